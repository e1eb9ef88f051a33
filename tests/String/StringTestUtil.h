// Shared helpers for the string tests: unit vectors, byte strings, time zones.
#pragma once
#include <stdlib.h>
#include <time.h>

#include <initializer_list>
#include <sstream>
#include <string>
#include <tuple>
#include <vector>

#include "tarn/String/UString.h"

namespace tarn::test {

using Units = std::vector<unsigned short>;
// A table of test rows, read with a structured binding.
template <typename... Columns>
using Rows = std::vector<std::tuple<Columns...>>;

inline Units UnitsOf(const UString& s) { return Units(s.begin(), s.end()); }
inline UString FromUnits(Units u) { return UString(u.data(), u.size()); }
inline std::string Bytes(std::initializer_list<int> b) { return std::string(b.begin(), b.end()); }
inline std::string AllBytes() {
  std::string s;
  for (int b = 0; b < 256; ++b) s.push_back(static_cast<char>(b));
  return s;
}

// The pieces of `text` between separators, read as UTF-8.
inline std::vector<UString> Split(const std::string& text, char separator = ' ') {
  std::istringstream in(text);
  std::vector<UString> out;
  for (std::string piece; std::getline(in, piece, separator);) out.push_back(UString(piece));
  return out;
}

// Sets the process time zone (a TZ value such as "UTC0" or "EST5").
inline void SetTimeZone(const char* tz) {
#ifdef _WIN32
  _putenv_s("TZ", tz);
  _tzset();
#else
  setenv("TZ", tz, 1);
  tzset();
#endif
}

}  // namespace tarn::test
