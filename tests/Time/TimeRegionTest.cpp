#include "tarn/Time/TimeRegion.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <memory>
#include <random>
#include <utility>
#include <vector>

#include "tarn/Errors/TarnError.h"

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
    mirror.erase(mirror.begin() + index, mirror.begin() + index + count);
    mirror.insert(mirror.begin() + index, merged);
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

TEST(TimeRegion, QueriesRegionOperationsAndIntLimits) {
  TimeRegion r(std::vector<Range>{{20, 25}, {0, 5}, {10, 15}}, false);
  EXPECT_EQ(RangesOf(r), (std::vector<Range>{{0, 5}, {10, 15}, {20, 25}}));
  EXPECT_THROW((void)r.NthRange(3), TarnError);
  int index = -1;
  EXPECT_TRUE(r.FindIfIntersectsRange({14, 100}, &index));
  EXPECT_EQ(index, 1);
  EXPECT_FALSE(r.FindIfIntersectsRange({15, 20}, &index));

  TimeRegion other(std::vector<Range>{{5, 10}, {15, 20}}, false);
  other.Add({24, 30});
  EXPECT_TRUE(r.Intersects(other));
  other.SubtractRegion(r);
  EXPECT_EQ(RangesOf(other), (std::vector<Range>{{5, 10}, {15, 20}, {25, 30}}));
  other.AddRegion(r);
  EXPECT_EQ(RangesOf(other), (std::vector<Range>{{0, 30}}));
  other.SubtractRegion(other);
  EXPECT_TRUE(other.IsEmpty());

  constexpr int kMax = 2147483647;
  r.Clear();
  r.Add({kMax - 10, kMax});
  r.Add({kMax - 20, kMax - 10});
  r.Subtract({kMax - 15, kMax});
  EXPECT_EQ(RangesOf(r), (std::vector<Range>{{kMax - 20, kMax - 15}}));
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
        const int s = pos(rng), e = pos(rng);
        const bool add = (rng() % 3) != 0;
        add ? region.Add({s, e}) : region.Subtract({s, e});
        for (int t = s; t < e; ++t) bits[t + 2] = add;

        const std::vector<Range> ranges = RangesOf(region);
        ASSERT_EQ(region.mirror, ranges);
        const Range bounds = region.Bounds();
        ASSERT_EQ(
            std::pair(bounds.start, bounds.end),
            ranges.empty() ? std::pair(0, 0) : std::pair(ranges.front().start, ranges.back().end));
        for (int t = -2; t < kSlots + 4; ++t) {
          Range found;
          ASSERT_EQ(region.FindIfIncludesTime(t, found), bits[t + 2]) << "t=" << t;
          ASSERT_TRUE(!bits[t + 2] || found.Includes(t));
          ASSERT_EQ(region.FindIndex(t),
                    std::count_if(ranges.begin(), ranges.end(),
                                  [t](const Range& x) { return x.start < t; }));
        }
        for (size_t i = 0; i < ranges.size(); ++i) {
          ASSERT_FALSE(ranges[i].IsEmpty());
          if (i > 0) {
            ASSERT_LE(ranges[i - 1].end + !strict, ranges[i].start);
          }
        }
      }
      // Copies keep the ranges and the coalescing rule.
      const std::unique_ptr<TimeRegion> copy = region.NewTimeRegionCopy();
      TimeRegion assigned(std::vector<Range>{{1, 2}}, !strict);
      assigned.InitFromCopy(region);
      for (const TimeRegion* r : {copy.get(), &assigned}) {
        ASSERT_EQ(RangesOf(*r), RangesOf(region));
        ASSERT_EQ(r->IsStrictCoalescing(), strict);
      }
    }
  }
}

}  // namespace
}  // namespace tarn
