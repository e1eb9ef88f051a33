#include <gtest/gtest.h>

#include <map>
#include <unordered_set>

#include "tarn/String/UString.h"

namespace tarn {
namespace {

TEST(UStringBasics, BuildsAsMapKeyAndConcatenates) {
  std::map<UString, int> m{{UString("b"), 2}, {UString("a"), 1}};
  EXPECT_EQ(m.begin()->second, 1);
  std::unordered_set<UString> set{UString("x"), UString("x"), UString("y")};
  EXPECT_EQ(set.size(), 2u);
  const UString s = UString("ab") + "cd" + UString("e");
  EXPECT_EQ(s, UString("abcde"));
  EXPECT_EQ(s.length(), 5u);
  EXPECT_EQ(s.data_size(), 10u);
}

}  // namespace
}  // namespace tarn
