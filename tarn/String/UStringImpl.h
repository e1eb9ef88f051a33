// Private: the conversion and text services behind UString, split into the
// portable Unicode transforms (UStringUnicode.cpp) and the platform services
// (UString_posix.cpp on ICU, UString_win.cpp on the Windows API).
#pragma once

#include <cstddef>
#include <cstdint>
#include <ctime>
#include <string>

#include "tarn/String/UTraits.h"

namespace tarn::detail {

inline constexpr unsigned short kReplacementUnit = 0xFFFD;

// Portable Unicode transforms; malformed input becomes U+FFFD.
void AppendUTF8(UTF16String& out, const char* bytes, std::size_t n);
void AppendUTF32(UTF16String& out, const unsigned int* units, std::size_t n);
void AppendCodePoint(UTF16String& out, std::uint32_t cp);
std::string ToUTF8(const unsigned short* units, std::size_t n);
UTF32String ToUTF32(const unsigned short* units, std::size_t n);

// Platform services. `codePage` is 0 (system ANSI: Windows-1252 on POSIX) or
// 1 (Mac Roman). Unconvertible characters use the platform's substitution.
void AppendCodePage(UTF16String& out, const char* bytes, std::size_t n, int codePage);
std::string FromCodePage(const unsigned short* units, std::size_t n, int codePage);

// The system's locale collation: -1, 0 or 1.
int SystemCompare(const unsigned short* a, std::size_t na, const unsigned short* b, std::size_t nb,
                  bool ignoreCase, bool ignoreNonSpace);
// Canonical decomposition with the non-spacing marks removed.
UTF16String StripNonSpacing(const UTF16String& s);

unsigned short MapCaseUnit(unsigned short c, bool upper);
void MapCaseString(UTF16String& s, bool upper);
UTF16String NormalizeKC(const UTF16String& s);

bool SystemIsRoman();
// Local broken-down time of a Unix time; false when the platform cannot.
bool ToLocalTime(std::int64_t unixSeconds, std::tm& out);

}  // namespace tarn::detail
