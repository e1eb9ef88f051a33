// Byte encodings, UTF-8/16/32, wide strings and Pascal strings, checked to the byte.
#include <gtest/gtest.h>

#include <cstring>
#include <set>
#include <string>
#include <vector>

#include "tarn/Errors/TarnError.h"
#include "tarn/String/UString.h"

namespace tarn {
namespace {

using Units = std::vector<unsigned short>;

Units UnitsOf(const UString& s) { return Units(s.begin(), s.end()); }
std::string Bytes(std::initializer_list<int> b) {
  std::string s;
  for (int x : b) s.push_back(static_cast<char>(x));
  return s;
}
UString FromUnits(Units u) { return UString(u.data(), u.size()); }

struct Pair {
  int byte;
  unsigned short unit;
};

// Bytes 0x80..0x9F, where Windows-1252 differs from ISO-8859-1.
const Pair kWin1252[] = {
    {0x80, 0x20AC}, {0x82, 0x201A}, {0x83, 0x0192}, {0x84, 0x201E}, {0x85, 0x2026}, {0x86, 0x2020},
    {0x87, 0x2021}, {0x88, 0x02C6}, {0x89, 0x2030}, {0x8A, 0x0160}, {0x8B, 0x2039}, {0x8C, 0x0152},
    {0x8E, 0x017D}, {0x91, 0x2018}, {0x92, 0x2019}, {0x93, 0x201C}, {0x94, 0x201D}, {0x95, 0x2022},
    {0x96, 0x2013}, {0x97, 0x2014}, {0x98, 0x02DC}, {0x99, 0x2122}, {0x9A, 0x0161}, {0x9B, 0x203A},
    {0x9C, 0x0153}, {0x9E, 0x017E}, {0x9F, 0x0178}};

const Pair kMacRoman[] = {{0x80, 0x00C4}, {0x8E, 0x00E9}, {0xA5, 0x2022}, {0xA8, 0x00AE},
                          {0xAA, 0x2122}, {0xC9, 0x2026}, {0xCA, 0x00A0}, {0xD0, 0x2013},
                          {0xE9, 0x00C8}, {0xFF, 0x02C7}, {0x87, 0x00E1}};

TEST(UStringEncoding, SystemEncodingIsWindows1252BothWays) {
  if (!IsSystemRomanNative()) GTEST_SKIP() << "system code page is not 1252";
  for (const Pair& p : kWin1252) {
    const std::string b(1, static_cast<char>(p.byte));
    EXPECT_EQ(UnitsOf(UString(b, UString::kSystemEncoding)), Units{p.unit}) << p.byte;
    EXPECT_EQ(FromUnits({p.unit}).string(UString::kSystemEncoding), b) << p.byte;
  }
  // Printable ASCII and 0xA0..0xFF are the identity in both directions.
  std::string all;
  for (int b = 0x20; b < 0x7F; ++b) all.push_back(static_cast<char>(b));
  for (int b = 0xA0; b <= 0xFF; ++b) all.push_back(static_cast<char>(b));
  const UString s(all, UString::kSystemEncoding);
  ASSERT_EQ(s.length(), all.size());
  for (std::size_t i = 0; i < all.size(); ++i) {
    EXPECT_EQ(s[i], static_cast<unsigned char>(all[i]));
  }
  EXPECT_EQ(s.string(UString::kSystemEncoding), all);
  // Every byte survives the round trip; the five bytes 1252 leaves unassigned
  // read as the C1 controls of the same value.
  std::string bytes;
  for (int b = 0; b < 256; ++b) bytes.push_back(static_cast<char>(b));
  const UString every(bytes, UString::kSystemEncoding);
  ASSERT_EQ(every.length(), 256u);
  for (int b : {0x81, 0x8D, 0x8F, 0x90, 0x9D}) EXPECT_EQ(every[b], b);
  EXPECT_EQ(every.string(UString::kSystemEncoding), bytes);
  // Multiple encodings read as the system encoding.
  EXPECT_EQ(UnitsOf(UString("\x80", UString::kMultipleEncodings)), Units{0x20AC});
}

TEST(UStringEncoding, SystemEncodingSubstitutesUnmappable) {
  if (!IsSystemRomanNative()) GTEST_SKIP() << "system code page is not 1252";
  EXPECT_EQ(FromUnits({'a', 0x4E00, 'b'}).string(UString::kSystemEncoding), "a?b");
}

TEST(UStringEncoding, MacRomanBothWays) {
  for (const Pair& p : kMacRoman) {
    const std::string b(1, static_cast<char>(p.byte));
    EXPECT_EQ(UnitsOf(UString(b, UString::kMacRomanEncoding)), Units{p.unit}) << p.byte;
    EXPECT_EQ(FromUnits({p.unit}).string(UString::kMacRomanEncoding), b) << p.byte;
  }
  // Every byte decodes to one distinct unit and encodes back to itself.
  std::string all;
  for (int b = 0; b < 256; ++b) all.push_back(static_cast<char>(b));
  const UString s(all.data(), all.size(), UString::kMacRomanEncoding);
  ASSERT_EQ(s.length(), 256u);
  EXPECT_EQ(std::set<unsigned short>(s.begin(), s.end()).size(), 256u);
  for (int b = 0; b < 0x80; ++b) EXPECT_EQ(s[b], b);
  EXPECT_EQ(s.string(UString::kMacRomanEncoding), all);
  EXPECT_EQ(FromUnits({'x', 0x4E00}).string(UString::kMacRomanEncoding), "x?");
}

TEST(UStringEncoding, AsciiKeepsSevenBitsAndReplacesTheRest) {
  EXPECT_EQ(FromUnits({'a', 0x00E9}).string(UString::kASCIIEncoding, '?'), "a?");
  EXPECT_EQ(FromUnits({0x7F, 0x80, 0xFFFF, 'z'}).string(UString::kASCIIEncoding, '#'),
            Bytes({0x7F, '#', '#', 'z'}));
  // Input: each byte is one unit.
  EXPECT_EQ(UnitsOf(UString(Bytes({'a', 0xE9, 0x80}), UString::kASCIIEncoding)),
            (Units{'a', 0xE9, 0x80}));
}

TEST(UStringEncoding, Latin1IsByteForUnit) {
  std::string all;
  for (int b = 0; b < 256; ++b) all.push_back(static_cast<char>(b));
  const UString s(all, UString::kLatin1Encoding);
  ASSERT_EQ(s.length(), 256u);
  for (int b = 0; b < 256; ++b) EXPECT_EQ(s[b], b);
  EXPECT_EQ(s.string(UString::kLatin1Encoding), all);
  EXPECT_EQ(FromUnits({0xFF, 0x100, 0x20AC}).string(UString::kLatin1Encoding, '*'),
            Bytes({0xFF, '*', '*'}));
}

TEST(UStringEncoding, MultipleEncodingsOutputIsEmpty) {
  const UString s("abc");
  EXPECT_EQ(s.string(UString::kMultipleEncodings), "");
  unsigned char buf[16];
  std::memset(buf, 0xEE, sizeof buf);
  s.pstring(buf, sizeof buf, UString::kMultipleEncodings);
  EXPECT_EQ(buf[0], 0);
  EXPECT_EQ(buf[1], 0xEE);
}

TEST(UStringEncoding, UnknownEncodingThrows) {
  EXPECT_THROW(UString("a", static_cast<UString::ByteEncoding>(5)), TarnError);
  EXPECT_THROW((void)UString("a").string(static_cast<UString::ByteEncoding>(-1)), TarnError);
}

TEST(UStringEncoding, NullSourcesReadAsEmpty) {
  const char* nullBytes = nullptr;
  const unsigned short* nullUnits = nullptr;
  const wchar_t* nullWide = nullptr;
  const unsigned char* nullPascal = nullptr;
  EXPECT_TRUE(UString(nullBytes).empty());
  EXPECT_TRUE(UString(nullUnits).empty());
  EXPECT_TRUE(UString(nullWide).empty());
  EXPECT_TRUE(UString(nullPascal).empty());
  EXPECT_TRUE(UString(nullBytes, 0, UString::kMacRomanEncoding).empty());
  UString s("x");
  s.append(nullBytes).append(nullUnits, 0).append(nullWide).append(nullPascal);
  EXPECT_EQ(s, UString("x"));
  EXPECT_THROW(UString(nullBytes, 3), TarnError);
  EXPECT_THROW(s.append(nullUnits, 1), TarnError);
  EXPECT_EQ(s, UString("x"));
}

TEST(UStringEncoding, StopAtNulEndsTheByteString) {
  const UString s(Units{'a', 'b', 0, 'c'}.data(), 4);
  EXPECT_EQ(s.string(UString::kUTF8Encoding, '?', false), std::string("ab\0c", 4));
  EXPECT_EQ(s.string(UString::kUTF8Encoding, '?', true), "ab");
}

TEST(UStringUTF8, ExactBytesBothWays) {
  const UString s(Bytes({'A', 0xC3, 0xA9, 0xE2, 0x82, 0xAC, 0xF0, 0x9F, 0x98, 0x80}));
  EXPECT_EQ(UnitsOf(s), (Units{'A', 0x00E9, 0x20AC, 0xD83D, 0xDE00}));
  EXPECT_EQ(s.utf8_str(), Bytes({'A', 0xC3, 0xA9, 0xE2, 0x82, 0xAC, 0xF0, 0x9F, 0x98, 0x80}));
  EXPECT_EQ(s.string(UString::kUTF8Encoding), s.utf8_str());
  EXPECT_EQ(FromUnits({0x7FF, 0x800, 0xFFFF}).utf8_str(),
            Bytes({0xDF, 0xBF, 0xE0, 0xA0, 0x80, 0xEF, 0xBF, 0xBF}));
}

TEST(UStringUTF8, MalformedInputBecomesReplacementCharacters) {
  const unsigned short R = 0xFFFD;
  struct Case {
    std::string in;
    Units out;
  } cases[] = {
      {Bytes({'a', 0x80, 'b'}), {'a', R, 'b'}},             // stray continuation
      {Bytes({0xC0, 0xAF}), {R, R}},                        // overlong lead
      {Bytes({0xE0, 0x80, 0xAF}), {R, R, R}},               // overlong three-byte
      {Bytes({0xE2, 0x82}), {R}},                           // truncated at end
      {Bytes({0xE2, 0x82, 'A'}), {R, 'A'}},                 // truncated before ASCII
      {Bytes({0xED, 0xA0, 0x80}), {R, R, R}},               // encoded surrogate
      {Bytes({0xF4, 0x90, 0x80, 0x80}), {R, R, R, R}},      // above U+10FFFF
      {Bytes({0xF0, 0x9F, 0x98}), {R}},                     // truncated four-byte
      {Bytes({0xFF, 'x'}), {R, 'x'}},                       // never valid
      {Bytes({0xF4, 0x8F, 0xBF, 0xBF}), {0xDBFF, 0xDFFF}},  // U+10FFFF is fine
  };
  for (const Case& c : cases)
    EXPECT_EQ(UnitsOf(UString(c.in)), c.out) << testing::PrintToString(c.in);
}

TEST(UStringUTF8, UnpairedSurrogatesBecomeReplacementCharacters) {
  const std::string fffd = Bytes({0xEF, 0xBF, 0xBD});
  EXPECT_EQ(FromUnits({0xD800}).utf8_str(), fffd);
  EXPECT_EQ(FromUnits({'a', 0xDC00, 'b'}).utf8_str(), "a" + fffd + "b");
  EXPECT_EQ(FromUnits({0xDC00, 0xD800}).utf8_str(), fffd + fffd);
  EXPECT_EQ(FromUnits({0xD800, 'x'}).utf32_str(), (UTF32String{0xFFFD, 'x'}));
}

TEST(UStringUTF8, EveryCodePointRoundTrips) {
  UTF32String all;
  for (unsigned cp = 0; cp <= 0x10FFFF; ++cp) {
    if (cp < 0xD800 || cp > 0xDFFF) all.push_back(cp);
  }
  const UString s(all);
  EXPECT_EQ(s.length(), 0xFFFFu - 0x800u + 1u + 2u * 0x100000u);
  EXPECT_EQ(s.utf32_str(), all);
  const UString back(s.utf8_str());
  EXPECT_TRUE(back == s);
}

TEST(UStringUTF32, InvalidValuesAndCodePointAppend) {
  EXPECT_EQ(UnitsOf(UString(UTF32String{0x110000, 0xD800, 0x41})), (Units{0xFFFD, 0xFFFD, 'A'}));
  UString s;
  s.append(0x10FFFFu).append(0x41u).append(0x1F600u).append(0xDFFFu);
  EXPECT_EQ(UnitsOf(s), (Units{0xDBFF, 0xDFFF, 'A', 0xD83D, 0xDE00, 0xFFFD}));
  s += 0x20ACu;
  EXPECT_EQ(s.back(), 0x20AC);
}

TEST(UStringWide, RoundTripsThroughTheNativeWideString) {
  const std::wstring w = L"A\u00E9\u20AC\U0001F600";
  const UString s(w);
  EXPECT_EQ(UnitsOf(s), (Units{'A', 0xE9, 0x20AC, 0xD83D, 0xDE00}));
  EXPECT_EQ(s.wstring(), w);
  EXPECT_EQ(UString(w.c_str()), s);
  UString t("x");
  t += w;
  t.append(L"!");
  EXPECT_EQ(t.length(), 7u);
}

TEST(UStringPascal, ReadsLengthByteThenBytes) {
  const unsigned char p[] = {5, 'H', 'e', 'l', 'l', 'o', 'X', 'X'};
  EXPECT_EQ(UString(p), UString("Hello"));
  const unsigned char mac[] = {2, 0x8E, 0xA5};
  EXPECT_EQ(UnitsOf(UString(mac, UString::kMacRomanEncoding)), (Units{0xE9, 0x2022}));
  const unsigned char empty[] = {0};
  EXPECT_TRUE(UString(empty).empty());
  UString s("a");
  s.append(p);
  EXPECT_EQ(s, UString("aHello"));
}

TEST(UStringPascal, WritesWithinTheBufferAndAt255) {
  const UString hello("Hello");
  for (int size = 0; size <= 8; ++size) {
    unsigned char buf[10];
    std::memset(buf, 0xEE, sizeof buf);
    EXPECT_EQ(hello.pstring(buf, size), buf);
    const int expected = size < 1 ? -1 : std::min(5, size - 1);
    if (expected < 0) {
      EXPECT_EQ(buf[0], 0xEE);
      continue;
    }
    EXPECT_EQ(buf[0], expected) << size;
    EXPECT_EQ(std::memcmp(buf + 1, "Hello", static_cast<std::size_t>(expected)), 0);
    for (int i = expected + 1; i < 10; ++i) EXPECT_EQ(buf[i], 0xEE) << size << ' ' << i;
  }
  std::vector<unsigned char> big(600, 0xEE);
  UString(std::string(400, 'z')).pstring(big.data(), static_cast<int>(big.size()));
  EXPECT_EQ(big[0], 255);
  EXPECT_EQ(big[255], 'z');
  EXPECT_EQ(big[256], 0xEE);
  EXPECT_EQ(hello.pstring(nullptr, 10), nullptr);
}

TEST(UStringPascal, EncodesAndNeverSplitsUTF8) {
  unsigned char buf[8];
  FromUnits({'a', 0xE9}).pstring(buf, 3, UString::kUTF8Encoding);  // room for 2 of 3 bytes
  EXPECT_EQ(buf[0], 1);
  EXPECT_EQ(buf[1], 'a');
  FromUnits({'a', 0xE9}).pstring(buf, 4, UString::kUTF8Encoding);
  EXPECT_EQ(buf[0], 3);
  FromUnits({0xE9, 0x2022}).pstring(buf, sizeof buf, UString::kMacRomanEncoding);
  EXPECT_EQ(std::string(reinterpret_cast<char*>(buf), 3), Bytes({2, 0x8E, 0xA5}));
  FromUnits({'a', 0xE9}).pstring(buf, sizeof buf, UString::kASCIIEncoding, '_');
  EXPECT_EQ(std::string(reinterpret_cast<char*>(buf), 3), Bytes({2, 'a', '_'}));
}

}  // namespace
}  // namespace tarn
