// The probes of the sound-file type table.
#include "tarn/Audio/SoundFileFormats/SoundFileProbes.h"

#include "tarn/Audio/SoundFileFormats/RIFFType.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"
#include "tarn/Audio/SoundFileFormats/SoundFileTypeTable.h"
#include "tarn/FileSystem/File.h"

#include <cstddef>

namespace tarn {
namespace {

// Whether `name` ends in the ASCII `suffix`, unit for unit (case counts).
bool EndsWith(const UString& name, const char* suffix) noexcept {
  std::size_t n = 0;
  while (suffix[n] != 0) ++n;
  if (name.size() < n) return false;
  const std::size_t start = name.size() - n;
  for (std::size_t i = 0; i < n; ++i) {
    if (name[start + i] != static_cast<unsigned char>(suffix[i])) return false;
  }
  return true;
}

}  // namespace

bool WAVEProbeAcceptsTypeAndName(std::uint32_t type, const UString& name) noexcept {
  switch (type) {
    case MakeRIFFType("WAVE"):
    case MakeRIFFType(".W64"):
    case MakeRIFFType(".WAV"):
    case MakeRIFFType(".wav"):
      return true;
    case MakeRIFFType("PNRA"):
    case MakeRIFFType("TEXT"):
      return name.size() > 4 && (EndsWith(name, ".wav") || EndsWith(name, ".WAV") ||
                                 EndsWith(name, ".w64") || EndsWith(name, ".W64"));
    default:
      return false;
  }
}

bool ProbeWAVEFile(const FileSpecification& file, std::uint32_t type) noexcept {
  try {
    return WAVEProbeAcceptsTypeAndName(type, file.GetName()) && WAVEReaderCanParse(file);
  } catch (...) {
    return false;
  }
}

bool ProbeWAVEFile(const FileSpecification& file) noexcept {
  try {
    return ProbeWAVEFile(file, File(file).GetType());
  } catch (...) {
    return false;
  }
}

bool ProbeAIFFFile(const FileSpecification& file) noexcept { return AIFFReaderCanParse(file); }

bool ProbeConverterFile(const FileSpecification& file) noexcept {
  try {
    return SoundFileFormatCache::Instance().ConverterCanOpen(file);
  } catch (...) {
    return false;
  }
}

bool ProbeFileOfType(const FileSpecification& file, std::uint32_t type) noexcept {
  const SoundFileTypeEntry* entry = FindSoundFileType(type);
  if (entry == nullptr) return false;
  switch (entry->mProbe) {
    case SoundFileProbeKind::kWAVE:
      return ProbeWAVEFile(file, type);
    case SoundFileProbeKind::kAIFF:
      return ProbeAIFFFile(file);
    case SoundFileProbeKind::kConverter:
      return ProbeConverterFile(file);
    case SoundFileProbeKind::kNone:
      break;
  }
  return false;
}

}  // namespace tarn
