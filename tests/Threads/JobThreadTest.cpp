#include "tarn/Threads/TarnJobThread.h"
#include "tarn/Threads/TarnMainThread.h"

#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "ThreadsTestUtil.h"
#include "tarn/Basics/Singleton.h"
#include "tarn/Basics/TarnCoreLibCallbacks.h"
#include "tarn/Threads/CIdleChore.h"
#include "tarn/Threads/TarnThread.h"

namespace tarn {
namespace {

using namespace std::chrono_literals;
using test::CatchError;
using test::Eventually;

void ExpectThreadsError(const TarnError& e, std::string_view subsystem, std::string_view text) {
  EXPECT_EQ(e.GetKind().view(), "TarnThreads");
  EXPECT_EQ(e.GetSystem().view(), "TarnThreads");
  EXPECT_EQ(e.GetSubsystem().view(), subsystem);
  EXPECT_EQ(e.GetIntErrorCode(), 0);
  EXPECT_EQ(e.GetOptionalErrorString().view(), text);
}

// wake() alone lets a blocked pop wait on; interrupt() breaks it once.
TEST(BlockingQueue, WakeAndInterrupt) {
  blocking_queue<int> q;
  std::atomic<bool> interrupted{false};
  std::thread consumer([&] {
    const TarnError e = CatchError([&] { (void)q.pop(); });
    ExpectThreadsError(e, "blocking_queue", "Interrupted");
    interrupted = IsBlockingQueueInterrupted(e);
  });
  std::this_thread::sleep_for(20ms);
  q.wake();
  std::this_thread::sleep_for(20ms);
  EXPECT_FALSE(interrupted.load());
  q.interrupt();
  consumer.join();
  EXPECT_TRUE(interrupted.load());
  q.push(5);  // the interrupt was consumed
  EXPECT_EQ(q.pop(), 5);
}

TEST(TarnJobQueueTypedJob, RunFulfilsFailsOrCancels) {
  auto job = MakeJob([] { return std::string("done"); });
  job->Run();
  auto promise = job->GetPromise();
  EXPECT_EQ(promise->Get(), "done");
  EXPECT_EQ(promise->Get(), "done");  // waiting twice does not block
  auto failing = MakeJob([]() -> int { throw TarnError(-50); });
  EXPECT_THROW(failing->Run(), TarnError);
  EXPECT_EQ(CatchError([&] { (void)failing->GetPromise()->Get(); }).GetIntErrorCode(), -50);
  auto dropped = MakeJob([] {});
  dropped->Cancel();
  const TarnError e = CatchError([&] { dropped->GetPromise()->Get(); });
  ExpectThreadsError(e, "TarnJobQueue", "Job cancelled");
  EXPECT_TRUE(IsJobCancelled(e));
}

// Jobs queued before Start wait for it; all run in order on the thread.
TEST(TarnJobThread, RunsJobsInOrderOnItsOwnThread) {
  TarnJobThread t(UString("order"), 0);
  std::vector<int> seen, expected(200);
  std::iota(expected.begin(), expected.end(), 0);
  std::shared_ptr<TarnPromise<bool>> last;
  for (int i : expected) {
    if (i == 3) t.Start();
    last = t.Post([&, i] {
      seen.push_back(i);
      return t.IsCurrent();
    });
  }
  EXPECT_TRUE(last->Get());
  EXPECT_EQ(seen, expected);
  t.Terminate();
}

// A job holds the thread until it has been asked to stop, so that the jobs
// queued behind it are left for the drain.
TEST(TarnJobThread, TerminateDrainsQueuedJobs) {
  for (auto [flags, expectRun] : {std::pair{0, false},
                                  {TarnJobThread::kRunRemainingJobsAtExit, true},
                                  {TarnJobThread::kDoNotWaitAtTerminate, false}}) {
    SCOPED_TRACE(flags);
    TarnJobThread t(UString("drain"), flags);
    t.Start();
    std::atomic<bool> inGate{false};
    auto gate = t.Post([&] {
      inGate = true;
      Eventually([&] { return t.IsTerminated(); });
    });
    ASSERT_TRUE(Eventually([&] { return inGate.load(); }));
    std::vector<std::shared_ptr<TarnPromise<int>>> promises;
    for (int i = 0; i < 100; ++i) promises.push_back(t.Post([i] { return i; }));
    t.Terminate();
    gate->Get();
    for (int i = 0; i < 100; ++i) {
      auto& p = promises[static_cast<size_t>(i)];
      p->Wait();
      const int outcome = p->Succeeded() ? p->Get() : (IsJobCancelled(p->GetError()) ? -1 : -2);
      EXPECT_EQ(outcome, expectRun ? i : -1) << i;  // -1: cancelled
    }
  }
}

class RecordingDelegate : public TarnJobThreadDelegate {
 public:
  void ThreadStarted() override { waits = 100; }
  void WaitAndRunJob(TarnJobQueue& queue) override {
    waits++;
    TarnJobThreadDelegate::WaitAndRunJob(queue);
  }
  void ThreadEnding() override { ended++; }
  std::atomic<int> waits{0}, ended{0};
};

// The job that terminates runs to its end; the next one is cancelled. Its
// error, and those of jobs nobody asked about, are printed.
TEST(TarnJobThread, TerminateFromInsideAJobAndUnhandledErrors) {
  auto delegate = std::make_shared<RecordingDelegate>();
  TarnJobThread t(delegate, 0, UString("self"));
  t.Start();
  testing::internal::CaptureStderr();
  auto bad = t.Post(
      []() -> int { throw TarnError("MyKind", "MySystem", "MySubsystem", -4242, "it broke"); });
  auto silent = t.Post([]() -> int { throw TarnError(-36); });
  std::atomic<bool> gate{false};
  auto stopper = t.Post([&] {
    Eventually([&] { return gate.load(); });
    t.Terminate();
  });
  auto after = t.Post([] { return 1; });
  gate = true;
  stopper->Get();
  ASSERT_TRUE(Eventually([&] { return delegate->ended.load() == 1; }));
  EXPECT_EQ(testing::internal::GetCapturedStderr(),
            "Unhandled exception: MyKind MySystem MySubsystem -4242 it broke\n"
            "Unhandled exception: OS   -36\n");
  EXPECT_EQ(bad->GetError().GetIntErrorCode(), -4242);
  EXPECT_EQ(silent->GetError().GetIntErrorCode(), -36);
  EXPECT_TRUE(IsJobCancelled(CatchError([&] { (void)after->Get(); })));
  EXPECT_EQ(delegate->waits.load(), 103);  // started first, then one wait per job
  t.Terminate();                           // from outside now: the thread has ended already
}

// Producers post jobs, each waiting once for its own job to have run (a lost
// wake-up of the job thread hangs here), and go on posting while the thread
// is being terminated. Every job ran (once, in its producer's order), was
// cancelled, or is still queued.
TEST(TarnJobThreadStress, PostingWhileTerminating) {
  constexpr int kProducers = 4, kEach = 5000;
  for (int32_t flags :
       {0, TarnJobThread::kWakeOnlyWhenWaiting | TarnJobThread::kRunRemainingJobsAtExit}) {
    TarnJobThread t(UString("race"), flags);
    t.Start();
    std::vector<std::vector<std::shared_ptr<TarnPromise<void>>>> promises(kProducers);
    std::vector<int> lastRun(kProducers, -1);
    std::atomic<bool> outOfOrder{false};
    std::atomic<int> halfway{0};
    std::thread producers([&] {
      test::RunThreads(kProducers, [&](int p) {
        auto& mine = promises[static_cast<size_t>(p)];
        auto& last = lastRun[static_cast<size_t>(p)];
        for (int i = 0; i < kEach; ++i) {
          mine.push_back(t.Post([&, i] {
            outOfOrder = outOfOrder || last >= i;
            last = i;
          }));
          if (i == kEach / 2) {
            mine.back()->Wait();
            halfway++;
          }
        }
      });
    });
    EXPECT_TRUE(Eventually([&] { return halfway.load() == kProducers; }));
    t.Terminate();
    producers.join();
    int pending = 0;
    for (auto& list : promises) {
      for (auto& pr : list) {
        pending += !pr->IsDone();
        EXPECT_TRUE(!pr->IsDone() || pr->Succeeded() || IsJobCancelled(pr->GetError()));
      }
    }
    EXPECT_FALSE(outOfOrder.load());
    EXPECT_EQ(pending, t.GetJobQueue()->count());
  }
}

// ---- idle chores and the main thread ----

// Counts the library's requests for idle time.
class CountingCallbacks : public TarnCoreLibCallbacks {
 public:
  bool GetIndString(short, short, UString&) override { return false; }
  void RequestIdleTime() override { requests++; }
  std::atomic<int> requests{0};
};

// Counts its runs; may throw, or assign itself again from inside.
class CountingChore : public CIdleChore {
 public:
  ~CountingChore() override { Cancel(); }
  int runs = 0, rescheduleTimes = 0;
  bool fail = false;

 protected:
  void Action() override {
    ++runs;
    if (rescheduleTimes-- > 0) Assign();
    if (fail) throw TarnError("K", "S", "Sub", 7, "chore failed");
  }
};

TEST(CIdleChore, AssignOnceCancelAndReassignFromInside) {
  CountingCallbacks callbacks;
  TarnCoreLibCallbacks::SetCallbackAPI(&callbacks);
  RunIdleChores();  // this test's thread is the main thread from here on
  CountingChore a, b;
  a.Assign();
  a.Assign();
  EXPECT_EQ(callbacks.requests.load(), 1);
  EXPECT_EQ(RunIdleChores(), 1);
  EXPECT_EQ(RunIdleChores(), 0);
  a.Assign();
  a.Cancel();
  EXPECT_EQ(RunIdleChores(), 0);
  TarnCoreLibCallbacks::SetCallbackAPI(nullptr);
  a.rescheduleTimes = 2;
  a.Assign();
  b.Assign();
  EXPECT_EQ(RunIdleChores(), 2);  // a, b; a's new run waits
  EXPECT_TRUE(a.IsScheduled());
  EXPECT_EQ(RunIdleChores(), 1);
  EXPECT_EQ(RunIdleChores(), 1);
  EXPECT_EQ(RunIdleChores(), 0);
  EXPECT_EQ(a.runs, 4);
  EXPECT_EQ(b.runs, 1);
}

// A chore's error is printed and the pump carries on; another thread may
// assign (waking the pump) but not pump.
TEST(CIdleChore, ErrorIsPrintedAndOtherThreadsAssignButDoNotPump) {
  RunIdleChores();
  CountingChore bad, good;
  bad.fail = true;
  bad.Assign();
  std::thread other([&] {
    EXPECT_EQ(test::CatchError([] { RunIdleChores(); }).GetIntErrorCode(), -50);
    std::this_thread::sleep_for(5ms);
    good.Assign();
  });
  testing::internal::CaptureStderr();
  EXPECT_EQ(PumpMainThreadFor(100ms), 2);
  other.join();
  EXPECT_EQ(testing::internal::GetCapturedStderr(),
            "Unhandled exception: K S Sub 7 chore failed\n");
  EXPECT_EQ(good.runs, 1);
}

// Worker threads post to the feeder and wait for results computed on the
// main thread, which pumps.
TEST(TarnMainThread, JobsRunOnTheMainThread) {
  RunIdleChores();
  TarnMainThread& feeder = TarnMainThread::Instance();
  EXPECT_FALSE(feeder.IsCurrent());
  std::atomic<int> sum{0}, finished{0};
  std::thread workers([&] {
    test::RunThreads(3, [&](int w) {
      for (int i = 0; i < 20; ++i)
        sum += feeder.Post([=] { return IsMainThread() ? w + i : -1000; })->Get();
    });
    finished = 1;
  });
  for (int spins = 0; spins < 2000 && !finished; ++spins) PumpMainThreadFor(5ms);
  workers.join();
  EXPECT_EQ(sum.load(), 3 * 190 + 20 * (0 + 1 + 2));
}

// Unload (the process-wide singletons' destruction) cancels every job the
// main thread has not taken yet and waits for the feeder, so a thread waiting
// for such a job gets "Job cancelled" instead of waiting forever. Runs in a
// child process: the feeder cannot be built again once destroyed.
TEST(TarnMainThreadDeathTest, UnloadCancelsJobsNotHandedOver) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  EXPECT_EXIT(
      {
        TarnMainThread& feeder = TarnMainThread::Instance();
        std::vector<std::shared_ptr<TarnPromise<int>>> jobs;
        for (int i = 0; i < 10; ++i) jobs.push_back(feeder.Post([i] { return i; }));
        std::atomic<int> cancelled{0};
        std::thread waiter([&] {
          for (auto& job : jobs) {
            if (!job->TimedWait(10'000'000'000)) break;  // left waiting: a fault
            try {
              (void)job->Get();
            } catch (const TarnError& e) {
              cancelled += IsJobCancelled(e) ? 1 : 0;
            }
          }
        });
        std::this_thread::sleep_for(20ms);  // let the feeder hand some over
        SingletonManager::Instance().DestroyAll();
        waiter.join();
        std::fprintf(stderr, "cancelled %d\n", cancelled.load());
        std::fflush(stderr);
        std::_Exit(0);
      },
      testing::ExitedWithCode(0), "cancelled 10");
}

TEST(TarnMainThread, InterruptStatusNamesMainAndInterruptThreads) {
  std::atomic<bool> recorded{false}, inWorker{false};
  TarnThread worker(std::make_shared<TarnFunctionThreadRoutine>([&] {
                      while (!recorded) std::this_thread::yield();
                      inWorker = InMainThreadOrWorkerThread();
                    }),
                    UString("Interrupt"));
  worker.Start();
  InitInterruptStatus(worker.GetID());
  recorded = true;
  EXPECT_TRUE(InMainThreadOrWorkerThread());
  EXPECT_FALSE(test::OnOtherThread([] { return InMainThreadOrWorkerThread(); }));
  worker.Terminate();
  EXPECT_TRUE(inWorker.load());
}

}  // namespace
}  // namespace tarn
