#include "tarn/Audio/SampleFormat.h"

#include <gtest/gtest.h>

#include "AudioTestUtil.h"
#include "tarn/Basics/TarnCoreLibCallbacks.h"
#include "tarn/String/UString.h"

namespace {

using namespace tarn;

TEST(SampleFormat, SizesAndOffsetBytes) {
  const int bytes[] = {0, 1, 1, 2, 3, 4, 4, 8, 8, 0};
  for (int f = -1; f <= 8; ++f)
    EXPECT_EQ(GetBytesPerSample(static_cast<SampleFormat>(f)), bytes[f + 1]) << f;
  const SampleFormat normal[] = {kSamp8Offset, kSamp8Offset, kSamp8Offset, kSamp16,
                                 kSamp24,      kSampFloat32, kSamp8Offset, kSamp8Offset,
                                 kSamp8Offset, kSampWide64B, kSamp8Offset};
  for (int size = -1; size <= 9; ++size)
    EXPECT_EQ(NormalSampleFormatForSize(size), normal[size + 1]) << size;
  for (int s = -128; s < 128; ++s) {
    const EightBitOffsetNumber n(static_cast<signed char>(s));
    EXPECT_TRUE(n.mValue == std::uint8_t(s + 128) && static_cast<signed char>(n) == s) << s;
  }
}

// Answers the format-name list with its own texts and counts the questions.
// The only test here that asks for names: the cache is process-wide, so the
// host must be installed before the first question. Cached texts survive the
// host's removal; every format also has a built-in name.
TEST(SampleFormat, NamesComeFromTheHostOnceAndStayCached) {
  struct CountingHost final : TarnCoreLibCallbacks {
    bool GetIndString(short listID, short index, UString& text) override {
      text = UString(("host " + std::to_string(index)).c_str());
      return listID == kSampleFormatNamesStringList && ++asked;
    }
    int asked = 0;
  } host;
  TarnCoreLibCallbacks::SetCallbackAPI(&host);
  for (int round = 0; round < 3; ++round)
    for (short f = 0; f < 8; ++f) {
      const UString& name = GetSampleFormatName(static_cast<SampleFormat>(f));
      EXPECT_TRUE(name == UString(("host " + std::to_string(f + 1)).c_str())) << f;
      EXPECT_EQ(&name, &GetSampleFormatName(static_cast<SampleFormat>(f)));
      UString text;
      EXPECT_TRUE(
          TarnCoreLibCallbacks::GetBuiltInIndString(kSampleFormatNamesStringList, f + 1, text) &&
          !text.empty());
    }
  EXPECT_EQ(host.asked, 8);
  TarnCoreLibCallbacks::SetCallbackAPI(nullptr);
  EXPECT_TRUE(GetSampleFormatName(kSamp16) == UString("host 3"));
  for (int bad : {-1, 8, 1000})
    EXPECT_EQ(ErrorOf([&] { (void)GetSampleFormatName(static_cast<SampleFormat>(bad)); }), -50);
}

}  // namespace
