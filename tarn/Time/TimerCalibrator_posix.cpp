#include <time.h>

#include "tarn/Time/TimerCalibratorImpl.h"

namespace tarn::detail {

std::int64_t ReadHighResolutionCounter() noexcept {
  timespec ts{};
  clock_gettime(CLOCK_MONOTONIC, &ts);
  return static_cast<std::int64_t>(ts.tv_sec) * 1000000000 + ts.tv_nsec;
}

double HighResolutionCounterFrequency() noexcept { return 1e9; }

}  // namespace tarn::detail
