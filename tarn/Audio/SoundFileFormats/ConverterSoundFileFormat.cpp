// ConverterSoundFileFormat: files read through the outside converter.
#include "tarn/Audio/SoundFileFormats/ConverterSoundFileFormat.h"

#include "tarn/Audio/ConverterAudioReader.h"
#include "tarn/Audio/OutsideDecoder.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatFailImpl.h"

namespace tarn {

ConverterSoundFileFormat::ConverterSoundFileFormat(const FileSpecification& file,
                                                   std::uint32_t type)
    : NoMetaDataSoundFileFormat(file), type_(type) {
  const OutsideDecoder decoder(file);
  attributes_.mFileType = type;
  attributes_.mNumChannels = static_cast<std::int16_t>(decoder.GetNumChannels());
  attributes_.mSampleRate = decoder.GetSampleRate();
  attributes_.mSampleFormat = decoder.GetSampleFormat();
  attributes_.mBytesPerSample =
      static_cast<std::int16_t>(GetBytesPerSample(decoder.GetSampleFormat()));
  attributes_.mBytesPerFrame = decoder.GetBytesPerFrame();
  attributes_.mOffsetToAudio = 0;
  attributes_.mSamplesAreLSBFirst = true;
  length_ = decoder.GetKnownLength();
}

ConverterSoundFileFormat::~ConverterSoundFileFormat() = default;

SampleCount ConverterSoundFileFormat::GetLengthInFrames() {
  std::lock_guard<std::mutex> guard(lengthLock_);
  if (!length_) {
    OutsideDecoder decoder(GetFile());
    length_ = decoder.CountFrames();
  }
  return *length_;
}

std::unique_ptr<AsyncAudioReader> ConverterSoundFileFormat::MakeReader(
    const TimeRangeOf<SampleCount>& range, double rate) {
  if (rate != GetNaturalRate())
    sffimpl::FailWithText("SoundFileFormat", kParamErr,
                          "a reader delivers the file's own sample rate only", GetFile());
  return std::make_unique<ConverterAudioReader>(GetFile(), range, GetLengthInFrames());
}

SoundFileAttributes ConverterSoundFileFormat::CreateFileOnDisk(const SoundFileAttributes&,
                                                               SampleCount, bool,
                                                               const SoundFileAttributes&) {
  sffimpl::FailWithText("SoundFileFormat", kNotAvailableErr,
                        "files of this type are read through the outside converter only",
                        GetFile());
}

std::shared_ptr<SoundFileFormat> MakeConverterSoundFileFormat(const FileSpecification& file,
                                                              std::uint32_t type) {
  return std::make_shared<ConverterSoundFileFormat>(file, type);
}

bool OutsideConverterCanOpen(const FileSpecification& file) noexcept {
  return OutsideDecoder::CanDecode(file);
}

}  // namespace tarn
