// Windows system errors: GetLastError() codes under the kind "Windows", with
// the system's message text.
#include <windows.h>

#include <cerrno>
#include <cstring>

#include "tarn/Errors/ErrorsImpl.h"
#include "tarn/Errors/Fail.h"

namespace tarn {

const char* SystemErrorKind() noexcept { return "Windows"; }

int LastSystemErrorCode() noexcept { return static_cast<int>(::GetLastError()); }

TarnError ErrnoAsTarnError(int err, const char* system, const char* subsystem) {
  char buffer[TarnError::kErrorStringSize] = {};
  if (strerror_s(buffer, sizeof buffer, err) != 0) buffer[0] = 0;
  return TarnError("POSIX", system, subsystem, err, buffer);
}

TarnError GetLastErrorAsTarnError(const char* system, const char* subsystem) {
  const DWORD code = ::GetLastError();
  char* message = nullptr;
  const DWORD length = ::FormatMessageA(
      FORMAT_MESSAGE_ALLOCATE_BUFFER | FORMAT_MESSAGE_FROM_SYSTEM | FORMAT_MESSAGE_IGNORE_INSERTS,
      nullptr, code, 0, reinterpret_cast<LPSTR>(&message), 0, nullptr);
  TarnError::ErrorString text(length && message ? message : "");
  if (message) ::LocalFree(message);
  return TarnError(SystemErrorKind(), system, subsystem, static_cast<int>(code), text.c_str());
}

}  // namespace tarn
