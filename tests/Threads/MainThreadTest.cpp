#include "tarn/Threads/TarnMainThread.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <thread>
#include <vector>

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

class CountingChore : public CIdleChore {
 public:
  ~CountingChore() override { Cancel(); }
  int runs = 0;
  int rescheduleTimes = 0;

 protected:
  void Action() override {
    ++runs;
    if (rescheduleTimes > 0) {
      --rescheduleTimes;
      Assign();
    }
  }
};

TEST(CIdleChore, AssignSchedulesOnceAndCancelUnschedules) {
  CountingCallbacks callbacks;
  TarnCoreLibCallbacks::SetCallbackAPI(&callbacks);
  RunIdleChores();  // this test's thread is the main thread from here on
  CountingChore chore;
  EXPECT_FALSE(chore.IsScheduled());
  chore.Assign();
  chore.Assign();
  EXPECT_TRUE(chore.IsScheduled());
  EXPECT_EQ(callbacks.requests.load(), 1);
  EXPECT_EQ(RunIdleChores(), 1);
  EXPECT_EQ(chore.runs, 1);
  EXPECT_EQ(RunIdleChores(), 0);

  chore.Assign();
  chore.Cancel();
  EXPECT_FALSE(chore.IsScheduled());
  EXPECT_EQ(RunIdleChores(), 0);
  EXPECT_EQ(chore.runs, 1);
  TarnCoreLibCallbacks::SetCallbackAPI(nullptr);
}

TEST(CIdleChore, RescheduledFromInsideRunsOnTheNextPass) {
  CountingChore a, b;
  a.rescheduleTimes = 2;
  a.Assign();
  b.Assign();
  EXPECT_EQ(RunIdleChores(), 2);  // a, b; a's new run waits
  EXPECT_EQ(a.runs, 1);
  EXPECT_EQ(b.runs, 1);
  EXPECT_TRUE(a.IsScheduled());
  EXPECT_EQ(RunIdleChores(), 1);
  EXPECT_EQ(RunIdleChores(), 1);
  EXPECT_EQ(RunIdleChores(), 0);
  EXPECT_EQ(a.runs, 3);
}

class ThrowingChore : public CIdleChore {
 public:
  ~ThrowingChore() override { Cancel(); }

 protected:
  void Action() override { throw TarnError("K", "S", "Sub", 7, "chore failed"); }
};

TEST(CIdleChore, ErrorInAChoreIsPrintedAndThePumpCarriesOn) {
  RunIdleChores();
  ThrowingChore bad;
  CountingChore good;
  bad.Assign();
  good.Assign();
  testing::internal::CaptureStderr();
  EXPECT_EQ(RunIdleChores(), 2);
  EXPECT_EQ(testing::internal::GetCapturedStderr(),
            "Unhandled exception: K S Sub 7 chore failed\n");
  EXPECT_EQ(good.runs, 1);
}

TEST(CIdleChore, OnlyTheMainThreadMayPump) {
  RunIdleChores();
  std::atomic<int> code{0};
  std::thread other([&] {
    try {
      RunIdleChores();
    } catch (const TarnError& e) {
      code = e.GetIntErrorCode();
    }
  });
  other.join();
  EXPECT_EQ(code.load(), -50);
}

TEST(CIdleChore, AssignFromAnotherThreadWakesThePump) {
  CountingChore chore;
  std::thread other([&] {
    std::this_thread::sleep_for(5ms);
    chore.Assign();
  });
  // Returns after the whole duration, having run the chore once.
  EXPECT_EQ(PumpMainThreadFor(100ms), 1);
  other.join();
  EXPECT_EQ(chore.runs, 1);
}

TEST(TarnMainThread, JobsRunOnTheMainThreadInOrder) {
  RunIdleChores();
  TarnMainThread& feeder = TarnMainThread::Instance();
  EXPECT_EQ(&feeder, &TarnMainThread::Instance());
  EXPECT_FALSE(feeder.IsCurrent());
  std::vector<int> order;
  std::atomic<bool> onMain{true};
  std::vector<std::shared_ptr<TarnPromise<void>>> promises;
  for (int i = 0; i < 150; ++i) {
    promises.push_back(feeder.Post([&, i] {
      order.push_back(i);
      if (!IsMainThread()) onMain = false;
    }));
  }
  for (int spins = 0; spins < 1000 && !promises.back()->IsDone(); ++spins) PumpMainThreadFor(10ms);
  ASSERT_TRUE(promises.back()->IsDone());
  EXPECT_TRUE(onMain.load());
  ASSERT_EQ(order.size(), 150u);
  for (int i = 0; i < 150; ++i) EXPECT_EQ(order[static_cast<size_t>(i)], i);
}

TEST(TarnMainThread, WorkerThreadsWaitForMainThreadResults) {
  RunIdleChores();
  std::atomic<int> sum{0};
  std::atomic<int> finished{0};
  std::vector<std::thread> workers;
  for (int w = 0; w < 3; ++w) {
    workers.emplace_back([&, w] {
      for (int i = 0; i < 20; ++i)
        sum += TarnMainThread::Instance().Post([=] { return w + i; })->Get();
      finished++;
    });
  }
  for (int spins = 0; spins < 2000 && finished.load() < 3; ++spins) PumpMainThreadFor(5ms);
  for (auto& t : workers) t.join();
  EXPECT_EQ(sum.load(), 3 * 190 + 20 * (0 + 1 + 2));
}

TEST(TarnMainThread, InterruptStatusNamesMainAndInterruptThreads) {
  std::atomic<uint32_t> workerID{0};
  std::atomic<bool> recorded{false}, inWorker{false}, inOther{true};
  std::thread worker([&] {
    workerID = TarnThreadID::CurrentThreadRawID();
    while (!recorded.load()) std::this_thread::yield();
    inWorker = InMainThreadOrWorkerThread();
  });
  while (workerID.load() == 0) std::this_thread::yield();
  InitInterruptStatus(TarnThreadID(workerID.load()));
  recorded = true;
  EXPECT_TRUE(InMainThreadOrWorkerThread());
  std::thread other([&] { inOther = InMainThreadOrWorkerThread(); });
  other.join();
  worker.join();
  EXPECT_FALSE(inOther.load());
  EXPECT_TRUE(inWorker.load());
}

}  // namespace
}  // namespace tarn
