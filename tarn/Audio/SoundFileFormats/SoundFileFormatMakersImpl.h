#pragma once
// Private to the format cache: the makers of the WAVE and AIFF format
// objects, kept in a file of their own so that the cache does not depend
// on the formats' headers.

#include <memory>

#include "tarn/FileSystem/FileSpecification.h"

namespace tarn {

class SoundFileFormat;

namespace sffimpl {

// A new format object for a file of the WAVE / AIFF family. Throws what the
// format's constructor throws.
[[nodiscard]] std::shared_ptr<SoundFileFormat> MakeWAVEFormat(const FileSpecification& file);
[[nodiscard]] std::shared_ptr<SoundFileFormat> MakeAIFFFormat(const FileSpecification& file);

}  // namespace sffimpl
}  // namespace tarn
