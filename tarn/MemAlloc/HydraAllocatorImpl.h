#pragma once

// Private parts of the allocator: the per-thread buddy pool, the global
// chunk pool, and the few platform services they need (implemented in
// HydraAllocator_posix.cpp / HydraAllocator_win.cpp).
//
// Nothing here may allocate through operator new: this code is what
// operator new calls.

#include <atomic>
#include <cstddef>
#include <cstdint>

#include "tarn/MemAlloc/HydraAllocator.h"
#include "tarn/Threads/AtomicStack.h"

namespace tarn {

// ---- Platform services -------------------------------------------------
namespace hydra_os {
// Committed, zero-filled read/write memory of bytes bytes (a multiple of
// the page size), or null.
[[nodiscard]] void* MapPages(std::size_t bytes) noexcept;
// Releases what MapPages returned; false (errno / GetLastError kept) when
// the system refuses.
bool UnmapPages(void* base, std::size_t bytes) noexcept;
[[nodiscard]] int LastSystemError() noexcept;
[[nodiscard]] std::size_t PageSize() noexcept;
// True when the 8 bytes before p are readable memory.
[[nodiscard]] bool CanAccessPrecedingBytes(const void* p) noexcept;

// The per-thread key whose clean-up function runs on each ending thread
// that stored a non-null value (pthread key / fiber-local storage).
bool CreateThreadKey(void (*cleanup)(void*)) noexcept;
[[nodiscard]] void* GetThreadKey() noexcept;
void SetThreadKey(void* value) noexcept;

// A bare system thread: the pool thread cannot be a TarnThread, whose
// routine, name and record are allocated through operator new and would
// re-enter the allocator while it is being constructed.
using ThreadBody = void (*)(void* arg);
bool StartThread(ThreadBody body, void* arg) noexcept;
// Sleeps for milliseconds.
void SleepMilliseconds(unsigned milliseconds) noexcept;
}  // namespace hydra_os

// ---- Operating-system chunks -------------------------------------------
// A chunk of size bytes is preceded by a 16-byte header inside the same
// mapping: word 0 (kFreshChunk from its mapping until first taken: every
// byte is still zero; then 0 while pooled or owned by a buddy pool, the
// logical size while it serves one large block) and word 1 (size). The
// whole mapping is (size + 16) rounded up to the page size.
struct HydraChunkHeader {
  uint64_t logical;
  uint64_t size;
};
inline constexpr uint64_t kFreshChunk = ~uint64_t{0};
static_assert(sizeof(HydraChunkHeader) == 16);
inline HydraChunkHeader* ChunkHeaderOf(void* chunk) noexcept {
  return static_cast<HydraChunkHeader*>(chunk) - 1;
}

// ---- The global pool ----------------------------------------------------
class HydraGlobalPool {
 public:
  HydraGlobalPool() noexcept;
  HydraGlobalPool(const HydraGlobalPool&) = delete;
  HydraGlobalPool& operator=(const HydraGlobalPool&) = delete;
  ~HydraGlobalPool() = delete;

  // A chunk of at least size bytes (exactly size above 53,232 bytes, else a
  // pooled 53,232-byte chunk), or null. Any thread.
  [[nodiscard]] void* Take(std::size_t size) noexcept;
  // Pooled-size chunks go back on the stack, others to the system.
  void GiveBack(void* chunk) noexcept;

  void PushOrphan(BuddySystemSubAllocator* orphan) noexcept;

  // Starts the pool thread (once).
  void StartPoolThread() noexcept;
  // One round of the pool thread: the band, and every fifth round the orphans.
  void PoolThreadRound(unsigned round) noexcept;

  [[nodiscard]] uint64_t PooledChunkCount() const noexcept { return fPooledCount.load(); }
  [[nodiscard]] uint64_t OSBytes() const noexcept { return fOSBytes.load(); }
  [[nodiscard]] uint64_t OrphanCount() const noexcept { return fOrphanCount.load(); }

  static constexpr int64_t kLowWater = 256;
  friend class HydraAllocator;
  static constexpr int64_t kHighWater = 275;

 private:
  // Pooled chunks are kept through small descriptor nodes that are never
  // released, so that a thread popping the stack may read a node's link
  // even after another thread popped it and the pool thread unmapped its
  // chunk.
  struct ChunkNode {
    ChunkNode* link;
    void* chunk;
  };
  [[nodiscard]] void* MapChunk(std::size_t size) noexcept;
  void UnmapChunk(void* chunk) noexcept;
  [[nodiscard]] ChunkNode* NewNode() noexcept;
  void PushPooled(void* chunk) noexcept;
  [[nodiscard]] void* PopPooled() noexcept;
  void CollectOrphans() noexcept;

  AtomicStackHead fChunks;     // ChunkNodes of pooled chunks
  AtomicStackHead fFreeNodes;  // spare ChunkNodes
  AtomicStackHead fOrphans;    // BuddySystemSubAllocators, linked by next
  // fPooledCount == |fChunks| whenever no push or pop is under way.
  std::atomic<int64_t> fPooledCount{0};
  std::atomic<uint64_t> fOSBytes{0};  // sizes of all live chunks (+ headers)
  std::atomic<uint64_t> fOrphanCount{0};
  std::atomic<bool> fThreadStarted{false};
  // Held for each pop of fOrphans (the pool thread's, and a new thread's
  // adopting an orphan), so that no pop reads the link of an orphan that
  // another popper took and destroyed.
  std::atomic_flag fOrphanPopLock = ATOMIC_FLAG_INIT;
};

// ---- The per-thread buddy pool -----------------------------------------
// Block layout (every block starts 32-byte-aligned relative to its chunk and
// 16-byte aligned in memory):
//   +0  4-byte header: class (8 bits), flags (8 bits), logical size / 4
//       (16 bits, live blocks only)
//   +4  owner (8 bytes, unaligned)
//   +12 magic 0xFACEF00D
//   +16 user memory (class size - 16 bytes usable)
// A free block keeps its list links at +8 and +16.
//
// Fibonacci buddies: a block of class k splits into a left block of class
// k - 1 and a right block of class k - 2 that follows it. Each block records
// its side (root, left, right) and one remembered side: the left child
// remembers the parent's side, the right child the parent's remembered
// side, so that merging restores the parent exactly.
class alignas(16) BuddySystemSubAllocator {
 public:
  BuddySystemSubAllocator* next = nullptr;  // link on the orphan stack (first word)
  // Other threads write the remote-free stack's head; the padding keeps it
  // off every cache line holding the fields the owner writes on each call
  // (the object is 16-byte aligned), so that those writes do not bounce the
  // line between the threads.
  unsigned char padBeforeRemoteFrees[56] = {};
  // User pointers pushed by other threads, linked through their first
  // words. Only ever pushed onto (any thread) and taken whole (the owner,
  // or the pool thread for an orphan), never popped one by one: no ABA can
  // arise, so both are single 8-byte atomic operations on the top word and
  // the generation word stays unused.
  AtomicStackHead remoteFrees;
  unsigned char padAfterRemoteFrees[48] = {};

  BuddySystemSubAllocator() noexcept;
  BuddySystemSubAllocator(const BuddySystemSubAllocator&) = delete;
  BuddySystemSubAllocator& operator=(const BuddySystemSubAllocator&) = delete;
  ~BuddySystemSubAllocator();

  // Malloc'd, never from the allocator itself.
  [[nodiscard]] static BuddySystemSubAllocator* Create() noexcept;
  static void Destroy(BuddySystemSubAllocator* s) noexcept;

  [[nodiscard]] void* Allocate(std::size_t size) noexcept;
  // Frees a block of this sub-allocator on its own thread.
  void FreeLocal(void* user) noexcept;
  // FreeLocal for a block known to come from the buddy pool.
  void FreeBuddyLocal(uint8_t* user) noexcept;
  // Resizes a block of this sub-allocator in place when it fits; null when
  // it does not (p untouched).
  [[nodiscard]] void* ResizeInPlace(void* user, std::size_t size) noexcept;
  // Another thread frees user (a block of this sub-allocator).
  void PushRemoteFree(void* user) noexcept {
    std::atomic_ref<void*> top(remoteFrees.top);
    std::atomic_ref<void*> link(*static_cast<void**>(user));
    void* seen = top.load(std::memory_order_relaxed);
    do {
      link.store(seen, std::memory_order_relaxed);
    } while (!top.compare_exchange_weak(seen, user, std::memory_order_release,
                                        std::memory_order_relaxed));
  }
  // Frees every block other threads have pushed so far, taken in one
  // exchange.
  void DrainRemoteFrees() noexcept;
  [[nodiscard]] bool HasRemoteFrees() noexcept {
    return std::atomic_ref<void*>(remoteFrees.top).load(std::memory_order_relaxed) != nullptr;
  }
  // True while any block handed out is not yet freed (here or pending on
  // the remote-free stack).
  [[nodiscard]] bool HoldsLiveBlocks() const noexcept {
    return blocks.load(std::memory_order_relaxed) != 0;
  }
  // Usable bytes of a block of this allocator or a large block.
  [[nodiscard]] static std::size_t Capacity(void* user) noexcept;
  // As its thread ends while blocks are still live: merges the quick lists
  // and gives every fully merged chunk back, and from then on gives back
  // each chunk as soon as it is fully merged, so that an orphan holds no
  // more than its live blocks need.
  void BecomeOrphan() noexcept;
  // Taken over by a new thread: keeps spare chunks again.
  void BecomeAdopted() noexcept { fSpareLimit = kSpareChunks; }

  // Figures, written only by the owning thread, read by anyone.
  std::atomic<uint64_t> bytesInUse{0};
  std::atomic<uint64_t> logicalBytes{0};
  std::atomic<uint64_t> blocks{0};
  // Registry of all sub-allocators, for the figures.
  BuddySystemSubAllocator* regPrev = nullptr;
  BuddySystemSubAllocator* regNext = nullptr;

  static constexpr int kMaxClasses = 85;

 private:
  struct FreeBlock;
  // Sizes up to this many bytes take the quick-list path of Allocate.
  static constexpr std::size_t kQuickSizeLimit = 1000;
  // Writes the header and prefix of a block taken for rounded bytes of class
  // c and zero-fills the user area.
  void* HandOut(uint8_t* block, int c, std::size_t rounded) noexcept;
  // Allocate's every other case: draining, sizes beyond the quick path,
  // splitting, growing.
  void* AllocateSlow(std::size_t size) noexcept;
  void* AllocateLarge(std::size_t rounded) noexcept;
  void FreeLarge(void* user) noexcept;
  [[nodiscard]] uint8_t* TakeBlock(int c) noexcept;
  [[nodiscard]] bool Grow() noexcept;
  void ListPush(int c, uint8_t* block) noexcept;
  void ListRemove(int c, uint8_t* block) noexcept;
  [[nodiscard]] uint8_t* ListPop(int c) noexcept;
  void FreeBlockMerging(uint8_t* block) noexcept;
  [[nodiscard]] bool HasQuickBlocks() const noexcept;
  // Merges every block waiting on the quick lists.
  void Tidy() noexcept;
  void Add(std::atomic<uint64_t>& figure, int64_t delta) noexcept {
    figure.store(figure.load(std::memory_order_relaxed) + static_cast<uint64_t>(delta),
                 std::memory_order_relaxed);
  }

  int fChunkClass;                        // class of a whole chunk (51,104 bytes)
  int fSmallestChunkClass;                // smallest class accepted when memory is short
  uint8_t* fFreeLists[kMaxClasses] = {};  // heads of doubly linked lists
  // Freed blocks not yet merged, per class (singly linked through +8; their
  // headers still read as in use, so no buddy merges with them). A block
  // freed and allocated again in the same class skips the split and merge
  // steps; the lists are merged (tidied) before the pool grows and when the
  // sub-allocator is orphaned or destroyed.
  // Invariant: fQuickCount[c] == length of fQuick[c] <=
  // HydraSizeClasses::CachedBlocks(c).
  uint8_t* fQuick[kMaxClasses] = {};
  uint32_t fQuickCount[kMaxClasses] = {};
  // Fully merged chunks (free root blocks, listed) are kept, up to
  // kSpareChunks, instead of being given back, so that a thread whose use
  // swings around a chunk boundary does not take chunks from the pool and
  // give them back all the time.
  // Invariant: fSpareChunks == number of root blocks on the free lists
  // <= fSpareLimit (kSpareChunks, or 0 while orphaned).
  static constexpr uint32_t kSpareChunks = 8;
  uint32_t fSpareChunks = 0;
  uint32_t fSpareLimit = kSpareChunks;
  uint64_t fLargeBlocks = 0;  // live blocks taken from the pool directly
};

}  // namespace tarn
