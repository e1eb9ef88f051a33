// Semaphores and flags: TarnSemaphore (counting, at most 100 outstanding
// units), TarnBinarySemaphore (at most one unit), WithBinarySemaphore (scope
// guard), and the never-blocking CountingSemaphore and TestAndSetSemaphore.
//
// The blocking classes are handles over a private implementation (on Linux
// TarnBinarySemaphore needs none: it sleeps on its own state word); any
// thread may signal, any thread may wait. Nothing here throws or reports
// errors: a unit signalled past the maximum is silently lost, and a timed
// wait that fails for any reason reports kTimedOut. Using an object whose
// implementation could not be created is an assertion failure ("px != 0").
#pragma once

#include <atomic>
#include <cstdint>

#include "tarn/Threads/TarnAtomic.h"

namespace tarn {

struct TarnSemaphoreImpl;
struct TarnBinarySemaphoreImpl;

class TarnSemaphore {
 public:
  enum WakeReason : int32_t { kSignalled = 0, kTimedOut = 1 };
  static constexpr int32_t kMaximumCount = 100;

  TarnSemaphore();  // count 0
  ~TarnSemaphore();
  TarnSemaphore(const TarnSemaphore&) = delete;
  TarnSemaphore& operator=(const TarnSemaphore&) = delete;

  void signal() noexcept;  // releases one unit unless 100 are outstanding
  void wait() noexcept;    // blocks until a unit can be taken
  // Waits at most microseconds / 1000 whole milliseconds (so less than 1000
  // microseconds is a poll).
  WakeReason timed_wait(uint32_t microseconds) noexcept;

 private:
  TarnSemaphoreImpl* fImpl;
};

class TarnBinarySemaphore {
 public:
  enum WakeReason : int32_t { kSignalled = 0, kTimedOut = 1 };

  explicit TarnBinarySemaphore(bool signalled = false);
  ~TarnBinarySemaphore();
  TarnBinarySemaphore(const TarnBinarySemaphore&) = delete;
  TarnBinarySemaphore& operator=(const TarnBinarySemaphore&) = delete;

  // A second Signal before a Wait is lost. Without a sleeping waiter this is
  // one atomic operation on Linux (no system call).
  void Signal() noexcept;
  // Takes the unit, sleeping until there is one. Takes it without a system
  // call on Linux when it is there already.
  void Wait() noexcept;
  // Waits at most nanoseconds / 1,000,000 whole milliseconds.
  WakeReason TimedWait(uint64_t nanoseconds) noexcept;

 private:
  // Where the platform can sleep on an address (Linux futexes), the whole
  // state: bit 0 is the unit, the bits above count the threads asleep in a
  // wait (state >> 1 == sleepers). Unused where fImpl holds a system object.
  std::atomic<uint32_t> fState;
  // The system object where the platform cannot sleep on an address.
  [[maybe_unused]] TarnBinarySemaphoreImpl* fImpl;
};

// Waits on the semaphore for the lifetime of the guard, signals it after.
class WithBinarySemaphore {
 public:
  explicit WithBinarySemaphore(TarnBinarySemaphore& semaphore) noexcept : fSemaphore(semaphore) {
    fSemaphore.Wait();
  }
  ~WithBinarySemaphore() { fSemaphore.Signal(); }
  WithBinarySemaphore(const WithBinarySemaphore&) = delete;
  WithBinarySemaphore& operator=(const WithBinarySemaphore&) = delete;

 private:
  TarnBinarySemaphore& fSemaphore;
};

// An atomic counter; never blocks.
class CountingSemaphore {
 public:
  explicit CountingSemaphore(int32_t value = 0) noexcept : fValue(value) {}
  CountingSemaphore(const CountingSemaphore& other) noexcept : fValue(other.GetValue()) {}
  CountingSemaphore& operator=(const CountingSemaphore& other) noexcept {
    AtomicStore32(&fValue, other.GetValue());
    return *this;
  }
  ~CountingSemaphore() = default;

  [[nodiscard]] int32_t GetValue() const noexcept { return AtomicLoad32(&fValue); }
  void AtomicAdd(int32_t n) noexcept { AtomicAdd32Implementation(&fValue, n); }
  void AtomicSubtract(int32_t n) noexcept { AtomicAdd32Implementation(&fValue, -n); }
  int32_t AtomicSubtractAndReturn(int32_t n) noexcept {  // returns the new value
    return AtomicAddAndReturn32Implementation(&fValue, -n);
  }

 private:
  volatile int32_t fValue;
};

// An atomic flag; never blocks. Clear is a plain store, for the flag's owner.
class TestAndSetSemaphore {
 public:
  TestAndSetSemaphore() noexcept = default;
  ~TestAndSetSemaphore() = default;
  TestAndSetSemaphore(const TestAndSetSemaphore&) = delete;
  TestAndSetSemaphore& operator=(const TestAndSetSemaphore&) = delete;

  [[nodiscard]] bool Test() const noexcept { return AtomicLoad32(&fFlag) != 0; }
  // Sets the flag; true when it was already set.
  bool TestAndSet() noexcept { return AtomicTestAndSet32(&fFlag); }
  void Clear() noexcept { __atomic_store_n(&fFlag, 0, __ATOMIC_RELEASE); }

 private:
  volatile int32_t fFlag = 0;
};

}  // namespace tarn
