// Windows file driver: CreateFileW with FILE_FLAG_NO_BUFFERING for
// unbuffered files (FILE_FLAG_RANDOM_ACCESS otherwise), ReadFile/WriteFile
// at the file pointer, SetFileInformationByHandle for the size. Every failed
// call becomes -36 here; nothing throws.
#include <windows.h>

#include "tarn/Audio/PlatformFileDriver.h"

namespace tarn {

namespace {

// The largest single ReadFile/WriteFile (a DWORD count); a multiple of the
// block size.
constexpr std::uint64_t kMaxTransfer = std::uint64_t{1} << 30;

HANDLE AsHandle(std::intptr_t h) { return reinterpret_cast<HANDLE>(h); }

}  // namespace

PlatformFileDriver::PlatformFileDriver(const FileSpecification& file, bool writable,
                                       PlatformFileOptions options) noexcept
    : cachingMode_(options.mCachingMode) {
  UString path;
  try {
    path = file.GetFullPath();
  } catch (...) {
    return;  // not open: every operation reports -50
  }
  const DWORD access = writable ? GENERIC_READ | GENERIC_WRITE : GENERIC_READ;
  const DWORD share = writable ? FILE_SHARE_READ | FILE_SHARE_WRITE | FILE_SHARE_DELETE
                               : FILE_SHARE_READ | FILE_SHARE_WRITE;
  const bool unbuffered = cachingMode_ == kUnbufferedCaching;
  const DWORD flags = unbuffered ? FILE_FLAG_NO_BUFFERING : FILE_FLAG_RANDOM_ACCESS;
  const auto* wide = reinterpret_cast<const wchar_t*>(path.get_internal_utf16());
  HANDLE h = ::CreateFileW(wide, access, share, nullptr, OPEN_EXISTING, flags, nullptr);
  if (h == INVALID_HANDLE_VALUE && unbuffered && ::GetLastError() == ERROR_INVALID_PARAMETER)
    h = ::CreateFileW(wide, access, share, nullptr, OPEN_EXISTING, FILE_ATTRIBUTE_NORMAL, nullptr);
  else
    unbuffered_ = unbuffered && h != INVALID_HANDLE_VALUE;
  needsAlignment_ = unbuffered || options.mForceAlignment;
  handle_ = h == INVALID_HANDLE_VALUE ? -1 : reinterpret_cast<std::intptr_t>(h);
}

PlatformFileDriver::~PlatformFileDriver() {
  if (handle_ != -1) ::CloseHandle(AsHandle(handle_));
}

bool PlatformFileDriver::IsOpen() const noexcept { return handle_ != -1; }

FileStatus PlatformFileDriver::SetFilePointer(std::uint64_t offset) noexcept {
  if (handle_ == -1) return kFileParamErr;
  LARGE_INTEGER to;
  to.QuadPart = static_cast<LONGLONG>(offset);
  return ::SetFilePointerEx(AsHandle(handle_), to, nullptr, FILE_BEGIN) ? kFileOK : kFileIOErr;
}

FileStatus PlatformFileDriver::GetFilePointer(std::uint64_t& offset) noexcept {
  if (handle_ == -1) return kFileParamErr;
  LARGE_INTEGER zero{}, at{};
  if (!::SetFilePointerEx(AsHandle(handle_), zero, &at, FILE_CURRENT)) return kFileIOErr;
  offset = static_cast<std::uint64_t>(at.QuadPart);
  return kFileOK;
}

FileStatus PlatformFileDriver::Write(const void* buffer, std::uint64_t count) noexcept {
  if (handle_ == -1) return kFileParamErr;
  const auto* bytes = static_cast<const unsigned char*>(buffer);
  std::uint64_t done = 0;
  while (done < count) {
    const std::uint64_t step = count - done < kMaxTransfer ? count - done : kMaxTransfer;
    DWORD written = 0;
    if (!::WriteFile(AsHandle(handle_), bytes + done, static_cast<DWORD>(step), &written,
                     nullptr) ||
        written == 0)
      return kFileIOErr;
    done += written;
  }
  return kFileOK;
}

FileResult PlatformFileDriver::Read(void* buffer, std::uint64_t count) noexcept {
  if (handle_ == -1) return {kFileParamErr, 0};
  auto* bytes = static_cast<unsigned char*>(buffer);
  std::uint64_t done = 0;
  while (done < count) {
    const std::uint64_t step = count - done < kMaxTransfer ? count - done : kMaxTransfer;
    DWORD got = 0;
    if (!::ReadFile(AsHandle(handle_), bytes + done, static_cast<DWORD>(step), &got, nullptr)) {
      const DWORD error = ::GetLastError();
      if (error == ERROR_HANDLE_EOF) return {kFileEOFErr, static_cast<std::int64_t>(done)};
      return {kFileIOErr, static_cast<std::int64_t>(done)};
    }
    if (got == 0) return {kFileEOFErr, static_cast<std::int64_t>(done)};
    done += got;
  }
  return {kFileOK, static_cast<std::int64_t>(done)};
}

FileStatus PlatformFileDriver::SetEndOfFile() noexcept {
  if (handle_ == -1) return kFileParamErr;
  return ::SetEndOfFile(AsHandle(handle_)) ? kFileOK : kFileIOErr;
}

FileStatus PlatformFileDriver::SetFileSize(std::uint64_t bytes) noexcept {
  if (handle_ == -1) return kFileParamErr;
  FILE_END_OF_FILE_INFO info;
  info.EndOfFile.QuadPart = static_cast<LONGLONG>(bytes);
  return ::SetFileInformationByHandle(AsHandle(handle_), FileEndOfFileInfo, &info, sizeof info)
             ? kFileOK
             : kFileIOErr;
}

FileResult PlatformFileDriver::GetFileSize() noexcept {
  if (handle_ == -1) return {kFileParamErr, 0};
  LARGE_INTEGER size{};
  if (!::GetFileSizeEx(AsHandle(handle_), &size)) return {kFileIOErr, 0};
  return {kFileOK, static_cast<std::int64_t>(size.QuadPart)};
}

FileStatus PlatformFileDriver::Flush() noexcept {
  if (handle_ == -1) return kFileParamErr;
  return ::FlushFileBuffers(AsHandle(handle_)) ? kFileOK : kFileIOErr;
}

}  // namespace tarn
