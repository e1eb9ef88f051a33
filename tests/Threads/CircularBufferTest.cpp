#include "tarn/Threads/CircularBuffer.h"

#include <gtest/gtest.h>

#include <array>
#include <chrono>
#include <cstdint>
#include <cstring>
#include <random>
#include <thread>
#include <vector>

#include "tarn/Errors/Fail.h"

namespace tarn {
namespace {

using RT = CircularBuffer::ReadTransaction;
using WT = CircularBuffer::WriteTransaction;

// Writes value and commits at once.
bool Put(CircularBuffer& b, int32_t value) {
  WT w(b);
  if (!b.Write(w, &value)) return false;
  b.Commit(w);
  return true;
}

// Reads one value and commits; -1 when empty.
int32_t Take(CircularBuffer& b) {
  RT r(b);
  int32_t v = -1;
  if (!b.Read(r, &v)) return -1;
  b.Commit(r);
  return v;
}

std::vector<int32_t> Drain(CircularBuffer& b) {
  std::vector<int32_t> out;
  for (int32_t v; (v = Take(b)) != -1;) out.push_back(v);
  return out;
}

TEST(CircularBuffer, CapacityIsExactAndOneSlotStaysEmpty) {
  CircularBuffer b(4, 20);
  EXPECT_EQ(b.GetCapacity(), 20);
  EXPECT_TRUE(b.IsEmpty());
  WT w(b);
  for (int32_t i = 0; i < 20; ++i) ASSERT_TRUE(b.Write(w, &i)) << i;
  int32_t extra = 99;
  EXPECT_FALSE(b.Write(w, &extra));
  EXPECT_FALSE(b.IsFull());  // nothing committed yet
  b.Commit(w);
  EXPECT_TRUE(b.IsFull());
  EXPECT_FALSE(b.IsEmpty());
  std::vector<int32_t> expect(20);
  for (int32_t i = 0; i < 20; ++i) expect[static_cast<size_t>(i)] = i;
  EXPECT_EQ(Drain(b), expect);
  EXPECT_TRUE(b.IsEmpty());
}

TEST(CircularBuffer, EmptyBufferReadsNothing) {
  CircularBuffer b(8, 3);
  RT r(b);
  uint64_t v = 0xABCD;
  EXPECT_FALSE(b.Read(r, &v));
  EXPECT_EQ(v, 0xABCDu);
  EXPECT_EQ(b.Snoop(r), nullptr);
}

TEST(CircularBuffer, RejectsBadSizes) {
  EXPECT_THROW(CircularBuffer(0, 4), TarnError);
  EXPECT_THROW(CircularBuffer(-4, 4), TarnError);
  EXPECT_THROW(CircularBuffer(4, -1), TarnError);
  EXPECT_THROW(CircularBuffer(4, -2), TarnError);
  // capacity + 1 overflows the 16-bit slot count.
  EXPECT_THROW(CircularBuffer(4, INT16_MAX), TarnError);
  CircularBuffer largest(1, INT16_MAX - 1);
  EXPECT_EQ(largest.GetCapacity(), INT16_MAX - 1);
  // Capacity 0: always full, never readable.
  CircularBuffer none(4, 0);
  EXPECT_FALSE(Put(none, 1));
  EXPECT_TRUE(none.IsFull() && none.IsEmpty());
}

TEST(CircularBuffer, UncommittedWritesAreInvisibleAndAbortReusesSlots) {
  CircularBuffer b(4, 4);
  WT w(b);
  int32_t v = 1;
  ASSERT_TRUE(b.Write(w, &v));
  v = 2;
  ASSERT_TRUE(b.Write(w, &v));
  EXPECT_TRUE(b.IsEmpty());
  RT r(b);
  EXPECT_FALSE(b.Read(r, &v));
  b.Abort(w);
  // The aborted slots are overwritten; the producer again has all four.
  for (int32_t i = 10; i < 14; ++i) ASSERT_TRUE(b.Write(w, &i));
  EXPECT_FALSE(b.Write(w, &v));
  b.Commit(w);
  EXPECT_EQ(Drain(b), (std::vector<int32_t>{10, 11, 12, 13}));
}

TEST(CircularBuffer, AbortedReadYieldsTheSameRecordsAgain) {
  CircularBuffer b(4, 8);
  for (int32_t i = 1; i <= 5; ++i) ASSERT_TRUE(Put(b, i));
  RT r(b);
  int32_t a = 0, c = 0;
  ASSERT_TRUE(b.Read(r, &a));
  ASSERT_TRUE(b.Read(r, &c));
  EXPECT_EQ(a, 1);
  EXPECT_EQ(c, 2);
  b.Abort(r);
  ASSERT_TRUE(b.Read(r, &a));
  ASSERT_TRUE(b.Read(r, &c));
  EXPECT_EQ(a, 1);
  EXPECT_EQ(c, 2);
  b.Commit(r);
  EXPECT_EQ(Drain(b), (std::vector<int32_t>{3, 4, 5}));
}

TEST(CircularBuffer, UncommittedReadDoesNotFreeSpace) {
  CircularBuffer b(4, 2);
  ASSERT_TRUE(Put(b, 1));
  ASSERT_TRUE(Put(b, 2));
  RT r(b);
  int32_t v = 0;
  ASSERT_TRUE(b.Read(r, &v));
  EXPECT_FALSE(Put(b, 3));
  b.Commit(r);
  EXPECT_TRUE(Put(b, 3));
  EXPECT_EQ(Drain(b), (std::vector<int32_t>{2, 3}));
}

TEST(CircularBuffer, SnoopExposesRecordsInPlace) {
  CircularBuffer b(8, 4);
  WT w(b);
  for (uint64_t i = 0; i < 3; ++i) {
    uint64_t v = 0x1111111111111111ull * (i + 1);
    ASSERT_TRUE(b.Write(w, &v));
  }
  b.Commit(w);
  RT r(b);
  const auto* p1 = static_cast<const uint64_t*>(b.Snoop(r));
  const auto* p2 = static_cast<const uint64_t*>(b.Snoop(r));
  ASSERT_NE(p1, nullptr);
  ASSERT_NE(p2, nullptr);
  EXPECT_EQ(*p1, 0x1111111111111111ull);
  EXPECT_EQ(*p2, 0x2222222222222222ull);
  EXPECT_EQ(reinterpret_cast<const char*>(p2) - reinterpret_cast<const char*>(p1), 8);
  b.Abort(r);
  EXPECT_EQ(b.Snoop(r), p1);
  b.Commit(r);
  uint64_t v = 0;
  RT r2(b);
  ASSERT_TRUE(b.Read(r2, &v));
  EXPECT_EQ(v, 0x2222222222222222ull);
}

TEST(CircularBuffer, WrapAroundKeepsOrderForEveryStartOffset) {
  // For every phase of the ring and every fill level, records come out in
  // order and intact.
  constexpr int16_t kCap = 7;
  for (int phase = 0; phase <= kCap; ++phase) {
    for (int fill = 0; fill <= kCap; ++fill) {
      CircularBuffer b(12, kCap);
      for (int i = 0; i < phase; ++i) {
        std::array<int32_t, 3> rec{};
        WT w(b);
        ASSERT_TRUE(b.Write(w, rec.data()));
        b.Commit(w);
        RT r(b);
        ASSERT_TRUE(b.Read(r, rec.data()));
        b.Commit(r);
      }
      WT w(b);
      for (int i = 0; i < fill; ++i) {
        std::array<int32_t, 3> rec{i, -i, i * 1000 + phase};
        ASSERT_TRUE(b.Write(w, rec.data()));
      }
      std::array<int32_t, 3> spare{};
      EXPECT_EQ(b.Write(w, spare.data()), fill < kCap);
      b.Abort(w);
      w = WT(b);
      for (int i = 0; i < fill; ++i) {
        std::array<int32_t, 3> rec{i, -i, i * 1000 + phase};
        ASSERT_TRUE(b.Write(w, rec.data()));
      }
      b.Commit(w);
      EXPECT_EQ(b.IsFull(), fill == kCap);
      RT r(b);
      for (int i = 0; i < fill; ++i) {
        std::array<int32_t, 3> rec{};
        ASSERT_TRUE(b.Read(r, rec.data()));
        EXPECT_EQ(rec, (std::array<int32_t, 3>{i, -i, i * 1000 + phase}));
      }
      EXPECT_FALSE(b.Read(r, spare.data()));
      b.Commit(r);
      EXPECT_TRUE(b.IsEmpty());
    }
  }
}

TEST(CircularBuffer, TypedRecordsRoundTripAcrossTheEnd) {
  struct Sample {
    double left;
    double right;
  };
  CircularBuffer b(sizeof(Sample), 3);
  CircularBuffer::WriteTransaction w(b);
  CircularBuffer::ReadTransaction r(b);
  for (int i = 0; i < 10; ++i) {
    ASSERT_TRUE(b.WriteRecord(w, Sample{i + 0.5, -i - 0.25}));
    ASSERT_TRUE(b.WriteRecord(w, Sample{i + 0.75, 0.0}));
    b.Commit(w);
    Sample s{};
    ASSERT_TRUE(b.ReadRecord(r, s));
    EXPECT_EQ(s.left, i + 0.5);
    EXPECT_EQ(s.right, -i - 0.25);
    ASSERT_TRUE(b.ReadRecord(r, s));
    EXPECT_EQ(s.left, i + 0.75);
    EXPECT_FALSE(b.ReadRecord(r, s));
    b.Commit(r);
  }
}

TEST(CircularBuffer, SetEmptyDiscardsUnread) {
  CircularBuffer b(4, 5);
  for (int32_t i = 0; i < 4; ++i) Put(b, i);
  b.SetEmpty();
  EXPECT_TRUE(b.IsEmpty());
  EXPECT_EQ(Take(b), -1);
  for (int32_t i = 0; i < 5; ++i) EXPECT_TRUE(Put(b, 100 + i));
  EXPECT_FALSE(Put(b, 0));
  EXPECT_EQ(Drain(b), (std::vector<int32_t>{100, 101, 102, 103, 104}));
}

TEST(CircularBuffer, CopyAndResizeToLargerKeepsEverything) {
  CircularBuffer b(4, 4);
  for (int32_t i = 0; i < 3; ++i) Put(b, i);
  Take(b);  // moves the start so the copy unwraps a ring
  Put(b, 3);
  Put(b, 4);
  auto bigger = b.CopyAndResize(10);
  ASSERT_TRUE(bigger);
  EXPECT_EQ(bigger->GetCapacity(), 10);
  EXPECT_EQ(bigger->GetRecordSize(), 4);
  EXPECT_TRUE(b.IsEmpty());
  EXPECT_EQ(Drain(*bigger), (std::vector<int32_t>{1, 2, 3, 4}));
}

TEST(CircularBuffer, CopyAndResizeToSmallerLosesOneRecord) {
  CircularBuffer b(4, 10);
  for (int32_t i = 0; i < 8; ++i) Put(b, i);
  auto smaller = b.CopyAndResize(3);
  ASSERT_TRUE(smaller);
  EXPECT_TRUE(smaller->IsFull());
  EXPECT_EQ(Drain(*smaller), (std::vector<int32_t>{0, 1, 2}));
  // Record 3 was taken out when the new buffer was full: it is gone.
  EXPECT_EQ(Drain(b), (std::vector<int32_t>{4, 5, 6, 7}));
}

TEST(CircularBuffer, CopyAndResizeOfExactFitLosesNothing) {
  CircularBuffer b(4, 6);
  for (int32_t i = 0; i < 3; ++i) Put(b, i);
  auto same = b.CopyAndResize(3);
  EXPECT_EQ(Drain(*same), (std::vector<int32_t>{0, 1, 2}));
  EXPECT_TRUE(b.IsEmpty());
  EXPECT_THROW((void)b.CopyAndResize(-5), TarnError);
}

TEST(CircularBuffer, CopySharesStorage) {
  auto original = std::make_unique<CircularBuffer>(4, 4);
  Put(*original, 7);
  {
    CircularBuffer view(*original);
    EXPECT_EQ(view.GetCapacity(), 4);
    RT r(view);
    const void* p = view.Snoop(r);
    RT r0(*original);
    EXPECT_EQ(p, original->Snoop(r0));
  }  // the copy's destruction leaves the storage alone
  EXPECT_EQ(Take(*original), 7);
}

// One producer and one consumer stream records with random batch sizes,
// random aborts on both sides, and check order and content of every byte.
template <size_t N>
void StreamRecords(int16_t capacity, uint64_t records) {
  struct Rec {
    uint64_t seq;
    unsigned char fill[N - 8];
  };
  static_assert(sizeof(Rec) == N);
  auto make = [](uint64_t seq) {
    Rec r;
    r.seq = seq;
    for (size_t i = 0; i < sizeof r.fill; ++i) r.fill[i] = static_cast<unsigned char>(seq * 31 + i);
    return r;
  };
  CircularBuffer b(static_cast<int32_t>(N), capacity);
  const auto deadline = std::chrono::steady_clock::now() + std::chrono::milliseconds(700);
  std::atomic<uint64_t> produced{0};

  std::thread producer([&] {
    std::mt19937 rng(1);
    uint64_t next = 0;
    WT w(b);
    while (next < records && std::chrono::steady_clock::now() < deadline) {
      const unsigned batch = 1 + rng() % 9;
      uint64_t seq = next;
      for (unsigned i = 0; i < batch && seq < records; ++i, ++seq) {
        Rec r = make(seq);
        if (!b.Write(w, &r)) break;
      }
      if (seq == next) std::this_thread::yield();  // full: let the consumer run
      if (rng() % 8 == 0) {
        b.Abort(w);
      } else {
        b.Commit(w);
        next = seq;
      }
    }
    produced.store(next, std::memory_order_release);
  });

  std::mt19937 rng(2);
  uint64_t expect = 0;
  RT r(b);
  bool mismatch = false;
  for (;;) {
    const uint64_t done = produced.load(std::memory_order_acquire);
    if (done != 0 && expect == done) break;
    const unsigned batch = 1 + rng() % 9;
    uint64_t seq = expect;
    for (unsigned i = 0; i < batch; ++i) {
      Rec got;
      if (rng() % 2) {
        if (!b.Read(r, &got)) break;
      } else {
        const void* p = b.Snoop(r);
        if (!p) break;
        std::memcpy(&got, p, sizeof got);
      }
      const Rec want = make(seq++);
      if (std::memcmp(&got, &want, sizeof got) != 0) mismatch = true;
    }
    if (mismatch) break;
    if (seq == expect) std::this_thread::yield();  // empty: let the producer run
    if (rng() % 8 == 0) {
      b.Abort(r);
    } else {
      b.Commit(r);
      expect = seq;
    }
  }
  producer.join();
  EXPECT_FALSE(mismatch) << "at record " << expect;
  EXPECT_GT(expect, 5000u);
  EXPECT_TRUE(b.IsEmpty());
}

TEST(CircularBufferStress, StreamsSmallRecordsInOrder) { StreamRecords<8>(61, 3'000'000); }
TEST(CircularBufferStress, StreamsLargeRecordsInOrder) { StreamRecords<72>(5, 1'000'000); }

}  // namespace
}  // namespace tarn
