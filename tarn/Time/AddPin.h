// Saturating addition for int, Tick and TockFrac, and interval predicates.
//
// Each AddPin pins to a symmetric range: [-2147483647, 2147483647] for int,
// [Tick::Min(), Tick::Max()] for Tick, and (-2147483647, 0)..(2147483647, 0)
// for TockFrac. The tests run in a fixed order, so an operand at or beyond
// the maximum wins over one at or beyond the minimum:
//   AddPin(2147483647, -2147483647) == 2147483647.
// The sum itself is never formed when it could overflow.
#pragma once

#include "tarn/Time/Tick.h"
#include "tarn/Time/TockFrac.h"

namespace tarn {

[[nodiscard]] int AddPin(int x, int y) noexcept;
[[nodiscard]] Tick AddPin(Tick x, Tick y) noexcept;
[[nodiscard]] TockFrac AddPin(const TockFrac& x, const TockFrac& y) noexcept;

// min <= value <= max.
[[nodiscard]] constexpr bool InClosedInterval(int value, int min, int max) noexcept {
  return min <= value && value <= max;
}
[[nodiscard]] constexpr bool InClosedInterval(Tick value, Tick min, Tick max) noexcept {
  return min <= value && value <= max;
}
[[nodiscard]] constexpr bool InClosedInterval(const TockFrac& value, const TockFrac& min,
                                              const TockFrac& max) noexcept {
  return min <= value && value <= max;
}

// min < value < max.
[[nodiscard]] constexpr bool InOpenInterval(int value, int min, int max) noexcept {
  return min < value && value < max;
}
[[nodiscard]] constexpr bool InOpenInterval(Tick value, Tick min, Tick max) noexcept {
  return min < value && value < max;
}
[[nodiscard]] constexpr bool InOpenInterval(const TockFrac& value, const TockFrac& min,
                                            const TockFrac& max) noexcept {
  return min < value && value < max;
}

}  // namespace tarn
