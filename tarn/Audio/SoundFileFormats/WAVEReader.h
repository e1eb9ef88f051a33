#pragma once
// WAVEReader: the header facts of a RIFF "WAVE" or Wave64 file, for the audio
// layer and the WAVE format object.
//
// The file is parsed once, on the first question: the reader walks the chunk
// headers from the container header on, seeking from header to header, and
// reads only the payloads it interprets ("fmt ", "bext", "acid", "strc",
// "Rec!"), each bounded by the bytes the file really has. The walk goes on
// after "data" so that metadata behind the audio is found too; a chunk
// header that is cut short, or a non-audio chunk whose size passes the end
// of the file, a null tag (zero bytes), or more than 4096 chunks, ends the
// walk quietly. A "data" chunk whose size passes the end of the file is
// taken as running to the end.
//
// Rules of interpretation:
//   - "fmt ": format tags 1 (integer PCM), 3 (IEEE float) and 0xFFFE
//     (extensible) are audio; any other tag is not parsed. A sample rate
//     that reads as negative keeps only its low 16 bits. Bytes per sample =
//     bits per sample / 8 (truncating). The extensible part (valid bits,
//     channel mask, subformat: IEEE float or integer) is read only from a
//     chunk of at least 38 bytes.
//   - "bext": the description is the comment; the original time stamp is
//     time reference high * 0x7FFFFFFF + low, both read as signed 32-bit.
//   - "acid": the tempo is rate / (frames / beats) * 60 in single precision
//     when frames per beat exceed 20.0, else 0. A 28-byte chunk holds one
//     32-bit field more before the number of beats.
//   - The frame count is the "data" length / frame size, never more than
//     (file length - audio offset) / frame size.
//
// Errors: CanParse never throws (false for anything the reader cannot use).
// Every other query parses first and, on a file it cannot use, throws what
// the parse met: kind/system/subsystem "WAVEReader" with one of the codes
// below, or the stream's error when the file cannot be opened. Nothing is
// allocated by a size field beyond the length of the file.
//
// Threads: one thread at a time per reader; nothing is held open between
// calls except during the parse.
//
//   WAVEReader reader(spec);
//   if (reader.CanParse()) offset = reader.GetOffsetToAudioHeader();

#include <cstdint>
#include <optional>
#include <vector>

#include "tarn/Audio/SampleFormat.h"
#include "tarn/Audio/SoundFileFormats/BWFBroadcastWaveExtension.h"
#include "tarn/Audio/SoundFileFormats/HostChannelOrder.h"
#include "tarn/Audio/SoundFileFormats/RIFFType.h"
#include "tarn/Errors/TarnError.h"
#include "tarn/FileSystem/FileSpecification.h"

namespace tarn {

class CFileStream;

class WAVEReader {
 public:
  static constexpr const char* kErrorClass = "WAVEReader";
  // Codes of the "WAVEReader" errors.
  static constexpr int kNotAWaveFile = 1;       // no RIFF/Wave64 container or not "WAVE"
  static constexpr int kNoFormatChunk = 2;      // no "fmt " chunk (or one too short)
  static constexpr int kNoDataChunk = 3;        // no "data" chunk
  static constexpr int kUnsupportedFormat = 4;  // format tag, channels or sample size unusable
  // The most channels a readable file may have (the 16-bit signed count of
  // SoundFileAttributes); more is kUnsupportedFormat.
  static constexpr int kMaxChannels = 0x7FFF;

  // The "acid" chunk (loop and tempo facts) and its "strc" slice list.
  struct AcidInfo {
    bool mPresent = false;
    std::uint32_t mFlags = 0;
    std::uint16_t mRootNote = 0;
    std::uint32_t mNumberOfBeats = 0;
    std::uint16_t mMeterDenominator = 0;
    std::uint16_t mMeterNumerator = 0;
    float mStoredTempo = 0.0f;  // the chunk's own tempo field
    float mTempo = 0.0f;        // computed from rate, frames and beats (see above)
    // "strc": the slice positions in frames, in file order.
    bool mHasSlices = false;
    std::vector<std::int64_t> mSlicePositions;
  };

  // One chunk met by the walk.
  struct ChunkLocation {
    RIFFType tag = 0;
    std::int64_t offset = 0;  // first byte of the chunk header
    std::int64_t length = 0;  // the payload length as the size field says
  };

  explicit WAVEReader(const FileSpecification& spec);
  WAVEReader(const WAVEReader&) = delete;
  WAVEReader& operator=(const WAVEReader&) = delete;
  ~WAVEReader();

  // Whether the file is a WAVE or Wave64 file this library can read.
  [[nodiscard]] bool CanParse() noexcept;

  [[nodiscard]] bool IsWave64();
  // True for a RIFF file whose header leaves room to be rewritten as Wave64
  // in place (see WAVEWriter::GetHeaderSizeNeededForWave64Switch), without
  // chunks before the audio that Wave64 cannot hold.
  [[nodiscard]] bool CanSwitchToWave64();
  // The offset of the first audio byte.
  [[nodiscard]] std::int64_t GetHeaderSize();
  // The offset of the "data" chunk header.
  [[nodiscard]] std::int64_t GetOffsetToAudioHeader();
  // The "data" chunk's length as its size field says (not clamped).
  [[nodiscard]] std::int64_t GetDataLength();
  [[nodiscard]] int GetNumberOfChannels();
  [[nodiscard]] std::int64_t GetNumberOfFrames();
  [[nodiscard]] double GetSampleRate();
  [[nodiscard]] int GetSampleSize();  // bytes per sample
  [[nodiscard]] int GetSampleFrameSize();
  // 1 -> 8-bit offset, 2 -> 16, 3 -> packed 24, 4 -> float or (integer) 24
  // in 32, 8 -> the 8-byte float or the other 8-byte format.
  [[nodiscard]] SampleFormat GetSampleFormat();
  [[nodiscard]] bool IsFloatingPoint();
  [[nodiscard]] SurroundModel GetSurroundModel();
  // The extensible channel mask (0 without one).
  [[nodiscard]] std::uint32_t GetChannelMask();
  [[nodiscard]] std::uint16_t GetFormatTag();

  [[nodiscard]] bool HasBroadcastExtension();
  [[nodiscard]] const BWFBroadcastWaveExtension& GetBroadcastExtension();
  [[nodiscard]] bool HasComment();
  [[nodiscard]] UString GetComment();
  [[nodiscard]] bool HasTimeStamp();
  [[nodiscard]] std::int64_t GetOriginalTimeStamp();
  [[nodiscard]] bool HasRecIndicator();
  // The offset of the "Rec!" chunk header (its value follows the header).
  [[nodiscard]] std::int64_t GetOffsetToRecIndicator();
  [[nodiscard]] std::uint32_t GetRecIndicatorValue();
  [[nodiscard]] const AcidInfo& GetAcidInfo();
  // The file's bytes from 0 up to the first audio byte.
  [[nodiscard]] std::vector<std::uint8_t> GetRawHeader();
  // Every chunk the walk met, in file order.
  [[nodiscard]] const std::vector<ChunkLocation>& GetChunks();
  // The file's length when it was parsed.
  [[nodiscard]] std::int64_t GetFileLength();

  // The original time stamp of a "bext" time reference (high * 0x7FFFFFFF
  // + low) and back (low < 0x7FFFFFFF).
  [[nodiscard]] static std::int64_t TimeStampFromReference(std::int32_t low,
                                                           std::int32_t high) noexcept;
  static void ReferenceFromTimeStamp(std::int64_t stamp, std::uint32_t& low,
                                     std::uint32_t& high) noexcept;

 private:
  void ParseFile();
  void Parse();
  void WalkChunks(CFileStream& stream);
  std::vector<std::uint8_t> ReadPayload(CFileStream& stream, const ChunkLocation& chunk,
                                        std::int64_t at, std::int64_t limit);
  void ReadFormatChunk(const std::vector<std::uint8_t>& payload);
  void ReadBroadcastAudioExtension(const std::vector<std::uint8_t>& payload);
  void ReadAcidChunk(const std::vector<std::uint8_t>& payload);
  void ReadAcidStrcChunk(const std::vector<std::uint8_t>& payload);
  void DetermineHeaderSize(std::int64_t dataLength, std::int64_t offset);
  [[nodiscard]] bool HeaderFitsWave64() const;
  [[noreturn]] void Fail(int code) const;

  FileSpecification spec_;
  bool parsed_ = false;
  std::optional<TarnError> error_;

  std::int64_t fileLength_ = 0;
  bool wave64_ = false;
  bool blocksSwitch_ = false;  // the second parse flag: chunks Wave64 cannot hold
  std::vector<ChunkLocation> chunks_;
  bool hasFormat_ = false;
  std::uint16_t formatTag_ = 0;
  bool float_ = false;
  int channels_ = 0;
  double sampleRate_ = 0.0;
  int sampleSize_ = 0;
  int frameSize_ = 0;
  int validBits_ = 0;
  std::uint32_t channelMask_ = 0;
  bool hasData_ = false;
  std::int64_t dataHeaderOffset_ = 0;
  std::int64_t dataLength_ = 0;
  std::int64_t headerSize_ = 0;
  std::int64_t frames_ = 0;
  std::optional<BWFBroadcastWaveExtension> bext_;
  std::int64_t timeStamp_ = 0;
  bool hasTimeStamp_ = false;
  std::optional<std::int64_t> recOffset_;
  std::uint32_t recValue_ = 0;
  AcidInfo acid_;
};

}  // namespace tarn
