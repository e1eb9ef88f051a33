#include "tarn/Audio/SoundFileFormats/RIFFFormatHandlers.h"

#include <algorithm>
#include <array>

namespace tarn {
namespace {

using Bytes12 = std::array<std::uint8_t, 12>;

// The last twelve bytes of the published identifiers.
constexpr Bytes12 kRiffSuffix{0x2E, 0x91, 0xCF, 0x11, 0xA5, 0xD6,
                              0x28, 0xDB, 0x04, 0xC1, 0x00, 0x00};
constexpr Bytes12 kListSuffix{0x2F, 0x91, 0xCF, 0x11, 0xA5, 0xD6,
                              0x28, 0xDB, 0x04, 0xC1, 0x00, 0x00};
constexpr Bytes12 kWaveSuffix{0xF3, 0xAC, 0xD3, 0x11, 0x8C, 0xD1,
                              0x00, 0xC0, 0x4F, 0x8E, 0xDB, 0x8A};
// Variants with bytes 7-9 differing, written by some programs for "levl" and
// "bext"; read, never written.
constexpr Bytes12 kLevlVariant{0xF3, 0xAC, 0xD3, 0x11, 0xD1, 0x8C,
                               0x00, 0xC0, 0x4F, 0x8E, 0xDB, 0x8A};
constexpr Bytes12 kBextVariant{0xF3, 0xAC, 0xD3, 0xAA, 0xD1, 0x8C,
                               0x00, 0xC0, 0x4F, 0x8E, 0xDB, 0x8A};
// The library's own chunks: their four characters and these bytes.
constexpr Bytes12 kOwnSuffix{0x5E, 0x0F, 0x4B, 0x79, 0x9A, 0x31,
                             0x4D, 0x26, 0xB8, 0x70, 0xC3, 0x1E};

// The identifier of four leading bytes and twelve more.
UUIDObj MakeID(std::uint32_t head, const Bytes12& tail) {
  TarnCOM::UUIDBytes bytes;
  for (int i = 0; i < 4; ++i) bytes.bytes[i] = static_cast<std::uint8_t>(head >> (24 - 8 * i));
  std::copy(tail.begin(), tail.end(), bytes.bytes + 4);
  return UUIDObj(bytes);
}

// Identifiers whose first four bytes are not the tag's characters.
const UUIDObj kMarkerID(0x56, 0x62, 0xF7, 0xAB, 0x2D, 0x39, 0xD2, 0x11, 0x86, 0xC7, 0x00, 0xC0,
                        0x4F, 0x8E, 0xDB, 0x8A);
const UUIDObj kSummaryListID(0xBC, 0x94, 0x5F, 0x92, 0x5A, 0x52, 0xD2, 0x11, 0x86, 0xDC, 0x00, 0xC0,
                             0x4F, 0x8E, 0xDB, 0x8A);

// The library's own metadata tags.
constexpr std::array<const char*, 40> kOwnTags{
    "qzma", "qzsa", "qzmc", "qzam", "qzas", "qzac", "qzwe", "qzw1", "qzbt", "qzcu",
    "qzmu", "qzuc", "qzrn", "qzte", "qzod", "Rec!", "MLo1", "qzdt", "MLo2", "SmpI",
    "ddOV", "ANNO", "Dscr", "AUTH", "(c) ", "ACdI", "basc", "acid", "regn", "qzfd",
    "qzf1", "qzf2", "qzf3", "qzf4", "qzf5", "qzf6", "qzf7", "qzf8", "qzf9", "qzfa"};

// Standard chunks of WAVE files beyond those with published identifiers.
constexpr std::array<const char*, 11> kStandardTags{"cue ", "smpl", "inst", "strc", "plst", "iXML",
                                                    "axml", "cart", "PEAK", "DISP", "id3 "};

bool UUIDLess(const UUIDObj& a, const UUIDObj& b) { return a.GetBytes() < b.GetBytes(); }

}  // namespace

WaveRIFFFormatHandler& GetWaveRIFFFormatHandler() {
  static WaveRIFFFormatHandler handler;
  return handler;
}

AIFF_RIFF_FormatHandler& GetAIFFRIFFFormatHandler() {
  static AIFF_RIFF_FormatHandler handler;
  return handler;
}

WaveRIFFFormatHandler::WaveRIFFFormatHandler() {
  const auto published = [](const char* tag, const char* id, const Bytes12& suffix) {
    return Entry{RIFFTypeFromChars(tag), MakeID(RIFFTypeFromChars(id), suffix)};
  };
  byTag_ = {
      {0, UUIDObj()},
      published("RIFF", "riff", kRiffSuffix),
      published("LIST", "list", kListSuffix),
      published("WAVE", "wave", kWaveSuffix),
      published("fmt ", "fmt ", kWaveSuffix),
      published("fact", "fact", kWaveSuffix),
      published("data", "data", kWaveSuffix),
      published("levl", "levl", kWaveSuffix),
      published("JUNK", "junk", kWaveSuffix),
      published("bext", "bext", kWaveSuffix),
      {MakeRIFFType("MRKR"), kMarkerID},
      {MakeRIFFType("SmLt"), kSummaryListID},
  };
  // Standard WAVE chunks that have no published Wave64 identifier take the
  // pattern of those that do: their four characters, then the twelve bytes
  // the published WAVE chunks share. Markers, loops and the other common
  // chunks can then be written to Wave64 files as to RIFF ones.
  for (const char* tag : kStandardTags) byTag_.push_back(published(tag, tag, kWaveSuffix));
  for (const char* tag : kOwnTags)
    byTag_.push_back({RIFFTypeFromChars(tag), MakeID(RIFFTypeFromChars(tag), kOwnSuffix)});
  byUUID_ = byTag_;
  byUUID_.push_back({MakeRIFFType("levl"), MakeID(MakeRIFFType("levl"), kLevlVariant)});
  byUUID_.push_back({MakeRIFFType("bext"), MakeID(MakeRIFFType("bext"), kBextVariant)});
  std::sort(byTag_.begin(), byTag_.end(),
            [](const Entry& a, const Entry& b) { return a.tag < b.tag; });
  std::sort(byUUID_.begin(), byUUID_.end(),
            [](const Entry& a, const Entry& b) { return UUIDLess(a.uuid, b.uuid); });
}

bool WaveRIFFFormatHandler::IsContainerID(std::uint32_t id) const {
  return id == MakeRIFFType("RIFF") || id == MakeRIFFType("riff");
}

bool WaveRIFFFormatHandler::IsWave64Container(const UUIDObj& id) const {
  return id == MakeID(MakeRIFFType("riff"), kRiffSuffix);
}

bool WaveRIFFFormatHandler::IsFormType(std::uint32_t tag) const {
  return tag == MakeRIFFType("WAVE");
}

RIFFType WaveRIFFFormatHandler::TagForUUID(const UUIDObj& id) const {
  const auto found =
      std::lower_bound(byUUID_.begin(), byUUID_.end(), id,
                       [](const Entry& e, const UUIDObj& u) { return UUIDLess(e.uuid, u); });
  return found != byUUID_.end() && found->uuid == id ? found->tag : kUnknownChunkTag;
}

UUIDObj WaveRIFFFormatHandler::UUIDForTag(RIFFType tag, bool) const {
  const auto found = std::lower_bound(byTag_.begin(), byTag_.end(), tag,
                                      [](const Entry& e, RIFFType t) { return e.tag < t; });
  return found != byTag_.end() && found->tag == tag ? found->uuid : UUIDObj();
}

bool AIFF_RIFF_FormatHandler::IsContainerID(std::uint32_t id) const {
  return id == MakeRIFFType("FORM");
}

bool AIFF_RIFF_FormatHandler::IsFormType(std::uint32_t tag) const {
  return tag == MakeRIFFType("AIFF") || tag == MakeRIFFType("AIFC");
}

}  // namespace tarn
