#include "tarn/Threads/AtomicStack.h"

#include <atomic>

#include "tarn/Threads/TarnAtomic.h"

namespace tarn {
namespace {

// The link word of a node, accessed atomically: a popper may read the link of
// a node that another thread has meanwhile popped and is relinking; the
// compare-and-swap of the head then fails and the stale link is discarded.
std::atomic_ref<void*> Link(void* node) noexcept {
  return std::atomic_ref<void*>(*static_cast<void**>(node));
}

AtomicStackHead LoadHead(AtomicStackHead* head) noexcept {
  // Two 64-bit loads; a torn pair only makes the swap below fail.
  AtomicStackHead seen;
  seen.generation = std::atomic_ref<uint64_t>(head->generation).load(std::memory_order_acquire);
  seen.top = std::atomic_ref<void*>(head->top).load(std::memory_order_acquire);
  return seen;
}

bool SwapHead(AtomicStackHead* head, const AtomicStackHead& seen, void* newTop) noexcept {
  return AtomicCompareAndSwap128Implementation(
      reinterpret_cast<volatile uint64_t*>(head), reinterpret_cast<uintptr_t>(seen.top),
      seen.generation, reinterpret_cast<uintptr_t>(newTop), seen.generation + 1);
}

}  // namespace

void EnqueueAtomic(AtomicStackHead* head, void* node) noexcept { SpliceAtomic(head, node, node); }

void SpliceAtomic(AtomicStackHead* head, void* first, void* last) noexcept {
  for (;;) {
    const AtomicStackHead seen = LoadHead(head);
    Link(last).store(seen.top, std::memory_order_relaxed);
    if (SwapHead(head, seen, first)) return;
  }
}

void* DequeueAtomic(AtomicStackHead* head) noexcept {
  for (;;) {
    const AtomicStackHead seen = LoadHead(head);
    if (seen.top == nullptr) return nullptr;
    void* next = Link(seen.top).load(std::memory_order_relaxed);
    if (SwapHead(head, seen, next)) return seen.top;
  }
}

void* DetachAtomic(AtomicStackHead* head) noexcept {
  for (;;) {
    const AtomicStackHead seen = LoadHead(head);
    if (seen.top == nullptr) return nullptr;
    if (SwapHead(head, seen, nullptr)) return seen.top;
  }
}

}  // namespace tarn
