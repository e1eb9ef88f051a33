// Per-sample conversion rules of the buffer converter, and the sample-buffer
// traits that read and write one sample of each format. Private to the
// converter; the vector kernels must produce exactly what these produce.
//
// Canonical values: 8-bit buffers read and write the signed byte value, the
// 16-bit buffer the signed 16-bit value, both 24-bit buffers the
// left-justified 32-bit word x32 (the 24-bit value is x32 >> 8), the float
// buffer the float.
//
// Non-finite float input: a NaN converts exactly as 0.0 would (dither still
// applied), +-infinity clip to full scale like any out-of-range value.
#pragma once

#include <bit>
#include <cstdint>
#include <cstring>

#include "tarn/Audio/Dither.h"
#include "tarn/Audio/SampleFormat.h"

namespace tarn::ConverterRules {

enum class Kind { k8, k16, k24, kFloat };

struct Samp8OffsetBuf {
  static constexpr SampleFormat kFormat = kSamp8Offset;
  using Sample = EightBitOffsetNumber;
  static constexpr Kind kKind = Kind::k8;
  static constexpr int kBytes = 1;
  static int Read(const std::uint8_t* p) noexcept { return static_cast<signed char>(*p ^ 0x80u); }
  static void Write(std::uint8_t* p, int s8) noexcept {
    *p = static_cast<std::uint8_t>(static_cast<unsigned>(s8) ^ 0x80u);
  }
};

struct Samp8Buf {
  static constexpr SampleFormat kFormat = kSamp8;
  using Sample = signed char;
  static constexpr Kind kKind = Kind::k8;
  static constexpr int kBytes = 1;
  static int Read(const std::uint8_t* p) noexcept { return static_cast<signed char>(*p); }
  static void Write(std::uint8_t* p, int s8) noexcept { *p = static_cast<std::uint8_t>(s8); }
};

struct Samp16Buf {
  static constexpr SampleFormat kFormat = kSamp16;
  using Sample = short;
  static constexpr Kind kKind = Kind::k16;
  static constexpr int kBytes = 2;
  static int Read(const std::uint8_t* p) noexcept {
    std::int16_t v;
    std::memcpy(&v, p, 2);
    return v;
  }
  static void Write(std::uint8_t* p, int s16) noexcept {
    const auto v = static_cast<std::int16_t>(s16);
    std::memcpy(p, &v, 2);
  }
};

// Packed 24-bit: three bytes, least significant first.
struct Samp24 {
  std::uint8_t mBytes[3];
};

struct Samp24Buf {
  static constexpr SampleFormat kFormat = kSamp24;
  using Sample = Samp24;
  static constexpr Kind kKind = Kind::k24;
  static constexpr int kBytes = 3;
  static std::int32_t Read(const std::uint8_t* p) noexcept {
    return static_cast<std::int32_t>((std::uint32_t{p[0]} << 8) | (std::uint32_t{p[1]} << 16) |
                                     (std::uint32_t{p[2]} << 24));
  }
  static void Write(std::uint8_t* p, std::int32_t x32) noexcept {
    const auto u = static_cast<std::uint32_t>(x32);
    p[0] = static_cast<std::uint8_t>(u >> 8);
    p[1] = static_cast<std::uint8_t>(u >> 16);
    p[2] = static_cast<std::uint8_t>(u >> 24);
  }
};

struct SampUnpacked24Buf {
  static constexpr SampleFormat kFormat = kSampUnpacked24;
  using Sample = std::int32_t;
  static constexpr Kind kKind = Kind::k24;
  static constexpr int kBytes = 4;
  static std::int32_t Read(const std::uint8_t* p) noexcept {
    std::int32_t v;
    std::memcpy(&v, p, 4);
    return v;
  }
  static void Write(std::uint8_t* p, std::int32_t x32) noexcept { std::memcpy(p, &x32, 4); }
};

struct FloatBuf {
  static constexpr SampleFormat kFormat = kSampFloat32;
  using Sample = float;
  static constexpr Kind kKind = Kind::kFloat;
  static constexpr int kBytes = 4;
  static float Read(const std::uint8_t* p) noexcept {
    float v;
    std::memcpy(&v, p, 4);
    return v;
  }
  static void Write(std::uint8_t* p, float f) noexcept { std::memcpy(p, &f, 4); }
};

// ---- Stateless widening -------------------------------------------------

// 8-bit widening deliberately scales by 32767/128, not 256.
inline int S8ToS16(int s8) noexcept {
  return static_cast<int>(static_cast<float>(s8) * 255.9921875f);
}
inline std::int32_t S8ToX32(int s8) noexcept {
  return static_cast<std::int32_t>(static_cast<float>(s8) * 16777216.0f);
}
inline float S8ToFloat(int s8) noexcept { return static_cast<float>(s8) * 0.0078125f; }
inline std::int32_t S16ToX32(int s16) noexcept {
  return static_cast<std::int32_t>(static_cast<float>(s16) * 65536.0f);
}

// ---- Integer to float through a double with a fixed high word ------------

// A double whose high word holds a magic exponent: placing (v XOR 2^31) in
// the low word and subtracting the magic value yields v scaled exactly,
// without an integer-to-float instruction.
struct DoubleUnion {
  double mValue;

  static constexpr double kMagic16 = 137439019008.0;  // 0x4240000080000000: v / 2^15
  static constexpr double kMagic24 = 2097153.0;       // 0x4140000080000000: v / 2^31

  float Convert(std::int32_t v, double magic) noexcept {
    const std::uint64_t hi = std::bit_cast<std::uint64_t>(mValue) & 0xFFFFFFFF00000000u;
    mValue = std::bit_cast<double>(hi | (static_cast<std::uint32_t>(v) ^ 0x80000000u));
    return static_cast<float>(mValue - magic);
  }
};

// ---- Float to integer ----------------------------------------------------

inline float ScrubNaN(float f) noexcept { return f == f ? f : 0.0f; }

// trunc(clamp(g * scale + (g < 0 ? -half : +half), lo, hi)); g is not NaN.
inline std::int32_t ScaleRoundClip(double g, double scale, double half, double lo,
                                   double hi) noexcept {
  double v = g * scale + (g < 0 ? -half : half);
  if (v < lo) v = lo;
  if (v > hi) v = hi;
  return static_cast<std::int32_t>(v);
}

inline int FloatToS16(float f) noexcept {
  return ScaleRoundClip(ScrubNaN(f), 32768.0, 0.5, -32768.0, 32767.0);
}
inline int FloatToS8(float f) noexcept {
  return ScaleRoundClip(ScrubNaN(f), 128.0, 0.5, -128.0, 127.0);
}
// Clearing the low byte after truncation toward zero moves negative results
// one more 24-bit step down; that asymmetry is intended.
inline std::int32_t FloatToX32(float f) noexcept {
  const std::int32_t t =
      ScaleRoundClip(ScrubNaN(f), 2147483648.0, 128.0, -2147483648.0, 2147483647.0);
  return static_cast<std::int32_t>(static_cast<std::uint32_t>(t) & 0xFFFFFF00u);
}

inline constexpr double kFloatDitherScale = 4.656612873077393e-10;  // 2^-31

inline int FloatToS16Dither(float f, std::int32_t d) noexcept {
  const double g = static_cast<double>(ScrubNaN(f)) + d * kFloatDitherScale;
  return ScaleRoundClip(g, 32768.0, 0.5, -32768.0, 32767.0);
}
// The dither keeps the size of a 16-bit step for 8-bit destinations.
inline int FloatToS8Dither(float f, std::int32_t d) noexcept {
  const double g = static_cast<double>(ScrubNaN(f)) + d * kFloatDitherScale;
  return ScaleRoundClip(g, 128.0, 0.5, -128.0, 127.0);
}

// ---- Integer narrowing ---------------------------------------------------

inline int Clamp(int v, int lo, int hi) noexcept { return v < lo ? lo : (v > hi ? hi : v); }

inline int S16ToS8Dither(int s16, std::int32_t d) noexcept {
  return Clamp(s16 + (d >> 8), -32768, 32767) >> 8;
}
inline int X32ToS16Dither(std::int32_t x32, std::int32_t d) noexcept {
  return Clamp((x32 >> 8) + (d >> 8), -8388608, 8388607) >> 8;
}
inline int X32ToS8Dither(std::int32_t x32, std::int32_t d) noexcept {
  return Clamp((x32 >> 8) + d, -8388608, 8388607) >> 16;
}

// ---- One sample of a pair ------------------------------------------------

template <class>
inline constexpr bool kNoRule = false;

// State types of the converter families.
struct UnusedState {};

template <class Src, class Dst>
inline void ConvertOne(UnusedState&, const std::uint8_t* s, std::uint8_t* d) noexcept {
  constexpr Kind from = Src::kKind, to = Dst::kKind;
  const auto v = Src::Read(s);
  if constexpr (from == Kind::k8 && to == Kind::k8)
    Dst::Write(d, v);
  else if constexpr (from == Kind::k8 && to == Kind::k16)
    Dst::Write(d, S8ToS16(v));
  else if constexpr (from == Kind::k8 && to == Kind::k24)
    Dst::Write(d, S8ToX32(v));
  else if constexpr (from == Kind::k8 && to == Kind::kFloat)
    Dst::Write(d, S8ToFloat(v));
  else if constexpr (from == Kind::k16 && to == Kind::k24)
    Dst::Write(d, S16ToX32(v));
  else if constexpr (from == Kind::kFloat && to == Kind::k24)
    Dst::Write(d, FloatToX32(v));
  else
    static_assert(kNoRule<Src>, "not a widening pair");
}

template <class Src, class Dst>
inline void ConvertOne(DoubleUnion& u, const std::uint8_t* s, std::uint8_t* d) noexcept {
  static_assert(Dst::kKind == Kind::kFloat);
  if constexpr (Src::kKind == Kind::k16)
    Dst::Write(d, u.Convert(Src::Read(s), DoubleUnion::kMagic16));
  else
    Dst::Write(d, u.Convert(Src::Read(s), DoubleUnion::kMagic24));
}

// Narrowing without dither: truncation by shift for integer sources.
template <class Src, class Dst>
inline void ConvertNoDither(const std::uint8_t* s, std::uint8_t* d) noexcept {
  constexpr Kind from = Src::kKind, to = Dst::kKind;
  const auto v = Src::Read(s);
  if constexpr (from == Kind::k16 && to == Kind::k8)
    Dst::Write(d, v >> 8);
  else if constexpr (from == Kind::k24 && to == Kind::k16)
    Dst::Write(d, v >> 16);
  else if constexpr (from == Kind::k24 && to == Kind::k8)
    Dst::Write(d, v >> 24);
  else if constexpr (from == Kind::k24 && to == Kind::k24)
    Dst::Write(d, v);
  else if constexpr (from == Kind::kFloat && to == Kind::k16)
    Dst::Write(d, FloatToS16(v));
  else if constexpr (from == Kind::kFloat && to == Kind::k8)
    Dst::Write(d, FloatToS8(v));
  else
    static_assert(kNoRule<Src>, "not a narrowing pair");
}

template <class Src, class Dst>
inline void ConvertOne(TriangularPDFDither16& dither, const std::uint8_t* s,
                       std::uint8_t* d) noexcept {
  constexpr Kind from = Src::kKind, to = Dst::kKind;
  const auto v = Src::Read(s);
  const std::int32_t r = dither.Next();
  if constexpr (from == Kind::k16 && to == Kind::k8)
    Dst::Write(d, S16ToS8Dither(v, r));
  else if constexpr (from == Kind::k24 && to == Kind::k16)
    Dst::Write(d, X32ToS16Dither(v, r));
  else if constexpr (from == Kind::k24 && to == Kind::k8)
    Dst::Write(d, X32ToS8Dither(v, r));
  else if constexpr (from == Kind::kFloat && to == Kind::k16)
    Dst::Write(d, FloatToS16Dither(v, r));
  else if constexpr (from == Kind::kFloat && to == Kind::k8)
    Dst::Write(d, FloatToS8Dither(v, r));
  else
    static_assert(kNoRule<Src>, "not a dithered pair");
}

}  // namespace tarn::ConverterRules

// Every supported pair as X(source buffer, destination buffer, family), the
// families being W (stateless widening), D (integer to float), N (narrowing,
// never dithered) and NT (narrowing, with or without triangular dither).
#define TARN_CONVERTER_PAIRS(X)            \
  X(Samp8OffsetBuf, Samp8Buf, W)           \
  X(Samp8OffsetBuf, Samp16Buf, W)          \
  X(Samp8OffsetBuf, Samp24Buf, W)          \
  X(Samp8OffsetBuf, SampUnpacked24Buf, W)  \
  X(Samp8OffsetBuf, FloatBuf, W)           \
  X(Samp8Buf, Samp8OffsetBuf, W)           \
  X(Samp8Buf, Samp16Buf, W)                \
  X(Samp8Buf, Samp24Buf, W)                \
  X(Samp8Buf, SampUnpacked24Buf, W)        \
  X(Samp8Buf, FloatBuf, W)                 \
  X(Samp16Buf, Samp8OffsetBuf, NT)         \
  X(Samp16Buf, Samp8Buf, NT)               \
  X(Samp16Buf, Samp24Buf, W)               \
  X(Samp16Buf, SampUnpacked24Buf, W)       \
  X(Samp16Buf, FloatBuf, D)                \
  X(Samp24Buf, Samp8OffsetBuf, NT)         \
  X(Samp24Buf, Samp8Buf, NT)               \
  X(Samp24Buf, Samp16Buf, NT)              \
  X(Samp24Buf, SampUnpacked24Buf, N)       \
  X(Samp24Buf, FloatBuf, D)                \
  X(SampUnpacked24Buf, Samp8OffsetBuf, NT) \
  X(SampUnpacked24Buf, Samp8Buf, NT)       \
  X(SampUnpacked24Buf, Samp16Buf, NT)      \
  X(SampUnpacked24Buf, Samp24Buf, N)       \
  X(SampUnpacked24Buf, FloatBuf, D)        \
  X(FloatBuf, Samp8OffsetBuf, NT)          \
  X(FloatBuf, Samp8Buf, NT)                \
  X(FloatBuf, Samp16Buf, NT)               \
  X(FloatBuf, Samp24Buf, W)                \
  X(FloatBuf, SampUnpacked24Buf, W)
