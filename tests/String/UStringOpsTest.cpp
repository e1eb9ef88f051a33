// Standard-string operations, the search family, sub-ranges and the stream proxy.
#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <unordered_map>

#include "tarn/String/UString.h"

namespace tarn {
namespace {

TEST(UStringOps, StorageIsTerminatedUTF16) {
  const UString s("abc");
  const unsigned short* p = s.get_internal_utf16();
  EXPECT_EQ(p[0], 'a');
  EXPECT_EQ(p[3], 0);
  EXPECT_EQ(s.data_size(), 6u);
  EXPECT_EQ(s.data(), reinterpret_cast<const unsigned char*>(p));
  EXPECT_TRUE(kEmptyString.empty());
  EXPECT_EQ(kEmptyString.get_internal_utf16()[0], 0);
  EXPECT_EQ(UString::npos, static_cast<std::size_t>(-1));
}

TEST(UStringOps, ConstructionFromEverySource) {
  const UString hello("Hello");
  EXPECT_EQ(UString(hello, 1, 3), UString("ell"));
  EXPECT_EQ(UString(hello, 2), UString("llo"));
  EXPECT_THROW(UString(hello, 6), std::out_of_range);
  EXPECT_EQ(UString("Hello, world", 5), hello);
  EXPECT_EQ(UString(std::string("Hello")), hello);
  const unsigned short units[] = {'H', 'e', 'l', 'l', 'o', 0};
  EXPECT_EQ(UString(units), hello);
  EXPECT_EQ(UString(units, 2), UString("He"));
  EXPECT_EQ(UString(UTF16String(units)), hello);
  EXPECT_EQ(UString(L"Hello"), hello);
  EXPECT_EQ(UString('x'), UString("x"));
  EXPECT_EQ(UString(static_cast<unsigned short>(0x20AC)).length(), 1u);
  EXPECT_EQ(UString(3, static_cast<unsigned short>('z')), UString("zzz"));

  UString s;
  s = "abc";
  EXPECT_EQ(s, UString("abc"));
  s = std::wstring(L"w");
  EXPECT_EQ(s, UString("w"));
  s = 'q';
  EXPECT_EQ(s, UString("q"));
  s.assign(hello, 3, UString::npos);
  EXPECT_EQ(s, UString("lo"));
  s.assign("\xE9", UString::kLatin1Encoding);
  EXPECT_EQ(s[0], 0xE9);
}

TEST(UStringOps, AppendFromEverySource) {
  UString s;
  s.append("a").append(std::string("b")).append(UString("xcx"), 1, 1).append(L"d");
  s += 'e';
  s += static_cast<unsigned short>('f');
  s += UString("g");
  s.append(2, static_cast<unsigned short>('h'));
  EXPECT_EQ(s, UString("abcdefghh"));
  EXPECT_EQ(UString("ab") + "cd" + UString("e") + std::string("f"), UString("abcdef"));
  EXPECT_EQ("x" + UString("y"), UString("xy"));
}

TEST(UStringOps, EditingOperations) {
  UString s("Hello");
  s.insert(0, UString(">>"));
  s.insert(s.length(), UString("!?"), 0, 1);
  s.insert(2, 2, static_cast<unsigned short>(' '));
  EXPECT_EQ(s, UString(">>  Hello!"));
  s.insert(s.begin(), static_cast<unsigned short>('['));
  EXPECT_EQ(s.front(), '[');
  s.erase(0, 5);
  EXPECT_EQ(s, UString("Hello!"));
  s.erase(s.begin() + 5);
  s.erase(s.begin(), s.begin() + 1);
  EXPECT_EQ(s, UString("ello"));
  s.replace(0, 1, UString("Je"));
  EXPECT_EQ(s, UString("Jello"));
  s.replace(1, 4, 3, static_cast<unsigned short>('a'));
  EXPECT_EQ(s, UString("Jaaa"));
  s.replace(s.begin(), s.begin() + 1, UString("B"));
  EXPECT_EQ(s, UString("Baaa"));
  s.pop_back();
  s.resize(5);
  EXPECT_EQ(s.length(), 5u);
  EXPECT_EQ(s[4], 0);
  s.resize(2);
  s.resize(4, 'c');
  s.resize(5, static_cast<unsigned short>('d'));
  EXPECT_EQ(s, UString("Baccd"));
  EXPECT_EQ(s.substr(1, 2), UString("ac"));
  EXPECT_EQ(s.substr(5), UString());
  EXPECT_THROW((void)s.substr(6), std::out_of_range);
  EXPECT_THROW((void)s.at(5), std::out_of_range);
  EXPECT_THROW(s.insert(9, UString("x")), std::out_of_range);
  EXPECT_THROW(s.erase(9), std::out_of_range);
  UString t("other");
  s.swap(t);
  EXPECT_EQ(s, UString("other"));
  EXPECT_EQ(std::u16string(s.rbegin(), s.rend()), u"rehto");
  s.clear();
  EXPECT_TRUE(s.empty());
}

TEST(UStringOps, SearchFamilyWithEveryArgumentKind) {
  const UString s("abcabc");
  EXPECT_EQ(s.find(UString("bc")), 1u);
  EXPECT_EQ(s.find(std::string("bc"), 2), 4u);
  EXPECT_EQ(s.find("ca"), 2u);
  EXPECT_EQ(s.find('c'), 2u);
  EXPECT_EQ(s.find(static_cast<unsigned short>('c'), 3), 5u);
  EXPECT_EQ(s.find('z'), UString::npos);
  EXPECT_EQ(s.find("a", 99), UString::npos);
  EXPECT_EQ(s.rfind(UString("ab")), 3u);
  EXPECT_EQ(s.rfind("ab", 2), 0u);
  EXPECT_EQ(s.rfind('a'), 3u);
  EXPECT_EQ(s.find_first_of("cb"), 1u);
  EXPECT_EQ(s.find_first_of(std::string("c"), 3), 5u);
  EXPECT_EQ(s.find_first_not_of("ab"), 2u);
  EXPECT_EQ(s.find_first_not_of('a'), 1u);
  EXPECT_EQ(s.find_last_of(UString("ab")), 4u);
  EXPECT_EQ(s.find_last_of('a', 2), 0u);
  EXPECT_EQ(s.find_last_not_of("c"), 4u);
  EXPECT_EQ(s.find_last_not_of(static_cast<unsigned short>('c'), 1), 1u);
  EXPECT_EQ(UString("aaa").find_first_not_of('a'), UString::npos);
  // Narrow arguments are byte-for-unit: 0xE9 finds U+00E9.
  const UString accented("caf\xC3\xA9");
  EXPECT_EQ(accented.find('\xE9'), 3u);
  EXPECT_EQ(accented.find(static_cast<unsigned short>(0xE9)), 3u);
}

TEST(UStringOps, HashAndMapKey) {
  std::unordered_map<UString, int> m;
  m[UString("one")] = 1;
  m[UString(L"one")] += 1;
  m[UString("two")] = 2;
  EXPECT_EQ(m.size(), 2u);
  EXPECT_EQ(m[UString("one")], 2);
  EXPECT_NE(std::hash<UString>{}(UString("ab")), std::hash<UString>{}(UString("ba")));
}

TEST(UStringOps, FormattedStreamProxyReplacesOrAppends) {
  UString s("old");
  {
    UString::FormattedStreamProxy(s)
        << "Take " << 12 << ", gain " << 0.5 << ' ' << UString("\xE2\x82\xAC");
  }
  EXPECT_EQ(s, UString("Take 12, gain 0.5 \xE2\x82\xAC"));
  { UString::FormattedStreamProxy(s, true) << '!' << -3; }
  EXPECT_EQ(s, UString("Take 12, gain 0.5 \xE2\x82\xAC!-3"));
  std::ostringstream os;
  os << UString("\xC3\xA9");
  EXPECT_EQ(os.str(), "\xC3\xA9");
}

}  // namespace
}  // namespace tarn
