// TarnThreadID on POSIX. Thread ids are 32-bit numbers handed out by the
// library (the first call of a thread takes the next one); a "handle" is a
// reference-counted record of a thread that the library created or that
// asked for its own handle. The record carries the kernel id
// (for per-thread niceness on Linux), and the exit code with a condition to
// wait for the end.
#include <pthread.h>
#include <sched.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <atomic>
#include <condition_variable>
#include <cstdint>
#include <cstring>
#include <mutex>
#include <new>
#include <unordered_map>

#include "tarn/Threads/TarnMutex.h"
#include "tarn/Threads/TarnThreadID.h"

namespace tarn {

namespace {

std::atomic<uint32_t> gNextThreadID{1};

uint32_t NextThreadID() noexcept {
  uint32_t id = gNextThreadID.fetch_add(1);
  if (id == 0) id = gNextThreadID.fetch_add(1);  // 0 means "no thread"
  return id;
}

long KernelThreadID() noexcept {
#if defined(__linux__)
  return static_cast<long>(syscall(SYS_gettid));
#else
  return 0;
#endif
}

struct ThreadRecord {
  enum JoinState { kNotJoined, kJoining, kJoined };

  std::atomic<int32_t> references{1};
  uint32_t id = 0;
  std::atomic<long> kernelID{0};  // set by the thread itself
  std::mutex mutex;
  std::condition_variable changed;
  bool finished = false;  // the entry has returned
  uint32_t exitCode = TarnThreadID::kStillActive;
  // Threads the library created are joinable: waiting for them joins them
  // (once), so that a wait ends only after the thread's thread-local
  // clean-up. The last reference detaches a thread nobody joined.
  bool created = false;
  pthread_t thread{};
  JoinState joinState = kNotJoined;

  void AddReference() noexcept { references.fetch_add(1); }
  void Release() noexcept {
    if (references.fetch_sub(1) == 1) {
      if (created && joinState == kNotJoined) pthread_detach(thread);
      delete this;
    }
  }
};

// Live records by id; each entry holds one reference. Never freed, so that
// threads ending during process exit can still unregister.
struct Registry {
  std::mutex mutex;
  std::unordered_map<uint32_t, ThreadRecord*> records;
};
Registry& TheRegistry() {
  static Registry* const registry = new Registry;
  return *registry;
}

void Register(ThreadRecord* record) {
  Registry& registry = TheRegistry();
  std::lock_guard<std::mutex> guard(registry.mutex);
  record->AddReference();
  registry.records[record->id] = record;
}

ThreadRecord* Lookup(uint32_t id) {
  Registry& registry = TheRegistry();
  std::lock_guard<std::mutex> guard(registry.mutex);
  auto found = registry.records.find(id);
  if (found == registry.records.end()) return nullptr;
  found->second->AddReference();
  return found->second;
}

// Marks the thread ended (waking waiters) and drops its registry entry.
void Finish(ThreadRecord* record, uint32_t exitCode) noexcept {
  {
    std::lock_guard<std::mutex> guard(record->mutex);
    record->finished = true;
    record->exitCode = exitCode;
  }
  record->changed.notify_all();
  Registry& registry = TheRegistry();
  bool registered = false;
  {
    std::lock_guard<std::mutex> guard(registry.mutex);
    auto found = registry.records.find(record->id);
    if (found != registry.records.end() && found->second == record) {
      registry.records.erase(found);
      registered = true;
    }
  }
  if (registered) record->Release();
}

// The calling thread's own record. Threads the library created get theirs
// at start; any other thread gets one on first demand, finished when the
// thread ends.
thread_local ThreadRecord* tOwnRecord = nullptr;
struct AdoptedRecord {
  ThreadRecord* record = nullptr;
  ~AdoptedRecord() {
    if (record != nullptr) {
      Finish(record, 0);
      record->Release();
    }
  }
};
thread_local AdoptedRecord tAdoptedRecord;

ThreadRecord* OwnRecord() {
  if (tOwnRecord == nullptr) {
    auto* record = new (std::nothrow) ThreadRecord;
    if (record == nullptr) return nullptr;
    record->id = TarnThreadID::CurrentThreadRawID();
    record->kernelID = KernelThreadID();
    Register(record);
    tAdoptedRecord.record = record;
    tOwnRecord = record;
  }
  tOwnRecord->AddReference();
  return tOwnRecord;
}

ThreadRecord* AsRecord(void* handle) noexcept { return static_cast<ThreadRecord*>(handle); }

struct ThreadStartArgs {
  TarnThreadID::EntryFunction entry;
  void* arg;
  TarnCoreMutex gate;
  ThreadRecord* record;  // one reference, owned by the new thread
};

void* StartRoutine(void* rawArgs) {
  auto* args = static_cast<ThreadStartArgs*>(rawArgs);
  ThreadRecord* record = args->record;
  detail::tCurrentThreadRawID = record->id;
  tOwnRecord = record;
  record->kernelID = KernelThreadID();
  uint32_t exitCode = 0;
  try {
    if (args->entry != nullptr) {
      // Wait until the creator has stored our id and handle.
      args->gate.lock();
      args->gate.unlock();
      exitCode = static_cast<uint32_t>(reinterpret_cast<uintptr_t>(args->entry(args->arg)));
    }
  } catch (...) {
  }
  delete args;
  tOwnRecord = nullptr;
  Finish(record, exitCode);
  record->Release();
  return nullptr;
}

}  // namespace

uint32_t detail::AssignCurrentThreadRawID() noexcept {
  return tCurrentThreadRawID = NextThreadID();
}

TarnThreadID TarnThreadID::CurrentThread() noexcept { return TarnThreadID(CurrentThreadRawID()); }

int TarnThreadID::Create(EntryFunction entry, void* arg, bool /*flag*/) noexcept {
  Invalidate();
  auto* record = new (std::nothrow) ThreadRecord;
  if (record == nullptr) return 1;
  auto* args = new (std::nothrow) ThreadStartArgs{entry, arg, {}, record};
  if (args == nullptr) {
    record->Release();
    return 1;
  }
  record->id = NextThreadID();
  try {
    Register(record);
  } catch (...) {
    delete args;
    record->Release();
    return 1;
  }

  args->gate.lock();
  record->AddReference();  // ours, as this object's handle
  pthread_t thread;
  const int result = pthread_create(&thread, nullptr, &StartRoutine, args);
  if (result == 0) {
    record->thread = thread;
    record->created = true;
    fHandle = record;
    fID.store(record->id, std::memory_order_relaxed);
  }
  args->gate.unlock();
  if (result != 0) {
    delete args;
    Finish(record, 0);
    record->Release();  // ours
    record->Release();  // the thread's, never started
    return 1;
  }
  return 0;
}

void* TarnThreadID::DemandOSThread() noexcept {
  if (fHandle == nullptr) {
    const uint32_t id = GetID();
    if (id == 0) return nullptr;
    try {
      fHandle = id == CurrentThreadRawID() ? OwnRecord() : Lookup(id);
    } catch (...) {
      fHandle = nullptr;
    }
  }
  return fHandle;
}

void TarnThreadID::Invalidate() noexcept {
  if (fHandle != nullptr) {
    AsRecord(fHandle)->Release();
    fHandle = nullptr;
  }
  fID.store(0, std::memory_order_relaxed);
}

int TarnThreadID::Terminate(uint32_t* exitCode) noexcept {
  ThreadRecord* record = AsRecord(DemandOSThread());
  if (record == nullptr) return 0;
  std::unique_lock<std::mutex> lock(record->mutex);
  if (record->created) {
    record->changed.wait(lock, [record] { return record->joinState != ThreadRecord::kJoining; });
    if (record->joinState == ThreadRecord::kNotJoined) {
      if (pthread_equal(record->thread, pthread_self())) return 0;  // cannot wait for itself
      record->joinState = ThreadRecord::kJoining;
      lock.unlock();
      pthread_join(record->thread, nullptr);
      lock.lock();
      record->joinState = ThreadRecord::kJoined;
      record->changed.notify_all();
    }
  } else {
    record->changed.wait(lock, [record] { return record->finished; });
  }
  if (exitCode != nullptr) *exitCode = record->exitCode;
  return 0;
}

bool TarnThreadID::GetExitCode(uint32_t* exitCode) noexcept {
  ThreadRecord* record = AsRecord(DemandOSThread());
  if (record == nullptr) return false;
  std::lock_guard<std::mutex> guard(record->mutex);
  *exitCode = record->exitCode;
  return true;
}

void TarnThreadID::SetThreadPriority(ThreadPriority priority,
                                     const RealtimePriorityHints& /*hints*/) noexcept {
  ThreadRecord* record = AsRecord(DemandOSThread());
  if (record == nullptr) return;
  if (priority >= kPriorityRealtimeLow && priority <= kPriorityRealtimeHigh) {
    // Real time applies to the calling thread, like a multimedia class
    // registration: FIFO scheduling at 70, 80 or 90 % of the range.
    const int lowest = sched_get_priority_min(SCHED_FIFO);
    const int highest = sched_get_priority_max(SCHED_FIFO);
    const int step = 7 + (priority - kPriorityRealtimeLow);
    sched_param parameters{};
    parameters.sched_priority = lowest + (highest - lowest) * step / 10;
    (void)pthread_setschedparam(pthread_self(), SCHED_FIFO, &parameters);
    return;
  }
  if (priority < kPriorityLowest || priority > kPriorityHighest) priority = kPriorityNormal;
#if defined(__linux__)
  // Ordinary levels are per-thread niceness: -2..2 become 10, 5, 0, -5, -10.
  const long kernelID = record->kernelID.load();
  if (kernelID != 0) (void)setpriority(PRIO_PROCESS, static_cast<id_t>(kernelID), -5 * priority);
#endif
}

void TarnThreadID::RenameCurrentThread(const char* name) noexcept {
  if (name == nullptr) return;
#if defined(__linux__)
  char shortName[16] = {};
  std::strncpy(shortName, name, sizeof shortName - 1);
  (void)pthread_setname_np(pthread_self(), shortName);
#endif
}

}  // namespace tarn
