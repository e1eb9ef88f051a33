// Exact sub-tick positions: whole ticks plus a remainder in 1/7,200,000 tick.
//
// TockFrac is the public face of Frac<7200000> and shares its canonical form,
// arithmetic and ordering; see tarn/Time/Frac.h.
#pragma once

#include "tarn/Time/Frac.h"

namespace tarn {

inline constexpr int kTocksPerTick = 7200000;

class TockFrac : public Frac<kTocksPerTick> {
 public:
  using Base = Frac<kTocksPerTick>;

  constexpr TockFrac() noexcept = default;
  constexpr TockFrac(int whole, int numerator) noexcept : Base(whole, numerator) {}
  constexpr TockFrac(const Base& frac) noexcept : Base(frac) {}  // NOLINT: implicit
  constexpr TockFrac(const TockFrac&) noexcept = default;
  constexpr TockFrac& operator=(const TockFrac&) noexcept = default;

 private:
  constexpr TockFrac(int whole, int numerator, AlreadyCanonical marker) noexcept
      : Base(whole, numerator, marker) {}
};

}  // namespace tarn
