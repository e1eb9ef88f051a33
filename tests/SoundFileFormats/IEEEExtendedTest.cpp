// The 80-bit extended sample-rate field: exact bytes for the rates files
// hold, round trips over large value sets, and the reading of fields other
// writers may produce (unnormalised mantissas, signs, huge exponents).

#include "tarn/Audio/SoundFileFormats/IEEEExtended.h"

#include <gtest/gtest.h>

#include <array>
#include <cmath>
#include <cstdint>
#include <limits>
#include <random>
#include <string>
#include <vector>

namespace tarn::test {
namespace {

using Ten = std::array<unsigned char, 10>;

std::string Hex(const Ten& bytes) {
  std::string out;
  for (unsigned char b : bytes) out += {"0123456789ABCDEF"[b >> 4], "0123456789ABCDEF"[b & 15]};
  return out;
}
Ten FromHex(const std::string& hex) {
  Ten out{};
  for (std::size_t i = 0; i < 10; ++i)
    out[i] = static_cast<unsigned char>(std::stoi(hex.substr(2 * i, 2), nullptr, 16));
  return out;
}
Ten Encode(double x) {
  Ten out;
  out.fill(0xEE);
  double_to_ieee_80(x, out.data());
  return out;
}

// Expected bytes worked out with exact rational arithmetic: exponent 16383 +
// floor(log2 |x|), mantissa |x| * 2^(63 - floor(log2 |x|)) truncated.
TEST(IEEEExtended, KnownRatesGiveExactBytesAndReadBack) {
  const std::pair<double, const char*> known[] = {
      {8000, "400BFA00000000000000"},
      {11025, "400CAC44000000000000"},
      {16000, "400CFA00000000000000"},
      {22050, "400DAC44000000000000"},
      {32000, "400DFA00000000000000"},
      {44100, "400EAC44000000000000"},
      {48000, "400EBB80000000000000"},
      {88200, "400FAC44000000000000"},
      {96000, "400FBB80000000000000"},
      {176400, "4010AC44000000000000"},
      {192000, "4010BB80000000000000"},
      {-44100, "C00EAC44000000000000"},
      {-8000, "C00BFA00000000000000"},
      {0.5, "3FFE8000000000000000"},
      {1, "3FFF8000000000000000"},
      {44100.0 * 1000 / 1001, "400EAC17F1ADA67D5000"},
      {48000.0 * 1000 / 1001, "400EBB500C4695DDB800"},
      {44100.5, "400EAC44800000000000"},
      {22050.25, "400DAC44800000000000"},
      {0.001, "3FF583126E978D4FE000"},
      {0, "00000000000000000000"},
  };
  for (const auto& [value, bytes] : known) {
    SCOPED_TRACE(value);
    EXPECT_EQ(Hex(Encode(value)), bytes);
    EXPECT_EQ(ieee_80_to_double(FromHex(bytes).data()), value);
    EXPECT_EQ(ieee_80_to_long(FromHex(bytes).data(), 0), static_cast<std::int32_t>(value));
  }
  EXPECT_EQ(Hex(Encode(-0.0)), "00000000000000000000");
}

TEST(IEEEExtended, EveryWholeRateUpToOneMillionRoundTrips) {
  for (int rate = 1; rate <= 1000000; ++rate) {
    const Ten bytes = Encode(rate);
    ASSERT_EQ(ieee_80_to_double(bytes.data()), rate);
    ASSERT_EQ(ieee_80_to_long(bytes.data(), 0), rate);
    ASSERT_EQ(bytes[2] & 0x80, 0x80) << rate;  // normalised
    ASSERT_EQ(Encode(-rate)[0], bytes[0] | 0x80);
  }
}

TEST(IEEEExtended, DoublesOfEveryMagnitudeRoundTrip) {
  std::mt19937_64 random(7);
  std::uniform_real_distribution<double> mantissa(1.0, 2.0);
  for (int exp = -1074; exp <= 1023; ++exp) {
    // Random mantissas, and powers of two and their neighbours, where the
    // logarithm is closest to a whole number.
    std::vector<double> values{std::ldexp(1.0, exp), std::nextafter(std::ldexp(1.0, exp), 0.0),
                               std::nextafter(std::ldexp(1.0, exp), 1e308)};
    for (int i = 0; i < 20; ++i) values.push_back(std::ldexp(mantissa(random), exp));
    for (double x : values) {
      if (!std::isfinite(x) || x == 0) continue;
      ASSERT_EQ(ieee_80_to_double(Encode(x).data()), x) << x;
      ASSERT_EQ(ieee_80_to_double(Encode(-x).data()), -x) << x;
    }
  }
}

TEST(IEEEExtended, FieldsFromOtherWritersRead) {
  const std::pair<const char*, double> cases[] = {
      {"400F5622000000000000", 44100},  // unnormalised mantissa, exponent one up
      {"403E0000000000000001", 1},      // only the low half of the mantissa set
      {"3FFF0000000000000000", 0},
      {"80000000000000000000", -0.0},
      {"7FFF8000000000000000", std::numeric_limits<double>::infinity()},
      {"00000000000000000001", 0},  // far below the double's range
  };
  for (const auto& [bytes, value] : cases) {
    const double v = ieee_80_to_double(FromHex(bytes).data());
    EXPECT_EQ(v, value) << bytes;
    EXPECT_EQ(std::signbit(v), std::signbit(value)) << bytes;
  }
}

TEST(IEEEExtended, ToLongTruncatesAndSaturates) {
  const std::pair<double, std::int32_t> cases[] = {
      {44100.99, 44100},          {-44100.99, -44100},        {0.75, 0},
      {2147483647.0, 2147483647}, {4294967296.0, 2147483647}, {-2147483648.0, -2147483647 - 1},
      {-1e12, -2147483647 - 1}};
  for (const auto& [value, expected] : cases) {
    std::array<unsigned char, 14> buffer{};
    double_to_ieee_80(value, buffer.data() + 4);
    EXPECT_EQ(ieee_80_to_long(buffer.data(), 4), expected) << value;
  }
  const Ten nan = Encode(std::numeric_limits<double>::quiet_NaN());
  EXPECT_EQ(Hex(nan), "7FFFC000000000000000");
  // The reading knows no NaN: exponent 0x7FFF is a huge power of two.
  EXPECT_EQ(ieee_80_to_double(nan.data()), std::numeric_limits<double>::infinity());
  EXPECT_EQ(ieee_80_to_long(nan.data(), 0), 2147483647);
  EXPECT_EQ(Hex(Encode(-std::numeric_limits<double>::infinity())), "FFFF8000000000000000");
}

}  // namespace
}  // namespace tarn::test
