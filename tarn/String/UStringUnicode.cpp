// Portable UTF-8, UTF-16 and UTF-32 transforms. Malformed input becomes
// U+FFFD: one per maximal ill-formed subsequence of UTF-8 (the Unicode
// recommendation), one per unpaired surrogate, one per UTF-32 value that is a
// surrogate or above U+10FFFF.
#include "tarn/String/UStringImpl.h"

namespace tarn::detail {

namespace {

constexpr bool IsHighSurrogate(unsigned u) { return u >= 0xD800 && u <= 0xDBFF; }
constexpr bool IsLowSurrogate(unsigned u) { return u >= 0xDC00 && u <= 0xDFFF; }

// Walks UTF-16 units as code points, unpaired surrogates as U+FFFD.
template <typename Sink>
void ForEachCodePoint(const unsigned short* u, std::size_t n, Sink&& sink) {
  for (std::size_t i = 0; i < n; ++i) {
    const unsigned c = u[i];
    if (IsHighSurrogate(c) && i + 1 < n && IsLowSurrogate(u[i + 1])) {
      sink(0x10000u + ((c - 0xD800u) << 10) + (u[i + 1] - 0xDC00u));
      ++i;
    } else if (IsHighSurrogate(c) || IsLowSurrogate(c)) {
      sink(std::uint32_t{kReplacementUnit});
    } else {
      sink(std::uint32_t{c});
    }
  }
}

}  // namespace

void AppendCodePoint(UTF16String& out, std::uint32_t cp) {
  if (cp < 0x10000) {
    out.push_back(IsHighSurrogate(cp) || IsLowSurrogate(cp) ? kReplacementUnit
                                                            : static_cast<unsigned short>(cp));
  } else if (cp <= 0x10FFFF) {
    cp -= 0x10000;
    out.push_back(static_cast<unsigned short>(0xD800 + (cp >> 10)));
    out.push_back(static_cast<unsigned short>(0xDC00 + (cp & 0x3FF)));
  } else {
    out.push_back(kReplacementUnit);
  }
}

void AppendUTF32(UTF16String& out, const unsigned int* units, std::size_t n) {
  out.reserve(out.size() + n);
  for (std::size_t i = 0; i < n; ++i) AppendCodePoint(out, units[i]);
}

void AppendUTF8(UTF16String& out, const char* bytes, std::size_t n) {
  const auto* p = reinterpret_cast<const unsigned char*>(bytes);
  out.reserve(out.size() + n);
  std::size_t i = 0;
  while (i < n) {
    const unsigned b = p[i++];
    if (b < 0x80) {
      out.push_back(static_cast<unsigned short>(b));
      continue;
    }
    int need = 0;
    std::uint32_t cp = 0;
    unsigned lo = 0x80, hi = 0xBF;  // allowed range of the next continuation byte
    if (b >= 0xC2 && b <= 0xDF) {
      need = 1;
      cp = b & 0x1F;
    } else if (b >= 0xE0 && b <= 0xEF) {
      need = 2;
      cp = b & 0x0F;
      if (b == 0xE0) lo = 0xA0;  // no overlong forms
      if (b == 0xED) hi = 0x9F;  // no surrogates
    } else if (b >= 0xF0 && b <= 0xF4) {
      need = 3;
      cp = b & 0x07;
      if (b == 0xF0) lo = 0x90;  // no overlong forms
      if (b == 0xF4) hi = 0x8F;  // nothing above U+10FFFF
    } else {
      out.push_back(kReplacementUnit);
      continue;
    }
    bool ok = true;
    for (int k = 0; k < need; ++k) {
      if (i < n && p[i] >= lo && p[i] <= hi) {
        cp = (cp << 6) | (p[i] & 0x3F);
        ++i;
        lo = 0x80;
        hi = 0xBF;
      } else {
        ok = false;  // the offending byte starts the next sequence
        break;
      }
    }
    AppendCodePoint(out, ok ? cp : kReplacementUnit);
  }
}

std::string ToUTF8(const unsigned short* units, std::size_t n) {
  std::string out;
  out.reserve(n);
  ForEachCodePoint(units, n, [&out](std::uint32_t cp) {
    if (cp < 0x80) {
      out.push_back(static_cast<char>(cp));
    } else if (cp < 0x800) {
      out.push_back(static_cast<char>(0xC0 | (cp >> 6)));
      out.push_back(static_cast<char>(0x80 | (cp & 0x3F)));
    } else if (cp < 0x10000) {
      out.push_back(static_cast<char>(0xE0 | (cp >> 12)));
      out.push_back(static_cast<char>(0x80 | ((cp >> 6) & 0x3F)));
      out.push_back(static_cast<char>(0x80 | (cp & 0x3F)));
    } else {
      out.push_back(static_cast<char>(0xF0 | (cp >> 18)));
      out.push_back(static_cast<char>(0x80 | ((cp >> 12) & 0x3F)));
      out.push_back(static_cast<char>(0x80 | ((cp >> 6) & 0x3F)));
      out.push_back(static_cast<char>(0x80 | (cp & 0x3F)));
    }
  });
  return out;
}

UTF32String ToUTF32(const unsigned short* units, std::size_t n) {
  UTF32String out;
  out.reserve(n);
  ForEachCodePoint(units, n, [&out](std::uint32_t cp) { out.push_back(cp); });
  return out;
}

}  // namespace tarn::detail
