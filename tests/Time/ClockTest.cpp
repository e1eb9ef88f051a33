// Dates in UTC, the clocks and the stopwatch.
#include <gtest/gtest.h>
#include <stdlib.h>
#include <time.h>
#ifdef _WIN32
#include <windows.h>
#endif

#include <cmath>
#include <cstdint>
#include <utility>

#include "tarn/Errors/TarnError.h"
#include "tarn/Time/Stopwatch.h"
#include "tarn/Time/TarnSystemTime.h"
#include "tarn/Time/TimerCalibrator.h"

namespace tarn {
namespace {

using TarnSystemTime::DateTimeRec;

DateTimeRec Date(int y, int mo, int d, int h = 0, int mi = 0, int s = 0, int w = 0) {
  using S = std::int16_t;
  return DateTimeRec{S(y), S(mo), S(d), S(h), S(mi), S(s), S(w)};
}

unsigned ToSeconds(const DateTimeRec& d) {
  unsigned s = 12345;
  return TarnSystemTime::DateToSeconds(&d, &s), s;
}

DateTimeRec ToDate(unsigned seconds) {
  DateTimeRec d;
  return TarnSystemTime::SecondsToDate(seconds, &d), d;
}

// Puts the process in UTC; on Windows the system's own zone must be UTC already.
bool UseUtcTimeZone() {
#ifdef _WIN32
  _putenv("TZ=UTC");
  _tzset();
  TIME_ZONE_INFORMATION zone{};
  return GetTimeZoneInformation(&zone) != TIME_ZONE_ID_INVALID && zone.Bias == 0 &&
         (zone.DaylightDate.wMonth == 0 || zone.DaylightBias == zone.StandardBias);
#else
  setenv("TZ", "UTC", 1);
  tzset();
  return true;
#endif
}

class TarnSystemTimeUtc : public ::testing::Test {
 protected:
  void SetUp() override {
    if (!UseUtcTimeZone()) GTEST_SKIP() << "the system time zone is not UTC";
  }
};

TEST_F(TarnSystemTimeUtc, DatesMatchCalendarRoundTripAndRejectNonexistentOnes) {
  std::int64_t days = 0;  // from 1 January 1904 to the first of the month
  for (int y = 1904; y <= 2039; ++y) {
    for (int m = 1; m <= 12; days += m == 2 ? 28 + (y % 4 == 0) : 30 + ((m + m / 8) & 1), ++m) {
      const auto expected = static_cast<unsigned>(days * 86400 + 86399);
      ASSERT_EQ(ToSeconds(Date(y, m, 1, 23, 59, 59)), expected) << y << "-" << m;
      ASSERT_EQ(ToDate(expected), Date(y, m, 1, 23, 59, 59, static_cast<int>((days + 5) % 7)));
    }
  }
  EXPECT_EQ(ToSeconds(Date(1904, -3, -7)), 0u);  // month and day below 1 read as 1
  EXPECT_EQ(ToDate(0xFFFFFFFFu), Date(2040, 2, 6, 6, 28, 15, 1));
  EXPECT_EQ(ToDate(ToSeconds(Date(2000, 2, 29, 23, 59, 59))), Date(2000, 2, 29, 23, 59, 59, 2));
  for (std::uint64_t s = 0; s <= 0xFFFFFFFFu; s += 0x00F0F0F1u) {
    ASSERT_EQ(ToSeconds(ToDate(static_cast<unsigned>(s))), s);
  }
  for (const DateTimeRec& d : {Date(2001, 13, 1), Date(2001, 2, 29), Date(2001, 4, 31),
                               Date(2001, 1, 32), Date(2001, 1, 1, 24), Date(2001, 1, 1, 0, 60),
                               Date(2001, 1, 1, 0, 0, -1), Date(1600, 12, 31)}) {
    EXPECT_THROW((void)ToSeconds(d), TarnError) << d.year << "-" << d.month << "-" << d.day;
  }
}

TEST(TarnSystemTime, ClocksAgreeAndStopwatchRestarts) {
  const double before = TarnSystemTime::GetAbsoluteTimeInSeconds();
  const double unix = TarnSystemTime::GetAbsoluteUnixTimeInSeconds();
  unsigned now = 0;
  TarnSystemTime::GetDateTime(&now);
  const double after = TarnSystemTime::GetAbsoluteTimeInSeconds();
  EXPECT_LE(before + 978307200.0, unix + 1e-6);
  EXPECT_GE(after + 978307200.0, unix - 1e-6);
  EXPECT_GE(now, std::floor(before) + 3061152000.0);
  EXPECT_LE(now, std::floor(after) + 3061152000.0);
  double last = TarnSystemTime::GetCurrentEventTime();
  std::uint64_t lastClocks = TimerCalibrator::Instance().Clocks();
  for (int i = 0; i < 100000; ++i) {
    const double event = TarnSystemTime::GetCurrentEventTime();
    const std::uint64_t clocks = TimerCalibrator::Instance().Clocks();
    ASSERT_GE(event, std::exchange(last, event));
    ASSERT_GE(clocks, std::exchange(lastClocks, clocks));
  }
  const TimerCalibrator& t = TimerCalibrator::Instance();
  EXPECT_EQ(t.SecondsToClocks(922337203685.4775808), 9223372036854775808ull);
  EXPECT_EQ(t.ClocksToSeconds(10000000000000000000ull), 1e12);
  Stopwatch outer, inner;
  EXPECT_EQ(inner.Stop(), 0);
  outer.Start();
  inner.Start();
  volatile std::uint64_t sink = 0;
  for (int i = 0; i < 200000; ++i) sink = sink + static_cast<std::uint64_t>(i);
  inner.Start();
  const std::int64_t innerMicros = inner.Stop();
  EXPECT_GE(innerMicros, 0);
  EXPECT_LE(innerMicros, outer.Stop());
}

}  // namespace
}  // namespace tarn
