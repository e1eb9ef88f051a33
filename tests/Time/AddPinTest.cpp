#include "tarn/Time/AddPin.h"

#include <gtest/gtest.h>

#include <cstdint>

namespace tarn {
namespace {

constexpr int kMax = 2147483647;
constexpr int kMin = -2147483647;

int ReferencePin(std::int64_t x, std::int64_t y) {
  // Order matters: an operand at the maximum wins, then one at the minimum.
  if (x == kMax || y == kMax) return kMax;
  if (x <= kMin || y <= kMin) return kMin;
  const std::int64_t s = x + y;
  return static_cast<int>(s <= kMin ? kMin : s >= kMax ? kMax : s);
}

TEST(AddPin, IntEdgeCases) {
  EXPECT_EQ(AddPin(kMax, kMin), kMax);
  EXPECT_EQ(AddPin(kMin, kMax), kMax);
  EXPECT_EQ(AddPin(kMin, 5), kMin);
  EXPECT_EQ(AddPin(-2147483647 - 1, 5), kMin);
  EXPECT_EQ(AddPin(0, 0), 0);
  EXPECT_EQ(AddPin(kMax - 10, 10), kMax);
  EXPECT_EQ(AddPin(kMin + 10, -10), kMin);
  EXPECT_EQ(AddPin(kMax - 10, 9), kMax - 1);
  EXPECT_EQ(AddPin(2000000000, 2000000000), kMax);
  EXPECT_EQ(AddPin(-2000000000, -2000000000), kMin);
}

TEST(AddPin, IntMatchesWideReferenceNearTheBounds) {
  std::vector<int> values;
  for (int d = 0; d <= 4; ++d) {
    values.push_back(kMax - d);
    values.push_back(kMin + d);
    values.push_back(d);
    values.push_back(-d);
    values.push_back(kMax / 2 + d - 2);
    values.push_back(kMin / 2 - d + 2);
  }
  values.push_back(-2147483647 - 1);
  for (int x : values) {
    for (int y : values) {
      const int r = AddPin(x, y);
      ASSERT_EQ(r, ReferencePin(x, y)) << x << " + " << y;
      ASSERT_TRUE(InClosedInterval(r, kMin, kMax));
    }
  }
}

TEST(AddPin, TickPinsToMinAndMax) {
  const Tick max = Tick::Max();
  const Tick min = Tick::Min();
  EXPECT_EQ(AddPin(max, min), max);
  EXPECT_EQ(AddPin(min, max), max);
  EXPECT_EQ(AddPin(min, Tick::Epsilon()), min);
  EXPECT_EQ(AddPin(max, Tick::NegativeEpsilon()), max);
  EXPECT_EQ(AddPin(Tick(3), Tick(4)), Tick(7));
  EXPECT_EQ(AddPin(max - Tick(1), Tick(1)), max);
  EXPECT_EQ(AddPin(max - Tick(1), Tick(1) - Tick(Tick::Epsilon())), max - Tick(Tick::Epsilon()));
  EXPECT_EQ(AddPin(min + Tick(1), Tick(-1)), min);
  // Raw values beyond the constants are pinned too.
  const Tick aboveMax = AssembleTick(kMax, 5);
  EXPECT_EQ(AddPin(aboveMax, Tick(-100)), max);
  const Tick belowMin = AssembleTick(-2147483647 - 1, 0);
  EXPECT_EQ(AddPin(belowMin, Tick(100)), min);
  const Tick near[] = {max,
                       max - Tick(Tick::Epsilon()),
                       Tick(kMax / 2),
                       Tick(),
                       Tick(kMin / 2),
                       min + Tick(Tick::Epsilon()),
                       min,
                       Tick(Tick::Epsilon())};
  for (Tick x : near) {
    for (Tick y : near) {
      const Tick r = AddPin(x, y);
      EXPECT_TRUE(InClosedInterval(r, min, max));
      const __int128 exact = static_cast<__int128>(x.AsLongLong()) + y.AsLongLong();
      if (x != max && y != max && x != min && y != min && exact > min.AsLongLong() &&
          exact < max.AsLongLong()) {
        EXPECT_EQ(r.AsLongLong(), static_cast<std::int64_t>(exact));
      }
    }
  }
}

TEST(AddPin, TockFracPinsLexicographically) {
  const TockFrac max(kMax, 0);
  const TockFrac min(kMin, 0);
  EXPECT_EQ(AddPin(max, min), max);
  EXPECT_EQ(AddPin(min, TockFrac(0, 1)), min);
  EXPECT_EQ(AddPin(TockFrac(kMax - 1, 7199999), TockFrac(0, 1)), max);
  EXPECT_EQ(AddPin(TockFrac(kMax - 1, 7199999), TockFrac(0, 0)), TockFrac(kMax - 1, 7199999));
  EXPECT_EQ(AddPin(TockFrac(kMin + 1, -1), TockFrac(-1, 0)), min);
  EXPECT_EQ(AddPin(TockFrac(-5, -3), TockFrac(2, 4)), TockFrac(-2, -7199999));
  EXPECT_EQ(AddPin(TockFrac(1, 3600000), TockFrac(1, 3600000)), TockFrac(3, 0));
  EXPECT_TRUE(InClosedInterval(AddPin(max, max), min, max));
}

TEST(Intervals, ClosedAndOpen) {
  EXPECT_TRUE(InClosedInterval(5, 5, 6));
  EXPECT_FALSE(InOpenInterval(5, 5, 6));
  EXPECT_TRUE(InOpenInterval(Tick(1), Tick(0), Tick(2)));
  EXPECT_FALSE(InOpenInterval(Tick(2), Tick(0), Tick(2)));
  EXPECT_TRUE(InClosedInterval(Tick(2), Tick(0), Tick(2)));
  EXPECT_TRUE(InOpenInterval(TockFrac(0, 1), TockFrac(), TockFrac(1, 0)));
  EXPECT_FALSE(InOpenInterval(TockFrac(), TockFrac(), TockFrac(1, 0)));
  EXPECT_TRUE(InClosedInterval(TockFrac(), TockFrac(), TockFrac(1, 0)));
}

}  // namespace
}  // namespace tarn
