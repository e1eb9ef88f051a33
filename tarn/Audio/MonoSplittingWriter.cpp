#include "tarn/Audio/MonoSplittingWriter.h"

#include <algorithm>
#include <utility>

#include "tarn/Errors/Fail.h"

namespace tarn {

MonoSplittingWriter::MonoSplittingWriter(std::shared_ptr<AudioWriter> destination)
    : destination_(std::move(destination)) {
  if (!destination_) FailOSErr(kParamErr);
  format_ = destination_->GetFormat();
  copies_.resize(static_cast<std::size_t>(std::max<int>(format_.mNumChannels, 0)));
  format_.mNumChannels = 1;
}

MonoSplittingWriter::~MonoSplittingWriter() = default;

void MonoSplittingWriter::Write(const void* const* channels, SampleCount frames) {
  std::fill(copies_.begin(), copies_.end(), channels[0]);
  destination_->Write(copies_.data(), frames);
}

}  // namespace tarn
