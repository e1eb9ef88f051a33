// POSIX system primitives behind the lock and semaphore handles: pthread
// mutexes, reader/writer locks, and a counted signal (mutex + condition
// variable on the monotonic clock) that serves as semaphore and auto-reset
// event. On Linux the binary semaphore is a futex word instead; elsewhere it
// is a counted signal of at most one unit.
#include <pthread.h>
#include <time.h>
#ifdef __linux__
#include <linux/futex.h>
#include <sys/syscall.h>
#include <unistd.h>
#endif

#include <cerrno>
#include <cstdint>
#include <new>

#include "tarn/Threads/TarnConditionVariable.h"
#include "tarn/Threads/TarnMutex.h"
#include "tarn/Threads/TarnSemaphore.h"
#include "tarn/Threads/TarnThreadsImpl.h"

namespace tarn {

using threads_detail::Demand;

namespace {

timespec DeadlineAfterMilliseconds(uint64_t milliseconds) noexcept {
  timespec now{};
  clock_gettime(CLOCK_MONOTONIC, &now);
  const uint64_t nanoseconds = static_cast<uint64_t>(now.tv_nsec) + (milliseconds % 1000) * 1000000;
  timespec deadline{};
  deadline.tv_sec =
      now.tv_sec + static_cast<time_t>(milliseconds / 1000 + nanoseconds / 1000000000);
  deadline.tv_nsec = static_cast<long>(nanoseconds % 1000000000);
  return deadline;
}

bool InitMonotonicCondition(pthread_cond_t* condition) noexcept {
  pthread_condattr_t attributes;
  if (pthread_condattr_init(&attributes) != 0) return false;
  pthread_condattr_setclock(&attributes, CLOCK_MONOTONIC);
  const bool ok = pthread_cond_init(condition, &attributes) == 0;
  pthread_condattr_destroy(&attributes);
  return ok;
}

// A count of units between 0 and a maximum; a post past the maximum is
// lost. Units persist until taken, so a post can never be missed by a later
// wait.
class CountedSignal {
 public:
  CountedSignal(int32_t initial, int32_t maximum) noexcept : fCount(initial), fMaximum(maximum) {
    fValid = pthread_mutex_init(&fMutex, nullptr) == 0;
    if (fValid && !InitMonotonicCondition(&fCondition)) {
      pthread_mutex_destroy(&fMutex);
      fValid = false;
    }
  }
  ~CountedSignal() {
    if (fValid) {
      pthread_cond_destroy(&fCondition);
      pthread_mutex_destroy(&fMutex);
    }
  }
  CountedSignal(const CountedSignal&) = delete;
  CountedSignal& operator=(const CountedSignal&) = delete;

  [[nodiscard]] bool IsValid() const noexcept { return fValid; }

  void Post() noexcept {
    pthread_mutex_lock(&fMutex);
    const bool posted = fCount < fMaximum;
    if (posted) ++fCount;
    pthread_mutex_unlock(&fMutex);
    if (posted) pthread_cond_signal(&fCondition);
  }

  void Wait() noexcept {
    pthread_mutex_lock(&fMutex);
    while (fCount == 0) pthread_cond_wait(&fCondition, &fMutex);
    --fCount;
    pthread_mutex_unlock(&fMutex);
  }

  // True when a unit was taken within the given whole milliseconds.
  bool TimedWait(uint64_t milliseconds) noexcept {
    const timespec deadline = DeadlineAfterMilliseconds(milliseconds);
    pthread_mutex_lock(&fMutex);
    int result = 0;
    while (fCount == 0 && result != ETIMEDOUT && milliseconds != 0) {
      result = pthread_cond_timedwait(&fCondition, &fMutex, &deadline);
    }
    const bool taken = fCount > 0;
    if (taken) --fCount;
    pthread_mutex_unlock(&fMutex);
    return taken;
  }

 private:
  pthread_mutex_t fMutex;
  pthread_cond_t fCondition;
  int32_t fCount;
  const int32_t fMaximum;
  bool fValid;
};

template <class T, class... Args>
T* NewValid(Args... args) noexcept {
  T* object = new (std::nothrow) T(args...);
  if (object != nullptr && !object->IsValid()) {
    delete object;
    object = nullptr;
  }
  return object;
}

}  // namespace

// --- TarnCoreMutex: a pthread mutex, recursive like a critical section ---

struct TarnCoreMutexImpl {
  pthread_mutex_t mutex;
  bool valid = false;

  TarnCoreMutexImpl() noexcept {
    pthread_mutexattr_t attributes;
    if (pthread_mutexattr_init(&attributes) != 0) return;
    pthread_mutexattr_settype(&attributes, PTHREAD_MUTEX_RECURSIVE);
    valid = pthread_mutex_init(&mutex, &attributes) == 0;
    pthread_mutexattr_destroy(&attributes);
  }
  ~TarnCoreMutexImpl() {
    if (valid) pthread_mutex_destroy(&mutex);
  }
  [[nodiscard]] bool IsValid() const noexcept { return valid; }
};

TarnCoreMutex::TarnCoreMutex() : fImpl(NewValid<TarnCoreMutexImpl>()) {}
TarnCoreMutex::~TarnCoreMutex() { delete fImpl; }
void TarnCoreMutex::lock() const noexcept { pthread_mutex_lock(&Demand(fImpl)->mutex); }
bool TarnCoreMutex::tryLock() const noexcept {
  return pthread_mutex_trylock(&Demand(fImpl)->mutex) == 0;
}
void TarnCoreMutex::unlock() const noexcept { pthread_mutex_unlock(&Demand(fImpl)->mutex); }

// --- SharedLock: a pthread reader/writer lock ---

namespace threads_detail {

namespace {
pthread_rwlock_t* AsRWLock(void* lock) noexcept { return static_cast<pthread_rwlock_t*>(lock); }
}  // namespace

SharedLock::SharedLock() noexcept : fLock(new (std::nothrow) pthread_rwlock_t) {
  if (fLock != nullptr && pthread_rwlock_init(AsRWLock(fLock), nullptr) != 0) {
    delete AsRWLock(fLock);
    fLock = nullptr;
  }
}
SharedLock::~SharedLock() {
  if (fLock != nullptr) {
    pthread_rwlock_destroy(AsRWLock(fLock));
    delete AsRWLock(fLock);
  }
}
void SharedLock::LockShared() noexcept { pthread_rwlock_rdlock(AsRWLock(fLock)); }
bool SharedLock::TryLockShared() noexcept { return pthread_rwlock_tryrdlock(AsRWLock(fLock)) == 0; }
void SharedLock::UnlockShared() noexcept { pthread_rwlock_unlock(AsRWLock(fLock)); }
void SharedLock::LockExclusive() noexcept { pthread_rwlock_wrlock(AsRWLock(fLock)); }
bool SharedLock::TryLockExclusive() noexcept {
  return pthread_rwlock_trywrlock(AsRWLock(fLock)) == 0;
}
void SharedLock::UnlockExclusive() noexcept { pthread_rwlock_unlock(AsRWLock(fLock)); }

// --- AutoResetEvent: a counted signal of at most one unit ---

namespace {
CountedSignal* AsSignal(void* event) noexcept { return static_cast<CountedSignal*>(event); }
}  // namespace

AutoResetEvent::AutoResetEvent() noexcept : fEvent(NewValid<CountedSignal>(0, 1)) {}
AutoResetEvent::~AutoResetEvent() { delete AsSignal(fEvent); }
void AutoResetEvent::Signal() noexcept { Demand(AsSignal(fEvent))->Post(); }
void AutoResetEvent::Wait() noexcept { Demand(AsSignal(fEvent))->Wait(); }
void AutoResetEvent::SignalAndWait(AutoResetEvent& toSignal, AutoResetEvent& toWait) noexcept {
  // The signal persists until taken, so signalling first and then waiting
  // loses nothing even though the two steps are not one system call.
  toSignal.Signal();
  toWait.Wait();
}

}  // namespace threads_detail

// --- TarnSemaphore and TarnBinarySemaphore ---

struct TarnSemaphoreImpl : CountedSignal {
  TarnSemaphoreImpl() noexcept : CountedSignal(0, TarnSemaphore::kMaximumCount) {}
};

TarnSemaphore::TarnSemaphore() : fImpl(NewValid<TarnSemaphoreImpl>()) {}
TarnSemaphore::~TarnSemaphore() { delete fImpl; }
void TarnSemaphore::signal() noexcept { Demand(fImpl)->Post(); }
void TarnSemaphore::wait() noexcept { Demand(fImpl)->Wait(); }
TarnSemaphore::WakeReason TarnSemaphore::timed_wait(uint32_t microseconds) noexcept {
  return Demand(fImpl)->TimedWait(microseconds / 1000) ? kSignalled : kTimedOut;
}

#ifdef __linux__

// The binary semaphore sleeps on its state word (see the header): taking an
// available unit and signalling without sleepers are single compare-and-swap
// operations; only a thread that finds no unit enters the kernel, after
// counting itself as a sleeper, and a signal wakes one sleeper when it sees
// any. All ordering between signaller and waiter comes from the atomic
// operations on the word; the futex calls only put threads to sleep and wake
// them (a wake-up may be spurious or go to a thread that then finds the unit
// gone; each sleeper re-checks the word).

namespace {

constexpr uint32_t kUnit = 1;
constexpr uint32_t kSleeper = 2;

static_assert(sizeof(std::atomic<uint32_t>) == sizeof(uint32_t) &&
              std::atomic<uint32_t>::is_always_lock_free);

uint32_t* FutexWord(std::atomic<uint32_t>& state) noexcept {
  return reinterpret_cast<uint32_t*>(&state);
}

// Sleeps while the word holds expected, at most until the absolute
// monotonic deadline (none when null); true when the deadline passed.
bool FutexWait(std::atomic<uint32_t>& state, uint32_t expected, const timespec* deadline) noexcept {
  const long result = syscall(SYS_futex, FutexWord(state), FUTEX_WAIT_BITSET | FUTEX_PRIVATE_FLAG,
                              expected, deadline, nullptr, FUTEX_BITSET_MATCH_ANY);
  return result != 0 && errno == ETIMEDOUT;
}

void FutexWakeOne(std::atomic<uint32_t>& state) noexcept {
  syscall(SYS_futex, FutexWord(state), FUTEX_WAKE | FUTEX_PRIVATE_FLAG, 1, nullptr, nullptr, 0);
}

// Takes the unit if it is there; s is the last value seen and is refreshed.
bool TryTakeUnit(std::atomic<uint32_t>& state, uint32_t& s, uint32_t leaving) noexcept {
  while ((s & kUnit) != 0) {
    if (state.compare_exchange_weak(s, (s - leaving) & ~kUnit, std::memory_order_acquire,
                                    std::memory_order_relaxed)) {
      return true;
    }
  }
  return false;
}

// Takes the unit, sleeping until it comes or the deadline (if any) passes;
// true when taken.
bool TakeUnit(std::atomic<uint32_t>& state, const timespec* deadline) noexcept {
  uint32_t s = state.load(std::memory_order_relaxed);
  for (;;) {
    if (TryTakeUnit(state, s, 0)) return true;
    if (state.compare_exchange_weak(s, s + kSleeper, std::memory_order_relaxed)) break;
  }
  s += kSleeper;
  for (;;) {
    const bool timedOut = FutexWait(state, s, deadline);
    s = state.load(std::memory_order_relaxed);
    if (TryTakeUnit(state, s, kSleeper)) return true;
    if (timedOut) {
      while (!state.compare_exchange_weak(s, s - kSleeper, std::memory_order_relaxed)) {
        if (TryTakeUnit(state, s, kSleeper)) return true;
      }
      return false;
    }
  }
}

}  // namespace

TarnBinarySemaphore::TarnBinarySemaphore(bool signalled)
    : fState(signalled ? kUnit : 0), fImpl(nullptr) {}
TarnBinarySemaphore::~TarnBinarySemaphore() = default;

void TarnBinarySemaphore::Signal() noexcept {
  uint32_t s = fState.load(std::memory_order_relaxed);
  do {
    if ((s & kUnit) != 0) return;  // at most one unit
  } while (!fState.compare_exchange_weak(s, s | kUnit, std::memory_order_release,
                                         std::memory_order_relaxed));
  if (s >= kSleeper) FutexWakeOne(fState);
}

void TarnBinarySemaphore::Wait() noexcept { (void)TakeUnit(fState, nullptr); }

TarnBinarySemaphore::WakeReason TarnBinarySemaphore::TimedWait(uint64_t nanoseconds) noexcept {
  const auto milliseconds = static_cast<uint64_t>(static_cast<double>(nanoseconds) / 1000000.0);
  uint32_t s = fState.load(std::memory_order_relaxed);
  if (TryTakeUnit(fState, s, 0)) return kSignalled;
  if (milliseconds == 0) return kTimedOut;
  const timespec deadline = DeadlineAfterMilliseconds(milliseconds);
  return TakeUnit(fState, &deadline) ? kSignalled : kTimedOut;
}

#else

struct TarnBinarySemaphoreImpl : CountedSignal {
  explicit TarnBinarySemaphoreImpl(bool signalled) noexcept : CountedSignal(signalled ? 1 : 0, 1) {}
};

TarnBinarySemaphore::TarnBinarySemaphore(bool signalled)
    : fState(0), fImpl(NewValid<TarnBinarySemaphoreImpl>(signalled)) {}
TarnBinarySemaphore::~TarnBinarySemaphore() { delete fImpl; }
void TarnBinarySemaphore::Signal() noexcept { Demand(fImpl)->Post(); }
void TarnBinarySemaphore::Wait() noexcept { Demand(fImpl)->Wait(); }
TarnBinarySemaphore::WakeReason TarnBinarySemaphore::TimedWait(uint64_t nanoseconds) noexcept {
  const auto milliseconds = static_cast<uint64_t>(static_cast<double>(nanoseconds) / 1000000.0);
  return Demand(fImpl)->TimedWait(milliseconds) ? kSignalled : kTimedOut;
}

#endif

// --- TarnConditionVariable ---

namespace {

class ConditionVariablePosix final : public TarnConditionVariable::Implementation {
 public:
  ConditionVariablePosix() noexcept {
    fValid = pthread_mutex_init(&fMutex, nullptr) == 0;
    if (fValid && !InitMonotonicCondition(&fCondition)) {
      pthread_mutex_destroy(&fMutex);
      fValid = false;
    }
  }
  ~ConditionVariablePosix() override {
    if (fValid) {
      pthread_cond_destroy(&fCondition);
      pthread_mutex_destroy(&fMutex);
    }
  }
  [[nodiscard]] bool IsValid() const noexcept { return fValid; }

  void lock() noexcept override { pthread_mutex_lock(&fMutex); }
  bool tryLock() noexcept override { return pthread_mutex_trylock(&fMutex) == 0; }
  void unlock() noexcept override { pthread_mutex_unlock(&fMutex); }
  void wait() noexcept override { pthread_cond_wait(&fCondition, &fMutex); }
  bool timedWait(uint64_t nanoseconds) noexcept override {
    const timespec deadline = DeadlineAfterMilliseconds(nanoseconds / 1000000);
    return pthread_cond_timedwait(&fCondition, &fMutex, &deadline) == ETIMEDOUT;
  }
  void signal() noexcept override { pthread_cond_signal(&fCondition); }
  void broadcast() noexcept override { pthread_cond_broadcast(&fCondition); }

 private:
  pthread_mutex_t fMutex;
  pthread_cond_t fCondition;
  bool fValid;
};

}  // namespace

TarnConditionVariable::Implementation* TarnConditionVariable::CreateImplementation() {
  return NewValid<ConditionVariablePosix>();
}

}  // namespace tarn
