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
    // With --benchmark_repetitions the median of the repetitions stands for
    // the case; otherwise its one run does.
    for (const Run& r : runs) {
      const std::string name = r.run_name.str();
      if (r.run_type == Run::RT_Aggregate && r.aggregate_name == "median") {
        times_[name] = r.GetAdjustedCPUTime();
        medians_[name] = true;
      } else if (r.run_type == Run::RT_Iteration && r.iterations > 0 && !medians_[name]) {
        times_[name] = r.GetAdjustedCPUTime();
      }
    }
    ConsoleReporter::ReportRuns(runs);
  }

  void PrintRatios() const {
    for (const auto& [name, ours] : times_) {
      const auto at = name.find("_Tarn");
      if (at == std::string::npos) continue;
      const std::string stem = name.substr(0, at + 1);
      for (const auto& [peer, theirs] : times_)
        if (peer != name && peer.rfind(stem, 0) == 0)
          PrintRatio(name.substr(0, at), WithoutTimeSuffixes(peer.substr(stem.size())),
                     ours / theirs);
    }
  }

 private:
  // "glibc/process_time/real_time" -> "glibc": the timing options that
  // every case of a benchmark shares say nothing about the peer.
  static std::string WithoutTimeSuffixes(std::string name) {
    for (const char* suffix : {"/process_time", "/real_time"})
      for (auto at = name.find(suffix); at != std::string::npos; at = name.find(suffix))
        name.erase(at, std::char_traits<char>::length(suffix));
    return name;
  }

  std::map<std::string, double> times_;
  std::map<std::string, bool> medians_;
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
