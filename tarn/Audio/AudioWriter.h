#pragma once
// AudioWriter: the deinterleaved end of the writer chain. It takes one
// buffer per channel (GetFormat().mNumChannels pointers, each holding
// `frames` samples in GetFormat().mSampleFormat, native byte order) and
// appends the frames to a sound file's audio, usually through an
// InterleavingWriter over an InterAudioWriter.
//
//   InterleavingWriter writer(format->MakeWriter());
//   const void* channels[] = {left.data(), right.data()};
//   writer.Write(channels, frames);   // as often as needed
//   writer.Flush();                   // the file's header tells every frame written
//   writer.Close();
//
// Threads: one thread at a time per writer.
// Failures: TarnErrors from the file layer; calls other than Close after
// Close throw a parameter error (-50).

#include "tarn/Audio/SampleFormat.h"
#include "tarn/Time/SampleCount.h"

namespace tarn {

class AudioWriter {
 public:
  AudioWriter() = default;
  AudioWriter(const AudioWriter&) = delete;
  AudioWriter& operator=(const AudioWriter&) = delete;
  virtual ~AudioWriter() = default;

  // The format of the samples Write accepts and the number of channels.
  [[nodiscard]] virtual AudioFormat GetFormat() const = 0;
  // Appends `frames` frames; the buffers are not modified.
  virtual void Write(const void* const* channels, SampleCount frames) = 0;
  // Pushes everything written to the file and brings its header up to date.
  virtual void Flush() = 0;
  // Flushes and closes; further calls to Close do nothing.
  virtual void Close() = 0;
};

}  // namespace tarn
