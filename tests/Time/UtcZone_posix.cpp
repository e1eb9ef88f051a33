#include <stdlib.h>
#include <time.h>

#include "UtcZone.h"

namespace tarn::testing {
bool UseUtcTimeZone() {
  setenv("TZ", "UTC", 1);
  tzset();
  return true;
}
}  // namespace tarn::testing
