#pragma once
// WAVEWriter: the layout rules of RIFF "WAVE" and Wave64 files.
//
// These static rules are shared by everything that lays out chunks in such
// files (the chunk editor among them): chunk payloads are padded to 2 bytes
// in RIFF (one zero byte after an odd length) and to 8 bytes in Wave64; a
// chunk header is 8 bytes in RIFF (4-byte tag, 32-bit size) and 24 in Wave64
// (16-byte identifier, 64-bit size that counts the header too); the form
// type after the container header takes 4 bytes in RIFF and 16 in Wave64.
// The same padding rule serves FORM (AIFF) files, whose payloads are padded
// to 2 bytes as well.

#include <cstdint>

namespace tarn {

class WAVEWriter {
 public:
  // `length` rounded up to the padding unit: +1 when odd (RIFF), up to the
  // next multiple of 8 (Wave64). Lengths are never negative.
  [[nodiscard]] static constexpr std::int64_t PadDataLength(std::int64_t length,
                                                            bool wave64) noexcept {
    return wave64 ? (length + 7) & ~std::int64_t{7} : length + (length & 1);
  }
  // Bytes of the form-type field after the container header.
  [[nodiscard]] static constexpr int GetRIFFChunkExtraSize(bool wave64) noexcept {
    return wave64 ? 16 : 4;
  }
  // Bytes of a chunk header: identifier and size field.
  [[nodiscard]] static constexpr int GetChunkHeaderSize(bool wave64) noexcept {
    return wave64 ? 24 : 8;
  }
};

}  // namespace tarn
