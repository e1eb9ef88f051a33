#include "tarn/Threads/TarnAtomic.h"

#include <atomic>
#include <cstddef>

namespace tarn {

#if defined(__x86_64__)

// cmpxchg16b is present on every 64-bit x86 that runs a current OS; the
// target attribute lets the compiler emit it without a build-wide -mcx16.
__attribute__((target("cx16"))) bool AtomicCompareAndSwap128Implementation(
    volatile uint64_t* target, uint64_t oldFirst, uint64_t oldSecond, uint64_t newFirst,
    uint64_t newSecond) noexcept {
  using Pair = unsigned __int128;
  const Pair expected = (static_cast<Pair>(oldSecond) << 64) | oldFirst;
  const Pair desired = (static_cast<Pair>(newSecond) << 64) | newFirst;
  return __sync_bool_compare_and_swap(reinterpret_cast<volatile Pair*>(target), expected, desired);
}

#elif defined(__aarch64__)

// ldxp/stxp (or casp with the large-system extensions) through the builtin.
bool AtomicCompareAndSwap128Implementation(volatile uint64_t* target, uint64_t oldFirst,
                                           uint64_t oldSecond, uint64_t newFirst,
                                           uint64_t newSecond) noexcept {
  using Pair = unsigned __int128;
  const Pair expected = (static_cast<Pair>(oldSecond) << 64) | oldFirst;
  const Pair desired = (static_cast<Pair>(newSecond) << 64) | newFirst;
  return __sync_bool_compare_and_swap(reinterpret_cast<volatile Pair*>(target), expected, desired);
}

#else

namespace {

// A striped table of spin locks, chosen by the pair's address, so that
// unrelated pairs rarely contend.
constexpr std::size_t kStripes = 64;
std::atomic_flag gStripes[kStripes] = {};

std::atomic_flag& StripeFor(volatile uint64_t* target) noexcept {
  return gStripes[(reinterpret_cast<std::uintptr_t>(target) >> 4) % kStripes];
}

}  // namespace

bool AtomicCompareAndSwap128Implementation(volatile uint64_t* target, uint64_t oldFirst,
                                           uint64_t oldSecond, uint64_t newFirst,
                                           uint64_t newSecond) noexcept {
  std::atomic_flag& stripe = StripeFor(target);
  while (stripe.test_and_set(std::memory_order_acquire)) {
  }
  bool swapped = false;
  if (AtomicLoad64(&target[0]) == oldFirst && AtomicLoad64(&target[1]) == oldSecond) {
    AtomicStore64(&target[0], newFirst);
    AtomicStore64(&target[1], newSecond);
    swapped = true;
  }
  stripe.clear(std::memory_order_release);
  return swapped;
}

#endif

}  // namespace tarn
