// Per-thread storage slots. A TarnThreadLocalBase owns one system
// thread-local key; each thread stores its own ITarnThreadLocalStorage
// object in it. When a thread ends, its non-null value is deleted (through
// the virtual destructor) on that thread. Storing does not delete a previous
// value. Destroying the slot itself does not delete other threads' values
// on POSIX; on Windows the system deletes them.
//
//   struct Scratch : ITarnThreadLocalStorage { std::vector<float> buffer; };
//   static TarnThreadLocal<Scratch> gScratch;
//   if (!gScratch.Get()) gScratch.Set(new Scratch);
#pragma once

#include <memory>

namespace tarn {

class ITarnThreadLocalStorage {
 public:
  virtual ~ITarnThreadLocalStorage() = default;
};

class TarnThreadLocalBase {
 public:
  virtual ~TarnThreadLocalBase();
  TarnThreadLocalBase(const TarnThreadLocalBase&) = delete;
  TarnThreadLocalBase& operator=(const TarnThreadLocalBase&) = delete;

  // The calling thread's value, null when none was set.
  [[nodiscard]] ITarnThreadLocalStorage* GetRaw() const noexcept;
  // Stores value for the calling thread; the slot owns it from now on.
  void SetRaw(ITarnThreadLocalStorage* value) noexcept;

  struct Impl;

 protected:
  TarnThreadLocalBase();  // asserts when the system has no key left

 private:
  std::unique_ptr<Impl> fImpl;
};

// A typed slot for T, which derives from ITarnThreadLocalStorage.
template <class T>
class TarnThreadLocal : public TarnThreadLocalBase {
 public:
  TarnThreadLocal() = default;
  [[nodiscard]] T* Get() const noexcept { return static_cast<T*>(GetRaw()); }
  void Set(T* value) noexcept { SetRaw(value); }
};

}  // namespace tarn
