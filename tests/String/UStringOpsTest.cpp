// Standard-string operations, the search family, the stream proxy and ParamUString.
#include <gtest/gtest.h>

#include <functional>
#include <sstream>
#include <stdexcept>
#include <unordered_map>
#include <utility>
#include <vector>

#include "String/StringTestUtil.h"
#include "tarn/String/ParamUString.h"

namespace tarn {
namespace {

using Unit = unsigned short;

TEST(UStringOps, ConstructAppendAndEdit) {
  const Unit units[] = {'H', 'e', 'l', 'l', 'o', 0};
  UString s(units, 2);
  s.append("a").append(std::string("b")).append(UString("xcx"), 1, 1).append(L"d");
  s += 'e';
  s.append(2, Unit('h'));
  s.insert(0, UString(">>"));
  s.insert(s.length(), UString("!?"), 0, 1);
  s.insert(2, 2, Unit(' '));
  EXPECT_EQ(s, UString(">>  Heabcdehh!"));
  s.erase(0, 4);
  s.erase(s.begin() + 9);
  s.replace(0, 1, UString("Je"));
  s.replace(s.begin(), s.begin() + 1, UString("B"));
  s.replace(2, 7, 2, Unit('z'));
  EXPECT_EQ(s, UString("Bezzh"));
  EXPECT_EQ(UString(s, 1, 2) + s.substr(5), UString("ez"));
  EXPECT_THROW((void)s.substr(6), std::out_of_range);
  EXPECT_THROW(s.insert(9, UString("x")), std::out_of_range);
  EXPECT_THROW(UString(s, 6), std::out_of_range);
}

// Every way in of the same text, a, e acute and a character outside the
// basic plane (a surrogate pair), gives the same units; null pointers read as
// nothing.
TEST(UStringOps, EveryFormOfTheSameTextIsEqual) {
  const UString text("a\xC3\xA9\xF0\x9D\x84\x9E");
  const char* utf8 = "a\xC3\xA9\xF0\x9D\x84\x9E";
  const auto* bytes = reinterpret_cast<const unsigned char*>(utf8);
  const unsigned char pascal[] = {7, 'a', 0xC3, 0xA9, 0xF0, 0x9D, 0x84, 0x9E};
  const Unit utf16[] = {'a', 0xE9, 0xD834, 0xDD1E, 0};
  const UTF16String u16(utf16);
  const UTF32String u32{'a', 0xE9, 0x1D11E};
  const wchar_t* wide = L"a\u00E9\U0001D11E";
  const Unit* const noUnits = nullptr;
  const std::vector<std::pair<const char*, std::function<UString()>>> forms = {
      {"unsigned bytes", [&] { return UString(bytes, 7); }},
      {"std::string", [&] { return UString(std::string(utf8)); }},
      {"units", [&] { return UString(utf16); }},
      {"UTF16String", [&] { return UString(u16); }},
      {"moved UTF16String", [&] { return UString(UTF16String(u16)); }},
      {"UTF32String", [&] { return UString(u32); }},
      {"wide", [&] { return UString(wide); }},
      {"std::wstring", [&] { return UString(std::wstring(wide)); }},
      {"= bytes", [&] { return UString() = utf8; }},
      {"= std::string", [&] { return UString() = std::string(utf8); }},
      {"= units", [&] { return UString() = utf16; }},
      {"= UTF16String", [&] { return UString() = u16; }},
      {"= UTF32String", [&] { return UString() = u32; }},
      {"= wide", [&] { return UString() = wide; }},
      {"= std::wstring", [&] { return UString() = std::wstring(wide); }},
      {"assign part", [&] { return UString().assign(UString("<") + text + UString(">"), 1, 4); }},
      {"assign Pascal", [&] { return UString().assign(pascal); }},
      {"append Pascal", [&] { return UString().append(pascal + 1, 1).append(pascal + 2, 6); }},
      {"append whole Pascal", [&] { return UString().append(pascal); }},
      {"append std::string", [&] { return UString("a").append(std::string(utf8 + 1)); }},
      {"append units", [&] { return UString("a").append(utf16 + 1).append(noUnits); }},
      {"append counted units", [&] { return UString("a").append(utf16 + 1, 3); }},
      {"append UTF16String", [&] { return UString("a").append(u16.substr(1)); }},
      {"append UTF32String", [&] { return UString("a").append(u32.substr(1)); }},
      {"append wide", [&] { return UString("a").append(wide + 1); }},
      {"append std::wstring", [&] { return UString("a").append(std::wstring(wide + 1)); }},
      {"+", [&] { return UString("a\xC3\xA9") + UString(utf16 + 2); }},
      {"insert units", [&] { return UString("a").insert(1, utf16 + 1); }},
      {"insert counted units", [&] { return UString("a\xC3\xA9").insert(2, utf16 + 2, 2); }},
      {"insert at iterator",
       [&] {
         UString s("a\xC3\xA9");
         s.insert(s.end(), Unit{0xD834});
         return s.insert(3, 1, Unit{0xDD1E});
       }},
      {"erase range",
       [&] {
         UString s = text + UString("xyz");
         s.erase(s.begin() + 4, s.end());
         return s;
       }},
      {"replace part",
       [&] {
         return UString("a?").replace(1, 1, UString("<\xC3\xA9>"), 1, 1) + UString(utf16 + 2);
       }},
      {"replace units", [&] { return UString("a??").replace(1, 2, utf16 + 1, 3); }},
  };
  for (const auto& [name, make] : forms)
    EXPECT_EQ(test::UnitsOf(make()), test::UnitsOf(text)) << name;
  const std::vector<std::pair<UString, test::Units>> units = {
      {UString(noUnits), {}},
      {UString(3, Unit{0xE9}), {0xE9, 0xE9, 0xE9}},
      {UString('\xE9'), {0xE9}},
      {UString(Unit{0xD834}), {0xD834}},
      {UString() = '\xE9', {0xE9}},
      {UString() = Unit{0xDD1E}, {0xDD1E}},
      {UString("x").assign(2, Unit{'y'}), {'y', 'y'}},
      {UString("x").append(static_cast<const unsigned char*>(nullptr)), {'x'}},
  };
  for (const auto& [s, expected] : units) EXPECT_EQ(test::UnitsOf(s), expected);
}

// Narrow arguments are byte-for-unit: 0xE9 finds U+00E9.
TEST(UStringOps, SearchHashAndStreams) {
  const UString s("abcabc\xC3\xA9");
  EXPECT_EQ(s.find(UString("bc")), 1u);
  EXPECT_EQ(s.find(std::string("bc"), 2), 4u);
  EXPECT_EQ(s.rfind("ab", 2), 0u);
  EXPECT_EQ(s.find_first_of(std::string("c"), 3), 5u);
  EXPECT_EQ(s.find_first_not_of("ab"), 2u);
  EXPECT_EQ(s.find_last_of('a', 2), 0u);
  EXPECT_EQ(s.find_last_not_of(Unit(0xE9)), 5u);
  EXPECT_EQ(s.find('\xE9'), 6u);
  std::unordered_map<UString, int> m = {{UString("one"), 1}};
  EXPECT_EQ(++m[UString(L"one")], 2);
  EXPECT_NE(std::hash<UString>{}(UString("ab")), std::hash<UString>{}(UString("ba")));
  UString text("old");
  { UString::FormattedStreamProxy(text) << "Take " << 12 << ", " << 0.5 << UString("\xC3\xA9"); }
  { UString::FormattedStreamProxy(text, true) << '!' << -3; }
  EXPECT_EQ(text, UString("Take 12, 0.5\xC3\xA9!-3"));
  std::ostringstream os;
  os << UString("\xC3\xA9");
  EXPECT_EQ(os.str(), "\xC3\xA9");
}

const std::string kWhat = "invalid vector<T> subscript";

// The substituted text, or the what() text of the exception GetString throws.
std::string Text(const ParamUString& p) {
  try {
    return p.GetString().utf8_str();
  } catch (const std::out_of_range& e) {
    return e.what();
  }
}

TEST(ParamUString, SubstitutesOrThrowsAndChangesNothing) {
  for (const auto& [format, params, want] :
       test::Rows<const char*, std::vector<const char*>, std::string>{
           {"%1 of %0%0", {"a", "b"}, "b of aa"},
           {"%0", {""}, ""},
           {"%0%1", {"x"}, kWhat},
           {"\xC3\xA9%0\xF0\x9F\x8E\xB5", {"\xE2\x82\xAC"}, "\xC3\xA9\xE2\x82\xAC\xF0\x9F\x8E\xB5"},
           {"100%%", {}, "100%"},
           {"%%0", {"x"}, "%0"},
           {"[%0] [%1]", {"%1 %0 %%", "%"}, "[%1 %0 %%] [%]"},  // parameters are literal
           {"%0%1", {"%", "1"}, "%1"},
           {"%", {"a"}, kWhat},
           {"%0", {}, kWhat},
           {"%/", {"x"}, kWhat},  // '0' - 1
           {"%:", {"x"}, kWhat},  // '9' + 1
           {"%0 and %3", {"x"}, kWhat}}) {
    ParamUString p{UString(format)};
    for (std::size_t i = 0; i < params.size(); ++i) p.SetParameterAtIndex(i, UString(params[i]));
    EXPECT_EQ(Text(p), want) << format;
    EXPECT_EQ(p.GetFormat(), UString(format));
    EXPECT_EQ(p.GetParameters().size(), params.size());
  }
}

// With 60 parameters every digit names its own and a letter still names none.
TEST(ParamUString, SettingParametersEveryDigitAndNoLetter) {
  ParamUString p;
  for (int i = 59; i >= 0; --i) p.SetParameterAtIndex(i, UString(std::to_string(i)));
  for (char d = '0'; d <= '9'; ++d) {
    p.SetFormat(UString(std::string("<%") + d + ">"));
    EXPECT_EQ(Text(p), std::string("<") + d + ">");
  }
  p.SetFormat(UString("%a"));
  EXPECT_EQ(Text(p), kWhat);
  p = ParamUString(UString("%0|%1|%2|%3"));
  p.SetParameterAtIndex(3, UString("x"));
  EXPECT_EQ(Text(p), "|||x");
  p.SetParameters("a", "b", "c", "d", "e", "f");  // replaces the whole list
  EXPECT_EQ(Text(p), "a|b|c|d");
  EXPECT_EQ(Text(ParamUString(UString("%1%0"), "x", UString("y"))), "yx");
}

}  // namespace
}  // namespace tarn
