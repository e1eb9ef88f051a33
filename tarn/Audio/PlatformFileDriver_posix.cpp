// POSIX file driver: open(2) with O_DIRECT for unbuffered files, lseek and
// read/write at the file pointer, ftruncate, fstat, fdatasync. Every failed
// call becomes -36 here; nothing throws.
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "tarn/Audio/PlatformFileDriver.h"

namespace tarn {

static_assert(sizeof(off_t) == 8, "64-bit file offsets are required");

namespace {

// The largest single read or write asked of the system (Linux moves at most
// about 2 GiB per call anyway); a multiple of the block size.
constexpr std::uint64_t kMaxTransfer = std::uint64_t{1} << 30;

int OpenFile(const std::string& path, int flags) {
  int fd;
  do {
    fd = ::open(path.c_str(), flags | O_CLOEXEC);
  } while (fd < 0 && errno == EINTR);
  return fd;
}

}  // namespace

PlatformFileDriver::PlatformFileDriver(const FileSpecification& file, bool writable,
                                       PlatformFileOptions options) noexcept
    : cachingMode_(options.mCachingMode) {
  std::string path;
  try {
    path = file.GetFullPath().utf8_str();
  } catch (...) {
    return;  // not open: every operation reports -50
  }
  const int access = writable ? O_RDWR : O_RDONLY;
  int fd = -1;
  if (cachingMode_ == kUnbufferedCaching) {
    needsAlignment_ = true;
#ifdef O_DIRECT
    fd = OpenFile(path, access | O_DIRECT);
    unbuffered_ = fd >= 0;
    // A file system that cannot bypass its cache refuses the flag.
    if (fd < 0 && errno == EINVAL) fd = OpenFile(path, access);
#else
    fd = OpenFile(path, access);
#endif
  } else {
    fd = OpenFile(path, access);
#ifdef POSIX_FADV_RANDOM
    if (fd >= 0) (void)::posix_fadvise(fd, 0, 0, POSIX_FADV_RANDOM);
#endif
  }
  if (options.mForceAlignment) needsAlignment_ = true;
  handle_ = fd;
}

PlatformFileDriver::~PlatformFileDriver() {
  if (handle_ >= 0) ::close(static_cast<int>(handle_));
}

bool PlatformFileDriver::IsOpen() const noexcept { return handle_ >= 0; }

FileStatus PlatformFileDriver::SetFilePointer(std::uint64_t offset) noexcept {
  if (handle_ < 0) return kFileParamErr;
  if (offset > std::uint64_t(INT64_MAX)) return kFileIOErr;
  return ::lseek(static_cast<int>(handle_), static_cast<off_t>(offset), SEEK_SET) < 0 ? kFileIOErr
                                                                                      : kFileOK;
}

FileStatus PlatformFileDriver::GetFilePointer(std::uint64_t& offset) noexcept {
  if (handle_ < 0) return kFileParamErr;
  const off_t at = ::lseek(static_cast<int>(handle_), 0, SEEK_CUR);
  if (at < 0) return kFileIOErr;
  offset = static_cast<std::uint64_t>(at);
  return kFileOK;
}

FileStatus PlatformFileDriver::Write(const void* buffer, std::uint64_t count) noexcept {
  if (handle_ < 0) return kFileParamErr;
  const auto* bytes = static_cast<const unsigned char*>(buffer);
  std::uint64_t done = 0;
  while (done < count) {
    const std::uint64_t step = count - done < kMaxTransfer ? count - done : kMaxTransfer;
    const ssize_t n = ::write(static_cast<int>(handle_), bytes + done, step);
    if (n < 0 && errno == EINTR) continue;
    if (n <= 0) return kFileIOErr;  // a full disk ends here (ENOSPC, EFBIG)
    done += static_cast<std::uint64_t>(n);
  }
  return kFileOK;
}

FileResult PlatformFileDriver::Read(void* buffer, std::uint64_t count) noexcept {
  if (handle_ < 0) return {kFileParamErr, 0};
  auto* bytes = static_cast<unsigned char*>(buffer);
  std::uint64_t done = 0;
  while (done < count) {
    const std::uint64_t step = count - done < kMaxTransfer ? count - done : kMaxTransfer;
    const ssize_t n = ::read(static_cast<int>(handle_), bytes + done, step);
    if (n < 0 && errno == EINTR) continue;
    if (n < 0) return {kFileIOErr, static_cast<std::int64_t>(done)};
    if (n == 0) return {kFileEOFErr, static_cast<std::int64_t>(done)};
    done += static_cast<std::uint64_t>(n);
  }
  return {kFileOK, static_cast<std::int64_t>(done)};
}

FileStatus PlatformFileDriver::SetEndOfFile() noexcept {
  std::uint64_t at = 0;
  if (const FileStatus status = GetFilePointer(at); status != kFileOK) return status;
  return SetFileSize(at);
}

FileStatus PlatformFileDriver::SetFileSize(std::uint64_t bytes) noexcept {
  if (handle_ < 0) return kFileParamErr;
  if (bytes > std::uint64_t(INT64_MAX)) return kFileIOErr;
  int result;
  do {
    result = ::ftruncate(static_cast<int>(handle_), static_cast<off_t>(bytes));
  } while (result != 0 && errno == EINTR);
  return result == 0 ? kFileOK : kFileIOErr;
}

FileResult PlatformFileDriver::GetFileSize() noexcept {
  if (handle_ < 0) return {kFileParamErr, 0};
  struct stat info {};
  if (::fstat(static_cast<int>(handle_), &info) != 0) return {kFileIOErr, 0};
  return {kFileOK, static_cast<std::int64_t>(info.st_size)};
}

FileStatus PlatformFileDriver::Flush() noexcept {
  if (handle_ < 0) return kFileParamErr;
#if defined(__APPLE__)
  return ::fsync(static_cast<int>(handle_)) == 0 ? kFileOK : kFileIOErr;
#else
  return ::fdatasync(static_cast<int>(handle_)) == 0 ? kFileOK : kFileIOErr;
#endif
}

}  // namespace tarn
