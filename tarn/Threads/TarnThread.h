// Threads that run a routine object: TarnThreadRoutine (what runs),
// TarnFunctionThreadRoutine (a routine from a callable) and TarnThread (the
// thread that runs it).
//
// Protocol: Start() runs routine->Run() on a new thread (named as given).
// The routine polls IsTerminated() and returns from Run() when it is set;
// TerminateAndContinue() sets it (and calls the routine's OnTerminate()),
// Terminate() also waits for the thread to end. There is no time-out and no
// forced kill: a routine that never looks at its flag keeps Terminate
// waiting. Exceptions escaping Run() are swallowed. The controlling methods
// (Start, Terminate...) belong to one controlling thread at a time.
//
//   auto routine = std::make_shared<TarnFunctionThreadRoutine>([&] { ... });
//   TarnThread thread(routine, UString("Meter Thread"));
//   thread.Start();
//   ...
//   thread.Terminate();  // before the TarnThread is destroyed
#pragma once

#include <atomic>
#include <cstdint>
#include <functional>
#include <memory>

#include "tarn/String/UString.h"
#include "tarn/Threads/TarnThreadID.h"

namespace tarn {

class TarnThread;

class TarnThreadRoutine {
 public:
  TarnThreadRoutine() noexcept = default;
  TarnThreadRoutine(const TarnThreadRoutine& other) noexcept : fTerminated(other.IsTerminated()) {}
  TarnThreadRoutine& operator=(const TarnThreadRoutine& other) noexcept {
    fTerminated.store(other.IsTerminated());
    return *this;
  }
  virtual ~TarnThreadRoutine() = default;

  virtual void Run() = 0;  // the thread body

  // True once termination was requested; safe to poll from any thread.
  [[nodiscard]] bool IsTerminated() const noexcept { return fTerminated.load(); }

 protected:
  // Called on the controlling thread after the flag is set, e.g. to wake a
  // routine that is blocked waiting for work. The base does nothing.
  virtual void OnTerminate() {}

 private:
  friend class TarnThread;
  void DoTerminate() {
    fTerminated.store(true);
    OnTerminate();
  }

  std::atomic<bool> fTerminated{false};
};

// Runs one callable. Running an empty callable throws std::bad_function_call
// (swallowed by the thread like any other exception).
class TarnFunctionThreadRoutine : public TarnThreadRoutine {
 public:
  explicit TarnFunctionThreadRoutine(std::function<void()> function)
      : fFunction(std::move(function)) {}
  TarnFunctionThreadRoutine(const TarnFunctionThreadRoutine&) = default;
  TarnFunctionThreadRoutine& operator=(const TarnFunctionThreadRoutine&) = default;
  ~TarnFunctionThreadRoutine() override = default;

  void Run() override { fFunction(); }

 private:
  std::function<void()> fFunction;
};

class TarnThread {
 public:
  TarnThread();
  TarnThread(std::shared_ptr<TarnThreadRoutine> routine, const UString& name);
  TarnThread(const TarnThread& other);
  TarnThread& operator=(const TarnThread& other);
  // Neither stops nor waits for the thread: owners call Terminate() first.
  ~TarnThread();

  // Starts the thread; a failure to create it is not reported (the thread
  // then just never runs).
  void Start();

  [[nodiscard]] TarnThreadID GetID() const noexcept { return fID; }

  // True before Start, after a stop request, or when the routine's own flag
  // is set.
  [[nodiscard]] bool IsTerminated() const noexcept;

  // Requests the stop without waiting. Asserts ("px != 0") when started
  // without a routine.
  void TerminateAndContinue();

  // Requests the stop and, if started, waits for the thread to end.
  void Terminate();

 private:
  static void* ThreadEntry(void* arg);

  static constexpr uint8_t kStarted = 1;
  static constexpr uint8_t kStopRequested = 2;

  TarnThreadID fID;
  std::shared_ptr<TarnThreadRoutine> fRoutine;
  std::atomic<uint8_t> fFlags{kStopRequested};  // kStarted | kStopRequested bits
  UString fName;
};

}  // namespace tarn
