// UString conversions and natural ordering against peers: ICU's UTF-8
// conversions (u_strFromUTF8 / u_strToUTF8) and glibc's strverscmp. Prints
// ours / peer time ratios at the end.
#include <benchmark/benchmark.h>

#include <string.h>
#include <unicode/ustring.h>
#include "RatioReporter.h"

#include <algorithm>
#include <cstdio>
#include <map>
#include <string>
#include <vector>

#include "tarn/String/UString.h"

namespace {

std::string MixedUTF8(std::size_t bytes) {
  const std::string piece = "Take 12 \xC3\xA9t\xC3\xA9 \xE2\x82\xAC 440 Hz \xF0\x9F\x8E\xB5 mix; ";
  std::string s;
  while (s.size() < bytes) s += piece;
  return s;
}

std::vector<std::string> FileNames() {
  std::vector<std::string> names;
  for (int i = 0; i < 2000; ++i) {
    names.push_back("Audio " + std::to_string((i * 7919) % 997) + " take" + std::to_string(i % 37) +
                    ".wav");
  }
  return names;
}

void UTF8Decode_Tarn(benchmark::State& state) {
  const std::string text = MixedUTF8(64 * 1024);
  for (auto _ : state) {
    tarn::UString s(text);
    benchmark::DoNotOptimize(s.get_internal_utf16());
  }
  state.SetBytesProcessed(int64_t(state.iterations()) * int64_t(text.size()));
}

void UTF8Decode_ICU(benchmark::State& state) {
  const std::string text = MixedUTF8(64 * 1024);
  std::vector<UChar> buf(text.size() + 1);
  for (auto _ : state) {
    UErrorCode err = U_ZERO_ERROR;
    int32_t n = 0;
    u_strFromUTF8WithSub(buf.data(), int32_t(buf.size()), &n, text.data(), int32_t(text.size()),
                         0xFFFD, nullptr, &err);
    // Match the allocation the string class does per conversion.
    std::u16string s(reinterpret_cast<const char16_t*>(buf.data()), std::size_t(n));
    benchmark::DoNotOptimize(s.data());
  }
  state.SetBytesProcessed(int64_t(state.iterations()) * int64_t(text.size()));
}

void UTF8Encode_Tarn(benchmark::State& state) {
  const tarn::UString s(MixedUTF8(64 * 1024));
  for (auto _ : state) {
    std::string out = s.utf8_str();
    benchmark::DoNotOptimize(out.data());
  }
}

void UTF8Encode_ICU(benchmark::State& state) {
  const tarn::UString s(MixedUTF8(64 * 1024));
  const auto* src = reinterpret_cast<const UChar*>(s.get_internal_utf16());
  for (auto _ : state) {
    std::string out(s.length() * 3, '\0');
    UErrorCode err = U_ZERO_ERROR;
    int32_t n = 0;
    u_strToUTF8WithSub(out.data(), int32_t(out.size()), &n, src, int32_t(s.length()), 0xFFFD,
                       nullptr, &err);
    out.resize(std::size_t(n));
    benchmark::DoNotOptimize(out.data());
  }
}

void NaturalSort_Tarn(benchmark::State& state) {
  std::vector<tarn::UString> names;
  for (const auto& n : FileNames()) names.emplace_back(n);
  for (auto _ : state) {
    auto v = names;
    std::sort(v.begin(), v.end(), [](const tarn::UString& a, const tarn::UString& b) {
      return a.less(b, tarn::UString::kLibraryCompare);
    });
    benchmark::DoNotOptimize(v.data());
  }
}

void NaturalSort_strverscmp(benchmark::State& state) {
  const std::vector<std::string> names = FileNames();
  for (auto _ : state) {
    auto v = names;
    std::sort(v.begin(), v.end(), [](const std::string& a, const std::string& b) {
      return strverscmp(a.c_str(), b.c_str()) < 0;
    });
    benchmark::DoNotOptimize(v.data());
  }
}

BENCHMARK(UTF8Decode_Tarn);
BENCHMARK(UTF8Decode_ICU);
BENCHMARK(UTF8Encode_Tarn);
BENCHMARK(UTF8Encode_ICU);
BENCHMARK(NaturalSort_Tarn);
BENCHMARK(NaturalSort_strverscmp);

// Collects per-benchmark times so that ours / peer ratios can be printed.
}  // namespace

int main(int argc, char** argv) { return tarn_bench::RunWithRatios(argc, argv); }
