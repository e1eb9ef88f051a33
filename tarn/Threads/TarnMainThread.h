#pragma once

// TarnMainThread: the process-wide job thread "Main Thread Job Feeder". Jobs
// posted to it run on the host's main thread: the feeder takes each job from
// its queue and hands it over through an idle chore, which the host's main
// thread runs when idle (RunIdleChores, see CIdleChore.h).
//
//   auto done = TarnMainThread::Instance().Post([] { UpdateMenus(); });
//   done->Wait();   // never from the main thread itself: it would wait forever
//
// Built and started on first use of Instance(); destroyed at unload, when
// jobs not yet handed over are cancelled ("Job cancelled") and the feeder is
// waited for. Posting is allowed from any thread.

#include "tarn/Threads/TarnJobThread.h"
#include "tarn/Threads/TarnThreadID.h"

namespace tarn {

template <class T>
class Singleton;

class TarnMainThread : public TarnJobThread {
 public:
  TarnMainThread(const TarnMainThread&) = delete;
  TarnMainThread& operator=(const TarnMainThread&) = delete;
  ~TarnMainThread() override;

  [[nodiscard]] static TarnMainThread& Instance();

 private:
  friend class Singleton<TarnMainThread>;
  class Delegate;
  TarnMainThread();
  explicit TarnMainThread(std::shared_ptr<Delegate> delegate);

  std::shared_ptr<Delegate> fDelegate;
};

// Records the calling thread as the main thread and interruptThread as the
// interrupt thread.
void InitInterruptStatus(const TarnThreadID& interruptThread) noexcept;
// True on the recorded main thread or the recorded interrupt thread.
[[nodiscard]] bool InMainThreadOrWorkerThread() noexcept;

}  // namespace tarn
