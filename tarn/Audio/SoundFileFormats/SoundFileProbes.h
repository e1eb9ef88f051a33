#pragma once
// The probes: whether a file can be opened as a given kind of sound file.
// Each takes the file and answers true or false; any error inside a probe
// (missing file, unreadable or malformed header) gives false, and no probe
// throws. They read the file and block for that; any thread.
//
//   if (ProbeFileOfType(spec, File(spec).GetType())) { /* open it */ }

#include <cstdint>

#include "tarn/FileSystem/FileSpecification.h"
#include "tarn/String/UString.h"

namespace tarn {

// The WAVE probe's rule on type and name, before the file is read: "WAVE",
// ".W64", ".WAV" and ".wav" pass; "PNRA" and "TEXT" pass only when `name`
// is longer than 4 characters and ends in ".wav", ".WAV", ".w64" or ".W64",
// compared exactly (".Wav" does not pass); every other type is refused.
[[nodiscard]] bool WAVEProbeAcceptsTypeAndName(std::uint32_t type, const UString& name) noexcept;

// The WAVE probe: the rule above on the file's type (File::GetType) and
// name, then whether the WAVE reader parses the file.
[[nodiscard]] bool ProbeWAVEFile(const FileSpecification& file) noexcept;
// As above with the type given instead of taken from the name.
[[nodiscard]] bool ProbeWAVEFile(const FileSpecification& file, std::uint32_t type) noexcept;
// The AIFF probe: whether the AIFF reader parses the file.
[[nodiscard]] bool ProbeAIFFFile(const FileSpecification& file) noexcept;
// The converter probe: whether the format cache's outside converter can
// open the file.
[[nodiscard]] bool ProbeConverterFile(const FileSpecification& file) noexcept;

// The probe that the type table names for `type` (false for types without
// one and types not in the table). "AIFC" goes to the converter probe.
[[nodiscard]] bool ProbeFileOfType(const FileSpecification& file, std::uint32_t type) noexcept;

// Whether the WAVE / AIFF reader can parse the file: the readers' part of
// the probes, kept apart so that the probes' own rules are testable alone.
// Never throw.
[[nodiscard]] bool WAVEReaderCanParse(const FileSpecification& file) noexcept;
[[nodiscard]] bool AIFFReaderCanParse(const FileSpecification& file) noexcept;

}  // namespace tarn
