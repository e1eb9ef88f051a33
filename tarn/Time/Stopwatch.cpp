#include "tarn/Time/Stopwatch.h"

#include "tarn/Time/TimerCalibrator.h"

namespace tarn {

void Stopwatch::Start() noexcept {
  startMicroseconds_ = TimerCalibrator::Instance().Microseconds();
}

std::int64_t Stopwatch::Stop() noexcept {
  if (!startMicroseconds_) return 0;
  const std::int64_t elapsed = TimerCalibrator::Instance().Microseconds() - *startMicroseconds_;
  startMicroseconds_.reset();
  return elapsed;
}

}  // namespace tarn
