#pragma once
// Shared by the audio I/O tests: a memory file that refuses what an
// unbuffered file refuses, recordings made through the formats, noise.

#include <gtest/gtest.h>

#include <cstring>
#include <memory>
#include <random>

#include "SoundFileFormats/ChunkFileTestUtil.h"
#include "tarn/Audio/AudioInFile.h"
#include "tarn/Audio/AudioOutFile.h"
#include "tarn/Audio/SoundFileFormats/AIFFSoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/WAVESoundFileFormat.h"

namespace tarn::test {

// With `aligned`, a transfer whose buffer, count or file pointer is not a
// multiple of 4096 fails (-36) and is counted in misaligned_.
struct MemoryDriver final : IFileDriver {
  MemoryDriver(Bytes bytes, bool aligned) : bytes_(std::move(bytes)), aligned_(aligned) {}
  bool NeedsAlignment() const noexcept override { return aligned_; }
  FileStatus SetFilePointer(std::uint64_t at) noexcept override { return pointer_ = at, kFileOK; }
  FileStatus GetFilePointer(std::uint64_t& at) noexcept override { return at = pointer_, kFileOK; }
  FileStatus Write(const void* buffer, std::uint64_t count) noexcept override {
    if (Refused(buffer, count) || failWrites_) return kFileIOErr;
    bytes_.resize(std::max<std::uint64_t>(bytes_.size(), pointer_ + count));
    std::memcpy(bytes_.data() + pointer_, buffer, count);
    return pointer_ += count, kFileOK;
  }
  FileResult Read(void* buffer, std::uint64_t count) noexcept override {
    if (Refused(buffer, count)) return {kFileIOErr, 0};
    const std::uint64_t n = std::min(count, bytes_.size() - std::min(pointer_, bytes_.size()));
    if (n != 0) std::memcpy(buffer, bytes_.data() + pointer_, n);
    pointer_ += n;
    return {n == count ? kFileOK : kFileEOFErr, std::int64_t(n)};
  }
  FileStatus SetEndOfFile() noexcept override { return SetFileSize(pointer_); }
  FileStatus SetFileSize(std::uint64_t bytes) noexcept override { return bytes_.resize(bytes), 0; }
  FileResult GetFileSize() noexcept override { return {kFileOK, std::int64_t(bytes_.size())}; }
  FileStatus Flush() noexcept override { return kFileOK; }
  bool Refused(const void* buffer, std::uint64_t count) noexcept {
    lastBuffer_ = buffer;
    const auto bits = reinterpret_cast<std::uintptr_t>(buffer) | count | pointer_;
    const bool bad = aligned_ && (bits & (PlatformAudioFile::kBlockSize - 1)) != 0;
    return misaligned_ += bad, bad;
  }

  Bytes bytes_;
  bool aligned_, failWrites_ = false;
  std::uint64_t pointer_ = 0;
  int misaligned_ = 0;
  const void* lastBuffer_ = nullptr;
};

inline SoundFileAttributes Attributes(std::uint32_t type, int channels, SampleFormat format,
                                      bool lsbFirst) {
  SoundFileAttributes a;
  a.mFileType = type;
  a.mNumChannels = static_cast<std::int16_t>(channels);
  a.mSampleRate = 48000.0;
  a.mSampleFormat = format;
  a.mBytesPerSample = static_cast<std::int16_t>(GetBytesPerSample(format));
  a.mBytesPerFrame = a.mBytesPerSample * channels;
  a.mSamplesAreLSBFirst = lsbFirst;
  return a;
}

// The format object of the file at `path`: a new, empty recording when
// `asked` is given.
inline std::shared_ptr<SoundFileFormat> FormatOf(const std::filesystem::path& path,
                                                 std::optional<SoundFileAttributes> asked = {}) {
  std::shared_ptr<SoundFileFormat> format;
  if (path.extension() == ".aif")
    format = std::make_shared<AIFFSoundFileFormat>(SpecOf(path));
  else
    format = std::make_shared<WAVESoundFileFormat>(SpecOf(path));
  if (asked) (void)format->CreateFileOnDisk(*asked, 0, true, {});
  return format;
}

// `count` pseudo-random bytes (no period a misplaced block could hide in).
inline Bytes Noise(std::size_t count, std::uint32_t seed = 1) {
  std::mt19937 random(seed);
  Bytes bytes(count);
  for (auto& b : bytes) b = static_cast<std::uint8_t>(random() >> 24);
  return bytes;
}

inline Bytes Swapped(Bytes bytes, int sampleSize) {
  for (std::size_t i = 0; i + sampleSize <= bytes.size(); i += sampleSize)
    std::reverse(bytes.begin() + std::ptrdiff_t(i), bytes.begin() + std::ptrdiff_t(i + sampleSize));
  return bytes;
}

}  // namespace tarn::test
