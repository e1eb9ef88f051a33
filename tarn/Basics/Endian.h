#pragma once
// Byte-order reversal for values and arrays.
//
// The library's stored formats are big-endian and its hosts little-endian, so
// every conversion is an unconditional reversal of bytes. `Swap` and
// `SwapArray` work in place on raw memory; `Swapped` returns a reversed copy of
// an integral or floating value and is what hot paths use.

#include <bit>
#include <cstdint>
#include <cstring>
#include <type_traits>

namespace tarn {

struct Endian {
  // Reverses `size` bytes in place; sizes below 2 leave the data unchanged.
  static void Swap(void* data, int size) noexcept {
    auto* p = static_cast<unsigned char*>(data);
    for (int lo = 0, hi = size - 1; lo < hi; ++lo, --hi) {
      const unsigned char t = p[lo];
      p[lo] = p[hi];
      p[hi] = t;
    }
  }

  // Reverses each of `count` consecutive elements of `elementSize` bytes.
  static void SwapArray(void* data, int elementSize, int count) noexcept;

  // The value with its bytes reversed.
  template <class T>
  [[nodiscard]] static T Swapped(T value) noexcept {
    static_assert(std::is_trivially_copyable_v<T>);
    if constexpr (sizeof(T) == 1) {
      return value;
    } else if constexpr (sizeof(T) == 2) {
      return std::bit_cast<T>(__builtin_bswap16(std::bit_cast<std::uint16_t>(value)));
    } else if constexpr (sizeof(T) == 4) {
      return std::bit_cast<T>(__builtin_bswap32(std::bit_cast<std::uint32_t>(value)));
    } else if constexpr (sizeof(T) == 8) {
      return std::bit_cast<T>(__builtin_bswap64(std::bit_cast<std::uint64_t>(value)));
    } else {
      Swap(&value, sizeof(T));
      return value;
    }
  }
};

inline void Endian::SwapArray(void* data, int elementSize, int count) noexcept {
  auto* p = static_cast<unsigned char*>(data);
  for (int i = 0; i < count; ++i, p += elementSize) Swap(p, elementSize);
}

}  // namespace tarn
