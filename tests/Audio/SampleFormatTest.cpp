#include "tarn/Audio/SampleFormat.h"

#include <gtest/gtest.h>

#include <map>

#include "tarn/Basics/TarnCoreLibCallbacks.h"
#include "tarn/Errors/TarnError.h"
#include "tarn/String/UString.h"

namespace {

using namespace tarn;

TEST(SampleFormat, BytesPerSample) {
  const int want[] = {1, 1, 2, 3, 4, 4, 8, 8};
  for (int f = 0; f < 8; ++f) EXPECT_EQ(GetBytesPerSample(static_cast<SampleFormat>(f)), want[f]);
  EXPECT_EQ(GetBytesPerSample(static_cast<SampleFormat>(8)), 0);
  EXPECT_EQ(GetBytesPerSample(static_cast<SampleFormat>(-1)), 0);
}

TEST(SampleFormat, NormalFormatForSize) {
  EXPECT_EQ(NormalSampleFormatForSize(1), kSamp8Offset);
  EXPECT_EQ(NormalSampleFormatForSize(2), kSamp16);
  EXPECT_EQ(NormalSampleFormatForSize(3), kSamp24);
  EXPECT_EQ(NormalSampleFormatForSize(4), kSampFloat32);  // float, not 24 in 32
  EXPECT_EQ(NormalSampleFormatForSize(8), kSampWide64B);
  for (int bytes : {-1, 0, 5, 6, 7, 9, 16})
    EXPECT_EQ(NormalSampleFormatForSize(bytes), kSamp8Offset);
}

TEST(SampleFormat, EightBitOffsetNumberFlipsTheTopBit) {
  for (int s = -128; s < 128; ++s) {
    const EightBitOffsetNumber n(static_cast<signed char>(s));
    EXPECT_EQ(n.mValue, static_cast<std::uint8_t>(s + 128));
    EXPECT_EQ(static_cast<signed char>(n), s);
  }
}

// Answers list 12595 with its own texts and counts the questions.
class CountingHost final : public TarnCoreLibCallbacks {
 public:
  bool GetIndString(short listID, short index, UString& text) override {
    ++asked[{listID, index}];
    if (listID != kSampleFormatNamesStringList) return false;
    text = UString(("host format " + std::to_string(index)).c_str());
    return true;
  }
  std::map<std::pair<short, short>, int> asked;
};

// The only test in this program that asks for names: the cache is
// process-wide, so the host must be installed before the first question.
TEST(SampleFormat, NamesComeFromTheHostOnceAndStayCached) {
  CountingHost host;
  TarnCoreLibCallbacks::SetCallbackAPI(&host);
  for (int round = 0; round < 3; ++round) {
    for (int f = 0; f < 8; ++f) {
      const UString& name = GetSampleFormatName(static_cast<SampleFormat>(f));
      EXPECT_TRUE(name == UString(("host format " + std::to_string(f + 1)).c_str())) << f;
      EXPECT_EQ(&name, &GetSampleFormatName(static_cast<SampleFormat>(f)));
    }
  }
  TarnCoreLibCallbacks::SetCallbackAPI(nullptr);
  for (int f = 0; f < 8; ++f) {
    EXPECT_EQ((host.asked[{kSampleFormatNamesStringList, static_cast<short>(f + 1)}]), 1) << f;
  }
  // Cached texts survive the host's removal.
  EXPECT_TRUE(GetSampleFormatName(kSamp16) == UString("host format 3"));
  for (int bad : {-1, 8, 1000}) {
    try {
      (void)GetSampleFormatName(static_cast<SampleFormat>(bad));
      ADD_FAILURE() << bad;
    } catch (const TarnError& e) {
      EXPECT_EQ(e.GetIntErrorCode(), -50);
    }
  }
}

TEST(SampleFormat, BuiltInNamesExistForEveryFormat) {
  for (short f = 0; f < 8; ++f) {
    UString text;
    EXPECT_TRUE(
        TarnCoreLibCallbacks::GetBuiltInIndString(kSampleFormatNamesStringList, f + 1, text));
    EXPECT_FALSE(text.empty());
  }
}

}  // namespace
