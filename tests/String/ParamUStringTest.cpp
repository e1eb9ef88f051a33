#include "tarn/String/ParamUString.h"

#include <gtest/gtest.h>

#include <stdexcept>
#include <string>

namespace tarn {
namespace {

std::string Text(const ParamUString& p) { return p.GetString().utf8_str(); }

// The what() text of the exception GetString throws, or "" if none.
std::string Failure(const ParamUString& p) {
  try {
    (void)p.GetString();
  } catch (const std::out_of_range& e) {
    return e.what();
  }
  return "";
}

TEST(ParamUString, SubstitutesNumberedParametersInAnyOrder) {
  EXPECT_EQ(Text(ParamUString(UString("%1 of %0"), UString("a"), UString("b"))), "b of a");
  EXPECT_EQ(Text(ParamUString(UString("%0%0%0"), UString("ab"))), "ababab");
  EXPECT_EQ(Text(ParamUString(UString("no placeholders"))), "no placeholders");
  EXPECT_EQ(Text(ParamUString(UString(""))), "");
  EXPECT_EQ(Text(ParamUString(UString("%0"), UString(""))), "");
  EXPECT_EQ(Text(ParamUString(UString("%5%4%3%2%1%0"), "0", "1", "2", "3", "4", "5")), "543210");
  // Non-ASCII texts on both sides survive (UTF-16 units, one surrogate pair).
  EXPECT_EQ(Text(ParamUString(UString("\xC3\xA9%0\xF0\x9F\x8E\xB5"), UString("\xE2\x82\xAC"))),
            "\xC3\xA9\xE2\x82\xAC\xF0\x9F\x8E\xB5");
}

TEST(ParamUString, PercentSigns) {
  EXPECT_EQ(Text(ParamUString(UString("100%%"))), "100%");
  EXPECT_EQ(Text(ParamUString(UString("%%%%"))), "%%");
  EXPECT_EQ(Text(ParamUString(UString("%%0"), UString("x"))), "%0");
  // Parameter texts are inserted literally, whatever they contain.
  EXPECT_EQ(Text(ParamUString(UString("[%0] [%1]"), UString("%1 %0 %%"), UString("%"))),
            "[%1 %0 %%] [%]");
  EXPECT_EQ(Text(ParamUString(UString("%0%1"), UString("%"), UString("1"))), "%1");
}

TEST(ParamUString, BadPlaceholdersThrowAndChangeNothing) {
  const std::string kWhat = "invalid vector<T> subscript";
  EXPECT_EQ(Failure(ParamUString(UString("ends in %"))), kWhat);
  EXPECT_EQ(Failure(ParamUString(UString("%"), UString("a"))), kWhat);
  EXPECT_EQ(Failure(ParamUString(UString("%1"), UString("a"))), kWhat);
  EXPECT_EQ(Failure(ParamUString(UString("%0"))), kWhat);
  EXPECT_EQ(Failure(ParamUString(UString("%a"), UString("x"))), kWhat);
  EXPECT_EQ(Failure(ParamUString(UString("%/"), UString("x"))), kWhat);  // '0' - 1
  EXPECT_EQ(Failure(ParamUString(UString("%:"), UString("x"))), kWhat);  // '9' + 1
  EXPECT_EQ(Failure(ParamUString(UString("% "), UString("x"))), kWhat);

  // A letter never names a parameter, however many there are.
  ParamUString many(UString("%a"));
  for (std::size_t i = 0; i < 60; ++i) many.SetParameterAtIndex(i, UString("p"));
  EXPECT_EQ(Failure(many), kWhat);

  ParamUString p(UString("%0 and %3"), UString("x"));
  EXPECT_EQ(Failure(p), kWhat);
  EXPECT_EQ(p.GetFormat().utf8_str(), "%0 and %3");
  ASSERT_EQ(p.GetParameters().size(), 1u);
  p.SetParameterAtIndex(3, UString("y"));
  EXPECT_EQ(Text(p), "x and y");
}

TEST(ParamUString, EveryDigitPlaceholderWithTenParameters) {
  ParamUString p;
  for (std::size_t i = 0; i < 10; ++i) p.SetParameterAtIndex(9 - i, UString(std::to_string(9 - i)));
  for (char d = '0'; d <= '9'; ++d) {
    p.SetFormat(UString(std::string("<%") + d + ">"));
    EXPECT_EQ(Text(p), std::string("<") + d + ">");
  }
}

TEST(ParamUString, SettingParameters) {
  ParamUString p(UString("%0|%1|%2|%3"));
  p.SetParameterAtIndex(3, UString("x"));
  ASSERT_EQ(p.GetParameters().size(), 4u);
  for (int i = 0; i < 3; ++i) EXPECT_TRUE(p.GetParameters()[i].empty());
  EXPECT_EQ(Text(p), "|||x");
  p.SetParameterAtIndex(0, UString("a"));
  EXPECT_EQ(Text(p), "a|||x");
  EXPECT_EQ(p.GetParameters().size(), 4u);

  // SetParameters replaces the whole list.
  p.SetParameters(UString("1"), UString("2"));
  EXPECT_EQ(p.GetParameters().size(), 2u);
  EXPECT_EQ(Failure(p), "invalid vector<T> subscript");
  p.SetParameters("a", "b", "c", "d", "e", "f");
  EXPECT_EQ(Text(p), "a|b|c|d");
  p.SetParameters(UString("only"));
  EXPECT_EQ(p.GetParameters().size(), 1u);
}

TEST(ParamUString, CopiesAreIndependent) {
  ParamUString a(UString("%0"), UString("one"));
  ParamUString b = a;
  b.SetParameters(UString("two"));
  EXPECT_EQ(Text(a), "one");
  EXPECT_EQ(Text(b), "two");
  a = b;
  EXPECT_EQ(Text(a), "two");
}

}  // namespace
}  // namespace tarn
