#pragma once

// FixedBlockAllocMT recycles blocks of one size and alignment between any
// number of threads without locks. Freed blocks wait on a lock-free atomic
// stack and are handed out again last-in-first-out; new blocks are carved,
// aligned, out of ordinary heap memory (operator new[]). Requests of any
// other size go straight to operator new[] / delete[], so the class can
// serve as the allocator of a container whose node size is known.
//
// Blocks are aligned to the alignment, and always at least to a pointer's
// alignment (a free block holds the stack's link). Each carved block is
// preceded, inside its heap allocation, by the start of
// that allocation (8 bytes at block - 16) and the marker 0xF794ABC1 (4 bytes
// at block - 8, for inspection only). Blocks go back to the heap only through
// flush(), so a block on the stack is always readable memory.
//
//   FixedBlockAllocMT nodes(sizeof(Node), alignof(Node));
//   void* n = nodes.allocate(sizeof(Node));   // any thread
//   nodes.deallocate(n, sizeof(Node));        // any thread
//   nodes.flush();                            // when no thread uses it
//
// allocate, deallocate and flush may run on any threads at once; flush must
// not run while another thread uses a block it would release (blocks on the
// stack are released, blocks handed out are not). allocate throws
// std::bad_alloc when the heap is exhausted; nothing else throws.

#include <cstddef>
#include <cstdint>

#include "tarn/Threads/AtomicStack.h"

namespace tarn {

class FixedBlockAllocMT {
 public:
  static constexpr uint32_t kBlockMarker = 0xF794ABC1;

  FixedBlockAllocMT() noexcept;
  FixedBlockAllocMT(std::size_t blockSize, std::size_t alignment) noexcept;
  // Copies every field; the copy shares the free stack's contents and must
  // not be used concurrently with the original.
  FixedBlockAllocMT(const FixedBlockAllocMT& other) noexcept;
  FixedBlockAllocMT& operator=(const FixedBlockAllocMT& other) noexcept;
  ~FixedBlockAllocMT() = default;  // free blocks stay until flush()

  // Sets the block size and alignment for later allocations (call before
  // first use: blocks already on the stack keep their old size).
  void SetSize(std::size_t blockSize, std::size_t alignment) noexcept;
  [[nodiscard]] std::size_t GetAlign() const noexcept { return fAlign; }
  [[nodiscard]] std::size_t GetBlockSize() const noexcept { return fBlockSize; }
  // All ones shifted left by ceil(log2(alignment)); all ones for 0 and 1.
  [[nodiscard]] uint64_t GetMask() const noexcept { return fMask; }

  // A block of the block size (aligned), or size bytes of plain heap memory.
  [[nodiscard]] void* allocate(std::size_t size);
  // Returns a block (null ignored); size must be what was allocated.
  void deallocate(void* p, std::size_t size) noexcept;
  // Releases every free block to the heap.
  void flush() noexcept;

 private:
  [[nodiscard]] AtomicStackHead* Head() const noexcept { return fHead; }

  // Room for a 16-byte-aligned head wherever the object itself lives.
  alignas(8) unsigned char fHeadRoom[sizeof(AtomicStackHead) + 8] = {};
  AtomicStackHead* fHead;
  std::size_t fBlockSize = 0;
  std::size_t fAlign = 0;
  uint64_t fMask = ~uint64_t{0};
};

// A standard-library allocator over a FixedBlockAllocMT shared by all its
// copies: single-object allocations of the block size are recycled, others
// pass through.
template <class T>
class FixedBlockStdAllocator {
 public:
  using value_type = T;
  explicit FixedBlockStdAllocator(FixedBlockAllocMT* blocks) noexcept : fBlocks(blocks) {}
  template <class U>
  FixedBlockStdAllocator(const FixedBlockStdAllocator<U>& other) noexcept
      : fBlocks(other.fBlocks) {}

  [[nodiscard]] T* allocate(std::size_t n) {
    return static_cast<T*>(fBlocks->allocate(n * sizeof(T)));
  }
  void deallocate(T* p, std::size_t n) noexcept { fBlocks->deallocate(p, n * sizeof(T)); }

  template <class U>
  bool operator==(const FixedBlockStdAllocator<U>& other) const noexcept {
    return fBlocks == other.fBlocks;
  }

 private:
  template <class U>
  friend class FixedBlockStdAllocator;
  FixedBlockAllocMT* fBlocks;
};

}  // namespace tarn
