// The makers of the WAVE and AIFF format objects.
#include "tarn/Audio/SoundFileFormats/SoundFileFormatMakersImpl.h"

#include "tarn/Audio/SoundFileFormats/AIFFSoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/WAVESoundFileFormat.h"

namespace tarn::sffimpl {

std::shared_ptr<SoundFileFormat> MakeWAVEFormat(const FileSpecification& file) {
  return std::make_shared<WAVESoundFileFormat>(file);
}

std::shared_ptr<SoundFileFormat> MakeAIFFFormat(const FileSpecification& file) {
  return std::make_shared<AIFFSoundFileFormat>(file);
}

}  // namespace tarn::sffimpl
