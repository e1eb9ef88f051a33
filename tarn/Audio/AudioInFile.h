#pragma once
// AudioInFile: the reading end of one stretch of a sound file's sample data.
// It turns frames into byte positions from the file's audio offset and frame
// size, reads them through a PlatformAudioFile (synchronously, or on the
// reader thread with a completion), and swaps them to native byte order when
// the file's order differs. Frame 0 is the first frame of the stretch
// (DSPSoundBiteSpec::mRange.start); the reader never reads past the stretch's
// end or past the audio the file held when it was made (FileLength), and a
// file that turns out shorter (cut while open) gives short reads.
//
// Read-ahead: on a file read without the system cache (see
// PlatformFileDriver), a Read or OutOfOrderRead that starts where the
// previous one ended queues a read of the same size that follows it on the
// reader thread, and a next request starting there is served from it while
// the disk already works on the one after. A prefetched block is used only
// for the same byte range and only as far as the file still reaches; every
// other request reads the file directly, and a request that touches the
// file (or the destructor) first waits for a queued prefetch.
//
//   AudioInFile in(bite, FileLength{frames});
//   std::vector<std::byte> block(4096 * in.GetBytesPerFrame());
//   while (SampleCount got = in.Read(block.data(), 4096)) { ... }
//   in.OutOfOrderReadAsync(buffer, SampleCount(0), 512, [](int status, SampleCount frames) {});
//
// Threads: one thread at a time; an asynchronous read's completion (and the
// performance monitor) runs on "PlatformAudioFile Reader Thread", and the
// reader must outlive it. Reads made inside such a completion never read
// ahead. Failures: the file layer's statuses through
// FailOSErr; Read alone absorbs the end of the file (-39).

#include <cstdint>
#include <memory>
#include <optional>

#include "tarn/Audio/AsyncAudioReader.h"
#include "tarn/Audio/AudioFile.h"
#include "tarn/Audio/DSPSoundBiteSpec.h"

namespace tarn {

// Told of the bytes each asynchronous read delivered, on the reader thread.
class AudioReadPerformanceMonitor {
 public:
  AudioReadPerformanceMonitor() = default;
  AudioReadPerformanceMonitor(const AudioReadPerformanceMonitor&) = delete;
  AudioReadPerformanceMonitor& operator=(const AudioReadPerformanceMonitor&) = delete;
  virtual ~AudioReadPerformanceMonitor() = default;

  virtual void BytesCompleted(std::int64_t bytes) noexcept = 0;
};

class AudioInFile : public AudioFile, public AsyncAudioReader {
 public:
  // Opens the bite's file for reading. With `sampleFormat` the samples are
  // taken as that format (it must have the file's bytes per sample). Throws
  // -50 for attributes that describe no plain sample data, a negative or
  // reversed range, or a mismatched format.
  AudioInFile(const DSPSoundBiteSpec& bite, const FileLength& length,
              PlatformFileOptions options = {});
  AudioInFile(const DSPSoundBiteSpec& bite, const FileLength& length, SampleFormat sampleFormat,
              PlatformFileOptions options = {});
  ~AudioInFile() override;

  // ---- AsyncAudioReader
  [[nodiscard]] AudioFormat GetFormat() const override { return GetAudioFormat(); }
  [[nodiscard]] HostChannelOrder GetChannelOrder() const override { return channelOrder_; }
  [[nodiscard]] SampleCount GetLengthInFrames() const override;
  // Reads min(frames, frames left) at the read position. At the end of the
  // file (-39) the position goes to the data end and no error is raised.
  SampleCount Read(void* buffer, SampleCount frames) override;
  [[nodiscard]] SampleCount GetReadPosition() const override;
  void SetReadPosition(SampleCount frame) override;
  // Read at `start` without moving the read position; -39 is raised here.
  SampleCount OutOfOrderRead(void* buffer, SampleCount start, SampleCount frames) override;
  void OutOfOrderReadAsync(void* buffer, SampleCount start, SampleCount frames,
                           Completion completion) override;

  // Byte range of a read of `frames` frames at `start` (below 0 taken as
  // 0): position = frame size * start from the stretch's first byte,
  // count = frame size * max(frames, 0) cut at the data end (0 when past).
  void PreflightReadRequest(SampleCount start, SampleCount frames, std::int64_t& bytePosition,
                            std::int64_t& byteCount) const;
  // After an asynchronous read: tells the monitor, swaps the bytes when
  // swapping is on, then calls `completion` with the frames delivered.
  void CompleteRead(void* buffer, std::int32_t status, std::int32_t bytes,
                    const Completion& completion) const;

  // Swap when the file's order and the wanted order differ.
  void SetByteSwappingBasedOnDesriedOutputByteOrder(bool fileIsLSBFirst,
                                                    bool wantedLSBFirst) noexcept;
  // Lowers the data end to what the file now holds (a file cut while
  // open); returns GetLengthInFrames().
  SampleCount CheckEndPosition();
  void SetPerformanceMonitor(std::shared_ptr<AudioReadPerformanceMonitor> monitor) noexcept {
    monitor_ = std::move(monitor);
  }

 private:
  struct Prefetch;
  // Reads `count` bytes at file offset `position`, from the prefetched block
  // when it matches, and queues the next prefetch when reads run forward.
  FileResult ReadBytes(PlatformAudioFile& file, void* buffer, std::int64_t position,
                       std::int64_t count);
  // Copies what the finished prefetch holds of the request's start (as far
  // as the file still reaches) and marks the prefetch used; the bytes copied.
  std::int64_t TakePrefetched(PlatformAudioFile& file, void* buffer, std::int64_t position,
                              std::int64_t count);
  // Queues the read of up to `count` bytes from file offset `next` on the
  // reader thread, for a file read without the system cache.
  void QueuePrefetch(PlatformAudioFile& file, std::int64_t next, std::int64_t count);
  // Waits until no prefetch is in flight (on the reader thread, forgets it:
  // it runs after the current job there).
  void SettlePrefetch() noexcept;

  std::shared_ptr<Prefetch> prefetch_;  // null until the first read-ahead
  std::int64_t nextSequential_ = 0;     // file offset after the last read
  std::int64_t firstByte_;              // file offset of the stretch's frame 0
  std::int64_t dataEnd_;                // file offset after the last readable byte; >= firstByte_
  std::int64_t readPosition_ = 0;       // bytes from firstByte_; in [0, dataEnd_ - firstByte_]
  HostChannelOrder channelOrder_;
  std::shared_ptr<AudioReadPerformanceMonitor> monitor_;
};

}  // namespace tarn
