// The chain and its host facade on real files: files that sox, ffmpeg and
// libsndfile's tools write (WAVE, Wave64, AIFF, AIFC; 8, 16, 24 and 32-bit
// integers and 32-bit float; 1 to 6 channels) read here exactly as
// libsndfile and sox decode them, and files written here decode there to
// exactly the samples written. Also the repair of crashed recordings.

#include <gtest/gtest.h>
#include <sndfile.h>

#include <array>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <random>
#include <string>

#include "AudioChain/ChainTestUtil.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormat.h"
#include "tarn/Audio/SoundFileReader.h"
#include "tarn/Audio/SoundFileWriter.h"
#include "tarn/FileSystem/FileSpecification.h"

namespace tarn::test {
namespace {

namespace fs = std::filesystem;

// Interleaved float samples and channel count as libsndfile decodes a file.
struct Decoded {
  int channels = 0;
  std::vector<float> samples;
};

Decoded DecodeWithLibsndfile(const fs::path& path) {
  SF_INFO info{};
  SNDFILE* f = sf_open(path.c_str(), SFM_READ, &info);
  EXPECT_NE(f, nullptr) << path << ": " << sf_strerror(nullptr);
  Decoded d;
  if (f == nullptr) return d;
  d.channels = info.channels;
  d.samples.resize(static_cast<std::size_t>(info.frames * info.channels));
  EXPECT_EQ(sf_readf_float(f, d.samples.data(), info.frames), info.frames);
  sf_close(f);
  return d;
}

Decoded DecodeWithFfmpeg(const fs::path& path, int channels) {
  const std::string raw =
      RunTool("ffmpeg -nostdin -hide_banner -loglevel error -i '" + path.string() + "' -f f32le -");
  Decoded d;
  d.channels = channels;
  d.samples.resize(raw.size() / 4);
  std::memcpy(d.samples.data(), raw.data(), d.samples.size() * 4);
  return d;
}

// An integer file's samples as sox decodes them: its raw 32-bit integers
// (the samples left-justified), each taken as v / 2^31 and rounded once to
// float, as this library scales them. (sox carries float files through
// 32-bit integers too, which loses the low bits of small values, so float
// files are checked against libsndfile and ffmpeg only.)
std::vector<float> DecodeWithSox(const fs::path& path) {
  const std::string raw = RunTool("sox -V1 '" + path.string() + "' -t s32 -");
  std::vector<float> out(raw.size() / 4);
  for (std::size_t i = 0; i < out.size(); ++i) {
    std::int32_t v;
    std::memcpy(&v, raw.data() + i * 4, 4);
    out[i] = static_cast<float>(static_cast<double>(v) / 2147483648.0);
  }
  return out;
}

// libsndfile reads float Wave64 files in the extensible form as 32-bit
// integers; for those files ffmpeg's decoding is the reference.
bool IsFloatWave64(const fs::path& path, SampleFormat format) {
  return format == kSampFloat32 && path.extension() == ".w64";
}

Decoded Reference(const fs::path& path, SampleFormat format, int channels) {
  return IsFloatWave64(path, format) ? DecodeWithFfmpeg(path, channels)
                                     : DecodeWithLibsndfile(path);
}

// Reads the whole file through the facade, interleaved back for comparing.
std::vector<float> ReadWithChain(const fs::path& path, int& channels) {
  SoundFileReader file(SpecOf(path));
  channels = file.GetNumChannels();
  std::vector<std::vector<float>> per;
  EXPECT_EQ(file.Read(0, file.GetLengthInFrames(), per), file.GetLengthInFrames());
  std::vector<float> out;
  for (std::size_t i = 0; i < per.at(0).size(); ++i)
    for (const auto& c : per) out.push_back(c[i]);
  return out;
}

class FileInterop : public ::testing::Test {
 protected:
  void SetUp() override {
    NeedTool("sox", "sox");
    NeedTool("ffmpeg", "ffmpeg");
    NeedTool("sndfile-convert", "sndfile-programs");
  }
  TempDir dir;
};

// Sine tones of different pitches per channel plus noise, so channels and
// frames differ and full scale is reached.
std::string SoxSynth(int channels) {
  std::string s = " synth 0.05";
  for (int c = 0; c < channels; ++c)
    s += c % 2 ? " whitenoise" : " sine " + std::to_string(300 + 170 * c);
  return s;
}

TEST_F(FileInterop, ForeignFilesReadAsTheirToolsDecodeThem) {
  struct Case {
    std::string name;     // output file name
    std::string command;  // %o: the output path; %c: channels; %s: the sox synth
  };
  const std::string ff =
      "ffmpeg -nostdin -hide_banner -loglevel error -y -f lavfi -i "
      "'sine=frequency=440:sample_rate=44100:duration=0.05' -ac %c ";
  const std::string sox = "sox -V1 -R -D -r 44100 -n -c %c ";
  const Case cases[] = {
      {"sox-u8.wav", sox + "-b 8 %o%s"},
      {"sox-s16.wav", sox + "-b 16 %o%s"},
      {"sox-s24.wav", sox + "-b 24 %o%s"},
      {"sox-s32.wav", sox + "-b 32 %o%s"},
      {"sox-f32.wav", sox + "-e floating-point -b 32 %o%s"},
      {"sox-s16.w64", sox + "-b 16 %o%s"},
      {"sox-s24.w64", sox + "-b 24 %o%s"},
      {"sox-f32.w64", sox + "-e floating-point -b 32 %o%s"},
      {"sox-s8.aiff", sox + "-b 8 %o%s"},
      {"sox-s16.aiff", sox + "-b 16 %o%s"},
      {"sox-s24.aiff", sox + "-b 24 %o%s"},
      {"sox-s32.aiff", sox + "-b 32 %o%s"},
      {"sox-s16.aifc", sox + "-b 16 -t aifc %o%s"},
      {"sox-f32.aifc", sox + "-e floating-point -b 32 -t aifc %o%s"},
      {"ffmpeg-u8.wav", ff + "-c:a pcm_u8 %o"},
      {"ffmpeg-s16.wav", ff + "-c:a pcm_s16le %o"},
      {"ffmpeg-s24.wav", ff + "-c:a pcm_s24le %o"},
      {"ffmpeg-s32.wav", ff + "-c:a pcm_s32le %o"},
      {"ffmpeg-f32.wav", ff + "-c:a pcm_f32le %o"},
      {"ffmpeg-s16.w64", ff + "-c:a pcm_s16le -f w64 %o"},
      {"ffmpeg-s24.w64", ff + "-c:a pcm_s24le -f w64 %o"},
      {"ffmpeg-f32.w64", ff + "-c:a pcm_f32le -f w64 %o"},
      {"ffmpeg-s8.aiff", ff + "-c:a pcm_s8 %o"},
      {"ffmpeg-s16.aiff", ff + "-c:a pcm_s16be %o"},
      {"ffmpeg-s24.aiff", ff + "-c:a pcm_s24be %o"},
      {"ffmpeg-s32.aiff", ff + "-c:a pcm_s32be %o"},
      {"ffmpeg-f32.aifc", ff + "-c:a pcm_f32be -f aiff %o"},
      {"ffmpeg-sowt.aifc", ff + "-c:a pcm_s16le -f aiff %o"},
      {"sndfile-s8.aiff", "sndfile-convert -pcms8 %i %o"},
      {"sndfile-u8.wav", "sndfile-convert -pcmu8 %i %o"},
      {"sndfile-s16.w64", "sndfile-convert -pcm16 %i %o"},
      {"sndfile-s24.aiff", "sndfile-convert -pcm24 %i %o"},
      {"sndfile-s32.wav", "sndfile-convert -pcm32 %i %o"},
      {"sndfile-f32.aiff", "sndfile-convert -float32 %i %o"},
      {"sndfile-f32.w64", "sndfile-convert -float32 %i %o"},
  };
  // Each file gets its own channel count, 1 to 6 in turn.
  int next = 0;
  for (const auto& c : cases) {
    const int channels = next++ % 6 + 1;
    {
      SCOPED_TRACE(testing::Message() << c.name << ", " << channels << " ch");
      const fs::path out = dir.path / (std::to_string(channels) + "-" + c.name);
      const fs::path source = dir.path / (std::to_string(channels) + "-source.wav");
      if (!fs::exists(source))
        RunTool("sox -V1 -R -D -r 44100 -n -c " + std::to_string(channels) + " -b 24 '" +
                source.string() + "'" + SoxSynth(channels));
      std::string command = c.command;
      for (auto [key, value] : {std::pair<std::string, std::string>{"%o", "'" + out.string() + "'"},
                                {"%i", "'" + source.string() + "'"},
                                {"%c", std::to_string(channels)},
                                {"%s", SoxSynth(channels)}})
        for (std::size_t at; (at = command.find(key)) != std::string::npos;)
          command.replace(at, key.size(), value);
      RunTool(command);
      ASSERT_TRUE(fs::exists(out));
      const bool floatFile = c.name.find("f32") != std::string::npos;
      const Decoded reference = Reference(out, floatFile ? kSampFloat32 : kSamp16, channels);
      int ourChannels = 0;
      const std::vector<float> ours = ReadWithChain(out, ourChannels);
      ASSERT_EQ(ourChannels, reference.channels);
      ASSERT_EQ(ours.size(), reference.samples.size());
      ASSERT_FALSE(ours.empty());
      for (std::size_t i = 0; i < ours.size(); ++i)
        ASSERT_EQ(ours[i], reference.samples[i]) << "sample " << i;
      if (floatFile) continue;  // see DecodeWithSox
      const std::vector<float> soxSamples = DecodeWithSox(out);
      ASSERT_EQ(soxSamples.size(), ours.size());
      for (std::size_t i = 0; i < ours.size(); ++i)
        ASSERT_EQ(ours[i], soxSamples[i]) << "sox, sample " << i;
    }
  }
}

// Samples that the file format holds exactly: q / 2^(bits - 1) for random
// q, with the extremes first; float files get arbitrary floats.
std::vector<float> ExactSamples(SampleFormat f, std::size_t count, std::mt19937& rng) {
  const int bits = f <= kSamp8 ? 8 : f == kSamp16 ? 16 : 24;
  const std::int32_t top = 1 << (bits - 1);
  std::vector<float> out;
  for (float v : {-1.0f, static_cast<float>(top - 1) / static_cast<float>(top), 0.0f})
    out.push_back(v);
  std::uniform_int_distribution<std::int32_t> q(-top, top - 1);
  std::uniform_real_distribution<float> any(-1.0f, 1.0f);
  while (out.size() < count)
    out.push_back(f == kSampFloat32 ? any(rng)
                                    : static_cast<float>(q(rng)) / static_cast<float>(top));
  out.resize(count);
  return out;
}

TEST_F(FileInterop, WrittenFilesDecodeToTheSamplesWritten) {
  struct Case {
    RIFFType type;
    const char* extension;
    SampleFormat format;
  };
  const Case cases[] = {
      {MakeRIFFType("WAVE"), "wav", kSamp8Offset}, {MakeRIFFType("WAVE"), "wav", kSamp16},
      {MakeRIFFType("WAVE"), "wav", kSamp24},      {MakeRIFFType("WAVE"), "wav", kSampFloat32},
      {MakeRIFFType(".W64"), "w64", kSamp16},      {MakeRIFFType(".W64"), "w64", kSamp24},
      {MakeRIFFType(".W64"), "w64", kSampFloat32}, {MakeRIFFType("AIFF"), "aiff", kSamp8},
      {MakeRIFFType("AIFF"), "aiff", kSamp16},     {MakeRIFFType("AIFF"), "aiff", kSamp24},
      {MakeRIFFType("AIFC"), "aifc", kSamp16},     {MakeRIFFType("AIFC"), "aifc", kSampFloat32},
  };
  std::mt19937 rng(7);
  for (const auto& c : cases)
    for (int channels = 1; channels <= 6; ++channels) {
      const bool perChannel = channels % 2 == 0;  // half through each entry point
      {
        SCOPED_TRACE(testing::Message() << c.extension << " format " << c.format << ", " << channels
                                        << " ch" << (perChannel ? " per channel" : " interleaved"));
        const fs::path path = dir.path / ("out." + std::string(c.extension));
        constexpr std::int64_t kFrames = 3001;  // odd: AIFF pads the audio
        const std::vector<float> samples =
            ExactSamples(c.format, static_cast<std::size_t>(kFrames * channels), rng);
        {
          SoundFileWriter::Settings settings;
          settings.fileType = c.type;
          settings.numChannels = static_cast<std::int16_t>(channels);
          settings.sampleRate = 44100.0;
          settings.fileFormat = c.format;
          SoundFileWriter out(SpecOf(path), settings);
          if (perChannel) {
            std::vector<std::vector<float>> per(static_cast<std::size_t>(channels));
            for (std::int64_t i = 0; i < kFrames; ++i)
              for (int ch = 0; ch < channels; ++ch)
                per[static_cast<std::size_t>(ch)].push_back(
                    samples[static_cast<std::size_t>(i * channels + ch)]);
            std::vector<const void*> ptrs;
            for (const auto& p : per) ptrs.push_back(p.data());
            out.Write(ptrs.data(), 1000);
            out.Flush();  // the file is complete here too
            EXPECT_EQ(Reference(path, c.format, channels).samples.size(),
                      static_cast<std::size_t>(1000 * channels));
            for (auto& p : ptrs) p = static_cast<const float*>(p) + 1000;
            out.Write(ptrs.data(), kFrames - 1000);
          } else {
            out.WriteInterleaved(samples.data(), kFrames);
          }
          EXPECT_EQ(out.GetFramesWritten(), kFrames);
          out.Close();
        }
        // The converter stores a negative 24-bit value (other than -1.0)
        // one step lower than it came in: that is the stored sample.
        std::vector<float> stored = samples;
        if (c.format == kSamp24)
          for (float& v : stored)
            if (v < 0 && v != -1.0f) v -= 1.0f / 8388608;
        const Decoded reference = Reference(path, c.format, channels);
        ASSERT_EQ(reference.channels, channels);
        ASSERT_EQ(reference.samples.size(), stored.size());
        for (std::size_t i = 0; i < stored.size(); ++i)
          ASSERT_EQ(reference.samples[i], stored[i]) << "reference decoder, sample " << i;
        int ourChannels = 0;
        EXPECT_EQ(ReadWithChain(path, ourChannels), stored);
        if (c.format != kSampFloat32) {
          const std::vector<float> soxSamples = DecodeWithSox(path);
          ASSERT_EQ(soxSamples.size(), stored.size());
          for (std::size_t i = 0; i < stored.size(); ++i)
            ASSERT_EQ(soxSamples[i], stored[i]) << "sox, sample " << i;
        }
        fs::remove(path);
      }
    }
}

TEST_F(FileInterop, RecoveryLeavesTrailingChunksAndRepairsForeignFiles) {
  // An AIFF file with an "ID3 " chunk after its audio is intact: the
  // repair leaves every byte as it is.
  const fs::path tagged = dir.path / "tagged.aiff";
  RunTool(
      "ffmpeg -nostdin -hide_banner -loglevel error -y -f lavfi -i "
      "'sine=frequency=440:sample_rate=8000:duration=0.1' -ac 2 -c:a pcm_s16be "
      "-write_id3v2 1 -metadata title=take '" +
      tagged.string() + "'");
  const std::string before = RunTool("cat '" + tagged.string() + "'");
  SoundFileWriter::RecoverCrashedRecording(SpecOf(tagged));
  EXPECT_EQ(RunTool("cat '" + tagged.string() + "'"), before);

  // sox's AIFF and AIFC files with audio appended after their header was
  // written: the repaired files decode in libsndfile to every frame.
  for (const char* name : {"cut.aiff", "cut.aifc"}) {
    SCOPED_TRACE(name);
    const fs::path path = dir.path / name;
    RunTool("sox -V1 -R -D -r 8000 -n -c 2 -b 24 '" + path.string() + "' synth 0.1 sine 440");
    const Decoded whole = DecodeWithLibsndfile(path);
    // Cut the header's counts back to a quarter of the audio, as a
    // recorder that died after its first flush leaves them.
    {
      SoundFileReader file(SpecOf(path));
      auto format = file.GetFileFormat();
      auto access = format->GetReadWriteMetaDataAccess();
      const std::string save = RunTool("cat '" + path.string() + "'");
      format->ChangeLengthInFrames(*access, file.GetLengthInFrames().AsLongLong() / 4);
      access.reset();
      std::ofstream(path, std::ios::binary | std::ios::app)
          .write(save.data() + fs::file_size(path),
                 static_cast<std::streamsize>(save.size() - fs::file_size(path)));
    }
    ASSERT_EQ(DecodeWithLibsndfile(path).samples.size(), whole.samples.size() / 4);
    SoundFileWriter::RecoverCrashedRecording(SpecOf(path));
    EXPECT_EQ(DecodeWithLibsndfile(path).samples, whole.samples);
  }
}

}  // namespace
}  // namespace tarn::test
