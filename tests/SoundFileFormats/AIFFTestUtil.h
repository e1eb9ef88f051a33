#pragma once
// Byte images of FORM "AIFF"/"AIFC" files for the AIFF tests: the fields of
// "COMM", "SSND", "basc" and "CHAN" payloads spelt out big-endian, and whole
// files built from them.

#include <array>
#include <cstdint>
#include <cstring>
#include <string>
#include <vector>

#include "SoundFileFormats/ChunkFileTestUtil.h"
#include "tarn/Audio/SoundFileFormats/IEEEExtended.h"

namespace tarn::test {

inline void PutBigEndian(Bytes& out, std::uint32_t v, int bytes) {
  const std::size_t at = out.size();
  out.resize(at + static_cast<std::size_t>(bytes));
  for (int i = 0; i < bytes; ++i)
    out[at + static_cast<std::size_t>(i)] = static_cast<std::uint8_t>(v >> (8 * (bytes - 1 - i)));
}
inline void Put16(Bytes& out, std::uint16_t v) { PutBigEndian(out, v, 2); }
inline void Put32(Bytes& out, std::uint32_t v) { PutBigEndian(out, v, 4); }
inline std::uint32_t Get32(const Bytes& b, std::size_t at) {
  return std::uint32_t{b[at]} << 24 | std::uint32_t{b[at + 1]} << 16 |
         std::uint32_t{b[at + 2]} << 8 | b[at + 3];
}

// A "COMM" payload; with a compression type (AIFC) the type and an empty
// name follow.
inline Bytes Comm(std::int16_t channels, std::uint32_t frames, std::int16_t bits, double rate,
                  RIFFType compression = 0) {
  Bytes out;
  Put16(out, static_cast<std::uint16_t>(channels));
  Put32(out, frames);
  Put16(out, static_cast<std::uint16_t>(bits));
  std::array<unsigned char, 10> ext{};
  double_to_ieee_80(rate, ext.data());
  out.insert(out.end(), ext.begin(), ext.end());
  if (compression != 0) {
    Put32(out, compression);
    Put16(out, 0);  // empty name and its pad byte
  }
  return out;
}

// An "SSND" payload: offset, block size, `offset` filler bytes, then audio.
inline Bytes Ssnd(std::uint32_t offset, const Bytes& audio, std::uint32_t filler = 0) {
  Bytes out;
  Put32(out, offset);
  Put32(out, 0);
  out.resize(out.size() + filler, 0xAB);
  out.insert(out.end(), audio.begin(), audio.end());
  return out;
}

// A whole FORM file of form type `form` with a correct container size.
inline Bytes FormImage(RIFFType form, const std::vector<ChunkSpec>& chunks) {
  Bytes image = FileImage(chunks, Container::kFORM);
  for (int i = 0; i < 4; ++i) image[8 + i] = static_cast<std::uint8_t>(form >> (24 - 8 * i));
  return image;
}

// The offset of the first "SSND" chunk found by walking the chunk headers
// (not by the library), or 0.
inline std::size_t FindSoundChunk(const Bytes& file) {
  for (std::size_t pos = 12; pos + 8 <= file.size();) {
    if (Get32(file, pos) == MakeRIFFType("SSND")) return pos;
    const std::size_t size = Get32(file, pos + 4);
    pos += 8 + size + (size & 1);
  }
  return 0;
}

// Known samples for a file: the bytes as the file holds them, and each
// sample as a full-scale 32-bit integer (integer encodings) or as a double
// (floating point), in interleaved order.
struct Ramp {
  Bytes bytes;
  std::vector<std::int32_t> ints;
  std::vector<double> reals;
};

inline Ramp MakeRamp(int channels, int frames, int bits, bool lsbFirst, bool floating) {
  Ramp ramp;
  const int bytes = bits / 8;
  for (int k = 0; k < channels * frames; ++k) {
    std::uint64_t word = 0;
    if (floating) {
      // Multiples of 1/256 in [-0.5, 0.5): exact in every format and decoder.
      const double v = ((k * 37 + 11) % 256 - 128) / 256.0;
      ramp.reals.push_back(v);
      if (bits == 32) {
        const float f = static_cast<float>(v);
        std::uint32_t u;
        std::memcpy(&u, &f, 4);
        word = u;
      } else {
        std::memcpy(&word, &v, 8);
      }
    } else {
      const std::uint32_t spread = static_cast<std::uint32_t>(k) * 2654435761u + 977u;
      const std::uint32_t top = spread & (bits == 32 ? 0xFFFFFFFFu : ~(0xFFFFFFFFu >> bits));
      ramp.ints.push_back(static_cast<std::int32_t>(top));
      word = top >> (32 - bits);
    }
    for (int i = 0; i < bytes; ++i) {
      const int shift = lsbFirst ? 8 * i : 8 * (bytes - 1 - i);
      ramp.bytes.push_back(static_cast<std::uint8_t>(word >> shift));
    }
  }
  return ramp;
}

}  // namespace tarn::test
