#include "tarn/Time/TimeRegion.h"

#include <gtest/gtest.h>

#include <array>
#include <random>
#include <vector>

namespace tarn {
namespace {

using Range = TimeRangeOf<int>;

std::vector<Range> RangesOf(const TimeRegionOf<int>& region) {
  std::vector<Range> out;
  for (int i = 0; i < region.CountRanges(); ++i) out.push_back(region.NthRange(i));
  return out;
}

// Keeps a parallel copy of the ranges through the overridable steps only, the
// way a derived region mirrors edits in its own structure.
class MirroredRegion : public TimeRegion {
 public:
  explicit MirroredRegion(bool strict) : TimeRegion(std::vector<Range>{}, strict) {}
  std::vector<Range> mirror;

 protected:
  void AddReplace(int index, int count, const Range& merged) override {
    if (count == 0) {
      mirror.insert(mirror.begin() + index, merged);
    } else {
      mirror[index] = merged;
      mirror.erase(mirror.begin() + index + 1, mirror.begin() + index + count);
    }
    TimeRegion::AddReplace(index, count, merged);
  }
  void SubtDelRange(int index, int count) override {
    mirror.erase(mirror.begin() + index, mirror.begin() + index + count);
    TimeRegion::SubtDelRange(index, count);
  }
  void SubtInsertRange(int index, const Range& range) override {
    mirror.insert(mirror.begin() + index, range);
    TimeRegion::SubtInsertRange(index, range);
  }
  void SubtUpdateRange(int index, const Range& range) override {
    mirror[index] = range;
    TimeRegion::SubtUpdateRange(index, range);
  }
};

TEST(TimeRange, EmptinessAndEquality) {
  EXPECT_TRUE(Range(5, 5).IsEmpty());
  EXPECT_TRUE(Range(6, 5).IsEmpty());
  EXPECT_EQ(Range(6, 5), Range(1, 1));  // all empty ranges are equal
  EXPECT_NE(Range(0, 2), Range(0, 3));
  EXPECT_TRUE(Range(0, 10).Includes(0));
  EXPECT_FALSE(Range(0, 10).Includes(10));
  EXPECT_FALSE(Range(0, 10).Intersects(Range(10, 20)));
  EXPECT_TRUE(Range(0, 11).Intersects(Range(10, 20)));
}

TEST(TimeRegion, TouchingRangesCoalesceUnlessStrict) {
  TimeRegion loose;
  loose.Add({0, 10});
  loose.Add({10, 20});
  EXPECT_EQ(RangesOf(loose), (std::vector<Range>{{0, 20}}));

  TimeRegion strict(std::vector<Range>{}, true);
  strict.Add({0, 10});
  strict.Add({10, 20});
  EXPECT_EQ(RangesOf(strict), (std::vector<Range>{{0, 10}, {10, 20}}));
  // Overlap merges in both modes, even past a range that only touches.
  strict.Add({5, 10});
  EXPECT_EQ(strict.CountRanges(), 2);
  strict.Add({-5, 1});
  EXPECT_EQ(RangesOf(strict), (std::vector<Range>{{-5, 10}, {10, 20}}));
  strict.Add({9, 11});
  EXPECT_EQ(RangesOf(strict), (std::vector<Range>{{-5, 20}}));
}

TEST(TimeRegion, UnionIntersectionSubtraction) {
  TimeRegion r;
  r.Add({0, 5});
  r.Add({10, 15});
  r.Add({20, 25});
  r.Add({3, 12});  // bridges the first two
  EXPECT_EQ(RangesOf(r), (std::vector<Range>{{0, 15}, {20, 25}}));
  r.Add({7, 7});  // empty: ignored
  EXPECT_EQ(r.CountRanges(), 2);
  EXPECT_EQ(r.Bounds(), Range(0, 25));

  r.Subtract({4, 6});  // splits
  EXPECT_EQ(RangesOf(r), (std::vector<Range>{{0, 4}, {6, 15}, {20, 25}}));
  r.Subtract({2, 22});  // trims the ends, deletes the middle
  EXPECT_EQ(RangesOf(r), (std::vector<Range>{{0, 2}, {22, 25}}));
  r.Subtract({15, 16});  // nothing there
  EXPECT_EQ(r.CountRanges(), 2);
  r.Subtract({-100, 100});
  EXPECT_TRUE(r.IsEmpty());
  EXPECT_EQ(r.Bounds(), Range(0, 0));
}

TEST(TimeRegion, Queries) {
  TimeRegion r(std::vector<Range>{{20, 25}, {0, 5}, {10, 15}}, false);
  EXPECT_EQ(RangesOf(r), (std::vector<Range>{{0, 5}, {10, 15}, {20, 25}}));
  EXPECT_EQ(r.FindIndex(-1), 0);
  EXPECT_EQ(r.FindIndex(0), 0);
  EXPECT_EQ(r.FindIndex(1), 1);
  EXPECT_EQ(r.FindIndex(10), 1);
  EXPECT_EQ(r.FindIndex(21), 3);
  Range found;
  EXPECT_TRUE(r.FindIfIncludesTime(14, found));
  EXPECT_EQ(found, Range(10, 15));
  EXPECT_FALSE(r.FindIfIncludesTime(15, found));
  EXPECT_FALSE(r.IncludesTime(-1));
  int index = -1;
  EXPECT_TRUE(r.FindIfIntersectsRange({4, 11}, &index));
  EXPECT_EQ(index, 0);
  EXPECT_TRUE(r.FindIfIntersectsRange({14, 100}, &index));
  EXPECT_EQ(index, 1);
  EXPECT_FALSE(r.FindIfIntersectsRange({15, 20}, &index));
  EXPECT_FALSE(r.FindIfIntersectsRange({12, 12}, nullptr));

  TimeRegion other(std::vector<Range>{{5, 10}, {15, 20}}, false);
  EXPECT_FALSE(r.Intersects(other));
  other.Add({24, 30});
  EXPECT_TRUE(r.Intersects(other));
}

TEST(TimeRegion, RangesAtTheIntLimits) {
  constexpr int kMax = 2147483647;
  TimeRegion r;
  r.Add({kMax - 10, kMax});
  r.Add({kMax - 20, kMax - 10});
  EXPECT_EQ(RangesOf(r), (std::vector<Range>{{kMax - 20, kMax}}));
  r.Subtract({kMax - 15, kMax});
  EXPECT_EQ(RangesOf(r), (std::vector<Range>{{kMax - 20, kMax - 15}}));
}

TEST(TimeRegion, RegionOperationsAndCopies) {
  TimeRegion a(std::vector<Range>{{0, 10}, {20, 30}}, false);
  TimeRegion b(std::vector<Range>{{5, 25}}, false);
  TimeRegion u = a;
  u.AddRegion(b);
  EXPECT_EQ(RangesOf(u), (std::vector<Range>{{0, 30}}));
  TimeRegion d = a;
  d.SubtractRegion(b);
  EXPECT_EQ(RangesOf(d), (std::vector<Range>{{0, 5}, {25, 30}}));
  d.SubtractRegion(d);
  EXPECT_TRUE(d.IsEmpty());
  u.AddRegion(u);
  EXPECT_EQ(RangesOf(u), (std::vector<Range>{{0, 30}}));

  TimeRegion strict(std::vector<Range>{}, true);
  strict.InitFromCopy(a);
  EXPECT_EQ(RangesOf(strict), RangesOf(a));
  EXPECT_FALSE(strict.IsStrictCoalescing());

  const std::unique_ptr<TimeRegion> copy = a.NewTimeRegionCopy();
  a.Clear();
  EXPECT_EQ(RangesOf(*copy), (std::vector<Range>{{0, 10}, {20, 30}}));
}

// Random edits over a 24-slot universe against a plain bitmap, in both
// coalescing modes, with a derived region mirroring every step.
TEST(TimeRegion, RandomEditsMatchBitmapReference) {
  constexpr int kSlots = 24;
  std::mt19937 rng(1234);
  std::uniform_int_distribution<int> pos(-2, kSlots + 2);
  for (bool strict : {false, true}) {
    for (int trial = 0; trial < 200; ++trial) {
      MirroredRegion region(strict);
      std::array<bool, kSlots + 8> bits{};
      for (int step = 0; step < 30; ++step) {
        const int s = pos(rng);
        const int e = pos(rng);
        const bool add = (rng() % 3) != 0;
        if (add) {
          region.Add({s, e});
        } else {
          region.Subtract({s, e});
        }
        for (int t = s; t < e; ++t) bits[t + 2] = add;

        const std::vector<Range> ranges = RangesOf(region);
        ASSERT_EQ(region.mirror, ranges);
        int runs = 0;
        for (int t = -2; t < kSlots + 4; ++t) {
          ASSERT_EQ(region.IncludesTime(t), bits[t + 2]) << "t=" << t;
          if (bits[t + 2] && (t == -2 || !bits[t + 1])) ++runs;
        }
        for (size_t i = 0; i < ranges.size(); ++i) {
          ASSERT_FALSE(ranges[i].IsEmpty());
          if (i > 0) {
            ASSERT_LE(ranges[i - 1].end, ranges[i].start);
            if (!strict) {
              ASSERT_LT(ranges[i - 1].end, ranges[i].start);
            }
          }
        }
        if (!strict) {
          ASSERT_EQ(region.CountRanges(), runs);
        }
      }
    }
  }
}

}  // namespace
}  // namespace tarn
