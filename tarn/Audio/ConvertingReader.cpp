#include "tarn/Audio/ConvertingReader.h"

#include <algorithm>
#include <utility>

#include "tarn/Audio/AudioChainKernelsImpl.h"
#include "tarn/Errors/Fail.h"

namespace tarn {

using chainimpl::kBlockFrames;

ConvertingReader::ConvertingReader(std::unique_ptr<AudioReader> source, SampleFormat format,
                                   DitherType dither)
    : source_(std::move(source)) {
  if (!source_) FailOSErr(kParamErr);
  const AudioFormat from = source_->GetFormat();
  format_ = from;
  format_.mSampleFormat = format;
  converter_ = BufConverter::Create(from, format_, dither);
  sourceBytes_ = GetBytesPerSample(from.mSampleFormat);
  bytes_ = GetBytesPerSample(format);
  scratchChannels_.resize(static_cast<std::size_t>(std::max<int>(from.mNumChannels, 0)));
}

ConvertingReader::~ConvertingReader() = default;

std::unique_ptr<AudioReader> ConvertingReader::Wrap(std::unique_ptr<AudioReader> source,
                                                    SampleFormat format, DitherType dither) {
  if (source && source->GetFormat().mSampleFormat == format) return source;
  return std::make_unique<ConvertingReader>(std::move(source), format, dither);
}

HostChannelOrder ConvertingReader::GetChannelOrder() const { return source_->GetChannelOrder(); }

SampleCount ConvertingReader::GetLengthInFrames() const { return source_->GetLengthInFrames(); }

void ConvertingReader::Reserve(std::size_t frames) {
  if (frames <= capacity_) return;
  scratch_.resize(frames * scratchChannels_.size() * static_cast<std::size_t>(sourceBytes_));
  capacity_ = frames;
  for (std::size_t c = 0; c < scratchChannels_.size(); ++c)
    scratchChannels_[c] = scratch_.data() + c * frames * static_cast<std::size_t>(sourceBytes_);
}

void ConvertingReader::ConvertInto(void* const* channels, std::size_t offset,
                                   std::size_t frames) noexcept {
  for (std::size_t c = 0; c < scratchChannels_.size(); ++c) {
    const auto* in = static_cast<const unsigned char*>(scratchChannels_[c]);
    auto* out =
        static_cast<unsigned char*>(channels[c]) + offset * static_cast<std::size_t>(bytes_);
    for (std::size_t done = 0; done < frames;) {
      const std::size_t n = std::min(frames - done, kBlockFrames);
      converter_->Convert(in + done * static_cast<std::size_t>(sourceBytes_),
                          out + done * static_cast<std::size_t>(bytes_), static_cast<int>(n));
      done += n;
    }
  }
}

SampleCount ConvertingReader::ReadFrames(void* const* channels, SampleCount start,
                                         SampleCount frames) {
  const std::size_t block =
      chainimpl::ReadBlockFrames(static_cast<std::size_t>(sourceBytes_) * scratchChannels_.size());
  Reserve(block);
  return chainimpl::ReadInBlocks(
      start.AsLongLong(), frames.AsLongLong(), block,
      [this](std::int64_t at, std::int64_t count) {
        return source_->OutOfOrderRead(scratchChannels_.data(), at, count).AsLongLong();
      },
      [this, channels](std::size_t done, std::size_t got) { ConvertInto(channels, done, got); });
}

void ConvertingReader::ReadFramesAsync(ChannelPointers channels, SampleCount start,
                                       SampleCount frames, Completion completion) {
  Reserve(static_cast<std::size_t>(frames.AsLongLong()));
  source_->OutOfOrderReadAsync(scratchChannels_.data(), start, frames,
                               [this, channels = std::move(channels),
                                completion = std::move(completion)](int status, SampleCount got) {
                                 if (got > 0)
                                   ConvertInto(channels.data(), 0,
                                               static_cast<std::size_t>(got.AsLongLong()));
                                 completion(status, got);
                               });
}

}  // namespace tarn
