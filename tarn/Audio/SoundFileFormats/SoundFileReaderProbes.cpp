// The readers' part of the probes: whether the WAVE and AIFF readers parse
// a file. Until the WAVE reader is part of the library, no file parses as
// WAVE.
#include "tarn/Audio/SoundFileFormats/SoundFileProbes.h"

#include "tarn/Audio/SoundFileFormats/AIFFReader.h"

namespace tarn {

bool WAVEReaderCanParse(const FileSpecification&) noexcept { return false; }

bool AIFFReaderCanParse(const FileSpecification& file) noexcept {
  try {
    return AIFFReader(file).CanParse();
  } catch (...) {
    return false;
  }
}

}  // namespace tarn
