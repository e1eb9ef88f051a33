// Platform services behind UString on Windows: code pages through
// MultiByteToWideChar/WideCharToMultiByte (CP_ACP and Mac Roman, 10000),
// collation through CompareStringW in the system default locale, case mapping
// through LCMapStringW with invariant rules, and NormalizeString.
#include <windows.h>

#include <climits>
#include <ctime>
#include <string>
#include <vector>

#include "tarn/Errors/Fail.h"
#include "tarn/String/UStringImpl.h"

namespace tarn::detail {

namespace {

static_assert(sizeof(wchar_t) == sizeof(unsigned short));
const wchar_t* W(const unsigned short* p) { return reinterpret_cast<const wchar_t*>(p); }
wchar_t* W(unsigned short* p) { return reinterpret_cast<wchar_t*>(p); }

int Len(std::size_t n) {
  if (n > static_cast<std::size_t>(INT_MAX)) Failure(kParamErr);
  return static_cast<int>(n);
}

UINT CodePage(int codePage) { return codePage == 0 ? CP_ACP : 10000; }

// A failed system call: the thread's last Windows error as a TarnError.
[[noreturn]] void Fail() {
  FailWinAPIError(0);
  Failure(kParamErr);  // the call set no error code
}

UTF16String MapString(const UTF16String& s, DWORD flags) {
  if (s.empty()) return s;
  int n = LCMapStringW(LOCALE_INVARIANT, flags, W(s.data()), Len(s.size()), nullptr, 0);
  if (n <= 0) Fail();
  UTF16String out(static_cast<std::size_t>(n), 0);
  n = LCMapStringW(LOCALE_INVARIANT, flags, W(s.data()), Len(s.size()), W(out.data()), n);
  if (n <= 0) Fail();
  out.resize(static_cast<std::size_t>(n));
  return out;
}

UTF16String Normalize(NORM_FORM form, const UTF16String& s) {
  if (s.empty()) return s;
  int guess = NormalizeString(form, W(s.data()), Len(s.size()), nullptr, 0);
  for (int attempt = 0; attempt < 8; ++attempt) {
    if (guess <= 0) Fail();
    UTF16String out(static_cast<std::size_t>(guess), 0);
    const int n = NormalizeString(form, W(s.data()), Len(s.size()), W(out.data()), guess);
    if (n > 0) {
      out.resize(static_cast<std::size_t>(n));
      return out;
    }
    if (GetLastError() != ERROR_INSUFFICIENT_BUFFER) Fail();
    guess = -n;  // the function returns the negated new estimate
  }
  Fail();
}

}  // namespace

void AppendCodePage(UTF16String& out, const char* bytes, std::size_t n, int codePage) {
  if (n == 0) return;
  const UINT cp = CodePage(codePage);
  const int len = MultiByteToWideChar(cp, 0, bytes, Len(n), nullptr, 0);
  if (len <= 0) Fail();
  const std::size_t start = out.size();
  out.resize(start + static_cast<std::size_t>(len));
  if (MultiByteToWideChar(cp, 0, bytes, Len(n), W(out.data() + start), len) != len) {
    Fail();
  }
}

std::string FromCodePage(const unsigned short* units, std::size_t n, int codePage) {
  if (n == 0) return {};
  const UINT cp = CodePage(codePage);
  const int len = WideCharToMultiByte(cp, 0, W(units), Len(n), nullptr, 0, nullptr, nullptr);
  if (len <= 0) Fail();
  std::string out(static_cast<std::size_t>(len), '\0');
  if (WideCharToMultiByte(cp, 0, W(units), Len(n), out.data(), len, nullptr, nullptr) != len) {
    Fail();
  }
  return out;
}

int SystemCompare(const unsigned short* a, std::size_t na, const unsigned short* b, std::size_t nb,
                  bool ignoreCase, bool ignoreNonSpace) {
  DWORD flags = 0;
  if (ignoreCase) flags |= NORM_IGNORECASE;
  if (ignoreNonSpace) flags |= NORM_IGNORENONSPACE;
  const int r = CompareStringW(LOCALE_SYSTEM_DEFAULT, flags, W(a), Len(na), W(b), Len(nb));
  if (r == 0) Fail();
  return r - CSTR_EQUAL;
}

UTF16String StripNonSpacing(const UTF16String& s) {
  const UTF16String d = Normalize(NormalizationD, s);
  if (d.empty()) return d;
  std::vector<WORD> types(d.size(), 0);
  if (!GetStringTypeW(CT_CTYPE3, W(d.data()), Len(d.size()), types.data())) {
    Fail();
  }
  UTF16String out;
  out.reserve(d.size());
  for (std::size_t i = 0; i < d.size(); ++i) {
    if ((types[i] & C3_NONSPACING) == 0) out.push_back(d[i]);
  }
  return out;
}

unsigned short MapCaseUnit(unsigned short c, bool upper) {
  if (c >= 0xD800 && c <= 0xDFFF) return c;
  const UTF16String m = MapString(UTF16String(1, c), upper ? LCMAP_UPPERCASE : LCMAP_LOWERCASE);
  return m.size() == 1 ? m[0] : c;
}

void MapCaseString(UTF16String& s, bool upper) {
  s = MapString(s, upper ? LCMAP_UPPERCASE : LCMAP_LOWERCASE);
}

UTF16String NormalizeKC(const UTF16String& s) { return Normalize(NormalizationKC, s); }

bool SystemIsRoman() { return GetACP() == 1252; }

std::int64_t LocalOffsetSeconds(std::int64_t unixSeconds) {
  // The C runtime (which honours TZ) rejects times whose local time falls
  // before 1970; earlier times use the offset in force early in January 1970.
  constexpr std::int64_t kEarliest = 2 * 86400;
  const __time64_t t = static_cast<__time64_t>(unixSeconds < kEarliest ? kEarliest : unixSeconds);
  std::tm local{};
  if (_localtime64_s(&local, &t) != 0) return 0;
  const __time64_t asUTC = _mkgmtime64(&local);
  return asUTC == -1 ? 0 : static_cast<std::int64_t>(asUTC - t);
}

}  // namespace tarn::detail
