// The Fail... functions: the only way the library raises a TarnError.
//
// Each function either returns normally (nothing to report) or throws a
// complete TarnError by value; the table of conditions is in each comment.
// The do_... variants record the caller's source file and line as the
// optional error string "<file> <line>"; the TARN_FAIL... macros pass them.
// All functions may be called from any thread.
#pragma once

#include "tarn/Errors/TarnError.h"

namespace tarn {

class FileSpecification;

// Codes of _FailNullPtrError. Other values are reported under kind "FailNULL".
enum NullPtrErrorCode : int {
  kNullPtrMemFull = 1,      // reported as out of memory (-108)
  kNullPtrResNotFound = 2,  // reported as resource not found (-192)
};

// Codes this library produces itself.
inline constexpr int kIOErr = -36;
inline constexpr int kEOFErr = -39;
inline constexpr int kFileNotFoundErr = -43;
inline constexpr int kDuplicateFileNameErr = -48;
inline constexpr int kParamErr = -50;
inline constexpr int kMemFullErr = -108;
inline constexpr int kUserCanceledErr = -128;
inline constexpr int kResNotFoundErr = -192;
inline constexpr int kAccessDeniedErr = -5000;

// Records the last failure code, then throws TarnError(code).
[[noreturn]] void Failure(int code);
// Records the last failure code, then throws TarnError(code, file, line).
[[noreturn]] void do_Failure(int code, const char* file, int line);
// The code given to the most recent Failure/do_Failure (for debuggers only;
// unsynchronised).
[[nodiscard]] int GetLastFailureCode() noexcept;

void FailOSErr(int code);                                       // code != 0: Failure(code)
void FailStream(short code);                                    // code != 0: Failure(code)
void FailNIL(const void* p);                                    // p null: Failure(-108)
[[noreturn]] void FailMemFullError();                           // Failure(-108)
void FailNILRes(const void* p);                                 // p null: Failure(-192)
void do_FailNILRes(const void* p, const char* file, int line);  // p null: do_Failure(-192, ...)

// Kept so portable callers compile; they never throw.
inline void FailMemError() noexcept {}
inline void FailResError() noexcept {}
inline void do_FailResError(const char*, int) noexcept {}

// err != 0: kind, system and subsystem "Windows", code err.
void FailWinError(int err);
void do_FailWinError(unsigned err, const char* file, int line);
// result == 0 (a failed system call): the calling thread's last system error,
// as GetLastErrorAsTarnError. On Windows the kind is "Windows" (GetLastError),
// elsewhere "POSIX" (errno). Call before any other system call.
void FailWinAPIError(int result);
void do_FailWinAPIError(unsigned result, const char* file, int line);
// err != 0: kind, system and subsystem "POSIX", code err, text strerror(err).
// For functions that return an errno value (pthreads).
void FailPOSIXError(int err);
// hr < 0: kind, system and subsystem "COM", code hr.
void FailCOMError(int hr);
void do_FailCOMError(int hr, const char* file, int line);

// code != 0: kind "OS", system "File I/O", the code, attachment the display
// path of spec (or of spec1, "\n", spec2). Defined with FileSpecification.
void FailFSErr(short code, const FileSpecification& spec);
void FailFSErr(short code, const FileSpecification& spec1, const FileSpecification& spec2);
// Kind, system and subsystem `className` (the format class that found the
// file malformed: "RIFFFileEditor", "WAVEReader", "AIFFReader"), the code,
// attachment the display path of spec. Defined with FileSpecification.
[[noreturn]] void FailFormatError(const char* className, int code, const FileSpecification& spec);

// p null: code 1 as do_Failure(-108), code 2 as do_FailNILRes, any other code
// kind "FailNULL", system "MemSys", that code, message as the optional error
// string. The first call registers the "FailNULL" translator (list 12596).
void _FailNullPtrError(const void* p, NullPtrErrorCode code, const char* message);

// Inside a catch handler: the exception in flight as a TarnError. A TarnError
// is copied; a std::exception becomes kind "Unknown Exception", system
// "TarnError", code 1, its what() text; anything else the same with
// "not a std::exception". With no exception in flight the process ends.
// The flag is accepted for compatibility and has no effect.
[[nodiscard]] TarnError GetCurrentError(bool unused = false);

// The calling thread's last system error with its message text: kind
// "Windows" with GetLastError() on Windows, kind "POSIX" with errno
// elsewhere; text cut to 255 bytes. Call right after the failed call.
[[nodiscard]] TarnError GetLastErrorAsTarnError(const char* system, const char* subsystem);
// An errno value as kind "POSIX" with its strerror text.
[[nodiscard]] TarnError ErrnoAsTarnError(int err, const char* system, const char* subsystem);

}  // namespace tarn

#define TARN_FAILURE(code) ::tarn::do_Failure((code), __FILE__, __LINE__)
#define TARN_FAIL_NIL_RES(p) ::tarn::do_FailNILRes((p), __FILE__, __LINE__)
#define TARN_FAIL_WIN_ERROR(err) ::tarn::do_FailWinError((err), __FILE__, __LINE__)
#define TARN_FAIL_WIN_API_ERROR(result) ::tarn::do_FailWinAPIError((result), __FILE__, __LINE__)
#define TARN_FAIL_COM_ERROR(hr) ::tarn::do_FailCOMError((hr), __FILE__, __LINE__)
#define TARN_FAIL_NULL(p, code, message) ::tarn::_FailNullPtrError((p), (code), (message))
