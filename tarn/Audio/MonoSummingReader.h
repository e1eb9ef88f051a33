#pragma once
// MonoSummingReader: an AudioReader of one float channel whose every sample
// is the sum, in single precision and in channel order, of the samples of
// all channels of a float AudioReader (no scaling: a full-scale stereo
// source can give 2.0). Rate and stretch are the source's.
//
//   auto mono = std::make_unique<MonoSummingReader>(format->MakeFloatingPointReader(range, rate));
//
// Threads and failures: as AudioReader; the constructor throws -50 for a
// null source or one that does not deliver kSampFloat32.

#include <memory>
#include <vector>

#include "tarn/Audio/AudioReader.h"

namespace tarn {

class MonoSummingReader final : public AudioReader {
 public:
  explicit MonoSummingReader(std::unique_ptr<AudioReader> source);
  ~MonoSummingReader() override;

  [[nodiscard]] AudioFormat GetFormat() const override { return format_; }
  [[nodiscard]] HostChannelOrder GetChannelOrder() const override;
  [[nodiscard]] SampleCount GetLengthInFrames() const override;

 protected:
  SampleCount ReadFrames(void* const* channels, SampleCount start, SampleCount frames) override;
  void ReadFramesAsync(ChannelPointers channels, SampleCount start, SampleCount frames,
                       Completion completion) override;

 private:
  void Reserve(std::size_t frames);

  std::unique_ptr<AudioReader> source_;
  AudioFormat format_;
  std::size_t capacity_ = 0;    // frames per channel in scratch_
  std::vector<float> scratch_;  // source channels, one after another
  ChannelPointers scratchChannels_;
};

}  // namespace tarn
