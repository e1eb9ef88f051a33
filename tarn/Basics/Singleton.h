// Process-wide singletons and the registry that builds and tears them down.
//
// Every singleton has a constructor object (a `SingletonConstructor`) that
// registers with the process-wide `SingletonManager`. The manager keeps two
// last-in, first-out lists: the construction list (every constructor object,
// consumed by `ConstructAll`) and the destruction list (constructor objects
// whose singleton exists and must be destroyed at unload). At process exit
// (library unload) the manager destroys the singletons of the destruction list,
// last registered first.
//
// `Singleton<T>` is how a class becomes a singleton:
//
//   class TarnWorkerThread {
//     friend class tarn::Singleton<TarnWorkerThread>;
//     TarnWorkerThread();            // may stay private
//   };
//   TarnWorkerThread& w = tarn::Singleton<TarnWorkerThread>::Instance();
//
// The `T` is created on the first call of `Instance()` (from any thread; the
// first caller builds it, concurrent callers wait) or by
// `SingletonManager::ConstructAll()`, whichever comes first, and registered for
// destruction at that moment; so singletons are destroyed in the reverse order
// of their creation. Calling `Instance()` after the singleton was destroyed
// (during unload) is a programming error and terminates the process.
#pragma once

#include <atomic>
#include <exception>
#include <mutex>

namespace tarn {

class SingletonManager;

// Abstract base of every singleton's constructor object. Constructing one
// registers it in the manager's construction list.
class SingletonConstructor {
 public:
  SingletonConstructor(const SingletonConstructor&) = delete;
  SingletonConstructor& operator=(const SingletonConstructor&) = delete;

  // Builds the singleton if it does not exist yet. Called by ConstructAll.
  virtual void ConstructSingleton() = 0;
  // Destroys the singleton. Called once by the manager's destruction.
  virtual void DestroySingleton() noexcept = 0;

 protected:
  // Registers with the process-wide manager.
  SingletonConstructor() noexcept;
  // Registers with the given manager (a private registry, e.g. in tests).
  explicit SingletonConstructor(SingletonManager& manager) noexcept;
  // Not virtual: constructor objects are never deleted through this base.
  ~SingletonConstructor() = default;

  // Puts this object at the head of the manager's destruction list.
  void RegisterForDestruction() noexcept;

 private:
  friend class SingletonManager;
  SingletonConstructor* fNextToConstruct = nullptr;
  SingletonConstructor* fNextToDestroy = nullptr;
  SingletonManager* fManager;
};

// The registry. `Instance()` is the process-wide one; other instances may be
// made for private registries and destroy their singletons when they die.
// Registration may happen on any thread (the lists are guarded); construct and
// destroy operations run outside the guard, on the calling thread.
class SingletonManager {
 public:
  enum State : int { kIdle = 0, kConstructed = 1, kDestroying = 2 };

  SingletonManager() noexcept = default;
  SingletonManager(const SingletonManager&) = delete;
  SingletonManager& operator=(const SingletonManager&) = delete;
  // Destroys the registered singletons (as DestroyAll).
  ~SingletonManager();

  // The process-wide manager, created on first call; its singletons are
  // destroyed at process exit. The manager object itself is never freed, so a
  // late registration after exit has begun is harmless (that singleton leaks).
  [[nodiscard]] static SingletonManager& Instance();

  // Sets the state to 1 and constructs every singleton in the construction
  // list, most recently registered first, consuming the list. Constructors
  // registered afterwards are not constructed by this call. Exceptions from
  // a singleton's constructor propagate; the rest of the list stays queued.
  void ConstructAll();

  // Sets the state to 2 and destroys every singleton registered for
  // destruction, most recently registered first, consuming the list.
  void DestroyAll() noexcept;

  [[nodiscard]] State GetState() const noexcept { return fState.load(std::memory_order_acquire); }

 private:
  friend class SingletonConstructor;
  void AddToConstruction(SingletonConstructor& c) noexcept;
  void AddToDestruction(SingletonConstructor& c) noexcept;

  SingletonConstructor* fConstructHead = nullptr;
  SingletonConstructor* fDestroyHead = nullptr;
  std::atomic<State> fState{kIdle};
  std::mutex fListLock;
};

// The singleton of class T; see the opening comment. T needs a default
// constructor reachable from Singleton<T> (public, or private with
// `friend class tarn::Singleton<T>`).
template <class T>
class Singleton {
 public:
  Singleton() = delete;

  // The instance, created on first use. Thread-safe; may throw whatever T's
  // constructor throws (a later call then tries again).
  [[nodiscard]] static T& Instance() {
    (void)&sRegistrar;
    Holder& h = GetHolder();
    T* p = h.fInstance.load(std::memory_order_acquire);
    if (p == nullptr) p = h.Create();
    if (p == nullptr) std::terminate();
    return *p;
  }

  // The instance if it has been created and not yet destroyed, else null.
  [[nodiscard]] static T* InstanceIfExists() noexcept {
    return GetHolder().fInstance.load(std::memory_order_acquire);
  }

 private:
  class Holder final : public SingletonConstructor {
   public:
    Holder() noexcept = default;

    T* Create() {
      std::lock_guard<std::mutex> guard(fCreateLock);
      T* p = fInstance.load(std::memory_order_relaxed);
      if (p == nullptr && !fDestroyed) {
        p = Singleton<T>::New();
        fInstance.store(p, std::memory_order_release);
        RegisterForDestruction();
      }
      return p;
    }
    void ConstructSingleton() override { (void)Create(); }
    void DestroySingleton() noexcept override {
      T* p;
      {
        std::lock_guard<std::mutex> guard(fCreateLock);
        p = fInstance.exchange(nullptr, std::memory_order_acq_rel);
        fDestroyed = true;
      }
      delete p;
    }

    std::atomic<T*> fInstance{nullptr};
    std::mutex fCreateLock;
    bool fDestroyed = false;
  };

  static T* New() { return new T(); }

  // The holder lives for the whole process (never freed), so that the
  // manager may still reach it while the program's statics are destroyed.
  static Holder& GetHolder() {
    static Holder* const holder = new Holder();
    return *holder;
  }

  // Forces the holder's registration during static initialisation, so that
  // ConstructAll sees every singleton the program uses.
  struct Registrar {
    Registrar() { (void)GetHolder(); }
  };
  static inline Registrar sRegistrar{};
};

}  // namespace tarn
