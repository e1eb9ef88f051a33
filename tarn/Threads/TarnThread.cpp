// TarnThread: starting a routine on its own thread and stopping it.
#include "tarn/Threads/TarnThread.h"

#include <chrono>
#include <thread>
#include <utility>

#include "tarn/Threads/TarnThreadsImpl.h"

namespace tarn {

namespace {

// What the new thread owns: its reference to the routine and its name.
struct ThreadPayload {
  std::shared_ptr<TarnThreadRoutine> routine;
  UString name;
};

}  // namespace

TarnThread::TarnThread() = default;

TarnThread::TarnThread(std::shared_ptr<TarnThreadRoutine> routine, const UString& name)
    : fRoutine(std::move(routine)), fName(name) {}

TarnThread::TarnThread(const TarnThread& other)
    : fID(other.fID), fRoutine(other.fRoutine), fFlags(other.fFlags.load()), fName(other.fName) {}

TarnThread& TarnThread::operator=(const TarnThread& other) {
  if (this != &other) {
    fID = other.fID;
    fRoutine = other.fRoutine;
    fFlags.store(other.fFlags.load());
    fName = other.fName;
  }
  return *this;
}

TarnThread::~TarnThread() = default;

void TarnThread::Start() {
  fFlags.store(kStarted);
  auto* payload = new ThreadPayload{fRoutine, fName};
  if (fID.Create(&ThreadEntry, payload) != 0) delete payload;
}

void* TarnThread::ThreadEntry(void* arg) {
  std::unique_ptr<ThreadPayload> payload(static_cast<ThreadPayload*>(arg));
  try {
    TarnThreadID::RenameCurrentThread(payload->name.utf8_str().c_str());
  } catch (...) {
  }
  if (payload->routine) {
    try {
      payload->routine->Run();
    } catch (...) {
    }
  }
  return nullptr;
}

bool TarnThread::IsTerminated() const noexcept {
  if ((fFlags.load() & kStopRequested) != 0) return true;
  return fRoutine && fRoutine->IsTerminated();
}

void TarnThread::TerminateAndContinue() {
  if ((fFlags.load() & kStarted) == 0) return;
  // Start stores the id only once the system has created the thread.
  while ((fFlags.load() & kStopRequested) == 0 && !fID.IsValid()) {
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
  }
  fFlags.fetch_or(kStopRequested);
  if (TarnThreadRoutine* routine = threads_detail::Demand(fRoutine.get())) routine->DoTerminate();
}

void TarnThread::Terminate() {
  TerminateAndContinue();
  if ((fFlags.load() & kStarted) != 0) (void)fID.Terminate(nullptr);
}

}  // namespace tarn
