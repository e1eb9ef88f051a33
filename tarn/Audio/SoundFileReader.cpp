#include "tarn/Audio/SoundFileReader.h"

#include <utility>

#include "tarn/Audio/AsyncAudioReader.h"
#include "tarn/Audio/ConvertingReader.h"
#include "tarn/Audio/DeinterleavingReader.h"
#include "tarn/Audio/MonoSummingReader.h"
#include "tarn/Audio/SoundFileFormats/RIFFType.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"
#include "tarn/Errors/Fail.h"
#include "tarn/FileSystem/File.h"

namespace tarn {

std::shared_ptr<SoundFileFormat> SoundFileReader::OpenFormat(const FileSpecification& file) {
  auto& cache = SoundFileFormatCache::Instance();
  const std::uint32_t type = File(file).GetType();
  if (type == MakeRIFFType("AIFC")) return cache.GetFormat(file, MakeRIFFType("AIFF"));
  return cache.GetFormat(file);
}

SoundFileReader::SoundFileReader(const FileSpecification& file)
    : SoundFileReader(OpenFormat(file)) {}

SoundFileReader::SoundFileReader(std::shared_ptr<SoundFileFormat> format)
    : format_(std::move(format)) {
  if (!format_) FailOSErr(kParamErr);
  attributes_ = format_->GetFileAttributes();
  length_ = format_->GetLengthInFrames();
}

SoundFileReader::~SoundFileReader() = default;

std::unique_ptr<AudioReader> SoundFileReader::MakeReader(const TimeRangeOf<SampleCount>& range,
                                                         SampleFormat format, bool mono,
                                                         DitherType dither) const {
  const TimeRangeOf<SampleCount> cut(std::max(range.start, SampleCount(0)),
                                     std::min(range.end, length_));
  std::unique_ptr<AudioReader> reader = std::make_unique<DeinterleavingReader>(format_->MakeReader(
      cut.IsEmpty() ? TimeRangeOf<SampleCount>(0, 0) : cut, format_->GetNaturalRate()));
  if (mono) {
    reader = std::make_unique<MonoSummingReader>(
        ConvertingReader::Wrap(std::move(reader), kSampFloat32));
  }
  return ConvertingReader::Wrap(std::move(reader), format, dither);
}

AudioReader& SoundFileReader::ReaderFor(SampleFormat format) {
  const auto index = static_cast<unsigned>(format);
  if (index >= readers_.size()) FailOSErr(kParamErr);
  if (!readers_[index]) readers_[index] = MakeReader({0, length_}, format);
  return *readers_[index];
}

SampleCount SoundFileReader::Read(SampleCount start, SampleCount frames, void* const* channels,
                                  SampleFormat format) {
  return ReaderFor(format).OutOfOrderRead(channels, start, frames);
}

SampleCount SoundFileReader::Read(SampleCount start, SampleCount frames,
                                  std::vector<std::vector<float>>& channels) {
  if (start < 0 || frames < 0) FailOSErr(kParamErr);
  const std::int64_t n = start >= length_ ? 0 : std::min(frames, length_ - start).AsLongLong();
  channels.resize(static_cast<std::size_t>(GetNumChannels()));
  std::vector<void*> pointers;
  for (auto& c : channels) {
    c.resize(static_cast<std::size_t>(n));
    pointers.push_back(c.data());
  }
  const SampleCount got = Read(start, n, pointers.data(), kSampFloat32);
  for (auto& c : channels) c.resize(static_cast<std::size_t>(got.AsLongLong()));
  return got;
}

void SoundFileReader::ReadAsync(SampleCount start, SampleCount frames, void* const* channels,
                                SampleFormat format, Completion completion) {
  ReaderFor(format).OutOfOrderReadAsync(channels, start, frames, std::move(completion));
}

}  // namespace tarn
