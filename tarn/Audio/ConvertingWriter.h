#pragma once
// ConvertingWriter: an InterAudioWriter that takes interleaved frames in
// the client's sample format, converts them to the format of the writer
// under it (the file's) with one BufConverter (optional triangular dither
// when narrowing to 8 or 16 bits) and gathers them into large blocks.
//
// Frames are held in one reused staging buffer of about 256 KiB and handed
// on when it is full, on Flush and on Close. When the writer under it
// offers a DiskAPI, each hand-on ends at the last disk-block boundary that
// the staged frames reach (the rest stays staged), so an unbuffered file is
// written in whole blocks whenever the frame size divides the block size.
// With equal formats the frames are copied, not converted. The dither
// sequence runs over the interleaved samples and is never restarted.
//
//   auto file = format->MakeWriter();                       // 24-bit file
//   ConvertingWriter writer(file, kSampFloat32, kTriangularDither);
//   writer.Write(floatFrames, n);
//   writer.Flush();                                         // staged frames reach the file
//
// Threads: one thread at a time. Failures: the constructor throws -50 for a
// null destination and the converter's -108 for a pair it cannot convert;
// writes throw the destination's errors (the frames not yet handed on stay
// staged); calls other than Close after Close throw -50. The destructor
// hands staged frames on and swallows errors: call Flush or Close to see
// them.

#include <memory>
#include <vector>

#include "tarn/Audio/BufConverter.h"
#include "tarn/Audio/InterAudioWriter.h"

namespace tarn {

class ConvertingWriter final : public InterAudioWriter {
 public:
  ConvertingWriter(std::shared_ptr<InterAudioWriter> destination, SampleFormat format,
                   DitherType dither = kNoDither);
  ~ConvertingWriter() override;

  [[nodiscard]] AudioFormat GetFormat() const override { return format_; }
  void Write(const void* buffer, SampleCount frames) override;
  void Flush() override;
  void Close() override;

  // Frames accepted so far (handed on or staged).
  [[nodiscard]] SampleCount GetFramesWritten() const noexcept { return written_; }
  [[nodiscard]] const std::shared_ptr<InterAudioWriter>& GetDestination() const noexcept {
    return destination_;
  }

 private:
  // Hands staged frames on: all of them, or up to the last block boundary.
  void HandOn(bool all);

  std::shared_ptr<InterAudioWriter> destination_;
  AudioFormat format_;
  std::unique_ptr<BufConverter> converter_;  // null for equal formats
  int clientFrameBytes_ = 0;
  int fileFrameBytes_ = 0;
  int samplesPerFrame_ = 0;
  std::size_t capacity_ = 0;  // frames in staging_
  std::size_t staged_ = 0;    // frames waiting in staging_
  std::vector<unsigned char> staging_;
  SampleCount written_ = 0;
  bool closed_ = false;
};

}  // namespace tarn
