#pragma once
// BasicAudioOutFile: the plain writing end of a sound file's sample data. It
// writes interleaved frames at its write position (the audio's first frame
// is frame 0), swapping them to the file's byte order in a scratch buffer so
// that the caller's buffer is never modified, and offers the block-aware
// DiskAPI that writers above it use to write whole blocks on unbuffered
// files. It does not touch the file's header; AudioOutFile does.
//
//   BasicAudioOutFile out(spec, 44, kNoByteSwap, {kSamp16, 2, 48000.0}, 0);
//   out.Write(frames, count);   // appends at the write position
//   out.SetEOF(count);          // file = header + count frames
//   out.Close();
//
// Threads: one thread at a time. Failures: the file layer's statuses raised
// through FailOSErr (a full disk is -36); every operation after Close
// throws -50 (Close itself may be repeated).

#include <cstdint>
#include <memory>

#include "tarn/Audio/AudioFile.h"
#include "tarn/Audio/InterAudioWriter.h"

namespace tarn {

class BasicAudioOutFile : public InterAudioWriter,
                          private AudioFile,
                          public InterAudioWriter::DiskAPI {
 public:
  // Opens the existing `file` for writing; the write position is after the
  // first `framesInFile` frames, which also count as written.
  BasicAudioOutFile(const FileSpecification& file, std::int32_t headerSize, ByteSwapOption swap,
                    const AudioFormat& format, SampleCount framesInFile,
                    PlatformFileOptions options = {});
  // Closes the file; failures are dropped.
  ~BasicAudioOutFile() override;

  // ---- InterAudioWriter
  [[nodiscard]] AudioFormat GetFormat() const override { return GetAudioFormat(); }
  // Writes `frames` frames (GetFrameSize() bytes each) from `buffer` at the
  // write position and advances it; `buffer` is not modified.
  void Write(const void* buffer, SampleCount frames) override;
  // The platform file's flush.
  void Flush() override;
  // Flush, then close the file.
  void Close() override;
  [[nodiscard]] InterAudioWriter::DiskAPI* getDiskAPI() override { return this; }

  // ---- DiskAPI
  // The platform file's block size (4096 when it cannot be asked).
  [[nodiscard]] int GetBlockSize() override;
  // Block size - (byte position mod block size): a whole block at a
  // boundary, never 0.
  [[nodiscard]] int GetBytesTillNextBlockBoundary() override;
  // File size - byte position when the file is longer, else 0.
  [[nodiscard]] std::int64_t GetUnFilledSpace() override;
  // When the file has less room after the write position than `bytes`, and
  // the position is inside a block: true, with `newLength` the frames that
  // fill the file's present length plus one block ((file size + block size
  // - header size) / frame size), for SetEOF.
  bool ShouldExtendFile(SampleCount& newLength, std::int64_t bytes) override;
  // Writes at the write position without swapping.
  void RawWrite(const void* buffer, std::int64_t bytes) override;

  // ---- the file
  // File size = header size + frames * frame size. Frames past the new end
  // no longer count as written.
  void SetEOF(SampleCount frames);
  // Frame position of the next Write (not clamped: a later write past the
  // end leaves a gap of zeros).
  void SetWritePosition(SampleCount frame);
  [[nodiscard]] SampleCount GetWritePosition() const;
  // Frames from the audio's start to the end of the furthest write (or
  // framesInFile, whichever is larger; cut by SetEOF).
  [[nodiscard]] SampleCount GetFramesWritten() const noexcept { return framesWritten_; }
  [[nodiscard]] bool NeedToSwapBytes() const noexcept { return ShouldSwapBuffer(); }
  [[nodiscard]] bool IsClosed() const noexcept { return AudioFile::GetPlatformFile() == nullptr; }

  using AudioFile::GetFile;
  using AudioFile::GetFrameSize;
  using AudioFile::GetHeaderSize;
  using AudioFile::GetPlatformFile;

 protected:
  using AudioFile::OpenFile;
  // Closes without flushing (after the subclass has done its part).
  void CloseNow() noexcept { CloseFile(); }

 private:
  void NoteWritten(const PlatformAudioFile& file) noexcept;

  SampleCount framesWritten_;
  // Swap scratch: scratchCapacity_ bytes at the first 4096-byte boundary
  // inside an allocation of scratchCapacity_ + 4096 bytes.
  std::unique_ptr<unsigned char[]> scratchRaw_;
  unsigned char* scratch_ = nullptr;
  std::int64_t scratchCapacity_ = 0;
};

}  // namespace tarn
