#include "tarn/Threads/TarnJobThread.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "ThreadsTestUtil.h"

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
  EXPECT_FALSE(IsBlockingQueueInterrupted(JobCancelledError()));
  int v;
  EXPECT_FALSE(q.try_pop(v));
  q.push(5);
  EXPECT_EQ(q.pop(), 5);
}

// Several producers, one consumer, many blocks of the queue's chain.
TEST(BlockingQueueStress, ProducersKeepTheirOrder) {
  constexpr int kProducers = 4, kEach = 20000;
  for (bool wakeOnlyWhenWaiting : {false, true}) {
    blocking_queue<int> q(wakeOnlyWhenWaiting);
    std::thread producers([&] {
      test::RunThreads(kProducers, [&](int p) {
        for (int i = 0; i < kEach; ++i) q.push(p * kEach + i);
      });
    });
    std::vector<int> next(kProducers, 0);
    bool inOrder = true;
    for (int n = 0; n < kProducers * kEach; ++n) {
      const int v = q.pop();
      inOrder &= (v % kEach == next[static_cast<size_t>(v / kEach)]++);
    }
    producers.join();
    EXPECT_TRUE(inOrder) << wakeOnlyWhenWaiting;
    EXPECT_TRUE(q.empty());
  }
}

TEST(TarnJobQueueTypedJob, RunFulfilsFailsOrCancels) {
  auto job = MakeJob([] { return std::string("done"); });
  auto promise = job->GetPromise();
  EXPECT_FALSE(promise->TimedWait(1'000'000));
  job->Run();
  EXPECT_EQ(promise->Get(), "done");
  EXPECT_EQ(promise->Get(), "done");  // waiting twice does not block
  auto failing = MakeJob([]() -> int { throw TarnError(-50); });
  EXPECT_THROW(failing->Run(), TarnError);
  EXPECT_FALSE(failing->GetPromise()->Succeeded());
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
  std::vector<int> seen;
  std::atomic<bool> onJobThread{true};
  std::shared_ptr<TarnPromise<void>> last;
  for (int i = 0; i < 200; ++i) {
    if (i == 3) t.Start();
    last = t.Post([&, i] {
      seen.push_back(i);
      onJobThread = onJobThread && t.IsCurrent();
    });
  }
  last->Get();
  EXPECT_TRUE(onJobThread.load());
  EXPECT_FALSE(t.IsCurrent());
  ASSERT_EQ(seen.size(), 200u);
  for (int i = 0; i < 200; ++i) EXPECT_EQ(seen[static_cast<size_t>(i)], i);
  EXPECT_EQ(t.Post([] { return 6 * 7; })->Get(), 42);
  t.Terminate();
  EXPECT_TRUE(t.IsTerminated());
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
    for (auto& p : promises) p->Wait();
    gate->Get();
    EXPECT_FALSE(t.HasPendingJobs());
    for (int i = 0; i < 100; ++i) {
      auto& p = promises[static_cast<size_t>(i)];
      if (expectRun) {
        EXPECT_EQ(p->Get(), i);
      } else {
        EXPECT_TRUE(IsJobCancelled(p->GetError()));
      }
    }
  }
}

class RecordingDelegate : public TarnJobThreadDelegate {
 public:
  void ThreadStarted() override { started++; }
  void WaitAndRunJob(TarnJobQueue& queue) override {
    waits++;
    TarnJobThreadDelegate::WaitAndRunJob(queue);
  }
  void ThreadEnding() override { ended++; }
  std::atomic<int> started{0}, waits{0}, ended{0};
};

TEST(TarnJobThread, TerminateFromInsideAJobEndsAfterThatJob) {
  auto delegate = std::make_shared<RecordingDelegate>();
  TarnJobThread t(delegate, 0, UString("self"));
  t.Start();
  std::atomic<bool> gate{false};
  auto stopper = t.Post([&] {
    Eventually([&] { return gate.load(); });
    t.Terminate();
  });
  auto after = t.Post([] { return 1; });
  gate = true;
  stopper->Get();
  ASSERT_TRUE(Eventually([&] { return delegate->ended.load() == 1; }));
  EXPECT_TRUE(IsJobCancelled(CatchError([&] { (void)after->Get(); })));
  EXPECT_EQ(delegate->started.load(), 1);
  EXPECT_EQ(delegate->waits.load(), 1);
  t.Terminate();  // from outside now: the thread has ended already
}

TEST(TarnJobThread, UnhandledErrorIsPrintedAndTheThreadCarriesOn) {
  TarnJobThread t(UString("errors"), 0);
  t.Start();
  testing::internal::CaptureStderr();
  auto bad = t.Post(
      []() -> int { throw TarnError("MyKind", "MySystem", "MySubsystem", -4242, "it broke"); });
  auto silent = t.Post([]() -> int { throw TarnError(-36); });
  EXPECT_EQ(t.Post([] { return 3; })->Get(), 3);
  EXPECT_EQ(testing::internal::GetCapturedStderr(),
            "Unhandled exception: MyKind MySystem MySubsystem -4242 it broke\n"
            "Unhandled exception: OS   -36\n");
  EXPECT_EQ(bad->GetError().GetIntErrorCode(), -4242);
  EXPECT_EQ(silent->GetError().GetIntErrorCode(), -36);
  t.Terminate();
}

// Producers post jobs while the thread is being terminated. Every job either
// ran (once, in its producer's order), was cancelled, or is still queued.
TEST(TarnJobThreadStress, PostingWhileTerminating) {
  constexpr int kProducers = 4, kEach = 2500;
  for (int32_t flags :
       {0, TarnJobThread::kWakeOnlyWhenWaiting | TarnJobThread::kRunRemainingJobsAtExit}) {
    TarnJobThread t(UString("race"), flags);
    t.Start();
    std::vector<std::vector<std::shared_ptr<TarnPromise<void>>>> promises(kProducers);
    std::vector<int> lastRun(kProducers, -1);
    std::atomic<bool> outOfOrder{false};
    std::atomic<int> started{0};
    std::thread producers([&] {
      test::RunThreads(kProducers, [&](int p) {
        started++;
        auto& last = lastRun[static_cast<size_t>(p)];
        for (int i = 0; i < kEach; ++i) {
          promises[static_cast<size_t>(p)].push_back(t.Post([&, i] {
            if (last >= i) outOfOrder = true;
            last = i;
          }));
        }
      });
    });
    Eventually([&] { return started.load() == kProducers; });
    std::this_thread::sleep_for(1ms);
    t.Terminate();
    producers.join();
    int pending = 0;
    for (auto& list : promises) {
      for (auto& pr : list) {
        if (!pr->IsDone()) {
          pending++;
        } else if (!pr->Succeeded()) {
          EXPECT_TRUE(IsJobCancelled(pr->GetError()));
        }
      }
    }
    EXPECT_FALSE(outOfOrder.load());
    EXPECT_EQ(pending, t.GetJobQueue()->count());
  }
}

}  // namespace
}  // namespace tarn
