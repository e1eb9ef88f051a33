// TarnWorkerThread: one process-wide thread ("TARN Worker Thread") that runs
// actions synchronously on behalf of callers.
//
// DoAction hands an action to the worker and returns when it has finished.
// Callers from any thread are served one at a time, in the order in which
// they take the call lock. An action marked to need it runs between the
// registered SubsidiaryLocker's Lock and Unlock. From the worker itself
// (an action that calls DoAction) or once the worker has been stopped, the
// action runs inline on the caller instead.
//
// Errors: a TarnError thrown by an action (any other exception becomes
// TarnError -50) is kept as the worker's last error and thrown to the
// caller. The last error is sticky: once an action has failed, every later
// DoAction through the worker throws that same error again. Inline runs
// neither use the locker nor capture errors (they propagate directly).
//
//   TarnWorkerThread::Instance().DoAction(&FlushCaches, &cacheSet);
#pragma once

#include <memory>

#include "tarn/Basics/Singleton.h"
#include "tarn/Threads/TarnThreadID.h"

namespace tarn {

class TarnWorkerThreadImpl;

class TarnWorkerThread {
 public:
  class Action {
   public:
    explicit Action(bool useSubsidiaryLocker = false) noexcept
        : fUseSubsidiaryLocker(useSubsidiaryLocker) {}
    virtual ~Action() = default;
    virtual void Do() = 0;

    bool fUseSubsidiaryLocker;
  };

  class SubsidiaryLocker {
   public:
    virtual ~SubsidiaryLocker() = default;
    virtual void Lock() = 0;
    virtual void Unlock() = 0;
  };

  using ActionFunction = void (*)(void* arg);

  // The process-wide worker, created and started on first use (the first
  // caller is registered with the "Pro Audio" class, see Start) and
  // destroyed at unload. Throws the out-of-memory TarnError when it cannot
  // be created.
  [[nodiscard]] static TarnWorkerThread& Instance();

  virtual ~TarnWorkerThread();
  TarnWorkerThread(const TarnWorkerThread&) = delete;
  TarnWorkerThread& operator=(const TarnWorkerThread&) = delete;

  // Runs action on the worker and blocks until it is done; see the opening
  // comment for errors. useSubsidiaryLocker marks the action as needing
  // the locker (as does the action's own flag). A null action does nothing
  // (after Stop) or ends the worker's loop.
  void DoAction(Action* action, bool useSubsidiaryLocker = false);
  void DoAction(ActionFunction function, void* arg, bool useSubsidiaryLocker = false);

  [[nodiscard]] TarnThreadID GetThread() const;
  void setThreadPriority(
      TarnThreadID::ThreadPriority priority,
      const TarnThreadID::RealtimePriorityHints& hints = TarnThreadID::RealtimePriorityHints());
  // Installs the locker used around marked actions (null removes it). Call
  // while no marked action is in flight.
  void registerLocker(SubsidiaryLocker* locker) noexcept;

  // Start creates the thread, waits until it is idle and then sets
  // kPriorityRealtimeHigh through the worker's id, which registers the
  // *calling* thread with "Pro Audio" (the worker keeps normal priority).
  // Stop ends the loop, waits for the thread and forgets its id.
  void Start();
  void Stop();

  // True when the caller should run the action itself: it is the worker, or
  // the worker does not run.
  [[nodiscard]] virtual bool ShouldDoActionImmediate(const TarnThreadID& worker) const;

 protected:
  friend class Singleton<TarnWorkerThread>;
  TarnWorkerThread();  // creates and starts the thread

 private:
  std::unique_ptr<TarnWorkerThreadImpl> fImpl;
};

}  // namespace tarn
