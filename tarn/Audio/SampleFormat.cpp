#include "tarn/Audio/SampleFormat.h"

#include <array>
#include <mutex>

#include "tarn/Basics/TarnCoreLibCallbacks.h"
#include "tarn/Errors/Fail.h"
#include "tarn/String/UString.h"

namespace tarn {

int GetBytesPerSample(SampleFormat format) noexcept {
  static constexpr int kBytes[kNumSampleFormats] = {1, 1, 2, 3, 4, 4, 8, 8};
  const auto index = static_cast<unsigned>(format);
  return index < kNumSampleFormats ? kBytes[index] : 0;
}

SampleFormat NormalSampleFormatForSize(int bytes) noexcept {
  switch (bytes) {
    case 2:
      return kSamp16;
    case 3:
      return kSamp24;
    case 4:
      return kSampFloat32;
    case 8:
      return kSampWide64B;
    default:
      return kSamp8Offset;
  }
}

namespace {

// One name per format, each fetched the first time it is asked for.
struct SampleFormatNames {
  std::array<UString, kNumSampleFormats> mNames;
  std::array<std::once_flag, kNumSampleFormats> mFetched;
};

}  // namespace

const UString& GetSampleFormatName(SampleFormat format) {
  const auto index = static_cast<unsigned>(format);
  if (index >= kNumSampleFormats) FailOSErr(-50);
  static SampleFormatNames* const names = new SampleFormatNames;  // lives for the process
  std::call_once(names->mFetched[index], [index] {
    names->mNames[index] =
        GetIndUString(kSampleFormatNamesStringList, static_cast<short>(index + 1));
  });
  return names->mNames[index];
}

}  // namespace tarn
