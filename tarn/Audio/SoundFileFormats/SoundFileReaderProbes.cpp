// The readers' part of the probes: whether the WAVE and AIFF readers parse
// a file. Any error while reading counts as "does not parse".
#include "tarn/Audio/SoundFileFormats/AIFFReader.h"
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

bool AIFFReaderCanParse(const FileSpecification& file) noexcept {
  try {
    return AIFFReader(file).CanParse();
  } catch (...) {
    return false;
  }
}

}  // namespace tarn
