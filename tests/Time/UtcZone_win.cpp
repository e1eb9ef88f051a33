#include <stdlib.h>
#include <time.h>

#include "UtcZone.h"

namespace tarn::testing {
void UseUtcTimeZone() {
  _putenv("TZ=UTC");
  _tzset();
}
}  // namespace tarn::testing
