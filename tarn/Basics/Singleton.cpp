#include "tarn/Basics/Singleton.h"

#include <cstdlib>

namespace tarn {

SingletonConstructor::SingletonConstructor() noexcept
    : SingletonConstructor(SingletonManager::Instance()) {}

SingletonConstructor::SingletonConstructor(SingletonManager& manager) noexcept
    : fManager(&manager) {
  manager.AddToConstruction(*this);
}

void SingletonConstructor::RegisterForDestruction() noexcept { fManager->AddToDestruction(*this); }

namespace {
void DestroyProcessSingletons() { SingletonManager::Instance().DestroyAll(); }
}  // namespace

SingletonManager& SingletonManager::Instance() {
  static SingletonManager* const manager = [] {
    auto* m = new SingletonManager();
    std::atexit(&DestroyProcessSingletons);
    return m;
  }();
  return *manager;
}

SingletonManager::~SingletonManager() { DestroyAll(); }

void SingletonManager::AddToConstruction(SingletonConstructor& c) noexcept {
  std::lock_guard<std::mutex> guard(fListLock);
  c.fNextToConstruct = fConstructHead;
  fConstructHead = &c;
}

void SingletonManager::AddToDestruction(SingletonConstructor& c) noexcept {
  std::lock_guard<std::mutex> guard(fListLock);
  c.fNextToDestroy = fDestroyHead;
  fDestroyHead = &c;
}

void SingletonManager::ConstructAll() {
  fState.store(kConstructed, std::memory_order_release);
  for (;;) {
    SingletonConstructor* head;
    {
      std::lock_guard<std::mutex> guard(fListLock);
      head = fConstructHead;
    }
    if (head == nullptr) break;
    // Constructing may register further singletons (at the head); those
    // are constructed as well. The constructed one is unlinked afterwards, so
    // a throwing constructor leaves it queued.
    head->ConstructSingleton();
    std::lock_guard<std::mutex> guard(fListLock);
    SingletonConstructor** link = &fConstructHead;
    while (*link != nullptr && *link != head) link = &(*link)->fNextToConstruct;
    if (*link == head) *link = head->fNextToConstruct;
  }
}

void SingletonManager::DestroyAll() noexcept {
  fState.store(kDestroying, std::memory_order_release);
  for (;;) {
    SingletonConstructor* head;
    {
      std::lock_guard<std::mutex> guard(fListLock);
      head = fDestroyHead;
      if (head == nullptr) break;
      fDestroyHead = head->fNextToDestroy;
    }
    head->DestroySingleton();
  }
}

}  // namespace tarn
