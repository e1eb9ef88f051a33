// Integer arithmetic that wraps like the machine does, without undefined
// behaviour: the time types promise two's-complement wrap on overflow, and
// conversions from floating point that do not fit give the processor's
// "integer indefinite" value (the most negative integer) instead of trapping.
#pragma once

#include <cmath>
#include <cstdint>
#include <limits>

namespace tarn::detail {

[[nodiscard]] constexpr std::int64_t WrapAdd(std::int64_t a, std::int64_t b) noexcept {
  return static_cast<std::int64_t>(static_cast<std::uint64_t>(a) + static_cast<std::uint64_t>(b));
}
[[nodiscard]] constexpr std::int64_t WrapSub(std::int64_t a, std::int64_t b) noexcept {
  return static_cast<std::int64_t>(static_cast<std::uint64_t>(a) - static_cast<std::uint64_t>(b));
}
[[nodiscard]] constexpr std::int64_t WrapMul(std::int64_t a, std::int64_t b) noexcept {
  return static_cast<std::int64_t>(static_cast<std::uint64_t>(a) * static_cast<std::uint64_t>(b));
}
[[nodiscard]] constexpr std::int64_t WrapNeg(std::int64_t a) noexcept {
  return static_cast<std::int64_t>(0u - static_cast<std::uint64_t>(a));
}
// Quotient truncated toward zero; the one overflowing case (min / -1) wraps to min.
[[nodiscard]] constexpr std::int64_t WrapDiv(std::int64_t a, std::int64_t b) noexcept {
  return b == -1 ? WrapNeg(a) : a / b;
}
[[nodiscard]] constexpr std::int64_t WrapRem(std::int64_t a, std::int64_t b) noexcept {
  return b == -1 ? 0 : a % b;
}
[[nodiscard]] constexpr std::int64_t WrapShiftLeft(std::int64_t a, int shift) noexcept {
  return static_cast<std::int64_t>(static_cast<std::uint64_t>(a) << shift);
}

[[nodiscard]] constexpr std::int32_t WrapAdd32(std::int32_t a, std::int32_t b) noexcept {
  return static_cast<std::int32_t>(static_cast<std::uint32_t>(a) + static_cast<std::uint32_t>(b));
}
[[nodiscard]] constexpr std::int32_t WrapSub32(std::int32_t a, std::int32_t b) noexcept {
  return static_cast<std::int32_t>(static_cast<std::uint32_t>(a) - static_cast<std::uint32_t>(b));
}
[[nodiscard]] constexpr std::int32_t WrapMul32(std::int32_t a, std::int32_t b) noexcept {
  return static_cast<std::int32_t>(static_cast<std::uint32_t>(a) * static_cast<std::uint32_t>(b));
}
[[nodiscard]] constexpr std::int32_t WrapNeg32(std::int32_t a) noexcept {
  return static_cast<std::int32_t>(0u - static_cast<std::uint32_t>(a));
}

// Truncates toward zero; NaN and values outside the range of Int give its minimum.
template <class Int>
[[nodiscard]] Int TruncateToInt(double d) noexcept {
  // Both bounds are powers of two and so exact as doubles.
  constexpr double kLow = static_cast<double>(std::numeric_limits<Int>::min());
  constexpr double kHigh = -kLow;
  if (!(d > kLow - 1.0 && d < kHigh)) return std::numeric_limits<Int>::min();
  return static_cast<Int>(d);
}

}  // namespace tarn::detail
