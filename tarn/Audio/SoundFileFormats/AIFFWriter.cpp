#include "tarn/Audio/SoundFileFormats/AIFFWriter.h"

#include <cstring>
#include <string_view>

#include "tarn/Audio/SoundFileFormats/IEEEExtended.h"
#include "tarn/Audio/SoundFileFormats/WAVEWriter.h"
#include "tarn/Errors/Fail.h"
#include "tarn/FileSystem/File.h"

namespace tarn {
namespace {

constexpr std::int64_t kMaxU32 = 0xFFFFFFFF;
// Bytes of the header fields before the audio that do not depend on the
// encoding: "FORM" header and form type, "COMM" header, "SSND" header with
// its offset and block size.
constexpr int kFormHeader = 12;
constexpr int kChunkHeader = 8;
constexpr int kFVERChunk = kChunkHeader + 4;
constexpr int kSoundHeader = kChunkHeader + 8;

std::string_view CompressionName(RIFFType compression) noexcept {
  switch (compression) {
    case AIFFReader::kSowt:
      return "little endian";
    case AIFFReader::kFl32:
      return "32-bit floating point";
    case AIFFReader::kFl64:
      return "64-bit floating point";
    default:
      return "not compressed";
  }
}

// Bytes of the "COMM" payload: 18, plus for AIFC the compression type and
// its name as a Pascal string padded to even length.
int CommonPayloadSize(RIFFType formType, RIFFType compression) noexcept {
  if (formType != AIFFReader::kAIFC) return AIFFReader::kCommonSize;
  const int name = 1 + static_cast<int>(CompressionName(compression).size());
  return AIFFReader::kCommonSizeAIFC + name + (name & 1);
}

void PutU32(CStream& s, std::uint32_t v) { s.PutLong(static_cast<int>(v)); }

}  // namespace

void AIFFWriter::Validate(double rate, std::int16_t channels, std::int16_t bits, RIFFType form,
                          RIFFType compression, std::int64_t frames) {
  bool ok = channels >= 1 && rate > 0.0 && frames >= 0 &&
            (form == AIFFReader::kAIFF || form == AIFFReader::kAIFC);
  switch (compression) {
    case AIFFReader::kNONE:
      ok = ok && (bits == 8 || bits == 16 || bits == 24 || bits == 32);
      break;
    case AIFFReader::kSowt:
      ok = ok && form == AIFFReader::kAIFC && bits == 16;
      break;
    case AIFFReader::kFl32:
      ok = ok && form == AIFFReader::kAIFC && bits == 32;
      break;
    case AIFFReader::kFl64:
      ok = ok && form == AIFFReader::kAIFC && bits == 64;
      break;
    default:
      ok = false;
  }
  // Every size field must hold the audio of `frames` frames.
  if (ok) {
    const std::int64_t frameBytes = std::int64_t{channels} * (bits / 8);
    ok = frames <= kMaxU32 &&
         frames * frameBytes + ComputeHeaderSize(form, compression) <= kMaxU32 - 1;
  }
  if (!ok) FailOSErr(kParamErr);
}

void AIFFWriter::ChooseEncoding(const SoundFileAttributes& a, RIFFType& formType,
                                RIFFType& compression, std::int16_t& bitsPerSample) {
  formType = a.mFileType == AIFFReader::kAIFC ? AIFFReader::kAIFC : AIFFReader::kAIFF;
  compression = AIFFReader::kNONE;
  switch (a.mSampleFormat) {
    case kSamp8:
      bitsPerSample = 8;
      break;
    case kSamp16:
      bitsPerSample = 16;
      break;
    case kSamp24:
      bitsPerSample = 24;
      break;
    case kSampUnpacked24:
      bitsPerSample = 32;
      break;
    case kSampFloat32:
      bitsPerSample = 32;
      compression = AIFFReader::kFl32;
      break;
    case kSampWide64B:
      bitsPerSample = 64;
      compression = AIFFReader::kFl64;
      break;
    default:
      FailOSErr(kParamErr);
  }
  if (compression == AIFFReader::kNONE && a.mSamplesAreLSBFirst && bitsPerSample > 8) {
    if (bitsPerSample != 16) FailOSErr(kParamErr);
    compression = AIFFReader::kSowt;
  }
  if (compression != AIFFReader::kNONE) formType = AIFFReader::kAIFC;
}

SoundFileAttributes AIFFWriter::AttributesOf(double rate, std::int16_t channels,
                                             std::int16_t bitsPerSample, RIFFType formType,
                                             RIFFType compression) {
  SoundFileAttributes a;
  a.mFileType = formType;
  a.mNumChannels = channels;
  a.mSampleRate = rate;
  a.mBytesPerSample = static_cast<std::int16_t>(bitsPerSample / 8);
  a.mBytesPerFrame = std::int32_t{channels} * a.mBytesPerSample;
  a.mOffsetToAudio = ComputeHeaderSize(formType, compression);
  a.mSamplesAreLSBFirst = compression == AIFFReader::kSowt;
  switch (compression) {
    case AIFFReader::kSowt:
      a.mSampleFormat = kSamp16;
      break;
    case AIFFReader::kFl32:
      a.mSampleFormat = kSampFloat32;
      break;
    case AIFFReader::kFl64:
      a.mSampleFormat = kSampWide64B;
      break;
    default: {
      constexpr SampleFormat kByBytes[] = {kSamp16, kSamp8, kSamp16, kSamp24, kSampUnpacked24};
      a.mSampleFormat = a.mBytesPerSample <= 4 ? kByBytes[a.mBytesPerSample] : kSampWide64A;
    }
  }
  return a;
}

std::int32_t AIFFWriter::ComputeHeaderSize(RIFFType formType, RIFFType compression) {
  return kFormHeader + (formType == AIFFReader::kAIFC ? kFVERChunk : 0) + kChunkHeader +
         CommonPayloadSize(formType, compression) + kSoundHeader;
}

AIFFWriter::AIFFWriter(const FileSpecification& spec, double rate, std::int16_t channels,
                       std::int16_t bitsPerSample, RIFFType formType, RIFFType compression,
                       std::int64_t frames)
    : rate_(rate),
      channels_(channels),
      bits_(bitsPerSample),
      form_(formType),
      compression_(compression),
      frames_(frames),
      bytesPerFrame_(std::int32_t{channels} * (bitsPerSample / 8)),
      headerSize_(0) {
  Validate(rate, channels, bitsPerSample, formType, compression, frames);
  headerSize_ = ComputeHeaderSize(formType, compression);
  if (!spec.Exists()) (void)File::CreateOnDisk(spec, FileTypeClass(formType), FileTypeClass());
  stream_ = std::make_unique<CFileStream>(spec, kStreamBufferSize);
  stream_->Open(kTCLReadWriteMode);
}

AIFFWriter::~AIFFWriter() = default;

void AIFFWriter::WriteCommonChunk() {
  CStream& s = *stream_;
  PutU32(s, AIFFReader::kCOMM);
  PutU32(s, static_cast<std::uint32_t>(CommonPayloadSize(form_, compression_)));
  s.PutShort(channels_);
  PutU32(s, static_cast<std::uint32_t>(frames_));
  s.PutShort(bits_);
  unsigned char rate[10];
  double_to_ieee_80(rate_, rate);
  s.PutRawDataToStream(rate, 10);
  if (form_ != AIFFReader::kAIFC) return;
  PutU32(s, compression_);
  const std::string_view name = CompressionName(compression_);
  unsigned char pstring[32] = {static_cast<unsigned char>(name.size())};
  std::memcpy(pstring + 1, name.data(), name.size());
  const int length = 1 + static_cast<int>(name.size());
  s.PutRawDataToStream(pstring, length + (length & 1));
}

void AIFFWriter::WriteHeader() {
  CStream& s = *stream_;
  s.MoveTo(0);
  const std::int64_t data = DataBytes(frames_);
  PutU32(s, AIFFReader::kFORM);
  PutU32(s, static_cast<std::uint32_t>(headerSize_ - kChunkHeader +
                                       WAVEWriter::PadDataLength(data, false)));
  PutU32(s, form_);
  if (form_ == AIFFReader::kAIFC) {
    PutU32(s, AIFFReader::kFVER);
    PutU32(s, 4);
    PutU32(s, kAIFCVersion1);
  }
  WriteCommonChunk();
  PutU32(s, AIFFReader::kSSND);
  PutU32(s, static_cast<std::uint32_t>(8 + data));
  PutU32(s, 0);  // offset
  PutU32(s, 0);  // block size
}

void AIFFWriter::UpdateDataLength(std::int64_t frames) {
  Validate(rate_, channels_, bits_, form_, compression_, frames);
  CStream& s = *stream_;
  const std::int64_t back = s.Position();
  const std::int64_t data = DataBytes(frames);
  const std::int64_t comm = kFormHeader + (form_ == AIFFReader::kAIFC ? kFVERChunk : 0);
  s.MoveTo(4);
  PutU32(s, static_cast<std::uint32_t>(headerSize_ - kChunkHeader +
                                       WAVEWriter::PadDataLength(data, false)));
  s.MoveTo(comm + kChunkHeader + 2);
  PutU32(s, static_cast<std::uint32_t>(frames));
  s.MoveTo(headerSize_ - kSoundHeader + 4);
  PutU32(s, static_cast<std::uint32_t>(8 + data));
  s.MoveTo(back);
  frames_ = frames;
}

void AIFFWriter::MaybePadChunk() {
  const std::int64_t data = DataBytes(frames_);
  if ((data & 1) == 0) return;
  CStream& s = *stream_;
  s.MoveTo(headerSize_ + data);
  s.PutChar(0);
}

void AIFFWriter::Close() { stream_->Close(); }

}  // namespace tarn
