#include "tarn/Time/TockFrac.h"

#include <gtest/gtest.h>

#include <cmath>
#include <cstdint>

namespace tarn {
namespace {

constexpr int kD = kTocksPerTick;

// The exact value in tocks.
std::int64_t Tocks(const Frac<kD>& f) {
  return std::int64_t{f.IntegerPart()} * kD + f.FractionalPart();
}

bool IsCanonical(const Frac<kD>& f) {
  const int w = f.IntegerPart();
  const int n = f.FractionalPart();
  if (n <= -kD || n >= kD) return false;
  if (w > 0 && n < 0) return false;
  if (w < 0 && n > 0) return false;
  return true;
}

// Reference floor division for the exact value.
std::int64_t FloorDiv(std::int64_t a, std::int64_t b) {
  std::int64_t q = a / b;
  if ((a % b != 0) && ((a < 0) != (b < 0))) --q;
  return q;
}

TEST(TockFrac, CanonicalFormAtTheBoundaries) {
  EXPECT_EQ(TockFrac(0, 7200000), TockFrac(1, 0));
  EXPECT_EQ(TockFrac(0, 7200000).IntegerPart(), 1);
  EXPECT_EQ(TockFrac(0, 7200000).FractionalPart(), 0);
  EXPECT_EQ(TockFrac(1, -1).IntegerPart(), 0);
  EXPECT_EQ(TockFrac(1, -1).FractionalPart(), 7199999);
  EXPECT_EQ(TockFrac(-1, 1).IntegerPart(), 0);
  EXPECT_EQ(TockFrac(-1, 1).FractionalPart(), -7199999);
  EXPECT_EQ(TockFrac(0, -7200000).IntegerPart(), -1);
  EXPECT_EQ(TockFrac(0, -7200000).FractionalPart(), 0);
  EXPECT_EQ(TockFrac(2, -14400001).IntegerPart(), 0);
  EXPECT_EQ(TockFrac(2, -14400001).FractionalPart(), -1);
  // A zero numerator is stored as given.
  EXPECT_EQ(TockFrac(-3, 0).IntegerPart(), -3);
}

// Every construction from a grid of (whole, numerator) pairs lands on the
// canonical pair of the same exact value.
TEST(TockFrac, ConstructionPreservesValueAndCanonicalises) {
  const int numerators[] = {-2147483647 - 1, -14400001, -14400000, -7200001,  -7200000, -7199999,
                            -3600000,        -1,        0,         1,         3600000,  7199999,
                            7200000,         7200001,   14400000,  2147483647};
  for (int w = -5; w <= 5; ++w) {
    for (int n : numerators) {
      const TockFrac f(w, n);
      EXPECT_TRUE(IsCanonical(f)) << w << "," << n;
      EXPECT_EQ(Tocks(f), std::int64_t{w} * kD + n) << w << "," << n;
    }
  }
}

// Addition and subtraction over all canonical values of a small window
// against exact 64-bit tock arithmetic.
TEST(TockFrac, AddSubtractExhaustiveAgainstReference) {
  const int nums[] = {-7199999, -5400000, -3600000, -1, 0, 1, 3600000, 5400000, 7199999};
  std::vector<TockFrac> values;
  for (int w = -3; w <= 3; ++w) {
    for (int n : nums) {
      if ((w > 0 && n < 0) || (w < 0 && n > 0)) continue;
      values.emplace_back(w, n);
    }
  }
  for (const TockFrac& a : values) {
    for (const TockFrac& b : values) {
      const TockFrac sum = a + b;
      const TockFrac diff = a - b;
      ASSERT_TRUE(IsCanonical(sum));
      ASSERT_TRUE(IsCanonical(diff));
      ASSERT_EQ(Tocks(sum), Tocks(a) + Tocks(b));
      ASSERT_EQ(Tocks(diff), Tocks(a) - Tocks(b));
      TockFrac acc = a;
      acc += b;
      ASSERT_EQ(acc, sum);
      acc = a;
      acc -= b;
      ASSERT_EQ(acc, diff);
      // Lexicographic comparison agrees with the exact values.
      ASSERT_EQ(a < b, Tocks(a) < Tocks(b));
      ASSERT_EQ(a == b, Tocks(a) == Tocks(b));
    }
    ASSERT_EQ(a.Floor(), FloorDiv(Tocks(a), kD));
    ASSERT_EQ(a.Ceiling(), -FloorDiv(-Tocks(a), kD));
    ASSERT_EQ(a.Round(), FloorDiv(2 * Tocks(a) + kD, 2 * kD));
    ASSERT_EQ(Tocks(a.AbsoluteValue()), std::llabs(Tocks(a)));
    ASSERT_EQ(Tocks(-a), -Tocks(a));
  }
}

TEST(TockFrac, CarryAndBorrow) {
  EXPECT_EQ(TockFrac(0, 7199999) + TockFrac(0, 1), TockFrac(1, 0));
  EXPECT_EQ(TockFrac(1, 0) - TockFrac(0, 1), TockFrac(0, 7199999));
  EXPECT_EQ(TockFrac(0, -7199999) - TockFrac(0, 1), TockFrac(-1, 0));
  EXPECT_EQ(TockFrac(-1, 0) + TockFrac(0, 1), TockFrac(0, -7199999));
  EXPECT_EQ(TockFrac(2, 100) - TockFrac(3, 0), TockFrac(0, -7199900));
}

TEST(TockFrac, RoundingHalvesTowardPlusInfinity) {
  EXPECT_EQ(TockFrac(0, 3600000).Round(), 1);
  EXPECT_EQ(TockFrac(0, -3600000).Round(), 0);
  EXPECT_EQ(TockFrac(0, -5400000).Round(), -1);
  EXPECT_EQ(TockFrac(-2, -3600000).Round(), -2);
  EXPECT_EQ(TockFrac(0, -1).Floor(), -1);
  EXPECT_EQ(TockFrac(0, 1).Ceiling(), 1);
}

TEST(TockFrac, ScalingGoesThroughDouble) {
  TockFrac f(1, 3600000);  // 1.5
  f *= 3;
  EXPECT_EQ(f, TockFrac(4, 3600000));
  f /= -3;
  EXPECT_EQ(f, TockFrac(-1, -3600000));
  TockFrac third(0, 1);
  third /= 3;  // 1/3 tock rounds to 0
  EXPECT_EQ(third, TockFrac());
  TockFrac twoThirds(0, 2);
  twoThirds /= 3;  // 2/3 tock rounds half away from zero to 1
  EXPECT_EQ(twoThirds, TockFrac(0, 1));
  TockFrac nearOne(0, 7199999);
  nearOne *= 1;
  EXPECT_EQ(nearOne, TockFrac(0, 7199999));
}

TEST(TockFrac, AbsoluteValueFollowsTheLeadingSign) {
  EXPECT_EQ(TockFrac(-2, -5).AbsoluteValue(), TockFrac(2, 5));
  EXPECT_EQ(TockFrac(0, -5).AbsoluteValue(), TockFrac(0, 5));
  EXPECT_EQ(TockFrac(3, 5).AbsoluteValue(), TockFrac(3, 5));
}

TEST(TockFrac, AlreadyCanonicalStoresAsGiven) {
  const Frac<kD> raw(0, 9000000, Frac<kD>::AlreadyCanonical{});
  EXPECT_EQ(raw.FractionalPart(), 9000000);
  Frac<kD> fixed = raw;
  fixed.MakeCanonical();
  EXPECT_EQ(fixed, Frac<kD>(1, 1800000));
}

}  // namespace
}  // namespace tarn
