#pragma once
// SoundFileAttributes: the header facts of one sound file that the audio
// layer needs to move samples in and out of it, in one record.
//
// A format object (SoundFileFormat) fills it from the file's header; a caller
// fills it to create a file. Plain value: copy and compare freely, from any
// thread. Nothing here validates; the formats refuse what they cannot write.

#include <cstdint>

#include "tarn/Audio/SampleFormat.h"

namespace tarn {

struct SoundFileAttributes {
  // Four-character type code of the file ("WAVE", ".W64", "AIFF", "AIFC"...);
  // 0 when unknown.
  std::uint32_t mFileType = 0;
  std::int16_t mNumChannels = 0;
  double mSampleRate = 0.0;
  SampleFormat mSampleFormat = kSamp16;
  // Bytes of one sample on disk (1, 2, 3, 4 or 8) and of one frame (all
  // channels); a frame is mBytesPerSample * mNumChannels bytes.
  std::int16_t mBytesPerSample = 0;
  std::int32_t mBytesPerFrame = 0;
  // Byte offset of the first audio byte in the file.
  std::int32_t mOffsetToAudio = 0;
  // True when multi-byte samples are stored least significant byte first
  // (WAVE, Wave64, AIFC "sowt"); false for big-endian AIFF.
  bool mSamplesAreLSBFirst = true;

  friend bool operator==(const SoundFileAttributes&, const SoundFileAttributes&) = default;
};

}  // namespace tarn
