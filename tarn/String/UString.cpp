// UString members: construction, assignment, appending, output and the
// standard-string operations. Conversions live in UStringUnicode.cpp and the
// platform files; comparison in UStringCompare.cpp.
#include "tarn/String/UString.h"

#include <algorithm>
#include <cstring>
#include <cwchar>
#include <ostream>
#include <stdexcept>

#include "tarn/String/UStringImpl.h"

namespace tarn {

const UString kEmptyString;

namespace {

void AppendBytes(UTF16String& out, const char* bytes, std::size_t n, UString::ByteEncoding enc) {
  switch (enc) {
    case UString::kSystemEncoding:
    case UString::kMultipleEncodings:
      detail::AppendCodePage(out, bytes, n, 0);
      return;
    case UString::kMacRomanEncoding:
      detail::AppendCodePage(out, bytes, n, 1);
      return;
    case UString::kASCIIEncoding:
    case UString::kLatin1Encoding:
      out.reserve(out.size() + n);
      for (std::size_t i = 0; i < n; ++i) out.push_back(static_cast<unsigned char>(bytes[i]));
      return;
    case UString::kUTF8Encoding:
      detail::AppendUTF8(out, bytes, n);
      return;
  }
  throw std::invalid_argument("UString: unknown ByteEncoding " + std::to_string(int(enc)));
}

// Text stored in several encodings at once is not produced by this build; the
// byte form of such a string is empty.
std::string DecodeMultiEncodings(const UTF16String&) { return {}; }

std::string EncodeBelow(const unsigned short* units, std::size_t n, unsigned limit,
                        char replacement) {
  std::string out(n, replacement);
  for (std::size_t i = 0; i < n; ++i) {
    if (units[i] < limit) out[i] = static_cast<char>(units[i]);
  }
  return out;
}

void AppendWide(UTF16String& out, const wchar_t* w, std::size_t n) {
  if constexpr (sizeof(wchar_t) == 2) {
    out.append(reinterpret_cast<const unsigned short*>(w), n);
  } else {
    for (std::size_t i = 0; i < n; ++i) detail::AppendCodePoint(out, std::uint32_t(w[i]));
  }
}

UTF16String Units(const std::string& ascii) {
  UTF16String u;
  u.reserve(ascii.size());
  for (char c : ascii) u.push_back(static_cast<unsigned char>(c));
  return u;
}

UTF16String Units(const char* ascii) {
  UTF16String u;
  for (; *ascii != 0; ++ascii) u.push_back(static_cast<unsigned char>(*ascii));
  return u;
}

}  // namespace

// --- FormattedStreamProxy ------------------------------------------------------

UString::FormattedStreamProxy::FormattedStreamProxy(UString& target, bool append)
    : target_(target), append_(append) {}

UString::FormattedStreamProxy::~FormattedStreamProxy() {
  try {
    const std::string text = stream_.str();
    if (append_) {
      target_.append(text, kUTF8Encoding);
    } else {
      target_.assign(text, kUTF8Encoding);
    }
  } catch (...) {
    // Out of memory while flushing: the target keeps its previous text.
  }
}

UString::FormattedStreamProxy& UString::FormattedStreamProxy::operator<<(const UString& text) {
  stream_ << text.utf8_str();
  return *this;
}

// --- construction and assignment -----------------------------------------------

UString::UString(const UString& other, size_type pos, size_type count)
    : str_(other.str_, pos, count) {}
UString::UString(const char* bytes, ByteEncoding enc) { assign(bytes, enc); }
UString::UString(const char* bytes, size_type byteCount, ByteEncoding enc) {
  assign(bytes, byteCount, enc);
}
UString::UString(const unsigned char* pascal, ByteEncoding enc) { assign(pascal, enc); }
UString::UString(const unsigned char* bytes, size_type byteCount, ByteEncoding enc) {
  assign(bytes, byteCount, enc);
}
UString::UString(const std::string& bytes, ByteEncoding enc) { assign(bytes, enc); }
UString::UString(const unsigned short* utf16) : str_(utf16) {}
UString::UString(const unsigned short* utf16, size_type count) : str_(utf16, count) {}
UString::UString(const UTF16String& utf16) : str_(utf16) {}
UString::UString(UTF16String&& utf16) noexcept : str_(std::move(utf16)) {}
UString::UString(const UTF32String& utf32) { assign(utf32); }
UString::UString(const wchar_t* wide) { assign(wide); }
UString::UString(const std::wstring& wide) { assign(wide); }
UString::UString(size_type count, value_type unit) : str_(count, unit) {}
UString::UString(char byte) : str_(1, static_cast<unsigned char>(byte)) {}
UString::UString(value_type unit) : str_(1, unit) {}

UString& UString::operator=(const char* bytes) { return assign(bytes); }
UString& UString::operator=(const std::string& bytes) { return assign(bytes); }
UString& UString::operator=(const unsigned short* utf16) { return assign(utf16); }
UString& UString::operator=(const UTF16String& utf16) { return assign(utf16); }
UString& UString::operator=(const UTF32String& utf32) { return assign(utf32); }
UString& UString::operator=(const wchar_t* wide) { return assign(wide); }
UString& UString::operator=(const std::wstring& wide) { return assign(wide); }
UString& UString::operator=(char byte) { return assign(byte); }
UString& UString::operator=(value_type unit) { return assign(unit); }

UString& UString::assign(const UString& other) {
  str_ = other.str_;
  return *this;
}
UString& UString::assign(const UString& other, size_type pos, size_type count) {
  str_.assign(other.str_, pos, count);
  return *this;
}
UString& UString::assign(const char* bytes, ByteEncoding enc) {
  return assign(bytes, std::strlen(bytes), enc);
}
UString& UString::assign(const char* bytes, size_type byteCount, ByteEncoding enc) {
  UTF16String s;
  AppendBytes(s, bytes, byteCount, enc);
  str_.swap(s);
  return *this;
}
UString& UString::assign(const unsigned char* pascal, ByteEncoding enc) {
  return assign(pascal + 1, pascal[0], enc);
}
UString& UString::assign(const unsigned char* bytes, size_type byteCount, ByteEncoding enc) {
  return assign(reinterpret_cast<const char*>(bytes), byteCount, enc);
}
UString& UString::assign(const std::string& bytes, ByteEncoding enc) {
  return assign(bytes.data(), bytes.size(), enc);
}
UString& UString::assign(const unsigned short* utf16) {
  str_.assign(utf16);
  return *this;
}
UString& UString::assign(const unsigned short* utf16, size_type count) {
  str_.assign(utf16, count);
  return *this;
}
UString& UString::assign(const UTF16String& utf16) {
  str_ = utf16;
  return *this;
}
UString& UString::assign(const UTF32String& utf32) {
  UTF16String s;
  detail::AppendUTF32(s, utf32.data(), utf32.size());
  str_.swap(s);
  return *this;
}
UString& UString::assign(const wchar_t* wide) {
  UTF16String s;
  AppendWide(s, wide, std::wcslen(wide));
  str_.swap(s);
  return *this;
}
UString& UString::assign(const std::wstring& wide) {
  UTF16String s;
  AppendWide(s, wide.data(), wide.size());
  str_.swap(s);
  return *this;
}
UString& UString::assign(size_type count, value_type unit) {
  str_.assign(count, unit);
  return *this;
}
UString& UString::assign(char byte) {
  str_.assign(1, static_cast<unsigned char>(byte));
  return *this;
}
UString& UString::assign(value_type unit) {
  str_.assign(1, unit);
  return *this;
}

// --- appending -------------------------------------------------------------------

UString& UString::append(const UString& other) {
  str_.append(other.str_);
  return *this;
}
UString& UString::append(const UString& other, size_type pos, size_type count) {
  str_.append(other.str_, pos, count);
  return *this;
}
UString& UString::append(const char* bytes, ByteEncoding enc) {
  return append(bytes, std::strlen(bytes), enc);
}
UString& UString::append(const char* bytes, size_type byteCount, ByteEncoding enc) {
  AppendBytes(str_, bytes, byteCount, enc);
  return *this;
}
UString& UString::append(const unsigned char* pascal, ByteEncoding enc) {
  return append(pascal + 1, pascal[0], enc);
}
UString& UString::append(const unsigned char* bytes, size_type byteCount, ByteEncoding enc) {
  return append(reinterpret_cast<const char*>(bytes), byteCount, enc);
}
UString& UString::append(const std::string& bytes, ByteEncoding enc) {
  return append(bytes.data(), bytes.size(), enc);
}
UString& UString::append(const unsigned short* utf16) {
  str_.append(utf16);
  return *this;
}
UString& UString::append(const unsigned short* utf16, size_type count) {
  str_.append(utf16, count);
  return *this;
}
UString& UString::append(const UTF16String& utf16) {
  str_.append(utf16);
  return *this;
}
UString& UString::append(const UTF32String& utf32) {
  detail::AppendUTF32(str_, utf32.data(), utf32.size());
  return *this;
}
UString& UString::append(const wchar_t* wide) {
  AppendWide(str_, wide, std::wcslen(wide));
  return *this;
}
UString& UString::append(const std::wstring& wide) {
  AppendWide(str_, wide.data(), wide.size());
  return *this;
}
UString& UString::append(size_type count, value_type unit) {
  str_.append(count, unit);
  return *this;
}
UString& UString::append(char byte) {
  str_.push_back(static_cast<unsigned char>(byte));
  return *this;
}
UString& UString::append(value_type unit) {
  str_.push_back(unit);
  return *this;
}
UString& UString::append(unsigned int codePoint) {
  detail::AppendCodePoint(str_, codePoint);
  return *this;
}

// --- output ------------------------------------------------------------------------

std::string UString::utf8_str() const { return detail::ToUTF8(str_.data(), str_.size()); }

UTF32String UString::utf32_str() const { return detail::ToUTF32(str_.data(), str_.size()); }

std::wstring UString::wstring() const {
  if constexpr (sizeof(wchar_t) == 2) {
    return std::wstring(str_.begin(), str_.end());
  } else {
    const UTF32String u = utf32_str();
    return std::wstring(u.begin(), u.end());
  }
}

std::string UString::string(ByteEncoding enc, char replacement, bool stopAtNul) const {
  std::size_t n = str_.size();
  if (stopAtNul) n = std::min(n, str_.find(value_type(0)));
  const unsigned short* p = str_.data();
  switch (enc) {
    case kMultipleEncodings:
      return DecodeMultiEncodings(str_);
    case kSystemEncoding:
      return detail::FromCodePage(p, n, 0);
    case kMacRomanEncoding:
      return detail::FromCodePage(p, n, 1);
    case kASCIIEncoding:
      return EncodeBelow(p, n, 0x80, replacement);
    case kUTF8Encoding:
      return detail::ToUTF8(p, n);
    case kLatin1Encoding:
      return EncodeBelow(p, n, 0x100, replacement);
  }
  throw std::invalid_argument("UString: unknown ByteEncoding " + std::to_string(int(enc)));
}

unsigned char* UString::pstring(unsigned char* buffer, int bufferSize, ByteEncoding enc,
                                unsigned char replacement) const {
  if (buffer == nullptr || bufferSize < 1) return buffer;
  const std::string bytes = string(enc, static_cast<char>(replacement));
  const std::size_t limit = static_cast<std::size_t>(std::min(255, bufferSize - 1));
  std::size_t n = std::min(bytes.size(), limit);
  if (enc == kUTF8Encoding && n < bytes.size()) {
    // Back off to the lead byte of a character the limit would split.
    while (n > 0 && (static_cast<unsigned char>(bytes[n]) & 0xC0) == 0x80) --n;
  }
  buffer[0] = static_cast<unsigned char>(n);
  if (n != 0) std::memcpy(buffer + 1, bytes.data(), n);
  return buffer;
}

// --- standard-string operations ----------------------------------------------------

UString& UString::insert(size_type pos, const UString& s) {
  str_.insert(pos, s.str_);
  return *this;
}
UString& UString::insert(size_type pos, const UString& s, size_type subpos, size_type count) {
  str_.insert(pos, s.str_, subpos, count);
  return *this;
}
UString& UString::insert(size_type pos, const unsigned short* utf16) {
  str_.insert(pos, utf16);
  return *this;
}
UString& UString::insert(size_type pos, const unsigned short* utf16, size_type count) {
  str_.insert(pos, utf16, count);
  return *this;
}
UString& UString::insert(size_type pos, size_type count, value_type unit) {
  str_.insert(pos, count, unit);
  return *this;
}
UString::iterator UString::insert(const_iterator where, value_type unit) {
  return str_.insert(where, unit);
}

UString& UString::erase(size_type pos, size_type count) {
  str_.erase(pos, count);
  return *this;
}
UString::iterator UString::erase(const_iterator where) { return str_.erase(where); }
UString::iterator UString::erase(const_iterator first, const_iterator last) {
  return str_.erase(first, last);
}

UString& UString::replace(size_type pos, size_type count, const UString& s) {
  str_.replace(pos, count, s.str_);
  return *this;
}
UString& UString::replace(size_type pos, size_type count, const UString& s, size_type subpos,
                          size_type subcount) {
  str_.replace(pos, count, s.str_, subpos, subcount);
  return *this;
}
UString& UString::replace(size_type pos, size_type count, const unsigned short* utf16,
                          size_type utf16Count) {
  str_.replace(pos, count, utf16, utf16Count);
  return *this;
}
UString& UString::replace(size_type pos, size_type count, size_type unitCount, value_type unit) {
  str_.replace(pos, count, unitCount, unit);
  return *this;
}
UString& UString::replace(const_iterator first, const_iterator last, const UString& s) {
  str_.replace(first, last, s.str_);
  return *this;
}

UString UString::substr(size_type pos, size_type count) const {
  return UString(str_.substr(pos, count));
}

int UString::compare(const UString& other) const noexcept { return str_.compare(other.str_); }

// --- search family -------------------------------------------------------------------

#define TARN_USTRING_SEARCH(name)                                                    \
  UString::size_type UString::name(const UString& s, size_type pos) const noexcept { \
    return str_.name(s.str_, pos);                                                   \
  }                                                                                  \
  UString::size_type UString::name(const std::string& s, size_type pos) const {      \
    return str_.name(Units(s), pos);                                                 \
  }                                                                                  \
  UString::size_type UString::name(const char* s, size_type pos) const {             \
    return str_.name(Units(s), pos);                                                 \
  }                                                                                  \
  UString::size_type UString::name(char c, size_type pos) const noexcept {           \
    return str_.name(static_cast<value_type>(static_cast<unsigned char>(c)), pos);   \
  }                                                                                  \
  UString::size_type UString::name(value_type c, size_type pos) const noexcept {     \
    return str_.name(c, pos);                                                        \
  }

TARN_USTRING_SEARCH(find)
TARN_USTRING_SEARCH(rfind)
TARN_USTRING_SEARCH(find_first_of)
TARN_USTRING_SEARCH(find_first_not_of)
TARN_USTRING_SEARCH(find_last_of)
TARN_USTRING_SEARCH(find_last_not_of)

#undef TARN_USTRING_SEARCH

// --- free operators --------------------------------------------------------------------

UString operator+(const UString& a, const UString& b) {
  UString r;
  r.reserve(a.length() + b.length());
  r.append(a);
  r.append(b);
  return r;
}

UString operator+(UString&& a, const UString& b) {
  a.append(b);
  return std::move(a);
}

std::ostream& operator<<(std::ostream& os, const UString& s) { return os << s.utf8_str(); }

}  // namespace tarn
