#include "tarn/FileSystem/FileTypes.h"

#include <gtest/gtest.h>

#include "FsTestSupport.h"

namespace {

using tarn::FileTypeClass;
using tarn::FileTypeFromName;
using tarntest::U;

TEST(FileTypes, NameToTypeFollowsFirstMatchingRow) {
  struct Case {
    const char* name;
    FileTypeClass type;
  };
  const Case cases[] = {
      {"Take", tarn::kNoExtensionFileType},  // no dot at all
      {"Take.", "MooV"},                     // the empty extension meets "MooV"'s empty second one
      {"Take.wav", "WAVE"},                  // not ".WAV", ".wav" or "PNRA" further down
      {"Take.WAV", "WAVE"},
      {"Take.WaVe", "WAVE"},
      {"Take.bwf", "WAVE"},
      {"Take.w64", ".W64"},
      {"Take.aif", "AIFF"},
      {"Take.AIFF", "AIFF"},
      {"Take.aifc", "AIFC"},
      {"Take.mp3", "MPG3"},  // first of seven mp3 rows
      {"Take.mpg3", "MPG3"},
      {"Take.mpeg", "MPEG"},
      {"Take.caf", "caff"},  // lower-case row comes first
      {"Take.grv", "scGR"},  // before the zero-led groove row
      {"Take.groove", 0x00477276},
      {"Take.smf", "Midi"},
      {"Take.htm", "html"},
      {"Take.sysx", "sysX"},
      {"Take.exe", "APPL"},
      {"Take.sd", "SFIL"},
      {"a.b.dig", "SFIL"},  // only the last extension counts
      {"Take.nosuch", 0},
      {"Take.wav.gz", 0},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.name);
    EXPECT_EQ(FileTypeFromName(U(c.name)).GetCode(), c.type.GetCode());
  }
}

TEST(FileTypes, ExtensionLookupReportsMatch) {
  FileTypeClass type = "XXXX";
  EXPECT_FALSE(tarn::ExtensionToFileType(U("nosuch"), type));
  EXPECT_EQ(type.GetCode(), 0u);
  EXPECT_TRUE(tarn::ExtensionToFileType(U(""), type));
  EXPECT_EQ(type, FileTypeClass("MooV"));
  EXPECT_TRUE(tarn::ExtensionToFileType(U("RX2"), type));
  EXPECT_EQ(type, FileTypeClass("REX2"));
}

TEST(FileTypes, TypeToExtensionsStopsAtFirstRow) {
  tarn::UString ext;
  EXPECT_TRUE(tarn::FileTypeToExtension("WAVE", ext));
  EXPECT_EQ(ext, U("wav"));
  std::vector<tarn::UString> list{U("stale")};
  EXPECT_TRUE(tarn::FileTypeToExtensionList("WAVE", list));
  EXPECT_EQ(list, (std::vector<tarn::UString>{U("wav"), U("wave")}));  // never "bwf"
  EXPECT_TRUE(tarn::FileTypeToExtensionList("MPEG", list));
  EXPECT_EQ(list, (std::vector<tarn::UString>{U("mpg"), U("mpeg")}));
  EXPECT_TRUE(tarn::FileTypeToExtensionList("MooV", list));
  EXPECT_EQ(list, (std::vector<tarn::UString>{U("mov")}));
  EXPECT_TRUE(tarn::FileTypeToExtensionList(0x00477276, list));
  EXPECT_EQ(list, (std::vector<tarn::UString>{U("grv"), U("groove")}));
  EXPECT_FALSE(tarn::FileTypeToExtensionList("None", list));
  EXPECT_TRUE(list.empty());
  EXPECT_FALSE(tarn::FileTypeToExtension("None", ext));
  EXPECT_TRUE(ext.empty());
}

TEST(FileTypes, EveryTypesExtensionsMapBackToATypeListingThem) {
  // The type an extension maps to lists that extension too, except for
  // extensions whose first row is not their type's first row ("bwf": WAVE
  // lists wav, wave; "smf": Midi lists mid, midi).
  const char* exts[] = {"mov", "avi",  "mp4", "mpg",   "m4v",   "dv",     "wmv", "aif",
                        "sd",  "sd2",  "wav", "w64",   "mp3",   "m4a",    "caf", "aifc",
                        "3gp", "3g2",  "rx",  "rcy",   "rx2",   "rtm",    "wma", "omf",
                        "aaf", "grv",  "exs", "syx",   "txt",   "mid",    "htm", "xml",
                        "exe", "tarn", "trt", "tclip", "tkeys", "tgroove"};
  for (const char* e : exts) {
    SCOPED_TRACE(e);
    FileTypeClass type;
    ASSERT_TRUE(tarn::ExtensionToFileType(U(e), type));
    std::vector<tarn::UString> list;
    ASSERT_TRUE(tarn::FileTypeToExtensionList(type, list));
    bool found = false;
    for (const auto& x : list) found = found || x.equal(U(e), tarn::UString::kIgnoreCase);
    EXPECT_TRUE(found);
  }
  tarn::UString ext;
  for (const char* e : {"bwf", "smf"}) {
    FileTypeClass type;
    ASSERT_TRUE(tarn::ExtensionToFileType(U(e), type));
    ASSERT_TRUE(tarn::FileTypeToExtension(type, ext));
    EXPECT_NE(ext, U(e));
  }
}

TEST(FileTypes, RegisteredTypesAreSearchedFirst) {
  FileTypeClass type;
  ASSERT_TRUE(tarn::ExtensionToFileType(U("tmix"), type));
  EXPECT_EQ(type, FileTypeClass("TrnM"));
  tarn::RegisterFileType("Rgs1", {U("zqx"), U("tmix")});
  tarn::RegisterFileType("Rgs2", {U("ZQX")});  // later entry: never reached for zqx
  EXPECT_TRUE(tarn::ExtensionToFileType(U("TMIX"), type));
  EXPECT_EQ(type, FileTypeClass("Rgs1"));
  EXPECT_TRUE(tarn::ExtensionToFileType(U("zqx"), type));
  EXPECT_EQ(type, FileTypeClass("Rgs1"));
  std::vector<tarn::UString> list;
  EXPECT_TRUE(tarn::FileTypeToExtensionList("Rgs1", list));
  EXPECT_EQ(list, (std::vector<tarn::UString>{U("zqx"), U("tmix")}));
  EXPECT_EQ(FileTypeFromName(U("x.Zqx")), FileTypeClass("Rgs1"));
}

}  // namespace
