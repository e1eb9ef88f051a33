#include "tarn/Audio/InterleavingWriter.h"

#include <algorithm>
#include <utility>

#include "tarn/Audio/AudioChainKernelsImpl.h"
#include "tarn/Errors/Fail.h"

namespace tarn {

using chainimpl::kBlockFrames;

InterleavingWriter::InterleavingWriter(std::shared_ptr<InterAudioWriter> destination)
    : destination_(std::move(destination)) {
  if (!destination_) FailOSErr(kParamErr);
  format_ = destination_->GetFormat();
  bytesPerSample_ = GetBytesPerSample(format_.mSampleFormat);
  if (bytesPerSample_ < 1 || format_.mNumChannels < 1) FailOSErr(kParamErr);
}

InterleavingWriter::~InterleavingWriter() = default;

void InterleavingWriter::Write(const void* const* channels, SampleCount frames) {
  if (closed_ || frames < 0) FailOSErr(kParamErr);
  const int numChannels = format_.mNumChannels;
  if (numChannels == 1) {
    if (frames > 0) destination_->Write(channels[0], frames);
    return;
  }
  scratch_.resize(kBlockFrames * static_cast<std::size_t>(bytesPerSample_) * numChannels);
  for (std::int64_t done = 0; done < frames.AsLongLong();) {
    const auto n = static_cast<std::size_t>(std::min<std::int64_t>(
        frames.AsLongLong() - done, static_cast<std::int64_t>(kBlockFrames)));
    chainimpl::Interleave(channels, static_cast<std::size_t>(done), scratch_.data(), numChannels,
                          bytesPerSample_, n);
    destination_->Write(scratch_.data(), static_cast<std::int64_t>(n));
    done += static_cast<std::int64_t>(n);
  }
}

void InterleavingWriter::Flush() {
  if (closed_) FailOSErr(kParamErr);
  destination_->Flush();
}

void InterleavingWriter::Close() {
  if (closed_) return;
  closed_ = true;
  destination_->Close();
}

}  // namespace tarn
