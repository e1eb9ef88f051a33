#pragma once
// Progress: a one-line progress bar on standard error for long work.
//
// Shown only when standard error is a terminal, and only once the work has
// run for half a second (short work prints nothing); redrawn at most ten
// times a second. Finish (or the destructor) clears the line. One thread.
//
//   Progress progress("converting", totalFrames);
//   for (...) progress.Update(framesDone);
//   progress.Finish();

#include <chrono>
#include <cstdint>
#include <string>

namespace tarnfile {

class Progress {
 public:
  Progress(std::string label, std::int64_t total);
  Progress(const Progress&) = delete;
  Progress& operator=(const Progress&) = delete;
  ~Progress();

  void Update(std::int64_t done);
  void Finish();

 private:
  using Clock = std::chrono::steady_clock;

  std::string label_;
  std::int64_t total_;
  bool enabled_;
  bool drawn_ = false;
  Clock::time_point start_;
  Clock::time_point lastDraw_;
};

}  // namespace tarnfile
