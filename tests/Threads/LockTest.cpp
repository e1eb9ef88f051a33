// Locks, semaphores, the condition variable and the atomic helpers: exact
// semantics at the boundaries and bounded concurrency stress.

#include "ThreadsTestUtil.h"
#include "tarn/Threads/TarnAtomic.h"
#include "tarn/Threads/TarnConditionVariable.h"
#include "tarn/Threads/TarnMutex.h"
#include "tarn/Threads/TarnSemaphore.h"

using namespace tarn;
using test::OnOtherThread;
using test::RunThreads;

namespace {

// Every kind of lock behind one interface.
template <class L, bool Reentrant>
struct PlainLock {
  static constexpr bool kReentrant = Reentrant;
  void lock() { l.lock(); }
  bool tryLock() { return l.tryLock(); }
  void unlock() { l.unlock(); }
  L l;
};
struct WriteLock {
  static constexpr bool kReentrant = true;
  void lock() { l.lockForWrite(); }
  bool tryLock() { return l.tryLockForWrite(); }
  void unlock() { l.unlock(); }
  TarnReadWriteLock l;
};
struct BinaryGate {
  static constexpr bool kReentrant = false;
  void lock() { l.Wait(); }
  bool tryLock() { return l.TimedWait(0) == TarnBinarySemaphore::kSignalled; }
  void unlock() { l.Signal(); }
  TarnBinarySemaphore l{true};
};

using LockKinds =
    ::testing::Types<PlainLock<TarnCoreMutex, false>, PlainLock<TarnCoreRecursiveMutex, true>,
                     PlainLock<TarnMutexLite, true>, WriteLock,
                     PlainLock<TarnConditionVariable, false>, BinaryGate>;

template <class L>
class AnyLock : public ::testing::Test {};
TYPED_TEST_SUITE(AnyLock, LockKinds);

template <class L>
bool TryAndRelease(L& l) {
  const bool got = l.tryLock();
  if (got) l.unlock();
  return got;
}

}  // namespace

// Held (re-entered three times where allowed), the lock shuts out other
// threads until the last unlock. Then, contended with tryLock and re-entry
// mixed in, a broken hand-off loses increments, overlaps, or deadlocks.
TYPED_TEST(AnyLock, ExcludesOthers) {
  TypeParam l;
  l.lock();
  if (TypeParam::kReentrant) {
    EXPECT_TRUE(l.tryLock());
    l.lock();
  }
  for (int i = 0; i < (TypeParam::kReentrant ? 3 : 1); ++i) {
    EXPECT_FALSE(OnOtherThread([&] { return l.tryLock(); })) << i;
    l.unlock();
  }
  EXPECT_TRUE(OnOtherThread([&] { return TryAndRelease(l); }));

  constexpr int kThreads = 4, kRounds = 10000;
  int64_t counter = 0, inside = 0;
  std::atomic<int> overlaps{0};
  RunThreads(kThreads, [&](int id) {
    for (int i = 0; i < kRounds; ++i) {
      if ((i + id) % 3 == 0) {
        while (!l.tryLock()) std::this_thread::yield();
      } else {
        l.lock();
      }
      if (++inside != 1) overlaps.fetch_add(1);
      if (TypeParam::kReentrant) l.lock();
      ++counter;
      if (TypeParam::kReentrant) l.unlock();
      --inside;
      l.unlock();
    }
  });
  EXPECT_EQ(overlaps.load(), 0);
  EXPECT_EQ(counter, int64_t{kThreads} * kRounds);
  EXPECT_TRUE(TryAndRelease(l));
}

// The other helpers forward to compiler builtins; these are the return
// conventions callers rely on, and the one real implementation.
TEST(AtomicHelpers, ReturnValuesAndCompareAndSwap128) {
  volatile int32_t v = INT32_MAX - 1;
  EXPECT_EQ(AtomicAdd32Implementation(&v, 1), INT32_MAX - 1);
  EXPECT_EQ(AtomicAddAndReturn32Implementation(&v, -5), INT32_MAX - 5);
  EXPECT_TRUE(AtomicTestAndSet32(&v));
  EXPECT_FALSE(AtomicTryLock(&v));
  alignas(16) volatile uint64_t pair[2] = {1, 2};  // both halves are compared
  EXPECT_FALSE(AtomicCompareAndSwap128Implementation(pair, 1, 3, 9, 9));
  EXPECT_FALSE(AtomicCompareAndSwap128Implementation(pair, 0, 2, 9, 9));
  EXPECT_TRUE(AtomicCompareAndSwap128Implementation(pair, 1, 2, ~0ull, 1ull << 63));
  EXPECT_EQ(pair[1], 1ull << 63);
}

// At most 100 units are kept; producers and consumers lose no wake-up.
TEST(TarnSemaphore, KeepsAtMostOneHundredUnitsAndLosesNothing) {
  TarnSemaphore items;
  for (int i = 0; i < 150; ++i) items.signal();
  int taken = 0;
  while (items.timed_wait(0) == TarnSemaphore::kSignalled) ++taken;
  EXPECT_EQ(taken, 100);
  std::atomic<int> consumed{0};
  constexpr int kPerThread = 5000;
  RunThreads(4, [&](int id) {
    const int p = id - 2;
    for (int i = 0; i < kPerThread; ++i) {
      if (p < 0) {
        items.wait();
        consumed.fetch_add(1);
      } else {
        // Stay well below the maximum count.
        while (2 * i + p - consumed.load() > 40) std::this_thread::yield();
        items.signal();
      }
    }
  });
  EXPECT_EQ(consumed.load(), 2 * kPerThread);
  EXPECT_EQ(items.timed_wait(2000), TarnSemaphore::kTimedOut);
}

TEST(TarnBinarySemaphore, HoldsOneUnit) {
  TarnBinarySemaphore b;
  b.Signal();
  b.Signal();  // lost
  EXPECT_EQ(b.TimedWait(0), TarnBinarySemaphore::kSignalled);
  EXPECT_EQ(b.TimedWait(2000000), TarnBinarySemaphore::kTimedOut);
}

// Of several sleeping timed waiters one signal wakes exactly one; the others
// time out and leave no trace: the next signal is kept for the next taker.
TEST(TarnBinarySemaphore, OneSignalServesOneOfManySleepers) {
  TarnBinarySemaphore b;
  std::atomic<int> taken{0}, timedOut{0};
  std::thread signaller([&] {
    std::this_thread::sleep_for(std::chrono::milliseconds(20));
    b.Signal();
  });
  RunThreads(4, [&](int) {
    const auto reason = b.TimedWait(300'000'000);
    (reason == TarnBinarySemaphore::kSignalled ? taken : timedOut).fetch_add(1);
  });
  signaller.join();
  EXPECT_EQ(taken.load(), 1);
  EXPECT_EQ(timedOut.load(), 3);
  EXPECT_EQ(b.TimedWait(0), TarnBinarySemaphore::kTimedOut);
  b.Signal();
  EXPECT_EQ(b.TimedWait(0), TarnBinarySemaphore::kSignalled);
}

// Two threads hand a turn back and forth through two semaphores, with both
// kinds of wait; a lost wake-up hangs here, a doubled one breaks the order.
TEST(TarnBinarySemaphore, PingPongLosesNoWakeUp) {
  constexpr int kRounds = 20000;
  TarnBinarySemaphore ping, pong;
  int turn = 0;
  std::thread other([&] {
    for (int i = 0; i < kRounds; ++i) {
      if (i % 2 == 0) {
        ping.Wait();
      } else {
        while (ping.TimedWait(1'000'000'000) != TarnBinarySemaphore::kSignalled) {
        }
      }
      EXPECT_EQ(turn, 2 * i + 1);
      ++turn;
      pong.Signal();
    }
  });
  for (int i = 0; i < kRounds; ++i) {
    EXPECT_EQ(turn, 2 * i);
    ++turn;
    ping.Signal();
    pong.Wait();
  }
  other.join();
  EXPECT_EQ(turn, 2 * kRounds);
}

TEST(TarnCoreRecursiveMutex, TagsReleaseWhatTheyTookAndOthersCannotUnlock) {
  TarnCoreRecursiveMutex m;
  TarnMutexLockTag held, refused;
  m.lock(&held);
  std::thread([&] { m.unlock(); }).join();  // ignored
  EXPECT_FALSE(OnOtherThread([&] { return m.tryLock(&refused); }));
  EXPECT_FALSE(refused.locked);
  refused.unlock(refused.locked, refused.mutex);  // does nothing
  held.unlock(held.locked, held.mutex);
  EXPECT_TRUE(OnOtherThread([&] { return TryAndRelease(m); }));
}

// Readers share and shut out writers; the writer's own read folds into its
// write hold; readers never see the writer's half-done work.
TEST(TarnReadWriteLock, ReadersShareWritersExclude) {
  TarnReadWriteLock lock;
  lock.lockForRead();
  EXPECT_FALSE(OnOtherThread([&] { return lock.tryLockForWrite(); }));
  EXPECT_TRUE(OnOtherThread([&] { return lock.tryLockForRead(); }));
  lock.unlock();
  lock.unlock();
  int64_t a = 0, b = 0;
  std::atomic<int> torn{0};
  RunThreads(4, [&](int id) {
    for (int i = 0; i < 5000; ++i) {
      id == 0 ? lock.lockForWrite() : lock.lockForRead();
      if (id == 0) {
        ++a;
        lock.lockForRead();
        ++b;
        lock.unlock();
      } else if (a != b) {
        torn.fetch_add(1);
      }
      lock.unlock();
    }
  });
  EXPECT_EQ(torn.load(), 0);
}

// A one-slot queue: producers and the consumer wait on the same condition;
// a lost wake-up hangs the test.
TEST(TarnConditionVariable, TimesOutAndHandsOverEveryItem) {
  TarnConditionVariable cv;
  cv.lock();
  EXPECT_TRUE(cv.timedWait(1000000));
  EXPECT_FALSE(OnOtherThread([&] { return cv.tryLock(); }));  // retaken
  cv.unlock();
  int slot = 0;  // 0 = empty
  int64_t sum = 0;
  constexpr int kItems = 3000;
  RunThreads(3, [&](int id) {
    for (int i = 1; i <= (id == 0 ? 2 * kItems : kItems); ++i) {
      cv.lock();
      while ((slot == 0) == (id == 0)) cv.wait();
      if (id == 0) {
        sum += slot;
        slot = 0;
      } else {
        slot = i;
      }
      cv.broadcast();
      cv.unlock();
    }
  });
  EXPECT_EQ(sum, int64_t{kItems} * (kItems + 1));
}
