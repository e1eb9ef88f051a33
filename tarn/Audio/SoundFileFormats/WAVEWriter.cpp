#include "tarn/Audio/SoundFileFormats/WAVEWriter.h"

#include <algorithm>
#include <limits>

#include "tarn/Audio/SoundFileFormats/HostChannelOrder.h"
#include "tarn/Audio/SoundFileFormats/LittleEndianBytesImpl.h"
#include "tarn/Audio/SoundFileFormats/RIFFFormatHandlers.h"
#include "tarn/FileSystem/File.h"
#include "tarn/Streams/CFileStream.h"

namespace tarn {

namespace le = LittleEndianBytes;

namespace {

constexpr RIFFType kRIFFTag = MakeRIFFType("RIFF");
constexpr RIFFType kWAVETag = MakeRIFFType("WAVE");
constexpr RIFFType kFormatTag = MakeRIFFType("fmt ");
constexpr RIFFType kBextTag = MakeRIFFType("bext");
constexpr RIFFType kRecTag = MakeRIFFType("Rec!");
constexpr RIFFType kJunkTag = MakeRIFFType("JUNK");
constexpr RIFFType kDataTag = MakeRIFFType("data");

// The published extensible subformats: the format tag in the first two
// bytes, then the fixed tail 00000000-0010-8000-00AA00389B71 in the GUID's
// little-endian field order.
std::array<std::uint8_t, 16> SubformatGUID(std::uint16_t tag) {
  return {static_cast<std::uint8_t>(tag),
          static_cast<std::uint8_t>(tag >> 8),
          0x00,
          0x00,
          0x00,
          0x00,
          0x10,
          0x00,
          0x80,
          0x00,
          0x00,
          0xAA,
          0x00,
          0x38,
          0x9B,
          0x71};
}

bool IsFloatFormat(std::uint32_t sampleFormat) {
  return sampleFormat == kSampFloat32 || sampleFormat == kSampWide64A ||
         sampleFormat == kSampWide64B;
}

std::uint32_t Clamp32(std::int64_t value) {
  return static_cast<std::uint32_t>(
      std::clamp<std::int64_t>(value, 0, std::numeric_limits<std::uint32_t>::max()));
}

void Append(std::vector<std::uint8_t>& out, const std::vector<std::uint8_t>& bytes) {
  out.insert(out.end(), bytes.begin(), bytes.end());
}

}  // namespace

WAVEWriter::WAVEWriter(const FileSpecification& spec, double sampleRate,
                       std::int16_t bytesPerSample, std::int16_t numChannels,
                       std::int64_t numFrames, std::int16_t bytesPerFrame,
                       std::uint32_t sampleFormat, bool recIndicator, bool wave64)
    : sampleRate_(sampleRate),
      bytesPerSample_(bytesPerSample),
      numChannels_(numChannels),
      numFrames_(numFrames),
      bytesPerFrame_(bytesPerFrame),
      sampleFormat_(sampleFormat),
      recIndicator_(recIndicator),
      wave64_(wave64) {
  if (!spec.Exists())
    (void)File::CreateOnDisk(spec, wave64 ? FileTypeClass(".W64") : FileTypeClass("WAVE"), 0);
  stream_ = std::make_unique<CFileStream>(spec, kStreamBufferSize);
  stream_->Open(kTCLReadWriteMode);
}

WAVEWriter::~WAVEWriter() {
  try {
    stream_->Close();
  } catch (...) {  // NOLINT(bugprone-empty-catch): see the header
  }
}

void WAVEWriter::Close() { stream_->Close(); }

std::vector<std::uint8_t> WAVEWriter::MakeChunkHeader(RIFFType tag, std::uint64_t length,
                                                      bool wave64) {
  std::vector<std::uint8_t> out(static_cast<std::size_t>(GetChunkHeaderSize(wave64)));
  if (wave64) {
    const UUIDObj id = GetWaveRIFFFormatHandler().UUIDForTag(tag, true);
    std::copy(id.GetBytes().begin(), id.GetBytes().end(), out.begin());
    le::Store64(out.data() + 16, length + 24);
  } else {
    for (int i = 0; i < 4; ++i) out[i] = static_cast<std::uint8_t>(tag >> (24 - 8 * i));
    le::Store32(out.data() + 4, static_cast<std::uint32_t>(length));
  }
  return out;
}

std::vector<std::uint8_t> WAVEWriter::MakeFormatChunkPayload(double sampleRate,
                                                             std::int16_t bytesPerSample,
                                                             std::int16_t numChannels,
                                                             std::int16_t bytesPerFrame,
                                                             std::uint32_t sampleFormat) {
  std::vector<std::uint8_t> out(static_cast<std::size_t>(GetFormatPayloadSize(numChannels)));
  std::uint8_t* p = out.data();
  const bool floating = bytesPerSample == 4 || bytesPerSample == 8;
  const std::uint16_t tag = numChannels > 2 ? kFormatTagExtensible
                            : floating      ? kFormatTagFloat
                                            : kFormatTagPCM;
  const int channels = std::max<int>(numChannels, 1);
  const auto bits = static_cast<std::uint16_t>(8 * (bytesPerFrame / channels));
  le::Store16(p, tag);
  le::Store16(p + 2, static_cast<std::uint16_t>(numChannels));
  le::Store32(p + 4, static_cast<std::uint32_t>(sampleRate));
  const float bitRate = static_cast<float>(bits) * static_cast<float>(sampleRate);
  le::Store32(p + 8,
              static_cast<std::uint32_t>(bitRate * static_cast<float>(numChannels) * 0.125f));
  le::Store16(p + 12, static_cast<std::uint16_t>(bytesPerSample * numChannels));
  le::Store16(p + 14, bits);
  if (tag == kFormatTagExtensible) {
    le::Store16(p + 16, 22);
    le::Store16(p + 18, bits);
    le::Store32(p + 20, HostChannelOrder::ForChannelCount(numChannels).GetChannelMask());
    const auto guid = SubformatGUID(IsFloatFormat(sampleFormat) ? kFormatTagFloat : kFormatTagPCM);
    std::copy(guid.begin(), guid.end(), p + 24);
  }
  return out;
}

std::int64_t WAVEWriter::GetOffsetToSoundDataHeader() const noexcept {
  if (dataHeaderOffset_) return *dataHeaderOffset_;
  return ComputeStandardOffsetToSoundDataHeader(recIndicator_, wave64_, true, numChannels_);
}

std::int64_t WAVEWriter::GetOffsetToAudio() const noexcept {
  return GetOffsetToSoundDataHeader() + GetChunkHeaderSize(wave64_);
}

std::int64_t WAVEWriter::ComputeFileSize() const noexcept {
  return GetOffsetToAudio() + DataLength();
}

void WAVEWriter::WriteHeader(std::uint32_t recIndicatorValue, std::int64_t numFrames) {
  numFrames_ = numFrames;
  std::vector<std::uint8_t> header;
  if (wave64_) {
    Append(header,
           MakeChunkHeader(kRIFFTag, static_cast<std::uint64_t>(ComputeFileSize()) - 24, true));
    const UUIDObj wave = GetWaveRIFFFormatHandler().UUIDForTag(kWAVETag, true);
    header.insert(header.end(), wave.GetBytes().begin(), wave.GetBytes().end());
  } else {
    Append(header, MakeChunkHeader(kRIFFTag, Clamp32(ComputeFileSize() - 8), false));
    header.insert(header.end(), {'W', 'A', 'V', 'E'});
  }
  const auto format = MakeFormatChunkPayload(sampleRate_, bytesPerSample_, numChannels_,
                                             bytesPerFrame_, sampleFormat_);
  Append(header, MakeChunkHeader(kFormatTag, format.size(), wave64_));
  Append(header, format);

  if (!bext_) {
    SoundFileAttributes attributes;
    attributes.mNumChannels = numChannels_;
    attributes.mSampleRate = sampleRate_;
    attributes.mSampleFormat = static_cast<SampleFormat>(sampleFormat_);
    attributes.mBytesPerSample = bytesPerSample_;
    attributes.mBytesPerFrame = bytesPerFrame_;
    bext_ = BWFBroadcastWaveExtension::ForNewRecording(attributes);
  }
  auto bext = bext_->Flatten();
  bext.resize(BWFBroadcastWaveExtension::BroadcastWaveExtensionDefaultChunkSize);
  Append(header, MakeChunkHeader(kBextTag, bext.size(), wave64_));
  Append(header, bext);
  header.resize(
      static_cast<std::size_t>(PadDataLength(static_cast<std::int64_t>(header.size()), wave64_)));

  if (recIndicator_) {
    Append(header, MakeChunkHeader(kRecTag, kRecIndicatorPayloadSize, wave64_));
    for (int i = 0; i < (wave64_ ? 2 : 1); ++i) {
      header.resize(header.size() + 4);
      le::Store32(header.data() + header.size() - 4, recIndicatorValue);
    }
  }
  if (!wave64_) {
    const std::int64_t junk = ComputeWave64ReserveJunkLength(recIndicator_, numChannels_);
    Append(header, MakeChunkHeader(kJunkTag, static_cast<std::uint64_t>(junk), false));
    header.resize(header.size() + static_cast<std::size_t>(junk));
  }
  Put(0, header);
  WriteSoundDataHeader(static_cast<std::int64_t>(header.size()));
}

void WAVEWriter::UpdateDataLength(std::int64_t numFrames) {
  numFrames_ = numFrames;
  const std::int64_t end = std::max(ComputeFileSize(), stream_->Size());
  if (wave64_) {
    Put(0, MakeChunkHeader(kRIFFTag, static_cast<std::uint64_t>(end) - 24, true));
  } else {
    Put(0, MakeChunkHeader(kRIFFTag, Clamp32(end - 8), false));
  }
  WriteSoundDataHeader(GetOffsetToSoundDataHeader());
}

void WAVEWriter::MaybePadChunk() {
  if (!wave64_) PadTo(ComputeFileSize());
}

void WAVEWriter::MaybePadTrailingChunk() { PadTo(stream_->Size()); }

void WAVEWriter::WriteJunkChunk(std::int64_t offset, std::int64_t length) {
  Put(offset, MakeChunkHeader(kJunkTag, static_cast<std::uint64_t>(length), wave64_));
  PutZeros(offset + GetChunkHeaderSize(wave64_), PadDataLength(length, wave64_));
}

void WAVEWriter::WriteRecordingIndicatorChunk(std::int64_t offset, std::uint32_t value) {
  auto chunk = MakeChunkHeader(kRecTag, kRecIndicatorPayloadSize, wave64_);
  for (int i = 0; i < (wave64_ ? 2 : 1); ++i) {
    chunk.resize(chunk.size() + 4);
    le::Store32(chunk.data() + chunk.size() - 4, value);
  }
  Put(offset, chunk);
}

void WAVEWriter::WriteSoundDataHeader(std::int64_t offset) {
  const std::int64_t length = DataLength();
  Put(offset,
      MakeChunkHeader(kDataTag, wave64_ ? static_cast<std::uint64_t>(length) : Clamp32(length),
                      wave64_));
}

void WAVEWriter::Put(std::int64_t offset, const std::vector<std::uint8_t>& bytes) {
  stream_->MoveTo(offset);
  stream_->PutRawDataToStream(bytes.data(), static_cast<int>(bytes.size()));
}

void WAVEWriter::PutZeros(std::int64_t offset, std::int64_t count) {
  static constexpr std::uint8_t kZeros[kStreamBufferSize] = {};
  stream_->MoveTo(offset);
  while (count > 0) {
    const int n = static_cast<int>(std::min<std::int64_t>(count, kStreamBufferSize));
    stream_->PutRawDataToStream(kZeros, n);
    count -= n;
  }
}

void WAVEWriter::PadTo(std::int64_t end) {
  const std::int64_t padded = PadDataLength(end, wave64_);
  if (padded > end) PutZeros(end, padded - end);
}

}  // namespace tarn
