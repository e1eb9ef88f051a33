#pragma once
// PlatformAudioFile: positioned reads and writes of raw bytes on one open
// file, the lowest layer of sample-data I/O.
//
// Callers may read and write any byte range to and from any buffer. When the
// file needs block-aligned transfers (an unbuffered file, see
// PlatformFileDriver) and a transfer is not aligned, the class moves whole
// 4096-byte blocks through an aligned bounce buffer: a write that starts or
// ends inside a block first reads that block (read-modify-write), and a write
// that extends the file leaves it exactly position + count bytes long.
// Aligned transfers (buffer, count and position all multiples of 4096), and
// every transfer of a file that needs no alignment, go straight to the file.
//
// Failures are statuses, never exceptions (see FileStatus): 0, -36 for a
// failed system call, -39 when a read met the end of the file inside the
// requested range (bytes tells how much is valid), -50 when the file failed
// to open. Running out of memory for the bounce buffer throws
// std::bad_alloc.
//
// The current position is this object's own (the system's file pointer is
// moved only by transfers); a transfer without a position uses it, and a
// successful one leaves it after the bytes moved.
//
// Threads: not locked; one thread at a time. AsyncRead runs the read later on
// the process-wide job thread "PlatformAudioFile Reader Thread" using this
// object's position and bounce buffer, so no other call may be made on the
// object until the completion has run. The object may be destroyed while a
// read is queued: the file stays open until the read has completed.
//
//   PlatformAudioFile file(spec, false, {kUnbufferedCaching});
//   FileResult r = file.SyncRead(buffer, 10, 5);   // any range, any buffer
//   file.AsyncRead(buffer, 0, 4096, [](std::int32_t status, std::int32_t bytes) { ... });

#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>

#include "tarn/Audio/PlatformFileDriver.h"
#include "tarn/FileSystem/FileSpecification.h"

namespace tarn {

class PlatformAudioFile {
 public:
  static constexpr std::int32_t kBlockSize = 4096;
  // Called on the reader thread with the read's status and bytes delivered.
  using Completion = std::function<void(std::int32_t status, std::int32_t bytes)>;

  // Opens the existing file through a PlatformFileDriver (see there for the
  // sharing and caching rules). A failed open is reported by the later
  // operations (-50), not here.
  PlatformAudioFile(const FileSpecification& file, bool writable, PlatformFileOptions options = {});
  // Over any driver (null behaves as a file that failed to open).
  explicit PlatformAudioFile(std::shared_ptr<IFileDriver> driver);
  PlatformAudioFile(const PlatformAudioFile&) = delete;
  PlatformAudioFile& operator=(const PlatformAudioFile&) = delete;
  ~PlatformAudioFile();

  // Reads `count` bytes at `position` (the current position when none).
  // Status 0 when all arrived; -39 with the valid byte count when the file
  // ends inside the range.
  FileResult SyncRead(void* buffer, std::uint64_t count,
                      std::optional<std::uint64_t> position = std::nullopt);
  // Writes `count` bytes at `position` (the current position when none).
  // On failure the current position is unchanged.
  FileStatus SyncWrite(const void* buffer, std::uint64_t count,
                       std::optional<std::uint64_t> position = std::nullopt);
  // Queues SyncRead(buffer, count, position) on the reader thread and
  // returns at once; `completion` runs there afterwards. `buffer` must stay
  // valid until then. Reads of more than 2^31 - 1 bytes complete with -50.
  void AsyncRead(void* buffer, std::uint64_t position, std::uint64_t count, Completion completion);
  // True on the reader thread (inside a completion), where waiting for a
  // queued read would wait forever.
  [[nodiscard]] static bool IsReaderThread();

  [[nodiscard]] std::uint64_t GetPosition() const noexcept;
  // Stores the position only; the system's file pointer is not touched.
  void SetPosition(std::uint64_t position) noexcept;

  // The file's length in bytes; -36 on failure.
  [[nodiscard]] FileResult GetSize();
  // Sets the file's length; -36 on failure.
  FileStatus SetSize(std::uint64_t bytes);
  // Asks the system to write the file's buffers to the disk.
  FileStatus Flush();
  // Always {0, 4096}.
  [[nodiscard]] FileResult GetBlockSize() const noexcept { return {kFileOK, kBlockSize}; }

  [[nodiscard]] bool NeedsAlignment() const noexcept;

  class Impl;

 private:
  // Shared with queued asynchronous reads, which keep it alive.
  std::shared_ptr<Impl> impl_;
};

// Grow-only storage whose start lies on a PlatformAudioFile::kBlockSize
// boundary, for whole-block transfers of files that need alignment.
// Reserve throws std::bad_alloc when memory runs out (the buffer is then
// empty). One thread at a time.
class BlockAlignedBuffer {
 public:
  // At least `bytes` usable bytes at the returned Data() from now on; the
  // contents are lost when the buffer grows.
  std::byte* Reserve(std::uint64_t bytes);
  [[nodiscard]] std::byte* Data() const noexcept { return data_; }

 private:
  std::unique_ptr<std::byte[]> raw_;  // capacity_ + kBlockSize bytes
  std::uint64_t capacity_ = 0;
  std::byte* data_ = nullptr;  // the first block boundary in raw_
};

}  // namespace tarn
