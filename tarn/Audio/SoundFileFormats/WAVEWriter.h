#pragma once
// WAVEWriter: writes the header of a new RIFF "WAVE" or Wave64 recording and
// keeps its sizes up to date while audio is appended; its static rules lay
// out chunks in such files for everything else too (the chunk editor among
// them).
//
// Layout rules: chunk payloads are padded to 2 bytes in RIFF (one zero byte
// after an odd length) and to 8 bytes in Wave64; a chunk header is 8 bytes
// in RIFF (4-byte tag, 32-bit size) and 24 in Wave64 (16-byte identifier,
// 64-bit size that counts the header too); the form type after the container
// header takes 4 bytes in RIFF and 16 in Wave64. The same padding rule
// serves FORM (AIFF) files, whose payloads are padded to 2 bytes as well.
//
// A new file's header, in order: container ("RIFF"/"WAVE" or the Wave64
// "riff"/"wave" identifiers), "fmt " (16 bytes for 1-2 channels, the
// 40-byte extensible layout for 3 or more), "bext" (858 bytes), optionally
// "Rec!" (a 4-byte recording indicator; in Wave64 written twice to fill the
// 8-byte unit), in RIFF a zero-filled "JUNK" that reserves the room the
// Wave64 headers need, then the "data" header. The audio therefore starts
// at the same byte in both forms (992 for 1-2 channels, 1016 for 3 or more,
// 32 more with a recording indicator), so a RIFF recording can be rewritten
// as Wave64 in place when it outgrows 32-bit sizes.
//
// "fmt " format tag: 1 (integer PCM) for 1-2 channels, 3 (IEEE float) for
// 1-2 channels of 4 or 8 bytes per sample, 0xFFFE (extensible, with the
// default channel mask of HostChannelOrder and the integer-PCM or IEEE-float
// subformat by the sample format) for 3 or more. A 32-bit integer file thus
// needs 3 or more channels.
//
// Threads: one thread at a time per writer. Errors: stream and file-system
// errors propagate (-36 write error, -5000 cannot open, file-system codes
// from creating the file); nothing is validated beyond what the layout
// needs.
//
//   WAVEWriter writer(spec, 48000.0, 3, 2, 0, 6, kSamp24, false, false);
//   writer.WriteHeader(0, 0);             // stream now at the first audio byte
//   ... append audio at writer.GetOffsetToAudio() ...
//   writer.UpdateDataLength(frames);      // container and "data" sizes
//   writer.MaybePadChunk();

#include <cstdint>
#include <memory>
#include <optional>
#include <vector>

#include "tarn/Audio/SampleFormat.h"
#include "tarn/Audio/SoundFileFormats/BWFBroadcastWaveExtension.h"
#include "tarn/Audio/SoundFileFormats/RIFFType.h"
#include "tarn/FileSystem/FileSpecification.h"

namespace tarn {

class CFileStream;

class WAVEWriter {
 public:
  static constexpr int kStreamBufferSize = 4096;
  static constexpr std::uint16_t kFormatTagPCM = 1;
  static constexpr std::uint16_t kFormatTagFloat = 3;
  static constexpr std::uint16_t kFormatTagExtensible = 0xFFFE;
  static constexpr int kFormatPayloadSize = 16;
  static constexpr int kExtensibleFormatPayloadSize = 40;
  static constexpr int kRecIndicatorPayloadSize = 4;

  // The file `spec` (created with type "WAVE", or ".W64" in Wave64 mode,
  // when it does not exist), opened read-write through a CFileStream with a
  // 4096-byte buffer that the writer owns. `sampleFormat` is the format the
  // audio layer writes (it picks the extensible subformat); `recIndicator`
  // asks for a "Rec!" chunk. Throws what creating or opening the file
  // throws.
  WAVEWriter(const FileSpecification& spec, double sampleRate, std::int16_t bytesPerSample,
             std::int16_t numChannels, std::int64_t numFrames, std::int16_t bytesPerFrame,
             std::uint32_t sampleFormat, bool recIndicator, bool wave64);
  WAVEWriter(const WAVEWriter&) = delete;
  WAVEWriter& operator=(const WAVEWriter&) = delete;
  // Writes back buffered bytes and closes the file; errors are dropped (call
  // Close to see them).
  ~WAVEWriter();

  // The "bext" payload to write; without one, ForNewRecording of the
  // writer's attributes is used.
  void SetBroadcastExtension(const BWFBroadcastWaveExtension& bext) { bext_ = bext; }

  // Writes the whole header for `numFrames` frames (the "Rec!" payload is
  // `recIndicatorValue`) and leaves the stream at the first audio byte.
  void WriteHeader(std::uint32_t recIndicatorValue, std::int64_t numFrames);
  // Rewrites the container size and the "data" header for `numFrames`;
  // nothing else is touched. The container size covers the audio and
  // whatever the file holds after it (the larger of the two ends). RIFF
  // sizes beyond 32 bits are stored as 0xFFFFFFFF.
  void UpdateDataLength(std::int64_t numFrames);
  // In RIFF, the pad byte after odd audio. A Wave64 file whose audio
  // chunk is the last is left unpadded: other programs count zero bytes
  // after the audio as samples (the chunk editor pads the file before it
  // appends a chunk behind the audio).
  void MaybePadChunk();
  // Zero bytes at the end of the file up to the padding unit of the mode.
  void MaybePadTrailingChunk();
  // A "JUNK" chunk at `offset` with `length` zero bytes of payload.
  void WriteJunkChunk(std::int64_t offset, std::int64_t length);
  // A "Rec!" chunk at `offset` holding `value`.
  void WriteRecordingIndicatorChunk(std::int64_t offset, std::uint32_t value);
  // The "data" chunk header at `offset` for the current frame count.
  void WriteSoundDataHeader(std::int64_t offset);
  // Writes back buffered bytes and closes the file; throws on write errors.
  void Close();
  // For a file laid out by another writer: where its "data" header is
  // (the standard offset of this layout otherwise).
  void SetOffsetToSoundDataHeader(std::int64_t offset) noexcept { dataHeaderOffset_ = offset; }

  [[nodiscard]] bool IsWave64() const noexcept { return wave64_; }
  [[nodiscard]] std::int64_t GetOffsetToSoundDataHeader() const noexcept;
  [[nodiscard]] std::int64_t GetOffsetToAudio() const noexcept;
  // Header, "data" header and audio, without the trailing pad.
  [[nodiscard]] std::int64_t ComputeFileSize() const noexcept;
  [[nodiscard]] std::uint32_t GetSampleFormat() const noexcept { return sampleFormat_; }
  [[nodiscard]] CFileStream& GetStream() noexcept { return *stream_; }

  // The "fmt " payload for these attributes (16 or 40 bytes, see above).
  [[nodiscard]] static std::vector<std::uint8_t> MakeFormatChunkPayload(double sampleRate,
                                                                        std::int16_t bytesPerSample,
                                                                        std::int16_t numChannels,
                                                                        std::int16_t bytesPerFrame,
                                                                        std::uint32_t sampleFormat);
  // A chunk header in the mode's form: the tag (the Wave64 identifier of the
  // tag) and the size field for a payload of `length` bytes.
  [[nodiscard]] static std::vector<std::uint8_t> MakeChunkHeader(RIFFType tag, std::uint64_t length,
                                                                 bool wave64);

  // `length` rounded up to the padding unit: +1 when odd (RIFF), up to the
  // next multiple of 8 (Wave64). Lengths are never negative.
  [[nodiscard]] static constexpr std::int64_t PadDataLength(std::int64_t length,
                                                            bool wave64) noexcept {
    return wave64 ? (length + 7) & ~std::int64_t{7} : length + (length & 1);
  }
  // Bytes of the form-type field after the container header.
  [[nodiscard]] static constexpr int GetRIFFChunkExtraSize(bool wave64) noexcept {
    return wave64 ? 16 : 4;
  }
  // Bytes of a chunk header: identifier and size field.
  [[nodiscard]] static constexpr int GetChunkHeaderSize(bool wave64) noexcept {
    return wave64 ? 24 : 8;
  }
  [[nodiscard]] static constexpr int GetFormatPayloadSize(int numChannels) noexcept {
    return numChannels <= 2 ? kFormatPayloadSize : kExtensibleFormatPayloadSize;
  }
  // Where the "data" header of a new file goes: 968/984 (Wave64/RIFF) for
  // 1-2 channels, 992/1008 for 3 or more, plus 32 (Wave64) or 12 plus the
  // junk growth (RIFF) with a recording indicator.
  [[nodiscard]] static constexpr std::int64_t ComputeStandardOffsetToSoundDataHeader(
      bool recIndicator, bool wave64, bool reserveJunk, int numChannels) noexcept {
    std::int64_t offset =
        GetRIFFChunkExtraSize(wave64) + 3 * GetChunkHeaderSize(wave64) +
        GetFormatPayloadSize(numChannels) +
        PadDataLength(BWFBroadcastWaveExtension::BroadcastWaveExtensionDefaultChunkSize, wave64);
    if (recIndicator)
      offset += GetChunkHeaderSize(wave64) + PadDataLength(kRecIndicatorPayloadSize, wave64);
    if (!wave64 && reserveJunk)
      offset +=
          GetChunkHeaderSize(false) + ComputeWave64ReserveJunkLength(recIndicator, numChannels);
    return offset;
  }
  // The RIFF "JUNK" payload that moves the RIFF audio to the Wave64 audio
  // offset (74 bytes without a recording indicator).
  [[nodiscard]] static constexpr std::int64_t ComputeWave64ReserveJunkLength(
      bool recIndicator, int numChannels) noexcept {
    const std::int64_t wave64Offset =
        ComputeStandardOffsetToSoundDataHeader(recIndicator, true, false, numChannels);
    const std::int64_t riffOffset =
        ComputeStandardOffsetToSoundDataHeader(recIndicator, false, false, numChannels);
    return PadDataLength(wave64Offset - (riffOffset + 8) + 24, false) - 8;
  }
  // The smallest audio offset at which a RIFF file can be rewritten as
  // Wave64 in place (992 for 1-2 channels without a recording indicator).
  [[nodiscard]] static constexpr std::int64_t GetHeaderSizeNeededForWave64Switch(
      bool recIndicator, int numChannels) noexcept {
    return ComputeStandardOffsetToSoundDataHeader(recIndicator, true, true, numChannels) +
           GetChunkHeaderSize(true);
  }

 private:
  void Put(std::int64_t offset, const std::vector<std::uint8_t>& bytes);
  void PutZeros(std::int64_t offset, std::int64_t count);
  void PadTo(std::int64_t end);
  [[nodiscard]] std::int64_t DataLength() const noexcept { return numFrames_ * bytesPerFrame_; }

  std::unique_ptr<CFileStream> stream_;
  double sampleRate_;
  std::int16_t bytesPerSample_;
  std::int16_t numChannels_;
  std::int64_t numFrames_;
  std::int16_t bytesPerFrame_;
  std::uint32_t sampleFormat_;
  bool recIndicator_;
  bool wave64_;
  std::optional<BWFBroadcastWaveExtension> bext_;
  std::optional<std::int64_t> dataHeaderOffset_;
};

}  // namespace tarn
