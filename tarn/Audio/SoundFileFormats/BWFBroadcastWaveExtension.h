#pragma once
// BWFBroadcastWaveExtension: the payload of a WAVE file's "bext" chunk (the
// broadcast extension), as a record, flattened to and parsed from its
// little-endian byte image.
//
// Layout (byte offsets): description 0 (256), originator 256 (32),
// originator reference 288 (32), origination date 320 (10, "yyyy-mm-dd"),
// origination time 330 (8, "hh:mm:ss"), time reference low 338 and high 342
// (32-bit each), version 346 (16-bit), UMID 348 (64), loudness value 412,
// loudness range 414, max true peak 416, max momentary 418, max short-term
// 420 (16-bit each, meaningful from version 1 and 2), 180 reserved bytes at
// 422, coding history from 602 to the end. Text fields are byte strings,
// zero-padded and not necessarily terminated.
//
// Flatten writes at least BroadcastWaveExtensionDefaultChunkSize (858)
// bytes, more when the coding history does not fit in the 256 bytes after
// the fixed part. Parse accepts any length: fields that the bytes do not
// reach keep their defaults (empty texts, zeros), so short chunks from other
// writers and version-0 chunks read fine. Plain value type; any thread.
//
//   BWFBroadcastWaveExtension bext = BWFBroadcastWaveExtension::ForNewRecording(attrs);
//   bext.SetDescription("Take 3");
//   std::vector<std::uint8_t> payload = bext.Flatten();   // 858 bytes

#include <array>
#include <cstdint>
#include <string>
#include <vector>

#include "tarn/Audio/SoundFileFormats/SoundFileAttributes.h"

namespace tarn {

class BWFBroadcastWaveExtension {
 public:
  static constexpr int BroadcastWaveExtensionDefaultChunkSize = 858;
  // Bytes before the coding history.
  static constexpr int kFixedPartSize = 602;
  static constexpr int kDescriptionSize = 256;
  static constexpr int kOriginatorSize = 32;
  static constexpr int kOriginatorReferenceSize = 32;
  static constexpr int kOriginationDateSize = 10;
  static constexpr int kOriginationTimeSize = 8;
  static constexpr int kUMIDSize = 64;
  static constexpr int kReservedSize = 180;
  // Offsets of the fields that follow the texts.
  static constexpr int kTimeReferenceOffset = 338;
  static constexpr int kVersionOffset = 346;
  static constexpr int kUMIDOffset = 348;
  static constexpr int kLoudnessOffset = 412;
  // The loudness fields' "not measured" value (versions 1 and 2).
  static constexpr std::int16_t kLoudnessUnset = 0x7FFF;
  // The originator written into new recordings.
  static constexpr const char* kDefaultOriginator = "TarnCore";

  BWFBroadcastWaveExtension() = default;
  BWFBroadcastWaveExtension(const BWFBroadcastWaveExtension&) = default;
  BWFBroadcastWaveExtension& operator=(const BWFBroadcastWaveExtension&) = default;
  ~BWFBroadcastWaveExtension() = default;

  // The extension of a new recording in a file with `attributes`: version
  // 1, originator "TarnCore", origination date and time now (UTC), time
  // reference 0, loudness fields unset, and a one-line coding history
  // ("A=PCM,F=48000,W=24,M=stereo,T=TarnCore", CR LF) that fits the
  // default size.
  [[nodiscard]] static BWFBroadcastWaveExtension ForNewRecording(
      const SoundFileAttributes& attributes);

  // The byte image: max(858, 602 + coding history length) bytes; texts
  // longer than their fields are cut.
  [[nodiscard]] std::vector<std::uint8_t> Flatten() const;
  // Reads what `size` bytes hold (any size, 0 included); never throws.
  [[nodiscard]] static BWFBroadcastWaveExtension Parse(const std::uint8_t* data, std::size_t size);

  // The time reference as one 64-bit value (high * 2^32 + low, unsigned).
  [[nodiscard]] std::uint64_t GetTimeReference() const noexcept {
    return static_cast<std::uint64_t>(mTimeReferenceHigh) << 32 | mTimeReferenceLow;
  }

  friend bool operator==(const BWFBroadcastWaveExtension&,
                         const BWFBroadcastWaveExtension&) = default;

  // Texts hold their bytes up to the first zero byte.
  std::string mDescription;
  std::string mOriginator;
  std::string mOriginatorReference;
  std::string mOriginationDate;  // "yyyy-mm-dd"
  std::string mOriginationTime;  // "hh:mm:ss"
  std::uint32_t mTimeReferenceLow = 0;
  std::uint32_t mTimeReferenceHigh = 0;
  std::uint16_t mVersion = 0;
  std::array<std::uint8_t, kUMIDSize> mUMID{};
  std::int16_t mLoudnessValue = 0;
  std::int16_t mLoudnessRange = 0;
  std::int16_t mMaxTruePeakLevel = 0;
  std::int16_t mMaxMomentaryLoudness = 0;
  std::int16_t mMaxShortTermLoudness = 0;
  // The coding history as stored (zero bytes at its end dropped).
  std::string mCodingHistory;
};

}  // namespace tarn
