// Private: the platform's high-resolution counter, one definition per platform file.
#pragma once

#include <cstdint>

namespace tarn::detail {

[[nodiscard]] std::int64_t ReadHighResolutionCounter() noexcept;
// Counter ticks per second.
[[nodiscard]] double HighResolutionCounterFrequency() noexcept;

}  // namespace tarn::detail
