#include "tarn/Audio/Dither.h"

#include <gtest/gtest.h>

#include "ConverterTestUtil.h"

namespace {

TEST(TriangularPDFDither16, MatchesTheGeneratorModel) {
  for (std::uint32_t seed : {0u, 1u, 0x7FFFFFFFu, 0x80000000u, 0xFFFFFFFFu, 123456789u}) {
    tarn::TriangularPDFDither16 dither(seed);
    convref::Generator model{seed};
    int lo = 0, hi = 0;
    for (int k = 0; k < 200000; ++k) {
      const std::int32_t d = dither.Next();
      ASSERT_EQ(d, model.Next()) << "seed " << seed << " value " << k;
      ASSERT_EQ(dither.GetState(), model.state);
      lo = std::min(lo, d);
      hi = std::max(hi, d);
    }
    EXPECT_GE(lo, -65536);
    EXPECT_LE(hi, 65534);
    EXPECT_LT(lo, -60000);  // the full triangle is covered
    EXPECT_GT(hi, 60000);
  }
}

TEST(TriangularPDFDither16, EachValueTakesTwoSteps) {
  tarn::TriangularPDFDither16 dither(42);
  const std::uint32_t s0 = 42;
  const std::uint32_t s1 = s0 * 1664525u + 1013904223u;
  const std::uint32_t s2 = s1 * 1664525u + 1013904223u;
  EXPECT_EQ(dither.Next(),
            (static_cast<std::int32_t>(s1) >> 16) + (static_cast<std::int32_t>(s0) >> 16));
  EXPECT_EQ(dither.GetState(), s2);
}

TEST(TriangularPDFDither16, SeedsFromEventTimeInSixtiethsOfASecond) {
  for (;;) {
    const std::uint32_t before = convtest::SeedNow();
    tarn::TriangularPDFDither16 dither;
    if (convtest::SeedNow() == before) {
      EXPECT_EQ(dither.GetState(), before);
      break;
    }
  }
  EXPECT_EQ(tarn::TriangularPDFDither16::SeedForEventTime(1.0), 60u);
  EXPECT_EQ(tarn::TriangularPDFDither16::SeedForEventTime(1.0 / 120.0),
            1u);  // 0.5 + 0.5 truncates to 1
  EXPECT_EQ(tarn::TriangularPDFDither16::SeedForEventTime(0.0083), 0u);
  // Only the low 32 bits of the count are kept.
  EXPECT_EQ(tarn::TriangularPDFDither16::SeedForEventTime(4294967296.0 / 60.0 + 1.0), 60u);
}

TEST(TriangularPDFDither16, CopiesContinueTheSequence) {
  tarn::TriangularPDFDither16 a(99);
  for (int k = 0; k < 17; ++k) (void)a.Next();
  tarn::TriangularPDFDither16 b = a;
  for (int k = 0; k < 100; ++k) EXPECT_EQ(a.Next(), b.Next());
}

}  // namespace
