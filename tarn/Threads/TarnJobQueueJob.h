#pragma once

// Jobs of a job thread and the promise through which a poster learns the
// outcome.
//
// A TarnJobQueueJob is run (Run) or, when its thread shuts down without
// running it, cancelled (Cancel). TarnJobQueueTypedJob<R> wraps a callable
// returning R and fulfils a TarnPromise<R> either way:
//
//   auto job = std::make_shared<TarnJobQueueTypedJob<int>>([] { return 42; });
//   auto promise = job->GetPromise();
//   jobThread.GetJobQueue()->push(job);
//   int v = promise->Get();      // blocks; throws "Job cancelled" if dropped
//
// A promise is completed exactly once, from the thread that runs or cancels
// the job; any number of threads may wait on it.

#include <atomic>
#include <functional>
#include <memory>
#include <optional>
#include <type_traits>
#include <utility>

#include "tarn/Errors/Fail.h"
#include "tarn/Errors/TarnError.h"
#include "tarn/Threads/TarnSemaphore.h"

namespace tarn {

// The error of a job dropped without running: kind and system "TarnThreads",
// subsystem "TarnJobQueue", code 0, text "Job cancelled".
[[nodiscard]] TarnError JobCancelledError();
// True for an error equal to JobCancelledError().
[[nodiscard]] bool IsJobCancelled(const TarnError& error) noexcept;

// Shared state of a job's outcome: the succeeded flag, the error of a failed
// or cancelled job, the value of a succeeded one, and the semaphore that is
// signalled on completion.
template <class R>
class TarnPromise {
 public:
  TarnPromise() = default;
  TarnPromise(const TarnPromise&) = delete;
  TarnPromise& operator=(const TarnPromise&) = delete;
  ~TarnPromise() = default;

  // Blocks until the job has run or was cancelled.
  void Wait() noexcept {
    if (fDone.load(std::memory_order_acquire)) return;
    fSignal.Wait();
    fSignal.Signal();  // let every other waiter through too
  }
  // Waits up to nanoseconds; true when the job has completed.
  [[nodiscard]] bool TimedWait(uint64_t nanoseconds) noexcept {
    if (fDone.load(std::memory_order_acquire)) return true;
    if (fSignal.TimedWait(nanoseconds) != TarnBinarySemaphore::kSignalled) return false;
    fSignal.Signal();
    return true;
  }
  [[nodiscard]] bool IsDone() const noexcept { return fDone.load(std::memory_order_acquire); }

  // Waits, then returns the job's result or throws its error ("Job
  // cancelled" for a dropped job, or the TarnError the job raised).
  R Get() {
    Wait();
    if (!fSucceeded) throw GetError();
    if constexpr (!std::is_void_v<R>) return *fValue;
  }
  // After completion: true when the job ran to its end.
  [[nodiscard]] bool Succeeded() const noexcept { return fSucceeded; }
  // After completion of a failed or cancelled job: its error (the
  // out-of-memory error when there was no memory left to keep it). Before
  // completion, and after success, a default TarnError.
  [[nodiscard]] const TarnError& GetError() const noexcept {
    static const TarnError kNone;
    static const TarnError kOutOfMemory(kMemFullErr);
    if (fError) return *fError;
    return fDone.load(std::memory_order_acquire) && !fSucceeded ? kOutOfMemory : kNone;
  }

  // Completion, called once by the job.
  template <class... V>
  void Fulfil(V&&... value) {
    if constexpr (!std::is_void_v<R>) fValue.emplace(std::forward<V>(value)...);
    fSucceeded = true;
    Complete();
  }
  void Fail(const TarnError& error) noexcept {
    try {
      fError = std::make_unique<TarnError>(error);
    } catch (...) {
      // GetError reports the lack of memory instead.
    }
    fSucceeded = false;
    Complete();
  }

 private:
  struct Nothing {};
  void Complete() noexcept {
    fDone.store(true, std::memory_order_release);
    fSignal.Signal();
  }

  // Written once by the completing thread before fDone is set. The error
  // lives apart: it is large, and most jobs never need it.
  bool fSucceeded = false;
  std::unique_ptr<TarnError> fError;
  std::optional<std::conditional_t<std::is_void_v<R>, Nothing, R>> fValue;
  std::atomic<bool> fDone{false};
  TarnBinarySemaphore fSignal{false};
};

// One unit of work for a job thread.
class TarnJobQueueJob {
 public:
  TarnJobQueueJob() = default;
  TarnJobQueueJob(const TarnJobQueueJob&) = default;
  TarnJobQueueJob& operator=(const TarnJobQueueJob&) = default;
  virtual ~TarnJobQueueJob() = default;

  // Does the work (on the thread that took the job).
  virtual void Run() = 0;
  // Reports that the job will never run.
  virtual void Cancel() = 0;
};

// A job that calls a callable and reports through a TarnPromise<R>. A
// TarnError raised by the callable fails the promise with that error and is
// rethrown to the job thread (which prints it); any other exception fails it
// with the error GetCurrentError makes of it, and is rethrown as well.
template <class R>
class TarnJobQueueTypedJob : public TarnJobQueueJob {
 public:
  explicit TarnJobQueueTypedJob(std::function<R()> function)
      : fFunction(std::move(function)), fPromise(std::make_shared<TarnPromise<R>>()) {}
  TarnJobQueueTypedJob(const TarnJobQueueTypedJob&) = default;
  TarnJobQueueTypedJob& operator=(const TarnJobQueueTypedJob&) = default;
  ~TarnJobQueueTypedJob() override = default;

  [[nodiscard]] const std::shared_ptr<TarnPromise<R>>& GetPromise() const noexcept {
    return fPromise;
  }

  void Run() override {
    try {
      if constexpr (std::is_void_v<R>) {
        fFunction();
        fPromise->Fulfil();
      } else {
        fPromise->Fulfil(fFunction());
      }
    } catch (...) {
      fPromise->Fail(GetCurrentError());
      throw;
    }
  }
  void Cancel() override { fPromise->Fail(JobCancelledError()); }

 private:
  std::function<R()> fFunction;
  std::shared_ptr<TarnPromise<R>> fPromise;
};

// Makes a typed job of a callable; the promise is reached through
// GetPromise().
template <class F>
auto MakeJob(F&& function) {
  using R = std::invoke_result_t<std::decay_t<F>&>;
  return std::make_shared<TarnJobQueueTypedJob<R>>(std::function<R()>(std::forward<F>(function)));
}

}  // namespace tarn
