// The type table, probes and cache reach the real formats: a well-formed
// file of each family probes true and gets its format class from the cache;
// "AIFC" stays with the converter probe.
#include <gtest/gtest.h>

#include <memory>

#include "AIFFTestUtil.h"
#include "ChunkFileTestUtil.h"
#include "tarn/Audio/SoundFileFormats/AIFFSoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"
#include "tarn/Audio/SoundFileFormats/SoundFileProbes.h"
#include "tarn/Audio/SoundFileFormats/WAVESoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/WAVEWriter.h"

namespace tarn::test {
namespace {

class FormatWiring : public ::testing::Test {
 protected:
  std::filesystem::path MakeAIFF(RIFFType form, const char* name) {
    const Bytes audio = Pattern(4 * 25);
    const Bytes comm = form == MakeRIFFType("AIFC") ? Comm(2, 25, 16, 44100, MakeRIFFType("NONE"))
                                                    : Comm(2, 25, 16, 44100);
    const auto path = dir_.Path(name);
    WriteFile(path, FormImage(form, {{MakeRIFFType("COMM"), comm},
                                     {MakeRIFFType("SSND"), Ssnd(0, audio)}}));
    return path;
  }
  // A new 16-bit stereo recording of 25 frames, RIFF or Wave64.
  std::filesystem::path MakeWAVE(bool wave64, const char* name) {
    const auto path = dir_.Path(name);
    {
      WAVEWriter writer(SpecOf(path), 44100.0, 2, 2, 25, 4, kSamp16, false, wave64);
      writer.WriteHeader(1, 25);
    }
    std::filesystem::resize_file(path, std::filesystem::file_size(path) + 4 * 25);
    return path;
  }
  TempDir dir_;
};

TEST_F(FormatWiring, WAVEFilesProbeByTypeAndNameAndGetTheWAVEFormatForAllSixTypes) {
  for (const bool wave64 : {false, true}) {
    SCOPED_TRACE(wave64);
    const auto path = MakeWAVE(wave64, wave64 ? "take.w64" : "take.wav");
    const auto spec = SpecOf(path);
    EXPECT_TRUE(ProbeWAVEFile(spec));
    for (const char* type : {"WAVE", ".W64", ".WAV", ".wav", "PNRA", "TEXT"}) {
      EXPECT_TRUE(ProbeWAVEFile(spec, RIFFTypeFromChars(type))) << type;
      auto f = SoundFileFormatCache::Instance().MakeFormatForFile(spec, RIFFTypeFromChars(type));
      ASSERT_NE(dynamic_cast<WAVESoundFileFormat*>(f.get()), nullptr) << type;
      EXPECT_EQ(f->GetLengthInFrames(), SampleCount(25)) << type;
    }
    EXPECT_FALSE(ProbeFileOfType(spec, MakeRIFFType("AIFF")));
    // The same bytes under a name whose extension is spelt in mixed case.
    const auto mixed = dir_.Path(wave64 ? "take2.W64x" : "take2.Wav");
    std::filesystem::copy_file(path, mixed);
    EXPECT_FALSE(ProbeWAVEFile(SpecOf(mixed), MakeRIFFType("TEXT")));
    EXPECT_TRUE(ProbeWAVEFile(SpecOf(mixed), MakeRIFFType("WAVE")));
  }
}

TEST_F(FormatWiring, AIFFFilesProbeTrueAndGetTheAIFFFormatForBothOfItsTypes) {
  const auto path = MakeAIFF(MakeRIFFType("AIFF"), "take.aif");
  EXPECT_TRUE(ProbeAIFFFile(SpecOf(path)));
  EXPECT_TRUE(ProbeFileOfType(SpecOf(path), MakeRIFFType("AIFF")));
  EXPECT_FALSE(ProbeFileOfType(SpecOf(path), MakeRIFFType("WAVE")));
  for (const char* type : {"AIFF", "ACdI"}) {
    auto f =
        SoundFileFormatCache::Instance().MakeFormatForFile(SpecOf(path), RIFFTypeFromChars(type));
    ASSERT_NE(dynamic_cast<AIFFSoundFileFormat*>(f.get()), nullptr) << type;
    EXPECT_EQ(f->GetLengthInFrames(), SampleCount(25));
  }
  auto shared = SoundFileFormatCache::Instance().GetFormat(SpecOf(path));
  EXPECT_EQ(shared, SoundFileFormatCache::Instance().GetFormat(SpecOf(path)));
  EXPECT_EQ(SoundFileFormat::GetFileLengthInFrames(SpecOf(path), MakeRIFFType("AIFF")),
            SampleCount(25));
}

TEST_F(FormatWiring, AIFCIsLeftToTheConverterProbe) {
  const auto path = MakeAIFF(MakeRIFFType("AIFC"), "take.aifc");
  EXPECT_TRUE(ProbeAIFFFile(SpecOf(path)));                           // the reader itself parses it
  EXPECT_FALSE(ProbeFileOfType(SpecOf(path), MakeRIFFType("AIFC")));  // no converter here
}

}  // namespace
}  // namespace tarn::test
