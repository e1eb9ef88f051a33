#include "tarn/Time/SampleCount.h"

#include <gtest/gtest.h>

#include <cmath>
#include <cstdint>
#include <limits>

namespace tarn {
namespace {

constexpr std::int64_t kMin64 = std::numeric_limits<std::int64_t>::min();
constexpr std::int64_t kMax64 = std::numeric_limits<std::int64_t>::max();
constexpr std::int32_t kMin32 = std::numeric_limits<std::int32_t>::min();
constexpr std::int32_t kMax32 = std::numeric_limits<std::int32_t>::max();

TEST(SampleCount, ArithmeticWrapsAtBothEnds) {
  SampleCount n = kMax64;
  ++n;
  EXPECT_EQ(n.AsLongLong(), kMin64);
  n--;
  EXPECT_EQ(n.AsLongLong(), kMax64);
  EXPECT_EQ((SampleCount(kMin64) - 1).AsLongLong(), kMax64);
  EXPECT_EQ((SampleCount(kMax64) * 2).AsLongLong(), -2);
  EXPECT_EQ((-SampleCount(kMin64)).AsLongLong(), kMin64);
  EXPECT_EQ(SampleCount(kMin64).Abs().AsLongLong(), kMin64);
  EXPECT_EQ((SampleCount(kMin64) / -1).AsLongLong(), kMin64);
  EXPECT_EQ(SampleCount(-7).Abs(), 7);
  EXPECT_EQ(SampleCount(-7) / 2, -3);
}

TEST(SampleCount, PostfixAndPrefixReturnTheRightValues) {
  SampleCount n = 5;
  EXPECT_EQ(n++, 5);
  EXPECT_EQ(n, 6);
  EXPECT_EQ(++n, 7);
  EXPECT_EQ(n--, 7);
  EXPECT_EQ(--n, 5);
}

TEST(SampleCount, FractionalOperandsAreTruncatedFirst) {
  SampleCount n = 10;
  n *= SampleCountFrac(2.9);
  EXPECT_EQ(n, 20);
  n += SampleCountFrac(-1.9);
  EXPECT_EQ(n, 19);
  n -= SampleCountFrac(0.99);
  EXPECT_EQ(n, 19);
  n /= SampleCountFrac(3.7);
  EXPECT_EQ(n, 6);
  EXPECT_EQ(SampleCount(SampleCountFrac(-2.7)), -2);
  EXPECT_EQ(SampleCount(SampleCountFrac(2.7)), 2);
}

TEST(SampleCount, NarrowingTable) {
  EXPECT_TRUE(SampleCount(kMax32).CanFitInSInt32());
  EXPECT_TRUE(SampleCount(kMin32).CanFitInSInt32());
  EXPECT_FALSE(SampleCount(std::int64_t{kMax32} + 1).CanFitInSInt32());
  EXPECT_FALSE(SampleCount(std::int64_t{kMin32} - 1).CanFitInSInt32());

  EXPECT_EQ(SampleCount(3000000000).GetSInt32PinningToRange(0, 100), 100);
  EXPECT_EQ(SampleCount(-5).GetSInt32PinningToRange(0, 100), 0);
  EXPECT_EQ(SampleCount(50).GetSInt32PinningToRange(0, 100), 50);
  // With min > max the max test wins for values above max.
  EXPECT_EQ(SampleCount(7).GetSInt32PinningToRange(10, 5), 5);
  EXPECT_EQ(SampleCount(3).GetSInt32PinningToRange(10, 5), 10);

  EXPECT_EQ(SampleCount(-1).GetPositiveSInt32PinningToMax(9), 0);
  EXPECT_EQ(SampleCount(kMax64).GetPositiveSInt32PinningToMax(9), 9);
  EXPECT_EQ(SampleCount(4).GetPositiveSInt32PinningToMax(9), 4);

  EXPECT_EQ(SampleCount(5000000000).GetUInt32PinningToMax(0xFFFFFFFFu), 0xFFFFFFFFu);
  EXPECT_EQ(SampleCount(4000000000).GetUInt32PinningToMax(0xFFFFFFFFu), 4000000000u);
  EXPECT_EQ(SampleCount(-3).GetUInt32PinningToMax(100u), 0u);
  EXPECT_EQ(SampleCount(101).GetUInt32PinningToMax(100u), 100u);

  EXPECT_EQ(SampleCount(0).SubtractWithSInt32Result(3000000000), kMin32);
  EXPECT_EQ(SampleCount(0).SubtractWithPositiveSInt32Result(3000000000), 0);
  EXPECT_EQ(SampleCount(3000000000).SubtractWithSInt32Result(0), kMax32);
  EXPECT_EQ(SampleCount(3000000000).SubtractWithPositiveSInt32Result(0), kMax32);
  EXPECT_EQ(SampleCount(10).SubtractWithSInt32Result(15), -5);
  // Differences that overflow 64 bits still clamp the right way.
  EXPECT_EQ(SampleCount(kMax64).SubtractWithSInt32Result(kMin64), kMax32);
  EXPECT_EQ(SampleCount(kMin64).SubtractWithSInt32Result(kMax64), kMin32);
  EXPECT_EQ(SampleCount(kMin64).SubtractWithPositiveSInt32Result(1), 0);

  EXPECT_EQ(SampleCount(-123).GetSInt32AssertingRange(), -123);
  EXPECT_EQ(SampleCount(77).GetSInt32AssertingRange(0, 100), 77);
  EXPECT_EQ(SampleCount(0x1'0000'0005)._bogus(), 5);
  SampleCount b;
  b._set_bogus(-9);
  EXPECT_EQ(b.AsLongLong(), -9);
}

// The clamped difference against an exact 128-bit reference over a grid of
// values around every boundary.
TEST(SampleCount, SubtractWithSInt32ResultMatchesWideReference) {
  const std::int64_t edges[] = {kMin64, kMin64 + 1, std::int64_t{kMin32} - 1, kMin32,     -1,    0,
                                1,      kMax32,     std::int64_t{kMax32} + 1, kMax64 - 1, kMax64};
  for (std::int64_t a : edges) {
    for (std::int64_t b : edges) {
      for (int da = -2; da <= 2; ++da) {
        const std::int64_t av = static_cast<std::int64_t>(static_cast<std::uint64_t>(a) + da);
        const __int128 d = static_cast<__int128>(av) - b;
        const auto signedRef = static_cast<std::int32_t>(d < kMin32   ? kMin32
                                                         : d > kMax32 ? kMax32
                                                                      : d);
        const auto positiveRef = static_cast<std::int32_t>(d < 0 ? 0 : d > kMax32 ? kMax32 : d);
        EXPECT_EQ(SampleCount(av).SubtractWithSInt32Result(b), signedRef) << av << " - " << b;
        EXPECT_EQ(SampleCount(av).SubtractWithPositiveSInt32Result(b), positiveRef);
      }
    }
  }
}

TEST(SampleCountFrac, RoundingFloorCeil) {
  EXPECT_EQ(SampleCountFrac(-2.5).Round(), -3.0);
  EXPECT_EQ(SampleCountFrac(2.5).Round(), 3.0);
  EXPECT_EQ(SampleCountFrac(-2.4).Round(), -2.0);
  EXPECT_EQ(SampleCountFrac(0.0).Round(), 0.0);
  EXPECT_EQ(SampleCountFrac(-0.5).Round(), -1.0);
  EXPECT_EQ(SampleCountFrac(-2.5).Floor(), -3.0);
  EXPECT_EQ(SampleCountFrac(-2.5).Ceil(), -2.0);
  EXPECT_EQ(SampleCountFrac(-2.5).Abs(), 2.5);
  EXPECT_TRUE(SampleCountFrac(std::nan("")).IsNotANumber());
  EXPECT_FALSE(SampleCountFrac(1.0).IsNotANumber());
}

TEST(SampleCountFrac, ArithmeticMixesCountsAndDoubles) {
  SampleCountFrac f = SampleCount(3);
  f += 0.5;
  EXPECT_EQ(f.AsDouble(), 3.5);
  EXPECT_EQ((f * SampleCount(2)).AsDouble(), 7.0);
  EXPECT_EQ((SampleCount(1) + SampleCountFrac(0.25)).AsDouble(), 1.25);
  EXPECT_EQ((-f).AsDouble(), -3.5);
  EXPECT_EQ((f / 2.0).AsDouble(), 1.75);
  EXPECT_EQ(f++, 3.5);
  EXPECT_EQ(--f, 3.5);
  EXPECT_EQ(SampleCountFrac(48000.0).AsSeconds(48000.0), 1.0);
  EXPECT_EQ(SampleCount(96000).AsSeconds(48000.0), 2.0);
}

TEST(SampleCountFrac, Float32IsPinnedToExactIntegers) {
  EXPECT_EQ(SampleCountFrac(1e12).GetFloat32AssertingRange(), 16777215.0f);
  EXPECT_EQ(SampleCountFrac(-1e12).GetFloat32AssertingRange(), -16777215.0f);
  EXPECT_EQ(SampleCountFrac(16777216.0).GetFloat32AssertingRange(), 16777215.0f);
  EXPECT_EQ(SampleCountFrac(-12.5).GetFloat32AssertingRange(), -12.5f);
}

TEST(SampleCountProxy, StoresThroughToItsTarget) {
  SampleCount target = 1;
  SampleCountProxy proxy(target);
  EXPECT_EQ(proxy.get(), 1);
  EXPECT_EQ(proxy = SampleCount(42), 42);
  EXPECT_EQ(target, 42);
  SampleCount other = 7;
  SampleCountProxy otherProxy(other);
  proxy = otherProxy;
  EXPECT_EQ(target, 7);
  EXPECT_EQ(static_cast<SampleCount>(proxy), 7);
}

}  // namespace
}  // namespace tarn
