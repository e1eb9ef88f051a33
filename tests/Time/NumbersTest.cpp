// SampleCount, Tick, TockFrac, AddPin and FixedUtils against wide references,
// and the stream forms of the time types.
#include <gtest/gtest.h>

#include <cmath>
#include <cstdint>
#include <limits>
#include <vector>

#include "tarn/Errors/TarnError.h"
#include "tarn/Streams/CHandleStream.h"
#include "tarn/Time/AddPin.h"
#include "tarn/Time/FixedUtils.h"
#include "tarn/Time/SampleCount.h"
#include "tarn/Time/Tick.h"
#include "tarn/Time/TockFrac.h"

namespace tarn {
namespace {

constexpr std::int64_t kMin64 = std::numeric_limits<std::int64_t>::min();
constexpr std::int64_t kMax64 = std::numeric_limits<std::int64_t>::max();
constexpr std::int32_t kMin32 = std::numeric_limits<std::int32_t>::min();
constexpr std::int32_t kMax32 = std::numeric_limits<std::int32_t>::max();
constexpr std::int64_t kTwo32 = std::int64_t{1} << 32;
constexpr std::uint32_t kMaxU32 = std::numeric_limits<std::uint32_t>::max();
constexpr int kD = kTocksPerTick;

TEST(SampleCount, WrapsTruncatesAndPinsAgainstWideReference) {
  SampleCount n = kMax64;
  EXPECT_EQ((++n).AsLongLong(), kMin64);
  EXPECT_EQ((SampleCount(kMax64) * 2).AsLongLong(), -2);
  EXPECT_EQ((-SampleCount(kMin64)).AsLongLong(), kMin64);
  EXPECT_EQ(SampleCount(kMin64).Abs().AsLongLong(), kMin64);
  EXPECT_EQ((SampleCount(kMin64) / -1).AsLongLong(), kMin64);
  n = 10;
  n *= SampleCountFrac(2.9);
  n += SampleCountFrac(-1.9);
  n /= SampleCountFrac(3.7);
  EXPECT_EQ(n, 6);  // operands truncated first: 10*2, -1, /3
  n -= SampleCountFrac(2.9);
  EXPECT_EQ(n++, 4);
  EXPECT_EQ(n--, 5);
  EXPECT_EQ(n, 4);
  EXPECT_EQ(SampleCountFrac(-2.5).Abs(), 2.5);
  EXPECT_EQ(SampleCount(7).GetSInt32PinningToRange(10, 5), 5);  // max test first
  const std::int64_t edges[] = {kMin64, kMin64 + 1, std::int64_t{kMin32} - 1, kMin32,     -1,    0,
                                1,      kMax32,     std::int64_t{kMax32} + 1, kMax64 - 1, kMax64};
  for (std::int64_t a : edges) {
    for (std::int64_t b : edges) {
      for (int da = -2; da <= 2; ++da) {
        const auto av = static_cast<std::int64_t>(static_cast<std::uint64_t>(a) + da);
        const __int128 d = static_cast<__int128>(av) - b;
        const auto ref = static_cast<std::int32_t>(d < kMin32 ? kMin32 : d > kMax32 ? kMax32 : d);
        EXPECT_EQ(SampleCount(av).SubtractWithSInt32Result(b), ref) << av << " - " << b;
        EXPECT_EQ(SampleCount(av).SubtractWithPositiveSInt32Result(b), ref < 0 ? 0 : ref);
        const std::int64_t pinned = av > 100 ? 100 : av < 0 ? 0 : av;
        const std::int64_t both = av > 100 ? 100 : av < -100 ? -100 : av;
        const std::int64_t below = av > -10 ? -10 : av < -100 ? -100 : av;
        const std::int64_t u32 = av < 0 ? 0 : av > kMaxU32 ? kMaxU32 : av;
        EXPECT_EQ(SampleCount(av).CanFitInSInt32(), av >= kMin32 && av <= kMax32) << av;
        EXPECT_EQ(SampleCount(av).GetSInt32PinningToRange(0, 100), pinned) << av;
        EXPECT_EQ(SampleCount(av).GetPositiveSInt32PinningToMax(100), pinned) << av;
        EXPECT_EQ(SampleCount(av).GetUInt32PinningToMax(100u), static_cast<std::uint32_t>(pinned));
        EXPECT_EQ(SampleCount(av).GetSInt32PinningToRange(-100, 100), both) << av;
        EXPECT_EQ(SampleCount(av).GetSInt32PinningToRange(-100, -10), below) << av;
        EXPECT_EQ(SampleCount(av).GetUInt32PinningToMax(kMaxU32), u32) << av;
      }
    }
  }
}

TEST(TickAndFrac, ConstructionRoundingAndWrappingArithmetic) {
  EXPECT_TRUE(SampleCountFrac(std::nan("")).IsNotANumber());
  const double inf = std::numeric_limits<double>::infinity();
  constexpr std::int64_t kLimit = 9223372036854774784;  // pinned, then truncated
  for (int sign : {1, -1}) {                            // every pin has a negative side as well
    const struct {
      double in, out;
    } floats[] = {{inf, 16777215},
                  {1e12, 16777215},
                  {16777216, 16777215},
                  {16777215.5, 16777215},
                  {16777215, 16777215},
                  {16777214, 16777214},
                  {0.5, 0.5}};
    for (const auto& f : floats) {
      EXPECT_EQ(SampleCountFrac(sign * f.in).GetFloat32AssertingRange(),
                static_cast<float>(sign * f.out))
          << sign * f.in;
    }
    EXPECT_EQ(Tick(sign * inf).AsLongLong(), sign * kLimit);
    EXPECT_EQ(Tick(sign * 1e300).AsLongLong(), sign * kLimit);
    EXPECT_EQ(Tick(sign * 2147483648.0).AsLongLong(), sign * kLimit);
    EXPECT_EQ(Tick(sign * 2147483647.5).AsLongLong(), sign * (kMax64 - kMax32)) << "not pinned";
  }
  EXPECT_EQ(Tick(Tick::Min()).AsLongLong(), static_cast<std::int64_t>(0x8000000100000000ull));
  EXPECT_EQ(Tick(kMin32).AsLongLong(), kMin64);
  for (int shift = 1; shift <= 31; ++shift) {
    for (int value : {1, -1, -7, kMax32}) {
      EXPECT_EQ(MakeTickByShifting(value, shift).AsDouble(), std::ldexp(double{1} * value, -shift))
          << value << " >> " << shift;
    }
  }
  EXPECT_EQ(Tick(std::ldexp(-1.5, -32)).AsLongLong(), -1);
  EXPECT_EQ(Tick(std::nan("")).AsLongLong(), 0);
  for (int quarters = -32; quarters <= 32; ++quarters) {
    const Tick t = MakeTickByShifting(quarters, 2);
    const double exact = quarters / 4.0;
    EXPECT_EQ(t.Floor(), static_cast<int>(std::floor(exact))) << exact;
    EXPECT_EQ(t.Ceiling(), static_cast<int>(std::ceil(exact))) << exact;
    EXPECT_EQ(t.Round(), static_cast<int>(std::floor(exact + 0.5))) << exact;
    EXPECT_EQ(SampleCountFrac(exact).Floor(), std::floor(exact));
    EXPECT_EQ(SampleCountFrac(exact).Ceil(), std::ceil(exact));
    EXPECT_EQ(SampleCountFrac(exact).Round(), std::round(exact));  // half away from zero
    EXPECT_EQ(OS::FixedUtils::Round(quarters * 16384), std::floor(exact));
  }
  EXPECT_EQ(AssembleTick(kMax32, 0x80000000u).Round(), kMin32);
  EXPECT_EQ((AssembleTick(kMax32, 0xFFFFFFFFu) + Tick(Tick::Epsilon())).AsLongLong(), kMin64);
  EXPECT_EQ((Tick(-7) % Tick(2)).AsLongLong(), -kTwo32);
  EXPECT_EQ((Tick(Tick::Max()) * 4.0).AsLongLong(), kMin64);  // not pinned
  const auto wrapped = [](std::int64_t a, std::int64_t b) {
    return static_cast<std::int64_t>(static_cast<std::uint64_t>(a) * static_cast<std::uint64_t>(b));
  };
  for (std::int64_t raw :
       {kMin64, -3 * kTwo32 - 5, std::int64_t{-1}, std::int64_t{0}, kTwo32 + 7, kMax64}) {
    const Tick t = AssembleTick(static_cast<int>(raw >> 32), static_cast<std::uint32_t>(raw));
    EXPECT_EQ((-t).AsLongLong(), wrapped(raw, -1)) << raw;
    EXPECT_EQ((t * 3).AsLongLong(), wrapped(raw, 3)) << raw;
    EXPECT_EQ((t * std::int64_t{-kTwo32}).AsLongLong(), wrapped(raw, -kTwo32)) << raw;
    EXPECT_EQ((t / std::int64_t{3}).AsLongLong(), raw / 3) << raw;
    EXPECT_EQ(t / Tick(-2), raw / (-2 * kTwo32)) << raw;
  }
}

std::int64_t Tocks(const Frac<kD>& f) {
  return std::int64_t{f.IntegerPart()} * kD + f.FractionalPart();
}

bool IsCanonical(const Frac<kD>& f) {
  const int w = f.IntegerPart(), n = f.FractionalPart();
  return n > -kD && n < kD && !(w > 0 && n < 0) && !(w < 0 && n > 0);
}

std::int64_t FloorDiv(std::int64_t a, std::int64_t b) {
  return a / b - ((a % b != 0) && ((a < 0) != (b < 0)));
}

TEST(TockFrac, ConstructionAndSumsCanonicalise) {
  using F = Frac<kD>;
  for (int w = -3; w <= 3; ++w) {
    for (std::int64_t n = kMin32; n <= kMax32; n += kD - 1) {
      for (int d : {0, 1, -1}) {
        const std::int64_t nn = n + d;
        if (nn < kMin32 || nn > kMax32) continue;
        SCOPED_TRACE(::testing::Message() << w << "," << nn);
        const int n32 = static_cast<int>(nn);
        for (const F& f : {F(w, n32), F(w, n32, F::AlreadyCanonical{}) + F()}) {
          ASSERT_TRUE(IsCanonical(f));
          ASSERT_EQ(Tocks(f), std::int64_t{w} * kD + nn);
        }
      }
    }
  }
}

TEST(TockFrac, ArithmeticExhaustiveAgainstReference) {
  std::vector<TockFrac> values;
  for (int w = -3; w <= 3; ++w) {
    for (int n : {-7199999, -5400000, -3600000, -1, 0, 1, 3600000, 5400000, 7199999}) {
      if (!((w > 0 && n < 0) || (w < 0 && n > 0))) values.emplace_back(w, n);
    }
  }
  for (const TockFrac& a : values) {
    for (const TockFrac& b : values) {
      TockFrac sum = a, diff = a;
      sum += b;
      diff -= b;
      ASSERT_TRUE(IsCanonical(sum) && IsCanonical(diff));
      ASSERT_EQ(Tocks(sum), Tocks(a) + Tocks(b));
      ASSERT_EQ(Tocks(diff), Tocks(a) - Tocks(b));
      ASSERT_EQ(a + b, sum);
      ASSERT_EQ(a - b, diff);
      ASSERT_EQ(a < b, Tocks(a) < Tocks(b));
      ASSERT_EQ(a == b, Tocks(a) == Tocks(b));
    }
    ASSERT_EQ(a.Floor(), FloorDiv(Tocks(a), kD));
    ASSERT_EQ(a.Ceiling(), -FloorDiv(-Tocks(a), kD));
    ASSERT_EQ(a.Round(), FloorDiv(2 * Tocks(a) + kD, 2 * kD));
    ASSERT_EQ(Tocks(a.AbsoluteValue()), std::llabs(Tocks(a)));
    ASSERT_EQ(Tocks(-a), -Tocks(a));
  }
  TockFrac f(1, 3600000);
  f *= 3;
  EXPECT_EQ(f, TockFrac(4, 3600000));
}

// Operands at or past a bound give that bound, the upper one first; other
// sums are pinned to [-bound, bound].
std::int64_t ReferencePin(std::int64_t x, std::int64_t y, std::int64_t bound) {
  if (x >= bound || y >= bound) return bound;
  if (x <= -bound || y <= -bound) return -bound;
  const __int128 s = static_cast<__int128>(x) + y;
  return static_cast<std::int64_t>(s <= -bound ? -bound : s >= bound ? bound : s);
}

TEST(AddPin, IntTickAndTockFracPinToTheirBounds) {
  std::vector<int> values{kMin32};
  for (int d = 0; d <= 4; ++d) {
    for (int v : {kMax32 - d, -kMax32 + d, d, -d, kMax32 / 2 + d - 2, -kMax32 / 2 - d + 2})
      values.push_back(v);
  }
  for (int x : values) {
    for (int y : values) ASSERT_EQ(AddPin(x, y), ReferencePin(x, y, kMax32)) << x << " + " << y;
  }
  // Raw ticks and tocks on both sides of both bounds, and between them.
  const std::int64_t maxRaw = std::int64_t{kMax32} << 32, maxTocks = std::int64_t{kMax32} * kD;
  std::vector<Tick> ticks;
  std::vector<TockFrac> tocks;
  for (std::int64_t sign : {1, -1}) {
    for (std::int64_t raw : {kMax64, maxRaw + 1, maxRaw, maxRaw - 1, maxRaw / 2 + 1, maxRaw / 2,
                             kTwo32, std::int64_t{1}, std::int64_t{0}})
      ticks.push_back(AssembleTick(static_cast<int>((sign * raw) >> 32),
                                   static_cast<std::uint32_t>(sign * raw)));
    ticks.push_back(AssembleTick(kMin32, 0));
    for (int whole : {kMax32, kMax32 - 1, kMax32 / 2, 1, 0}) {
      for (int n : {0, 1, kD / 2, kD - 1})
        tocks.emplace_back(static_cast<int>(sign * whole), static_cast<int>(sign * n));
    }
    tocks.emplace_back(kMin32, 0);
  }
  for (const Tick x : ticks) {
    for (const Tick y : ticks) {
      const Tick sum = AddPin(x, y);
      ASSERT_EQ(sum.AsLongLong(), ReferencePin(x.AsLongLong(), y.AsLongLong(), maxRaw))
          << x.AsLongLong() << " + " << y.AsLongLong();
      ASSERT_TRUE(InClosedInterval(sum, Tick::Min(), Tick::Max()));
    }
  }
  for (const TockFrac& x : tocks) {
    for (const TockFrac& y : tocks) {
      const TockFrac sum = AddPin(x, y);
      ASSERT_EQ(Tocks(sum), ReferencePin(Tocks(x), Tocks(y), maxTocks))
          << Tocks(x) << " + " << Tocks(y);
      ASSERT_TRUE(InClosedInterval(sum, TockFrac(-kMax32, 0), TockFrac(kMax32, 0)));
    }
  }
  const Tick max = Tick::Max(), min = Tick::Min(), eps = Tick::Epsilon();
  EXPECT_EQ(AddPin(min, max), max);
  EXPECT_EQ(AddPin(max - Tick(1), Tick(1) - eps), max - eps);
  EXPECT_EQ(AddPin(min + Tick(1), Tick(-1) + eps), min + eps);
  EXPECT_EQ(AddPin(AssembleTick(kMax32, 5), Tick(-100)), max);
  const TockFrac tmax(kMax32, 0), tmin(-kMax32, 0);
  EXPECT_EQ(AddPin(tmin, tmax), tmax);
  EXPECT_EQ(AddPin(TockFrac(kMax32 - 1, 7199999), TockFrac(0, 1)), tmax);
  EXPECT_EQ(AddPin(TockFrac(-5, -3), TockFrac(2, 4)), TockFrac(-2, -7199999));
}

namespace fx = OS::FixedUtils;

TEST(FixedUtils, RoundConvertAndMulDivAgainstReference) {
  EXPECT_EQ(fx::FloatToFixed(std::ldexp(-1.5f, -16)), -1);
  EXPECT_EQ(fx::FloatToFixed(1e10f), INT32_MIN);
  const fx::Fixed values[] = {0,       1,        -1,        0x8000,      -0x8000,   0x10000,
                              0x18000, -0x18000, 0x7FFFFFF, -0x7FFFFFFF, 123456789, -987654};
  auto low32 = [](std::int64_t v) { return static_cast<fx::Fixed>(static_cast<std::uint32_t>(v)); };
  for (fx::Fixed a : values) {
    for (fx::Fixed b : values) {
      const std::int64_t p = std::int64_t{a} * b;
      ASSERT_EQ(fx::Mul(a, b), low32(p >> 16)) << a << " * " << b;
      ASSERT_EQ(fx::FracMul(a, b), low32(p >> 30)) << a << " * " << b;
      if (b == 0) continue;
      ASSERT_EQ(fx::Div(a, b), low32(std::int64_t{a} * 65536 / b)) << a << " / " << b;
      ASSERT_EQ(fx::FracDiv(a, b), low32((std::int64_t{a} << 30) / b)) << a << " / " << b;
    }
  }
}

TEST(TimeStreams, ExactBytesReadBackInBothWidths) {
  CHandleStream s(kTCLReadWriteMode);
  SampleCount(0x0102030405060708).PutTo(s);
  SampleCount(-2).PutTo(s, true);
  SampleCount(5000000000).PutTo(s, false);  // pinned to 32 bits
  SampleCount(-5000000000).PutTo(s, false);
  SampleCount(-3).PutTo(s, false);
  AssembleTick(1, 0x80000000u).PutTo(s);
  Tick(Tick::Min()).PutTo(s);
  SampleCountFrac(-2.5).PutTo(s);
  const std::vector<unsigned char> expected{1,    2,    3,    4,    5,    6,    7,    8,     //
                                            0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFE,  //
                                            0x7F, 0xFF, 0xFF, 0xFF, 0x80, 0,    0,    0,
                                            0xFF, 0xFF, 0xFF, 0xFD,                       //
                                            0,    0,    0,    1,    0x80, 0,    0,    0,  //
                                            0x80, 0,    0,    1,    0,    0,    0,    0,  //
                                            0xC0, 0x04, 0,    0,    0,    0,    0,    0};
  char** h = s.GetStreamHandle();
  EXPECT_EQ(std::vector<unsigned char>(*h, *h + s.Size()), expected);

  s.MoveTo(0);
  SampleCount n;
  Tick t;
  SampleCountFrac f;
  EXPECT_EQ((n.GetFrom(s), n), 0x0102030405060708);
  EXPECT_EQ((n.GetFrom(s, true), n), -2);
  EXPECT_EQ((n.GetFrom(s, false), n), 2147483647);
  EXPECT_EQ(SampleCount::Get_LLorL(s, true), -2147483647 - 1);  // true: 32 bits
  EXPECT_EQ(SampleCount::Get_LLorL_SampleCount(s, true), -3);
  EXPECT_EQ((t.GetFrom(s), t), AssembleTick(1, 0x80000000u));
  EXPECT_EQ(SampleCount::Get_LLorL(s, false), static_cast<std::int64_t>(0x8000000100000000ull));
  EXPECT_EQ((f.GetFrom(s), f), -2.5);
  s.MoveTo(s.Size() - 3);
  EXPECT_THROW(t.GetFrom(s), TarnError);
}

}  // namespace
}  // namespace tarn
