#include <stdlib.h>
#include <time.h>

#include "String/TestTimeZone.h"

void tarn::test::SetTimeZone(const char* tz) {
  setenv("TZ", tz, 1);
  tzset();
}
