// The base behaviours of SoundFileFormat: file operations, the length
// algorithms and the defaults of the optional features. The metadata
// counting lives in MetaDataAccess.cpp, the type table in
// SoundFileTypeTable.cpp.
#include "tarn/Audio/SoundFileFormats/SoundFileFormat.h"

#include <utility>

#include "tarn/Audio/AudioInFile.h"
#include "tarn/Audio/AudioOutFile.h"

#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatFailImpl.h"
#include "tarn/Audio/SoundFileFormats/SoundFileTypeTable.h"
#include "tarn/Errors/Fail.h"
#include "tarn/FileSystem/File.h"

namespace tarn {

SoundFileFormat::SoundFileFormat(const FileSpecification& file) : file_(file) {}

SoundFileFormat::~SoundFileFormat() = default;

std::vector<double> SoundFileFormat::GetCachedRates() { return {}; }

std::unique_ptr<AsyncAudioReader> SoundFileFormat::MakeReader(const TimeRangeOf<SampleCount>& range,
                                                              double rate) {
  if (FormatRequiresExternalConversion())
    sffimpl::FailWithText("SoundFileFormat", kNotAvailableErr,
                          "this file is read through the outside converter only", file_);
  if (rate != GetNaturalRate())
    sffimpl::FailWithText("SoundFileFormat", kParamErr,
                          "a reader delivers the file's own sample rate only", file_);
  const DSPSoundBiteSpec bite{file_, GetFileAttributes(), GetChannelOrder(), range};
  return std::make_unique<AudioInFile>(bite, FileLength{GetLengthInFrames()});
}

std::shared_ptr<InterAudioWriter> SoundFileFormat::MakeWriter() {
  if (FormatRequiresExternalConversion())
    sffimpl::FailWithText("SoundFileFormat", kNotAvailableErr,
                          "this file is read through the outside converter only", file_);
  std::shared_ptr<SoundFileFormat> self = weak_from_this().lock();
  if (!self)
    sffimpl::FailWithText("SoundFileFormat", kParamErr,
                          "a writer needs a format object owned by a shared_ptr", file_);
  // Appended audio must end the file: chunks after the audio go first.
  const SoundFileAttributes attributes = GetFileAttributes();
  AudioOutFile::CheckPlainSampleData(attributes, file_);
  const std::int64_t audioEnd =
      attributes.mOffsetToAudio + GetLengthInFrames().AsLongLong() * attributes.mBytesPerFrame;
  if (File(file_).GetFileDataSize() > audioEnd + (audioEnd & 1)) RemoveTrailingMetaData();
  return std::make_shared<AudioOutFile>(std::move(self));
}

void SoundFileFormat::Delete() {
  File(file_).Delete();
  SoundFileFormatCache::Instance().FormatDeleted(*this);
}

void SoundFileFormat::MoveTo(const FileSpecification& folder, const UString& name) {
  File file(file_);
  file.MoveTo(folder, name);
  UpdateFileSpec(file.GetSpecification());
  SoundFileFormatCache::Instance().FormatChanged(*this);
}

void SoundFileFormat::Rename(const UString& name) {
  File file(file_);
  file.Rename(name);
  UpdateFileSpec(file.GetSpecification());
  SoundFileFormatCache::Instance().FormatChanged(*this);
}

bool SoundFileFormat::GetFileModDate(FileDate& date) {
  try {
    date = FileDate::Get(file_);
    return true;
  } catch (const TarnError&) {
    return false;
  }
}

bool SoundFileFormat::IsFileWritable() { return File(file_).CanWriteToFile(); }

void SoundFileFormat::GetFormatName(UString& name) {
  const SoundFileTypeEntry* entry = FindSoundFileType(GetActualFileType());
  if (entry == nullptr) entry = FindSoundFileType(GetCanonicalFileType());
  name = entry != nullptr ? UString(entry->mName) : UString();
}

double SoundFileFormat::GetLengthInSeconds() {
  return static_cast<double>(GetLengthInFrames().AsLongLong()) * GetNaturalRate();
}

void SoundFileFormat::ChangeLengthInFrames(ReadWriteMetaDataAccess& access, SampleCount n) {
  CheckAccess(access);
  if (n == GetLengthInFrames()) return;
  const SoundFileAttributes attributes = GetFileAttributes();
  ChangeLengthInternal(attributes, n);
}

void SoundFileFormat::UpdateLengthAfterAppendingAudio(ReadWriteMetaDataAccess& access,
                                                      const SoundFileAttributes& attributes) {
  CheckAccess(access);
  const SampleCount n = GetLengthInFramesBasedOnDataLen(attributes);
  ChangeLengthInternal(attributes, n);
}

void SoundFileFormat::ChangeLengthInternal(const SoundFileAttributes& attributes,
                                           SampleCount frames) {
  if (ShouldSwitchToExtendedFileFormat(frames)) SwitchToExtendedFileFormat(frames);
  AdjustLengthInHeader(attributes, frames);
  {
    std::lock_guard<std::recursive_mutex> guard(metaDataLock_);
    lengthChanged_ = true;
  }
  ThrowOutCachedMetaDataPositions();
  SoundFileFormatCache::Instance().FormatChanged(*this);
}

SampleCount SoundFileFormat::GetLengthInFramesBasedOnDataLen(
    const SoundFileAttributes& attributes) const {
  const std::int32_t bytesPerFrame = attributes.mBytesPerFrame;
  if (bytesPerFrame < 1) FailOSErr(kParamErr);
  const std::int64_t dataSize = File(file_).GetFileDataSize();
  return SampleCount((dataSize - attributes.mOffsetToAudio) / bytesPerFrame);
}

bool SoundFileFormat::SupportsRegionList() { return false; }
bool SoundFileFormat::ImportRegionsAsSeparateSoundBites() { return false; }
bool SoundFileFormat::AlwaysImportRegionForWholeFile() { return true; }

std::uint32_t SoundFileFormat::GetActualFileType() { return GetCanonicalFileType(); }

bool SoundFileFormat::IsValidType(std::uint32_t type) {
  return GetActualFileType() == 0 || type == GetCanonicalFileType();
}

bool SoundFileFormat::MatchesExtension(const UString&) { return false; }
bool SoundFileFormat::FormatRequiresExternalConversion() { return false; }
bool SoundFileFormat::HasFileTempoAndSyncPoint(float&, SampleCount&) { return false; }
bool SoundFileFormat::HasFileMeterAndPitch(short&, short&, short&) { return false; }
bool SoundFileFormat::GetDisplayTempo(UString&) { return false; }
bool SoundFileFormat::SetDisplayTempo(ReadWriteMetaDataAccess&, UString&) { return false; }
bool SoundFileFormat::HasOriginalTimeStamp(SampleCount&) { return false; }
void SoundFileFormat::WriteOriginalTimeStamp(ReadWriteMetaDataAccess&, SampleCount) {}
bool SoundFileFormat::ShouldUseExistingGroup() { return false; }
bool SoundFileFormat::SupportsLoops() { return false; }
bool SoundFileFormat::SupportsTickOffsets() { return false; }
void SoundFileFormat::GetTickOffsets(std::vector<Tick>&) {}
void SoundFileFormat::SetTickOffsets(const std::vector<Tick>&) {}
bool SoundFileFormat::SupportsLengthInTicks() { return false; }
double SoundFileFormat::GetLengthInTicks() { return 0.0; }
bool SoundFileFormat::SupportsRegionTempos() { return false; }
void SoundFileFormat::GetRegionTempos(ReadOnlyMetaDataAccess&, std::vector<double>&) {}
void SoundFileFormat::ClearFileTempoData() {}
bool SoundFileFormat::SetNoTimeScaleOnImport() { return false; }
void SoundFileFormat::SaveStringToFile(ReadWriteMetaDataAccess&, int, const UString&) {}
bool SoundFileFormat::GetStringFromFile(ReadOnlyMetaDataAccess&, int, UString&) { return false; }
bool SoundFileFormat::AudioDataIsZeroLength() { return false; }
void SoundFileFormat::RecoverCrashedRecording() {}
bool SoundFileFormat::SupportsRawHeader() { return false; }
void SoundFileFormat::GetRawHeader(std::vector<std::uint8_t>&) {}
bool SoundFileFormat::FormatSupportsMetaData() { return true; }
void SoundFileFormat::RemoveTrailingMetaData() {}

void SoundFileFormat::UpdateFileSpec(const FileSpecification& file) { file_ = file; }

SampleCount SoundFileFormat::GetMaxFrameCount() {
  return SoundFileFormatCache::GetMaxFrameCountForType(GetActualFileType(),
                                                       GetFileAttributes().mBytesPerFrame);
}

bool SoundFileFormat::ShouldSwitchToExtendedFileFormat(const SampleCount&) { return false; }
void SoundFileFormat::SwitchToExtendedFileFormat(const SampleCount&) {}
bool SoundFileFormat::IsExtendedFormat() { return false; }
void SoundFileFormat::ThrowOutCachedMetaDataPositions() {}

void SoundFileFormat::GetFormatName(std::uint32_t type, UString& name) {
  const SoundFileTypeEntry* entry = FindSoundFileType(type);
  name = entry != nullptr ? UString(entry->mName) : UString();
}

void SoundFileFormat::GetSupportedFileTypes(const std::uint32_t*& types, int& count) noexcept {
  types = GetSoundFileTypeCodes();
  count = kNumSupportedFileTypes;
}

SoundFileAttributes SoundFileFormat::GetAttributesFromFileAndType(const FileSpecification& file,
                                                                  std::uint32_t type) {
  return SoundFileFormatCache::Instance().GetFormat(file, type)->GetFileAttributes();
}

SampleCount SoundFileFormat::GetFileLengthInFrames(const FileSpecification& file,
                                                   std::uint32_t type) {
  return SoundFileFormatCache::Instance().GetFormat(file, type)->GetLengthInFrames();
}

void SoundFileFormat::CheckAccess(const HoldOpenMetaData& access) const {
  if (&access.GetFormat() != this) FailOSErr(kParamErr);
}

}  // namespace tarn
