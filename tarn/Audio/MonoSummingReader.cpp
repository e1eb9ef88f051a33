#include "tarn/Audio/MonoSummingReader.h"

#include <algorithm>
#include <utility>

#include "tarn/Audio/AudioChainKernelsImpl.h"
#include "tarn/Errors/Fail.h"

namespace tarn {

using chainimpl::kBlockFrames;

MonoSummingReader::MonoSummingReader(std::unique_ptr<AudioReader> source)
    : source_(std::move(source)) {
  if (!source_) FailOSErr(kParamErr);
  format_ = source_->GetFormat();
  if (format_.mSampleFormat != kSampFloat32 || format_.mNumChannels < 1) FailOSErr(kParamErr);
  scratchChannels_.resize(static_cast<std::size_t>(format_.mNumChannels));
  format_.mNumChannels = 1;
}

MonoSummingReader::~MonoSummingReader() = default;

HostChannelOrder MonoSummingReader::GetChannelOrder() const {
  return HostChannelOrder::ForChannelCount(1);
}

SampleCount MonoSummingReader::GetLengthInFrames() const { return source_->GetLengthInFrames(); }

void MonoSummingReader::Reserve(std::size_t frames) {
  if (frames <= capacity_) return;
  scratch_.resize(frames * scratchChannels_.size());
  capacity_ = frames;
  for (std::size_t c = 0; c < scratchChannels_.size(); ++c)
    scratchChannels_[c] = scratch_.data() + c * frames;
}

SampleCount MonoSummingReader::ReadFrames(void* const* channels, SampleCount start,
                                          SampleCount frames) {
  Reserve(kBlockFrames);
  auto* out = static_cast<float*>(channels[0]);
  const int numChannels = static_cast<int>(scratchChannels_.size());
  std::int64_t done = 0;
  while (done < frames.AsLongLong()) {
    const std::int64_t want =
        std::min<std::int64_t>(frames.AsLongLong() - done, static_cast<std::int64_t>(kBlockFrames));
    const std::int64_t got =
        source_->OutOfOrderRead(scratchChannels_.data(), start + done, want).AsLongLong();
    if (got <= 0) break;
    chainimpl::SumChannels(scratchChannels_.data(), numChannels, 0, out + done,
                           static_cast<std::size_t>(got));
    done += got;
    if (got < want) break;
  }
  return done;
}

void MonoSummingReader::ReadFramesAsync(ChannelPointers channels, SampleCount start,
                                        SampleCount frames, Completion completion) {
  Reserve(static_cast<std::size_t>(frames.AsLongLong()));
  source_->OutOfOrderReadAsync(
      scratchChannels_.data(), start, frames,
      [this, out = static_cast<float*>(channels[0]), completion = std::move(completion)](
          int status, SampleCount got) {
        if (got > 0)
          chainimpl::SumChannels(scratchChannels_.data(), static_cast<int>(scratchChannels_.size()),
                                 0, out, static_cast<std::size_t>(got.AsLongLong()));
        completion(status, got);
      });
}

}  // namespace tarn
