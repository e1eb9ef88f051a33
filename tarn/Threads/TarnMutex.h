// Mutual exclusion: TarnCoreMutex, TarnCoreRecursiveMutex, TarnMutexLite and
// TarnReadWriteLock, plus TarnMutexLockTag for generic scope guards.
//
// Each class is a small handle over a private implementation, so that it can
// be a member of widely shared classes without exposing operating-system
// types. Lock methods are const so that const objects can lock their own
// members. Nothing here throws or reports errors; using an object whose
// implementation could not be created is an assertion failure ("px != 0").
// Objects are neither copyable nor movable.
//
//   TarnCoreRecursiveMutex m;
//   TarnMutexLockTag tag;
//   m.lock(&tag);                   // tag now knows how to release m
//   ...
//   tag.unlock(tag.locked, tag.mutex);
#pragma once

#include <atomic>

#include <cstdint>

#include "tarn/Threads/TarnSemaphore.h"
#include "tarn/Threads/TarnThreadID.h"

namespace tarn {

// Filled by the tag forms of lock/tryLock: whether the lock was taken, the
// lock, and a function that releases it (doing nothing when locked is false).
struct TarnMutexLockTag {
  using UnlockFunction = void (*)(bool locked, void* mutex);
  bool locked = false;
  void* mutex = nullptr;
  UnlockFunction unlock = nullptr;
};

struct TarnCoreMutexImpl;

// A plain mutex (one critical section / pthread mutex). It happens to be
// re-entrant on every platform, but callers that need re-entry use
// TarnMutexLite or TarnCoreRecursiveMutex.
class TarnCoreMutex {
 public:
  TarnCoreMutex();
  ~TarnCoreMutex();
  TarnCoreMutex(const TarnCoreMutex&) = delete;
  TarnCoreMutex& operator=(const TarnCoreMutex&) = delete;

  void lock() const noexcept;                   // blocks
  [[nodiscard]] bool tryLock() const noexcept;  // never blocks; true when obtained
  void unlock() const noexcept;

 private:
  TarnCoreMutexImpl* fImpl;
};

// A counted lock with a hand-off semaphore: uncontended lock and unlock are
// one atomic operation each and never enter the kernel. Re-entrant; unlock
// from a thread that does not own it is ignored. Waiters are woken one per
// final unlock; ownership passes to the woken waiter (no barging by tryLock).
class TarnCoreRecursiveMutex {
 public:
  using Tester = void (*)(TarnCoreRecursiveMutex* mutex);

  TarnCoreRecursiveMutex() = default;
  ~TarnCoreRecursiveMutex() = default;
  TarnCoreRecursiveMutex(const TarnCoreRecursiveMutex&) = delete;
  TarnCoreRecursiveMutex& operator=(const TarnCoreRecursiveMutex&) = delete;

  // Uncontended, lock and unlock are one atomic add each and no call.
  void lock() const noexcept {
    const uint32_t self = TarnThreadID::CurrentThreadRawID();
    if (fOwnerID.load(std::memory_order_relaxed) == self) {
      ++fDepth;
      return;
    }
    if (fLockCount.fetch_add(1, std::memory_order_acquire) >= 1) fWake.wait();
    fOwnerID.store(self, std::memory_order_relaxed);
    fDepth = 0;
  }
  [[nodiscard]] bool tryLock() const noexcept;
  // Ignored when the calling thread does not hold the lock.
  void unlock() const noexcept {
    if (fOwnerID.load(std::memory_order_relaxed) != TarnThreadID::CurrentThreadRawID()) return;
    if (fDepth >= 1) {
      --fDepth;
      return;
    }
    fOwnerID.store(0, std::memory_order_relaxed);
    if (fLockCount.fetch_sub(1, std::memory_order_release) > 1) fWake.signal();
  }
  void lock(TarnMutexLockTag* tag) const noexcept;
  bool tryLock(TarnMutexLockTag* tag) const noexcept;
  static void unlockMutex(bool locked, void* mutex) noexcept;

  // A test hook; stored only, it plays no part in locking.
  void SetTester(Tester tester) noexcept { fTester = tester; }

 private:
  // fLockCount == number of threads holding or waiting for the lock (the
  // holder counts once however deep its recursion is). fOwnerID is the
  // holder's raw thread id, 0 while free; only the holder writes it, so a
  // thread comparing it with its own id sees either its own id or not.
  mutable std::atomic<int32_t> fLockCount{0};
  mutable std::atomic<uint32_t> fOwnerID{0};
  mutable TarnSemaphore fWake;
  mutable int32_t fDepth = 0;  // extra acquisitions by the owner; owner-only
  Tester fTester = nullptr;
};

// A re-entrant wrapper over TarnCoreMutex. unlock does not check the caller.
class TarnMutexLite {
 public:
  TarnMutexLite();
  ~TarnMutexLite();
  TarnMutexLite(const TarnMutexLite&) = delete;
  TarnMutexLite& operator=(const TarnMutexLite&) = delete;

  void lock() const noexcept;
  [[nodiscard]] bool tryLock() const noexcept;
  void unlock() const noexcept;
  [[nodiscard]] bool owningThreadIsCurrent() const noexcept;

 private:
  TarnCoreMutex* fMutex;
  mutable TarnThreadID fOwner;
  mutable uint32_t fCount = 0;  // owner-only
};

// A reader/writer lock whose writer may re-enter and may also take read
// locks while writing (they fold into the write hold). One unlock() releases
// either kind. A reader that asks for the write lock deadlocks: there is no
// upgrade.
class TarnReadWriteLock {
 public:
  TarnReadWriteLock();
  ~TarnReadWriteLock();
  TarnReadWriteLock(const TarnReadWriteLock&) = delete;
  TarnReadWriteLock& operator=(const TarnReadWriteLock&) = delete;

  void lockForRead() const noexcept;
  void lockForWrite() const noexcept;
  [[nodiscard]] bool tryLockForRead() const noexcept;
  [[nodiscard]] bool tryLockForWrite() const noexcept;
  void unlock() const noexcept;

  struct Impl;

 private:
  Impl* fImpl;
};

}  // namespace tarn
