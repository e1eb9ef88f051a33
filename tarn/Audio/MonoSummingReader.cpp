#include "tarn/Audio/MonoSummingReader.h"

#include <algorithm>
#include <utility>

#include "tarn/Audio/AudioChainKernelsImpl.h"
#include "tarn/Errors/Fail.h"

namespace tarn {

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
  const int numChannels = static_cast<int>(scratchChannels_.size());
  const std::size_t block =
      chainimpl::ReadBlockFrames(sizeof(float) * static_cast<std::size_t>(numChannels));
  Reserve(block);
  auto* out = static_cast<float*>(channels[0]);
  return chainimpl::ReadInBlocks(
      start.AsLongLong(), frames.AsLongLong(), block,
      [this](std::int64_t at, std::int64_t count) {
        return source_->OutOfOrderRead(scratchChannels_.data(), at, count).AsLongLong();
      },
      [&](std::size_t done, std::size_t got) {
        chainimpl::SumChannels(scratchChannels_.data(), numChannels, 0, out + done, got);
      });
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
