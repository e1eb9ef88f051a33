#include <stdlib.h>
#include <time.h>

#include "String/TestTimeZone.h"

void tarn::test::SetTimeZone(const char* tz) {
  _putenv_s("TZ", tz);
  _tzset();
}
