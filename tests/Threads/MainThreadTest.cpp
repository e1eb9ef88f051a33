#include "tarn/Threads/TarnMainThread.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <numeric>
#include <thread>
#include <vector>

#include "ThreadsTestUtil.h"
#include "tarn/Basics/TarnCoreLibCallbacks.h"
#include "tarn/Threads/CIdleChore.h"

namespace tarn {
namespace {

using namespace std::chrono_literals;

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
  EXPECT_FALSE(a.IsScheduled());
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

TEST(CIdleChore, ErrorIsPrintedAndOnlyTheMainThreadMayPump) {
  RunIdleChores();
  CountingChore bad, good;
  bad.fail = true;
  bad.Assign();
  good.Assign();
  testing::internal::CaptureStderr();
  EXPECT_EQ(RunIdleChores(), 2);
  EXPECT_EQ(testing::internal::GetCapturedStderr(),
            "Unhandled exception: K S Sub 7 chore failed\n");
  EXPECT_EQ(good.runs, 1);
  std::thread([] {
    EXPECT_EQ(test::CatchError([] { RunIdleChores(); }).GetIntErrorCode(), -50);
  }).join();
}

TEST(CIdleChore, AssignFromAnotherThreadWakesThePump) {
  CountingChore chore;
  std::thread other([&] {
    std::this_thread::sleep_for(5ms);
    chore.Assign();
  });
  EXPECT_EQ(PumpMainThreadFor(100ms), 1);
  other.join();
  EXPECT_EQ(chore.runs, 1);
}

// Jobs posted by this thread run in order; worker threads wait for results.
TEST(TarnMainThread, JobsRunOnTheMainThread) {
  RunIdleChores();
  TarnMainThread& feeder = TarnMainThread::Instance();
  EXPECT_FALSE(feeder.IsCurrent());
  std::vector<int> order;
  std::atomic<bool> onMain{true};
  std::shared_ptr<TarnPromise<void>> last;
  for (int i = 0; i < 150; ++i) {
    last = feeder.Post([&, i] {
      order.push_back(i);
      onMain = onMain && IsMainThread();
    });
  }
  std::atomic<int> sum{0}, finished{0};
  std::thread workers([&] {
    test::RunThreads(3, [&](int w) {
      for (int i = 0; i < 20; ++i) sum += feeder.Post([=] { return w + i; })->Get();
    });
    finished = 1;
  });
  for (int spins = 0; spins < 2000 && !(finished && last->IsDone()); ++spins)
    PumpMainThreadFor(5ms);
  workers.join();
  EXPECT_EQ(sum.load(), 3 * 190 + 20 * (0 + 1 + 2));
  EXPECT_TRUE(onMain.load());
  std::vector<int> expected(150);
  std::iota(expected.begin(), expected.end(), 0);
  EXPECT_EQ(order, expected);
}

TEST(TarnMainThread, InterruptStatusNamesMainAndInterruptThreads) {
  std::atomic<uint32_t> workerID{0};
  std::atomic<bool> recorded{false}, inWorker{false};
  std::thread worker([&] {
    workerID = TarnThreadID::CurrentThreadRawID();
    while (!recorded.load()) std::this_thread::yield();
    inWorker = InMainThreadOrWorkerThread();
  });
  while (workerID.load() == 0) std::this_thread::yield();
  InitInterruptStatus(TarnThreadID(workerID.load()));
  recorded = true;
  EXPECT_TRUE(InMainThreadOrWorkerThread());
  EXPECT_FALSE(test::OnOtherThread([] { return InMainThreadOrWorkerThread(); }));
  worker.join();
  EXPECT_TRUE(inWorker.load());
}

}  // namespace
}  // namespace tarn
