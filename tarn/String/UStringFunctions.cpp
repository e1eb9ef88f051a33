// Free string helpers (interim).
#include "tarn/String/UStringFunctions.h"

#include "tarn/String/UStringImpl.h"

namespace tarn {

bool IsLower(unsigned short c) { return c >= 'a' && c <= 'z'; }
bool IsUpper(unsigned short c) { return c >= 'A' && c <= 'Z'; }
bool IsSpace(unsigned short c) noexcept { return c == ' ' || (c >= 9 && c <= 13); }
bool IsLineTerminator(unsigned short c) noexcept { return c == 10 || c == 13; }
unsigned short ToLower(unsigned short c) { return detail::MapCaseUnit(c, false); }
unsigned short ToUpper(unsigned short c) { return detail::MapCaseUnit(c, true); }
void ToLower(UString& s) {
  for (auto& c : s) c = ToLower(c);
}
void ToUpper(UString& s) {
  for (auto& c : s) c = ToUpper(c);
}
bool IsNumeric(const UString&) noexcept { return false; }
bool IsStringWhitespace(const UString&) noexcept { return false; }
std::int64_t FindNumberInString(const UString&) noexcept { return -1; }
UString NumToUString(std::int64_t n) { return UString(std::to_string(n)); }
void NumToUString(std::int64_t n, NumFormat, UString& out) { out = NumToUString(n); }
UString NumToHexUString(std::uint64_t, int) { return {}; }
std::int64_t UStringToNum(const UString&, NumFormat) { return 0; }
std::int32_t StrToL(const UString&, UString*, int) { return 0; }
std::int64_t StrToLL(const UString&, UString*, int) { return 0; }
double StrToD(const UString&, UString*) { return 0; }
double UStringToDouble(const UString&) { return 0; }
void DoubleToUString(double, UString& out, int) { out.clear(); }
void DateToUString(std::uint32_t, DateTimeFormat, UString& out) { out.clear(); }
void TimeToUString(std::uint32_t, DateTimeFormat, UString& out) { out.clear(); }
UString NormalizeStringWithFormKC(const UString& s) { return s; }
void ResTypeToUString(std::uint32_t, UString& out) { out.clear(); }
std::uint32_t UStringToResType(const UString&) { return 0; }
std::size_t UStringToRawData(const UString&, unsigned char*, std::size_t) { return 0; }
void UStrncatTruncateFirst(UString& first, const UString& second, short) { first += second; }
bool IsSystemOrRomanEncoding(unsigned e) noexcept { return e == 0 || e == 1 || e == 999; }
bool IsSystemRomanNative() { return detail::SystemIsRoman(); }

}  // namespace tarn
