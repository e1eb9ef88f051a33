// A condition variable that carries its own mutex: lock() the object, test
// the condition, wait() (which releases the mutex while waiting and takes it
// again before returning), unlock(). signal() wakes one waiter, broadcast()
// all; both may be called with or without the mutex held. Waits may wake
// spuriously, so callers re-test their condition in a loop.
//
//   cv.lock();
//   while (!ready) cv.wait();
//   cv.unlock();
//
// Nothing throws; a missing implementation is an assertion failure.
#pragma once

#include <cstdint>
#include <memory>

namespace tarn {

class TarnConditionVariable {
 public:
  class Implementation {
   public:
    virtual void lock() noexcept = 0;
    virtual bool tryLock() noexcept = 0;
    virtual void unlock() noexcept = 0;
    virtual void wait() noexcept = 0;
    virtual bool timedWait(uint64_t nanoseconds) noexcept = 0;  // true when timed out
    virtual void signal() noexcept = 0;
    virtual void broadcast() noexcept = 0;
    virtual ~Implementation() = default;
  };

  TarnConditionVariable();
  ~TarnConditionVariable();
  TarnConditionVariable(const TarnConditionVariable&) = delete;
  TarnConditionVariable& operator=(const TarnConditionVariable&) = delete;

  void lock() const noexcept;
  [[nodiscard]] bool tryLock() const noexcept;
  void unlock() const noexcept;
  void wait() const noexcept;  // with the mutex held
  // With the mutex held; waits at most nanoseconds / 1,000,000 whole
  // milliseconds. True when it timed out.
  bool timedWait(uint64_t nanoseconds) const noexcept;
  void signal() const noexcept;
  void broadcast() const noexcept;

 private:
  static Implementation* CreateImplementation();  // per platform; null on failure
  Implementation* fImpl;
};

}  // namespace tarn
