#include "tarn/Streams/PipedStream.h"

#include <chrono>
#include <condition_variable>
#include <cstring>
#include <deque>
#include <limits>
#include <mutex>

#include "tarn/Errors/TarnError.h"

namespace tarn {

struct PipedStream::Pipe {
  std::mutex mutex;
  std::condition_variable arrived;  // bytes pushed or an end destroyed
  std::deque<char> bytes;
  int ends = 0;
};

PipedStream::PipedStream() : pipe_(std::make_shared<Pipe>()), isReadingEnd_(false) {
  pipe_->ends = 1;
  Open(kTCLWriteMode);
}

PipedStream::PipedStream(PipedStream& otherEnd) : pipe_(otherEnd.pipe_), isReadingEnd_(true) {
  {
    std::lock_guard lock(pipe_->mutex);
    ++pipe_->ends;
  }
  Open(kTCLReadMode);
}

PipedStream::~PipedStream() { Close(); }

void PipedStream::Close() {
  if (!attached_) return;
  attached_ = false;
  {
    std::lock_guard lock(pipe_->mutex);
    --pipe_->ends;
  }
  pipe_->arrived.notify_all();
  CStream::Close();
}

std::int64_t PipedStream::Size() {
  if (!isReadingEnd_) return transferred_;
  std::lock_guard lock(pipe_->mutex);
  if (pipe_->ends > 1) return std::numeric_limits<std::int64_t>::max();
  return transferred_ + static_cast<std::int64_t>(pipe_->bytes.size());
}

void PipedStream::MoveTo(std::int64_t position) {
  if (position == transferred_) return;
  if (!isReadingEnd_ || position < transferred_) FailStream(kPositionOutOfRange);
  char scrap[256];
  while (transferred_ < position) {
    const std::int64_t left = position - transferred_;
    GetRawDataFromStream(scrap, left < 256 ? static_cast<int>(left) : 256);
  }
}

void PipedStream::PutRawDataToStream(const void* data, int count) {
  if (count <= 0) return;
  const auto* p = static_cast<const char*>(data);
  {
    std::lock_guard lock(pipe_->mutex);
    pipe_->bytes.insert(pipe_->bytes.end(), p, p + count);
  }
  transferred_ += count;
  pipe_->arrived.notify_all();
}

void PipedStream::PutThru(const void* data, char terminator) {
  const auto* p = static_cast<const char*>(data);
  std::size_t n = 0;
  while (p[n] != terminator) ++n;
  PutRawDataToStream(p, static_cast<int>(n + 1));
}

int PipedStream::Take(char* buffer, int count, char terminator, bool stopAtTerminator) {
  using namespace std::chrono_literals;
  int taken = 0;
  std::unique_lock lock(pipe_->mutex);
  while (taken < count) {
    auto& bytes = pipe_->bytes;
    if (bytes.empty()) {
      if (pipe_->ends < 2) break;
      // Woken by the writer; the timeout is a safety net, not the mechanism.
      pipe_->arrived.wait_for(lock, 1ms);
      continue;
    }
    bool hit = false;
    while (taken < count && !bytes.empty() && !hit) {
      const char c = bytes.front();
      bytes.pop_front();
      buffer[taken++] = c;
      hit = stopAtTerminator && c == terminator;
    }
    if (hit) break;
  }
  transferred_ += taken;
  return taken;
}

void PipedStream::GetRawDataFromStream(void* buffer, int count) {
  if (count <= 0) return;
  if (Take(static_cast<char*>(buffer), count, 0, false) < count) Failure(-39);
}

int PipedStream::GetThruN(void* buffer, char terminator, int max) {
  if (max <= 0) return 0;
  return Take(static_cast<char*>(buffer), max, terminator, true);
}

}  // namespace tarn
