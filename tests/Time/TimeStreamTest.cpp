// Stream forms of the time types: exact bytes and round trips.
#include <gtest/gtest.h>

#include <cstdint>
#include <limits>
#include <vector>

#include "tarn/Errors/TarnError.h"
#include "tarn/Streams/CHandleStream.h"
#include "tarn/Time/SampleCount.h"
#include "tarn/Time/Tick.h"

namespace tarn {
namespace {

using Bytes = std::vector<unsigned char>;

Bytes Contents(CHandleStream& s) {
  const auto size = static_cast<std::size_t>(s.Size());
  char** h = s.GetStreamHandle();
  return Bytes(*h, *h + size);
}

template <class Write>
Bytes Written(Write write) {
  CHandleStream s(kTCLReadWriteMode);
  write(s);
  return Contents(s);
}

// A stream holding exactly `bytes`, positioned at the start.
struct ReadStream {
  explicit ReadStream(const Bytes& bytes) : s(kTCLReadWriteMode) {
    s.PutUCharArray(bytes.data(), static_cast<int>(bytes.size()));
    s.MoveTo(0);
  }
  CHandleStream s;
};

TEST(TimeStreams, SampleCountWritesBigEndian64) {
  EXPECT_EQ(Written([](CStream& s) { SampleCount(0x0102030405060708).PutTo(s); }),
            (Bytes{1, 2, 3, 4, 5, 6, 7, 8}));
  EXPECT_EQ(Written([](CStream& s) { SampleCount(-2).PutTo(s); }),
            (Bytes{0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFE}));
  EXPECT_EQ(Written([](CStream& s) { SampleCount(-2).PutTo(s, true); }),
            (Bytes{0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFE}));
}

TEST(TimeStreams, SampleCountAs32BitIsPinned) {
  EXPECT_EQ(Written([](CStream& s) { SampleCount(5000000000).PutTo(s, false); }),
            (Bytes{0x7F, 0xFF, 0xFF, 0xFF}));
  EXPECT_EQ(Written([](CStream& s) { SampleCount(-5000000000).PutTo(s, false); }),
            (Bytes{0x80, 0x00, 0x00, 0x00}));
  EXPECT_EQ(Written([](CStream& s) { SampleCount(-3).PutTo(s, false); }),
            (Bytes{0xFF, 0xFF, 0xFF, 0xFD}));
}

TEST(TimeStreams, SampleCountReadsBothWidths) {
  ReadStream r32(Bytes{0xFF, 0xFF, 0xFF, 0xFD});
  SampleCount n;
  n.GetFrom(r32.s, false);
  EXPECT_EQ(n, -3);  // sign-extended
  ReadStream r64(Bytes{0, 0, 0, 1, 0, 0, 0, 2});
  n.GetFrom(r64.s, true);
  EXPECT_EQ(n, 0x100000002);
  ReadStream plain(Bytes{0x80, 0, 0, 0, 0, 0, 0, 0});
  n.GetFrom(plain.s);
  EXPECT_EQ(n, std::numeric_limits<std::int64_t>::min());
}

TEST(TimeStreams, GetLLorLTakesTheInvertedSense) {
  const Bytes bytes{0xFF, 0xFF, 0xFF, 0xFE, 0, 0, 0, 0};
  ReadStream a(bytes);
  EXPECT_EQ(SampleCount::Get_LLorL(a.s, true), -2);  // true: 32 bits
  EXPECT_EQ(a.s.Position(), 4);
  ReadStream b(bytes);
  EXPECT_EQ(SampleCount::Get_LLorL(b.s, false), std::int64_t{-2} * 0x100000000);  // 64 bits
  EXPECT_EQ(b.s.Position(), 8);
  ReadStream c(bytes);
  EXPECT_EQ(SampleCount::Get_LLorL_SampleCount(c.s, true), -2);
  ReadStream d(bytes);
  EXPECT_EQ(SampleCount::Get_LLorL_SampleCount(d.s, false), std::int64_t{-2} * 0x100000000);
}

TEST(TimeStreams, RoundTrips) {
  CHandleStream s(kTCLReadWriteMode);
  const SampleCount counts[] = {0, -1, std::numeric_limits<std::int64_t>::min(),
                                std::numeric_limits<std::int64_t>::max(), 48000};
  for (SampleCount c : counts) c.PutTo(s);
  const Tick ticks[] = {Tick(Tick::Max()), Tick(Tick::Min()), Tick(Tick::NegativeEpsilon()),
                        AssembleTick(-3, 0x12345678u)};
  for (Tick t : ticks) t.PutTo(s);
  const SampleCountFrac fracs[] = {-2.5, 1e-300, 123456789.125};
  for (SampleCountFrac f : fracs) f.PutTo(s);
  s.MoveTo(0);
  for (SampleCount c : counts) {
    SampleCount back;
    back.GetFrom(s);
    EXPECT_EQ(back, c);
  }
  for (Tick t : ticks) {
    Tick back;
    back.GetFrom(s);
    EXPECT_EQ(back, t);
  }
  for (SampleCountFrac f : fracs) {
    SampleCountFrac back;
    back.GetFrom(s);
    EXPECT_EQ(back, f);
  }
  EXPECT_TRUE(s.AtEnd());
}

TEST(TimeStreams, TickAndFracExactBytes) {
  EXPECT_EQ(Written([](CStream& s) { AssembleTick(1, 0x80000000u).PutTo(s); }),
            (Bytes{0, 0, 0, 1, 0x80, 0, 0, 0}));
  EXPECT_EQ(Written([](CStream& s) { Tick(Tick::Min()).PutTo(s); }),
            (Bytes{0x80, 0, 0, 1, 0, 0, 0, 0}));
  EXPECT_EQ(Written([](CStream& s) { SampleCountFrac(1.0).PutTo(s); }),
            (Bytes{0x3F, 0xF0, 0, 0, 0, 0, 0, 0}));
  EXPECT_EQ(Written([](CStream& s) { SampleCountFrac(-2.0).PutTo(s); }),
            (Bytes{0xC0, 0, 0, 0, 0, 0, 0, 0}));
}

TEST(TimeStreams, TruncatedDataThrows) {
  ReadStream r(Bytes{0, 0, 0, 1, 0});
  SampleCount n;
  EXPECT_THROW(n.GetFrom(r.s), TarnError);
  ReadStream t(Bytes{0, 0});
  Tick tick;
  EXPECT_THROW(tick.GetFrom(t.s), TarnError);
  ReadStream l(Bytes{0, 0, 1});
  EXPECT_THROW((void)SampleCount::Get_LLorL(l.s, true), TarnError);
}

}  // namespace
}  // namespace tarn
