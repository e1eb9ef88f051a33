// The 32 rows of the sound-file type table, in their fixed order.
#include "tarn/Audio/SoundFileFormats/SoundFileTypeTable.h"

#include <array>

#include "tarn/Audio/SoundFileFormats/RIFFType.h"

namespace tarn {
namespace {

using P = SoundFileProbeKind;

// "AIFC" is read through the outside converter on purpose; the AIFF chunk
// editor still accepts AIFC forms when it edits a file.
constexpr std::array<SoundFileTypeEntry, 32> kTable{{
    {MakeRIFFType("Sd2f"), "Sound Designer II", P::kNone},
    {MakeRIFFType("SFIL"), "Sound Designer I", P::kNone},
    {MakeRIFFType("AIFF"), "AIFF", P::kAIFF},
    {MakeRIFFType("WAVE"), "WAVE", P::kWAVE},
    {MakeRIFFType(".WAV"), "WAVE", P::kWAVE},
    {MakeRIFFType(".wav"), "WAVE", P::kWAVE},
    {MakeRIFFType(".W64"), "WAVE64", P::kWAVE},
    {MakeRIFFType("PNRA"), "WAVE", P::kWAVE},
    {MakeRIFFType("AIFC"), "AIFC", P::kConverter},
    {MakeRIFFType("dvc!"), "DV Audio", P::kConverter},
    {MakeRIFFType("MooV"), "QuickTime Movie", P::kConverter},
    {MakeRIFFType("ULAW"), "MuLaw", P::kConverter},
    {MakeRIFFType("VfW "), "AVI", P::kConverter},
    {MakeRIFFType("M4A "), "Apple Lossless", P::kConverter},
    {MakeRIFFType("caff"), "Apple CAF File", P::kConverter},
    {MakeRIFFType("CAFF"), "Apple CAF File", P::kConverter},
    {MakeRIFFType("MPG3"), "MP3 Audio", P::kConverter},
    {MakeRIFFType("Mp3 "), "MP3 Audio", P::kConverter},
    {MakeRIFFType("SwaT"), "MP3 Audio", P::kConverter},
    {MakeRIFFType("MPEG"), "MPEG Video", P::kConverter},
    {MakeRIFFType("PLAY"), "MP3 Audio", P::kConverter},
    {MakeRIFFType("MP3 "), "MP3 Audio", P::kConverter},
    {MakeRIFFType("mp3 "), "MP3 Audio", P::kConverter},
    {MakeRIFFType("3GPM"), "MP3 Audio", P::kConverter},
    {MakeRIFFType("REX "), "Recycle Loop", P::kNone},
    {MakeRIFFType("RCSO"), "Recycle Loop", P::kNone},
    {MakeRIFFType("REX2"), "Recycle Loop", P::kNone},
    {MakeRIFFType("RTMP"), "Recycle Converted File", P::kNone},
    {MakeRIFFType("M4V "), "M4V Video", P::kConverter},
    {MakeRIFFType("mpg4"), "Mp4 Video", P::kConverter},
    {MakeRIFFType("wmv "), "WMV Video", P::kConverter},
    {MakeRIFFType("wma "), "WMA Audio", P::kConverter},
}};

constexpr std::array<std::uint32_t, kTable.size()> MakeCodes() {
  std::array<std::uint32_t, kTable.size()> codes{};
  for (std::size_t i = 0; i < kTable.size(); ++i) codes[i] = kTable[i].mType;
  return codes;
}

constexpr std::array<std::uint32_t, kTable.size()> kCodes = MakeCodes();

}  // namespace

std::span<const SoundFileTypeEntry> GetSoundFileTypeTable() noexcept { return kTable; }

const std::uint32_t* GetSoundFileTypeCodes() noexcept { return kCodes.data(); }

const SoundFileTypeEntry* FindSoundFileType(std::uint32_t type) noexcept {
  for (const SoundFileTypeEntry& entry : kTable) {
    if (entry.mType == type) return &entry;
  }
  return nullptr;
}

}  // namespace tarn
