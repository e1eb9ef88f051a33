// Moving audio between a sound file and per-channel float buffers through
// the host facade, against libsndfile doing the same job with its own
// float calls. The file is a 10-second 48 kHz stereo 24-bit WAVE (about
// 2.9 MB), in the system's page cache after the first run.
//
// Cases (one iteration moves the whole file):
//   Read24_Tarn        SoundFileReader::Read of the whole file into two float
//                      buffers (read, deinterleave, convert);
//   Read24_libsndfile  sf_readf_float of the whole file into one interleaved
//                      float buffer (its natural call; it does not
//                      deinterleave);
//   Write24_Tarn       SoundFileWriter::Write of two float buffers in 4096-frame
//                      blocks, then Close;
//   Write24_libsndfile sf_writef_float of the interleaved frames in 4096-frame
//                      blocks, then sf_close.
//
// Usage: bench_ChainBench [Google Benchmark flags]. The files go into the
// system's temporary folder and are removed at the end.
#include <benchmark/benchmark.h>
#include <sndfile.h>

#include <cmath>
#include <filesystem>
#include <vector>

#include "RatioReporter.h"
#include "tarn/Audio/SoundFileReader.h"
#include "tarn/Audio/SoundFileWriter.h"

namespace {

namespace fs = std::filesystem;
constexpr std::int64_t kFrames = 480000;
constexpr std::int64_t kBlock = 4096;

fs::path Dir() {
  static const fs::path dir = [] {
    fs::path d = fs::temp_directory_path() / "tarn-chain-bench";
    fs::create_directories(d);
    return d;
  }();
  return dir;
}

tarn::FileSpecification Spec(const fs::path& p) {
  return tarn::FileSpecification(tarn::UString(p.string()));
}

struct Signal {
  std::vector<float> left, right, interleaved;
  Signal() {
    for (std::int64_t i = 0; i < kFrames; ++i) {
      const float l = 0.5f * std::sin(static_cast<float>(i) * 0.01f);
      const float r = 0.5f * std::sin(static_cast<float>(i) * 0.013f);
      left.push_back(l);
      right.push_back(r);
      interleaved.push_back(l);
      interleaved.push_back(r);
    }
  }
};

const Signal& TheSignal() {
  static const Signal s;
  return s;
}

tarn::SoundFileWriter::Settings Settings24() {
  tarn::SoundFileWriter::Settings settings;
  settings.numChannels = 2;
  settings.fileFormat = tarn::kSamp24;
  return settings;
}

void WriteTarn(const fs::path& path) {
  const Signal& s = TheSignal();
  tarn::SoundFileWriter out(Spec(path), Settings24());
  for (std::int64_t at = 0; at < kFrames; at += kBlock) {
    const void* channels[] = {s.left.data() + at, s.right.data() + at};
    out.Write(channels, std::min(kBlock, kFrames - at));
  }
  out.Close();
}

void Write24_Tarn(benchmark::State& state) {
  for (auto _ : state) WriteTarn(Dir() / "tarn.wav");
  state.SetBytesProcessed(state.iterations() * kFrames * 6);
}

void Write24_libsndfile(benchmark::State& state) {
  const Signal& s = TheSignal();
  const std::string path = (Dir() / "sndfile.wav").string();
  for (auto _ : state) {
    SF_INFO info{};
    info.samplerate = 48000;
    info.channels = 2;
    info.format = SF_FORMAT_WAV | SF_FORMAT_PCM_24;
    SNDFILE* f = sf_open(path.c_str(), SFM_WRITE, &info);
    for (std::int64_t at = 0; at < kFrames; at += kBlock)
      sf_writef_float(f, s.interleaved.data() + at * 2, std::min(kBlock, kFrames - at));
    sf_close(f);
  }
  state.SetBytesProcessed(state.iterations() * kFrames * 6);
}

void Read24_Tarn(benchmark::State& state) {
  const fs::path path = Dir() / "read.wav";
  if (!fs::exists(path)) WriteTarn(path);
  std::vector<float> left(kFrames), right(kFrames);
  void* channels[] = {left.data(), right.data()};
  for (auto _ : state) {
    tarn::SoundFileReader in(Spec(path));
    benchmark::DoNotOptimize(in.Read(0, kFrames, channels));
  }
  state.SetBytesProcessed(state.iterations() * kFrames * 6);
}

void Read24_libsndfile(benchmark::State& state) {
  const fs::path path = Dir() / "read.wav";
  if (!fs::exists(path)) WriteTarn(path);
  std::vector<float> frames(kFrames * 2);
  for (auto _ : state) {
    SF_INFO info{};
    SNDFILE* f = sf_open(path.string().c_str(), SFM_READ, &info);
    benchmark::DoNotOptimize(sf_readf_float(f, frames.data(), kFrames));
    sf_close(f);
  }
  state.SetBytesProcessed(state.iterations() * kFrames * 6);
}

BENCHMARK(Read24_Tarn)->Unit(benchmark::kMillisecond);
BENCHMARK(Read24_libsndfile)->Unit(benchmark::kMillisecond);
BENCHMARK(Write24_Tarn)->Unit(benchmark::kMillisecond);
BENCHMARK(Write24_libsndfile)->Unit(benchmark::kMillisecond);

}  // namespace

int main(int argc, char** argv) {
  const int status = tarn_bench::RunWithRatios(argc, argv);
  std::error_code ec;
  fs::remove_all(Dir(), ec);
  return status;
}
