#include "tarn/Audio/SoundFileFormats/AIFFReader.h"

#include <algorithm>
#include <array>

#include "tarn/Audio/SoundFileFormats/IEEEExtended.h"
#include "tarn/Audio/SoundFileFormats/WAVEWriter.h"
#include "tarn/Errors/Fail.h"
#include "tarn/Streams/CFileStream.h"

namespace tarn {
namespace {

constexpr int kStreamBufferSize = 4096;

std::uint32_t U32(const std::uint8_t* p) noexcept {
  return std::uint32_t{p[0]} << 24 | std::uint32_t{p[1]} << 16 | std::uint32_t{p[2]} << 8 | p[3];
}
std::int16_t S16(const std::uint8_t* p) noexcept {
  return static_cast<std::int16_t>(static_cast<std::uint16_t>(p[0] << 8 | p[1]));
}

// The channel-layout chunk ("CHAN"): layout tag, channel bitmap and a count
// of 20-byte channel descriptions (label, flags, three coordinates). Tags
// hold a layout number in the high 16 bits and the channel count in the low.
constexpr std::uint32_t kUseChannelDescriptions = 0;
constexpr std::uint32_t kUseChannelBitmap = 1u << 16;
constexpr int kLayoutHeaderSize = 12;
constexpr int kChannelDescriptionSize = 20;

// Labels 1..11 (left, right, centre, LFE, left and right surround, left and
// right of centre, centre surround, left and right surround direct) and the
// bitmap's bits 0..10 name the same positions as WAVE's mask bits 0..10.
ChannelLabel LabelFromLayoutLabel(std::uint32_t label) noexcept {
  if (label >= 1 && label <= 11) return static_cast<ChannelLabel>(label - 1);
  if (label == 42) return ChannelLabel::kCenter;  // mono
  return ChannelLabel::kDiscrete;
}

// The positions of the predefined layouts this library meets, as labels.
struct LayoutTag {
  std::uint32_t number;  // the tag's high 16 bits
  std::array<std::uint8_t, 8> labels;
};
constexpr LayoutTag kLayoutTags[] = {
    {100, {42}},                        // mono
    {101, {1, 2}},                      // stereo
    {102, {1, 2}},                      // stereo headphones
    {108, {1, 2, 5, 6}},                // quadraphonic
    {113, {1, 2, 3}},                   // 3.0 A
    {114, {3, 1, 2}},                   // 3.0 B
    {115, {1, 2, 3, 9}},                // 4.0 A
    {116, {3, 1, 2, 9}},                // 4.0 B
    {117, {1, 2, 3, 5, 6}},             // 5.0 A
    {118, {1, 2, 5, 6, 3}},             // 5.0 B
    {119, {1, 3, 2, 5, 6}},             // 5.0 C
    {120, {3, 1, 2, 5, 6}},             // 5.0 D
    {121, {1, 2, 3, 4, 5, 6}},          // 5.1 A
    {122, {1, 2, 5, 6, 3, 4}},          // 5.1 B
    {123, {1, 3, 2, 5, 6, 4}},          // 5.1 C
    {124, {3, 1, 2, 5, 6, 4}},          // 5.1 D
    {125, {1, 2, 3, 4, 5, 6, 9}},       // 6.1 A
    {126, {1, 2, 3, 4, 5, 6, 7, 8}},    // 7.1 A
    {127, {3, 7, 8, 1, 2, 5, 6, 4}},    // 7.1 B
    {128, {1, 2, 3, 4, 5, 6, 10, 11}},  // 7.1 C
};

}  // namespace

AIFFReader::AIFFReader(const FileSpecification& spec) : spec_(spec) {}
AIFFReader::~AIFFReader() = default;

void AIFFReader::Fail() const { FailFormatError("AIFFReader", 0, spec_); }

void AIFFReader::Parse() {
  if (!parsed_) {
    parsed_ = true;
    try {
      ParseFile();
    } catch (...) {
      error_ = std::current_exception();
    }
  }
  if (error_) std::rethrow_exception(error_);
}

bool AIFFReader::CanParse() noexcept {
  try {
    Parse();
    return true;
  } catch (...) {
    return false;
  }
}

RIFFType AIFFReader::ReadFormChunk() {
  if (fileLength_ < 12) Fail();
  std::uint8_t header[12];
  stream_->MoveTo(0);
  stream_->GetRawDataFromStream(header, 12);
  // The container's own size is never trusted: the walk goes by the file.
  if (U32(header) != kFORM) Fail();
  const RIFFType form = U32(header + 8);
  if (form != kAIFF && form != kAIFC) Fail();
  return form;
}

AIFFReader::Chunk AIFFReader::ReadChunkHeader() {
  std::uint8_t header[8];
  stream_->GetRawDataFromStream(header, 8);
  const std::int64_t size = U32(header + 4);
  return {U32(header), WAVEWriter::PadDataLength(size, false), size};
}

void AIFFReader::ReadCommonChunk(RIFFType formType, std::int64_t chunkSize) {
  const int need = formType == kAIFC ? kCommonSizeAIFC : kCommonSize;
  const std::int64_t at = stream_->Position();
  if (chunkSize < need || at + need > fileLength_) Fail();
  std::uint8_t comm[kCommonSizeAIFC];
  stream_->GetRawDataFromStream(comm, need);
  channels_ = S16(comm);
  frames_ = U32(comm + 2);
  bits_ = S16(comm + 6);
  rate_ = ieee_80_to_double(comm + 8);
  compression_ = formType == kAIFC ? U32(comm + 18) : kNONE;
  bytesPerSample_ = static_cast<std::int16_t>(bits_ / 8);
  lsbFirst_ = compression_ == kSowt;
  if (compression_ == kNONE) {
    switch (bytesPerSample_) {
      case 1:
        format_ = kSamp8;
        break;
      case 2:
        format_ = kSamp16;
        break;
      case 3:
        format_ = kSamp24;
        break;
      case 4:
        format_ = kSampUnpacked24;
        break;
      case 8:
        format_ = kSampWide64A;
        break;
      default:
        Fail();
    }
  } else if (compression_ == kIn32) {
    format_ = kSampUnpacked24;
  } else if (compression_ == kFl32 || compression_ == kFL32) {
    format_ = kSampFloat32;
  } else if (compression_ == kFl64 || compression_ == kFL64) {
    format_ = kSampWide64B;
  } else if (compression_ == kIn24) {
    format_ = kSamp24;
  } else if (compression_ == kSowt || compression_ == kTwos) {
    format_ = kSamp16;  // whatever the sample size
  } else {
    Fail();
  }
  order_ = HostChannelOrder::ForChannelCount(channels_);
}

std::int64_t AIFFReader::DetermineHeaderSize(std::int64_t chunkSize, bool verify) {
  stream_->MoveTo(ssndOffset_ + 8);
  std::uint8_t fields[8];  // offset, block size (not used)
  stream_->GetRawDataFromStream(fields, 8);
  const std::int64_t start = ssndOffset_ + 16;
  if (!verify) return start + U32(fields);
  const std::int64_t offset = static_cast<std::int32_t>(U32(fields));
  const std::int64_t frameSize = std::int64_t{channels_} * bytesPerSample_;
  const bool usable = bytesPerSample_ != 0 && channels_ != 0 && offset >= 0 &&
                      start + offset >= 0 && offset <= chunkSize - 8 &&
                      (chunkSize - 8 - offset) / frameSize >= std::int64_t{frames_};
  return usable ? start + offset : start;
}

void AIFFReader::ReadAppleLoopBasicChunk(std::int64_t chunkSize) {
  const std::int64_t at = stream_->Position();
  if (chunkSize < kBascSize || at + kBascSize > fileLength_) return;
  std::uint8_t basc[kBascSize];
  stream_->GetRawDataFromStream(basc, kBascSize);
  hasBasc_ = true;
  beats_ = static_cast<std::int32_t>(U32(basc + 4));
  const short root = S16(basc + 8);
  rootNote_ = root < 127 ? root : kDefaultRootNote;
  numerator_ = S16(basc + 12);
  denominator_ = S16(basc + 14);
  loopType_ = S16(basc + 16);
}

void AIFFReader::ReadChannelLayoutChunk(std::int64_t chunkSize) {
  const std::int64_t at = stream_->Position();
  const std::int64_t available = std::min(chunkSize, fileLength_ - at);
  if (available < kLayoutHeaderSize) return;
  std::uint8_t header[kLayoutHeaderSize];
  stream_->GetRawDataFromStream(header, kLayoutHeaderSize);
  const std::uint32_t tag = U32(header);
  const std::uint32_t bitmap = U32(header + 4);
  const std::uint32_t count = U32(header + 8);
  std::vector<ChannelLabel> labels;
  if (tag == kUseChannelDescriptions) {
    if (count > static_cast<std::uint64_t>(available - kLayoutHeaderSize) / kChannelDescriptionSize)
      return;
    for (std::uint32_t i = 0; i < count; ++i) {
      std::uint8_t description[kChannelDescriptionSize];
      stream_->GetRawDataFromStream(description, kChannelDescriptionSize);
      labels.push_back(LabelFromLayoutLabel(U32(description)));
    }
  } else if (tag == kUseChannelBitmap) {
    for (int bit = 0; bit < 32; ++bit) {
      if ((bitmap >> bit & 1) == 0) continue;
      labels.push_back(bit <= 10 ? static_cast<ChannelLabel>(bit) : ChannelLabel::kDiscrete);
    }
  } else {
    const std::uint32_t number = tag >> 16;
    const std::uint32_t channels = tag & 0xFFFF;
    const auto known = std::find_if(std::begin(kLayoutTags), std::end(kLayoutTags),
                                    [&](const LayoutTag& t) { return t.number == number; });
    if (known != std::end(kLayoutTags)) {
      for (std::uint32_t i = 0; i < channels && i < known->labels.size() && known->labels[i] != 0;
           ++i)
        labels.push_back(LabelFromLayoutLabel(known->labels[i]));
    } else {
      // Discrete, in order, or a layout this library has no positions for.
      labels.assign(channels, ChannelLabel::kDiscrete);
    }
  }
  layout_ = HostChannelOrder(std::move(labels), SurroundModel::kNone);
}

void AIFFReader::ParseFile() {
  CFileStream stream(spec_, kStreamBufferSize);
  stream.Open(kTCLReadMode);
  stream_ = &stream;
  struct Forget {
    CStream*& stream;
    ~Forget() { stream = nullptr; }
  } forget{stream_};
  fileLength_ = stream.Size();
  formType_ = ReadFormChunk();

  std::int64_t position = 12;
  while (position + 8 <= fileLength_) {
    stream.MoveTo(position);
    const Chunk chunk = ReadChunkHeader();
    const std::int64_t payload = position + 8;
    if (chunk.tag == kCOMM && commOffset_ < 0) {
      commOffset_ = position;
      ReadCommonChunk(formType_, chunk.rawSize);
    } else if (chunk.tag == kSSND && ssndOffset_ < 0) {
      ssndOffset_ = position;
      ssndSize_ = chunk.size;
    } else if (chunk.tag == kBasc && !hasBasc_) {
      ReadAppleLoopBasicChunk(chunk.rawSize);
    } else if (chunk.tag == kCHAN && !layout_) {
      ReadChannelLayoutChunk(chunk.rawSize);
    }
    position = payload + chunk.size;
  }
  if (commOffset_ < 0 || ssndOffset_ < 0 || ssndOffset_ + 16 > fileLength_) Fail();
  headerSize_ = DetermineHeaderSize(ssndSize_, true);
  if (layout_ && layout_->GetNumChannels() == channels_)
    order_ =
        HostChannelOrder(layout_->GetLabels(), HostChannelOrder::GuessSurroundModel(channels_));
  stream.Close();
}

std::int64_t AIFFReader::GetHeaderSize() {
  Parse();
  return headerSize_;
}
std::int16_t AIFFReader::GetNumberOfChannels() {
  Parse();
  return channels_;
}
std::int64_t AIFFReader::GetNumberOfFrames() {
  Parse();
  return frames_;
}
double AIFFReader::GetSampleRate() {
  Parse();
  return rate_;
}
std::int16_t AIFFReader::GetSampleSize() {
  Parse();
  return bytesPerSample_;
}
std::int16_t AIFFReader::GetSampleSizeInBits() {
  Parse();
  return bits_;
}
std::int32_t AIFFReader::GetSampleFrameSize() {
  Parse();
  return std::int32_t{channels_} * bytesPerSample_;
}
SampleFormat AIFFReader::GetSampleFormat() {
  Parse();
  return format_;
}
bool AIFFReader::GetSamplesAreLSBFirst() {
  Parse();
  return lsbFirst_;
}
SurroundModel AIFFReader::GetSurroundModel() {
  Parse();
  return order_.GetSurroundModel();
}
HostChannelOrder AIFFReader::GetChannelOrder() {
  Parse();
  return order_;
}
RIFFType AIFFReader::GetFormType() {
  Parse();
  return formType_;
}
RIFFType AIFFReader::GetCompressionType() {
  Parse();
  return compression_;
}
std::int64_t AIFFReader::GetOffsetToCommonChunk() {
  Parse();
  return commOffset_;
}
std::int64_t AIFFReader::GetOffsetToSoundChunk() {
  Parse();
  return ssndOffset_;
}

bool AIFFReader::GetMeterAndPitch(short& rootNote, short& numerator, short& denominator) {
  Parse();
  if (!hasBasc_) return false;
  rootNote = rootNote_;
  numerator = numerator_;
  denominator = denominator_;
  return true;
}

double AIFFReader::GetQuarterNoteTempoBPM() {
  Parse();
  if (!hasBasc_ || loopType_ != 1 || frames_ == 0 || beats_ <= 0) return 0.0;
  return rate_ / (static_cast<double>(frames_) / beats_) * 60.0;
}

void AIFFReader::GetRawHeader(std::vector<std::uint8_t>& header) {
  Parse();
  CFileStream stream(spec_, kStreamBufferSize);
  stream.Open(kTCLReadMode);
  const std::int64_t size = std::min(headerSize_, stream.Size());
  header.assign(static_cast<std::size_t>(size), 0);
  for (std::int64_t done = 0; done < size;) {
    const int step = static_cast<int>(std::min<std::int64_t>(size - done, 1 << 20));
    stream.GetRawDataFromStream(header.data() + done, step);
    done += step;
  }
  stream.Close();
}

SoundFileAttributes AIFFReader::GetAttributes() {
  Parse();
  SoundFileAttributes a;
  a.mFileType = formType_;
  a.mNumChannels = channels_;
  a.mSampleRate = rate_;
  a.mSampleFormat = format_;
  a.mBytesPerSample = bytesPerSample_;
  a.mBytesPerFrame = std::int32_t{channels_} * bytesPerSample_;
  a.mOffsetToAudio = static_cast<std::int32_t>(std::min<std::int64_t>(headerSize_, INT32_MAX));
  a.mSamplesAreLSBFirst = lsbFirst_;
  return a;
}

}  // namespace tarn
