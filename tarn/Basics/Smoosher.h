#pragma once
// Bit packing into big-endian 32-bit words.
//
// Smoosher writes fields of 1 to 32 bits, most significant bit first, into
// consecutive words of the caller's buffer; a field may straddle two words.
// Each word is stored big-endian once it is full; the destructor flushes a
// partly filled last word, padded with zero bits at the bottom. Values are
// not masked: the caller passes values that fit in their width (a negative
// value reduced to its low bits first). UnSmoosher reads fields of 1 to 31
// bits back as unsigned bit patterns; a caller that stored signed values
// sign-extends them itself. Neither checks the buffer's end: the caller sizes
// it, typically with SmoosherBuffer.
//
//   SmoosherBuffer buf(3 + 5);
//   { Smoosher out(buf.GetBuffer()); out.Put(5, 3); out.Put(3, 5); }  // A3 00 00 00
//   UnSmoosher in(buf.GetBuffer());
//   int a = in.Get(3), b = in.Get(5);                                 // 5, 3

#include <cstdint>
#include <memory>

namespace tarn {

class Smoosher {
 public:
  explicit Smoosher(unsigned int* words) noexcept : next_(words) {}
  Smoosher(const Smoosher&) = delete;
  Smoosher& operator=(const Smoosher&) = delete;
  ~Smoosher();

  void Put(int value, short bitCount) noexcept;

 private:
  unsigned int* next_;
  std::uint32_t accumulator_ = 0;  // the bits not yet written, at the bottom
  std::int16_t free_ = 32;         // bits still free in the accumulator
};

class UnSmoosher {
 public:
  explicit UnSmoosher(const unsigned int* words) noexcept : next_(words) {}
  UnSmoosher(const UnSmoosher&) = delete;
  UnSmoosher& operator=(const UnSmoosher&) = delete;
  ~UnSmoosher() = default;

  [[nodiscard]] int Get(short bitCount) noexcept;

 private:
  const unsigned int* next_;
  std::uint32_t current_ = 0;  // rotated so that the unread bits are at the top
  std::int16_t unread_ = 0;
};

// An owned, zero-filled buffer of whole 32-bit words for `bitCount` bits.
class SmoosherBuffer {
 public:
  explicit SmoosherBuffer(unsigned int bitCount);
  SmoosherBuffer(const SmoosherBuffer&) = delete;
  SmoosherBuffer& operator=(const SmoosherBuffer&) = delete;
  ~SmoosherBuffer() = default;

  // ((bitCount + 31) / 32) * 4.
  [[nodiscard]] unsigned int GetSize() const noexcept { return size_; }
  // Null when the size is 0.
  [[nodiscard]] unsigned int* GetBuffer() const noexcept { return words_.get(); }

 private:
  unsigned int size_;
  std::unique_ptr<unsigned int[]> words_;
};

}  // namespace tarn
