#pragma once
// Shared by the audio I/O tests: a file driver over memory that enforces
// what an unbuffered file enforces, and makers of WAVE and AIFF recordings.

#include <gtest/gtest.h>

#include <cstdint>
#include <cstring>
#include <memory>
#include <vector>

#include "SoundFileFormats/ChunkFileTestUtil.h"
#include "tarn/Audio/AudioInFile.h"
#include "tarn/Audio/AudioOutFile.h"
#include "tarn/Audio/PlatformAudioFile.h"
#include "tarn/Audio/SoundFileFormats/AIFFSoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/WAVESoundFileFormat.h"

namespace tarn::test {

// A file in memory. With `aligned`, every transfer whose buffer, count or
// file pointer is not a multiple of 4096 fails (-36) and is counted, as an
// unbuffered file would refuse it.
class MemoryDriver final : public IFileDriver {
 public:
  explicit MemoryDriver(Bytes bytes, bool aligned) : bytes_(std::move(bytes)), aligned_(aligned) {}

  bool NeedsAlignment() const noexcept override { return aligned_; }
  FileStatus SetFilePointer(std::uint64_t offset) noexcept override {
    pointer_ = offset;
    return kFileOK;
  }
  FileStatus GetFilePointer(std::uint64_t& offset) noexcept override {
    offset = pointer_;
    return kFileOK;
  }
  FileStatus Write(const void* buffer, std::uint64_t count) noexcept override {
    lastBuffer_ = buffer;
    if (failWrites_ || Misaligned(buffer, count)) return kFileIOErr;
    if (bytes_.size() < pointer_ + count) bytes_.resize(pointer_ + count);
    std::memcpy(bytes_.data() + pointer_, buffer, count);
    pointer_ += count;
    ++transfers_;
    return kFileOK;
  }
  FileResult Read(void* buffer, std::uint64_t count) noexcept override {
    lastBuffer_ = buffer;
    if (Misaligned(buffer, count)) return {kFileIOErr, 0};
    const std::uint64_t have = pointer_ < bytes_.size() ? bytes_.size() - pointer_ : 0;
    const std::uint64_t n = std::min(have, count);
    if (n != 0) std::memcpy(buffer, bytes_.data() + pointer_, n);
    pointer_ += n;
    ++transfers_;
    return {n == count ? kFileOK : kFileEOFErr, static_cast<std::int64_t>(n)};
  }
  FileStatus SetEndOfFile() noexcept override { return SetFileSize(pointer_); }
  FileStatus SetFileSize(std::uint64_t bytes) noexcept override {
    bytes_.resize(bytes);
    return kFileOK;
  }
  FileResult GetFileSize() noexcept override {
    return {kFileOK, static_cast<std::int64_t>(bytes_.size())};
  }
  FileStatus Flush() noexcept override { return kFileOK; }

  Bytes bytes_;
  bool aligned_;
  bool failWrites_ = false;
  std::uint64_t pointer_ = 0;
  int misaligned_ = 0;
  int transfers_ = 0;
  const void* lastBuffer_ = nullptr;

 private:
  bool Misaligned(const void* buffer, std::uint64_t count) noexcept {
    const bool bad = aligned_ && ((reinterpret_cast<std::uintptr_t>(buffer) | count | pointer_) &
                                  (PlatformAudioFile::kBlockSize - 1)) != 0;
    misaligned_ += bad;
    return bad;
  }
};

inline SoundFileAttributes Attributes(std::uint32_t type, int channels, SampleFormat format,
                                      bool lsbFirst, double rate = 48000.0) {
  SoundFileAttributes a;
  a.mFileType = type;
  a.mNumChannels = static_cast<std::int16_t>(channels);
  a.mSampleRate = rate;
  a.mSampleFormat = format;
  a.mSamplesAreLSBFirst = lsbFirst;
  return a;
}

// A new, empty recording at `path`, and its format object.
inline std::shared_ptr<SoundFileFormat> NewRecording(const std::filesystem::path& path,
                                                     const SoundFileAttributes& asked) {
  std::shared_ptr<SoundFileFormat> format;
  if (asked.mFileType == MakeRIFFType("AIFF") || asked.mFileType == MakeRIFFType("AIFC"))
    format = std::make_shared<AIFFSoundFileFormat>(SpecOf(path));
  else
    format = std::make_shared<WAVESoundFileFormat>(SpecOf(path));
  (void)format->CreateFileOnDisk(asked, 0, true, {});
  return format;
}

// `count` pseudo-random bytes (no period a misplaced block could hide in).
inline Bytes Noise(std::size_t count, std::uint32_t seed = 1) {
  std::mt19937 random(seed);
  Bytes bytes(count);
  for (auto& b : bytes) b = static_cast<std::uint8_t>(random() >> 24);
  return bytes;
}

}  // namespace tarn::test
