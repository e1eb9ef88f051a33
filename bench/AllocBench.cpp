// HydraAllocator against the C runtime's allocator (glibc) and, where their
// Debian libraries load, mimalloc, jemalloc and tcmalloc, all in one run.
// Prints ratios ours / peer (below 1: ours is faster).
//
//   Small<Kind>:        one thread freeing and allocating 16-1024-byte blocks
//                       in a ring of 256 live blocks (about 130 KB);
//   SmallMany<Kind>:    the same with 4096 live blocks (about 2 MB, beyond
//                       the caches: mostly a measure of memory misses).
//   CrossThread<Kind>:  a producer allocates 16-1024-byte blocks and a
//                       consumer thread frees every one of them.
//   Larson<Kind>:       two threads each replacing random blocks in an array
//                       of 1000 live blocks; after every round the arrays
//                       change hands, so most frees are of the other
//                       thread's blocks.
// Kind is Malloc (peers' malloc) or Calloc (peers' calloc); HydraAllocator
// always zero-fills, so its figures are the same in both.
//
// The peers are loaded with dlopen and RTLD_LOCAL so that they do not
// replace the process's malloc. jemalloc needs static TLS room that glibc
// does not reserve for dlopen'ed libraries; the program re-runs itself once
// with GLIBC_TUNABLES set to provide it.
//
// Usage: bench_AllocBench [Google Benchmark flags]

#include <dlfcn.h>
#include <unistd.h>

#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <cstring>
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

// A single-producer single-consumer ring of pointers.
class Handoff {
 public:
  bool Put(void* p) {
    const unsigned w = fWrite.load(std::memory_order_relaxed);
    if (w - fRead.load(std::memory_order_acquire) == kSlots) return false;
    fSlots[w % kSlots] = p;
    fWrite.store(w + 1, std::memory_order_release);
    return true;
  }
  void* Take() {
    const unsigned r = fRead.load(std::memory_order_relaxed);
    if (r == fWrite.load(std::memory_order_acquire)) return nullptr;
    void* p = fSlots[r % kSlots];
    fRead.store(r + 1, std::memory_order_release);
    return p;
  }

 private:
  static constexpr unsigned kSlots = 1024;
  void* fSlots[kSlots] = {};
  alignas(64) std::atomic<unsigned> fWrite{0};
  alignas(64) std::atomic<unsigned> fRead{0};
};

void CrossThread(benchmark::State& state, const Api& api, bool zeroed) {
  const auto& sizes = Sizes();
  Handoff handoff;
  std::atomic<bool> done{false};
  std::thread consumer([&] {
    for (;;) {
      if (void* p = handoff.Take()) {
        api.free(p);
      } else if (done.load()) {
        while (void* q = handoff.Take()) api.free(q);
        return;
      } else {
        std::this_thread::yield();
      }
    }
  });
  std::size_t i = 0;
  for (auto _ : state) {
    for (int k = 0; k < 10000; ++k) {
      void* p = Get(api, zeroed, sizes[i++ & 4095]);
      while (!handoff.Put(p)) std::this_thread::yield();
    }
  }
  done = true;
  consumer.join();
  state.SetItemsProcessed(state.iterations() * 10000);
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

void Register(const char* stem, void (*fn)(benchmark::State&, const Api&, bool), bool zeroed,
              bool threaded, long arg = -1) {
  for (const Api& api : gApis) {
    auto* b = benchmark::RegisterBenchmark(
        (std::string(stem) + "_" + api.name).c_str(),
        [fn, &api, zeroed](benchmark::State& s) { fn(s, api, zeroed); });
    if (arg >= 0) b->Arg(arg);
    if (threaded) b->MeasureProcessCPUTime()->UseRealTime();
  }
}

}  // namespace

int main(int argc, char** argv) {
  if (!std::getenv("GLIBC_TUNABLES")) {
    setenv("GLIBC_TUNABLES", "glibc.rtld.optional_static_tls=65536", 1);
    execv("/proc/self/exe", argv);  // on failure, carry on without the room
  }
  gApis.push_back({"Tarn", &TarnMalloc, &TarnCalloc, &TarnFree});
  gApis.push_back({"glibc", &std::malloc, &std::calloc, &std::free});
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
  return tarn_bench::RunWithRatios(argc, argv);
}
