// UString::Compare: the system's locale collation, or the library's natural
// ordering (CompareFlags bit 5).
#include "tarn/String/UString.h"
#include "tarn/String/UStringImpl.h"

namespace tarn {

namespace {

constexpr bool IsAsciiDigit(unsigned short c) { return c >= '0' && c <= '9'; }

// The library's preparation step: fold accents and case as requested.
UTF16String Prepare(const UTF16String& s, bool ignoreCase, bool ignoreNonSpace) {
  UTF16String r = ignoreNonSpace ? detail::StripNonSpacing(s) : s;
  if (ignoreCase) detail::MapCaseString(r, false);
  return r;
}

// Natural order: runs of ASCII digits compare by numeric value, everything
// else by code unit. When the texts are otherwise equal, the first digit run
// that differs only in leading zeros decides, shorter run first.
int NaturalCompare(const UTF16String& a, const UTF16String& b) {
  const std::size_t na = a.size(), nb = b.size();
  std::size_t i = 0, j = 0;
  int tie = 0;
  while (i < na && j < nb) {
    if (IsAsciiDigit(a[i]) && IsAsciiDigit(b[j])) {
      const std::size_t si = i, sj = j;
      while (i < na && IsAsciiDigit(a[i])) ++i;
      while (j < nb && IsAsciiDigit(b[j])) ++j;
      std::size_t zi = si, zj = sj;  // first significant digit (keep one zero)
      while (zi + 1 < i && a[zi] == '0') ++zi;
      while (zj + 1 < j && b[zj] == '0') ++zj;
      const std::size_t li = i - zi, lj = j - zj;
      if (li != lj) return li < lj ? -1 : 1;
      for (std::size_t k = 0; k < li; ++k) {
        if (a[zi + k] != b[zj + k]) return a[zi + k] < b[zj + k] ? -1 : 1;
      }
      if (tie == 0 && i - si != j - sj) tie = i - si < j - sj ? -1 : 1;
    } else {
      if (a[i] != b[j]) return a[i] < b[j] ? -1 : 1;
      ++i;
      ++j;
    }
  }
  if (i < na) return 1;
  if (j < nb) return -1;
  return tie;
}

}  // namespace

int UString::Compare(const UString& other, CompareFlags flags) const {
  const bool ignoreCase = (flags & (kIgnoreCase | kIgnoreCaseAlt)) != 0;
  const bool ignoreNonSpace = (flags & kIgnoreNonSpace) != 0;
  if ((flags & kLibraryCompare) != 0) {
    if (!ignoreCase && !ignoreNonSpace) return NaturalCompare(str_, other.str_);
    return NaturalCompare(Prepare(str_, ignoreCase, ignoreNonSpace),
                          Prepare(other.str_, ignoreCase, ignoreNonSpace));
  }
  return detail::SystemCompare(str_.data(), str_.size(), other.str_.data(), other.str_.size(),
                               ignoreCase, ignoreNonSpace);
}

}  // namespace tarn
