#include "tarn/Time/TimerCalibrator.h"

#include "tarn/Time/TimerCalibratorImpl.h"

namespace tarn {
namespace {

constexpr double kTwoTo63 = 9223372036854775808.0;

// Doubles at or above 2^63 do not fit a signed conversion; take them down
// by 2^63 first and add it back as an unsigned value.
std::uint64_t ToUInt64(double d) noexcept {
  if (!(d > 0.0)) return 0;
  if (d >= 2.0 * kTwoTo63) return UINT64_MAX;
  if (d >= kTwoTo63)
    return static_cast<std::uint64_t>(static_cast<std::int64_t>(d - kTwoTo63)) + (1ull << 63);
  return static_cast<std::uint64_t>(static_cast<std::int64_t>(d));
}

}  // namespace

TimerCalibrator& TimerCalibrator::Instance() {
  static TimerCalibrator instance;
  return instance;
}

TimerCalibrator::TimerCalibrator() noexcept
    : impl_{clocksPerSecond_ / detail::HighResolutionCounterFrequency()} {}

std::uint64_t TimerCalibrator::Clocks() const noexcept {
  return ToUInt64(static_cast<double>(detail::ReadHighResolutionCounter()) * impl_.counterToClocks);
}

double TimerCalibrator::Seconds() const noexcept { return ClocksToSeconds(Clocks()); }

std::int64_t TimerCalibrator::Microseconds() const noexcept {
  return static_cast<std::int64_t>(Seconds() * 1e6);
}

double TimerCalibrator::ClocksToSeconds(std::uint64_t clocks) const noexcept {
  return static_cast<double>(clocks) * secondsPerClock_;
}

std::uint64_t TimerCalibrator::SecondsToClocks(double seconds) const noexcept {
  return ToUInt64(seconds * clocksPerSecond_);
}

}  // namespace tarn
