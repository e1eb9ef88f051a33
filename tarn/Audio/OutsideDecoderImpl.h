#pragma once
// Private to OutsideDecoder: what each platform's converter supplies. The
// portable OutsideDecoder does the sample-accurate positioning on top.

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>

#include "tarn/Audio/SampleFormat.h"
#include "tarn/FileSystem/FileSpecification.h"

namespace tarn::odimpl {

// Sentinel start of a block whose position the converter did not report.
inline constexpr std::int64_t kUnknownStart = INT64_MIN;

// One file's first audio stream, decoded block by block into interleaved
// frames of one sample format. Every failure throws (the caller turns it
// into OutsideDecoder's error).
class DecodeSource {
 public:
  DecodeSource() = default;
  DecodeSource(const DecodeSource&) = delete;
  DecodeSource& operator=(const DecodeSource&) = delete;
  virtual ~DecodeSource() = default;

  [[nodiscard]] virtual int NumChannels() const noexcept = 0;
  [[nodiscard]] virtual double SampleRate() const noexcept = 0;
  [[nodiscard]] virtual SampleFormat Format() const noexcept = 0;
  // The exact frame count the container states, if it states one.
  [[nodiscard]] virtual std::optional<std::int64_t> KnownLength() const noexcept = 0;
  // Whether SeekNear lands on positions that Next reports truly; when
  // false the decoder only ever restarts.
  [[nodiscard]] virtual bool CanSeek() const noexcept = 0;
  // Frames to decode before a wanted frame after a seek, so that the
  // codec's state has settled by then (0 for codecs without memory).
  [[nodiscard]] virtual std::int64_t PreRoll() const noexcept = 0;

  // Goes to a seek point at or before `frame` (best effort: the next
  // block's start says where it landed).
  virtual void SeekNear(std::int64_t frame) = 0;
  // Goes back to the first block, in the state it was first decoded in.
  virtual void Restart() = 0;
  // Decodes the next block: its first frame's position (kUnknownStart when
  // the converter does not say), its frame count and its interleaved bytes,
  // valid until the next call. False at the end of the stream.
  virtual bool Next(std::int64_t& start, std::int64_t& frames, const std::byte*& data) = 0;
};

// Opens `file` with the platform's converter; throws (any exception) when
// it cannot be opened or holds no decodable audio stream. The first block
// is decoded before it returns.
[[nodiscard]] std::unique_ptr<DecodeSource> OpenDecodeSource(const FileSpecification& file);

}  // namespace tarn::odimpl
