// Puts the process in the UTC time zone (TZ=UTC) for date tests. Returns
// whether the platform's local-time conversion now follows UTC: on Windows
// it follows the system's zone, which a process cannot change for itself
// (under Wine, the host's TZ at start-up).
#pragma once

namespace tarn::testing {
bool UseUtcTimeZone();
}  // namespace tarn::testing
