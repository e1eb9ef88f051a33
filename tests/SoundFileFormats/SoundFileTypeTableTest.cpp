// The file-type table, the probes' rules and the region list's byte form.
#include <gtest/gtest.h>

#include <cctype>
#include <string>
#include <vector>

#include "ChunkFileTestUtil.h"
#include "FakeSoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"
#include "tarn/Audio/SoundFileFormats/SoundFileProbes.h"
#include "tarn/Audio/SoundFileFormats/SoundFileRegionList.h"
#include "tarn/Audio/SoundFileFormats/SoundFileTypeTable.h"

namespace tarn::test {
namespace {

struct Row {
  const char* type;
  const char* name;
  SoundFileProbeKind probe;
};
using P = SoundFileProbeKind;
const Row kExpected[] = {
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
  EXPECT_EQ(codes[0], MakeRIFFType("Sd2f"));
  EXPECT_EQ(codes[31], MakeRIFFType("wma "));
}

TEST(SoundFileTypeTable, UnknownTypesHaveNoName) {
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
  f.canonicalType = MakeRIFFType("WAVE");
  f.actualType = MakeRIFFType(".W64");
  f.GetFormatName(name);
  EXPECT_EQ(name, UString("WAVE64"));
  f.actualType = MakeRIFFType("TEXT");
  f.GetFormatName(name);
  EXPECT_EQ(name, UString("WAVE"));
  f.canonicalType = MakeRIFFType("junk");
  f.GetFormatName(name);
  EXPECT_TRUE(name.empty());
}

// --- the WAVE probe's rule ---------------------------------------------------

// Every spelling of `ext` ("wav" or "w64") with each letter in either case.
std::vector<std::string> CaseVariants(const std::string& ext) {
  std::vector<std::string> out;
  for (int mask = 0; mask < 8; ++mask) {
    std::string s = ext;
    for (int i = 0; i < 3; ++i) {
      if ((mask >> i & 1) != 0) s[i] = static_cast<char>(std::toupper(s[i]));
    }
    out.push_back(s);
  }
  return out;
}

TEST(WAVEProbeRule, TypesAndNamesExhaustively) {
  const std::vector<std::string> exact{".wav", ".WAV", ".w64", ".W64"};
  std::vector<std::string> names{"", "x", "wav", ".wa", "wav.", "x.wav.bak", "x.wa v"};
  for (const std::string& base : {std::string(""), std::string("x"), std::string("take 1")}) {
    for (const char* ext : {"wav", "w64"}) {
      for (const std::string& v : CaseVariants(ext)) names.push_back(base + "." + v);
    }
  }
  std::vector<std::uint32_t> types;
  for (const SoundFileTypeEntry& e : GetSoundFileTypeTable()) types.push_back(e.mType);
  for (const char* t : {"TEXT", "text", "wave", "W64 ", "ACdI", "\0\0\0\0"}) {
    types.push_back(RIFFTypeFromChars(t));
  }
  for (std::uint32_t type : types) {
    const std::string typeName = RIFFTypeToString(type);
    const bool direct =
        typeName == "WAVE" || typeName == ".W64" || typeName == ".WAV" || typeName == ".wav";
    const bool byName = typeName == "PNRA" || typeName == "TEXT";
    for (const std::string& name : names) {
      bool endsExactly = false;
      for (const std::string& e : exact) {
        endsExactly |= name.size() >= 4 && name.compare(name.size() - 4, 4, e) == 0;
      }
      const bool expected = direct || (byName && name.size() > 4 && endsExactly);
      EXPECT_EQ(WAVEProbeAcceptsTypeAndName(type, UString(name)), expected)
          << typeName << " '" << name << "'";
    }
  }
}

TEST(WAVEProbeRule, TheCasesThatMatter) {
  const std::uint32_t text = MakeRIFFType("TEXT");
  EXPECT_TRUE(WAVEProbeAcceptsTypeAndName(text, UString("x.wav")));
  EXPECT_FALSE(WAVEProbeAcceptsTypeAndName(text, UString("x.Wav")));
  EXPECT_FALSE(WAVEProbeAcceptsTypeAndName(text, UString(".wav")));  // 4 characters
  EXPECT_TRUE(WAVEProbeAcceptsTypeAndName(MakeRIFFType("PNRA"), UString("a.W64")));
  EXPECT_TRUE(WAVEProbeAcceptsTypeAndName(MakeRIFFType(".W64"), UString("")));
  EXPECT_FALSE(WAVEProbeAcceptsTypeAndName(MakeRIFFType("AIFF"), UString("x.wav")));
}

// --- probes on files ---------------------------------------------------------

class Probes : public ::testing::Test {
 protected:
  void TearDown() override { SoundFileFormatCache::Instance().SetConverterProbe(nullptr); }
  TempDir dir_;
};

TEST_F(Probes, NeverThrowAndRefuseMissingAndMalformedFiles) {
  const auto garbage = dir_.Path("garbage.wav");
  WriteFile(garbage, Pattern(300));
  const auto empty = dir_.Path("empty.wav");
  WriteFile(empty, {});
  for (const auto& path : {garbage, empty, dir_.Path("missing.wav")}) {
    const FileSpecification spec = SpecOf(path);
    for (const SoundFileTypeEntry& e : GetSoundFileTypeTable()) {
      EXPECT_FALSE(ProbeFileOfType(spec, e.mType)) << path << " " << e.mName;
    }
    EXPECT_FALSE(ProbeWAVEFile(spec));
    EXPECT_FALSE(ProbeAIFFFile(spec));
    EXPECT_FALSE(ProbeConverterFile(spec));
  }
  EXPECT_FALSE(ProbeFileOfType(FileSpecification(), MakeRIFFType("WAVE")));
  EXPECT_FALSE(ProbeWAVEFile(FileSpecification()));
}

TEST_F(Probes, AIFCAndTheOtherConverterTypesGoToTheConverterProbe) {
  const auto path = dir_.Path("take.aifc");
  WriteFile(path, Pattern(100));
  std::vector<std::string> asked;
  SoundFileFormatCache::Instance().SetConverterProbe([&](const FileSpecification& spec) {
    asked.push_back(spec.GetName().string());
    return true;
  });
  for (const SoundFileTypeEntry& e : GetSoundFileTypeTable()) {
    const bool converter = e.mProbe == SoundFileProbeKind::kConverter;
    EXPECT_EQ(ProbeFileOfType(SpecOf(path), e.mType), converter) << e.mName;
  }
  EXPECT_EQ(asked.size(), 20u);
  EXPECT_TRUE(ProbeFileOfType(SpecOf(path), MakeRIFFType("AIFC")));
  EXPECT_FALSE(ProbeFileOfType(SpecOf(path), MakeRIFFType("AIFF")));

  SoundFileFormatCache::Instance().SetConverterProbe(
      [](const FileSpecification&) -> bool { Failure(kIOErr); });
  EXPECT_FALSE(ProbeFileOfType(SpecOf(path), MakeRIFFType("AIFC")));
}

// --- region list ---------------------------------------------------------------

TEST(SoundFileRegionList, FlattensToExactBytesAndBack) {
  SoundFileRegionList list;
  list.Add({7, UString("Ab"), 0x0102030405LL, 0x10});
  list.Add({0xFFFFFFFF, UString(""), -1, 0});
  EXPECT_EQ(list.size(), 2u);
  EXPECT_EQ(list.CountMarkers(), 1u);
  EXPECT_EQ(list.CountRegions(), 1u);
  const RCBlobMT blob = list.Flatten();
  const Bytes expected{
      'R',  'g',  'n',  'L',  0,    0,    0,    1,    0,    0,    0,    2,     // header
      0,    0,    0,    7,    0,    0,    0,    1,    2,    3,    4,    5,     // id, start
      0,    0,    0,    0,    0,    0,    0,    0x10, 0,    0,    0,    2,     // length, units
      0,    'A',  0,    'b',                                                   // name
      0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF,  // id, start
      0,    0,    0,    0,    0,    0,    0,    0,    0,    0,    0,    0,     // length, units
  };
  ASSERT_EQ(blob.GetSize(), static_cast<std::int32_t>(expected.size()));
  EXPECT_EQ(Bytes(blob.GetPtr(), blob.GetPtr() + blob.GetSize()), expected);
  EXPECT_EQ(SoundFileRegionList::Unflatten(blob), list);
  EXPECT_TRUE(SoundFileRegionList::Unflatten(RCBlobMT()).empty());
  EXPECT_EQ(SoundFileRegionList::Unflatten(SoundFileRegionList().Flatten()), SoundFileRegionList());
}

TEST(SoundFileRegionList, RefusesEveryCutLiedOrPaddedByteForm) {
  SoundFileRegionList list;
  list.Add({1, UString("Verse"), 44100, 88200});
  list.Add({2, UString("Hit"), 10000, 0});
  const RCBlobMT blob = list.Flatten();
  const Bytes good(blob.GetPtr(), blob.GetPtr() + blob.GetSize());
  auto codeOf = [](const Bytes& bytes) {
    auto e = ErrorOf(
        [&] { (void)SoundFileRegionList::Unflatten(RCBlobMT(bytes.data(), bytes.size())); });
    return e ? e->GetIntErrorCode() : 0;
  };
  for (std::size_t n = 1; n < good.size(); ++n) {
    EXPECT_EQ(codeOf(Bytes(good.begin(), good.begin() + static_cast<std::ptrdiff_t>(n))), kParamErr)
        << n;
  }
  Bytes extra = good;
  extra.push_back(0);
  EXPECT_EQ(codeOf(extra), kParamErr);
  Bytes lyingCount = good;
  lyingCount[8] = 0x7F;  // count 0x7F000002
  EXPECT_EQ(codeOf(lyingCount), kParamErr);
  Bytes lyingName = good;
  lyingName[12 + 20] = 0x7F;  // first name length
  EXPECT_EQ(codeOf(lyingName), kParamErr);
  Bytes negative = good;
  negative[12 + 12] = 0x80;  // first length negative
  EXPECT_EQ(codeOf(negative), kParamErr);
  Bytes badTag = good;
  badTag[0] = 'r';
  EXPECT_EQ(codeOf(badTag), kParamErr);
  Bytes badVersion = good;
  badVersion[7] = 2;
  EXPECT_EQ(codeOf(badVersion), kParamErr);
}

}  // namespace
}  // namespace tarn::test
