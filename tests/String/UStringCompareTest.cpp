// CompareFlags contract: case, accents, the alternate case bit, the natural
// ordering of the library's own comparison, the -1/0/1 result range, and
// comparisons and conversions from several threads at once.
#include <gtest/gtest.h>

#include <atomic>
#include <thread>
#include <tuple>
#include <vector>

#include "String/StringTestUtil.h"

namespace tarn {
namespace {

using F = UString::CompareFlags;
constexpr F Flags(unsigned f) { return static_cast<F>(f); }

// Over every combination of the flag bits. A pair differs in case (1), in
// accents (2) or in letters (4); case differences vanish with bit 1 or 64,
// accent differences with bit 2, letter differences never.
TEST(UStringCompare, CaseAndAccentFlags) {
  const char *accented = "r\u00E9sum\u00E9", *decomposed = "re\u0301sume\u0301";
  const char* const left[] = {"abc", "abc", accented, decomposed, accented, "abc"};
  const char* const right[] = {"abc", "ABC", "resume", "resume", "RESUME", "ABD"};
  const unsigned differs[] = {0, 1, 2, 2, 3, 5};
  for (std::size_t i = 0; i < std::size(left); ++i) {
    for (unsigned f : {0u, 1u, 2u, 3u, 64u, 65u, 66u, 67u}) {
      const unsigned d = differs[i];
      const bool equal = !(d & 4) && (!(d & 1) || (f & 65)) && (!(d & 2) || (f & 2));
      for (unsigned g : {f, f | 32}) {
        EXPECT_EQ(UString(left[i]).equal(UString(right[i]), Flags(g)), equal) << i << ' ' << g;
      }
    }
  }
}

TEST(UStringCompare, SystemComparisonIsLinguisticAndOperatorsUseCodeUnits) {
  EXPECT_TRUE(UString("B") < UString("a"));  // code units
  EXPECT_TRUE(UString("a").less(UString("B")));
  EXPECT_TRUE(UString("apple").less(UString("Banana"), UString::kIgnoreCase));
  EXPECT_TRUE(UString("\u00E9clair").less(UString("fig")));  // e-acute sorts with e
  EXPECT_TRUE(UString("ABC") < UString("abc") && UString("ab") < UString("abc"));
  EXPECT_LT(UString("a").compare(UString("b")), 0);
}

TEST(UStringCompare, ResultIsMinusOneZeroOrOneAndAntisymmetric) {
  std::vector<UString> words = test::Split("a A ab file2 file10 zz Z9 \u00C9t\u00E9");
  words.push_back(UString());
  for (unsigned f : {0u, 1u, 2u, 3u, 32u, 33u, 34u, 35u, 64u, 96u}) {
    for (const UString& x : words) {
      for (const UString& y : words) {
        const int c = x.Compare(y, Flags(f));
        EXPECT_TRUE(c == -1 || c == 0 || c == 1) << c;
        EXPECT_EQ(c, -y.Compare(x, Flags(f))) << x << " / " << y << " flags " << f;
      }
    }
  }
}

// Each chain is in ascending natural order (the first starts with the empty
// string), and every pair must compare so.
// Digit runs compare by value, equal values with fewer leading zeros first but
// only as a tie-break (the first such run decides); other units by code unit
// unless case is ignored.
TEST(UStringCompare, NaturalOrderComparesDigitRunsByValue) {
  const auto exact = test::Split(
      " FILE10 a1b01 a01b1 a1b2 a1b10 file2 file02 file02b file2c file9 file10 n99 "
      "n99999999999999999998 n99999999999999999999 n12345678901234567890123 t0 t00 x x1");
  const auto folded = test::Split("file2 FILE10 Take_1 take_9 Take_09b Take_10 take_100");
  for (const auto& [chain, flags] :
       {std::pair{exact, UString::kLibraryCompare},
        std::pair{folded, UString::kLibraryCompare | UString::kIgnoreCase}}) {
    for (std::size_t i = 0; i < chain.size(); ++i) {
      for (std::size_t j = 0; j < chain.size(); ++j) {
        const int want = i < j ? -1 : i > j;
        EXPECT_EQ(chain[i].Compare(chain[j], flags), want) << chain[i] << " / " << chain[j];
      }
    }
  }
}

// Conversions and comparisons from many threads at once must give the same
// answers as one thread (no shared converter or collator state).
TEST(UStringThreads, ConcurrentConversionsAndComparisons) {
  const std::string bytes = test::AllBytes();
  const UString a("R\xC3\xA9sum\xC3\xA9 take 2"), b("resume TAKE 10");
  const F folded = UString::kIgnoreCase | UString::kIgnoreNonSpace;
  const auto work = [&] {
    UString upper = a;
    ToUpper(upper);
    return std::tuple(UString(bytes, UString::kMacRomanEncoding).string(UString::kMacRomanEncoding),
                      UString(bytes, UString::kSystemEncoding).utf8_str(), upper.utf8_str(),
                      a.Compare(b, UString::kCompareDefault), a.Compare(b, folded),
                      a.Compare(b, UString::kLibraryCompare | folded));
  };
  const auto expected = work();
  std::atomic<int> mismatches{0};
  std::vector<std::thread> threads;
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back([&] {
      for (int i = 0; i < 300; ++i) mismatches += work() != expected;
    });
  }
  for (auto& th : threads) th.join();
  EXPECT_EQ(mismatches.load(), 0);
  EXPECT_EQ(std::get<4>(expected), 1);   // "resume take 2" vs "resume take 10": '2' > '1'
  EXPECT_EQ(std::get<5>(expected), -1);  // naturally 2 < 10
}

}  // namespace
}  // namespace tarn
