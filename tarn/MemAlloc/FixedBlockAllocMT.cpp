#include "tarn/MemAlloc/FixedBlockAllocMT.h"

#include <cstring>
#include <new>

namespace tarn {

namespace {
AtomicStackHead* AlignedHead(unsigned char* room) noexcept {
  const auto at = (reinterpret_cast<uintptr_t>(room) + 15) & ~uintptr_t{15};
  return new (reinterpret_cast<void*>(at)) AtomicStackHead();
}

uint64_t MaskFor(std::size_t alignment) noexcept {
  unsigned shift = 0;
  while (shift < 63 && (std::size_t{1} << shift) < alignment) ++shift;
  return ~uint64_t{0} << shift;
}

constexpr std::size_t kBlockPrefix = 16;  // heap start, marker, 4 spare bytes
}  // namespace

FixedBlockAllocMT::FixedBlockAllocMT() noexcept : fHead(AlignedHead(fHeadRoom)) {}

FixedBlockAllocMT::FixedBlockAllocMT(std::size_t blockSize, std::size_t alignment) noexcept
    : fHead(AlignedHead(fHeadRoom)) {
  SetSize(blockSize, alignment);
}

FixedBlockAllocMT::FixedBlockAllocMT(const FixedBlockAllocMT& other) noexcept
    : fHead(AlignedHead(fHeadRoom)) {
  *this = other;
}

FixedBlockAllocMT& FixedBlockAllocMT::operator=(const FixedBlockAllocMT& other) noexcept {
  if (this != &other) {
    *fHead = *other.fHead;
    fBlockSize = other.fBlockSize;
    fAlign = other.fAlign;
    fMask = other.fMask;
  }
  return *this;
}

void FixedBlockAllocMT::SetSize(std::size_t blockSize, std::size_t alignment) noexcept {
  fBlockSize = blockSize;
  fAlign = alignment;
  fMask = MaskFor(alignment);
}

void* FixedBlockAllocMT::allocate(std::size_t size) {
  if (size != fBlockSize) return ::operator new[](size);
  if (void* block = DequeueAtomic(fHead)) return block;
  // A block holds its stack link while free: at least a pointer's size and
  // alignment, whatever smaller alignment was asked for.
  const std::size_t usable = fBlockSize < sizeof(void*) ? sizeof(void*) : fBlockSize;
  const std::size_t align = fAlign < alignof(void*) ? alignof(void*) : fAlign;
  const uint64_t mask = fMask & ~uint64_t{alignof(void*) - 1};
  auto* heap = static_cast<unsigned char*>(::operator new[](align + usable + kBlockPrefix));
  const uint64_t start = reinterpret_cast<uintptr_t>(heap) + align + kBlockPrefix;
  auto* block = reinterpret_cast<unsigned char*>(static_cast<uintptr_t>(start & mask));
  std::memcpy(block - 16, &heap, sizeof heap);
  std::memcpy(block - 8, &kBlockMarker, sizeof kBlockMarker);
  return block;
}

void FixedBlockAllocMT::deallocate(void* p, std::size_t size) noexcept {
  if (!p) return;
  if (size != fBlockSize) {
    ::operator delete[](p);
    return;
  }
  EnqueueAtomic(fHead, p);
}

void FixedBlockAllocMT::flush() noexcept {
  void* block = DetachAtomic(fHead);
  while (block) {
    void* next = AtomicStackNext(block);
    unsigned char* heap;
    std::memcpy(&heap, static_cast<unsigned char*>(block) - 16, sizeof heap);
    ::operator delete[](heap);
    block = next;
  }
}

}  // namespace tarn
