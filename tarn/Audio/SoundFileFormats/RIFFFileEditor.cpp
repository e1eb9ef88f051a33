#include "tarn/Audio/SoundFileFormats/RIFFFileEditor.h"

#include <algorithm>
#include <array>
#include <limits>
#include <mutex>

#include "tarn/Audio/SoundFileFormats/WAVEWriter.h"
#include "tarn/Errors/Fail.h"

namespace tarn {
namespace {

constexpr RIFFType kSoundTag = MakeRIFFType("SSND");
constexpr RIFFType kDataTag = MakeRIFFType("data");
constexpr int kMoveBlockSize = 4096;

// Sizes above this are taken as "larger than any file": it keeps every sum
// of a position and a length far from overflow.
constexpr std::int64_t kHugeLength = std::int64_t{1} << 62;

// The metadata tag <-> resource number table, searched from the top.
constexpr std::array<std::pair<RIFFType, std::uint32_t>, 32> kTagIDTable{{
    {MakeRIFFType("qzma"), 1001},
    {MakeRIFFType("qzsa"), 1002},
    {MakeRIFFType("qzmc"), 1003},
    {MakeRIFFType("qzam"), 1004},
    {MakeRIFFType("qzas"), 1005},
    {MakeRIFFType("qzac"), 1006},
    {MakeRIFFType("qzwe"), 1020},
    {MakeRIFFType("qzw1"), 1023},
    {MakeRIFFType("qzbt"), 1024},
    {MakeRIFFType("qzcu"), 1050},
    {MakeRIFFType("qzmu"), 1051},
    {MakeRIFFType("qzuc"), 1052},
    {MakeRIFFType("qzmc"), 1053},
    {MakeRIFFType("qzrn"), MakeRIFFType("ddRL")},
    {MakeRIFFType("qzte"), MakeRIFFType("QZtd")},
    {MakeRIFFType("bext"), MakeRIFFType("bext")},
    {MakeRIFFType("levl"), MakeRIFFType("levl")},
    {MakeRIFFType("qzod"), MakeRIFFType("qzod")},
    {MakeRIFFType("Rec!"), MakeRIFFType("Rec!")},
    {MakeRIFFType("MLo1"), 1022},
    {MakeRIFFType("qzdt"), 1025},
    {MakeRIFFType("MLo2"), 1026},
    {MakeRIFFType("SmpI"), MakeRIFFType("SmpI")},
    {MakeRIFFType("ddOV"), MakeRIFFType("ddOV")},
    {MakeRIFFType("ANNO"), 1021},
    {MakeRIFFType("Dscr"), MakeRIFFType("Dscr")},
    {MakeRIFFType("AUTH"), MakeRIFFType("AUTH")},
    {MakeRIFFType("(c) "), MakeRIFFType("(c) ")},
    {MakeRIFFType("ACdI"), MakeRIFFType("ACdI")},
    {MakeRIFFType("basc"), MakeRIFFType("basc")},
    {MakeRIFFType("acid"), MakeRIFFType("acid")},
    {MakeRIFFType("regn"), MakeRIFFType("regn")},
}};

}  // namespace

// Raises the stream to the access an operation needs and gives it back its
// earlier access afterwards. Restore() reports a failed final write; the
// destructor restores quietly on the way out of a failed operation. A stream
// that was opened for writing alone is brought back read-write, never
// reopened with "wb", which would empty the file.
class RIFFFileEditor::Access {
 public:
  Access(CFileStream& stream, TCLStreamMode need) : stream_(stream), earlier_(stream.GetMode()) {
    if (earlier_ == need || earlier_ == kTCLReadWriteMode) return;
    stream_.Close();
    changed_ = true;
    stream_.Open(need);
  }
  Access(const Access&) = delete;
  Access& operator=(const Access&) = delete;
  ~Access() {
    try {
      Restore();
    } catch (const TarnError&) {
      // The operation is already failing with its own error.
    }
  }

  void Restore() {
    if (!changed_) return;
    changed_ = false;
    stream_.Close();
    if (earlier_ != kTCLClosedMode)
      stream_.Open(earlier_ == kTCLWriteMode ? kTCLReadWriteMode : earlier_);
  }

 private:
  CFileStream& stream_;
  TCLStreamMode earlier_;
  bool changed_ = false;
};

RIFFFileEditor::RIFFFileEditor(const FileSpecification& spec, RIFFFileEndian endian,
                               FormatHandler& handler)
    : RIFFFileEditor(std::make_unique<CFileStream>(spec, kStreamBufferSize), endian, handler) {}

RIFFFileEditor::RIFFFileEditor(std::unique_ptr<CFileStream> stream, RIFFFileEndian endian,
                               FormatHandler& handler)
    : stream_(std::move(stream)), endian_(endian), handler_(handler) {
  FailNIL(stream_.get());
}

RIFFFileEditor::~RIFFFileEditor() = default;

void RIFFFileEditor::Reset(const FileSpecification& spec) {
  std::lock_guard hold(lock_);
  chunks_.clear();
  stream_ = std::make_unique<CFileStream>(spec, kStreamBufferSize);
  wave64_ = audioRunsToEnd_ = listed_ = false;
}

// ---------------------------------------------------------------- reading

RIFFType RIFFFileEditor::ReadRIFFType(UUIDObj& uuid) {
  if (wave64_) {
    TarnCOM::UUIDBytes bytes;
    stream_->GetRawDataFromStream(bytes.bytes, 16);
    uuid = UUIDObj(bytes);
    return handler_.TagForUUID(uuid);
  }
  std::uint8_t bytes[4];
  stream_->GetRawDataFromStream(bytes, 4);
  uuid = UUIDObj();
  return RIFFTypeFromChars(reinterpret_cast<const char*>(bytes));
}

std::uint64_t RIFFFileEditor::ReadLength() {
  std::uint8_t b[8];
  const int size = wave64_ ? 8 : 4;
  stream_->GetRawDataFromStream(b, size);
  std::uint64_t value = 0;
  for (int i = 0; i < size; ++i) {
    const int byte = endian_ == kRIFFBigEndian ? i : size - 1 - i;
    value = value << 8 | b[byte];
  }
  return value;
}

RIFFFileEditor::ChunkHeader RIFFFileEditor::ReadChunkHeader() {
  ChunkHeader header;
  header.tag = ReadRIFFType(header.uuid);
  std::uint64_t length = ReadLength();
  if (wave64_) {
    // A Wave64 size counts its own header; less than that is no chunk.
    if (length < 24) Failure(kParamErr);
    length -= 24;
  }
  header.length = static_cast<std::int64_t>(std::min<std::uint64_t>(length, kHugeLength));
  header.padded = WAVEWriter::PadDataLength(header.length, wave64_);
  return header;
}

RIFFType RIFFFileEditor::ReadRIFFChunk() {
  const std::int64_t start = stream_->Position();
  try {
    std::uint8_t first[4];
    stream_->GetRawDataFromStream(first, 4);
    if (!handler_.IsContainerID(RIFFTypeFromChars(reinterpret_cast<const char*>(first))))
      FailFormatError("RIFFFileEditor", kNotAChunkFile, stream_->GetSpecification());
    wave64_ = false;
    if (handler_.SupportsWave64() && stream_->Size() - start >= 16) {
      stream_->MoveTo(start);
      TarnCOM::UUIDBytes bytes;
      stream_->GetRawDataFromStream(bytes.bytes, 16);
      wave64_ = handler_.IsWave64Container(UUIDObj(bytes));
    }
    if (!wave64_) stream_->MoveTo(start + 4);
    (void)ReadLength();  // the container's own size is never trusted
    UUIDObj formID;
    const RIFFType form = ReadRIFFType(formID);
    if (!handler_.IsFormType(form))
      FailFormatError("RIFFFileEditor", kNotAChunkFile, stream_->GetSpecification());
    return form;
  } catch (const TarnError& e) {
    // A file too short for its container header is not a chunk file either.
    if (e.GetIntErrorCode() != kEOFErr) throw;
    FailFormatError("RIFFFileEditor", kNotAChunkFile, stream_->GetSpecification());
  }
}

void RIFFFileEditor::ReadChunkLocations(StopParsingTester* tester) {
  ForgetListing();
  ReadChunkLocationsExt(chunks_, tester);
  listed_ = true;
}

void RIFFFileEditor::ForgetListing() noexcept {
  chunks_.clear();
  audioRunsToEnd_ = listed_ = false;
}

void RIFFFileEditor::ReadChunkLocationsExt(ChunkList& list, StopParsingTester* tester) {
  Access access(*stream_, kTCLReadMode);
  stream_->MoveTo(0);
  (void)ReadRIFFChunk();
  const std::int64_t fileLength = stream_->Size();
  // Only the container's first audio chunk holds the audio; a later one of
  // that tag, or the other container's audio tag, is metadata like any other.
  const RIFFType audioTag = endian_ == kRIFFBigEndian ? kSoundTag : kDataTag;
  bool audioListed = false;
  try {
    for (;;) {
      const std::int64_t headerStart = stream_->Position();
      const ChunkHeader header = ReadChunkHeader();
      const std::int64_t payloadStart = stream_->Position();
      const bool isAudio = !audioListed && header.tag == audioTag;
      audioListed = audioListed || isAudio;
      std::int64_t length = header.padded;
      if (length > fileLength) {
        if (!isAudio) break;  // a lying metadata size ends the walk
        audioRunsToEnd_ = true;
        length = fileLength - payloadStart;
      }
      if (length == 0 && isAudio && header.tag == kSoundTag && payloadStart < fileLength) {
        // An "SSND" payload is never empty (it starts with its offset and
        // block size): size 0 is a recording whose size was never written.
        audioRunsToEnd_ = true;
        length = fileLength - payloadStart;
      }
      list.emplace_back(ChunkInfo{header.tag, header.uuid, headerStart, length}, kKeepSegment);
      if (header.tag == kNullTag || (tester != nullptr && tester->ShouldStop(header.tag)) ||
          payloadStart + length >= fileLength)
        break;
      stream_->MoveTo(payloadStart + length);
    }
  } catch (const TarnError&) {
    // A damaged or truncated header ends the listing; what was listed stays.
  }
  access.Restore();
}

void RIFFFileEditor::EnsureListed() {
  if (!listed_) ReadChunkLocations(nullptr);
}

RIFFFileEditor::ChunkList::const_iterator RIFFFileEditor::FindChunk(RIFFType tag) const {
  return std::find_if(chunks_.begin(), chunks_.end(),
                      [tag](const auto& entry) { return entry.first.tag == tag; });
}

bool RIFFFileEditor::HasChunk(RIFFType tag) const { return FindChunk(tag) != chunks_.end(); }

std::int64_t RIFFFileEditor::GetOffsetToChunkStart(RIFFType tag) const {
  const auto found = FindChunk(tag);
  if (found == chunks_.end())
    FailFormatError("RIFFFileEditor", kChunkNotFound, stream_->GetSpecification());
  return found->first.offset;
}

RCBlobMT RIFFFileEditor::ReadChunkData(RIFFType tag) {
  UUIDObj uuid;
  return ReadChunkData(tag, uuid);
}

RCBlobMT RIFFFileEditor::ReadChunkData(RIFFType tag, UUIDObj& uuid) {
  std::lock_guard hold(lock_);
  return ReadChunkDataInternal(tag, uuid);
}

RCBlobMT RIFFFileEditor::ReadChunkDataInternal(RIFFType tag, UUIDObj& uuid) {
  const auto found = FindChunk(tag);
  if (found == chunks_.end()) {
    uuid = handler_.UUIDForTag(tag, false);
    return RCBlobMT();
  }
  Access access(*stream_, kTCLReadMode);
  stream_->MoveTo(found->first.offset);
  const ChunkHeader header = ReadChunkHeader();
  // Never more than the listing found room for, nor past the end of the file.
  std::int64_t length = std::min(header.length, found->first.length);
  length = std::min(length, stream_->Size() - stream_->Position());
  if (length <= 0) {
    uuid = handler_.UUIDForTag(tag, false);
    return RCBlobMT();
  }
  if (length > static_cast<std::int64_t>(RCBlobMT::kMaxSize)) Failure(kParamErr);
  RCBlobMT blob(static_cast<std::size_t>(length));
  stream_->GetRawDataFromStream(blob.GetPtr(), blob.GetSize());
  uuid = header.uuid;
  access.Restore();
  return blob;
}

// ---------------------------------------------------------------- writing

void RIFFFileEditor::WriteRIFFType(RIFFType tag, const UUIDObj& uuid) {
  if (wave64_) {
    stream_->PutRawDataToStream(uuid.GetBytes().data(), 16);
    return;
  }
  const std::uint8_t bytes[4] = {
      static_cast<std::uint8_t>(tag >> 24), static_cast<std::uint8_t>(tag >> 16),
      static_cast<std::uint8_t>(tag >> 8), static_cast<std::uint8_t>(tag)};
  stream_->PutRawDataToStream(bytes, 4);
}

void RIFFFileEditor::WriteLength(std::int64_t length) {
  std::uint8_t b[8];
  int size = 8;
  std::uint64_t value = static_cast<std::uint64_t>(length) + 24;
  if (!wave64_) {
    // A classic size field holds 32 bits; larger files carry the largest.
    size = 4;
    value = static_cast<std::uint64_t>(std::min<std::int64_t>(length, 0xFFFFFFFF));
  }
  for (int i = 0; i < size; ++i) {
    const int byte = endian_ == kRIFFBigEndian ? size - 1 - i : i;
    b[byte] = static_cast<std::uint8_t>(value >> (8 * i));
  }
  stream_->PutRawDataToStream(b, size);
}

std::int64_t RIFFFileEditor::WriteSegment(const ChunkData& chunk, const UUIDObj& uuid) {
  WriteRIFFType(chunk.tag, uuid);
  const std::int64_t size = chunk.data.GetSize();
  WriteLength(size);
  if (size > 0) {
    stream_->PutRawDataToStream(chunk.data.GetPtr(), chunk.data.GetSize());
    static constexpr std::uint8_t kZeros[8] = {};
    const auto pad = static_cast<int>(WAVEWriter::PadDataLength(size, wave64_) - size);
    if (pad > 0) stream_->PutRawDataToStream(kZeros, pad);
  }
  return stream_->Position();
}

void RIFFFileEditor::DetermineSegmentActions(const ChunkData* chunk, RIFFType audioTag) {
  const std::int64_t newLength =
      chunk ? WAVEWriter::PadDataLength(chunk->data.GetSize(), wave64_) : 0;
  bool seenAudio = false;
  for (auto& [info, action] : chunks_) {
    if (action != kJunkSegment) action = kKeepSegment;
    if (info.tag == audioTag && !seenAudio) {
      seenAudio = true;
      if (audioRunsToEnd_) action = kFixAudioHeader;
    } else if (chunk && info.tag == chunk->tag) {
      if (newLength == info.length)
        action = kOverwriteSegment;
      else
        action = seenAudio ? kRemoveSegment : kJunkSegment;
    } else if (action == kJunkSegment && seenAudio) {
      action = kRemoveSegment;
    }
  }
}

void RIFFFileEditor::JunkThisSegment(ChunkInfo& info) {
  stream_->MoveTo(info.offset);
  info.tag = kJunkTag;
  info.uuid = MaybeTranslateRiffType(kJunkTag);
  WriteRIFFType(info.tag, info.uuid);
}

void RIFFFileEditor::OverwriteThisSegment(ChunkInfo& info, const ChunkData& chunk,
                                          const UUIDObj& uuid) {
  stream_->MoveTo(info.offset);
  (void)WriteSegment(chunk, uuid);
  info.tag = chunk.tag;
  info.uuid = wave64_ ? uuid : UUIDObj();
}

void RIFFFileEditor::MoveThisSegmentBack(ChunkInfo& info, std::int64_t shift) {
  struct alignas(kMoveBlockSize) Block {
    std::uint8_t bytes[kMoveBlockSize];
  };
  const auto block = std::make_unique<Block>();
  const std::int64_t total = GetRiffHeaderSize() + info.length;
  // The destination lies before the source, so copying upwards never
  // overwrites bytes still to be copied.
  for (std::int64_t i = 0; i < total; i += kMoveBlockSize) {
    const int count = static_cast<int>(std::min<std::int64_t>(kMoveBlockSize, total - i));
    stream_->MoveTo(info.offset + i);
    stream_->GetRawDataFromStream(block->bytes, count);
    stream_->MoveTo(info.offset - shift + i);
    stream_->PutRawDataToStream(block->bytes, count);
  }
  info.offset -= shift;
}

void RIFFFileEditor::RemoveOverwrittenChunks() {
  std::erase_if(chunks_, [](const auto& entry) { return entry.second == kRemoveSegment; });
}

void RIFFFileEditor::AddChunkData(const ChunkData& chunk, RIFFType audioTag) {
  std::lock_guard hold(lock_);
  if (chunk.tag == kNullTag) Failure(kParamErr);
  // An empty "SSND" chunk reads as a recording that runs to the end of the
  // file: every chunk after it would be taken for audio.
  if (endian_ == kRIFFBigEndian && chunk.tag == kSoundTag && chunk.data.GetSize() == 0)
    Failure(kParamErr);
  EnsureListed();
  const UUIDObj uuid =
      !wave64_ || !chunk.uuid.IsClear() ? chunk.uuid : MaybeTranslateRiffType(chunk.tag);
  if (wave64_) {
    // Nothing is written before every identifier the edit needs is known.
    if (uuid.IsClear() || MaybeTranslateRiffType(kJunkTag).IsClear()) Failure(kParamErr);
    ConfirmUUIDMap();
  }
  ApplySegmentActions(&chunk, uuid, audioTag);
}

void RIFFFileEditor::JunkChunk(RIFFType tag, RIFFType audioTag) {
  std::lock_guard hold(lock_);
  EnsureListed();
  if (FindChunk(tag) == chunks_.end())
    FailFormatError("RIFFFileEditor", kChunkNotFound, stream_->GetSpecification());
  if (wave64_) {
    if (MaybeTranslateRiffType(kJunkTag).IsClear()) Failure(kParamErr);
    ConfirmUUIDMap();
  }
  MaybeJunkSegment(tag);
  ApplySegmentActions(nullptr, UUIDObj(), audioTag);
}

void RIFFFileEditor::ApplySegmentActions(const ChunkData* chunk, const UUIDObj& uuid,
                                         RIFFType audioTag) {
  DetermineSegmentActions(chunk, audioTag);
  try {
    WriteSegmentActions(chunk, uuid);
  } catch (...) {
    // Chunks may have moved before the failure: the list no longer tells
    // where they are, so the next edit lists the file again.
    ForgetListing();
    throw;
  }
}

void RIFFFileEditor::WriteSegmentActions(const ChunkData* chunk, const UUIDObj& uuid) {
  Access access(*stream_, kTCLReadWriteMode);

  const int headerSize = GetRiffHeaderSize();
  if (!chunks_.empty()) {
    // A truncated last chunk (its size passes the end of the file, though by
    // less than the whole file's length) could be neither moved nor
    // appended to: refuse before anything is written.
    const ChunkInfo& last = chunks_.back().first;
    if (last.tag != kNullTag && last.offset + headerSize + last.length >
                                    WAVEWriter::PadDataLength(stream_->Size(), wave64_))
      FailFormatError("RIFFFileEditor", kChunkPastEndOfFile, stream_->GetSpecification());
  }
  std::int64_t shift = 0;
  std::int64_t end = GetIDSize() + (wave64_ ? 8 : 4) + WAVEWriter::GetRIFFChunkExtraSize(wave64_);
  bool written = false;
  bool removed = false;
  for (auto& [info, action] : chunks_) {
    switch (action) {
      case kJunkSegment:
        JunkThisSegment(info);
        break;
      case kOverwriteSegment:
        // Behind a cut chunk the new bytes go where this one moves to.
        info.offset -= shift;
        OverwriteThisSegment(info, *chunk, uuid);
        written = true;
        break;
      case kRemoveSegment:
        shift += headerSize + info.length;
        removed = true;
        continue;  // a cut chunk ends nothing: the end stays where it was
      case kFixAudioHeader:
        stream_->MoveTo(info.offset);
        WriteRIFFType(info.tag, info.uuid);
        WriteLength(info.length);
        // From now on the chunk is whole; the next edit appends after it
        // and restores its pad bytes.
        info.length = WAVEWriter::PadDataLength(info.length, wave64_);
        audioRunsToEnd_ = false;
        written = true;
        break;
      case kKeepSegment:
        if (shift > 0) MoveThisSegmentBack(info, shift);
        break;
    }
    // A null entry is zero fill, not a chunk: the new chunk goes over it.
    end = info.tag == kNullTag ? info.offset : info.offset + headerSize + info.length;
  }

  if ((written || !chunk) && removed) {
    // Chunks moved back over a cut one: the file ends where the last kept
    // chunk now ends, and the container says so.
    stream_->MoveTo(GetIDSize());
    WriteLength(end - headerSize);
    stream_->Truncate(end);
  } else if (!written && chunk) {
    end = CompleteEmptySoundChunk(end);
    const std::int64_t fileLength = stream_->Size();
    const std::int64_t paddedLength = WAVEWriter::PadDataLength(fileLength, wave64_);
    if (end > fileLength && paddedLength > fileLength && paddedLength >= end) {
      // The last chunk lacks its final pad bytes: restore them.
      static constexpr std::uint8_t kZeros[8] = {};
      stream_->MoveTo(fileLength);
      stream_->PutRawDataToStream(kZeros, static_cast<int>(paddedLength - fileLength));
    }
    stream_->MoveTo(end);
    const std::int64_t newEnd = WriteSegment(*chunk, uuid);
    stream_->MoveTo(GetIDSize());
    WriteLength(newEnd - headerSize);
    stream_->Truncate(newEnd);
    // The new chunk took the place of any zero fill listed last.
    if (!chunks_.empty() && chunks_.back().first.tag == kNullTag) chunks_.pop_back();
    chunks_.emplace_back(
        ChunkInfo{chunk->tag, wave64_ ? uuid : UUIDObj(), end, newEnd - end - headerSize},
        kKeepSegment);
  }
  if (removed) RemoveOverwrittenChunks();
  access.Restore();
}

std::int64_t RIFFFileEditor::CompleteEmptySoundChunk(std::int64_t end) {
  if (endian_ != kRIFFBigEndian || chunks_.empty()) return end;
  ChunkInfo& last = chunks_.back().first;
  if (FindChunk(kSoundTag) != std::prev(chunks_.end()) || last.length != 0) return end;
  // An "SSND" payload starts with its offset and block size; of size 0, with
  // chunks after it, the audio chunk would list as a recording that runs to
  // the end of the file, over them. Written past the end of the file.
  static constexpr std::uint8_t kEmptySound[8] = {};
  stream_->MoveTo(end);
  stream_->PutRawDataToStream(kEmptySound, sizeof kEmptySound);
  last.length = sizeof kEmptySound;
  stream_->MoveTo(last.offset);
  WriteRIFFType(last.tag, last.uuid);
  WriteLength(last.length);
  return end + last.length;
}

void RIFFFileEditor::MaybeJunkSegment(RIFFType tag) {
  if (tag == kNullTag) return;  // zero fill is no chunk to retire
  for (auto& [info, action] : chunks_) {
    if (info.tag == tag) {
      action = kJunkSegment;
      return;
    }
  }
}

void RIFFFileEditor::RemoveTrailingMetaData(RIFFType audioTag) {
  std::lock_guard hold(lock_);
  EnsureListed();
  auto audio = FindChunk(audioTag);
  if (audio == chunks_.end() || std::next(audio) == chunks_.end()) return;
  const auto first = chunks_.begin() + (std::next(audio) - chunks_.cbegin());
  Access access(*stream_, kTCLReadWriteMode);
  stream_->Truncate(first->first.offset);
  access.Restore();
  chunks_.erase(first, chunks_.end());
}

// ---------------------------------------------------------------- queries

bool RIFFFileEditor::AudioDataIsZeroLength(RIFFType audioTag, std::int64_t limit) {
  ChunkList list;
  TestForChunk stopAtAudio(audioTag);
  ReadChunkLocationsExt(list, &stopAtAudio);
  return !list.empty() && list.back().first.tag == audioTag && list.back().first.length <= limit;
}

int RIFFFileEditor::CountPostAudioChunks(RIFFType audioTag) {
  std::lock_guard hold(lock_);
  const auto audio = FindChunk(audioTag);
  return audio == chunks_.end() ? 0 : static_cast<int>(chunks_.end() - audio - 1);
}

RIFFType RIFFFileEditor::GetNthPostAudioChunks(int n, RIFFType audioTag, UUIDObj& uuid) {
  std::lock_guard hold(lock_);
  const auto audio = FindChunk(audioTag);
  if (audio == chunks_.end() || n < 0 || n >= chunks_.end() - audio - 1) return kNullTag;
  const ChunkInfo& info = (audio + n + 1)->first;
  uuid = info.uuid;
  return info.tag;
}

std::uint32_t RIFFFileEditor::FindIDForTag(RIFFType tag) noexcept {
  for (const auto& [t, id] : kTagIDTable)
    if (t == tag) return id;
  return tag;
}

RIFFType RIFFFileEditor::FindTagForID(std::uint32_t id) noexcept {
  for (const auto& [tag, i] : kTagIDTable)
    if (i == id) return tag;
  return id;
}

void RIFFFileEditor::UpdateUUIDsFromTags() {
  // A handler without identifiers (chunk files that are never Wave64) would
  // retire every chunk, the audio too.
  const UUIDObj junk = handler_.UUIDForTag(kJunkTag, true);
  if (junk.IsClear()) return;
  for (auto& [info, action] : chunks_) {
    if (info.tag == kNullTag) continue;
    const UUIDObj uuid = handler_.UUIDForTag(info.tag, true);
    if (uuid.IsClear()) {
      action = kJunkSegment;
      info.tag = kJunkTag;
      info.uuid = junk;
    } else {
      info.uuid = uuid;
    }
  }
}

UUIDObj RIFFFileEditor::MaybeTranslateRiffType(RIFFType tag) const {
  return wave64_ ? handler_.UUIDForTag(tag, false) : UUIDObj();
}

void RIFFFileEditor::ConfirmUUIDMap() const {
  for (const auto& entry : kTagIDTable) (void)handler_.UUIDForTag(entry.first, true);
}

}  // namespace tarn
