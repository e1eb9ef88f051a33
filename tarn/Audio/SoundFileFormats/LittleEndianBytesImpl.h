#pragma once
// Little-endian fields in byte images: loads and stores of 16-, 32- and
// 64-bit values at a byte pointer, whatever the host's order. The RIFF and
// Wave64 chunk payloads (and their size fields) are little-endian; these
// helpers are how the WAVE classes build and read them. No bounds are
// checked: callers hand in pointers with enough bytes behind them.

#include <cstdint>

namespace tarn::LittleEndianBytes {

[[nodiscard]] inline std::uint16_t Load16(const std::uint8_t* p) noexcept {
  return static_cast<std::uint16_t>(p[0] | p[1] << 8);
}
[[nodiscard]] inline std::uint32_t Load32(const std::uint8_t* p) noexcept {
  return static_cast<std::uint32_t>(p[0]) | static_cast<std::uint32_t>(p[1]) << 8 |
         static_cast<std::uint32_t>(p[2]) << 16 | static_cast<std::uint32_t>(p[3]) << 24;
}
[[nodiscard]] inline std::uint64_t Load64(const std::uint8_t* p) noexcept {
  return static_cast<std::uint64_t>(Load32(p)) | static_cast<std::uint64_t>(Load32(p + 4)) << 32;
}
inline void Store16(std::uint8_t* p, std::uint16_t v) noexcept {
  p[0] = static_cast<std::uint8_t>(v);
  p[1] = static_cast<std::uint8_t>(v >> 8);
}
inline void Store32(std::uint8_t* p, std::uint32_t v) noexcept {
  for (int i = 0; i < 4; ++i) p[i] = static_cast<std::uint8_t>(v >> (8 * i));
}
inline void Store64(std::uint8_t* p, std::uint64_t v) noexcept {
  for (int i = 0; i < 8; ++i) p[i] = static_cast<std::uint8_t>(v >> (8 * i));
}

}  // namespace tarn::LittleEndianBytes
