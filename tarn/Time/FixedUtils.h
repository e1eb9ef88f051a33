// 16.16 fixed point (and 2.30 fractions) in a signed 32-bit integer.
//
// Products and quotients are formed in 64 bits and truncated back to 32 bits
// (wrapping). Conversions from floating point truncate toward zero; values
// that do not fit give the most negative fixed value. Round() floors:
// Round of -0.5 is -1 and of 1.75 is 1, which callers rely on.
// Division by zero is the caller's fault.
#pragma once

#include <cstdint>

#include "tarn/Time/WrappingMath.h"

namespace tarn::OS::FixedUtils {

using Fixed = std::int32_t;
using Fract = std::int32_t;  // 2.30

inline constexpr Fixed kFixedOne = 0x10000;

namespace detail {
[[nodiscard]] constexpr Fixed Low32(std::int64_t v) noexcept {
  return static_cast<Fixed>(static_cast<std::uint32_t>(static_cast<std::uint64_t>(v)));
}
}  // namespace detail

[[nodiscard]] inline Fixed FloatToFixed(float f) noexcept {
  return tarn::detail::TruncateToInt<Fixed>(static_cast<double>(f) * 65536.0);
}
[[nodiscard]] constexpr float FixedToFloat(Fixed fixed) noexcept {
  return static_cast<float>(fixed * (1.0 / 65536.0));
}
[[nodiscard]] constexpr double Double(Fixed fixed) noexcept { return fixed * (1.0 / 65536.0); }
[[nodiscard]] inline Fixed RatioToFixed(short a, short b) noexcept {
  return tarn::detail::TruncateToInt<Fixed>(static_cast<double>(a) / b * 65536.0);
}
[[nodiscard]] constexpr Fixed Mul(Fixed a, Fixed b) noexcept {
  return detail::Low32((static_cast<std::int64_t>(a) * b) >> 16);
}
[[nodiscard]] constexpr Fixed Div(Fixed a, Fixed b) noexcept {
  return detail::Low32(tarn::detail::WrapDiv(static_cast<std::int64_t>(a) * 65536, b));
}
[[nodiscard]] constexpr Fract FracMul(Fract a, Fract b) noexcept {
  return detail::Low32((static_cast<std::int64_t>(a) * b) >> 30);
}
[[nodiscard]] constexpr Fract FracDiv(Fract a, Fract b) noexcept {
  return detail::Low32(tarn::detail::WrapDiv(static_cast<std::int64_t>(a) * (1 << 30), b));
}
// The whole part by an arithmetic shift: rounds toward minus infinity.
[[nodiscard]] constexpr int Round(Fixed fixed) noexcept { return fixed >> 16; }

}  // namespace tarn::OS::FixedUtils
