#pragma once
// The 80-bit extended floating-point field of AIFF "COMM" chunks (the sample
// rate): sign and 15-bit exponent biased by 16383 in the first two bytes,
// then a 64-bit mantissa with an explicit integer bit, all big-endian.
//
// double_to_ieee_80 takes the exponent from a logarithm (log(a) / log(2)),
// not from the bits of the double, and truncates the mantissa into two
// 32-bit halves. For every rate a file is likely to hold (integers, the
// pulled-down rates such as 44100 * 1000 / 1001) this gives the normalised
// bytes other writers produce: 44100 -> 40 0E AC 44 00 00 00 00 00 00. Where
// the logarithm rounds up to the next whole number (values a few units in
// the last place below a power of two) the exponent is one higher and the
// mantissa's top bit clear; the bytes still read back to the same value.
// Should it ever round down, the mantissa's excess over 32 bits is dropped
// (taken modulo 2^32), as the unsigned conversion would on the usual
// processors; no rate meets this. Zero of either sign writes ten zero bytes;
// infinities and NaNs write exponent 0x7FFF with the mantissa's integer bit
// (and for a NaN its top fraction bit) set.
//
// Pure functions, any thread, nothing thrown.

#include <cstdint>

namespace tarn {

// x as ten bytes at out.
void double_to_ieee_80(double x, unsigned char out[10]) noexcept;

// The value of the ten bytes at in; all-zero bytes (and a zero exponent and
// mantissa with the sign clear) read as 0.0. Exponents beyond the double's
// range give infinity or 0; the field's NaNs read as infinity.
[[nodiscard]] double ieee_80_to_double(const unsigned char in[10]) noexcept;

// ieee_80_to_double of the ten bytes at p + offset, truncated towards zero
// to 32 bits; values beyond the 32-bit range (infinity included) saturate.
[[nodiscard]] std::int32_t ieee_80_to_long(const unsigned char* p, int offset) noexcept;

}  // namespace tarn
