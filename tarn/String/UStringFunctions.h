// Free string helpers in namespace tarn: character classes, case mapping,
// number, date and four-character-code conversions, and small string utilities.
//
// Character classes work on single UTF-16 units. IsDigit and IsXDigit accept
// ASCII digits only; IsSpace accepts the Unicode white-space units of the Basic
// Multilingual Plane; IsLower, IsUpper and the case mappings follow the
// platform's Unicode case tables (single-unit, simple mappings for one unit;
// the whole-string forms may use full mappings where the platform offers them).
//
// Number and date texts are locale-independent: '.' as decimal point, ','
// as thousands separator, English month and day names. None of these functions
// throw except for allocation failure, std::invalid_argument for a base outside
// 0 and 2..36, and out-of-range enumeration values.
#pragma once

#include <cstddef>
#include <cstdint>

#include "tarn/String/UString.h"

namespace tarn {

// --- character classes and case ---------------------------------------------
[[nodiscard]] constexpr bool IsASCII(unsigned short c) noexcept { return c < 0x80; }
[[nodiscard]] constexpr bool IsDigit(unsigned short c) noexcept { return c >= '0' && c <= '9'; }
[[nodiscard]] constexpr bool IsXDigit(unsigned short c) noexcept {
  return IsDigit(c) || (c >= 'a' && c <= 'f') || (c >= 'A' && c <= 'F');
}
[[nodiscard]] bool IsLower(unsigned short c);
[[nodiscard]] bool IsUpper(unsigned short c);
// Tab, LF, VT, FF, CR, space, U+0085, U+00A0, U+1680, U+2000..U+200A, U+2028,
// U+2029, U+202F, U+205F and U+3000.
[[nodiscard]] bool IsSpace(unsigned short c) noexcept;
// LF, CR, U+0085 (next line), U+2028 and U+2029.
[[nodiscard]] bool IsLineTerminator(unsigned short c) noexcept;

[[nodiscard]] unsigned short ToLower(unsigned short c);
[[nodiscard]] unsigned short ToUpper(unsigned short c);
void ToLower(UString& s);
void ToUpper(UString& s);

// True when `s` is non-empty and consists of ASCII digits only.
[[nodiscard]] bool IsNumeric(const UString& s) noexcept;
// True when every unit of `s` is white space (so also for an empty string).
[[nodiscard]] bool IsStringWhitespace(const UString& s) noexcept;
// The value of the first run of ASCII digits in `s` ("Take 12 (3)" -> 12),
// saturated at INT64_MAX; -1 when `s` has no digit.
[[nodiscard]] std::int64_t FindNumberInString(const UString& s) noexcept;

// --- numbers -------------------------------------------------------------------
enum class NumFormat : int {
  kDecimal = 0,      // "-1234567"
  kThousands = 1,    // "-1,234,567"
  kHex = 2,          // "12D687" (upper case, two's complement for negatives)
  kHexPrefixed = 3,  // "0x12D687"
};

[[nodiscard]] UString NumToUString(std::int64_t n);
void NumToUString(std::int64_t n, NumFormat format, UString& out);
// Upper-case hexadecimal, padded with zeros to at least `minDigits` digits.
[[nodiscard]] UString NumToHexUString(std::uint64_t n, int minDigits = 0);
// Reads a number written in `format` (leading white space and, for decimal
// formats, a sign allowed; kThousands skips ','; both hex formats accept an
// optional "0x"). Reading stops at the first unit that does not fit; the
// result saturates at the int64 range; 0 when no digit was read.
[[nodiscard]] std::int64_t UStringToNum(const UString& s, NumFormat format = NumFormat::kDecimal);

// As strtol/strtoll: skip leading white space, optional sign, base 0 (decimal,
// "0x" hex, leading-0 octal) or 2..36; results saturate at the type's range.
// `rest` (may be null) receives the text after the number, or all of `s` when
// no number was read. The 32-bit StrToL has the same range on every platform.
[[nodiscard]] std::int32_t StrToL(const UString& s, UString* rest = nullptr, int base = 10);
[[nodiscard]] std::int64_t StrToLL(const UString& s, UString* rest = nullptr, int base = 10);
// A decimal or scientific floating-point number (also "inf", "nan"), '.' as
// decimal point; 0.0 and all of `s` in `rest` when none was read.
[[nodiscard]] double StrToD(const UString& s, UString* rest = nullptr);
[[nodiscard]] double UStringToDouble(const UString& s);
// decimals < 0: the shortest text that reads back as the same double;
// otherwise fixed notation with that many decimals.
void DoubleToUString(double d, UString& out, int decimals = -1);

// --- dates ---------------------------------------------------------------------
// `seconds` counts from 1 January 1904, 00:00 UTC; texts show local time.
enum class DateTimeFormat : int {
  kShort = 0,   // date "3/5/2024"           time "14:07"
  kAbbrev = 1,  // date "Tue, Mar 5, 2024"   time "14:07:09"
  kLong = 2,    // date "Tuesday, March 5, 2024"  time "14:07:09"
  kISO = 3,     // date "2024-03-05"         time "14:07:09"
};
void DateToUString(std::uint32_t seconds, DateTimeFormat format, UString& out);
void TimeToUString(std::uint32_t seconds, DateTimeFormat format, UString& out);

// --- conversions and utilities -----------------------------------------------
// Unicode normalisation form KC.
[[nodiscard]] UString NormalizeStringWithFormKC(const UString& s);

// Four-character codes: the code's bytes, most significant first, read as Mac
// Roman. UStringToResType writes each of the first four units back as its Mac
// Roman byte (its low byte when Mac Roman has no such character); a shorter
// string is padded with spaces.
void ResTypeToUString(std::uint32_t code, UString& out);
[[nodiscard]] std::uint32_t UStringToResType(const UString& s);

// Copies the low byte of each unit into `buffer` (at most `size` bytes) and
// zero-fills the rest of the buffer; returns the number of units copied.
std::size_t UStringToRawData(const UString& s, unsigned char* buffer, std::size_t size);

// Appends `second` to `first` keeping the result within maxLength units; the
// end of `first` gives way first, then the end of `second`
// ("Hello" + "World", 8 -> "HelWorld"; 3 -> "Wor"). maxLength < 0 acts as 0.
void UStrncatTruncateFirst(UString& first, const UString& second, short maxLength);

// True for kSystemEncoding and kMacRomanEncoding (and kMultipleEncodings,
// which reads as the system encoding).
[[nodiscard]] bool IsSystemOrRomanEncoding(unsigned encoding) noexcept;
// True when the system encoding is the Western (Roman) code page 1252.
[[nodiscard]] bool IsSystemRomanNative();

}  // namespace tarn
