#include "tarn/Streams/CBufferedStream.h"

#include <cstring>

#include "tarn/Errors/TarnError.h"

namespace tarn {

CBufferedStream::~CBufferedStream() { ReleaseBuffer(); }

void CBufferedStream::ReleaseBuffer() noexcept {
  if (ownsBuffer_) DisposeHandle(buffer_);
  buffer_ = nullptr;
}

void CBufferedStream::Open(TCLStreamMode mode) {
  CStream::Open(mode);
  if (!buffer_) {
    buffer_ = NewHandle(static_cast<std::size_t>(bufferSize_));
    ownsBuffer_ = true;
  }
  bufferStart_ = 0;
  bufferPosition_ = 0;
  bufferLength_ = 0;
  dirty_ = false;
}

std::int64_t CBufferedStream::Size() {
  const std::int64_t physical = GetPhysicalSize();
  const std::int64_t buffered = bufferStart_ + bufferLength_;
  return physical > buffered ? physical : buffered;
}

void CBufferedStream::MoveTo(std::int64_t position) {
  if (position < 0 || position > Size()) FailStream(kPositionOutOfRange);
  if (position >= bufferStart_ && position <= bufferStart_ + bufferLength_) {
    bufferPosition_ = static_cast<int>(position - bufferStart_);
  } else {
    Bracket(position);
  }
}

void CBufferedStream::Flush() {
  if (!dirty_) return;
  const std::int64_t position = Position();
  Drain();
  Bracket(position);
}

void CBufferedStream::Truncate(std::int64_t size) {
  if (size < 0) FailStream(kPositionOutOfRange);
  const std::int64_t position = Position();
  Flush();
  SetPhysicalSize(size);
  Bracket(position < size ? position : size);
}

void CBufferedStream::GetRawDataFromStream(void* buffer, int count) {
  auto* out = static_cast<char*>(buffer);
  // The common case, a read inside the buffer, takes one copy.
  if (count <= bufferLength_ - bufferPosition_) {
    if (count > 0) std::memcpy(out, *buffer_ + bufferPosition_, static_cast<std::size_t>(count));
    bufferPosition_ += count > 0 ? count : 0;
    return;
  }
  while (count > 0) {
    if (bufferPosition_ == bufferLength_) Fill();
    const int available = bufferLength_ - bufferPosition_;
    const int n = count < available ? count : available;
    std::memcpy(out, *buffer_ + bufferPosition_, static_cast<std::size_t>(n));
    bufferPosition_ += n;
    out += n;
    count -= n;
  }
}

void CBufferedStream::PutRawDataToStream(const void* data, int count) {
  const auto* in = static_cast<const char*>(data);
  while (count > 0) {
    if (bufferPosition_ == bufferSize_) Drain();
    dirty_ = true;
    const int room = bufferSize_ - bufferPosition_;
    const int n = count < room ? count : room;
    std::memcpy(*buffer_ + bufferPosition_, in, static_cast<std::size_t>(n));
    bufferPosition_ += n;
    if (bufferLength_ < bufferPosition_) bufferLength_ = bufferPosition_;
    in += n;
    count -= n;
  }
}

void CBufferedStream::PutThru(const void* data, char terminator) {
  const auto* p = static_cast<const char*>(data);
  std::size_t n = 0;
  while (p[n] != terminator) ++n;
  PutRawDataToStream(p, static_cast<int>(n + 1));
}

int CBufferedStream::GetThruN(void* buffer, char terminator, int max) {
  auto* out = static_cast<char*>(buffer);
  int count = 0;
  while (count < max) {
    if (bufferPosition_ == bufferLength_) {
      if (Position() >= Size()) break;
      Fill();
    }
    const int available = bufferLength_ - bufferPosition_;
    const int want = max - count < available ? max - count : available;
    const char* from = *buffer_ + bufferPosition_;
    const void* hit = std::memchr(from, terminator, static_cast<std::size_t>(want));
    const int n = hit ? static_cast<int>(static_cast<const char*>(hit) - from) + 1 : want;
    std::memcpy(out + count, from, static_cast<std::size_t>(n));
    bufferPosition_ += n;
    count += n;
    if (hit) break;
  }
  return count;
}

void CBufferedStream::SetBufferSize(int size) {
  if (size <= 0) Failure(-50);
  if (buffer_ && bufferLength_ > 0) {
    const std::int64_t position = Position();
    if (dirty_) Drain();
    Bracket(position);
  }
  if (buffer_) {
    SetHandleSize(buffer_, static_cast<std::size_t>(size));
  } else {
    buffer_ = NewHandle(static_cast<std::size_t>(size));
    ownsBuffer_ = true;
  }
  bufferSize_ = size;
}

void CBufferedStream::Fill() {
  if (bufferPosition_ == bufferLength_) Failure(-39);
}

}  // namespace tarn
