// Thread ids, TarnThread, thread-local slots, per-thread semaphores and the
// worker thread.
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <cstdint>
#include <memory>
#include <stdexcept>
#include <thread>
#include <vector>

#include "tarn/Errors/TarnError.h"
#include "tarn/Threads/TarnSemaphore.h"
#include "tarn/Threads/TarnThread.h"
#include "tarn/Threads/TarnThreadLocal.h"
#include "tarn/Threads/TarnWorkerThread.h"

using namespace tarn;

namespace {

// Worker starts register their *calling* thread for real-time scheduling;
// keep that off the test runner's thread by starting workers elsewhere.
template <class F>
void OnThrowawayThread(F body) {
  std::thread(body).join();
}

struct GateProbe {
  TarnThreadID* creatorSlot;
  std::atomic<uint32_t> seenInCreatorSlot{0};
  std::atomic<uint32_t> seenAsCurrent{0};
};

void* ProbeEntry(void* arg) {
  auto* probe = static_cast<GateProbe*>(arg);
  probe->seenInCreatorSlot = probe->creatorSlot->GetID();
  probe->seenAsCurrent = TarnThreadID::CurrentThread().GetID();
  return reinterpret_cast<void*>(uintptr_t{0x100000000} + 42);  // exit code truncates to 42
}

void* SlowEntry(void* arg) {
  std::this_thread::sleep_for(std::chrono::milliseconds(30));
  static_cast<std::atomic<bool>*>(arg)->store(true);
  return nullptr;
}

}  // namespace

TEST(TarnThreadID, DefaultIsNoThread) {
  TarnThreadID none;
  EXPECT_FALSE(none.IsValid());
  EXPECT_FALSE(none.IsCurrent());
  EXPECT_EQ(none.DemandOSThread(), nullptr);
  uint32_t code = 7;
  EXPECT_EQ(none.Terminate(&code), 0);
  EXPECT_EQ(code, 7u);
  EXPECT_FALSE(none.GetExitCode(&code));
  none.SetThreadPriority(TarnThreadID::kPriorityHighest);  // no handle: nothing happens
  EXPECT_TRUE(TarnThreadID::CurrentThread().IsValid());
  EXPECT_TRUE(TarnThreadID::CurrentThread().IsCurrent());
  EXPECT_EQ(TarnThreadID::CurrentThread(), TarnThreadID::CurrentThread());
}

TEST(TarnThreadID, CreateHoldsTheGateUntilTheIdIsStored) {
  for (int round = 0; round < 50; ++round) {
    TarnThreadID id;
    GateProbe probe{&id};
    ASSERT_EQ(id.Create(&ProbeEntry, &probe), 0);
    EXPECT_TRUE(id.IsValid());
    EXPECT_FALSE(id.IsCurrent());
    EXPECT_FALSE(id == TarnThreadID::CurrentThread());
    uint32_t exitCode = 0;
    EXPECT_EQ(id.Terminate(&exitCode), 0);
    EXPECT_EQ(exitCode, 42u);
    EXPECT_EQ(probe.seenInCreatorSlot.load(), id.GetID());
    EXPECT_EQ(probe.seenAsCurrent.load(), id.GetID());
  }
}

TEST(TarnThreadID, TerminateWaitsForTheEnd) {
  std::atomic<bool> done{false};
  TarnThreadID id;
  ASSERT_EQ(id.Create(&SlowEntry, &done), 0);
  uint32_t code = 0;
  EXPECT_TRUE(id.GetExitCode(&code));
  if (!done) {
    EXPECT_EQ(code, TarnThreadID::kStillActive);
  }
  TarnThreadID copy(id);  // opens a handle of its own
  EXPECT_EQ(copy, id);
  EXPECT_EQ(copy.Terminate(&code), 0);
  EXPECT_TRUE(done.load());
  EXPECT_EQ(code, 0u);
  EXPECT_EQ(id.Terminate(), 0);  // the first object's handle still works
  id.Invalidate();
  EXPECT_FALSE(id.IsValid());
}

TEST(TarnThreadID, EveryPriorityIsAccepted) {
  // On a thread of its own: real-time levels apply to the calling thread.
  std::thread([] {
    TarnThreadID self = TarnThreadID::CurrentThread();
    for (int p : {-3, -2, -1, 0, 1, 2, 7, 3, 4, 5}) {
      self.SetThreadPriority(static_cast<TarnThreadID::ThreadPriority>(p));
    }
    TarnThreadID::RenameCurrentThread("A thread name longer than fifteen bytes");
  }).join();
}

namespace {

class CountingRoutine : public TarnThreadRoutine {
 public:
  void Run() override {
    running = true;
    while (!IsTerminated()) std::this_thread::sleep_for(std::chrono::milliseconds(1));
    std::this_thread::sleep_for(std::chrono::milliseconds(10));
    ended = true;
  }
  std::atomic<bool> running{false};
  std::atomic<bool> ended{false};
  std::atomic<int> onTerminateCalls{0};

 protected:
  void OnTerminate() override { onTerminateCalls.fetch_add(1); }
};

}  // namespace

TEST(TarnThread, UnstartedThreadIsTerminated) {
  TarnThread empty;
  EXPECT_TRUE(empty.IsTerminated());
  empty.Terminate();
  auto routine = std::make_shared<CountingRoutine>();
  TarnThread idle(routine, UString("Idle"));
  EXPECT_TRUE(idle.IsTerminated());
  idle.Terminate();
  EXPECT_EQ(routine->onTerminateCalls.load(), 0);
  EXPECT_FALSE(idle.GetID().IsValid());
}

TEST(TarnThread, TerminateStopsAndWaits) {
  auto routine = std::make_shared<CountingRoutine>();
  TarnThread thread(routine, UString("Counting Thread"));
  thread.Start();
  EXPECT_FALSE(thread.IsTerminated());
  while (!routine->running) std::this_thread::sleep_for(std::chrono::milliseconds(1));
  EXPECT_TRUE(thread.GetID().IsValid());
  EXPECT_FALSE(thread.GetID().IsCurrent());
  thread.Terminate();
  EXPECT_TRUE(routine->ended.load());
  EXPECT_TRUE(thread.IsTerminated());
  EXPECT_TRUE(routine->IsTerminated());
  EXPECT_EQ(routine->onTerminateCalls.load(), 1);
}

TEST(TarnThread, TerminateAndContinueDoesNotWait) {
  auto routine = std::make_shared<CountingRoutine>();
  TarnThread thread(routine, UString("Counting Thread"));
  thread.Start();
  thread.TerminateAndContinue();
  EXPECT_TRUE(thread.IsTerminated());
  TarnThreadID id = thread.GetID();
  id.Terminate();
  EXPECT_TRUE(routine->ended.load());
}

TEST(TarnThread, ExceptionsFromRunAreSwallowed) {
  std::atomic<int> runs{0};
  auto thrower = std::make_shared<TarnFunctionThreadRoutine>([&] {
    runs.fetch_add(1);
    throw std::runtime_error("ignored");
  });
  TarnThread a(thrower, UString("Thrower"));
  a.Start();
  a.Terminate();
  auto empty = std::make_shared<TarnFunctionThreadRoutine>(std::function<void()>());
  TarnThread b(empty, UString("Empty"));
  b.Start();
  b.Terminate();
  EXPECT_EQ(runs.load(), 1);
  EXPECT_THROW(empty->Run(), std::bad_function_call);
}

namespace {

struct Tracked : ITarnThreadLocalStorage {
  explicit Tracked(std::atomic<int>& deaths) : fDeaths(deaths) {}
  ~Tracked() override { fDeaths.fetch_add(1); }
  std::atomic<int>& fDeaths;
};

}  // namespace

TEST(TarnThreadLocal, ValuesArePerThreadAndCleanedUpAtThreadExit) {
  static TarnThreadLocal<Tracked> slot;
  std::atomic<int> deaths{0};
  EXPECT_EQ(slot.Get(), nullptr);
  std::vector<std::thread> threads;
  std::atomic<int> sawOwn{0};
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([&] {
      EXPECT_EQ(slot.Get(), nullptr);
      auto* mine = new Tracked(deaths);
      slot.Set(mine);
      std::this_thread::sleep_for(std::chrono::milliseconds(5));
      if (slot.Get() == mine) sawOwn.fetch_add(1);
    });
  }
  for (auto& t : threads) t.join();
  EXPECT_EQ(sawOwn.load(), 4);
  EXPECT_EQ(deaths.load(), 4);
  EXPECT_EQ(slot.Get(), nullptr);

  // Threads started through TarnThread are cleaned up the same way.
  auto routine =
      std::make_shared<TarnFunctionThreadRoutine>([&] { slot.Set(new Tracked(deaths)); });
  TarnThread thread(routine, UString("Slot User"));
  thread.Start();
  thread.Terminate();
  EXPECT_EQ(deaths.load(), 5);
}

TEST(TarnThreadID, ThreadSemaphoreIsPerThread) {
  TarnSemaphore& mine = TarnThreadID::DemandThreadSemaphore();
  EXPECT_EQ(&mine, &TarnThreadID::DemandThreadSemaphore());
  TarnSemaphore* theirs = nullptr;
  std::thread([&] {
    theirs = &TarnThreadID::DemandThreadSemaphore();
    mine.signal();
  }).join();
  EXPECT_NE(theirs, &mine);
  EXPECT_EQ(mine.timed_wait(0), TarnSemaphore::kSignalled);
  theirs->signal();  // still alive after its thread ended
  EXPECT_EQ(theirs->timed_wait(0), TarnSemaphore::kSignalled);
}

// --- Worker thread ---

namespace {

class TestWorker : public TarnWorkerThread {
 public:
  TestWorker() = default;
};

std::unique_ptr<TestWorker> MakeWorker() {
  std::unique_ptr<TestWorker> worker;
  OnThrowawayThread([&] { worker = std::make_unique<TestWorker>(); });
  return worker;
}

class LambdaAction : public TarnWorkerThread::Action {
 public:
  explicit LambdaAction(std::function<void()> body, bool useLocker = false)
      : Action(useLocker), fBody(std::move(body)) {}
  void Do() override { fBody(); }

 private:
  std::function<void()> fBody;
};

class CountingLocker : public TarnWorkerThread::SubsidiaryLocker {
 public:
  void Lock() override { ++locks; }
  void Unlock() override { ++unlocks; }
  int locks = 0;  // touched on the worker only
  int unlocks = 0;
};

}  // namespace

TEST(TarnWorkerThread, ServesCallersFromManyThreadsOneAtATime) {
  TarnWorkerThread* worker = nullptr;
  OnThrowawayThread([&] { worker = &TarnWorkerThread::Instance(); });
  EXPECT_EQ(worker, &TarnWorkerThread::Instance());
  const TarnThreadID workerID = worker->GetThread();
  ASSERT_TRUE(workerID.IsValid());

  int64_t counter = 0;  // only touched by actions
  int inside = 0;
  std::atomic<int> wrongThread{0}, overlaps{0};
  std::vector<std::thread> callers;
  for (int c = 0; c < 4; ++c) {
    callers.emplace_back([&] {
      for (int i = 0; i < 300; ++i) {
        LambdaAction action([&] {
          if (!workerID.IsCurrent()) wrongThread.fetch_add(1);
          if (++inside != 1) overlaps.fetch_add(1);
          ++counter;
          --inside;
        });
        worker->DoAction(&action);
      }
    });
  }
  for (auto& t : callers) t.join();
  EXPECT_EQ(counter, 1200);
  EXPECT_EQ(wrongThread.load(), 0);
  EXPECT_EQ(overlaps.load(), 0);

  // The function form, and a nested call from an action runs inline.
  int value = 0;
  worker->DoAction([](void* arg) { *static_cast<int*>(arg) = 5; }, &value);
  EXPECT_EQ(value, 5);
  bool nestedOnWorker = false;
  LambdaAction outer([&] {
    LambdaAction inner([&] { nestedOnWorker = workerID.IsCurrent(); });
    worker->DoAction(&inner);
  });
  worker->DoAction(&outer);
  EXPECT_TRUE(nestedOnWorker);
}

TEST(TarnWorkerThread, LockerWrapsOnlyMarkedActions) {
  auto worker = MakeWorker();
  CountingLocker locker;
  worker->registerLocker(&locker);
  LambdaAction plain([] {});
  worker->DoAction(&plain);
  LambdaAction marked([] {}, true);
  worker->DoAction(&marked);
  LambdaAction markedByCall([] {});
  worker->DoAction(&markedByCall, true);
  worker->DoAction([](void*) {}, nullptr, true);
  EXPECT_EQ(locker.locks, 3);
  EXPECT_EQ(locker.unlocks, 3);
  worker->registerLocker(nullptr);
  OnThrowawayThread([&] { worker.reset(); });
}

TEST(TarnWorkerThread, LastErrorIsSticky) {
  auto worker = MakeWorker();
  LambdaAction failing([] { throw TarnError(-36); });
  try {
    worker->DoAction(&failing);
    FAIL() << "no error";
  } catch (const TarnError& e) {
    EXPECT_EQ(e.GetIntErrorCode(), -36);
  }
  int ran = 0;
  LambdaAction harmless([&] { ++ran; });
  for (int i = 0; i < 3; ++i) {
    try {
      worker->DoAction(&harmless);
      ADD_FAILURE() << "the error was cleared";
    } catch (const TarnError& e) {
      EXPECT_EQ(e.GetIntErrorCode(), -36);
    }
  }
  EXPECT_EQ(ran, 3);  // the actions ran; only the report is stale

  auto other = MakeWorker();
  LambdaAction foreign([] { throw std::runtime_error("not a TarnError"); });
  try {
    other->DoAction(&foreign);
    FAIL() << "no error";
  } catch (const TarnError& e) {
    EXPECT_EQ(e.GetIntErrorCode(), -50);
  }
  OnThrowawayThread([&] {
    worker.reset();
    other.reset();
  });
}

TEST(TarnWorkerThread, RunsInlineAfterStop) {
  auto worker = MakeWorker();
  const TarnThreadID workerID = worker->GetThread();
  worker->Stop();
  EXPECT_FALSE(worker->GetThread().IsValid());
  uint32_t code = 0;
  TarnThreadID ended(workerID);
  EXPECT_EQ(ended.Terminate(&code), 0);  // already over
  bool onCaller = false;
  LambdaAction action(
      [&] { onCaller = TarnThreadID::CurrentThread().IsCurrent() && !workerID.IsCurrent(); });
  worker->DoAction(&action);
  EXPECT_TRUE(onCaller);
  worker->DoAction(nullptr);  // nothing to end any more
  // Inline runs report errors directly and leave the slot alone.
  LambdaAction failing([] { throw TarnError(-39); });
  EXPECT_THROW(worker->DoAction(&failing), TarnError);
  LambdaAction fine([] {});
  EXPECT_NO_THROW(worker->DoAction(&fine));
  worker.reset();
}
