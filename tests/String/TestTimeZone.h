// Sets the process time zone (a TZ value such as "UTC0" or "EST5") for tests.
#pragma once

namespace tarn::test {
void SetTimeZone(const char* tz);
}
