// Thread-local slots on Windows: one fiber-local slot per slot object,
// whose callback deletes the ending thread's value.
#include <windows.h>

#include "tarn/Threads/TarnThreadLocal.h"
#include "tarn/Threads/TarnThreadsImpl.h"

namespace tarn {

struct TarnThreadLocalBase::Impl {
  DWORD index;
};

namespace {
void WINAPI DeleteThreadValue(void* value) { delete static_cast<ITarnThreadLocalStorage*>(value); }
}  // namespace

TarnThreadLocalBase::TarnThreadLocalBase() : fImpl(new Impl) {
  fImpl->index = FlsAlloc(&DeleteThreadValue);
  if (fImpl->index == FLS_OUT_OF_INDEXES) fImpl.reset();
}

TarnThreadLocalBase::~TarnThreadLocalBase() {
  if (fImpl) FlsFree(fImpl->index);
}

ITarnThreadLocalStorage* TarnThreadLocalBase::GetRaw() const noexcept {
  return static_cast<ITarnThreadLocalStorage*>(
      FlsGetValue(threads_detail::Demand(fImpl.get())->index));
}

void TarnThreadLocalBase::SetRaw(ITarnThreadLocalStorage* value) noexcept {
  FlsSetValue(threads_detail::Demand(fImpl.get())->index, value);
}

}  // namespace tarn
