// Sample frame counts and positions.
//
// SampleCount is a signed 64-bit count of sample frames; its arithmetic wraps
// on overflow exactly like plain 64-bit integers, and division by zero is the
// caller's fault. Only the 32-bit narrowing accessors pin. SampleCountFrac is
// a frame count with a fractional part, computed in double precision.
// Both are plain values: copyable, allocation-free, safe on any thread.
//
// Stream forms use CStream's big-endian integers and IEEE doubles; reading
// throws whatever the stream throws (a TarnError at end of data).
#pragma once

#include <compare>
#include <cstdint>

namespace tarn {

class CStream;
class SampleCountFrac;

class SampleCount {
 public:
  constexpr SampleCount() noexcept = default;
  constexpr SampleCount(std::int64_t value) noexcept : value_(value) {}  // NOLINT: implicit
  // Truncates toward zero; NaN or out of range gives the most negative count.
  explicit SampleCount(const SampleCountFrac& frac) noexcept;
  constexpr SampleCount(const SampleCount&) noexcept = default;
  constexpr SampleCount& operator=(const SampleCount&) noexcept = default;

  [[nodiscard]] constexpr std::int64_t AsLongLong() const noexcept { return value_; }
  [[nodiscard]] double AsSeconds(double rate) const noexcept {
    return static_cast<double>(value_) / rate;
  }
  [[nodiscard]] SampleCount Abs() const noexcept;

  SampleCount& operator+=(SampleCount rhs) noexcept;
  SampleCount& operator-=(SampleCount rhs) noexcept;
  SampleCount& operator*=(SampleCount rhs) noexcept;
  SampleCount& operator/=(SampleCount rhs) noexcept;
  SampleCount& operator+=(std::int64_t rhs) noexcept { return *this += SampleCount(rhs); }
  SampleCount& operator-=(std::int64_t rhs) noexcept { return *this -= SampleCount(rhs); }
  SampleCount& operator*=(std::int64_t rhs) noexcept { return *this *= SampleCount(rhs); }
  SampleCount& operator/=(std::int64_t rhs) noexcept { return *this /= SampleCount(rhs); }
  // These truncate the operand toward zero first: n *= 2.9 doubles n.
  SampleCount& operator+=(const SampleCountFrac& rhs) noexcept;
  SampleCount& operator-=(const SampleCountFrac& rhs) noexcept;
  SampleCount& operator*=(const SampleCountFrac& rhs) noexcept;
  SampleCount& operator/=(const SampleCountFrac& rhs) noexcept;
  SampleCount& operator++() noexcept { return *this += SampleCount(1); }
  SampleCount& operator--() noexcept { return *this -= SampleCount(1); }
  SampleCount operator++(int) noexcept;
  SampleCount operator--(int) noexcept;
  [[nodiscard]] SampleCount operator-() const noexcept;

  friend SampleCount operator+(SampleCount a, SampleCount b) noexcept { return a += b; }
  friend SampleCount operator-(SampleCount a, SampleCount b) noexcept { return a -= b; }
  friend SampleCount operator*(SampleCount a, SampleCount b) noexcept { return a *= b; }
  friend SampleCount operator/(SampleCount a, SampleCount b) noexcept { return a /= b; }
  friend constexpr bool operator==(SampleCount, SampleCount) noexcept = default;
  friend constexpr auto operator<=>(SampleCount, SampleCount) noexcept = default;

  // Narrowing to 32 bits.
  [[nodiscard]] bool CanFitInSInt32() const noexcept;
  // max if value > max, else the larger of value and min.
  [[nodiscard]] std::int32_t GetSInt32PinningToRange(std::int32_t min,
                                                     std::int32_t max) const noexcept;
  [[nodiscard]] std::int32_t GetPositiveSInt32PinningToMax(std::int32_t max) const noexcept;
  [[nodiscard]] std::uint32_t GetUInt32PinningToMax(std::uint32_t max) const noexcept;
  // this - other clamped to [-2^31, 2^31 - 1] and [0, 2^31 - 1], free of overflow.
  [[nodiscard]] std::int32_t SubtractWithSInt32Result(SampleCount other) const noexcept;
  [[nodiscard]] std::int32_t SubtractWithPositiveSInt32Result(SampleCount other) const noexcept;
  // The low 32 bits; the caller guarantees the range (TARN_ASSERT unless NDEBUG).
  [[nodiscard]] std::int32_t GetSInt32AssertingRange() const noexcept;
  [[nodiscard]] std::int32_t GetSInt32AssertingRange(std::int32_t min,
                                                     std::int32_t max) const noexcept;
  // For old callers that treat the count as 32-bit.
  [[nodiscard]] std::int32_t _bogus() const noexcept { return static_cast<std::int32_t>(value_); }
  void _set_bogus(std::int32_t value) noexcept { value_ = value; }

  // Stream form: a big-endian signed 64-bit integer.
  void PutTo(CStream& stream) const;
  void GetFrom(CStream& stream);
  // as64Bit false: a signed 32-bit integer, pinned on writing, sign-extended on reading.
  void PutTo(CStream& stream, bool as64Bit) const;
  void GetFrom(CStream& stream, bool as64Bit);
  // Note the inverted sense, kept for existing files: true reads 32 bits, false 64.
  [[nodiscard]] static std::int64_t Get_LLorL(CStream& stream, bool as32Bit);
  [[nodiscard]] static SampleCount Get_LLorL_SampleCount(CStream& stream, bool as32Bit);

 private:
  std::int64_t value_ = 0;
};

// The largest and smallest sample positions the library uses as sentinels:
// ±(2^48 - 1), far beyond any real recording yet safe to add lengths to.
inline constexpr SampleCount kLargestSampleCount{281474976710655LL};
inline constexpr SampleCount kSmallestSampleCount{-281474976710655LL};

class SampleCountFrac {
 public:
  constexpr SampleCountFrac() noexcept = default;
  constexpr SampleCountFrac(double value) noexcept : value_(value) {}  // NOLINT: implicit
  constexpr SampleCountFrac(SampleCount count) noexcept                // NOLINT: implicit
      : value_(static_cast<double>(count.AsLongLong())) {}
  constexpr SampleCountFrac(const SampleCountFrac&) noexcept = default;
  constexpr SampleCountFrac& operator=(const SampleCountFrac&) noexcept = default;

  [[nodiscard]] constexpr double AsDouble() const noexcept { return value_; }
  [[nodiscard]] constexpr double AsSeconds(double rate) const noexcept { return value_ / rate; }
  [[nodiscard]] SampleCountFrac Abs() const noexcept;
  [[nodiscard]] bool IsNotANumber() const noexcept;
  [[nodiscard]] SampleCountFrac Floor() const noexcept;
  [[nodiscard]] SampleCountFrac Ceil() const noexcept;
  // Halves round away from zero: 2.5 gives 3, -2.5 gives -3.
  [[nodiscard]] SampleCountFrac Round() const noexcept;
  // Pinned to [-16777215, 16777215], the integers a float holds exactly.
  [[nodiscard]] float GetFloat32AssertingRange() const noexcept;

  constexpr SampleCountFrac& operator+=(SampleCountFrac rhs) noexcept {
    value_ += rhs.value_;
    return *this;
  }
  constexpr SampleCountFrac& operator-=(SampleCountFrac rhs) noexcept {
    value_ -= rhs.value_;
    return *this;
  }
  constexpr SampleCountFrac& operator*=(SampleCountFrac rhs) noexcept {
    value_ *= rhs.value_;
    return *this;
  }
  constexpr SampleCountFrac& operator/=(SampleCountFrac rhs) noexcept {
    value_ /= rhs.value_;
    return *this;
  }
  constexpr SampleCountFrac& operator++() noexcept { return *this += 1.0; }
  constexpr SampleCountFrac& operator--() noexcept { return *this -= 1.0; }
  constexpr SampleCountFrac operator++(int) noexcept {
    SampleCountFrac old = *this;
    ++*this;
    return old;
  }
  constexpr SampleCountFrac operator--(int) noexcept {
    SampleCountFrac old = *this;
    --*this;
    return old;
  }
  [[nodiscard]] constexpr SampleCountFrac operator-() const noexcept { return -value_; }

  friend constexpr SampleCountFrac operator+(SampleCountFrac a, SampleCountFrac b) noexcept {
    return a += b;
  }
  friend constexpr SampleCountFrac operator-(SampleCountFrac a, SampleCountFrac b) noexcept {
    return a -= b;
  }
  friend constexpr SampleCountFrac operator*(SampleCountFrac a, SampleCountFrac b) noexcept {
    return a *= b;
  }
  friend constexpr SampleCountFrac operator/(SampleCountFrac a, SampleCountFrac b) noexcept {
    return a /= b;
  }
  friend constexpr bool operator==(SampleCountFrac, SampleCountFrac) noexcept = default;
  friend constexpr auto operator<=>(SampleCountFrac, SampleCountFrac) noexcept = default;

  // Stream form: the IEEE double, big-endian.
  void PutTo(CStream& stream) const;
  void GetFrom(CStream& stream);

 private:
  double value_ = 0.0;
};

// Stores into a SampleCount held elsewhere, like a reference.
class SampleCountProxy {
 public:
  explicit SampleCountProxy(SampleCount& target) noexcept : target_(&target) {}
  SampleCountProxy(const SampleCountProxy&) noexcept = default;

  [[nodiscard]] SampleCount get() const noexcept { return *target_; }
  operator SampleCount() const noexcept { return *target_; }  // NOLINT: implicit
  SampleCount operator=(SampleCount value) noexcept { return *target_ = value; }
  SampleCount operator=(const SampleCountProxy& other) noexcept { return *target_ = other.get(); }

 private:
  SampleCount* target_;
};

}  // namespace tarn
