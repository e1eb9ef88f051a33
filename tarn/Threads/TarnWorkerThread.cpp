// The process-wide worker thread: a loop that hands actions over through two
// auto-reset events, one caller at a time.
#include "tarn/Threads/TarnWorkerThread.h"

#include <atomic>
#include <new>

#include "tarn/Errors/Fail.h"
#include "tarn/Errors/TarnError.h"
#include "tarn/Threads/TarnMutex.h"
#include "tarn/Threads/TarnThreadsImpl.h"

namespace tarn {

class TarnWorkerThreadImpl {
 public:
  explicit TarnWorkerThreadImpl(TarnWorkerThread* owner) noexcept : fOwner(owner) {}

  [[nodiscard]] bool IsValid() const noexcept { return fGo.IsValid() && fDone.IsValid(); }

  static void* Loop(void* rawImpl);
  // Hands action (null ends the loop) to the worker and waits until it is
  // done. Call with fCallMutex held.
  void HandOff(TarnWorkerThread::Action* action) noexcept;

  TarnThreadID fThread;
  threads_detail::AutoResetEvent fGo;
  threads_detail::AutoResetEvent fDone;
  std::atomic<TarnWorkerThread::Action*> fPending{nullptr};
  TarnError fLastError{0};  // written by the worker, read by the caller it serves
  TarnCoreMutex fCallMutex;
  std::atomic<TarnWorkerThread::SubsidiaryLocker*> fLocker{nullptr};
  TarnWorkerThread* fOwner;
};

namespace {

class FunctionAction final : public TarnWorkerThread::Action {
 public:
  FunctionAction(TarnWorkerThread::ActionFunction function, void* arg, bool useLocker) noexcept
      : Action(useLocker), fFunction(function), fArg(arg) {}
  void Do() override { fFunction(fArg); }

 private:
  TarnWorkerThread::ActionFunction fFunction;
  void* fArg;
};

class CallLock {
 public:
  explicit CallLock(const TarnCoreMutex& mutex) noexcept : fMutex(mutex) { fMutex.lock(); }
  ~CallLock() { fMutex.unlock(); }
  CallLock(const CallLock&) = delete;
  CallLock& operator=(const CallLock&) = delete;

 private:
  const TarnCoreMutex& fMutex;
};

void RunWithLocker(TarnWorkerThread::Action& action, TarnWorkerThread::SubsidiaryLocker* locker) {
  if (!action.fUseSubsidiaryLocker || locker == nullptr) {
    action.Do();
    return;
  }
  locker->Lock();
  try {
    action.Do();
  } catch (...) {
    locker->Unlock();
    throw;
  }
  locker->Unlock();
}

}  // namespace

void* TarnWorkerThreadImpl::Loop(void* rawImpl) {
  auto* impl = static_cast<TarnWorkerThreadImpl*>(rawImpl);
  TarnThreadID::RenameCurrentThread("TARN Worker Thread");
  for (;;) {
    threads_detail::AutoResetEvent::SignalAndWait(impl->fDone, impl->fGo);
    TarnWorkerThread::Action* action = impl->fPending.exchange(nullptr);
    if (action == nullptr) break;
    try {
      RunWithLocker(*action, impl->fLocker.load());
    } catch (const TarnError& error) {
      impl->fLastError = error;
    } catch (...) {
      impl->fLastError = TarnError(-50);
    }
  }
  impl->fDone.Signal();
  return nullptr;
}

void TarnWorkerThreadImpl::HandOff(TarnWorkerThread::Action* action) noexcept {
  fPending.store(action);
  uint32_t exitCode = 0;
  if (fThread.IsValid() &&
      (!fThread.GetExitCode(&exitCode) || exitCode == TarnThreadID::kStillActive)) {
    threads_detail::AutoResetEvent::SignalAndWait(fGo, fDone);
  } else {
    fPending.store(nullptr);
  }
}

TarnWorkerThread& TarnWorkerThread::Instance() { return Singleton<TarnWorkerThread>::Instance(); }

TarnWorkerThread::TarnWorkerThread() : fImpl(new (std::nothrow) TarnWorkerThreadImpl(this)) {
  if (!fImpl || !fImpl->IsValid()) FailMemFullError();
  Start();
}

TarnWorkerThread::~TarnWorkerThread() {
  if (fImpl->fThread.IsValid()) Stop();
}

void TarnWorkerThread::DoAction(Action* action, bool useSubsidiaryLocker) {
  if (action != nullptr) {
    if (useSubsidiaryLocker) action->fUseSubsidiaryLocker = true;
    if (ShouldDoActionImmediate(fImpl->fThread)) {
      action->Do();
      return;
    }
  }
  CallLock guard(fImpl->fCallMutex);
  fImpl->HandOff(action);
  // Deliberately sticky: the slot is never cleared once an action failed.
  if (!(fImpl->fLastError == TarnError())) throw TarnError(fImpl->fLastError);
}

void TarnWorkerThread::DoAction(ActionFunction function, void* arg, bool useSubsidiaryLocker) {
  FunctionAction action(function, arg, useSubsidiaryLocker);
  DoAction(&action, useSubsidiaryLocker);
}

TarnThreadID TarnWorkerThread::GetThread() const { return fImpl->fThread; }

void TarnWorkerThread::setThreadPriority(TarnThreadID::ThreadPriority priority,
                                         const TarnThreadID::RealtimePriorityHints& hints) {
  TarnThreadID worker = GetThread();
  worker.SetThreadPriority(priority, hints);
}

void TarnWorkerThread::registerLocker(SubsidiaryLocker* locker) noexcept {
  fImpl->fLocker.store(locker);
}

void TarnWorkerThread::Start() {
  CallLock guard(fImpl->fCallMutex);
  if (fImpl->fThread.IsValid()) return;
  if (fImpl->fThread.Create(&TarnWorkerThreadImpl::Loop, fImpl.get()) != 0) return;
  fImpl->fDone.Wait();  // the loop signals as soon as it runs
  fImpl->fThread.SetThreadPriority(TarnThreadID::kPriorityRealtimeHigh);
}

void TarnWorkerThread::Stop() {
  CallLock guard(fImpl->fCallMutex);
  if (!fImpl->fThread.IsValid()) return;
  fImpl->HandOff(nullptr);
  (void)fImpl->fThread.Terminate(nullptr);
  fImpl->fThread.Invalidate();
}

bool TarnWorkerThread::ShouldDoActionImmediate(const TarnThreadID& worker) const {
  return worker.IsCurrent() || !worker.IsValid();
}

}  // namespace tarn
