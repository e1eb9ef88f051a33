#include "tarn/Errors/Fail.h"

#include <cstdio>
#include <cstdlib>
#include <exception>

#include "tarn/Basics/TarnCoreLibCallbacks.h"
#include "tarn/Errors/ErrorsImpl.h"

namespace tarn {

namespace {

// Written just before each throw of Failure/do_Failure; nothing reads it
// but a debugger (and GetLastFailureCode). Deliberately unsynchronised.
int32_t gLastFailureCode = 0;

// The source path that _FailNullPtrError reports as its file.
constexpr const char kFailNULLSource[] = "Errors/FailNULLUtils";

}  // namespace

void Failure(int code) {
  gLastFailureCode = code;
  throw TarnError(code);
}

void do_Failure(int code, const char* file, int line) {
  gLastFailureCode = code;
  throw TarnError(code, file, line);
}

int GetLastFailureCode() noexcept { return gLastFailureCode; }

void FailOSErr(int code) {
  if (code != 0) Failure(code);
}

void FailStream(short code) {
  if (code != 0) Failure(code);
}

void FailNIL(const void* p) {
  if (p == nullptr) Failure(kMemFullErr);
}

void FailMemFullError() { Failure(kMemFullErr); }

void FailNILRes(const void* p) {
  if (p == nullptr) Failure(kResNotFoundErr);
}

void do_FailNILRes(const void* p, const char* file, int line) {
  if (p == nullptr) do_Failure(kResNotFoundErr, file, line);
}

void FailWinError(int err) {
  if (err != 0) throw TarnError("Windows", "Windows", "Windows", err);
}

void do_FailWinError(unsigned err, const char* file, int line) {
  if (err != 0) throw TarnError("Windows", "Windows", "Windows", static_cast<int>(err), file, line);
}

void FailWinAPIError(int result) {
  if (result == 0) throw GetLastErrorAsTarnError(SystemErrorKind(), SystemErrorKind());
}

void do_FailWinAPIError(unsigned result, const char* file, int line) {
  if (result != 0) return;
  const int code = LastSystemErrorCode();
  const char* kind = SystemErrorKind();
  throw TarnError(kind, kind, kind, code, file, line);
}

void FailPOSIXError(int err) {
  if (err != 0) throw ErrnoAsTarnError(err, "POSIX", "POSIX");
}

void FailCOMError(int hr) {
  if (hr < 0) throw TarnError("COM", "COM", "COM", hr);
}

void do_FailCOMError(int hr, const char* file, int line) {
  if (hr < 0) throw TarnError("COM", "COM", "COM", hr, file, line);
}

void _FailNullPtrError(const void* p, NullPtrErrorCode code, const char* message) {
  // Gives "FailNULL" errors their texts; lives until the process ends.
  static const auto* translator =
      new GenericErrCodeTranslator(UStringFromUTF8("FailNULL"), kFailNULLStringList);
  (void)translator;
  if (p != nullptr) return;
  switch (code) {
    case kNullPtrMemFull:
      do_Failure(kMemFullErr, kFailNULLSource, __LINE__);
    case kNullPtrResNotFound:
      do_FailNILRes(p, kFailNULLSource, __LINE__);
      break;
  }
  throw TarnError("FailNULL", "MemSys", "", static_cast<int>(code), message);
}

TarnError GetCurrentError(bool) {
  try {
    throw;  // with no exception in flight this calls std::terminate
  } catch (const TarnError& error) {
    return error;
  } catch (const std::exception& e) {
    return TarnError(TarnError::UnknownExceptionKind(), "TarnError", "", 1, e.what());
  } catch (...) {
    return TarnError(TarnError::UnknownExceptionKind(), "TarnError", "", 1, "not a std::exception");
  }
}

void FatalInvariantViolation(const char* message) noexcept {
  std::fprintf(stderr, "TarnCore fatal error: %s\n", message);
  std::fflush(stderr);
  std::abort();
}

}  // namespace tarn
