// HydraAllocator against the C runtime's allocator (glibc) and, where their
// Debian libraries load, mimalloc, jemalloc and tcmalloc, all in one run.
// Prints ratios ours / peer (below 1: ours is faster).
//
//   Small<Kind>:        one thread freeing and allocating 16-1024-byte blocks
//                       in a ring of 256 live blocks (about 130 KB);
//   SmallMany<Kind>:    the same with 4096 live blocks (about 2 MB, beyond
//                       the caches: mostly a measure of memory misses).
//   CrossThread<Kind>:  a producer allocates 16-1024-byte blocks and a
//                       consumer thread frees every one of them; they hand
//                       blocks over in batches of 64 and sleep (not spin)
//                       while waiting for each other.
//   Larson<Kind>:       two threads each replacing random blocks in an array
//                       of 1000 live blocks; after every round the arrays
//                       change hands, so most frees are of the other
//                       thread's blocks.
// Kind is Malloc (peers' malloc) or Calloc (peers' calloc); HydraAllocator
// always zero-fills, so its figures are the same in both. The peer
// "glibcMemset" is glibc's malloc with the requested bytes zeroed by memset
// in both kinds: the share of the gap to glibc's malloc that zero fill
// itself costs.
//
// The peers are loaded with dlopen and RTLD_LOCAL so that they do not
// replace the process's malloc. jemalloc needs static TLS room that glibc
// does not reserve for dlopen'ed libraries; the program re-runs itself once
// with GLIBC_TUNABLES set to provide it.
//
// Afterwards every workload runs once more with every allocator, each in a
// child process of its own, and the table of their peak resident memory
// (beyond an idle child's) follows, with ratio lines "<Workload>(peakRSS)".
//
// Usage: bench_AllocBench [--no-rss] [Google Benchmark flags]

#include <dlfcn.h>
#include <unistd.h>

#include <atomic>
#include <condition_variable>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <mutex>
#include <random>
#include <string>
#include <thread>
#include <vector>

#include "RatioReporter.h"
#include "tarn/MemAlloc/HydraAllocator.h"

namespace {

struct Api {
  std::string name;
  void* (*malloc)(std::size_t);
  void* (*calloc)(std::size_t, std::size_t);
  void (*free)(void*);
};

void* TarnMalloc(std::size_t n) { return tarn::HydraAllocator::Instance().Allocate(n); }
void* TarnCalloc(std::size_t n, std::size_t m) {
  return tarn::HydraAllocator::Instance().Allocate(n * m);
}
void TarnFree(void* p) { tarn::HydraAllocator::Instance().Deallocate(p); }

// glibc's malloc followed by a memset of the requested bytes: what the C
// runtime costs when it is made to zero-fill the way HydraAllocator must
// (its own calloc takes a slower path that bypasses its per-thread cache).
void* GlibcMallocZeroed(std::size_t n) {
  void* p = std::malloc(n);
  __asm__("" : "+r"(p));  // or the compiler turns malloc + memset into calloc
  return std::memset(p, 0, n);
}
void* GlibcMallocZeroedN(std::size_t n, std::size_t m) { return GlibcMallocZeroed(n * m); }

std::vector<Api> gApis;

void LoadPeer(const char* name, const char* library, const char* m, const char* c, const char* f) {
  void* handle = dlopen(library, RTLD_NOW | RTLD_LOCAL);
  if (!handle) {
    std::fprintf(stderr, "peer %s not loaded: %s\n", name, dlerror());
    return;
  }
  Api api{name, reinterpret_cast<void* (*)(std::size_t)>(dlsym(handle, m)),
          reinterpret_cast<void* (*)(std::size_t, std::size_t)>(dlsym(handle, c)),
          reinterpret_cast<void (*)(void*)>(dlsym(handle, f))};
  if (api.malloc && api.calloc && api.free)
    gApis.push_back(api);
  else
    std::fprintf(stderr, "peer %s lacks %s/%s/%s\n", name, m, c, f);
}

// 16..1024-byte sizes, the same sequence for every allocator.
const std::vector<std::size_t>& Sizes() {
  static const std::vector<std::size_t> sizes = [] {
    std::mt19937 rng(7);
    std::vector<std::size_t> s(4096);
    for (auto& v : s) v = 16 + rng() % 1009;
    return s;
  }();
  return sizes;
}

void* Get(const Api& api, bool zeroed, std::size_t n) {
  void* p = zeroed ? api.calloc(1, n) : api.malloc(n);
  static_cast<volatile char*>(p)[0] = 1;
  return p;
}

void Small(benchmark::State& state, const Api& api, bool zeroed) {
  const auto& sizes = Sizes();
  const std::size_t live = static_cast<std::size_t>(state.range(0));
  std::vector<void*> ring(live);
  for (std::size_t i = 0; i < ring.size(); ++i) ring[i] = Get(api, zeroed, sizes[i]);
  std::size_t i = 0, n = 0;
  for (auto _ : state) {
    for (int k = 0; k < 1000; ++k) {
      if (++i == live) i = 0;
      api.free(ring[i]);
      ring[i] = Get(api, zeroed, sizes[++n & 4095]);
    }
  }
  for (void* p : ring) api.free(p);
  state.SetItemsProcessed(state.iterations() * 1000);
}

// Hands blocks from a producer to a consumer in batches of 64 through a ring
// of 16 batches guarded by a mutex and two condition variables. Either side
// sleeps while it cannot go on (the producer when every batch is full, the
// consumer when none is), and a sleeper is woken only once the ring is half
// full (half empty) again, so that it wakes to a run of work instead of
// one batch at a time. On a machine with few processors neither side burns
// the other's time spinning or yielding, and the lock is taken twice per 64
// blocks on each side: what remains is mostly the allocators' own work. The
// ring is plain memory, so the hand-off itself allocates nothing.
class BatchHandoff {
 public:
  static constexpr unsigned kBatch = 64;

  // Producer: the batch to fill next; waits while every batch is full.
  void** Acquire() {
    std::unique_lock<std::mutex> hold(fMutex);
    while (fWritten - fRead == kBatches) {
      fProducerWaits = true;
      fNotFull.wait(hold);
      fProducerWaits = false;
    }
    return fSlots[fWritten % kBatches];
  }
  // Producer: hands over the acquired batch holding count blocks.
  void Publish(unsigned count) {
    bool wake;
    {
      std::lock_guard<std::mutex> hold(fMutex);
      fFill[fWritten % kBatches] = count;
      ++fWritten;
      wake = fConsumerWaits && fWritten - fRead >= kBatches / 2;
    }
    if (wake) fNotEmpty.notify_one();
  }
  void Finish() {
    {
      std::lock_guard<std::mutex> hold(fMutex);
      fDone = true;
    }
    fNotEmpty.notify_one();
  }
  // Consumer: the oldest batch and its count; false once finished and empty.
  bool Take(void**& batch, unsigned& count) {
    std::unique_lock<std::mutex> hold(fMutex);
    while (fWritten == fRead && !fDone) {
      fConsumerWaits = true;
      fNotEmpty.wait(hold);
      fConsumerWaits = false;
    }
    if (fWritten == fRead) return false;
    batch = fSlots[fRead % kBatches];
    count = fFill[fRead % kBatches];
    return true;
  }
  // Consumer: the taken batch may be filled again.
  void Release() {
    bool wake;
    {
      std::lock_guard<std::mutex> hold(fMutex);
      ++fRead;
      wake = fProducerWaits && fWritten - fRead <= kBatches / 2;
    }
    if (wake) fNotFull.notify_one();
  }

 private:
  static constexpr unsigned kBatches = 16;
  void* fSlots[kBatches][kBatch] = {};
  unsigned fFill[kBatches] = {};
  std::mutex fMutex;
  std::condition_variable fNotEmpty, fNotFull;
  // Guarded by fMutex. Invariant: 0 <= fWritten - fRead <= kBatches.
  unsigned fWritten = 0, fRead = 0;
  bool fProducerWaits = false, fConsumerWaits = false, fDone = false;
};

void CrossThread(benchmark::State& state, const Api& api, bool zeroed) {
  const auto& sizes = Sizes();
  BatchHandoff handoff;
  std::thread consumer([&] {
    void** batch;
    unsigned count;
    while (handoff.Take(batch, count)) {
      for (unsigned k = 0; k < count; ++k) api.free(batch[k]);
      handoff.Release();
    }
  });
  std::size_t i = 0;
  constexpr int kBatchesPerIteration = 160;
  for (auto _ : state) {
    for (int k = 0; k < kBatchesPerIteration; ++k) {
      void** batch = handoff.Acquire();
      for (unsigned b = 0; b < BatchHandoff::kBatch; ++b)
        batch[b] = Get(api, zeroed, sizes[i++ & 4095]);
      handoff.Publish(BatchHandoff::kBatch);
    }
  }
  handoff.Finish();
  consumer.join();
  state.SetItemsProcessed(state.iterations() * kBatchesPerIteration * BatchHandoff::kBatch);
}

void Larson(benchmark::State& state, const Api& api, bool zeroed) {
  const auto& sizes = Sizes();
  constexpr int kSlots = 1000, kOps = 20000;
  std::vector<void*> arrays[2];
  for (auto& a : arrays) {
    a.resize(kSlots);
    for (int s = 0; s < kSlots; ++s) a[s] = Get(api, zeroed, sizes[s]);
  }
  unsigned round = 0;
  for (auto _ : state) {
    auto work = [&](std::vector<void*>& slots, unsigned seed) {
      std::minstd_rand rng(seed);
      for (int k = 0; k < kOps; ++k) {
        const unsigned r = rng();
        const unsigned s = r % kSlots;
        api.free(slots[s]);
        slots[s] = Get(api, zeroed, sizes[(r >> 10) & 4095]);
      }
    };
    std::thread a(work, std::ref(arrays[round & 1]), round * 2 + 1);
    std::thread b(work, std::ref(arrays[(round + 1) & 1]), round * 2 + 2);
    a.join();
    b.join();
    ++round;
  }
  for (auto& a : arrays)
    for (void* p : a) api.free(p);
  state.SetItemsProcessed(state.iterations() * 2 * kOps);
}

// The workloads in registration order, for the resident-memory pass.
std::vector<std::string> gStems;

void Register(const char* stem, void (*fn)(benchmark::State&, const Api&, bool), bool zeroed,
              bool threaded, long arg = -1) {
  gStems.emplace_back(stem);
  for (const Api& api : gApis) {
    auto* b = benchmark::RegisterBenchmark(
        (std::string(stem) + "_" + api.name).c_str(),
        [fn, &api, zeroed](benchmark::State& s) { fn(s, api, zeroed); });
    if (arg >= 0) b->Arg(arg);
    if (threaded) b->MeasureProcessCPUTime()->UseRealTime();
  }
}

// Swallows a child's results: only its resident memory is of interest.
class QuietReporter : public benchmark::BenchmarkReporter {
 public:
  bool ReportContext(const Context&) override { return true; }
  void ReportRuns(const std::vector<Run>&) override {}
};

// In a child started with --rss-child=<filter>: runs the benchmarks
// matching filter (none for an empty one) for a fixed short time, quietly,
// then prints its peak resident kilobytes (the high-water mark of its own
// address space, which a fork's rusage would not give: that counts the
// parent's pages the child shared before it started again).
int RunRssChild(const char* program, const std::string& filter) {
  if (!filter.empty()) {
    std::string f = "--benchmark_filter=^" + filter + "(/|$)";
    std::string t = "--benchmark_min_time=0.2";
    std::string p = program;
    char* args[] = {p.data(), f.data(), t.data(), nullptr};
    int n = 3;
    benchmark::Initialize(&n, args);
    QuietReporter quiet;
    benchmark::RunSpecifiedBenchmarks(&quiet);
  }
  FILE* status = std::fopen("/proc/self/status", "r");
  if (!status) return 1;
  char line[256];
  long kb = -1;
  while (std::fgets(line, sizeof line, status))
    if (std::sscanf(line, "VmHWM: %ld kB", &kb) == 1) break;
  std::fclose(status);
  std::printf("%ld\n", kb);
  return kb < 0 ? 1 : 0;
}

// Peak resident kilobytes of a fresh process (this program started again,
// so that every allocator, the pool thread included, starts as in a real
// program) that runs the benchmarks matching filter; -1 on failure.
long ChildPeakKB(const std::string& filter) {
  char self[4096];
  const ssize_t length = readlink("/proc/self/exe", self, sizeof self - 1);
  if (length <= 0) return -1;
  self[length] = 0;
  const std::string command = std::string("'") + self + "' '--rss-child=" + filter + "'";
  std::fflush(stdout);
  FILE* child = popen(command.c_str(), "r");
  if (!child) return -1;
  long kb = -1;
  if (std::fscanf(child, "%ld", &kb) != 1) kb = -1;
  return pclose(child) == 0 ? kb : -1;
}

// Each workload with each allocator once more, each in a process of its
// own: the peak resident memory it needed beyond an idle child's, in MB.
void ReportPeakResidentMemory() {
  const long idle = ChildPeakKB("");
  std::printf("\nPeak resident memory, MB beyond an idle process (each run alone):\n%-18s",
              "workload");
  for (const Api& api : gApis) std::printf(" %11s", api.name.c_str());
  std::printf("\n");
  std::vector<std::vector<double>> table;  // MB per workload and allocator; -1: failed
  for (const std::string& stem : gStems) {
    std::vector<double>& mb = table.emplace_back();
    for (const Api& api : gApis) {
      const long kb = ChildPeakKB(stem + "_" + api.name);
      mb.push_back(kb < 0 ? -1.0 : static_cast<double>(kb > idle ? kb - idle : 0) / 1024.0);
    }
    std::printf("%-18s", stem.c_str());
    for (double v : mb) std::printf(" %11.1f", v);
    std::printf("\n");
  }
  // Ratios only against peers that needed at least 1 MB: below that the
  // figures are mostly page-granular noise.
  std::printf("\n");
  for (size_t w = 0; w < table.size(); ++w)
    for (size_t k = 1; k < gApis.size(); ++k)
      if (table[w][0] >= 0 && table[w][k] >= 1.0)
        tarn_bench::PrintRatio(gStems[w] + "(peakRSS)", gApis[k].name, table[w][0] / table[w][k]);
}

}  // namespace

int main(int argc, char** argv) {
  if (!std::getenv("GLIBC_TUNABLES")) {
    setenv("GLIBC_TUNABLES", "glibc.rtld.optional_static_tls=65536", 1);
    execv("/proc/self/exe", argv);  // on failure, carry on without the room
  }
  gApis.push_back({"Tarn", &TarnMalloc, &TarnCalloc, &TarnFree});
  gApis.push_back({"glibc", &std::malloc, &std::calloc, &std::free});
  gApis.push_back({"glibcMemset", &GlibcMallocZeroed, &GlibcMallocZeroedN, &std::free});
  LoadPeer("mimalloc", "libmimalloc.so.2", "mi_malloc", "mi_calloc", "mi_free");
  LoadPeer("jemalloc", "libjemalloc.so.2", "malloc", "calloc", "free");
  LoadPeer("tcmalloc", "libtcmalloc_minimal.so.4", "tc_malloc", "tc_calloc", "tc_free");
  Register("SmallMalloc", &Small, false, false, 256);
  Register("SmallCalloc", &Small, true, false, 256);
  Register("SmallManyMalloc", &Small, false, false, 4096);
  Register("SmallManyCalloc", &Small, true, false, 4096);
  Register("CrossThreadMalloc", &CrossThread, false, true);
  Register("CrossThreadCalloc", &CrossThread, true, true);
  Register("LarsonMalloc", &Larson, false, true);
  Register("LarsonCalloc", &Larson, true, true);
  if (argc == 2 && std::strncmp(argv[1], "--rss-child=", 12) == 0)
    return RunRssChild(argv[0], argv[1] + 12);
  // --no-rss leaves out the resident-memory pass.
  bool rss = true;
  for (int i = 1; i < argc; ++i) {
    if (std::strcmp(argv[i], "--no-rss") == 0) {
      rss = false;
      for (int k = i; k < argc; ++k) argv[k] = argv[k + 1];
      --argc;
      break;
    }
  }
  const int status = tarn_bench::RunWithRatios(argc, argv);
  if (rss) ReportPeakResidentMemory();
  return status;
}
