#include <stdlib.h>
#include <time.h>
#include <windows.h>

#include "UtcZone.h"

namespace tarn::testing {
bool UseUtcTimeZone() {
  _putenv("TZ=UTC");
  _tzset();
  TIME_ZONE_INFORMATION zone{};
  const DWORD id = GetTimeZoneInformation(&zone);
  if (id == TIME_ZONE_ID_INVALID || zone.Bias != 0) return false;
  // Daylight saving must not move the clock either.
  return zone.DaylightDate.wMonth == 0 || zone.DaylightBias == zone.StandardBias;
}
}  // namespace tarn::testing
