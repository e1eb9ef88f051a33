// The readers' part of the probes: whether the WAVE and AIFF readers parse
// a file. Until the AIFF reader is part of the library, no AIFF file parses.
#include "tarn/Audio/SoundFileFormats/SoundFileProbes.h"
#include "tarn/Audio/SoundFileFormats/WAVEReader.h"

namespace tarn {

bool WAVEReaderCanParse(const FileSpecification& file) noexcept {
  try {
    return WAVEReader(file).CanParse();
  } catch (...) {
    return false;
  }
}

bool AIFFReaderCanParse(const FileSpecification&) noexcept { return false; }

}  // namespace tarn
