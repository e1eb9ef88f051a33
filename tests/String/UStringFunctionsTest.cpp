// The tarn:: string functions: classes, case, numbers, dates, four-character
// codes, NFKC and truncating concatenation.
#include <gtest/gtest.h>

#include <cmath>
#include <cstdint>
#include <cstring>
#include <limits>

#include "String/TestTimeZone.h"
#include "tarn/Errors/TarnError.h"
#include "tarn/String/UString.h"

namespace tarn {
namespace {

using Units = std::vector<unsigned short>;
UString U(const char* utf8) { return UString(utf8); }

TEST(UStringFunctions, CharacterClasses) {
  EXPECT_TRUE(IsASCII(0x7F));
  EXPECT_FALSE(IsASCII(0x80));
  EXPECT_TRUE(IsDigit('0') && IsDigit('9'));
  EXPECT_FALSE(IsDigit('/') || IsDigit(':') || IsDigit(0x0663));  // Arabic-Indic three
  EXPECT_TRUE(IsXDigit('f') && IsXDigit('F') && IsXDigit('7'));
  EXPECT_FALSE(IsXDigit('g') || IsXDigit('G'));
  EXPECT_TRUE(IsLower('a') && IsLower(0xE9) && IsLower(0x3C9));  // e-acute, omega
  EXPECT_TRUE(IsUpper('A') && IsUpper(0xC9) && IsUpper(0x3A9));
  EXPECT_FALSE(IsLower('A') || IsUpper('a') || IsLower('1') || IsUpper('1'));
  for (unsigned short c :
       {0x09, 0x0A, 0x0B, 0x0C, 0x0D, 0x20, 0x85, 0xA0, 0x2000, 0x200A, 0x2028, 0x3000}) {
    EXPECT_TRUE(IsSpace(c)) << c;
  }
  for (unsigned short c : {0x08, 0x0E, 0x1F, 0x61, 0x200B, 0xFEFF}) EXPECT_FALSE(IsSpace(c)) << c;
  EXPECT_TRUE(IsLineTerminator('\n') && IsLineTerminator('\r') && IsLineTerminator(0x2028));
  EXPECT_FALSE(IsLineTerminator(' ') || IsLineTerminator('\t'));
}

TEST(UStringFunctions, CaseMapping) {
  EXPECT_EQ(ToUpper('a'), 'A');
  EXPECT_EQ(ToLower('Z'), 'z');
  EXPECT_EQ(ToUpper(0xE9), 0xC9);
  EXPECT_EQ(ToLower(0x130 + 0x2E), 0x15F);  // S-cedilla
  EXPECT_EQ(ToUpper('1'), '1');
  EXPECT_EQ(ToUpper(0xD83D), 0xD83D);  // lone surrogate unchanged
  UString s = U("h\u00E9llo W\u00D6RLD 42");
  ToUpper(s);
  EXPECT_EQ(s, U("H\u00C9LLO W\u00D6RLD 42"));
  ToLower(s);
  EXPECT_EQ(s, U("h\u00E9llo w\u00F6rld 42"));
}

TEST(UStringFunctions, WholeStringTests) {
  EXPECT_TRUE(IsNumeric(UString("0123456789")));
  EXPECT_FALSE(IsNumeric(UString("")));
  EXPECT_FALSE(IsNumeric(UString("12a")));
  EXPECT_FALSE(IsNumeric(UString("-1")));
  EXPECT_TRUE(IsStringWhitespace(UString(" \t\r\n")));
  EXPECT_TRUE(IsStringWhitespace(UString("")));
  EXPECT_TRUE(IsStringWhitespace(U("\u3000\u00A0")));
  EXPECT_FALSE(IsStringWhitespace(UString(" a ")));
  EXPECT_EQ(FindNumberInString(UString("Take 12 (3)")), 12);
  EXPECT_EQ(FindNumberInString(UString("007")), 7);
  EXPECT_EQ(FindNumberInString(UString("none")), -1);
  EXPECT_EQ(FindNumberInString(UString("x99999999999999999999y")),
            std::numeric_limits<std::int64_t>::max());
}

TEST(UStringFunctions, NumbersToText) {
  UString s;
  const std::pair<std::int64_t, const char*> thousands[] = {
      {0, "0"},
      {999, "999"},
      {1000, "1,000"},
      {-1000, "-1,000"},
      {-999, "-999"},
      {1234567, "1,234,567"},
      {std::numeric_limits<std::int64_t>::min(), "-9,223,372,036,854,775,808"}};
  for (const auto& [n, text] : thousands) {
    NumToUString(n, NumFormat::kThousands, s);
    EXPECT_EQ(s, UString(text)) << n;
  }
  EXPECT_EQ(NumToUString(-42), UString("-42"));
  NumToUString(255, NumFormat::kHex, s);
  EXPECT_EQ(s, UString("FF"));
  NumToUString(-1, NumFormat::kHexPrefixed, s);
  EXPECT_EQ(s, UString("0xFFFFFFFFFFFFFFFF"));
  EXPECT_EQ(NumToHexUString(0), UString("0"));
  EXPECT_EQ(NumToHexUString(0xABC, 6), UString("000ABC"));
  EXPECT_THROW(NumToUString(1, static_cast<NumFormat>(9), s), TarnError);
}

TEST(UStringFunctions, NumbersRoundTripInEveryFormat) {
  std::vector<std::int64_t> values = {0,
                                      1,
                                      -1,
                                      9,
                                      10,
                                      999,
                                      1000,
                                      -1000,
                                      65535,
                                      1LL << 40,
                                      std::numeric_limits<std::int64_t>::max(),
                                      std::numeric_limits<std::int64_t>::min()};
  std::uint64_t x = 0x9E3779B97F4A7C15ULL;
  for (int i = 0; i < 500; ++i) {
    x ^= x << 13, x ^= x >> 7, x ^= x << 17;
    values.push_back(static_cast<std::int64_t>(x) >> (i % 60));
  }
  for (NumFormat f :
       {NumFormat::kDecimal, NumFormat::kThousands, NumFormat::kHex, NumFormat::kHexPrefixed}) {
    for (std::int64_t v : values) {
      UString s;
      NumToUString(v, f, s);
      EXPECT_EQ(UStringToNum(s, f), v) << s;
    }
  }
  EXPECT_EQ(UStringToNum(UString("  -12,345 apples"), NumFormat::kThousands), -12345);
  EXPECT_EQ(UStringToNum(UString("12,,3"), NumFormat::kThousands), 12);
  EXPECT_EQ(UStringToNum(UString("99999999999999999999")),
            std::numeric_limits<std::int64_t>::max());
  EXPECT_EQ(UStringToNum(UString("junk")), 0);
}

TEST(UStringFunctions, StrToLAndStrToLL) {
  UString rest;
  EXPECT_EQ(StrToL(UString("  -42abc"), &rest, 10), -42);
  EXPECT_EQ(rest, UString("abc"));
  EXPECT_EQ(StrToL(UString("0x1Fz"), &rest, 0), 31);
  EXPECT_EQ(rest, UString("z"));
  EXPECT_EQ(StrToL(UString("0x1F"), &rest, 16), 31);
  EXPECT_EQ(StrToL(UString("010"), &rest, 0), 8);
  EXPECT_EQ(StrToL(UString("0x"), &rest, 0), 0);
  EXPECT_EQ(rest, UString("x"));
  EXPECT_EQ(StrToL(UString("abc"), &rest, 10), 0);
  EXPECT_EQ(rest, UString("abc"));
  EXPECT_EQ(StrToL(UString("zz"), nullptr, 36), 1295);
  EXPECT_EQ(StrToL(UString("2147483647"), nullptr, 10), 2147483647);
  EXPECT_EQ(StrToL(UString("2147483648"), nullptr, 10), 2147483647);
  EXPECT_EQ(StrToL(UString("-2147483648"), nullptr, 10), -2147483647 - 1);
  EXPECT_EQ(StrToL(UString("-2147483649"), nullptr, 10), -2147483647 - 1);
  EXPECT_EQ(StrToLL(UString("9223372036854775807"), nullptr, 10),
            std::numeric_limits<std::int64_t>::max());
  EXPECT_EQ(StrToLL(UString("9223372036854775808"), nullptr, 10),
            std::numeric_limits<std::int64_t>::max());
  EXPECT_EQ(StrToLL(UString("-9223372036854775808"), &rest, 10),
            std::numeric_limits<std::int64_t>::min());
  EXPECT_TRUE(rest.empty());
  EXPECT_EQ(StrToLL(UString("+1011"), nullptr, 2), 11);
  EXPECT_THROW((void)StrToL(UString("1"), nullptr, 1), TarnError);
  EXPECT_THROW((void)StrToLL(UString("1"), nullptr, 37), TarnError);
}

TEST(UStringFunctions, StrToDAndDoubleText) {
  UString rest;
  EXPECT_EQ(StrToD(UString("3.25xyz"), &rest), 3.25);
  EXPECT_EQ(rest, UString("xyz"));
  EXPECT_EQ(StrToD(UString(" -1e3"), &rest), -1000.0);
  EXPECT_TRUE(rest.empty());
  EXPECT_EQ(StrToD(UString("+0.5"), nullptr), 0.5);
  EXPECT_EQ(StrToD(UString("abc"), &rest), 0.0);
  EXPECT_EQ(rest, UString("abc"));
  EXPECT_EQ(StrToD(UString("--1"), &rest), 0.0);
  EXPECT_EQ(rest, UString("--1"));
  EXPECT_TRUE(std::isinf(StrToD(UString("1e999"), nullptr)));
  EXPECT_EQ(StrToD(UString("-1e-999"), nullptr), 0.0);
  EXPECT_TRUE(std::isnan(UStringToDouble(UString("nan"))));
  EXPECT_EQ(UStringToDouble(UString("1,5")), 1.0);  // '.' is the only decimal point

  UString s;
  DoubleToUString(0.1, s);
  EXPECT_EQ(s, UString("0.1"));
  DoubleToUString(1.5, s, 2);
  EXPECT_EQ(s, UString("1.50"));
  DoubleToUString(-2.0, s, 0);
  EXPECT_EQ(s, UString("-2"));
  std::uint64_t x = 0x0123456789ABCDEFULL;
  for (int i = 0; i < 2000; ++i) {
    x ^= x << 13, x ^= x >> 7, x ^= x << 17;
    double d;
    std::memcpy(&d, &x, sizeof d);
    if (!std::isfinite(d)) continue;
    DoubleToUString(d, s);
    EXPECT_EQ(UStringToDouble(s), d) << s;
  }
}

TEST(UStringFunctions, DatesAndTimesInUTC) {
  test::SetTimeZone("UTC0");
  UString s;
  DateToUString(0, DateTimeFormat::kShort, s);
  EXPECT_EQ(s, UString("1/1/1904"));
  DateToUString(0, DateTimeFormat::kLong, s);
  EXPECT_EQ(s, UString("Friday, January 1, 1904"));
  TimeToUString(0, DateTimeFormat::kShort, s);
  EXPECT_EQ(s, UString("00:00"));
  const std::uint32_t t = 3792492429u;  // 2024-03-05 14:07:09 UTC
  DateToUString(t, DateTimeFormat::kAbbrev, s);
  EXPECT_EQ(s, UString("Tue, Mar 5, 2024"));
  DateToUString(t, DateTimeFormat::kLong, s);
  EXPECT_EQ(s, UString("Tuesday, March 5, 2024"));
  DateToUString(t, DateTimeFormat::kISO, s);
  EXPECT_EQ(s, UString("2024-03-05"));
  TimeToUString(t, DateTimeFormat::kShort, s);
  EXPECT_EQ(s, UString("14:07"));
  TimeToUString(t, DateTimeFormat::kLong, s);
  EXPECT_EQ(s, UString("14:07:09"));
  DateToUString(0xFFFFFFFFu, DateTimeFormat::kISO, s);
  EXPECT_EQ(s, UString("2040-02-06"));
  TimeToUString(0xFFFFFFFFu, DateTimeFormat::kISO, s);
  EXPECT_EQ(s, UString("06:28:15"));
  DateToUString(2082844800u + 68169600u, DateTimeFormat::kISO, s);  // 1972-02-29
  EXPECT_EQ(s, UString("1972-02-29"));
  EXPECT_THROW(DateToUString(0, static_cast<DateTimeFormat>(7), s), TarnError);
}

TEST(UStringFunctions, DatesFollowTheLocalTimeZone) {
  test::SetTimeZone("EST5");
  UString s;
  const std::uint32_t t = 3792492429u;  // 2024-03-05 14:07:09 UTC
  TimeToUString(t, DateTimeFormat::kLong, s);
  EXPECT_EQ(s, UString("09:07:09"));
  DateToUString(0, DateTimeFormat::kISO, s);
  EXPECT_EQ(s, UString("1903-12-31"));
  TimeToUString(0, DateTimeFormat::kShort, s);
  EXPECT_EQ(s, UString("19:00"));
  test::SetTimeZone("UTC0");
}

TEST(UStringFunctions, NormalizeFormKC) {
  EXPECT_EQ(NormalizeStringWithFormKC(U("\uFB01le")), UString("file"));
  EXPECT_EQ(NormalizeStringWithFormKC(U("e\u0301")), U("\u00E9"));
  EXPECT_EQ(NormalizeStringWithFormKC(U("\u2460\uFF21")), UString("1A"));
  EXPECT_EQ(NormalizeStringWithFormKC(UString()), UString());
}

TEST(UStringFunctions, FourCharCodes) {
  UString s;
  ResTypeToUString(0x57415645, s);  // 'WAVE'
  EXPECT_EQ(s, UString("WAVE"));
  EXPECT_EQ(UStringToResType(s), 0x57415645u);
  ResTypeToUString(0x8EA52020, s);
  EXPECT_EQ(Units(s.begin(), s.end()), (Units{0xE9, 0x2022, ' ', ' '}));
  EXPECT_EQ(UStringToResType(UString("ab")), 0x61622020u);
  EXPECT_EQ(UStringToResType(U("\u4E01xyz!")), 0x0178797Au);  // no Mac Roman form: low byte
  // Every Mac Roman byte in every position survives the round trip.
  for (unsigned b = 0; b < 256; ++b) {
    const std::uint32_t code =
        (b << 24) | ((255 - b) << 16) | (((b + 85) & 0xFF) << 8) | (b ^ 0x5A);
    ResTypeToUString(code, s);
    ASSERT_EQ(s.length(), 4u);
    EXPECT_EQ(UStringToResType(s), code) << std::hex << code;
  }
}

TEST(UStringFunctions, RawData) {
  unsigned char buf[6];
  std::memset(buf, 0xEE, sizeof buf);
  EXPECT_EQ(UStringToRawData(U("AB\u0141"), buf, sizeof buf), 3u);
  EXPECT_EQ(std::string(reinterpret_cast<char*>(buf), 6), std::string("AB\x41\0\0\0", 6));
  std::memset(buf, 0xEE, sizeof buf);
  EXPECT_EQ(UStringToRawData(UString("abcdefgh"), buf, 4), 4u);
  EXPECT_EQ(buf[3], 'd');
  EXPECT_EQ(buf[4], 0xEE);
}

TEST(UStringFunctions, StrncatTruncateFirst) {
  auto cat = [](const char* a, const char* b, short max) {
    UString first(a);
    UStrncatTruncateFirst(first, UString(b), max);
    return first;
  };
  EXPECT_EQ(cat("Hello", "World", 8), UString("HelWorld"));
  EXPECT_EQ(cat("Hello", "World", 3), UString("Wor"));
  EXPECT_EQ(cat("Hello", "World", 10), UString("HelloWorld"));
  EXPECT_EQ(cat("Hello", "World", 12), UString("HelloWorld"));
  EXPECT_EQ(cat("Hello", "World", -4), UString());
  const UString first("Hello"), second("World");
  for (short max = 0; max <= 12; ++max) {
    const std::size_t keepFirst = max > 5 ? std::min<std::size_t>(5, max - 5) : 0;
    const std::size_t keepSecond = std::min<std::size_t>(5, max);
    EXPECT_EQ(cat("Hello", "World", max), first.substr(0, keepFirst) + second.substr(0, keepSecond))
        << max;
  }
}

TEST(UStringFunctions, EncodingQueries) {
  EXPECT_TRUE(IsSystemOrRomanEncoding(0));
  EXPECT_TRUE(IsSystemOrRomanEncoding(1));
  EXPECT_TRUE(IsSystemOrRomanEncoding(999));
  EXPECT_FALSE(IsSystemOrRomanEncoding(2) || IsSystemOrRomanEncoding(3) ||
               IsSystemOrRomanEncoding(4));
}

}  // namespace
}  // namespace tarn
