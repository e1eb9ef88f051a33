#include <windows.h>
// After windows.h, which it needs.
#include <mmsystem.h>

#include "tarn/Time/TarnSystemTimeImpl.h"

namespace tarn::TarnSystemTime::detail {
namespace {

std::uint64_t ToUInt64(const FILETIME& ft) noexcept {
  return (static_cast<std::uint64_t>(ft.dwHighDateTime) << 32) | ft.dwLowDateTime;
}

FILETIME ToFileTime(std::uint64_t units) noexcept {
  FILETIME ft;
  ft.dwLowDateTime = static_cast<DWORD>(units);
  ft.dwHighDateTime = static_cast<DWORD>(units >> 32);
  return ft;
}

}  // namespace

std::uint64_t FileTimeNow() noexcept {
  FILETIME ft;
  GetSystemTimeAsFileTime(&ft);
  return ToUInt64(ft);
}

std::uint64_t UptimeMilliseconds() noexcept { return timeGetTime(); }

std::int64_t LocalDateToFileSeconds(const DateTimeRec& date) noexcept {
  SYSTEMTIME local{};
  local.wYear = static_cast<WORD>(date.year);
  local.wMonth = static_cast<WORD>(date.month);
  local.wDay = static_cast<WORD>(date.day);
  local.wHour = static_cast<WORD>(date.hour);
  local.wMinute = static_cast<WORD>(date.minute);
  local.wSecond = static_cast<WORD>(date.second);
  local.wDayOfWeek = static_cast<WORD>(date.dayOfWeek);
  local.wMilliseconds = 0;
  // Local to UTC by the zone's rules for that date, as the C runtime does.
  SYSTEMTIME utc{};
  FILETIME ft{};
  if (!TzSpecificLocalTimeToSystemTime(nullptr, &local, &utc) || !SystemTimeToFileTime(&utc, &ft))
    return 0;
  return static_cast<std::int64_t>(ToUInt64(ft) / 10000000u);
}

void FileSecondsToLocalDate(std::int64_t fileSeconds, DateTimeRec* date) noexcept {
  const FILETIME ft = ToFileTime(static_cast<std::uint64_t>(fileSeconds) * 10000000u);
  SYSTEMTIME utc{};
  SYSTEMTIME local{};
  if (!FileTimeToSystemTime(&ft, &utc) || !SystemTimeToTzSpecificLocalTime(nullptr, &utc, &local))
    local = SYSTEMTIME{};
  date->year = static_cast<std::int16_t>(local.wYear);
  date->month = static_cast<std::int16_t>(local.wMonth);
  date->day = static_cast<std::int16_t>(local.wDay);
  date->hour = static_cast<std::int16_t>(local.wHour);
  date->minute = static_cast<std::int16_t>(local.wMinute);
  date->second = static_cast<std::int16_t>(local.wSecond);
  date->dayOfWeek = static_cast<std::int16_t>(local.wDayOfWeek);
}

}  // namespace tarn::TarnSystemTime::detail
