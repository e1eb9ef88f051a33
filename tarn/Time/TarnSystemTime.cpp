#include "tarn/Time/TarnSystemTime.h"

#include "tarn/Errors/Fail.h"
#include "tarn/Time/TarnSystemTimeImpl.h"

namespace tarn::TarnSystemTime {
namespace {

// Seconds from the file-time epoch (1601) to 2001, and from 1904 to 2001.
constexpr std::int64_t kFileEpochTo2001 = 12622780800;
constexpr std::int64_t k1904To2001 = 3061152000;
constexpr std::int64_t kFileEpochTo1904 = kFileEpochTo2001 - k1904To2001;
static_assert(kFileEpochTo1904 == 9561628800);

constexpr double kFileTimeUnitsPerSecond = 1e7;

constexpr bool IsLeapYear(int y) noexcept { return (y % 4 == 0 && y % 100 != 0) || y % 400 == 0; }

int DaysInMonth(int year, int month) noexcept {
  constexpr int kDays[12] = {31, 28, 31, 30, 31, 30, 31, 31, 30, 31, 30, 31};
  return month == 2 && IsLeapYear(year) ? 29 : kDays[month - 1];
}

// Every platform accepts exactly these dates (the range of the Windows calendar).
bool IsValidDate(const DateTimeRec& d) noexcept {
  return d.year >= 1601 && d.year <= 30827 && d.month >= 1 && d.month <= 12 && d.day >= 1 &&
         d.day <= DaysInMonth(d.year, d.month) && d.hour >= 0 && d.hour <= 23 && d.minute >= 0 &&
         d.minute <= 59 && d.second >= 0 && d.second <= 59;
}

}  // namespace

double GetAbsoluteTimeInSeconds() noexcept {
  return static_cast<double>(detail::FileTimeNow()) / kFileTimeUnitsPerSecond -
         static_cast<double>(kFileEpochTo2001);
}

double GetAbsoluteUnixTimeInSeconds() noexcept {
  return GetAbsoluteTimeInSeconds() + kUnixToAbsoluteSeconds;
}

double GetCurrentEventTime() noexcept {
  return static_cast<double>(detail::UptimeMilliseconds()) / 1000.0;
}

void GetDateTime(unsigned int* seconds) noexcept {
  const auto fileSeconds = static_cast<std::int64_t>(detail::FileTimeNow() / 10000000u);
  *seconds = static_cast<unsigned int>(fileSeconds - kFileEpochTo1904);
}

void DateToSeconds(const DateTimeRec* date, unsigned int* seconds) {
  DateTimeRec d = *date;
  if (d.month < 1) d.month = 1;
  if (d.day < 1) d.day = 1;
  if (!IsValidDate(d)) Failure(kParamErr);
  *seconds = static_cast<unsigned int>(detail::LocalDateToFileSeconds(d) - kFileEpochTo1904);
}

void SecondsToDate(unsigned int seconds, DateTimeRec* date) noexcept {
  detail::FileSecondsToLocalDate(static_cast<std::int64_t>(seconds) + kFileEpochTo1904, date);
}

}  // namespace tarn::TarnSystemTime
