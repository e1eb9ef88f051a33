#pragma once
// ConverterSoundFileFormat: the format object of a file that only the
// outside converter reads (AIFC, MP3, M4A, CAF, movie soundtracks...).
//
// It carries no metadata (NoMetaDataSoundFileFormat answers every metadata
// question with "none") and cannot be written or created. Its attributes
// are the decoded stream's: channel count, rate, and the converter's
// closest native sample format (mOffsetToAudio 0, samples native-order).
// The frame count is the container's where it states one exactly;
// otherwise the file is decoded once to count it, on the first question,
// and the count is kept. MakeReader gives a ConverterAudioReader, so
// MakeFloatingPointReader gives the usual deinterleaving float chain.
//
//   auto format = SoundFileFormatCache::Instance().GetFormat(spec);   // "mp3 " etc.
//   auto reader = format->MakeFloatingPointReader({0, format->GetLengthInFrames()},
//                                                 format->GetNaturalRate());
//
// Threads: any thread; the counted length is computed once under a lock.
// Failures: construction throws OutsideDecoder's TarnError (naming the
// file) when the converter cannot decode it; MakeReader throws -50 for a
// rate other than the natural one; MakeWriter and CreateFileOnDisk throw
// kNotAvailableErr.

#include <cstdint>
#include <mutex>
#include <optional>

#include "tarn/Audio/SoundFileFormats/NoMetaDataSoundFileFormat.h"

namespace tarn {

class ConverterSoundFileFormat final : public NoMetaDataSoundFileFormat {
 public:
  // Opens the file with the outside converter to learn its attributes;
  // `type` is the file's type code (GetCanonicalFileType).
  ConverterSoundFileFormat(const FileSpecification& file, std::uint32_t type);
  ~ConverterSoundFileFormat() override;

  [[nodiscard]] std::unique_ptr<AsyncAudioReader> MakeReader(const TimeRangeOf<SampleCount>& range,
                                                             double rate) override;
  [[nodiscard]] SampleCount GetLengthInFrames() override;
  [[nodiscard]] std::uint32_t GetCanonicalFileType() override { return type_; }
  [[nodiscard]] std::uint32_t GetPerferredFileCreator() override { return 0; }
  [[nodiscard]] SoundFileAttributes GetFileAttributes() override { return attributes_; }
  [[nodiscard]] bool FormatRequiresExternalConversion() override { return true; }
  SoundFileAttributes CreateFileOnDisk(const SoundFileAttributes& attributes, SampleCount frames,
                                       bool recording, const SoundFileAttributes& hint) override;

 private:
  std::uint32_t type_;
  SoundFileAttributes attributes_;
  std::mutex lengthLock_;
  std::optional<SampleCount> length_;  // known or counted; guarded by lengthLock_
};

// The cache's defaults for converter-read files: a ConverterSoundFileFormat,
// and the probe (whether OutsideDecoder can decode the file; never throws).
[[nodiscard]] std::shared_ptr<SoundFileFormat> MakeConverterSoundFileFormat(
    const FileSpecification& file, std::uint32_t type);
[[nodiscard]] bool OutsideConverterCanOpen(const FileSpecification& file) noexcept;

}  // namespace tarn
