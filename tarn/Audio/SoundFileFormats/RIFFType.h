#pragma once
// RIFFType: a four-character code (a chunk tag, a file type, a metadata tag)
// held as an unsigned 32-bit value whose most significant byte is the first
// character, so "data" is 0x64617461 whatever the byte order of the file it
// came from.

#include <cstdint>
#include <string>

namespace tarn {

using RIFFType = std::uint32_t;

// The code of the four characters at `code` (which need not be terminated).
[[nodiscard]] constexpr RIFFType RIFFTypeFromChars(const char* code) noexcept {
  RIFFType type = 0;
  for (int i = 0; i < 4; ++i) type = type << 8 | static_cast<unsigned char>(code[i]);
  return type;
}

// The code of a four-character literal: MakeRIFFType("data").
[[nodiscard]] constexpr RIFFType MakeRIFFType(const char (&code)[5]) noexcept {
  return RIFFTypeFromChars(code);
}

// The four characters, first character first; bytes outside printable ASCII
// show as "\xNN".
[[nodiscard]] std::string RIFFTypeToString(RIFFType type);

}  // namespace tarn
