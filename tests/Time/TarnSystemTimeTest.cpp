#include "tarn/Time/TarnSystemTime.h"

#include <gtest/gtest.h>

#include <cmath>
#include <cstdint>

#include "UtcZone.h"

namespace tarn {
namespace {

using TarnSystemTime::DateTimeRec;

DateTimeRec Date(int y, int mo, int d, int h = 0, int mi = 0, int s = 0) {
  DateTimeRec r;
  r.year = static_cast<std::int16_t>(y);
  r.month = static_cast<std::int16_t>(mo);
  r.day = static_cast<std::int16_t>(d);
  r.hour = static_cast<std::int16_t>(h);
  r.minute = static_cast<std::int16_t>(mi);
  r.second = static_cast<std::int16_t>(s);
  return r;
}

unsigned ToSeconds(const DateTimeRec& d) {
  unsigned s = 12345;
  TarnSystemTime::DateToSeconds(&d, &s);
  return s;
}

DateTimeRec ToDate(unsigned seconds) {
  DateTimeRec d;
  TarnSystemTime::SecondsToDate(seconds, &d);
  return d;
}

// Days from 1 January 1904 by the proleptic Gregorian calendar.
std::int64_t DaysSince1904(int y, int m, int d) {
  y -= m <= 2;
  const std::int64_t era = (y >= 0 ? y : y - 399) / 400;
  const std::int64_t yoe = y - era * 400;
  const std::int64_t doy = (153 * (m + (m > 2 ? -3 : 9)) + 2) / 5 + d - 1;
  const std::int64_t doe = yoe * 365 + yoe / 4 - yoe / 100 + doy;
  return era * 146097 + doe - 719468 + 24107;  // 24107 days from 1904 to 1970
}

class TarnSystemTimeUtc : public ::testing::Test {
 protected:
  static void SetUpTestSuite() { utc_ = testing::UseUtcTimeZone(); }
  void SetUp() override {
    if (!utc_) GTEST_SKIP() << "the system time zone is not UTC; run with TZ=UTC";
  }
  static inline bool utc_ = false;
};

TEST_F(TarnSystemTimeUtc, EpochAndKnownDates) {
  EXPECT_EQ(ToSeconds(Date(1904, 1, 1)), 0u);
  EXPECT_EQ(ToSeconds(Date(1904, 0, 0)), 0u);  // month and day 0 read as 1
  EXPECT_EQ(ToSeconds(Date(1904, -3, -7)), 0u);
  EXPECT_EQ(ToSeconds(Date(1904, 1, 1, 0, 0, 59)), 59u);
  EXPECT_EQ(ToSeconds(Date(1970, 1, 1)), 2082844800u);
  EXPECT_EQ(ToSeconds(Date(2001, 1, 1)), 3061152000u);
  EXPECT_EQ(ToSeconds(Date(2040, 2, 6, 6, 28, 15)), 0xFFFFFFFFu);
  // The day of the week plays no part on input.
  DateTimeRec withWeekday = Date(2001, 1, 1);
  withWeekday.dayOfWeek = 3;
  EXPECT_EQ(ToSeconds(withWeekday), 3061152000u);
}

TEST_F(TarnSystemTimeUtc, SecondsToDateFillsEveryField) {
  DateTimeRec epoch = Date(1904, 1, 1);
  epoch.dayOfWeek = 5;  // a Friday
  EXPECT_EQ(ToDate(0), epoch);
  DateTimeRec last = Date(2040, 2, 6, 6, 28, 15);
  last.dayOfWeek = 1;  // a Monday
  EXPECT_EQ(ToDate(0xFFFFFFFFu), last);
  DateTimeRec leap = Date(2000, 2, 29, 23, 59, 59);
  leap.dayOfWeek = 2;  // a Tuesday
  EXPECT_EQ(ToDate(ToSeconds(leap)), leap);
}

// The first of every month and the last second of every day in a sweep,
// against a calendar reference, and back again.
TEST_F(TarnSystemTimeUtc, DatesMatchCalendarReferenceAndRoundTrip) {
  for (int y = 1904; y <= 2039; ++y) {
    for (int m = 1; m <= 12; ++m) {
      const std::int64_t days = DaysSince1904(y, m, 1);
      const DateTimeRec d = Date(y, m, 1, 23, 59, 59);
      const auto expected = static_cast<unsigned>(days * 86400 + 86399);
      ASSERT_EQ(ToSeconds(d), expected) << y << "-" << m;
      DateTimeRec back = ToDate(expected);
      EXPECT_EQ(back.dayOfWeek, (days + 5) % 7);
      back.dayOfWeek = 0;
      ASSERT_EQ(back, d) << y << "-" << m;
    }
  }
  for (std::uint64_t s = 0; s <= 0xFFFFFFFFu; s += 0x00F0F0F1u) {
    const auto seconds = static_cast<unsigned>(s);
    ASSERT_EQ(ToSeconds(ToDate(seconds)), seconds);
  }
}

TEST(TarnSystemTime, UnixAndAbsoluteTimeDifferByTheEpochGap) {
  const double before = TarnSystemTime::GetAbsoluteTimeInSeconds();
  const double unix = TarnSystemTime::GetAbsoluteUnixTimeInSeconds();
  const double after = TarnSystemTime::GetAbsoluteTimeInSeconds();
  // Bracketed rather than timed: the Unix reading lies between the two others.
  EXPECT_LE(before + 978307200.0, unix + 1e-6);
  EXPECT_GE(after + 978307200.0, unix - 1e-6);
  EXPECT_GT(before, 25.0 * 365 * 86400);  // after 2025
}

TEST(TarnSystemTime, GetDateTimeAgreesWithAbsoluteTime) {
  const double before = TarnSystemTime::GetAbsoluteTimeInSeconds();
  unsigned now = 0;
  TarnSystemTime::GetDateTime(&now);
  const double after = TarnSystemTime::GetAbsoluteTimeInSeconds();
  EXPECT_GE(static_cast<double>(now), std::floor(before) + 3061152000.0);
  EXPECT_LE(static_cast<double>(now), std::floor(after) + 3061152000.0);
}

TEST(TarnSystemTime, EventTimeNeverGoesBackwards) {
  double last = TarnSystemTime::GetCurrentEventTime();
  EXPECT_GT(last, 0.0);
  for (int i = 0; i < 100000; ++i) {
    const double now = TarnSystemTime::GetCurrentEventTime();
    ASSERT_GE(now, last);
    last = now;
  }
}

}  // namespace
}  // namespace tarn
