#include "tarn/Threads/TarnJobThread.h"

#include <atomic>
#include <cstdio>
#include <string>

namespace tarn {

namespace {

TarnError ThreadsError(const char* subsystem, const char* text) {
  return TarnError("TarnThreads", "TarnThreads", subsystem, 0, text);
}

}  // namespace

void FailBlockingQueueInterrupted() { throw ThreadsError("blocking_queue", "Interrupted"); }

bool IsBlockingQueueInterrupted(const TarnError& error) noexcept {
  return error.GetIntErrorCode() == 0 && error.GetSubsystem().view() == "blocking_queue" &&
         error.GetKind().view() == "TarnThreads" &&
         error.GetOptionalErrorString().view() == "Interrupted";
}

TarnError JobCancelledError() { return ThreadsError("TarnJobQueue", "Job cancelled"); }

bool IsJobCancelled(const TarnError& error) noexcept {
  return error.GetIntErrorCode() == 0 && error.GetSubsystem().view() == "TarnJobQueue" &&
         error.GetKind().view() == "TarnThreads" &&
         error.GetOptionalErrorString().view() == "Job cancelled";
}

void PrintUnhandledException(const TarnError& error) noexcept {
  try {
    std::string line = "Unhandled exception: ";
    line += error.GetKind().c_str();
    line += ' ';
    line += error.GetSystem().c_str();
    line += ' ';
    line += error.GetSubsystem().c_str();
    line += ' ';
    line += std::to_string(error.GetIntErrorCode());
    if (!error.GetOptionalErrorString().empty()) {
      line += ' ';
      line += error.GetOptionalErrorString().c_str();
    }
    line += '\n';
    std::fputs(line.c_str(), stderr);
    std::fflush(stderr);
  } catch (...) {
    // Out of memory while formatting: nothing more can be reported.
  }
}

void TarnJobThreadDelegate::WaitAndRunJob(TarnJobQueue& queue) { queue.pop()->Run(); }

// What the job thread runs: the delegate's loop, then the drain.
class TarnJobThread::Routine final : public TarnThreadRoutine {
 public:
  Routine(std::shared_ptr<TarnJobQueue> queue, std::shared_ptr<TarnJobThreadDelegate> delegate,
          bool runRemainingJobsAtExit)
      : fQueue(std::move(queue)),
        fDelegate(std::move(delegate)),
        fRunRemainingJobsAtExit(runRemainingJobsAtExit) {}

  void Run() override {
    fDelegate->ThreadStarted();
    while (!IsTerminated() && !fStopFromInside.load(std::memory_order_acquire)) {
      Guarded([&] { fDelegate->WaitAndRunJob(*fQueue); });
    }
    std::shared_ptr<TarnJobQueueJob> job;
    while (fQueue->count() != 0 && fQueue->try_pop(job)) {
      if (fRunRemainingJobsAtExit) {
        Guarded([&] { job->Run(); });
      } else {
        job->Cancel();
      }
      job.reset();
    }
    fDelegate->ThreadEnding();
  }

  void StopFromInside() noexcept { fStopFromInside.store(true, std::memory_order_release); }

 protected:
  void OnTerminate() override { fQueue->interrupt(); }

 private:
  // Runs step, printing what escapes it; the interruption that ends the wait
  // at termination is the normal way out and is not printed.
  template <class Step>
  static void Guarded(Step&& step) noexcept {
    try {
      step();
    } catch (const TarnError& e) {
      if (!IsBlockingQueueInterrupted(e)) PrintUnhandledException(e);
    } catch (...) {
      try {
        PrintUnhandledException(GetCurrentError());
      } catch (...) {
      }
    }
  }

  std::shared_ptr<TarnJobQueue> fQueue;
  std::shared_ptr<TarnJobThreadDelegate> fDelegate;
  const bool fRunRemainingJobsAtExit;
  std::atomic<bool> fStopFromInside{false};
};

TarnJobThread::TarnJobThread(const UString& name, int32_t flags)
    : TarnJobThread(std::make_shared<TarnJobThreadDelegate>(), flags, name) {}

TarnJobThread::TarnJobThread(std::shared_ptr<TarnJobThreadDelegate> delegate, int32_t flags,
                             const UString& name)
    : fQueue(std::make_shared<TarnJobQueue>((flags & kWakeOnlyWhenWaiting) != 0)),
      fRoutine(std::make_shared<Routine>(fQueue, std::move(delegate),
                                         (flags & kRunRemainingJobsAtExit) != 0)),
      fThread(fRoutine, name),
      fDoNotWaitAtTerminate((flags & kDoNotWaitAtTerminate) != 0) {}

TarnJobThread::~TarnJobThread() {
  if (!fThread.IsTerminated()) Terminate();
}

void TarnJobThread::Start() { fThread.Start(); }

void TarnJobThread::SetPriority(Priority priority) noexcept {
  TarnThreadID id = fThread.GetID();
  switch (priority) {
    case kHighPriority:
      id.SetThreadPriority(TarnThreadID::kPriorityHighest);
      break;
    case kRealtimePriority:
      id.SetThreadPriority(TarnThreadID::kPriorityRealtimeNormal);
      break;
    default:
      break;
  }
}

void TarnJobThread::Terminate() {
  if (IsCurrent()) {
    fRoutine->StopFromInside();
  } else if (fDoNotWaitAtTerminate) {
    fThread.TerminateAndContinue();
  } else {
    fThread.Terminate();
  }
}

}  // namespace tarn
