// Half-open time ranges and sets of disjoint ranges.
//
// TimeRangeOf<T> is [start, end); it is empty when end <= start, and all
// empty ranges compare equal. TimeRegionOf<T> keeps disjoint, non-empty
// ranges sorted by start in one vector and finds positions by binary search.
// Adding merges every range that coalesces with the new one: ranges that
// overlap always coalesce; ranges that merely touch ([0, 10) and [10, 20))
// coalesce unless the region was built with the strict-coalescing flag.
//
//   TimeRegion region;                       // touching ranges merge
//   region.Add({0, 10});
//   region.Add({10, 20});                    // now one range, [0, 20)
//   region.Subtract({5, 6});                 // [0, 5), [6, 20)
//
// A derived region can mirror every edit in a parallel structure by
// overriding the protected steps AddUnion, AddReplace, SubtDelRange,
// SubtInsertRange and SubtUpdateRange. Nothing here throws except on
// allocation failure; a region belongs to one thread at a time.
#pragma once

#include <algorithm>
#include <limits>
#include <memory>
#include <vector>

namespace tarn {

template <class T>
struct TimeRangeOf {
  T start{};
  T end{};

  constexpr TimeRangeOf() noexcept = default;
  constexpr TimeRangeOf(T s, T e) noexcept : start(s), end(e) {}

  [[nodiscard]] constexpr bool IsEmpty() const noexcept { return end <= start; }
  [[nodiscard]] constexpr bool Includes(T t) const noexcept { return start <= t && t < end; }
  [[nodiscard]] constexpr TimeRangeOf Intersection(const TimeRangeOf& o) const noexcept {
    return {std::max(start, o.start), std::min(end, o.end)};
  }
  [[nodiscard]] constexpr bool Intersects(const TimeRangeOf& o) const noexcept {
    return !Intersection(o).IsEmpty();
  }
  // The smallest range covering both.
  [[nodiscard]] constexpr TimeRangeOf Union(const TimeRangeOf& o) const noexcept {
    return {std::min(start, o.start), std::max(end, o.end)};
  }

  friend constexpr bool operator==(const TimeRangeOf& a, const TimeRangeOf& b) noexcept {
    return (a.IsEmpty() && b.IsEmpty()) || (a.start == b.start && a.end == b.end);
  }
};

template <class T>
class TimeRegionOf {
 public:
  using Range = TimeRangeOf<T>;

  TimeRegionOf() = default;
  TimeRegionOf(const TimeRegionOf&) = default;
  TimeRegionOf& operator=(const TimeRegionOf&) = default;
  TimeRegionOf(TimeRegionOf&&) noexcept = default;
  TimeRegionOf& operator=(TimeRegionOf&&) noexcept = default;
  // The ranges may come in any order; they are added one by one.
  TimeRegionOf(const std::vector<Range>& ranges, bool strictCoalescing)
      : strictCoalescing_(strictCoalescing) {
    for (const Range& r : ranges) Add(r);
  }
  virtual ~TimeRegionOf() = default;

  void Clear() noexcept { ranges_.clear(); }
  [[nodiscard]] bool IsEmpty() const noexcept { return ranges_.empty(); }
  [[nodiscard]] int CountRanges() const noexcept { return static_cast<int>(ranges_.size()); }
  [[nodiscard]] const Range& NthRange(int i) const noexcept { return ranges_[i]; }
  [[nodiscard]] const std::vector<Range>& Ranges() const noexcept { return ranges_; }
  [[nodiscard]] bool IsStrictCoalescing() const noexcept { return strictCoalescing_; }

  // From the first start to the last end; (0, 0) when empty.
  [[nodiscard]] Range Bounds() const noexcept {
    return ranges_.empty() ? Range() : Range(ranges_.front().start, ranges_.back().end);
  }

  // The index of the first range whose start is >= t (CountRanges() if none).
  [[nodiscard]] int FindIndex(T t) const noexcept {
    const auto it = std::lower_bound(ranges_.begin(), ranges_.end(), t,
                                     [](const Range& r, T v) { return r.start < v; });
    return static_cast<int>(it - ranges_.begin());
  }

  [[nodiscard]] bool IncludesTime(T t) const noexcept {
    Range unused;
    return FindIfIncludesTime(t, unused);
  }
  // Copies the range that includes t into `range`.
  bool FindIfIncludesTime(T t, Range& range) const noexcept {
    const auto it = std::upper_bound(ranges_.begin(), ranges_.end(), t,
                                     [](T v, const Range& r) { return v < r.start; });
    if (it == ranges_.begin() || !(it - 1)->Includes(t)) return false;
    range = *(it - 1);
    return true;
  }
  // Whether some range intersects `range`; if so and `index` is given, the
  // index of the first one.
  bool FindIfIntersectsRange(const Range& range, int* index) const noexcept {
    if (range.IsEmpty()) return false;
    // Ends rise with starts, so the first candidate is the first range ending after range.start.
    const auto it = std::upper_bound(ranges_.begin(), ranges_.end(), range.start,
                                     [](T v, const Range& r) { return v < r.end; });
    if (it == ranges_.end() || !it->Intersects(range)) return false;
    if (index) *index = static_cast<int>(it - ranges_.begin());
    return true;
  }
  [[nodiscard]] bool Intersects(const TimeRegionOf& other) const noexcept {
    auto a = ranges_.begin();
    auto b = other.ranges_.begin();
    while (a != ranges_.end() && b != other.ranges_.end()) {
      if (a->Intersects(*b)) return true;
      if (a->end <= b->end) {
        ++a;
      } else {
        ++b;
      }
    }
    return false;
  }

  // Whether a and b merge when added: they overlap, or (unless strict) touch.
  [[nodiscard]] bool CoalesceCompare(const Range& a, const Range& b) const noexcept {
    if (a.Intersects(b)) return true;
    if (strictCoalescing_ || a.IsEmpty() || b.IsEmpty()) return false;
    return a.start == b.end || b.start == a.end;
  }

  void Add(const Range& range) {
    if (range.IsEmpty()) return;
    const T endPlusOne = range.end == std::numeric_limits<T>::max() ? range.end : range.end + 1;
    int hi = FindIndex(endPlusOne);
    Range merged = range;
    // A range starting exactly at our end sits before hi; in strict mode it
    // stays, and the walk continues past it.
    if (hi > 0 && !CoalesceCompare(ranges_[hi - 1], merged) && ranges_[hi - 1].start >= merged.end)
      --hi;
    int lo = hi;
    while (lo > 0 && CoalesceCompare(ranges_[lo - 1], merged)) {
      --lo;
      AddUnion(lo, merged);
    }
    AddReplace(lo, hi - lo, merged);
  }

  void Subtract(const Range& range) {
    if (range.IsEmpty()) return;
    int i = std::max(FindIndex(range.start) - 1, 0);
    int delFirst = -1;
    int delCount = 0;
    for (; i < CountRanges(); ++i) {
      const Range r = ranges_[i];
      if (r.start >= range.end) break;
      if (!r.Intersects(range)) continue;
      const Range left(r.start, range.start);
      const Range right(range.end, r.end);
      if (!left.IsEmpty()) {
        SubtUpdateRange(i, left);
        if (!right.IsEmpty()) {
          SubtInsertRange(i + 1, right);
          break;  // range lay inside r: nothing further can intersect
        }
      } else if (!right.IsEmpty()) {
        SubtUpdateRange(i, right);
      } else {
        if (delCount == 0) delFirst = i;
        ++delCount;
      }
    }
    if (delCount > 0) SubtDelRange(delFirst, delCount);
  }

  void AddRegion(const TimeRegionOf& other) {
    if (&other == this) return;  // a region added to itself is unchanged
    for (const Range& r : other.ranges_) Add(r);
  }
  void SubtractRegion(const TimeRegionOf& other) {
    if (&other == this) {
      std::vector<Range> copy = ranges_;
      for (const Range& r : copy) Subtract(r);
      return;
    }
    for (const Range& r : other.ranges_) Subtract(r);
  }
  // Becomes a copy of other: its ranges and its coalescing rule.
  void InitFromCopy(const TimeRegionOf& other) {
    if (&other != this) *this = other;
  }

 protected:
  // Add, per absorbed range: merges ranges_[index] into the growing range.
  virtual void AddUnion(int index, Range& growing) { growing = growing.Union(ranges_[index]); }
  // Add, at the end: `merged` replaces the `count` absorbed ranges starting at
  // `index`, or is inserted there when count is 0.
  virtual void AddReplace(int index, int count, const Range& merged) {
    if (count == 0) {
      ranges_.insert(ranges_.begin() + index, merged);
      return;
    }
    ranges_[index] = merged;
    ranges_.erase(ranges_.begin() + index + 1, ranges_.begin() + index + count);
  }
  // Subtract: removes `count` wholly covered ranges starting at `index`.
  virtual void SubtDelRange(int index, int count) {
    ranges_.erase(ranges_.begin() + index, ranges_.begin() + index + count);
  }
  // Subtract: inserts the right-hand remainder of a cut range at `index`.
  virtual void SubtInsertRange(int index, const Range& range) {
    ranges_.insert(ranges_.begin() + index, range);
  }
  // Subtract: a cut range at `index` shrinks to its remainder.
  virtual void SubtUpdateRange(int index, const Range& range) { ranges_[index] = range; }

 private:
  std::vector<Range> ranges_;  // disjoint, non-empty, sorted by start
  bool strictCoalescing_ = false;
};

extern template struct TimeRangeOf<int>;
extern template class TimeRegionOf<int>;

// The region of ints the audio layers pass around.
class TimeRegion : public TimeRegionOf<int> {
 public:
  using TimeRegionOf<int>::TimeRegionOf;
  TimeRegion() = default;
  TimeRegion(const TimeRegionOf<int>& other) : TimeRegionOf<int>(other) {}  // NOLINT: implicit

  // A heap copy owned by the caller; derived regions return their own type.
  [[nodiscard]] virtual std::unique_ptr<TimeRegion> NewTimeRegionCopy() const;
};

}  // namespace tarn
