// The makers of the WAVE and AIFF format objects. Until the AIFF format is
// part of the library, making one fails with the cache's "unsupported"
// error.
#include "tarn/Audio/SoundFileFormats/SoundFileFormatMakers.h"

#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatFailImpl.h"
#include "tarn/Audio/SoundFileFormats/WAVESoundFileFormat.h"

namespace tarn::sffimpl {

std::shared_ptr<SoundFileFormat> MakeWAVEFormat(const FileSpecification& file) {
  return std::make_shared<WAVESoundFileFormat>(file);
}

std::shared_ptr<SoundFileFormat> MakeAIFFFormat(const FileSpecification& file) {
  FailWithText("SoundFileFormatCache", SoundFileFormatCache::kUnsupportedFormatErr,
               "the AIFF format is not available", file);
}

}  // namespace tarn::sffimpl
