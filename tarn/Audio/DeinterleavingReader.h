#pragma once
// DeinterleavingReader: turns an AsyncAudioReader (interleaved frames) into
// an AudioReader (one buffer per channel) without changing the samples: the
// sample format, channel count, rate, channel order and stretch are the
// source's. Reads go to the source in blocks through one reused scratch
// buffer (an asynchronous read grows it to the request once); a mono source
// reads straight into the caller's buffer.
//
//   auto reader = std::make_unique<DeinterleavingReader>(format->MakeReader(range, rate));
//
// Threads and failures: as AudioReader; the constructor throws -50 for a
// null source.

#include <memory>
#include <vector>

#include "tarn/Audio/AsyncAudioReader.h"
#include "tarn/Audio/AudioReader.h"

namespace tarn {

class DeinterleavingReader final : public AudioReader {
 public:
  explicit DeinterleavingReader(std::unique_ptr<AsyncAudioReader> source);
  ~DeinterleavingReader() override;

  [[nodiscard]] AudioFormat GetFormat() const override { return format_; }
  [[nodiscard]] HostChannelOrder GetChannelOrder() const override;
  [[nodiscard]] SampleCount GetLengthInFrames() const override;

 protected:
  SampleCount ReadFrames(void* const* channels, SampleCount start, SampleCount frames) override;
  void ReadFramesAsync(ChannelPointers channels, SampleCount start, SampleCount frames,
                       Completion completion) override;

 private:
  std::unique_ptr<AsyncAudioReader> source_;
  AudioFormat format_;
  int bytesPerSample_ = 0;
  std::vector<unsigned char> scratch_;  // interleaved frames of the source
};

}  // namespace tarn
