#include <time.h>

#include "tarn/Time/TarnSystemTimeImpl.h"

namespace tarn::TarnSystemTime::detail {
namespace {

constexpr std::int64_t kFileEpochToUnix = 11644473600;

}  // namespace

std::uint64_t FileTimeNow() noexcept {
  timespec ts{};
  clock_gettime(CLOCK_REALTIME, &ts);
  return static_cast<std::uint64_t>(ts.tv_sec + kFileEpochToUnix) * 10000000u +
         static_cast<std::uint64_t>(ts.tv_nsec) / 100u;
}

std::uint64_t UptimeMilliseconds() noexcept {
  timespec ts{};
  clock_gettime(CLOCK_MONOTONIC, &ts);
  return static_cast<std::uint64_t>(ts.tv_sec) * 1000u +
         static_cast<std::uint64_t>(ts.tv_nsec) / 1000000u;
}

std::int64_t LocalDateToFileSeconds(const DateTimeRec& date) {
  tm t{};
  t.tm_year = date.year - 1900;
  t.tm_mon = date.month - 1;
  t.tm_mday = date.day;
  t.tm_hour = date.hour;
  t.tm_min = date.minute;
  t.tm_sec = date.second;
  t.tm_isdst = -1;  // let the zone's rules decide for that date
  return static_cast<std::int64_t>(mktime(&t)) + kFileEpochToUnix;
}

void FileSecondsToLocalDate(std::int64_t fileSeconds, DateTimeRec* date) noexcept {
  const auto unixSeconds = static_cast<time_t>(fileSeconds - kFileEpochToUnix);
  tm t{};
  localtime_r(&unixSeconds, &t);
  date->year = static_cast<std::int16_t>(t.tm_year + 1900);
  date->month = static_cast<std::int16_t>(t.tm_mon + 1);
  date->day = static_cast<std::int16_t>(t.tm_mday);
  date->hour = static_cast<std::int16_t>(t.tm_hour);
  date->minute = static_cast<std::int16_t>(t.tm_min);
  date->second = static_cast<std::int16_t>(t.tm_sec);
  date->dayOfWeek = static_cast<std::int16_t>(t.tm_wday);
}

}  // namespace tarn::TarnSystemTime::detail
