#include "tarn/Threads/TarnMainThread.h"

#include <atomic>

#include "tarn/Basics/Singleton.h"
#include "tarn/Threads/CIdleChore.h"
#include "tarn/Threads/TarnMutex.h"

namespace tarn {

namespace {

std::atomic<uint32_t> gInterruptThread{0};

// Scoped lock of a TarnCoreMutex.
class Hold {
 public:
  explicit Hold(const TarnCoreMutex& mutex) noexcept : fMutex(mutex) { fMutex.lock(); }
  Hold(const Hold&) = delete;
  Hold& operator=(const Hold&) = delete;
  ~Hold() { fMutex.unlock(); }

 private:
  const TarnCoreMutex& fMutex;
};

}  // namespace

// Forwards each job from the feeder's queue to the main-thread queue and
// schedules itself as an idle chore; the chore runs the forwarded jobs on the
// main thread. The chore mutex guards the chore's scheduling state, the stop
// mutex the stopping flag; neither is held while a job runs.
class TarnMainThread::Delegate final : public TarnJobThreadDelegate, public CIdleChore {
 public:
  Delegate() = default;
  Delegate(const Delegate&) = delete;
  Delegate& operator=(const Delegate&) = delete;
  ~Delegate() override {
    Stop();
    // The main thread no longer takes from the main-thread queue.
    std::shared_ptr<TarnJobQueueJob> job;
    while (fMainQueue.try_pop(job)) job->Cancel();
  }

  // Feeder thread.
  void WaitAndRunJob(TarnJobQueue& queue) override {
    fMainQueue.push(queue.pop());
    Hold stop(fStopMutex);
    if (!fStopping) Assign();
  }

  // Stops scheduling; waits for a run in progress on the main thread.
  void Stop() noexcept {
    {
      Hold stop(fStopMutex);
      fStopping = true;
    }
    Cancel();
  }

 protected:
  // Main thread.
  void Action() override {
    {
      Hold chore(fChoreMutex);
      Cancel();
      fChoreRunning = true;
    }
    std::shared_ptr<TarnJobQueueJob> job;
    while (fMainQueue.try_pop(job)) {
      try {
        job->Run();
      } catch (...) {
        PrintUnhandledException(GetCurrentError());
      }
      job.reset();
    }
    Hold chore(fChoreMutex);
    if (!fMainQueue.empty()) {
      Hold stop(fStopMutex);
      if (!fStopping) Assign();
    }
    fChoreRunning = false;
  }

 private:
  TarnJobQueue fMainQueue;
  TarnCoreMutex fChoreMutex;
  bool fChoreRunning = false;
  TarnCoreMutex fStopMutex;
  bool fStopping = false;
};

TarnMainThread::TarnMainThread() : TarnMainThread(std::make_shared<Delegate>()) {}

TarnMainThread::TarnMainThread(std::shared_ptr<Delegate> delegate)
    : TarnJobThread(delegate, 0, UString("Main Thread Job Feeder")), fDelegate(delegate) {
  Start();
}

TarnMainThread::~TarnMainThread() {
  fDelegate->Stop();
  Terminate();
}

TarnMainThread& TarnMainThread::Instance() { return Singleton<TarnMainThread>::Instance(); }

void InitInterruptStatus(const TarnThreadID& interruptThread) noexcept {
  RecordCurrentThreadAsMain();
  gInterruptThread.store(interruptThread.GetID());
}

bool InMainThreadOrWorkerThread() noexcept {
  if (IsMainThread()) return true;
  const uint32_t interrupt = gInterruptThread.load();
  return interrupt != 0 && interrupt == TarnThreadID::CurrentThreadRawID();
}

}  // namespace tarn
