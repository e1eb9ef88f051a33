// Helpers of the audio tests, chiefly an independent model of the sample
// converter, written sample by sample with integer arithmetic where the rule
// allows and sharing no code with the library.
#pragma once

#include <gtest/gtest.h>

#include <algorithm>
#include <bit>
#include <climits>
#include <cmath>
#include <cstdint>
#include <cstring>
#include <limits>
#include <random>
#include <tuple>
#include <vector>

#include "TestSupport.h"
#include "tarn/Audio/BufConverter.h"
#include "tarn/Audio/ConverterKernelsImpl.h"
#include "tarn/Audio/Dither.h"
#include "tarn/Errors/TarnError.h"
#include "tarn/Time/TarnSystemTime.h"

namespace convref {

using Bytes = std::vector<std::uint8_t>;

// Two congruential steps per value, each step's high half read as signed.
struct Generator {
  std::uint32_t state;
  std::int32_t Next() {
    const std::uint32_t s0 = state, s1 = s0 * 1664525u + 1013904223u;
    state = s1 * 1664525u + 1013904223u;
    return static_cast<std::int16_t>(s1 >> 16) + static_cast<std::int16_t>(s0 >> 16);
  }
};

inline int Width(int f) { return f == 3 ? 3 : f >= 4 ? 4 : f == 2 ? 2 : 1; }
// Canonical integer width: s8, s16, or 24 bits held in the top of 32.
inline int Bits(int f) { return f <= 1 ? 8 : f == 2 ? 16 : 32; }
inline bool Ditherable(int from, int to) { return Bits(to) < Bits(from); }

inline std::int64_t ReadInt(int f, const std::uint8_t* p) {
  if (f <= 1) return f == 0 ? p[0] - 128 : static_cast<std::int8_t>(p[0]);
  std::uint32_t u = 0;
  for (int k = Width(f) - 1; k >= 0; --k) u = u << 8 | p[k];
  return f == 2 ? static_cast<std::int16_t>(u) : static_cast<std::int32_t>(u << (f == 3 ? 8 : 0));
}

inline void WriteInt(int f, std::uint8_t* p, std::int64_t v) {
  v = f == 0 ? v + 128 : f == 3 ? v >> 8 : v;
  for (int k = 0; k < Width(f); ++k) p[k] = static_cast<std::uint8_t>(v >> (8 * k));
}

// Float to integer: scale, add half a step away from zero, clip, truncate.
inline std::int64_t Round(double g, double scale, double half) {
  const double v = g * scale + (g < 0 ? -half : half);
  return static_cast<std::int64_t>(std::trunc(std::fmin(std::fmax(v, -scale), scale - 1)));
}

// One sample from format `from` to `to`; `gen` is null for no dither.
inline void ConvertSample(int from, int to, Generator* gen, const std::uint8_t* s,
                          std::uint8_t* d) {
  const int tb = Bits(to), fb = Bits(from);
  if (from == 5) {
    float f;
    std::memcpy(&f, s, 4);
    if (std::isnan(f)) f = 0.0f;
    if (tb == 32) return WriteInt(to, d, Round(f, 2147483648.0, 128.0) >> 8 << 8);
    const double g = f + (gen ? std::ldexp(gen->Next(), -31) : 0.0);
    return WriteInt(to, d, Round(g, tb == 16 ? 32768.0 : 128.0, 0.5));
  }
  const std::int64_t v = ReadInt(from, s);
  if (to == 5) {
    const auto out = static_cast<float>(std::ldexp(static_cast<double>(v), 1 - fb));
    std::memcpy(d, &out, 4);
  } else if (tb == 16 && fb == 8) {
    WriteInt(to, d, v * 32767 / 128);  // C division truncates toward zero
  } else if (tb >= fb || !gen) {
    WriteInt(to, d, tb >= fb ? v << (tb - fb) : v >> (fb - tb));
  } else {  // dither at 16 or 24 bits, then drop the low bits
    const int w = fb == 16 ? 16 : 24, shift = w - tb;
    const std::int64_t lim = std::int64_t{1} << (w - 1);
    const std::int64_t x = (v >> (fb - w)) + (gen->Next() >> (16 - shift));
    WriteInt(to, d, std::clamp(x, -lim, lim - 1) >> shift);
  }
}

inline Bytes ConvertRun(int from, int to, Generator* gen, const Bytes& src) {
  Bytes out(src.size() / Width(from) * Width(to));
  for (std::size_t i = 0; i < src.size() / Width(from); ++i)
    ConvertSample(from, to, gen, &src[i * Width(from)], &out[i * Width(to)]);
  return out;
}

inline std::unique_ptr<tarn::BufConverter> New(int from, int to, int dither) {
  return tarn::BufConverter::Create({.mSampleFormat = tarn::SampleFormat(from)},
                                    {.mSampleFormat = tarn::SampleFormat(to)},
                                    tarn::DitherType(dither));
}

// A converter and its dither seed, learnt from the event time before and after
// creation; retried until both fall in the same sixtieth of a second.
struct Made {
  std::unique_ptr<tarn::BufConverter> conv;
  Generator gen;
  Generator* Gen(int dither) { return dither ? &gen : nullptr; }
};
inline Made Create(int from, int to, int dither) {
  const auto seed = [] {
    return tarn::TriangularPDFDither16::SeedForEventTime(
        tarn::TarnSystemTime::GetCurrentEventTime());
  };
  for (;;) {
    const std::uint32_t before = seed();
    auto conv = New(from, to, dither);
    if (seed() == before) return {std::move(conv), {before}};
  }
}

inline void PushFloat(Bytes& b, double x) {
  const auto u = std::bit_cast<std::uint32_t>(static_cast<float>(x));
  for (int k = 0; k < 4; ++k) b.push_back(static_cast<std::uint8_t>(u >> (8 * k)));
}

// Floats on or next to every rounding and clipping boundary, plus non-finite and extreme ones.
inline Bytes BoundaryFloats() {
  using L = std::numeric_limits<float>;
  Bytes b;
  for (float x : {0.0f, 1e30f, 3.4e38f, L::infinity(), L::quiet_NaN(), L::signaling_NaN(),
                  L::denorm_min(), L::min(), L::max()})
    for (float s : {x, -x}) PushFloat(b, s);
  for (int shift : {7, 15, 23, 31}) {
    const double step = std::ldexp(1.0, -shift), half = shift == 31 ? 128 * step : step / 2;
    for (double k : {0.0, 1.0, 2.0, 3.0, 100.0, 1 / step - 2, 1 / step - 1, 1 / step, 1 / step + 1})
      for (double x : {k * step, k * step + half, k * step - half, k * step + step - half})
        for (float f : {float(x), float(-x)})
          for (float g : {-9.0f, f, 9.0f}) PushFloat(b, std::nextafter(f, g));
  }
  return b;
}

// Random samples; floats are any bit pattern, or an integer or a tie on an
// 8-, 16-, 24- or 32-bit grid, possibly one step off.
inline Bytes RandomSamples(std::mt19937_64& rng, int from, std::size_t count) {
  Bytes b;
  for (std::size_t i = 0; from != 5 && i < count * Width(from); ++i)
    b.push_back(std::uint8_t(rng()));
  for (std::size_t i = 0; from == 5 && i < count; ++i) {
    const std::uint64_t r = rng();
    const int shift = 7 + 8 * int(r & 3);
    const double half = shift == 31 ? 128.0 : 0.5;
    const double k =
        double(std::int64_t(r >> 8) % (std::int64_t{2} << shift)) + ((r & 4) ? half : 0.0);
    const auto f = static_cast<float>(std::ldexp(k, -shift) - 1.0);
    const float nudged = std::nextafter(f, (r & 8) ? 9.0f : (r & 16) ? -9.0f : f);
    PushFloat(b, (r & 32) ? std::bit_cast<float>(std::uint32_t(r >> 32)) : nudged);
  }
  return b;
}

// Converts `src` at the given offsets from 64-byte boundaries and expects the
// model's bytes, with the guard bytes around the destination untouched.
inline void Check(tarn::BufConverter& conv, int from, int to, Generator* gen, const Bytes& src,
                  int srcOff = 0, int dstOff = 0) {
  const Bytes want = ConvertRun(from, to, gen, src);
  Bytes in(src.size() + 64 + srcOff), out(want.size() + 80 + dstOff, 0x5A);
  auto at = [](Bytes& b, int off) {
    return b.data() + (64 - reinterpret_cast<std::uintptr_t>(b.data()) % 64) % 64 + off;
  };
  std::copy(src.begin(), src.end(), at(in, srcOff));
  const std::ptrdiff_t d = at(out, dstOff) - out.data();
  conv.Convert(at(in, srcOff), out.data() + d, static_cast<int>(src.size() / Width(from)));
  Bytes expect(out.size(), 0x5A);
  std::copy(want.begin(), want.end(), expect.begin() + d);
  EXPECT_TRUE(out == expect) << from << "->" << to << (gen ? " dithered" : "") << ", offsets "
                             << srcOff << "/" << dstOff << ", count " << want.size() / Width(to);
}

}  // namespace convref
