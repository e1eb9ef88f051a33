// Platform services behind UString on POSIX, built on ICU: code pages through
// ICU converters ("windows-1252" for the system encoding, so that byte strings
// read the same as on Windows, and "macintosh" for Mac Roman), collation with
// the root collator, case mapping with root-locale rules, and normalisation.
#include <unicode/uchar.h>
#include <unicode/ucnv.h>
#include <unicode/ucol.h>
#include <unicode/unorm2.h>
#include <unicode/ustring.h>
#include <unicode/utf16.h>

#include <array>
#include <climits>
#include <ctime>

#include "tarn/Errors/Fail.h"
#include "tarn/String/UStringImpl.h"

namespace tarn::detail {

namespace {

// UTF16String units and ICU's UChar are both 16-bit code units.
static_assert(sizeof(UChar) == sizeof(unsigned short));
const UChar* U(const unsigned short* p) { return reinterpret_cast<const UChar*>(p); }
UChar* U(unsigned short* p) { return reinterpret_cast<UChar*>(p); }

int32_t Len(std::size_t n) {
  if (n > static_cast<std::size_t>(INT32_MAX)) Failure(kParamErr);
  return static_cast<int32_t>(n);
}

void Check(UErrorCode err) {
  if (U_FAILURE(err)) {
    if (err == U_MEMORY_ALLOCATION_ERROR) FailMemFullError();
    Failure(kParamErr);
  }
}

// ICU converters keep conversion state, so each thread keeps its own pair.
class Converters {
 public:
  Converters() = default;
  Converters(const Converters&) = delete;
  Converters& operator=(const Converters&) = delete;
  ~Converters() {
    for (UConverter* c : cnv_) {
      if (c != nullptr) ucnv_close(c);
    }
  }
  UConverter* Get(int codePage) {
    UConverter*& c = cnv_[codePage == 0 ? 0 : 1];
    if (c == nullptr) {
      UErrorCode err = U_ZERO_ERROR;
      c = ucnv_open(codePage == 0 ? "windows-1252" : "macintosh", &err);
      Check(err);
      ucnv_setSubstChars(c, "?", 1, &err);
      Check(err);
    }
    return c;
  }

 private:
  std::array<UConverter*, 2> cnv_{};
};

UConverter* ConverterFor(int codePage) {
  thread_local Converters converters;
  return converters.Get(codePage);
}

// Runs an ICU "fill this buffer" call, growing the buffer once if the first
// guess was too small.
template <typename Call>
UTF16String Transform(std::size_t guess, Call&& call) {
  UTF16String out(guess, 0);
  UErrorCode err = U_ZERO_ERROR;
  int32_t n = call(U(out.data()), Len(out.size()), &err);
  if (err == U_BUFFER_OVERFLOW_ERROR) {
    out.assign(static_cast<std::size_t>(n), 0);
    err = U_ZERO_ERROR;
    n = call(U(out.data()), Len(out.size()), &err);
  }
  if (err == U_STRING_NOT_TERMINATED_WARNING) err = U_ZERO_ERROR;
  Check(err);
  out.resize(static_cast<std::size_t>(n));
  return out;
}

// Root collators for the four flag combinations; shared read-only after setup.
class Collators {
 public:
  Collators() {
    for (int i = 0; i < 4; ++i) {
      UErrorCode err = U_ZERO_ERROR;
      coll_[i] = ucol_open("", &err);
      Check(err);
      const bool ignoreCase = (i & 1) != 0, ignoreNonSpace = (i & 2) != 0;
      if (ignoreNonSpace) {
        ucol_setStrength(coll_[i], UCOL_PRIMARY);
        if (!ignoreCase) ucol_setAttribute(coll_[i], UCOL_CASE_LEVEL, UCOL_ON, &err);
      } else {
        ucol_setStrength(coll_[i], ignoreCase ? UCOL_SECONDARY : UCOL_TERTIARY);
      }
      Check(err);
    }
  }
  Collators(const Collators&) = delete;
  Collators& operator=(const Collators&) = delete;
  ~Collators() {
    for (UCollator* c : coll_) ucol_close(c);
  }
  const UCollator* Get(bool ignoreCase, bool ignoreNonSpace) const {
    return coll_[(ignoreCase ? 1 : 0) | (ignoreNonSpace ? 2 : 0)];
  }

 private:
  std::array<UCollator*, 4> coll_{};
};

}  // namespace

void AppendCodePage(UTF16String& out, const char* bytes, std::size_t n, int codePage) {
  if (n == 0) return;
  UConverter* cnv = ConverterFor(codePage);
  const UTF16String units = Transform(n + 1, [&](UChar* dst, int32_t cap, UErrorCode* err) {
    return ucnv_toUChars(cnv, dst, cap, bytes, Len(n), err);
  });
  out.append(units);
}

std::string FromCodePage(const unsigned short* units, std::size_t n, int codePage) {
  if (n == 0) return {};
  UConverter* cnv = ConverterFor(codePage);
  std::string out(n + 1, '\0');
  UErrorCode err = U_ZERO_ERROR;
  int32_t len = ucnv_fromUChars(cnv, out.data(), Len(out.size()), U(units), Len(n), &err);
  if (err == U_BUFFER_OVERFLOW_ERROR) {
    out.assign(static_cast<std::size_t>(len) + 1, '\0');
    err = U_ZERO_ERROR;
    len = ucnv_fromUChars(cnv, out.data(), Len(out.size()), U(units), Len(n), &err);
  }
  Check(err);
  out.resize(static_cast<std::size_t>(len));
  return out;
}

int SystemCompare(const unsigned short* a, std::size_t na, const unsigned short* b, std::size_t nb,
                  bool ignoreCase, bool ignoreNonSpace) {
  static const Collators collators;
  const UCollationResult r =
      ucol_strcoll(collators.Get(ignoreCase, ignoreNonSpace), U(a), Len(na), U(b), Len(nb));
  return r == UCOL_LESS ? -1 : (r == UCOL_GREATER ? 1 : 0);
}

UTF16String StripNonSpacing(const UTF16String& s) {
  UErrorCode err = U_ZERO_ERROR;
  const UNormalizer2* nfd = unorm2_getNFDInstance(&err);
  Check(err);
  const UTF16String d = Transform(s.size() * 3 + 1, [&](UChar* dst, int32_t cap, UErrorCode* e) {
    return unorm2_normalize(nfd, U(s.data()), Len(s.size()), dst, cap, e);
  });
  UTF16String out;
  out.reserve(d.size());
  const int32_t len = Len(d.size());
  for (int32_t i = 0; i < len;) {
    const int32_t start = i;
    UChar32 c;
    U16_NEXT(d.data(), i, len, c);
    if (u_charType(c) != U_NON_SPACING_MARK) out.append(d, start, i - start);
  }
  return out;
}

unsigned short MapCaseUnit(unsigned short c, bool upper) {
  const UChar32 m = upper ? u_toupper(c) : u_tolower(c);
  return m <= 0xFFFF ? static_cast<unsigned short>(m) : c;
}

void MapCaseString(UTF16String& s, bool upper) {
  if (s.empty()) return;
  s = Transform(s.size() + 8, [&](UChar* dst, int32_t cap, UErrorCode* err) {
    return upper ? u_strToUpper(dst, cap, U(s.data()), Len(s.size()), "", err)
                 : u_strToLower(dst, cap, U(s.data()), Len(s.size()), "", err);
  });
}

UTF16String NormalizeKC(const UTF16String& s) {
  UErrorCode err = U_ZERO_ERROR;
  const UNormalizer2* nfkc = unorm2_getNFKCInstance(&err);
  Check(err);
  return Transform(s.size() + 8, [&](UChar* dst, int32_t cap, UErrorCode* e) {
    return unorm2_normalize(nfkc, U(s.data()), Len(s.size()), dst, cap, e);
  });
}

bool SystemIsRoman() { return true; }

std::int64_t LocalOffsetSeconds(std::int64_t unixSeconds) {
  const std::time_t t = static_cast<std::time_t>(unixSeconds);
  std::tm local{};
  if (localtime_r(&t, &local) == nullptr) return 0;
  return local.tm_gmtoff;
}

}  // namespace tarn::detail
