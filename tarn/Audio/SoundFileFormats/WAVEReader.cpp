#include "tarn/Audio/SoundFileFormats/WAVEReader.h"

#include <algorithm>
#include <bit>

#include "tarn/Audio/SoundFileFormats/LittleEndianBytesImpl.h"
#include "tarn/Audio/SoundFileFormats/RIFFFormatHandlers.h"
#include "tarn/Audio/SoundFileFormats/WAVEWriter.h"
#include "tarn/Errors/Fail.h"
#include "tarn/Streams/CFileStream.h"

namespace tarn {

namespace le = LittleEndianBytes;

namespace {

constexpr RIFFType kRIFFTag = MakeRIFFType("RIFF");
constexpr RIFFType kWAVETag = MakeRIFFType("WAVE");
constexpr RIFFType kFormatTag = MakeRIFFType("fmt ");
constexpr RIFFType kDataTag = MakeRIFFType("data");
constexpr RIFFType kBextTag = MakeRIFFType("bext");
constexpr RIFFType kAcidTag = MakeRIFFType("acid");
constexpr RIFFType kStrcTag = MakeRIFFType("strc");
constexpr RIFFType kRecTag = MakeRIFFType("Rec!");
constexpr RIFFType kJunkTag = MakeRIFFType("JUNK");

// Payloads read whole are at most this long; longer ones are read up to it.
constexpr std::int64_t kMaxPayloadRead = 16 << 20;
// The part of "fmt " that the reader interprets.
constexpr std::int64_t kFormatReadLength = 40;
constexpr std::size_t kMinimumExtensibleFormat = 38;
constexpr std::size_t kStrcHeaderSize = 28;
constexpr std::size_t kStrcEntrySize = 36;
constexpr float kMinimumFramesPerBeat = 20.0f;
// The walk ends quietly after this many chunks (audio bytes behind a "data"
// chunk of size 0 can look like an endless run of tiny chunks).
constexpr std::size_t kMaxChunks = 4096;

bool IsJunk(RIFFType tag) {
  return tag == kJunkTag || tag == MakeRIFFType("junk") || tag == MakeRIFFType("PAD ") ||
         tag == MakeRIFFType("FLLR");
}

}  // namespace

WAVEReader::WAVEReader(const FileSpecification& spec) : spec_(spec) {}

WAVEReader::~WAVEReader() = default;

void WAVEReader::Fail(int code) const { FailFormatError(kErrorClass, code, spec_); }

bool WAVEReader::CanParse() noexcept {
  try {
    ParseFile();
    return true;
  } catch (...) {
    return false;
  }
}

void WAVEReader::ParseFile() {
  if (!parsed_) {
    parsed_ = true;
    try {
      Parse();
    } catch (const TarnError& error) {
      error_ = error;
    }
  }
  if (error_) throw *error_;
}

void WAVEReader::Parse() {
  CFileStream stream(spec_, WAVEWriter::kStreamBufferSize);
  stream.Open(kTCLReadMode);
  fileLength_ = stream.Size();
  if (fileLength_ < 12) Fail(kNotAWaveFile);
  std::uint8_t head[40];
  stream.GetRawDataFromStream(head, 12);
  if (RIFFTypeFromChars(reinterpret_cast<const char*>(head)) == kRIFFTag) {
    if (RIFFTypeFromChars(reinterpret_cast<const char*>(head + 8)) != kWAVETag) Fail(kNotAWaveFile);
    wave64_ = false;
  } else {
    if (fileLength_ < 40) Fail(kNotAWaveFile);
    stream.GetRawDataFromStream(head + 12, 28);
    auto& handler = GetWaveRIFFFormatHandler();
    TarnCOM::UUIDBytes container{};
    TarnCOM::UUIDBytes form{};
    std::copy(head, head + 16, container.bytes);
    std::copy(head + 24, head + 40, form.bytes);
    if (!handler.IsWave64Container(UUIDObj(container)) ||
        handler.TagForUUID(UUIDObj(form)) != kWAVETag)
      Fail(kNotAWaveFile);
    wave64_ = true;
  }
  WalkChunks(stream);
  if (!hasFormat_) Fail(kNoFormatChunk);
  if (formatTag_ != WAVEWriter::kFormatTagPCM && formatTag_ != WAVEWriter::kFormatTagFloat &&
      formatTag_ != WAVEWriter::kFormatTagExtensible)
    Fail(kUnsupportedFormat);
  // SoundFileAttributes holds the channel count in 16 signed bits: a larger
  // count would reach the audio layer negative.
  if (channels_ <= 0 || channels_ > kMaxChannels || sampleSize_ <= 0) Fail(kUnsupportedFormat);
  if (!hasData_) Fail(kNoDataChunk);
  DetermineHeaderSize(dataLength_, dataHeaderOffset_ + WAVEWriter::GetChunkHeaderSize(wave64_));
  if (acid_.mPresent && acid_.mNumberOfBeats > 0) {
    const float framesPerBeat =
        static_cast<float>(frames_) / static_cast<float>(acid_.mNumberOfBeats);
    acid_.mTempo = framesPerBeat > kMinimumFramesPerBeat
                       ? static_cast<float>(sampleRate_) / framesPerBeat * 60.0f
                       : 0.0f;
  }
}

void WAVEReader::WalkChunks(CFileStream& stream) {
  const int headerSize = WAVEWriter::GetChunkHeaderSize(wave64_);
  std::int64_t position =
      WAVEWriter::GetChunkHeaderSize(wave64_) + WAVEWriter::GetRIFFChunkExtraSize(wave64_);
  auto& handler = GetWaveRIFFFormatHandler();
  while (position + headerSize <= fileLength_ && chunks_.size() < kMaxChunks) {
    std::uint8_t header[24];
    stream.MoveTo(position);
    stream.GetRawDataFromStream(header, headerSize);
    ChunkLocation chunk;
    chunk.offset = position;
    std::uint64_t length = 0;
    if (wave64_) {
      TarnCOM::UUIDBytes id{};
      std::copy(header, header + 16, id.bytes);
      if (UUIDObj(id).IsClear()) break;  // zeros: no chunk here
      chunk.tag = handler.TagForUUID(UUIDObj(id));
      length = le::Load64(header + 16);
      if (length < 24) break;
      length -= 24;
    } else {
      chunk.tag = RIFFTypeFromChars(reinterpret_cast<const char*>(header));
      length = le::Load32(header + 4);
      if (chunk.tag == 0) break;  // zeros: no chunk here
    }
    const std::int64_t payload = position + headerSize;
    const auto available = static_cast<std::uint64_t>(fileLength_ - payload);
    if (chunk.tag == kDataTag && !hasData_) {
      hasData_ = true;
      dataHeaderOffset_ = position;
      dataLength_ = static_cast<std::int64_t>(std::min<std::uint64_t>(length, INT64_MAX));
      chunk.length = dataLength_;
      chunks_.push_back(chunk);
      if (length > available) break;  // the audio runs to the end of the file
    } else {
      if (length > available) break;
      chunk.length = static_cast<std::int64_t>(length);
      chunks_.push_back(chunk);
      if (chunk.tag == kFormatTag && !hasFormat_) {
        ReadFormatChunk(ReadPayload(stream, chunk, payload, kFormatReadLength));
      } else if (chunk.tag == kBextTag && !bext_) {
        ReadBroadcastAudioExtension(ReadPayload(stream, chunk, payload, kMaxPayloadRead));
      } else if (chunk.tag == kAcidTag && !acid_.mPresent) {
        ReadAcidChunk(ReadPayload(stream, chunk, payload, kMaxPayloadRead));
      } else if (chunk.tag == kStrcTag && !acid_.mHasSlices) {
        ReadAcidStrcChunk(ReadPayload(stream, chunk, payload, kMaxPayloadRead));
      } else if (chunk.tag == kRecTag && !recOffset_) {
        recOffset_ = position;
        const auto value = ReadPayload(stream, chunk, payload, 4);
        if (value.size() == 4) recValue_ = le::Load32(value.data());
      }
    }
    position = payload + WAVEWriter::PadDataLength(chunk.length, wave64_);
  }
}

std::vector<std::uint8_t> WAVEReader::ReadPayload(CFileStream& stream, const ChunkLocation& chunk,
                                                  std::int64_t at, std::int64_t limit) {
  std::vector<std::uint8_t> bytes(static_cast<std::size_t>(std::min(chunk.length, limit)));
  stream.MoveTo(at);
  if (!bytes.empty()) stream.GetRawDataFromStream(bytes.data(), static_cast<int>(bytes.size()));
  return bytes;
}

void WAVEReader::ReadFormatChunk(const std::vector<std::uint8_t>& payload) {
  if (payload.size() < 16) return;
  const std::uint8_t* p = payload.data();
  hasFormat_ = true;
  formatTag_ = le::Load16(p);
  float_ = formatTag_ == WAVEWriter::kFormatTagFloat;
  channels_ = le::Load16(p + 2);
  const auto rate = static_cast<std::int32_t>(le::Load32(p + 4));
  sampleRate_ = rate < 0 ? static_cast<double>(rate & 0xFFFF) : static_cast<double>(rate);
  const int bits = le::Load16(p + 14);
  sampleSize_ = bits / 8;
  frameSize_ = channels_ * sampleSize_;
  validBits_ = bits;
  if (formatTag_ == WAVEWriter::kFormatTagExtensible &&
      payload.size() >= kMinimumExtensibleFormat) {
    validBits_ = le::Load16(p + 18);
    channelMask_ = le::Load32(p + 20);
    float_ = le::Load16(p + 24) == WAVEWriter::kFormatTagFloat;
  }
}

void WAVEReader::ReadBroadcastAudioExtension(const std::vector<std::uint8_t>& payload) {
  bext_ = BWFBroadcastWaveExtension::Parse(payload.data(), payload.size());
  timeStamp_ = TimeStampFromReference(static_cast<std::int32_t>(bext_->mTimeReferenceLow),
                                      static_cast<std::int32_t>(bext_->mTimeReferenceHigh));
  hasTimeStamp_ = payload.size() >= BWFBroadcastWaveExtension::kTimeReferenceOffset + 8;
}

void WAVEReader::ReadAcidChunk(const std::vector<std::uint8_t>& payload) {
  const std::size_t beatsAt = payload.size() == 28 ? 16 : 12;
  if (payload.size() < beatsAt + 4) return;
  const std::uint8_t* p = payload.data();
  acid_.mPresent = true;
  acid_.mFlags = le::Load32(p);
  acid_.mRootNote = le::Load16(p + 4);
  acid_.mNumberOfBeats = le::Load32(p + beatsAt);
  if (payload.size() >= beatsAt + 8) {
    acid_.mMeterDenominator = le::Load16(p + beatsAt + 4);
    acid_.mMeterNumerator = le::Load16(p + beatsAt + 6);
  }
  if (payload.size() >= beatsAt + 12)
    acid_.mStoredTempo = std::bit_cast<float>(le::Load32(p + beatsAt + 8));
}

void WAVEReader::ReadAcidStrcChunk(const std::vector<std::uint8_t>& payload) {
  if (payload.size() < kStrcHeaderSize) return;
  acid_.mHasSlices = true;
  const std::size_t declared = le::Load32(payload.data() + 4);
  const std::size_t count = std::min(declared, (payload.size() - kStrcHeaderSize) / kStrcEntrySize);
  acid_.mSlicePositions.reserve(count);
  for (std::size_t i = 0; i < count; ++i) {
    const std::uint8_t* entry = payload.data() + kStrcHeaderSize + i * kStrcEntrySize;
    acid_.mSlicePositions.push_back(static_cast<std::int64_t>(le::Load64(entry + 24)));
  }
}

void WAVEReader::DetermineHeaderSize(std::int64_t dataLength, std::int64_t offset) {
  headerSize_ = offset;
  frames_ = dataLength / frameSize_;
  const std::int64_t room = std::max<std::int64_t>(fileLength_ - headerSize_, 0) / frameSize_;
  frames_ = std::min(frames_, room);
  blocksSwitch_ = !HeaderFitsWave64();
}

bool WAVEReader::HeaderFitsWave64() const {
  if (headerSize_ % 8 != 0) return false;
  auto& handler = GetWaveRIFFFormatHandler();
  std::int64_t end = 24 + 16;
  for (const auto& chunk : chunks_) {
    if (chunk.offset >= dataHeaderOffset_) break;
    if (IsJunk(chunk.tag)) continue;
    if (handler.UUIDForTag(chunk.tag, true).IsClear()) return false;
    end += 24 + WAVEWriter::PadDataLength(chunk.length, true);
  }
  const std::int64_t gap = headerSize_ - 24 - end;
  return gap == 0 || gap >= 24;
}

std::int64_t WAVEReader::TimeStampFromReference(std::int32_t low, std::int32_t high) noexcept {
  return static_cast<std::int64_t>(high) * 0x7FFFFFFF + low;
}

void WAVEReader::ReferenceFromTimeStamp(std::int64_t stamp, std::uint32_t& low,
                                        std::uint32_t& high) noexcept {
  stamp = std::max<std::int64_t>(stamp, 0);
  high = static_cast<std::uint32_t>(stamp / 0x7FFFFFFF);
  low = static_cast<std::uint32_t>(stamp % 0x7FFFFFFF);
}

bool WAVEReader::IsWave64() {
  ParseFile();
  return wave64_;
}

bool WAVEReader::CanSwitchToWave64() {
  ParseFile();
  return !wave64_ && !blocksSwitch_ &&
         headerSize_ >=
             WAVEWriter::GetHeaderSizeNeededForWave64Switch(recOffset_.has_value(), channels_);
}

std::int64_t WAVEReader::GetHeaderSize() {
  ParseFile();
  return headerSize_;
}

std::int64_t WAVEReader::GetOffsetToAudioHeader() {
  ParseFile();
  return dataHeaderOffset_;
}

std::int64_t WAVEReader::GetDataLength() {
  ParseFile();
  return dataLength_;
}

int WAVEReader::GetNumberOfChannels() {
  ParseFile();
  return channels_;
}

std::int64_t WAVEReader::GetNumberOfFrames() {
  ParseFile();
  return frames_;
}

double WAVEReader::GetSampleRate() {
  ParseFile();
  return sampleRate_;
}

int WAVEReader::GetSampleSize() {
  ParseFile();
  return sampleSize_;
}

int WAVEReader::GetSampleFrameSize() {
  ParseFile();
  return frameSize_;
}

SampleFormat WAVEReader::GetSampleFormat() {
  ParseFile();
  switch (sampleSize_) {
    case 1:
      return kSamp8Offset;
    case 2:
      return kSamp16;
    case 3:
      return kSamp24;
    case 4:
      return float_ ? kSampFloat32 : kSampUnpacked24;
    case 8:
      return float_ ? kSampWide64B : kSampWide64A;
    default:
      return NormalSampleFormatForSize(sampleSize_);
  }
}

bool WAVEReader::IsFloatingPoint() {
  ParseFile();
  return float_;
}

SurroundModel WAVEReader::GetSurroundModel() {
  ParseFile();
  return HostChannelOrder::GuessSurroundModel(channels_);
}

std::uint32_t WAVEReader::GetChannelMask() {
  ParseFile();
  return channelMask_;
}

std::uint16_t WAVEReader::GetFormatTag() {
  ParseFile();
  return formatTag_;
}

bool WAVEReader::HasBroadcastExtension() {
  ParseFile();
  return bext_.has_value();
}

const BWFBroadcastWaveExtension& WAVEReader::GetBroadcastExtension() {
  ParseFile();
  static const BWFBroadcastWaveExtension kNone;
  return bext_ ? *bext_ : kNone;
}

bool WAVEReader::HasComment() {
  ParseFile();
  return bext_ && !bext_->mDescription.empty();
}

UString WAVEReader::GetComment() {
  ParseFile();
  return bext_ ? UString(bext_->mDescription, UString::kSystemEncoding) : UString();
}

bool WAVEReader::HasTimeStamp() {
  ParseFile();
  return hasTimeStamp_;
}

std::int64_t WAVEReader::GetOriginalTimeStamp() {
  ParseFile();
  return hasTimeStamp_ ? timeStamp_ : 0;
}

bool WAVEReader::HasRecIndicator() {
  ParseFile();
  return recOffset_.has_value();
}

std::int64_t WAVEReader::GetOffsetToRecIndicator() {
  ParseFile();
  return recOffset_.value_or(0);
}

std::uint32_t WAVEReader::GetRecIndicatorValue() {
  ParseFile();
  return recValue_;
}

const WAVEReader::AcidInfo& WAVEReader::GetAcidInfo() {
  ParseFile();
  return acid_;
}

std::vector<std::uint8_t> WAVEReader::GetRawHeader() {
  ParseFile();
  CFileStream stream(spec_, WAVEWriter::kStreamBufferSize);
  stream.Open(kTCLReadMode);
  const std::int64_t count = std::min(headerSize_, stream.Size());
  std::vector<std::uint8_t> bytes(static_cast<std::size_t>(count));
  if (count > 0) stream.GetRawDataFromStream(bytes.data(), static_cast<int>(count));
  return bytes;
}

const std::vector<WAVEReader::ChunkLocation>& WAVEReader::GetChunks() {
  ParseFile();
  return chunks_;
}

std::int64_t WAVEReader::GetFileLength() {
  ParseFile();
  return fileLength_;
}

}  // namespace tarn
