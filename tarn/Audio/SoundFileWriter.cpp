#include "tarn/Audio/SoundFileWriter.h"

#include <utility>

#include "tarn/Audio/AudioOutFile.h"
#include "tarn/Audio/ConvertingWriter.h"
#include "tarn/Audio/InterleavingWriter.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"
#include "tarn/Audio/SoundFileReader.h"
#include "tarn/Errors/Fail.h"
#include "tarn/Streams/CFileStream.h"

namespace tarn {

SoundFileWriter::SoundFileWriter(const FileSpecification& file, const Settings& settings) {
  const std::uint32_t type = settings.fileType;
  const bool aiff = type == MakeRIFFType("AIFF") || type == MakeRIFFType("AIFC");
  if (!aiff && type != MakeRIFFType("WAVE") && type != MakeRIFFType(".W64")) FailOSErr(kParamErr);
  if (settings.numChannels < 1 || !(settings.sampleRate > 0.0)) FailOSErr(kParamErr);
  format_ = SoundFileFormatCache::Instance().GetFormat(file, aiff ? MakeRIFFType("AIFF") : type);
  {
    // The new file starts empty: the header writers leave bytes beyond
    // the header as they find them.
    CFileStream empty(file);
    empty.Open(kTCLWriteMode);
    empty.Close();
  }

  SoundFileAttributes wanted;
  wanted.mFileType = type;
  wanted.mNumChannels = settings.numChannels;
  wanted.mSampleRate = settings.sampleRate;
  // 8-bit samples are offset binary in WAVE and signed in AIFF; AIFF
  // integers are big-endian.
  SampleFormat stored = settings.fileFormat;
  if (stored == kSamp8Offset || stored == kSamp8) stored = aiff ? kSamp8 : kSamp8Offset;
  wanted.mSampleFormat = stored;
  wanted.mSamplesAreLSBFirst = !aiff;
  wanted.mBytesPerSample = static_cast<std::int16_t>(GetBytesPerSample(stored));
  wanted.mBytesPerFrame = wanted.mBytesPerSample * settings.numChannels;
  SoundFileAttributes hint;
  hint.mFileType = type;
  attributes_ = format_->CreateFileOnDisk(wanted, 0, settings.recording, hint);

  PlatformFileOptions options;
  options.mCachingMode = settings.unbuffered ? kUnbufferedCaching : kCachedCaching;
  std::shared_ptr<InterAudioWriter> out = std::make_shared<AudioOutFile>(format_, options);
  attributes_.mSampleFormat = out->GetFormat().mSampleFormat;
  converter_ =
      std::make_shared<ConvertingWriter>(std::move(out), settings.clientFormat, settings.dither);
  channels_ = std::make_unique<InterleavingWriter>(converter_);
}

SoundFileWriter::~SoundFileWriter() {
  try {
    Close();
  } catch (...) {  // NOLINT(bugprone-empty-catch): documented; Close reports errors
  }
}

void SoundFileWriter::RecoverCrashedRecording(const FileSpecification& file) {
  SoundFileReader::OpenFormat(file)->RecoverCrashedRecording();
}

SampleCount SoundFileWriter::GetFramesWritten() const noexcept {
  return converter_->GetFramesWritten();
}

void SoundFileWriter::WriteInterleaved(const void* frames, SampleCount count) {
  converter_->Write(frames, count);
}

void SoundFileWriter::Write(const void* const* channels, SampleCount frames) {
  channels_->Write(channels, frames);
}

void SoundFileWriter::Flush() { channels_->Flush(); }

void SoundFileWriter::Close() { channels_->Close(); }

}  // namespace tarn
