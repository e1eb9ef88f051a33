// The library's version, as built.
#pragma once

namespace tarn {

[[nodiscard]] const char* GetTarnCoreVersion() noexcept;  // "major.minor.patch"

}  // namespace tarn
