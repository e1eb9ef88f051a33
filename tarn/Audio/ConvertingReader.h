#pragma once
// ConvertingReader: an AudioReader that delivers another AudioReader's
// samples in a different sample format, converted block by block by one
// BufConverter (this library's scaling, rounding and clipping; optional
// triangular dither when narrowing to 8 or 16 bits). Channels, rate,
// channel order and stretch are the source's.
//
// Samples are converted channel after channel through one converter, so a
// dithered reader draws a fresh dither value for every sample of every
// channel. The source reads into one reused scratch buffer of a few
// thousand frames per channel (an asynchronous read grows it to the
// request once); nothing is allocated per block.
//
//   std::unique_ptr<AudioReader> floats =
//       ConvertingReader::Wrap(std::make_unique<DeinterleavingReader>(std::move(raw)),
//                              kSampFloat32);
//
// Threads and failures: as AudioReader. The constructor throws -50 for a
// null source and the converter's -108 when there is no converter for the
// pair (equal formats included; Wrap avoids that case).

#include <memory>
#include <vector>

#include "tarn/Audio/AudioReader.h"
#include "tarn/Audio/BufConverter.h"

namespace tarn {

class ConvertingReader final : public AudioReader {
 public:
  ConvertingReader(std::unique_ptr<AudioReader> source, SampleFormat format,
                   DitherType dither = kNoDither);
  ~ConvertingReader() override;

  // `source` itself when it already delivers `format`, else a
  // ConvertingReader over it.
  [[nodiscard]] static std::unique_ptr<AudioReader> Wrap(std::unique_ptr<AudioReader> source,
                                                         SampleFormat format,
                                                         DitherType dither = kNoDither);

  [[nodiscard]] AudioFormat GetFormat() const override { return format_; }
  [[nodiscard]] HostChannelOrder GetChannelOrder() const override;
  [[nodiscard]] SampleCount GetLengthInFrames() const override;

 protected:
  SampleCount ReadFrames(void* const* channels, SampleCount start, SampleCount frames) override;
  void ReadFramesAsync(ChannelPointers channels, SampleCount start, SampleCount frames,
                       Completion completion) override;

 private:
  // Makes room for `frames` source samples per channel.
  void Reserve(std::size_t frames);
  // Converts `frames` scratch samples per channel into `channels` from
  // sample `offset` on.
  void ConvertInto(void* const* channels, std::size_t offset, std::size_t frames) noexcept;

  std::unique_ptr<AudioReader> source_;
  AudioFormat format_;
  std::unique_ptr<BufConverter> converter_;
  int sourceBytes_ = 0;
  int bytes_ = 0;
  std::size_t capacity_ = 0;            // frames per channel in scratch_
  std::vector<unsigned char> scratch_;  // source samples, channel after channel
  ChannelPointers scratchChannels_;
};

}  // namespace tarn
