#include "tarn/Threads/CircularBuffer.h"

#include <gtest/gtest.h>

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
using Ints = std::vector<int32_t>;

bool Put(CircularBuffer& b, int32_t value) {
  WT w(b);
  if (!b.Write(w, &value)) return false;
  b.Commit(w);
  return true;
}

// Reads and commits everything there is.
Ints Drain(CircularBuffer& b) {
  Ints out;
  RT r(b);
  for (int32_t v; b.Read(r, &v);) out.push_back(v);
  b.Commit(r);
  return out;
}

TEST(CircularBuffer, SizesAtTheLimits) {
  for (auto [recordSize, capacity] : {std::pair{0, 4}, {-4, 4}, {4, -1}, {4, -2}, {4, INT16_MAX}})
    EXPECT_THROW(CircularBuffer(recordSize, static_cast<int16_t>(capacity)), TarnError)
        << recordSize << " " << capacity;
  EXPECT_EQ(CircularBuffer(1, INT16_MAX - 1).GetCapacity(), INT16_MAX - 1);
  CircularBuffer none(4, 0);  // always full, never readable
  EXPECT_FALSE(Put(none, 1));
  EXPECT_TRUE(none.IsFull() && none.IsEmpty());
}

TEST(CircularBuffer, OnlyCommitsPublishOrFree) {
  CircularBuffer b(4, 2);
  WT w(b);
  ASSERT_TRUE(b.Write(w, &w));
  EXPECT_TRUE(b.IsEmpty());
  b.Abort(w);
  ASSERT_TRUE(Put(b, 10) && Put(b, 11));
  RT r(b);
  const void* first = b.Snoop(r);
  EXPECT_FALSE(Put(b, 12));  // an uncommitted read frees nothing
  b.Abort(r);
  EXPECT_EQ(b.Snoop(r), first);  // the aborted read comes back
  b.Commit(r);
  EXPECT_TRUE(Put(b, 12));
  EXPECT_EQ(Drain(b), (Ints{11, 12}));
}

// Every phase of the ring and every fill level, with Read and Snoop
// alternating: records come out in order.
TEST(CircularBuffer, WrapAroundKeepsOrderForEveryStartOffset) {
  constexpr int16_t kCap = 7;
  for (int32_t phase = 0; phase <= kCap; ++phase) {
    for (int32_t fill = 0; fill <= kCap; ++fill) {
      SCOPED_TRACE(testing::Message() << "phase " << phase << " fill " << fill);
      CircularBuffer b(4, kCap);
      for (int i = 0; i < phase; ++i) {
        Put(b, 0);
        Drain(b);
      }
      WT w(b);
      for (int32_t i = 0; i < fill; ++i) ASSERT_TRUE(b.Write(w, &i));
      b.Commit(w);
      EXPECT_EQ(b.IsFull(), fill == kCap);
      EXPECT_EQ(b.Write(w, &fill), fill < kCap);
      b.Abort(w);
      RT r(b);
      for (int32_t i = 0; i < fill; ++i) {
        int32_t got = -1;
        if (i % 2) {
          ASSERT_TRUE(b.Read(r, &got));
        } else {
          const void* p = b.Snoop(r);
          ASSERT_NE(p, nullptr);
          std::memcpy(&got, p, 4);
        }
        EXPECT_EQ(got, i);
      }
      EXPECT_EQ(b.Snoop(r), nullptr);
      b.Commit(r);
      EXPECT_TRUE(b.IsEmpty());
    }
  }
}

TEST(CircularBuffer, SetEmptyDiscardsUnreadAndCopiesShareStorage) {
  auto b = std::make_unique<CircularBuffer>(4, 3);
  Put(*b, 1);
  b->SetEmpty();
  EXPECT_TRUE(b->IsEmpty());
  Put(*b, 2);
  Put(*b, 3);
  {
    CircularBuffer view(*b);  // its destruction leaves the storage alone
    EXPECT_EQ(Drain(view), (Ints{2, 3}));
  }
  EXPECT_EQ(Drain(*b), (Ints{2, 3}));
}

// When the new buffer fills up, the record taken out for it is lost.
TEST(CircularBuffer, CopyAndResize) {
  struct Row {
    int16_t capacity;
    int puts, takes, morePuts;
    int16_t newCapacity;
    Ints inNew, leftOld;
  };
  const Row rows[] = {
      {4, 3, 1, 2, 10, {1, 2, 3, 4}, {}},  // unwraps a ring
      {10, 8, 0, 0, 3, {0, 1, 2}, {4, 5, 6, 7}},
      {6, 3, 0, 0, 3, {0, 1, 2}, {}},
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(row.newCapacity);
    CircularBuffer b(4, row.capacity);
    int32_t next = 0;
    for (int i = 0; i < row.puts; ++i) Put(b, next++);
    RT r(b);
    for (int i = 0; i < row.takes; ++i) (void)b.Snoop(r);
    b.Commit(r);
    for (int i = 0; i < row.morePuts; ++i) Put(b, next++);
    auto copy = b.CopyAndResize(row.newCapacity);
    ASSERT_TRUE(copy);
    EXPECT_EQ(copy->GetCapacity(), row.newCapacity);
    EXPECT_EQ(copy->GetRecordSize(), 4);
    EXPECT_EQ(Drain(*copy), row.inNew);
    EXPECT_EQ(Drain(b), row.leftOld);
  }
  CircularBuffer b(4, 2);
  EXPECT_THROW((void)b.CopyAndResize(-5), TarnError);
}

// One producer and one consumer stream records with random batch sizes and
// random aborts on both sides, through every read and write call; every
// byte is checked.
template <size_t N>
void StreamRecords(int16_t capacity, uint64_t records) {
  struct Rec {
    uint64_t seq;
    unsigned char fill[N - 8];
  };
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
        if (!b.WriteRecord(w, make(seq))) break;
      }
      if (seq == next) std::this_thread::yield();
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
  while (!mismatch) {
    const uint64_t done = produced.load(std::memory_order_acquire);
    if (done != 0 && expect == done) break;
    const unsigned batch = 1 + rng() % 9;
    uint64_t seq = expect;
    for (unsigned i = 0; i < batch; ++i) {
      Rec got;
      bool ok = false;
      if (const unsigned how = rng() % 3; how == 0) {
        const void* p = b.Snoop(r);
        if ((ok = p != nullptr)) std::memcpy(&got, p, sizeof got);
      } else {
        ok = how == 1 ? b.Read(r, &got) : b.ReadRecord(r, got);
      }
      if (!ok) break;
      const Rec want = make(seq++);
      mismatch |= std::memcmp(&got, &want, sizeof got) != 0;
    }
    if (seq == expect) std::this_thread::yield();
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
