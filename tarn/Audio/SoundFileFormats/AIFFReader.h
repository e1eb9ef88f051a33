#pragma once
// AIFFReader: the header facts of a FORM "AIFF" or "AIFC" file that the
// audio layer needs: where the audio starts, its channels, frames, rate,
// sample format and byte order, plus the loop facts of a "basc" chunk and
// the channel layout of a "CHAN" chunk.
//
// The file is parsed once, on the first question, by seeking from chunk
// header to chunk header (payloads other than "COMM", the 8-byte "SSND"
// header, "basc" and "CHAN" are never read); the file is open only during
// that parse. All fields are big-endian. Chunk sizes are rounded up to even,
// so an odd chunk is skipped with its pad byte (and the "SSND" offset check
// counts that byte); a chunk whose size field is too small for the fields
// read from it ("COMM", "basc", "CHAN") does not lend them its pad byte. A
// chunk header cut short by the end of the file ends the walk.
//
// Sample format and byte order ("COMM"):
//   form "AIFF", or "AIFC" with compression "NONE": by bytes per sample
//     (bits / 8, truncating) 1 -> kSamp8, 2 -> kSamp16, 3 -> kSamp24,
//     4 -> kSampUnpacked24, 8 -> kSampWide64A; other sizes fail;
//   "AIFC" with "in24" -> kSamp24, "in32" -> kSampUnpacked24, "fl32" ->
//     kSampFloat32, "fl64" -> kSampWide64B, "sowt" or "twos" -> kSamp16
//     whatever the sample size; any other compression fails, except that
//     "FL32" and "FL64", the spellings libsndfile writes for the same
//     floating-point samples, read as "fl32" and "fl64".
//   Samples are least significant byte first exactly when the compression
//   is "sowt". The frame size stays channels * (bits / 8), so a 24-bit
//   "sowt" file reads as 16-bit samples in 3-byte slots: readers that want
//   its samples check GetSampleSize as well.
//
// The audio starts 8 bytes into the "SSND" payload plus the chunk's offset
// field, but only if that offset leaves room for every "COMM" frame in the
// chunk (DetermineHeaderSize); a damaged offset is taken as 0 so it never
// hides audio. GetNumberOfFrames is the "COMM" frame count as written; it is
// not cut to the file's length.
//
// Errors: a file that is not FORM "AIFF"/"AIFC", lacks "COMM" or "SSND",
// has a "COMM" chunk too short for its fields, or an unknown sample size or
// compression, throws kind/system/subsystem "AIFFReader" code 0 (the file's
// path attached) from every question but CanParse, which answers false
// instead. A file that cannot be opened throws the file system's error the
// same way. Every question after the first repeats the first answer (or
// error). Nothing is allocated by a size field beyond the file's length.
//
// Threads: one reader belongs to one thread at a time; distinct readers of
// the same file are independent.
//
//   AIFFReader reader(spec);
//   if (!reader.CanParse()) return;
//   const std::int64_t audioStart = reader.GetHeaderSize();
//   const std::int32_t frameBytes = reader.GetSampleFrameSize();

#include <cstdint>
#include <exception>
#include <optional>
#include <vector>

#include "tarn/Audio/SampleFormat.h"
#include "tarn/Audio/SoundFileFormats/HostChannelOrder.h"
#include "tarn/Audio/SoundFileFormats/RIFFType.h"
#include "tarn/Audio/SoundFileFormats/SoundFileAttributes.h"
#include "tarn/FileSystem/FileSpecification.h"

namespace tarn {

class CStream;

class AIFFReader {
 public:
  static constexpr RIFFType kFORM = MakeRIFFType("FORM");
  static constexpr RIFFType kAIFF = MakeRIFFType("AIFF");
  static constexpr RIFFType kAIFC = MakeRIFFType("AIFC");
  static constexpr RIFFType kCOMM = MakeRIFFType("COMM");
  static constexpr RIFFType kSSND = MakeRIFFType("SSND");
  static constexpr RIFFType kFVER = MakeRIFFType("FVER");
  static constexpr RIFFType kBasc = MakeRIFFType("basc");
  static constexpr RIFFType kCHAN = MakeRIFFType("CHAN");
  // AIFC compression types.
  static constexpr RIFFType kNONE = MakeRIFFType("NONE");
  static constexpr RIFFType kSowt = MakeRIFFType("sowt");
  static constexpr RIFFType kTwos = MakeRIFFType("twos");
  static constexpr RIFFType kIn24 = MakeRIFFType("in24");
  static constexpr RIFFType kIn32 = MakeRIFFType("in32");
  static constexpr RIFFType kFl32 = MakeRIFFType("fl32");
  static constexpr RIFFType kFl64 = MakeRIFFType("fl64");
  static constexpr RIFFType kFL32 = MakeRIFFType("FL32");
  static constexpr RIFFType kFL64 = MakeRIFFType("FL64");

  // Bytes of the "COMM" fields read (18; 22 with an AIFC compression type).
  static constexpr int kCommonSize = 18;
  static constexpr int kCommonSizeAIFC = 22;
  // Bytes of the "basc" fields read.
  static constexpr int kBascSize = 18;
  // Root note kept when the "basc" one is 127 or more.
  static constexpr short kDefaultRootNote = 60;

  explicit AIFFReader(const FileSpecification& spec);
  AIFFReader(const AIFFReader&) = delete;
  AIFFReader& operator=(const AIFFReader&) = delete;
  ~AIFFReader();

  // Whether the file parses; never throws.
  [[nodiscard]] bool CanParse() noexcept;

  // The byte offset of the first audio byte.
  [[nodiscard]] std::int64_t GetHeaderSize();
  [[nodiscard]] std::int16_t GetNumberOfChannels();
  [[nodiscard]] std::int64_t GetNumberOfFrames();
  [[nodiscard]] double GetSampleRate();
  // Bytes per sample: the "COMM" bit count / 8, truncating.
  [[nodiscard]] std::int16_t GetSampleSize();
  // The "COMM" bit count as written.
  [[nodiscard]] std::int16_t GetSampleSizeInBits();
  [[nodiscard]] std::int32_t GetSampleFrameSize();
  [[nodiscard]] SampleFormat GetSampleFormat();
  [[nodiscard]] bool GetSamplesAreLSBFirst();
  [[nodiscard]] SurroundModel GetSurroundModel();
  // From "CHAN" when it names as many channels as "COMM" has, else the
  // default order for the channel count.
  [[nodiscard]] HostChannelOrder GetChannelOrder();
  // "AIFF" or "AIFC"; and the AIFC compression type ("NONE" for AIFF).
  [[nodiscard]] RIFFType GetFormType();
  [[nodiscard]] RIFFType GetCompressionType();
  // Offsets of the "COMM" and "SSND" chunk headers.
  [[nodiscard]] std::int64_t GetOffsetToCommonChunk();
  [[nodiscard]] std::int64_t GetOffsetToSoundChunk();
  // False without a "basc" chunk; otherwise its root note (60 when the
  // chunk's is 127 or more), meter numerator and denominator.
  [[nodiscard]] bool GetMeterAndPitch(short& rootNote, short& numerator, short& denominator);
  // With a "basc" chunk of loop type 1: rate / (frames / beats) * 60; 0
  // otherwise (and when frames or beats are not positive).
  [[nodiscard]] double GetQuarterNoteTempoBPM();
  // Every byte before the audio (at most the file's length).
  void GetRawHeader(std::vector<std::uint8_t>& header);
  // The facts above in one record (file type "AIFF" or "AIFC").
  [[nodiscard]] SoundFileAttributes GetAttributes();

 private:
  struct Chunk {
    RIFFType tag = 0;
    std::int64_t size = 0;     // rounded up to even
    std::int64_t rawSize = 0;  // as the size field says
  };

  void Parse();
  void ParseFile();
  RIFFType ReadFormChunk();
  Chunk ReadChunkHeader();
  void ReadCommonChunk(RIFFType formType, std::int64_t chunkSize);
  std::int64_t DetermineHeaderSize(std::int64_t chunkSize, bool verify);
  void ReadAppleLoopBasicChunk(std::int64_t chunkSize);
  void ReadChannelLayoutChunk(std::int64_t chunkSize);
  [[noreturn]] void Fail() const;

  FileSpecification spec_;
  CStream* stream_ = nullptr;  // only while parsing
  std::int64_t fileLength_ = 0;
  bool parsed_ = false;
  std::exception_ptr error_;

  RIFFType formType_ = 0;
  RIFFType compression_ = kNONE;
  std::int16_t channels_ = 0;
  std::uint32_t frames_ = 0;
  std::int16_t bits_ = 0;
  std::int16_t bytesPerSample_ = 0;
  double rate_ = 0.0;
  SampleFormat format_ = kSamp16;
  bool lsbFirst_ = false;
  std::int64_t commOffset_ = -1;
  std::int64_t ssndOffset_ = -1;
  std::int64_t ssndSize_ = 0;
  std::int64_t headerSize_ = 0;
  HostChannelOrder order_;
  std::optional<HostChannelOrder> layout_;  // from "CHAN"
  bool hasBasc_ = false;
  std::int32_t beats_ = 0;
  short rootNote_ = kDefaultRootNote;
  short numerator_ = 0;
  short denominator_ = 0;
  short loopType_ = 0;
};

}  // namespace tarn
