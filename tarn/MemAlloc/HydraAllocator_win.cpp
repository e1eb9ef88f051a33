// The allocator's platform services on Windows: VirtualAlloc'd chunks,
// fiber-local storage with a clean-up callback, and a bare CreateThread for
// the pool thread.
#include <windows.h>

#include "tarn/MemAlloc/HydraAllocatorImpl.h"

namespace tarn::hydra_os {

namespace {
DWORD gIndex = FLS_OUT_OF_INDEXES;
void (*gCleanup)(void*) = nullptr;

void WINAPI FlsCleanup(void* value) {
  if (value && gCleanup) gCleanup(value);
}

struct ThreadStart {
  ThreadBody body;
  void* arg;
};

DWORD WINAPI ThreadEntry(void* raw) {
  const ThreadStart start = *static_cast<ThreadStart*>(raw);
  UnmapPages(raw, PageSize());
  start.body(start.arg);
  return 0;
}
}  // namespace

void* MapPages(std::size_t bytes) noexcept {
  return VirtualAlloc(nullptr, bytes, MEM_RESERVE | MEM_COMMIT, PAGE_READWRITE);
}

bool UnmapPages(void* base, std::size_t) noexcept { return VirtualFree(base, 0, MEM_RELEASE) != 0; }

int LastSystemError() noexcept { return static_cast<int>(GetLastError()); }

std::size_t PageSize() noexcept {
  static const std::size_t page = [] {
    SYSTEM_INFO info;
    GetSystemInfo(&info);
    return static_cast<std::size_t>(info.dwPageSize);
  }();
  return page;
}

bool CanAccessPrecedingBytes(const void* p) noexcept {
  MEMORY_BASIC_INFORMATION info;
  const auto* before = static_cast<const char*>(p) - 8;
  if (VirtualQuery(before, &info, sizeof info) == 0) return false;
  if (info.State != MEM_COMMIT) return false;
  const DWORD readable = PAGE_READONLY | PAGE_READWRITE | PAGE_WRITECOPY | PAGE_EXECUTE_READ |
                         PAGE_EXECUTE_READWRITE | PAGE_EXECUTE_WRITECOPY;
  return (info.Protect & readable) != 0 && (info.Protect & PAGE_GUARD) == 0;
}

bool CreateThreadKey(void (*cleanup)(void*)) noexcept {
  gCleanup = cleanup;
  gIndex = FlsAlloc(&FlsCleanup);
  return gIndex != FLS_OUT_OF_INDEXES;
}

void* GetThreadKey() noexcept {
  return gIndex == FLS_OUT_OF_INDEXES ? nullptr : FlsGetValue(gIndex);
}

void SetThreadKey(void* value) noexcept {
  if (gIndex != FLS_OUT_OF_INDEXES) FlsSetValue(gIndex, value);
}

bool StartThread(ThreadBody body, void* arg) noexcept {
  auto* start = static_cast<ThreadStart*>(MapPages(PageSize()));
  if (!start) return false;
  *start = ThreadStart{body, arg};
  HANDLE thread = CreateThread(nullptr, 0, &ThreadEntry, start, 0, nullptr);
  if (!thread) {
    UnmapPages(start, PageSize());
    return false;
  }
  CloseHandle(thread);
  return true;
}

void SleepMilliseconds(unsigned milliseconds) noexcept { Sleep(milliseconds); }

}  // namespace tarn::hydra_os
