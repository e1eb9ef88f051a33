#pragma once
// The chunk editor's two format handlers: WAVE (RIFF and Wave64) and AIFF
// (FORM "AIFF" and "AIFC").
//
// The WAVE handler maps Wave64's 16-byte chunk identifiers to four-character
// tags and back. Standard chunks use the identifiers published for Wave64
// ("riff", "list", "wave", "fmt ", "fact", "data", "levl", "junk", "bext",
// the marker chunk "MRKR" and the summary list "SmLt"); the variant "bext"
// and "levl" identifiers some writers use are read as those tags too, but
// never written. Other standard WAVE chunks ("cue ", "smpl", "inst", "strc",
// "plst", "iXML", "axml", "cart", "PEAK", "DISP", "id3 ") follow the published
// pattern: their four characters, then the twelve bytes the published WAVE
// chunks share. The library's own metadata chunks get fixed identifiers of
// its own: the tag's four characters followed by twelve fixed bytes. An
// identifier it does not know reads as the tag "Unkn".
//
// Both handlers are immutable singletons, made once on first use (safe from
// any thread) and shared by every editor.

#include "tarn/Audio/SoundFileFormats/RIFFFileEditor.h"

namespace tarn {

class WaveRIFFFormatHandler;
class AIFF_RIFF_FormatHandler;

[[nodiscard]] WaveRIFFFormatHandler& GetWaveRIFFFormatHandler();
[[nodiscard]] AIFF_RIFF_FormatHandler& GetAIFFRIFFFormatHandler();

// Tag of an identifier the WAVE handler does not know.
inline constexpr RIFFType kUnknownChunkTag = MakeRIFFType("Unkn");

class WaveRIFFFormatHandler final : public RIFFFileEditor::FormatHandler {
 public:
  // "RIFF", or "riff" (the first four bytes of the Wave64 identifier).
  [[nodiscard]] bool IsContainerID(std::uint32_t id) const override;
  [[nodiscard]] bool IsWave64Container(const UUIDObj& id) const override;
  [[nodiscard]] bool IsFormType(std::uint32_t tag) const override;  // "WAVE"
  [[nodiscard]] bool SupportsWave64() const override { return true; }
  [[nodiscard]] RIFFType TagForUUID(const UUIDObj& id) const override;
  // Both values of `forWriting` give the same identifier.
  [[nodiscard]] UUIDObj UUIDForTag(RIFFType tag, bool forWriting) const override;

 private:
  friend WaveRIFFFormatHandler& GetWaveRIFFFormatHandler();
  WaveRIFFFormatHandler();

  struct Entry {
    RIFFType tag;
    UUIDObj uuid;
  };
  std::vector<Entry> byTag_;   // sorted by tag, one identifier per tag
  std::vector<Entry> byUUID_;  // sorted by identifier bytes, variants included
};

class AIFF_RIFF_FormatHandler final : public RIFFFileEditor::FormatHandler {
 public:
  [[nodiscard]] bool IsContainerID(std::uint32_t id) const override;  // "FORM"
  [[nodiscard]] bool IsWave64Container(const UUIDObj&) const override { return false; }
  [[nodiscard]] bool IsFormType(std::uint32_t tag) const override;  // "AIFF", "AIFC"
  [[nodiscard]] bool SupportsWave64() const override { return false; }
  [[nodiscard]] RIFFType TagForUUID(const UUIDObj&) const override { return 0; }
  [[nodiscard]] UUIDObj UUIDForTag(RIFFType, bool) const override { return {}; }

 private:
  friend AIFF_RIFF_FormatHandler& GetAIFFRIFFFormatHandler();
  AIFF_RIFF_FormatHandler() = default;
};

}  // namespace tarn
