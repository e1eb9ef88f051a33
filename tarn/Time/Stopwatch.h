// Elapsed-time measurement in microseconds.
#pragma once

#include <cstdint>
#include <optional>

namespace tarn {

// Measures elapsed microseconds on TimerCalibrator's clock. One thread.
//
//   Stopwatch watch;
//   watch.Start();
//   DoWork();
//   std::int64_t micros = watch.Stop();
class Stopwatch {
 public:
  Stopwatch() noexcept = default;
  Stopwatch(const Stopwatch&) noexcept = default;
  Stopwatch& operator=(const Stopwatch&) noexcept = default;

  // Starts, or restarts a running stopwatch.
  void Start() noexcept;
  // Microseconds since Start(), and stops; 0 when not running.
  std::int64_t Stop() noexcept;
  [[nodiscard]] bool IsRunning() const noexcept { return startMicroseconds_.has_value(); }

 private:
  std::optional<std::int64_t> startMicroseconds_;  // empty when stopped
};

}  // namespace tarn
