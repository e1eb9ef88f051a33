#include <windows.h>

#include "tarn/Time/TimerCalibratorImpl.h"

namespace tarn::detail {

std::int64_t ReadHighResolutionCounter() noexcept {
  LARGE_INTEGER count;
  QueryPerformanceCounter(&count);
  return count.QuadPart;
}

double HighResolutionCounterFrequency() noexcept {
  LARGE_INTEGER frequency;
  QueryPerformanceFrequency(&frequency);
  return static_cast<double>(frequency.QuadPart);
}

}  // namespace tarn::detail
