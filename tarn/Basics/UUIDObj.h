// A 16-byte unique identifier in a fixed, big-endian byte order.
//
// Bytes 0-3 hold the first (32-bit) field of the standard identifier layout,
// most significant byte first; bytes 4-5 and 6-7 the second and third
// (16-bit) fields, most significant byte first; bytes 8-15 the remaining
// eight bytes in order. So the text "00112233-4455-6677-8899-aabbccddeeff"
// is the bytes 00 11 22 ... ff, in reading order, on every platform.
//
// The stream form is 17 bytes: a version byte (2) and the 16 bytes. Records
// of version 1 carry two more bytes after the identifier, which are skipped.
#pragma once

#include <array>
#include <cstdint>

#include "tarn/String/UString.h"

namespace tarn {

class CStream;

namespace TarnCOM {
// The 16 bytes of an identifier as a plain record, in UUIDObj's byte order.
struct UUIDBytes {
  std::uint8_t bytes[16];
};
}  // namespace TarnCOM

class UUIDObj {
 public:
  static constexpr int kStreamVersion = 2;

  constexpr UUIDObj() noexcept = default;  // the clear identifier (all zero)
  constexpr UUIDObj(const UUIDObj&) noexcept = default;
  constexpr UUIDObj& operator=(const UUIDObj&) noexcept = default;
  ~UUIDObj() = default;

  explicit UUIDObj(const TarnCOM::UUIDBytes& bytes) noexcept;
  constexpr UUIDObj(std::uint8_t b0, std::uint8_t b1, std::uint8_t b2, std::uint8_t b3,
                    std::uint8_t b4, std::uint8_t b5, std::uint8_t b6, std::uint8_t b7,
                    std::uint8_t b8, std::uint8_t b9, std::uint8_t b10, std::uint8_t b11,
                    std::uint8_t b12, std::uint8_t b13, std::uint8_t b14, std::uint8_t b15) noexcept
      : fBytes{b0, b1, b2, b3, b4, b5, b6, b7, b8, b9, b10, b11, b12, b13, b14, b15} {}
  // From the hyphenated text form "xxxxxxxx-xxxx-xxxx-xxxx-xxxxxxxxxxxx"
  // (hex digits in either case, optionally in braces). The empty text gives
  // the clear identifier; any other malformed text throws a TarnError -50.
  explicit UUIDObj(const UString& text);

  [[nodiscard]] constexpr bool operator==(const UUIDObj&) const noexcept = default;
  [[nodiscard]] constexpr bool IsClear() const noexcept { return *this == UUIDObj(); }

  // A new time-based (version 1 style, sequential) identifier from the system.
  [[nodiscard]] static UUIDObj GetNewUUID();

  // The hyphenated text form, lower-case hex, without braces.
  [[nodiscard]] UString GetString() const;

  // Writes the version byte and the 16 bytes (17 bytes).
  void PutTo(CStream& stream) const;
  // Reads a record written by PutTo (17 bytes) or a version-1 record (19).
  void GetFrom(CStream& stream);

  [[nodiscard]] constexpr const std::array<std::uint8_t, 16>& GetBytes() const noexcept {
    return fBytes;
  }
  [[nodiscard]] TarnCOM::UUIDBytes GetUUIDBytes() const noexcept;

 private:
  std::array<std::uint8_t, 16> fBytes{};
};

}  // namespace tarn
