#include <gtest/gtest.h>

#include <functional>
#include <numeric>

#include "AudioTestUtil.h"
#include "tarn/Audio/MultiBuffer.h"
#include "tarn/Audio/SampleBuffer.h"

namespace tarn {
namespace {

constexpr std::int32_t kLen = MultiBuffer::kBlockLength;

// A pool whose filled span starts at `start` and holds `blocks` full blocks
// in which the sample at time t has the value float(t).
MultiBuffer FilledPool(int blocks, SampleCount start) {
  MultiBuffer pool(blocks);
  pool.SetTime(start);
  SampleBuffer* b = nullptr;
  while (pool.AllocateBuffer(b)) {
    std::iota(b->GetData(), b->GetData() + kLen, float(pool.GetEndTime().AsLongLong()));
    EXPECT_TRUE(pool.BufferIsFilled());
  }
  return pool;
}

TEST(SampleBuffer, AlignmentSerialsSizesAndCopies) {
  auto serial = SampleBuffer(0, 0).GetSerialNumber();
  for (std::int32_t n : {0, 1, 7, kLen}) {
    const SampleBuffer block(n, 5);
    EXPECT_EQ(reinterpret_cast<std::uintptr_t>(block.GetData()) % 4096, 0u);
    EXPECT_GT(block.GetSerialNumber(), serial);
    serial = block.GetSerialNumber();
  }
  SampleBuffer b(1000, 5);
  EXPECT_EQ(b.GetEndTime(), SampleCount(1005));
  b[0] = 2.0f;
  b[999] = 1.5f;
  b.SetSize(10);
  EXPECT_EQ(b.GetEndTime(), SampleCount(15));
  b.Clear();  // clears the valid samples only
  EXPECT_TRUE(b[0] == 0.0f && b[999] == 1.5f);
  SampleBuffer small(8, 0);
  for (auto f : std::initializer_list<std::function<void()>>{
           [&] { b.SetSize(1001); }, [&] { b.SetSize(-1); }, [] { SampleBuffer(-1, 0); },
           [&] { small = b; }})
    EXPECT_EQ(ErrorOf(f), -50);
  b.SetSize(8);
  small = b;
  const SampleBuffer copy(small);
  EXPECT_NE(copy.GetSerialNumber(), small.GetSerialNumber());
  EXPECT_TRUE(copy.GetStartTime() == 5 && copy[7] == b[7]);
}

TEST(MultiBuffer, BlocksMoveThroughTheFourQueues) {
  MultiBuffer pool(2);
  pool.SetTime(1000);
  SampleBuffer *a = nullptr, *b = nullptr, *c = nullptr;
  ASSERT_TRUE(pool.AllocateBuffer(a) && pool.AllocateBuffer(b));
  EXPECT_FALSE(pool.AllocateBuffer(c) || pool.PopBuffer(c));  // nothing filled yet
  b->SetSize(100);
  ASSERT_TRUE(pool.BufferIsFilled());  // the oldest being filled: a
  EXPECT_TRUE(pool.GetEndTime() == 1000 + kLen && a->GetStartTime() == 1000);
  ASSERT_TRUE(pool.BufferIsFilled());
  EXPECT_TRUE(pool.GetEndTime() == 1000 + kLen + 100 && !pool.BufferIsFilled());
  EXPECT_EQ(pool.StartTimeAfterPop(), SampleCount(1000 + kLen));
  ASSERT_TRUE(pool.PopBuffer(c) && c == a && pool.GetStartTime() == 1000 + kLen);
  EXPECT_FALSE(pool.AllocateBuffer(c));  // popped, not yet free
  EXPECT_TRUE(pool.FreeBuffer() && !pool.FreeBuffer());
  ASSERT_TRUE(pool.AllocateBuffer(c) && c == a);
  EXPECT_TRUE(pool.PopAndFreeBuffer() && !pool.PopAndFreeBuffer());
  EXPECT_TRUE(pool.StartTimeAfterPop() == pool.GetStartTime() && pool.Invariant());
}

TEST(MultiBuffer, PointersIntoSpansAndJoinedCopies) {
  MultiBuffer pool = FilledPool(3, 0);
  // A span ending exactly on a block boundary is served from one block.
  const float* p = pool.GetBufferPointer(100, kLen, 200);
  ASSERT_TRUE(p && *p == 200.0f);
  EXPECT_EQ(pool.GetBufferPointer(100, kLen + 1, 200), nullptr);
  EXPECT_EQ(pool.GetBufferPointer(3 * kLen, 3 * kLen + 4, 3 * kLen), nullptr);
  EXPECT_EQ(pool.GetBufferPointer(-4, -1, -2), nullptr);
  // The address points at `at` inside the joined copy.
  for (auto [from, to, at] : {std::tuple{100, kLen + 1, 100},
                              {kLen - 5, kLen + 5, kLen},
                              {0, 10, 3},
                              {kLen / 2, kLen / 2 + kLen, kLen / 2}}) {
    const float* q = pool.MakeBufferPointer(from, to, at);
    for (int t = from; t < to; ++t) ASSERT_EQ(q[t - at], float(t)) << from << " " << t;
  }
  // Spans longer than a block, outside the pool, or with `at` outside.
  const int bad[][3] = {{10, 11 + kLen, 10}, {kLen - 1, 2 * kLen + 1, kLen},
                        {-1, 10, 0},         {3 * kLen - 5, 3 * kLen + 1, 3 * kLen},
                        {10, 20, 21},        {20, 10, 15}};
  for (const auto& s : bad)
    EXPECT_EQ(ErrorOf([&] { (void)pool.MakeBufferPointer(s[0], s[1], s[2]); }), -50) << s[0];
}

TEST(MultiBuffer, TruncateElementAccessAndCopies) {
  MultiBuffer pool = FilledPool(4, 0);
  pool.Truncate(kLen + 10);
  EXPECT_TRUE(pool.AtEnd() && pool.Invariant());
  EXPECT_EQ(pool.GetEndTime(), SampleCount(kLen + 10));
  EXPECT_EQ(pool.GetInUseBuffer(1)->GetSize(), 10);
  EXPECT_EQ(pool.GetInUseBuffer(SampleCount(kLen + 9)), pool.GetInUseBuffer(1));
  EXPECT_TRUE(!pool.GetInUseBuffer(SampleCount(-1)) &&
              !pool.GetInUseBuffer(SampleCount(2 * kLen)) && !pool.GetInUseBuffer(2) &&
              !pool.GetInUseBuffer(-1));
  // The two surplus blocks are free again, at full size, with one more added.
  EXPECT_TRUE(pool.ExpandCapacity(-3) && pool.ExpandCapacity(1));
  for (int i = 0; i < 3; ++i) EXPECT_TRUE(pool.AllocateUninitializedBuffer());
  EXPECT_FALSE(pool.AllocateUninitializedBuffer());
  EXPECT_EQ(pool.GetEndTime(), SampleCount(4 * kLen + 10));
  for (int at : {0, -5}) {  // before the start: clamped, still nothing
    pool.Truncate(at);
    SampleBuffer* b = nullptr;
    EXPECT_TRUE(pool.GetInUseBuffer(0) == nullptr && !pool.PopBuffer(b));
  }
  pool = FilledPool(2, 7);
  EXPECT_FALSE(pool.AtEnd());  // assigning a pool clears the flag
  EXPECT_EQ(pool[SampleCount(7 + kLen)], float(7 + kLen));
  pool[SampleCount(8)] = -1.0f;
  for (int t : {6, 7 + 2 * kLen}) EXPECT_EQ(ErrorOf([&] { (void)pool[SampleCount(t)]; }), -50);
  MultiBuffer copy(pool);
  pool[SampleCount(9)] = -2.0f;
  EXPECT_TRUE(copy[SampleCount(8)] == -1.0f && copy[SampleCount(9)] == 9.0f);  // deep copy
  EXPECT_TRUE(copy.Invariant());
}

}  // namespace
}  // namespace tarn
