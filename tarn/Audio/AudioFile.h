#pragma once
// AudioFile: the sample-data region of one sound file, in frames, on top of a
// PlatformAudioFile. It knows where the samples start (the header size), the
// file's sample format and channel count, and whether the bytes must be
// swapped to native order. The readers and writers (AudioInFile,
// BasicAudioOutFile) build on it; on its own it only opens the file and
// answers those facts.
//
// The static byte-swap helpers reverse every sample of a buffer in place and
// may be called from any thread. An AudioFile object is for one thread at a
// time.

#include <cstdint>
#include <memory>

#include "tarn/Audio/PlatformAudioFile.h"
#include "tarn/Audio/SampleFormat.h"
#include "tarn/FileSystem/FileSpecification.h"

namespace tarn {

enum ByteSwapOption : std::int32_t {
  kNoByteSwap = 0,
  kByteSwap = 1,
};

class AudioFile {
 public:
  // Opens `file` (see PlatformAudioFile; a failed open shows as -50 on the
  // first transfer). `headerSize` is the byte offset of the first sample.
  AudioFile(const FileSpecification& file, std::int32_t headerSize, ByteSwapOption swap,
            const AudioFormat& format, bool writable, PlatformFileOptions options = {});
  AudioFile(const AudioFile&) = delete;
  AudioFile& operator=(const AudioFile&) = delete;
  virtual ~AudioFile();

  // No swap (0) for a file whose samples are least significant byte first
  // on a little-endian machine; a swap (1) when the two orders differ.
  [[nodiscard]] static ByteSwapOption LSBOrderToByteSwapOption(bool lsbFirst) noexcept;
  // Reverse the bytes of each 2-, 3-, 4- or 8-byte sample in place; a
  // trailing partial sample is left alone.
  static void ByteSwap16BitBuffer(void* bytes, std::int64_t byteCount) noexcept;
  static void ByteSwap24BitBuffer(void* bytes, std::int64_t byteCount) noexcept;
  static void ByteSwap32BitBuffer(void* bytes, std::int64_t byteCount) noexcept;
  static void ByteSwap64BitBuffer(void* bytes, std::int64_t byteCount) noexcept;

  // The swap for this file's bytes per sample (1-byte samples need none).
  void ByteSwapBuffer(void* bytes, std::int64_t byteCount) const noexcept;
  [[nodiscard]] bool ShouldSwapBuffer() const noexcept { return swap_ == kByteSwap; }

  [[nodiscard]] const FileSpecification& GetFile() const noexcept { return file_; }
  [[nodiscard]] std::int32_t GetHeaderSize() const noexcept { return headerSize_; }
  [[nodiscard]] const AudioFormat& GetAudioFormat() const noexcept { return format_; }
  // GetBytesPerSample(format) * channels.
  [[nodiscard]] std::int16_t GetFrameSize() const noexcept { return frameSize_; }
  // Null after the file was closed (writers' Close).
  [[nodiscard]] PlatformAudioFile* GetPlatformFile() const noexcept { return platformFile_.get(); }

 protected:
  void SetByteSwapOption(ByteSwapOption swap) noexcept { swap_ = swap; }
  // The open file; throws -50 once it is closed.
  [[nodiscard]] PlatformAudioFile& OpenFile() const;
  void CloseFile() noexcept { platformFile_.reset(); }

 private:
  FileSpecification file_;
  std::int32_t headerSize_;
  ByteSwapOption swap_;
  AudioFormat format_;
  std::unique_ptr<PlatformAudioFile> platformFile_;
  std::int16_t frameSize_;
};

}  // namespace tarn
