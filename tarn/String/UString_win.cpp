// Platform services behind UString (interim: plain code-unit behaviour).
#include "tarn/String/UStringImpl.h"

namespace tarn::detail {

void AppendCodePage(UTF16String& out, const char* bytes, std::size_t n, int) {
  for (std::size_t i = 0; i < n; ++i) out.push_back(static_cast<unsigned char>(bytes[i]));
}
std::string FromCodePage(const unsigned short* units, std::size_t n, int) {
  std::string s;
  for (std::size_t i = 0; i < n; ++i) s.push_back(units[i] < 0x100 ? char(units[i]) : '?');
  return s;
}
int SystemCompare(const unsigned short* a, std::size_t na, const unsigned short* b, std::size_t nb,
                  bool, bool) {
  const UTF16String x(a, na), y(b, nb);
  const int c = x.compare(y);
  return c < 0 ? -1 : (c > 0 ? 1 : 0);
}
UTF16String StripNonSpacing(const UTF16String& s) { return s; }
unsigned short MapCaseUnit(unsigned short c, bool upper) {
  if (upper && c >= 'a' && c <= 'z') return c - 32;
  if (!upper && c >= 'A' && c <= 'Z') return c + 32;
  return c;
}
void MapCaseString(UTF16String& s, bool upper) {
  for (auto& c : s) c = MapCaseUnit(c, upper);
}
UTF16String NormalizeKC(const UTF16String& s) { return s; }
bool SystemIsRoman() { return true; }
bool ToLocalTime(std::int64_t, std::tm&) { return false; }

}  // namespace tarn::detail
