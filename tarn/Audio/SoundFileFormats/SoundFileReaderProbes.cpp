// The readers' part of the probes: whether the WAVE and AIFF readers parse
// a file. Until those readers are part of the library, no file parses.
#include "tarn/Audio/SoundFileFormats/SoundFileProbes.h"

namespace tarn {

bool WAVEReaderCanParse(const FileSpecification&) noexcept { return false; }

bool AIFFReaderCanParse(const FileSpecification&) noexcept { return false; }

}  // namespace tarn
