#include "tarn/Audio/SoundFileFormats/IEEEExtended.h"

#include <cmath>
#include <limits>

namespace tarn {
namespace {

constexpr double kTwo32 = 4294967296.0;

// The unsigned 32-bit truncation of a non-negative value, modulo 2^32 when
// it does not fit.
std::uint32_t TruncateToU32(double v) noexcept {
  v = std::trunc(v);
  if (v >= kTwo32) v = std::fmod(v, kTwo32);
  return static_cast<std::uint32_t>(v);
}

void PutU32(unsigned char* out, std::uint32_t v) noexcept {
  out[0] = static_cast<unsigned char>(v >> 24);
  out[1] = static_cast<unsigned char>(v >> 16);
  out[2] = static_cast<unsigned char>(v >> 8);
  out[3] = static_cast<unsigned char>(v);
}

std::uint32_t GetU32(const unsigned char* in) noexcept {
  return std::uint32_t{in[0]} << 24 | std::uint32_t{in[1]} << 16 | std::uint32_t{in[2]} << 8 |
         in[3];
}

}  // namespace

void double_to_ieee_80(double x, unsigned char out[10]) noexcept {
  for (int i = 0; i < 10; ++i) out[i] = 0;
  if (x == 0.0) return;
  const bool negative = std::signbit(x);
  std::uint16_t e = 0x7FFF;
  std::uint32_t hi = 0x80000000u;
  std::uint32_t lo = 0;
  if (std::isnan(x)) {
    hi = 0xC0000000u;
  } else if (!std::isinf(x)) {
    const double a = std::fabs(x);
    // The exponent as the logarithm gives it; whole values stay in 16 bits
    // for every finite double (15309 .. 17406).
    e = static_cast<std::uint16_t>(static_cast<std::int32_t>(std::log(a) / std::log(2.0) + 16383));
    const double m = std::ldexp(a, 16414 - static_cast<int>(e));
    hi = TruncateToU32(m);
    lo = TruncateToU32((m - std::trunc(m)) * kTwo32);
  }
  out[0] = static_cast<unsigned char>((e >> 8) + (negative ? 0x80 : 0));
  out[1] = static_cast<unsigned char>(e);
  PutU32(out + 2, hi);
  PutU32(out + 6, lo);
}

double ieee_80_to_double(const unsigned char in[10]) noexcept {
  const auto s = static_cast<std::int16_t>(static_cast<std::uint16_t>(in[0] << 8 | in[1]));
  const std::uint32_t hi = GetU32(in + 2);
  const std::uint32_t lo = GetU32(in + 6);
  const int exponent = s & 0x7FFF;
  if (hi == 0 && lo == 0 && exponent == 0 && s >= 0) return 0.0;
  // Each half converts exactly; the sum rounds once, to nearest.
  const double mantissa =
      std::ldexp(static_cast<double>(lo), -63) + std::ldexp(static_cast<double>(hi), -31);
  const double value = std::ldexp(mantissa, exponent - 16383);
  return s < 0 ? -value : value;
}

std::int32_t ieee_80_to_long(const unsigned char* p, int offset) noexcept {
  const double v = ieee_80_to_double(p + offset);
  if (std::isnan(v)) return 0;
  if (v >= 2147483647.0) return std::numeric_limits<std::int32_t>::max();
  if (v <= -2147483648.0) return std::numeric_limits<std::int32_t>::min();
  return static_cast<std::int32_t>(v);
}

}  // namespace tarn
