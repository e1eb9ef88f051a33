#pragma once
// AudioOutFile: the writing end of a sound file that also keeps the file's
// header right. It appends frames after the audio the file already holds
// (as its SoundFileFormat reports it) and, on every Flush, writes the frame
// count into the header through the format (FixFileLength), so that the
// file is complete and readable by any program after each flush. A RIFF
// WAVE recording that grows past what RIFF's 32-bit sizes hold is switched
// to Wave64 in place by the format at that moment.
//
//   std::shared_ptr<InterAudioWriter> out = format->MakeWriter();
//   out->Write(frames, count);
//   out->Flush();   // data pushed to disk, header tells every frame so far
//   out->Close();
//
// The format object is shared: while the writer lives, nobody else may
// change the file's audio length. Threads: one thread at a time.
// Failures: as BasicAudioOutFile, plus what the format throws while it
// rewrites the header.

#include <memory>

#include "tarn/Audio/BasicAudioOutFile.h"

namespace tarn {

class SoundFileFormat;
struct SoundFileAttributes;

class AudioOutFile : public BasicAudioOutFile {
 public:
  // Opens the format's file for writing after its present audio. Throws
  // -50 when the format's attributes describe no plain sample data (see
  // CheckWritableAttributes).
  explicit AudioOutFile(std::shared_ptr<SoundFileFormat> format, PlatformFileOptions options = {});
  // Closes as Close does; failures are dropped.
  ~AudioOutFile() override;

  // The platform flush, then FixFileLength.
  void Flush() override;
  // Cuts the file after the written audio when truncation is on (the
  // default), flushes and closes.
  void Close() override;

  // Writes GetFramesWritten() into the header through the format (a
  // read-write metadata access and ChangeLengthInFrames).
  void FixFileLength();
  // Whether Close (and destruction) cut the file after the written audio,
  // dropping space reserved by SetEOF beyond it. On by default.
  void SetShouldTruncateOnDelete(bool truncate) noexcept { truncateOnDelete_ = truncate; }
  // False: the header's length follows what is written (FixFileLength).
  [[nodiscard]] bool HasFixedFileLength() const noexcept { return false; }
  [[nodiscard]] const std::shared_ptr<SoundFileFormat>& GetFileFormat() const noexcept {
    return format_;
  }

  // Throws -50 (with a text) unless `attributes` describe interleaved
  // samples of GetBytesPerSample(mSampleFormat) bytes that this layer can
  // move as they are.
  static void CheckPlainSampleData(const SoundFileAttributes& attributes,
                                   const FileSpecification& file);

 private:
  std::shared_ptr<SoundFileFormat> format_;
  bool truncateOnDelete_ = true;
};

}  // namespace tarn
