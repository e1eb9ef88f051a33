// SoundFileFormatCache: one shared format object per file, held weakly.
#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"

#include <algorithm>

#include "tarn/Audio/SoundFileFormats/ConverterSoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/RIFFType.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatFailImpl.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatMakersImpl.h"
#include "tarn/Errors/Fail.h"
#include "tarn/FileSystem/File.h"

namespace tarn {

// The outside converter serves converter-read types unless a test swaps it.
SoundFileFormatCache::SoundFileFormatCache()
    : converterFactory_(MakeConverterSoundFileFormat), converterProbe_(OutsideConverterCanOpen) {}
SoundFileFormatCache::~SoundFileFormatCache() = default;

SoundFileFormatCache& SoundFileFormatCache::Instance() {
  return Singleton<SoundFileFormatCache>::Instance();
}

std::shared_ptr<SoundFileFormat> SoundFileFormatCache::GetFormat(const FileSpecification& file) {
  if (std::shared_ptr<SoundFileFormat> found = FindFormat(file)) return found;
  return GetFormat(file, File(file).GetType());
}

std::shared_ptr<SoundFileFormat> SoundFileFormatCache::GetFormat(const FileSpecification& file,
                                                                 std::uint32_t type) {
  const UString key = file.GetFullPath();
  {
    std::lock_guard<std::mutex> guard(lock_);
    auto it = formats_.find(key);
    if (it != formats_.end()) {
      if (std::shared_ptr<SoundFileFormat> found = it->second.lock()) return found;
    }
  }
  // Made outside the lock: a format may read its file when it is made.
  std::shared_ptr<SoundFileFormat> made = MakeFormatForFile(file, type);
  std::lock_guard<std::mutex> guard(lock_);
  std::weak_ptr<SoundFileFormat>& slot = formats_[key];
  if (std::shared_ptr<SoundFileFormat> first = slot.lock()) return first;  // another thread won
  slot = made;
  PurgeLocked();
  return made;
}

std::shared_ptr<SoundFileFormat> SoundFileFormatCache::FindFormat(const FileSpecification& file) {
  const UString key = file.GetFullPath();
  std::lock_guard<std::mutex> guard(lock_);
  auto it = formats_.find(key);
  if (it == formats_.end()) return nullptr;
  std::shared_ptr<SoundFileFormat> found = it->second.lock();
  if (!found) formats_.erase(it);
  return found;
}

SoundFileFamily SoundFileFormatCache::FamilyForType(std::uint32_t type) noexcept {
  switch (type) {
    case MakeRIFFType("WAVE"):
    case MakeRIFFType("TEXT"):
    case MakeRIFFType("PNRA"):
    case MakeRIFFType(".W64"):
    case MakeRIFFType(".WAV"):
    case MakeRIFFType(".wav"):
      return SoundFileFamily::kWAVE;
    case MakeRIFFType("AIFF"):
    case MakeRIFFType("ACdI"):
      return SoundFileFamily::kAIFF;
    case MakeRIFFType("Sd2f"):
    case MakeRIFFType("SFIL"):
      return SoundFileFamily::kSoundDesigner;
    default:
      return SoundFileFamily::kConverter;
  }
}

std::shared_ptr<SoundFileFormat> SoundFileFormatCache::MakeFormatForFile(
    const FileSpecification& file, std::uint32_t type) {
  switch (FamilyForType(type)) {
    case SoundFileFamily::kWAVE:
      return sffimpl::MakeWAVEFormat(file);
    case SoundFileFamily::kAIFF:
      return sffimpl::MakeAIFFFormat(file);
    case SoundFileFamily::kSoundDesigner:
      sffimpl::FailWithText("SoundFileFormatCache", kUnsupportedFormatErr,
                            "Sound Designer files are not supported", file);
    case SoundFileFamily::kConverter:
      break;
  }
  ConverterFormatFactory factory;
  {
    std::lock_guard<std::mutex> guard(lock_);
    factory = converterFactory_;
  }
  std::shared_ptr<SoundFileFormat> made = factory ? factory(file, type) : nullptr;
  if (!made) {
    sffimpl::FailWithText("SoundFileFormatCache", kUnsupportedFormatErr,
                          "no converter reads files of this type", file);
  }
  return made;
}

SoundFileFormatCache::ConverterFormatFactory SoundFileFormatCache::SetConverterFormatFactory(
    ConverterFormatFactory factory) {
  std::lock_guard<std::mutex> guard(lock_);
  std::swap(factory, converterFactory_);
  return factory;
}

SoundFileFormatCache::ConverterProbe SoundFileFormatCache::SetConverterProbe(ConverterProbe probe) {
  std::lock_guard<std::mutex> guard(lock_);
  std::swap(probe, converterProbe_);
  return probe;
}

bool SoundFileFormatCache::ConverterCanOpen(const FileSpecification& file) noexcept {
  try {
    ConverterProbe probe;
    {
      std::lock_guard<std::mutex> guard(lock_);
      probe = converterProbe_;
    }
    return probe && probe(file);
  } catch (...) {
    return false;
  }
}

SampleCount SoundFileFormatCache::GetMaxFrameCountForType(std::uint32_t type, int bytesPerFrame) {
  if (bytesPerFrame < 1) FailOSErr(kParamErr);
  constexpr std::int64_t k32BitSizes = 0xFFFFFFFFLL;
  constexpr std::int64_t k64BitBytes = std::int64_t{1} << 62;
  std::int64_t bytes = k64BitBytes;
  switch (type) {
    case MakeRIFFType(".WAV"):
    case MakeRIFFType(".wav"):
    case MakeRIFFType("PNRA"):
    case MakeRIFFType("TEXT"):
    case MakeRIFFType("AIFF"):
    case MakeRIFFType("AIFC"):
    case MakeRIFFType("ACdI"):
      bytes = k32BitSizes - kHeaderReserve;
      break;
    case MakeRIFFType("Sd2f"):
    case MakeRIFFType("SFIL"):
      bytes = k32BitSizes;
      break;
    default:
      break;
  }
  return SampleCount(bytes / bytesPerFrame);
}

void SoundFileFormatCache::FormatChanged(SoundFileFormat& format) {
  const UString key = format.GetFile().GetFullPath();
  std::vector<ChangeListener> listeners;
  {
    std::lock_guard<std::mutex> guard(lock_);
    // The entry follows the object when its file was renamed or moved.
    for (auto it = formats_.begin(); it != formats_.end(); ++it) {
      if (it->first != key && it->second.lock().get() == &format) {
        std::weak_ptr<SoundFileFormat> entry = it->second;
        formats_.erase(it);
        formats_[key] = entry;
        break;
      }
    }
    listeners.reserve(listeners_.size());
    for (const auto& [id, listener] : listeners_) listeners.push_back(listener);
  }
  for (const ChangeListener& listener : listeners) listener(format);
}

void SoundFileFormatCache::FormatDeleted(SoundFileFormat& format) {
  std::lock_guard<std::mutex> guard(lock_);
  for (auto it = formats_.begin(); it != formats_.end(); ++it) {
    if (it->second.lock().get() == &format) {
      formats_.erase(it);
      return;
    }
  }
}

SoundFileFormatCache::ListenerID SoundFileFormatCache::AddChangeListener(ChangeListener listener) {
  std::lock_guard<std::mutex> guard(lock_);
  const ListenerID id = nextListenerID_++;
  listeners_.emplace_back(id, std::move(listener));
  return id;
}

void SoundFileFormatCache::RemoveChangeListener(ListenerID id) {
  std::lock_guard<std::mutex> guard(lock_);
  std::erase_if(listeners_, [id](const auto& entry) { return entry.first == id; });
}

void SoundFileFormatCache::Purge() {
  std::lock_guard<std::mutex> guard(lock_);
  PurgeLocked();
}

void SoundFileFormatCache::PurgeLocked() {
  std::erase_if(formats_, [](const auto& entry) { return entry.second.expired(); });
}

std::size_t SoundFileFormatCache::GetLiveCount() {
  std::lock_guard<std::mutex> guard(lock_);
  PurgeLocked();
  return formats_.size();
}

}  // namespace tarn
