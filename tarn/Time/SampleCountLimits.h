// The largest and smallest sample positions the library uses as sentinels:
// ±(2^48 - 1), far beyond any real recording yet safe to add lengths to.
#pragma once

#include "tarn/Time/SampleCount.h"

namespace tarn {

inline constexpr SampleCount kLargestSampleCount{281474976710655LL};
inline constexpr SampleCount kSmallestSampleCount{-281474976710655LL};

}  // namespace tarn
