#include "tarn/Time/FixedUtils.h"

#include <gtest/gtest.h>

#include <cmath>
#include <cstdint>

namespace tarn {
namespace {

namespace fx = OS::FixedUtils;

TEST(FixedUtils, RoundFloors) {
  EXPECT_EQ(fx::Round(-fx::kFixedOne / 2), -1);
  EXPECT_EQ(fx::Round(fx::FloatToFixed(1.75f)), 1);
  EXPECT_EQ(fx::Round(fx::FloatToFixed(-1.75f)), -2);
  EXPECT_EQ(fx::Round(-1), -1);
  EXPECT_EQ(fx::Round(0), 0);
  // Every sixteenth in [-64, 64] against floor.
  for (int sixteenths = -1024; sixteenths <= 1024; ++sixteenths) {
    const fx::Fixed f = sixteenths * 4096;
    ASSERT_EQ(fx::Round(f), static_cast<int>(std::floor(sixteenths / 16.0))) << sixteenths;
  }
}

TEST(FixedUtils, ConversionsTruncateTowardZero) {
  EXPECT_EQ(fx::FloatToFixed(1.5f), 0x18000);
  EXPECT_EQ(fx::FloatToFixed(-1.5f), -0x18000);
  EXPECT_EQ(fx::FloatToFixed(std::ldexp(1.5f, -16)), 1);
  EXPECT_EQ(fx::FloatToFixed(std::ldexp(-1.5f, -16)), -1);
  EXPECT_EQ(fx::FloatToFixed(1e10f), INT32_MIN);  // out of range: indefinite value
  EXPECT_EQ(fx::FixedToFloat(0x18000), 1.5f);
  EXPECT_EQ(fx::Double(-0x8000), -0.5);
  EXPECT_EQ(fx::RatioToFixed(1, 3), 21845);
  EXPECT_EQ(fx::RatioToFixed(-1, 3), -21845);
  EXPECT_EQ(fx::RatioToFixed(3, 2), 0x18000);
}

TEST(FixedUtils, MulDivAgainstWideReference) {
  const fx::Fixed values[] = {0,       1,        -1,        0x8000,      -0x8000,   0x10000,
                              0x18000, -0x18000, 0x7FFFFFF, -0x7FFFFFFF, 123456789, -987654};
  for (fx::Fixed a : values) {
    for (fx::Fixed b : values) {
      const std::int64_t p = std::int64_t{a} * b;
      ASSERT_EQ(fx::Mul(a, b), static_cast<fx::Fixed>(static_cast<std::uint32_t>(p >> 16)));
      ASSERT_EQ(fx::FracMul(a, b), static_cast<fx::Fixed>(static_cast<std::uint32_t>(p >> 30)));
      if (b != 0) {
        const std::int64_t q = std::int64_t{a} * 65536 / b;
        ASSERT_EQ(fx::Div(a, b), static_cast<fx::Fixed>(static_cast<std::uint32_t>(q)));
        const std::int64_t fq = (std::int64_t{a} << 30) / b;
        ASSERT_EQ(fx::FracDiv(a, b), static_cast<fx::Fixed>(static_cast<std::uint32_t>(fq)));
      }
    }
  }
  EXPECT_EQ(fx::Mul(0x18000, 0x20000), 0x30000);      // 1.5 * 2
  EXPECT_EQ(fx::Mul(-0x8000, 1), -1);                 // floors through the shift
  EXPECT_EQ(fx::Div(0x10000, 0x30000), 21845);        // 1 / 3
  EXPECT_EQ(fx::FracMul(1 << 29, 1 << 29), 1 << 28);  // 0.5 * 0.5
  EXPECT_EQ(fx::FracDiv(1 << 29, 1 << 30), 1 << 29);  // 0.5 / 1
}

}  // namespace
}  // namespace tarn
