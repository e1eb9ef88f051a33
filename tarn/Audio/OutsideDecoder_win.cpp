// The outside converter on Windows: Media Foundation's source reader.
#include <stdexcept>

#include "tarn/Audio/OutsideDecoderImpl.h"

namespace tarn::odimpl {

std::unique_ptr<DecodeSource> OpenDecodeSource(const FileSpecification&) {
  throw std::runtime_error("no outside converter on this platform");
}

}  // namespace tarn::odimpl
