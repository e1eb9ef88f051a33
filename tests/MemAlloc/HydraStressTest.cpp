// Threads allocating, freeing, handing over and resizing blocks of random
// sizes (0 bytes to 200 KB) at once. Every block is checked for zero fill and
// alignment when it arrives, filled with a pattern derived from its address,
// and checked against that pattern before it is resized or freed, so a block
// handed out twice or written by anyone else shows up. Threads end while
// other threads still hold their blocks; at the end the figures return to
// where they started and no orphaned pool remains. Bounded by operation
// counts, not by time.
#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <cstring>
#include <mutex>
#include <random>
#include <thread>
#include <vector>

#include "tarn/MemAlloc/HydraAllocator.h"

#if defined(__SANITIZE_THREAD__) || defined(__SANITIZE_ADDRESS__)
#define TARN_STRESS_SCALE 4
#elif defined(__has_feature)
#if __has_feature(thread_sanitizer) || __has_feature(address_sanitizer)
#define TARN_STRESS_SCALE 4
#endif
#endif
#ifndef TARN_STRESS_SCALE
#define TARN_STRESS_SCALE 1
#endif

namespace tarn {
namespace {

struct Block {
  uint8_t* p;
  std::size_t size;
};

uint8_t PatternByte(const void* base, std::size_t i) {
  const uint64_t seed = reinterpret_cast<uintptr_t>(base) * 0x9E3779B97F4A7C15ull;
  return static_cast<uint8_t>((seed >> ((i & 7) * 8)) + (i >> 3) * 31);
}

void Fill(const Block& b) {
  for (std::size_t i = 0; i < b.size; ++i) b.p[i] = PatternByte(b.p, i);
}

// True when the first n bytes at p carry the pattern of base.
bool Carries(const uint8_t* p, const void* base, std::size_t n) {
  for (std::size_t i = 0; i < n; ++i)
    if (p[i] != PatternByte(base, i)) return false;
  return true;
}

bool Zero(const uint8_t* p, std::size_t n) {
  for (std::size_t i = 0; i < n; ++i)
    if (p[i] != 0) return false;
  return true;
}

std::size_t RandomSize(std::mt19937_64& rng) {
  const unsigned r = rng() % 100;
  if (r < 55) return rng() % 257;
  if (r < 80) return 257 + rng() % 3840;
  if (r < 98) return 4097 + rng() % 37'000;
  return 41'000 + rng() % (200'000 - 41'000 + 1);
}

class Exchange {
 public:
  explicit Exchange(std::size_t capacity) { fBlocks.reserve(capacity); }
  bool Put(const Block& b) {
    std::lock_guard lock(fMutex);
    if (fBlocks.size() == fBlocks.capacity()) return false;
    fBlocks.push_back(b);
    return true;
  }
  bool Take(Block* b, std::mt19937_64& rng) {
    std::lock_guard lock(fMutex);
    if (fBlocks.empty()) return false;
    const std::size_t at = rng() % fBlocks.size();
    *b = fBlocks[at];
    fBlocks[at] = fBlocks.back();
    fBlocks.pop_back();
    return true;
  }

 private:
  std::mutex fMutex;
  std::vector<Block> fBlocks;
};

struct Failures {
  std::atomic<int> notZero{0}, misaligned{0}, overwritten{0}, nullBlocks{0};
};

void Worker(int seed, int ops, Exchange& exchange, Failures& failures) {
  HydraAllocator& heap = HydraAllocator::Instance();
  std::mt19937_64 rng(seed);
  std::vector<Block> mine;
  mine.reserve(256);
  auto allocate = [&](std::size_t size) {
    auto* p = static_cast<uint8_t*>(heap.Allocate(size));
    if (!p) {
      ++failures.nullBlocks;
      return;
    }
    if (reinterpret_cast<uintptr_t>(p) % 16 != 0) ++failures.misaligned;
    if (!Zero(p, size)) ++failures.notZero;
    Block b{p, size};
    Fill(b);
    mine.push_back(b);
  };
  auto release = [&](const Block& b) {
    if (!Carries(b.p, b.p, b.size)) ++failures.overwritten;
    heap.Deallocate(b.p);
  };
  auto takeMine = [&] {
    const std::size_t at = rng() % mine.size();
    const Block b = mine[at];
    mine[at] = mine.back();
    mine.pop_back();
    return b;
  };
  for (int i = 0; i < ops; ++i) {
    const unsigned r = rng() % 100;
    if (r < 45 || mine.empty()) {
      allocate(RandomSize(rng));
    } else if (r < 62) {
      release(takeMine());
    } else if (r < 77) {
      const Block b = takeMine();
      if (!exchange.Put(b)) release(b);
    } else if (r < 90) {
      Block b;
      if (exchange.Take(&b, rng)) release(b);  // freed on another thread than its own
    } else {
      Block b = takeMine();
      // Grow, or shrink (to at least 1 byte: Reallocate to 0 frees).
      const std::size_t size =
          r < 95 ? b.size + 1 + rng() % 20'000 : std::max<std::size_t>(1, b.size / (2 + rng() % 4));
      auto* q = static_cast<uint8_t*>(heap.Reallocate(b.p, size));
      if (!q) {
        ++failures.nullBlocks;
        release(b);
        continue;
      }
      const std::size_t kept = std::min(b.size, size);
      if (!Carries(q, b.p, kept)) ++failures.overwritten;
      if (size > b.size && !Zero(q + b.size, size - b.size)) ++failures.notZero;
      b = Block{q, size};
      Fill(b);
      mine.push_back(b);
    }
    while (mine.size() > 200) release(takeMine());
  }
  // End while others may still hold some of our blocks: hand over half.
  for (std::size_t i = 0; i < mine.size(); ++i)
    if (i % 2 != 0 || !exchange.Put(mine[i])) release(mine[i]);
}

struct Figures {
  uint64_t blocks, logical, inUse;
  bool operator==(const Figures&) const = default;
};

Figures Now() {
  return {HydraDebugging::BlocksInOperatorNewPools(),
          HydraDebugging::LogicalBytesInOperatorNewPools(),
          HydraDebugging::BytesInUseInOperatorNewPools()};
}

// The pool thread collects orphans every 500 ms; waits up to 5 s.
void WaitForNoOrphans() {
  for (int i = 0; i < 500 && HydraDebugging::OrphanedSubAllocators() != 0; ++i)
    std::this_thread::sleep_for(std::chrono::milliseconds(10));
}

class HydraStress : public ::testing::TestWithParam<int> {};

TEST_P(HydraStress, ThreadsAllocateFreeHandOverAndResize) {
  const int threadCount = GetParam();
  const int ops = 8'000 / TARN_STRESS_SCALE;
  Exchange exchange(static_cast<std::size_t>(threadCount) * 3 * 400 + 1000);
  Failures failures;
  std::vector<std::thread> threads;
  threads.reserve(static_cast<std::size_t>(threadCount) * 3);
  // Let earlier tests' ended threads be collected first: their pools may
  // still hold blocks freed elsewhere, which would leave the figures.
  WaitForNoOrphans();
  const Figures start = Now();
  // Three generations: later threads start while earlier ones end, and take
  // over the blocks that the ended threads left behind.
  for (int generation = 0; generation < 3; ++generation) {
    for (int t = 0; t < threadCount; ++t) {
      const int seed = generation * 100 + t;
      threads.emplace_back(Worker, seed, ops * (1 + t % 3) / 2, std::ref(exchange),
                           std::ref(failures));
    }
    if (generation > 0)
      for (int t = 0; t < threadCount; ++t) threads[(generation - 1) * threadCount + t].join();
  }
  for (int t = 0; t < threadCount; ++t) threads[2 * threadCount + t].join();
  std::mt19937_64 rng(1);
  Block b;
  while (exchange.Take(&b, rng)) {
    if (!Carries(b.p, b.p, b.size)) ++failures.overwritten;
    HydraAllocator::Instance().Deallocate(b.p);
  }
  EXPECT_EQ(failures.notZero.load(), 0);
  EXPECT_EQ(failures.misaligned.load(), 0);
  EXPECT_EQ(failures.overwritten.load(), 0);
  EXPECT_EQ(failures.nullBlocks.load(), 0);
  WaitForNoOrphans();
  EXPECT_EQ(HydraDebugging::OrphanedSubAllocators(), 0u);
  const Figures end = Now();
  EXPECT_EQ(end.blocks, start.blocks);
  EXPECT_EQ(end.logical, start.logical);
  EXPECT_EQ(end.inUse, start.inUse);
}

INSTANTIATE_TEST_SUITE_P(Threads, HydraStress, ::testing::Values(2, 4, 8));

}  // namespace
}  // namespace tarn
