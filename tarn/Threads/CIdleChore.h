#pragma once

// CIdleChore: a callback that the host's main thread runs when it is idle.
//
// Assign() schedules one run of Action() (scheduling an already scheduled
// chore changes nothing); Cancel() removes a pending run. Action() may
// Assign() its own chore again; that run happens on a later pass. Assign and
// Cancel may be called from any thread. When a chore is scheduled the library
// asks the host for idle time (TarnCoreLibCallbacks::RequestIdleTime); the
// host answers by calling RunIdleChores() on its main thread. Programs
// without a host loop (tools, tests) pump with PumpMainThreadFor.
//
//   class Refresh : public CIdleChore {
//     void Action() override { Redraw(); }
//    public:
//     ~Refresh() override { Cancel(); }
//   };
//
// Cancel() called on another thread while the chore runs waits until the run
// has ended, so a derived class that calls Cancel() first in its destructor
// is never destroyed under its running Action().

#include <chrono>
#include <cstdint>

namespace tarn {

class CIdleChore {
 public:
  // Makes sure the process-wide chore list exists, so that it outlives
  // every process-wide object that owns a chore.
  CIdleChore();
  CIdleChore(const CIdleChore&) = delete;
  CIdleChore& operator=(const CIdleChore&) = delete;
  // Cancels; derived classes call Cancel() in their own destructors too.
  virtual ~CIdleChore();

  void Assign();
  void Cancel() noexcept;
  [[nodiscard]] bool IsScheduled() const noexcept;

 protected:
  // Runs on the main thread. A TarnError escaping it is printed as an
  // "Unhandled exception: " line and the pump carries on.
  virtual void Action() = 0;

 private:
  friend class CIdleChoreGlobalState;
};

// Runs the chores that are due, on the calling thread, and returns how many
// ran. The first thread to call it (or the thread recorded by
// InitInterruptStatus) is the main thread; calls from any other thread throw
// TarnError -50.
int32_t RunIdleChores();

// Runs chores as they become due until the duration has passed; returns how
// many ran. Same thread rule as RunIdleChores.
int32_t PumpMainThreadFor(std::chrono::nanoseconds duration);

// Records the calling thread as the main thread (replacing any earlier one).
void RecordCurrentThreadAsMain() noexcept;
// True when the calling thread is the recorded main thread.
[[nodiscard]] bool IsMainThread() noexcept;

}  // namespace tarn
