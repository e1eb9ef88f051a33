// The makers of the WAVE and AIFF format objects. Until those formats are
// part of the library, making one fails with the cache's "unsupported"
// error.
#include "tarn/Audio/SoundFileFormats/SoundFileFormatMakers.h"

#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatFailImpl.h"

namespace tarn::sffimpl {

std::shared_ptr<SoundFileFormat> MakeWAVEFormat(const FileSpecification& file) {
  FailWithText("SoundFileFormatCache", SoundFileFormatCache::kUnsupportedFormatErr,
               "the WAVE format is not available", file);
}

std::shared_ptr<SoundFileFormat> MakeAIFFFormat(const FileSpecification& file) {
  FailWithText("SoundFileFormatCache", SoundFileFormatCache::kUnsupportedFormatErr,
               "the AIFF format is not available", file);
}

}  // namespace tarn::sffimpl
