// A monotonic clock in fixed 100-nanosecond units ("clocks"), read from the
// platform's high-resolution counter and scaled once at start-up.
//
// TimerCalibrator::Instance() is created on first use (thread-safe) and
// lives until the process ends. No member throws, blocks or allocates; any
// thread may call them. Clocks count from an arbitrary origin, so only
// differences are meaningful.
#pragma once

#include <cstdint>

namespace tarn {

class TimerCalibrator {
 public:
  TimerCalibrator(const TimerCalibrator&) = delete;
  TimerCalibrator& operator=(const TimerCalibrator&) = delete;

  [[nodiscard]] static TimerCalibrator& Instance();

  [[nodiscard]] std::uint64_t Clocks() const noexcept;
  [[nodiscard]] double Seconds() const noexcept;
  [[nodiscard]] std::int64_t Microseconds() const noexcept;
  // Clocks per second: 1e7.
  [[nodiscard]] double Frequency() const noexcept { return clocksPerSecond_; }
  [[nodiscard]] double ClocksToSeconds(std::uint64_t clocks) const noexcept;
  [[nodiscard]] std::uint64_t SecondsToClocks(double seconds) const noexcept;

 private:
  TimerCalibrator() noexcept;
  ~TimerCalibrator() = default;

  struct Impl {
    double counterToClocks;  // 1e7 / the counter's frequency
  };

  double secondsPerClock_ = 1e-7;
  double clocksPerSecond_ = 1e7;
  Impl impl_;
};

}  // namespace tarn
