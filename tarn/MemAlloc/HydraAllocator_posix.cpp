// The allocator's platform services on POSIX: mmap'd chunks, a pthread key
// with a destructor, and a bare pthread for the pool thread.
#include <pthread.h>
#include <sys/mman.h>
#include <unistd.h>

#include <cerrno>
#include <ctime>

#include "tarn/MemAlloc/HydraAllocatorImpl.h"

namespace tarn::hydra_os {

namespace {
pthread_key_t gKey;
bool gKeyCreated = false;

struct ThreadStart {
  ThreadBody body;
  void* arg;
};

void* ThreadEntry(void* raw) {
  const ThreadStart start = *static_cast<ThreadStart*>(raw);
  UnmapPages(raw, PageSize());
  start.body(start.arg);
  return nullptr;
}
}  // namespace

void* MapPages(std::size_t bytes) noexcept {
  void* p = mmap(nullptr, bytes, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
  return p == MAP_FAILED ? nullptr : p;
}

bool UnmapPages(void* base, std::size_t bytes) noexcept { return munmap(base, bytes) == 0; }

int LastSystemError() noexcept { return errno; }

std::size_t PageSize() noexcept {
  static const std::size_t page = static_cast<std::size_t>(sysconf(_SC_PAGESIZE));
  return page;
}

bool CanAccessPrecedingBytes(const void* p) noexcept {
  // mincore fails with ENOMEM on an unmapped page; a mapped page without
  // read access would still pass, which no allocator hands out.
  const auto page = reinterpret_cast<uintptr_t>(p) - PageSize();
  unsigned char resident;
  return mincore(reinterpret_cast<void*>(page & ~(PageSize() - 1)), 1, &resident) == 0;
}

bool CreateThreadKey(void (*cleanup)(void*)) noexcept {
  gKeyCreated = pthread_key_create(&gKey, cleanup) == 0;
  return gKeyCreated;
}

void* GetThreadKey() noexcept { return gKeyCreated ? pthread_getspecific(gKey) : nullptr; }

void SetThreadKey(void* value) noexcept {
  if (gKeyCreated) pthread_setspecific(gKey, value);
}

bool StartThread(ThreadBody body, void* arg) noexcept {
  // The start record lives in a page of its own: nothing here may use the
  // allocator that is being built.
  auto* start = static_cast<ThreadStart*>(MapPages(PageSize()));
  if (!start) return false;
  *start = ThreadStart{body, arg};
  pthread_attr_t attr;
  pthread_attr_init(&attr);
  pthread_attr_setdetachstate(&attr, PTHREAD_CREATE_DETACHED);
  pthread_t thread;
  const int err = pthread_create(&thread, &attr, &ThreadEntry, start);
  pthread_attr_destroy(&attr);
  if (err != 0) {
    UnmapPages(start, PageSize());
    errno = err;
    return false;
  }
  return true;
}

void SleepMilliseconds(unsigned milliseconds) noexcept {
  if (milliseconds == 0) {
    sched_yield();
    return;
  }
  timespec t{static_cast<time_t>(milliseconds / 1000),
             static_cast<long>(milliseconds % 1000) * 1'000'000L};
  while (nanosleep(&t, &t) != 0 && errno == EINTR) {
  }
}

}  // namespace tarn::hydra_os
