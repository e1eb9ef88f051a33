// POSIX system errors: errno values under the kind "POSIX".
#include <string.h>
#include <cerrno>

#include "tarn/Errors/ErrorsImpl.h"
#include "tarn/Errors/Fail.h"

namespace tarn {

namespace {

// strerror_r comes in two flavours (XSI returns int, GNU returns char*);
// these overloads accept either.
[[maybe_unused]] const char* MessageOf(int result, const char* buffer) {
  return result == 0 ? buffer : "";
}
[[maybe_unused]] const char* MessageOf(const char* result, const char*) {
  return result ? result : "";
}

}  // namespace

const char* SystemErrorKind() noexcept { return "POSIX"; }

int LastSystemErrorCode() noexcept { return errno; }

TarnError ErrnoAsTarnError(int err, const char* system, const char* subsystem) {
  char buffer[TarnError::kErrorStringSize] = {};
  const char* message = MessageOf(strerror_r(err, buffer, sizeof buffer), buffer);
  return TarnError(SystemErrorKind(), system, subsystem, err, message);
}

TarnError GetLastErrorAsTarnError(const char* system, const char* subsystem) {
  return ErrnoAsTarnError(errno, system, subsystem);
}

}  // namespace tarn
