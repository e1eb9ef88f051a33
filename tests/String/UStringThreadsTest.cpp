// Conversions and comparisons from many threads at once: each thread must get
// the same answers as a single thread (no shared converter or collator state).
#include <gtest/gtest.h>

#include <atomic>
#include <string>
#include <thread>
#include <vector>

#include "tarn/String/UString.h"

namespace tarn {
namespace {

TEST(UStringThreads, ConcurrentConversionsAndComparisons) {
  std::string bytes;
  for (int b = 0; b < 256; ++b) bytes.push_back(static_cast<char>(b));
  const UString mac(bytes, UString::kMacRomanEncoding);
  const UString sys(bytes, UString::kSystemEncoding);
  const UString a("R\xC3\xA9sum\xC3\xA9 take 2"), b("resume TAKE 10");
  const int expected[4] = {
      a.Compare(b, UString::kCompareDefault),
      a.Compare(b, UString::kIgnoreCase | UString::kIgnoreNonSpace),
      a.Compare(b, UString::kLibraryCompare),
      a.Compare(b, UString::kLibraryCompare | UString::kIgnoreCase | UString::kIgnoreNonSpace)};
  std::atomic<int> mismatches{0};
  std::vector<std::thread> threads;
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back([&, t] {
      for (int i = 0; i < 300; ++i) {
        if (UString(bytes, UString::kMacRomanEncoding) != mac) ++mismatches;
        if (mac.string(UString::kMacRomanEncoding) != bytes) ++mismatches;
        if (UString(bytes, UString::kSystemEncoding) != sys) ++mismatches;
        const int got[4] = {a.Compare(b, UString::kCompareDefault),
                            a.Compare(b, UString::kIgnoreCase | UString::kIgnoreNonSpace),
                            a.Compare(b, UString::kLibraryCompare),
                            a.Compare(b, UString::kLibraryCompare | UString::kIgnoreCase |
                                             UString::kIgnoreNonSpace)};
        for (int k = 0; k < 4; ++k) {
          if (got[(k + t) % 4] != expected[(k + t) % 4]) ++mismatches;
        }
        UString upper = a;
        ToUpper(upper);
        if (upper != UString("R\xC3\x89SUM\xC3\x89 TAKE 2")) ++mismatches;
      }
    });
  }
  for (auto& th : threads) th.join();
  EXPECT_EQ(mismatches.load(), 0);
  EXPECT_EQ(expected[1], 1);   // "resume take 2" vs "resume take 10": '2' > '1'
  EXPECT_EQ(expected[3], -1);  // naturally 2 < 10
}

}  // namespace
}  // namespace tarn
