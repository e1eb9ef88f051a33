// Free string helpers: character classes, case, whole-string tests,
// four-character codes and small utilities. Numbers and dates live in
// UStringNumbers.cpp and UStringDates.cpp.
#include "tarn/String/UStringFunctions.h"

#include <algorithm>
#include <limits>

#include "tarn/String/UStringImpl.h"

namespace tarn {

bool IsLower(unsigned short c) {
  if (c < 0x80) return c >= 'a' && c <= 'z';
  return detail::MapCaseUnit(c, true) != c && detail::MapCaseUnit(c, false) == c;
}

bool IsUpper(unsigned short c) {
  if (c < 0x80) return c >= 'A' && c <= 'Z';
  return detail::MapCaseUnit(c, false) != c && detail::MapCaseUnit(c, true) == c;
}

bool IsSpace(unsigned short c) noexcept {
  if (c <= 0x20) return c == 0x20 || (c >= 0x09 && c <= 0x0D);
  switch (c) {
    case 0x85:
    case 0xA0:
    case 0x1680:
    case 0x2028:
    case 0x2029:
    case 0x202F:
    case 0x205F:
    case 0x3000:
      return true;
    default:
      return c >= 0x2000 && c <= 0x200A;
  }
}

bool IsLineTerminator(unsigned short c) noexcept {
  return c == 0x0A || c == 0x0D || c == 0x85 || c == 0x2028 || c == 0x2029;
}

unsigned short ToLower(unsigned short c) {
  if (c < 0x80) return (c >= 'A' && c <= 'Z') ? static_cast<unsigned short>(c + 32) : c;
  return detail::MapCaseUnit(c, false);
}

unsigned short ToUpper(unsigned short c) {
  if (c < 0x80) return (c >= 'a' && c <= 'z') ? static_cast<unsigned short>(c - 32) : c;
  return detail::MapCaseUnit(c, true);
}

void ToLower(UString& s) {
  UTF16String u = s.utf16_str();
  detail::MapCaseString(u, false);
  s = UString(std::move(u));
}

void ToUpper(UString& s) {
  UTF16String u = s.utf16_str();
  detail::MapCaseString(u, true);
  s = UString(std::move(u));
}

bool IsNumeric(const UString& s) noexcept {
  return !s.empty() && std::all_of(s.begin(), s.end(), [](unsigned short c) { return IsDigit(c); });
}

bool IsStringWhitespace(const UString& s) noexcept {
  return std::all_of(s.begin(), s.end(), [](unsigned short c) { return IsSpace(c); });
}

std::int64_t FindNumberInString(const UString& s) noexcept {
  auto it = std::find_if(s.begin(), s.end(), [](unsigned short c) { return IsDigit(c); });
  if (it == s.end()) return -1;
  constexpr std::int64_t kMax = std::numeric_limits<std::int64_t>::max();
  std::int64_t v = 0;
  for (; it != s.end() && IsDigit(*it); ++it) {
    const int d = *it - '0';
    v = v > (kMax - d) / 10 ? kMax : v * 10 + d;
  }
  return v;
}

UString NormalizeStringWithFormKC(const UString& s) {
  return UString(detail::NormalizeKC(s.utf16_str()));
}

void ResTypeToUString(std::uint32_t code, UString& out) {
  const char bytes[4] = {static_cast<char>(code >> 24), static_cast<char>(code >> 16),
                         static_cast<char>(code >> 8), static_cast<char>(code)};
  out.assign(bytes, 4, UString::kMacRomanEncoding);
}

std::uint32_t UStringToResType(const UString& s) {
  std::uint32_t code = 0;
  for (std::size_t i = 0; i < 4; ++i) {
    unsigned char byte = ' ';
    if (i < s.length()) {
      const UString unit(s[i]);
      const std::string mac = unit.string(UString::kMacRomanEncoding);
      const bool exact = mac.size() == 1 && UString(mac, UString::kMacRomanEncoding) == unit;
      byte = exact ? static_cast<unsigned char>(mac[0]) : static_cast<unsigned char>(s[i] & 0xFF);
    }
    code = (code << 8) | byte;
  }
  return code;
}

std::size_t UStringToRawData(const UString& s, unsigned char* buffer, std::size_t size) {
  if (buffer == nullptr) return 0;
  const std::size_t n = std::min(size, s.length());
  for (std::size_t i = 0; i < n; ++i) buffer[i] = static_cast<unsigned char>(s[i] & 0xFF);
  std::fill(buffer + n, buffer + size, static_cast<unsigned char>(0));
  return n;
}

void UStrncatTruncateFirst(UString& first, const UString& second, short maxLength) {
  const std::size_t max = maxLength < 0 ? 0 : static_cast<std::size_t>(maxLength);
  if (first.length() + second.length() > max) {
    const std::size_t keep = max > second.length() ? max - second.length() : 0;
    if (first.length() > keep) first.resize(keep);
  }
  first.append(second);
  if (first.length() > max) first.resize(max);
}

bool IsSystemOrRomanEncoding(unsigned encoding) noexcept {
  return encoding == UString::kSystemEncoding || encoding == UString::kMacRomanEncoding ||
         encoding == UString::kMultipleEncodings;
}

bool IsSystemRomanNative() { return detail::SystemIsRoman(); }

}  // namespace tarn
