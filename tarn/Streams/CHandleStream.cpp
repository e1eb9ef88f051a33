#include "tarn/Streams/CHandleStream.h"

#include <climits>
#include <cstring>

#include "tarn/Errors/TarnError.h"

namespace tarn {

CHandleStream::CHandleStream(char** handle, TCLStreamMode mode, int blockSize)
    : CBufferedStream(static_cast<int>(GetHandleSize(handle))),
      blockSize_(blockSize > 0 ? blockSize : kDefaultBlockSize) {
  FailNIL(handle);
  if (GetHandleSize(handle) > static_cast<std::size_t>(INT_MAX)) Failure(-50);
  buffer_ = handle;
  ownsBuffer_ = false;
  bufferLength_ = bufferSize_;
  if (mode != kTCLClosedMode) Open(mode);
}

CHandleStream::CHandleStream(TCLStreamMode mode)
    : CBufferedStream(kDefaultBlockSize), blockSize_(kDefaultBlockSize) {
  if (mode != kTCLClosedMode) Open(mode);
}

void CHandleStream::Open(TCLStreamMode mode) {
  if (!buffer_) {
    const int size = bufferSize_ > 0 ? bufferSize_ : blockSize_;
    buffer_ = NewHandle(static_cast<std::size_t>(size));
    ownsBuffer_ = true;
    bufferSize_ = size;
    bufferLength_ = 0;
  }
  CStream::Open(mode);
  bufferStart_ = 0;
  bufferPosition_ = 0;
  dirty_ = false;
}

void CHandleStream::ResizeBlock(std::int64_t size) {
  if (size > INT_MAX) FailMemFullError();
  SetHandleSize(buffer_, static_cast<std::size_t>(size));
  bufferSize_ = static_cast<int>(size);
}

void CHandleStream::Drain() {
  // Called when a write reaches the end of the block: grow, keep the data.
  ResizeBlock(static_cast<std::int64_t>(bufferSize_) + blockSize_);
  dirty_ = false;
}

void CHandleStream::Bracket(std::int64_t position) {
  bufferPosition_ = static_cast<int>(position < bufferLength_ ? position : bufferLength_);
}

void CHandleStream::SetPhysicalSize(std::int64_t size) {
  if (size < 0) FailStream(kPositionOutOfRange);
  if (size > bufferSize_) ResizeBlock(size);
  if (size > bufferLength_) {
    std::memset(*buffer_ + bufferLength_, 0, static_cast<std::size_t>(size - bufferLength_));
  }
  bufferLength_ = static_cast<int>(size);
  if (bufferPosition_ > bufferLength_) bufferPosition_ = bufferLength_;
}

void CHandleStream::Truncate(std::int64_t size) { SetPhysicalSize(size); }

void CHandleStream::SetBufferSize(int size) {
  if (!buffer_) {
    bufferSize_ = size > 0 ? size : blockSize_;
    return;
  }
  ResizeBlock(size > bufferLength_ ? size : bufferLength_);
}

char** CHandleStream::GetStreamHandle() {
  if (buffer_ && bufferSize_ != bufferLength_) ResizeBlock(bufferLength_);
  return buffer_;
}

auto_handle<char> CHandleStream::DetachHandle() {
  if (!ownsBuffer_) Failure(-50);
  auto_handle<char> h(GetStreamHandle());
  buffer_ = nullptr;
  ownsBuffer_ = true;
  bufferSize_ = blockSize_;
  bufferStart_ = bufferPosition_ = bufferLength_ = 0;
  CStream::Close();
  return h;
}

void CHandleStream::DisposeAll() noexcept {
  ReleaseBuffer();
  ownsBuffer_ = true;
  bufferSize_ = blockSize_;
  bufferStart_ = bufferPosition_ = bufferLength_ = 0;
  CStream::Close();
}

void CHandleStream::SetBlockSize(int blockSize) {
  if (blockSize <= 0) Failure(-50);
  blockSize_ = blockSize;
}

}  // namespace tarn
