#pragma once

// TarnJobThread: a named thread that takes jobs from its own blocking_queue
// and runs them one at a time, in the order they were queued. How it waits
// for and runs a job is decided by a TarnJobThreadDelegate; the default one
// runs each job on the job thread.
//
//   TarnJobThread t(UString("Loader"), TarnJobThread::kRunRemainingJobsAtExit);
//   t.Start();
//   auto promise = t.Post([] { return Load(); });   // any thread
//   auto value = promise->Get();
//   t.Terminate();
//
// Posting, Wake, HasPendingJobs, IsCurrent and IsTerminated may be called
// from any thread. Start, SetPriority and Terminate belong to the owner (and
// Terminate also to the job thread itself). A TarnError escaping a job is
// printed to standard error as "Unhandled exception: <kind> <system>
// <subsystem> <code> <text>" and the thread carries on. At exit, jobs still
// queued are run (flag bit 0) or cancelled: their promises report "Job
// cancelled". Construction does not start the thread; the owner calls
// Terminate before destroying a started thread (the destructor does it too).

#include <cstdint>
#include <memory>

#include "tarn/String/UString.h"
#include "tarn/Threads/TarnJobQueueJob.h"
#include "tarn/Threads/TarnThread.h"
#include "tarn/Threads/blocking_queue.h"

namespace tarn {

using TarnJobQueue = blocking_queue<std::shared_ptr<TarnJobQueueJob>>;

// Prints error as the "Unhandled exception: " line on standard error.
void PrintUnhandledException(const TarnError& error) noexcept;

// Decides how a job thread waits for and runs its jobs. Called only on the
// job thread.
class TarnJobThreadDelegate {
 public:
  TarnJobThreadDelegate() = default;
  TarnJobThreadDelegate(const TarnJobThreadDelegate&) = default;
  TarnJobThreadDelegate& operator=(const TarnJobThreadDelegate&) = default;
  virtual ~TarnJobThreadDelegate() = default;

  // Once, before the first job.
  virtual void ThreadStarted() {}
  // Waits for one job (queue.pop()) and runs or forwards it. The default runs
  // it here. Throws "Interrupted" when the thread is being terminated.
  virtual void WaitAndRunJob(TarnJobQueue& queue);
  // Once, after the loop and the drain of the remaining jobs.
  virtual void ThreadEnding() {}
};

class TarnJobThread {
 public:
  enum Flags : int32_t {
    kRunRemainingJobsAtExit = 1 << 0,  // else they are cancelled
    kWakeOnlyWhenWaiting = 1 << 1,     // producers signal only a thread that is waiting
    kDoNotWaitAtTerminate = 1 << 2,    // Terminate from another thread returns at once
  };
  // 0 leaves the priority alone; 1 highest; 2 real-time normal (by the
  // platform's rule this registers the calling thread); other values do
  // nothing.
  enum Priority : int32_t { kDefaultPriority = 0, kHighPriority = 1, kRealtimePriority = 2 };

  TarnJobThread(const UString& name, int32_t flags);
  TarnJobThread(std::shared_ptr<TarnJobThreadDelegate> delegate, int32_t flags,
                const UString& name);
  TarnJobThread(const TarnJobThread&) = delete;
  TarnJobThread& operator=(const TarnJobThread&) = delete;
  // Terminates the thread first if it is running.
  virtual ~TarnJobThread();

  void Start();
  // The queue, for posting jobs; it stays valid after Terminate.
  [[nodiscard]] const std::shared_ptr<TarnJobQueue>& GetJobQueue() const noexcept { return fQueue; }
  // Queues a callable as a job and returns its promise.
  template <class F>
  auto Post(F&& function) {
    auto job = MakeJob(std::forward<F>(function));
    auto promise = job->GetPromise();
    fQueue->push(std::move(job));
    return promise;
  }

  [[nodiscard]] bool HasPendingJobs() const noexcept { return fQueue->count() != 0; }
  [[nodiscard]] bool IsCurrent() const noexcept { return fThread.GetID().IsCurrent(); }
  [[nodiscard]] bool IsTerminated() const noexcept { return fThread.IsTerminated(); }
  // Makes the waiting thread look at its queue once more.
  void Wake() noexcept { fQueue->wake(); }
  void SetPriority(Priority priority) noexcept;

  // From the job thread: the loop ends after the current job. From another
  // thread: requests the stop, interrupts the wait and, unless
  // kDoNotWaitAtTerminate, waits until the thread has ended.
  void Terminate();

 private:
  class Routine;

  std::shared_ptr<TarnJobQueue> fQueue;
  std::shared_ptr<Routine> fRoutine;
  TarnThread fThread;
  bool fDoNotWaitAtTerminate;
};

}  // namespace tarn
