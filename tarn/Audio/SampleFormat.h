// Sample encodings of audio held in memory or on disk, and the small value
// types that describe a stream of samples.
//
// `SampleFormat` values are stable 32-bit codes (they are stored in files and
// records). `GetBytesPerSample` and `NormalSampleFormatForSize` are pure table
// look-ups and never throw. `GetSampleFormatName` returns display text fetched
// once per format from the host's texts (built-in English when no host is
// installed); the reference stays valid for the life of the process and the
// function may be called from any thread.
#pragma once

#include <cstdint>

namespace tarn {

class UString;

enum SampleFormat : std::int32_t {
  kSamp8Offset = 0,     // unsigned offset binary, 0x80 is silence
  kSamp8 = 1,           // signed 8-bit
  kSamp16 = 2,          // signed 16-bit
  kSamp24 = 3,          // packed signed 24-bit, least significant byte first
  kSampUnpacked24 = 4,  // signed 24-bit left-justified in a 32-bit word
  kSampFloat32 = 5,     // IEEE float, full scale is +-1.0
  kSampWide64A = 6,     // 8-byte format the converter does not handle
  kSampWide64B = 7,     // the normal 8-byte format
};

inline constexpr int kNumSampleFormats = 8;

enum DitherType : std::int32_t {
  kNoDither = 0,
  kTriangularDither = 1,
};

// The format of a stream of frames. Only `mSampleFormat` matters to the
// sample converter.
struct AudioFormat {
  SampleFormat mSampleFormat = kSamp16;
  std::int16_t mNumChannels = 1;
  double mSampleRate = 44100.0;

  friend bool operator==(const AudioFormat&, const AudioFormat&) = default;
};

// One 8-bit offset-binary sample: converts to and from a signed byte by
// flipping the top bit (adding 128 modulo 256).
struct EightBitOffsetNumber {
  std::uint8_t mValue = 0x80;

  EightBitOffsetNumber() = default;
  constexpr explicit EightBitOffsetNumber(signed char s) noexcept
      : mValue(static_cast<std::uint8_t>(static_cast<std::uint8_t>(s) ^ 0x80u)) {}
  [[nodiscard]] constexpr explicit operator signed char() const noexcept {
    return static_cast<signed char>(mValue ^ 0x80u);
  }
};

// 1, 1, 2, 3, 4, 4, 8, 8 for formats 0 to 7; 0 for any other value.
[[nodiscard]] int GetBytesPerSample(SampleFormat format) noexcept;

// The usual format for a sample size: 1 -> kSamp8Offset, 2 -> kSamp16,
// 3 -> kSamp24, 4 -> kSampFloat32, 8 -> kSampWide64B; any other size -> 0.
[[nodiscard]] SampleFormat NormalSampleFormatForSize(int bytes) noexcept;

// Display name of a format: entry format + 1 of the host's string list 12595,
// fetched the first time it is asked for and cached. Throws a parameter error
// (-50) for values outside 0 to 7.
[[nodiscard]] const UString& GetSampleFormatName(SampleFormat format);

}  // namespace tarn
