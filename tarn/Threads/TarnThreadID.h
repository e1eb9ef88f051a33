// TarnThreadID: an operating-system thread by its 32-bit id (0 = none), with
// a lazily opened handle of its own, plus thread creation, waiting,
// priorities and naming.
//
// Copies share the id but never the handle: each object opens its own on
// demand and closes it when invalidated, reassigned or destroyed. Two ids
// are equal when their 32-bit ids are equal. A TarnThreadID object is used by
// one thread at a time (the id alone may be read concurrently).
//
// Priorities: kPriorityLowest..kPriorityHighest (-2..2) set the target
// thread's ordinary priority. kPriorityRealtimeLow..High (3..5) register the
// *calling* thread with the "Pro Audio" multimedia scheduling class at low,
// normal or high priority (on POSIX: SCHED_FIFO at increasing priorities),
// never reverted; call them from the thread that is to run in real time.
// Other values count as kPriorityNormal. Refusal by the system is silent.
#pragma once

#include <atomic>
#include <cstdint>

// The calling thread's id lives in a thread-local read straight off the
// thread pointer (initial-exec), so that locks can compare owners without a
// call.
#if defined(_WIN32)
#define TARN_TLS_INITIAL_EXEC
#else
#define TARN_TLS_INITIAL_EXEC __attribute__((tls_model("initial-exec")))
#endif

namespace tarn {

class TarnSemaphore;

namespace detail {
// The calling thread's raw id, 0 until its first use on that thread.
extern thread_local constinit uint32_t tCurrentThreadRawID TARN_TLS_INITIAL_EXEC;
// Gives the calling thread its raw id and returns it.
uint32_t AssignCurrentThreadRawID() noexcept;
}  // namespace detail

class TarnThreadID {
 public:
  enum ThreadPriority : int32_t {
    kPriorityLowest = -2,
    kPriorityBelowNormal = -1,
    kPriorityNormal = 0,
    kPriorityAboveNormal = 1,
    kPriorityHighest = 2,
    kPriorityRealtimeLow = 3,
    kPriorityRealtimeNormal = 4,
    kPriorityRealtimeHigh = 5,
  };

  // Scheduling hints for real-time threads; accepted and not consulted.
  class RealtimePriorityHints {
   public:
    RealtimePriorityHints() noexcept : periodNanoseconds(0), computationNanoseconds(0) {}
    uint32_t periodNanoseconds;
    uint32_t computationNanoseconds;
  };

  using EntryFunction = void* (*)(void* arg);
  using ExceptionHandler = void (*)(void* osExceptionRecord);
  static constexpr uint32_t kStillActive = 259;  // exit code of a running thread

  TarnThreadID() noexcept : fID(0) {}
  explicit TarnThreadID(uint32_t id) noexcept : fID(id) {}
  TarnThreadID(const TarnThreadID& other) noexcept : fID(other.GetID()) {}
  TarnThreadID& operator=(const TarnThreadID& other) noexcept {
    if (this != &other) {
      const uint32_t id = other.GetID();
      Invalidate();
      fID.store(id, std::memory_order_relaxed);
    }
    return *this;
  }
  ~TarnThreadID() { Invalidate(); }

  // Starts a thread that runs entry(arg); the entry's result (truncated to 32
  // bits) becomes the exit code. The new thread initialises COM (Windows)
  // and does not call entry before this object holds its id and handle.
  // flag is accepted and ignored. Returns 0 on success, 1 on failure.
  int Create(EntryFunction entry, void* arg, bool flag = false) noexcept;

  // The calling thread, with no handle.
  [[nodiscard]] static TarnThreadID CurrentThread() noexcept;
  [[nodiscard]] static uint32_t CurrentThreadRawID() noexcept {
    const uint32_t id = detail::tCurrentThreadRawID;
    return id != 0 ? id : detail::AssignCurrentThreadRawID();
  }

  [[nodiscard]] uint32_t GetID() const noexcept { return fID.load(std::memory_order_relaxed); }
  [[nodiscard]] bool IsValid() const noexcept { return GetID() != 0; }
  [[nodiscard]] bool IsCurrent() const noexcept { return GetID() == CurrentThreadRawID(); }
  [[nodiscard]] bool IsEqual(const TarnThreadID& other) const noexcept {
    return GetID() == other.GetID();
  }
  friend bool operator==(const TarnThreadID& a, const TarnThreadID& b) noexcept {
    return a.IsEqual(b);
  }

  // This object's handle, opened first if needed; null for an invalid id or
  // a thread the system cannot open.
  void* DemandOSThread() noexcept;
  void* GetOSThread() noexcept { return DemandOSThread(); }

  // Closes the handle (if open) and sets the id to 0.
  void Invalidate() noexcept;

  // Does not kill anything: waits without time-out for the thread to end
  // and then stores its exit code in *exitCode (when not null). Returns 0,
  // at once when no handle can be had.
  int Terminate(uint32_t* exitCode = nullptr) noexcept;

  // The thread's exit code, kStillActive while it runs. False when no handle
  // can be had or the system cannot tell.
  bool GetExitCode(uint32_t* exitCode) noexcept;

  // See the opening comment. Does nothing when no handle can be had.
  void SetThreadPriority(ThreadPriority priority,
                         const RealtimePriorityHints& hints = RealtimePriorityHints()) noexcept;

  // Names the calling thread where the system keeps thread names (POSIX
  // keeps at most 15 bytes).
  static void RenameCurrentThread(const char* name) noexcept;

  // A process-wide handler for the system's record of an unhandled failure;
  // the abort hook calls it (when installed) before aborting.
  static void SetExceptionHandler(ExceptionHandler handler) noexcept;
  [[nodiscard]] static ExceptionHandler GetExceptionHandler() noexcept;

  // A semaphore private to the calling thread, created on its first call.
  // It is kept (not destroyed) when the thread ends, so that late signals
  // from other threads stay harmless.
  static TarnSemaphore& DemandThreadSemaphore();

 private:
  std::atomic<uint32_t> fID;
  void* fHandle = nullptr;
};

}  // namespace tarn
