#pragma once
// AIFFWriter: lays down the header of a new FORM "AIFF" or "AIFC" file so
// that the audio can follow it, and keeps the header's sizes right as the
// audio grows.
//
// Header of a new file, in file order (all fields big-endian):
//   "FORM" size, form type "AIFF" or "AIFC";
//   AIFC only: "FVER" with the AIFC version stamp 0xA2805140;
//   "COMM": channels, frames, bits per sample, the rate as an 80-bit
//     extended value, and for AIFC the compression type with its name as a
//     Pascal string padded to even length;
//   "SSND" with offset 0 and block size 0; the audio follows at once.
// Audio offsets: 54 in AIFF; in AIFC 86 for "NONE", 84 for "sowt", 92 for
// "fl32" and "fl64" (the compression names' lengths differ).
//
// Encodings: AIFF (compression "NONE") takes big-endian integers of 8, 16,
// 24 or 32 bits; AIFC takes "NONE" the same way, "sowt" for little-endian
// 16-bit, "fl32" for 32-bit and "fl64" for 64-bit floating point. Anything
// else, fewer than 1 channel, a rate that is not positive, or more frames
// than the 32-bit fields can describe fails with -50 before the file is
// touched. The reader (AIFFReader) reads every combination written back
// with the same attributes.
//
// The writer creates the file when it does not exist (type "AIFF" or
// "AIFC"; an existing file is written over from its start, not shortened),
// opens it for writing and owns the stream until Close or
// destruction. WriteHeader leaves the stream at the first audio byte; the
// caller writes the audio there (through GetStream, or through its own file
// access at GetHeaderSize). After the audio, UpdateDataLength rewrites the
// "FORM" size, the "COMM" frame count and the "SSND" size in place, and
// MaybePadChunk adds the zero pad byte an odd amount of audio needs.
// Stream errors (-36, -5000) propagate. One thread at a time.
//
//   AIFFWriter writer(spec, 48000.0, 2, 16, AIFFReader::kAIFC, AIFFReader::kSowt, 0);
//   writer.WriteHeader();
//   writer.GetStream().PutRawDataToStream(samples, bytes);
//   writer.UpdateDataLength(frames);
//   writer.MaybePadChunk();
//   writer.Close();

#include <cstdint>
#include <memory>

#include "tarn/Audio/SoundFileFormats/AIFFReader.h"
#include "tarn/Audio/SoundFileFormats/SoundFileAttributes.h"
#include "tarn/FileSystem/FileSpecification.h"
#include "tarn/Streams/CFileStream.h"

namespace tarn {

class AIFFWriter {
 public:
  static constexpr std::uint32_t kAIFCVersion1 = 0xA2805140;
  static constexpr int kStreamBufferSize = 4096;

  // A writer of `channels` x `bitsPerSample` audio at `rate` in form
  // `formType` ("AIFF"/"AIFC") with `compression` ("NONE" for AIFF), whose
  // header first describes `frames` frames.
  AIFFWriter(const FileSpecification& spec, double rate, std::int16_t channels,
             std::int16_t bitsPerSample, RIFFType formType, RIFFType compression,
             std::int64_t frames);
  AIFFWriter(const AIFFWriter&) = delete;
  AIFFWriter& operator=(const AIFFWriter&) = delete;
  ~AIFFWriter();

  // The form and compression that hold samples of these attributes:
  // floating point needs AIFC "fl32"/"fl64", little-endian integers AIFC
  // "sowt" (16-bit only), big-endian integers "NONE" in the form the
  // attributes' file type asks for ("AIFF" unless it is "AIFC"). Fails with
  // -50 for what AIFF cannot hold.
  static void ChooseEncoding(const SoundFileAttributes& attributes, RIFFType& formType,
                             RIFFType& compression, std::int16_t& bitsPerSample);
  // The attributes a reader finds in a file written with these settings.
  [[nodiscard]] static SoundFileAttributes AttributesOf(double rate, std::int16_t channels,
                                                        std::int16_t bitsPerSample,
                                                        RIFFType formType, RIFFType compression);
  // The offset of the first audio byte for a form and compression.
  [[nodiscard]] static std::int32_t ComputeHeaderSize(RIFFType formType, RIFFType compression);

  // Writes the header from the start of the file; the stream is left at the
  // first audio byte.
  void WriteHeader();
  // Rewrites the three size fields for `frames` frames; the stream's
  // position is restored.
  void UpdateDataLength(std::int64_t frames);
  // Writes the zero pad byte after the audio when its length is odd.
  void MaybePadChunk();
  // Writes back and closes the stream (errors propagate).
  void Close();

  [[nodiscard]] std::int32_t GetHeaderSize() const noexcept { return headerSize_; }
  [[nodiscard]] std::int32_t GetBytesPerFrame() const noexcept { return bytesPerFrame_; }
  [[nodiscard]] CFileStream& GetStream() noexcept { return *stream_; }

 private:
  static void Validate(double rate, std::int16_t channels, std::int16_t bitsPerSample,
                       RIFFType formType, RIFFType compression, std::int64_t frames);
  void WriteCommonChunk();
  [[nodiscard]] std::int64_t DataBytes(std::int64_t frames) const noexcept {
    return frames * bytesPerFrame_;
  }

  double rate_;
  std::int16_t channels_;
  std::int16_t bits_;
  RIFFType form_;
  RIFFType compression_;
  std::int64_t frames_;
  std::int32_t bytesPerFrame_;
  std::int32_t headerSize_;
  std::unique_ptr<CFileStream> stream_;
};

}  // namespace tarn
