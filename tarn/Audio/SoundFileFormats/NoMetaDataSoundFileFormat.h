#pragma once
// NoMetaDataSoundFileFormat: the base of formats that carry no metadata,
// such as files that only the outside converter can read.
//
// It answers every metadata question with "none": FormatSupportsMetaData
// and MetaDataIsOpen are false, there are no loops and no regions, reads of
// metadata give empty blocks, and every metadata write, loop write,
// record-flag and tempo write, CleanMetaDataMods and AdjustLengthInHeader do
// nothing. Its natural rate is the rate of its attributes and its channel
// order the default order for its channel count. A concrete class supplies
// the rest (length, attributes, types, creation). Threads as
// SoundFileFormat.

#include "tarn/Audio/SoundFileFormats/SoundFileFormat.h"

namespace tarn {

class NoMetaDataSoundFileFormat : public SoundFileFormat {
 public:
  using SoundFileFormat::SoundFileFormat;
  ~NoMetaDataSoundFileFormat() override = default;

  // The one empty operation behind every metadata write of this class.
  void MetaDataNotSupported() noexcept {}

  [[nodiscard]] double GetNaturalRate() override;
  [[nodiscard]] HostChannelOrder GetChannelOrder() override;

  [[nodiscard]] bool SupportsRegionList() override { return false; }
  [[nodiscard]] std::unique_ptr<SoundFileRegionList> GetRegionList(
      ReadOnlyMetaDataAccess& access) override;
  void WriteRegionList(ReadWriteMetaDataAccess&, RCBlobMT, std::uint32_t) override {
    MetaDataNotSupported();
  }
  void SetRecordFlagMetaData(ReadWriteMetaDataAccess&, int) override { MetaDataNotSupported(); }
  void WriteFileTempoData(ReadWriteMetaDataAccess&, float, short, short, short,
                          const std::vector<std::int64_t>&, SampleCount, float) override {
    MetaDataNotSupported();
  }
  [[nodiscard]] bool SupportsLoops() override { return false; }
  [[nodiscard]] short NumberOfLoops(ReadOnlyMetaDataAccess&) override { return 0; }
  void GetFileLoop(ReadOnlyMetaDataAccess&, short, SoundFileFormatLoop&) override {
    MetaDataNotSupported();
  }
  void AddFileLoops(ReadWriteMetaDataAccess&, const std::vector<SoundFileFormatLoop>&) override {
    MetaDataNotSupported();
  }
  [[nodiscard]] bool FormatSupportsMetaData() override { return false; }
  [[nodiscard]] bool MetaDataIsOpen() override { return false; }
  void DontSetModDateBackOnMetaDataClose() override { MetaDataNotSupported(); }
  [[nodiscard]] bool HasMetaData(ReadOnlyMetaDataAccess&, std::uint32_t) override { return false; }
  [[nodiscard]] RCBlobMT ReadMetaData(ReadOnlyMetaDataAccess&, std::uint32_t) override {
    return {};
  }
  void WriteMetaData(ReadWriteMetaDataAccess&, std::uint32_t, RCBlobMT) override {
    MetaDataNotSupported();
  }
  void CleanMetaDataMods() override { MetaDataNotSupported(); }
  [[nodiscard]] RCBlobMT ReadNamedMetaData(ReadOnlyMetaDataAccess&, const UString&,
                                           std::uint32_t) override {
    return {};
  }
  void WriteNamedMetaData(ReadWriteMetaDataAccess&, const UString&, std::uint32_t,
                          RCBlobMT) override {
    MetaDataNotSupported();
  }

 private:
  void AdjustLengthInHeader(const SoundFileAttributes&, SampleCount) override {
    MetaDataNotSupported();
  }
};

}  // namespace tarn
