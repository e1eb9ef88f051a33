// Wall-clock time, event time and calendar dates.
//
// Absolute time counts seconds since 1 January 2001, 00:00 UTC; Unix time
// counts from 1970. Event time is a millisecond uptime counter in seconds: it
// never goes backwards and is what callers use to seed per-event state (the
// sample converter seeds its dither from it). Date second counts are unsigned
// 32-bit seconds since 1 January 1904, 00:00 UTC, converted to and from
// calendar dates in the process's local time zone.
//
// None of these functions block, and only DateToSeconds throws; all may be
// called from any thread.
#pragma once

#include <cstdint>

namespace tarn::TarnSystemTime {

// A calendar date and time of day, in local time.
struct DateTimeRec {
  std::int16_t year = 0;
  std::int16_t month = 0;  // 1..12
  std::int16_t day = 0;    // 1..31
  std::int16_t hour = 0;
  std::int16_t minute = 0;
  std::int16_t second = 0;
  std::int16_t dayOfWeek = 0;  // 0 (Sunday) .. 6 (Saturday); ignored on input

  friend bool operator==(const DateTimeRec&, const DateTimeRec&) = default;
};

// Seconds from 1 January 1970 to 1 January 2001.
inline constexpr double kUnixToAbsoluteSeconds = 978307200.0;

// Seconds since 1 January 2001, 00:00 UTC.
[[nodiscard]] double GetAbsoluteTimeInSeconds() noexcept;

// Seconds since 1 January 1970, 00:00 UTC: GetAbsoluteTimeInSeconds() + 978307200.
[[nodiscard]] double GetAbsoluteUnixTimeInSeconds() noexcept;

// The system's millisecond uptime counter, in seconds; monotonic.
[[nodiscard]] double GetCurrentEventTime() noexcept;

// Now, as seconds since 1 January 1904 UTC (low 32 bits).
void GetDateTime(unsigned int* seconds) noexcept;

// Local date to seconds since 1904 UTC (low 32 bits, so dates outside
// 1904..2040 wrap). Month and day below 1 are read as 1; the day of the week
// is ignored. Throws TarnError -50 for a date that does not exist: a year
// outside 1601..30827, a month above 12, a day beyond the month's end, or a
// time of day outside 00:00:00..23:59:59.
void DateToSeconds(const DateTimeRec* date, unsigned int* seconds);

// Seconds since 1904 UTC to a local date, day of the week included.
void SecondsToDate(unsigned int seconds, DateTimeRec* date) noexcept;

}  // namespace tarn::TarnSystemTime
