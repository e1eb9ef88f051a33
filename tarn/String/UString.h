// UString: the library's one string type.
//
// A UString holds UTF-16 code units; every index, length and position counts
// code units, and npos means "not found" or "to the end", as in std::string.
// The buffer always ends in a 0 unit (get_internal_utf16()).
//
// Byte strings convert through ByteEncoding:
//   kSystemEncoding (0)    the ANSI code page; Windows-1252 on POSIX so that a
//                          byte string reads the same on every platform
//   kMacRomanEncoding (1)  Mac Roman (code page 10000)
//   kASCIIEncoding (2)     input: each byte is one unit; output: units below
//                          128 are kept, every other unit becomes the caller's
//                          replacement byte
//   kUTF8Encoding (3)      UTF-8
//   kLatin1Encoding (4)    ISO-8859-1: each byte is the code point U+0000..U+00FF;
//                          on output, units above 0xFF become the replacement byte
//   kMultipleEncodings (999) read as kSystemEncoding; written by string() and
//                          pstring() as an empty byte string
// Conversions never throw for unconvertible characters: encodings 0 and 1 use
// the platform's substitution ('?'), 2 and 4 the caller's replacement byte.
// Malformed UTF-8, unpaired surrogates and UTF-32 values outside Unicode become
// U+FFFD (UTF-8 EF BF BD) in every direction. Byte-string sources default to
// UTF-8; a single char is taken as one ISO-8859-1 byte.
//
// Index errors throw std::out_of_range as std::basic_string does; allocation
// failure propagates. An unknown ByteEncoding value throws std::invalid_argument.
// A UString is a value type: distinct objects may be used from different
// threads; one object is not synchronised.
//
// Comparison: operator== and operator<=> compare code units (cheap, total
// order, suitable for map keys). equal()/less()/Compare() take CompareFlags:
//   kIgnoreCase (1, also 64)  ignore case
//   kIgnoreNonSpace (2)       ignore non-spacing marks (accents)
//   kLibraryCompare (32)      the library's natural ordering instead of the
//                             system locale's: runs of ASCII digits compare by
//                             numeric value ("file2" < "file10"), other units
//                             by code unit after the case/accent folding
//                             requested; equal values with different numbers of
//                             leading zeros order the shorter run first.
// Without kLibraryCompare the system's locale collation is used.
#pragma once

#include <compare>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <iosfwd>
#include <sstream>
#include <string>

#include "tarn/String/UTraits.h"

namespace tarn {

class UString {
 public:
  using value_type = unsigned short;
  using string_type = UTF16String;
  using size_type = std::size_t;
  using difference_type = std::ptrdiff_t;
  using reference = value_type&;
  using const_reference = const value_type&;
  using iterator = string_type::iterator;
  using const_iterator = string_type::const_iterator;
  using reverse_iterator = string_type::reverse_iterator;
  using const_reverse_iterator = string_type::const_reverse_iterator;

  static constexpr size_type npos = static_cast<size_type>(-1);

  enum ByteEncoding : int {
    kSystemEncoding = 0,
    kMacRomanEncoding = 1,
    kASCIIEncoding = 2,
    kUTF8Encoding = 3,
    kLatin1Encoding = 4,
    kMultipleEncodings = 999,
  };

  enum CompareFlags : unsigned {
    kCompareDefault = 0,
    kIgnoreCase = 1,
    kIgnoreNonSpace = 2,
    kLibraryCompare = 32,
    kIgnoreCaseAlt = 64,
  };

  // Collects streamed numbers and texts and writes them into the target when
  // destroyed (replacing its text, or appending when `append` is true):
  //   UString s;
  //   { UString::FormattedStreamProxy(s) << "Take " << 12 << ", " << 0.5; }
  // Narrow texts streamed in are read as UTF-8.
  class FormattedStreamProxy {
   public:
    explicit FormattedStreamProxy(UString& target, bool append = false);
    ~FormattedStreamProxy();
    FormattedStreamProxy(const FormattedStreamProxy&) = delete;
    FormattedStreamProxy& operator=(const FormattedStreamProxy&) = delete;

    template <typename T>
    FormattedStreamProxy& operator<<(const T& value) {
      stream_ << value;
      return *this;
    }
    FormattedStreamProxy& operator<<(const UString& text);

   private:
    UString& target_;
    bool append_;
    std::ostringstream stream_;
  };

  // --- construction -------------------------------------------------------
  UString() noexcept = default;
  UString(const UString&) = default;
  UString(UString&&) noexcept = default;
  UString& operator=(const UString&) = default;
  UString& operator=(UString&&) noexcept = default;
  ~UString() = default;

  UString(const UString& other, size_type pos, size_type count = npos);
  UString(const char* bytes, ByteEncoding enc = kUTF8Encoding);
  UString(const char* bytes, size_type byteCount, ByteEncoding enc = kUTF8Encoding);
  // A Pascal string: a length byte, then that many bytes.
  UString(const unsigned char* pascal, ByteEncoding enc = kUTF8Encoding);
  UString(const unsigned char* bytes, size_type byteCount, ByteEncoding enc = kUTF8Encoding);
  UString(const std::string& bytes, ByteEncoding enc = kUTF8Encoding);
  UString(const unsigned short* utf16);
  UString(const unsigned short* utf16, size_type count);
  UString(const UTF16String& utf16);
  UString(UTF16String&& utf16) noexcept;
  UString(const UTF32String& utf32);
  UString(const wchar_t* wide);
  UString(const std::wstring& wide);
  UString(size_type count, value_type unit);
  explicit UString(char byte);
  explicit UString(value_type unit);

  UString& operator=(const char* bytes);
  UString& operator=(const std::string& bytes);
  UString& operator=(const unsigned short* utf16);
  UString& operator=(const UTF16String& utf16);
  UString& operator=(const UTF32String& utf32);
  UString& operator=(const wchar_t* wide);
  UString& operator=(const std::wstring& wide);
  UString& operator=(char byte);
  UString& operator=(value_type unit);

  UString& assign(const UString& other);
  UString& assign(const UString& other, size_type pos, size_type count = npos);
  UString& assign(const char* bytes, ByteEncoding enc = kUTF8Encoding);
  UString& assign(const char* bytes, size_type byteCount, ByteEncoding enc = kUTF8Encoding);
  UString& assign(const unsigned char* pascal, ByteEncoding enc = kUTF8Encoding);
  UString& assign(const unsigned char* bytes, size_type byteCount,
                  ByteEncoding enc = kUTF8Encoding);
  UString& assign(const std::string& bytes, ByteEncoding enc = kUTF8Encoding);
  UString& assign(const unsigned short* utf16);
  UString& assign(const unsigned short* utf16, size_type count);
  UString& assign(const UTF16String& utf16);
  UString& assign(const UTF32String& utf32);
  UString& assign(const wchar_t* wide);
  UString& assign(const std::wstring& wide);
  UString& assign(size_type count, value_type unit);
  UString& assign(char byte);
  UString& assign(value_type unit);

  // --- appending ------------------------------------------------------------
  UString& append(const UString& other);
  UString& append(const UString& other, size_type pos, size_type count = npos);
  UString& append(const char* bytes, ByteEncoding enc = kUTF8Encoding);
  UString& append(const char* bytes, size_type byteCount, ByteEncoding enc = kUTF8Encoding);
  UString& append(const unsigned char* pascal, ByteEncoding enc = kUTF8Encoding);
  UString& append(const unsigned char* bytes, size_type byteCount,
                  ByteEncoding enc = kUTF8Encoding);
  UString& append(const std::string& bytes, ByteEncoding enc = kUTF8Encoding);
  UString& append(const unsigned short* utf16);
  UString& append(const unsigned short* utf16, size_type count);
  UString& append(const UTF16String& utf16);
  UString& append(const UTF32String& utf32);
  UString& append(const wchar_t* wide);
  UString& append(const std::wstring& wide);
  UString& append(size_type count, value_type unit);
  UString& append(char byte);               // one ISO-8859-1 byte
  UString& append(value_type unit);         // one UTF-16 unit, as is
  UString& append(unsigned int codePoint);  // one or two units; invalid -> U+FFFD

  UString& operator+=(const UString& other) { return append(other); }
  UString& operator+=(const char* bytes) { return append(bytes); }
  UString& operator+=(const std::string& bytes) { return append(bytes); }
  UString& operator+=(const unsigned short* utf16) { return append(utf16); }
  UString& operator+=(const UTF16String& utf16) { return append(utf16); }
  UString& operator+=(const UTF32String& utf32) { return append(utf32); }
  UString& operator+=(const wchar_t* wide) { return append(wide); }
  UString& operator+=(const std::wstring& wide) { return append(wide); }
  UString& operator+=(char byte) { return append(byte); }
  UString& operator+=(value_type unit) { return append(unit); }
  UString& operator+=(unsigned int codePoint) { return append(codePoint); }

  void push_back(value_type unit) { str_.push_back(unit); }

  // --- output ---------------------------------------------------------------
  [[nodiscard]] std::string utf8_str() const;
  [[nodiscard]] UTF32String utf32_str() const;
  [[nodiscard]] std::wstring wstring() const;
  // The text as bytes in `enc`. With `stopAtNul`, output ends before the first
  // 0 unit, so the result is safe to hand on as a C string.
  [[nodiscard]] std::string string(ByteEncoding enc = kUTF8Encoding, char replacement = '?',
                                   bool stopAtNul = false) const;
  // Writes a Pascal string (length byte, then the bytes) into `buffer` and
  // returns it. At most min(255, bufferSize - 1) bytes are stored; UTF-8 is
  // never cut inside a character. bufferSize < 1 or a null buffer writes
  // nothing and returns buffer.
  unsigned char* pstring(unsigned char* buffer, int bufferSize, ByteEncoding enc = kUTF8Encoding,
                         unsigned char replacement = '?') const;

  [[nodiscard]] const unsigned short* get_internal_utf16() const noexcept { return str_.c_str(); }
  [[nodiscard]] const unsigned short* c_str() const noexcept { return str_.c_str(); }
  [[nodiscard]] const unsigned char* data() const noexcept {
    return reinterpret_cast<const unsigned char*>(str_.data());
  }
  [[nodiscard]] size_type data_size() const noexcept { return str_.size() * sizeof(value_type); }
  [[nodiscard]] const string_type& utf16_str() const noexcept { return str_; }

  // --- standard-string operations (UTF-16 units) ----------------------------
  [[nodiscard]] size_type length() const noexcept { return str_.length(); }
  [[nodiscard]] size_type size() const noexcept { return str_.size(); }
  [[nodiscard]] bool empty() const noexcept { return str_.empty(); }
  [[nodiscard]] size_type capacity() const noexcept { return str_.capacity(); }
  void reserve(size_type n) { str_.reserve(n); }
  void clear() noexcept { str_.clear(); }
  void resize(size_type n) { str_.resize(n); }
  void resize(size_type n, value_type unit) { str_.resize(n, unit); }
  void resize(size_type n, char byte) { str_.resize(n, static_cast<unsigned char>(byte)); }

  [[nodiscard]] reference at(size_type i) { return str_.at(i); }
  [[nodiscard]] const_reference at(size_type i) const { return str_.at(i); }
  [[nodiscard]] reference operator[](size_type i) noexcept { return str_[i]; }
  [[nodiscard]] const_reference operator[](size_type i) const noexcept { return str_[i]; }
  [[nodiscard]] reference front() { return str_.front(); }
  [[nodiscard]] const_reference front() const { return str_.front(); }
  [[nodiscard]] reference back() { return str_.back(); }
  [[nodiscard]] const_reference back() const { return str_.back(); }

  [[nodiscard]] iterator begin() noexcept { return str_.begin(); }
  [[nodiscard]] iterator end() noexcept { return str_.end(); }
  [[nodiscard]] const_iterator begin() const noexcept { return str_.begin(); }
  [[nodiscard]] const_iterator end() const noexcept { return str_.end(); }
  [[nodiscard]] const_iterator cbegin() const noexcept { return str_.cbegin(); }
  [[nodiscard]] const_iterator cend() const noexcept { return str_.cend(); }
  [[nodiscard]] reverse_iterator rbegin() noexcept { return str_.rbegin(); }
  [[nodiscard]] reverse_iterator rend() noexcept { return str_.rend(); }
  [[nodiscard]] const_reverse_iterator rbegin() const noexcept { return str_.rbegin(); }
  [[nodiscard]] const_reverse_iterator rend() const noexcept { return str_.rend(); }

  UString& insert(size_type pos, const UString& s);
  UString& insert(size_type pos, const UString& s, size_type subpos, size_type count = npos);
  UString& insert(size_type pos, const unsigned short* utf16);
  UString& insert(size_type pos, const unsigned short* utf16, size_type count);
  UString& insert(size_type pos, size_type count, value_type unit);
  iterator insert(const_iterator where, value_type unit);

  UString& erase(size_type pos = 0, size_type count = npos);
  iterator erase(const_iterator where);
  iterator erase(const_iterator first, const_iterator last);

  UString& replace(size_type pos, size_type count, const UString& s);
  UString& replace(size_type pos, size_type count, const UString& s, size_type subpos,
                   size_type subcount = npos);
  UString& replace(size_type pos, size_type count, const unsigned short* utf16,
                   size_type utf16Count);
  UString& replace(size_type pos, size_type count, size_type unitCount, value_type unit);
  UString& replace(const_iterator first, const_iterator last, const UString& s);

  [[nodiscard]] UString substr(size_type pos = 0, size_type count = npos) const;
  void swap(UString& other) noexcept { str_.swap(other.str_); }
  void pop_back() { str_.pop_back(); }

  // Search family. Narrow-string arguments are read as ASCII (each byte one unit).
  [[nodiscard]] size_type find(const UString& s, size_type pos = 0) const noexcept;
  [[nodiscard]] size_type find(const std::string& s, size_type pos = 0) const;
  [[nodiscard]] size_type find(const char* s, size_type pos = 0) const;
  [[nodiscard]] size_type find(char c, size_type pos = 0) const noexcept;
  [[nodiscard]] size_type find(value_type c, size_type pos = 0) const noexcept;
  [[nodiscard]] size_type rfind(const UString& s, size_type pos = npos) const noexcept;
  [[nodiscard]] size_type rfind(const std::string& s, size_type pos = npos) const;
  [[nodiscard]] size_type rfind(const char* s, size_type pos = npos) const;
  [[nodiscard]] size_type rfind(char c, size_type pos = npos) const noexcept;
  [[nodiscard]] size_type rfind(value_type c, size_type pos = npos) const noexcept;
  [[nodiscard]] size_type find_first_of(const UString& s, size_type pos = 0) const noexcept;
  [[nodiscard]] size_type find_first_of(const std::string& s, size_type pos = 0) const;
  [[nodiscard]] size_type find_first_of(const char* s, size_type pos = 0) const;
  [[nodiscard]] size_type find_first_of(char c, size_type pos = 0) const noexcept;
  [[nodiscard]] size_type find_first_of(value_type c, size_type pos = 0) const noexcept;
  [[nodiscard]] size_type find_first_not_of(const UString& s, size_type pos = 0) const noexcept;
  [[nodiscard]] size_type find_first_not_of(const std::string& s, size_type pos = 0) const;
  [[nodiscard]] size_type find_first_not_of(const char* s, size_type pos = 0) const;
  [[nodiscard]] size_type find_first_not_of(char c, size_type pos = 0) const noexcept;
  [[nodiscard]] size_type find_first_not_of(value_type c, size_type pos = 0) const noexcept;
  [[nodiscard]] size_type find_last_of(const UString& s, size_type pos = npos) const noexcept;
  [[nodiscard]] size_type find_last_of(const std::string& s, size_type pos = npos) const;
  [[nodiscard]] size_type find_last_of(const char* s, size_type pos = npos) const;
  [[nodiscard]] size_type find_last_of(char c, size_type pos = npos) const noexcept;
  [[nodiscard]] size_type find_last_of(value_type c, size_type pos = npos) const noexcept;
  [[nodiscard]] size_type find_last_not_of(const UString& s, size_type pos = npos) const noexcept;
  [[nodiscard]] size_type find_last_not_of(const std::string& s, size_type pos = npos) const;
  [[nodiscard]] size_type find_last_not_of(const char* s, size_type pos = npos) const;
  [[nodiscard]] size_type find_last_not_of(char c, size_type pos = npos) const noexcept;
  [[nodiscard]] size_type find_last_not_of(value_type c, size_type pos = npos) const noexcept;

  // --- comparison -------------------------------------------------------------
  // Plain code-unit comparison: <0, 0, >0.
  [[nodiscard]] int compare(const UString& other) const noexcept;
  // Three-way comparison under `flags` (see the top of this file): -1, 0 or 1.
  [[nodiscard]] int Compare(const UString& other, CompareFlags flags) const;
  [[nodiscard]] bool equal(const UString& other, CompareFlags flags = kCompareDefault) const {
    return Compare(other, flags) == 0;
  }
  [[nodiscard]] bool less(const UString& other, CompareFlags flags = kCompareDefault) const {
    return Compare(other, flags) < 0;
  }

  friend bool operator==(const UString& a, const UString& b) noexcept { return a.str_ == b.str_; }
  friend std::strong_ordering operator<=>(const UString& a, const UString& b) noexcept {
    const int c = a.compare(b);
    return c < 0 ? std::strong_ordering::less
                 : (c > 0 ? std::strong_ordering::greater : std::strong_ordering::equal);
  }
  friend bool operator<(const UString& a, const UString& b) noexcept { return a.compare(b) < 0; }

 private:
  string_type str_;
};

constexpr UString::CompareFlags operator|(UString::CompareFlags a, UString::CompareFlags b) {
  return static_cast<UString::CompareFlags>(static_cast<unsigned>(a) | static_cast<unsigned>(b));
}

// A shared empty string, for functions that return a reference to "nothing".
extern const UString kEmptyString;

[[nodiscard]] UString operator+(const UString& a, const UString& b);
[[nodiscard]] UString operator+(UString&& a, const UString& b);

// Writes the text as UTF-8.
std::ostream& operator<<(std::ostream& os, const UString& s);

}  // namespace tarn

template <>
struct std::hash<tarn::UString> {
  std::size_t operator()(const tarn::UString& s) const noexcept {
    // 64-bit FNV-1a over the code units.
    std::uint64_t h = 14695981039346656037ULL;
    for (unsigned short u : s) {
      h ^= u;
      h *= 1099511628211ULL;
    }
    return static_cast<std::size_t>(h);
  }
};

#include "tarn/String/UStringFunctions.h"
