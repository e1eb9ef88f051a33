// The global allocation and release operators, routed to HydraAllocator.
// Linked (as the Tarn::HydraOverride object library) into programs that want
// all of their memory pooled. Aligned forms honour any power-of-two
// alignment: up to 16 bytes every block qualifies (HydraAllocator's blocks
// are 16-byte aligned); larger alignments take a block big enough to align
// within and keep the block's own pointer 16 bytes before the aligned
// address, where the aligned delete finds it.
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <new>

#include "tarn/MemAlloc/HydraAllocator.h"

namespace {

using tarn::HydraAllocator;

void* AllocateOrThrow(std::size_t size) {
  void* p = HydraAllocator::Instance().Allocate(size);
  if (!p) throw std::bad_alloc();
  return p;
}

void* AllocateAligned(std::size_t size, std::size_t align) noexcept {
  if (align <= 16) return HydraAllocator::Instance().Allocate(size);
  if (size > SIZE_MAX - align - 16) return nullptr;
  auto* raw = static_cast<uint8_t*>(HydraAllocator::Instance().Allocate(size + align + 16));
  if (!raw) return nullptr;
  const uintptr_t start = reinterpret_cast<uintptr_t>(raw) + 16;
  auto* aligned = reinterpret_cast<uint8_t*>((start + align - 1) & ~(uintptr_t{align} - 1));
  std::memcpy(aligned - 16, &raw, sizeof raw);
  return aligned;
}

void DeallocateAligned(void* p, std::size_t align) noexcept {
  if (!p) return;
  if (align <= 16) {
    HydraAllocator::Instance().Deallocate(p);
    return;
  }
  void* raw;
  std::memcpy(&raw, static_cast<uint8_t*>(p) - 16, sizeof raw);
  HydraAllocator::Instance().Deallocate(raw);
}

void* AllocateAlignedOrThrow(std::size_t size, std::align_val_t align) {
  void* p = AllocateAligned(size, static_cast<std::size_t>(align));
  if (!p) throw std::bad_alloc();
  return p;
}

}  // namespace

void* operator new(std::size_t size) { return AllocateOrThrow(size); }
void* operator new[](std::size_t size) { return AllocateOrThrow(size); }
void* operator new(std::size_t size, const std::nothrow_t&) noexcept {
  return HydraAllocator::Instance().Allocate(size);
}
void* operator new[](std::size_t size, const std::nothrow_t&) noexcept {
  return HydraAllocator::Instance().Allocate(size);
}
void* operator new(std::size_t size, std::align_val_t align) {
  return AllocateAlignedOrThrow(size, align);
}
void* operator new[](std::size_t size, std::align_val_t align) {
  return AllocateAlignedOrThrow(size, align);
}
void* operator new(std::size_t size, std::align_val_t align, const std::nothrow_t&) noexcept {
  return AllocateAligned(size, static_cast<std::size_t>(align));
}
void* operator new[](std::size_t size, std::align_val_t align, const std::nothrow_t&) noexcept {
  return AllocateAligned(size, static_cast<std::size_t>(align));
}

void operator delete(void* p) noexcept { HydraAllocator::Instance().Deallocate(p); }
void operator delete[](void* p) noexcept { HydraAllocator::Instance().Deallocate(p); }
void operator delete(void* p, const std::nothrow_t&) noexcept {
  HydraAllocator::Instance().Deallocate(p);
}
void operator delete[](void* p, const std::nothrow_t&) noexcept {
  HydraAllocator::Instance().Deallocate(p);
}
void operator delete(void* p, std::size_t) noexcept { HydraAllocator::Instance().Deallocate(p); }
void operator delete[](void* p, std::size_t) noexcept { HydraAllocator::Instance().Deallocate(p); }
void operator delete(void* p, std::align_val_t align) noexcept {
  DeallocateAligned(p, static_cast<std::size_t>(align));
}
void operator delete[](void* p, std::align_val_t align) noexcept {
  DeallocateAligned(p, static_cast<std::size_t>(align));
}
void operator delete(void* p, std::size_t, std::align_val_t align) noexcept {
  DeallocateAligned(p, static_cast<std::size_t>(align));
}
void operator delete[](void* p, std::size_t, std::align_val_t align) noexcept {
  DeallocateAligned(p, static_cast<std::size_t>(align));
}
void operator delete(void* p, std::align_val_t align, const std::nothrow_t&) noexcept {
  DeallocateAligned(p, static_cast<std::size_t>(align));
}
void operator delete[](void* p, std::align_val_t align, const std::nothrow_t&) noexcept {
  DeallocateAligned(p, static_cast<std::size_t>(align));
}
