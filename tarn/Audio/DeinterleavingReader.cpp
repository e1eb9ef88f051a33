#include "tarn/Audio/DeinterleavingReader.h"

#include <algorithm>
#include <utility>

#include "tarn/Audio/AudioChainKernelsImpl.h"
#include "tarn/Errors/Fail.h"

namespace tarn {

DeinterleavingReader::DeinterleavingReader(std::unique_ptr<AsyncAudioReader> source)
    : source_(std::move(source)) {
  if (!source_) FailOSErr(kParamErr);
  format_ = source_->GetFormat();
  bytesPerSample_ = GetBytesPerSample(format_.mSampleFormat);
  if (bytesPerSample_ < 1 || format_.mNumChannels < 1) FailOSErr(kParamErr);
}

DeinterleavingReader::~DeinterleavingReader() = default;

HostChannelOrder DeinterleavingReader::GetChannelOrder() const {
  return source_->GetChannelOrder();
}

SampleCount DeinterleavingReader::GetLengthInFrames() const { return source_->GetLengthInFrames(); }

SampleCount DeinterleavingReader::ReadFrames(void* const* channels, SampleCount start,
                                             SampleCount frames) {
  const int numChannels = format_.mNumChannels;
  if (numChannels == 1) return source_->OutOfOrderRead(channels[0], start, frames);
  const std::size_t frameBytes = static_cast<std::size_t>(bytesPerSample_) * numChannels;
  const std::size_t block = chainimpl::ReadBlockFrames(frameBytes);
  scratch_.resize(std::max(scratch_.size(), block * frameBytes));
  return chainimpl::ReadInBlocks(
      start.AsLongLong(), frames.AsLongLong(), block,
      [this](std::int64_t at, std::int64_t count) {
        return source_->OutOfOrderRead(scratch_.data(), at, count).AsLongLong();
      },
      [&](std::size_t done, std::size_t got) {
        chainimpl::Deinterleave(scratch_.data(), channels, numChannels, bytesPerSample_, got, done);
      });
}

void DeinterleavingReader::ReadFramesAsync(ChannelPointers channels, SampleCount start,
                                           SampleCount frames, Completion completion) {
  const int numChannels = format_.mNumChannels;
  if (numChannels == 1) {
    source_->OutOfOrderReadAsync(channels[0], start, frames, std::move(completion));
    return;
  }
  const std::size_t frameBytes = static_cast<std::size_t>(bytesPerSample_) * numChannels;
  const auto bytes = static_cast<std::size_t>(frames.AsLongLong()) * frameBytes;
  if (scratch_.size() < bytes) scratch_.resize(bytes);
  source_->OutOfOrderReadAsync(
      scratch_.data(), start, frames,
      [this, channels = std::move(channels), completion = std::move(completion)](int status,
                                                                                 SampleCount got) {
        if (got > 0)
          chainimpl::Deinterleave(scratch_.data(), channels.data(), format_.mNumChannels,
                                  bytesPerSample_, static_cast<std::size_t>(got.AsLongLong()), 0);
        completion(status, got);
      });
}

}  // namespace tarn
