// Locks, semaphores, the condition variable and the atomic helpers: exact
// semantics at the boundaries and bounded concurrency stress.
#include <gtest/gtest.h>

#include <atomic>
#include <cstdint>
#include <thread>
#include <vector>

#include "tarn/Threads/TarnAtomic.h"
#include "tarn/Threads/TarnConditionVariable.h"
#include "tarn/Threads/TarnMutex.h"
#include "tarn/Threads/TarnSemaphore.h"

using namespace tarn;

namespace {

template <class F>
void RunThreads(int count, F body) {
  std::vector<std::thread> threads;
  for (int i = 0; i < count; ++i) threads.emplace_back(body, i);
  for (auto& t : threads) t.join();
}

// Runs body on another thread and returns its result.
template <class F>
auto OnOtherThread(F body) {
  decltype(body()) result{};
  std::thread([&] { result = body(); }).join();
  return result;
}

}  // namespace

TEST(AtomicHelpers, ReturnValuesAtBoundaries) {
  volatile int32_t v = INT32_MAX - 1;
  EXPECT_EQ(AtomicAdd32Implementation(&v, 1), INT32_MAX - 1);
  EXPECT_EQ(AtomicAddAndReturn32Implementation(&v, -5), INT32_MAX - 5);
  volatile int64_t w = int64_t{1} << 40;
  EXPECT_EQ(AtomicAdd64Implementation(&w, 3), int64_t{1} << 40);
  EXPECT_EQ(AtomicLoad64(&w), (int64_t{1} << 40) + 3);
  EXPECT_FALSE(AtomicCompareAndSwap64(&w, 3, 4));
  EXPECT_TRUE(AtomicCompareAndSwap64(&w, (int64_t{1} << 40) + 3, -1));
  EXPECT_EQ(AtomicLoad64(&w), -1);

  volatile int32_t flag = 0;
  EXPECT_TRUE(AtomicTryLock(&flag));
  EXPECT_FALSE(AtomicTryLock(&flag));
  EXPECT_TRUE(AtomicTestAndClear32(&flag));
  EXPECT_FALSE(AtomicTestAndClear32(&flag));
  EXPECT_FALSE(AtomicTestAndSet32(&flag));
  EXPECT_TRUE(AtomicTestAndSet32(&flag));
  EXPECT_EQ(AtomicLoadAndStore32(&flag, 7), 1);
  AtomicStore32(&flag, -3);
  EXPECT_EQ(AtomicLoad32(&flag), -3);
  EXPECT_FALSE(AtomicCompareAndSwap32(&flag, 3, 0));
  EXPECT_TRUE(AtomicCompareAndSwap32(&flag, -3, 0));
}

TEST(AtomicHelpers, CompareAndSwap128ComparesBothHalves) {
  alignas(16) volatile uint64_t pair[2] = {1, 2};
  EXPECT_FALSE(AtomicCompareAndSwap128Implementation(pair, 1, 3, 9, 9));
  EXPECT_FALSE(AtomicCompareAndSwap128Implementation(pair, 0, 2, 9, 9));
  EXPECT_EQ(AtomicLoad64(&pair[0]), 1u);
  EXPECT_EQ(AtomicLoad64(&pair[1]), 2u);
  EXPECT_TRUE(AtomicCompareAndSwap128Implementation(pair, 1, 2, UINT64_MAX, 0x8000000000000000u));
  EXPECT_EQ(AtomicLoad64(&pair[0]), UINT64_MAX);
  EXPECT_EQ(AtomicLoad64(&pair[1]), 0x8000000000000000u);
}

// Many threads move a (counter, check) pair forward where check = ~counter*3;
// a lost or torn update breaks either the invariant or the final count.
TEST(AtomicHelpers, CompareAndSwap128Stress) {
  alignas(16) static volatile uint64_t pair[2] = {0, ~uint64_t{0}};
  constexpr int kThreads = 6;
  constexpr int kIncrements = 20000;
  std::atomic<int> broken{0};
  RunThreads(kThreads, [&](int) {
    for (int i = 0; i < kIncrements; ++i) {
      for (;;) {
        const uint64_t first = AtomicLoad64(&pair[0]);
        const uint64_t second = AtomicLoad64(&pair[1]);
        if (AtomicCompareAndSwap128Implementation(pair, first, second, first + 1,
                                                  ~((first + 1) * 3))) {
          if (second != ~(first * 3)) broken.fetch_add(1);
          break;
        }
      }
    }
  });
  EXPECT_EQ(broken.load(), 0);
  EXPECT_EQ(pair[0], uint64_t{kThreads} * kIncrements);
  EXPECT_EQ(pair[1], ~(uint64_t{kThreads} * kIncrements * 3));
}

TEST(CountingSemaphore, CountsAndCopies) {
  CountingSemaphore s(1);
  EXPECT_EQ(s.AtomicSubtractAndReturn(1), 0);
  s.AtomicSubtractAndReturn(1);
  EXPECT_EQ(s.GetValue(), -1);
  s.AtomicAdd(5);
  s.AtomicSubtract(2);
  EXPECT_EQ(s.GetValue(), 2);
  CountingSemaphore t(40);
  t = s;
  EXPECT_EQ(t.GetValue(), 2);
  RunThreads(4, [&](int) {
    for (int i = 0; i < 10000; ++i) t.AtomicAdd(1);
  });
  EXPECT_EQ(t.GetValue(), 40002);
}

TEST(TestAndSetSemaphore, SetsOnce) {
  TestAndSetSemaphore f;
  EXPECT_FALSE(f.Test());
  EXPECT_FALSE(f.TestAndSet());
  EXPECT_TRUE(f.Test());
  EXPECT_TRUE(f.TestAndSet());
  f.Clear();
  EXPECT_FALSE(f.Test());
  std::atomic<int> winners{0};
  RunThreads(6, [&](int) {
    if (!f.TestAndSet()) winners.fetch_add(1);
  });
  EXPECT_EQ(winners.load(), 1);
}

TEST(TarnSemaphore, KeepsAtMostOneHundredUnits) {
  TarnSemaphore s;
  for (int i = 0; i < 150; ++i) s.signal();
  int taken = 0;
  while (s.timed_wait(0) == TarnSemaphore::kSignalled) ++taken;
  EXPECT_EQ(taken, 100);
  s.signal();
  EXPECT_EQ(s.timed_wait(999), TarnSemaphore::kSignalled);
  EXPECT_EQ(s.timed_wait(500), TarnSemaphore::kTimedOut);
  EXPECT_EQ(s.timed_wait(2000), TarnSemaphore::kTimedOut);
}

TEST(TarnSemaphore, ProducersAndConsumersLoseNothing) {
  TarnSemaphore items;
  std::atomic<int> consumed{0};
  constexpr int kPerThread = 5000;
  std::vector<std::thread> threads;
  for (int c = 0; c < 2; ++c) {
    threads.emplace_back([&] {
      for (int i = 0; i < kPerThread; ++i) {
        items.wait();
        consumed.fetch_add(1);
      }
    });
  }
  // Keep the outstanding count well below the maximum: each producer waits
  // until consumers have caught up before signalling more.
  for (int p = 0; p < 2; ++p) {
    threads.emplace_back([&, p] {
      for (int i = 0; i < kPerThread; ++i) {
        while (2 * i + p - consumed.load() > 40) std::this_thread::yield();
        items.signal();
      }
    });
  }
  for (auto& t : threads) t.join();
  EXPECT_EQ(consumed.load(), 2 * kPerThread);
  EXPECT_EQ(items.timed_wait(0), TarnSemaphore::kTimedOut);
}

TEST(TarnBinarySemaphore, HoldsOneUnit) {
  TarnBinarySemaphore open(true);
  EXPECT_EQ(open.TimedWait(0), TarnBinarySemaphore::kSignalled);
  EXPECT_EQ(open.TimedWait(999999), TarnBinarySemaphore::kTimedOut);
  TarnBinarySemaphore closed;
  closed.Signal();
  closed.Signal();
  EXPECT_EQ(closed.TimedWait(0), TarnBinarySemaphore::kSignalled);
  EXPECT_EQ(closed.TimedWait(2000000), TarnBinarySemaphore::kTimedOut);
}

// Two threads bounce a token through two binary semaphores; a single lost
// wake-up hangs the test.
TEST(TarnBinarySemaphore, PingPongLosesNoWakeUp) {
  TarnBinarySemaphore ping, pong;
  constexpr int kRounds = 20000;
  int value = 0;  // handed back and forth under the semaphores
  std::thread partner([&] {
    for (int i = 0; i < kRounds; ++i) {
      ping.Wait();
      ++value;
      pong.Signal();
    }
  });
  for (int i = 0; i < kRounds; ++i) {
    ping.Signal();
    pong.Wait();
    ++value;
  }
  partner.join();
  EXPECT_EQ(value, 2 * kRounds);
}

TEST(WithBinarySemaphore, ExcludesOthers) {
  TarnBinarySemaphore gate(true);
  int64_t counter = 0;
  RunThreads(4, [&](int) {
    for (int i = 0; i < 5000; ++i) {
      WithBinarySemaphore hold(gate);
      ++counter;
    }
  });
  EXPECT_EQ(counter, 20000);
  EXPECT_EQ(gate.TimedWait(0), TarnBinarySemaphore::kSignalled);
}

TEST(TarnCoreMutex, ExcludesOthers) {
  TarnCoreMutex m;
  int64_t counter = 0;
  RunThreads(4, [&](int) {
    for (int i = 0; i < 20000; ++i) {
      m.lock();
      ++counter;
      m.unlock();
    }
  });
  EXPECT_EQ(counter, 80000);
  m.lock();
  EXPECT_FALSE(OnOtherThread([&] { return m.tryLock(); }));
  m.unlock();
  EXPECT_TRUE(OnOtherThread([&] {
    const bool got = m.tryLock();
    if (got) m.unlock();
    return got;
  }));
}

TEST(TarnCoreRecursiveMutex, NeedsAsManyUnlocksAsLocks) {
  TarnCoreRecursiveMutex m;
  m.lock();
  EXPECT_TRUE(m.tryLock());
  m.lock();
  std::atomic<bool> waiterIn{false};
  std::thread waiter([&] {
    m.lock();
    waiterIn = true;
    m.unlock();
  });
  for (int i = 0; i < 2; ++i) {
    m.unlock();
    EXPECT_FALSE(OnOtherThread([&] { return m.tryLock(); }));
    EXPECT_FALSE(waiterIn.load());
  }
  m.unlock();
  waiter.join();
  EXPECT_TRUE(waiterIn.load());
  EXPECT_TRUE(m.tryLock());
  m.unlock();
}

TEST(TarnCoreRecursiveMutex, UnlockByOtherThreadIsIgnored) {
  TarnCoreRecursiveMutex m;
  m.lock();
  std::thread([&] { m.unlock(); }).join();
  EXPECT_FALSE(OnOtherThread([&] { return m.tryLock(); }));
  m.unlock();
  EXPECT_TRUE(OnOtherThread([&] {
    const bool got = m.tryLock();
    if (got) m.unlock();
    return got;
  }));
}

TEST(TarnCoreRecursiveMutex, TagsReleaseWhatTheyTook) {
  TarnCoreRecursiveMutex m;
  TarnMutexLockTag held;
  m.lock(&held);
  EXPECT_TRUE(held.locked);
  EXPECT_EQ(held.mutex, &m);
  TarnMutexLockTag refused;
  EXPECT_FALSE(OnOtherThread([&] { return m.tryLock(&refused); }));
  EXPECT_FALSE(refused.locked);
  refused.unlock(refused.locked, refused.mutex);  // does nothing
  held.unlock(held.locked, held.mutex);
  EXPECT_TRUE(OnOtherThread([&] {
    TarnMutexLockTag tag;
    const bool got = m.tryLock(&tag);
    tag.unlock(tag.locked, tag.mutex);
    return got;
  }));
}

// Contended hand-off with re-entry and tryLock mixed in; a broken hand-off
// either loses increments or deadlocks.
TEST(TarnCoreRecursiveMutex, HandOffUnderContention) {
  TarnCoreRecursiveMutex m;
  int64_t counter = 0;
  int64_t inside = 0;
  std::atomic<int> overlaps{0};
  RunThreads(4, [&](int id) {
    for (int i = 0; i < 20000; ++i) {
      if ((i + id) % 3 == 0) {
        while (!m.tryLock()) std::this_thread::yield();
      } else {
        m.lock();
      }
      if (++inside != 1) overlaps.fetch_add(1);
      m.lock();  // re-entry
      ++counter;
      m.unlock();
      --inside;
      m.unlock();
    }
  });
  EXPECT_EQ(overlaps.load(), 0);
  EXPECT_EQ(counter, 80000);
  EXPECT_TRUE(m.tryLock());
  m.unlock();
}

TEST(TarnMutexLite, ReentersAndKnowsItsOwner) {
  TarnMutexLite m;
  EXPECT_FALSE(m.owningThreadIsCurrent());
  m.lock();
  EXPECT_TRUE(m.tryLock());
  EXPECT_TRUE(m.owningThreadIsCurrent());
  EXPECT_FALSE(OnOtherThread([&] { return m.tryLock(); }));
  m.unlock();
  EXPECT_TRUE(m.owningThreadIsCurrent());
  m.unlock();
  EXPECT_FALSE(m.owningThreadIsCurrent());
  int64_t counter = 0;
  RunThreads(4, [&](int) {
    for (int i = 0; i < 10000; ++i) {
      m.lock();
      m.lock();
      ++counter;
      m.unlock();
      m.unlock();
    }
  });
  EXPECT_EQ(counter, 40000);
}

TEST(TarnReadWriteLock, WriterReentersAndReadsWhileWriting) {
  TarnReadWriteLock lock;
  lock.lockForWrite();
  lock.lockForRead();
  EXPECT_TRUE(lock.tryLockForWrite());
  EXPECT_TRUE(lock.tryLockForRead());
  for (int i = 0; i < 4; ++i) {
    EXPECT_FALSE(OnOtherThread([&] { return lock.tryLockForRead(); }));
    lock.unlock();
  }
  EXPECT_TRUE(OnOtherThread([&] {
    const bool got = lock.tryLockForRead();
    if (got) lock.unlock();
    return got;
  }));
}

TEST(TarnReadWriteLock, ReadersShareWritersExclude) {
  TarnReadWriteLock lock;
  lock.lockForRead();
  EXPECT_TRUE(OnOtherThread([&] {
    const bool got = lock.tryLockForRead();
    if (got) lock.unlock();
    return got;
  }));
  EXPECT_FALSE(OnOtherThread([&] { return lock.tryLockForWrite(); }));
  lock.unlock();

  int64_t a = 0, b = 0;
  std::atomic<int> torn{0};
  RunThreads(4, [&](int id) {
    for (int i = 0; i < 5000; ++i) {
      if (id == 0) {
        lock.lockForWrite();
        lock.lockForWrite();
        ++a;
        lock.lockForRead();
        ++b;
        lock.unlock();
        lock.unlock();
        lock.unlock();
      } else {
        lock.lockForRead();
        if (a != b) torn.fetch_add(1);
        lock.unlock();
      }
    }
  });
  EXPECT_EQ(torn.load(), 0);
  EXPECT_EQ(a, 5000);
}

TEST(TarnConditionVariable, TimedWaitReportsTimeOut) {
  TarnConditionVariable cv;
  cv.lock();
  EXPECT_TRUE(cv.timedWait(1000000));
  EXPECT_FALSE(OnOtherThread([&] { return cv.tryLock(); }));  // held again
  cv.unlock();
  EXPECT_TRUE(OnOtherThread([&] {
    const bool got = cv.tryLock();
    if (got) cv.unlock();
    return got;
  }));
}

// A bounded queue of one slot: producers and consumers wait on the same
// condition; a lost wake-up hangs the test.
TEST(TarnConditionVariable, HandsOverEveryItem) {
  TarnConditionVariable cv;
  int slot = 0;  // 0 = empty
  int64_t sum = 0;
  constexpr int kItems = 5000;
  std::thread consumer([&] {
    for (int i = 0; i < 2 * kItems; ++i) {
      cv.lock();
      while (slot == 0) cv.wait();
      sum += slot;
      slot = 0;
      cv.broadcast();
      cv.unlock();
    }
  });
  RunThreads(2, [&](int) {
    for (int i = 1; i <= kItems; ++i) {
      cv.lock();
      while (slot != 0) cv.wait();
      slot = i;
      cv.broadcast();
      cv.unlock();
    }
  });
  consumer.join();
  EXPECT_EQ(sum, int64_t{kItems} * (kItems + 1));
}
