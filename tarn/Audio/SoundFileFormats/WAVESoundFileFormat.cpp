#include "tarn/Audio/SoundFileFormats/WAVESoundFileFormat.h"

#include <algorithm>
#include <bit>
#include <cstring>
#include <map>

#include "tarn/Audio/SoundFileFormats/LittleEndianBytesImpl.h"
#include "tarn/Audio/SoundFileFormats/RIFFFormatHandlers.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatFailImpl.h"
#include "tarn/Audio/SoundFileFormats/WAVEWriter.h"
#include "tarn/Errors/Fail.h"
#include "tarn/Streams/CFileStream.h"

namespace tarn {

namespace le = LittleEndianBytes;

namespace {

constexpr RIFFType kDataTag = MakeRIFFType("data");
constexpr RIFFType kBextTag = MakeRIFFType("bext");
constexpr RIFFType kSmplTag = MakeRIFFType("smpl");
constexpr RIFFType kCueTag = MakeRIFFType("cue ");
constexpr RIFFType kListTag = MakeRIFFType("LIST");
constexpr RIFFType kAdtlTag = MakeRIFFType("adtl");
constexpr RIFFType kLablTag = MakeRIFFType("labl");
constexpr RIFFType kLtxtTag = MakeRIFFType("ltxt");
constexpr RIFFType kRgnPurpose = MakeRIFFType("rgn ");
constexpr RIFFType kAcidTag = MakeRIFFType("acid");
constexpr RIFFType kRecTag = MakeRIFFType("Rec!");
constexpr RIFFType kJunkTag = MakeRIFFType("JUNK");

constexpr std::size_t kSmplHeaderSize = 36;
constexpr std::size_t kSmplLoopSize = 24;
constexpr std::size_t kCuePointSize = 24;

using Bytes = std::vector<std::uint8_t>;

Bytes BytesOf(const RCBlobMT& blob) {
  return blob.IsEmpty() ? Bytes() : Bytes(blob.GetPtr(), blob.GetPtr() + blob.GetSize());
}
RCBlobMT BlobOf(const Bytes& bytes) { return RCBlobMT(bytes.data(), bytes.size()); }

void Put32(Bytes& out, std::uint32_t v) {
  out.resize(out.size() + 4);
  le::Store32(out.data() + out.size() - 4, v);
}
void Put16(Bytes& out, std::uint16_t v) {
  out.resize(out.size() + 2);
  le::Store16(out.data() + out.size() - 2, v);
}
void PutTag(Bytes& out, RIFFType tag) {
  for (int i = 0; i < 4; ++i) out.push_back(static_cast<std::uint8_t>(tag >> (24 - 8 * i)));
}
RIFFType TagAt(const std::uint8_t* p) {
  return RIFFTypeFromChars(reinterpret_cast<const char*>(p));
}

// A subchunk of a "LIST": tag, size, text (NUL-terminated), even padding.
void PutSubchunk(Bytes& out, RIFFType tag, const Bytes& payload) {
  PutTag(out, tag);
  Put32(out, static_cast<std::uint32_t>(payload.size()));
  out.insert(out.end(), payload.begin(), payload.end());
  if (payload.size() & 1) out.push_back(0);
}

UString TextOf(const std::uint8_t* p, std::size_t size) {
  const auto* first = reinterpret_cast<const char*>(p);
  const std::size_t length = static_cast<std::size_t>(std::find(first, first + size, '\0') - first);
  return UString(first, length, UString::kSystemEncoding);
}

}  // namespace

WAVESoundFileFormat::WAVESoundFileFormat(const FileSpecification& file) : SoundFileFormat(file) {}

WAVESoundFileFormat::~WAVESoundFileFormat() = default;

bool WAVESoundFileFormat::FileWillBeWave64(int channels, const SampleCount& frames,
                                           int bytesPerSample) {
  const std::int64_t audio = WAVEWriter::GetHeaderSizeNeededForWave64Switch(true, channels);
  const std::int64_t data = frames.AsLongLong() * std::max(channels, 1) * bytesPerSample;
  return audio + WAVEWriter::PadDataLength(data, false) - 8 > 0xFFFFFFFFll;
}

WAVEReader& WAVESoundFileFormat::Reader() {
  if (!reader_) reader_ = std::make_unique<WAVEReader>(GetFile());
  return *reader_;
}

RIFFFileEditor& WAVESoundFileFormat::DemandFileEditor() {
  if (!editor_) {
    editor_ =
        std::make_unique<RIFFFileEditor>(GetFile(), kRIFFLittleEndian, GetWaveRIFFFormatHandler());
    try {
      editor_->ReadChunkLocations(nullptr);
    } catch (...) {
      editor_.reset();
      throw;
    }
  }
  return *editor_;
}

void WAVESoundFileFormat::ThrowOutCachedMetaDataPositions() {
  reader_.reset();
  editor_.reset();
}

void WAVESoundFileFormat::UpdateFileSpec(const FileSpecification& file) {
  SoundFileFormat::UpdateFileSpec(file);
  ThrowOutCachedMetaDataPositions();
}

double WAVESoundFileFormat::GetNaturalRate() { return GetFileAttributes().mSampleRate; }

SampleCount WAVESoundFileFormat::GetLengthInFrames() { return Reader().GetNumberOfFrames(); }

std::uint32_t WAVESoundFileFormat::GetCanonicalFileType() { return MakeRIFFType("WAVE"); }

std::uint32_t WAVESoundFileFormat::GetActualFileType() {
  return IsExtendedFormat() ? MakeRIFFType(".W64") : MakeRIFFType("WAVE");
}

bool WAVESoundFileFormat::IsExtendedFormat() { return Reader().IsWave64(); }

SampleCount WAVESoundFileFormat::GetMaxFrameCount() {
  // A RIFF file without room for the Wave64 headers stops where 32-bit sizes do.
  WAVEReader& r = Reader();
  const std::uint32_t type =
      r.IsWave64() || r.CanSwitchToWave64() ? GetActualFileType() : MakeRIFFType(".wav");
  return SoundFileFormatCache::GetMaxFrameCountForType(type, GetFileAttributes().mBytesPerFrame);
}

SoundFileAttributes WAVESoundFileFormat::GetFileAttributes() {
  WAVEReader& r = Reader();
  SoundFileAttributes a;
  a.mFileType = r.IsWave64() ? MakeRIFFType(".W64") : MakeRIFFType("WAVE");
  a.mNumChannels = static_cast<std::int16_t>(r.GetNumberOfChannels());
  a.mSampleRate = r.GetSampleRate();
  a.mSampleFormat = r.GetSampleFormat();
  a.mBytesPerSample = static_cast<std::int16_t>(r.GetSampleSize());
  a.mBytesPerFrame = r.GetSampleFrameSize();
  a.mOffsetToAudio = static_cast<std::int32_t>(r.GetHeaderSize());
  a.mSamplesAreLSBFirst = true;
  return a;
}

HostChannelOrder WAVESoundFileFormat::GetChannelOrder() {
  return HostChannelOrder::ForChannelCount(Reader().GetNumberOfChannels());
}

// ------------------------------------------------------------ metadata

RCBlobMT WAVESoundFileFormat::CurrentChunk(std::uint32_t tag) {
  for (const auto& [pendingTag, data] : pending_)
    if (pendingTag == tag) return data;
  return DemandFileEditor().ReadChunkData(tag);
}

void WAVESoundFileFormat::SetPending(std::uint32_t tag, const RCBlobMT& data) {
  for (auto& entry : pending_) {
    if (entry.first == tag) {
      entry.second = data;
      return;
    }
  }
  pending_.emplace_back(tag, data);
}

bool WAVESoundFileFormat::HasMetaData(ReadOnlyMetaDataAccess& access, std::uint32_t tag) {
  CheckAccess(access);
  for (const auto& entry : pending_)
    if (entry.first == tag) return true;
  return DemandFileEditor().HasChunk(tag);
}

RCBlobMT WAVESoundFileFormat::ReadMetaData(ReadOnlyMetaDataAccess& access, std::uint32_t tag) {
  CheckAccess(access);
  return CurrentChunk(tag);
}

void WAVESoundFileFormat::WriteMetaData(ReadWriteMetaDataAccess& access, std::uint32_t tag,
                                        RCBlobMT data) {
  CheckAccess(access);
  const RCBlobMT old = DemandFileEditor().ReadChunkData(tag);
  const bool inFile = DemandFileEditor().HasChunk(tag);
  if (inFile && old.GetSize() == data.GetSize() && old.SameBytes(data)) {
    // The file holds it already; drop an earlier pending change of the tag.
    std::erase_if(pending_, [tag](const auto& entry) { return entry.first == tag; });
    return;
  }
  SetPending(tag, data);
}

void WAVESoundFileFormat::CleanMetaDataMods() {
  pending_.clear();
  editor_.reset();
}

bool WAVESoundFileFormat::WriteMetaDataToDisk() {
  if (pending_.empty()) return false;
  while (!pending_.empty()) {
    RIFFFileEditor& editor = DemandFileEditor();
    const RIFFFileEditor::ChunkData chunk{pending_.front().first, {}, pending_.front().second};
    // A recording whose "data" size was never written: the first edit only
    // fixes that size.
    if (editor.AudioRunsToEndOfFile()) editor.AddChunkData(chunk, kDataTag);
    editor.AddChunkData(chunk, kDataTag);
    pending_.erase(pending_.begin());
  }
  ThrowOutCachedMetaDataPositions();
  return true;
}

void WAVESoundFileFormat::CloseMetaDataOnDisk() noexcept { editor_.reset(); }

RCBlobMT WAVESoundFileFormat::ReadNamedMetaData(ReadOnlyMetaDataAccess& access, const UString&,
                                                std::uint32_t tag) {
  return ReadMetaData(access, tag);
}

void WAVESoundFileFormat::WriteNamedMetaData(ReadWriteMetaDataAccess& access, const UString&,
                                             std::uint32_t tag, RCBlobMT data) {
  WriteMetaData(access, tag, std::move(data));
}

void WAVESoundFileFormat::RemoveTrailingMetaData() {
  DemandFileEditor().RemoveTrailingMetaData(kDataTag);
  editor_.reset();
  WAVEReader& r = Reader();
  if (!r.CanParse()) return;
  AdjustLengthInHeader(GetFileAttributes(), r.GetNumberOfFrames());
}

// ------------------------------------------------------------ broadcast extension

BWFBroadcastWaveExtension WAVESoundFileFormat::CurrentBroadcastExtension() {
  const RCBlobMT blob = CurrentChunk(kBextTag);
  if (blob.IsEmpty()) return BWFBroadcastWaveExtension::ForNewRecording(GetFileAttributes());
  return BWFBroadcastWaveExtension::Parse(blob.GetPtr(), static_cast<std::size_t>(blob.GetSize()));
}

bool WAVESoundFileFormat::HasOriginalTimeStamp(SampleCount& timeStamp) {
  for (const auto& entry : pending_) {
    if (entry.first == kBextTag) {
      const auto bext = BWFBroadcastWaveExtension::Parse(
          entry.second.GetPtr(), static_cast<std::size_t>(entry.second.GetSize()));
      timeStamp =
          WAVEReader::TimeStampFromReference(static_cast<std::int32_t>(bext.mTimeReferenceLow),
                                             static_cast<std::int32_t>(bext.mTimeReferenceHigh));
      return true;
    }
  }
  if (!Reader().HasTimeStamp()) return false;
  timeStamp = Reader().GetOriginalTimeStamp();
  return true;
}

void WAVESoundFileFormat::WriteOriginalTimeStamp(ReadWriteMetaDataAccess& access,
                                                 SampleCount timeStamp) {
  CheckAccess(access);
  BWFBroadcastWaveExtension bext = CurrentBroadcastExtension();
  WAVEReader::ReferenceFromTimeStamp(timeStamp.AsLongLong(), bext.mTimeReferenceLow,
                                     bext.mTimeReferenceHigh);
  WriteMetaData(access, kBextTag, BlobOf(bext.Flatten()));
}

void WAVESoundFileFormat::SaveStringToFile(ReadWriteMetaDataAccess& access, int which,
                                           const UString& text) {
  CheckAccess(access);
  if (which != kCommentString && which != kOriginatorString) return;
  BWFBroadcastWaveExtension bext = CurrentBroadcastExtension();
  (which == kCommentString ? bext.mDescription : bext.mOriginator) =
      text.string(UString::kSystemEncoding);
  WriteMetaData(access, kBextTag, BlobOf(bext.Flatten()));
}

bool WAVESoundFileFormat::GetStringFromFile(ReadOnlyMetaDataAccess& access, int which,
                                            UString& text) {
  CheckAccess(access);
  if (which != kCommentString && which != kOriginatorString) return false;
  const RCBlobMT blob = CurrentChunk(kBextTag);
  if (blob.IsEmpty()) return false;
  const auto bext =
      BWFBroadcastWaveExtension::Parse(blob.GetPtr(), static_cast<std::size_t>(blob.GetSize()));
  const std::string& value = which == kCommentString ? bext.mDescription : bext.mOriginator;
  if (value.empty()) return false;
  text = UString(value, UString::kSystemEncoding);
  return true;
}

// ------------------------------------------------------------ tempo, record flag

bool WAVESoundFileFormat::HasFileTempoAndSyncPoint(float& tempo, SampleCount& syncPoint) {
  const auto& acid = Reader().GetAcidInfo();
  const float value = acid.mTempo > 0.0f ? acid.mTempo : acid.mStoredTempo;
  if (!acid.mPresent || !(value > 0.0f)) return false;
  tempo = value;
  syncPoint = 0;
  return true;
}

bool WAVESoundFileFormat::HasFileMeterAndPitch(short& rootNote, short& numerator,
                                               short& denominator) {
  const auto& acid = Reader().GetAcidInfo();
  if (!acid.mPresent) return false;
  rootNote = static_cast<short>(acid.mRootNote);
  numerator = static_cast<short>(acid.mMeterNumerator);
  denominator = static_cast<short>(acid.mMeterDenominator);
  return true;
}

void WAVESoundFileFormat::WriteFileTempoData(ReadWriteMetaDataAccess& access, float tempo,
                                             short rootNote, short numerator, short denominator,
                                             const std::vector<std::int64_t>&, SampleCount,
                                             float beats) {
  CheckAccess(access);
  Bytes acid;
  Put32(acid, rootNote > 0 ? 0x2u : 0u);  // root note set
  Put16(acid, static_cast<std::uint16_t>(rootNote));
  Put16(acid, 0x8000);
  Put32(acid, 0);
  Put32(acid, static_cast<std::uint32_t>(std::max(0.0f, beats) + 0.5f));
  Put16(acid, static_cast<std::uint16_t>(denominator));
  Put16(acid, static_cast<std::uint16_t>(numerator));
  Put32(acid, std::bit_cast<std::uint32_t>(tempo));
  WriteMetaData(access, kAcidTag, BlobOf(acid));
}

void WAVESoundFileFormat::SetRecordFlagMetaData(ReadWriteMetaDataAccess& access, int flag) {
  CheckAccess(access);
  Bytes value;
  Put32(value, static_cast<std::uint32_t>(flag));
  WriteMetaData(access, kRecTag, BlobOf(value));
}

// ------------------------------------------------------------ loops

short WAVESoundFileFormat::NumberOfLoops(ReadOnlyMetaDataAccess& access) {
  CheckAccess(access);
  const RCBlobMT smpl = CurrentChunk(kSmplTag);
  const auto size = static_cast<std::size_t>(smpl.GetSize());
  if (size < kSmplHeaderSize) return 0;
  const std::size_t declared = le::Load32(smpl.GetPtr() + 28);
  return static_cast<short>(
      std::min<std::size_t>({declared, (size - kSmplHeaderSize) / kSmplLoopSize, 0x7FFF}));
}

void WAVESoundFileFormat::GetFileLoop(ReadOnlyMetaDataAccess& access, short index,
                                      SoundFileFormatLoop& loop) {
  if (index < 0 || index >= NumberOfLoops(access)) FailOSErr(-50);
  const RCBlobMT smpl = CurrentChunk(kSmplTag);
  const std::uint8_t* p = smpl.GetPtr() + kSmplHeaderSize + kSmplLoopSize * index;
  loop = {};
  loop.mID = le::Load32(p);
  const std::uint32_t type = le::Load32(p + 4);
  loop.mType = type <= 2 ? static_cast<SoundFileFormatLoop::Type>(type)
                         : SoundFileFormatLoop::Type::kForward;
  loop.mStart = le::Load32(p + 8);
  loop.mEnd = std::int64_t{le::Load32(p + 12)} + 1;
  loop.mFraction = le::Load32(p + 16);
  loop.mPlayCount = le::Load32(p + 20);
}

void WAVESoundFileFormat::AddFileLoops(ReadWriteMetaDataAccess& access,
                                       const std::vector<SoundFileFormatLoop>& loops) {
  CheckAccess(access);
  const Bytes old = BytesOf(CurrentChunk(kSmplTag));
  Bytes smpl;
  Bytes samplerData;
  if (old.size() >= kSmplHeaderSize) {
    smpl.assign(old.begin(), old.begin() + kSmplHeaderSize);
    const std::size_t oldLoops = std::min<std::size_t>(
        le::Load32(old.data() + 28), (old.size() - kSmplHeaderSize) / kSmplLoopSize);
    const std::size_t dataAt = kSmplHeaderSize + oldLoops * kSmplLoopSize;
    const std::size_t dataSize =
        std::min<std::size_t>(le::Load32(old.data() + 32), old.size() - dataAt);
    samplerData.assign(old.begin() + static_cast<std::ptrdiff_t>(dataAt),
                       old.begin() + static_cast<std::ptrdiff_t>(dataAt + dataSize));
  } else {
    smpl.assign(kSmplHeaderSize, 0);
    const double rate = GetNaturalRate();
    le::Store32(smpl.data() + 8, rate > 0 ? static_cast<std::uint32_t>(1e9 / rate + 0.5) : 0);
    le::Store32(smpl.data() + 12, 60);  // unity note: middle C
  }
  le::Store32(smpl.data() + 28, static_cast<std::uint32_t>(loops.size()));
  le::Store32(smpl.data() + 32, static_cast<std::uint32_t>(samplerData.size()));
  for (const auto& loop : loops) {
    Put32(smpl, loop.mID);
    Put32(smpl, static_cast<std::uint32_t>(loop.mType));
    Put32(smpl, static_cast<std::uint32_t>(loop.mStart.AsLongLong()));
    Put32(smpl, static_cast<std::uint32_t>(std::max<std::int64_t>(loop.mEnd.AsLongLong() - 1, 0)));
    Put32(smpl, loop.mFraction);
    Put32(smpl, loop.mPlayCount);
  }
  smpl.insert(smpl.end(), samplerData.begin(), samplerData.end());
  WriteMetaData(access, kSmplTag, BlobOf(smpl));
}

// ------------------------------------------------------------ markers and regions

std::unique_ptr<SoundFileRegionList> WAVESoundFileFormat::GetRegionList(
    ReadOnlyMetaDataAccess& access) {
  CheckAccess(access);
  auto list = std::make_unique<SoundFileRegionList>();
  const Bytes cue = BytesOf(CurrentChunk(kCueTag));
  if (cue.size() < 4) return list;
  const std::size_t count =
      std::min<std::size_t>(le::Load32(cue.data()), (cue.size() - 4) / kCuePointSize);
  std::map<std::uint32_t, UString> names;
  std::map<std::uint32_t, std::int64_t> lengths;
  const Bytes adtl = BytesOf(CurrentChunk(kListTag));
  if (adtl.size() >= 4 && TagAt(adtl.data()) == kAdtlTag) {
    std::size_t at = 4;
    while (at + 8 <= adtl.size()) {
      const RIFFType tag = TagAt(adtl.data() + at);
      const std::size_t size = le::Load32(adtl.data() + at + 4);
      if (size > adtl.size() - at - 8) break;
      const std::uint8_t* p = adtl.data() + at + 8;
      if (tag == kLablTag && size >= 4) names[le::Load32(p)] = TextOf(p + 4, size - 4);
      if (tag == kLtxtTag && size >= 12 && TagAt(p + 8) == kRgnPurpose)
        lengths[le::Load32(p)] = le::Load32(p + 4);
      at += 8 + size + (size & 1);
    }
  }
  for (std::size_t i = 0; i < count; ++i) {
    const std::uint8_t* p = cue.data() + 4 + i * kCuePointSize;
    SoundFileRegionList::Entry entry;
    entry.mID = le::Load32(p);
    entry.mStart = std::int64_t{le::Load32(p + 20)};
    if (auto name = names.find(entry.mID); name != names.end()) entry.mName = name->second;
    if (auto length = lengths.find(entry.mID); length != lengths.end())
      entry.mLength = length->second;
    list->Add(std::move(entry));
  }
  return list;
}

void WAVESoundFileFormat::WriteRegionList(ReadWriteMetaDataAccess& access, RCBlobMT regions,
                                          std::uint32_t) {
  CheckAccess(access);
  const SoundFileRegionList list = SoundFileRegionList::Unflatten(regions);
  Bytes cue;
  Put32(cue, static_cast<std::uint32_t>(list.size()));
  Bytes adtl;
  PutTag(adtl, kAdtlTag);
  for (const auto& entry : list) {
    const auto start = static_cast<std::uint32_t>(entry.mStart.AsLongLong());
    Put32(cue, entry.mID);
    Put32(cue, start);
    PutTag(cue, kDataTag);
    Put32(cue, 0);
    Put32(cue, 0);
    Put32(cue, start);
    if (!entry.mName.empty()) {
      Bytes label;
      Put32(label, entry.mID);
      const std::string name = entry.mName.string(UString::kSystemEncoding);
      label.insert(label.end(), name.begin(), name.end());
      label.push_back(0);
      PutSubchunk(adtl, kLablTag, label);
    }
    if (!entry.IsMarker()) {
      Bytes text;
      Put32(text, entry.mID);
      Put32(text, static_cast<std::uint32_t>(entry.mLength.AsLongLong()));
      PutTag(text, kRgnPurpose);
      text.resize(text.size() + 8);  // country, language, dialect, code page
      PutSubchunk(adtl, kLtxtTag, text);
    }
  }
  WriteMetaData(access, kCueTag, BlobOf(cue));
  // Only our own kind of "LIST" is replaced (see the header).
  const Bytes current = BytesOf(DemandFileEditor().ReadChunkData(kListTag));
  if (current.empty() || (current.size() >= 4 && TagAt(current.data()) == kAdtlTag))
    WriteMetaData(access, kListTag, BlobOf(adtl));
}

// ------------------------------------------------------------ creation and length

SoundFileAttributes WAVESoundFileFormat::CreateFileOnDisk(const SoundFileAttributes& attributes,
                                                          SampleCount frames, bool recording,
                                                          const SoundFileAttributes& hint) {
  SoundFileAttributes out = attributes;
  const int channels = std::max<int>(attributes.mNumChannels, 1);
  out.mNumChannels = static_cast<std::int16_t>(channels);
  if (out.mBytesPerSample <= 0)
    out.mBytesPerSample = static_cast<std::int16_t>(GetBytesPerSample(attributes.mSampleFormat));
  if (out.mBytesPerFrame <= 0) out.mBytesPerFrame = out.mBytesPerSample * channels;
  const bool wave64 = attributes.mFileType == MakeRIFFType(".W64") ||
                      hint.mFileType == MakeRIFFType(".W64") ||
                      FileWillBeWave64(channels, frames, out.mBytesPerSample);
  ThrowOutCachedMetaDataPositions();
  WAVEWriter writer(GetFile(), attributes.mSampleRate, out.mBytesPerSample,
                    static_cast<std::int16_t>(channels), frames.AsLongLong(),
                    static_cast<std::int16_t>(out.mBytesPerFrame),
                    static_cast<std::uint32_t>(attributes.mSampleFormat), recording, wave64);
  writer.WriteHeader(recording ? 1u : 0u, frames.AsLongLong());
  writer.Close();
  out.mFileType = wave64 ? MakeRIFFType(".W64") : MakeRIFFType("WAVE");
  out.mOffsetToAudio = static_cast<std::int32_t>(writer.GetOffsetToAudio());
  out.mSamplesAreLSBFirst = true;
  return out;
}

void WAVESoundFileFormat::AdjustLengthInHeader(const SoundFileAttributes&, SampleCount frames) {
  WAVEReader& r = Reader();
  WAVEWriter writer(GetFile(), r.GetSampleRate(), static_cast<std::int16_t>(r.GetSampleSize()),
                    static_cast<std::int16_t>(r.GetNumberOfChannels()), 0,
                    static_cast<std::int16_t>(r.GetSampleFrameSize()),
                    static_cast<std::uint32_t>(r.GetSampleFormat()), r.HasRecIndicator(),
                    r.IsWave64());
  writer.SetOffsetToSoundDataHeader(r.GetOffsetToAudioHeader());
  writer.UpdateDataLength(frames.AsLongLong());
  writer.Close();
  ThrowOutCachedMetaDataPositions();
}

bool WAVESoundFileFormat::ShouldSwitchToExtendedFileFormat(const SampleCount& frames) {
  return FileWillBeWave64(Reader().GetNumberOfChannels(), frames, Reader().GetSampleSize());
}

void WAVESoundFileFormat::SwitchToExtendedFileFormat(const SampleCount& frames) {
  WAVEReader& r = Reader();
  if (r.IsWave64()) return;
  if (!r.CanSwitchToWave64())
    sffimpl::FailWithText(kErrorClass, kCannotSwitchErr,
                          "the header has no room for the Wave64 form", GetFile());
  const std::int64_t audio = r.GetHeaderSize();
  const std::int64_t dataHeader = audio - WAVEWriter::GetChunkHeaderSize(true);
  const std::int64_t dataLength = frames.AsLongLong() * r.GetSampleFrameSize();
  CFileStream stream(GetFile(), WAVEWriter::kStreamBufferSize);
  stream.Open(kTCLReadWriteMode);
  const std::int64_t fileEnd = std::max(stream.Size(), audio + dataLength);
  Bytes header = WAVEWriter::MakeChunkHeader(MakeRIFFType("RIFF"),
                                             static_cast<std::uint64_t>(fileEnd) - 24, true);
  const UUIDObj wave = GetWaveRIFFFormatHandler().UUIDForTag(MakeRIFFType("WAVE"), true);
  header.insert(header.end(), wave.GetBytes().begin(), wave.GetBytes().end());
  // The chunks before the audio, in their Wave64 form; junk is dropped.
  for (const auto& chunk : r.GetChunks()) {
    if (chunk.offset >= r.GetOffsetToAudioHeader()) break;
    if (chunk.tag == kJunkTag || chunk.tag == MakeRIFFType("junk") ||
        chunk.tag == MakeRIFFType("PAD ") || chunk.tag == MakeRIFFType("FLLR"))
      continue;
    Bytes payload(static_cast<std::size_t>(chunk.length));
    stream.MoveTo(chunk.offset + 8);
    if (!payload.empty())
      stream.GetRawDataFromStream(payload.data(), static_cast<int>(payload.size()));
    if (chunk.tag == kRecTag && payload.size() == 4)  // the value twice, as new files have it
      payload.insert(payload.end(), payload.begin(), payload.end());
    const Bytes chunkHeader =
        WAVEWriter::MakeChunkHeader(chunk.tag, chunk.tag == kRecTag ? 4u : payload.size(), true);
    header.insert(header.end(), chunkHeader.begin(), chunkHeader.end());
    header.insert(header.end(), payload.begin(), payload.end());
    header.resize(static_cast<std::size_t>(
        WAVEWriter::PadDataLength(static_cast<std::int64_t>(header.size()), true)));
  }
  const std::int64_t gap = dataHeader - static_cast<std::int64_t>(header.size());
  if (gap > 0) {
    const Bytes junk =
        WAVEWriter::MakeChunkHeader(kJunkTag, static_cast<std::uint64_t>(gap) - 24, true);
    header.insert(header.end(), junk.begin(), junk.end());
    header.resize(static_cast<std::size_t>(dataHeader));
  }
  const Bytes data =
      WAVEWriter::MakeChunkHeader(kDataTag, static_cast<std::uint64_t>(dataLength), true);
  header.insert(header.end(), data.begin(), data.end());
  stream.MoveTo(0);
  stream.PutRawDataToStream(header.data(), static_cast<int>(header.size()));
  stream.Close();
  ThrowOutCachedMetaDataPositions();
}

bool WAVESoundFileFormat::AudioDataIsZeroLength() { return Reader().GetNumberOfFrames() == 0; }

void WAVESoundFileFormat::RecoverCrashedRecording() {
  WAVEReader& r = Reader();
  if (!r.CanParse()) return;
  const auto& chunks = r.GetChunks();
  if (chunks.empty() || chunks.back().tag != kDataTag) return;  // metadata after the audio
  // The audio runs to the end of the file: every whole frame there reached
  // the disk, whether the header was last written with no length, with the
  // length of an earlier flush, or (a torn size field) with more than the
  // file holds. Only the pad byte(s) after a declared length are no audio.
  const std::int64_t room = r.GetFileLength() - r.GetHeaderSize();
  const std::int64_t declared = r.GetDataLength();
  const std::int64_t frameSize = r.GetSampleFrameSize();
  if (room <= 0 || frameSize <= 0) return;
  if (declared != 0 && declared <= room &&
      (room <= WAVEWriter::PadDataLength(declared, r.IsWave64()) ||
       room / frameSize <= declared / frameSize))
    return;
  const SampleCount frames = room / frameSize;
  if (ShouldSwitchToExtendedFileFormat(frames) && r.CanSwitchToWave64())
    SwitchToExtendedFileFormat(frames);
  AdjustLengthInHeader(GetFileAttributes(), frames);
}

void WAVESoundFileFormat::GetRawHeader(std::vector<std::uint8_t>& header) {
  header = Reader().GetRawHeader();
}

}  // namespace tarn
