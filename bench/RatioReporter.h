// A Google Benchmark reporter that, after the usual table, prints one ratio
// line per peer: benchmarks are named "<Case>_Tarn" for ours and
// "<Case>_<Peer>" for each peer, and the ratio is ours / peer in processor
// time (steadier than wall time on a shared machine).
#pragma once

#include <benchmark/benchmark.h>

#include <cstdio>
#include <map>
#include <string>
#include <vector>

namespace tarn_bench {

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
          std::printf("%-16s ours / %-24s = %.2f\n", name.substr(0, at).c_str(),
                      peer.substr(stem.size()).c_str(), ours / theirs);
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
