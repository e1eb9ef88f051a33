#include <gtest/gtest.h>

#include <cstdint>

#include "tarn/Time/Stopwatch.h"
#include "tarn/Time/TimerCalibrator.h"

namespace tarn {
namespace {

TEST(TimerCalibrator, ConversionsUseHundredNanosecondClocks) {
  TimerCalibrator& t = TimerCalibrator::Instance();
  EXPECT_EQ(&t, &TimerCalibrator::Instance());
  EXPECT_EQ(t.Frequency(), 1e7);
  EXPECT_EQ(t.SecondsToClocks(1.0), 10000000u);
  EXPECT_EQ(t.ClocksToSeconds(10000000), 1.0);
  EXPECT_EQ(t.SecondsToClocks(0.5e-6), 5u);
  EXPECT_EQ(t.SecondsToClocks(0.0), 0u);
  // At and above 2^63 clocks the unsigned range is used in full.
  EXPECT_EQ(t.SecondsToClocks(1e12), 10000000000000000000ull);
  EXPECT_EQ(t.SecondsToClocks(922337203685.4775808), 9223372036854775808ull);
  EXPECT_EQ(t.ClocksToSeconds(10000000000000000000ull), 1e12);
}

TEST(TimerCalibrator, ClocksAreMonotonic) {
  TimerCalibrator& t = TimerCalibrator::Instance();
  std::uint64_t last = t.Clocks();
  for (int i = 0; i < 100000; ++i) {
    const std::uint64_t now = t.Clocks();
    ASSERT_GE(now, last);
    last = now;
  }
  const std::int64_t micros = t.Microseconds();
  const double seconds = t.Seconds();
  EXPECT_GE(seconds * 1e6 + 1.0, static_cast<double>(micros));
}

TEST(Stopwatch, StopWithoutStartIsZero) {
  Stopwatch w;
  EXPECT_FALSE(w.IsRunning());
  EXPECT_EQ(w.Stop(), 0);
  w.Start();
  EXPECT_TRUE(w.IsRunning());
  EXPECT_GE(w.Stop(), 0);
  EXPECT_FALSE(w.IsRunning());
  EXPECT_EQ(w.Stop(), 0);
}

TEST(Stopwatch, RestartMeasuresFromTheLatestStart) {
  Stopwatch outer;
  Stopwatch inner;
  outer.Start();
  inner.Start();
  volatile std::uint64_t sink = 0;
  for (int i = 0; i < 200000; ++i) sink = sink + static_cast<std::uint64_t>(i);
  inner.Start();  // restart
  const std::int64_t innerMicros = inner.Stop();
  const std::int64_t outerMicros = outer.Stop();
  EXPECT_GE(innerMicros, 0);
  EXPECT_LE(innerMicros, outerMicros);
}

}  // namespace
}  // namespace tarn
