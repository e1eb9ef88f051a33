#pragma once
// SoundFileReader: a host's few-line way to read any sound file this
// library opens (WAVE, Wave64, AIFF, AIFC): any frame range, as one buffer
// per channel, in float or any other sample format, synchronously or with a
// completion.
//
//   SoundFileReader file(spec);                       // throws if it is no sound file
//   std::vector<std::vector<float>> channels;
//   file.Read(0, file.GetLengthInFrames(), channels); // whole file, float per channel
//   void* buffers[] = {left, right};
//   file.Read(48000, 1024, buffers, kSamp16);         // 16-bit samples at one second
//   file.ReadAsync(0, 1024, buffers, kSampFloat32, [](int status, SampleCount got) { ... });
//
// The format object comes from SoundFileFormatCache::Instance() (an "AIFC"
// file is opened by the AIFF format). Frames count from the start of the
// file's audio; requests are cut to the length the file had when it was
// opened (a read at or past the end gives 0 frames; a negative start or
// count throws -50). Samples are converted from the file's format by the
// library's converter (no dither unless a reader is made with it).
//
// Threads: one thread at a time; an asynchronous read's completion runs on
// the file layer's reader thread, and no other read may start on this
// object, nor may it be destroyed, until the completion has run.
// Failures: TarnErrors from the format (opening, parsing) and the file
// layer; asynchronous reads report the file layer's status instead.

#include <array>
#include <memory>
#include <vector>

#include "tarn/Audio/AudioReader.h"
#include "tarn/Audio/SoundFileFormats/SoundFileAttributes.h"
#include "tarn/FileSystem/FileSpecification.h"
#include "tarn/Time/TimeRegion.h"

namespace tarn {

class SoundFileFormat;

class SoundFileReader {
 public:
  using Completion = AudioReader::Completion;

  // Opens `file` through the format cache.
  explicit SoundFileReader(const FileSpecification& file);
  // Reads the file of an existing format object.
  explicit SoundFileReader(std::shared_ptr<SoundFileFormat> format);
  SoundFileReader(const SoundFileReader&) = delete;
  SoundFileReader& operator=(const SoundFileReader&) = delete;
  ~SoundFileReader();

  // The format object the cache gave for `file`: an "AIFC" file is served
  // by the AIFF format.
  [[nodiscard]] static std::shared_ptr<SoundFileFormat> OpenFormat(const FileSpecification& file);

  [[nodiscard]] const std::shared_ptr<SoundFileFormat>& GetFileFormat() const noexcept {
    return format_;
  }
  // The file's header facts (type, channels, rate, stored sample format).
  [[nodiscard]] const SoundFileAttributes& GetAttributes() const noexcept { return attributes_; }
  [[nodiscard]] int GetNumChannels() const noexcept { return attributes_.mNumChannels; }
  [[nodiscard]] double GetSampleRate() const noexcept { return attributes_.mSampleRate; }
  [[nodiscard]] SampleCount GetLengthInFrames() const noexcept { return length_; }

  // Reads up to `frames` frames from `start` into GetNumChannels() buffers
  // of `format` samples; returns the frames read.
  SampleCount Read(SampleCount start, SampleCount frames, void* const* channels,
                   SampleFormat format = kSampFloat32);
  // As above into float vectors: `channels` becomes GetNumChannels()
  // vectors of the frames read.
  SampleCount Read(SampleCount start, SampleCount frames,
                   std::vector<std::vector<float>>& channels);
  // As Read, returning at once; `completion` gets the status and the frames
  // read when the buffers are filled (see Threads above).
  void ReadAsync(SampleCount start, SampleCount frames, void* const* channels, SampleFormat format,
                 Completion completion);

  // A reader chain of its own over `range` of the file (cut to the file),
  // delivering `format`, optionally dithered when narrowing, and summed to
  // one channel when `mono` (summed in float, then converted).
  [[nodiscard]] std::unique_ptr<AudioReader> MakeReader(const TimeRangeOf<SampleCount>& range,
                                                        SampleFormat format = kSampFloat32,
                                                        bool mono = false,
                                                        DitherType dither = kNoDither) const;

 private:
  AudioReader& ReaderFor(SampleFormat format);

  std::shared_ptr<SoundFileFormat> format_;
  SoundFileAttributes attributes_;
  SampleCount length_ = 0;
  // Whole-file readers, one per client sample format, made on first use.
  std::array<std::unique_ptr<AudioReader>, kNumSampleFormats> readers_;
};

}  // namespace tarn
