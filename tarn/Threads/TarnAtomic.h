// Free atomic helpers shared by the locks, the lock-free buffers and the
// allocators.
//
// Every helper is sequentially consistent and lock-free on x86-64 and
// aarch64. Targets are plain integers (optionally volatile) that are only
// ever accessed through these helpers while other threads may touch them.
// The 16-byte compare-and-swap needs a 16-byte-aligned pair of words; on
// processors without a 16-byte swap it falls back to a small striped lock
// table, which keeps its semantics (but not lock-freedom) as long as every
// writer of the pair uses the same function.
#pragma once

#include <cstdint>

namespace tarn {

// Fetch-and-add: returns the value before the addition.
inline int32_t AtomicAdd32Implementation(volatile int32_t* target, int32_t delta) noexcept {
  return __atomic_fetch_add(target, delta, __ATOMIC_SEQ_CST);
}

// Add-and-fetch: returns the value after the addition.
inline int32_t AtomicAddAndReturn32Implementation(volatile int32_t* target,
                                                  int32_t delta) noexcept {
  return __atomic_add_fetch(target, delta, __ATOMIC_SEQ_CST);
}

// Fetch-and-add: returns the value before the addition.
inline int64_t AtomicAdd64Implementation(volatile int64_t* target, int64_t delta) noexcept {
  return __atomic_fetch_add(target, delta, __ATOMIC_SEQ_CST);
}

// Stores newValue when *target equals oldValue; true when it did.
inline bool AtomicCompareAndSwap32(volatile int32_t* target, int32_t oldValue,
                                   int32_t newValue) noexcept {
  return __atomic_compare_exchange_n(target, &oldValue, newValue, false, __ATOMIC_SEQ_CST,
                                     __ATOMIC_SEQ_CST);
}

inline bool AtomicCompareAndSwap64(volatile int64_t* target, int64_t oldValue,
                                   int64_t newValue) noexcept {
  return __atomic_compare_exchange_n(target, &oldValue, newValue, false, __ATOMIC_SEQ_CST,
                                     __ATOMIC_SEQ_CST);
}

// 16-byte compare-and-swap of target[0..1] (16-byte aligned): stores
// (newFirst, newSecond) when the pair equals (oldFirst, oldSecond); true when
// it did. The halves may be read separately with AtomicLoad64 (a torn read
// only makes the following swap fail).
bool AtomicCompareAndSwap128Implementation(volatile uint64_t* target, uint64_t oldFirst,
                                           uint64_t oldSecond, uint64_t newFirst,
                                           uint64_t newSecond) noexcept;

// Compare-and-swap of 0 to 1: true when the caller took the word.
inline bool AtomicTryLock(volatile int32_t* target) noexcept {
  return AtomicCompareAndSwap32(target, 0, 1);
}

// Exchange with 1 / with 0; true when the previous value was non-zero.
inline bool AtomicTestAndSet32(volatile int32_t* target) noexcept {
  return __atomic_exchange_n(target, 1, __ATOMIC_SEQ_CST) != 0;
}
inline bool AtomicTestAndClear32(volatile int32_t* target) noexcept {
  return __atomic_exchange_n(target, 0, __ATOMIC_SEQ_CST) != 0;
}

[[nodiscard]] inline int32_t AtomicLoad32(const volatile int32_t* target) noexcept {
  return __atomic_load_n(target, __ATOMIC_SEQ_CST);
}
[[nodiscard]] inline int64_t AtomicLoad64(const volatile int64_t* target) noexcept {
  return __atomic_load_n(target, __ATOMIC_SEQ_CST);
}
[[nodiscard]] inline uint64_t AtomicLoad64(const volatile uint64_t* target) noexcept {
  return __atomic_load_n(target, __ATOMIC_SEQ_CST);
}

// Exchange: stores value and returns the previous one.
inline int32_t AtomicLoadAndStore32(volatile int32_t* target, int32_t value) noexcept {
  return __atomic_exchange_n(target, value, __ATOMIC_SEQ_CST);
}

inline void AtomicStore32(volatile int32_t* target, int32_t value) noexcept {
  __atomic_store_n(target, value, __ATOMIC_SEQ_CST);
}
inline void AtomicStore64(volatile int64_t* target, int64_t value) noexcept {
  __atomic_store_n(target, value, __ATOMIC_SEQ_CST);
}
inline void AtomicStore64(volatile uint64_t* target, uint64_t value) noexcept {
  __atomic_store_n(target, value, __ATOMIC_SEQ_CST);
}

// Full fences.
inline void AtomicMemoryBarrier() noexcept { __atomic_thread_fence(__ATOMIC_SEQ_CST); }
inline void AtomicPublishVolatileData() noexcept { __atomic_thread_fence(__ATOMIC_SEQ_CST); }
inline void AtomicFlushSpeculativeExecution() noexcept { __atomic_thread_fence(__ATOMIC_SEQ_CST); }

}  // namespace tarn
