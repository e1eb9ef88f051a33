#pragma once
// Formats that keep every base behaviour of SoundFileFormat.
// StubSoundFileFormat supplies only what the base leaves to a concrete
// format, from plain fields; FakeSoundFileFormat also records the calls of
// the base's algorithms and metadata hooks in one log, so tests see their
// order.

#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "tarn/Audio/SoundFileFormats/RIFFType.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormat.h"

namespace tarn::test {

class StubSoundFileFormat : public SoundFileFormat {
 public:
  using SoundFileFormat::SoundFileFormat;

  SoundFileAttributes attributes{MakeRIFFType("WAVE"), 2, 48000.0, kSamp16, 2, 4, 44, true};
  SampleCount length{1000};
  std::uint32_t canonicalType = MakeRIFFType("WAVE");

  double GetNaturalRate() override { return attributes.mSampleRate; }
  SampleCount GetLengthInFrames() override { return length; }
  std::unique_ptr<SoundFileRegionList> GetRegionList(ReadOnlyMetaDataAccess&) override {
    return std::make_unique<SoundFileRegionList>();
  }
  void WriteRegionList(ReadWriteMetaDataAccess&, RCBlobMT, std::uint32_t) override {}
  std::uint32_t GetCanonicalFileType() override { return canonicalType; }
  std::uint32_t GetPerferredFileCreator() override { return MakeRIFFType("TARN"); }
  SoundFileAttributes GetFileAttributes() override { return attributes; }
  HostChannelOrder GetChannelOrder() override {
    return HostChannelOrder::ForChannelCount(attributes.mNumChannels);
  }
  SoundFileAttributes CreateFileOnDisk(const SoundFileAttributes& a, SampleCount, bool,
                                       const SoundFileAttributes&) override {
    return a;
  }
  void SetRecordFlagMetaData(ReadWriteMetaDataAccess&, int) override {}
  void WriteFileTempoData(ReadWriteMetaDataAccess&, float, short, short, short,
                          const std::vector<std::int64_t>&, SampleCount, float) override {}
  short NumberOfLoops(ReadOnlyMetaDataAccess&) override { return 0; }
  void GetFileLoop(ReadOnlyMetaDataAccess&, short, SoundFileFormatLoop&) override {}
  void AddFileLoops(ReadWriteMetaDataAccess&, const std::vector<SoundFileFormatLoop>&) override {}
  bool HasMetaData(ReadOnlyMetaDataAccess&, std::uint32_t) override { return false; }
  RCBlobMT ReadMetaData(ReadOnlyMetaDataAccess&, std::uint32_t) override { return {}; }
  void WriteMetaData(ReadWriteMetaDataAccess&, std::uint32_t, RCBlobMT) override {}
  void CleanMetaDataMods() override {}
  RCBlobMT ReadNamedMetaData(ReadOnlyMetaDataAccess&, const UString&, std::uint32_t) override {
    return {};
  }
  void WriteNamedMetaData(ReadWriteMetaDataAccess&, const UString&, std::uint32_t,
                          RCBlobMT) override {}

 private:
  void AdjustLengthInHeader(const SoundFileAttributes&, SampleCount n) override { length = n; }
};

class FakeSoundFileFormat : public StubSoundFileFormat {
 public:
  using StubSoundFileFormat::StubSoundFileFormat;

  std::uint32_t actualType = MakeRIFFType("WAVE");
  bool switchToExtended = false;
  // Called by WriteMetaDataToDisk; its result is the hook's.
  std::function<bool()> onWrite = [] { return false; };
  // Makes OpenMetaDataOnDisk throw.
  bool failOpen = false;
  std::vector<std::string> log;

  std::uint32_t GetActualFileType() override { return actualType; }
  bool ShouldSwitchToExtendedFileFormat(const SampleCount& n) override {
    log.push_back("should-switch " + std::to_string(n.AsLongLong()));
    return switchToExtended;
  }
  void SwitchToExtendedFileFormat(const SampleCount& n) override {
    log.push_back("switch " + std::to_string(n.AsLongLong()));
  }

 protected:
  void ThrowOutCachedMetaDataPositions() override { log.push_back("throw-out"); }

 private:
  void AdjustLengthInHeader(const SoundFileAttributes& a, SampleCount n) override {
    log.push_back("adjust " + std::to_string(n.AsLongLong()) + " bpf " +
                  std::to_string(a.mBytesPerFrame));
    length = n;
  }
  void OpenMetaDataOnDisk(bool forWriting) override {
    if (failOpen) FailOSErr(kIOErr);
    log.push_back(forWriting ? "open rw" : "open r");
  }
  bool WriteMetaDataToDisk() override {
    log.push_back("write");
    return onWrite();
  }
  void CloseMetaDataOnDisk() noexcept override { log.push_back("close"); }
};

}  // namespace tarn::test
