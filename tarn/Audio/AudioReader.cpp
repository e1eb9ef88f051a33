#include "tarn/Audio/AudioReader.h"

#include <algorithm>
#include <utility>

#include "tarn/Errors/Fail.h"

namespace tarn {

SampleCount AudioReader::Available(SampleCount start, SampleCount frames) const {
  if (start < 0 || frames < 0) FailOSErr(kParamErr);
  const SampleCount length = GetLengthInFrames();
  if (start >= length) return 0;
  return std::min(frames, length - start);
}

SampleCount AudioReader::Read(void* const* channels, SampleCount frames) {
  const SampleCount got = OutOfOrderRead(channels, position_, frames);
  position_ += got;
  return got;
}

void AudioReader::SetReadPosition(SampleCount frame) {
  position_ = std::clamp(frame, SampleCount(0), GetLengthInFrames());
}

SampleCount AudioReader::OutOfOrderRead(void* const* channels, SampleCount start,
                                        SampleCount frames) {
  const SampleCount n = Available(start, frames);
  return n > 0 ? ReadFrames(channels, start, n) : SampleCount(0);
}

void AudioReader::OutOfOrderReadAsync(void* const* channels, SampleCount start, SampleCount frames,
                                      Completion completion) {
  const SampleCount n = Available(start, frames);
  if (n <= 0) {
    completion(0, 0);
    return;
  }
  ReadFramesAsync(ChannelPointers(channels, channels + GetNumChannels()), start, n,
                  std::move(completion));
}

}  // namespace tarn
