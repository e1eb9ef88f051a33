#include "tarn/Audio/FunctionGenerator.h"

#include <gtest/gtest.h>

#include <cmath>

#include "tarn/Errors/TarnError.h"

namespace tarn {
namespace {

constexpr double kPeriod = 100.0;
constexpr double kAmp = 0.5;

TEST(FunctionGenerator, ValuesAtStartOfCycle) {
  EXPECT_EQ(FunctionGenerator(new SineWave, kPeriod, kAmp).GetValue(0), 0.0);
  EXPECT_EQ(FunctionGenerator(new SquareWave, kPeriod, kAmp).GetValue(0), kAmp);
  EXPECT_EQ(FunctionGenerator(new SawToothWave, kPeriod, kAmp).GetValue(0), -kAmp);
  EXPECT_EQ(FunctionGenerator(new TriangleWave, kPeriod, kAmp).GetValue(0), -kAmp);
}

TEST(FunctionGenerator, HalfPeriodSquareIsZeroTriangleIsPeak) {
  EXPECT_EQ(FunctionGenerator(new SquareWave, kPeriod, kAmp).GetValue(kPeriod / 2), 0.0);
  EXPECT_EQ(FunctionGenerator(new TriangleWave, kPeriod, kAmp).GetValue(kPeriod / 2), kAmp);
  // Just before the half, the square is still high: it is unipolar 1/0.
  EXPECT_EQ(FunctionGenerator(new SquareWave, kPeriod, kAmp).GetValue(kPeriod / 2 - 1e-9), kAmp);
}

TEST(FunctionGenerator, NegativeTimesAreNotFolded) {
  const double t = -kPeriod / 4;  // phase -0.25
  EXPECT_EQ(FunctionGenerator(new SquareWave, kPeriod, kAmp).GetValue(t), kAmp);
  EXPECT_EQ(FunctionGenerator(new SawToothWave, kPeriod, kAmp).GetValue(t), -1.5 * kAmp);
  EXPECT_EQ(FunctionGenerator(new TriangleWave, kPeriod, kAmp).GetValue(t), -2.0 * kAmp);
  EXPECT_NEAR(FunctionGenerator(new SineWave, kPeriod, kAmp).GetValue(t), -kAmp, 1e-15);
}

TEST(FunctionGenerator, WholePeriodsGivePhaseZero) {
  FunctionGenerator saw(new SawToothWave, kPeriod, kAmp);
  FunctionGenerator tri(new TriangleWave, 4.0, 2.0);
  for (int k = -5; k <= 5; ++k) {
    EXPECT_EQ(saw.GetValue(k * kPeriod), -kAmp) << k;
    EXPECT_EQ(tri.GetValue(k * 4.0), -2.0) << k;
  }
}

TEST(FunctionGenerator, ShapesOverOneCycleMatchTheirFormulas) {
  SineWave sine;
  SquareWave square;
  SawToothWave saw;
  TriangleWave tri;
  for (int i = 0; i < 64; ++i) {
    const double p = i / 64.0;
    EXPECT_EQ(sine.GetValue(p), std::sin(p * 2.0 * 3.141592653589793));
    EXPECT_EQ(square.GetValue(p), i < 32 ? 1.0 : 0.0);
    EXPECT_EQ(saw.GetValue(p), 2 * p - 1);
    EXPECT_EQ(tri.GetValue(p), i < 32 ? 4 * p - 1 : -4 * p + 3);
  }
  // The triangle is continuous at the fold and at the cycle's end.
  EXPECT_EQ(tri.GetValue(0.5), 1.0);
  EXPECT_NEAR(tri.GetValue(1.0 - 1e-12), -1.0, 1e-11);
}

TEST(FunctionGenerator, NullShapeIsOutOfMemory) {
  try {
    FunctionGenerator g(nullptr, kPeriod, kAmp);
    FAIL() << "no error";
  } catch (const TarnError& e) {
    EXPECT_TRUE(e.IsMacOSError(-108));
  }
}

TEST(FunctionGenerator, KeepsPeriodAndAmplitude) {
  FunctionGenerator g(new SineWave, 48000.0 / 440.0, 0.25);
  EXPECT_EQ(g.GetPeriod(), 48000.0 / 440.0);
  EXPECT_EQ(g.GetAmplitude(), 0.25);
  FunctionGenerator moved(std::move(g));
  EXPECT_EQ(moved.GetAmplitude(), 0.25);
  EXPECT_NEAR(moved.GetValue(48000.0 / 440.0 / 4), 0.25, 1e-15);
}

}  // namespace
}  // namespace tarn
