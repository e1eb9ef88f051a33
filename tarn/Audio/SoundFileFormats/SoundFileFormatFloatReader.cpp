// SoundFileFormat::MakeFloatingPointReader: the format's own reader, turned
// into per-channel float buffers by the reader chain.

#include "tarn/Audio/AsyncAudioReader.h"
#include "tarn/Audio/AudioReader.h"
#include "tarn/Audio/ConvertingReader.h"
#include "tarn/Audio/DeinterleavingReader.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormat.h"

namespace tarn {

std::unique_ptr<AudioReader> SoundFileFormat::MakeFloatingPointReader(
    const TimeRangeOf<SampleCount>& range, double rate) {
  return ConvertingReader::Wrap(std::make_unique<DeinterleavingReader>(MakeReader(range, rate)),
                                kSampFloat32);
}

}  // namespace tarn
