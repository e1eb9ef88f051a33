#pragma once
// OutsideDecoder: the first audio stream of a file in a foreign or
// compressed format (MP3, AAC, ALAC, FLAC, AIFC, movie soundtracks...),
// decoded by the platform's outside converter into interleaved frames.
//
// It tells the stream's channel count, rate and the sample format it
// delivers (the converter's closest native one: 8-bit offset, 16-bit,
// 32-bit integers as kSampUnpacked24, or 32-bit float), and the frame count
// where the container knows it exactly. Reads are sample-accurate from any
// frame: Seek goes to the nearest earlier seek point the container offers
// (with the codec's pre-roll), decodes, and drops the frames before the
// wanted one, so a frame reads the same whether reached by Seek or by
// decoding from the start. Where that cannot hold, a backward or far Seek
// decodes from the start: lossy codecs (whose state after a seek never
// quite equals the state reached from the start) and containers whose
// positions cannot be trusted (raw MP3 and other unindexed streams). Reads
// that go on where the last one ended never seek.
//
//   OutsideDecoder decoder(spec);                 // throws if it cannot decode
//   std::vector<float> block(4096 * decoder.GetNumChannels());
//   decoder.Seek(SampleCount(44100));
//   SampleCount got = decoder.Decode(block.data(), 4096);   // 0 at the end
//
// Threads: one thread at a time per object; separate objects are
// independent. Decoding blocks on file I/O.
// Failures: TarnErrors of kind, system and subsystem "OutsideDecoder" with
// code kDecodeErr (the file cannot be opened, has no audio stream, or its
// data cannot be decoded), naming the file; -50 for a negative Seek.

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>

#include "tarn/Audio/SampleFormat.h"
#include "tarn/FileSystem/FileSpecification.h"
#include "tarn/Time/SampleCount.h"

namespace tarn {

namespace odimpl {
class DecodeSource;
}

class OutsideDecoder {
 public:
  // Code of every failure of the outside converter.
  static constexpr int kDecodeErr = -2;

  // Opens the file and decodes its first audio block. Throws kDecodeErr.
  explicit OutsideDecoder(const FileSpecification& file);
  // Over a block stream of one's own (OutsideDecoderImpl.h), such as a
  // test's; `file` names it in errors.
  OutsideDecoder(const FileSpecification& file, std::unique_ptr<odimpl::DecodeSource> source);
  OutsideDecoder(const OutsideDecoder&) = delete;
  OutsideDecoder& operator=(const OutsideDecoder&) = delete;
  ~OutsideDecoder();

  // Whether the converter can open `file` and decode its first audio
  // block. Never throws; any failure is false.
  [[nodiscard]] static bool CanDecode(const FileSpecification& file) noexcept;

  [[nodiscard]] int GetNumChannels() const noexcept;
  [[nodiscard]] double GetSampleRate() const noexcept;
  // The format of the samples Decode delivers.
  [[nodiscard]] SampleFormat GetSampleFormat() const noexcept;
  [[nodiscard]] int GetBytesPerFrame() const noexcept {
    return GetBytesPerSample(GetSampleFormat()) * GetNumChannels();
  }
  // The frame count when the container states it exactly (lossless codecs
  // in indexed containers); empty otherwise.
  [[nodiscard]] std::optional<SampleCount> GetKnownLength() const noexcept;
  // Counts the frames by decoding the whole stream from the start; the
  // position is then the end. Throws kDecodeErr.
  SampleCount CountFrames();

  // The frame the next Decode delivers first.
  [[nodiscard]] SampleCount GetPosition() const noexcept { return position_; }
  // Moves to `frame` (past the end: Decode then gives 0). Decoding happens
  // lazily in the next Decode.
  void Seek(SampleCount frame);
  // Decodes up to `frames` frames into `buffer` (GetBytesPerFrame each);
  // fewer only at the end of the stream. Throws kDecodeErr.
  SampleCount Decode(void* buffer, SampleCount frames);

 private:
  // Brings the source to a block holding position_ (or the end).
  void Reposition();
  // Takes the next block from the source; false at the end.
  bool NextBlock();
  [[noreturn]] void Fail(const char* what) const;

  FileSpecification file_;
  std::unique_ptr<odimpl::DecodeSource> source_;
  SampleCount position_{0};  // the frame that the next Decode starts with
  // The source's current block covers [blockStart_, blockStart_ + blockFrames_),
  // and its frames from blockStart_ + used_ on are not yet delivered.
  std::int64_t blockStart_ = 0;
  std::int64_t blockFrames_ = 0;
  std::int64_t used_ = 0;
  const std::byte* data_ = nullptr;  // the block's interleaved frames
  bool atEnd_ = false;               // the source has no more blocks
  bool needSeek_ = false;            // position_ may lie outside the block stream's course
};

}  // namespace tarn
