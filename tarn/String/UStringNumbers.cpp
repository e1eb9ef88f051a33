// Number <-> text conversions of the tarn:: string functions. All of them are
// locale-independent and read ASCII digits only.
#include <algorithm>
#include <charconv>
#include <limits>
#include <string>

#include "tarn/Errors/Fail.h"
#include "tarn/String/UStringFunctions.h"

namespace tarn {

namespace {

int DigitValue(unsigned short c) {
  if (c >= '0' && c <= '9') return c - '0';
  if (c >= 'a' && c <= 'z') return c - 'a' + 10;
  if (c >= 'A' && c <= 'Z') return c - 'A' + 10;
  return 99;
}

struct ParsedInt {
  std::uint64_t magnitude = 0;  // saturated at UINT64_MAX
  bool negative = false;
  bool any = false;     // at least one digit read
  std::size_t end = 0;  // index after the last unit read
};

// strtol-style scan: white space, sign, base prefix, digits. `skip` units
// (e.g. thousands separators) are passed over between digits.
ParsedInt ScanInt(const UString& s, int base, unsigned short skip = 0) {
  if (base != 0 && (base < 2 || base > 36)) {
    Failure(kParamErr);
  }
  ParsedInt r;
  const std::size_t n = s.length();
  std::size_t i = 0;
  while (i < n && IsSpace(s[i])) ++i;
  if (i < n && (s[i] == '+' || s[i] == '-')) r.negative = s[i++] == '-';
  const bool hexPrefix =
      i + 2 < n && s[i] == '0' && (s[i + 1] == 'x' || s[i + 1] == 'X') && IsXDigit(s[i + 2]);
  if (base == 0) base = hexPrefix ? 16 : (i < n && s[i] == '0' ? 8 : 10);
  if (base == 16 && hexPrefix) i += 2;
  constexpr std::uint64_t kMax = std::numeric_limits<std::uint64_t>::max();
  for (; i < n; ++i) {
    if (skip != 0 && s[i] == skip && r.any && i + 1 < n && DigitValue(s[i + 1]) < base) continue;
    const int d = DigitValue(s[i]);
    if (d >= base) break;
    r.any = true;
    const auto b = static_cast<std::uint64_t>(base);
    r.magnitude = r.magnitude > (kMax - d) / b ? kMax : r.magnitude * b + d;
    r.end = i + 1;
  }
  return r;
}

template <typename T>
T ToSigned(const ParsedInt& p) {
  constexpr auto kMax = static_cast<std::uint64_t>(std::numeric_limits<T>::max());
  if (p.negative) {
    if (p.magnitude > kMax) return std::numeric_limits<T>::min();
    return static_cast<T>(-static_cast<std::int64_t>(p.magnitude));
  }
  return p.magnitude > kMax ? std::numeric_limits<T>::max() : static_cast<T>(p.magnitude);
}

void SetRest(const UString& s, const ParsedInt& p, UString* rest) {
  if (rest != nullptr) *rest = p.any ? s.substr(p.end) : s;
}

}  // namespace

UString NumToUString(std::int64_t n) { return UString(std::to_string(n)); }

UString NumToHexUString(std::uint64_t n, int minDigits) {
  static constexpr char kDigits[] = "0123456789ABCDEF";
  std::string hex;
  do {
    hex.push_back(kDigits[n & 0xF]);
    n >>= 4;
  } while (n != 0);
  if (minDigits > 0 && hex.size() < static_cast<std::size_t>(minDigits)) {
    hex.append(static_cast<std::size_t>(minDigits) - hex.size(), '0');
  }
  std::reverse(hex.begin(), hex.end());
  return UString(hex);
}

void NumToUString(std::int64_t n, NumFormat format, UString& out) {
  switch (format) {
    case NumFormat::kDecimal:
      out = NumToUString(n);
      return;
    case NumFormat::kThousands: {
      const std::string digits = std::to_string(n);
      const std::size_t sign = n < 0 ? 1 : 0;
      std::string grouped = digits.substr(0, sign);
      const std::size_t count = digits.size() - sign;
      for (std::size_t i = 0; i < count; ++i) {
        if (i != 0 && (count - i) % 3 == 0) grouped.push_back(',');
        grouped.push_back(digits[sign + i]);
      }
      out = UString(grouped);
      return;
    }
    case NumFormat::kHex:
      out = NumToHexUString(static_cast<std::uint64_t>(n));
      return;
    case NumFormat::kHexPrefixed:
      out = UString("0x") + NumToHexUString(static_cast<std::uint64_t>(n));
      return;
  }
  Failure(kParamErr);
}

std::int64_t UStringToNum(const UString& s, NumFormat format) {
  switch (format) {
    case NumFormat::kDecimal:
      return ToSigned<std::int64_t>(ScanInt(s, 10));
    case NumFormat::kThousands:
      return ToSigned<std::int64_t>(ScanInt(s, 10, ','));
    case NumFormat::kHex:
    case NumFormat::kHexPrefixed: {
      // Hex texts are two's complement bit patterns, as NumToUString writes them.
      const ParsedInt p = ScanInt(s, 16);
      const auto bits = static_cast<std::int64_t>(p.magnitude);
      return p.negative ? static_cast<std::int64_t>(0 - p.magnitude) : bits;
    }
  }
  Failure(kParamErr);
}

std::int32_t StrToL(const UString& s, UString* rest, int base) {
  const ParsedInt p = ScanInt(s, base);
  SetRest(s, p, rest);
  return ToSigned<std::int32_t>(p);
}

std::int64_t StrToLL(const UString& s, UString* rest, int base) {
  const ParsedInt p = ScanInt(s, base);
  SetRest(s, p, rest);
  return ToSigned<std::int64_t>(p);
}

double StrToD(const UString& s, UString* rest) {
  const std::size_t n = s.length();
  std::size_t i = 0;
  while (i < n && IsSpace(s[i])) ++i;
  bool negative = false;
  if (i < n && (s[i] == '+' || s[i] == '-')) negative = s[i++] == '-';
  std::string ascii;
  for (std::size_t k = i; k < n && s[k] < 0x80 && s[k] > ' '; ++k) {
    ascii.push_back(static_cast<char>(s[k]));
  }
  double value = 0.0;
  const char* first = ascii.data();
  const auto [ptr, ec] =
      std::from_chars(first, first + ascii.size(), value, std::chars_format::general);
  // A leading '-' after our own sign is not a number ("--1").
  if (ptr == first || ascii.empty() || ascii[0] == '-' || ascii[0] == '+') {
    if (rest != nullptr) *rest = s;
    return 0.0;
  }
  if (ec == std::errc::result_out_of_range) {
    const std::string used(first, ptr);
    const std::size_t e = used.find_first_of("eE");
    const bool tiny = e != std::string::npos && e + 1 < used.size() && used[e + 1] == '-';
    value = tiny ? 0.0 : std::numeric_limits<double>::infinity();
  }
  if (rest != nullptr) *rest = s.substr(i + static_cast<std::size_t>(ptr - first));
  return negative ? -value : value;
}

double UStringToDouble(const UString& s) { return StrToD(s, nullptr); }

void DoubleToUString(double d, UString& out, int decimals) {
  std::string buf(400 + static_cast<std::size_t>(std::clamp(decimals, 0, 1000)), '\0');
  char* first = buf.data();
  const auto res = decimals < 0 ? std::to_chars(first, first + buf.size(), d)
                                : std::to_chars(first, first + buf.size(), d,
                                                std::chars_format::fixed, std::min(decimals, 1000));
  buf.resize(static_cast<std::size_t>(res.ptr - first));
  out = UString(buf);
}

}  // namespace tarn
