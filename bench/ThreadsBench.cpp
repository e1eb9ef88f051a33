// Threads benchmarks, each against a peer in the same run; prints ratios
// (ours / peer, below 1 is faster for times, above 1 is better for rates).
//
//   CircularBuffer producer -> consumer throughput on two threads (8- and
//     64-byte records) vs boost::lockfree::spsc_queue and a mutex-guarded
//     std::deque, all with 1024 slots.
//   Uncontended lock/unlock of TarnCoreRecursiveMutex and TarnMutexLite vs
//     std::recursive_mutex.
//   Post-to-run latency of a TarnJobThread vs a std::condition_variable
//     worker.
//   Completion latency of a 4 KiB file read done on a background thread:
//     pread on a TarnJobThread vs pread on the condition-variable worker.
//
//   Time per job in a burst of posts (no waiting between posts): the same
//     two contenders.
//
// Usage: bench_ThreadsBench [seconds-scale, default 1] [rows...]
//   rows: throughput, lock, latency, burst, fileread (default: all)

#include <algorithm>
#include <atomic>
#include <boost/lockfree/spsc_queue.hpp>
#include <chrono>
#include <condition_variable>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <deque>
#include <functional>
#include <mutex>
#ifdef __linux__
#include <pthread.h>
#endif
#include <fcntl.h>
#include <unistd.h>

#include <random>
#include <thread>
#include <vector>

#include "RatioReporter.h"
#include "tarn/Threads/CircularBuffer.h"
#include "tarn/Threads/TarnJobThread.h"
#include "tarn/Threads/TarnMutex.h"

namespace {

using Clock = std::chrono::steady_clock;
double gScale = 1.0;

double Seconds(Clock::duration d) { return std::chrono::duration<double>(d).count(); }

template <size_t N>
struct Rec {
  uint64_t seq;
  unsigned char pad[N - 8];
};
template <>
struct Rec<8> {
  uint64_t seq;
};

constexpr int kSlots = 1024;

// Spin a little, then yield: on a loaded machine a side that spins through
// its time slice only delays the other side. Every contender uses it.
struct Backoff {
  int spins = 0;
  void operator()() {
    if (++spins >= 64) {
      spins = 0;
      std::this_thread::yield();
    }
  }
};

// Keeps the calling thread on one CPU. Left to the scheduler, the two sides
// of a transfer sometimes share one CPU and take turns (a whole buffer per
// turn, several times faster than any cross-core transfer), so rates swing
// five-fold between rounds; pinned, every round measures the cross-core case
// that a real producer and consumer face.
void PinToCpu(int cpu) {
#ifdef __linux__
  if (std::thread::hardware_concurrency() < 2) return;
  cpu_set_t set;
  CPU_ZERO(&set);
  CPU_SET(cpu, &set);
  pthread_setaffinity_np(pthread_self(), sizeof set, &set);
#else
  (void)cpu;
#endif
}

// Runs produce() and consume() on two threads, on two CPUs; returns records
// per second.
double Transfer(uint64_t count, const std::function<void(uint64_t)>& produce,
                const std::function<uint64_t(uint64_t)>& consume) {
  PinToCpu(0);
  const auto start = Clock::now();
  std::thread producer([&] {
    PinToCpu(1);
    produce(count);
  });
  const uint64_t sum = consume(count);
  producer.join();
  const double s = Seconds(Clock::now() - start);
  if (sum != count * (count - 1) / 2) {
    std::fprintf(stderr, "transfer lost records\n");
    std::exit(1);
  }
  return static_cast<double>(count) / s;
}

template <size_t N>
double CircularBufferRate(uint64_t count) {
  tarn::CircularBuffer b(static_cast<int32_t>(N), kSlots);
  return Transfer(
      count,
      [&](uint64_t n) {
        tarn::CircularBuffer::WriteTransaction w(b);
        Rec<N> r{};
        for (uint64_t i = 0; i < n; ++i) {
          r.seq = i;
          for (Backoff wait; !b.WriteRecord(w, r);) wait();
          b.Commit(w);
        }
      },
      [&](uint64_t n) {
        tarn::CircularBuffer::ReadTransaction rt(b);
        Rec<N> r;
        uint64_t sum = 0;
        for (uint64_t i = 0; i < n; ++i) {
          for (Backoff wait; !b.ReadRecord(rt, r);) wait();
          b.Commit(rt);
          sum += r.seq;
        }
        return sum;
      });
}

template <size_t N>
double BoostRate(uint64_t count) {
  boost::lockfree::spsc_queue<Rec<N>, boost::lockfree::capacity<kSlots + 1>> q;
  return Transfer(
      count,
      [&](uint64_t n) {
        Rec<N> r{};
        for (uint64_t i = 0; i < n; ++i) {
          r.seq = i;
          for (Backoff wait; !q.push(r);) wait();
        }
      },
      [&](uint64_t n) {
        Rec<N> r;
        uint64_t sum = 0;
        for (uint64_t i = 0; i < n; ++i) {
          for (Backoff wait; !q.pop(r);) wait();
          sum += r.seq;
        }
        return sum;
      });
}

template <size_t N>
double MutexDequeRate(uint64_t count) {
  std::mutex m;
  std::deque<Rec<N>> q;
  return Transfer(
      count,
      [&](uint64_t n) {
        Rec<N> r{};
        for (uint64_t i = 0; i < n;) {
          std::lock_guard<std::mutex> hold(m);
          if (q.size() < kSlots) {
            r.seq = i++;
            q.push_back(r);
          }
        }
      },
      [&](uint64_t n) {
        uint64_t sum = 0;
        for (uint64_t i = 0; i < n;) {
          std::lock_guard<std::mutex> hold(m);
          if (!q.empty()) {
            sum += q.front().seq;
            q.pop_front();
            ++i;
          }
        }
        return sum;
      });
}

double Median(std::vector<double> v) {
  std::nth_element(v.begin(), v.begin() + static_cast<std::ptrdiff_t>(v.size() / 2), v.end());
  return v[v.size() / 2];
}

template <size_t N>
void ThroughputRow() {
  // Rounds alternate between the contenders so that a burst of load from
  // elsewhere on the machine hits them alike; both the best and the median
  // round are shown.
  const auto count = static_cast<uint64_t>(4'000'000 * gScale);
  std::vector<double> ours, boost, deque;
  // A first, shorter round of each contender warms caches and allocator and
  // is not counted; the contender that goes first alternates.
  (void)CircularBufferRate<N>(count / 4);
  (void)BoostRate<N>(count / 4);
  for (int round = 0; round < 8; ++round) {
    if (round % 2 == 0) {
      ours.push_back(CircularBufferRate<N>(count));
      boost.push_back(BoostRate<N>(count));
    } else {
      boost.push_back(BoostRate<N>(count));
      ours.push_back(CircularBufferRate<N>(count));
    }
    if (round < 3) deque.push_back(MutexDequeRate<N>(count / 8));
  }
  const double bestOurs = *std::max_element(ours.begin(), ours.end());
  const double bestBoost = *std::max_element(boost.begin(), boost.end());
  const double bestDeque = *std::max_element(deque.begin(), deque.end());
  std::printf(
      "CircularBuffer %2zu-byte records, best: %6.1f M/s | boost::lockfree::spsc_queue "
      "%6.1f M/s ratio %.2f | mutex+std::deque %5.1f M/s ratio %.1f\n",
      N, bestOurs / 1e6, bestBoost / 1e6, bestOurs / bestBoost, bestDeque / 1e6,
      bestOurs / bestDeque);
  std::printf(
      "CircularBuffer %2zu-byte records, median: %6.1f M/s | boost::lockfree::spsc_queue "
      "%6.1f M/s ratio %.2f\n",
      N, Median(ours) / 1e6, Median(boost) / 1e6, Median(ours) / Median(boost));
  // As time per record, like every other ratio line.
  const std::string what = "CircularBuffer" + std::to_string(N) + "B";
  tarn_bench::PrintRatio(what, "boost::spsc_queue", Median(boost) / Median(ours));
  tarn_bench::PrintRatio(what, "mutex+std::deque", bestDeque / bestOurs);
}

// Nanoseconds per uncontended lock/unlock pair.
template <class M>
double LockPairNs(M& m) {
  const auto n = static_cast<int64_t>(20'000'000 * gScale);
  double best = 1e9;
  for (int round = 0; round < 3; ++round) {
    const auto start = Clock::now();
    for (int64_t i = 0; i < n; ++i) {
      m.lock();
      m.unlock();
    }
    best = std::min(best, Seconds(Clock::now() - start) * 1e9 / static_cast<double>(n));
  }
  return best;
}

void LockRow() {
  tarn::TarnCoreRecursiveMutex recursive;
  tarn::TarnMutexLite lite;
  std::recursive_mutex stdRecursive;
  const double ours = LockPairNs(recursive);
  const double liteNs = LockPairNs(lite);
  const double peer = LockPairNs(stdRecursive);
  std::printf(
      "uncontended lock+unlock: TarnCoreRecursiveMutex %.2f ns, TarnMutexLite %.2f ns | "
      "std::recursive_mutex %.2f ns | ratios %.2f, %.2f\n",
      ours, liteNs, peer, ours / peer, liteNs / peer);
  tarn_bench::PrintRatio("RecursiveMutex", "std::recursive_mutex", ours / peer);
  tarn_bench::PrintRatio("TarnMutexLite", "std::recursive_mutex", liteNs / peer);
}

// A minimal condition-variable worker: the usual hand-written job thread.
class CvWorker {
 public:
  CvWorker() : fThread([this] { Loop(); }) {}
  ~CvWorker() {
    {
      std::lock_guard<std::mutex> hold(fMutex);
      fStop = true;
    }
    fReady.notify_one();
    fThread.join();
  }
  void Post(std::function<void()> job) {
    {
      std::lock_guard<std::mutex> hold(fMutex);
      fJobs.push_back(std::move(job));
    }
    fReady.notify_one();
  }

 private:
  void Loop() {
    std::unique_lock<std::mutex> hold(fMutex);
    for (;;) {
      fReady.wait(hold, [&] { return fStop || !fJobs.empty(); });
      if (fJobs.empty()) return;
      auto job = std::move(fJobs.front());
      fJobs.pop_front();
      hold.unlock();
      job();
      hold.lock();
    }
  }
  std::mutex fMutex;
  std::condition_variable fReady;
  std::deque<std::function<void()>> fJobs;
  bool fStop = false;
  std::thread fThread;
};

// Runs the contenders' measurements in alternating rounds, so that a burst of
// load from elsewhere on the machine hits them alike, and returns the median
// of each contender's samples. measure(contender, samples) appends one round
// of samples.
template <class Measure>
std::vector<double> InterleavedMedians(int contenders, int rounds, Measure measure) {
  std::vector<std::vector<double>> samples(static_cast<size_t>(contenders));
  for (int round = 0; round < rounds; ++round) {
    for (int k = 0; k < contenders; ++k) {
      // The contender that goes first alternates too.
      const int c = (round % 2 == 0) ? k : contenders - 1 - k;
      measure(c, samples[static_cast<size_t>(c)]);
    }
  }
  std::vector<double> medians;
  for (auto& s : samples) medians.push_back(Median(s));
  return medians;
}

// One round of microseconds from posting a job to its start, the poster
// waiting until the job has run and pausing before posting the next. The
// poster sleeps rather than spins while it waits: a spinning poster holds one
// of the two CPUs, and a worker woken onto that CPU waits out the poster's
// time slice, which made one contender's median jump ten-fold at random.
template <class PostFn>
void PostToRunUs(PostFn post, std::vector<double>& samples) {
  const int n = std::max(20, static_cast<int>(300 * gScale));
  for (int i = 0; i < n; ++i) {
    std::atomic<int64_t> ranAt{0};
    const auto posted = Clock::now();
    post([&] {
      ranAt = Clock::now().time_since_epoch().count();
      ranAt.notify_one();
    });
    ranAt.wait(0);
    samples.push_back(static_cast<double>(ranAt.load() - posted.time_since_epoch().count()) / 1e3);
    std::this_thread::sleep_for(std::chrono::microseconds(50));
  }
}

void LatencyRow() {
  tarn::TarnJobThread jobs(tarn::UString("bench"), 0);
  jobs.Start();
  CvWorker worker;
  const auto medians = InterleavedMedians(2, 10, [&](int c, std::vector<double>& samples) {
    if (c == 0) {
      PostToRunUs([&](std::function<void()> f) { (void)jobs.Post(std::move(f)); }, samples);
    } else {
      PostToRunUs([&](std::function<void()> f) { worker.Post(std::move(f)); }, samples);
    }
  });
  jobs.Terminate();
  std::printf(
      "post-to-run latency (median): TarnJobThread %.1f us | std::condition_variable "
      "worker %.1f us | ratio %.2f\n",
      medians[0], medians[1], medians[0] / medians[1]);
  tarn_bench::PrintRatio("JobPostToRun", "condition_variable worker", medians[0] / medians[1]);
}

// One round of the time per job, in microseconds, when a burst of jobs is
// posted without waiting and the last one is awaited: the poster's and the
// worker's processor cost per job (allocation, queueing, wake-ups, freeing).
template <class PostFn>
void BurstUsPerJob(PostFn post, std::vector<double>& samples) {
  const int n = std::max(1000, static_cast<int>(20000 * gScale));
  std::atomic<int> ran{0};
  const auto start = Clock::now();
  for (int i = 0; i < n; ++i) post([&] { ran.fetch_add(1, std::memory_order_relaxed); });
  while (ran.load() != n) std::this_thread::yield();
  samples.push_back(Seconds(Clock::now() - start) * 1e6 / n);
}

void BurstRow() {
  tarn::TarnJobThread jobs(tarn::UString("bench"), 0);
  jobs.Start();
  CvWorker worker;
  const auto medians = InterleavedMedians(2, 10, [&](int c, std::vector<double>& samples) {
    if (c == 0) {
      BurstUsPerJob([&](std::function<void()> f) { (void)jobs.Post(std::move(f)); }, samples);
    } else {
      BurstUsPerJob([&](std::function<void()> f) { worker.Post(std::move(f)); }, samples);
    }
  });
  jobs.Terminate();
  std::printf(
      "burst of posts, time per job (median): TarnJobThread %.3f us | std::condition_variable "
      "worker %.3f us | ratio %.2f\n",
      medians[0], medians[1], medians[0] / medians[1]);
  tarn_bench::PrintRatio("JobBurst", "condition_variable worker", medians[0] / medians[1]);
}

// ---- Completion latency of 4 KiB file reads done on a background thread ----
//
// A reader issues a 4 KiB read at a random block of a 16 MiB file (in the
// page cache: what is measured is the hand-off, not the disk) and waits until
// it has completed. ReadCompletionUs times any such "issue and wait"; each
// contender is one FileReadIssuer. Today's contenders are pread on a
// TarnJobThread (waiting on the job's promise) and pread on the
// condition-variable worker (waiting on a mutex and condition variable).
// An asynchronous file reader of the library (the platform audio file's
// asynchronous read) belongs here as a further contender, compared with the
// condition-variable worker in the same run.

constexpr size_t kReadBlock = 4096;
constexpr size_t kReadFileBytes = 16u << 20;

// Issues a read of kReadBlock bytes at offset into buffer and returns once it
// has completed.
using FileReadIssuer = std::function<void(int fd, off_t offset, unsigned char* buffer)>;

void ReadBlock(int fd, off_t offset, unsigned char* buffer) {
  if (pread(fd, buffer, kReadBlock, offset) != static_cast<ssize_t>(kReadBlock)) {
    std::fprintf(stderr, "pread failed\n");
    std::exit(1);
  }
}

// A scratch file of kReadFileBytes, removed when done.
class ScratchFile {
 public:
  ScratchFile() {
    char path[] = "/tmp/tarn_bench_readXXXXXX";
    fFd = mkstemp(path);
    if (fFd < 0) {
      std::perror("mkstemp");
      std::exit(1);
    }
    unlink(path);
    std::vector<unsigned char> block(1 << 20);
    for (size_t i = 0; i < block.size(); ++i) block[i] = static_cast<unsigned char>(i * 131);
    for (size_t done = 0; done < kReadFileBytes; done += block.size()) {
      if (write(fFd, block.data(), block.size()) != static_cast<ssize_t>(block.size())) {
        std::perror("write");
        std::exit(1);
      }
    }
  }
  ~ScratchFile() { close(fFd); }
  ScratchFile(const ScratchFile&) = delete;
  ScratchFile& operator=(const ScratchFile&) = delete;
  [[nodiscard]] int Fd() const { return fFd; }

 private:
  int fFd;
};

// One round of microseconds from issuing a read to seeing it complete.
void ReadCompletionUs(const FileReadIssuer& issue, int fd, std::vector<double>& samples) {
  const int n = std::max(20, static_cast<int>(300 * gScale));
  std::mt19937 rng(static_cast<unsigned>(samples.size()));
  alignas(4096) static unsigned char buffer[kReadBlock];
  for (int i = 0; i < n; ++i) {
    const auto offset = static_cast<off_t>((rng() % (kReadFileBytes / kReadBlock)) * kReadBlock);
    const auto start = Clock::now();
    issue(fd, offset, buffer);
    samples.push_back(Seconds(Clock::now() - start) * 1e6);
    if (buffer[0] != static_cast<unsigned char>((offset % (1 << 20)) * 131)) {
      std::fprintf(stderr, "read returned the wrong bytes\n");
      std::exit(1);
    }
    std::this_thread::sleep_for(std::chrono::microseconds(50));
  }
}

void FileReadRow() {
  ScratchFile file;
  tarn::TarnJobThread jobs(tarn::UString("bench reader"), 0);
  jobs.Start();
  CvWorker worker;
  struct Contender {
    const char* label;  // for the human-readable line
    const char* tag;    // for the ratio line
    FileReadIssuer issue;
  };
  std::vector<Contender> issuers = {
      {"pread on TarnJobThread", "Read4KiBJobThread",
       [&](int fd, off_t offset, unsigned char* buffer) {
         jobs.Post([=] { ReadBlock(fd, offset, buffer); })->Get();
       }},
      {"pread on std::condition_variable worker", "pread on condition_variable worker",
       [&](int fd, off_t offset, unsigned char* buffer) {
         std::mutex m;
         std::condition_variable cv;
         bool done = false;
         worker.Post([&] {
           ReadBlock(fd, offset, buffer);
           std::lock_guard<std::mutex> hold(m);
           done = true;
           cv.notify_one();
         });
         std::unique_lock<std::mutex> hold(m);
         cv.wait(hold, [&] { return done; });
       }},
      // An asynchronous file reader of the library goes here, e.g.
      // {"PlatformAudioFile async read", "Read4KiBAsyncFile", ...}.
  };
  const auto medians = InterleavedMedians(
      static_cast<int>(issuers.size()), 10, [&](int c, std::vector<double>& samples) {
        ReadCompletionUs(issuers[static_cast<size_t>(c)].issue, file.Fd(), samples);
      });
  jobs.Terminate();
  const size_t peer = 1;  // the condition-variable worker
  for (size_t c = 0; c < issuers.size(); ++c) {
    if (c == peer) continue;
    std::printf("4 KiB read completion latency (median): %s %.1f us | %s %.1f us | ratio %.2f\n",
                issuers[c].label, medians[c], issuers[peer].label, medians[peer],
                medians[c] / medians[peer]);
    tarn_bench::PrintRatio(issuers[c].tag, issuers[peer].tag, medians[c] / medians[peer]);
  }
}

}  // namespace

int main(int argc, char** argv) {
  if (argc > 1) gScale = std::max(0.05, std::atof(argv[1]));
  // Further arguments pick rows: throughput, lock, latency, burst, fileread.
  auto wanted = [&](const char* row) {
    if (argc <= 2) return true;
    for (int i = 2; i < argc; ++i)
      if (std::strcmp(argv[i], row) == 0) return true;
    return false;
  };
  if (wanted("throughput")) {
    ThroughputRow<8>();
    ThroughputRow<64>();
  }
  if (wanted("lock")) LockRow();
  if (wanted("latency")) LatencyRow();
  if (wanted("burst")) BurstRow();
  if (wanted("fileread")) FileReadRow();
  return 0;
}
