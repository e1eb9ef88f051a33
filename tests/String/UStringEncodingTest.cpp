// Byte encodings, UTF-8/16/32, wide strings and Pascal strings, checked to the byte.
#include <gtest/gtest.h>

#include <set>
#include <span>
#include <utility>

#include "String/StringTestUtil.h"
#include "tarn/Errors/TarnError.h"
#include "tarn/String/UString.h"

namespace tarn {
namespace {

using namespace test;
using enum UString::ByteEncoding;
using Encoding = UString::ByteEncoding;
constexpr unsigned short R = 0xFFFD;

// One to four UTF-8 bytes, including the edges of each length.
const Units kMixedUnits = {'A', 0xE9, 0x7FF, 0x800, 0x20AC, 0xFFFF, 0xD83D, 0xDE00};
const std::string kMixedBytes = Bytes({'A', 0xC3, 0xA9, 0xDF, 0xBF, 0xE0, 0xA0, 0x80, 0xE2, 0x82,
                                       0xAC, 0xEF, 0xBF, 0xBF, 0xF0, 0x9F, 0x98, 0x80});

using Pair = std::pair<int, unsigned short>;  // byte, unit

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

// Every byte decodes to one distinct unit (its own value below identityEnd
// unless listed in spots) and the whole text encodes back to the same bytes.
// The five bytes 1252 leaves unassigned read as the C1 controls of that value;
// multiple encodings read as the system encoding and write nothing.
TEST(UStringEncoding, SingleByteEncodingsDecodeExactlyAndRoundTripEveryByte) {
  const std::string all = AllBytes();
  for (const auto& [enc, spots, identityEnd] :
       Rows<Encoding, std::span<const Pair>, int>{{kSystemEncoding, kWin1252, 256},
                                                  {kMultipleEncodings, kWin1252, 256},
                                                  {kMacRomanEncoding, kMacRoman, 0x80},
                                                  {kLatin1Encoding, {}, 256}}) {
    SCOPED_TRACE(enc);
    if (enc != kMacRomanEncoding && enc != kLatin1Encoding && !IsSystemRomanNative()) continue;
    const UString s(all.data(), all.size(), enc);
    ASSERT_EQ(s.length(), 256u);
    EXPECT_EQ(std::set<unsigned short>(s.begin(), s.end()).size(), 256u);
    std::vector<int> want(256, -1);
    for (int b = 0; b < identityEnd; ++b) want[b] = b;
    for (const auto& [byte, unit] : spots) want[byte] = unit;
    for (int b = 0; b < 256; ++b) EXPECT_TRUE(want[b] < 0 || s[b] == want[b]) << b;
    EXPECT_EQ(s.string(enc), enc == kMultipleEncodings ? "" : all);
  }
}

// Encodings 0 and 1 substitute '?' whatever replacement the caller passes.
TEST(UStringEncoding, OutputBytesAndReplacements) {
  const std::string fffd = Bytes({0xEF, 0xBF, 0xBD});
  for (const auto& [enc, in, out, stopAtNul] : Rows<Encoding, Units, std::string, bool>{
           {kSystemEncoding, {'a', 0x4E00, 'b'}, "a?b", false},
           {kMacRomanEncoding, {'x', 0x4E00}, "x?", false},
           {kASCIIEncoding, {0x7F, 0x80, 0xFFFF, 'z'}, Bytes({0x7F, '#', '#', 'z'}), false},
           {kLatin1Encoding, {0xFF, 0x100, 0x20AC}, Bytes({0xFF, '#', '#'}), false},
           {kLatin1Encoding, {'a', 0, 0xE9}, "a", true},
           {kMultipleEncodings, {'a', 'b', 'c'}, "", false},
           {kUTF8Encoding, {'a', 'b', 0, 'c'}, "ab", true},
           {kUTF8Encoding, kMixedUnits, kMixedBytes, false},
           {kUTF8Encoding, {0xD800}, fffd, false},
           {kUTF8Encoding, {'a', 0xDC00, 'b'}, "a" + fffd + "b", false},
           {kUTF8Encoding, {0xDC00, 0xD800}, fffd + fffd, false}}) {
    SCOPED_TRACE(testing::PrintToString(in));
    if (enc == kSystemEncoding && !IsSystemRomanNative()) continue;
    const UString s = FromUnits(in);
    EXPECT_EQ(s.string(enc, '#', stopAtNul), out);
    if (enc != kUTF8Encoding || stopAtNul) continue;
    EXPECT_EQ(s.utf8_str(), out);
  }
}

TEST(UStringEncoding, InvalidArguments) {
  EXPECT_THROW(UString("a", static_cast<Encoding>(5)), TarnError);
  EXPECT_THROW((void)UString("a").string(static_cast<Encoding>(-1)), TarnError);
  const char* nullBytes = nullptr;
  const unsigned short* nullUnits = nullptr;
  const unsigned char* nullPascal = nullptr;
  EXPECT_TRUE(UString(nullBytes).empty() && UString(nullPascal).empty());
  UString s("x");
  s.append(nullBytes).append(nullUnits, 0).append(static_cast<const wchar_t*>(nullptr));
  EXPECT_THROW(UString(nullBytes, 3), TarnError);
  EXPECT_THROW(s.append(nullUnits, 1), TarnError);
  EXPECT_EQ(s, UString("x"));
}

TEST(UStringUTF8, DecodingValidAndMalformedInput) {
  for (const auto& [in, out] :
       Rows<std::string, Units>{{kMixedBytes, kMixedUnits},
                                {Bytes({0xF4, 0x8F, 0xBF, 0xBF}), {0xDBFF, 0xDFFF}},  // U+10FFFF
                                {Bytes({'a', 0x80, 'b'}), {'a', R, 'b'}},  // stray continuation
                                {Bytes({0xC0, 0xAF}), {R, R}},             // overlong lead
                                {Bytes({0xE0, 0x80, 0xAF}), {R, R, R}},    // overlong three-byte
                                {Bytes({0xE2, 0x82}), {R}},                // truncated at end
                                {Bytes({0xE2, 0x82, 'A'}), {R, 'A'}},      // truncated before ASCII
                                {Bytes({0xED, 0xA0, 0x80}), {R, R, R}},    // encoded surrogate
                                {Bytes({0xF4, 0x90, 0x80, 0x80}), {R, R, R, R}},  // above U+10FFFF
                                {Bytes({0xFF, 'x'}), {R, 'x'}}}) {                // never valid
    EXPECT_EQ(UnitsOf(UString(in)), out) << testing::PrintToString(in);
  }
}

TEST(UStringUTF32, EveryCodePointRoundTripsInvalidValuesAndWideStrings) {
  UTF32String all;
  for (unsigned cp = 0; cp <= 0x10FFFF; ++cp) {
    if (cp < 0xD800 || cp > 0xDFFF) all.push_back(cp);
  }
  const UString every(all);
  EXPECT_EQ(every.length(), 0xFFFFu - 0x800u + 1u + 2u * 0x100000u);
  EXPECT_EQ(every.utf32_str(), all);
  EXPECT_TRUE(UString(every.utf8_str()) == every);
  EXPECT_EQ(UnitsOf(UString(UTF32String{0x110000, 0xD800, 0x41})), (Units{R, R, 'A'}));
  EXPECT_EQ(FromUnits({0xD800, 'x'}).utf32_str(), (UTF32String{R, 'x'}));
  UString s;
  s.append(0x10FFFFu).append(0x41u).append(0x1F600u).append(0xDFFFu);
  s += 0x20ACu;
  EXPECT_EQ(UnitsOf(s), (Units{0xDBFF, 0xDFFF, 'A', 0xD83D, 0xDE00, R, 0x20AC}));
  const std::wstring w = L"A\u00E9\u20AC\U0001F600";
  EXPECT_EQ(UnitsOf(UString(w)), (Units{'A', 0xE9, 0x20AC, 0xD83D, 0xDE00}));
  EXPECT_EQ(UString(w.c_str()).wstring(), w);
}

// The bytes pstring writes into a 0xEE-filled 300-byte buffer of nominal `size`.
std::string PascalImage(const UString& s, int size, Encoding enc = kUTF8Encoding,
                        unsigned char replacement = '?') {
  std::string buf(300, '\xEE');
  auto* p = reinterpret_cast<unsigned char*>(buf.data());
  EXPECT_EQ(s.pstring(p, size, enc, replacement), p);
  return buf;
}
std::string Filled(std::string head) { return head.resize(300, '\xEE'), head; }

TEST(UStringPascal, ReadsAndWritesWithinTheBufferNeverSplittingUTF8) {
  EXPECT_EQ(UnitsOf(UString(Bytes({'a', 0xE9, 0x80}), kASCIIEncoding)), (Units{'a', 0xE9, 0x80}));
  const unsigned char pascal[] = {5, 'H', 'e', 'l', 'l', 'o', 'X', 'X'}, empty[] = {0};
  EXPECT_EQ(UString(pascal), UString("Hello"));
  EXPECT_TRUE(UString(empty).empty());
  for (int size = 0; size <= 8; ++size) {
    const int n = std::min(5, size - 1);
    EXPECT_EQ(PascalImage(UString("Hello"), size),
              Filled(size < 1 ? "" : char(n) + std::string("Hello", n)))
        << size;
  }
  EXPECT_EQ(PascalImage(UString(std::string(400, 'z')), 300),
            Filled('\xFF' + std::string(255, 'z')));
  EXPECT_EQ(UString("x").pstring(nullptr, 10), nullptr);

  for (const auto& [in, size, enc, out] : Rows<Units, int, Encoding, std::string>{
           {{'a', 0xE9}, 3, kUTF8Encoding, Bytes({1, 'a'})},  // room for 2 of 3 bytes
           {{'a', 0xE9}, 4, kUTF8Encoding, Bytes({3, 'a', 0xC3, 0xA9})},
           {{0xE9, 0x2022}, 8, kMacRomanEncoding, Bytes({2, 0x8E, 0xA5})},
           {{'a', 'b', 'c'}, 16, kMultipleEncodings, Bytes({0})}}) {
    EXPECT_EQ(PascalImage(FromUnits(in), size, enc, '_'), Filled(out))
        << testing::PrintToString(in);
  }
}

}  // namespace
}  // namespace tarn
