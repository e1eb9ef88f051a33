#pragma once
// InterAudioWriter: the interleaved end of the writer chain. It takes
// frames (one sample of every channel, channels interleaved, native byte
// order) in the format GetFormat reports and appends them to a sound file's
// audio at its write position.
//
// Writers above it that care about the disk's block size (to write whole
// blocks on an unbuffered file) ask for its DiskAPI; a writer that is not
// backed by a file answers nullptr.
//
//   std::shared_ptr<InterAudioWriter> writer = format->MakeWriter();
//   writer->Write(frames.data(), count);   // as often as needed
//   writer->Flush();                       // header now tells the frames written
//   writer->Close();
//
// Threads: one thread at a time per writer.
// Failures: TarnErrors (FailOSErr with the file layer's status; a full disk
// is -36 or the system's own code).

#include <cstdint>

#include "tarn/Audio/SampleFormat.h"
#include "tarn/Time/SampleCount.h"

namespace tarn {

class InterAudioWriter {
 public:
  // Block-aware access to the file under a writer.
  class DiskAPI {
   public:
    DiskAPI() = default;
    DiskAPI(const DiskAPI&) = delete;
    DiskAPI& operator=(const DiskAPI&) = delete;
    virtual ~DiskAPI() = default;

    // The file's block size (4096 when it cannot be asked).
    [[nodiscard]] virtual int GetBlockSize() = 0;
    // Bytes from the write position to the next block boundary; a whole
    // block (never 0) at a boundary.
    [[nodiscard]] virtual int GetBytesTillNextBlockBoundary() = 0;
    // Bytes between the write position and the end of the file; 0 when the
    // position is at or past the end.
    [[nodiscard]] virtual std::int64_t GetUnFilledSpace() = 0;
    // True, with the new length in frames, when writing `bytes` more bytes
    // should first extend the file by a block.
    virtual bool ShouldExtendFile(SampleCount& newLength, std::int64_t bytes) = 0;
    // Writes bytes at the write position as they are (no byte swapping).
    virtual void RawWrite(const void* buffer, std::int64_t bytes) = 0;
  };

  InterAudioWriter() = default;
  InterAudioWriter(const InterAudioWriter&) = delete;
  InterAudioWriter& operator=(const InterAudioWriter&) = delete;
  virtual ~InterAudioWriter() = default;

  // The format of the frames Write accepts.
  [[nodiscard]] virtual AudioFormat GetFormat() const = 0;
  // Appends `frames` frames from `buffer` (not modified).
  virtual void Write(const void* buffer, SampleCount frames) = 0;
  // Pushes what was written to the file and brings its header up to date.
  virtual void Flush() = 0;
  // Flushes and closes; later calls other than Close throw.
  virtual void Close() = 0;
  [[nodiscard]] virtual DiskAPI* getDiskAPI() { return nullptr; }
};

}  // namespace tarn
