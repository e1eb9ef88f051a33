#include "tarn/Basics/Smoosher.h"

#include <bit>

#include "tarn/Basics/Endian.h"

namespace tarn {

Smoosher::~Smoosher() {
  if (next_ && free_ != 32) Put(0, free_);
}

void Smoosher::Put(int value, short bitCount) noexcept {
  if (free_ > bitCount) {
    accumulator_ = (accumulator_ << bitCount) | static_cast<std::uint32_t>(value);
    free_ = static_cast<std::int16_t>(free_ - bitCount);
    return;
  }
  const int over = bitCount - free_;
  const std::uint32_t high = free_ == 32 ? 0 : accumulator_ << free_;
  const std::uint32_t word = static_cast<std::uint32_t>(value >> over) | high;
  *next_++ = Endian::Swapped(word);
  accumulator_ = over == 0 ? 0 : static_cast<std::uint32_t>(value) & ((1u << over) - 1);
  free_ = static_cast<std::int16_t>(32 - over);
}

int UnSmoosher::Get(short bitCount) noexcept {
  int n = bitCount;
  std::uint32_t high = 0;
  if (n > unread_) {
    if (unread_ > 0) high = (current_ >> (32 - unread_)) << (n - unread_);
    n -= unread_;
    current_ = Endian::Swapped(static_cast<std::uint32_t>(*next_++));
    unread_ = 32;
  }
  current_ = std::rotl(current_, n);
  unread_ = static_cast<std::int16_t>(unread_ - n);
  const std::uint32_t mask = n >= 32 ? ~0u : (1u << n) - 1;
  return static_cast<int>((current_ & mask) | high);
}

SmoosherBuffer::SmoosherBuffer(unsigned int bitCount)
    : size_(static_cast<unsigned int>((static_cast<std::uint64_t>(bitCount) + 31) / 32 * 4)),
      words_(size_ ? std::make_unique<unsigned int[]>(size_ / 4) : nullptr) {}

}  // namespace tarn
