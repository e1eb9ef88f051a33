// Dates go through the local time zone: a fixed-offset zone shifts them.
#include <gtest/gtest.h>
#include <stdlib.h>
#include <time.h>

#include "UtcZone.h"
#include "tarn/Time/TarnSystemTime.h"

namespace tarn {
namespace {

TEST(TarnSystemTimeLocalZone, FixedOffsetZoneShiftsDates) {
  setenv("TZ", "EST5", 1);  // five hours west of UTC, no daylight saving
  tzset();
  TarnSystemTime::DateTimeRec d;
  d.year = 1904;
  d.month = 1;
  d.day = 1;
  unsigned seconds = 0;
  TarnSystemTime::DateToSeconds(&d, &seconds);
  EXPECT_EQ(seconds, 5u * 3600u);
  TarnSystemTime::DateTimeRec back;
  TarnSystemTime::SecondsToDate(0, &back);
  EXPECT_EQ(back.year, 1903);
  EXPECT_EQ(back.month, 12);
  EXPECT_EQ(back.day, 31);
  EXPECT_EQ(back.hour, 19);
  testing::UseUtcTimeZone();
}

}  // namespace
}  // namespace tarn
