#include "tarn/Audio/Dither.h"

#include "tarn/Time/TarnSystemTime.h"

namespace tarn {

std::uint32_t TriangularPDFDither16::SeedForEventTime(double seconds) noexcept {
  const double v = seconds * 60.0 + 0.5;
  // Event time is an uptime counter; anything outside the 64-bit range (or
  // NaN) would make the truncation undefined, so it seeds with 0.
  if (!(v > -9.2e18 && v < 9.2e18)) return 0;
  return static_cast<std::uint32_t>(static_cast<std::uint64_t>(static_cast<std::int64_t>(v)));
}

TriangularPDFDither16::TriangularPDFDither16() noexcept
    : mState(SeedForEventTime(TarnSystemTime::GetCurrentEventTime())) {}

}  // namespace tarn
