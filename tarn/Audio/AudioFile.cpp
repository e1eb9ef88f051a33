#include "tarn/Audio/AudioFile.h"

#include <algorithm>
#include <bit>
#include <utility>

#include "tarn/Errors/Fail.h"

namespace tarn {

AudioFile::AudioFile(const FileSpecification& file, std::int32_t headerSize, ByteSwapOption swap,
                     const AudioFormat& format, bool writable, PlatformFileOptions options)
    : file_(file),
      headerSize_(headerSize),
      swap_(swap),
      format_(format),
      platformFile_(std::make_unique<PlatformAudioFile>(file, writable, options)),
      frameSize_(static_cast<std::int16_t>(GetBytesPerSample(format.mSampleFormat) *
                                           format.mNumChannels)) {
  if (headerSize < 0 || format.mNumChannels < 1 || frameSize_ < 1) FailOSErr(kParamErr);
}

AudioFile::~AudioFile() = default;

ByteSwapOption AudioFile::LSBOrderToByteSwapOption(bool lsbFirst) noexcept {
  return lsbFirst == (std::endian::native == std::endian::little) ? kNoByteSwap : kByteSwap;
}

namespace {

template <int N>
void SwapEach(void* bytes, std::int64_t byteCount) noexcept {
  auto* p = static_cast<unsigned char*>(bytes);
  for (std::int64_t i = 0; i + N <= byteCount; i += N) std::reverse(p + i, p + i + N);
}

}  // namespace

void AudioFile::ByteSwap16BitBuffer(void* bytes, std::int64_t byteCount) noexcept {
  SwapEach<2>(bytes, byteCount);
}
void AudioFile::ByteSwap24BitBuffer(void* bytes, std::int64_t byteCount) noexcept {
  SwapEach<3>(bytes, byteCount);
}
void AudioFile::ByteSwap32BitBuffer(void* bytes, std::int64_t byteCount) noexcept {
  SwapEach<4>(bytes, byteCount);
}
void AudioFile::ByteSwap64BitBuffer(void* bytes, std::int64_t byteCount) noexcept {
  SwapEach<8>(bytes, byteCount);
}

void AudioFile::ByteSwapBuffer(void* bytes, std::int64_t byteCount) const noexcept {
  switch (GetBytesPerSample(format_.mSampleFormat)) {
    case 2:
      ByteSwap16BitBuffer(bytes, byteCount);
      break;
    case 3:
      ByteSwap24BitBuffer(bytes, byteCount);
      break;
    case 4:
      ByteSwap32BitBuffer(bytes, byteCount);
      break;
    case 8:
      ByteSwap64BitBuffer(bytes, byteCount);
      break;
    default:
      break;
  }
}

PlatformAudioFile& AudioFile::OpenFile() const {
  if (!platformFile_) FailOSErr(kParamErr);
  return *platformFile_;
}

}  // namespace tarn
