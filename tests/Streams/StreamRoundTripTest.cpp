// Every value type through every kind of stream, and short data read back
// at every possible cut.

#include <gtest/gtest-spi.h>
#include <gtest/gtest.h>

#include <cmath>
#include <cstring>
#include <limits>
#include <string>
#include <thread>

#include "StreamTestSupport.h"

namespace tarn {
namespace {

using test::Bytes;
using test::Channel;
using test::ChannelKind;
using test::CodeOf;

UString NonAscii() {
  UString s("Gr");
  s += static_cast<UString::value_type>(0xFC);  // u-umlaut
  s += "n ";
  s += static_cast<unsigned int>(0x1F3B5);  // outside the basic plane
  return s;
}

// Writes one of everything; ReadRecord checks it.
void WriteRecord(CStream& s) {
  static const unsigned char pascal[] = {5, 'h', 'e', 'l', 'l', 'o'};
  static const short shorts[] = {std::numeric_limits<short>::min(), -1, 0, 1,
                                 std::numeric_limits<short>::max()};
  static const int longs[] = {std::numeric_limits<int>::min(), -1, 0, 0x12345678};
  static const float floats[] = {0.0f, -1.5f, std::numeric_limits<float>::denorm_min()};
  s.PutChar('\xF0');
  s.PutBoolean(true);
  s.PutShort(std::numeric_limits<short>::min());
  s.PutLong(std::numeric_limits<int>::min());
  s.PutLongLong(std::numeric_limits<std::int64_t>::min() + 5);
  s.PutPoint(tarnPoint{-3, 4});
  s.PutRect(tarnRect{-1, -2, 300, 400});
  s._PutDouble(-0.125);
  s.PutIEEEDouble(std::numeric_limits<double>::max());
  s.PutIEEEDouble(-0.0);
  s.PutUString(NonAscii());
  s.PutUString(UString());
  s.PutStr("nul-terminated");
  s.PutStr255(pascal);
  s.PutStr255AsLine(pascal);
  auto_handle<char> h(NewHandle(4));
  std::memcpy(h.data(), "\x00\x01\x02\xFF", 4);
  s.PutHandle(h.get());
  s.PutHandle(nullptr);
  s.PutCharArray("raw", 3);
  s.PutShortArray(shorts, 5);
  s.PutLongArray(longs, 4);
  s.PutFloatArray(floats, 3);
  s.PutLong(0x0E0D0E0D);
}

void ReadRecord(CStream& s) {
  EXPECT_EQ(s.GetChar(), '\xF0');
  EXPECT_TRUE(s.GetBoolean());
  EXPECT_EQ(s.GetShort(), std::numeric_limits<short>::min());
  EXPECT_EQ(s.GetLong(), std::numeric_limits<int>::min());
  EXPECT_EQ(s.GetLongLong(), std::numeric_limits<std::int64_t>::min() + 5);
  EXPECT_EQ(s.GetPoint(), (tarnPoint{-3, 4}));
  EXPECT_EQ(s.GetRect(), (tarnRect{-1, -2, 300, 400}));
  EXPECT_EQ(s._GetDouble(), -0.125);
  EXPECT_EQ(s.GetIEEEDouble(), std::numeric_limits<double>::max());
  const double negZero = s.GetIEEEDouble();
  EXPECT_TRUE(negZero == 0.0 && std::signbit(negZero));
  UString u;
  s.GetUString(u);
  EXPECT_TRUE(u == NonAscii());
  s.GetUString(u);
  EXPECT_TRUE(u.empty());
  char str[32] = {};
  s.GetStr(str, 32);
  EXPECT_STREQ(str, "nul-terminated");
  unsigned char p[256] = {};
  s.GetStr255(p);
  EXPECT_EQ(std::string(reinterpret_cast<char*>(p + 1), p[0]), "hello");
  s.GetStr255(p);
  EXPECT_EQ(std::string(reinterpret_cast<char*>(p + 1), p[0]), "hello");
  EXPECT_EQ(s.GetChar(), 13);
  auto_handle<char> h = s.GetHandle();
  EXPECT_EQ(std::string(h.data(), h.size()), std::string("\x00\x01\x02\xFF", 4));
  EXPECT_EQ(s.GetHandle().size(), 0u);
  char raw[3] = {};
  s.GetCharArray(raw, 3);
  EXPECT_EQ(std::string(raw, 3), "raw");
  short shorts[5] = {};
  s.GetShortArray(shorts, 5);
  EXPECT_EQ(shorts[0], std::numeric_limits<short>::min());
  EXPECT_EQ(shorts[1], -1);
  EXPECT_EQ(shorts[4], std::numeric_limits<short>::max());
  int longs[4] = {};
  s.GetLongArray(longs, 4);
  EXPECT_EQ(longs[0], std::numeric_limits<int>::min());
  EXPECT_EQ(longs[3], 0x12345678);
  float floats[3] = {};
  s.GetFloatArray(floats, 3);
  EXPECT_EQ(floats[1], -1.5f);
  EXPECT_EQ(floats[2], std::numeric_limits<float>::denorm_min());
  EXPECT_EQ(s.GetLong(), 0x0E0D0E0D);
}

class EveryStream : public ::testing::TestWithParam<ChannelKind> {};

TEST_P(EveryStream, RecordRoundTrips) {
  auto channel = GetParam().make();
  WriteRecord(channel->Out());
  const Bytes image = test::ImageOf(WriteRecord);
  EXPECT_EQ(channel->Out().Position(), static_cast<std::int64_t>(image.size()));
  CStream& in = channel->In();
  ReadRecord(in);
  EXPECT_TRUE(in.AtEnd()) << "every byte read, none left";
}

TEST_P(EveryStream, ManyValuesAcrossBufferBoundaries) {
  auto channel = GetParam().make();
  for (int i = 0; i < 5000; ++i) {
    channel->Out().PutLong(i * 7919);
    channel->Out().PutShort(static_cast<short>(i));
    if (i % 100 == 0)
      channel->Out().PutUString(UString(std::string(static_cast<std::size_t>(i % 700), 'z')));
  }
  CStream& in = channel->In();
  for (int i = 0; i < 5000; ++i) {
    ASSERT_EQ(in.GetLong(), i * 7919) << i;
    ASSERT_EQ(in.GetShort(), static_cast<short>(i)) << i;
    if (i % 100 == 0) {
      UString u;
      in.GetUString(u);
      ASSERT_EQ(u.length(), static_cast<std::size_t>(i % 700));
    }
  }
}

TEST_P(EveryStream, SeventyThousandByteTextIsCutAndSkipped) {
  auto channel = GetParam().make();
  const std::string text(70000, 'k');
  channel->Out().PutUString(UString(text));
  channel->Out().PutShort(0x1234);
  CStream& in = channel->In();
  UString back;
  in.GetUString(back);
  EXPECT_EQ(back.length(), 65535u);
  EXPECT_EQ(in.GetShort(), 0x1234);
}

INSTANTIATE_TEST_SUITE_P(Kinds, EveryStream, ::testing::ValuesIn(test::AllChannelKinds()),
                         [](const auto& info) { return info.param.name; });

// Every proper prefix of the record, read through a handle stream and a file
// stream, fails with end of file and never reads beyond the data.
TEST(Truncation, EveryCutOfARecordFailsWithEndOfFile) {
  const Bytes image = test::ImageOf(WriteRecord);
  test::TempPath path("cut");
  // The fields before the record's number text.
  const std::size_t numberTextStart = test::ImageOf([](CStream& s) {
                                        s.PutChar(0);
                                        s.PutBoolean(false);
                                        s.PutShort(0);
                                        s.PutLong(0);
                                        s.PutLongLong(0);
                                        s.PutPoint({});
                                        s.PutRect({});
                                      }).size();
  for (std::size_t cut = 0; cut < image.size(); ++cut) {
    auto_handle<char> h(NewHandle(cut));
    if (cut) std::memcpy(h.data(), image.data(), cut);
    CHandleStream s(h.get(), kTCLReadMode);
    const int code = CodeOf([&] {
      // The value cut in two may read wrong before the throw; only the
      // code matters here.
      ::testing::TestPartResultArray ignored;
      ::testing::ScopedFakeTestPartResultReporter quiet(
          ::testing::ScopedFakeTestPartResultReporter::INTERCEPT_ONLY_CURRENT_THREAD, &ignored);
      ReadRecord(s);
    });
    // Nothing at all where a number text starts is "no number text".
    ASSERT_TRUE(code == -39 || (code == CStream::kNoNumberText && cut == numberTextStart))
        << "cut at " << cut << ": " << code;
  }
  for (std::size_t cut = 0; cut < image.size(); cut += 7) {
    {
      CFileStream out(path.Spec(), 16);
      out.Open(kTCLWriteMode);
      out.PutCharArray(reinterpret_cast<const char*>(image.data()), static_cast<int>(cut));
      out.Close();
    }
    CFileStream in(path.Spec(), 16);
    in.Open(kTCLReadMode);
    ASSERT_EQ(CodeOf([&] {
                ::testing::TestPartResultArray ignored;
                ::testing::ScopedFakeTestPartResultReporter quiet(
                    ::testing::ScopedFakeTestPartResultReporter::INTERCEPT_ONLY_CURRENT_THREAD,
                    &ignored);
                ReadRecord(in);
              }),
              cut == numberTextStart ? CStream::kNoNumberText : -39)
        << "cut at " << cut;
  }
}

// PtrStream refuses short reads silently: values come back as zeros, and no
// read goes outside the area (the sanitizer builds check this).
TEST(Truncation, PtrStreamCutsReadZerosInsideTheArea) {
  const Bytes image = test::ImageOf(WriteRecord);
  for (std::size_t cut = 0; cut < image.size(); ++cut) {
    std::vector<char> exact(image.begin(), image.begin() + static_cast<std::ptrdiff_t>(cut));
    PtrStream s(static_cast<const void*>(exact.data()), static_cast<std::int64_t>(cut));
    try {
      ::testing::TestPartResultArray ignored;
      ::testing::ScopedFakeTestPartResultReporter quiet(
          ::testing::ScopedFakeTestPartResultReporter::INTERCEPT_ONLY_CURRENT_THREAD, &ignored);
      ReadRecord(s);
    } catch (const TarnError& e) {
      // Only the typed layer's own checks may fail here.
      ASSERT_TRUE(e.GetIntErrorCode() == -39 || e.GetIntErrorCode() == 2) << e.GetIntErrorCode();
    }
    ASSERT_LE(s.Position(), static_cast<std::int64_t>(cut));
  }
}

TEST(PipedStream, TwoThreadsExchangeARecordStream) {
  PipedStream out;
  PipedStream in(out);
  std::thread writer([&] {
    for (int i = 0; i < 200; ++i) WriteRecord(out);
  });
  for (int i = 0; i < 200; ++i) ReadRecord(in);
  writer.join();
}

TEST(PipedStream, ReadAfterTheWriterIsGoneFailsWithEndOfFile) {
  auto out = std::make_unique<PipedStream>();
  PipedStream in(*out);
  out->PutShort(5);
  out->PutChar('x');
  EXPECT_GT(in.Size(), 1'000'000'000) << "unbounded while the writer lives";
  out.reset();
  EXPECT_EQ(in.Size(), 3);
  EXPECT_EQ(in.GetShort(), 5);
  EXPECT_EQ(CodeOf([&] { (void)in.GetShort(); }), -39);
  EXPECT_TRUE(in.AtEnd());
}

TEST(PipedStream, PositionsAndSkipping) {
  PipedStream out;
  PipedStream in(out);
  out.PutLong(1);
  out.PutLong(2);
  EXPECT_EQ(out.Position(), 8);
  in.MoveTo(4);  // skips the first long
  EXPECT_EQ(in.GetLong(), 2);
  EXPECT_EQ(CodeOf([&] { in.MoveTo(0); }), CStream::kPositionOutOfRange);
  EXPECT_EQ(CodeOf([&] { out.MoveTo(100); }), CStream::kPositionOutOfRange);
}

}  // namespace
}  // namespace tarn
