// WAVE and Wave64 files against sox, ffmpeg and libsndfile: files they write
// read with the right facts (the audio offset checked against the raw
// bytes libsndfile reads), and files we write open in all of them (and
// mediainfo shows our broadcast extension). The tools run here at test
// time; a missing tool fails with the package to install. Built only where
// the tests link libsndfile (POSIX).

#include <gtest/gtest.h>

#ifdef TARN_TEST_DECODERS

#include <sndfile.h>

#include <array>
#include <cmath>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include "SoundFileFormats/ChunkFileTestUtil.h"
#include "tarn/Audio/SoundFileFormats/SoundFileRegionList.h"
#include "tarn/Audio/SoundFileFormats/WAVEReader.h"
#include "tarn/Audio/SoundFileFormats/WAVESoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/WAVEWriter.h"

namespace tarn::test {
namespace {

namespace fs = std::filesystem;

// The standard output of `command`; fails the test when it exits non-zero.
std::string RunTool(const std::string& command) {
  std::string out;
  FILE* pipe = ::popen((command + " 2>/dev/null").c_str(), "r");
  if (pipe == nullptr) {
    ADD_FAILURE() << "cannot run " << command;
    return out;
  }
  std::array<char, 4096> buffer;
  std::size_t n = 0;
  while ((n = std::fread(buffer.data(), 1, buffer.size(), pipe)) > 0) out.append(buffer.data(), n);
  const int status = ::pclose(pipe);
  EXPECT_EQ(status, 0) << command << "\n" << out;
  while (!out.empty() && (out.back() == '\n' || out.back() == '\r')) out.pop_back();
  return out;
}

void Need(const char* tool, const char* package) {
  const int status = std::system((std::string("command -v ") + tool + " >/dev/null 2>&1").c_str());
  ASSERT_EQ(status, 0) << tool << " is missing: install the Debian package " << package;
}

class WAVEInterop : public ::testing::Test {
 protected:
  void SetUp() override {
    Need("sox", "sox");
    Need("ffmpeg", "ffmpeg");
    Need("ffprobe", "ffmpeg");
    Need("sndfile-convert", "sndfile-programs");
    Need("sndfile-metadata-set", "sndfile-programs");
    Need("mediainfo", "mediainfo");
  }
  std::string P(const std::string& name) const { return "'" + dir_.Path(name).string() + "'"; }
  TempDir dir_;
};

// What libsndfile sees: the facts and the first raw audio bytes.
struct SndfileView {
  int channels = 0, rate = 0;
  std::int64_t frames = 0;
  Bytes raw;
};

SndfileView ViewWithSndfile(const fs::path& path, std::size_t rawBytes) {
  SndfileView view;
  SF_INFO info{};
  SNDFILE* file = sf_open(path.c_str(), SFM_READ, &info);
  if (file == nullptr) {
    ADD_FAILURE() << "libsndfile cannot open " << path << ": " << sf_strerror(nullptr);
    return view;
  }
  view.channels = info.channels;
  view.rate = info.samplerate;
  view.frames = info.frames;
  view.raw.resize(rawBytes);
  const sf_count_t got = sf_read_raw(file, view.raw.data(), static_cast<sf_count_t>(rawBytes));
  view.raw.resize(static_cast<std::size_t>(std::max<sf_count_t>(got, 0)));
  sf_close(file);
  return view;
}

struct ForeignCase {
  const char* name;
  std::string command;  // %o is the output file
  bool wave64;
  int channels;
  int rate;
  std::int64_t frames;
  SampleFormat format;
};

TEST_F(WAVEInterop, FilesOtherProgramsWriteReadWithTheirFacts) {
  const std::string sox = "sox -V1 -R -D -r 8000 -n ";
  const std::string tone = " synth 0.1 sine 440";
  const std::string ff =
      "ffmpeg -nostdin -hide_banner -loglevel error -y -f lavfi -i "
      "sine=frequency=440:sample_rate=8000:duration=0.1 ";
  const ForeignCase cases[] = {
      {"sox-u8.wav", sox + "-c 1 -b 8 %o" + tone, false, 1, 8000, 800, kSamp8Offset},
      {"sox-s16.wav", sox + "-c 2 -b 16 %o" + tone, false, 2, 8000, 800, kSamp16},
      {"sox-s24.wav", sox + "-c 1 -b 24 %o" + tone, false, 1, 8000, 800, kSamp24},
      {"sox-s32.wav", sox + "-c 2 -b 32 -e signed-integer %o" + tone, false, 2, 8000, 800,
       kSampUnpacked24},
      {"sox-f32.wav", sox + "-c 2 -b 32 -e floating-point %o" + tone, false, 2, 8000, 800,
       kSampFloat32},
      {"sox-f64.wav", sox + "-c 1 -b 64 -e floating-point %o" + tone, false, 1, 8000, 800,
       kSampWide64B},
      {"sox-6ch.wav", sox + "-c 6 -b 24 %o" + tone, false, 6, 8000, 800, kSamp24},
      {"sox-3ch.wav", sox + "-c 3 -b 16 %o" + tone, false, 3, 8000, 800, kSamp16},
      {"sox-8ch-f32.wav", sox + "-c 8 -b 32 -e floating-point %o" + tone, false, 8, 8000, 800,
       kSampFloat32},
      {"sox-s16.w64", sox + "-c 2 -b 16 -t w64 %o" + tone, true, 2, 8000, 800, kSamp16},
      {"sox-odd-u8.w64", "sox -V1 -R -D -r 8000 -n -c 1 -b 8 -t w64 %o synth 81s sine 440", true, 1,
       8000, 81, kSamp8Offset},
      {"ffmpeg-u8.wav", ff + "-c:a pcm_u8 %o", false, 1, 8000, 800, kSamp8Offset},
      {"ffmpeg-s16.wav", ff + "-c:a pcm_s16le %o", false, 1, 8000, 800, kSamp16},
      {"ffmpeg-s24.wav", ff + "-c:a pcm_s24le %o", false, 1, 8000, 800, kSamp24},
      {"ffmpeg-s32.wav", ff + "-c:a pcm_s32le %o", false, 1, 8000, 800, kSampUnpacked24},
      {"ffmpeg-f32.wav", ff + "-c:a pcm_f32le %o", false, 1, 8000, 800, kSampFloat32},
      {"ffmpeg-f64.wav", ff + "-c:a pcm_f64le %o", false, 1, 8000, 800, kSampWide64B},
      {"ffmpeg-5.1.wav", ff + "-af aformat=channel_layouts=5.1 -c:a pcm_s16le %o", false, 6, 8000,
       800, kSamp16},
      {"ffmpeg-bext.wav",
       ff + "-c:a pcm_s16le -write_bext 1 -metadata description=Take -metadata originator=Tarn %o",
       false, 1, 8000, 800, kSamp16},
      {"ffmpeg-s24.w64", ff + "-c:a pcm_s24le -f w64 %o", true, 1, 8000, 800, kSamp24},
      {"ffmpeg-f32.w64", ff + "-c:a pcm_f32le -f w64 %o", true, 1, 8000, 800, kSampFloat32},
      {"sndfile-s24.wav", "sndfile-convert -pcm24 %i %o", false, 2, 8000, 800, kSamp24},
      {"sndfile-f64.w64", "sndfile-convert -float64 %i %o", true, 2, 8000, 800, kSampWide64B},
      {"sndfile-s32.w64", "sndfile-convert -pcm32 %i %o", true, 2, 8000, 800, kSampUnpacked24},
      {"sndfile-bext.wav",
       "sndfile-metadata-set --bext-description Take --bext-originator Tarn %i %o", false, 2, 8000,
       800, kSamp16},
  };
  // The input of the libsndfile cases.
  RunTool(sox + "-c 2 -b 16 " + P("input.wav") + tone);
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    std::string command = c.command;
    command.replace(command.find("%o"), 2, P(c.name));
    if (const auto at = command.find("%i"); at != std::string::npos)
      command.replace(at, 2, P("input.wav"));
    RunTool(command);
    const auto path = dir_.Path(c.name);
    WAVEReader reader(SpecOf(path));
    ASSERT_TRUE(reader.CanParse());
    EXPECT_EQ(reader.IsWave64(), c.wave64);
    EXPECT_EQ(reader.GetNumberOfChannels(), c.channels);
    EXPECT_EQ(reader.GetSampleRate(), c.rate);
    EXPECT_EQ(reader.GetNumberOfFrames(), c.frames);
    EXPECT_EQ(reader.GetSampleFormat(), c.format);
    const std::size_t audioBytes = static_cast<std::size_t>(c.frames * reader.GetSampleFrameSize());
    const SndfileView view = ViewWithSndfile(path, audioBytes);
    EXPECT_EQ(view.channels, c.channels);
    EXPECT_EQ(view.rate, c.rate);
    EXPECT_EQ(view.frames, c.frames);
    const Bytes file = ReadFile(path);
    ASSERT_LE(reader.GetHeaderSize() + static_cast<std::int64_t>(audioBytes),
              static_cast<std::int64_t>(file.size()));
    EXPECT_EQ(
        Bytes(file.begin() + reader.GetHeaderSize(),
              file.begin() + reader.GetHeaderSize() + static_cast<std::ptrdiff_t>(audioBytes)),
        view.raw);
    if (std::string(c.name).find("bext") != std::string::npos) {
      EXPECT_EQ(reader.GetComment(), UString("Take"));
      EXPECT_EQ(reader.GetBroadcastExtension().mOriginator, "Tarn");
    }
    // The format object agrees with its reader.
    WAVESoundFileFormat format(SpecOf(path));
    EXPECT_EQ(format.GetLengthInFrames(), c.frames);
    EXPECT_EQ(format.GetFileAttributes().mOffsetToAudio, reader.GetHeaderSize());
  }
}

// The value of one "Name : value" line of sox --i.
std::string SoxField(const std::string& info, const std::string& name) {
  const auto at = info.find("\n" + name);
  if (at == std::string::npos) return {};
  const auto colon = info.find(": ", at);
  const auto end = info.find('\n', colon);
  return info.substr(colon + 2, end == std::string::npos ? std::string::npos : end - colon - 2);
}

struct OwnCase {
  bool wave64;
  int channels;
  int bytesPerSample;
  SampleFormat format;
  const char* codec;  // ffprobe's name
};

// `frames` frames of a slow ramp in the file's sample format.
Bytes Audio(const OwnCase& c, int frames) {
  Bytes out;
  for (int f = 0; f < frames; ++f) {
    for (int ch = 0; ch < c.channels; ++ch) {
      const double v = std::sin(0.01 * f + ch) * 0.5;
      std::uint8_t b[4] = {};
      if (c.format == kSampFloat32) {
        const float x = static_cast<float>(v);
        std::memcpy(b, &x, 4);
      } else if (c.bytesPerSample == 1) {
        b[0] = static_cast<std::uint8_t>(128 + static_cast<int>(v * 127));
      } else {
        const auto x = static_cast<std::int32_t>(v * 2147483647.0);
        for (int i = 0; i < c.bytesPerSample; ++i)
          b[i] = static_cast<std::uint8_t>(x >> (8 * (4 - c.bytesPerSample + i)));
      }
      out.insert(out.end(), b, b + c.bytesPerSample);
    }
  }
  return out;
}

TEST_F(WAVEInterop, FilesWeWriteOpenEverywhere) {
  std::vector<OwnCase> cases;
  for (const bool wave64 : {false, true}) {
    for (const int channels : {1, 2, 3, 4, 6, 8}) {
      cases.push_back({wave64, channels, 1, kSamp8Offset, "pcm_u8"});
      cases.push_back({wave64, channels, 2, kSamp16, "pcm_s16le"});
      cases.push_back({wave64, channels, 3, kSamp24, "pcm_s24le"});
      cases.push_back({wave64, channels, 4, kSampFloat32, "pcm_f32le"});
      if (channels > 2) cases.push_back({wave64, channels, 4, kSampUnpacked24, "pcm_s32le"});
    }
  }
  constexpr int kFrames = 1001;
  for (const auto& c : cases) {
    const std::string name = std::string(c.wave64 ? "w64" : "riff") + "-" +
                             std::to_string(c.channels) + "ch-" + c.codec +
                             (c.wave64 ? ".w64" : ".wav");
    SCOPED_TRACE(name);
    const auto path = dir_.Path(name);
    const Bytes audio = Audio(c, kFrames);
    {
      WAVEWriter writer(SpecOf(path), 44100.0, static_cast<std::int16_t>(c.bytesPerSample),
                        static_cast<std::int16_t>(c.channels), 0,
                        static_cast<std::int16_t>(c.bytesPerSample * c.channels), c.format, false,
                        c.wave64);
      writer.WriteHeader(0, 0);
      writer.GetStream().PutRawDataToStream(audio.data(), static_cast<int>(audio.size()));
      writer.UpdateDataLength(kFrames);
      writer.MaybePadChunk();
      writer.Close();
    }
    const SndfileView view = ViewWithSndfile(path, audio.size());
    EXPECT_EQ(view.channels, c.channels);
    EXPECT_EQ(view.rate, 44100);
    EXPECT_EQ(view.frames, kFrames);
    EXPECT_EQ(view.raw, audio);

    const std::string sox = RunTool("sox --i " + P(name));
    EXPECT_EQ(SoxField(sox, "Channels"), std::to_string(c.channels));
    EXPECT_EQ(SoxField(sox, "Sample Rate"), "44100");
    EXPECT_NE(SoxField(sox, "Duration").find("= " + std::to_string(kFrames) + " samples"),
              std::string::npos)
        << sox;
    EXPECT_EQ(RunTool("ffprobe -v error -show_entries stream=codec_name,channels,sample_rate,"
                      "duration_ts:format=format_name -of default=nw=1 " +
                      P(name)),
              std::string("codec_name=") + c.codec + "\nsample_rate=44100\nchannels=" +
                  std::to_string(c.channels) + "\nduration_ts=" + std::to_string(kFrames) +
                  "\nformat_name=" + (c.wave64 ? "w64" : "wav"));
  }
}

// Markers ("cue ") and loops ("smpl") travel both ways: libsndfile's cue
// points and instrument loops read here as markers and loops, and ours read
// in libsndfile as cue points and loops at the same frames.
TEST_F(WAVEInterop, MarkersAndLoopsTravelBothWaysWithLibsndfile) {
  const fs::path theirs = dir_.Path("theirs.wav");
  {
    SF_INFO info{};
    info.samplerate = 44100;
    info.channels = 2;
    info.format = SF_FORMAT_WAV | SF_FORMAT_PCM_16;
    SNDFILE* sf = sf_open(theirs.c_str(), SFM_WRITE, &info);
    ASSERT_NE(sf, nullptr) << sf_strerror(nullptr);
    SF_CUES cues{};
    cues.cue_count = 2;
    for (std::uint32_t i = 0; i < 2; ++i) {
      SF_CUE_POINT& c = cues.cue_points[i];
      c.indx = static_cast<std::int32_t>(i + 1);
      c.position = c.sample_offset = i == 0 ? 100u : 2500u;
      c.fcc_chunk = 0x61746164;  // "data", little-endian
    }
    ASSERT_EQ(sf_command(sf, SFC_SET_CUE, &cues, sizeof cues), SF_TRUE);
    SF_INSTRUMENT inst{};
    inst.basenote = 60;
    inst.velocity_hi = inst.key_hi = 127;
    inst.loop_count = 2;
    inst.loops[0] = {SF_LOOP_FORWARD, 1000, 2000, 0};
    inst.loops[1] = {SF_LOOP_ALTERNATING, 3000, 4000, 3};
    ASSERT_EQ(sf_command(sf, SFC_SET_INSTRUMENT, &inst, sizeof inst), SF_TRUE);
    std::vector<short> audio(2 * 5000, 0);
    ASSERT_EQ(sf_writef_short(sf, audio.data(), 5000), 5000);
    sf_close(sf);
  }
  // What libsndfile reads back of its own file is what we must read.
  SF_INFO info{};
  SNDFILE* sf = sf_open(theirs.c_str(), SFM_READ, &info);
  ASSERT_NE(sf, nullptr);
  SF_INSTRUMENT theirInst{};
  ASSERT_EQ(sf_command(sf, SFC_GET_INSTRUMENT, &theirInst, sizeof theirInst), SF_TRUE);
  sf_close(sf);
  ASSERT_EQ(theirInst.loop_count, 2);
  {
    auto format = std::make_shared<WAVESoundFileFormat>(SpecOf(theirs));
    auto ro = format->GetReadOnlyMetaDataAccess();
    ASSERT_EQ(format->NumberOfLoops(*ro), 2);
    for (short i = 0; i < 2; ++i) {
      SoundFileFormatLoop loop;
      format->GetFileLoop(*ro, i, loop);
      EXPECT_EQ(loop.mStart, SampleCount(theirInst.loops[i].start)) << i;
      EXPECT_EQ(loop.mEnd, SampleCount(theirInst.loops[i].end)) << i;
    }
    SoundFileFormatLoop second;
    format->GetFileLoop(*ro, 1, second);
    EXPECT_EQ(second.mType, SoundFileFormatLoop::Type::kAlternating);
    EXPECT_EQ(second.mPlayCount, 3u);
    std::vector<std::int64_t> markers;
    const auto regions = format->GetRegionList(*ro);
    for (const auto& entry : *regions) {
      EXPECT_TRUE(entry.IsMarker());
      markers.push_back(entry.mStart.AsLongLong());
    }
    EXPECT_EQ(markers, (std::vector<std::int64_t>{100, 2500}));
  }

  // Ours, read by libsndfile.
  const fs::path ours = dir_.Path("ours.wav");
  {
    WAVEWriter writer(SpecOf(ours), 48000.0, 2, 1, 6000, 2, kSamp16, false, false);
    writer.WriteHeader(0, 6000);
    const Bytes audio(12000, 0);
    writer.GetStream().PutRawDataToStream(audio.data(), static_cast<int>(audio.size()));
  }
  {
    auto format = std::make_shared<WAVESoundFileFormat>(SpecOf(ours));
    std::vector<SoundFileFormatLoop> loops(1);
    loops[0].mStart = 500;
    loops[0].mEnd = 1500;
    SoundFileRegionList regions;
    regions.Add({1, UString("Hit"), 250, 0});
    regions.Add({2, UString("Bar"), 4000, 0});
    auto rw = format->GetReadWriteMetaDataAccess();
    format->AddFileLoops(*rw, loops);
    format->WriteRegionList(*rw, regions.Flatten(), 0);
  }
  sf = sf_open(ours.c_str(), SFM_READ, &info);
  ASSERT_NE(sf, nullptr);
  SF_INSTRUMENT inst{};
  ASSERT_EQ(sf_command(sf, SFC_GET_INSTRUMENT, &inst, sizeof inst), SF_TRUE);
  SF_CUES cues{};
  ASSERT_EQ(sf_command(sf, SFC_GET_CUE, &cues, sizeof cues), SF_TRUE);
  sf_close(sf);
  ASSERT_EQ(inst.loop_count, 1);
  EXPECT_EQ(inst.loops[0].mode, SF_LOOP_FORWARD);
  // libsndfile reads the loop as it reads its own: compare with its own round trip.
  EXPECT_EQ(inst.loops[0].start, 500u);
  EXPECT_EQ(inst.loops[0].end - theirInst.loops[0].end, 1500u - 2000u);
  ASSERT_EQ(cues.cue_count, 2u);
  EXPECT_EQ(cues.cue_points[0].sample_offset, 250u);
  EXPECT_EQ(cues.cue_points[1].sample_offset, 4000u);
}

TEST_F(WAVEInterop, MediainfoShowsOurBroadcastExtension) {
  for (const bool wave64 : {false, true}) {
    const std::string name = wave64 ? "bext.w64" : "bext.wav";
    auto format = std::make_shared<WAVESoundFileFormat>(SpecOf(dir_.Path(name)));
    SoundFileAttributes attributes;
    attributes.mNumChannels = 2;
    attributes.mSampleRate = 48000.0;
    attributes.mSampleFormat = kSamp24;
    SoundFileAttributes hint;
    hint.mFileType = wave64 ? MakeRIFFType(".W64") : 0;
    const auto written = format->CreateFileOnDisk(attributes, 0, false, hint);
    {
      std::ofstream out(dir_.Path(name), std::ios::binary | std::ios::app);
      const Bytes audio(6 * 480, 0);
      out.write(reinterpret_cast<const char*>(audio.data()),
                static_cast<std::streamsize>(audio.size()));
    }
    {
      auto rw = format->GetReadWriteMetaDataAccess();
      format->UpdateLengthAfterAppendingAudio(*rw, written);
      format->SaveStringToFile(*rw, WAVESoundFileFormat::kCommentString, UString("Interop take"));
    }
    // mediainfo reads "bext" in RIFF files only; of a Wave64 file it shows
    // the container.
    EXPECT_EQ(RunTool("mediainfo --Inform='General;%Format%|%Description%|%Producer%' " + P(name)),
              wave64 ? "Wave64||" : "Wave|Interop take|TarnCore")
        << name;
    EXPECT_EQ(RunTool("sox --i -s " + P(name)), "480");
  }
}

TEST_F(WAVEInterop, SparseRecordingPastFourGigabytesSwitchesToWave64InPlace) {
  const auto path = dir_.Path("long.wav");
  auto format = std::make_shared<WAVESoundFileFormat>(SpecOf(path));
  SoundFileAttributes attributes;
  attributes.mNumChannels = 2;
  attributes.mSampleRate = 48000.0;
  // 16-bit: sox reads the whole audio of a floating-point file to count it.
  attributes.mSampleFormat = kSamp16;
  const auto written = format->CreateFileOnDisk(attributes, 0, true, {});
  ASSERT_EQ(written.mFileType, MakeRIFFType("WAVE"));
  ASSERT_EQ(written.mOffsetToAudio, 1024);
  // 1.2 billion frames of 4 bytes: 4.8 GB of audio, left as a hole.
  constexpr std::int64_t kFrames = 1'200'000'000;
  std::error_code error;
  fs::resize_file(path, static_cast<std::uintmax_t>(1024 + kFrames * 4), error);
  ASSERT_FALSE(error) << error.message();
  {
    auto rw = format->GetReadWriteMetaDataAccess();
    format->UpdateLengthAfterAppendingAudio(*rw, written);
  }
  EXPECT_TRUE(format->IsExtendedFormat());
  EXPECT_EQ(format->GetLengthInFrames(), kFrames);
  EXPECT_EQ(format->GetFileAttributes().mOffsetToAudio, 1024);
  WAVEReader reader(SpecOf(path));
  EXPECT_TRUE(reader.IsWave64());
  EXPECT_TRUE(reader.HasRecIndicator());
  EXPECT_EQ(RunTool("ffprobe -v error -show_entries stream=channels,duration_ts:format=format_name "
                    "-of default=nw=1 " +
                    P("long.wav")),
            "channels=2\nduration_ts=" + std::to_string(kFrames) + "\nformat_name=w64");
  // sox picks its reader by the name's extension: show it the file under a
  // Wave64 name.
  fs::create_symlink(path, dir_.Path("long.w64"), error);
  ASSERT_FALSE(error) << error.message();
  EXPECT_EQ(RunTool("sox --i -t " + P("long.w64")), "w64");
  EXPECT_EQ(RunTool("sox --i -s " + P("long.w64")), std::to_string(kFrames));
  fs::remove(dir_.Path("long.w64"), error);
  fs::remove(path, error);
}

}  // namespace
}  // namespace tarn::test

#endif  // TARN_TEST_DECODERS
