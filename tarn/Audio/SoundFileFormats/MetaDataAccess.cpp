// The metadata access handles and the counting that SoundFileFormat does for
// them: the first handle opens the metadata, a read-write handle flushes the
// pending changes when it goes, the last handle closes the metadata and
// (when only metadata changed) sets the file's date back.
#include "tarn/Audio/SoundFileFormats/MetaDataAccess.h"

#include <utility>

#include "tarn/Audio/SoundFileFormats/SoundFileFormat.h"
#include "tarn/Errors/Fail.h"

namespace tarn {

HoldOpenMetaData::HoldOpenMetaData(SoundFileFormat& format,
                                   std::shared_ptr<SoundFileFormat> keepAlive,
                                   MetaDataMode mode) noexcept
    : format_(&format), keepAlive_(std::move(keepAlive)), mode_(mode) {}

HoldOpenMetaData::~HoldOpenMetaData() { format_->ReleaseMetaData(mode_); }

void ReadWriteMetaDataAccess::Flush() { GetFormat().FlushMetaData(); }

std::shared_ptr<HoldOpenMetaData> SoundFileFormat::AcquireMetaData(MetaDataMode mode) {
  std::shared_ptr<SoundFileFormat> keepAlive = weak_from_this().lock();
  const bool writing = mode == MetaDataMode::kReadWrite;
  {
    std::lock_guard<std::recursive_mutex> guard(metaDataLock_);
    if (metaDataHolds_ == 0) {
      OpenMetaDataOnDisk(writing);
      metaDataWritten_ = false;
      lengthChanged_ = false;
      keepModDateOnClose_ = false;
      modDateAtOpen_.reset();
      FileDate date;
      if (GetFileModDate(date)) modDateAtOpen_ = date;
    } else if (writing && metaDataWriters_ == 0) {
      OpenMetaDataOnDisk(true);
    }
    ++metaDataHolds_;
    if (writing) ++metaDataWriters_;
  }
  // The handle is made outside the lock: its destruction (also when making
  // the shared_ptr fails) takes the lock to give the count back.
  HoldOpenMetaData* handle = nullptr;
  try {
    switch (mode) {
      case MetaDataMode::kHoldOpen:
        handle = new HoldOpenMetaData(*this, std::move(keepAlive), mode);
        break;
      case MetaDataMode::kReadOnly:
        handle = new ReadOnlyMetaDataAccess(*this, std::move(keepAlive), mode);
        break;
      case MetaDataMode::kReadWrite:
        handle = new ReadWriteMetaDataAccess(*this, std::move(keepAlive), mode);
        break;
    }
    return std::shared_ptr<HoldOpenMetaData>(handle);
  } catch (...) {
    if (handle == nullptr) ReleaseMetaData(mode);
    throw;
  }
}

void SoundFileFormat::FlushMetaData() {
  std::lock_guard<std::recursive_mutex> guard(metaDataLock_);
  if (WriteMetaDataToDisk()) metaDataWritten_ = true;
}

void SoundFileFormat::ReleaseMetaData(MetaDataMode mode) noexcept {
  std::lock_guard<std::recursive_mutex> guard(metaDataLock_);
  if (mode == MetaDataMode::kReadWrite) {
    try {
      if (WriteMetaDataToDisk()) metaDataWritten_ = true;
    } catch (...) {
      // A release cannot report; Flush() is the way to see the failure.
    }
    --metaDataWriters_;
  }
  if (--metaDataHolds_ > 0) return;
  CloseMetaDataOnDisk();
  if (metaDataWritten_ && !lengthChanged_ && !keepModDateOnClose_ && modDateAtOpen_) {
    try {
      FileDate::Set(file_, *modDateAtOpen_);
    } catch (...) {
      // The file may be gone or read-only; its date then stays as it is.
    }
  }
  modDateAtOpen_.reset();
}

std::shared_ptr<ReadOnlyMetaDataAccess> SoundFileFormat::GetReadOnlyMetaDataAccess() {
  return std::static_pointer_cast<ReadOnlyMetaDataAccess>(AcquireMetaData(MetaDataMode::kReadOnly));
}

std::shared_ptr<ReadWriteMetaDataAccess> SoundFileFormat::GetReadWriteMetaDataAccess() {
  return std::static_pointer_cast<ReadWriteMetaDataAccess>(
      AcquireMetaData(MetaDataMode::kReadWrite));
}

std::shared_ptr<HoldOpenMetaData> SoundFileFormat::OpenMetaData() {
  return AcquireMetaData(MetaDataMode::kHoldOpen);
}

bool SoundFileFormat::MetaDataIsOpen() {
  std::lock_guard<std::recursive_mutex> guard(metaDataLock_);
  return metaDataHolds_ > 0;
}

void SoundFileFormat::DontSetModDateBackOnMetaDataClose() {
  std::lock_guard<std::recursive_mutex> guard(metaDataLock_);
  keepModDateOnClose_ = true;
}

void SoundFileFormat::GetFileModDateAtMetaDataOpen(FileDate& date) {
  std::lock_guard<std::recursive_mutex> guard(metaDataLock_);
  if (metaDataHolds_ == 0 || !modDateAtOpen_) FailOSErr(kParamErr);
  date = *modDateAtOpen_;
}

void SoundFileFormat::OpenMetaDataOnDisk(bool) {}
bool SoundFileFormat::WriteMetaDataToDisk() { return false; }
void SoundFileFormat::CloseMetaDataOnDisk() noexcept {}

}  // namespace tarn
