#include "tarn/Threads/CircularBuffer.h"

#include <array>
#include <cstring>
#include <random>

#include "ThreadsTestUtil.h"
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

// Moves the ring's start by that many slots.
void Advance(CircularBuffer& b, int slots) {
  for (int i = 0; i < slots; ++i) {
    Put(b, -1);
    Drain(b);
  }
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

// From every phase of the ring, the buffer takes exactly its capacity and
// gives the records back in order, through Read and Snoop alike. (Aborts on
// both sides are checked by the stream below.)
TEST(CircularBuffer, WrapAroundKeepsOrderForEveryStartOffset) {
  constexpr int16_t kCap = 7;
  for (int phase = 0; phase <= kCap; ++phase) {
    SCOPED_TRACE(phase);
    CircularBuffer b(4, kCap);
    Advance(b, phase);
    WT w(b);
    for (int32_t i = 0; i < kCap; ++i) ASSERT_TRUE(b.Write(w, &i));
    EXPECT_TRUE(b.IsEmpty());  // nothing is published before the commit
    EXPECT_FALSE(b.Write(w, &w));
    b.Commit(w);
    EXPECT_TRUE(b.IsFull());
    RT r(b);
    for (int32_t i = 0, got = -1; i < kCap; ++i) {
      const void* p = i % 2 ? b.Snoop(r) : (b.Read(r, &got) ? &got : nullptr);
      ASSERT_NE(p, nullptr);
      EXPECT_EQ(std::memcmp(p, &i, 4), 0) << i;
    }
    EXPECT_EQ(b.Snoop(r), nullptr);
    EXPECT_TRUE(b.IsFull());  // nothing is freed before the commit
    b.Commit(r);
    EXPECT_TRUE(b.IsEmpty());
  }
}

TEST(CircularBuffer, SetEmptyDiscardsUnreadAndCopiesShareStorage) {
  auto b = std::make_unique<CircularBuffer>(4, 3);
  Put(*b, 1);
  b->SetEmpty();
  Put(*b, 2);
  CircularBuffer view(*b);  // its destruction leaves the storage alone
  EXPECT_EQ(Drain(view), (Ints{2}));
  EXPECT_EQ(Drain(*b), (Ints{2}));
}

// When the new buffer fills up, the record taken out for it is lost.
TEST(CircularBuffer, CopyAndResize) {
  struct Row {
    int16_t capacity;
    int phase, puts;
    int16_t newCapacity;
    Ints inNew, leftOld;
  };
  const Row rows[] = {
      {4, 1, 4, 10, {0, 1, 2, 3}, {}},  // unwraps a ring
      {10, 0, 8, 3, {0, 1, 2}, {4, 5, 6, 7}},
      {6, 0, 3, 3, {0, 1, 2}, {}},
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(row.newCapacity);
    CircularBuffer b(4, row.capacity);
    Advance(b, row.phase);
    for (int32_t i = 0; i < row.puts; ++i) Put(b, i);
    auto copy = b.CopyAndResize(row.newCapacity);
    ASSERT_TRUE(copy);
    EXPECT_EQ(copy->GetCapacity(), row.newCapacity);
    EXPECT_EQ(Drain(*copy), row.inNew);
    EXPECT_EQ(Drain(b), row.leftOld);
  }
  CircularBuffer b(4, 2);
  EXPECT_THROW((void)b.CopyAndResize(-5), TarnError);
}

// One producer and one consumer stream a fixed number of records, with
// random batch sizes and random aborts on both sides; every byte is checked.
// The count, not a clock, bounds the run, so a loaded machine only slows it.
template <size_t N>
void StreamRecords(int16_t capacity) {
  using Rec = std::array<uint64_t, N / 8>;
  constexpr uint64_t kTotal = 200000;
  auto make = [](uint64_t seq) {
    Rec r;
    for (size_t i = 0; i < r.size(); ++i) r[i] = seq * 0x9E3779B97F4A7C15ull + i;
    return r;
  };
  CircularBuffer b(static_cast<int32_t>(N), capacity);
  std::atomic<bool> consumerDone{false};  // frees the producer after a mismatch
  std::thread producer([&] {
    std::mt19937 rng(1);
    uint64_t next = 0;
    WT w(b);
    while (next < kTotal && !consumerDone.load(std::memory_order_relaxed)) {
      uint64_t seq = next;
      for (unsigned batch = 1 + rng() % 9; batch > 0 && seq < kTotal && b.WriteRecord(w, make(seq));
           --batch)
        ++seq;
      if (seq == next) std::this_thread::yield();
      if (rng() % 8 == 0) {
        b.Abort(w);
      } else {
        b.Commit(w);
        next = seq;
      }
    }
  });
  std::mt19937 rng(2);
  uint64_t expect = 0;
  RT r(b);
  bool mismatch = false;
  while (!mismatch && expect < kTotal) {
    uint64_t seq = expect;
    for (unsigned batch = 1 + rng() % 9; batch > 0 && !mismatch; --batch) {
      Rec got;
      const void* p = rng() % 2 ? b.Snoop(r) : nullptr;
      if (p) {
        std::memcpy(&got, p, sizeof got);
      } else if (!b.ReadRecord(r, got)) {
        break;
      }
      mismatch = got != make(seq++);
    }
    if (seq == expect) std::this_thread::yield();
    if (rng() % 8 == 0) {
      b.Abort(r);
    } else {
      b.Commit(r);
      expect = seq;
    }
  }
  consumerDone.store(true, std::memory_order_relaxed);
  producer.join();
  EXPECT_FALSE(mismatch) << "at record " << expect;
  EXPECT_EQ(expect, kTotal);
  EXPECT_TRUE(b.IsEmpty());
}

TEST(CircularBufferStress, StreamsSmallRecordsInOrder) { StreamRecords<8>(61); }
TEST(CircularBufferStress, StreamsLargeRecordsInOrder) { StreamRecords<72>(5); }

}  // namespace
}  // namespace tarn
