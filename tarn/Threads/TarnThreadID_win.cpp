// TarnThreadID on Windows: system thread ids and handles, COM on every
// created thread, thread priorities and the multimedia class scheduler.
#include <windows.h>

#include <avrt.h>
#include <objbase.h>

#include <cstdint>
#include <new>
#include <string>

#include "tarn/Threads/TarnMutex.h"
#include "tarn/Threads/TarnThreadID.h"

namespace tarn {

namespace {

struct ThreadStartArgs {
  TarnThreadID::EntryFunction entry;
  void* arg;
  TarnCoreMutex gate;
};

DWORD WINAPI StartRoutine(void* rawArgs) {
  auto* args = static_cast<ThreadStartArgs*>(rawArgs);
  DWORD exitCode = 0;
  try {
    const HRESULT com = CoInitializeEx(nullptr, COINIT_MULTITHREADED);
    if (args != nullptr && args->entry != nullptr) {
      // Wait until the creator has stored our id and handle.
      args->gate.lock();
      exitCode = static_cast<DWORD>(reinterpret_cast<uintptr_t>(args->entry(args->arg)));
      args->gate.unlock();
    }
    delete args;
    if (SUCCEEDED(com)) CoUninitialize();
  } catch (...) {
  }
  return exitCode;
}

}  // namespace

uint32_t detail::AssignCurrentThreadRawID() noexcept {
  return tCurrentThreadRawID = GetCurrentThreadId();
}

TarnThreadID TarnThreadID::CurrentThread() noexcept { return TarnThreadID(GetCurrentThreadId()); }

int TarnThreadID::Create(EntryFunction entry, void* arg, bool /*flag*/) noexcept {
  Invalidate();
  auto* args = new (std::nothrow) ThreadStartArgs{entry, arg, {}};
  if (args == nullptr) return 1;
  args->gate.lock();
  DWORD id = 0;
  HANDLE handle = CreateThread(nullptr, 0, &StartRoutine, args, 0, &id);
  if (handle != nullptr) {
    fID.store(id, std::memory_order_relaxed);
    fHandle = handle;
  }
  args->gate.unlock();
  if (handle == nullptr) {
    delete args;
    return 1;
  }
  return 0;
}

void* TarnThreadID::DemandOSThread() noexcept {
  if (fHandle == nullptr && IsValid()) fHandle = OpenThread(THREAD_ALL_ACCESS, FALSE, GetID());
  return fHandle;
}

void TarnThreadID::Invalidate() noexcept {
  if (fHandle != nullptr) {
    CloseHandle(fHandle);
    fHandle = nullptr;
  }
  fID.store(0, std::memory_order_relaxed);
}

int TarnThreadID::Terminate(uint32_t* exitCode) noexcept {
  HANDLE handle = DemandOSThread();
  if (handle == nullptr) return 0;
  if (WaitForSingleObject(handle, INFINITE) == WAIT_OBJECT_0 && exitCode != nullptr) {
    DWORD code = 0;
    if (GetExitCodeThread(handle, &code)) *exitCode = code;
  }
  return 0;
}

bool TarnThreadID::GetExitCode(uint32_t* exitCode) noexcept {
  HANDLE handle = DemandOSThread();
  DWORD code = 0;
  if (handle == nullptr || !GetExitCodeThread(handle, &code)) return false;
  *exitCode = code;
  return true;
}

void TarnThreadID::SetThreadPriority(ThreadPriority priority,
                                     const RealtimePriorityHints& /*hints*/) noexcept {
  HANDLE handle = DemandOSThread();
  if (handle == nullptr) return;
  if (priority >= kPriorityRealtimeLow && priority <= kPriorityRealtimeHigh) {
    // Registers the calling thread (not the target) and is never reverted.
    DWORD taskIndex = 0;
    HANDLE registration = AvSetMmThreadCharacteristicsW(L"Pro Audio", &taskIndex);
    if (registration != nullptr) {
      static const AVRT_PRIORITY kLevels[] = {AVRT_PRIORITY_LOW, AVRT_PRIORITY_NORMAL,
                                              AVRT_PRIORITY_HIGH};
      AvSetMmThreadPriority(registration, kLevels[priority - kPriorityRealtimeLow]);
    }
    return;
  }
  if (priority < kPriorityLowest || priority > kPriorityHighest) priority = kPriorityNormal;
  ::SetThreadPriority(handle, static_cast<int>(priority));
}

void TarnThreadID::RenameCurrentThread(const char* name) noexcept {
  if (name == nullptr) return;
  // SetThreadDescription exists from Windows 10 1607 on; look it up.
  using SetDescription = HRESULT(WINAPI*)(HANDLE, PCWSTR);
  static const auto setDescription = reinterpret_cast<SetDescription>(reinterpret_cast<void*>(
      GetProcAddress(GetModuleHandleW(L"kernel32.dll"), "SetThreadDescription")));
  if (setDescription == nullptr) return;
  wchar_t wide[256] = {};
  if (MultiByteToWideChar(CP_UTF8, 0, name, -1, wide, 255) > 0) {
    setDescription(GetCurrentThread(), wide);
  }
}

}  // namespace tarn
