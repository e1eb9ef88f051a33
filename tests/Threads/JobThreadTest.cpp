#include "tarn/Threads/TarnJobThread.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

namespace tarn {
namespace {

using namespace std::chrono_literals;
using JobPtr = std::shared_ptr<TarnJobQueueJob>;

// Spins (with short sleeps) until done() or about 10 s have passed.
template <class Pred>
bool Eventually(Pred done) {
  for (int i = 0; i < 10000; ++i) {
    if (done()) return true;
    std::this_thread::sleep_for(1ms);
  }
  return done();
}

TarnError CatchError(const std::function<void()>& f) {
  try {
    f();
  } catch (const TarnError& e) {
    return e;
  }
  ADD_FAILURE() << "no TarnError thrown";
  return TarnError();
}

// ---- blocking_queue ------------------------------------------------------

TEST(BlockingQueue, KeepsOrderAcrossBlocks) {
  blocking_queue<int> q;
  for (int i = 0; i < 64 * 3 + 5; ++i) q.push(i);
  EXPECT_EQ(q.count(), 64 * 3 + 5);
  for (int i = 0; i < 64 * 3 + 5; ++i) {
    int v = -1;
    ASSERT_TRUE(q.try_pop(v));
    ASSERT_EQ(v, i);
    if (i == 70) q.push(1000);  // pushes while the consumer is inside the chain
  }
  EXPECT_EQ(q.pop(), 1000);
  int v;
  EXPECT_FALSE(q.try_pop(v));
  EXPECT_TRUE(q.empty());
}

TEST(BlockingQueue, InterruptThrowsOnceWithItsError) {
  blocking_queue<int> q;
  q.interrupt();
  const TarnError e = CatchError([&] { (void)q.pop(); });
  EXPECT_EQ(e.GetKind().view(), "TarnThreads");
  EXPECT_EQ(e.GetSystem().view(), "TarnThreads");
  EXPECT_EQ(e.GetSubsystem().view(), "blocking_queue");
  EXPECT_EQ(e.GetIntErrorCode(), 0);
  EXPECT_EQ(e.GetOptionalErrorString().view(), "Interrupted");
  EXPECT_TRUE(IsBlockingQueueInterrupted(e));
  EXPECT_FALSE(IsBlockingQueueInterrupted(JobCancelledError()));
  // The request is consumed: the next pop waits for an item.
  q.push(5);
  EXPECT_EQ(q.pop(), 5);
}

TEST(BlockingQueue, WakeOnEmptyMakesTheConsumerWaitAgain) {
  blocking_queue<int> q;
  std::atomic<int> got{-1};
  std::thread consumer([&] { got = q.pop(); });
  std::this_thread::sleep_for(20ms);
  q.wake();
  std::this_thread::sleep_for(20ms);
  EXPECT_EQ(got.load(), -1);
  q.push(7);
  consumer.join();
  EXPECT_EQ(got.load(), 7);
}

TEST(BlockingQueue, InterruptBreaksABlockedWait) {
  blocking_queue<int> q;
  std::atomic<bool> interrupted{false};
  std::thread consumer([&] {
    try {
      (void)q.pop();
    } catch (const TarnError& e) {
      interrupted = IsBlockingQueueInterrupted(e);
    }
  });
  std::this_thread::sleep_for(10ms);
  q.interrupt();
  consumer.join();
  EXPECT_TRUE(interrupted.load());
}

// Several producers, one consumer; with and without the empty-only signal.
void ManyProducersOneConsumer(bool wakeOnlyWhenWaiting) {
  constexpr int kProducers = 4, kEach = 20000;
  blocking_queue<int> q(wakeOnlyWhenWaiting);
  std::vector<std::thread> producers;
  for (int p = 0; p < kProducers; ++p)
    producers.emplace_back([&q, p] {
      for (int i = 0; i < kEach; ++i) q.push(p * kEach + i);
    });
  std::vector<int> next(kProducers, 0);
  bool inOrder = true;
  for (int n = 0; n < kProducers * kEach; ++n) {
    const int v = q.pop();
    const int p = v / kEach;
    inOrder &= (v % kEach == next[static_cast<size_t>(p)]++);
  }
  for (auto& t : producers) t.join();
  EXPECT_TRUE(inOrder);
  EXPECT_TRUE(q.empty());
}

TEST(BlockingQueueStress, ProducersKeepTheirOrder) { ManyProducersOneConsumer(false); }
TEST(BlockingQueueStress, ProducersKeepTheirOrderWithWakeOnlyWhenWaiting) {
  ManyProducersOneConsumer(true);
}

// ---- promises and jobs ---------------------------------------------------

TEST(TarnJobQueueTypedJob, RunFulfilsAndCancelReportsJobCancelled) {
  auto job = MakeJob([] { return std::string("done"); });
  auto promise = job->GetPromise();
  EXPECT_FALSE(promise->IsDone());
  EXPECT_FALSE(promise->TimedWait(1'000'000));
  job->Run();
  EXPECT_TRUE(promise->IsDone());
  EXPECT_TRUE(promise->Succeeded());
  EXPECT_EQ(promise->Get(), "done");
  EXPECT_EQ(promise->Get(), "done");  // waiting twice does not block

  auto dropped = MakeJob([] {});
  dropped->Cancel();
  const TarnError e = CatchError([&] { dropped->GetPromise()->Get(); });
  EXPECT_EQ(e.GetKind().view(), "TarnThreads");
  EXPECT_EQ(e.GetSystem().view(), "TarnThreads");
  EXPECT_EQ(e.GetSubsystem().view(), "TarnJobQueue");
  EXPECT_EQ(e.GetIntErrorCode(), 0);
  EXPECT_EQ(e.GetOptionalErrorString().view(), "Job cancelled");
  EXPECT_TRUE(IsJobCancelled(e));
}

TEST(TarnJobQueueTypedJob, ThrowingJobFailsItsPromiseAndRethrows) {
  auto job = MakeJob([]() -> int { throw TarnError(-50); });
  EXPECT_THROW(job->Run(), TarnError);
  EXPECT_FALSE(job->GetPromise()->Succeeded());
  EXPECT_EQ(job->GetPromise()->GetError().GetIntErrorCode(), -50);
  EXPECT_EQ(CatchError([&] { (void)job->GetPromise()->Get(); }).GetIntErrorCode(), -50);
}

// ---- job threads ---------------------------------------------------------

TEST(TarnJobThread, RunsJobsInOrderOnItsOwnThread) {
  TarnJobThread t(UString("order"), 0);
  EXPECT_TRUE(t.IsTerminated());  // not started yet
  std::vector<int> seen;
  std::atomic<bool> onJobThread{true};
  // Queued before Start: they wait for the thread.
  for (int i = 0; i < 3; ++i) t.Post([&, i] { seen.push_back(i); });
  EXPECT_TRUE(t.HasPendingJobs());
  t.Start();
  EXPECT_FALSE(t.IsCurrent());
  std::shared_ptr<TarnPromise<void>> last;
  for (int i = 3; i < 200; ++i) {
    last = t.Post([&, i] {
      seen.push_back(i);
      if (!t.IsCurrent()) onJobThread = false;
    });
  }
  last->Get();
  EXPECT_TRUE(onJobThread.load());
  ASSERT_EQ(seen.size(), 200u);
  for (int i = 0; i < 200; ++i) EXPECT_EQ(seen[static_cast<size_t>(i)], i);
  EXPECT_EQ(t.Post([] { return 6 * 7; })->Get(), 42);
  t.SetPriority(TarnJobThread::kDefaultPriority);
  t.SetPriority(static_cast<TarnJobThread::Priority>(3));
  t.SetPriority(TarnJobThread::kHighPriority);
  EXPECT_EQ(t.Post([] { return 1; })->Get(), 1);
  t.Terminate();
  EXPECT_TRUE(t.IsTerminated());
  EXPECT_FALSE(t.HasPendingJobs());
}

// Blocks the job thread in a job until the thread has been asked to stop, so
// that the jobs queued behind it are left for the drain.
void TerminateWithQueuedJobs(int32_t flags, bool expectRun) {
  TarnJobThread t(UString("drain"), flags);
  t.Start();
  std::atomic<bool> inGate{false};
  auto gate = t.Post([&] {
    inGate = true;
    Eventually([&] { return t.IsTerminated(); });
  });
  ASSERT_TRUE(Eventually([&] { return inGate.load(); }));
  std::atomic<int> ran{0};
  std::vector<std::shared_ptr<TarnPromise<int>>> promises;
  for (int i = 0; i < 100; ++i) promises.push_back(t.Post([&ran, i] { return ++ran, i; }));
  t.Terminate();
  if (flags & TarnJobThread::kDoNotWaitAtTerminate) {
    for (auto& p : promises) p->Wait();
  }
  gate->Get();
  EXPECT_FALSE(t.HasPendingJobs());
  for (int i = 0; i < 100; ++i) {
    auto& p = promises[static_cast<size_t>(i)];
    ASSERT_TRUE(p->IsDone());
    if (expectRun) {
      EXPECT_EQ(p->Get(), i);
    } else {
      EXPECT_TRUE(IsJobCancelled(p->GetError()));
    }
  }
  EXPECT_EQ(ran.load(), expectRun ? 100 : 0);
}

TEST(TarnJobThread, TerminateCancelsQueuedJobs) { TerminateWithQueuedJobs(0, false); }
TEST(TarnJobThread, TerminateRunsQueuedJobsWhenAsked) {
  TerminateWithQueuedJobs(TarnJobThread::kRunRemainingJobsAtExit, true);
}
TEST(TarnJobThread, TerminateWithoutWaitingStillDrains) {
  TerminateWithQueuedJobs(TarnJobThread::kDoNotWaitAtTerminate, false);
}

// Records the delegate calls.
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
  std::atomic<bool> returned{false};
  std::atomic<bool> gate{false};
  auto stopper = t.Post([&] {
    Eventually([&] { return gate.load(); });
    t.Terminate();
    returned = true;
  });
  auto after = t.Post([] { return 1; });
  gate = true;
  stopper->Get();
  EXPECT_TRUE(returned.load());
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
  auto good = t.Post([] { return 3; });
  EXPECT_EQ(good->Get(), 3);
  const std::string err = testing::internal::GetCapturedStderr();
  EXPECT_EQ(err,
            "Unhandled exception: MyKind MySystem MySubsystem -4242 it broke\n"
            "Unhandled exception: OS   -36\n");
  EXPECT_EQ(bad->GetError().GetIntErrorCode(), -4242);
  EXPECT_EQ(silent->GetError().GetIntErrorCode(), -36);
  t.Terminate();
}

// Producers post jobs while the thread is being terminated. Every job either
// ran (once, in its producer's order), was cancelled, or is still queued.
void PostWhileTerminating(int32_t flags) {
  constexpr int kProducers = 4, kEach = 2500;
  TarnJobThread t(UString("race"), flags);
  t.Start();
  std::vector<std::vector<std::shared_ptr<TarnPromise<void>>>> promises(kProducers);
  std::vector<int> lastRun(kProducers, -1);
  std::atomic<bool> outOfOrder{false};
  std::atomic<int> started{0};
  std::vector<std::thread> producers;
  for (int p = 0; p < kProducers; ++p) {
    producers.emplace_back([&, p] {
      started++;
      for (int i = 0; i < kEach; ++i) {
        promises[static_cast<size_t>(p)].push_back(t.Post([&, p, i] {
          if (lastRun[static_cast<size_t>(p)] >= i) outOfOrder = true;
          lastRun[static_cast<size_t>(p)] = i;
        }));
      }
    });
  }
  Eventually([&] { return started.load() == kProducers; });
  std::this_thread::sleep_for(1ms);
  t.Terminate();
  for (auto& th : producers) th.join();
  int ran = 0, cancelled = 0, pending = 0;
  for (auto& list : promises) {
    for (auto& pr : list) {
      if (!pr->IsDone()) {
        pending++;
      } else if (pr->Succeeded()) {
        ran++;
      } else {
        EXPECT_TRUE(IsJobCancelled(pr->GetError()));
        cancelled++;
      }
    }
  }
  EXPECT_FALSE(outOfOrder.load());
  EXPECT_EQ(ran + cancelled + pending, kProducers * kEach);
  EXPECT_EQ(pending, t.GetJobQueue()->count());
}

TEST(TarnJobThreadStress, PostingWhileTerminating) { PostWhileTerminating(0); }
TEST(TarnJobThreadStress, PostingWhileTerminatingWakeOnlyWhenWaiting) {
  PostWhileTerminating(TarnJobThread::kWakeOnlyWhenWaiting |
                       TarnJobThread::kRunRemainingJobsAtExit);
}

}  // namespace
}  // namespace tarn
