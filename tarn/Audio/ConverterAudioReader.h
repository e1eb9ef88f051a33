#pragma once
// ConverterAudioReader: the interleaved end of the reader chain for a file
// that the outside converter decodes (OutsideDecoder). It serves the same
// AsyncAudioReader calls as AudioInFile, so the deinterleaving and
// converting readers work on it unchanged.
//
// Frame 0 is the first frame of the stretch it was made for; the stretch is
// cut at the file's length. Reads decode from the nearest earlier seek point
// and drop the frames before the wanted one, so any frame reads the same
// whether reached by a stream read or an out-of-order read. A file that
// ends before its stated length gives short reads (status -39 in
// OutOfOrderRead and in asynchronous completions; Read just stops).
//
//   auto reader = std::make_unique<ConverterAudioReader>(spec, range, frames);
//   std::vector<float> block(4096 * reader->GetFormat().mNumChannels);
//   while (SampleCount got = reader->Read(block.data(), 4096)) { ... }
//
// Threads: one thread at a time, as AsyncAudioReader says. Asynchronous
// reads run on the job thread "Converter Reader Thread"; the reader must
// outlive their completions.
// Failures: OutsideDecoder's TarnErrors (naming the file); -50 for a
// negative or reversed range.

#include <memory>
#include <mutex>

#include "tarn/Audio/AsyncAudioReader.h"
#include "tarn/Audio/OutsideDecoder.h"
#include "tarn/FileSystem/FileSpecification.h"
#include "tarn/Time/TimeRegion.h"

namespace tarn {

class ConverterAudioReader final : public AsyncAudioReader {
 public:
  // Opens `file` with a decoder of its own; `fileLength` is the file's
  // length in frames, at which the stretch is cut.
  ConverterAudioReader(const FileSpecification& file, const TimeRangeOf<SampleCount>& range,
                       SampleCount fileLength);
  ~ConverterAudioReader() override;

  [[nodiscard]] AudioFormat GetFormat() const override { return format_; }
  [[nodiscard]] HostChannelOrder GetChannelOrder() const override { return channelOrder_; }
  [[nodiscard]] SampleCount GetLengthInFrames() const override { return length_; }

  SampleCount Read(void* buffer, SampleCount frames) override;
  [[nodiscard]] SampleCount GetReadPosition() const override { return readPosition_; }
  void SetReadPosition(SampleCount frame) override;
  SampleCount OutOfOrderRead(void* buffer, SampleCount start, SampleCount frames) override;
  void OutOfOrderReadAsync(void* buffer, SampleCount start, SampleCount frames,
                           Completion completion) override;

 private:
  // Decodes frames [start, start + frames) of the stretch, cut at its end.
  SampleCount ReadAt(void* buffer, SampleCount start, SampleCount frames);

  std::mutex lock_;  // the decoder is used by the caller's thread and the reader thread
  OutsideDecoder decoder_;
  AudioFormat format_;
  HostChannelOrder channelOrder_;
  SampleCount first_;   // file frame of the stretch's frame 0
  SampleCount length_;  // frames in the stretch
  SampleCount readPosition_{0};
};

}  // namespace tarn
