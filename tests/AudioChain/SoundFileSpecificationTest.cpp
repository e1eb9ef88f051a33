// Multi-mono channel-file names: the suffix of every channel of the usual
// layouts, host texts taking the place of the built-in ones, and splitting
// a channel file's name back into its parts.

#include <gtest/gtest.h>

#include "AudioChain/ChainTestUtil.h"
#include "tarn/Audio/SoundFileSpecification.h"
#include "tarn/Basics/TarnCoreLibCallbacks.h"

namespace tarn::test {
namespace {

TEST(SoundFileSpecification, NamesEveryChannelOfTheUsualLayouts) {
  const std::vector<std::vector<std::string>> expected = {
      {"Take.wav"},
      {"Take.L.wav", "Take.R.wav"},
      {"Take.L.wav", "Take.R.wav", "Take.C.wav"},
      {"Take.L.wav", "Take.R.wav", "Take.Ls.wav", "Take.Rs.wav"},
      {"Take.L.wav", "Take.R.wav", "Take.C.wav", "Take.Ls.wav", "Take.Rs.wav"},
      {"Take.L.wav", "Take.R.wav", "Take.C.wav", "Take.LFE.wav", "Take.Ls.wav", "Take.Rs.wav"},
      {"Take.L.wav", "Take.R.wav", "Take.C.wav", "Take.LFE.wav", "Take.Cs.wav", "Take.Ls.wav",
       "Take.Rs.wav"},
      {"Take.L.wav", "Take.R.wav", "Take.C.wav", "Take.LFE.wav", "Take.Lsr.wav", "Take.Rsr.wav",
       "Take.Ls.wav", "Take.Rs.wav"},
      {"Take.1.wav", "Take.2.wav", "Take.3.wav", "Take.4.wav", "Take.5.wav", "Take.6.wav",
       "Take.7.wav", "Take.8.wav", "Take.9.wav"},
  };
  TempDir dir;
  const FileSpecification folder = SpecOf(dir.path);
  for (std::size_t n = 1; n <= expected.size(); ++n) {
    SCOPED_TRACE(testing::Message() << n << " ch");
    const SoundFileSpecification take(folder, UString("Take"), UString("wav"),
                                      HostChannelOrder::ForChannelCount(static_cast<int>(n)));
    ASSERT_TRUE(take.IsMultiMono());
    ASSERT_EQ(take.GetNumFiles(), static_cast<int>(n));
    for (std::size_t c = 0; c < n; ++c) {
      EXPECT_EQ(take.GetFile(static_cast<int>(c)).GetName(), UString(expected[n - 1][c]));
      EXPECT_EQ(take.GetFile(static_cast<int>(c)).GetParentFolder(), folder);
      UString base, suffix, extension;
      if (n > 1) {
        ASSERT_TRUE(SoundFileSpecification::SplitChannelFileName(UString(expected[n - 1][c]), base,
                                                                 suffix, extension));
        EXPECT_EQ(base, UString("Take"));
        EXPECT_EQ(suffix,
                  SoundFileSpecification::GetChannelSuffix(
                      HostChannelOrder::ForChannelCount(static_cast<int>(n)), static_cast<int>(c)));
        EXPECT_EQ(extension, UString("wav"));
      }
    }
    EXPECT_EQ(ErrorOf([&] { (void)take.GetFile(static_cast<int>(n)); }), -50);
    EXPECT_EQ(ErrorOf([&] { (void)take.GetFile(-1); }), -50);
  }
  const SoundFileSpecification one(SpecOf(dir.path / "Mix.aif"));
  EXPECT_FALSE(one.IsMultiMono());
  EXPECT_EQ(one.GetFiles(), std::vector<FileSpecification>{SpecOf(dir.path / "Mix.aif")});
  EXPECT_NE(one, SoundFileSpecification(SpecOf(dir.path / "Mix.aiff")));
}

TEST(SoundFileSpecification, SplitsChannelFileNames) {
  struct Case {
    const char* name;
    bool ok;
    const char *base, *suffix, *extension;
  };
  const Case cases[] = {
      {"Take.L.wav", true, "Take", ".L", "wav"},
      {"My.Take.LFE.aiff", true, "My.Take", ".LFE", "aiff"},
      {"Take.Rsr", true, "Take", ".Rsr", ""},
      {"Take.12.w64", true, "Take", ".12", "w64"},
      {"Take.wav", false, "", "", ""},
      {"Take.l.wav", false, "", "", ""},  // suffixes compare exactly
      {".L.wav", false, "", "", ""},
      {"L.wav", false, "", "", ""},
      {"", false, "", "", ""},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    UString base("x"), suffix("x"), extension("x");
    ASSERT_EQ(
        SoundFileSpecification::SplitChannelFileName(UString(c.name), base, suffix, extension),
        c.ok);
    if (!c.ok) {
      EXPECT_EQ(base, UString("x"));
      continue;
    }
    EXPECT_EQ(base, UString(c.base));
    EXPECT_EQ(suffix, UString(c.suffix));
    EXPECT_EQ(extension, UString(c.extension));
  }
}

// A host that names left and right in its own language.
class GermanSuffixes final : public TarnCoreLibCallbacks {
 public:
  bool GetIndString(short listID, short index, UString& text) override {
    if (listID != kChannelSuffixesStringList || index > 2) return false;
    text = UString(index == 1 ? ".Links" : ".Rechts");
    return true;
  }
};

TEST(SoundFileSpecification, SuffixesComeFromTheHost) {
  GermanSuffixes host;
  TarnCoreLibCallbacks::SetCallbackAPI(&host);
  const auto order = HostChannelOrder::ForChannelCount(3);
  EXPECT_EQ(SoundFileSpecification::GetChannelSuffix(order, 0), UString(".Links"));
  EXPECT_EQ(SoundFileSpecification::GetChannelSuffix(order, 1), UString(".Rechts"));
  EXPECT_EQ(SoundFileSpecification::GetChannelSuffix(order, 2), UString(".C"));
  UString base, suffix, extension;
  EXPECT_TRUE(SoundFileSpecification::SplitChannelFileName(UString("a.Rechts.wav"), base, suffix,
                                                           extension));
  EXPECT_FALSE(
      SoundFileSpecification::SplitChannelFileName(UString("a.R.wav"), base, suffix, extension));
  TarnCoreLibCallbacks::SetCallbackAPI(nullptr);
  EXPECT_EQ(SoundFileSpecification::GetChannelSuffix(order, 0), UString(".L"));
  EXPECT_EQ(ErrorOf([&] { (void)SoundFileSpecification::GetChannelSuffix(order, 3); }), -50);
}

}  // namespace
}  // namespace tarn::test
