#pragma once

// HydraAllocator: the library's general-purpose memory allocator, built for
// many threads allocating at once without locks. Linking Tarn::HydraOverride
// routes the global operator new and delete to it.
//
// Each thread owns a private sub-allocator that only it touches: Fibonacci
// sized buddy blocks (32, 64, 96, 160, 256, ... bytes) carved from 51,104-byte
// chunks. A block freed on another thread is pushed on its owner's lock-free
// remote-free stack and returned to the owner's pool the next time the owner
// allocates or frees. Chunks and blocks whose prefix and size reach 41,337
// bytes come from a process-wide pool of pre-allocated 53,232-byte chunks,
// kept between 256 and 275 chunks by a background thread that wakes every
// 100 ms; that thread also collects the sub-allocators of ended threads
// (orphans) once their last block has been freed elsewhere, unless a new
// thread has taken one over first (a thread's first allocation adopts a
// recent orphan when there is one, instead of creating a sub-allocator).
// For reuse, each thread keeps up to eight free chunks and a bounded number
// of freed blocks per size class (HydraSizeClasses::CachedBlocks); they go
// back to the pool when the thread ends, and an orphan gives back each chunk
// as soon as it is free.
//
// What callers may rely on:
// - Every block is zero-filled and 16-byte aligned (the prefix in front of
//   it is 12 or 16 bytes); Allocate(0) gives a valid, distinct block.
// - Deallocate and Reallocate may be called on any thread, for blocks from
//   any thread. A pointer that this allocator did not hand out (from the C
//   runtime's malloc, say) is passed to the C runtime's free.
// - No lock is taken on the allocation and free paths.
// - Nothing throws: exhausted memory makes Allocate and Reallocate return null.
//
//   HydraAllocator& heap = HydraAllocator::Instance();
//   auto* samples = static_cast<float*>(heap.Allocate(512 * sizeof(float)));
//   samples = static_cast<float*>(heap.Reallocate(samples, 1024 * sizeof(float)));
//   heap.Deallocate(samples);  // any thread
//
// The instance lives until the process ends and is never destroyed, so that
// objects with static storage that are destroyed at exit can still free
// their memory into it.

#include <atomic>
#include <cstddef>
#include <cstdint>

namespace tarn {

class BuddySystemSubAllocator;
class HydraGlobalPool;

// The size classes shared by every sub-allocator.
namespace HydraSizeClasses {
inline constexpr uint32_t kBuddyMagic = 0xFACEF00D;       // block from a buddy pool
inline constexpr uint32_t kLargeMagic = 0xFEEDFACE;       // block from the global pool
inline constexpr uint32_t kPadMarker = 0xFEDAFACE;        // between magic and user memory
inline constexpr std::size_t kLargeThreshold = 41'337;    // rounded size + 16 from here on
inline constexpr std::size_t kPooledChunkBytes = 53'232;  // size of every pooled chunk

// Number of classes (85): the Fibonacci sequence from 32 and 64 up to the
// last sum that fits 64 bits.
[[nodiscard]] int Count() noexcept;
// Bytes of class k, 0 <= k < Count().
[[nodiscard]] uint64_t Size(int k) noexcept;
// Entry i of the small-size index (0 <= i < 256): the smallest class of at
// least 4 * i bytes.
[[nodiscard]] int SmallIndex(int i) noexcept;
// How many freed blocks of class k a thread keeps unmerged for reuse
// (128 KB of blocks up to 1088 bytes, 32 KB of larger ones, at least 4);
// a block freed beyond that is merged with its buddies at once.
[[nodiscard]] uint32_t CachedBlocks(int k) noexcept;
// The smallest class of at least bytes bytes; -1 when none is that large.
[[nodiscard]] int ClassFor(uint64_t bytes) noexcept;
}  // namespace HydraSizeClasses

class HydraAllocator {
 public:
  HydraAllocator(const HydraAllocator&) = delete;
  HydraAllocator& operator=(const HydraAllocator&) = delete;

  // The process-wide instance, constructed on first use (thread-safe). The
  // construction allocates the first 256 pooled chunks and starts the pool
  // thread.
  [[nodiscard]] static HydraAllocator& Instance() noexcept {
    if (HydraAllocator* instance = sInstance.load(std::memory_order_acquire)) [[likely]]
      return *instance;
    return MakeInstance();
  }

  // Zero-filled, 16-byte-aligned memory of at least size bytes (0 counts as
  // 1), or null when the operating system refuses memory. Any thread.
  [[nodiscard]] void* Allocate(std::size_t size) noexcept;
  // Frees p (null is ignored) on any thread.
  void Deallocate(void* p) noexcept;
  // p null: as Allocate; size 0: as Deallocate, returns null. Otherwise the
  // block holding the first min(old, new) bytes of p's contents, with any
  // bytes beyond the old size zero; p is invalid afterwards unless it is the
  // returned pointer. Null (p untouched) when memory is exhausted.
  [[nodiscard]] void* Reallocate(void* p, std::size_t size) noexcept;

  // The pool of chunks shared by all threads.
  [[nodiscard]] static HydraGlobalPool& GlobalPool() noexcept;

  // The clean-up function of the per-thread key, run on a thread as it ends
  // with that thread's sub-allocator: destroys it when it holds no live
  // blocks, else hands it to the pool thread as an orphan.
  static void SubAllocatorDestructor(void* subAllocator) noexcept;

  // With the flag set, blocks not carrying either magic are ignored instead
  // of being handed to the C runtime's free. Off by default.
  [[nodiscard]] bool GetIgnoreUnknownDeallocations() const noexcept;
  void SetIgnoreUnknownDeallocations(bool ignore) noexcept;

 private:
  friend class HydraGlobalPool;
  friend struct HydraDebugging;
  HydraAllocator() noexcept;
  ~HydraAllocator() = delete;  // lives until the process ends

  // Constructs the instance on the first call (thread-safe) and publishes it.
  static HydraAllocator& MakeInstance() noexcept;
  BuddySystemSubAllocator* GetSubAllocatorForCurrentThread() noexcept;
  BuddySystemSubAllocator* GetSubAllocatorOrphan() noexcept;
  // Deallocate's cases other than a buddy block of the calling thread (self).
  void DeallocateSlow(void* p, BuddySystemSubAllocator* self) noexcept;

  // The instance once constructed, read without a call by Instance().
  static inline std::atomic<HydraAllocator*> sInstance{nullptr};
  HydraGlobalPool* fPool;
  std::atomic<bool> fIgnoreUnknownDeallocations{false};
};

// Figures over all pools, for tests and diagnostics. Any thread; the figures
// of other threads' sub-allocators are read while those threads may change
// them, so they are exact only while those threads are quiet. Each call
// first returns the calling thread's pending cross-thread frees to its pool.
struct HydraDebugging {
  // Bytes obtained from the operating system and not yet released.
  [[nodiscard]] static uint64_t TotalBytesInOperatorNewPools() noexcept;
  // Bytes of blocks handed out and not yet freed, with their prefixes and
  // rounding (whole buddy blocks, whole large chunks).
  [[nodiscard]] static uint64_t BytesInUseInOperatorNewPools() noexcept;
  // Total minus in use: pooled chunks and free buddy blocks.
  [[nodiscard]] static uint64_t FreeBytesInOperatorNewPools() noexcept;
  // The sizes callers asked for, rounded up to 4 bytes, of live blocks.
  [[nodiscard]] static uint64_t LogicalBytesInOperatorNewPools() noexcept;
  // Live blocks.
  [[nodiscard]] static uint64_t BlocksInOperatorNewPools() noexcept;
  // Sub-allocators of ended threads still waiting for their blocks.
  [[nodiscard]] static uint64_t OrphanedSubAllocators() noexcept;
  // Chunks on the global pool's stack.
  [[nodiscard]] static uint64_t PooledChunks() noexcept;
};

}  // namespace tarn
