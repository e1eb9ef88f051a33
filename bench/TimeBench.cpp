// Range-set edits and lookups: TimeRegion against Boost.ICL's interval_set
// (right-open int intervals, joining touching ones like a non-strict region),
// and TockFrac additions against plain 64-bit tock counts. Prints ours/peer
// by CPU time, which is steadier than wall time on a shared machine.
#include <benchmark/benchmark.h>

#include "RatioReporter.h"

#include <boost/icl/interval_set.hpp>
#include <cstdint>
#include <cstdio>
#include <map>
#include <random>
#include <string>
#include <vector>

#include "tarn/Time/TimeRegion.h"
#include "tarn/Time/TockFrac.h"

namespace {

struct Edit {
  int start;
  int end;
  bool add;
};

const std::vector<Edit>& Edits() {
  static const std::vector<Edit> edits = [] {
    std::mt19937 rng(42);
    std::uniform_int_distribution<int> pos(0, 1000000);
    std::uniform_int_distribution<int> len(1, 2000);
    std::vector<Edit> out;
    for (int i = 0; i < 4000; ++i) {
      const int s = pos(rng);
      out.push_back({s, s + len(rng), rng() % 4 != 0});
    }
    return out;
  }();
  return edits;
}

void RegionEdits_Tarn(benchmark::State& state) {
  for (auto _ : state) {
    tarn::TimeRegion region;
    for (const Edit& e : Edits()) {
      if (e.add) {
        region.Add({e.start, e.end});
      } else {
        region.Subtract({e.start, e.end});
      }
    }
    benchmark::DoNotOptimize(region.CountRanges());
  }
}
BENCHMARK(RegionEdits_Tarn);

void RegionEdits_BoostICLIntervalSet(benchmark::State& state) {
  for (auto _ : state) {
    boost::icl::interval_set<int> set;
    for (const Edit& e : Edits()) {
      if (e.add) {
        set += boost::icl::interval<int>::right_open(e.start, e.end);
      } else {
        set -= boost::icl::interval<int>::right_open(e.start, e.end);
      }
    }
    benchmark::DoNotOptimize(boost::icl::interval_count(set));
  }
}
BENCHMARK(RegionEdits_BoostICLIntervalSet);

void RegionLookups_Tarn(benchmark::State& state) {
  tarn::TimeRegion region;
  for (const Edit& e : Edits()) region.Add({e.start, e.end});
  int t = 0;
  for (auto _ : state) {
    t = (t + 7919) % 1000000;
    benchmark::DoNotOptimize(region.IncludesTime(t));
  }
}
BENCHMARK(RegionLookups_Tarn);

void RegionLookups_BoostICLContains(benchmark::State& state) {
  boost::icl::interval_set<int> set;
  for (const Edit& e : Edits()) set += boost::icl::interval<int>::right_open(e.start, e.end);
  int t = 0;
  for (auto _ : state) {
    t = (t + 7919) % 1000000;
    benchmark::DoNotOptimize(boost::icl::contains(set, t));
  }
}
BENCHMARK(RegionLookups_BoostICLContains);

void TockFracSums_Tarn(benchmark::State& state) {
  std::vector<tarn::TockFrac> steps;
  for (int i = 0; i < 1024; ++i) steps.emplace_back(i % 3 - 1, (i * 7777) % 7200000 - 3600000);
  for (auto _ : state) {
    tarn::TockFrac sum;
    for (const tarn::TockFrac& s : steps) sum += s;
    benchmark::DoNotOptimize(sum);
  }
}
BENCHMARK(TockFracSums_Tarn);

// The peer keeps one 64-bit count of tocks and never normalises.
void TockFracSums_PlainInt64Tocks(benchmark::State& state) {
  std::vector<std::int64_t> steps;
  for (int i = 0; i < 1024; ++i)
    steps.push_back(std::int64_t{i % 3 - 1} * 7200000 + (i * 7777) % 7200000 - 3600000);
  for (auto _ : state) {
    std::int64_t sum = 0;
    for (std::int64_t s : steps) {
      sum += s;
      benchmark::DoNotOptimize(sum);
    }
  }
}
BENCHMARK(TockFracSums_PlainInt64Tocks);

}  // namespace

int main(int argc, char** argv) { return tarn_bench::RunWithRatios(argc, argv); }
