// Character traits for the library's UTF-16 and UTF-32 code-unit strings.
//
// std::char_traits is only specified for the standard character types, so the
// string storage of UString (unsigned short units) and its UTF-32 form
// (unsigned int units) use these traits instead. Ordering is plain code-unit
// value order.
#pragma once

#include <cstddef>
#include <cstring>
#include <ios>
#include <string>
#include <type_traits>

namespace tarn {

template <typename CharT>
struct UTraits {
  static_assert(std::is_unsigned_v<CharT> && sizeof(CharT) >= 2,
                "UTraits is meant for unsigned 16- and 32-bit code units");

  using char_type = CharT;
  using int_type = unsigned long long;
  using off_type = std::streamoff;
  using pos_type = std::streampos;
  using state_type = std::mbstate_t;

  static constexpr void assign(char_type& r, const char_type& a) noexcept { r = a; }
  static constexpr bool eq(char_type a, char_type b) noexcept { return a == b; }
  static constexpr bool lt(char_type a, char_type b) noexcept { return a < b; }

  static constexpr int compare(const char_type* a, const char_type* b, std::size_t n) noexcept {
    for (std::size_t i = 0; i < n; ++i) {
      if (a[i] != b[i]) return a[i] < b[i] ? -1 : 1;
    }
    return 0;
  }
  static constexpr std::size_t length(const char_type* s) noexcept {
    std::size_t n = 0;
    while (s[n] != 0) ++n;
    return n;
  }
  static constexpr const char_type* find(const char_type* s, std::size_t n,
                                         const char_type& c) noexcept {
    for (std::size_t i = 0; i < n; ++i) {
      if (s[i] == c) return s + i;
    }
    return nullptr;
  }
  static char_type* move(char_type* d, const char_type* s, std::size_t n) noexcept {
    if (n != 0) std::memmove(d, s, n * sizeof(char_type));
    return d;
  }
  static char_type* copy(char_type* d, const char_type* s, std::size_t n) noexcept {
    if (n != 0) std::memcpy(d, s, n * sizeof(char_type));
    return d;
  }
  static constexpr char_type* assign(char_type* d, std::size_t n, char_type c) noexcept {
    for (std::size_t i = 0; i < n; ++i) d[i] = c;
    return d;
  }

  static constexpr char_type to_char_type(int_type i) noexcept { return static_cast<char_type>(i); }
  static constexpr int_type to_int_type(char_type c) noexcept { return c; }
  static constexpr bool eq_int_type(int_type a, int_type b) noexcept { return a == b; }
  static constexpr int_type eof() noexcept { return ~0ULL; }
  static constexpr int_type not_eof(int_type i) noexcept { return i == eof() ? 0 : i; }
};

using UTF16String = std::basic_string<unsigned short, UTraits<unsigned short>>;
using UTF32String = std::basic_string<unsigned int, UTraits<unsigned int>>;

}  // namespace tarn
