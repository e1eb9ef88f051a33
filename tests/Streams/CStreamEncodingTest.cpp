// The wire format: exact bytes of every typed operation, and reading back
// through the special rules (cut texts, limited strings, lines, number text).

#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "StreamTestSupport.h"
#include "tarn/Streams/CHandleStream.h"
#include "tarn/Streams/PtrStream.h"
#include "tarn/String/UString.h"

namespace tarn {
namespace {

using test::Bytes;
using test::CodeOf;
using test::ImageOf;

// A read stream over `bytes`.
CHandleStream ReaderOver(const Bytes& bytes, auto_handle<char>& keep) {
  keep.reset(NewHandle(bytes.size()));
  if (!bytes.empty()) std::memcpy(keep.data(), bytes.data(), bytes.size());
  return CHandleStream(keep.get(), kTCLReadMode);
}

TEST(CStreamEncoding, NumbersAreBigEndian) {
  EXPECT_EQ(ImageOf([](CStream& s) { s.PutLong(1); }), (Bytes{0, 0, 0, 1}));
  EXPECT_EQ(ImageOf([](CStream& s) { s.PutShort(-2); }), (Bytes{0xFF, 0xFE}));
  EXPECT_EQ(ImageOf([](CStream& s) { s.PutLongLong(0x0102030405060708); }),
            (Bytes{1, 2, 3, 4, 5, 6, 7, 8}));
  EXPECT_EQ(ImageOf([](CStream& s) { s.PutLong(-1); }), (Bytes{0xFF, 0xFF, 0xFF, 0xFF}));
  EXPECT_EQ(ImageOf([](CStream& s) { s.PutIEEEDouble(1.0); }),
            (Bytes{0x3F, 0xF0, 0, 0, 0, 0, 0, 0}));
  EXPECT_EQ(ImageOf([](CStream& s) { s.PutIEEEDouble(-2.5); }),
            (Bytes{0xC0, 0x04, 0, 0, 0, 0, 0, 0}));
}

TEST(CStreamEncoding, CharsBooleansPointsAndRects) {
  EXPECT_EQ(ImageOf([](CStream& s) {
              s.PutChar('A');
              s.PutBoolean(true);
              s.PutBoolean(false);
            }),
            (Bytes{0x41, 1, 0}));
  EXPECT_EQ(ImageOf([](CStream& s) { s.PutPoint(tarnPoint{1, -1}); }), (Bytes{0, 1, 0xFF, 0xFF}));
  EXPECT_EQ(ImageOf([](CStream& s) {
              s.PutRect(tarnRect{1, 2, 3, 4});
            }),
            (Bytes{0, 1, 0, 2, 0, 3, 0, 4}));
  auto_handle<char> keep;
  CHandleStream in = ReaderOver(Bytes{0, 7, 2, 1, 0}, keep);
  EXPECT_FALSE(in.GetBoolean());
  EXPECT_TRUE(in.GetBoolean()) << "any non-zero byte is true";
  EXPECT_TRUE(in.GetBoolean());
  EXPECT_TRUE(in.GetBoolean());
  EXPECT_FALSE(in.GetBoolean());
}

TEST(CStreamEncoding, Strings) {
  EXPECT_EQ(ImageOf([](CStream& s) { s.PutStr("ab"); }), (Bytes{'a', 'b', 0}));
  EXPECT_EQ(ImageOf([](CStream& s) { s.PutStr(""); }), (Bytes{0}));
  const unsigned char abc[] = {3, 'a', 'b', 'c', 'X'};
  EXPECT_EQ(ImageOf([&](CStream& s) { s.PutStr255(abc); }), (Bytes{3, 'a', 'b', 'c'}));
  EXPECT_EQ(ImageOf([&](CStream& s) { s.PutStr255AsLine(abc); }),
            (Bytes{3, 0x61, 0x62, 0x63, 0x0D}));
  EXPECT_EQ(ImageOf([](CStream& s) { s._PutDouble(0.1); }), (Bytes{'0', '.', '1', 0}));
  EXPECT_EQ(ImageOf([](CStream& s) { s._PutDouble(-1234.5); }),
            (Bytes{'-', '1', '2', '3', '4', '.', '5', 0}));
}

TEST(CStreamEncoding, UStringIsCountedUtf8) {
  EXPECT_EQ(ImageOf([](CStream& s) { s.PutUString(UString()); }), (Bytes{0, 0, 0, 0}));
  UString eAcute;
  eAcute += static_cast<UString::value_type>(0xE9);
  EXPECT_EQ(ImageOf([&](CStream& s) { s.PutUString(eAcute); }), (Bytes{0, 0, 0, 2, 0xC3, 0xA9}));
  UString euro;
  euro += static_cast<UString::value_type>(0x20AC);
  EXPECT_EQ(ImageOf([&](CStream& s) { s.PutUString(euro); }),
            (Bytes{0, 0, 0, 3, 0xE2, 0x82, 0xAC}));
  UString clef;
  clef += static_cast<unsigned int>(0x1D11E);  // a surrogate pair in UTF-16
  EXPECT_EQ(ImageOf([&](CStream& s) { s.PutUString(clef); }),
            (Bytes{0, 0, 0, 4, 0xF0, 0x9D, 0x84, 0x9E}));
}

TEST(CStreamEncoding, HandlesAndArrays) {
  EXPECT_EQ(ImageOf([](CStream& s) { s.PutHandle(nullptr); }), (Bytes{0, 0, 0, 0}));
  auto_handle<char> h(NewHandle(3));
  std::memcpy(h.data(), "xyz", 3);
  EXPECT_EQ(ImageOf([&](CStream& s) { s.PutHandle(h.get()); }), (Bytes{0, 0, 0, 3, 'x', 'y', 'z'}));
  EXPECT_EQ(ImageOf([&](CStream& s) { s.PutHandleOfSize(h.get(), 2); }), (Bytes{'x', 'y'}));
  EXPECT_EQ(CodeOf([&] { (void)ImageOf([&](CStream& s) { s.PutHandleOfSize(h.get(), 4); }); }), -50)
      << "more bytes than the block holds";

  const short shorts[] = {1, -2};
  EXPECT_EQ(ImageOf([&](CStream& s) { s.PutShortArray(shorts, 2); }), (Bytes{0, 1, 0xFF, 0xFE}));
  const int longs[] = {0x01020304, -1};
  EXPECT_EQ(ImageOf([&](CStream& s) { s.PutLongArray(longs, 2); }),
            (Bytes{1, 2, 3, 4, 0xFF, 0xFF, 0xFF, 0xFF}));
  const float floats[] = {1.0f, -2.0f};
  EXPECT_EQ(ImageOf([&](CStream& s) { s.PutFloatArray(floats, 2); }),
            (Bytes{0x3F, 0x80, 0, 0, 0xC0, 0, 0, 0}));
  EXPECT_EQ(longs[0], 0x01020304) << "the caller's array is not swapped";
  const char chars[] = {'a', 0, 'b'};
  EXPECT_EQ(ImageOf([&](CStream& s) { s.PutCharArray(chars, 3); }), (Bytes{'a', 0, 'b'}));
  void* p = &h;
  Bytes ptr(sizeof p);
  std::memcpy(ptr.data(), &p, sizeof p);
  EXPECT_EQ(ImageOf([&](CStream& s) { s.PutPointer(p); }), ptr) << "host order, 8 bytes";
}

TEST(CStreamEncoding, LongArraysCrossTheSliceBoundary) {
  std::vector<int> values(1000);
  for (int i = 0; i < 1000; ++i) values[static_cast<std::size_t>(i)] = i * 65537 - 7;
  CHandleStream s(kTCLReadWriteMode);
  s.PutLongArray(values.data(), 1000);
  ASSERT_EQ(s.Size(), 4000);
  s.MoveTo(999 * 4);
  EXPECT_EQ(s.GetLong(), 999 * 65537 - 7);
  s.MoveTo(0);
  std::vector<int> back(1000);
  s.GetLongArray(back.data(), 1000);
  EXPECT_EQ(back, values);
}

TEST(CStreamReading, LongUStringIsCutButSkippedWhole) {
  std::string text(70000, 'a');
  for (std::size_t i = 0; i < text.size(); ++i) text[i] = static_cast<char>('a' + i % 26);
  CHandleStream s(kTCLReadWriteMode);
  s.PutUString(UString(text.c_str()));
  s.PutLong(0x5A5A5A5A);
  s.MoveTo(0);
  UString back;
  s.GetUString(back);
  EXPECT_EQ(back.utf8_str(), text.substr(0, 65535));
  EXPECT_EQ(s.Position(), 4 + 70000);
  EXPECT_EQ(s.GetLong(), 0x5A5A5A5A);
}

TEST(CStreamReading, UStringEdgeCounts) {
  auto_handle<char> keep;
  // A negative count reads as empty and leaves the stream after the count.
  CHandleStream neg = ReaderOver(Bytes{0xFF, 0xFF, 0xFF, 0xFF, 0, 0, 0, 9}, keep);
  UString s = UString("x");
  neg.GetUString(s);
  EXPECT_TRUE(s.empty());
  EXPECT_EQ(neg.GetLong(), 9);
  // A count beyond the data fails with end of file.
  auto_handle<char> keep2;
  CHandleStream lying = ReaderOver(Bytes{0, 0, 0, 5, 'a', 'b'}, keep2);
  EXPECT_EQ(CodeOf([&] { lying.GetUString(s); }), -39);
  // A long count beyond the data: the first 65,535 are missing already.
  auto_handle<char> keep3;
  CHandleStream huge = ReaderOver(Bytes{0x7F, 0, 0, 0, 'a'}, keep3);
  EXPECT_EQ(CodeOf([&] { huge.GetUString(s); }), -39);
}

TEST(CStreamReading, PascalStrings) {
  auto_handle<char> keep;
  CHandleStream s = ReaderOver(Bytes{3, 'a', 'b', 'c', 5, '1', '2', '3', '4', '5', 'Z'}, keep);
  unsigned char buf[256] = {};
  s.GetStr255(buf);
  EXPECT_EQ(buf[0], 3);
  EXPECT_EQ(std::memcmp(buf + 1, "abc", 3), 0);
  s.GetLimitedStr255(buf, 3);  // room for 2 characters
  EXPECT_EQ(buf[0], 2);
  EXPECT_EQ(std::memcmp(buf + 1, "12", 2), 0);
  EXPECT_EQ(s.GetChar(), '3') << "the rest of the stored string is not skipped";
  const auto before = s.Position();
  s.GetLimitedStr255(buf, 0);
  EXPECT_EQ(s.Position(), before) << "max 0 reads nothing";
}

TEST(CStreamReading, Lines) {
  CHandleStream s(kTCLReadWriteMode);
  const unsigned char abc[] = {3, 'a', 'b', 'c'};
  s.PutCharArray("hello\rworld", 11);
  s.MoveTo(0);
  unsigned char buf[256] = {};
  s.GetLineAsStr255(buf);
  EXPECT_EQ(std::string(reinterpret_cast<char*>(buf + 1), buf[0]), "hello");
  s.GetLineAsStr255(buf);
  EXPECT_EQ(std::string(reinterpret_cast<char*>(buf + 1), buf[0]), "world") << "last line, no CR";
  (void)abc;

  CHandleStream longLine(kTCLReadWriteMode);
  const std::string text(300, 'q');
  longLine.PutCharArray(text.data(), 300);
  longLine.PutChar(13);
  longLine.MoveTo(0);
  EXPECT_EQ(CodeOf([&] { longLine.GetLineAsStr255(buf); }), 3);

  CHandleStream exact(kTCLReadWriteMode);
  exact.PutCharArray(text.data(), 254);
  exact.PutChar(13);
  exact.MoveTo(0);
  exact.GetLineAsStr255(buf);
  EXPECT_EQ(buf[0], 254) << "254 characters and the CR fit";
}

TEST(CStreamReading, NumberText) {
  for (double d : {0.0, 1.0, -0.1, 3.141592653589793, 1e300, -2.5e-300, 123456789012345.6}) {
    CHandleStream s(kTCLReadWriteMode);
    s._PutDouble(d);
    s.MoveTo(0);
    EXPECT_EQ(s._GetDouble(), d);
    EXPECT_TRUE(s.AtEnd());
  }
  CHandleStream empty(kTCLReadWriteMode);
  EXPECT_EQ(CodeOf([&] { (void)empty._GetDouble(); }), 2);
  auto_handle<char> keep;
  CHandleStream garbage = ReaderOver(Bytes{'x', 0}, keep);
  EXPECT_EQ(CodeOf([&] { (void)garbage._GetDouble(); }), 2);
  auto_handle<char> keep2;
  CHandleStream cut = ReaderOver(Bytes{'1', '2', '.'}, keep2);
  EXPECT_EQ(CodeOf([&] { (void)cut._GetDouble(); }), -39) << "no NUL: the text was cut";
}

TEST(CStreamReading, HandlesAndStrs) {
  CHandleStream s(kTCLReadWriteMode);
  s.PutHandle(nullptr);
  auto_handle<char> h(NewHandle(5));
  std::memcpy(h.data(), "12345", 5);
  s.PutHandle(h.get());
  s.PutStr("text");
  s.MoveTo(0);
  auto_handle<char> empty = s.GetHandle();
  ASSERT_TRUE(empty);
  EXPECT_EQ(empty.size(), 0u);
  auto_handle<char> back = s.GetHandle();
  EXPECT_EQ(std::string(back.data(), back.size()), "12345");
  char text[10] = {};
  s.GetStr(text, 10);
  EXPECT_STREQ(text, "text");

  auto_handle<char> keep;
  CHandleStream lying = ReaderOver(Bytes{0x7F, 0xFF, 0xFF, 0xFF, 1, 2}, keep);
  EXPECT_EQ(CodeOf([&] { (void)lying.GetHandle(); }), -39) << "checked before allocating 2 GB";
  auto_handle<char> keep2;
  CHandleStream negative = ReaderOver(Bytes{0xFF, 0xFF, 0xFF, 0xFE}, keep2);
  EXPECT_EQ(CodeOf([&] { (void)negative.GetHandle(); }), -50);
}

}  // namespace
}  // namespace tarn
