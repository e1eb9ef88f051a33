#pragma once

// A lock-free intrusive last-in-first-out stack of caller-owned nodes, safe
// for any number of threads pushing and popping at once and usable from
// real-time callbacks (no locks, no allocation).
//
// A node is any memory whose first pointer-sized word is free for the stack
// to use as the link to the next node. The head pairs the top node with a
// generation counter and is changed only by a 16-byte compare-and-swap, so a
// node popped and pushed again between another thread's load and swap is not
// mistaken for an unchanged head (no ABA).
//
//   AtomicStackHead free;                 // zero-initialised: empty
//   EnqueueAtomic(&free, block);          // any thread
//   void* b = DequeueAtomic(&free);       // any thread; null when empty
//   for (void* n = DetachAtomic(&free); n; n = AtomicStackNext(n)) ...
//
// Popping reads the link of the node being removed, so nodes must remain
// readable memory while any thread may still be popping (they may be reused,
// never returned to the system).

#include <atomic>
#include <cstdint>

namespace tarn {

struct alignas(16) AtomicStackHead {
  // Invariants: generation == number of successful changes of the head
  // since it was zero-initialised; top == null exactly when the stack is
  // empty; following links from top reaches null after |stack| nodes.
  void* top = nullptr;
  uint64_t generation = 0;
};
static_assert(sizeof(AtomicStackHead) == 16);

// Pushes node (its first word is overwritten with the link).
void EnqueueAtomic(AtomicStackHead* head, void* node) noexcept;
// Pops and returns the top node, or null when the stack is empty.
[[nodiscard]] void* DequeueAtomic(AtomicStackHead* head) noexcept;
// Takes the whole chain: returns the old top (null when empty) and leaves
// the stack empty. The chain stays linked through the nodes' first words.
[[nodiscard]] void* DetachAtomic(AtomicStackHead* head) noexcept;
// Pushes the ready-made chain first..last in one step; last's link is
// overwritten with the old top.
void SpliceAtomic(AtomicStackHead* head, void* first, void* last) noexcept;

// The link stored in a node's first word (for walking a detached chain).
[[nodiscard]] inline void* AtomicStackNext(const void* node) noexcept {
  return std::atomic_ref<void*>(*static_cast<void**>(const_cast<void*>(node)))
      .load(std::memory_order_relaxed);
}

}  // namespace tarn
