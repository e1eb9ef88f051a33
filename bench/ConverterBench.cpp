// Throughput of the buffer converter for every pair, in cache (4,096-sample
// blocks) and from memory (64 Mi-sample runs), next to memcpy of the
// destination's bytes (the bandwidth limit) and, for the pairs it offers,
// libsndfile's own conversion through sf_read_float / sf_write_float on an
// in-memory virtual file. Prints one table; ratios are ours / peer in time
// (below 1 is faster than the peer).
#include <sndfile.h>

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <functional>
#include <memory>
#include <random>
#include <string>
#include <vector>

#include "RatioReporter.h"
#include "tarn/Audio/BufConverter.h"
#include "tarn/Audio/ConverterKernelsImpl.h"

namespace {

constexpr int kBlock = 4096;
constexpr std::int64_t kRun = std::int64_t{64} << 20;

const char* const kNames[] = {"8off", "8", "16", "24", "24in32", "float"};
const int kBytes[] = {1, 1, 2, 3, 4, 4};

// This thread's processor time: the shared build machines preempt often,
// and wall-clock batches would count time spent waiting for a core.
double ThreadSeconds() {
  timespec t{};
  clock_gettime(CLOCK_THREAD_CPUTIME_ID, &t);
  return static_cast<double>(t.tv_sec) + static_cast<double>(t.tv_nsec) * 1e-9;
}

// Best time per call in seconds of `work`, over `reps` measurements of
// `inner` calls each.
double BestSeconds(const std::function<void()>& work, int inner, int reps) {
  double best = 1e30;
  work();  // warm caches and page tables
  for (int r = 0; r < reps; ++r) {
    const double t0 = ThreadSeconds();
    for (int k = 0; k < inner; ++k) work();
    best = std::min(best, (ThreadSeconds() - t0) / inner);
  }
  return best;
}

// Fills `bytes` with plausible samples of `format`: audio-range floats,
// random integers.
void FillSource(std::vector<std::uint8_t>& bytes, int format, std::size_t count) {
  std::mt19937 rng(1);
  if (format == 5) {
    std::uniform_real_distribution<float> dist(-1.05f, 1.05f);
    for (std::size_t i = 0; i < count; ++i) {
      const float f = dist(rng);
      std::memcpy(bytes.data() + i * 4, &f, 4);
    }
  } else {
    for (std::size_t i = 0; i < count * kBytes[format]; ++i)
      bytes[i] = static_cast<std::uint8_t>(rng());
  }
}

// ---- libsndfile on an in-memory file ----------------------------------

struct MemFile {
  std::vector<std::uint8_t> data;
  sf_count_t pos = 0;
};

SF_VIRTUAL_IO MemIO() {
  SF_VIRTUAL_IO io{};
  io.get_filelen = [](void* u) -> sf_count_t {
    return static_cast<sf_count_t>(static_cast<MemFile*>(u)->data.size());
  };
  io.seek = [](sf_count_t off, int whence, void* u) -> sf_count_t {
    auto* f = static_cast<MemFile*>(u);
    const sf_count_t base = whence == SEEK_SET   ? 0
                            : whence == SEEK_CUR ? f->pos
                                                 : static_cast<sf_count_t>(f->data.size());
    f->pos = base + off;
    return f->pos;
  };
  io.read = [](void* p, sf_count_t n, void* u) -> sf_count_t {
    auto* f = static_cast<MemFile*>(u);
    const sf_count_t avail =
        std::max<sf_count_t>(0, static_cast<sf_count_t>(f->data.size()) - f->pos);
    n = std::min(n, avail);
    std::memcpy(p, f->data.data() + f->pos, static_cast<std::size_t>(n));
    f->pos += n;
    return n;
  };
  io.write = [](const void* p, sf_count_t n, void* u) -> sf_count_t {
    auto* f = static_cast<MemFile*>(u);
    const auto end = static_cast<std::size_t>(f->pos + n);
    if (f->data.size() < end) f->data.resize(end);
    std::memcpy(f->data.data() + f->pos, p, static_cast<std::size_t>(n));
    f->pos += n;
    return n;
  };
  io.tell = [](void* u) -> sf_count_t { return static_cast<MemFile*>(u)->pos; };
  return io;
}

int SndfileSubtype(int format) {
  return format == 2 ? SF_FORMAT_PCM_16 : format == 3 ? SF_FORMAT_PCM_24 : SF_FORMAT_FLOAT;
}

// Seconds per call for libsndfile converting `count` samples between the
// integer format on "disk" and floats in memory; negative when unavailable.
double SndfileSeconds(int from, int to, std::int64_t count, int inner, int reps) {
  const int pcm = from == 5 ? to : from;
  SF_VIRTUAL_IO io = MemIO();
  MemFile file;
  file.data.reserve(static_cast<std::size_t>(count) * kBytes[pcm] + 1024);
  SF_INFO info{};
  info.samplerate = 48000;
  info.channels = 1;
  info.format = SF_FORMAT_WAV | SndfileSubtype(pcm);
  std::vector<float> floats(static_cast<std::size_t>(count));
  {
    std::vector<std::uint8_t> tmp(floats.size() * 4);
    FillSource(tmp, 5, floats.size());
    std::memcpy(floats.data(), tmp.data(), tmp.size());
    for (float& f : floats) f = std::clamp(f, -1.0f, 0.99f);
  }
  SNDFILE* sf = sf_open_virtual(&io, SFM_RDWR, &info, &file);
  if (!sf) return -1;
  if (sf_write_float(sf, floats.data(), count) != count) {
    sf_close(sf);
    return -1;
  }
  double s;
  if (from == 5) {
    s = BestSeconds(
        [&] {
          sf_seek(sf, 0, SEEK_SET);
          sf_write_float(sf, floats.data(), count);
        },
        inner, reps);
  } else {
    s = BestSeconds(
        [&] {
          sf_seek(sf, 0, SEEK_SET);
          sf_read_float(sf, floats.data(), count);
        },
        inner, reps);
  }
  sf_close(sf);
  return s;
}

struct Row {
  std::string pair;
  double blockOurs, blockCopy, runOurs, runCopy, blockPeer = -1, runPeer = -1;
};

double Msps(std::int64_t count, double seconds) { return count / seconds / 1e6; }

}  // namespace

int main() {
  const std::size_t maxBytes = static_cast<std::size_t>(kRun) * 4;
  std::vector<std::uint8_t> src(maxBytes), dst(maxBytes), copySrc(maxBytes, 1);
  std::vector<Row> rows;

  for (int from = 0; from <= 5; ++from) {
    FillSource(src, from, static_cast<std::size_t>(kRun));
    for (int to = 0; to <= 5; ++to) {
      if (to == from) continue;
      for (int dither = 0; dither <= 1; ++dither) {
        tarn::AudioFormat a, b;
        a.mSampleFormat = static_cast<tarn::SampleFormat>(from);
        b.mSampleFormat = static_cast<tarn::SampleFormat>(to);
        const bool narrowing = to <= 2 && (from > to || (from == 5)) && !(from <= 1 && to <= 1);
        if (dither == 1 && !narrowing) continue;
        auto conv = tarn::BufConverter::Create(a, b, static_cast<tarn::DitherType>(dither));
        Row row;
        row.pair = std::string(kNames[from]) + " -> " + kNames[to] + (dither ? " T" : "");
        const std::size_t blockDst = static_cast<std::size_t>(kBlock) * kBytes[to];
        const std::size_t runDst = static_cast<std::size_t>(kRun) * kBytes[to];
        row.blockOurs =
            BestSeconds([&] { conv->Convert(src.data(), dst.data(), kBlock); }, 100, 30);
        row.blockCopy =
            BestSeconds([&] { std::memcpy(dst.data(), copySrc.data(), blockDst); }, 100, 30);
        row.runOurs = BestSeconds(
            [&] { conv->Convert(src.data(), dst.data(), static_cast<int>(kRun)); }, 1, 2);
        row.runCopy = BestSeconds([&] { std::memcpy(dst.data(), copySrc.data(), runDst); }, 1, 2);
        const bool peer =
            dither == 0 && ((to == 5 && (from == 2 || from == 3)) || (from == 5 && to == 2));
        if (peer) {
          row.blockPeer = SndfileSeconds(from, to, kBlock, 50, 30);
          row.runPeer = SndfileSeconds(from, to, kRun, 1, 2);
        }
        rows.push_back(row);
        std::fflush(stdout);
      }
    }
  }

  std::printf("Buffer converter throughput, kernels: %s. Rates in million samples per second;\n",
              tarn::ConverterKernels::InstructionSet());
  std::printf("ratios are time ours / time peer (lower is better). Block = %d samples in cache,\n",
              kBlock);
  std::printf("run = %lld samples from memory. memcpy copies the destination's bytes; the\n",
              static_cast<long long>(kRun));
  std::printf(
      "libsndfile peer converts through sf_read_float / sf_write_float on a virtual file.\n\n");
  std::printf("%-18s | %9s %9s %6s | %9s %9s %6s | %11s %6s %11s %6s\n", "pair (T=dither)", "block",
              "memcpy", "ratio", "run", "memcpy", "ratio", "sndfile blk", "ratio", "sndfile run",
              "ratio");
  for (const Row& r : rows) {
    std::printf("%-18s | %9.0f %9.0f %6.2f | %9.0f %9.0f %6.2f", r.pair.c_str(),
                Msps(kBlock, r.blockOurs), Msps(kBlock, r.blockCopy), r.blockOurs / r.blockCopy,
                Msps(kRun, r.runOurs), Msps(kRun, r.runCopy), r.runOurs / r.runCopy);
    if (r.blockPeer > 0) {
      std::printf(" | %11.0f %6.2f %11.0f %6.2f\n", Msps(kBlock, r.blockPeer),
                  r.blockOurs / r.blockPeer, Msps(kRun, r.runPeer), r.runOurs / r.runPeer);
    } else {
      std::printf(" |\n");
    }
  }
  std::printf("\n");
  for (const Row& r : rows) {
    tarn_bench::PrintRatio(r.pair + " (block)", "memcpy", r.blockOurs / r.blockCopy);
    tarn_bench::PrintRatio(r.pair + " (run)", "memcpy", r.runOurs / r.runCopy);
    if (r.blockPeer > 0) {
      tarn_bench::PrintRatio(r.pair + " (block)", "libsndfile", r.blockOurs / r.blockPeer);
      tarn_bench::PrintRatio(r.pair + " (run)", "libsndfile", r.runOurs / r.runPeer);
    }
  }
  return 0;
}
