// Four-character file type codes and their extensions.
//
// A file's type is not stored anywhere: it follows from the extension of its
// name through one fixed table of 64 rows (searched in order, first match
// wins, extensions compared ignoring case), preceded by a process-wide list of
// registered types. `RegisterFileType` adds to that list; lookups may run on
// any thread concurrently with registration.
#pragma once

#include <cstdint>
#include <vector>

#include "tarn/String/UString.h"

namespace tarn {

// A four-character code: the first character is the most significant byte.
class FileTypeClass {
 public:
  constexpr FileTypeClass() noexcept = default;
  constexpr FileTypeClass(std::uint32_t code) noexcept
      : fCode(code) {}  // NOLINT: implicit by design
  // From a four-character literal: FileTypeClass("WAVE").
  constexpr FileTypeClass(const char (&text)[5]) noexcept
      : fCode((std::uint32_t(std::uint8_t(text[0])) << 24) |
              (std::uint32_t(std::uint8_t(text[1])) << 16) |
              (std::uint32_t(std::uint8_t(text[2])) << 8) | std::uint32_t(std::uint8_t(text[3]))) {}

  [[nodiscard]] constexpr std::uint32_t GetCode() const noexcept { return fCode; }
  constexpr operator std::uint32_t() const noexcept { return fCode; }
  [[nodiscard]] constexpr bool operator==(const FileTypeClass&) const noexcept = default;

 private:
  std::uint32_t fCode = 0;
};

// The type of a name without any dot.
inline constexpr std::uint32_t kNoExtensionFileType = 0x20575446;

// Looks `extension` (without the dot) up: registered types first, then the
// fixed table. Sets `type` to the match or 0; returns whether one matched.
// The empty extension (a name ending in ".") maps to "MooV".
bool ExtensionToFileType(const UString& extension, FileTypeClass& type);

// The first extension of `type`, without the dot; false and empty if unknown.
bool FileTypeToExtension(FileTypeClass type, UString& extension);

// All extensions of `type`: the registered entry's list if registered, else
// the first and (if any) second extension of the first table row with the
// type. `extensions` is cleared first; returns whether any was found.
bool FileTypeToExtensionList(FileTypeClass type, std::vector<UString>& extensions);

// Adds an entry to the registered list (searched before the table, in order
// of registration).
void RegisterFileType(FileTypeClass type, const std::vector<UString>& extensions);

// The type code of a file named `name`, by the rules of File::GetType.
[[nodiscard]] FileTypeClass FileTypeFromName(const UString& name);

}  // namespace tarn
