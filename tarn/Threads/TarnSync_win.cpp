// Windows system primitives behind the lock and semaphore handles: critical
// sections, slim reader/writer locks, semaphores, auto-reset events with
// SignalObjectAndWait, and CONDITION_VARIABLE.
#include <windows.h>

#include <cstdint>
#include <new>

#include "tarn/Threads/TarnConditionVariable.h"
#include "tarn/Threads/TarnMutex.h"
#include "tarn/Threads/TarnSemaphore.h"
#include "tarn/Threads/TarnThreadsImpl.h"

namespace tarn {

using threads_detail::Demand;

// --- TarnCoreMutex: one critical section ---

struct TarnCoreMutexImpl {
  CRITICAL_SECTION section;
  TarnCoreMutexImpl() noexcept { InitializeCriticalSection(&section); }
  ~TarnCoreMutexImpl() { DeleteCriticalSection(&section); }
};

TarnCoreMutex::TarnCoreMutex() : fImpl(new (std::nothrow) TarnCoreMutexImpl) {}
TarnCoreMutex::~TarnCoreMutex() { delete fImpl; }
void TarnCoreMutex::lock() const noexcept { EnterCriticalSection(&Demand(fImpl)->section); }
bool TarnCoreMutex::tryLock() const noexcept {
  return TryEnterCriticalSection(&Demand(fImpl)->section) != FALSE;
}
void TarnCoreMutex::unlock() const noexcept { LeaveCriticalSection(&Demand(fImpl)->section); }

namespace threads_detail {

// --- SharedLock: a slim reader/writer lock ---

namespace {
SRWLOCK* AsSRW(void* lock) noexcept { return static_cast<SRWLOCK*>(lock); }
}  // namespace

SharedLock::SharedLock() noexcept : fLock(new (std::nothrow) SRWLOCK) {
  if (fLock != nullptr) InitializeSRWLock(AsSRW(fLock));
}
SharedLock::~SharedLock() { delete AsSRW(fLock); }
void SharedLock::LockShared() noexcept { AcquireSRWLockShared(AsSRW(fLock)); }
bool SharedLock::TryLockShared() noexcept { return TryAcquireSRWLockShared(AsSRW(fLock)) != 0; }
void SharedLock::UnlockShared() noexcept { ReleaseSRWLockShared(AsSRW(fLock)); }
void SharedLock::LockExclusive() noexcept { AcquireSRWLockExclusive(AsSRW(fLock)); }
bool SharedLock::TryLockExclusive() noexcept {
  return TryAcquireSRWLockExclusive(AsSRW(fLock)) != 0;
}
void SharedLock::UnlockExclusive() noexcept { ReleaseSRWLockExclusive(AsSRW(fLock)); }

// --- AutoResetEvent: an auto-reset, initially unsignalled event ---

AutoResetEvent::AutoResetEvent() noexcept : fEvent(CreateEventW(nullptr, FALSE, FALSE, nullptr)) {}
AutoResetEvent::~AutoResetEvent() {
  if (fEvent != nullptr) CloseHandle(fEvent);
}
void AutoResetEvent::Signal() noexcept { SetEvent(Demand(fEvent)); }
void AutoResetEvent::Wait() noexcept { WaitForSingleObject(Demand(fEvent), INFINITE); }
void AutoResetEvent::SignalAndWait(AutoResetEvent& toSignal, AutoResetEvent& toWait) noexcept {
  SignalObjectAndWait(Demand(toSignal.fEvent), Demand(toWait.fEvent), INFINITE, FALSE);
}

}  // namespace threads_detail

// --- TarnSemaphore and TarnBinarySemaphore: system semaphores ---

namespace {

// A system semaphore handle; null when creation failed.
struct SemaphoreHandle {
  HANDLE handle;
  SemaphoreHandle(LONG initial, LONG maximum) noexcept
      : handle(CreateSemaphoreW(nullptr, initial, maximum, nullptr)) {}
  ~SemaphoreHandle() {
    if (handle != nullptr) CloseHandle(handle);
  }
  SemaphoreHandle(const SemaphoreHandle&) = delete;
  SemaphoreHandle& operator=(const SemaphoreHandle&) = delete;
};

template <class T, class... Args>
T* NewSemaphore(Args... args) noexcept {
  T* semaphore = new (std::nothrow) T(args...);
  if (semaphore != nullptr && semaphore->handle == nullptr) {
    delete semaphore;
    semaphore = nullptr;
  }
  return semaphore;
}

}  // namespace

struct TarnSemaphoreImpl : SemaphoreHandle {
  TarnSemaphoreImpl() noexcept : SemaphoreHandle(0, TarnSemaphore::kMaximumCount) {}
};

TarnSemaphore::TarnSemaphore() : fImpl(NewSemaphore<TarnSemaphoreImpl>()) {}
TarnSemaphore::~TarnSemaphore() { delete fImpl; }
void TarnSemaphore::signal() noexcept { ReleaseSemaphore(Demand(fImpl)->handle, 1, nullptr); }
void TarnSemaphore::wait() noexcept { WaitForSingleObject(Demand(fImpl)->handle, INFINITE); }
TarnSemaphore::WakeReason TarnSemaphore::timed_wait(uint32_t microseconds) noexcept {
  const DWORD result = WaitForSingleObject(Demand(fImpl)->handle, microseconds / 1000);
  return result == WAIT_OBJECT_0 ? kSignalled : kTimedOut;
}

struct TarnBinarySemaphoreImpl : SemaphoreHandle {
  explicit TarnBinarySemaphoreImpl(bool signalled) noexcept
      : SemaphoreHandle(signalled ? 1 : 0, 1) {}
};

TarnBinarySemaphore::TarnBinarySemaphore(bool signalled)
    : fState(0), fImpl(NewSemaphore<TarnBinarySemaphoreImpl>(signalled)) {}
TarnBinarySemaphore::~TarnBinarySemaphore() { delete fImpl; }
void TarnBinarySemaphore::Signal() noexcept { ReleaseSemaphore(Demand(fImpl)->handle, 1, nullptr); }
void TarnBinarySemaphore::Wait() noexcept { WaitForSingleObject(Demand(fImpl)->handle, INFINITE); }
TarnBinarySemaphore::WakeReason TarnBinarySemaphore::TimedWait(uint64_t nanoseconds) noexcept {
  const auto milliseconds = static_cast<DWORD>(static_cast<double>(nanoseconds) / 1000000.0);
  const DWORD result = WaitForSingleObject(Demand(fImpl)->handle, milliseconds);
  return result == WAIT_OBJECT_0 ? kSignalled : kTimedOut;
}

// --- TarnConditionVariable: CONDITION_VARIABLE with its own critical section ---

namespace {

class TarnConditionVariableImplWin final : public TarnConditionVariable::Implementation {
 public:
  TarnConditionVariableImplWin() noexcept {
    InitializeConditionVariable(&fCondition);
    InitializeCriticalSection(&fSection);
  }
  ~TarnConditionVariableImplWin() override { DeleteCriticalSection(&fSection); }

  void lock() noexcept override { EnterCriticalSection(&fSection); }
  bool tryLock() noexcept override { return TryEnterCriticalSection(&fSection) != FALSE; }
  void unlock() noexcept override { LeaveCriticalSection(&fSection); }
  void wait() noexcept override { SleepConditionVariableCS(&fCondition, &fSection, INFINITE); }
  bool timedWait(uint64_t nanoseconds) noexcept override {
    const auto milliseconds = static_cast<DWORD>(nanoseconds / 1000000);
    if (SleepConditionVariableCS(&fCondition, &fSection, milliseconds)) return false;
    return GetLastError() == ERROR_TIMEOUT;
  }
  void signal() noexcept override { WakeConditionVariable(&fCondition); }
  void broadcast() noexcept override { WakeAllConditionVariable(&fCondition); }

 private:
  CONDITION_VARIABLE fCondition;
  CRITICAL_SECTION fSection;
};

}  // namespace

TarnConditionVariable::Implementation* TarnConditionVariable::CreateImplementation() {
  return new (std::nothrow) TarnConditionVariableImplWin;
}

}  // namespace tarn
