// POSIX file-system primitives. Paths are the UTF-8 bytes of the UStrings;
// failures become TarnErrors of kind "POSIX" carrying errno and the path.
#include <fcntl.h>
#include <stdio.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <string>

#include "tarn/Errors/Fail.h"
#include "tarn/FileSystem/FileDate.h"
#include "tarn/FileSystem/FileSystemImpl.h"

namespace tarn::fsimpl {

namespace {

std::string Native(const UString& path) { return path.utf8_str(); }

// Throws errno (as left by the failed call) with the path(s) attached.
[[noreturn]] void FailErrno(int err, const char* operation, const UString& path,
                            const UString* path2 = nullptr) {
  ThrowWithPaths(ErrnoAsTarnError(err, "File I/O", operation), path, path2);
}

}  // namespace

bool IsSeparator(unsigned short unit) noexcept { return unit == '/'; }

unsigned short PreferredSeparator() noexcept { return '/'; }

std::size_t RootLength(const UString& path) noexcept {
  return !path.empty() && path[0] == '/' ? 1 : 0;
}

PathKind GetPathKind(const UString& path) noexcept {
  if (path.empty()) return PathKind::kNone;
  struct stat st;
  std::string native;
  try {
    native = Native(path);
  } catch (...) {
    return PathKind::kNone;
  }
  if (::stat(native.c_str(), &st) != 0) return PathKind::kNone;
  if (S_ISREG(st.st_mode)) return PathKind::kFile;
  if (S_ISDIR(st.st_mode)) return PathKind::kFolder;
  return PathKind::kOther;
}

bool IsExistingFile(const UString& path) noexcept { return GetPathKind(path) == PathKind::kFile; }

void CreateNewFile(const UString& path) {
  const int fd = ::open(Native(path).c_str(), O_CREAT | O_EXCL | O_RDONLY | O_CLOEXEC, 0666);
  if (fd < 0) FailErrno(errno, "create", path);
  if (::close(fd) != 0) FailErrno(errno, "create", path);
}

std::FILE* OpenFile(const UString& path, const char* mode, bool throwOnFailure) {
  std::FILE* f = std::fopen(Native(path).c_str(), mode);
  // A folder opens for reading here but not on Windows: refuse it alike.
  struct stat st;
  if (f != nullptr && ::fstat(::fileno(f), &st) == 0 && S_ISDIR(st.st_mode)) {
    std::fclose(f);
    f = nullptr;
    errno = EISDIR;
  }
  if (f == nullptr && throwOnFailure) FailErrno(errno, "open", path);
  return f;
}

std::int64_t FileSizeOf(const UString& path, bool missingIsZero) {
  struct stat st;
  if (::stat(Native(path).c_str(), &st) != 0) {
    const int err = errno;
    if (missingIsZero && err == ENOENT) return 0;
    FailErrno(err, "size", path);
  }
  return std::int64_t(st.st_size);
}

void RenameNoReplace(const UString& from, const UString& to) {
  const std::string f = Native(from), t = Native(to);
  if (::renameat2(AT_FDCWD, f.c_str(), AT_FDCWD, t.c_str(), RENAME_NOREPLACE) != 0) {
    int err = errno;
    if (err != EINVAL && err != ENOSYS) FailErrno(err, "rename", from, &to);
    // The file system cannot refuse to replace: check, then rename.
    struct stat st;
    if (::lstat(t.c_str(), &st) == 0) FailErrno(EEXIST, "rename", from, &to);
    if (::rename(f.c_str(), t.c_str()) != 0) FailErrno(errno, "rename", from, &to);
  }
}

void RenameReplacing(const UString& from, const UString& to) {
  if (::rename(Native(from).c_str(), Native(to).c_str()) != 0)
    FailErrno(errno, "rename", from, &to);
}

void RemoveFile(const UString& path) {
  if (::unlink(Native(path).c_str()) != 0) FailErrno(errno, "delete", path);
}

FileDate GetModificationDate(const UString& path) {
  struct stat st;
  if (::stat(Native(path).c_str(), &st) != 0) FailErrno(errno, "date", path);
  return FileDate(std::int64_t(st.st_mtim.tv_sec), std::uint32_t(st.st_mtim.tv_nsec));
}

void SetModificationDate(const UString& path, const FileDate& date) {
  struct timespec times[2];
  times[0].tv_sec = 0;
  times[0].tv_nsec = UTIME_OMIT;  // access time unchanged
  times[1].tv_sec = time_t(date.GetSeconds());
  times[1].tv_nsec = long(date.GetNanoseconds());
  if (::utimensat(AT_FDCWD, Native(path).c_str(), times, 0) != 0) FailErrno(errno, "date", path);
}

}  // namespace tarn::fsimpl
