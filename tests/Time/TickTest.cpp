#include "tarn/Time/Tick.h"

#include <gtest/gtest.h>

#include <cmath>
#include <cstdint>
#include <limits>

namespace tarn {
namespace {

constexpr std::int64_t kTwo32 = std::int64_t{1} << 32;

TEST(Tick, ConstantsHaveTheirRawValues) {
  EXPECT_EQ(Tick(Tick::Zero()).AsLongLong(), 0);
  EXPECT_EQ(Tick(Tick::Epsilon()).AsLongLong(), 1);
  EXPECT_EQ(Tick(Tick::NegativeEpsilon()).AsLongLong(), -1);
  EXPECT_EQ(Tick(Tick::Max()).AsLongLong(), std::int64_t{0x7FFFFFFF00000000});
  EXPECT_EQ(Tick(Tick::Min()).AsLongLong(), static_cast<std::int64_t>(0x8000000100000000ull));
  EXPECT_EQ(Tick(Tick::Max()).Floor(), 2147483647);
  EXPECT_EQ(Tick(Tick::Min()).Floor(), -2147483647);
  EXPECT_EQ(-Tick(Tick::Max()), Tick(Tick::Min()));
  EXPECT_GT(Tick(Tick::Min()).AsLongLong(), std::numeric_limits<std::int64_t>::min());
}

TEST(Tick, ConstructionFromIntAndParts) {
  EXPECT_EQ(Tick(5).AsLongLong(), 5 * kTwo32);
  EXPECT_EQ(Tick(-1).AsLongLong(), -kTwo32);
  EXPECT_EQ(Tick(std::numeric_limits<int>::min()).AsLongLong(),
            std::numeric_limits<std::int64_t>::min());
  EXPECT_EQ(AssembleTick(-1, 0x80000000u).AsLongLong(), -kTwo32 / 2);
  EXPECT_EQ(AssembleTick(3, 7).AsLongLong(), 3 * kTwo32 + 7);
  EXPECT_EQ(AssembleTick(-2, 0xFFFFFFFFu).AsLongLong(), -kTwo32 - 1);
  for (int shift = 1; shift <= 31; ++shift) {
    for (int value : {1, -1, 3, -7, 1000, std::numeric_limits<int>::max()}) {
      const Tick t = MakeTickByShifting(value, shift);
      EXPECT_EQ(t.AsDouble(), std::ldexp(static_cast<double>(value), -shift))
          << value << " >> " << shift;
    }
  }
}

TEST(Tick, ConstructionFromDoublePinsThenTruncates) {
  constexpr std::int64_t kLimit = 9223372036854774784;
  EXPECT_EQ(Tick(1e300).AsLongLong(), kLimit);
  EXPECT_EQ(Tick(-1e300).AsLongLong(), -kLimit);
  EXPECT_EQ(Tick(2147483648.0).AsLongLong(), kLimit);  // 2^63 raw, just out of range
  EXPECT_EQ(Tick(0.5).AsLongLong(), kTwo32 / 2);
  EXPECT_EQ(Tick(-0.5).AsLongLong(), -kTwo32 / 2);
  // 1.5 * 2^-32 tick truncates toward zero on both sides.
  EXPECT_EQ(Tick(std::ldexp(1.5, -32)).AsLongLong(), 1);
  EXPECT_EQ(Tick(std::ldexp(-1.5, -32)).AsLongLong(), -1);
  EXPECT_EQ(Tick(std::nan("")).AsLongLong(), 0);
}

TEST(Tick, FloorRoundCeiling) {
  EXPECT_EQ(Tick(0.5).Round(), 1);
  EXPECT_EQ(Tick(-0.5).Round(), 0);
  EXPECT_EQ(Tick(-0.25).Floor(), -1);
  EXPECT_EQ(Tick(0.25).Ceiling(), 1);
  EXPECT_EQ(Tick(-0.75).Round(), -1);
  EXPECT_EQ(Tick(2).Ceiling(), 2);
  EXPECT_EQ(Tick(-2).Floor(), -2);
  EXPECT_EQ(Tick(Tick::Epsilon()).Ceiling(), 1);
  EXPECT_EQ(Tick(Tick::NegativeEpsilon()).Floor(), -1);
  EXPECT_EQ(Tick(Tick::NegativeEpsilon()).Ceiling(), 0);
  // Rounding the largest raw value wraps like the 64-bit sum does.
  const Tick top = AssembleTick(std::numeric_limits<int>::max(), 0x80000000u);
  EXPECT_EQ(top.Round(), std::numeric_limits<int>::min());
  // Every quarter tick in [-8, 8] against floor/ceil of the exact value.
  for (int quarters = -32; quarters <= 32; ++quarters) {
    const Tick t = MakeTickByShifting(quarters, 2);
    const double exact = quarters / 4.0;
    EXPECT_EQ(t.Floor(), static_cast<int>(std::floor(exact))) << exact;
    EXPECT_EQ(t.Ceiling(), static_cast<int>(std::ceil(exact))) << exact;
    EXPECT_EQ(t.Round(), static_cast<int>(std::floor(exact + 0.5))) << exact;
  }
}

TEST(Tick, ArithmeticWrapsLikeSixtyFourBitIntegers) {
  const Tick max = Tick(Tick::Max());
  const Tick big = max + max;  // no pinning here
  EXPECT_EQ(static_cast<std::uint64_t>(big.AsLongLong()), 0xFFFFFFFE00000000ull);
  Tick t = AssembleTick(std::numeric_limits<int>::max(), 0xFFFFFFFFu);
  t += Tick(Tick::Epsilon());
  EXPECT_EQ(t.AsLongLong(), std::numeric_limits<std::int64_t>::min());
  t -= Tick(Tick::Epsilon());
  EXPECT_EQ(t.AsLongLong(), std::numeric_limits<std::int64_t>::max());
  EXPECT_EQ((-Tick(std::numeric_limits<int>::min())).AsLongLong(),
            std::numeric_limits<std::int64_t>::min());
  EXPECT_EQ((Tick(3) * 4).AsLongLong(), 12 * kTwo32);
  EXPECT_EQ((Tick(3) * std::int64_t{-2}).AsLongLong(), -6 * kTwo32);
  EXPECT_EQ((max * std::int64_t{4}).AsLongLong(), static_cast<std::int64_t>(0xFFFFFFFC00000000ull));
  EXPECT_EQ((Tick(7) / std::int64_t{2}).AsLongLong(), 7 * kTwo32 / 2);
  EXPECT_EQ((Tick(std::numeric_limits<int>::min()) / std::int64_t{-1}).AsLongLong(),
            std::numeric_limits<std::int64_t>::min());
  EXPECT_EQ(Tick(7) / Tick(2), 3);
  EXPECT_EQ(Tick(-7) / Tick(2), -3);
  EXPECT_EQ((Tick(7) % Tick(2)).AsLongLong(), kTwo32);
  EXPECT_EQ((Tick(-7) % Tick(2)).AsLongLong(), -kTwo32);
}

TEST(Tick, MultiplyByDoubleTruncatesWithoutPinning) {
  EXPECT_EQ((Tick(Tick::Epsilon()) * 2.9).AsLongLong(), 2);
  EXPECT_EQ((Tick(Tick::NegativeEpsilon()) * 2.9).AsLongLong(), -2);
  EXPECT_EQ((Tick(10) * 0.25).AsLongLong(), 10 * kTwo32 / 4);
  // Out of range is not pinned to Max(): the processor's indefinite value.
  EXPECT_EQ((Tick(Tick::Max()) * 4.0).AsLongLong(), std::numeric_limits<std::int64_t>::min());
}

TEST(Tick, ComparisonsFollowTheRawValue) {
  EXPECT_LT(Tick(Tick::Min()), Tick(Tick::NegativeEpsilon()));
  EXPECT_LT(Tick(Tick::NegativeEpsilon()), Tick());
  EXPECT_LT(Tick(), Tick(Tick::Epsilon()));
  EXPECT_LT(Tick(Tick::Epsilon()), Tick(Tick::Max()));
  EXPECT_EQ(Tick(2), AssembleTick(2, 0));
  EXPECT_NE(Tick(2), AssembleTick(2, 1));
  EXPECT_EQ(Tick(1.25).AsDouble(), 1.25);
}

}  // namespace
}  // namespace tarn
