// The tool's helpers called directly: its command-line parser, JSON text,
// names of tags and sample formats, the broadcast-extension fields at their
// byte offsets, the container sniffing, and every pair of container and
// sample format written and read back. Built only where the tool is.

#include <gtest/gtest.h>

#ifdef TARNFILE_PATH

#include <cmath>
#include <filesystem>
#include <fstream>
#include <limits>
#include <string>
#include <vector>

#include "AudioJobs.h"
#include "BextFields.h"
#include "JsonWriter.h"
#include "TestSupport.h"
#include "ToolSupport.h"
#include "tarn/Audio/SoundFileFormats/BWFBroadcastWaveExtension.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"
#include "tarn/Errors/TarnError.h"

namespace tarnfile {
namespace {

namespace fs = std::filesystem;

TEST(ToolCommandLine, SplitsWordsAndRefusesWhatItDoesNotKnow) {
  struct Case {
    std::vector<std::string> words;
    std::size_t minimum, maximum;
    const char* error;  // empty: parses
    std::vector<std::string> positional;
    std::vector<std::string> sets;
    bool json;
  } cases[] = {
      {{"a.wav", "--json"}, 1, 1, "", {"a.wav"}, {}, true},
      {{"--set", "x=1", "a.wav", "--set=y=2"}, 1, 1, "", {"a.wav"}, {"x=1", "y=2"}, false},
      {{"--", "--json"}, 1, 1, "", {"--json"}, {}, false},
      {{"-"}, 1, 1, "", {"-"}, {}, false},
      {{"a", "b"}, 1, 1, "too many arguments", {}, {}, false},
      {{}, 1, 2, "missing argument", {}, {}, false},
      {{"a", "--colour"}, 1, 1, "unknown option --colour", {}, {}, false},
      {{"a", "--set"}, 1, 1, "--set needs a value", {}, {}, false},
      {{"a", "--json=yes"}, 1, 1, "--json takes no value", {}, {}, false},
      {{"--help"}, 1, 1, "", {}, {}, false},  // help wins over the missing argument
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(::testing::PrintToString(c.words));
    if (*c.error) {
      try {
        CommandLine cl(c.words, {"json"}, {"set"}, c.minimum, c.maximum);
        ADD_FAILURE() << "parsed";
      } catch (const UsageError& e) {
        EXPECT_STREQ(e.what(), c.error);
      }
      continue;
    }
    const CommandLine cl(c.words, {"json"}, {"set"}, c.minimum, c.maximum);
    EXPECT_EQ(cl.Positional(), c.positional);
    EXPECT_EQ(cl.Values("set"), c.sets);
    EXPECT_EQ(cl.Has("json"), c.json);
    EXPECT_EQ(cl.Value("set").value_or(""), c.sets.empty() ? "" : c.sets.back());
  }
}

TEST(ToolJson, ExactTextForEveryKindOfValue) {
  std::string line;
  JsonWriter json(line);
  json.BeginObject();
  json.Key("s").String("quote \" backslash \\ tab \t nl \n cr \r bell \x07 del \x7f");
  json.Key("utf8").String("Caf\xC3\xA9 \xE2\x82\xAC \xF0\x9F\x8E\xB5");
  // Stray bytes, an overlong slash, a surrogate and a cut sequence read as Latin-1.
  json.Key("bytes").String("\xE9\xC0\xAF\xED\xA0\x80\xE2\x82");
  json.Key("n").BeginArray().Int(0).Int(std::numeric_limits<std::int64_t>::min()).EndArray();
  json.Key("x").BeginArray();
  json.Number(0.5).Number(44100).Number(1e-7).Number(std::nan("")).Number(HUGE_VAL);
  json.EndArray();
  json.Key("o").BeginObject().Key("t").Bool(true).Key("f").Bool(false).Key("z").Null().EndObject();
  json.Key("e").BeginArray().EndArray();
  json.EndObject();
  EXPECT_EQ(line,
            "{\"s\":\"quote \\\" backslash \\\\ tab \\t nl \\n cr \\r bell \\u0007 del \\u007f\","
            "\"utf8\":\"Caf\xC3\xA9 \xE2\x82\xAC \xF0\x9F\x8E\xB5\","
            "\"bytes\":\"\xC3\xA9\xC3\x80\xC2\xAF\xC3\xAD\xC2\xA0\xC2\x80\xC3\xA2\xC2\x82\","
            "\"n\":[0,-9223372036854775808],\"x\":[0.5,44100,1e-07,null,null],"
            "\"o\":{\"t\":true,\"f\":false,\"z\":null},\"e\":[]}");
}

TEST(ToolNames, TagsNumbersAndSampleFormats) {
  EXPECT_EQ(ParseTag("fmt"), tarn::MakeRIFFType("fmt "));
  EXPECT_EQ(ParseTag("bext"), tarn::MakeRIFFType("bext"));
  EXPECT_EQ(ParseTag("a"), tarn::MakeRIFFType("a   "));
  for (const char* bad : {"", "toolong", "a\tb", "\x80"})
    EXPECT_THROW((void)ParseTag(bad), UsageError);
  EXPECT_EQ(TagText(tarn::MakeRIFFType("ds64")), "ds64");

  EXPECT_EQ(ParseInteger("-12", "n"), -12);
  EXPECT_EQ(ParseInteger("9223372036854775807", "n"), std::numeric_limits<std::int64_t>::max());
  for (const char* bad : {"", "12x", "1.5", " 1", "9223372036854775808"})
    EXPECT_THROW((void)ParseInteger(bad, "n"), UsageError) << bad;
  EXPECT_EQ(ParseNumber("1e3", "x"), 1000.0);
  EXPECT_EQ(ParseNumber("-0.25", "x"), -0.25);
  for (const char* bad : {"", "nan", "inf", "-inf", "1e999", "0x10", "1,5"})
    EXPECT_THROW((void)ParseNumber(bad, "x"), UsageError) << bad;

  for (int f = 0; f < tarn::kNumSampleFormats; ++f) {
    const auto format = static_cast<tarn::SampleFormat>(f);
    if (format == tarn::kSampWide64A) continue;  // not a format files are written in
    EXPECT_EQ(ParseSampleFormat(SampleFormatName(format)), format) << f;
  }
  EXPECT_EQ(ParseSampleFormat("s32"), tarn::kSampUnpacked24);
  EXPECT_THROW((void)ParseSampleFormat("s12"), UsageError);

  EXPECT_EQ(ContainerForExtension("a/b.WAV"), Container::kRIFF);
  EXPECT_EQ(ContainerForExtension("x.bwf"), Container::kRIFF);
  EXPECT_EQ(ContainerForExtension("x.w64"), Container::kWave64);
  EXPECT_EQ(ContainerForExtension("x.aif"), Container::kAIFF);
  EXPECT_EQ(ContainerForExtension("x.AIFC"), Container::kAIFC);
  EXPECT_EQ(ContainerForExtension("x.mp3"), std::nullopt);
  EXPECT_EQ(ContainerForExtension("wav"), std::nullopt);
}

TEST(ToolBext, FieldsLandAtTheirByteOffsets) {
  tarn::BWFBroadcastWaveExtension bext;
  SetBextField(bext, "description", "Take 1");
  SetBextField(bext, "originator", std::string(32, 'o'));
  SetBextField(bext, "origination_date", "2026-11-24");
  SetBextField(bext, "time_reference", "4294967297");  // 2^32 + 1
  SetBextField(bext, "version", "2");
  SetBextField(bext, "umid", "0A0b");
  SetBextField(bext, "loudness_value", "-2300");
  SetBextField(bext, "max_short_term_loudness", "32767");
  SetBextField(bext, "coding_history", "A=PCM\r\n");
  const std::vector<std::uint8_t> bytes = bext.Flatten();
  ASSERT_EQ(bytes.size(), 858u);
  EXPECT_EQ(std::string(bytes.begin(), bytes.begin() + 7), std::string("Take 1\0", 7));
  EXPECT_EQ(bytes[256 + 31], 'o');
  EXPECT_EQ(bytes[288], 0);  // the originator filled its field, nothing spilled
  EXPECT_EQ(std::string(bytes.begin() + 320, bytes.begin() + 330), "2026-11-24");
  const std::vector<std::uint8_t> reference(bytes.begin() + 338, bytes.begin() + 346);
  EXPECT_EQ(reference, (std::vector<std::uint8_t>{1, 0, 0, 0, 1, 0, 0, 0}));
  EXPECT_EQ(bytes[346], 2);
  EXPECT_EQ(bytes[348], 0x0A);
  EXPECT_EQ(bytes[349], 0x0B);
  EXPECT_EQ(bytes[350], 0);
  EXPECT_EQ(bytes[412] | bytes[413] << 8, 0x10000 - 2300);
  EXPECT_EQ(bytes[420] | bytes[421] << 8, 32767);
  EXPECT_EQ(std::string(bytes.begin() + 602, bytes.begin() + 609), "A=PCM\r\n");

  std::string line;
  JsonWriter json(line);
  WriteBextJson(json, tarn::BWFBroadcastWaveExtension::Parse(bytes.data(), bytes.size()));
  EXPECT_NE(line.find("\"time_reference\":4294967297,\"version\":2,\"umid\":\"0a0b00"),
            std::string::npos)
      << line;
  EXPECT_NE(line.find("\"coding_history\":\"A=PCM\\r\\n\"}"), std::string::npos) << line;

  struct Bad {
    const char* field;
    std::string value;
  } bad[] = {
      {"description", std::string(257, 'x')},
      {"origination_time", "12:00:00:00"},
      {"version", "65536"},
      {"version", "-1"},
      {"time_reference", "-1"},
      {"loudness_range", "32768"},
      {"umid", std::string(130, '0')},
      {"umid", "abc"},
      {"umid", "zz"},
      {"colour", "red"},
  };
  for (const Bad& b : bad)
    EXPECT_THROW(SetBextField(bext, b.field, b.value), UsageError) << b.field << "=" << b.value;
}

TEST(ToolFiles, ContainersAreKnownByTheirFirstBytes) {
  tarn::test::TempDir dir;
  const std::string wave64 =
      std::string("riff\x2E\x91\xCF\x11\xA5\xD6\x28\xDB\x04\xC1\x00\x00", 16) + "rest";
  struct Case {
    std::string bytes;
    Container want;
  } cases[] = {
      {std::string("RIFF\0\0\0\0WAVE", 12), Container::kRIFF},
      {std::string("RIFF\0\0\0\0AVI ", 12), Container::kUnknown},
      {wave64, Container::kWave64},
      {"riff" + std::string(12, 'x'), Container::kUnknown},
      {std::string("FORM\0\0\0\0AIFF", 12), Container::kAIFF},
      {std::string("FORM\0\0\0\0AIFC", 12), Container::kAIFC},
      {"FORM", Container::kUnknown},
      {"", Container::kUnknown},
  };
  for (const Case& c : cases) {
    std::ofstream(dir.Path("f"), std::ios::binary) << c.bytes;
    EXPECT_EQ(SniffContainer(SpecForPath(dir.Path("f").string())), c.want)
        << ::testing::PrintToString(c.bytes);
  }
}

TEST(ToolFiles, FailuresNameTheFileTheyConcern) {
  {
    FileScope outer("outer.wav");
    {
      FileScope inner("inner.wav");
      EXPECT_EQ(CurrentFile(), "inner.wav");
    }
    EXPECT_EQ(CurrentFile(), "outer.wav");
    try {
      FileScope failing("failing.wav");
      throw UsageError("x");
    } catch (const UsageError&) {
      // The scope that was left by the throw still names its file.
      EXPECT_EQ(CurrentFile(), "failing.wav");
    }
  }
  try {
    (void)OpenSoundFile("/nonexistent/take.wav");
    ADD_FAILURE() << "opened";
  } catch (const tarn::TarnError& e) {
    EXPECT_EQ(e.GetIntErrorCode(), -43);
    ASSERT_TRUE(e.GetAttachment().has_value());
    EXPECT_NE(e.GetAttachment()->utf8_str().find("take.wav"), std::string::npos);
  }
}

// Every container with every sample format and 1 to 3 channels: what the
// tool lets through is written and read back as asked, the rest is refused
// before any file is made.
TEST(ToolFiles, EveryContainerAndSampleFormatWrittenAndReadBack) {
  tarn::test::TempDir dir;
  const Tone tone{ToneShape::kSine, 1000.0, 0.25};
  int written = 0;
  for (Container c : {Container::kRIFF, Container::kWave64, Container::kAIFF, Container::kAIFC}) {
    for (int channels = 1; channels <= 3; ++channels) {
      const auto storable = StorableFormats(c, channels);
      for (int f = 0; f < tarn::kNumSampleFormats; ++f) {
        const auto format = static_cast<tarn::SampleFormat>(f);
        SCOPED_TRACE(std::string(FormatName(c)) + " " + SampleFormatName(format) + " " +
                     std::to_string(channels));
        const std::string path = dir.Path("f" + std::to_string(written) + ".snd").string();
        const AudioTarget target{c, format, channels, 22050.0, tarn::kNoDither, false};
        if (std::find(storable.begin(), storable.end(), format) == storable.end()) {
          EXPECT_THROW(CheckStorable(c, format, channels), UsageError);
          EXPECT_THROW(WriteTone(path, target, tone, 100), UsageError);
          EXPECT_FALSE(fs::exists(path));
          continue;
        }
        WriteTone(path, target, tone, 1000);
        ++written;
        const SoundFile file = OpenSoundFile(path);
        EXPECT_EQ(file.container, c);
        EXPECT_EQ(file.attributes.mSampleFormat, format);
        EXPECT_EQ(file.attributes.mNumChannels, channels);
        EXPECT_EQ(file.attributes.mSampleRate, 22050.0);
        EXPECT_EQ(file.frames, 1000);
        const auto frames = ReadFramesAsFloat(file);
        ASSERT_EQ(frames.size(), static_cast<std::size_t>(channels));
        float peak = 0;
        for (const auto& channel : frames) {
          ASSERT_EQ(channel.size(), 1000u);
          for (float v : channel) peak = std::max(peak, std::fabs(v));
        }
        EXPECT_NEAR(peak, 0.25, 0.01);
      }
    }
  }
  EXPECT_EQ(written, 2 * (5 + 5 + 6) + 3 * 4 + 3 * 6);  // WAVE, Wave64, AIFF, AIFC
  tarn::SoundFileFormatCache::Instance().Purge();
}

}  // namespace
}  // namespace tarnfile

#endif  // TARNFILE_PATH
