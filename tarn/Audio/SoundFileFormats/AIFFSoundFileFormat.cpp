#include "tarn/Audio/SoundFileFormats/AIFFSoundFileFormat.h"

#include <algorithm>
#include <cmath>
#include <cstring>
#include <set>
#include <string>

#include "tarn/Audio/SoundFileFormats/AIFFWriter.h"
#include "tarn/Audio/SoundFileFormats/RIFFFormatHandlers.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"
#include "tarn/Audio/SoundFileFormats/WAVEWriter.h"
#include "tarn/Errors/Fail.h"
#include "tarn/Streams/CFileStream.h"

namespace tarn {
namespace {

constexpr int kStreamBufferSize = 4096;
constexpr std::int64_t kMaxU32 = 0xFFFFFFFF;
constexpr std::int16_t kMaxMarkerID = 32767;

// Big-endian fields of chunk payloads.
class PayloadWriter {
 public:
  void U8(std::uint8_t v) { bytes_.push_back(v); }
  void U16(std::uint16_t v) {
    U8(static_cast<std::uint8_t>(v >> 8));
    U8(static_cast<std::uint8_t>(v));
  }
  void U32(std::uint32_t v) {
    U16(static_cast<std::uint16_t>(v >> 16));
    U16(static_cast<std::uint16_t>(v));
  }
  void Raw(const void* p, std::size_t n) {
    const auto* b = static_cast<const std::uint8_t*>(p);
    bytes_.insert(bytes_.end(), b, b + n);
  }
  [[nodiscard]] RCBlobMT Blob() const { return RCBlobMT(bytes_.data(), bytes_.size()); }
  std::vector<std::uint8_t>& Bytes() noexcept { return bytes_; }

 private:
  std::vector<std::uint8_t> bytes_;
};

class PayloadReader {
 public:
  explicit PayloadReader(const RCBlobMT& blob)
      : p_(blob.GetPtr()), n_(static_cast<std::size_t>(blob.GetSize())) {}
  [[nodiscard]] bool Has(std::size_t count) const noexcept { return n_ - at_ >= count; }
  std::uint8_t U8() noexcept { return p_[at_++]; }
  std::uint16_t U16() noexcept {
    const std::uint16_t v = static_cast<std::uint16_t>(p_[at_] << 8 | p_[at_ + 1]);
    at_ += 2;
    return v;
  }
  std::uint32_t U32() noexcept {
    const std::uint32_t hi = U16();
    return hi << 16 | U16();
  }
  const std::uint8_t* Take(std::size_t count) noexcept {
    const std::uint8_t* p = p_ + at_;
    at_ += count;
    return p;
  }

 private:
  const std::uint8_t* p_;
  std::size_t n_;
  std::size_t at_ = 0;
};

// The extension in lower case without its dot.
std::string PlainExtension(const UString& extension) {
  std::string text = extension.utf8_str();
  if (!text.empty() && text[0] == '.') text.erase(0, 1);
  for (char& c : text)
    if (c >= 'A' && c <= 'Z') c = static_cast<char>(c - 'A' + 'a');
  return text;
}

std::int16_t NextMarkerID(const std::vector<AIFFSoundFileFormat::Marker>& markers) {
  std::int16_t next = 1;
  for (const auto& m : markers)
    if (m.id >= next && m.id < kMaxMarkerID) next = static_cast<std::int16_t>(m.id + 1);
  return next;
}

}  // namespace

// The loops of "INST" with the markers they use.
struct AIFFSoundFileFormat::Loops {
  std::vector<SoundFileFormatLoop> loops;
  std::set<std::int16_t> loopMarkers;  // ids named by the loops of "INST"
  std::vector<Marker> markers;         // all of "MARK"
  RCBlobMT inst;
};

std::vector<AIFFSoundFileFormat::Marker> AIFFSoundFileFormat::ParseMarkers(const RCBlobMT& chunk) {
  std::vector<Marker> markers;
  PayloadReader in(chunk);
  if (!in.Has(2)) return markers;
  const std::uint16_t count = in.U16();
  for (std::uint16_t i = 0; i < count && in.Has(7); ++i) {
    Marker m;
    m.id = static_cast<std::int16_t>(in.U16());
    m.position = in.U32();
    const std::uint8_t length = in.U8();
    if (!in.Has(length)) break;
    m.name =
        UString(reinterpret_cast<const char*>(in.Take(length)), length, UString::kMacRomanEncoding);
    if (length % 2 == 0 && in.Has(1)) (void)in.U8();  // pad after an odd Pascal string
    markers.push_back(std::move(m));
  }
  return markers;
}

RCBlobMT AIFFSoundFileFormat::FlattenMarkers(const std::vector<Marker>& markers) {
  PayloadWriter out;
  out.U16(static_cast<std::uint16_t>(markers.size()));
  for (const Marker& m : markers) {
    out.U16(static_cast<std::uint16_t>(m.id));
    out.U32(m.position);
    std::string name = m.name.string(UString::kMacRomanEncoding);
    if (name.size() > 255) name.resize(255);
    out.U8(static_cast<std::uint8_t>(name.size()));
    out.Raw(name.data(), name.size());
    if (name.size() % 2 == 0) out.U8(0);
  }
  return out.Blob();
}

AIFFSoundFileFormat::AIFFSoundFileFormat(const FileSpecification& file) : SoundFileFormat(file) {}
AIFFSoundFileFormat::~AIFFSoundFileFormat() = default;

AIFFReader& AIFFSoundFileFormat::Reader() {
  if (!reader_) reader_ = std::make_unique<AIFFReader>(GetFile());
  return *reader_;
}

RIFFFileEditor& AIFFSoundFileFormat::DemandFileEditor() {
  if (!editor_) {
    auto editor =
        std::make_unique<RIFFFileEditor>(GetFile(), kRIFFBigEndian, GetAIFFRIFFFormatHandler());
    editor->ReadChunkLocations(nullptr);
    editor_ = std::move(editor);
  }
  return *editor_;
}

RCBlobMT AIFFSoundFileFormat::FileChunk(RIFFType tag) {
  return DemandFileEditor().ReadChunkData(tag);
}

RCBlobMT AIFFSoundFileFormat::CurrentChunk(RIFFType tag) {
  for (const auto& [t, blob] : pending_)
    if (t == tag) return blob;
  return FileChunk(tag);
}

void AIFFSoundFileFormat::SetPending(RIFFType tag, RCBlobMT data) {
  const RCBlobMT onDisk = FileChunk(tag);
  std::erase_if(pending_, [&](const auto& p) { return p.first == tag; });
  if (onDisk.SameBytes(data)) return;  // the file holds these bytes already
  pending_.emplace_back(tag, std::move(data));
}

void AIFFSoundFileFormat::WritePending() {
  if (pending_.empty()) return;
  RIFFFileEditor& editor = DemandFileEditor();
  for (const auto& [tag, blob] : pending_) {
    // An audio chunk whose size ran past the end of the file takes one call
    // to be fixed; the chunk goes in with the next.
    bool fixing = false;
    do {
      fixing = editor.AudioRunsToEndOfFile();
      editor.AddChunkData({tag, {}, blob}, AIFFReader::kSSND);
    } while (fixing);
  }
  pending_.clear();
  Forget();
}

void AIFFSoundFileFormat::Forget() noexcept {
  reader_.reset();
  editor_.reset();
}

void AIFFSoundFileFormat::ThrowOutCachedMetaDataPositions() {
  std::lock_guard guard(lock_);
  Forget();
}

double AIFFSoundFileFormat::GetNaturalRate() { return GetFileAttributes().mSampleRate; }

SampleCount AIFFSoundFileFormat::GetLengthInFrames() {
  std::lock_guard guard(lock_);
  return Reader().GetNumberOfFrames();
}

SoundFileAttributes AIFFSoundFileFormat::GetFileAttributes() {
  std::lock_guard guard(lock_);
  return Reader().GetAttributes();
}

HostChannelOrder AIFFSoundFileFormat::GetChannelOrder() {
  std::lock_guard guard(lock_);
  return Reader().GetChannelOrder();
}

bool AIFFSoundFileFormat::MatchesExtension(const UString& extension) {
  const std::string text = PlainExtension(extension);
  return text == "aif" || text == "aiff" || text == "aifc";
}

bool AIFFSoundFileFormat::HasFileTempoAndSyncPoint(float& tempo, SampleCount& syncPoint) {
  std::lock_guard guard(lock_);
  const double bpm = Reader().GetQuarterNoteTempoBPM();
  if (bpm <= 0.0) return false;
  tempo = static_cast<float>(bpm);
  syncPoint = 0;
  return true;
}

bool AIFFSoundFileFormat::HasFileMeterAndPitch(short& rootNote, short& numerator,
                                               short& denominator) {
  std::lock_guard guard(lock_);
  return Reader().GetMeterAndPitch(rootNote, numerator, denominator);
}

SoundFileAttributes AIFFSoundFileFormat::CreateFileOnDisk(const SoundFileAttributes& attributes,
                                                          SampleCount frames, bool,
                                                          const SoundFileAttributes&) {
  RIFFType form = 0, compression = 0;
  std::int16_t bits = 0;
  AIFFWriter::ChooseEncoding(attributes, form, compression, bits);
  std::lock_guard guard(lock_);
  Forget();
  AIFFWriter writer(GetFile(), attributes.mSampleRate, attributes.mNumChannels, bits, form,
                    compression, frames.AsLongLong());
  writer.WriteHeader();
  writer.Close();
  return AIFFWriter::AttributesOf(attributes.mSampleRate, attributes.mNumChannels, bits, form,
                                  compression);
}

void AIFFSoundFileFormat::AdjustLengthInHeader(const SoundFileAttributes&, SampleCount frames) {
  std::lock_guard guard(lock_);
  Forget();
  AIFFReader& reader = Reader();
  const std::int64_t ssnd = reader.GetOffsetToSoundChunk();
  const std::int64_t comm = reader.GetOffsetToCommonChunk();
  const std::int64_t start = reader.GetHeaderSize();
  const std::int64_t frameSize = reader.GetSampleFrameSize();
  const std::int64_t n = frames.AsLongLong();
  if (frameSize < 1 || n < 0 || n > kMaxU32 || start + n * frameSize + 1 > kMaxU32)
    FailOSErr(kParamErr);
  const std::int64_t end = start + n * frameSize;
  const std::int64_t paddedEnd = WAVEWriter::PadDataLength(end, false);

  // Where the chunks after the audio begin (none when the audio runs to
  // the end of the file).
  std::int64_t trailing = -1;
  {
    RIFFFileEditor& editor = DemandFileEditor();
    bool afterAudio = false;
    for (const auto& [info, action] : editor.GetChunkList()) {
      if (afterAudio) {
        trailing = info.offset;
        break;
      }
      afterAudio = info.tag == AIFFReader::kSSND && info.offset == ssnd;
    }
  }
  Forget();

  CFileStream stream(GetFile(), kStreamBufferSize);
  stream.Open(kTCLReadWriteMode);
  const std::int64_t fileLength = stream.Size();
  std::int64_t newLength = paddedEnd;
  if (trailing >= 0 && paddedEnd <= trailing) {
    // Move the chunks after the audio back to follow its new end; copying
    // upwards is safe because the destination lies before the source.
    const std::int64_t count = fileLength - trailing;
    std::vector<std::uint8_t> block(64 * 1024);
    for (std::int64_t done = 0; done < count && paddedEnd != trailing;) {
      const int step = static_cast<int>(std::min<std::int64_t>(count - done, 64 * 1024));
      stream.MoveTo(trailing + done);
      stream.GetRawDataFromStream(block.data(), step);
      stream.MoveTo(paddedEnd + done);
      stream.PutRawDataToStream(block.data(), step);
      done += step;
    }
    newLength = paddedEnd + count;
  }
  if (end != paddedEnd) {
    stream.MoveTo(end);
    stream.PutChar(0);
  }
  stream.MoveTo(4);
  stream.PutLong(static_cast<int>(static_cast<std::uint32_t>(newLength - 8)));
  stream.MoveTo(comm + 8 + 2);
  stream.PutLong(static_cast<int>(static_cast<std::uint32_t>(n)));
  stream.MoveTo(ssnd + 4);
  stream.PutLong(static_cast<int>(static_cast<std::uint32_t>(end - ssnd - 8)));
  stream.SetPhysicalSize(newLength);
  stream.Close();
}

void AIFFSoundFileFormat::SetRecordFlagMetaData(ReadWriteMetaDataAccess& access, int flag) {
  PayloadWriter out;
  out.U32(static_cast<std::uint32_t>(flag));
  WriteMetaData(access, kRecFlag, out.Blob());
}

void AIFFSoundFileFormat::WriteFileTempoData(ReadWriteMetaDataAccess& access, float tempo,
                                             short rootNote, short numerator, short denominator,
                                             const std::vector<std::int64_t>&, SampleCount,
                                             float beats) {
  CheckAccess(access);
  std::uint32_t count = 0;
  if (beats > 0) {
    count = static_cast<std::uint32_t>(std::lround(beats));
  } else if (tempo > 0) {
    const SoundFileAttributes a = GetFileAttributes();
    const double framesPerBeat = a.mSampleRate * 60.0 / tempo;
    count = static_cast<std::uint32_t>(
        std::lround(static_cast<double>(GetLengthInFrames().AsLongLong()) / framesPerBeat));
  }
  PayloadWriter out;
  out.U32(1);  // version
  out.U32(count);
  out.U16(static_cast<std::uint16_t>(rootNote));
  out.U16(3);  // scale type: neither major nor minor
  out.U16(static_cast<std::uint16_t>(numerator));
  out.U16(static_cast<std::uint16_t>(denominator));
  out.U16(tempo > 0 ? 1 : 0);  // loop, or one-shot
  out.Bytes().resize(kBascWrittenSize, 0);
  WriteMetaData(access, AIFFReader::kBasc, out.Blob());
}

AIFFSoundFileFormat::Loops AIFFSoundFileFormat::ReadLoops() {
  Loops out;
  out.inst = CurrentChunk(kINST);
  out.markers = ParseMarkers(CurrentChunk(kMARK));
  if (out.inst.GetSize() < kInstSize) return out;
  PayloadReader in(out.inst);
  (void)in.Take(8);
  for (int k = 0; k < 2; ++k) {
    const std::uint16_t mode = in.U16();
    const auto begin = static_cast<std::int16_t>(in.U16());
    const auto end = static_cast<std::int16_t>(in.U16());
    if (mode != 1 && mode != 2) continue;
    const auto b = std::find_if(out.markers.begin(), out.markers.end(),
                                [&](const Marker& m) { return m.id == begin; });
    const auto e = std::find_if(out.markers.begin(), out.markers.end(),
                                [&](const Marker& m) { return m.id == end; });
    if (b == out.markers.end() || e == out.markers.end() || e->position <= b->position) continue;
    out.loopMarkers.insert(begin);
    out.loopMarkers.insert(end);
    SoundFileFormatLoop loop;
    loop.mStart = b->position;
    loop.mEnd = e->position;
    loop.mType =
        mode == 1 ? SoundFileFormatLoop::Type::kForward : SoundFileFormatLoop::Type::kAlternating;
    loop.mID = static_cast<std::uint32_t>(begin);
    loop.mName = b->name;
    out.loops.push_back(loop);
  }
  return out;
}

short AIFFSoundFileFormat::NumberOfLoops(ReadOnlyMetaDataAccess& access) {
  CheckAccess(access);
  std::lock_guard guard(lock_);
  return static_cast<short>(ReadLoops().loops.size());
}

void AIFFSoundFileFormat::GetFileLoop(ReadOnlyMetaDataAccess& access, short index,
                                      SoundFileFormatLoop& loop) {
  CheckAccess(access);
  std::lock_guard guard(lock_);
  const Loops loops = ReadLoops();
  if (index < 0 || static_cast<std::size_t>(index) >= loops.loops.size()) FailOSErr(kParamErr);
  loop = loops.loops[static_cast<std::size_t>(index)];
}

void AIFFSoundFileFormat::AddFileLoops(ReadWriteMetaDataAccess& access,
                                       const std::vector<SoundFileFormatLoop>& loops) {
  CheckAccess(access);
  if (loops.size() > 2) FailOSErr(kParamErr);
  for (const auto& loop : loops) {
    if (loop.mStart < SampleCount(0) || loop.mEnd <= loop.mStart ||
        loop.mEnd.AsLongLong() > kMaxU32 || loop.mType == SoundFileFormatLoop::Type::kBackward)
      FailOSErr(kParamErr);
  }
  std::lock_guard guard(lock_);
  const Loops old = ReadLoops();
  std::vector<Marker> markers;
  for (const Marker& m : old.markers)
    if (old.loopMarkers.count(m.id) == 0) markers.push_back(m);
  PayloadWriter inst;
  if (old.inst.GetSize() >= kInstSize) {
    inst.Raw(old.inst.GetPtr(), 8);
  } else {
    const std::uint8_t defaults[8] = {60, 0, 0, 127, 1, 127, 0, 0};
    inst.Raw(defaults, 8);
  }
  for (std::size_t k = 0; k < 2; ++k) {
    if (k >= loops.size()) {
      inst.U16(0), inst.U16(0), inst.U16(0);
      continue;
    }
    const SoundFileFormatLoop& loop = loops[k];
    Marker begin{NextMarkerID(markers), static_cast<std::uint32_t>(loop.mStart.AsLongLong()),
                 loop.mName};
    markers.push_back(begin);
    Marker end{NextMarkerID(markers), static_cast<std::uint32_t>(loop.mEnd.AsLongLong()), {}};
    markers.push_back(end);
    inst.U16(loop.mType == SoundFileFormatLoop::Type::kAlternating ? 2 : 1);
    inst.U16(static_cast<std::uint16_t>(begin.id));
    inst.U16(static_cast<std::uint16_t>(end.id));
  }
  SetPending(kMARK, FlattenMarkers(markers));
  SetPending(kINST, inst.Blob());
}

std::unique_ptr<SoundFileRegionList> AIFFSoundFileFormat::GetRegionList(
    ReadOnlyMetaDataAccess& access) {
  CheckAccess(access);
  std::lock_guard guard(lock_);
  const RCBlobMT own = CurrentChunk(kRegn);
  if (!own.IsEmpty()) {
    try {
      return std::make_unique<SoundFileRegionList>(SoundFileRegionList::Unflatten(own));
    } catch (const TarnError&) {
      // Not ours after all: the markers below.
    }
  }
  auto list = std::make_unique<SoundFileRegionList>();
  const Loops loops = ReadLoops();
  for (const Marker& m : loops.markers) {
    if (loops.loopMarkers.count(m.id) != 0) continue;
    list->Add({static_cast<std::uint32_t>(m.id), m.name, m.position, 0});
  }
  return list;
}

void AIFFSoundFileFormat::WriteRegionList(ReadWriteMetaDataAccess& access, RCBlobMT regions,
                                          std::uint32_t) {
  CheckAccess(access);
  const SoundFileRegionList list = SoundFileRegionList::Unflatten(regions);
  std::lock_guard guard(lock_);
  const Loops loops = ReadLoops();
  std::vector<Marker> markers;
  for (const Marker& m : loops.markers)
    if (loops.loopMarkers.count(m.id) != 0) markers.push_back(m);
  const auto taken = [&](std::int64_t id) {
    return std::any_of(markers.begin(), markers.end(), [&](const Marker& m) { return m.id == id; });
  };
  const auto add = [&](std::int64_t id, std::int64_t position, const UString& name) {
    if (position < 0 || position > kMaxU32) return;  // no place in "MARK"
    if (id < 1 || id > kMaxMarkerID || taken(id)) id = NextMarkerID(markers);
    markers.push_back({static_cast<std::int16_t>(id), static_cast<std::uint32_t>(position), name});
  };
  for (const auto& entry : list) {
    add(entry.mID, entry.mStart.AsLongLong(), entry.mName);
    if (!entry.IsMarker()) add(0, (entry.mStart + entry.mLength).AsLongLong(), entry.mName);
  }
  SetPending(kRegn, regions);
  SetPending(kMARK, FlattenMarkers(markers));
}

bool AIFFSoundFileFormat::AudioDataIsZeroLength() {
  std::lock_guard guard(lock_);
  RIFFFileEditor editor(GetFile(), kRIFFBigEndian, GetAIFFRIFFFormatHandler());
  return editor.AudioDataIsZeroLength(AIFFReader::kSSND, 8);
}

void AIFFSoundFileFormat::RecoverCrashedRecording() {
  std::int64_t start = 0;
  std::int64_t frameSize = 0;
  std::int64_t declaredEnd = 0;
  std::int64_t headerFrames = 0;
  {
    std::lock_guard guard(lock_);
    Forget();
    AIFFReader& reader = Reader();
    if (!reader.CanParse()) return;
    start = reader.GetHeaderSize();
    frameSize = reader.GetSampleFrameSize();
    headerFrames = reader.GetNumberOfFrames();
    const std::int64_t ssnd = reader.GetOffsetToSoundChunk();
    CFileStream stream(GetFile(), kStreamBufferSize);
    stream.Open(kTCLReadMode);
    const std::int64_t fileLength = stream.Size();
    if (frameSize < 1 || start > fileLength) return;
    stream.MoveTo(ssnd + 4);
    declaredEnd =
        WAVEWriter::PadDataLength(ssnd + 8 + static_cast<std::uint32_t>(stream.GetLong()), false);
    // Trailing metadata: printable tags whose sizes lead exactly to the end.
    bool trailingChunks = declaredEnd <= fileLength;
    for (std::int64_t at = declaredEnd; trailingChunks && at < fileLength;) {
      if (at + 8 > fileLength) {
        trailingChunks = false;
        break;
      }
      stream.MoveTo(at);
      std::uint8_t tag[4];
      stream.GetRawDataFromStream(tag, 4);
      for (std::uint8_t ch : tag) trailingChunks = trailingChunks && ch >= 0x20 && ch <= 0x7E;
      at = WAVEWriter::PadDataLength(at + 8 + static_cast<std::uint32_t>(stream.GetLong()), false);
      trailingChunks = trailingChunks && at <= fileLength;
    }
    const std::int64_t frames = (fileLength - start) / frameSize;
    if (trailingChunks && headerFrames <= frames) return;
    stream.Close();
    if (frames == headerFrames && start + frames * frameSize == fileLength) return;
    headerFrames = frames;
    CFileStream cut(GetFile(), kStreamBufferSize);
    cut.Open(kTCLReadWriteMode);
    cut.SetPhysicalSize(start + frames * frameSize);
    cut.Close();
    Forget();
  }
  AdjustLengthInHeader(GetFileAttributes(), headerFrames);
  SoundFileFormatCache::Instance().FormatChanged(*this);
}

void AIFFSoundFileFormat::GetRawHeader(std::vector<std::uint8_t>& header) {
  std::lock_guard guard(lock_);
  Reader().GetRawHeader(header);
}

bool AIFFSoundFileFormat::HasMetaData(ReadOnlyMetaDataAccess& access, std::uint32_t tag) {
  CheckAccess(access);
  std::lock_guard guard(lock_);
  for (const auto& [t, blob] : pending_)
    if (t == tag) return true;
  return DemandFileEditor().HasChunk(tag);
}

RCBlobMT AIFFSoundFileFormat::ReadMetaData(ReadOnlyMetaDataAccess& access, std::uint32_t tag) {
  CheckAccess(access);
  std::lock_guard guard(lock_);
  return CurrentChunk(tag);
}

void AIFFSoundFileFormat::WriteMetaData(ReadWriteMetaDataAccess& access, std::uint32_t tag,
                                        RCBlobMT data) {
  CheckAccess(access);
  std::lock_guard guard(lock_);
  SetPending(tag, std::move(data));
}

void AIFFSoundFileFormat::CleanMetaDataMods() {
  std::lock_guard guard(lock_);
  pending_.clear();
}

void AIFFSoundFileFormat::RemoveTrailingMetaData() {
  std::lock_guard guard(lock_);
  WritePending();
  DemandFileEditor().RemoveTrailingMetaData(AIFFReader::kSSND);
  Forget();
  CFileStream stream(GetFile(), kStreamBufferSize);
  stream.Open(kTCLReadWriteMode);
  const std::int64_t length = stream.Size();
  stream.MoveTo(4);
  stream.PutLong(static_cast<int>(static_cast<std::uint32_t>(length - 8)));
  stream.Close();
}

RCBlobMT AIFFSoundFileFormat::ReadNamedMetaData(ReadOnlyMetaDataAccess& access, const UString& name,
                                                std::uint32_t tag) {
  CheckAccess(access);
  std::lock_guard guard(lock_);
  const RCBlobMT chunk = CurrentChunk(tag);
  PayloadReader in(chunk);
  if (!in.Has(2)) return {};
  const std::uint16_t length = in.U16();
  if (!in.Has(length)) return {};
  const std::string stored(reinterpret_cast<const char*>(in.Take(length)), length);
  if (stored != name.utf8_str()) return {};
  const std::size_t rest = static_cast<std::size_t>(chunk.GetSize()) - 2 - length;
  return RCBlobMT(chunk.GetPtr() + 2 + length, rest);
}

void AIFFSoundFileFormat::WriteNamedMetaData(ReadWriteMetaDataAccess& access, const UString& name,
                                             std::uint32_t tag, RCBlobMT data) {
  const std::string utf8 = name.utf8_str();
  if (utf8.size() > 0xFFFF) FailOSErr(kParamErr);
  PayloadWriter out;
  out.U16(static_cast<std::uint16_t>(utf8.size()));
  out.Raw(utf8.data(), utf8.size());
  out.Raw(data.GetPtr(), static_cast<std::size_t>(data.GetSize()));
  WriteMetaData(access, tag, out.Blob());
}

void AIFFSoundFileFormat::OpenMetaDataOnDisk(bool) {}

bool AIFFSoundFileFormat::WriteMetaDataToDisk() {
  std::lock_guard guard(lock_);
  if (pending_.empty()) return false;
  WritePending();
  return true;
}

void AIFFSoundFileFormat::CloseMetaDataOnDisk() noexcept {
  try {
    std::lock_guard guard(lock_);
    Forget();
  } catch (...) {
    // A lock that cannot be taken leaves the cached objects for the next
    // question to drop.
  }
}

}  // namespace tarn
