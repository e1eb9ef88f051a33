// Behaviour particular to each stream: files, handles, memory areas and the
// length-prefix companions.

#include <gtest/gtest.h>

#include <cstdio>
#include <cstring>
#include <fstream>
#include <iterator>
#include <string>

#include "StreamTestSupport.h"
#include "tarn/FileSystem/File.h"
#include "tarn/Streams/LengthIO.h"

namespace tarn {
namespace {

using test::Bytes;
using test::CodeOf;
using test::TempPath;

Bytes FileBytes(const TempPath& path) {
  std::ifstream in(path.Path(), std::ios::binary);
  return Bytes(std::istreambuf_iterator<char>(in), {});
}

TEST(CFileStream, ReadingPastTheEndFailsWithEndOfFile) {
  TempPath path("eof");
  {
    CFileStream out(path.Spec());
    out.Open(kTCLWriteMode);
    out.PutShort(7);
  }
  EXPECT_EQ(FileBytes(path), (Bytes{0, 7}));
  CFileStream in(path.Spec());
  in.Open(kTCLReadMode);
  EXPECT_EQ(in.GetShort(), 7);
  EXPECT_TRUE(in.AtEnd());
  EXPECT_EQ(CodeOf([&] { (void)in.GetChar(); }), -39);
}

TEST(CFileStream, MoveToAcceptsExactlyZeroThroughSize) {
  TempPath path("moveto");
  CFileStream s(path.Spec(), 8);
  s.Open(kTCLWriteMode);
  s.PutCharArray("0123456789abcdefXYZ", 19);  // longer than the buffer
  EXPECT_EQ(s.Size(), 19);
  s.MoveTo(s.Size());
  s.MoveTo(0);
  EXPECT_EQ(CodeOf([&] { s.MoveTo(20); }), CStream::kPositionOutOfRange);
  EXPECT_EQ(CodeOf([&] { s.MoveTo(-1); }), CStream::kPositionOutOfRange);
}

TEST(CFileStream, MissingFileFailsToOpenWith5000) {
  TempPath path("missing");
  CFileStream s(path.Spec());
  EXPECT_EQ(CodeOf([&] { s.Open(kTCLReadMode); }), -5000);
  EXPECT_EQ(CodeOf([&] { s.Open(kTCLReadWriteMode); }), -5000);
}

TEST(CFileStream, UnopenedStreamsFailInsteadOfTouchingMemory) {
  TempPath path("unopened");
  CFileStream file(path.Spec());
  EXPECT_EQ(CodeOf([&] { file.PutLong(1); }), -38);
  EXPECT_EQ(CodeOf([&] { (void)file.GetLong(); }), -38);
  CHandleStream handle;
  EXPECT_EQ(CodeOf([&] { handle.PutLong(1); }), -38);
  char text[4];
  EXPECT_EQ(CodeOf([&] { handle.GetStr(text, 4); }), -38);
}

TEST(CFileStream, ReadWriteEditsInPlaceAcrossBuffers) {
  TempPath path("edit");
  {
    CFileStream out(path.Spec(), 4);
    out.Open(kTCLWriteMode);
    for (int i = 0; i < 10; ++i) out.PutLong(i);
  }
  {
    CFileStream io(path.Spec(), 4);
    io.Open(kTCLReadWriteMode);
    EXPECT_EQ(io.Size(), 40);
    io.MoveTo(8);
    EXPECT_EQ(io.GetLong(), 2);
    io.PutLong(-3);  // overwrites element 3
    EXPECT_EQ(io.GetLong(), 4) << "a read right after a write";
    io.MoveTo(36);
    io.PutLong(99);
    io.PutShort(0x0102);  // extends the file
    io.MoveTo(0);
    EXPECT_EQ(io.GetLong(), 0);
    EXPECT_EQ(io.Size(), 42);
  }
  const Bytes bytes = FileBytes(path);
  ASSERT_EQ(bytes.size(), 42u);
  EXPECT_EQ(Bytes(bytes.begin() + 12, bytes.begin() + 16), (Bytes{0xFF, 0xFF, 0xFF, 0xFD}));
  EXPECT_EQ(Bytes(bytes.begin() + 36, bytes.end()), (Bytes{0, 0, 0, 99, 1, 2}));
}

TEST(CFileStream, TruncateAndReopen) {
  TempPath path("truncate");
  CFileStream s(path.Spec(), 16);
  s.Open(kTCLWriteMode);
  s.PutCharArray("abcdefghij", 10);
  s.Truncate(4);
  EXPECT_EQ(s.Size(), 4);
  EXPECT_EQ(s.Position(), 4);
  s.PutChar('Z');
  s.Close();
  EXPECT_EQ(FileBytes(path), (Bytes{'a', 'b', 'c', 'd', 'Z'}));
  s.Open(kTCLReadMode);
  EXPECT_EQ(s.GetChar(), 'a');
  s.Open(kTCLReadMode);  // already open: back to the start
  EXPECT_EQ(s.Position(), 0);
  EXPECT_EQ(s.GetChar(), 'a');
}

TEST(CFileStream, AdoptsAnOpenFileAndStoresNoPointers) {
  TempPath path("adopt");
  std::FILE* f = File(path.Spec()).Open("w+b");
  ASSERT_NE(f, nullptr);
  CFileStream s;
  s.Open(f, kTCLReadWriteMode);
  s.PutPointer(&s);
  s.PutLong(5);
  s.MoveTo(0);
  EXPECT_EQ(s.GetPointer(), nullptr);
  EXPECT_EQ(s.GetLong(), 5);
  s.Close();
  EXPECT_EQ(FileBytes(path), (Bytes{0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 5}));
}

TEST(CFileStream, SixtyFourBitPositions) {
  TempPath path("big");
  CFileStream s(path.Spec());
  s.Open(kTCLWriteMode);
  const std::int64_t far = (std::int64_t{1} << 32) + 12;
  s.Truncate(far);  // sparse on most file systems
  s.MoveTo(far);
  s.PutLong(0x0A0B0C0D);
  s.MoveTo(far);
  EXPECT_EQ(s.GetLong(), 0x0A0B0C0D);
  EXPECT_EQ(s.Size(), far + 4);
  s.Truncate(0);
}

TEST(CHandleStream, GrowsByItsBlockSizeAndTrimsOnRequest) {
  CHandleStream s(kTCLWriteMode);
  EXPECT_EQ(s.Size(), 0);
  for (int i = 0; i < 3000; ++i) s.PutShort(static_cast<short>(i));
  EXPECT_EQ(s.Size(), 6000);
  EXPECT_EQ(GetHandleSize(s.GetStreamHandle()), 6000u) << "trimmed to the data";
  s.PutChar(1);
  EXPECT_EQ(s.Size(), 6001);
  s.MoveTo(5998);
  EXPECT_EQ(s.GetShort(), 2999);
  EXPECT_EQ(s.GetChar(), 1);
  EXPECT_EQ(CodeOf([&] { (void)s.GetChar(); }), -39);
  EXPECT_EQ(CodeOf([&] { s.MoveTo(6002); }), CStream::kPositionOutOfRange);
}

TEST(CHandleStream, WorksInTheCallersHandleWithoutOwningIt) {
  auto_handle<char> h(NewHandle(4));
  std::memcpy(h.data(), "\0\0\0\x2A", 4);
  {
    CHandleStream s(h.get(), kTCLReadWriteMode, 2);
    EXPECT_EQ(s.Size(), 4);
    EXPECT_EQ(s.GetLong(), 42);
    s.PutLong(7);
    EXPECT_EQ(s.GetStreamHandle(), h.get());
    EXPECT_EQ(CodeOf([&] { (void)s.DetachHandle(); }), -50);
    s.Truncate(6);
    EXPECT_EQ(s.Position(), 6);
  }
  ASSERT_EQ(h.size(), 6u) << "the handle survives the stream";
  EXPECT_EQ(Bytes(h.data(), h.data() + 6), (Bytes{0, 0, 0, 42, 0, 0}));
}

TEST(CHandleStream, TruncateShrinksAndGrowsWithZeros) {
  CHandleStream s(kTCLReadWriteMode);
  s.PutCharArray("abcdef", 6);
  s.Truncate(2);
  EXPECT_EQ(s.Size(), 2);
  s.Truncate(5);
  s.MoveTo(0);
  char back[5] = {};
  s.GetCharArray(back, 5);
  EXPECT_EQ(std::string(back, 5), std::string("ab\0\0\0", 5));
  s.DisposeAll();
  EXPECT_EQ(s.GetMode(), kTCLClosedMode);
}

TEST(PtrStream, IgnoresWhatDoesNotFit) {
  unsigned char area[4] = {9, 9, 9, 9};
  PtrStream s(area, 4);
  s.PutLong(0x01020304);
  EXPECT_EQ(s.Position(), 4);
  s.MoveTo(2);
  s.PutLong(0x0A0B0C0D);  // would pass the capacity
  EXPECT_EQ(s.Position(), 2);
  EXPECT_EQ(Bytes(area, area + 4), (Bytes{1, 2, 3, 4}));
  s.MoveTo(9);
  EXPECT_EQ(s.Position(), 2) << "a move outside is ignored";
  EXPECT_EQ(s.GetLong(), 0) << "a read past the data yields 0";
  EXPECT_EQ(s.Position(), 2);
  EXPECT_EQ(s.GetShort(), 0x0304);
}

TEST(PtrStream, GetThruNStopsAtTerminatorOrData) {
  const char text[] = {'a', 'b', '\r', 'c', 'd'};
  PtrStream s(PtrStream::ReadOnly{}, text, 5);
  char buf[8] = {};
  EXPECT_EQ(s.GetThruN(buf, '\r', 8), 3);
  EXPECT_EQ(s.GetThruN(buf, '\r', 1), 1);
  EXPECT_EQ(s.GetThruN(buf, '\r', 8), 1);
  EXPECT_EQ(s.GetThruN(buf, '\r', 8), 0);
  s.PutLong(5);  // read-only area: ignored
  EXPECT_EQ(s.Size(), 5);
}

TEST(LengthIO, WriterPatchesTheCountOfItsData) {
  EXPECT_EQ(test::ImageOf([](CStream& s) {
              LengthWriter len(s, false);
              s.PutCharArray("0123456789", 10);
              len.PatchLength();
              s.PutChar('!');
            }),
            (Bytes{0, 0, 0, 10, '0', '1', '2', '3', '4', '5', '6', '7', '8', '9', '!'}));
  const Bytes withOwn = test::ImageOf([](CStream& s) {
    LengthWriter len(s, true);
    s.PutCharArray("0123456789", 10);
  });  // patched by the destructor
  EXPECT_EQ(Bytes(withOwn.begin(), withOwn.begin() + 4), (Bytes{0, 0, 0, 14}));
  EXPECT_EQ(test::ImageOf([](CStream& s) {
              LengthWriter len(s, false);
              len.PatchWithNum(-2);
            }),
            (Bytes{0xFF, 0xFF, 0xFF, 0xFE}));
}

TEST(LengthIO, ReaderSkipsWhatWasNotRead) {
  for (bool includes : {false, true}) {
    CHandleStream s(kTCLReadWriteMode);
    {
      LengthWriter len(s, includes);
      s.PutLong(1);
      s.PutLong(2);
    }
    s.PutShort(3);
    s.MoveTo(0);
    {
      LengthReader len(s, includes);
      EXPECT_EQ(len.GetLength(), includes ? 12 : 8);
      EXPECT_TRUE(len.AnyDataRemainsToBeRead());
      EXPECT_EQ(s.GetLong(), 1);
    }
    EXPECT_EQ(s.GetShort(), 3);
  }
}

TEST(LengthIO, LyingLengths) {
  auto_handle<char> h(NewHandle(8));
  std::memcpy(h.data(),
              "\0\0\0\x02"
              "abcd",
              8);
  CHandleStream self(h.get(), kTCLReadMode);
  EXPECT_EQ(CodeOf([&] { LengthReader len(self, true); }), CStream::kPositionOutOfRange)
      << "a length that includes itself cannot be below 4";
  CHandleStream longer(h.get(), kTCLReadMode);
  std::memcpy(h.data(), "\0\0\0\x09", 4);
  {
    LengthReader len(longer, false);
    EXPECT_EQ(CodeOf([&] { len.SkipRemainingData(); }), CStream::kPositionOutOfRange);
  }  // the destructor's own attempt fails quietly
  EXPECT_EQ(longer.Position(), 4);
}

}  // namespace
}  // namespace tarn
