#include <stdlib.h>
#include <time.h>

#include "UtcZone.h"

namespace tarn::testing {
void UseUtcTimeZone() {
  setenv("TZ", "UTC", 1);
  tzset();
}
}  // namespace tarn::testing
