// Thread-local slots on POSIX: one pthread key per slot, whose destructor
// deletes the ending thread's value.
#include <pthread.h>

#include "tarn/Threads/TarnThreadLocal.h"
#include "tarn/Threads/TarnThreadsImpl.h"

namespace tarn {

struct TarnThreadLocalBase::Impl {
  pthread_key_t key;
};

namespace {
void DeleteThreadValue(void* value) { delete static_cast<ITarnThreadLocalStorage*>(value); }
}  // namespace

TarnThreadLocalBase::TarnThreadLocalBase() : fImpl(new Impl) {
  if (pthread_key_create(&fImpl->key, &DeleteThreadValue) != 0) fImpl.reset();
}

TarnThreadLocalBase::~TarnThreadLocalBase() {
  if (fImpl) pthread_key_delete(fImpl->key);
}

ITarnThreadLocalStorage* TarnThreadLocalBase::GetRaw() const noexcept {
  return static_cast<ITarnThreadLocalStorage*>(
      pthread_getspecific(threads_detail::Demand(fImpl.get())->key));
}

void TarnThreadLocalBase::SetRaw(ITarnThreadLocalStorage* value) noexcept {
  pthread_setspecific(threads_detail::Demand(fImpl.get())->key, value);
}

}  // namespace tarn
