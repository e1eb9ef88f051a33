// Throw-on-destruction holders and the conversions between TarnError and the
// sibling library's plain 162-byte TarnException record.
//
// ExceptionThrower holds a TarnError that a caller fills; its destructor
// throws the error when the code is non-zero, unconditionally, so it must
// never be destroyed during stack unwinding:
//
//   { tarn::ExceptionThrower thrower(__FILE__, __LINE__);
//     static_cast<tarn::TarnError&>(thrower).SetIntErrorCode(status); }  // throws if status != 0
//
// TarnExceptionThrower holds a TarnException for a sibling-library call that
// fills it on failure; its destructor throws Convert(record) when the code is
// non-zero and no exception is already propagating:
//
//   { tarn::TarnExceptionThrower thrower; SomeTPOCall(args, thrower); }
#pragma once

#include "TarnPublicObjects/TarnPublicObjects.h"
#include "tarn/Errors/TarnError.h"

namespace tarn {

class ExceptionThrower {
 public:
  ExceptionThrower() noexcept = default;                  // kind "OS", code 0
  ExceptionThrower(const char* file, int line) noexcept;  // TarnError(0, file, line)
  ExceptionThrower(const ExceptionThrower&) = default;
  ExceptionThrower& operator=(const ExceptionThrower&) = default;
  // Throws a copy of the held error if its code is non-zero.
  ~ExceptionThrower() noexcept(false);

  operator TarnError&() noexcept { return error_; }

 private:
  TarnError error_;
};

class TarnExceptionThrower {
 public:
  TarnExceptionThrower() noexcept : record_{} {}  // code 0, no detailed message
  TarnExceptionThrower(const TarnExceptionThrower&) = delete;
  TarnExceptionThrower& operator=(const TarnExceptionThrower&) = delete;
  // Throws Convert(record) if the code is non-zero and no exception is in flight.
  ~TarnExceptionThrower() noexcept(false);

  operator TarnException*() noexcept { return &record_; }

 private:
  TarnException record_;
};

// Packs an error into a record (texts cut to 49 bytes; an attachment travels
// as the record's detailed message). An error unpacked from a plain record
// (kind "Pav,<n>") is restored to that record instead.
[[nodiscard]] TarnException Convert(const TarnError& error);
// Unpacks a record. A malformed packed record ends the process.
[[nodiscard]] TarnError Convert(const TarnException& record);

[[nodiscard]] bool IsPackedTarnError(
    const TarnException& record) noexcept;                                  // text1 "TarnError,..."
[[nodiscard]] bool IsPackedTarnException(const TarnError& error) noexcept;  // kind "Pav,..."
[[nodiscard]] bool IsPackedTarnInternalErr(const TarnError& error) noexcept;  // kind "Pav,0"
[[nodiscard]] bool IsPackedTarnMacOSErr(const TarnError& error) noexcept;     // kind "Pav,1"

}  // namespace tarn
