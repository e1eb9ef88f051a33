#include <gtest/gtest.h>

#include <cstdint>
#include <functional>
#include <numeric>
#include <vector>

#include "tarn/Audio/MultiBuffer.h"
#include "tarn/Audio/SampleBuffer.h"
#include "tarn/Errors/TarnError.h"

namespace tarn {
namespace {

constexpr std::int32_t kLen = MultiBuffer::kBlockLength;

bool IsParamErr(const std::function<void()>& f) {
  try {
    f();
  } catch (const TarnError& e) {
    return e.IsMacOSError(-50);
  }
  return false;
}

// A pool whose filled span starts at `start` and holds `blocks` full blocks
// in which the sample at time t has the value float(t).
MultiBuffer FilledPool(int blocks, SampleCount start) {
  MultiBuffer pool(blocks);
  pool.SetTime(start);
  SampleBuffer* b = nullptr;
  while (pool.AllocateBuffer(b)) {
    const std::int64_t first = pool.GetEndTime().AsLongLong();
    for (std::int32_t i = 0; i < kLen; ++i) (*b)[i] = static_cast<float>(first + i);
    EXPECT_TRUE(pool.BufferIsFilled());
  }
  return pool;
}

TEST(SampleBuffer, DataIsPageAlignedWithSlackAndSerialsIncrease) {
  std::vector<std::unique_ptr<SampleBuffer>> blocks;
  for (std::int32_t n : {0, 1, 7, 1000, kLen})
    blocks.push_back(std::make_unique<SampleBuffer>(n, 5));
  for (std::size_t i = 0; i < blocks.size(); ++i) {
    EXPECT_EQ(reinterpret_cast<std::uintptr_t>(blocks[i]->GetData()) % 4096, 0u);
    if (i > 0) {
      EXPECT_GT(blocks[i]->GetSerialNumber(), blocks[i - 1]->GetSerialNumber());
    }
  }
  SampleBuffer& b = *blocks[3];
  EXPECT_EQ(b.GetSize(), 1000);
  EXPECT_EQ(b.GetCapacity(), 1000);
  EXPECT_EQ(b.GetEndTime(), SampleCount(1005));
  b[999] = 1.5f;
  b.SetSize(10);
  EXPECT_EQ(b.GetEndTime(), SampleCount(15));
  b.Clear();  // clears the valid samples only
  EXPECT_EQ(b[0], 0.0f);
  EXPECT_EQ(b[999], 1.5f);
  EXPECT_TRUE(IsParamErr([&] { b.SetSize(1001); }));
  EXPECT_TRUE(IsParamErr([&] { b.SetSize(-1); }));
  EXPECT_TRUE(IsParamErr([] { SampleBuffer bad(-1, 0); }));
}

TEST(SampleBuffer, CopyKeepsContentButTakesItsOwnSerial) {
  SampleBuffer a(16, 100);
  std::iota(a.GetData(), a.GetData() + 16, 0.0f);
  SampleBuffer b(a);
  EXPECT_NE(a.GetSerialNumber(), b.GetSerialNumber());
  EXPECT_EQ(b.GetStartTime(), SampleCount(100));
  EXPECT_EQ(b[15], 15.0f);
  SampleBuffer small(8, 0);
  EXPECT_TRUE(IsParamErr([&] { small = a; }));
  a.SetSize(8);
  small = a;
  EXPECT_EQ(small[7], 7.0f);
  EXPECT_EQ(small.GetStartTime(), SampleCount(100));
}

TEST(MultiBuffer, BlocksMoveThroughTheFourQueues) {
  MultiBuffer pool(2);
  pool.SetTime(1000);
  SampleBuffer* a = nullptr;
  SampleBuffer* b = nullptr;
  SampleBuffer* c = nullptr;
  ASSERT_TRUE(pool.AllocateBuffer(a));
  ASSERT_TRUE(pool.AllocateBuffer(b));
  EXPECT_FALSE(pool.AllocateBuffer(c));
  EXPECT_FALSE(pool.PopBuffer(c));  // nothing filled yet
  b->SetSize(100);
  ASSERT_TRUE(pool.BufferIsFilled());  // the oldest being filled: a
  EXPECT_EQ(pool.GetEndTime(), SampleCount(1000 + kLen));
  EXPECT_EQ(a->GetStartTime(), SampleCount(1000));
  ASSERT_TRUE(pool.BufferIsFilled());
  EXPECT_EQ(pool.GetEndTime(), SampleCount(1000 + kLen + 100));
  EXPECT_FALSE(pool.BufferIsFilled());
  EXPECT_TRUE(pool.Invariant());
  EXPECT_EQ(pool.StartTimeAfterPop(), SampleCount(1000 + kLen));
  ASSERT_TRUE(pool.PopBuffer(c));
  EXPECT_EQ(c, a);
  EXPECT_EQ(pool.GetStartTime(), SampleCount(1000 + kLen));
  EXPECT_FALSE(pool.AllocateBuffer(c));  // popped, not yet free
  EXPECT_TRUE(pool.FreeBuffer());
  EXPECT_FALSE(pool.FreeBuffer());
  ASSERT_TRUE(pool.AllocateBuffer(c));
  EXPECT_EQ(c, a);
  EXPECT_TRUE(pool.PopAndFreeBuffer());
  EXPECT_FALSE(pool.PopAndFreeBuffer());
  EXPECT_EQ(pool.StartTimeAfterPop(), pool.GetStartTime());
  EXPECT_TRUE(pool.Invariant());
}

TEST(MultiBuffer, ExpandCapacityAndUninitializedBuffers) {
  MultiBuffer pool(0);
  EXPECT_FALSE(pool.AllocateUninitializedBuffer());
  EXPECT_TRUE(pool.ExpandCapacity(0));
  EXPECT_TRUE(pool.ExpandCapacity(-3));
  EXPECT_TRUE(pool.ExpandCapacity(3));
  pool.SetTime(-10);
  for (int i = 0; i < 3; ++i) EXPECT_TRUE(pool.AllocateUninitializedBuffer());
  EXPECT_FALSE(pool.AllocateUninitializedBuffer());
  EXPECT_EQ(pool.GetEndTime(), SampleCount(-10 + 3 * kLen));
  EXPECT_EQ(pool.GetInUseBuffer(2)->GetStartTime(), SampleCount(-10 + 2 * kLen));
  EXPECT_EQ(pool.GetInUseBuffer(3), nullptr);
  EXPECT_EQ(pool.GetInUseBuffer(-1), nullptr);
  EXPECT_EQ(pool.GetInUseBuffer(SampleCount(-10 + kLen)), pool.GetInUseBuffer(1));
  EXPECT_EQ(pool.GetInUseBuffer(SampleCount(-11)), nullptr);
}

TEST(MultiBuffer, SpanEndingOnABoundaryIsServedFromOneBlock) {
  const SampleCount start = 500;
  MultiBuffer pool = FilledPool(3, start);
  // [start + 100, start + 32768) ends exactly on the boundary.
  const float* p = pool.GetBufferPointer(start + 100, start + kLen, start + 200);
  ASSERT_NE(p, nullptr);
  EXPECT_EQ(*p, float(500 + 200));
  // One sample more crosses into the next block.
  EXPECT_EQ(pool.GetBufferPointer(start + 100, start + kLen + 1, start + 200), nullptr);
  const float* q = pool.MakeBufferPointer(start + 100, start + kLen + 1, start + 100);
  for (std::int64_t t = 100; t <= kLen; ++t) ASSERT_EQ(q[t - 100], float(500 + t)) << t;
  // The returned address points at `at` inside the joined copy.
  const float* r = pool.MakeBufferPointer(start + kLen - 5, start + kLen + 5, start + kLen);
  EXPECT_EQ(r[-5], float(500 + kLen - 5));
  EXPECT_EQ(r[4], float(500 + kLen + 4));
  // Within one block the join also works.
  EXPECT_EQ(*pool.MakeBufferPointer(start, start + 10, start + 3), float(503));
}

TEST(MultiBuffer, SpansThatWouldOverrunTheScratchBlockAreRefused) {
  const SampleCount start = 0;
  MultiBuffer pool = FilledPool(3, start);
  EXPECT_TRUE(IsParamErr([&] { (void)pool.MakeBufferPointer(10, 10 + kLen + 1, 10); }));
  EXPECT_TRUE(IsParamErr([&] { (void)pool.MakeBufferPointer(kLen - 1, 2 * kLen + 1, kLen); }));
  EXPECT_TRUE(IsParamErr([&] { (void)pool.MakeBufferPointer(-1, 10, 0); }));
  EXPECT_TRUE(
      IsParamErr([&] { (void)pool.MakeBufferPointer(3 * kLen - 5, 3 * kLen + 1, 3 * kLen); }));
  EXPECT_TRUE(IsParamErr([&] { (void)pool.MakeBufferPointer(10, 20, 21); }));
  EXPECT_TRUE(IsParamErr([&] { (void)pool.MakeBufferPointer(20, 10, 15); }));
  // Exactly one full block's worth across a boundary is fine.
  const float* p = pool.MakeBufferPointer(kLen / 2, kLen / 2 + kLen, kLen / 2);
  EXPECT_EQ(p[kLen - 1], float(kLen / 2 + kLen - 1));
  // Spans outside the filled blocks have no direct pointer either.
  EXPECT_EQ(pool.GetBufferPointer(3 * kLen, 3 * kLen + 4, 3 * kLen), nullptr);
  EXPECT_EQ(pool.GetBufferPointer(-4, -1, -2), nullptr);
}

TEST(MultiBuffer, TruncateKeepsCoveringBlocksAndTrimsTheLast) {
  MultiBuffer pool = FilledPool(4, 0);
  pool.Truncate(kLen + 10);
  EXPECT_TRUE(pool.AtEnd());
  EXPECT_EQ(pool.GetEndTime(), SampleCount(kLen + 10));
  EXPECT_EQ(pool.GetInUseBuffer(1)->GetSize(), 10);
  EXPECT_EQ(pool.GetInUseBuffer(2), nullptr);
  EXPECT_TRUE(pool.Invariant());
  // The two surplus blocks are free again, at full size.
  EXPECT_TRUE(pool.AllocateUninitializedBuffer());
  EXPECT_TRUE(pool.AllocateUninitializedBuffer());
  EXPECT_FALSE(pool.AllocateUninitializedBuffer());
  EXPECT_EQ(pool.GetEndTime(), SampleCount(kLen + 10 + 2 * kLen));
}

TEST(MultiBuffer, TruncateToStartLeavesNothingFilled) {
  MultiBuffer pool = FilledPool(2, 64);
  pool.Truncate(64);
  EXPECT_TRUE(pool.AtEnd());
  EXPECT_EQ(pool.GetInUseBuffer(0), nullptr);
  SampleBuffer* b = nullptr;
  EXPECT_FALSE(pool.PopBuffer(b));
  pool.Truncate(0);  // before the start: clamped, still nothing
  EXPECT_EQ(pool.GetInUseBuffer(0), nullptr);
  // Assigning a pool clears the at-end flag.
  pool = FilledPool(1, 0);
  EXPECT_FALSE(pool.AtEnd());
}

TEST(MultiBuffer, ElementAccessByTimeAndCopies) {
  MultiBuffer pool = FilledPool(2, 7);
  EXPECT_EQ(pool[SampleCount(7)], 7.0f);
  EXPECT_EQ(pool[SampleCount(7 + kLen)], float(7 + kLen));
  pool[SampleCount(8)] = -1.0f;
  EXPECT_TRUE(IsParamErr([&] { (void)pool[SampleCount(6)]; }));
  EXPECT_TRUE(IsParamErr([&] { (void)pool[SampleCount(7 + 2 * kLen)]; }));
  MultiBuffer copy(pool);
  pool[SampleCount(9)] = -2.0f;
  EXPECT_EQ(copy[SampleCount(8)], -1.0f);
  EXPECT_EQ(copy[SampleCount(9)], 9.0f);  // deep copy
  EXPECT_TRUE(copy.Invariant());
}

}  // namespace
}  // namespace tarn
