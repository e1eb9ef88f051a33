// The chain and its host facade on real files, one file per container and
// sample layout the chain handles differently (offset and signed 8-bit,
// packed 24-bit, big- and little-endian AIFF, float in every container):
// files that sox, ffmpeg and libsndfile's tools write read here exactly as
// libsndfile decodes them. Also the repair of crashed recordings. (What
// other programs make of the files we write is checked once, by the
// sound-file format tests; the chain's conversions by the chain tests.)

#include <gtest/gtest.h>
#include <sndfile.h>

#include <filesystem>
#include <fstream>
#include <string>

#include "AudioChain/ChainTestUtil.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormat.h"
#include "tarn/Audio/SoundFileReader.h"
#include "tarn/Audio/SoundFileWriter.h"

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

// libsndfile reads float Wave64 files in the extensible form as 32-bit
// integers; for those files ffmpeg's decoding is the reference.
Decoded Reference(const fs::path& path, bool floatFile, int channels) {
  return floatFile && path.extension() == ".w64" ? DecodeWithFfmpeg(path, channels)
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
      {"sox-s24.wav", sox + "-b 24 %o%s"},
      {"ffmpeg-s32.wav", ff + "-c:a pcm_s32le %o"},
      {"sox-f32.wav", sox + "-e floating-point -b 32 %o%s"},
      {"sox-s16.w64", sox + "-b 16 %o%s"},
      {"ffmpeg-f32.w64", ff + "-c:a pcm_f32le -f w64 %o"},
      {"sox-s8.aiff", sox + "-b 8 %o%s"},
      {"ffmpeg-s24.aiff", ff + "-c:a pcm_s24be %o"},
      {"sndfile-s32.aiff", "sndfile-convert -pcm32 %i %o"},
      {"sox-f32.aifc", sox + "-e floating-point -b 32 -t aifc %o%s"},
      {"ffmpeg-sowt.aifc", ff + "-c:a pcm_s16le -f aiff %o"},
      {"sndfile-f32.aiff", "sndfile-convert -float32 %i %o"},
  };
  // Each file gets its own channel count, 1 to 6 in turn.
  int next = 0;
  for (const auto& c : cases) {
    const int channels = next++ % 6 + 1;
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
    const Decoded reference = Reference(out, floatFile, channels);
    int ourChannels = 0;
    const std::vector<float> ours = ReadWithChain(out, ourChannels);
    ASSERT_EQ(ourChannels, reference.channels);
    ASSERT_EQ(ours.size(), reference.samples.size());
    ASSERT_FALSE(ours.empty());
    for (std::size_t i = 0; i < ours.size(); ++i)
      ASSERT_EQ(ours[i], reference.samples[i]) << "sample " << i;
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
