// Private helpers of the error subsystem; not installed for callers' use.
#pragma once

#include <cstdio>
#include <string>
#include <string_view>

#include "tarn/Basics/ConstantString.h"
#include "tarn/String/UString.h"

namespace tarn {

// "<file> <line>" into an error string, cut to its capacity.
template <std::size_t N>
void FormatFileAndLine(ConstantString<N>& target, const char* file, int line) noexcept {
  char buffer[N];
  std::snprintf(buffer, N, "%s %i", file ? file : "", line);
  target.assign(buffer);
}

inline UString UStringFromUTF8(std::string_view text) {
  return UString(text.data(), text.size(), UString::kUTF8Encoding);
}

// The kind of the platform's own error numbers: "Windows" or "POSIX".
[[nodiscard]] const char* SystemErrorKind() noexcept;
// The calling thread's last system error number (GetLastError or errno).
[[nodiscard]] int LastSystemErrorCode() noexcept;

// Ends the process through the runtime's fatal-error path after printing
// message to standard error. For broken invariants only.
[[noreturn]] void FatalInvariantViolation(const char* message) noexcept;

}  // namespace tarn
