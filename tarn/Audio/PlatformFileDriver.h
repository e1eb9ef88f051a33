#pragma once
// IFileDriver and PlatformFileDriver: the raw file under PlatformAudioFile.
//
// IFileDriver is the small set of positioned-file operations PlatformAudioFile
// needs; it is the one interface of the library that reports failures by
// status instead of throwing: 0 success, -36 a system call failed, -39 a read
// delivered fewer bytes than asked (end of file), -50 the file is not open.
//
// PlatformFileDriver opens an existing file by its full path. Caching mode
// kUnbufferedCaching (2) bypasses the system cache (O_DIRECT on POSIX,
// FILE_FLAG_NO_BUFFERING on Windows) and then every transfer must be
// block-aligned (NeedsAlignment() is true); any other mode uses the cache
// with a random-access hint. Where the file system refuses unbuffered I/O
// the file is opened through the cache, but NeedsAlignment() stays true so
// that callers keep taking the aligned path that mode 2 promises.
// PlatformFileOptions::mForceAlignment makes NeedsAlignment() true in every
// mode (tests use it to drive the aligned path through the cache).
//
// A failed open is not reported by the constructor: every later operation
// returns -50. The destructor closes the file. Not locked: one thread at a
// time per driver.

#include <cstdint>

#include "tarn/FileSystem/FileSpecification.h"

namespace tarn {

// Status codes of the driver interface (16-bit, classic negative codes).
using FileStatus = std::int16_t;
inline constexpr FileStatus kFileOK = 0;
inline constexpr FileStatus kFileIOErr = -36;
inline constexpr FileStatus kFileEOFErr = -39;
inline constexpr FileStatus kFileParamErr = -50;

// A status with a byte count (bytes delivered, or a size).
struct FileResult {
  FileStatus status = kFileOK;
  std::int64_t bytes = 0;

  friend bool operator==(const FileResult&, const FileResult&) = default;
};

// Caching modes of PlatformFileDriver.
inline constexpr int kCachedCaching = 0;
inline constexpr int kUnbufferedCaching = 2;

struct PlatformFileOptions {
  int mCachingMode = kCachedCaching;
  // Report NeedsAlignment() true whatever the mode.
  bool mForceAlignment = false;
};

class IFileDriver {
 public:
  IFileDriver() = default;
  IFileDriver(const IFileDriver&) = delete;
  IFileDriver& operator=(const IFileDriver&) = delete;
  virtual ~IFileDriver() = default;

  // True when buffer addresses, byte counts and file offsets of transfers
  // must be multiples of the block size (4096).
  [[nodiscard]] virtual bool NeedsAlignment() const noexcept = 0;
  // The system's file pointer, as an absolute byte offset.
  virtual FileStatus SetFilePointer(std::uint64_t offset) noexcept = 0;
  virtual FileStatus GetFilePointer(std::uint64_t& offset) noexcept = 0;
  // Writes all `count` bytes at the file pointer (-36 if any is refused).
  virtual FileStatus Write(const void* buffer, std::uint64_t count) noexcept = 0;
  // Reads up to `count` bytes at the file pointer; -39 when fewer arrived
  // because the file ended, -36 on a failure (bytes: what arrived before).
  virtual FileResult Read(void* buffer, std::uint64_t count) noexcept = 0;
  // Cuts or extends the file at the file pointer.
  virtual FileStatus SetEndOfFile() noexcept = 0;
  // Sets the file's length; the file pointer does not move.
  virtual FileStatus SetFileSize(std::uint64_t bytes) noexcept = 0;
  virtual FileResult GetFileSize() noexcept = 0;
  // Asks the system to write the file's buffers to the disk.
  virtual FileStatus Flush() noexcept = 0;
};

class PlatformFileDriver final : public IFileDriver {
 public:
  // Opens the existing file `file`: for reading and writing (shared for
  // read, write and delete) when `writable`, else for reading (shared for
  // read and write).
  PlatformFileDriver(const FileSpecification& file, bool writable,
                     PlatformFileOptions options = {}) noexcept;
  ~PlatformFileDriver() override;

  // Whether the open succeeded.
  [[nodiscard]] bool IsOpen() const noexcept;
  // Whether the system cache is bypassed (false after a fallback).
  [[nodiscard]] bool IsUnbuffered() const noexcept { return unbuffered_; }

  [[nodiscard]] bool NeedsAlignment() const noexcept override { return needsAlignment_; }
  FileStatus SetFilePointer(std::uint64_t offset) noexcept override;
  FileStatus GetFilePointer(std::uint64_t& offset) noexcept override;
  FileStatus Write(const void* buffer, std::uint64_t count) noexcept override;
  FileResult Read(void* buffer, std::uint64_t count) noexcept override;
  FileStatus SetEndOfFile() noexcept override;
  FileStatus SetFileSize(std::uint64_t bytes) noexcept override;
  FileResult GetFileSize() noexcept override;
  FileStatus Flush() noexcept override;

 private:
  // A file descriptor on POSIX, a HANDLE on Windows; -1 when not open.
  std::intptr_t handle_ = -1;
  int cachingMode_;
  bool needsAlignment_ = false;
  bool unbuffered_ = false;
};

}  // namespace tarn
