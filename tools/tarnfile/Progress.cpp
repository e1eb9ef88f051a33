#include "Progress.h"

#include <algorithm>
#include <cstdio>

#include "ToolSupport.h"

namespace tarnfile {

namespace {
constexpr auto kDelay = std::chrono::milliseconds(500);
constexpr auto kRedraw = std::chrono::milliseconds(100);
constexpr int kBarWidth = 40;
}  // namespace

Progress::Progress(std::string label, std::int64_t total)
    : label_(std::move(label)),
      total_(std::max<std::int64_t>(total, 1)),
      enabled_(StandardErrorIsTerminal()),
      start_(Clock::now()),
      lastDraw_(start_) {}

Progress::~Progress() { Finish(); }

void Progress::Update(std::int64_t done) {
  if (!enabled_) return;
  const auto now = Clock::now();
  if (now - start_ < kDelay || (drawn_ && now - lastDraw_ < kRedraw)) return;
  lastDraw_ = now;
  drawn_ = true;
  const double fraction = std::clamp(static_cast<double>(done) / total_, 0.0, 1.0);
  const int filled = static_cast<int>(fraction * kBarWidth);
  std::string bar(static_cast<std::size_t>(filled), '#');
  bar.append(static_cast<std::size_t>(kBarWidth - filled), '.');
  std::fprintf(stderr, "\r%s [%s] %3d%%", label_.c_str(), bar.c_str(),
               static_cast<int>(fraction * 100));
  std::fflush(stderr);
}

void Progress::Finish() {
  if (!drawn_) return;
  drawn_ = false;
  std::fprintf(stderr, "\r%*s\r", static_cast<int>(label_.size()) + kBarWidth + 8, "");
  std::fflush(stderr);
}

}  // namespace tarnfile
