#include "tarn/Time/TimeRegion.h"

namespace tarn {

template struct TimeRangeOf<int>;
template class TimeRegionOf<int>;

std::unique_ptr<TimeRegion> TimeRegion::NewTimeRegionCopy() const {
  return std::make_unique<TimeRegion>(*this);
}

}  // namespace tarn
