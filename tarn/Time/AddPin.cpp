#include "tarn/Time/AddPin.h"

namespace tarn {
namespace {

// The one rule behind every AddPin: max wins over min, then each side is
// checked against the room left by the other, so the sum is formed only when
// it lies strictly inside the bounds.
template <class T>
T PinnedSum(const T& x, const T& y, const T& min, const T& max) noexcept {
  if (x >= max || y >= max) return max;
  if (x <= min || y <= min) return min;
  if (x <= T{}) {
    if (y <= min - x) return min;
  } else if (y >= max - x) {
    return max;
  }
  return x + y;
}

}  // namespace

int AddPin(int x, int y) noexcept { return PinnedSum(x, y, -2147483647, 2147483647); }

Tick AddPin(Tick x, Tick y) noexcept {
  return PinnedSum(x, y, Tick(Tick::Min()), Tick(Tick::Max()));
}

TockFrac AddPin(const TockFrac& x, const TockFrac& y) noexcept {
  return PinnedSum<TockFrac>(x, y, TockFrac(-2147483647, 0), TockFrac(2147483647, 0));
}

}  // namespace tarn
