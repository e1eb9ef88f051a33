// The fixed-block allocator: masks, carved-block layout, last-in-first-out
// reuse, pass-through sizes, flush, threads, and a container using it.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstring>
#include <list>
#include <set>
#include <thread>
#include <vector>

#include "tarn/MemAlloc/FixedBlockAllocMT.h"

namespace tarn {
namespace {

TEST(FixedBlockAllocMT, MaskForEveryAlignment) {
  const std::pair<std::size_t, uint64_t> cases[] = {
      {0, ~0ull},       {1, ~0ull},       {2, ~0ull << 1},    {3, ~0ull << 2},
      {4, ~0ull << 2},  {5, ~0ull << 3},  {8, ~0ull << 3},    {16, ~0ull << 4},
      {17, ~0ull << 5}, {64, ~0ull << 6}, {4096, ~0ull << 12}};
  for (auto [align, mask] : cases) {
    FixedBlockAllocMT blocks(24, align);
    EXPECT_EQ(blocks.GetMask(), mask) << align;
    EXPECT_EQ(blocks.GetAlign(), align);
  }
  FixedBlockAllocMT empty;
  EXPECT_EQ(empty.GetBlockSize(), 0u);
}

TEST(FixedBlockAllocMT, CarvedBlocksAlignedMarkedAndReusedLastInFirstOut) {
  for (std::size_t align : {1u, 8u, 16u, 64u, 256u}) {
    FixedBlockAllocMT blocks(40, align);
    void* a = blocks.allocate(40);
    void* b = blocks.allocate(40);
    ASSERT_NE(a, b);
    for (void* p : {a, b}) {
      EXPECT_EQ(reinterpret_cast<uintptr_t>(p) % align, 0u) << align;
      uint32_t marker;
      std::memcpy(&marker, static_cast<uint8_t*>(p) - 8, 4);
      EXPECT_EQ(marker, FixedBlockAllocMT::kBlockMarker);
      uintptr_t heap;
      std::memcpy(&heap, static_cast<uint8_t*>(p) - 16, 8);
      EXPECT_LE(heap + 16, reinterpret_cast<uintptr_t>(p));
      EXPECT_LE(reinterpret_cast<uintptr_t>(p), heap + 16 + std::max<std::size_t>(align, 8));
      EXPECT_EQ(reinterpret_cast<uintptr_t>(p) % alignof(void*), 0u);
    }
    blocks.deallocate(a, 40);
    blocks.deallocate(b, 40);
    EXPECT_EQ(blocks.allocate(40), b);
    EXPECT_EQ(blocks.allocate(40), a);
    blocks.deallocate(a, 40);
    blocks.deallocate(b, 40);
    blocks.flush();
    blocks.flush();  // empty: nothing happens
    blocks.deallocate(nullptr, 40);
  }
}

TEST(FixedBlockAllocMT, OtherSizesPassThrough) {
  FixedBlockAllocMT blocks(32, 16);
  void* kept = blocks.allocate(32);
  blocks.deallocate(kept, 32);
  void* other = blocks.allocate(100);
  std::memset(other, 1, 100);
  blocks.deallocate(other, 100);
  EXPECT_EQ(blocks.allocate(32), kept);  // the stack was not touched
  blocks.deallocate(kept, 32);
  blocks.flush();
}

TEST(FixedBlockAllocMT, ThreadsShareTheStack) {
  FixedBlockAllocMT blocks(48, 16);
  std::vector<std::thread> threads;
  std::atomic<int> bad{0};
  for (int t = 0; t < 4; ++t)
    threads.emplace_back([&, t] {
      std::vector<uint8_t*> mine;
      for (int i = 0; i < 20000; ++i) {
        if (mine.size() < 8 || (i * 7 + t) % 3 != 0) {
          auto* p = static_cast<uint8_t*>(blocks.allocate(48));
          std::memset(p, t + 1, 48);
          mine.push_back(p);
        } else {
          uint8_t* p = mine.back();
          mine.pop_back();
          for (int j = 0; j < 48; ++j)
            if (p[j] != t + 1) ++bad;
          blocks.deallocate(p, 48);
        }
        if (mine.size() > 64) {
          for (uint8_t* p : mine) blocks.deallocate(p, 48);
          mine.clear();
        }
      }
      for (uint8_t* p : mine) blocks.deallocate(p, 48);
    });
  for (auto& t : threads) t.join();
  EXPECT_EQ(bad.load(), 0);
  blocks.flush();
}

TEST(FixedBlockAllocMT, ServesAStandardList) {
  // The list's node holds its two links and the (padded) value.
  FixedBlockAllocMT blocks(2 * sizeof(void*) + sizeof(long), alignof(void*));
  {
    FixedBlockStdAllocator<int> alloc(&blocks);
    std::list<int, FixedBlockStdAllocator<int>> values(alloc);
    std::list<int> reference;
    for (int i = 0; i < 1000; ++i) {
      values.push_back(i);
      reference.push_back(i);
    }
    for (int round = 0; round < 3; ++round) {
      values.remove_if([round](int v) { return v % (round + 2) == 0; });
      reference.remove_if([round](int v) { return v % (round + 2) == 0; });
      for (int i = 0; i < 500; ++i) {
        values.push_front(i * 3 + round);
        reference.push_front(i * 3 + round);
      }
    }
    EXPECT_TRUE(std::equal(values.begin(), values.end(), reference.begin(), reference.end()));
  }
  blocks.flush();
}

TEST(FixedBlockAllocMT, CopySharesTheStack) {
  FixedBlockAllocMT original(64, 32);
  void* a = original.allocate(64);
  original.deallocate(a, 64);
  FixedBlockAllocMT copy(original);
  EXPECT_EQ(copy.GetAlign(), 32u);
  EXPECT_EQ(copy.allocate(64), a);
  copy.deallocate(a, 64);
  copy.flush();
}

}  // namespace
}  // namespace tarn
