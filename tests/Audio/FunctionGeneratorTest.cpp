#include "tarn/Audio/FunctionGenerator.h"

#include <gtest/gtest.h>

#include "AudioTestUtil.h"

namespace tarn {
namespace {

// The shapes over one cycle, and the generator's scaling of time and value:
// negative times are not folded into the cycle, whole periods are phase 0.
TEST(FunctionGenerator, ShapesAndScaling) {
  for (int i = 0; i < 64; ++i) {
    const double p = i / 64.0;
    EXPECT_EQ(SineWave().GetValue(p), std::sin(p * 2.0 * 3.141592653589793));
    EXPECT_EQ(SquareWave().GetValue(p), i < 32 ? 1.0 : 0.0);
    EXPECT_EQ(SawToothWave().GetValue(p), 2 * p - 1);
    EXPECT_EQ(TriangleWave().GetValue(p), i < 32 ? 4 * p - 1 : -4 * p + 3);
  }
  const struct {
    WaveCycle* shape;
    double t, want;
  } rows[] = {{new SquareWave, -25, 0.5},       {new SawToothWave, -25, -0.75},
              {new TriangleWave, -25, -1},      {new SineWave, -25, -0.5},
              {new SawToothWave, 300, -0.5},    {new TriangleWave, -500, -0.5},
              {new TriangleWave, 50, 0.5},      {new SineWave, 125, 0.5},
              {new SquareWave, 50 - 1e-7, 0.5}, {new TriangleWave, 100 - 1e-10, -0.5}};
  for (const auto& row : rows) {
    FunctionGenerator g(row.shape, 100.0, 0.5);
    EXPECT_NEAR(FunctionGenerator(std::move(g)).GetValue(row.t), row.want, 1e-11) << row.t;
  }
  EXPECT_EQ(ErrorOf([] { FunctionGenerator(nullptr, 100.0, 0.5); }), -108);
}

}  // namespace
}  // namespace tarn
