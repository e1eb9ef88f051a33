#include "tarn/Audio/SoundFileFormats/NoMetaDataSoundFileFormat.h"

namespace tarn {

double NoMetaDataSoundFileFormat::GetNaturalRate() { return GetFileAttributes().mSampleRate; }

HostChannelOrder NoMetaDataSoundFileFormat::GetChannelOrder() {
  return HostChannelOrder::ForChannelCount(GetFileAttributes().mNumChannels);
}

std::unique_ptr<SoundFileRegionList> NoMetaDataSoundFileFormat::GetRegionList(
    ReadOnlyMetaDataAccess&) {
  return std::make_unique<SoundFileRegionList>();
}

}  // namespace tarn
