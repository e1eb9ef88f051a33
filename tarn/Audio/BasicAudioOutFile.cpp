#include "tarn/Audio/BasicAudioOutFile.h"

#include <algorithm>
#include <cstring>
#include <limits>

#include "tarn/Errors/Fail.h"

namespace tarn {

BasicAudioOutFile::BasicAudioOutFile(const FileSpecification& file, std::int32_t headerSize,
                                     ByteSwapOption swap, const AudioFormat& format,
                                     SampleCount framesInFile, PlatformFileOptions options)
    : AudioFile(file, headerSize, swap, format, true, options), framesWritten_(framesInFile) {
  if (framesInFile.AsLongLong() < 0) FailOSErr(kParamErr);
  SetWritePosition(framesInFile);
}

BasicAudioOutFile::~BasicAudioOutFile() {
  try {
    BasicAudioOutFile::Close();
  } catch (...) {
    // A destructor cannot report; Close is where a caller sees failures.
  }
}

void BasicAudioOutFile::NoteWritten(const PlatformAudioFile& file) noexcept {
  const std::int64_t frames =
      (static_cast<std::int64_t>(file.GetPosition()) - GetHeaderSize()) / GetFrameSize();
  framesWritten_ = std::max(framesWritten_.AsLongLong(), frames);
}

void BasicAudioOutFile::Write(const void* buffer, SampleCount frames) {
  PlatformAudioFile& file = OpenFile();
  const std::int64_t count = frames.AsLongLong();
  if (count < 0 || count > std::numeric_limits<std::int64_t>::max() / GetFrameSize())
    FailOSErr(kParamErr);
  const std::int64_t bytes = count * GetFrameSize();
  if (bytes == 0) return;
  const void* from = buffer;
  if (ShouldSwapBuffer()) {
    if (bytes > scratchCapacity_) {
      scratchRaw_.reset();
      scratchCapacity_ = 0;
      scratchRaw_.reset(
          new unsigned char[static_cast<std::size_t>(bytes) + PlatformAudioFile::kBlockSize]);
      const auto raw = reinterpret_cast<std::uintptr_t>(scratchRaw_.get());
      scratch_ = scratchRaw_.get() +
                 (PlatformAudioFile::kBlockSize - (raw & (PlatformAudioFile::kBlockSize - 1)));
      scratchCapacity_ = bytes;
    }
    std::memcpy(scratch_, buffer, static_cast<std::size_t>(bytes));
    ByteSwapBuffer(scratch_, bytes);
    from = scratch_;
  }
  FailOSErr(file.SyncWrite(from, static_cast<std::uint64_t>(bytes)));
  NoteWritten(file);
}

void BasicAudioOutFile::RawWrite(const void* buffer, std::int64_t bytes) {
  PlatformAudioFile& file = OpenFile();
  if (bytes < 0) FailOSErr(kParamErr);
  FailOSErr(file.SyncWrite(buffer, static_cast<std::uint64_t>(bytes)));
  NoteWritten(file);
}

void BasicAudioOutFile::Flush() { FailOSErr(OpenFile().Flush()); }

void BasicAudioOutFile::Close() {
  if (IsClosed()) return;
  try {
    Flush();
  } catch (...) {
    CloseFile();
    throw;
  }
  CloseFile();
}

int BasicAudioOutFile::GetBlockSize() {
  const FileResult size = OpenFile().GetBlockSize();
  return size.status == kFileOK && size.bytes > 0 ? static_cast<int>(size.bytes)
                                                  : PlatformAudioFile::kBlockSize;
}

int BasicAudioOutFile::GetBytesTillNextBlockBoundary() {
  const std::uint64_t block = static_cast<std::uint64_t>(GetBlockSize());
  return static_cast<int>(block - OpenFile().GetPosition() % block);
}

std::int64_t BasicAudioOutFile::GetUnFilledSpace() {
  PlatformAudioFile& file = OpenFile();
  const FileResult size = file.GetSize();
  const auto position = static_cast<std::int64_t>(file.GetPosition());
  return size.status == kFileOK && size.bytes > position ? size.bytes - position : 0;
}

bool BasicAudioOutFile::ShouldExtendFile(SampleCount& newLength, std::int64_t bytes) {
  PlatformAudioFile& file = OpenFile();
  const FileResult size = file.GetSize();
  FailOSErr(size.status);
  const int block = GetBlockSize();
  if (GetUnFilledSpace() >= bytes || GetBytesTillNextBlockBoundary() >= block) return false;
  newLength = (size.bytes + block - GetHeaderSize()) / GetFrameSize();
  return true;
}

void BasicAudioOutFile::SetEOF(SampleCount frames) {
  PlatformAudioFile& file = OpenFile();
  const std::int64_t count = frames.AsLongLong();
  if (count < 0 ||
      count > (std::numeric_limits<std::int64_t>::max() - GetHeaderSize()) / GetFrameSize())
    FailOSErr(kParamErr);
  FailOSErr(file.SetSize(static_cast<std::uint64_t>(GetHeaderSize() + count * GetFrameSize())));
  framesWritten_ = std::min(framesWritten_.AsLongLong(), count);
}

void BasicAudioOutFile::SetWritePosition(SampleCount frame) {
  PlatformAudioFile& file = OpenFile();
  const std::int64_t at = frame.AsLongLong();
  if (at < 0 || at > (std::numeric_limits<std::int64_t>::max() - GetHeaderSize()) / GetFrameSize())
    FailOSErr(kParamErr);
  file.SetPosition(static_cast<std::uint64_t>(GetHeaderSize() + at * GetFrameSize()));
}

SampleCount BasicAudioOutFile::GetWritePosition() const {
  return (static_cast<std::int64_t>(OpenFile().GetPosition()) - GetHeaderSize()) / GetFrameSize();
}

}  // namespace tarn
