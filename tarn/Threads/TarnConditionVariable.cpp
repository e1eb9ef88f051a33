#include "tarn/Threads/TarnConditionVariable.h"

#include "tarn/Threads/TarnThreadsImpl.h"

namespace tarn {

using threads_detail::Demand;

TarnConditionVariable::TarnConditionVariable() : fImpl(CreateImplementation()) {}
TarnConditionVariable::~TarnConditionVariable() { delete fImpl; }

void TarnConditionVariable::lock() const noexcept { Demand(fImpl)->lock(); }
bool TarnConditionVariable::tryLock() const noexcept { return Demand(fImpl)->tryLock(); }
void TarnConditionVariable::unlock() const noexcept { Demand(fImpl)->unlock(); }
void TarnConditionVariable::wait() const noexcept { Demand(fImpl)->wait(); }
bool TarnConditionVariable::timedWait(uint64_t nanoseconds) const noexcept {
  return Demand(fImpl)->timedWait(nanoseconds);
}
void TarnConditionVariable::signal() const noexcept { Demand(fImpl)->signal(); }
void TarnConditionVariable::broadcast() const noexcept { Demand(fImpl)->broadcast(); }

}  // namespace tarn
