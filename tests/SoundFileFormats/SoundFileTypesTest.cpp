// The file-type table, the probes' rules on names and on files, their
// wiring to the real formats through the cache, and the region list's byte
// form.
#include <gtest/gtest.h>

#include <cctype>
#include <string>
#include <vector>

#include "ChunkFileTestUtil.h"
#include "FakeSoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/AIFFSoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"
#include "tarn/Audio/SoundFileFormats/SoundFileProbes.h"
#include "tarn/Audio/SoundFileFormats/SoundFileRegionList.h"
#include "tarn/Audio/SoundFileFormats/SoundFileTypeTable.h"
#include "tarn/Audio/SoundFileFormats/WAVESoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/WAVEWriter.h"

namespace tarn::test {
namespace {

using P = SoundFileProbeKind;
const struct {
  const char* type;
  const char* name;
  SoundFileProbeKind probe;
} kExpected[] = {
    {"Sd2f", "Sound Designer II", P::kNone},
    {"SFIL", "Sound Designer I", P::kNone},
    {"AIFF", "AIFF", P::kAIFF},
    {"WAVE", "WAVE", P::kWAVE},
    {".WAV", "WAVE", P::kWAVE},
    {".wav", "WAVE", P::kWAVE},
    {".W64", "WAVE64", P::kWAVE},
    {"PNRA", "WAVE", P::kWAVE},
    {"AIFC", "AIFC", P::kConverter},
    {"dvc!", "DV Audio", P::kConverter},
    {"MooV", "QuickTime Movie", P::kConverter},
    {"ULAW", "MuLaw", P::kConverter},
    {"VfW ", "AVI", P::kConverter},
    {"M4A ", "Apple Lossless", P::kConverter},
    {"caff", "Apple CAF File", P::kConverter},
    {"CAFF", "Apple CAF File", P::kConverter},
    {"MPG3", "MP3 Audio", P::kConverter},
    {"Mp3 ", "MP3 Audio", P::kConverter},
    {"SwaT", "MP3 Audio", P::kConverter},
    {"MPEG", "MPEG Video", P::kConverter},
    {"PLAY", "MP3 Audio", P::kConverter},
    {"MP3 ", "MP3 Audio", P::kConverter},
    {"mp3 ", "MP3 Audio", P::kConverter},
    {"3GPM", "MP3 Audio", P::kConverter},
    {"REX ", "Recycle Loop", P::kNone},
    {"RCSO", "Recycle Loop", P::kNone},
    {"REX2", "Recycle Loop", P::kNone},
    {"RTMP", "Recycle Converted File", P::kNone},
    {"M4V ", "M4V Video", P::kConverter},
    {"mpg4", "Mp4 Video", P::kConverter},
    {"wmv ", "WMV Video", P::kConverter},
    {"wma ", "WMA Audio", P::kConverter},
};

TEST(SoundFileTypeTable, HasThe32RowsInOrderWithTheirNamesAndProbes) {
  const auto table = GetSoundFileTypeTable();
  ASSERT_EQ(table.size(), 32u);
  const std::uint32_t* codes = nullptr;
  int count = 0;
  SoundFileFormat::GetSupportedFileTypes(codes, count);
  ASSERT_EQ(count, 32);
  for (std::size_t i = 0; i < 32; ++i) {
    const std::uint32_t type = RIFFTypeFromChars(kExpected[i].type);
    EXPECT_EQ(table[i].mType, type) << i;
    EXPECT_EQ(codes[i], type) << i;
    EXPECT_EQ(std::string(table[i].mName), kExpected[i].name) << i;
    EXPECT_EQ(table[i].mProbe, kExpected[i].probe) << i;
    UString name;
    SoundFileFormat::GetFormatName(type, name);
    EXPECT_EQ(name, UString(kExpected[i].name)) << i;
  }
  for (const char* type : {"TEXT", "ACdI", "wav ", "aiff", "\0\0\0\0"}) {
    UString name("stale");
    SoundFileFormat::GetFormatName(RIFFTypeFromChars(type), name);
    EXPECT_TRUE(name.empty()) << type;
    EXPECT_EQ(FindSoundFileType(RIFFTypeFromChars(type)), nullptr);
  }
}

TEST(SoundFileTypeTable, AFormatNamesItsActualTypeThenItsCanonicalType) {
  FakeSoundFileFormat f(FileSpecification(UString("/nowhere/x.w64")));
  UString name;
  f.actualType = T(".W64");
  f.GetFormatName(name);
  EXPECT_EQ(name, UString("WAVE64"));
  f.actualType = T("TEXT");
  f.GetFormatName(name);
  EXPECT_EQ(name, UString("WAVE"));
  f.canonicalType = T("junk");
  f.GetFormatName(name);
  EXPECT_TRUE(name.empty());
}

// Every type of the table and some others, against names with every
// spelling of ".wav" and ".w64" (each letter in either case) and near misses.
TEST(WAVEProbeRule, TypesAndNamesExhaustively) {
  std::vector<std::string> names{"", "x", "wav", ".wa", "wav.", "x.wav.bak", "x.wa v"};
  for (const char* base : {"", "x", "take 1"})
    for (const std::string ext : {"wav", "w64"})
      for (int mask = 0; mask < 8; ++mask) {
        std::string s = ext;
        for (int i = 0; i < 3; ++i)
          if ((mask >> i & 1) != 0) s[i] = static_cast<char>(std::toupper(s[i]));
        names.push_back(std::string(base) + "." + s);
      }
  std::vector<std::uint32_t> types;
  for (const SoundFileTypeEntry& e : GetSoundFileTypeTable()) types.push_back(e.mType);
  for (const char* t : {"TEXT", "text", "wave", "W64 ", "ACdI", "\0\0\0\0"})
    types.push_back(RIFFTypeFromChars(t));
  for (std::uint32_t type : types) {
    const std::string typeName = RIFFTypeToString(type);
    const bool direct =
        typeName == "WAVE" || typeName == ".W64" || typeName == ".WAV" || typeName == ".wav";
    const bool byName = typeName == "PNRA" || typeName == "TEXT";
    for (const std::string& name : names) {
      bool endsExactly = false;
      for (const char* e : {".wav", ".WAV", ".w64", ".W64"})
        endsExactly |= name.size() >= 4 && name.compare(name.size() - 4, 4, e) == 0;
      EXPECT_EQ(WAVEProbeAcceptsTypeAndName(type, UString(name)),
                direct || (byName && name.size() > 4 && endsExactly))
          << typeName << " '" << name << "'";
    }
  }
}

class Probes : public ::testing::Test {
 protected:
  void TearDown() override { SoundFileFormatCache::Instance().SetConverterProbe(nullptr); }
  std::filesystem::path MakeAIFF(RIFFType form, const char* name) {
    const auto path = dir_.Path(name);
    WriteFile(
        path,
        FormImage(form, {{T("COMM"), Comm(2, 25, 16, 44100, form == T("AIFC") ? T("NONE") : 0)},
                         {T("SSND"), Ssnd(0, Pattern(4 * 25))}}));
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

TEST_F(Probes, NeverThrowAndRefuseMissingAndMalformedFiles) {
  WriteFile(dir_.Path("garbage.wav"), Pattern(300));
  WriteFile(dir_.Path("empty.wav"), {});
  for (const char* name : {"garbage.wav", "empty.wav", "missing.wav"}) {
    const FileSpecification spec = SpecOf(dir_.Path(name));
    for (const SoundFileTypeEntry& e : GetSoundFileTypeTable())
      EXPECT_FALSE(ProbeFileOfType(spec, e.mType)) << name << " " << e.mName;
    EXPECT_FALSE(ProbeWAVEFile(spec));
    EXPECT_FALSE(ProbeAIFFFile(spec));
    EXPECT_FALSE(ProbeConverterFile(spec));
  }
  EXPECT_FALSE(ProbeFileOfType(FileSpecification(), T("WAVE")));
  EXPECT_FALSE(ProbeWAVEFile(FileSpecification()));
}

TEST_F(Probes, AIFCAndTheOtherConverterTypesGoToTheConverterProbe) {
  const auto path = MakeAIFF(T("AIFC"), "take.aifc");
  EXPECT_TRUE(ProbeAIFFFile(SpecOf(path)));                // the reader itself parses it
  EXPECT_FALSE(ProbeFileOfType(SpecOf(path), T("AIFC")));  // no converter yet
  const auto other = dir_.Path("other.aifc");
  WriteFile(other, Pattern(100));
  std::vector<std::string> asked;
  SoundFileFormatCache::Instance().SetConverterProbe([&](const FileSpecification& spec) {
    asked.push_back(spec.GetName().string());
    return true;
  });
  for (const SoundFileTypeEntry& e : GetSoundFileTypeTable())
    EXPECT_EQ(ProbeFileOfType(SpecOf(other), e.mType), e.mProbe == P::kConverter) << e.mName;
  EXPECT_EQ(asked.size(), 20u);
  SoundFileFormatCache::Instance().SetConverterProbe(
      [](const FileSpecification&) -> bool { Failure(kIOErr); });
  EXPECT_FALSE(ProbeFileOfType(SpecOf(other), T("AIFC")));
}

TEST_F(Probes, WAVEFilesProbeByTypeAndNameAndGetTheWAVEFormatForAllSixTypes) {
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
    EXPECT_FALSE(ProbeFileOfType(spec, T("AIFF")));
    // The same bytes under a name whose extension is spelt in mixed case.
    const auto mixed = dir_.Path(wave64 ? "take2.W64x" : "take2.Wav");
    std::filesystem::copy_file(path, mixed);
    EXPECT_FALSE(ProbeWAVEFile(SpecOf(mixed), T("TEXT")));
    EXPECT_TRUE(ProbeWAVEFile(SpecOf(mixed), T("WAVE")));
  }
}

TEST_F(Probes, AIFFFilesProbeTrueAndGetTheAIFFFormatForBothOfItsTypes) {
  const auto path = MakeAIFF(T("AIFF"), "take.aif");
  EXPECT_TRUE(ProbeAIFFFile(SpecOf(path)));
  EXPECT_TRUE(ProbeFileOfType(SpecOf(path), T("AIFF")));
  EXPECT_FALSE(ProbeFileOfType(SpecOf(path), T("WAVE")));
  for (const char* type : {"AIFF", "ACdI"}) {
    auto f =
        SoundFileFormatCache::Instance().MakeFormatForFile(SpecOf(path), RIFFTypeFromChars(type));
    ASSERT_NE(dynamic_cast<AIFFSoundFileFormat*>(f.get()), nullptr) << type;
    EXPECT_EQ(f->GetLengthInFrames(), SampleCount(25));
  }
  auto shared = SoundFileFormatCache::Instance().GetFormat(SpecOf(path));
  EXPECT_EQ(shared, SoundFileFormatCache::Instance().GetFormat(SpecOf(path)));
  EXPECT_EQ(SoundFileFormat::GetFileLengthInFrames(SpecOf(path), T("AIFF")), SampleCount(25));
}

// --- region list ---------------------------------------------------------------

TEST(SoundFileRegionList, FlattensToExactBytesAndBack) {
  SoundFileRegionList list;
  list.Add({7, UString("Ab"), 0x0102030405LL, 0x10});
  list.Add({0xFFFFFFFF, UString(""), -1, 0});
  EXPECT_EQ(list.size(), 2u);
  EXPECT_EQ(list.CountMarkers(), 1u);
  EXPECT_EQ(list.CountRegions(), 1u);
  const Bytes expected = Cat({Text("RgnL"), BE(1, 4), BE(2, 4),              // header
                              BE(7, 4), BE(0x0102030405LL, 8), BE(0x10, 8),  // id, start, length
                              BE(2, 4), Bytes{0, 'A', 0, 'b'},               // name
                              Bytes(12, 0xFF), Bytes(12, 0)});  // id, start; length, units
  EXPECT_EQ(BytesOf(list.Flatten()), expected);
  EXPECT_EQ(SoundFileRegionList::Unflatten(list.Flatten()), list);
  EXPECT_TRUE(SoundFileRegionList::Unflatten(RCBlobMT()).empty());
  EXPECT_EQ(SoundFileRegionList::Unflatten(SoundFileRegionList().Flatten()), SoundFileRegionList());

  // Every cut, lying count or length, extra byte, tag or version is refused.
  SoundFileRegionList two;
  two.Add({1, UString("Verse"), 44100, 88200});
  two.Add({2, UString("Hit"), 10000, 0});
  const Bytes good = BytesOf(two.Flatten());
  const auto codeOf = [](const Bytes& b) {
    return CodeOf([&] { (void)SoundFileRegionList::Unflatten(Blob(b)); });
  };
  for (std::size_t n = 1; n < good.size(); ++n)
    EXPECT_EQ(codeOf(Slice(good, 0, n)), kParamErr) << n;
  EXPECT_EQ(codeOf(Cat({good, Bytes(1)})), kParamErr);
  for (const auto& [at, value] : {std::pair<std::size_t, std::uint8_t>{8, 0x7F},  // count
                                  {12 + 20, 0x7F},                                // name length
                                  {12 + 12, 0x80},                                // negative length
                                  {0, 'r'},                                       // tag
                                  {7, 2}}) {                                      // version
    Bytes bad = good;
    bad[at] = value;
    EXPECT_EQ(codeOf(bad), kParamErr) << at;
  }
}

}  // namespace
}  // namespace tarn::test
