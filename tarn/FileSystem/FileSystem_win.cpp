// Windows file-system primitives. Paths go to the wide ("W") calls as the
// UStrings' UTF-16 units, so any Unicode name works; failures become
// TarnErrors of kind "Windows" carrying GetLastError() and the path.
#include <windows.h>

#include <cstdio>
#include <string>

#include "tarn/Errors/Fail.h"
#include "tarn/FileSystem/FileDate.h"
#include "tarn/FileSystem/FileSystemImpl.h"

namespace tarn::fsimpl {

namespace {

const wchar_t* Native(const UString& path) {
  return reinterpret_cast<const wchar_t*>(path.get_internal_utf16());
}

// Throws the last Windows error (call right after the failed call) with the
// path(s) attached.
[[noreturn]] void FailLastError(const char* operation, const UString& path,
                                const UString* path2 = nullptr) {
  ThrowWithPaths(GetLastErrorAsTarnError("File I/O", operation), path, path2);
}

// 100-ns intervals from 1601-01-01 to 1970-01-01.
constexpr std::int64_t kUnixEpochInFileTimeSeconds = 11644473600LL;
constexpr std::int64_t kTicksPerSecond = 10'000'000;

FileDate FromFileTime(const FILETIME& ft) {
  const std::int64_t ticks =
      std::int64_t((std::uint64_t(ft.dwHighDateTime) << 32) | ft.dwLowDateTime);
  return FileDate(ticks / kTicksPerSecond - kUnixEpochInFileTimeSeconds,
                  std::uint32_t(ticks % kTicksPerSecond) * 100);
}

HANDLE OpenForAttributes(const UString& path, DWORD access) {
  return ::CreateFileW(Native(path), access, FILE_SHARE_READ | FILE_SHARE_WRITE | FILE_SHARE_DELETE,
                       nullptr, OPEN_EXISTING, FILE_FLAG_BACKUP_SEMANTICS, nullptr);
}

}  // namespace

bool IsSeparator(unsigned short unit) noexcept { return unit == '\\' || unit == '/'; }

unsigned short PreferredSeparator() noexcept { return '\\'; }

std::size_t RootLength(const UString& path) noexcept {
  const std::size_t n = path.length();
  auto letter = [](unsigned short c) { return (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z'); };
  auto driveRoot = [&](std::size_t at) -> std::size_t {
    if (n >= at + 2 && letter(path[at]) && path[at + 1] == ':')
      return n >= at + 3 && IsSeparator(path[at + 2]) ? at + 3 : at + 2;
    return 0;
  };
  if (std::size_t d = driveRoot(0)) return d;
  if (n >= 2 && IsSeparator(path[0]) && IsSeparator(path[1])) {
    // "\\?\C:\" or "\\server\share\"
    if (n >= 4 && path[2] == '?' && IsSeparator(path[3])) {
      if (std::size_t d = driveRoot(4)) return d;
    }
    std::size_t i = 2;
    while (i < n && !IsSeparator(path[i])) ++i;  // server
    if (i < n) ++i;
    while (i < n && !IsSeparator(path[i])) ++i;  // share
    return i < n ? i + 1 : n;
  }
  return n >= 1 && IsSeparator(path[0]) ? 1 : 0;
}

PathKind GetPathKind(const UString& path) noexcept {
  if (path.empty()) return PathKind::kNone;
  const DWORD attributes = ::GetFileAttributesW(Native(path));
  if (attributes == INVALID_FILE_ATTRIBUTES) return PathKind::kNone;
  if (attributes & FILE_ATTRIBUTE_DIRECTORY) return PathKind::kFolder;
  if (attributes & FILE_ATTRIBUTE_DEVICE) return PathKind::kOther;
  return PathKind::kFile;
}

bool IsExistingFile(const UString& path) noexcept {
  // Opening (rather than GetFileAttributesW) also finds alternate data streams.
  HANDLE h = OpenForAttributes(path, FILE_READ_ATTRIBUTES);
  if (h == INVALID_HANDLE_VALUE) return false;
  BY_HANDLE_FILE_INFORMATION info;
  const bool isFile = ::GetFileInformationByHandle(h, &info) &&
                      (info.dwFileAttributes & FILE_ATTRIBUTE_DIRECTORY) == 0;
  ::CloseHandle(h);
  return isFile;
}

void CreateNewFile(const UString& path) {
  HANDLE h = ::CreateFileW(Native(path), GENERIC_READ, 0, nullptr, CREATE_NEW,
                           FILE_ATTRIBUTE_NORMAL, nullptr);
  if (h == INVALID_HANDLE_VALUE) FailLastError("create", path);
  if (!::CloseHandle(h)) FailLastError("create", path);
}

std::FILE* OpenFile(const UString& path, const char* mode, bool throwOnFailure) {
  std::wstring wideMode;
  for (const char* m = mode; *m != 0; ++m) wideMode += wchar_t(static_cast<unsigned char>(*m));
  ::SetLastError(ERROR_SUCCESS);
  std::FILE* f = ::_wfopen(Native(path), wideMode.c_str());
  if (f == nullptr && throwOnFailure) {
    if (::GetLastError() == ERROR_SUCCESS) ::SetLastError(ERROR_INVALID_PARAMETER);  // bad mode
    FailLastError("open", path);
  }
  return f;
}

std::int64_t FileSizeOf(const UString& path, bool missingIsZero) {
  HANDLE h = OpenForAttributes(path, FILE_READ_ATTRIBUTES);
  if (h == INVALID_HANDLE_VALUE) {
    const DWORD err = ::GetLastError();
    if (missingIsZero && (err == ERROR_FILE_NOT_FOUND || err == ERROR_PATH_NOT_FOUND)) return 0;
    FailLastError("size", path);
  }
  LARGE_INTEGER size;
  const BOOL ok = ::GetFileSizeEx(h, &size);
  const DWORD err = ::GetLastError();
  ::CloseHandle(h);
  if (!ok) {
    ::SetLastError(err);
    FailLastError("size", path);
  }
  return size.QuadPart;
}

void RenameNoReplace(const UString& from, const UString& to) {
  if (!::MoveFileExW(Native(from), Native(to), MOVEFILE_COPY_ALLOWED))
    FailLastError("rename", from, &to);
}

void RenameReplacing(const UString& from, const UString& to) {
  if (!::MoveFileExW(Native(from), Native(to), MOVEFILE_COPY_ALLOWED | MOVEFILE_REPLACE_EXISTING))
    FailLastError("rename", from, &to);
}

void RemoveFile(const UString& path) {
  if (!::DeleteFileW(Native(path))) FailLastError("delete", path);
}

FileDate GetModificationDate(const UString& path) {
  WIN32_FILE_ATTRIBUTE_DATA data;
  if (!::GetFileAttributesExW(Native(path), GetFileExInfoStandard, &data))
    FailLastError("date", path);
  return FromFileTime(data.ftLastWriteTime);
}

void SetModificationDate(const UString& path, const FileDate& date) {
  const std::int64_t seconds = date.GetSeconds() + kUnixEpochInFileTimeSeconds;
  if (seconds < 0 || seconds > INT64_MAX / kTicksPerSecond - 1) {
    ::SetLastError(ERROR_INVALID_PARAMETER);
    FailLastError("date", path);
  }
  const std::uint64_t ticks =
      std::uint64_t(seconds * kTicksPerSecond + date.GetNanoseconds() / 100);
  FILETIME ft;
  ft.dwLowDateTime = DWORD(ticks & 0xFFFFFFFFu);
  ft.dwHighDateTime = DWORD(ticks >> 32);
  HANDLE h = OpenForAttributes(path, FILE_WRITE_ATTRIBUTES);
  if (h == INVALID_HANDLE_VALUE) FailLastError("date", path);
  const BOOL ok = ::SetFileTime(h, nullptr, nullptr, &ft);
  const DWORD err = ::GetLastError();
  ::CloseHandle(h);
  if (!ok) {
    ::SetLastError(err);
    FailLastError("date", path);
  }
}

}  // namespace tarn::fsimpl
