// Private: the platform primitives under TarnSystemTime, one definition per
// platform file. Seconds here are whole seconds since 1 January 1601 UTC, the
// file-time epoch, so that the portable code holds every epoch constant.
#pragma once

#include <cstdint>

#include "tarn/Time/TarnSystemTime.h"

namespace tarn::TarnSystemTime::detail {

// Now, in 100-nanosecond units since 1601 UTC.
[[nodiscard]] std::uint64_t FileTimeNow() noexcept;

// A monotonic millisecond uptime counter.
[[nodiscard]] std::uint64_t UptimeMilliseconds() noexcept;

// The local date (already validated) as UTC seconds since 1601.
[[nodiscard]] std::int64_t LocalDateToFileSeconds(const DateTimeRec& date);

// UTC seconds since 1601 to the local date.
void FileSecondsToLocalDate(std::int64_t fileSeconds, DateTimeRec* date) noexcept;

}  // namespace tarn::TarnSystemTime::detail
