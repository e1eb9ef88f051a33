// The tarn:: string functions: classes, case, numbers, dates, four-character
// codes, NFKC and truncating concatenation.
#include <gtest/gtest.h>

#include <algorithm>
#include <bit>
#include <cmath>
#include <cstdint>
#include <limits>

#include "String/StringTestUtil.h"
#include "tarn/Errors/TarnError.h"
#include "tarn/String/UString.h"

namespace tarn {
namespace {

using test::Rows;
using test::Units;
using Unit = unsigned short;
using I64 = std::numeric_limits<std::int64_t>;
using I32 = std::numeric_limits<std::int32_t>;
UString U(const char* utf8) { return UString(utf8); }

TEST(UStringFunctions, SpaceAndLineTerminatorOverEveryUnit) {
  for (unsigned c = 0; c <= 0xFFFF; ++c) {
    const bool terminator = c == '\n' || c == '\r' || c == 0x85 || c == 0x2028 || c == 0x2029;
    const bool space = terminator || (c >= 9 && c <= 13) || c == ' ' || c == 0xA0 || c == 0x1680 ||
                       (c >= 0x2000 && c <= 0x200A) || c == 0x202F || c == 0x205F || c == 0x3000;
    ASSERT_EQ(IsSpace(static_cast<unsigned short>(c)), space) << std::hex << c;
    ASSERT_EQ(IsLineTerminator(static_cast<unsigned short>(c)), terminator) << std::hex << c;
  }
}

TEST(UStringFunctions, CaseAndWholeStringTests) {
  // Lower/upper pairs: ASCII, e-acute, omega, S-cedilla; digits and a lone
  // surrogate are neither and map to themselves.
  const Unit lower[] = {'a', 0xE9, 0x3C9, 0x15F, '1', 0xD83D};
  const Unit upper[] = {'A', 0xC9, 0x3A9, 0x15E, '1', 0xD83D};
  for (std::size_t i = 0; i < std::size(lower); ++i) {
    EXPECT_EQ(ToUpper(lower[i]), upper[i]);
    EXPECT_EQ(ToLower(upper[i]), lower[i]);
    EXPECT_EQ(IsLower(lower[i]) && IsUpper(upper[i]), lower[i] != upper[i]) << lower[i];
    EXPECT_FALSE(IsLower(upper[i]) || IsUpper(lower[i])) << lower[i];
  }
  UString s = U("h\u00E9llo W\u00D6RLD 42");
  ToUpper(s);
  EXPECT_EQ(s, U("H\u00C9LLO W\u00D6RLD 42"));
  ToLower(s);
  EXPECT_EQ(s, U("h\u00E9llo w\u00F6rld 42"));
  EXPECT_TRUE(IsNumeric(UString("0123456789")));
  EXPECT_FALSE(IsNumeric(UString("")) || IsNumeric(UString("12a")) || IsNumeric(UString("-1")));
  EXPECT_TRUE(IsStringWhitespace(UString("")) && IsStringWhitespace(U(" \t\r\n\u3000\u00A0")));
  EXPECT_FALSE(IsStringWhitespace(UString(" a ")));
  EXPECT_EQ(FindNumberInString(UString("Take 12 (3)")), 12);
  EXPECT_EQ(FindNumberInString(UString("none")), -1);
  EXPECT_EQ(FindNumberInString(UString("x99999999999999999999y")), I64::max());
}

TEST(UStringFunctions, NumbersToTextAndBack) {
  using enum NumFormat;
  UString s;
  const Rows<std::int64_t, NumFormat, const char*> rows = {
      {1000, kThousands, "1,000"},
      {1234567, kThousands, "1,234,567"},
      {I64::min(), kThousands, "-9,223,372,036,854,775,808"},
      {-42, kDecimal, "-42"},
      {255, kHex, "FF"},
      {-1, kHexPrefixed, "0xFFFFFFFFFFFFFFFF"}};
  for (const auto& [n, format, text] : rows) {
    NumToUString(n, format, s);
    EXPECT_EQ(s, UString(text));
  }
  EXPECT_EQ(NumToHexUString(0xABC, 6), UString("000ABC"));
  EXPECT_THROW(NumToUString(1, static_cast<NumFormat>(9), s), TarnError);

  std::uint64_t x = 0x9E3779B97F4A7C15ULL;
  for (int i = 0; i < 2000; ++i) {
    x ^= x << 13, x ^= x >> 7, x ^= x << 17;
    const std::int64_t v = static_cast<std::int64_t>(x) >> (i % 64);
    NumToUString(v, static_cast<NumFormat>(i % 4), s);
    EXPECT_EQ(UStringToNum(s, static_cast<NumFormat>(i % 4)), v) << s;
  }
  EXPECT_EQ(UStringToNum(UString("  -12,345 apples"), kThousands), -12345);
  EXPECT_EQ(UStringToNum(UString("99999999999999999999")), I64::max());
}

// StrToL is StrToLL saturated to 32 bits; '|' marks where both stop reading.
TEST(UStringFunctions, StrToLAndStrToLL) {
  const Rows<std::string, int, std::int64_t> rows = {{"  -42|abc", 10, -42},
                                                     {"0x1F|z", 0, 31},
                                                     {"010|", 0, 8},
                                                     {"0|x", 0, 0},
                                                     {"|abc", 10, 0},
                                                     {"zz|", 36, 1295},
                                                     {"2147483648|", 10, 2147483648LL},
                                                     {"9223372036854775808|", 10, I64::max()},
                                                     {"-9223372036854775808|", 10, I64::min()},
                                                     {"-99999999999999999999|", 10, I64::min()}};
  for (const auto& [marked, base, value] : rows) {
    SCOPED_TRACE(marked);
    const std::size_t stop = marked.find('|');
    const UString in(marked.substr(0, stop) + marked.substr(stop + 1));
    const UString rest(marked.substr(stop + 1));
    UString after, after32;
    EXPECT_EQ(StrToLL(in, &after, base), value);
    EXPECT_EQ(StrToL(in, &after32, base), std::clamp<std::int64_t>(value, I32::min(), I32::max()));
    EXPECT_EQ(after, rest);
    EXPECT_EQ(after32, rest);
  }
  EXPECT_EQ(StrToL(UString("2147483647")), I32::max());
  EXPECT_THROW((void)StrToL(UString("1"), nullptr, 1), TarnError);
  EXPECT_THROW((void)StrToLL(UString("1"), nullptr, 37), TarnError);
}

TEST(UStringFunctions, StrToDAndDoubleText) {
  const Rows<const char*, double, const char*> rows = {
      {"3.25xyz", 3.25, "xyz"}, {" -1e3", -1000.0, ""}, {"+0.5", 0.5, ""},
      {"abc", 0.0, "abc"},      {"--1", 0.0, "--1"},    {"1,5", 1.0, ",5"},
      {"-1e-999", 0.0, ""},     {"1e999", HUGE_VAL, ""}};
  for (const auto& [in, value, rest] : rows) {
    UString after;
    EXPECT_EQ(StrToD(UString(in), &after), value) << in;
    EXPECT_EQ(after, UString(rest)) << in;
  }
  EXPECT_TRUE(std::isnan(UStringToDouble(UString("nan"))));

  UString s;
  DoubleToUString(0.1, s);
  EXPECT_EQ(s, UString("0.1"));
  DoubleToUString(-1.5, s, 2);
  EXPECT_EQ(s, UString("-1.50"));
  std::uint64_t x = 0x0123456789ABCDEFULL;
  for (int i = 0; i < 2000; ++i) {
    x ^= x << 13, x ^= x >> 7, x ^= x << 17;
    const double d = std::bit_cast<double>(x);
    if (!std::isfinite(d)) continue;
    DoubleToUString(d, s);
    EXPECT_EQ(UStringToDouble(s), d) << s;
  }
}

// Each row: the date in the four formats, then the time (kShort drops seconds).
TEST(UStringFunctions, DatesAndTimesInTheLocalTimeZone) {
  const std::uint32_t t = 3792492429u;  // 2024-03-05 14:07:09 UTC
  const Rows<const char*, std::uint32_t, const char*> rows = {
      {"UTC0", 0, "1/1/1904|Fri, Jan 1, 1904|Friday, January 1, 1904|1904-01-01|00:00:00"},
      {"UTC0", t, "3/5/2024|Tue, Mar 5, 2024|Tuesday, March 5, 2024|2024-03-05|14:07:09"},
      {"UTC0", ~0u, "2/6/2040|Mon, Feb 6, 2040|Monday, February 6, 2040|2040-02-06|06:28:15"},
      {"UTC0", 2082844800u + 68169600u,
       "2/29/1972|Tue, Feb 29, 1972|Tuesday, February 29, 1972|1972-02-29|00:00:00"},
      {"EST5", 0, "12/31/1903|Thu, Dec 31, 1903|Thursday, December 31, 1903|1903-12-31|19:00:00"},
      {"EST5", t, "3/5/2024|Tue, Mar 5, 2024|Tuesday, March 5, 2024|2024-03-05|09:07:09"}};
  UString s;
  for (const auto& [tz, seconds, texts] : rows) {
    test::SetTimeZone(tz);
    const std::vector<UString> want = test::Split(texts, '|');
    for (int f = 0; f < 4; ++f) {
      DateToUString(seconds, static_cast<DateTimeFormat>(f), s);
      EXPECT_EQ(s, want[f]) << tz << ' ' << seconds;
      TimeToUString(seconds, static_cast<DateTimeFormat>(f), s);
      EXPECT_EQ(s, f == 0 ? want[4].substr(0, 5) : want[4]) << tz << ' ' << seconds;
    }
  }
  test::SetTimeZone("UTC0");
  EXPECT_THROW(DateToUString(0, static_cast<DateTimeFormat>(7), s), TarnError);
}

TEST(UStringFunctions, NormalizeFormKCFourCharCodesAndRawData) {
  EXPECT_EQ(NormalizeStringWithFormKC(U("\uFB01le")), UString("file"));
  EXPECT_EQ(NormalizeStringWithFormKC(U("e\u0301")), U("\u00E9"));
  UString s;
  ResTypeToUString(0x8EA52020, s);
  EXPECT_EQ(test::UnitsOf(s), (Units{0xE9, 0x2022, ' ', ' '}));
  EXPECT_EQ(UStringToResType(UString("ab")), 0x61622020u);
  EXPECT_EQ(UStringToResType(U("\u4E01xyz!")), 0x0178797Au);  // no Mac Roman form: low byte
  for (unsigned b = 0; b < 256; ++b) {
    const std::uint32_t code =
        (b << 24) | ((255 - b) << 16) | (((b + 85) & 0xFF) << 8) | (b ^ 0x5A);
    ResTypeToUString(code, s);
    EXPECT_EQ(UStringToResType(s), code) << std::hex << code;
  }
  std::string buf(6, '\xEE');  // raw data: low bytes, then zeros
  auto* p = reinterpret_cast<unsigned char*>(buf.data());
  EXPECT_EQ(UStringToRawData(U("AB\u0141"), p, 5), 3u);
  EXPECT_EQ(buf, std::string("AB\x41\0\0\xEE", 6));
  EXPECT_EQ(UStringToRawData(UString("abcdefgh"), p, 4), 4u);
  EXPECT_EQ(buf, std::string("abcd\0\xEE", 6));
}

// The end of the first text gives way first, then the end of the second.
TEST(UStringFunctions, StrncatTruncateFirstOverAGrid) {
  const UString full("abcdefg"), other("1234567");
  for (std::size_t n1 = 0; n1 <= 6; ++n1) {
    for (std::size_t n2 = 0; n2 <= 6; ++n2) {
      for (short max = -3; max <= 14; ++max) {
        const std::size_t room = static_cast<std::size_t>(std::max<short>(max, 0));
        const std::size_t keep2 = std::min(n2, room), keep1 = std::min(n1, room - keep2);
        UString first = full.substr(0, n1);
        UStrncatTruncateFirst(first, other.substr(0, n2), max);
        ASSERT_EQ(first, full.substr(0, keep1) + other.substr(0, keep2))
            << n1 << ' ' << n2 << ' ' << max;
      }
    }
  }
}

}  // namespace
}  // namespace tarn
