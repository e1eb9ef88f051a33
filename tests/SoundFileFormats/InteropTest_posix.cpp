// Sound files across programs, run on the host at test time (POSIX only;
// a missing tool fails with the package to install). WAVE and Wave64 files
// that sox, ffmpeg and libsndfile write read with their facts (the audio
// offset checked against the raw bytes libsndfile reads); the WAVE,
// Wave64, AIFF and AIFC files we write (every encoding, 1 to 8 channels)
// open in libsndfile, sox and ffprobe with the attributes written and
// decode to the very samples written; markers and loops travel both ways;
// mediainfo shows our broadcast extension; a recording past 4 GB switches
// to Wave64 in place.

#include <gtest/gtest.h>

#ifdef TARN_TEST_DECODERS

#include <sndfile.h>

#include <cmath>
#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include "SoundFileFormats/ChunkFileTestUtil.h"
#include "tarn/Audio/SoundFileFormats/AIFFWriter.h"
#include "tarn/Audio/SoundFileFormats/SoundFileRegionList.h"
#include "tarn/Audio/SoundFileFormats/WAVEReader.h"
#include "tarn/Audio/SoundFileFormats/WAVESoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/WAVEWriter.h"

namespace tarn::test {
namespace {

namespace fs = std::filesystem;

class Interop : public ::testing::Test {
 protected:
  void SetUp() override {
    for (const auto& [tool, package] : {std::pair{"sox", "sox"},
                                        {"ffmpeg", "ffmpeg"},
                                        {"ffprobe", "ffmpeg"},
                                        {"sndfile-convert", "sndfile-programs"},
                                        {"sndfile-metadata-set", "sndfile-programs"},
                                        {"mediainfo", "mediainfo"}})
      NeedTool(tool, package);
  }
  std::string P(const std::string& name) const { return "'" + dir_.Path(name).string() + "'"; }
  TempDir dir_;
};

std::string Trimmed(std::string s) {
  while (!s.empty() && (s.back() == '\n' || s.back() == '\r')) s.pop_back();
  return s;
}

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
  view = {info.channels, info.samplerate, info.frames, Bytes(rawBytes)};
  const sf_count_t got = sf_read_raw(file, view.raw.data(), static_cast<sf_count_t>(rawBytes));
  view.raw.resize(static_cast<std::size_t>(std::max<sf_count_t>(got, 0)));
  sf_close(file);
  return view;
}

// sox --i says the file holds `frames` frames of `channels` at `rate` in
// the sample encoding of `codec` (ffprobe's name).
void ExpectSoxSees(const std::string& quoted, const std::string& codec, int rate, int channels,
                   int frames, bool checkEncoding = true) {
  const auto sox = Fields(RunTool("sox --i " + quoted), ':');
  EXPECT_EQ(sox.at("Channels"), std::to_string(channels));
  EXPECT_EQ(sox.at("Sample Rate"), std::to_string(rate));
  EXPECT_NE(sox.at("Duration").find("= " + std::to_string(frames) + " samples"), std::string::npos)
      << sox.at("Duration");
  if (!checkEncoding) return;
  const char* encoding = codec.starts_with("pcm_f") ? "Floating Point"
                         : codec == "pcm_u8"        ? "Unsigned Integer"
                                                    : "Signed Integer";
  EXPECT_NE(sox.at("Sample Encoding").find(encoding), std::string::npos)
      << sox.at("Sample Encoding");
}
// ffprobe says the same, and names the container `format` if given.
void ExpectFFprobeSees(const std::string& quoted, const std::string& codec, int rate, int channels,
                       int frames, const std::string& format = "") {
  const auto probe = Fields(RunTool("ffprobe -v error -show_entries stream=codec_name,sample_rate,"
                                    "channels,duration_ts:format=format_name -of default=nw=1 " +
                                    quoted),
                            '=');
  EXPECT_EQ(probe.at("codec_name"), codec);
  EXPECT_EQ(probe.at("sample_rate"), std::to_string(rate));
  EXPECT_EQ(probe.at("channels"), std::to_string(channels));
  EXPECT_EQ(probe.at("duration_ts"), std::to_string(frames));
  if (!format.empty()) {
    EXPECT_EQ(probe.at("format_name"), format);
  }
}

TEST_F(Interop, WaveFilesOtherProgramsWriteReadWithTheirFacts) {
  const std::string sox = "sox -V1 -R -D -r 8000 -n ";
  const std::string tone = " synth 0.1 sine 440";
  const std::string ff =
      "ffmpeg -nostdin -hide_banner -loglevel error -y -f lavfi -i "
      "sine=frequency=440:sample_rate=8000:duration=0.1 ";
  const struct {
    const char* name;
    std::string command;  // %o is the output file, %i a 16-bit stereo tone
    bool wave64;
    int channels;
    std::int64_t frames;
    SampleFormat format;
  } cases[] = {
      {"sox-u8.wav", sox + "-c 1 -b 8 %o" + tone, false, 1, 800, kSamp8Offset},
      {"sox-s16.wav", sox + "-c 2 -b 16 %o" + tone, false, 2, 800, kSamp16},
      {"sox-s24.wav", sox + "-c 1 -b 24 %o" + tone, false, 1, 800, kSamp24},
      {"sox-s32.wav", sox + "-c 2 -b 32 -e signed-integer %o" + tone, false, 2, 800,
       kSampUnpacked24},
      {"sox-f32.wav", sox + "-c 2 -b 32 -e floating-point %o" + tone, false, 2, 800, kSampFloat32},
      {"sox-f64.wav", sox + "-c 1 -b 64 -e floating-point %o" + tone, false, 1, 800, kSampWide64B},
      {"sox-6ch.wav", sox + "-c 6 -b 24 %o" + tone, false, 6, 800, kSamp24},
      {"sox-3ch.wav", sox + "-c 3 -b 16 %o" + tone, false, 3, 800, kSamp16},
      {"sox-8ch-f32.wav", sox + "-c 8 -b 32 -e floating-point %o" + tone, false, 8, 800,
       kSampFloat32},
      {"sox-s16.w64", sox + "-c 2 -b 16 -t w64 %o" + tone, true, 2, 800, kSamp16},
      {"sox-odd-u8.w64", sox + "-c 1 -b 8 -t w64 %o synth 81s sine 440", true, 1, 81, kSamp8Offset},
      {"ffmpeg-u8.wav", ff + "-c:a pcm_u8 %o", false, 1, 800, kSamp8Offset},
      {"ffmpeg-s16.wav", ff + "-c:a pcm_s16le %o", false, 1, 800, kSamp16},
      {"ffmpeg-s24.wav", ff + "-c:a pcm_s24le %o", false, 1, 800, kSamp24},
      {"ffmpeg-s32.wav", ff + "-c:a pcm_s32le %o", false, 1, 800, kSampUnpacked24},
      {"ffmpeg-f32.wav", ff + "-c:a pcm_f32le %o", false, 1, 800, kSampFloat32},
      {"ffmpeg-f64.wav", ff + "-c:a pcm_f64le %o", false, 1, 800, kSampWide64B},
      {"ffmpeg-5.1.wav", ff + "-af aformat=channel_layouts=5.1 -c:a pcm_s16le %o", false, 6, 800,
       kSamp16},
      {"ffmpeg-bext.wav",
       ff + "-c:a pcm_s16le -write_bext 1 -metadata description=Take -metadata originator=Tarn %o",
       false, 1, 800, kSamp16},
      {"ffmpeg-s24.w64", ff + "-c:a pcm_s24le -f w64 %o", true, 1, 800, kSamp24},
      {"ffmpeg-f32.w64", ff + "-c:a pcm_f32le -f w64 %o", true, 1, 800, kSampFloat32},
      {"sndfile-s24.wav", "sndfile-convert -pcm24 %i %o", false, 2, 800, kSamp24},
      {"sndfile-f64.w64", "sndfile-convert -float64 %i %o", true, 2, 800, kSampWide64B},
      {"sndfile-s32.w64", "sndfile-convert -pcm32 %i %o", true, 2, 800, kSampUnpacked24},
      {"sndfile-bext.wav",
       "sndfile-metadata-set --bext-description Take --bext-originator Tarn %i %o", false, 2, 800,
       kSamp16},
  };
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
    EXPECT_EQ(reader.GetSampleRate(), 8000);
    EXPECT_EQ(reader.GetNumberOfFrames(), c.frames);
    EXPECT_EQ(reader.GetSampleFormat(), c.format);
    const auto audioBytes = static_cast<std::size_t>(c.frames * reader.GetSampleFrameSize());
    const SndfileView view = ViewWithSndfile(path, audioBytes);
    EXPECT_EQ(view.channels, c.channels);
    EXPECT_EQ(view.rate, 8000);
    EXPECT_EQ(view.frames, c.frames);
    const Bytes file = ReadFile(path);
    const auto at = static_cast<std::size_t>(reader.GetHeaderSize());
    ASSERT_LE(at + audioBytes, file.size());
    EXPECT_EQ(Slice(file, at, at + audioBytes), view.raw);
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

TEST_F(Interop, WaveFilesWeWriteOpenEverywhere) {
  const struct {
    int bytesPerSample;
    SampleFormat format;
    const char* codec;
    bool multichannelOnly;
  } encodings[] = {{1, kSamp8Offset, "pcm_u8", false},
                   {2, kSamp16, "pcm_s16le", false},
                   {3, kSamp24, "pcm_s24le", false},
                   {4, kSampFloat32, "pcm_f32le", false},
                   {4, kSampUnpacked24, "pcm_s32le", true}};
  constexpr int kFrames = 1001;
  for (const bool wave64 : {false, true}) {
    for (const int channels : {1, 2, 3, 4, 6, 8}) {
      for (const auto& e : encodings) {
        if (e.multichannelOnly && channels <= 2) continue;
        const std::string name = std::string(wave64 ? "w64" : "riff") + "-" +
                                 std::to_string(channels) + "ch-" + e.codec +
                                 (wave64 ? ".w64" : ".wav");
        SCOPED_TRACE(name);
        // A slow sine in the file's sample format.
        Bytes audio;
        for (int k = 0; k < kFrames * channels; ++k) {
          const double v = std::sin(0.01 * (k / channels) + k % channels) * 0.5;
          const float single = static_cast<float>(v);
          std::uint32_t word = 0;
          if (e.format == kSampFloat32)
            std::memcpy(&word, &single, 4);
          else if (e.bytesPerSample == 1)
            word = static_cast<std::uint32_t>(128 + static_cast<int>(v * 127));
          else
            word = static_cast<std::uint32_t>(static_cast<std::int32_t>(v * 2147483647.0)) >>
                   (32 - 8 * e.bytesPerSample);
          const Bytes sample = LE(word, e.bytesPerSample);
          audio.insert(audio.end(), sample.begin(), sample.end());
        }
        const auto path = dir_.Path(name);
        {
          WAVEWriter writer(SpecOf(path), 44100.0, static_cast<std::int16_t>(e.bytesPerSample),
                            static_cast<std::int16_t>(channels), 0,
                            static_cast<std::int16_t>(e.bytesPerSample * channels), e.format, false,
                            wave64);
          writer.WriteHeader(0, 0);
          writer.GetStream().PutRawDataToStream(audio.data(), static_cast<int>(audio.size()));
          writer.UpdateDataLength(kFrames);
          writer.MaybePadChunk();
          writer.Close();
        }
        const SndfileView view = ViewWithSndfile(path, audio.size());
        EXPECT_EQ(view.channels, channels);
        EXPECT_EQ(view.rate, 44100);
        EXPECT_EQ(view.frames, kFrames);
        EXPECT_EQ(view.raw, audio);
        // sox takes Wave64's extensible floating point for integers.
        ExpectSoxSees(P(name), e.codec, 44100, channels, kFrames, !wave64 || channels <= 2);
        ExpectFFprobeSees(P(name), e.codec, 44100, channels, kFrames, wave64 ? "w64" : "wav");
      }
    }
  }
}

TEST_F(Interop, AiffFilesWeWriteOpenWithTheAttributesAndDecodeToTheSamplesWritten) {
  const struct {
    RIFFType form, compression;
    std::int16_t bits;
    const char* codec;  // as ffprobe names it
  } encodings[] = {
      {T("AIFF"), T("NONE"), 8, "pcm_s8"},     {T("AIFF"), T("NONE"), 16, "pcm_s16be"},
      {T("AIFF"), T("NONE"), 24, "pcm_s24be"}, {T("AIFF"), T("NONE"), 32, "pcm_s32be"},
      {T("AIFC"), T("NONE"), 16, "pcm_s16be"}, {T("AIFC"), T("NONE"), 24, "pcm_s24be"},
      {T("AIFC"), T("sowt"), 16, "pcm_s16le"}, {T("AIFC"), T("fl32"), 32, "pcm_f32be"},
      {T("AIFC"), T("fl64"), 64, "pcm_f64be"},
  };
  const int frames = 101;  // odd: 8-bit mono audio needs its pad byte
  for (const auto& e : encodings) {
    for (std::int16_t channels = 1; channels <= 8; ++channels) {
      const std::string tag = RIFFTypeToString(e.form) + "-" + RIFFTypeToString(e.compression) +
                              "-" + std::to_string(e.bits) + "-" + std::to_string(channels);
      SCOPED_TRACE(tag);
      const std::string name = tag + (e.form == T("AIFC") ? ".aifc" : ".aiff");
      const bool floating = e.compression == T("fl32") || e.compression == T("fl64");
      const Ramp ramp = MakeRamp(channels, frames, e.bits, e.compression == T("sowt"), floating);
      const int rate = 22050 + channels;
      {
        AIFFWriter writer(SpecOf(dir_.Path(name)), rate, channels, e.bits, e.form, e.compression,
                          0);
        writer.WriteHeader();
        writer.GetStream().PutRawDataToStream(ramp.bytes.data(),
                                              static_cast<int>(ramp.bytes.size()));
        writer.UpdateDataLength(frames);
        writer.MaybePadChunk();
        writer.Close();
      }
      // libsndfile, in process.
      SF_INFO info{};
      SNDFILE* sf = sf_open(dir_.Path(name).c_str(), SFM_READ, &info);
      ASSERT_NE(sf, nullptr) << sf_strerror(nullptr);
      EXPECT_EQ(info.channels, channels);
      EXPECT_EQ(info.samplerate, rate);
      EXPECT_EQ(info.frames, frames);
      std::vector<double> reals(ramp.reals.size());
      std::vector<int> ints(ramp.ints.size());
      if (floating) {
        EXPECT_EQ(sf_readf_double(sf, reals.data(), frames), frames);
      } else
        EXPECT_EQ(sf_readf_int(sf, ints.data(), frames), frames);
      sf_close(sf);
      EXPECT_EQ(reals, ramp.reals);
      EXPECT_EQ(std::vector<std::int32_t>(ints.begin(), ints.end()), ramp.ints);
      // sox, for the usual channel counts, and ffprobe (which takes most of
      // a second to start) once per encoding, the channel counts in turn.
      if (channels == static_cast<int>(&e - encodings) % 8 + 1)
        ExpectFFprobeSees(P(name), e.codec, rate, channels, frames);
      if (channels == 4 || channels == 5 || channels == 7) continue;
      ExpectSoxSees(P(name), e.codec, rate, channels, frames);
      const std::string raw = RunTool(
          "sox -V1 " + P(name) +
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
    }
  }
}

// Markers ("cue ") and loops ("smpl") travel both ways: libsndfile's cue
// points and instrument loops read here as markers and loops, and ours read
// in libsndfile as cue points and loops at the same frames.
TEST_F(Interop, WaveMarkersAndLoopsTravelBothWaysWithLibsndfile) {
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
      if (i == 1) {
        EXPECT_EQ(loop.mType, SoundFileFormatLoop::Type::kAlternating);
        EXPECT_EQ(loop.mPlayCount, 3u);
      }
    }
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
    SoundFileFormatLoop loop;
    loop.mStart = 500;
    loop.mEnd = 1500;
    SoundFileRegionList regions;
    regions.Add({1, UString("Hit"), 250, 0});
    regions.Add({2, UString("Bar"), 4000, 0});
    auto rw = format->GetReadWriteMetaDataAccess();
    format->AddFileLoops(*rw, {loop});
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

TEST_F(Interop, MediainfoShowsOurBroadcastExtension) {
  for (const bool wave64 : {false, true}) {
    const std::string name = wave64 ? "bext.w64" : "bext.wav";
    auto format = std::make_shared<WAVESoundFileFormat>(SpecOf(dir_.Path(name)));
    SoundFileAttributes attributes, hint;
    attributes.mNumChannels = 2;
    attributes.mSampleRate = 48000.0;
    attributes.mSampleFormat = kSamp24;
    hint.mFileType = wave64 ? T(".W64") : 0;
    const auto written = format->CreateFileOnDisk(attributes, 0, false, hint);
    AppendFile(dir_.Path(name), Bytes(6 * 480, 0));
    {
      auto rw = format->GetReadWriteMetaDataAccess();
      format->UpdateLengthAfterAppendingAudio(*rw, written);
      format->SaveStringToFile(*rw, WAVESoundFileFormat::kCommentString, UString("Interop take"));
    }
    // mediainfo reads "bext" in RIFF files only; of a Wave64 file it shows
    // the container.
    EXPECT_EQ(Trimmed(RunTool("mediainfo --Inform='General;%Format%|%Description%|%Producer%' " +
                              P(name))),
              wave64 ? "Wave64||" : "Wave|Interop take|TarnCore")
        << name;
    EXPECT_EQ(Trimmed(RunTool("sox --i -s " + P(name))), "480");
  }
}

TEST_F(Interop, SparseRecordingPastFourGigabytesSwitchesToWave64InPlace) {
  const auto path = dir_.Path("long.wav");
  auto format = std::make_shared<WAVESoundFileFormat>(SpecOf(path));
  SoundFileAttributes attributes;
  attributes.mNumChannels = 2;
  attributes.mSampleRate = 48000.0;
  // 16-bit: sox reads the whole audio of a floating-point file to count it.
  attributes.mSampleFormat = kSamp16;
  const auto written = format->CreateFileOnDisk(attributes, 0, true, {});
  ASSERT_EQ(written.mFileType, T("WAVE"));
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
  EXPECT_EQ(Trimmed(RunTool(
                "ffprobe -v error -show_entries stream=channels,duration_ts:format=format_name "
                "-of default=nw=1 " +
                P("long.wav"))),
            "channels=2\nduration_ts=" + std::to_string(kFrames) + "\nformat_name=w64");
  // sox picks its reader by the name's extension: show it the file under a
  // Wave64 name.
  fs::create_symlink(path, dir_.Path("long.w64"), error);
  ASSERT_FALSE(error) << error.message();
  EXPECT_EQ(Trimmed(RunTool("sox --i -t " + P("long.w64"))), "w64");
  EXPECT_EQ(Trimmed(RunTool("sox --i -s " + P("long.w64"))), std::to_string(kFrames));
  fs::remove(dir_.Path("long.w64"), error);
  fs::remove(path, error);
}

}  // namespace
}  // namespace tarn::test

#endif  // TARN_TEST_DECODERS
