// Vector kernels of the buffer converter, written once with the compiler's
// generic vector types and compiled per instruction set. Every lane operation
// is the IEEE or two's-complement operation of the per-sample rule it stands
// for, so results match ConverterRulesImpl.h bit for bit:
// - integer to float: the integer converts exactly (16-bit) or with one
//   round-to-nearest (24-bit words), and the scale is a power of two, so the
//   product equals the exact quotient rounded once, as the rules require;
// - float to integer without dither: exact single-precision steps that
//   provably give the double-precision rule's result (see FloatToIntRounded
//   and FloatToX32; also checked against the rules over all 2^32 floats);
// - float to integer with dither: the rule's double-precision arithmetic,
//   lane by lane, with the clamp done before the truncating conversion;
// - dither: each lane runs the generator from its own starting point, found
//   by jumping the linear congruence ahead, so lane k of a group draws the
//   value the scalar generator would draw for sample k of that group.
#include "tarn/Audio/ConverterKernelsImpl.h"

#include <algorithm>
#include <atomic>
#include <bit>
#include <cstring>
#include <utility>

#include "tarn/Audio/ConverterRulesImpl.h"

#if defined(__x86_64__)
#include <immintrin.h>  // declares the streaming-store builtins for GCC
#endif

#if defined(__GNUC__)
// The 32-byte vector types below never cross a function boundary outside the
// always-inlined kernel bodies, so the ABI note does not apply.
#pragma GCC diagnostic ignored "-Wpsabi"
#endif

#if defined(__x86_64__)
#define TARN_CONVERTER_X86 1
#else
#define TARN_CONVERTER_X86 0
#endif
// GCC cannot keep 32-byte stack slots aligned on 64-bit Windows, so the AVX2
// kernels are built for the other x86-64 targets only; Windows builds use
// the SSE4.1 kernels at best.
#if TARN_CONVERTER_X86 && !defined(_WIN32)
#define TARN_CONVERTER_AVX2 1
#else
#define TARN_CONVERTER_AVX2 0
#endif

namespace tarn::ConverterKernels {
namespace {

using namespace ConverterRules;

template <int V>
struct Lanes;

template <>
struct Lanes<4> {
  typedef std::int32_t I32 __attribute__((vector_size(16)));
  typedef std::uint32_t U32 __attribute__((vector_size(16)));
  typedef float F32 __attribute__((vector_size(16)));
  typedef float F32h __attribute__((vector_size(8)));
  typedef std::int32_t I32h __attribute__((vector_size(8)));
  typedef double F64h __attribute__((vector_size(16)));
  typedef std::uint8_t B __attribute__((vector_size(16)));
  typedef std::uint8_t B1 __attribute__((vector_size(4)));
  typedef std::uint8_t B2 __attribute__((vector_size(8)));
  typedef std::int16_t I16w __attribute__((vector_size(16)));
};

template <>
struct Lanes<8> {
  typedef std::int32_t I32 __attribute__((vector_size(32)));
  typedef std::uint32_t U32 __attribute__((vector_size(32)));
  typedef float F32 __attribute__((vector_size(32)));
  typedef float F32h __attribute__((vector_size(16)));
  typedef std::int32_t I32h __attribute__((vector_size(16)));
  typedef double F64h __attribute__((vector_size(32)));
  typedef std::uint8_t B __attribute__((vector_size(32)));
  typedef std::uint8_t B1 __attribute__((vector_size(8)));
  typedef std::uint8_t B2 __attribute__((vector_size(16)));
  typedef std::int16_t I16w __attribute__((vector_size(32)));
};

#define TARN_INLINE [[gnu::always_inline]] inline

template <class T, class S>
TARN_INLINE T Splat(S s) {
  T v = {};
  return v + s;
}

// Lane-wise mask ? a : b, the mask being the result of a vector comparison;
// compilers turn the common forms into min, max and blend instructions.
template <class T, class M>
TARN_INLINE T Select(const M& mask, const T& a, const T& b) {
  return mask ? a : b;
}

template <class T>
TARN_INLINE T Max(const T& a, const T& b) {
  return a < b ? b : a;
}
template <class T>
TARN_INLINE T Min(const T& a, const T& b) {
  return b < a ? b : a;
}

// Byte shuffles: byte i of the result (N bytes) takes byte Map::At(i) of
// `a`, or zero where At returns a negative index.
template <std::size_t N, class Map, class In, std::size_t... Is>
TARN_INLINE auto ShuffleBytes(const In& a, std::index_sequence<Is...>) {
  constexpr int kZero = sizeof(In);
  const In zero = {};
  return __builtin_shufflevector(a, zero, (Map::At(Is) < 0 ? kZero : Map::At(Is))...);
}
template <std::size_t N, class Map, class In>
TARN_INLINE auto ShuffleBytes(const In& a) {
  return ShuffleBytes<N, Map>(a, std::make_index_sequence<N>());
}

template <int V>
struct ByteMaps {
  static constexpr int kZero = -1;
  // Byte kOff + k to the top byte of word k (then shifted down with its sign).
  template <int kOff>
  struct BytesToTop {
    static constexpr int At(std::size_t i) {
      return i % 4 == 3 ? kOff + static_cast<int>(i / 4) : kZero;
    }
  };
  // 16-bit value k, from byte kOff on, to the top half of word k.
  template <int kOff>
  struct ShortsToTop {
    static constexpr int At(std::size_t i) {
      return i % 4 >= 2 ? kOff + static_cast<int>(2 * (i / 4) + i % 4 - 2) : kZero;
    }
  };
  // Packed sample k to bytes 1..3 of word k, byte 0 zero.
  struct PackedToWords {
    static constexpr int At(std::size_t i) {
      return i % 4 == 0 ? kZero : static_cast<int>(3 * (i / 4) + i % 4 - 1);
    }
  };
  // Bytes 1..3 of every word, packed; the last V bytes are filler.
  struct WordsToPacked {
    static constexpr int At(std::size_t i) {
      return i < 3 * V ? static_cast<int>(4 * (i / 3) + i % 3 + 1) : 0;
    }
  };
  // The low byte of every word; the rest filler.
  struct WordsToBytes {
    static constexpr int At(std::size_t i) { return i < V ? static_cast<int>(4 * i) : 0; }
  };
  // The low half of every word; the rest filler.
  struct WordsToShorts {
    static constexpr int At(std::size_t i) {
      return i < 2 * V ? static_cast<int>(4 * (i / 2) + i % 2) : 0;
    }
  };
};

template <int V>
TARN_INLINE typename Lanes<V>::F32h LowHalf(const typename Lanes<V>::F32& f) {
  if constexpr (V == 4)
    return __builtin_shufflevector(f, f, 0, 1);
  else
    return __builtin_shufflevector(f, f, 0, 1, 2, 3);
}
template <int V>
TARN_INLINE typename Lanes<V>::F32h HighHalf(const typename Lanes<V>::F32& f) {
  if constexpr (V == 4)
    return __builtin_shufflevector(f, f, 2, 3);
  else
    return __builtin_shufflevector(f, f, 4, 5, 6, 7);
}
template <int V>
TARN_INLINE typename Lanes<V>::I32 Join(const typename Lanes<V>::I32h& a,
                                        const typename Lanes<V>::I32h& b) {
  if constexpr (V == 4)
    return __builtin_shufflevector(a, b, 0, 1, 2, 3);
  else
    return __builtin_shufflevector(a, b, 0, 1, 2, 3, 4, 5, 6, 7);
}

// Reads group kG of V samples as canonical lanes (int32 or float). 8- and
// 16-bit samples come from `raw`, 4V bytes loaded once for several groups;
// they are moved to the top of each word and shifted down, which
// sign-extends them. Wider samples are read from `p`, the group's start.
template <int V, class Src, int kG>
TARN_INLINE auto Load(const std::uint8_t* p, const typename Lanes<V>::B& raw) {
  using L = Lanes<V>;
  using M = ByteMaps<V>;
  if constexpr (Src::kBytes == 1) {
    using Map = typename M::template BytesToTop<kG * V>;
    typename L::I32 w = (typename L::I32)ShuffleBytes<4 * V, Map>(raw);
    if constexpr (Src::kFormat == kSamp8Offset) w ^= static_cast<std::int32_t>(0x80000000u);
    return w >> 24;
  } else if constexpr (Src::kBytes == 2) {
    using Map = typename M::template ShortsToTop<kG * 2 * V>;
    return (typename L::I32)ShuffleBytes<4 * V, Map>(raw) >> 16;
  } else if constexpr (Src::kBytes == 3) {
    typename L::B b;
    std::memcpy(&b, p, sizeof b);  // V bytes past the group; the caller leaves room
    return (typename L::I32)ShuffleBytes<4 * V, typename M::PackedToWords>(b);
  } else if constexpr (Src::kKind == Kind::k24) {
    typename L::I32 w;
    std::memcpy(&w, p, sizeof w);
    return w;
  } else {
    typename L::F32 f;
    std::memcpy(&f, p, sizeof f);
    return f;
  }
}

// Stores one full vector to a destination aligned to its size, bypassing
// the caches (for long runs that would only evict the caller's data).
template <class T>
TARN_INLINE void StreamStore(std::uint8_t* p, const T& v) {
#if defined(__clang__)
  __builtin_nontemporal_store(v, reinterpret_cast<T*>(p));
#elif TARN_CONVERTER_X86
  typedef long long Q2 __attribute__((vector_size(16)));
  typedef long long Q4 __attribute__((vector_size(32)));
  if constexpr (sizeof(T) == 16)
    __builtin_ia32_movntdq(reinterpret_cast<Q2*>(p), (Q2)v);
  else
    __builtin_ia32_movntdq256(reinterpret_cast<Q4*>(p), (Q4)v);
#else
  std::memcpy(p, &v, sizeof v);
#endif
}

// Writes V canonical lanes; integer lanes are already in the destination's
// range.
template <int V, class Dst, bool kStream = false, class T>
TARN_INLINE void Store(std::uint8_t* p, const T& v) {
  using L = Lanes<V>;
  using M = ByteMaps<V>;
  if constexpr (Dst::kBytes == 1) {
    typename L::B1 b = ShuffleBytes<V, typename M::WordsToBytes>((typename L::B)v);
    if constexpr (Dst::kFormat == kSamp8Offset) b ^= static_cast<std::uint8_t>(0x80);
    std::memcpy(p, &b, sizeof b);
  } else if constexpr (Dst::kBytes == 2) {
    const typename L::B2 b = ShuffleBytes<2 * V, typename M::WordsToShorts>((typename L::B)v);
    std::memcpy(p, &b, sizeof b);
  } else if constexpr (Dst::kBytes == 3) {
    // Writes V filler bytes past the group, which later groups or the
    // caller's per-sample tail overwrite; the caller leaves room.
    const typename L::B b = ShuffleBytes<4 * V, typename M::WordsToPacked>((typename L::B)v);
    std::memcpy(p, &b, sizeof b);
  } else if constexpr (kStream) {
    StreamStore(p, v);
  } else {
    std::memcpy(p, &v, sizeof v);
  }
}

template <int V>
TARN_INLINE typename Lanes<V>::I32 ClampI(const typename Lanes<V>::I32& x, std::int32_t lo,
                                          std::int32_t hi) {
  using I32 = typename Lanes<V>::I32;
  return Min(Max(x, Splat<I32>(lo)), Splat<I32>(hi));
}

// trunc(clamp(g * scale + (g < 0 ? -half : half), lo, hi)) on half a group,
// in double precision as the dithered float rules need: f + d * 2^-31 is not
// exact in single precision.
template <int V>
TARN_INLINE typename Lanes<V>::I32h RoundClipHalf(const typename Lanes<V>::F64h& g, double scale,
                                                  double half, double lo, double hi) {
  using F64h = typename Lanes<V>::F64h;
  F64h v = g * scale + Select(g < Splat<F64h>(0.0), Splat<F64h>(-half), Splat<F64h>(half));
  v = Select(v < Splat<F64h>(lo), Splat<F64h>(lo), v);
  v = Select(v > Splat<F64h>(hi), Splat<F64h>(hi), v);
  return __builtin_convertvector(v, typename Lanes<V>::I32h);
}

template <int V>
TARN_INLINE typename Lanes<V>::I32 FloatToIntDithered(const typename Lanes<V>::F32& f,
                                                      const typename Lanes<V>::I32& d, double scale,
                                                      double half, double lo, double hi) {
  using L = Lanes<V>;
  const typename L::F32 g = Select(f == f, f, Splat<typename L::F32>(0.0f));  // NaN as 0.0
  typename L::F64h glo = __builtin_convertvector(LowHalf<V>(g), typename L::F64h);
  typename L::F64h ghi = __builtin_convertvector(HighHalf<V>(g), typename L::F64h);
  const typename L::F32 df = __builtin_convertvector(d, typename L::F32);  // |d| < 2^17: exact
  glo += __builtin_convertvector(LowHalf<V>(df), typename L::F64h) * kFloatDitherScale;
  ghi += __builtin_convertvector(HighHalf<V>(df), typename L::F64h) * kFloatDitherScale;
  return Join<V>(RoundClipHalf<V>(glo, scale, half, lo, hi),
                 RoundClipHalf<V>(ghi, scale, half, lo, hi));
}

// The undithered float rules in single precision. x = f * scale is exact
// (a power of two), so the double-precision rule reduces to exact float and
// integer steps:
// - 8/16-bit: trunc(x +- 0.5) clipped is x rounded half away from zero,
//   then saturated, which equals x first limited to magnitude `scale`, then
//   rounded, then limited to scale - 1. For every float of magnitude up to
//   32768, rounding half away from zero equals
//   trunc(x + copysign(0.49999997f, x)) with the sum rounded to float
//   (checked over all such floats), so no double is needed.
// - 24-bit: for x in the 32-bit range trunc(x +- 128) = trunc(x) +- 128 (the
//   sign taken from f < 0, so -0.0 adds +128). Every x at or above 2^31 - 256
//   ends as 0x7FFFFF00 and every x at or below -2^31 + 256 as 0x80000000, so
//   limiting |x| to 2^31 - 256 keeps the integer sum in range.
// NaN lanes are replaced by 0.0 first, as in the per-sample rules.
//
// x = f * scale with NaN lanes replaced by 0.0 and magnitudes limited to
// `limit`. The limit is applied to the bit pattern: for non-negative floats
// (infinity included) the unsigned order of the bits is the numeric order,
// and an unsigned minimum is cheaper than a float blend.
template <int V, std::uint32_t kLimitBits>
TARN_INLINE typename Lanes<V>::F32 ScaledLimited(const typename Lanes<V>::F32& f, float scale,
                                                 typename Lanes<V>::U32& sign) {
  using L = Lanes<V>;
  using F32 = typename L::F32;
  using U32 = typename L::U32;
  const U32 bits = (U32)(Select(f == f, f, Splat<F32>(0.0f)) * scale);
  sign = bits & 0x80000000u;
  return (F32)(Min(bits ^ sign, Splat<U32>(kLimitBits)) | sign);
}

template <int V, int kScale>
TARN_INLINE typename Lanes<V>::I32 FloatToIntRounded(const typename Lanes<V>::F32& f) {
  using L = Lanes<V>;
  using I32 = typename L::I32;
  constexpr float kScaleF = static_cast<float>(kScale);
  constexpr std::uint32_t kHalfBits = std::bit_cast<std::uint32_t>(0.49999997f);
  typename L::U32 sign;
  const typename L::F32 x =
      ScaledLimited<V, std::bit_cast<std::uint32_t>(kScaleF)>(f, kScaleF, sign);
  const I32 t = __builtin_convertvector(x + (typename L::F32)(sign | kHalfBits), I32);
  return Min(t, Splat<I32>(kScale - 1));
}

template <int V>
TARN_INLINE typename Lanes<V>::I32 FloatToX32(const typename Lanes<V>::F32& f) {
  using L = Lanes<V>;
  using F32 = typename L::F32;
  using I32 = typename L::I32;
  typename L::U32 sign;
  const F32 x =
      ScaledLimited<V, std::bit_cast<std::uint32_t>(2147483392.0f)>(f, 2147483648.0f, sign);
  const I32 negative = (I32)(x < Splat<F32>(0.0f));
  const I32 t =
      __builtin_convertvector(x, I32) + Select(negative, Splat<I32>(-128), Splat<I32>(128));
  return t & static_cast<std::int32_t>(0xFFFFFF00u);
}

// Generator jump: j steps map state s to a * s + c.
struct Jump {
  std::uint32_t a = 1, c = 0;
};
constexpr Jump JumpOf(int steps) {
  Jump j;
  for (int k = 0; k < steps; ++k) {
    j.a *= 1664525u;
    j.c = j.c * 1664525u + 1013904223u;
  }
  return j;
}

// Groups of V samples that one 4V-byte vector of a format holds.
template <class Buf>
inline constexpr int kPerVector = Buf::kBytes == 1   ? 4
                                  : Buf::kBytes == 2 ? 2
                                                     : 1;

// Converts group kG of a block (V samples) and returns the destination lanes.
template <int V, class Src, class Dst, bool kDither, int kG>
TARN_INLINE auto Group(const std::uint8_t* s, const typename Lanes<V>::B* raw,
                       typename Lanes<V>::U32& s0) {
  using L = Lanes<V>;
  using I32 = typename L::I32;
  using U32 = typename L::U32;
  using F32 = typename L::F32;
  constexpr Kind from = Src::kKind, to = Dst::kKind;
  constexpr Jump kOne = JumpOf(1), kGroup = JumpOf(2 * V);
  constexpr int kPer = kPerVector<Src>;
  const auto x = Load<V, Src, kG % kPer>(s + kG * V * Src::kBytes, raw[kG / kPer]);
  I32 r = {};
  if constexpr (kDither) {
    const U32 s1 = s0 * kOne.a + kOne.c;
    r = ((I32)s1 >> 16) + ((I32)s0 >> 16);
    s0 = s0 * kGroup.a + kGroup.c;
  }
  if constexpr (to == Kind::kFloat) {
    F32 y = __builtin_convertvector(x, F32);
    if constexpr (from == Kind::k8)
      y *= 0.0078125f;
    else if constexpr (from == Kind::k16)
      y *= 1.0f / 32768.0f;
    else
      y *= 1.0f / 2147483648.0f;
    return y;
  } else if constexpr (from == Kind::kFloat) {
    if constexpr (to == Kind::k24) {
      return FloatToX32<V>(x);
    } else if constexpr (!kDither) {
      if constexpr (to == Kind::k16)
        return FloatToIntRounded<V, 32768>(x);
      else
        return FloatToIntRounded<V, 128>(x);
    } else if constexpr (to == Kind::k16) {
      return FloatToIntDithered<V>(x, r, 32768.0, 0.5, -32768.0, 32767.0);
    } else {
      return FloatToIntDithered<V>(x, r, 128.0, 0.5, -128.0, 127.0);
    }
  } else if constexpr (from == Kind::k8) {
    if constexpr (to == Kind::k8) {
      return x;
    } else {
      const float scale = to == Kind::k16 ? 255.9921875f : 16777216.0f;
      return __builtin_convertvector(__builtin_convertvector(x, F32) * scale, I32);
    }
  } else if constexpr (from == Kind::k16 && to == Kind::k24) {
    return __builtin_convertvector(__builtin_convertvector(x, F32) * 65536.0f, I32);
  } else if constexpr (from == Kind::k16) {  // to 8-bit
    if constexpr (kDither)
      return ClampI<V>(x + (r >> 8), -32768, 32767) >> 8;
    else
      return x >> 8;
  } else if constexpr (to == Kind::k24) {
    return x;
  } else if constexpr (to == Kind::k16) {
    if constexpr (kDither)
      return ClampI<V>((x >> 8) + (r >> 8), -8388608, 8388607) >> 8;
    else
      return x >> 16;
  } else {  // 24-bit to 8-bit
    if constexpr (kDither)
      return ClampI<V>((x >> 8) + r, -8388608, 8388607) >> 16;
    else
      return x >> 24;
  }
}

template <class T, std::size_t... Is>
TARN_INLINE auto Concat(const T& a, const T& b, std::index_sequence<Is...>) {
  return __builtin_shufflevector(a, b, static_cast<int>(Is)...);
}
template <class T>
TARN_INLINE auto Concat(const T& a, const T& b) {
  return Concat(a, b, std::make_index_sequence<2 * sizeof(T) / sizeof(a[0])>());
}

// A block of kGroups groups. Two groups for a 16-bit destination are
// narrowed together and stored at once (one pack instead of two shuffles);
// otherwise each group is stored by itself.
template <int V, class Src, class Dst, bool kDither, bool kStream, int... kGs>
TARN_INLINE void Block(const std::uint8_t* s, std::uint8_t* d, typename Lanes<V>::U32& s0,
                       std::integer_sequence<int, kGs...>) {
  using L = Lanes<V>;
  constexpr int kGroups = sizeof...(kGs);
  typename L::B raw[kGroups] = {};
  if constexpr (Src::kBytes <= 2) {
    for (int k = 0; k < kGroups / kPerVector<Src>; ++k)
      std::memcpy(&raw[k], s + k * sizeof raw[0], sizeof raw[0]);
  }
  if constexpr (Dst::kBytes == 2 && kGroups == 2) {
    const typename L::I32 r[kGroups] = {Group<V, Src, Dst, kDither, kGs>(s, raw, s0)...};
    const auto b = __builtin_convertvector(Concat(r[0], r[1]), typename L::I16w);
    if constexpr (kStream)
      StreamStore(d, b);
    else
      std::memcpy(d, &b, sizeof b);
  } else {
    (Store<V, Dst, kStream>(d + kGs * V * Dst::kBytes,
                            Group<V, Src, Dst, kDither, kGs>(s, raw, s0)),
     ...);
  }
}

// How far ahead of the block being converted the source is fetched on runs
// far larger than the caches. The hardware prefetcher alone leaves the
// float-source kernels, whose arithmetic takes longest, a third slower from
// memory than with it.
inline constexpr std::ptrdiff_t kAhead = 2048;

// Converts whole blocks: four groups for 8-bit sources and two for 16-bit
// sources or destinations (one 4V-byte load or store each), one otherwise.
// kLarge runs fetch the source ahead; kStream runs also stream their stores.
template <int V, class Src, class Dst, bool kDither, bool kLarge, bool kStream>
TARN_INLINE int Blocks(const std::uint8_t* s, std::uint8_t* d, int n, std::uint32_t* state) {
  using U32 = typename Lanes<V>::U32;
  constexpr int kGroups = std::max(kPerVector<Src>, Dst::kBytes == 2 ? 2 : 1);
  constexpr bool kPacked = Src::kBytes == 3 || Dst::kBytes == 3;
  constexpr int kStep = kGroups * V;
  // Packed loads and stores touch V bytes past the block.
  const int last = n - kStep - (kPacked ? V : 0);

  U32 s0 = {};
  if constexpr (kDither) {
    for (int k = 0; k < V; ++k) {
      const Jump j = JumpOf(2 * k);
      s0[k] = j.a * *state + j.c;
    }
  }
  int i = 0;
  for (; i <= last; i += kStep) {
    if constexpr (kLarge)
      __builtin_prefetch(s + static_cast<std::ptrdiff_t>(i) * Src::kBytes + kAhead);
    Block<V, Src, Dst, kDither, kStream>(s + static_cast<std::ptrdiff_t>(i) * Src::kBytes,
                                         d + static_cast<std::ptrdiff_t>(i) * Dst::kBytes, s0,
                                         std::make_integer_sequence<int, kGroups>());
  }
  if constexpr (kDither) *state = s0[0];
#if TARN_CONVERTER_X86
  if constexpr (kStream) __builtin_ia32_sfence();
#endif
  return i;
}

// Streaming stores apply where every store is one whole vector at a
// vector-aligned offset: 4-byte destinations and paired 16-bit groups.
template <int V, class Src, class Dst>
inline constexpr bool kCanStream = TARN_CONVERTER_X86 && (Dst::kBytes == 4 || Dst::kBytes == 2) &&
                                   !(Dst::kBytes == 2 && kPerVector<Src> == 4);

template <int V, class Src, class Dst, bool kDither>
TARN_INLINE int Body(const std::uint8_t* s, std::uint8_t* d, int n, std::uint32_t* state,
                     bool stream) {
  if (stream) {
    if constexpr (kCanStream<V, Src, Dst>) {
      if (reinterpret_cast<std::uintptr_t>(d) % (4 * V) == 0)
        return Blocks<V, Src, Dst, kDither, true, true>(s, d, n, state);
    }
    return Blocks<V, Src, Dst, kDither, true, false>(s, d, n, state);
  }
  return Blocks<V, Src, Dst, kDither, false, false>(s, d, n, state);
}

template <class Src, class Dst, bool kDither>
int RunBaseline(const std::uint8_t* s, std::uint8_t* d, int n, std::uint32_t* state,
                bool stream) noexcept {
  return Body<4, Src, Dst, kDither>(s, d, n, state, stream);
}

#if TARN_CONVERTER_X86
// SSE4.1 brings the byte shuffle that 8-bit and packed 24-bit data need.
template <class Src, class Dst, bool kDither>
__attribute__((target("sse4.1"))) int RunSse41(const std::uint8_t* s, std::uint8_t* d, int n,
                                               std::uint32_t* state, bool stream) noexcept {
  return Body<4, Src, Dst, kDither>(s, d, n, state, stream);
}

bool CpuHasSse41() noexcept {
  static const bool has = [] {
    __builtin_cpu_init();
    return __builtin_cpu_supports("sse4.1") != 0;
  }();
  return has;
}
#endif

#if TARN_CONVERTER_AVX2
template <class Src, class Dst, bool kDither>
__attribute__((target("avx2"))) int RunAvx2(const std::uint8_t* s, std::uint8_t* d, int n,
                                            std::uint32_t* state, bool stream) noexcept {
  return Body<8, Src, Dst, kDither>(s, d, n, state, stream);
}

bool CpuHasAvx2() noexcept {
  static const bool has = [] {
    __builtin_cpu_init();
    return __builtin_cpu_supports("avx2") != 0;
  }();
  return has;
}
#endif

std::atomic<int> gLevel{static_cast<int>(KernelLevel::kBest)};

}  // namespace

void SetKernelLevel(KernelLevel level) noexcept {
  gLevel.store(static_cast<int>(level), std::memory_order_relaxed);
}

const char* InstructionSet() noexcept {
  const int level = gLevel.load(std::memory_order_relaxed);
  if (level == static_cast<int>(KernelLevel::kScalar)) return "scalar";
#if TARN_CONVERTER_AVX2
  if (level >= static_cast<int>(KernelLevel::kBest) && CpuHasAvx2()) return "avx2";
#endif
#if TARN_CONVERTER_X86
  if (level >= static_cast<int>(KernelLevel::kExtended) && CpuHasSse41()) return "sse4.1";
#endif
#if defined(__x86_64__)
  return "sse2";
#elif defined(__aarch64__)
  return "neon";
#else
  return "generic";
#endif
}

// The baseline kernel, or null where the per-sample path is faster: SSE2
// has no byte shuffle, so on x86-64 only pairs of 4-byte formats use it.
template <class Src, class Dst, bool kDither>
Kernel Baseline() noexcept {
  if constexpr (TARN_CONVERTER_X86 && (Src::kBytes != 4 || Dst::kBytes != 4)) {
    return nullptr;
  } else {
    return &RunBaseline<Src, Dst, kDither>;
  }
}

template <class Src, class Dst, bool kDither>
Kernel Get() noexcept {
  const int level = gLevel.load(std::memory_order_relaxed);
  if (level == static_cast<int>(KernelLevel::kScalar)) return nullptr;
#if TARN_CONVERTER_AVX2
  if (level >= static_cast<int>(KernelLevel::kBest) && CpuHasAvx2()) {
    return &RunAvx2<Src, Dst, kDither>;
  }
#endif
#if TARN_CONVERTER_X86
  if (level >= static_cast<int>(KernelLevel::kExtended) && CpuHasSse41()) {
    return &RunSse41<Src, Dst, kDither>;
  }
#endif
  return Baseline<Src, Dst, kDither>();
}

#define TARN_INSTANTIATE_W(S, D) template Kernel Get<S, D, false>() noexcept;
#define TARN_INSTANTIATE_D(S, D) template Kernel Get<S, D, false>() noexcept;
#define TARN_INSTANTIATE_N(S, D) template Kernel Get<S, D, false>() noexcept;
#define TARN_INSTANTIATE_NT(S, D)              \
  template Kernel Get<S, D, false>() noexcept; \
  template Kernel Get<S, D, true>() noexcept;
#define TARN_INSTANTIATE(S, D, family) TARN_INSTANTIATE_##family(S, D)
TARN_CONVERTER_PAIRS(TARN_INSTANTIATE)

}  // namespace tarn::ConverterKernels
