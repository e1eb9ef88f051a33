// UString::Compare: the system's locale collation, or the library's natural
// ordering (CompareFlags bit 5).
#include "tarn/String/UString.h"
#include "tarn/String/UStringImpl.h"

namespace tarn {

int UString::Compare(const UString& other, CompareFlags flags) const {
  const bool ignoreCase = (flags & (kIgnoreCase | kIgnoreCaseAlt)) != 0;
  const bool ignoreNonSpace = (flags & kIgnoreNonSpace) != 0;
  return detail::SystemCompare(str_.data(), str_.size(), other.str_.data(), other.str_.size(),
                               ignoreCase, ignoreNonSpace);
}

}  // namespace tarn
