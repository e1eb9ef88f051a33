#pragma once
// The sound-file type table: for each file type code this library knows,
// the name of its format and the probe that decides whether a file of that
// type can be opened. 32 rows in a fixed order; SoundFileFormat's
// GetFormatName and GetSupportedFileTypes answer from it. Constant data,
// any thread.

#include <cstdint>
#include <span>

namespace tarn {

// Which probe decides whether a file of a type can be opened
// (SoundFileProbes.h).
enum class SoundFileProbeKind : int {
  kNone = 0,       // none: the type is named but not opened by probing
  kWAVE = 1,       // ProbeWAVEFile
  kAIFF = 2,       // ProbeAIFFFile
  kConverter = 3,  // ProbeConverterFile
};

struct SoundFileTypeEntry {
  std::uint32_t mType;
  const char* mName;  // UTF-8 (ASCII)
  SoundFileProbeKind mProbe;
};

// The 32 rows, "Sd2f" first and "wma " last.
[[nodiscard]] std::span<const SoundFileTypeEntry> GetSoundFileTypeTable() noexcept;
// The 32 type codes in table order.
[[nodiscard]] const std::uint32_t* GetSoundFileTypeCodes() noexcept;
// The first row of `type`, or null.
[[nodiscard]] const SoundFileTypeEntry* FindSoundFileType(std::uint32_t type) noexcept;

}  // namespace tarn
