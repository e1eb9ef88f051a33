// Chunk envelopes, version decisions, and UString in legacy byte forms.

#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "StreamTestSupport.h"
#include "tarn/Streams/StreamChunk.h"
#include "tarn/Streams/UStringIO.h"

namespace tarn {
namespace {

using test::Bytes;
using test::CodeOf;
using test::ImageOf;

constexpr int kPrefs = 0x50524546;  // 'PREF'
constexpr int kInner = 0x494E4E52;  // 'INNR'

TEST(StreamChunk, EmptyChunkIsSixteenBytes) {
  EXPECT_EQ(ImageOf([](CStream& s) { StreamChunkWriter w(s, kPrefs, StreamChunkVers(2, 3)); }),
            (Bytes{0x7C, 0x97, 0x0F, 0x1A, 'P', 'R', 'E', 'F', 0, 2, 0, 3, 0, 0, 0, 0}));
}

TEST(StreamChunk, LengthCountsTheData) {
  const Bytes image = ImageOf([](CStream& s) {
    StreamChunkWriter w(s, kPrefs);
    s.PutLong(1);
    s.PutShort(2);
  });
  ASSERT_EQ(image.size(), 22u);
  EXPECT_EQ(Bytes(image.begin() + 8, image.begin() + 16), (Bytes{0, 1, 0, 1, 0, 0, 0, 6}))
      << "the named default version is 1.1";
}

TEST(StreamChunk, VersionDefaultsAndOrder) {
  EXPECT_EQ(StreamChunkVers(), StreamChunkVers(1, 0));
  EXPECT_EQ(kDefaultMajVers, 1);
  EXPECT_EQ(kDefaultMinVers, 1);
  EXPECT_TRUE(StreamChunkVers(1, 9) < StreamChunkVers(2, 0));
  EXPECT_TRUE(StreamChunkVers(2, 1) < StreamChunkVers(2, 3));
  EXPECT_FALSE(StreamChunkVers(2, 3) < StreamChunkVers(2, 3));
  EXPECT_EQ(ImageOf([](CStream& s) { StreamChunkVers(-1, 258).put(s); }),
            (Bytes{0xFF, 0xFF, 1, 2}));
}

TEST(StreamChunk, VersionDecisions) {
  CHandleStream s(kTCLReadWriteMode);
  { StreamChunkWriter w(s, kPrefs, StreamChunkVers(2, 3)); }
  s.MoveTo(0);
  StreamChunkReader r(s);
  EXPECT_EQ(r.GetID(), kPrefs);
  EXPECT_EQ(r.GetVers(), StreamChunkVers(2, 3));
  EXPECT_EQ(r.GetLen(), 0);
  EXPECT_TRUE(r.ShouldRead(StreamChunkVers(2, 3)));
  EXPECT_TRUE(r.ShouldRead(StreamChunkVers(2, 5)));
  EXPECT_TRUE(r.IsTooNew(StreamChunkVers(2, 1)));
  EXPECT_FALSE(r.IsTooOld(StreamChunkVers(2, 1)));
  EXPECT_TRUE(r.IsTooNew(StreamChunkVers(1, 9)));
  EXPECT_TRUE(r.IsTooOld(StreamChunkVers(3, 0)));
  EXPECT_FALSE(r.IsTooNew(StreamChunkVers(3, 0)));
  bool tooOld = true, tooNew = true;
  r.GetAge(StreamChunkVers(2, 4), tooOld, tooNew);
  EXPECT_FALSE(tooOld);
  EXPECT_FALSE(tooNew);
  EXPECT_EQ(CodeOf([&] { r.FailIfCantRead(StreamChunkVers(3, 0), -1001, -1002); }), -1001);
  EXPECT_EQ(CodeOf([&] { r.FailIfCantRead(StreamChunkVers(2, 0), -1001, -1002); }), -1002);
  EXPECT_EQ(CodeOf([&] { r.FailIfCantRead(StreamChunkVers(2, 9), -1001, -1002); }), 0);
}

TEST(StreamChunk, PartlyReadChunkIsSkippedToItsEnd) {
  CHandleStream s(kTCLReadWriteMode);
  {
    StreamChunkWriter w(s, kPrefs);
    for (int i = 0; i < 10; ++i) s.PutLong(i);
  }
  s.PutLong(-7);
  s.MoveTo(0);
  {
    StreamChunkReader r(s);
    EXPECT_EQ(s.GetLong(), 0);
    EXPECT_TRUE(r.MoreInChunk());
  }
  EXPECT_EQ(s.Position(), 56);
  EXPECT_EQ(s.GetLong(), -7);
}

// A newer writer adds a nested chunk and trailing fields; an old reader that
// knows only the first field still lands on the next record.
TEST(StreamChunk, NestedChunksAreSkippedByOldReaders) {
  CHandleStream s(kTCLReadWriteMode);
  for (int record = 0; record < 3; ++record) {
    StreamChunkWriter outer(s, kPrefs, StreamChunkVers(1, 4));
    s.PutLong(record);
    {
      StreamChunkWriter inner(s, kInner, StreamChunkVers(7, 0));
      s.PutUString(UString("inner text"));
      { StreamChunkWriter innermost(s, kInner); }
    }
    s.PutIEEEDouble(0.5);
  }
  s.MoveTo(0);
  for (int record = 0; record < 3; ++record) {
    ASSERT_TRUE(StreamChunkReader::HasMagic(s));
    StreamChunkReader outer(s);
    ASSERT_TRUE(outer.ShouldRead(StreamChunkVers(1, 9)));
    EXPECT_EQ(s.GetLong(), record);
  }
  EXPECT_TRUE(s.AtEnd());

  // A reader that knows the nesting sees the inner chunk's envelope.
  s.MoveTo(0);
  StreamChunkReader outer(s);
  (void)s.GetLong();
  StreamChunkReader inner(s);
  EXPECT_EQ(inner.GetID(), kInner);
  EXPECT_EQ(inner.GetVers(), StreamChunkVers(7, 0));
  EXPECT_EQ(inner.GetLen(), 4 + 10 + 16);
}

TEST(StreamChunk, MissingMagicFailsWith103AndHasMagicKeepsPosition) {
  CHandleStream s(kTCLReadWriteMode);
  s.PutLong(0x7C970F1B);
  s.PutLong(0);
  s.PutLong(kStreamChunkMagic);
  s.MoveTo(0);
  EXPECT_FALSE(StreamChunkReader::HasMagic(s));
  EXPECT_EQ(s.Position(), 0);
  s.MoveTo(8);
  EXPECT_TRUE(StreamChunkReader::HasMagic(s));
  EXPECT_EQ(s.Position(), 8);
  s.MoveTo(10);
  EXPECT_FALSE(StreamChunkReader::HasMagic(s)) << "fewer than 4 bytes left";
  EXPECT_EQ(s.Position(), 10);
  s.MoveTo(0);
  EXPECT_EQ(CodeOf([&] { StreamChunkReader r(s); }), 103);
}

TEST(StreamChunk, TruncatedChunksFailAndReadersNeverThrowOnExit) {
  const Bytes image = ImageOf([](CStream& s) {
    StreamChunkWriter w(s, kPrefs);
    s.PutLong(0x11223344);
  });
  for (std::size_t cut = 0; cut < image.size(); ++cut) {
    auto_handle<char> h(NewHandle(cut));
    if (cut) std::memcpy(h.data(), image.data(), cut);
    CHandleStream s(h.get(), kTCLReadMode);
    const int code = CodeOf([&] {
      StreamChunkReader r(s);  // its destructor runs during the unwinding
      (void)s.GetLong();
    });
    EXPECT_EQ(code, -39) << cut;
  }
  // A chunk claiming more data than there is: the reader's exit is quiet.
  Bytes lying = image;
  lying[15] = 0x40;
  auto_handle<char> h(NewHandle(lying.size()));
  std::memcpy(h.data(), lying.data(), lying.size());
  CHandleStream s(h.get(), kTCLReadMode);
  { StreamChunkReader r(s); }
  EXPECT_EQ(s.Position(), 16);
}

TEST(UStringIO, ByteForms) {
  UString cafe("caf");
  cafe += static_cast<UString::value_type>(0xE9);  // in the ANSI code page
  UString snowman("a");
  snowman += static_cast<UString::value_type>(0x2603);  // not in it
  EXPECT_EQ(ImageOf([&](CStream& s) { PutUStringAsCharArray(s, cafe); }),
            (Bytes{'c', 'a', 'f', 0xE9}));
  EXPECT_EQ(ImageOf([&](CStream& s) { PutUStringAsStr(s, snowman); }), (Bytes{'a', '?', 0}));
  EXPECT_EQ(ImageOf([&](CStream& s) { PutUStringAsStr255(s, cafe); }),
            (Bytes{4, 'c', 'a', 'f', 0xE9}));
  EXPECT_EQ(ImageOf([&](CStream& s) { PutUStringAsFixedSizeUCharArray(s, 4, cafe); }),
            (Bytes{2, 'c', 'a', 0}))
      << "a Pascal string for 3 bytes, in a 4-byte field";
  EXPECT_EQ(ImageOf([&](CStream& s) { PutUStringAsFixedSizeUCharArray(s, 8, cafe); }),
            (Bytes{4, 'c', 'a', 'f', 0xE9, 0, 0, 0}));
  const std::string longText(300, 'x');
  EXPECT_EQ(ImageOf([&](CStream& s) { PutUStringAsStr255(s, UString(longText)); }).size(), 256u);
}

TEST(UStringIO, ReadsBack) {
  UString cafe("caf");
  cafe += static_cast<UString::value_type>(0xE9);
  CHandleStream s(kTCLReadWriteMode);
  PutUStringAsCharArray(s, cafe);
  PutUStringAsStr(s, cafe);
  PutUStringAsStr255(s, cafe);
  PutUStringAsFixedSizeUCharArray(s, 10, cafe);
  PutUStringAsStr255(s, UString("limited"));
  s.MoveTo(0);
  UString back;
  GetCharArrayAsUString(s, 4, back);
  EXPECT_TRUE(back == cafe);
  GetStrAsUString(s, back);
  EXPECT_TRUE(back == cafe);
  GetStr255AsUString(s, back);
  EXPECT_TRUE(back == cafe);
  GetFixedSizeUCharArrayAsUString(s, 10, back);
  EXPECT_TRUE(back == cafe);
  GetLimitedStr255AsUString(s, back, 4);
  EXPECT_EQ(back.utf8_str(), "lim");

  // A field whose length byte lies is cut to the field.
  const unsigned char field[] = {200, 'a', 'b'};
  PtrStream p(PtrStream::ReadOnly{}, field, 3);
  GetFixedSizeUCharArrayAsUString(p, 3, back);
  EXPECT_EQ(back.utf8_str(), "ab");
  PtrStream u(PtrStream::ReadOnly{}, field + 1, 2);
  GetUCharArrayAsUString(u, 2, back);
  EXPECT_EQ(back.utf8_str(), "ab");
}

}  // namespace
}  // namespace tarn
