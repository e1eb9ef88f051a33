// The portable lock logic: the counted recursive mutex, the re-entrant
// wrapper and the reader/writer lock with a re-entrant writer.
#include "tarn/Threads/TarnMutex.h"

#include <new>

#include "tarn/Threads/TarnThreadsImpl.h"

namespace tarn {

using threads_detail::Demand;

// --- TarnCoreRecursiveMutex ---

bool TarnCoreRecursiveMutex::tryLock() const noexcept {
  const uint32_t self = TarnThreadID::CurrentThreadRawID();
  int32_t expected = 0;
  if (fLockCount.compare_exchange_strong(expected, 1, std::memory_order_acquire)) {
    fOwnerID.store(self, std::memory_order_relaxed);
    fDepth = 0;
    return true;
  }
  if (fOwnerID.load(std::memory_order_relaxed) == self) {
    ++fDepth;
    return true;
  }
  return false;
}

void TarnCoreRecursiveMutex::lock(TarnMutexLockTag* tag) const noexcept {
  tag->mutex = const_cast<TarnCoreRecursiveMutex*>(this);
  tag->unlock = &unlockMutex;
  lock();
  tag->locked = true;
}

bool TarnCoreRecursiveMutex::tryLock(TarnMutexLockTag* tag) const noexcept {
  tag->mutex = const_cast<TarnCoreRecursiveMutex*>(this);
  tag->unlock = &unlockMutex;
  tag->locked = tryLock();
  return tag->locked;
}

void TarnCoreRecursiveMutex::unlockMutex(bool locked, void* mutex) noexcept {
  if (locked) static_cast<TarnCoreRecursiveMutex*>(mutex)->unlock();
}

// --- TarnMutexLite ---

TarnMutexLite::TarnMutexLite() : fMutex(new (std::nothrow) TarnCoreMutex) {}

TarnMutexLite::~TarnMutexLite() { delete fMutex; }

void TarnMutexLite::lock() const noexcept {
  if (!fOwner.IsCurrent()) {
    Demand(fMutex)->lock();
    fOwner = TarnThreadID::CurrentThread();
  }
  ++fCount;
}

bool TarnMutexLite::tryLock() const noexcept {
  if (!fOwner.IsCurrent()) {
    if (!Demand(fMutex)->tryLock()) return false;
    fOwner = TarnThreadID::CurrentThread();
  }
  ++fCount;
  return true;
}

void TarnMutexLite::unlock() const noexcept {
  if (fCount-- == 1) {
    fOwner.Invalidate();
    Demand(fMutex)->unlock();
  }
}

bool TarnMutexLite::owningThreadIsCurrent() const noexcept { return fOwner.IsCurrent(); }

// --- TarnReadWriteLock ---

struct TarnReadWriteLock::Impl {
  uint32_t fWriteCount = 0;  // writer-only
  TarnMutexLite fReserved;   // kept for layout compatibility; never locked
  TarnThreadID fWriter;
  threads_detail::SharedLock fLock;
};

TarnReadWriteLock::TarnReadWriteLock() : fImpl(new (std::nothrow) Impl) {
  if (fImpl != nullptr && !fImpl->fLock.IsValid()) {
    delete fImpl;
    fImpl = nullptr;
  }
}

TarnReadWriteLock::~TarnReadWriteLock() { delete fImpl; }

void TarnReadWriteLock::lockForRead() const noexcept {
  Impl* px = Demand(fImpl);
  if (px->fWriter.IsCurrent()) {
    ++px->fWriteCount;
  } else {
    px->fLock.LockShared();
  }
}

void TarnReadWriteLock::lockForWrite() const noexcept {
  Impl* px = Demand(fImpl);
  if (!px->fWriter.IsCurrent()) {
    px->fLock.LockExclusive();
    px->fWriter = TarnThreadID::CurrentThread();
  }
  ++px->fWriteCount;
}

bool TarnReadWriteLock::tryLockForRead() const noexcept {
  Impl* px = Demand(fImpl);
  if (px->fWriter.IsCurrent()) {
    ++px->fWriteCount;
    return true;
  }
  return px->fLock.TryLockShared();
}

bool TarnReadWriteLock::tryLockForWrite() const noexcept {
  Impl* px = Demand(fImpl);
  if (!px->fWriter.IsCurrent()) {
    if (!px->fLock.TryLockExclusive()) return false;
    px->fWriter = TarnThreadID::CurrentThread();
  }
  ++px->fWriteCount;
  return true;
}

void TarnReadWriteLock::unlock() const noexcept {
  Impl* px = Demand(fImpl);
  if (px->fWriter.IsCurrent()) {
    if (px->fWriteCount-- == 1) {
      px->fWriter.Invalidate();
      px->fLock.UnlockExclusive();
    }
  } else {
    px->fLock.UnlockShared();
  }
}

}  // namespace tarn
