#include "tarn/Audio/AudioInFile.h"

#include <algorithm>
#include <condition_variable>
#include <cstring>
#include <limits>
#include <mutex>
#include <new>
#include <utility>

#include "tarn/Audio/AudioOutFile.h"
#include "tarn/Errors/Fail.h"

namespace tarn {

namespace {

AudioFormat CheckedFormat(const DSPSoundBiteSpec& bite, std::optional<SampleFormat> override) {
  AudioOutFile::CheckPlainSampleData(bite.mAttributes, bite.mFile);
  const SoundFileAttributes& a = bite.mAttributes;
  const SampleFormat format = override.value_or(a.mSampleFormat);
  if (GetBytesPerSample(format) != a.mBytesPerSample || bite.mRange.start.AsLongLong() < 0 ||
      bite.mRange.end < bite.mRange.start)
    FailFSErr(kParamErr, bite.mFile);
  return {format, a.mNumChannels, a.mSampleRate};
}

// Reads ahead are no larger than this; a longer request takes the rest from
// the file.
constexpr std::int64_t kMaxPrefetchBytes = std::int64_t{16} << 20;

}  // namespace

// One block read ahead. The reader thread's completion owns a reference, so
// a forgotten prefetch finishes into its own buffer.
struct AudioInFile::Prefetch {
  std::mutex mutex;
  std::condition_variable finished;
  bool inFlight = false;      // guarded by mutex
  bool valid = false;         // a finished read of [position, position + result.bytes)
  std::int64_t position = 0;  // a multiple of the block size
  FileResult result{};
  BlockAlignedBuffer buffer;  // whole blocks go straight from the disk here
};

AudioInFile::AudioInFile(const DSPSoundBiteSpec& bite, const FileLength& length,
                         PlatformFileOptions options)
    : AudioInFile(bite, length, bite.mAttributes.mSampleFormat, options) {}

AudioInFile::AudioInFile(const DSPSoundBiteSpec& bite, const FileLength& length,
                         SampleFormat sampleFormat, PlatformFileOptions options)
    : AudioFile(bite.mFile, bite.mAttributes.mOffsetToAudio,
                LSBOrderToByteSwapOption(bite.mAttributes.mSamplesAreLSBFirst),
                CheckedFormat(bite, sampleFormat), false, options),
      channelOrder_(bite.mChannelOrder) {
  const std::int64_t frameSize = GetFrameSize();
  const std::int64_t maxFrames = (std::numeric_limits<std::int64_t>::max() / 2) / frameSize;
  const std::int64_t start = bite.mRange.start.AsLongLong();
  const std::int64_t end =
      std::max(start, std::min(bite.mRange.end.AsLongLong(), length.mFrames.AsLongLong()));
  if (end > maxFrames) FailFSErr(kParamErr, bite.mFile);
  firstByte_ = GetHeaderSize() + start * frameSize;
  dataEnd_ = GetHeaderSize() + end * frameSize;
  nextSequential_ = firstByte_;
}

AudioInFile::~AudioInFile() { SettlePrefetch(); }

void AudioInFile::SettlePrefetch() noexcept {
  if (!prefetch_) return;
  std::unique_lock lock(prefetch_->mutex);
  if (!prefetch_->inFlight) return;
  if (PlatformAudioFile::IsReaderThread()) {
    lock.unlock();
    prefetch_.reset();
    return;
  }
  prefetch_->finished.wait(lock, [&] { return !prefetch_->inFlight; });
}

FileResult AudioInFile::ReadBytes(PlatformAudioFile& file, void* buffer, std::int64_t position,
                                  std::int64_t count) {
  SettlePrefetch();
  FileResult result{kFileOK, TakePrefetched(file, buffer, position, count)};
  if (result.bytes < count) {
    const FileResult rest = file.SyncRead(static_cast<std::byte*>(buffer) + result.bytes,
                                          static_cast<std::uint64_t>(count - result.bytes),
                                          static_cast<std::uint64_t>(position + result.bytes));
    result = {rest.status, result.bytes + rest.bytes};
  }
  const bool forward = position == nextSequential_;
  nextSequential_ = position + result.bytes;
  if (forward && result.status == kFileOK) QueuePrefetch(file, position + count, count);
  return result;
}

std::int64_t AudioInFile::TakePrefetched(PlatformAudioFile& file, void* buffer,
                                         std::int64_t position, std::int64_t count) {
  if (!prefetch_) return 0;
  Prefetch& p = *prefetch_;
  const bool finished = std::exchange(p.valid, false);  // a block serves one request
  const bool usable = finished && (p.result.status == kFileOK || p.result.status == kFileEOFErr) &&
                      position >= p.position && position < p.position + p.result.bytes;
  if (!usable) return 0;
  const std::int64_t skip = position - p.position;
  const std::int64_t served = std::min(count, p.result.bytes - skip);
  // The file may have been cut since the block was read.
  const FileResult size = file.GetSize();
  if (size.status != kFileOK || size.bytes < position + served) return 0;
  std::memcpy(buffer, p.buffer.Data() + skip, static_cast<std::size_t>(served));
  return served;
}

void AudioInFile::QueuePrefetch(PlatformAudioFile& file, std::int64_t next, std::int64_t count) {
  const std::int64_t ahead = std::min({count, dataEnd_ - next, kMaxPrefetchBytes});
  if (ahead <= 0 || !file.NeedsAlignment() || PlatformAudioFile::IsReaderThread()) return;
  if (!prefetch_) prefetch_ = std::make_shared<Prefetch>();
  Prefetch& p = *prefetch_;
  constexpr std::int64_t kBlock = PlatformAudioFile::kBlockSize;
  const std::int64_t alignedStart = next / kBlock * kBlock;
  const std::int64_t span = (next + ahead + kBlock - 1) / kBlock * kBlock - alignedStart;
  p.position = alignedStart;
  {
    std::lock_guard lock(p.mutex);
    p.inFlight = true;
  }
  try {
    file.AsyncRead(p.buffer.Reserve(static_cast<std::uint64_t>(span)),
                   static_cast<std::uint64_t>(alignedStart), static_cast<std::uint64_t>(span),
                   [state = prefetch_](std::int32_t status, std::int32_t bytes) {
                     std::lock_guard lock(state->mutex);
                     state->result = {static_cast<FileStatus>(status), bytes};
                     state->valid = true;
                     state->inFlight = false;
                     state->finished.notify_all();
                   });
  } catch (const std::bad_alloc&) {
    // Reading ahead is optional: the next request reads the file itself.
    std::lock_guard lock(p.mutex);
    p.inFlight = false;
  }
}

SampleCount AudioInFile::GetLengthInFrames() const {
  return (dataEnd_ - firstByte_) / GetFrameSize();
}

SampleCount AudioInFile::GetReadPosition() const { return readPosition_ / GetFrameSize(); }

void AudioInFile::SetReadPosition(SampleCount frame) {
  const std::int64_t frames =
      std::clamp<std::int64_t>(frame.AsLongLong(), 0, GetLengthInFrames().AsLongLong());
  readPosition_ = frames * GetFrameSize();
}

void AudioInFile::PreflightReadRequest(SampleCount start, SampleCount frames,
                                       std::int64_t& bytePosition, std::int64_t& byteCount) const {
  // The stretch holds a whole number of frames, so cutting in frames is
  // cutting at the data end.
  const std::int64_t frameSize = GetFrameSize();
  const std::int64_t available = (dataEnd_ - firstByte_) / frameSize;
  const std::int64_t first = std::clamp<std::int64_t>(start.AsLongLong(), 0, available);
  const std::int64_t count = std::clamp<std::int64_t>(frames.AsLongLong(), 0, available - first);
  bytePosition = first * frameSize;
  byteCount = count * frameSize;
}

SampleCount AudioInFile::Read(void* buffer, SampleCount frames) {
  PlatformAudioFile& file = OpenFile();
  const std::int64_t frameSize = GetFrameSize();
  const std::int64_t left = (dataEnd_ - firstByte_ - readPosition_) / frameSize;
  const std::int64_t count = std::clamp<std::int64_t>(frames.AsLongLong(), 0, left);
  if (count == 0) return 0;
  const FileResult result = ReadBytes(file, buffer, firstByte_ + readPosition_, count * frameSize);
  const std::int64_t whole = result.bytes / frameSize * frameSize;
  if (ShouldSwapBuffer()) ByteSwapBuffer(buffer, whole);
  if (result.status == kFileEOFErr) {
    readPosition_ = dataEnd_ - firstByte_;
  } else {
    readPosition_ += result.bytes;
    FailOSErr(result.status);
  }
  return result.bytes / frameSize;
}

SampleCount AudioInFile::OutOfOrderRead(void* buffer, SampleCount start, SampleCount frames) {
  PlatformAudioFile& file = OpenFile();
  std::int64_t position = 0, count = 0;
  PreflightReadRequest(start, frames, position, count);
  if (count == 0) return 0;
  const FileResult result = ReadBytes(file, buffer, firstByte_ + position, count);
  if (ShouldSwapBuffer()) ByteSwapBuffer(buffer, result.bytes / GetFrameSize() * GetFrameSize());
  FailOSErr(result.status);
  return result.bytes / GetFrameSize();
}

void AudioInFile::OutOfOrderReadAsync(void* buffer, SampleCount start, SampleCount frames,
                                      Completion completion) {
  PlatformAudioFile& file = OpenFile();
  std::int64_t position = 0, count = 0;
  PreflightReadRequest(start, frames, position, count);
  SettlePrefetch();
  file.AsyncRead(
      buffer, static_cast<std::uint64_t>(firstByte_ + position), static_cast<std::uint64_t>(count),
      [this, buffer, completion = std::move(completion)](std::int32_t status, std::int32_t bytes) {
        CompleteRead(buffer, status, bytes, completion);
      });
}

void AudioInFile::CompleteRead(void* buffer, std::int32_t status, std::int32_t bytes,
                               const Completion& completion) const {
  if (monitor_) monitor_->BytesCompleted(bytes);
  const std::int64_t frames = bytes / GetFrameSize();
  if (ShouldSwapBuffer()) ByteSwapBuffer(buffer, frames * GetFrameSize());
  completion(status, frames);
}

void AudioInFile::SetByteSwappingBasedOnDesriedOutputByteOrder(bool fileIsLSBFirst,
                                                               bool wantedLSBFirst) noexcept {
  SetByteSwapOption(fileIsLSBFirst == wantedLSBFirst ? kNoByteSwap : kByteSwap);
}

SampleCount AudioInFile::CheckEndPosition() {
  SettlePrefetch();
  const FileResult size = OpenFile().GetSize();
  FailOSErr(size.status);
  if (size.bytes < dataEnd_) {
    const std::int64_t frames = std::max<std::int64_t>(size.bytes - firstByte_, 0) / GetFrameSize();
    dataEnd_ = firstByte_ + frames * GetFrameSize();
    readPosition_ = std::min(readPosition_, dataEnd_ - firstByte_);
  }
  return GetLengthInFrames();
}

}  // namespace tarn
