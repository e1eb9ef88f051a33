// Learning what a sound file holds from its header, over 10,000 small files:
// channels, sample rate, frame count, sample format and (ours only: the
// peer has no call for it) where the audio starts. The files, made at start
// in a scratch folder and removed at the end, are a mix of what a host's
// file browser meets:
//   40%  RIFF WAVE, 16-bit stereo, plain;
//   15%  RIFF WAVE, 24-bit, with an 858-byte "bext" and a "JUNK" chunk;
//   10%  RIFF WAVE, 16-bit mono, with "cue ", a LIST/adtl of labels and a
//        LIST/INFO after the audio;
//   15%  Wave64, 16-bit stereo;
//   20%  AIFF, 16-bit stereo, half of them with "MARK" markers.
// Each file holds 64 frames of audio.
//
// Cases (one iteration opens and parses every file once):
//   Readers_Tarn       WAVEReader or AIFFReader (by the file's extension)
//                      asked the facts above;
//   Cache_Tarn         the format cache's object for the file (by its type)
//                      asked GetFileAttributes and GetLengthInFrames, then
//                      released, so every file is parsed afresh;
//   <Case>_libsndfile  sf_open in read mode (which fills SF_INFO with the
//                      same facts), SFC_GET_CURRENT_SF_INFO, sf_close.
// Before the timed runs every file is read both ways once and the facts
// compared; a disagreement is printed and ends the run.
//
// Usage: bench_HeaderBench [Google Benchmark flags]. Files go into a folder
// under $TARN_BENCH_DIR (or the system's temporary folder).
#include <benchmark/benchmark.h>
#include <sndfile.h>
#include <unistd.h>

#include "RatioReporter.h"

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include "tarn/Audio/SoundFileFormats/AIFFReader.h"
#include "tarn/Audio/SoundFileFormats/IEEEExtended.h"
#include "tarn/Audio/SoundFileFormats/SoundFileAttributes.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"
#include "tarn/Audio/SoundFileFormats/WAVEReader.h"
#include "tarn/FileSystem/FileSpecification.h"
#include "tarn/String/UString.h"

namespace {

using Bytes = std::vector<std::uint8_t>;

constexpr int kFileCount = 10000;
constexpr int kFrames = 64;

// ---------------------------------------------------------------- file bytes

void Le16(Bytes& b, std::uint16_t v) {
  b.push_back(static_cast<std::uint8_t>(v));
  b.push_back(static_cast<std::uint8_t>(v >> 8));
}
void Le32(Bytes& b, std::uint32_t v) {
  Le16(b, static_cast<std::uint16_t>(v));
  Le16(b, static_cast<std::uint16_t>(v >> 16));
}
void Le64(Bytes& b, std::uint64_t v) {
  Le32(b, static_cast<std::uint32_t>(v));
  Le32(b, static_cast<std::uint32_t>(v >> 32));
}
void Be16(Bytes& b, std::uint16_t v) {
  b.push_back(static_cast<std::uint8_t>(v >> 8));
  b.push_back(static_cast<std::uint8_t>(v));
}
void Be32(Bytes& b, std::uint32_t v) {
  Be16(b, static_cast<std::uint16_t>(v >> 16));
  Be16(b, static_cast<std::uint16_t>(v));
}
void Tag(Bytes& b, const char* tag) {
  for (int i = 0; i < 4; ++i) b.push_back(static_cast<std::uint8_t>(tag[i]));
}
void Append(Bytes& b, const Bytes& more) { b.insert(b.end(), more.begin(), more.end()); }

// A RIFF chunk, padded to even.
Bytes Chunk(const char* tag, const Bytes& payload, bool bigEndian = false) {
  Bytes b;
  Tag(b, tag);
  if (bigEndian)
    Be32(b, static_cast<std::uint32_t>(payload.size()));
  else
    Le32(b, static_cast<std::uint32_t>(payload.size()));
  Append(b, payload);
  if (payload.size() % 2 != 0) b.push_back(0);
  return b;
}

Bytes FormatPayload(int channels, int bits, std::uint32_t rate) {
  Bytes b;
  const int block = channels * bits / 8;
  Le16(b, 1);
  Le16(b, static_cast<std::uint16_t>(channels));
  Le32(b, rate);
  Le32(b, rate * static_cast<std::uint32_t>(block));
  Le16(b, static_cast<std::uint16_t>(block));
  Le16(b, static_cast<std::uint16_t>(bits));
  return b;
}

Bytes Audio(int bytes) {
  Bytes b(static_cast<std::size_t>(bytes));
  for (std::size_t i = 0; i < b.size(); ++i) b[i] = static_cast<std::uint8_t>(i * 37);
  return b;
}

Bytes Riff(const std::vector<Bytes>& chunks) {
  Bytes body;
  Tag(body, "WAVE");
  for (const Bytes& c : chunks) Append(body, c);
  Bytes b;
  Tag(b, "RIFF");
  Le32(b, static_cast<std::uint32_t>(body.size()));
  Append(b, body);
  return b;
}

Bytes PlainWave(std::uint32_t rate) {
  return Riff({Chunk("fmt ", FormatPayload(2, 16, rate)), Chunk("data", Audio(kFrames * 4))});
}

Bytes BroadcastWave(std::uint32_t rate, int n) {
  Bytes bext(858, 0);
  const std::string description = "Take " + std::to_string(n);
  std::memcpy(bext.data(), description.data(), description.size());
  std::memcpy(bext.data() + 256, "TarnCore bench", 14);
  std::memcpy(bext.data() + 320, "2026-11-24", 10);
  std::memcpy(bext.data() + 330, "02:05:00", 8);
  bext[338] = static_cast<std::uint8_t>(n);  // time reference, low
  return Riff({Chunk("fmt ", FormatPayload(2, 24, rate)), Chunk("bext", bext),
               Chunk("JUNK", Bytes(74, 0)), Chunk("data", Audio(kFrames * 6))});
}

Bytes MarkedWave(std::uint32_t rate) {
  Bytes cue;
  Le32(cue, 3);
  for (std::uint32_t id = 1; id <= 3; ++id) {
    Le32(cue, id);
    Le32(cue, 0);
    Tag(cue, "data");
    Le32(cue, 0);
    Le32(cue, 0);
    Le32(cue, id * 10);
  }
  Bytes adtl;
  Tag(adtl, "adtl");
  for (std::uint32_t id = 1; id <= 3; ++id) {
    Bytes label;
    Le32(label, id);
    const std::string name = "Marker " + std::to_string(id);
    label.insert(label.end(), name.begin(), name.end());
    label.push_back(0);
    Append(adtl, Chunk("labl", label));
  }
  Bytes info;
  Tag(info, "INFO");
  const std::string title = "Bench loop";
  Append(info, Chunk("INAM", Bytes(title.begin(), title.end() + 1)));
  return Riff({Chunk("fmt ", FormatPayload(1, 16, rate)), Chunk("cue ", cue), Chunk("LIST", adtl),
               Chunk("data", Audio(kFrames * 2)), Chunk("LIST", info)});
}

// Wave64: chunks named by 16-byte identifiers, 64-bit sizes that count the
// 24-byte header, padded to 8.
void Guid(Bytes& b, const char* tag, bool riff) {
  static const std::uint8_t kRiffTail[12] = {0x2e, 0x91, 0xcf, 0x11, 0xa5, 0xd6,
                                             0x28, 0xdb, 0x04, 0xc1, 0x00, 0x00};
  static const std::uint8_t kTail[12] = {0xf3, 0xac, 0xd3, 0x11, 0x8c, 0xd1,
                                         0x00, 0xc0, 0x4f, 0x8e, 0xdb, 0x8a};
  Tag(b, tag);
  for (const std::uint8_t byte : riff ? kRiffTail : kTail) b.push_back(byte);
}

Bytes Wave64Chunk(const char* tag, const Bytes& payload) {
  Bytes b;
  Guid(b, tag, false);
  Le64(b, payload.size() + 24);
  Append(b, payload);
  while (b.size() % 8 != 0) b.push_back(0);
  return b;
}

Bytes Wave64(std::uint32_t rate) {
  Bytes body;
  Guid(body, "wave", false);
  Append(body, Wave64Chunk("fmt ", FormatPayload(2, 16, rate)));
  Append(body, Wave64Chunk("data", Audio(kFrames * 4)));
  Bytes b;
  Guid(b, "riff", true);
  Le64(b, body.size() + 24);
  Append(b, body);
  return b;
}

Bytes Aiff(double rate, bool markers) {
  Bytes comm;
  Be16(comm, 2);
  Be32(comm, kFrames);
  Be16(comm, 16);
  unsigned char extended[10];
  tarn::double_to_ieee_80(rate, extended);
  comm.insert(comm.end(), extended, extended + 10);
  Bytes body;
  Tag(body, "AIFF");
  Append(body, Chunk("COMM", comm, true));
  if (markers) {
    Bytes mark;
    Be16(mark, 2);
    for (std::uint16_t id = 1; id <= 2; ++id) {
      Be16(mark, id);
      Be32(mark, id * 16u);
      mark.push_back(3);
      Tag(mark, id == 1 ? "Go  " : "End ");
      mark.pop_back();  // a 3-character Pascal string: 4 bytes, no pad
    }
    Append(body, Chunk("MARK", mark, true));
  }
  Bytes ssnd(8, 0);
  Append(ssnd, Audio(kFrames * 4));
  Append(body, Chunk("SSND", ssnd, true));
  Bytes b;
  Tag(b, "FORM");
  Be32(b, static_cast<std::uint32_t>(body.size()));
  Append(b, body);
  return b;
}

// ---------------------------------------------------------------- the files

enum class Kind { kWave, kAiff };

struct BenchFile {
  std::string path;
  tarn::FileSpecification spec;
  Kind kind;
};

std::filesystem::path gDir;
std::vector<BenchFile> gFiles;

void MakeFiles() {
  const char* env = std::getenv("TARN_BENCH_DIR");
  const std::filesystem::path base = env != nullptr && *env != '\0'
                                         ? std::filesystem::path(env)
                                         : std::filesystem::temp_directory_path();
  gDir = base / ("tarn_header_bench_" + std::to_string(getpid()));
  std::filesystem::create_directories(gDir);
  static const std::uint32_t kRates[] = {44100, 48000, 96000, 22050};
  gFiles.reserve(kFileCount);
  for (int n = 0; n < kFileCount; ++n) {
    const std::uint32_t rate = kRates[n % 4];
    const int slot = n % 20;  // 8 plain, 3 bext, 2 marked, 3 Wave64, 4 AIFF
    Bytes bytes;
    const char* extension = ".wav";
    Kind kind = Kind::kWave;
    if (slot < 8) {
      bytes = PlainWave(rate);
    } else if (slot < 11) {
      bytes = BroadcastWave(rate, n);
    } else if (slot < 13) {
      bytes = MarkedWave(rate);
    } else if (slot < 16) {
      bytes = Wave64(rate);
      extension = ".w64";
    } else {
      bytes = Aiff(rate, slot % 2 == 0);
      extension = ".aif";
      kind = Kind::kAiff;
    }
    char name[32];
    std::snprintf(name, sizeof name, "f%05d%s", n, extension);
    const std::filesystem::path path = gDir / name;
    std::FILE* f = std::fopen(path.c_str(), "wb");
    if (f == nullptr || std::fwrite(bytes.data(), 1, bytes.size(), f) != bytes.size() ||
        std::fclose(f) != 0) {
      std::fprintf(stderr, "cannot write %s\n", path.c_str());
      std::exit(1);
    }
    gFiles.push_back({path.string(), tarn::FileSpecification(tarn::UString(path.c_str())), kind});
  }
}

// ---------------------------------------------------------------- the readers

struct Facts {
  int channels = 0;
  double rate = 0;
  std::int64_t frames = 0;
  int bytesPerSample = 0;
  std::int64_t audioOffset = 0;
};

Facts ReadWithReaders(const BenchFile& file) {
  Facts facts;
  if (file.kind == Kind::kWave) {
    tarn::WAVEReader reader(file.spec);
    facts.channels = reader.GetNumberOfChannels();
    facts.rate = reader.GetSampleRate();
    facts.frames = reader.GetNumberOfFrames();
    facts.bytesPerSample = reader.GetSampleSize();
    (void)reader.GetSampleFormat();
    facts.audioOffset = reader.GetHeaderSize();
  } else {
    tarn::AIFFReader reader(file.spec);
    facts.channels = reader.GetNumberOfChannels();
    facts.rate = reader.GetSampleRate();
    facts.frames = reader.GetNumberOfFrames();
    facts.bytesPerSample = reader.GetSampleSize();
    (void)reader.GetSampleFormat();
    facts.audioOffset = reader.GetHeaderSize();
  }
  return facts;
}

Facts ReadWithCache(const BenchFile& file) {
  const std::shared_ptr<tarn::SoundFileFormat> format =
      tarn::SoundFileFormatCache::Instance().GetFormat(file.spec);
  const tarn::SoundFileAttributes a = format->GetFileAttributes();
  Facts facts;
  facts.channels = a.mNumChannels;
  facts.rate = a.mSampleRate;
  facts.frames = format->GetLengthInFrames().AsLongLong();
  facts.bytesPerSample = a.mBytesPerSample;
  facts.audioOffset = a.mOffsetToAudio;
  return facts;
}

int BytesOfSubformat(int format) {
  switch (format & SF_FORMAT_SUBMASK) {
    case SF_FORMAT_PCM_S8:
    case SF_FORMAT_PCM_U8:
      return 1;
    case SF_FORMAT_PCM_16:
      return 2;
    case SF_FORMAT_PCM_24:
      return 3;
    case SF_FORMAT_PCM_32:
    case SF_FORMAT_FLOAT:
      return 4;
    case SF_FORMAT_DOUBLE:
      return 8;
    default:
      return 0;
  }
}

Facts ReadWithSndfile(const BenchFile& file) {
  SF_INFO info{};
  SNDFILE* sf = sf_open(file.path.c_str(), SFM_READ, &info);
  Facts facts;
  if (sf == nullptr) return facts;
  SF_INFO current{};
  sf_command(sf, SFC_GET_CURRENT_SF_INFO, &current, sizeof current);
  facts.channels = current.channels;
  facts.rate = current.samplerate;
  facts.frames = current.frames;
  facts.bytesPerSample = BytesOfSubformat(current.format);
  sf_close(sf);
  return facts;
}

bool CheckAllAgree() {
  int bad = 0;
  for (const BenchFile& file : gFiles) {
    const Facts ours = ReadWithReaders(file);
    const Facts cached = ReadWithCache(file);
    const Facts theirs = ReadWithSndfile(file);
    const bool agree =
        ours.channels == theirs.channels && ours.rate == theirs.rate &&
        ours.frames == theirs.frames && ours.bytesPerSample == theirs.bytesPerSample &&
        cached.channels == ours.channels && cached.rate == ours.rate &&
        cached.frames == ours.frames && cached.bytesPerSample == ours.bytesPerSample &&
        cached.audioOffset == ours.audioOffset && ours.frames == kFrames;
    if (!agree && bad++ < 5)
      std::printf(
          "%s: ours %d ch %.0f Hz %lld frames %d bytes; cache %d ch %lld frames; "
          "libsndfile %d ch %.0f Hz %lld frames %d bytes\n",
          file.path.c_str(), ours.channels, ours.rate, static_cast<long long>(ours.frames),
          ours.bytesPerSample, cached.channels, static_cast<long long>(cached.frames),
          theirs.channels, theirs.rate, static_cast<long long>(theirs.frames),
          theirs.bytesPerSample);
  }
  if (bad == 0)
    std::printf("All %zu files: channels, rate, frames and sample size agree with libsndfile\n",
                gFiles.size());
  return bad == 0;
}

template <Facts (*Read)(const BenchFile&)>
void Run(benchmark::State& state) {
  for (auto _ : state) {
    std::int64_t sum = 0;
    for (const BenchFile& file : gFiles) sum += Read(file).frames;
    benchmark::DoNotOptimize(sum);
  }
  state.SetItemsProcessed(state.iterations() * static_cast<std::int64_t>(gFiles.size()));
}

}  // namespace

int main(int argc, char** argv) {
  MakeFiles();
  int status = 0;
  if (CheckAllAgree()) {
    benchmark::RegisterBenchmark("Readers_Tarn", Run<ReadWithReaders>)
        ->Unit(benchmark::kMillisecond);
    benchmark::RegisterBenchmark("Readers_libsndfile", Run<ReadWithSndfile>)
        ->Unit(benchmark::kMillisecond);
    benchmark::RegisterBenchmark("Cache_Tarn", Run<ReadWithCache>)->Unit(benchmark::kMillisecond);
    benchmark::RegisterBenchmark("Cache_libsndfile", Run<ReadWithSndfile>)
        ->Unit(benchmark::kMillisecond);
    status = tarn_bench::RunWithRatios(argc, argv);
  } else {
    status = 1;
  }
  std::error_code ignored;
  std::filesystem::remove_all(gDir, ignored);
  return status;
}
