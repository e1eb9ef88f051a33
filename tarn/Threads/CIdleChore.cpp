#include "tarn/Threads/CIdleChore.h"

#include <algorithm>
#include <atomic>
#include <condition_variable>
#include <deque>
#include <mutex>

#include "tarn/Basics/Singleton.h"
#include "tarn/Basics/TarnCoreLibCallbacks.h"
#include "tarn/Errors/Fail.h"
#include "tarn/Threads/TarnJobThread.h"
#include "tarn/Threads/TarnThreadID.h"

namespace tarn {

namespace {

std::atomic<uint32_t> gMainThread{0};

// Records the caller as main thread if none is recorded; fails when another
// thread is.
void RequireMainThread() {
  const uint32_t self = TarnThreadID::CurrentThreadRawID();
  uint32_t expected = 0;
  if (!gMainThread.compare_exchange_strong(expected, self) && expected != self) {
    FailOSErr(kParamErr);
  }
}

}  // namespace

void RecordCurrentThreadAsMain() noexcept { gMainThread.store(TarnThreadID::CurrentThreadRawID()); }

bool IsMainThread() noexcept { return gMainThread.load() == TarnThreadID::CurrentThreadRawID(); }

// The process-wide list of scheduled chores and the one that is running.
class CIdleChoreGlobalState {
 public:
  CIdleChoreGlobalState() = default;
  CIdleChoreGlobalState(const CIdleChoreGlobalState&) = delete;
  CIdleChoreGlobalState& operator=(const CIdleChoreGlobalState&) = delete;
  ~CIdleChoreGlobalState() = default;

  void Assign(CIdleChore* chore) {
    {
      std::lock_guard<std::mutex> hold(fMutex);
      if (std::find(fScheduled.begin(), fScheduled.end(), chore) != fScheduled.end()) return;
      fScheduled.push_back(chore);
    }
    fChanged.notify_all();
    TarnCoreLibCallbacks::GetCallbackAPI()->RequestIdleTime();
  }

  void Cancel(CIdleChore* chore) noexcept {
    std::unique_lock<std::mutex> hold(fMutex);
    fScheduled.erase(std::remove(fScheduled.begin(), fScheduled.end(), chore), fScheduled.end());
    // From inside its own run (on the main thread) there is nothing to wait for.
    if (!IsMainThread()) fChanged.wait(hold, [&] { return fRunning != chore; });
  }

  bool IsScheduled(const CIdleChore* chore) noexcept {
    std::lock_guard<std::mutex> hold(fMutex);
    return std::find(fScheduled.begin(), fScheduled.end(), chore) != fScheduled.end();
  }

  // Runs the chores scheduled when the pass began, oldest first; chores
  // scheduled during the pass wait for the next one.
  int32_t RunDue() {
    size_t due;
    {
      std::lock_guard<std::mutex> hold(fMutex);
      due = fScheduled.size();
    }
    int32_t ran = 0;
    for (; due > 0; --due) {
      CIdleChore* chore;
      {
        std::lock_guard<std::mutex> hold(fMutex);
        if (fScheduled.empty()) break;
        chore = fScheduled.front();
        fScheduled.pop_front();
        fRunning = chore;
      }
      try {
        chore->Action();
      } catch (...) {
        PrintUnhandledException(GetCurrentError());
      }
      {
        std::lock_guard<std::mutex> hold(fMutex);
        fRunning = nullptr;
      }
      fChanged.notify_all();
      ++ran;
    }
    return ran;
  }

  int32_t PumpFor(std::chrono::nanoseconds duration) {
    const auto deadline = std::chrono::steady_clock::now() + duration;
    int32_t ran = 0;
    for (;;) {
      ran += RunDue();
      std::unique_lock<std::mutex> hold(fMutex);
      if (!fChanged.wait_until(hold, deadline, [&] { return !fScheduled.empty(); })) break;
    }
    return ran;
  }

 private:
  // Invariants: each chore appears in fScheduled at most once;
  // fRunning != null only inside RunDue, on the main thread.
  std::mutex fMutex;
  std::condition_variable fChanged;
  std::deque<CIdleChore*> fScheduled;
  CIdleChore* fRunning = nullptr;
};

CIdleChore::CIdleChore() { (void)Singleton<CIdleChoreGlobalState>::Instance(); }

CIdleChore::~CIdleChore() { Cancel(); }

void CIdleChore::Assign() {
  // During unload, after the list is gone, there is no main loop left to run
  // the chore.
  if (auto* state = Singleton<CIdleChoreGlobalState>::InstanceIfExists()) state->Assign(this);
}

void CIdleChore::Cancel() noexcept {
  if (auto* state = Singleton<CIdleChoreGlobalState>::InstanceIfExists()) state->Cancel(this);
}

bool CIdleChore::IsScheduled() const noexcept {
  auto* state = Singleton<CIdleChoreGlobalState>::InstanceIfExists();
  return state != nullptr && state->IsScheduled(this);
}

int32_t RunIdleChores() {
  RequireMainThread();
  return Singleton<CIdleChoreGlobalState>::Instance().RunDue();
}

int32_t PumpMainThreadFor(std::chrono::nanoseconds duration) {
  RequireMainThread();
  return Singleton<CIdleChoreGlobalState>::Instance().PumpFor(duration);
}

}  // namespace tarn
