// The one line format in which every benchmark reports a ratio,
//
//   <case> ours / <peer> = <ratio>
//
// (bench/run gathers these lines from all benchmarks into one table), and a
// Google Benchmark reporter that, after the usual table, prints one such line
// per peer: benchmarks are named "<Case>_Tarn" for ours and "<Case>_<Peer>"
// for each peer, and the ratio is ours / peer in processor time (steadier
// than wall time on a shared machine). Benchmarks that time by hand call
// PrintRatio for each figure they compare.
#pragma once

#include <benchmark/benchmark.h>

#include <cstdio>
#include <map>
#include <string>
#include <vector>

namespace tarn_bench {

// Prints one ratio line; what and peer must not contain " ours / " or " = ".
inline void PrintRatio(const std::string& what, const std::string& peer, double ratio) {
  std::printf("%-16s ours / %-24s = %.2f\n", what.c_str(), peer.c_str(), ratio);
}

class RatioReporter : public benchmark::ConsoleReporter {
 public:
  void ReportRuns(const std::vector<Run>& runs) override {
    for (const Run& r : runs)
      if (r.run_type == Run::RT_Iteration && r.iterations > 0)
        times_[r.benchmark_name()] = r.GetAdjustedCPUTime();
    ConsoleReporter::ReportRuns(runs);
  }

  void PrintRatios() const {
    for (const auto& [name, ours] : times_) {
      const auto at = name.find("_Tarn");
      if (at == std::string::npos) continue;
      const std::string stem = name.substr(0, at + 1);
      for (const auto& [peer, theirs] : times_)
        if (peer != name && peer.rfind(stem, 0) == 0)
          PrintRatio(name.substr(0, at), peer.substr(stem.size()), ours / theirs);
    }
  }

 private:
  std::map<std::string, double> times_;
};

// Runs the registered benchmarks, then prints the ratios.
inline int RunWithRatios(int argc, char** argv) {
  benchmark::Initialize(&argc, argv);
  RatioReporter reporter;
  benchmark::RunSpecifiedBenchmarks(&reporter);
  reporter.PrintRatios();
  benchmark::Shutdown();
  return 0;
}

}  // namespace tarn_bench
