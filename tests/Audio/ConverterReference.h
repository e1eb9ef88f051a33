// An independent model of the sample converter for the tests: the conversion
// rules written out sample by sample in the plainest form, with integer
// arithmetic where the rule allows, so that it shares no code with the
// library's rules or kernels.
#pragma once

#include <cmath>
#include <cstdint>
#include <cstring>
#include <vector>

namespace convref {

// The generator: two congruential steps per value, each step's high half
// read as a signed 16-bit number.
struct Generator {
  std::uint32_t state;
  std::int32_t Next() {
    const std::uint32_t s0 = state;
    const auto s1 =
        static_cast<std::uint32_t>((std::uint64_t{s0} * 1664525u + 1013904223u) & 0xFFFFFFFFu);
    state = static_cast<std::uint32_t>((std::uint64_t{s1} * 1664525u + 1013904223u) & 0xFFFFFFFFu);
    auto high = [](std::uint32_t s) {
      const auto h = static_cast<std::int32_t>(s >> 16);
      return h >= 32768 ? h - 65536 : h;
    };
    return high(s1) + high(s0);
  }
};

inline int BytesOf(int format) {
  static const int kBytes[] = {1, 1, 2, 3, 4, 4};
  return kBytes[format];
}

inline bool IsInt8(int f) { return f == 0 || f == 1; }
inline bool Is24(int f) { return f == 3 || f == 4; }

// Floor division by a power of two, as arithmetic right shifts behave.
inline std::int64_t FloorDiv(std::int64_t v, std::int64_t d) {
  std::int64_t q = v / d;
  if (v % d != 0 && v < 0) --q;
  return q;
}

inline std::int64_t ClampI(std::int64_t v, std::int64_t lo, std::int64_t hi) {
  return v < lo ? lo : (v > hi ? hi : v);
}

// The rule for float to integer: scale, add half a step away from zero,
// clip, truncate. NaN reads as 0.0.
inline std::int64_t RoundFloat(double g, double scale, double half, double lo, double hi) {
  double v = g * scale + (g < 0 ? -half : half);
  v = std::fmin(std::fmax(v, lo), hi);
  return static_cast<std::int64_t>(std::trunc(v));
}

// Integer reading of one source sample: 8-bit -> s8, 16 -> s16, 24 -> x32.
inline std::int64_t ReadInt(int f, const std::uint8_t* p) {
  switch (f) {
    case 0:
      return static_cast<std::int64_t>(p[0]) - 128;
    case 1:
      return p[0] >= 128 ? p[0] - 256 : p[0];
    case 2: {
      const int v = p[0] | (p[1] << 8);
      return v >= 32768 ? v - 65536 : v;
    }
    case 3: {
      const std::int64_t v =
          (std::int64_t{p[0]} << 8) | (std::int64_t{p[1]} << 16) | (std::int64_t{p[2]} << 24);
      return v >= 0x80000000LL ? v - 0x100000000LL : v;
    }
    default: {
      const std::int64_t v = std::int64_t{p[0]} | (std::int64_t{p[1]} << 8) |
                             (std::int64_t{p[2]} << 16) | (std::int64_t{p[3]} << 24);
      return v >= 0x80000000LL ? v - 0x100000000LL : v;
    }
  }
}

inline float ReadFloat(const std::uint8_t* p) {
  float f;
  std::memcpy(&f, p, 4);
  return f;
}

// Writes an integer in the destination's canonical scale (s8, s16, x32).
inline void WriteInt(int f, std::uint8_t* p, std::int64_t v) {
  const auto u = static_cast<std::uint64_t>(v);
  switch (f) {
    case 0:
      p[0] = static_cast<std::uint8_t>((v + 128) & 0xFF);
      break;
    case 1:
      p[0] = static_cast<std::uint8_t>(u & 0xFF);
      break;
    case 2:
      p[0] = u & 0xFF;
      p[1] = (u >> 8) & 0xFF;
      break;
    case 3:
      p[0] = (u >> 8) & 0xFF;
      p[1] = (u >> 16) & 0xFF;
      p[2] = (u >> 24) & 0xFF;
      break;
    default:
      for (int k = 0; k < 4; ++k) p[k] = (u >> (8 * k)) & 0xFF;
      break;
  }
}

inline void WriteFloat(std::uint8_t* p, float f) { std::memcpy(p, &f, 4); }

// One sample from format `from` to `to`; `gen` is null for no dither.
inline void ConvertSample(int from, int to, Generator* gen, const std::uint8_t* s,
                          std::uint8_t* d) {
  if (from == 5) {
    float f = ReadFloat(s);
    if (std::isnan(f)) f = 0.0f;
    if (Is24(to)) {
      const std::int64_t t = RoundFloat(f, 2147483648.0, 128.0, -2147483648.0, 2147483647.0);
      WriteInt(to, d, FloorDiv(t, 256) * 256);  // clearing the low byte floors to 256
      return;
    }
    double g = f;
    if (gen) g += std::ldexp(static_cast<double>(gen->Next()), -31);
    if (to == 2)
      WriteInt(to, d, RoundFloat(g, 32768.0, 0.5, -32768.0, 32767.0));
    else
      WriteInt(to, d, RoundFloat(g, 128.0, 0.5, -128.0, 127.0));
    return;
  }
  const std::int64_t v = ReadInt(from, s);
  if (to == 5) {
    if (IsInt8(from))
      WriteFloat(d, static_cast<float>(v) / 128.0f);
    else if (from == 2)
      WriteFloat(d, static_cast<float>(v) / 32768.0f);
    else
      WriteFloat(d, static_cast<float>(static_cast<double>(v) / 2147483648.0));
    return;
  }
  if (IsInt8(from)) {
    if (IsInt8(to))
      WriteInt(to, d, v);
    else if (to == 2)
      WriteInt(to, d, v * 32767 / 128);  // C division truncates toward zero
    else
      WriteInt(to, d, v * 16777216);
    return;
  }
  if (from == 2) {
    if (Is24(to)) {
      WriteInt(to, d, v * 65536);
      return;
    }
    std::int64_t r = v;
    if (gen) r = ClampI(v + FloorDiv(gen->Next(), 256), -32768, 32767);
    WriteInt(to, d, FloorDiv(r, 256));
    return;
  }
  // 24-bit sources
  if (Is24(to)) {
    WriteInt(to, d, v);
    return;
  }
  const std::int64_t s24 = FloorDiv(v, 256);
  if (to == 2) {
    if (gen)
      WriteInt(to, d, FloorDiv(ClampI(s24 + FloorDiv(gen->Next(), 256), -8388608, 8388607), 256));
    else
      WriteInt(to, d, FloorDiv(v, 65536));
  } else {
    if (gen)
      WriteInt(to, d, FloorDiv(ClampI(s24 + gen->Next(), -8388608, 8388607), 65536));
    else
      WriteInt(to, d, FloorDiv(v, 16777216));
  }
}

inline std::vector<std::uint8_t> ConvertRun(int from, int to, Generator* gen,
                                            const std::vector<std::uint8_t>& src, int count) {
  std::vector<std::uint8_t> out(static_cast<std::size_t>(count) * BytesOf(to));
  for (int i = 0; i < count; ++i) {
    ConvertSample(from, to, gen, src.data() + static_cast<std::size_t>(i) * BytesOf(from),
                  out.data() + static_cast<std::size_t>(i) * BytesOf(to));
  }
  return out;
}

}  // namespace convref
