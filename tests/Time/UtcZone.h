// Puts the process's C runtime in the UTC time zone (TZ=UTC), so that date
// tests give the same answers on every machine.
#pragma once

namespace tarn::testing {
void UseUtcTimeZone();
}  // namespace tarn::testing
