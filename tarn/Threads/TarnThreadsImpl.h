// Private helpers shared by the thread and lock sources.
#pragma once

#include "tarn/Errors/TarnAssert.h"

namespace tarn::threads_detail {

// The implementation behind a handle object; asserts when it is missing.
template <class T>
inline T* Demand(T* px) noexcept {
  TARN_ASSERT(px != 0);
  return px;
}

// A system reader/writer lock whose shared and exclusive holds are released
// by separate calls.
class SharedLock {
 public:
  SharedLock() noexcept;
  ~SharedLock();
  SharedLock(const SharedLock&) = delete;
  SharedLock& operator=(const SharedLock&) = delete;

  [[nodiscard]] bool IsValid() const noexcept { return fLock != nullptr; }
  void LockShared() noexcept;
  bool TryLockShared() noexcept;
  void UnlockShared() noexcept;
  void LockExclusive() noexcept;
  bool TryLockExclusive() noexcept;
  void UnlockExclusive() noexcept;

 private:
  void* fLock;
};

// An auto-reset event: Signal lets exactly one Wait through (now or later);
// signals do not accumulate.
class AutoResetEvent {
 public:
  AutoResetEvent() noexcept;
  ~AutoResetEvent();
  AutoResetEvent(const AutoResetEvent&) = delete;
  AutoResetEvent& operator=(const AutoResetEvent&) = delete;

  [[nodiscard]] bool IsValid() const noexcept { return fEvent != nullptr; }
  void Signal() noexcept;
  void Wait() noexcept;
  // Signals toSignal and waits on toWait as one step, so that no wake-up can
  // be lost in between.
  static void SignalAndWait(AutoResetEvent& toSignal, AutoResetEvent& toWait) noexcept;

 private:
  void* fEvent;
};

}  // namespace tarn::threads_detail
