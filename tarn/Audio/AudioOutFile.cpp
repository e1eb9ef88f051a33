#include "tarn/Audio/AudioOutFile.h"

#include <utility>

#include "tarn/Audio/SoundFileFormats/SoundFileFormat.h"
#include "tarn/Errors/Fail.h"

namespace tarn {

namespace {

const SoundFileAttributes& CheckedAttributes(const SoundFileAttributes& attributes,
                                             const FileSpecification& file) {
  AudioOutFile::CheckPlainSampleData(attributes, file);
  return attributes;
}

AudioFormat FormatOf(const SoundFileAttributes& a) {
  return {a.mSampleFormat, a.mNumChannels, a.mSampleRate};
}

}  // namespace

void AudioOutFile::CheckPlainSampleData(const SoundFileAttributes& a,
                                        const FileSpecification& file) {
  const int bytesPerSample = GetBytesPerSample(a.mSampleFormat);
  const char* problem = nullptr;
  if (a.mNumChannels < 1)
    problem = "the file has no channels";
  else if (bytesPerSample == 0 || bytesPerSample != a.mBytesPerSample ||
           a.mBytesPerFrame != bytesPerSample * a.mNumChannels)
    problem = "the file's samples are not plain interleaved PCM or float data";
  else if (a.mOffsetToAudio < 0)
    problem = "the file's audio offset is negative";
  if (problem == nullptr) return;
  try {
    FailFSErr(kParamErr, file);
  } catch (TarnError& error) {
    error.SetOptionalErrorString(problem);
    throw;
  }
}

AudioOutFile::AudioOutFile(std::shared_ptr<SoundFileFormat> format, PlatformFileOptions options)
    : BasicAudioOutFile(
          format->GetFile(),
          CheckedAttributes(format->GetFileAttributes(), format->GetFile()).mOffsetToAudio,
          ::tarn::AudioFile::LSBOrderToByteSwapOption(
              format->GetFileAttributes().mSamplesAreLSBFirst),
          FormatOf(format->GetFileAttributes()), format->GetLengthInFrames(), options),
      format_(std::move(format)) {}

AudioOutFile::~AudioOutFile() {
  try {
    AudioOutFile::Close();
  } catch (...) {
    // A destructor cannot report; Close is where a caller sees failures.
  }
}

void AudioOutFile::FixFileLength() {
  (void)OpenFile();
  auto access = format_->GetReadWriteMetaDataAccess();
  format_->ChangeLengthInFrames(*access, GetFramesWritten());
  access->Flush();
}

void AudioOutFile::Flush() {
  BasicAudioOutFile::Flush();
  FixFileLength();
}

void AudioOutFile::Close() {
  if (IsClosed()) return;
  try {
    if (truncateOnDelete_) {
      PlatformAudioFile& file = OpenFile();
      // An odd end keeps the byte after it: the chunk's pad byte.
      std::int64_t end = GetHeaderSize() + GetFramesWritten().AsLongLong() * GetFrameSize();
      end += end & 1;
      const FileResult size = file.GetSize();
      if (size.status == kFileOK && size.bytes > end)
        FailOSErr(file.SetSize(static_cast<std::uint64_t>(end)));
    }
    Flush();
  } catch (...) {
    CloseNow();
    throw;
  }
  CloseNow();
}

}  // namespace tarn
