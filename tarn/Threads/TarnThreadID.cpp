// The portable parts of TarnThreadID: the exception handler slot and the
// per-thread semaphores.
#include "tarn/Threads/TarnThreadID.h"

#include <atomic>
#include <mutex>
#include <new>

#include "tarn/Threads/TarnSemaphore.h"

namespace tarn {

namespace detail {
thread_local constinit uint32_t tCurrentThreadRawID TARN_TLS_INITIAL_EXEC = 0;
}  // namespace detail

namespace {

std::atomic<TarnThreadID::ExceptionHandler> gExceptionHandler{nullptr};

// Every thread semaphore ever made stays on this list (never freed), so that
// a semaphore outlives its thread and late signals stay harmless.
struct RetainedSemaphore {
  TarnSemaphore semaphore;
  RetainedSemaphore* next = nullptr;
};
std::atomic<RetainedSemaphore*> gRetainedSemaphores{nullptr};

thread_local TarnSemaphore* tThreadSemaphore = nullptr;

}  // namespace

void TarnThreadID::SetExceptionHandler(ExceptionHandler handler) noexcept {
  gExceptionHandler.store(handler);
}

TarnThreadID::ExceptionHandler TarnThreadID::GetExceptionHandler() noexcept {
  return gExceptionHandler.load();
}

TarnSemaphore& TarnThreadID::DemandThreadSemaphore() {
  if (tThreadSemaphore == nullptr) {
    auto* retained = new RetainedSemaphore;
    retained->next = gRetainedSemaphores.load();
    while (!gRetainedSemaphores.compare_exchange_weak(retained->next, retained)) {
    }
    tThreadSemaphore = &retained->semaphore;
  }
  return *tThreadSemaphore;
}

}  // namespace tarn
