// CompareFlags contract: case, accents, the alternate case bit, the natural
// ordering of the library's own comparison, and the -1/0/1 result range.
#include <gtest/gtest.h>

#include <algorithm>
#include <vector>

#include "tarn/String/UString.h"

namespace tarn {
namespace {

using F = UString::CompareFlags;
constexpr F Flags(unsigned f) { return static_cast<F>(f); }

UString U(const char* utf8) { return UString(utf8); }

TEST(UStringCompare, CaseFlags) {
  const UString a("abc"), b("ABC");
  for (unsigned base : {0u, 32u}) {
    EXPECT_FALSE(a.equal(b, Flags(base))) << base;
    EXPECT_TRUE(a.equal(b, Flags(base | 1))) << base;
    EXPECT_TRUE(a.equal(b, Flags(base | 64))) << base;
    EXPECT_TRUE(a.equal(b, Flags(base | 65))) << base;
    EXPECT_TRUE(a.equal(a, Flags(base))) << base;
  }
  EXPECT_TRUE(a.equal(b, UString::kIgnoreCase | UString::kLibraryCompare));
}

TEST(UStringCompare, AccentFlags) {
  const UString accented = U("r\u00E9sum\u00E9"), plain("resume"), upper("RESUME");
  const UString decomposed = U("re\u0301sume\u0301");
  for (unsigned base : {0u, 32u}) {
    EXPECT_FALSE(accented.equal(plain, Flags(base))) << base;
    EXPECT_TRUE(accented.equal(plain, Flags(base | 2))) << base;
    EXPECT_FALSE(accented.equal(upper, Flags(base | 2))) << base;  // case still counts
    EXPECT_TRUE(accented.equal(upper, Flags(base | 3))) << base;
    EXPECT_TRUE(accented.equal(upper, Flags(base | 66))) << base;
    EXPECT_TRUE(decomposed.equal(plain, Flags(base | 2))) << base;
  }
}

TEST(UStringCompare, SystemComparisonIsLinguisticNotCodeUnit) {
  // In code units 'B' < 'a'; a collation puts a before B.
  EXPECT_TRUE(UString("B") < UString("a"));
  EXPECT_TRUE(UString("a").less(UString("B")));
  EXPECT_TRUE(UString("apple").less(UString("Banana"), UString::kIgnoreCase));
  EXPECT_TRUE(U("\u00E9clair").less(UString("fig")));  // e-acute sorts with e
  EXPECT_FALSE(UString("fig").less(U("\u00E9clair")));
}

TEST(UStringCompare, ResultIsMinusOneZeroOrOneAndAntisymmetric) {
  const std::vector<UString> words = {UString(""),        UString("a"),     UString("A"),
                                      UString("ab"),      UString("file2"), UString("file10"),
                                      U("\u00C9t\u00E9"), UString("zz"),    UString("Z9")};
  for (unsigned f : {0u, 1u, 2u, 3u, 32u, 33u, 34u, 35u, 64u, 96u}) {
    for (const UString& x : words) {
      for (const UString& y : words) {
        const int c = x.Compare(y, Flags(f));
        EXPECT_TRUE(c == -1 || c == 0 || c == 1) << c;
        EXPECT_EQ(c, -y.Compare(x, Flags(f))) << x << " / " << y << " flags " << f;
        EXPECT_EQ(x.less(y, Flags(f)), c < 0);
        EXPECT_EQ(x.equal(y, Flags(f)), c == 0);
      }
    }
  }
  EXPECT_EQ(UString("").Compare(UString("a"), Flags(0)), -1);
  EXPECT_EQ(UString("").Compare(UString("a"), Flags(32)), -1);
  EXPECT_EQ(UString("").Compare(UString(""), Flags(32)), 0);
}

TEST(UStringCompare, NaturalOrderComparesDigitRunsByValue) {
  const F nat = UString::kLibraryCompare;
  EXPECT_EQ(UString("file2").Compare(UString("file10"), nat), -1);
  EXPECT_EQ(UString("file10").Compare(UString("file9"), nat), 1);
  EXPECT_EQ(UString("a1b2").Compare(UString("a1b10"), nat), -1);
  EXPECT_EQ(UString("x").Compare(UString("x1"), nat), -1);
  EXPECT_EQ(UString("v1.10").Compare(UString("v1.9"), nat), 1);
  EXPECT_EQ(UString("n123456789012345678901234567890").Compare(UString("n99"), nat), 1);
  EXPECT_EQ(UString("n99999999999999999999").Compare(UString("n99999999999999999998"), nat), 1);
  // Equal values: the run with fewer leading zeros first, but only as a tie-break.
  EXPECT_EQ(UString("file2").Compare(UString("file02"), nat), -1);
  EXPECT_EQ(UString("file02b").Compare(UString("file2c"), nat), -1);
  EXPECT_EQ(UString("t0").Compare(UString("t00"), nat), -1);
  // Plain code units outside digit runs; case folding on request.
  EXPECT_EQ(UString("file2").Compare(UString("FILE10"), nat), 1);
  EXPECT_EQ(UString("file2").Compare(UString("FILE10"), nat | UString::kIgnoreCase), -1);

  std::vector<UString> names = {UString("Take 10"), UString("take 9"), UString("Take 1"),
                                UString("take 100"), UString("Take 09b")};
  std::sort(names.begin(), names.end(), [](const UString& a, const UString& b) {
    return a.less(b, UString::kLibraryCompare | UString::kIgnoreCase);
  });
  EXPECT_EQ(names, (std::vector<UString>{UString("Take 1"), UString("take 9"), UString("Take 09b"),
                                         UString("Take 10"), UString("take 100")}));
}

TEST(UStringCompare, PlainOperatorsUseCodeUnits) {
  EXPECT_TRUE(UString("abc") == UString("abc"));
  EXPECT_TRUE(UString("abc") != UString("ABC"));
  EXPECT_TRUE(UString("ABC") < UString("abc"));
  EXPECT_TRUE(UString("ab") < UString("abc"));
  EXPECT_TRUE(UString("b") > UString("abc"));
  EXPECT_LT(UString("a").compare(UString("b")), 0);
  EXPECT_TRUE(UString("x") == "x");
}

}  // namespace
}  // namespace tarn
