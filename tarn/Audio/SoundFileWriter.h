#pragma once
// SoundFileWriter: a host's few-line way to create a WAVE, Wave64, AIFF or
// AIFC file and write audio into it, interleaved or one buffer per channel,
// converted from the host's sample format to the file's (with triangular
// dither when asked and the file is 8 or 16 bits).
//
//   SoundFileWriter::Settings settings;               // WAVE, 2 ch, 48 kHz, 24-bit, float in
//   SoundFileWriter out(spec, settings);              // creates (replaces) the file
//   out.Write(channels, frames);                      // per-channel float buffers
//   out.WriteInterleaved(frames, count);              // or interleaved float frames
//   out.Flush();                                      // header now tells every frame written
//   out.Close();
//
// The file is made by its format object from SoundFileFormatCache::Instance()
// (CreateFileOnDisk, then an AudioOutFile): after every Flush its header is right
// and any program reads every frame written so far. A "WAVE" recording
// (Settings::recording) that grows past what RIFF's 32-bit sizes hold is
// switched to Wave64 in place by its format during a Flush, without
// stopping the writer. Frames are gathered into large blocks between
// flushes (whole disk blocks where the frame size allows), so a recorder
// that writes small buffers still writes large ones.
//
// If a writing process dies, RecoverCrashedRecording brings the file's
// header up to every frame that reached the disk.
//
// Threads: one thread at a time. Failures: TarnErrors; -50 for settings the
// file type cannot hold and for calls after Close; the file layer's errors
// while writing. The destructor closes the file and drops errors: call
// Close to see them.

#include <cstdint>
#include <memory>

#include "tarn/Audio/AudioWriter.h"
#include "tarn/Audio/SoundFileFormats/RIFFType.h"
#include "tarn/Audio/SoundFileFormats/SoundFileAttributes.h"
#include "tarn/FileSystem/FileSpecification.h"

namespace tarn {

class ConvertingWriter;
class SoundFileFormat;

class SoundFileWriter {
 public:
  struct Settings {
    // "WAVE", ".W64", "AIFF" or "AIFC".
    std::uint32_t fileType = MakeRIFFType("WAVE");
    std::int16_t numChannels = 2;
    double sampleRate = 48000.0;
    // The samples as stored (8-bit samples are stored as the type has
    // them: offset binary in WAVE, signed in AIFF), and as the host hands
    // them over.
    SampleFormat fileFormat = kSamp24;
    SampleFormat clientFormat = kSampFloat32;
    DitherType dither = kNoDither;
    // Marks the file as a recording; a WAVE recording can switch to Wave64
    // in place when it outgrows RIFF.
    bool recording = true;
    // Writes bypass the system's file cache (unbuffered, whole blocks where
    // the frame size allows), as a long recording wants; by default they go
    // through the cache.
    bool unbuffered = false;
  };

  // Creates `file` (replacing what is there) and opens it for writing.
  SoundFileWriter(const FileSpecification& file, const Settings& settings);
  SoundFileWriter(const SoundFileWriter&) = delete;
  SoundFileWriter& operator=(const SoundFileWriter&) = delete;
  ~SoundFileWriter();

  // Brings the header of a file whose writer died up to the frames that
  // reached the disk (WAVE, Wave64, AIFF, AIFC); a sound file whose header
  // is already right is left alone.
  static void RecoverCrashedRecording(const FileSpecification& file);

  // The attributes written (the file's sample format may differ from
  // Settings::fileFormat where the type stores it otherwise, e.g. 8-bit
  // WAVE is offset binary).
  [[nodiscard]] const SoundFileAttributes& GetAttributes() const noexcept { return attributes_; }
  [[nodiscard]] const std::shared_ptr<SoundFileFormat>& GetFileFormat() const noexcept {
    return format_;
  }
  // Frames accepted so far.
  [[nodiscard]] SampleCount GetFramesWritten() const noexcept;

  // Appends `frames` interleaved frames of Settings::clientFormat.
  void WriteInterleaved(const void* frames, SampleCount count);
  // Appends `frames` frames from numChannels buffers of clientFormat.
  void Write(const void* const* channels, SampleCount frames);
  void Flush();
  void Close();

 private:
  std::shared_ptr<SoundFileFormat> format_;
  SoundFileAttributes attributes_;
  std::shared_ptr<ConvertingWriter> converter_;
  std::unique_ptr<AudioWriter> channels_;
};

}  // namespace tarn
