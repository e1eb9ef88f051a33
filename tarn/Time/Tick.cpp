#include "tarn/Time/Tick.h"

#include <cmath>

#include "tarn/Streams/CStream.h"
#include "tarn/Time/WrappingMath.h"

namespace tarn {
namespace {

constexpr double kRawPerTick = 4294967296.0;  // 2^32
// 2^63 - 1024: the largest double below 2^63, so the pinned value always converts.
constexpr double kRawLimit = 9223372036854774784.0;

}  // namespace

Tick::Tick(double ticks) noexcept {
  double raw = ticks * kRawPerTick;
  if (std::isnan(raw)) raw = 0.0;
  if (raw > kRawLimit) raw = kRawLimit;
  if (raw < -kRawLimit) raw = -kRawLimit;
  raw_ = static_cast<std::int64_t>(raw);
}

int Tick::Round() const noexcept { return WholeOf(detail::WrapAdd(raw_, 0x80000000)); }
int Tick::Ceiling() const noexcept { return WholeOf(detail::WrapAdd(raw_, 0xFFFFFFFF)); }

double Tick::AsDouble() const noexcept { return static_cast<double>(raw_) / kRawPerTick; }

Tick& Tick::operator+=(Tick rhs) noexcept {
  raw_ = detail::WrapAdd(raw_, rhs.raw_);
  return *this;
}
Tick& Tick::operator-=(Tick rhs) noexcept {
  raw_ = detail::WrapSub(raw_, rhs.raw_);
  return *this;
}
Tick Tick::operator-() const noexcept { return Tick(RawTag{}, detail::WrapNeg(raw_)); }

Tick Tick::operator*(int n) const noexcept { return *this * static_cast<std::int64_t>(n); }
Tick Tick::operator*(std::int64_t n) const noexcept {
  return Tick(RawTag{}, detail::WrapMul(raw_, n));
}
Tick Tick::operator*(double d) const noexcept {
  return Tick(RawTag{}, detail::TruncateToInt<std::int64_t>(static_cast<double>(raw_) * d));
}
Tick Tick::operator/(std::int64_t n) const noexcept {
  return Tick(RawTag{}, detail::WrapDiv(raw_, n));
}
std::int64_t Tick::operator/(Tick rhs) const noexcept { return detail::WrapDiv(raw_, rhs.raw_); }
Tick Tick::operator%(Tick rhs) const noexcept {
  return Tick(RawTag{}, detail::WrapRem(raw_, rhs.raw_));
}

void Tick::PutTo(CStream& stream) const { stream.PutLongLong(raw_); }

void Tick::GetFrom(CStream& stream) { raw_ = stream.GetLongLong(); }

}  // namespace tarn
