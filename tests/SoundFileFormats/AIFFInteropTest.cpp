// AIFF and AIFC files across programs. make-aiff-files.sh makes files with
// sox, ffmpeg and libsndfile's tools in every encoding they write; the
// reader must find the channels, rate, frames, sample format, byte order and
// audio offset those files hold (the offset from a walk of the chunk
// headers done here), and, on POSIX, the samples at that offset must be the
// ones libsndfile decodes. The sample-rate bytes sox writes for the usual
// rates must be the bytes double_to_ieee_80 makes. The other way round,
// files this library writes (AIFF and AIFC, every encoding, 1 to 8
// channels) must open in libsndfile, sox (1, 2, 3, 6 and 8 channels) and
// ffprobe (each encoding once, the channel counts in turn) with the
// attributes written and decode to the very samples written.

#include <algorithm>
#include <cctype>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <map>
#include <sstream>
#include <string>
#include <vector>

#include "SoundFileFormats/AIFFTestUtil.h"
#include "tarn/Audio/SoundFileFormats/AIFFReader.h"
#include "tarn/Audio/SoundFileFormats/AIFFWriter.h"

#ifdef TARN_TEST_DECODERS
#include <sndfile.h>
#endif

namespace tarn::test {
namespace {

namespace fs = std::filesystem;
constexpr RIFFType T(const char (&code)[5]) { return MakeRIFFType(code); }

// $TARN_AIFF_FILES (CTest's fixture made it on the host), else on POSIX a
// scratch folder the script fills on first use.
const fs::path& AIFFDir() {
  struct Scratch {
    fs::path path;
    ~Scratch() {
      std::error_code ignored;
      if (!path.empty()) fs::remove_all(path, ignored);
    }
  };
  static Scratch scratch;
  static const fs::path dir = []() -> fs::path {
    if (const char* env = std::getenv("TARN_AIFF_FILES"); env != nullptr && *env != 0) return env;
#ifdef TARN_AIFF_FILES_SCRIPT
    std::string name = (fs::temp_directory_path() / "tarn-aiff-XXXXXX").string();
    if (::mkdtemp(name.data()) == nullptr) return {};
    scratch.path = name;
    const std::string command = "sh '" TARN_AIFF_FILES_SCRIPT "' '" + name + "'";
    if (std::system(command.c_str()) == 0) return name;
#endif
    return {};
  }();
  return dir;
}

fs::path SourceOf(const std::string& name) {
  const fs::path path = AIFFDir() / name;
  if (!AIFFDir().empty() && fs::exists(path)) return path;
  ADD_FAILURE() << "no " << name << ": run the tests through CTest, or make the files with "
                << "tests/SoundFileFormats/make-aiff-files.sh DIR and set TARN_AIFF_FILES=DIR";
  return {};
}

struct Foreign {
  const char* name;
  bool parses;
  int channels = 0;
  double rate = 0;
  std::int64_t frames = 0;
  SampleFormat format = kSamp16;
  int bytes = 0;
  bool lsbFirst = false;
};

const Foreign kForeign[] = {
    {"sox-s8-odd.aiff", true, 1, 8000, 81, kSamp8, 1},
    {"sox-s16-stereo.aiff", true, 2, 8000, 80, kSamp16, 2},
    {"sox-s24.aiff", true, 1, 8000, 80, kSamp24, 3},
    {"sox-s32-6ch.aiff", true, 6, 8000, 80, kSampUnpacked24, 4},
    {"sox-s16.aifc", true, 1, 8000, 80, kSamp16, 2},
    {"sox-f32.aifc", true, 2, 8000, 80, kSampFloat32, 4},
    {"sox-f64.aifc", true, 1, 8000, 80, kSampWide64B, 8},
    {"ffmpeg-s8.aiff", true, 1, 8000, 80, kSamp8, 1},
    {"ffmpeg-s16-stereo.aiff", true, 2, 8000, 80, kSamp16, 2},
    {"ffmpeg-s24.aiff", true, 1, 8000, 80, kSamp24, 3},
    {"ffmpeg-s32.aiff", true, 1, 8000, 80, kSampUnpacked24, 4},
    {"ffmpeg-f32.aifc", true, 1, 8000, 80, kSampFloat32, 4},
    {"ffmpeg-f64.aifc", true, 1, 8000, 80, kSampWide64B, 8},
    {"ffmpeg-sowt.aifc", true, 1, 8000, 80, kSamp16, 2, true},
    {"ffmpeg-u8.aifc", false},  // compression "raw "
    {"sndfile-s8.aiff", true, 2, 44100, 441, kSamp8, 1},
    {"sndfile-s16.aiff", true, 2, 44100, 441, kSamp16, 2},
    {"sndfile-s24.aiff", true, 2, 44100, 441, kSamp24, 3},
    {"sndfile-s32.aiff", true, 2, 44100, 441, kSampUnpacked24, 4},
    {"sndfile-f32.aiff", true, 2, 44100, 441, kSampFloat32, 4},  // "FL32"
    {"sndfile-f64.aiff", true, 2, 44100, 441, kSampWide64B, 8},  // "FL64"
    {"sndfile-sowt.aiff", true, 2, 44100, 441, kSamp16, 2, true},
    {"sndfile-le24.aiff", false},  // compression "42n1"
};

// The samples at `at` as full-scale 32-bit integers, or as doubles.
void DecodeOwn(const Bytes& file, std::size_t at, std::size_t count, int bytes, bool lsbFirst,
               bool floating, std::vector<std::int32_t>& ints, std::vector<double>& reals) {
  for (std::size_t k = 0; k < count; ++k) {
    std::uint64_t word = 0;
    for (int i = 0; i < bytes; ++i) {
      const std::uint64_t b = file[at + k * bytes + static_cast<std::size_t>(i)];
      word |= b << (lsbFirst ? 8 * i : 8 * (bytes - 1 - i));
    }
    if (!floating) {
      ints.push_back(
          static_cast<std::int32_t>(static_cast<std::uint32_t>(word << (32 - 8 * bytes))));
    } else if (bytes == 4) {
      float f;
      const auto u = static_cast<std::uint32_t>(word);
      std::memcpy(&f, &u, 4);
      reals.push_back(f);
    } else {
      double d;
      std::memcpy(&d, &word, 8);
      reals.push_back(d);
    }
  }
}

class ForeignAIFF : public ::testing::TestWithParam<const Foreign*> {};

TEST_P(ForeignAIFF, ReaderAgreesWithTheWriter) {
  const Foreign& f = *GetParam();
  const fs::path path = SourceOf(f.name);
  if (path.empty()) return;
  AIFFReader reader(SpecOf(path));
  ASSERT_EQ(reader.CanParse(), f.parses);
  if (!f.parses) return;
  EXPECT_EQ(reader.GetNumberOfChannels(), f.channels);
  EXPECT_EQ(reader.GetSampleRate(), f.rate);
  EXPECT_EQ(reader.GetNumberOfFrames(), f.frames);
  EXPECT_EQ(reader.GetSampleFormat(), f.format);
  EXPECT_EQ(reader.GetSampleSize(), f.bytes);
  EXPECT_EQ(reader.GetSampleFrameSize(), f.bytes * f.channels);
  EXPECT_EQ(reader.GetSamplesAreLSBFirst(), f.lsbFirst);
  const Bytes file = ReadFile(path);
  const std::size_t ssnd = FindSoundChunk(file);
  ASSERT_NE(ssnd, 0u);
  EXPECT_EQ(reader.GetOffsetToSoundChunk(), static_cast<std::int64_t>(ssnd));
  EXPECT_EQ(reader.GetHeaderSize(), static_cast<std::int64_t>(ssnd + 16 + Get32(file, ssnd + 8)));
  const std::size_t count = static_cast<std::size_t>(f.frames * f.channels);
  ASSERT_LE(reader.GetHeaderSize() + static_cast<std::int64_t>(count) * f.bytes,
            static_cast<std::int64_t>(file.size()));
#ifdef TARN_TEST_DECODERS
  const bool floating = f.format == kSampFloat32 || f.format == kSampWide64B;
  std::vector<std::int32_t> ints;
  std::vector<double> reals;
  DecodeOwn(file, static_cast<std::size_t>(reader.GetHeaderSize()), count, f.bytes, f.lsbFirst,
            floating, ints, reals);
  SF_INFO info{};
  SNDFILE* sf = sf_open(path.c_str(), SFM_READ, &info);
  ASSERT_NE(sf, nullptr) << sf_strerror(nullptr);
  EXPECT_EQ(info.frames, f.frames);
  EXPECT_EQ(info.channels, f.channels);
  if (floating) {
    std::vector<double> theirs(count);
    EXPECT_EQ(sf_readf_double(sf, theirs.data(), f.frames), f.frames);
    EXPECT_EQ(reals, theirs);
  } else {
    std::vector<int> theirs(count);
    EXPECT_EQ(sf_readf_int(sf, theirs.data(), f.frames), f.frames);
    EXPECT_EQ(ints, std::vector<std::int32_t>(theirs.begin(), theirs.end()));
  }
  sf_close(sf);
#endif
}

INSTANTIATE_TEST_SUITE_P(Programs, ForeignAIFF, ::testing::ValuesIn([] {
                           std::vector<const Foreign*> files;
                           for (const auto& f : kForeign) files.push_back(&f);
                           return files;
                         }()),
                         [](const auto& info) {
                           std::string name = info.param->name;
                           for (char& ch : name)
                             if (!std::isalnum(static_cast<unsigned char>(ch))) ch = '_';
                           return name;
                         });

// sox writes the rate field with full precision; its bytes for the usual
// rates, pulled-down rates and a half-hertz rate are ours exactly.
TEST(ForeignAIFFRates, SoxWritesTheSameRateBytes) {
  const char* const rates[] = {"8000",
                               "11025",
                               "16000",
                               "22050",
                               "32000",
                               "44100",
                               "48000",
                               "88200",
                               "96000",
                               "176400",
                               "192000",
                               "44055.944055944055",
                               "47952.047952047952",
                               "22050.5"};
  for (const char* rate : rates) {
    SCOPED_TRACE(rate);
    const fs::path path = SourceOf(std::string("rate-") + rate + ".aiff");
    if (path.empty()) return;
    const Bytes file = ReadFile(path);
    std::size_t comm = 12;
    while (comm + 8 <= file.size() && Get32(file, comm) != T("COMM")) {
      const std::size_t size = Get32(file, comm + 4);
      comm += 8 + size + (size & 1);
    }
    ASSERT_LE(comm + 26 + 10, file.size() + 8);
    unsigned char ours[10];
    double_to_ieee_80(std::strtod(rate, nullptr), ours);
    EXPECT_TRUE(std::equal(ours, ours + 10, file.begin() + static_cast<std::ptrdiff_t>(comm + 16)));
    AIFFReader reader(SpecOf(path));
    EXPECT_EQ(reader.GetSampleRate(), std::strtod(rate, nullptr));
  }
}

#ifdef TARN_TEST_DECODERS

std::string RunTool(const std::string& command) {
  FILE* pipe = ::popen(command.c_str(), "r");
  if (pipe == nullptr) return {};
  std::string out;
  char buffer[4096];
  for (std::size_t n; (n = std::fread(buffer, 1, sizeof buffer, pipe)) > 0;) out.append(buffer, n);
  EXPECT_EQ(::pclose(pipe), 0) << command;
  return out;
}

// "key=value" lines (ffprobe) or "Key   : value" lines (sox --i).
std::map<std::string, std::string> Fields(const std::string& text, char separator) {
  std::map<std::string, std::string> out;
  std::istringstream lines(text);
  for (std::string line; std::getline(lines, line);) {
    const auto at = line.find(separator);
    if (at == std::string::npos) continue;
    auto trim = [](std::string s) {
      s.erase(0, s.find_first_not_of(' '));
      s.erase(s.find_last_not_of(" \r'") + 1);
      return s;
    };
    out[trim(line.substr(0, at))] = trim(line.substr(at + 1));
  }
  return out;
}

void ExpectFFprobeSees(const std::string& quoted, const char* codec, double rate, int channels,
                       int frames) {
  const auto probe = Fields(RunTool("ffprobe -v error -show_entries "
                                    "stream=codec_name,sample_rate,channels,duration_ts "
                                    "-of default=nw=1 " +
                                    quoted),
                            '=');
  EXPECT_EQ(probe.at("codec_name"), codec);
  EXPECT_EQ(probe.at("sample_rate"), std::to_string(static_cast<int>(rate)));
  EXPECT_EQ(probe.at("channels"), std::to_string(channels));
  EXPECT_EQ(probe.at("duration_ts"), std::to_string(frames));
}

struct Encoding {
  RIFFType form;
  RIFFType compression;
  std::int16_t bits;
  const char* codec;  // as ffprobe names it
};
const Encoding kEncodings[] = {
    {T("AIFF"), T("NONE"), 8, "pcm_s8"},     {T("AIFF"), T("NONE"), 16, "pcm_s16be"},
    {T("AIFF"), T("NONE"), 24, "pcm_s24be"}, {T("AIFF"), T("NONE"), 32, "pcm_s32be"},
    {T("AIFC"), T("NONE"), 16, "pcm_s16be"}, {T("AIFC"), T("NONE"), 24, "pcm_s24be"},
    {T("AIFC"), T("sowt"), 16, "pcm_s16le"}, {T("AIFC"), T("fl32"), 32, "pcm_f32be"},
    {T("AIFC"), T("fl64"), 64, "pcm_f64be"},
};

TEST(OwnAIFFInOtherPrograms, OpenWithTheAttributesAndDecodeToTheSamplesWritten) {
  TempDir dir;
  const int frames = 101;  // odd: 8-bit mono audio needs its pad byte
  for (const Encoding& e : kEncodings) {
    for (std::int16_t channels = 1; channels <= 8; ++channels) {
      const std::string tag = RIFFTypeToString(e.form) + "-" + RIFFTypeToString(e.compression) +
                              "-" + std::to_string(e.bits) + "-" + std::to_string(channels);
      SCOPED_TRACE(tag);
      const fs::path path = dir.Path(tag + (e.form == T("AIFC") ? ".aifc" : ".aiff"));
      const bool floating = e.compression == T("fl32") || e.compression == T("fl64");
      const Ramp ramp = MakeRamp(channels, frames, e.bits, e.compression == T("sowt"), floating);
      const double rate = 22050 + channels;
      {
        AIFFWriter writer(SpecOf(path), rate, channels, e.bits, e.form, e.compression, 0);
        writer.WriteHeader();
        writer.GetStream().PutRawDataToStream(ramp.bytes.data(),
                                              static_cast<int>(ramp.bytes.size()));
        writer.UpdateDataLength(frames);
        writer.MaybePadChunk();
        writer.Close();
      }
      const std::string quoted = "'" + path.string() + "'";

      // libsndfile, in process.
      SF_INFO info{};
      SNDFILE* sf = sf_open(path.c_str(), SFM_READ, &info);
      ASSERT_NE(sf, nullptr) << sf_strerror(nullptr);
      EXPECT_EQ(info.channels, channels);
      EXPECT_EQ(info.samplerate, rate);
      EXPECT_EQ(info.frames, frames);
      if (floating) {
        std::vector<double> theirs(ramp.reals.size());
        EXPECT_EQ(sf_readf_double(sf, theirs.data(), frames), frames);
        EXPECT_EQ(theirs, ramp.reals);
      } else {
        std::vector<int> theirs(ramp.ints.size());
        EXPECT_EQ(sf_readf_int(sf, theirs.data(), frames), frames);
        EXPECT_EQ(std::vector<std::int32_t>(theirs.begin(), theirs.end()), ramp.ints);
      }
      sf_close(sf);

      // sox for the usual channel counts: what it says the file holds, and
      // what it decodes.
      const bool probe = channels == static_cast<int>(&e - kEncodings) % 8 + 1;
      if (channels == 4 || channels == 5 || channels == 7) {
        if (probe) ExpectFFprobeSees(quoted, e.codec, rate, channels, frames);
        continue;
      }
      const auto sox = Fields(RunTool("sox --i " + quoted), ':');
      EXPECT_EQ(sox.at("Channels"), std::to_string(channels));
      EXPECT_EQ(sox.at("Sample Rate"), std::to_string(static_cast<int>(rate)));
      EXPECT_NE(sox.at("Duration").find("= " + std::to_string(frames) + " samples"),
                std::string::npos)
          << sox.at("Duration");
      EXPECT_NE(sox.at("Sample Encoding").find(floating ? "Floating Point" : "Signed Integer"),
                std::string::npos);
      const std::string raw = RunTool(
          "sox -V1 " + quoted +
          (floating ? " -t raw -e floating-point -b 64 -L -" : " -t raw -e signed -b 32 -L -"));
      if (floating) {
        std::vector<double> decoded(raw.size() / 8);
        std::memcpy(decoded.data(), raw.data(), decoded.size() * 8);
        EXPECT_EQ(decoded, ramp.reals);
      } else {
        std::vector<std::int32_t> decoded(raw.size() / 4);
        std::memcpy(decoded.data(), raw.data(), decoded.size() * 4);
        EXPECT_EQ(decoded, ramp.ints);
      }

      // ffprobe, which takes most of a second to start, once per encoding,
      // with the channel counts taken in turn.
      if (probe) ExpectFFprobeSees(quoted, e.codec, rate, channels, frames);
    }
  }
}

#endif

}  // namespace
}  // namespace tarn::test
