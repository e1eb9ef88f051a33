// Thread ids, TarnThread, thread-local slots, per-thread semaphores and the
// worker thread.

#include <algorithm>
#include <stdexcept>

#include "ThreadsTestUtil.h"
#include "tarn/Threads/TarnSemaphore.h"
#include "tarn/Threads/TarnThread.h"
#include "tarn/Threads/TarnThreadLocal.h"
#include "tarn/Threads/TarnWorkerThread.h"

using namespace tarn;
using test::CatchError;
using namespace std::chrono_literals;

namespace {

struct GateProbe {
  TarnThreadID* creatorSlot;
  int sleepMs;
  std::atomic<uint32_t> seenInCreatorSlot{0}, seenAsCurrent{0};
};

void* ProbeEntry(void* arg) {
  auto* probe = static_cast<GateProbe*>(arg);
  probe->seenInCreatorSlot = probe->creatorSlot->GetID();
  std::this_thread::sleep_for(std::chrono::milliseconds(probe->sleepMs));
  probe->seenAsCurrent = TarnThreadID::CurrentThread().GetID();
  return reinterpret_cast<void*>(uintptr_t{0x100000000} + 42);  // exit code truncates to 42
}

class CountingRoutine : public TarnThreadRoutine {
 public:
  void Run() override {
    while (!IsTerminated()) std::this_thread::sleep_for(1ms);
    std::this_thread::sleep_for(10ms);
    ended = true;
  }
  std::atomic<bool> ended{false};
  std::atomic<int> onTerminateCalls{0};

 protected:
  void OnTerminate() override { onTerminateCalls.fetch_add(1); }
};

std::atomic<int> gDeaths{0};
struct Tracked : ITarnThreadLocalStorage {
  ~Tracked() override { gDeaths.fetch_add(1); }
};

// Worker starts register their *calling* thread for real-time scheduling;
// keep that off the test runner's thread by starting and ending workers
// elsewhere.
class TestWorker : public TarnWorkerThread {};
using WorkerPtr = std::unique_ptr<TestWorker>;

WorkerPtr MakeWorker() {
  WorkerPtr worker;
  std::thread([&] { worker = std::make_unique<TestWorker>(); }).join();
  return worker;
}

void EndWorker(WorkerPtr& worker) {
  std::thread([&] { worker.reset(); }).join();
}

template <class F>
struct LambdaAction : TarnWorkerThread::Action {
  explicit LambdaAction(F body, bool useLocker = false) : Action(useLocker), fBody(body) {}
  void Do() override { fBody(); }
  F fBody;
};

struct CountingLocker : TarnWorkerThread::SubsidiaryLocker {
  void Lock() override { ++locks; }
  void Unlock() override { ++unlocks; }
  int locks = 0, unlocks = 0;  // touched on the worker only
};

}  // namespace

// The new thread already sees its id in the creator's slot; Terminate waits
// for the end and reports the exit code, also through a copy.
TEST(TarnThreadID, CreateStoresTheIdBeforeTheThreadRuns) {
  uint32_t code = 7;
  EXPECT_FALSE(TarnThreadID().GetExitCode(&code) || TarnThreadID().IsCurrent());
  for (int round = 0; round < 50; ++round) {
    TarnThreadID id;
    GateProbe probe{&id, round == 0 ? 30 : 0};
    ASSERT_EQ(id.Create(&ProbeEntry, &probe), 0);
    if (round == 0) {
      EXPECT_EQ(TarnThreadID(id).Terminate(&code), 0);  // a copy has a handle of its own
      EXPECT_NE(probe.seenAsCurrent.load(), 0u);        // the slow thread has ended
    }
    EXPECT_EQ(id.Terminate(&code), 0);
    EXPECT_EQ(code, 42u);
    EXPECT_EQ(probe.seenInCreatorSlot.load(), id.GetID());
    EXPECT_EQ(probe.seenAsCurrent.load(), id.GetID());
  }
}

TEST(TarnThread, TerminateWaitsTerminateAndContinueDoesNot) {
  for (bool wait : {true, false}) {
    auto routine = std::make_shared<CountingRoutine>();
    TarnThread thread(routine, UString("Counting Thread"));
    thread.Start();
    EXPECT_FALSE(thread.IsTerminated());
    wait ? thread.Terminate() : thread.TerminateAndContinue();
    EXPECT_EQ(routine->ended.load(), wait);
    EXPECT_TRUE(thread.IsTerminated());
    EXPECT_EQ(routine->onTerminateCalls.load(), 1);
    thread.GetID().Terminate();
    EXPECT_TRUE(routine->ended.load());
  }
}

TEST(TarnThread, ExceptionsFromRunAreSwallowed) {
  for (auto body : {std::function<void()>([] { throw std::runtime_error("ignored"); }),
                    std::function<void()>()}) {
    TarnThread t(std::make_shared<TarnFunctionThreadRoutine>(body), UString("Thrower"));
    t.Start();
    t.Terminate();
  }
}

// Slots and thread semaphores are per thread; slot values die with their
// thread, semaphores outlive it.
TEST(TarnThreadLocal, ValuesArePerThreadAndCleanedUpAtThreadExit) {
  static TarnThreadLocal<Tracked> slot;
  gDeaths = 0;
  std::atomic<int> sawOwn{0};
  std::vector<TarnSemaphore*> semaphores(4);
  test::RunThreads(4, [&](int id) {
    EXPECT_EQ(slot.Get(), nullptr);
    auto* mine = new Tracked;
    slot.Set(mine);
    semaphores[static_cast<size_t>(id)] = &TarnThreadID::DemandThreadSemaphore();
    EXPECT_EQ(semaphores[static_cast<size_t>(id)], &TarnThreadID::DemandThreadSemaphore());
    std::this_thread::sleep_for(5ms);
    if (slot.Get() == mine) sawOwn.fetch_add(1);
  });
  EXPECT_EQ(sawOwn.load(), 4);
  EXPECT_EQ(gDeaths.load(), 4);
  semaphores.push_back(&TarnThreadID::DemandThreadSemaphore());
  for (TarnSemaphore* s : semaphores) {
    EXPECT_EQ(std::count(semaphores.begin(), semaphores.end(), s), 1);
    s->signal();  // still alive after its thread ended
    EXPECT_EQ(s->timed_wait(0), TarnSemaphore::kSignalled);
  }
}

// One action at a time, on the worker; nested calls run inline; the locker
// wraps only the marked actions.
TEST(TarnWorkerThread, ServesCallersFromManyThreadsOneAtATime) {
  auto worker = MakeWorker();
  const TarnThreadID workerID = worker->GetThread();
  int64_t counter = 0;  // only touched by actions
  int inside = 0;
  std::atomic<int> wrong{0};  // off the worker, or overlapping
  test::RunThreads(4, [&](int) {
    for (int i = 0; i < 300; ++i) {
      LambdaAction action([&] {
        if (++inside != 1 || !workerID.IsCurrent()) wrong.fetch_add(1);
        ++counter;
        --inside;
        LambdaAction nested([&] { ++counter; });
        worker->DoAction(&nested);
      });
      worker->DoAction(&action);
    }
  });
  EXPECT_EQ(counter, 2400);
  EXPECT_EQ(wrong.load(), 0);
  CountingLocker locker;
  worker->registerLocker(&locker);
  LambdaAction plain([] {});
  LambdaAction marked([] {}, true);
  worker->DoAction(&plain);
  worker->DoAction(&marked);
  worker->DoAction(&plain, true);
  int value = 0;
  worker->DoAction([](void* arg) { *static_cast<int*>(arg) = 5; }, &value, true);
  EXPECT_EQ(value, 5);
  EXPECT_EQ(locker.locks, 3);
  EXPECT_EQ(locker.unlocks, 3);
  worker->registerLocker(nullptr);
  EndWorker(worker);
}

// The first error is reported again with every later action (which still
// runs); a foreign exception becomes -50. After Stop, actions run inline and
// report only their own errors.
TEST(TarnWorkerThread, LastErrorIsStickyUntilStop) {
  auto worker = MakeWorker();
  int ran = 0;
  LambdaAction counting([&] { ++ran; });
  LambdaAction foreign([] { throw std::runtime_error("not a TarnError"); });
  LambdaAction failing([] { throw TarnError(-36); });
  EXPECT_EQ(CatchError([&] { worker->DoAction(&foreign); }).GetIntErrorCode(), -50);
  for (int i = 0; i < 2; ++i)
    EXPECT_EQ(CatchError([&] { worker->DoAction(&counting); }).GetIntErrorCode(), -50);
  TarnThreadID ended = worker->GetThread();
  worker->Stop();
  EXPECT_FALSE(worker->GetThread().IsValid());
  EXPECT_EQ(ended.Terminate(), 0);
  EXPECT_EQ(CatchError([&] { worker->DoAction(&failing); }).GetIntErrorCode(), -36);
  EXPECT_NO_THROW(worker->DoAction(&counting));
  EXPECT_EQ(ran, 3);
  EndWorker(worker);
}
