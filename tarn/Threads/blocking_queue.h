#pragma once

// blocking_queue<T>: an unbounded first-in-first-out queue for many producers
// and exactly one consumer, the queue of a job thread.
//
// Producers (any thread) append under a push mutex and signal a binary wake
// semaphore; the consumer takes without a lock, touching only the head block.
// Items live in a chain of 64-slot blocks; the consumer frees each block as it
// leaves it. Items therefore leave in exactly the order they were queued.
//
//   blocking_queue<std::shared_ptr<Job>> q;
//   q.push(job);                           // any thread
//   auto next = q.pop();                   // consumer: blocks while empty,
//                                          // throws "Interrupted" after interrupt()
//
// pop() and try_pop() belong to one consumer thread at a time. interrupt()
// and wake() may be called from any thread.

#include <atomic>
#include <cstdint>
#include <new>
#include <utility>

#include "tarn/Errors/Fail.h"
#include "tarn/Errors/TarnAssert.h"
#include "tarn/Threads/TarnMutex.h"
#include "tarn/Threads/TarnSemaphore.h"

namespace tarn {

// Throws the TarnError of an interrupted wait: kind and system "TarnThreads",
// subsystem "blocking_queue", code 0, text "Interrupted".
[[noreturn]] void FailBlockingQueueInterrupted();
// True for exactly the error that FailBlockingQueueInterrupted throws.
[[nodiscard]] bool IsBlockingQueueInterrupted(const TarnError& error) noexcept;

template <class T>
class blocking_queue {
 public:
  static constexpr int32_t kBlockSlots = 64;

  // wakeOnlyWhenWaiting: producers signal the wake semaphore only when the
  // consumer has announced that it is about to wait (saves a system call per
  // item while the consumer is busy; the consumer drains until empty anyway).
  explicit blocking_queue(bool wakeOnlyWhenWaiting = false)
      : fHead(new Block), fTail(fHead), fWakeOnlyWhenWaiting(wakeOnlyWhenWaiting) {}
  blocking_queue(const blocking_queue&) = delete;
  blocking_queue& operator=(const blocking_queue&) = delete;
  ~blocking_queue() {
    for (Block* b = fHead; b != nullptr;) {
      Block* next = b->next.load(std::memory_order_relaxed);
      delete b;
      b = next;
    }
  }

  // Appends item; never blocks except on the push mutex.
  void push(T item) {
    fPushMutex.lock();
    // Counted before it is published, so the consumer never takes an item
    // that is not yet counted: count >= items visible to the consumer.
    fCount.fetch_add(1, std::memory_order_seq_cst);
    Block* tail = fTail;
    const int32_t fill = tail->fill.load(std::memory_order_relaxed);
    if (fill < kBlockSlots) {
      tail->slots[fill] = std::move(item);
      tail->fill.store(fill + 1, std::memory_order_seq_cst);
    } else {
      // The item goes into slot 0 before the block is linked, so the consumer
      // never sees an empty successor.
      Block* fresh = new (std::nothrow) Block;
      if (fresh == nullptr) {
        fCount.fetch_sub(1, std::memory_order_seq_cst);
        fPushMutex.unlock();
        FailMemFullError();
      }
      fresh->slots[0] = std::move(item);
      fresh->fill.store(1, std::memory_order_relaxed);
      fTail = fresh;
      tail->next.store(fresh, std::memory_order_seq_cst);  // last touch of the old tail
    }
    fPushMutex.unlock();
    if (fWakeOnlyWhenWaiting) {
      // The publishing store above, this exchange, the consumer's store of
      // fWaiting and its second look are all sequentially consistent: either
      // the consumer sees this item when it looks again, or this producer
      // sees it waiting.
      if (!fWaiting.exchange(false, std::memory_order_seq_cst)) return;
    }
    fWake.Signal();
  }

  // Consumer: takes the oldest item into out; false when the queue is empty.
  bool try_pop(T& out) {
    if (fHeadIndex >= fHead->fill.load(std::memory_order_seq_cst)) {
      Block* next = fHead->next.load(std::memory_order_seq_cst);
      if (next == nullptr) return false;
      // A linked successor means the head block is full; its last slots may
      // have been filled since the first look.
      if (fHeadIndex == kBlockSlots) {
        delete fHead;
        fHead = next;
        fHeadIndex = 0;
      }
    }
    out = std::move(fHead->slots[fHeadIndex]);
    fHead->slots[fHeadIndex] = T();
    ++fHeadIndex;
    const int32_t before = fCount.fetch_sub(1, std::memory_order_seq_cst);
    TARN_ASSERT(before >= 1);
    (void)before;
    return true;
  }

  // Consumer: takes the oldest item, waiting while the queue is empty. Throws
  // "Interrupted" (and clears the request) when interrupt() was called.
  T pop() {
    for (;;) {
      if (fInterrupted.exchange(false, std::memory_order_acq_rel)) FailBlockingQueueInterrupted();
      T item;
      if (try_pop(item)) return item;
      if (fWakeOnlyWhenWaiting) {
        fWaiting.store(true, std::memory_order_seq_cst);
        if (try_pop(item)) {
          fWaiting.store(false, std::memory_order_relaxed);
          return item;
        }
      }
      fWake.Wait();
    }
  }

  // Breaks the consumer out of its wait (or its next one) with "Interrupted".
  void interrupt() noexcept {
    fInterrupted.store(true, std::memory_order_release);
    fWake.Signal();
  }
  // Makes a waiting consumer look at the queue once more.
  void wake() noexcept { fWake.Signal(); }

  // Items queued and not yet taken (a snapshot when producers are active).
  [[nodiscard]] int32_t count() const noexcept { return fCount.load(std::memory_order_acquire); }
  [[nodiscard]] bool empty() const noexcept { return count() == 0; }

 private:
  struct Block {
    // Invariants: 0 <= fill <= kBlockSlots; slots [0, fill) were written by
    // producers; next != null only when fill == kBlockSlots.
    T slots[kBlockSlots]{};
    std::atomic<int32_t> fill{0};
    std::atomic<Block*> next{nullptr};
  };

  // Consumer's side. Invariant: count == (slots filled in the chain from
  // fHead) - fHeadIndex once every producer has left push(); while one is
  // inside, count may exceed it by one (counted, not yet published).
  Block* fHead;
  int32_t fHeadIndex = 0;

  // Producers' side, guarded by fPushMutex.
  Block* fTail;
  TarnCoreMutex fPushMutex;

  std::atomic<int32_t> fCount{0};
  TarnBinarySemaphore fWake{false};
  std::atomic<bool> fInterrupted{false};
  std::atomic<bool> fWaiting{false};  // the consumer is about to wait
  const bool fWakeOnlyWhenWaiting;
};

}  // namespace tarn
