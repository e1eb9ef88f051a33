#pragma once
// AudioReader: the deinterleaved end of the reader chain. It delivers the
// frames of one stretch of a sound file as one buffer per channel, in the
// sample format GetFormat reports (float unless the chain was built for
// another), at a stream position or at any frame, synchronously or with a
// completion that runs when an asynchronous read has filled the buffers.
//
// Frame numbers count from the first frame of the reader's stretch (0), not
// from the start of the file; GetLengthInFrames is the stretch's length.
// `channels` is an array of GetFormat().mNumChannels pointers; each buffer
// receives `frames` samples of GetBytesPerSample(GetFormat().mSampleFormat)
// bytes, native byte order. Requests are cut to the stretch: a read at or
// past its end returns 0 frames, and a negative start or frame count throws
// a parameter error (-50).
//
//   std::unique_ptr<AudioReader> reader = format->MakeFloatingPointReader(range, rate);
//   std::vector<float> left(4096), right(4096);
//   void* channels[] = {left.data(), right.data()};
//   while (SampleCount got = reader->Read(channels, 4096)) { ... }
//   reader->OutOfOrderReadAsync(channels, 1000, 4096, [](int status, SampleCount got) { ... });
//
// Threads: one thread at a time per reader. An asynchronous read's
// completion runs on the file layer's reader thread (on the calling thread,
// before OutOfOrderReadAsync returns, when there is nothing to read); the
// caller must not start another read on the same reader, nor destroy it,
// until the completion has run. The buffers must live until then; the
// pointer array itself is copied.
// Failures: TarnErrors (FailOSErr with the file layer's status); an
// asynchronous read reports the file layer's status to its completion.

#include <functional>
#include <vector>

#include "tarn/Audio/SampleFormat.h"
#include "tarn/Audio/SoundFileFormats/HostChannelOrder.h"
#include "tarn/Time/SampleCount.h"

namespace tarn {

class AudioReader {
 public:
  // Called once per asynchronous read with the file layer's status (0, or
  // -39 when the file ended early, -36 on an I/O error) and the frames
  // delivered to every channel.
  using Completion = std::function<void(int status, SampleCount frames)>;
  using ChannelPointers = std::vector<void*>;

  AudioReader() = default;
  AudioReader(const AudioReader&) = delete;
  AudioReader& operator=(const AudioReader&) = delete;
  virtual ~AudioReader() = default;

  // The format of the samples delivered and the number of channel buffers.
  [[nodiscard]] virtual AudioFormat GetFormat() const = 0;
  [[nodiscard]] virtual HostChannelOrder GetChannelOrder() const = 0;
  // Frames in the stretch this reader covers.
  [[nodiscard]] virtual SampleCount GetLengthInFrames() const = 0;
  [[nodiscard]] int GetNumChannels() const { return GetFormat().mNumChannels; }

  // Reads up to `frames` frames at the stream position and advances it by
  // the frames read; fewer only at the end of the stretch (0 there).
  SampleCount Read(void* const* channels, SampleCount frames);
  [[nodiscard]] SampleCount GetReadPosition() const noexcept { return position_; }
  // Positions outside [0, GetLengthInFrames()] are clamped to it.
  void SetReadPosition(SampleCount frame);

  // Reads up to `frames` frames at `start` without moving the stream
  // position; returns the frames read.
  SampleCount OutOfOrderRead(void* const* channels, SampleCount start, SampleCount frames);
  // As OutOfOrderRead, but returns at once; `completion` runs after the
  // buffers are filled (see Threads above).
  void OutOfOrderReadAsync(void* const* channels, SampleCount start, SampleCount frames,
                           Completion completion);

 protected:
  // The readers of the chain supply these; the request is already cut to
  // the stretch: 0 <= start, 0 < frames, start + frames <= length.
  virtual SampleCount ReadFrames(void* const* channels, SampleCount start, SampleCount frames) = 0;
  virtual void ReadFramesAsync(ChannelPointers channels, SampleCount start, SampleCount frames,
                               Completion completion) = 0;

 private:
  // Cuts [start, start + frames) to the stretch; throws -50 for negatives.
  [[nodiscard]] SampleCount Available(SampleCount start, SampleCount frames) const;

  SampleCount position_ = 0;
};

}  // namespace tarn
