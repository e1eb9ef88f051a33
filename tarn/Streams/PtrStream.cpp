#include "tarn/Streams/PtrStream.h"

#include <cstring>

namespace tarn {

PtrStream::PtrStream(void* base, std::int64_t capacity, std::int64_t size) noexcept
    : base_(static_cast<char*>(base)),
      capacity_(capacity > 0 ? capacity : 0),
      size_(size < 0 ? 0 : (size > capacity_ ? capacity_ : size)) {}

// Capacity 0: nothing is ever written through the const area.
PtrStream::PtrStream(const void* base, std::int64_t size) noexcept
    : base_(static_cast<char*>(const_cast<void*>(base))),
      capacity_(0),
      size_(size > 0 ? size : 0) {}

void PtrStream::Open(TCLStreamMode mode) {
  CStream::Open(mode);
  position_ = 0;
}

void PtrStream::MoveTo(std::int64_t position) {
  if (position >= 0 && position <= size_) position_ = position;
}

void PtrStream::Truncate(std::int64_t size) {
  if (size < 0 || size >= size_) return;
  size_ = size;
  if (position_ > size_) position_ = size_;
}

void PtrStream::GetRawDataFromStream(void* buffer, int count) {
  if (count <= 0 || count > size_ - position_) return;
  std::memcpy(buffer, base_ + position_, static_cast<std::size_t>(count));
  position_ += count;
}

void PtrStream::PutRawDataToStream(const void* data, int count) {
  if (count <= 0 || count > capacity_ - position_) return;
  std::memcpy(base_ + position_, data, static_cast<std::size_t>(count));
  position_ += count;
  if (size_ < position_) size_ = position_;
}

void PtrStream::PutThru(const void* data, char terminator) {
  const auto* p = static_cast<const char*>(data);
  std::size_t n = 0;
  while (p[n] != terminator) ++n;
  PutRawDataToStream(p, static_cast<int>(n + 1));
}

int PtrStream::GetThruN(void* buffer, char terminator, int max) {
  std::int64_t span = size_ - position_;
  if (span > max) span = max;
  if (span <= 0) return 0;
  const char* from = base_ + position_;
  const void* hit = std::memchr(from, terminator, static_cast<std::size_t>(span));
  const auto count = hit ? static_cast<const char*>(hit) - from + 1 : span;
  std::memcpy(buffer, from, static_cast<std::size_t>(count));
  position_ += count;
  return static_cast<int>(count);
}

}  // namespace tarn
