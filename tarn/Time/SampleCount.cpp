#include "tarn/Time/SampleCount.h"

#include <cassert>
#include <cmath>
#include <limits>

#include "tarn/Streams/CStream.h"
#include "tarn/Time/WrappingMath.h"

namespace tarn {
namespace {

constexpr std::int64_t kSInt32Min = std::numeric_limits<std::int32_t>::min();
constexpr std::int64_t kSInt32Max = std::numeric_limits<std::int32_t>::max();
constexpr std::int64_t kSInt64Min = std::numeric_limits<std::int64_t>::min();
constexpr std::int64_t kSInt64Max = std::numeric_limits<std::int64_t>::max();

// a - b clamped to [lo, hi]; the exact difference may not fit in 64 bits.
std::int32_t ClampedDifference(std::int64_t a, std::int64_t b, std::int64_t lo,
                               std::int64_t hi) noexcept {
  if (b < 0 && a > kSInt64Max + b) return static_cast<std::int32_t>(hi);
  if (b > 0 && a < kSInt64Min + b) return static_cast<std::int32_t>(lo);
  const std::int64_t d = a - b;
  return static_cast<std::int32_t>(d < lo ? lo : d > hi ? hi : d);
}

std::int64_t Truncated(const SampleCountFrac& frac) noexcept {
  return detail::TruncateToInt<std::int64_t>(frac.AsDouble());
}

}  // namespace

SampleCount::SampleCount(const SampleCountFrac& frac) noexcept : value_(Truncated(frac)) {}

SampleCount SampleCount::Abs() const noexcept { return value_ < 0 ? -*this : *this; }

SampleCount& SampleCount::operator+=(SampleCount rhs) noexcept {
  value_ = detail::WrapAdd(value_, rhs.value_);
  return *this;
}
SampleCount& SampleCount::operator-=(SampleCount rhs) noexcept {
  value_ = detail::WrapSub(value_, rhs.value_);
  return *this;
}
SampleCount& SampleCount::operator*=(SampleCount rhs) noexcept {
  value_ = detail::WrapMul(value_, rhs.value_);
  return *this;
}
SampleCount& SampleCount::operator/=(SampleCount rhs) noexcept {
  value_ = detail::WrapDiv(value_, rhs.value_);
  return *this;
}
SampleCount& SampleCount::operator+=(const SampleCountFrac& rhs) noexcept {
  return *this += SampleCount(rhs);
}
SampleCount& SampleCount::operator-=(const SampleCountFrac& rhs) noexcept {
  return *this -= SampleCount(rhs);
}
SampleCount& SampleCount::operator*=(const SampleCountFrac& rhs) noexcept {
  return *this *= SampleCount(rhs);
}
SampleCount& SampleCount::operator/=(const SampleCountFrac& rhs) noexcept {
  return *this /= SampleCount(rhs);
}

SampleCount SampleCount::operator++(int) noexcept {
  const SampleCount old = *this;
  ++*this;
  return old;
}
SampleCount SampleCount::operator--(int) noexcept {
  const SampleCount old = *this;
  --*this;
  return old;
}
SampleCount SampleCount::operator-() const noexcept { return detail::WrapNeg(value_); }

bool SampleCount::CanFitInSInt32() const noexcept {
  return value_ >= kSInt32Min && value_ <= kSInt32Max;
}

std::int32_t SampleCount::GetSInt32PinningToRange(std::int32_t min,
                                                  std::int32_t max) const noexcept {
  if (value_ > max) return max;
  return value_ < min ? min : static_cast<std::int32_t>(value_);
}

std::int32_t SampleCount::GetPositiveSInt32PinningToMax(std::int32_t max) const noexcept {
  if (value_ < 0) return 0;
  return value_ < max ? static_cast<std::int32_t>(value_) : max;
}

std::uint32_t SampleCount::GetUInt32PinningToMax(std::uint32_t max) const noexcept {
  if (value_ > static_cast<std::int64_t>(max)) return max;
  return value_ >= 0 ? static_cast<std::uint32_t>(value_) : 0u;
}

std::int32_t SampleCount::SubtractWithSInt32Result(SampleCount other) const noexcept {
  return ClampedDifference(value_, other.value_, kSInt32Min, kSInt32Max);
}

std::int32_t SampleCount::SubtractWithPositiveSInt32Result(SampleCount other) const noexcept {
  return ClampedDifference(value_, other.value_, 0, kSInt32Max);
}

std::int32_t SampleCount::GetSInt32AssertingRange() const noexcept {
  assert(CanFitInSInt32());
  return static_cast<std::int32_t>(value_);
}

std::int32_t SampleCount::GetSInt32AssertingRange(std::int32_t min,
                                                  std::int32_t max) const noexcept {
  assert(value_ >= min && value_ <= max);
  (void)min;
  (void)max;
  return static_cast<std::int32_t>(value_);
}

void SampleCount::PutTo(CStream& stream) const { stream.PutLongLong(value_); }

void SampleCount::GetFrom(CStream& stream) { value_ = stream.GetLongLong(); }

void SampleCount::PutTo(CStream& stream, bool as64Bit) const {
  if (as64Bit) {
    stream.PutLongLong(value_);
  } else {
    stream.PutLong(GetSInt32PinningToRange(std::numeric_limits<std::int32_t>::min(),
                                           std::numeric_limits<std::int32_t>::max()));
  }
}

void SampleCount::GetFrom(CStream& stream, bool as64Bit) {
  value_ = as64Bit ? stream.GetLongLong() : stream.GetLong();
}

std::int64_t SampleCount::Get_LLorL(CStream& stream, bool as32Bit) {
  return as32Bit ? stream.GetLong() : stream.GetLongLong();
}

SampleCount SampleCount::Get_LLorL_SampleCount(CStream& stream, bool as32Bit) {
  return Get_LLorL(stream, as32Bit);
}

SampleCountFrac SampleCountFrac::Abs() const noexcept { return std::fabs(value_); }
bool SampleCountFrac::IsNotANumber() const noexcept { return std::isnan(value_); }
SampleCountFrac SampleCountFrac::Floor() const noexcept { return std::floor(value_); }
SampleCountFrac SampleCountFrac::Ceil() const noexcept { return std::ceil(value_); }

SampleCountFrac SampleCountFrac::Round() const noexcept {
  return value_ > 0 ? std::floor(value_ + 0.5) : std::ceil(value_ - 0.5);
}

float SampleCountFrac::GetFloat32AssertingRange() const noexcept {
  constexpr double kLimit = 16777215.0;
  if (value_ > kLimit) return static_cast<float>(kLimit);
  if (value_ < -kLimit) return static_cast<float>(-kLimit);
  return static_cast<float>(value_);
}

void SampleCountFrac::PutTo(CStream& stream) const { stream.PutIEEEDouble(value_); }

void SampleCountFrac::GetFrom(CStream& stream) { value_ = stream.GetIEEEDouble(); }

}  // namespace tarn
