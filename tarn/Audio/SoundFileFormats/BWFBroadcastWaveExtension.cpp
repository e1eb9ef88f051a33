#include "tarn/Audio/SoundFileFormats/BWFBroadcastWaveExtension.h"

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstring>
#include <string>

#include "tarn/Audio/SoundFileFormats/LittleEndianBytesImpl.h"

namespace tarn {

namespace {

void PutText(std::uint8_t* out, const std::string& text, int size) {
  std::memcpy(out, text.data(), std::min<std::size_t>(text.size(), static_cast<std::size_t>(size)));
}

// The bytes of [offset, offset + size) that `size` bytes of data reach, up
// to the first zero byte.
std::string GetText(const std::uint8_t* data, std::size_t have, int offset, int size) {
  if (have <= static_cast<std::size_t>(offset)) return {};
  const std::size_t count = std::min<std::size_t>(have - offset, static_cast<std::size_t>(size));
  const auto* first = reinterpret_cast<const char*>(data + offset);
  return std::string(first, std::find(first, first + count, '\0'));
}

const char* ModeName(int channels) {
  switch (channels) {
    case 1:
      return "mono";
    case 2:
      return "stereo";
    default:
      return "multichannel";
  }
}

}  // namespace

BWFBroadcastWaveExtension BWFBroadcastWaveExtension::ForNewRecording(
    const SoundFileAttributes& attributes) {
  BWFBroadcastWaveExtension bext;
  bext.mVersion = 1;
  bext.mOriginator = kDefaultOriginator;
  const auto now = std::chrono::system_clock::now();
  const auto day = std::chrono::floor<std::chrono::days>(now);
  const std::chrono::year_month_day date{day};
  const std::chrono::hh_mm_ss time{std::chrono::floor<std::chrono::seconds>(now - day)};
  char buffer[64];
  std::snprintf(buffer, sizeof buffer, "%04d-%02u-%02u", static_cast<int>(date.year()),
                static_cast<unsigned>(date.month()), static_cast<unsigned>(date.day()));
  bext.mOriginationDate = buffer;
  std::snprintf(buffer, sizeof buffer, "%02d:%02d:%02d", static_cast<int>(time.hours().count()),
                static_cast<int>(time.minutes().count()), static_cast<int>(time.seconds().count()));
  bext.mOriginationTime = buffer;
  bext.mLoudnessValue = bext.mLoudnessRange = bext.mMaxTruePeakLevel = kLoudnessUnset;
  bext.mMaxMomentaryLoudness = bext.mMaxShortTermLoudness = kLoudnessUnset;
  const bool isFloat = attributes.mSampleFormat == kSampFloat32 ||
                       attributes.mSampleFormat == kSampWide64A ||
                       attributes.mSampleFormat == kSampWide64B;
  std::snprintf(buffer, sizeof buffer, "A=%s,F=%d,W=%d,M=%s,T=%s\r\n", isFloat ? "FLOAT" : "PCM",
                static_cast<int>(attributes.mSampleRate), 8 * attributes.mBytesPerSample,
                ModeName(attributes.mNumChannels), kDefaultOriginator);
  bext.mCodingHistory = buffer;
  return bext;
}

std::vector<std::uint8_t> BWFBroadcastWaveExtension::Flatten() const {
  namespace le = LittleEndianBytes;
  std::vector<std::uint8_t> out(std::max<std::size_t>(BroadcastWaveExtensionDefaultChunkSize,
                                                      kFixedPartSize + mCodingHistory.size()));
  std::uint8_t* p = out.data();
  PutText(p, mDescription, kDescriptionSize);
  PutText(p + 256, mOriginator, kOriginatorSize);
  PutText(p + 288, mOriginatorReference, kOriginatorReferenceSize);
  PutText(p + 320, mOriginationDate, kOriginationDateSize);
  PutText(p + 330, mOriginationTime, kOriginationTimeSize);
  le::Store32(p + kTimeReferenceOffset, mTimeReferenceLow);
  le::Store32(p + kTimeReferenceOffset + 4, mTimeReferenceHigh);
  le::Store16(p + kVersionOffset, mVersion);
  std::copy(mUMID.begin(), mUMID.end(), p + kUMIDOffset);
  const std::int16_t loudness[5] = {mLoudnessValue, mLoudnessRange, mMaxTruePeakLevel,
                                    mMaxMomentaryLoudness, mMaxShortTermLoudness};
  for (int i = 0; i < 5; ++i)
    le::Store16(p + kLoudnessOffset + 2 * i, static_cast<std::uint16_t>(loudness[i]));
  std::memcpy(p + kFixedPartSize, mCodingHistory.data(), mCodingHistory.size());
  return out;
}

BWFBroadcastWaveExtension BWFBroadcastWaveExtension::Parse(const std::uint8_t* data,
                                                           std::size_t size) {
  namespace le = LittleEndianBytes;
  BWFBroadcastWaveExtension bext;
  if (data == nullptr) return bext;
  bext.mDescription = GetText(data, size, 0, kDescriptionSize);
  bext.mOriginator = GetText(data, size, 256, kOriginatorSize);
  bext.mOriginatorReference = GetText(data, size, 288, kOriginatorReferenceSize);
  bext.mOriginationDate = GetText(data, size, 320, kOriginationDateSize);
  bext.mOriginationTime = GetText(data, size, 330, kOriginationTimeSize);
  const auto has = [size](int offset, int count) {
    return size >= static_cast<std::size_t>(offset + count);
  };
  if (has(kTimeReferenceOffset, 8)) {
    bext.mTimeReferenceLow = le::Load32(data + kTimeReferenceOffset);
    bext.mTimeReferenceHigh = le::Load32(data + kTimeReferenceOffset + 4);
  }
  if (has(kVersionOffset, 2)) bext.mVersion = le::Load16(data + kVersionOffset);
  if (has(kUMIDOffset, kUMIDSize))
    std::copy(data + kUMIDOffset, data + kUMIDOffset + kUMIDSize, bext.mUMID.begin());
  std::int16_t* loudness[5] = {&bext.mLoudnessValue, &bext.mLoudnessRange, &bext.mMaxTruePeakLevel,
                               &bext.mMaxMomentaryLoudness, &bext.mMaxShortTermLoudness};
  for (int i = 0; i < 5; ++i) {
    if (has(kLoudnessOffset + 2 * i, 2))
      *loudness[i] = static_cast<std::int16_t>(le::Load16(data + kLoudnessOffset + 2 * i));
  }
  if (size > static_cast<std::size_t>(kFixedPartSize)) {
    const auto* first = reinterpret_cast<const char*>(data + kFixedPartSize);
    std::size_t count = size - kFixedPartSize;
    while (count > 0 && first[count - 1] == 0) --count;
    bext.mCodingHistory.assign(first, count);
  }
  return bext;
}

}  // namespace tarn
