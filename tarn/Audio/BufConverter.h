// Converts runs of samples from one in-memory sample format to another, with
// this library's scaling, rounding, clipping and optional triangular dither.
//
// Converting readers and writers create one converter per stream when the
// stored format differs from the format the client wants, and call `Convert`
// once per block:
//
//   std::unique_ptr<BufConverter> conv =
//       BufConverter::Create(fileFormat, clientFormat, kTriangularDither);
//   conv->Convert(diskBlock, clientBlock, frames * channels);
//
// Data are native-order (little-endian) arrays; byte swapping is the file
// layer's business. `Convert` never allocates, never throws and never
// branches on the format per sample; out-of-range values clip, a float NaN
// converts as 0.0 would and infinities clip to full scale. Runs whose
// destination spans 4 MiB or more are written with stores that bypass the
// caches. A dithered converter advances its generator by two steps per
// sample and keeps its state across calls, so block boundaries do not
// restart the sequence. A converter is used by one thread at a time;
// distinct converters share nothing.
#pragma once

#include <memory>

#include "tarn/Audio/SampleFormat.h"

namespace tarn {

class BufConverter {
 public:
  BufConverter() = default;
  BufConverter(const BufConverter&) = default;
  BufConverter& operator=(const BufConverter&) = default;
  virtual ~BufConverter() = default;

  // A converter from `from.mSampleFormat` to `to.mSampleFormat`. Dither
  // applies only to 8- and 16-bit destinations; conversions to 24 bits are
  // never dithered. Throws the out-of-memory error (-108) when there is no
  // converter for the request: equal formats, formats 6 and 7 or values
  // outside 0..7, or a narrowing pair with a dither other than 0 or 1.
  [[nodiscard]] static std::unique_ptr<BufConverter> Create(const AudioFormat& from,
                                                            const AudioFormat& to,
                                                            DitherType dither);

  // Converts `count` samples; `source` and `destination` must not overlap.
  // A count of 0 or less writes nothing.
  virtual void Convert(const void* source, void* destination, int count) noexcept = 0;

  // A converter of the same pair and dither kind whose state is a copy of
  // this one's: a dithered clone continues this converter's sequence.
  [[nodiscard]] virtual std::unique_ptr<BufConverter> Clone() const = 0;
};

}  // namespace tarn
