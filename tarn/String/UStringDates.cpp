// Date and time texts from 1904-based second counts, in local time. The
// calendar arithmetic is done here (proleptic Gregorian) so that dates before
// 1970 work on every platform; the platform supplies only the UTC offset.
#include <cstdio>
#include <string>

#include "tarn/Errors/Fail.h"
#include "tarn/String/UStringFunctions.h"
#include "tarn/String/UStringImpl.h"

namespace tarn {

namespace {

// Seconds from 1904-01-01 to 1970-01-01.
constexpr std::int64_t k1904To1970 = 2082844800;

constexpr const char* kMonths[12] = {"January",   "February", "March",    "April",
                                     "May",       "June",     "July",     "August",
                                     "September", "October",  "November", "December"};
constexpr const char* kDays[7] = {"Sunday",   "Monday", "Tuesday", "Wednesday",
                                  "Thursday", "Friday", "Saturday"};

struct Civil {
  int year, month, day, hour, minute, second, weekday;  // weekday 0 = Sunday
};

// Howard Hinnant's days-to-civil algorithm.
Civil LocalCivil(std::uint32_t seconds1904) {
  const std::int64_t unix = static_cast<std::int64_t>(seconds1904) - k1904To1970;
  const std::int64_t local = unix + detail::LocalOffsetSeconds(unix);
  std::int64_t days = local / 86400;
  std::int64_t secs = local % 86400;
  if (secs < 0) {
    secs += 86400;
    --days;
  }
  Civil c{};
  c.hour = static_cast<int>(secs / 3600);
  c.minute = static_cast<int>(secs / 60 % 60);
  c.second = static_cast<int>(secs % 60);
  c.weekday = static_cast<int>(((days % 7) + 11) % 7);  // 1970-01-01 was a Thursday
  const std::int64_t z = days + 719468;
  const std::int64_t era = (z >= 0 ? z : z - 146096) / 146097;
  const std::int64_t doe = z - era * 146097;
  const std::int64_t yoe = (doe - doe / 1460 + doe / 36524 - doe / 146096) / 365;
  const std::int64_t doy = doe - (365 * yoe + yoe / 4 - yoe / 100);
  const std::int64_t mp = (5 * doy + 2) / 153;
  c.day = static_cast<int>(doy - (153 * mp + 2) / 5 + 1);
  c.month = static_cast<int>(mp < 10 ? mp + 3 : mp - 9);
  c.year = static_cast<int>(yoe + era * 400 + (c.month <= 2 ? 1 : 0));
  return c;
}

void CheckFormat(DateTimeFormat format) {
  if (static_cast<int>(format) < 0 || static_cast<int>(format) > 3) {
    Failure(kParamErr);
  }
}

}  // namespace

void DateToUString(std::uint32_t seconds, DateTimeFormat format, UString& out) {
  CheckFormat(format);
  const Civil c = LocalCivil(seconds);
  char buf[64];
  switch (format) {
    case DateTimeFormat::kShort:
      std::snprintf(buf, sizeof buf, "%d/%d/%d", c.month, c.day, c.year);
      break;
    case DateTimeFormat::kAbbrev:
      std::snprintf(buf, sizeof buf, "%.3s, %.3s %d, %d", kDays[c.weekday], kMonths[c.month - 1],
                    c.day, c.year);
      break;
    case DateTimeFormat::kLong:
      std::snprintf(buf, sizeof buf, "%s, %s %d, %d", kDays[c.weekday], kMonths[c.month - 1], c.day,
                    c.year);
      break;
    case DateTimeFormat::kISO:
      std::snprintf(buf, sizeof buf, "%04d-%02d-%02d", c.year, c.month, c.day);
      break;
  }
  out = UString(buf);
}

void TimeToUString(std::uint32_t seconds, DateTimeFormat format, UString& out) {
  CheckFormat(format);
  const Civil c = LocalCivil(seconds);
  char buf[32];
  if (format == DateTimeFormat::kShort) {
    std::snprintf(buf, sizeof buf, "%02d:%02d", c.hour, c.minute);
  } else {
    std::snprintf(buf, sizeof buf, "%02d:%02d:%02d", c.hour, c.minute, c.second);
  }
  out = UString(buf);
}

}  // namespace tarn
