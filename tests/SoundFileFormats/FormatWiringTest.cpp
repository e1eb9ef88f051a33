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
  TempDir dir_;
};

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
