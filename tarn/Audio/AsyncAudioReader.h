#pragma once
// AsyncAudioReader: the interleaved end of the reader chain. It delivers the
// frames of one stretch of a sound file (one sample of every channel per
// frame, channels interleaved) in one sample format, at a stream position or
// at any frame, synchronously or with a completion on a background thread.
//
// Frame numbers count from the first frame of the reader's stretch (0), not
// from the start of the file; GetLengthInFrames is the stretch's length.
// Buffers hold GetBytesPerSample(GetFormat().mSampleFormat) *
// GetFormat().mNumChannels bytes per frame, in native byte order.
//
//   std::unique_ptr<AsyncAudioReader> reader = format->MakeReader(range, rate);
//   std::vector<std::byte> block(frames * reader->GetBytesPerFrame());
//   while (SampleCount got = reader->Read(block.data(), frames)) { ... }
//
// Threads: one thread at a time per reader; an asynchronous read's
// completion runs on the reader thread, and the caller must not start
// another read on the same reader until it has run.
// Failures: TarnErrors (FailOSErr with the file layer's status).

#include <cstdint>
#include <functional>

#include "tarn/Audio/SampleFormat.h"
#include "tarn/Audio/SoundFileFormats/HostChannelOrder.h"
#include "tarn/Time/SampleCount.h"

namespace tarn {

class AsyncAudioReader {
 public:
  // Called once per asynchronous read with the file layer's status (0, or
  // -39 when the file ended early, -36 on an I/O error) and the frames
  // delivered.
  using Completion = std::function<void(int status, SampleCount frames)>;

  AsyncAudioReader() = default;
  AsyncAudioReader(const AsyncAudioReader&) = delete;
  AsyncAudioReader& operator=(const AsyncAudioReader&) = delete;
  virtual ~AsyncAudioReader() = default;

  // The format of the frames delivered.
  [[nodiscard]] virtual AudioFormat GetFormat() const = 0;
  [[nodiscard]] int GetBytesPerFrame() const {
    const AudioFormat format = GetFormat();
    return GetBytesPerSample(format.mSampleFormat) * format.mNumChannels;
  }
  [[nodiscard]] virtual HostChannelOrder GetChannelOrder() const = 0;
  // Frames in the stretch this reader covers.
  [[nodiscard]] virtual SampleCount GetLengthInFrames() const = 0;

  // Reads up to `frames` frames at the stream position and advances it by
  // the frames read; fewer only at the end of the stretch (0 there).
  virtual SampleCount Read(void* buffer, SampleCount frames) = 0;
  [[nodiscard]] virtual SampleCount GetReadPosition() const = 0;
  // Positions outside [0, GetLengthInFrames()] are clamped to it.
  virtual void SetReadPosition(SampleCount frame) = 0;

  // Reads up to `frames` frames at `start` without moving the stream
  // position; returns the frames read.
  virtual SampleCount OutOfOrderRead(void* buffer, SampleCount start, SampleCount frames) = 0;
  // As OutOfOrderRead, but returns at once; `completion` runs on the reader
  // thread after `buffer` is filled. `buffer` must live until then.
  virtual void OutOfOrderReadAsync(void* buffer, SampleCount start, SampleCount frames,
                                   Completion completion) = 0;
};

}  // namespace tarn
