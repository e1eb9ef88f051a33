#include "tarn/Audio/ConvertingWriter.h"

#include <algorithm>
#include <cstring>
#include <utility>

#include "tarn/Errors/Fail.h"

namespace tarn {

namespace {
constexpr std::size_t kStagingBytes = 256 * 1024;
}

ConvertingWriter::ConvertingWriter(std::shared_ptr<InterAudioWriter> destination,
                                   SampleFormat format, DitherType dither)
    : destination_(std::move(destination)) {
  if (!destination_) FailOSErr(kParamErr);
  const AudioFormat fileFormat = destination_->GetFormat();
  format_ = fileFormat;
  format_.mSampleFormat = format;
  samplesPerFrame_ = fileFormat.mNumChannels;
  clientFrameBytes_ = GetBytesPerSample(format) * samplesPerFrame_;
  fileFrameBytes_ = GetBytesPerSample(fileFormat.mSampleFormat) * samplesPerFrame_;
  if (samplesPerFrame_ < 1 || fileFrameBytes_ < 1 || clientFrameBytes_ < 1) FailOSErr(kParamErr);
  if (format != fileFormat.mSampleFormat)
    converter_ = BufConverter::Create(format_, fileFormat, dither);
  capacity_ = std::max<std::size_t>(kStagingBytes / static_cast<std::size_t>(fileFrameBytes_), 1);
  staging_.resize(capacity_ * static_cast<std::size_t>(fileFrameBytes_));
}

ConvertingWriter::~ConvertingWriter() {
  if (closed_ || staged_ == 0) return;
  try {
    HandOn(true);
  } catch (...) {  // NOLINT(bugprone-empty-catch): documented; Flush reports errors
  }
}

void ConvertingWriter::Write(const void* buffer, SampleCount frames) {
  if (closed_ || frames < 0) FailOSErr(kParamErr);
  const auto* in = static_cast<const unsigned char*>(buffer);
  auto left = static_cast<std::size_t>(frames.AsLongLong());
  while (left > 0) {
    if (staged_ == capacity_) HandOn(false);
    const std::size_t n = std::min(left, capacity_ - staged_);
    unsigned char* out = staging_.data() + staged_ * static_cast<std::size_t>(fileFrameBytes_);
    if (converter_)
      converter_->Convert(in, out, static_cast<int>(n) * samplesPerFrame_);
    else
      std::memcpy(out, in, n * static_cast<std::size_t>(fileFrameBytes_));
    in += n * static_cast<std::size_t>(clientFrameBytes_);
    staged_ += n;
    left -= n;
    written_ += static_cast<std::int64_t>(n);
  }
}

void ConvertingWriter::HandOn(bool all) {
  if (staged_ == 0) return;
  std::size_t frames = staged_;
  if (!all) {
    if (InterAudioWriter::DiskAPI* disk = destination_->getDiskAPI()) {
      const std::int64_t block = std::max(disk->GetBlockSize(), 1);
      const std::int64_t bytes = static_cast<std::int64_t>(staged_) * fileFrameBytes_;
      const std::int64_t till = disk->GetBytesTillNextBlockBoundary();
      if (till > 0 && bytes >= till) {
        const std::int64_t aligned = till + (bytes - till) / block * block;
        frames = std::max<std::size_t>(static_cast<std::size_t>(aligned / fileFrameBytes_), 1);
      }
    }
  }
  destination_->Write(staging_.data(), static_cast<std::int64_t>(frames));
  staged_ -= frames;
  if (staged_ > 0)
    std::memmove(staging_.data(),
                 staging_.data() + frames * static_cast<std::size_t>(fileFrameBytes_),
                 staged_ * static_cast<std::size_t>(fileFrameBytes_));
}

void ConvertingWriter::Flush() {
  if (closed_) FailOSErr(kParamErr);
  HandOn(true);
  destination_->Flush();
}

void ConvertingWriter::Close() {
  if (closed_) return;
  HandOn(true);
  closed_ = true;
  destination_->Close();
}

}  // namespace tarn
