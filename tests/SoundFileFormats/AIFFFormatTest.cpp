// AIFFSoundFileFormat: attributes of new and foreign files, metadata kept
// pending and written in place, loops and markers that other programs see,
// tempo, length changes, and chunks it does not know surviving every edit
// with the audio bytes untouched.

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "SoundFileFormats/AIFFTestUtil.h"
#include "tarn/Audio/SoundFileFormats/AIFFReader.h"
#include "tarn/Audio/SoundFileFormats/AIFFSoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"

#ifdef TARN_TEST_DECODERS
#include <sndfile.h>
#endif

namespace tarn::test {
namespace {

constexpr RIFFType T(const char (&code)[5]) { return MakeRIFFType(code); }

Bytes BlobBytes(const RCBlobMT& blob) {
  return Bytes(blob.GetPtr(), blob.GetPtr() + blob.GetSize());
}
RCBlobMT Blob(const Bytes& bytes) { return RCBlobMT(bytes.data(), bytes.size()); }

// The payload of every chunk, in file order, by a walk done here.
std::vector<std::pair<RIFFType, Bytes>> Chunks(const Bytes& file) {
  std::vector<std::pair<RIFFType, Bytes>> out;
  for (std::size_t pos = 12; pos + 8 <= file.size();) {
    const std::size_t size = Get32(file, pos + 4);
    const std::size_t end = std::min(file.size(), pos + 8 + size);
    out.emplace_back(Get32(file, pos), Bytes(file.begin() + static_cast<std::ptrdiff_t>(pos + 8),
                                             file.begin() + static_cast<std::ptrdiff_t>(end)));
    pos += 8 + size + (size & 1);
  }
  return out;
}

Bytes PayloadOf(const Bytes& file, RIFFType tag) {
  for (auto& [t, payload] : Chunks(file))
    if (t == tag) return payload;
  return {};
}

SoundFileFormatLoop LoopOf(std::int64_t start, std::int64_t end) {
  SoundFileFormatLoop loop;
  loop.mStart = start;
  loop.mEnd = end;
  return loop;
}

class AIFFFormatTest : public ::testing::Test {
 protected:
  // A 16-bit stereo AIFF at 44.1 kHz with `frames` frames of known audio,
  // and chunks no AIFF code here knows before and after the audio (one of
  // them odd-sized).
  std::filesystem::path MakeFile(int frames, const std::string& name = "file.aif") {
    audio_ = MakeRamp(2, frames, 16, false, false).bytes;
    const Bytes image =
        FormImage(T("AIFF"), {{T("ANNO"), Text("made by hand")},
                              {T("COMM"), Comm(2, static_cast<std::uint32_t>(frames), 16, 44100)},
                              {T("APPL"), Pattern(7)},
                              {T("SSND"), Ssnd(0, audio_)},
                              {T("ID3 "), Pattern(9, 3)}});
    const auto path = dir_.Path(name);
    WriteFile(path, image);
    return path;
  }

  static void ExpectAudio(const std::filesystem::path& path, const Bytes& audio) {
    const Bytes file = ReadFile(path);
    AIFFReader reader(SpecOf(path));
    ASSERT_TRUE(reader.CanParse());
    const auto at = static_cast<std::size_t>(reader.GetHeaderSize());
    ASSERT_LE(at + audio.size(), file.size());
    EXPECT_TRUE(
        std::equal(audio.begin(), audio.end(), file.begin() + static_cast<std::ptrdiff_t>(at)));
    EXPECT_EQ(Get32(file, 4), file.size() - 8);
  }

  // The unknown chunks of MakeFile, still there with their bytes.
  static void ExpectForeignChunks(const std::filesystem::path& path) {
    const Bytes file = ReadFile(path);
    EXPECT_EQ(PayloadOf(file, T("ANNO")), Text("made by hand"));
    EXPECT_EQ(PayloadOf(file, T("APPL")), Pattern(7));
    EXPECT_EQ(PayloadOf(file, T("ID3 ")), Pattern(9, 3));
  }

  TempDir dir_;
  Bytes audio_;
};

TEST_F(AIFFFormatTest, NewFilesHaveTheAttributesAsked) {
  struct Case {
    std::uint32_t type;
    std::int16_t channels;
    double rate;
    SampleFormat format;
    bool lsbFirst;
    std::int32_t offset;
  };
  const Case cases[] = {
      {T("AIFF"), 2, 44100, kSamp16, false, 54},
      {T("AIFF"), 1, 96000, kSamp24, false, 54},
      {T("AIFF"), 6, 48000, kSampUnpacked24, false, 54},
      {T("AIFC"), 2, 48000, kSamp16, false, 86},
      {T("AIFF"), 2, 44100, kSamp16, true, 84},
      {T("AIFF"), 8, 192000, kSampFloat32, false, 92},
      {T("AIFF"), 1, 22050, kSampWide64B, false, 92},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(std::to_string(c.channels) + " channels, format " + std::to_string(c.format));
    const auto path = dir_.Path("new.aif");
    std::filesystem::remove(path);
    auto format = std::make_shared<AIFFSoundFileFormat>(SpecOf(path));
    SoundFileAttributes asked;
    asked.mFileType = c.type;
    asked.mNumChannels = c.channels;
    asked.mSampleRate = c.rate;
    asked.mSampleFormat = c.format;
    asked.mSamplesAreLSBFirst = c.lsbFirst;
    const SoundFileAttributes written = format->CreateFileOnDisk(asked, 1000, false, {});
    EXPECT_EQ(written.mOffsetToAudio, c.offset);
    EXPECT_EQ(written.mSampleFormat, c.format);
    EXPECT_EQ(written.mSamplesAreLSBFirst, c.lsbFirst);
    EXPECT_EQ(format->GetFileAttributes(), written);
    EXPECT_EQ(format->GetLengthInFrames(), SampleCount(1000));
    EXPECT_EQ(format->GetNaturalRate(), c.rate);
    EXPECT_EQ(format->GetChannelOrder(), HostChannelOrder::ForChannelCount(c.channels));
    EXPECT_EQ(std::filesystem::file_size(path), static_cast<std::uintmax_t>(c.offset));
  }
  auto format = std::make_shared<AIFFSoundFileFormat>(SpecOf(dir_.Path("bad.aif")));
  SoundFileAttributes bad;
  bad.mNumChannels = 2;
  bad.mSampleRate = 44100;
  bad.mSampleFormat = kSamp24;
  bad.mSamplesAreLSBFirst = true;  // no little-endian 24-bit AIFF
  EXPECT_EQ(ErrorOf([&] { (void)format->CreateFileOnDisk(bad, 0, false, {}); })->GetIntErrorCode(),
            -50);
}

TEST_F(AIFFFormatTest, TheCacheMakesItForAIFFFiles) {
  const auto path = MakeFile(10, "cached.aif");
  auto format = SoundFileFormatCache::Instance().GetFormat(SpecOf(path));
  ASSERT_NE(dynamic_cast<AIFFSoundFileFormat*>(format.get()), nullptr);
  EXPECT_EQ(format->GetLengthInFrames(), SampleCount(10));
  EXPECT_TRUE(format->MatchesExtension(UString("AIF")));
  EXPECT_TRUE(format->MatchesExtension(UString(".aifc")));
  EXPECT_FALSE(format->MatchesExtension(UString("wav")));
  std::vector<std::uint8_t> header;
  format->GetRawHeader(header);
  EXPECT_EQ(header.size(), static_cast<std::size_t>(format->GetFileAttributes().mOffsetToAudio));
}

TEST_F(AIFFFormatTest, WritesArePendingUntilTheHandleGoesAndSameBytesAreNotWritten) {
  const auto path = MakeFile(20);
  const Bytes before = ReadFile(path);
  auto format = std::make_shared<AIFFSoundFileFormat>(SpecOf(path));
  {
    auto rw = format->GetReadWriteMetaDataAccess();
    format->WriteMetaData(*rw, T("NAME"), Blob(Text("A tone")));
    format->WriteMetaData(*rw, T("ANNO"), Blob(Text("made by hand")));  // as the file holds it
    EXPECT_EQ(ReadFile(path), before);
    EXPECT_TRUE(format->HasMetaData(*rw, T("NAME")));
    EXPECT_EQ(BlobBytes(format->ReadMetaData(*rw, T("NAME"))), Text("A tone"));
    EXPECT_FALSE(format->HasMetaData(*rw, T("AUTH")));
  }
  const Bytes after = ReadFile(path);
  EXPECT_EQ(PayloadOf(after, T("NAME")), Text("A tone"));
  EXPECT_EQ(Chunks(after).size(), Chunks(before).size() + 1);  // ANNO not written again
  ExpectForeignChunks(path);
  ExpectAudio(path, audio_);

  // The same bytes again: the file is not touched at all.
  const auto time = std::filesystem::last_write_time(path);
  {
    auto rw = format->GetReadWriteMetaDataAccess();
    format->WriteMetaData(*rw, T("NAME"), Blob(Text("A tone")));
  }
  EXPECT_EQ(ReadFile(path), after);
  EXPECT_EQ(std::filesystem::last_write_time(path), time);

  // Dropped changes never reach the file.
  {
    auto rw = format->GetReadWriteMetaDataAccess();
    format->WriteMetaData(*rw, T("AUTH"), Blob(Text("Somebody")));
    format->CleanMetaDataMods();
    EXPECT_FALSE(format->HasMetaData(*rw, T("AUTH")));
  }
  EXPECT_EQ(ReadFile(path), after);
}

TEST_F(AIFFFormatTest, LoopsRoundTripAndOtherProgramsSeeThem) {
  const auto path = MakeFile(1000);
  auto format = std::make_shared<AIFFSoundFileFormat>(SpecOf(path));
  SoundFileFormatLoop sustain;
  sustain.mStart = 100;
  sustain.mEnd = 600;
  sustain.mName = UString("Sustain");
  SoundFileFormatLoop release;
  release.mStart = 700;
  release.mEnd = 900;
  release.mType = SoundFileFormatLoop::Type::kAlternating;
  {
    auto rw = format->GetReadWriteMetaDataAccess();
    EXPECT_EQ(format->NumberOfLoops(*rw), 0);
    format->AddFileLoops(*rw, {sustain, release});
    EXPECT_EQ(format->NumberOfLoops(*rw), 2);
    EXPECT_EQ(ErrorOf([&] {
                format->AddFileLoops(*rw, {sustain, sustain, sustain});
              })->GetIntErrorCode(),
              -50);
    SoundFileFormatLoop backward = sustain;
    backward.mType = SoundFileFormatLoop::Type::kBackward;
    EXPECT_EQ(ErrorOf([&] { format->AddFileLoops(*rw, {backward}); })->GetIntErrorCode(), -50);
  }
  ExpectForeignChunks(path);
  ExpectAudio(path, audio_);

  auto fresh = std::make_shared<AIFFSoundFileFormat>(SpecOf(path));
  auto ro = fresh->GetReadOnlyMetaDataAccess();
  ASSERT_EQ(fresh->NumberOfLoops(*ro), 2);
  SoundFileFormatLoop loop;
  fresh->GetFileLoop(*ro, 0, loop);
  EXPECT_EQ(loop.mStart, SampleCount(100));
  EXPECT_EQ(loop.mEnd, SampleCount(600));
  EXPECT_EQ(loop.mType, SoundFileFormatLoop::Type::kForward);
  EXPECT_EQ(loop.mName, UString("Sustain"));
  fresh->GetFileLoop(*ro, 1, loop);
  EXPECT_EQ(loop.mStart, SampleCount(700));
  EXPECT_EQ(loop.mEnd, SampleCount(900));
  EXPECT_EQ(loop.mType, SoundFileFormatLoop::Type::kAlternating);
  EXPECT_EQ(ErrorOf([&] { fresh->GetFileLoop(*ro, 2, loop); })->GetIntErrorCode(), -50);
  // Loop markers are not markers of the region list.
  EXPECT_TRUE(fresh->GetRegionList(*ro)->empty());

#ifdef TARN_TEST_DECODERS
  SF_INFO info{};
  SNDFILE* sf = sf_open(path.c_str(), SFM_READ, &info);
  ASSERT_NE(sf, nullptr);
  SF_INSTRUMENT inst{};
  ASSERT_EQ(sf_command(sf, SFC_GET_INSTRUMENT, &inst, sizeof inst), SF_TRUE);
  // libsndfile finds both loops through their markers; it reports every
  // AIFF loop as forward, whatever its play mode.
  ASSERT_EQ(inst.loop_count, 2);
  EXPECT_EQ(inst.loops[0].mode, SF_LOOP_FORWARD);
  EXPECT_EQ(inst.loops[0].start, 100u);
  EXPECT_EQ(inst.loops[0].end, 600u);
  EXPECT_EQ(inst.loops[1].start, 700u);
  EXPECT_EQ(inst.loops[1].end, 900u);
  sf_close(sf);
#endif
}

TEST_F(AIFFFormatTest, RegionListRoundTripsAndItsPointsAreMarkers) {
  const auto path = MakeFile(5000);
  auto format = std::make_shared<AIFFSoundFileFormat>(SpecOf(path));
  SoundFileRegionList list;
  list.Add({7, UString("Hit"), 1000, 0});
  list.Add({3, UString("Verse"), 2000, 1500});
  list.Add({0, UString("Late"), 4000, 0});
  {
    auto rw = format->GetReadWriteMetaDataAccess();
    format->AddFileLoops(*rw, {LoopOf(10, 20)});
    format->WriteRegionList(*rw, list.Flatten(), 0);
  }
  ExpectForeignChunks(path);
  ExpectAudio(path, audio_);
  auto fresh = std::make_shared<AIFFSoundFileFormat>(SpecOf(path));
  auto ro = fresh->GetReadOnlyMetaDataAccess();
  EXPECT_EQ(*fresh->GetRegionList(*ro), list);
  EXPECT_EQ(fresh->NumberOfLoops(*ro), 1);  // the loop's markers stayed

  // "MARK" holds the loop's two points and every marker and region edge.
  const auto markers =
      AIFFSoundFileFormat::ParseMarkers(Blob(PayloadOf(ReadFile(path), T("MARK"))));
  std::vector<std::uint32_t> positions;
  for (const auto& m : markers) positions.push_back(m.position);
  std::sort(positions.begin(), positions.end());
  EXPECT_EQ(positions, (std::vector<std::uint32_t>{10, 20, 1000, 2000, 3500, 4000}));
  std::vector<std::int16_t> ids;
  for (const auto& m : markers) ids.push_back(m.id);
  std::sort(ids.begin(), ids.end());
  EXPECT_EQ(std::adjacent_find(ids.begin(), ids.end()), ids.end()) << "marker ids repeat";

  // Without the library's own chunk the markers alone are the list.
  {
    auto rw = fresh->GetReadWriteMetaDataAccess();
    RIFFFileEditor editor(SpecOf(path), kRIFFBigEndian, GetAIFFRIFFFormatHandler());
    editor.ReadChunkLocations(nullptr);
    editor.MaybeJunkSegment(T("regn"));
    editor.AddChunkData({T("NAME"), {}, Blob(Text("x"))}, T("SSND"));
  }
  auto plain = std::make_shared<AIFFSoundFileFormat>(SpecOf(path));
  auto ro2 = plain->GetReadOnlyMetaDataAccess();
  EXPECT_EQ(plain->GetRegionList(*ro2)->size(), 4u);
}

TEST_F(AIFFFormatTest, TempoMeterRecordFlagAndNamedMetaData) {
  const auto path = MakeFile(88200);  // two seconds
  auto format = std::make_shared<AIFFSoundFileFormat>(SpecOf(path));
  float tempo = 0;
  SampleCount sync;
  short root = 0, num = 0, den = 0;
  EXPECT_FALSE(format->HasFileTempoAndSyncPoint(tempo, sync));
  EXPECT_FALSE(format->HasFileMeterAndPitch(root, num, den));
  {
    auto rw = format->GetReadWriteMetaDataAccess();
    format->WriteFileTempoData(*rw, 120.0f, 62, 3, 4, {}, 0, 0.0f);
    format->SetRecordFlagMetaData(*rw, 0x01020304);
    format->WriteNamedMetaData(*rw, UString("Take"), T("APPL"), Blob(Text("payload")));
  }
  ExpectAudio(path, audio_);
  EXPECT_TRUE(format->HasFileTempoAndSyncPoint(tempo, sync));
  EXPECT_FLOAT_EQ(tempo, 120.0f);  // 4 beats over two seconds
  EXPECT_EQ(sync, SampleCount(0));
  ASSERT_TRUE(format->HasFileMeterAndPitch(root, num, den));
  EXPECT_EQ(root, 62);
  EXPECT_EQ(num, 3);
  EXPECT_EQ(den, 4);
  auto ro = format->GetReadOnlyMetaDataAccess();
  EXPECT_EQ(BlobBytes(format->ReadMetaData(*ro, T("Rec!"))), (Bytes{1, 2, 3, 4}));
  EXPECT_EQ(BlobBytes(format->ReadNamedMetaData(*ro, UString("Take"), T("APPL"))), Text("payload"));
  EXPECT_TRUE(format->ReadNamedMetaData(*ro, UString("Other"), T("APPL")).IsEmpty());
  // The "APPL" chunk before the audio was junked in place, not lost
  // silently: the new one follows the audio.
  EXPECT_EQ(PayloadOf(ReadFile(path), T("JUNK")), Pattern(7));
}

TEST_F(AIFFFormatTest, ShorterAudioKeepsTheChunksAfterIt) {
  const auto path = MakeFile(100);
  auto format = std::make_shared<AIFFSoundFileFormat>(SpecOf(path));
  {
    auto rw = format->GetReadWriteMetaDataAccess();
    format->WriteMetaData(*rw, T("NAME"), Blob(Text("odd")));  // after the audio, odd size
  }
  for (int frames : {61, 60, 0}) {
    SCOPED_TRACE(frames);
    {
      auto rw = format->GetReadWriteMetaDataAccess();
      format->ChangeLengthInFrames(*rw, frames);
    }
    EXPECT_EQ(format->GetLengthInFrames(), SampleCount(frames));
    ExpectAudio(path, Bytes(audio_.begin(), audio_.begin() + frames * 4));
    ExpectForeignChunks(path);
    EXPECT_EQ(PayloadOf(ReadFile(path), T("NAME")), Text("odd"));
    const Bytes file = ReadFile(path);
    const std::size_t ssnd = FindSoundChunk(file);
    EXPECT_EQ(Get32(file, ssnd + 4), 8u + static_cast<std::uint32_t>(frames) * 4);
#ifdef TARN_TEST_DECODERS
    SF_INFO info{};
    SNDFILE* sf = sf_open(path.c_str(), SFM_READ, &info);
    ASSERT_NE(sf, nullptr);
    EXPECT_EQ(info.frames, frames);
    sf_close(sf);
#endif
  }
}

TEST_F(AIFFFormatTest, AppendedAudioAndTrailingChunksCut) {
  const auto path = dir_.Path("rec.aif");
  auto format = std::make_shared<AIFFSoundFileFormat>(SpecOf(path));
  SoundFileAttributes a;
  a.mFileType = T("AIFF");
  a.mNumChannels = 1;
  a.mSampleRate = 8000;
  a.mSampleFormat = kSamp8;
  const SoundFileAttributes written = format->CreateFileOnDisk(a, 0, true, {});
  EXPECT_TRUE(format->AudioDataIsZeroLength());
  const Ramp ramp = MakeRamp(1, 77, 8, false, false);
  Bytes file = ReadFile(path);
  file.insert(file.end(), ramp.bytes.begin(), ramp.bytes.end());
  WriteFile(path, file);
  {
    auto rw = format->GetReadWriteMetaDataAccess();
    format->UpdateLengthAfterAppendingAudio(*rw, written);
  }
  EXPECT_EQ(format->GetLengthInFrames(), SampleCount(77));
  EXPECT_FALSE(format->AudioDataIsZeroLength());
  ExpectAudio(path, ramp.bytes);
  EXPECT_EQ(ReadFile(path).size(), 54u + 77 + 1);  // with the pad byte
  {
    auto rw = format->GetReadWriteMetaDataAccess();
    format->WriteMetaData(*rw, T("ANNO"), Blob(Text("note")));
  }
  format->RemoveTrailingMetaData();
  EXPECT_EQ(ReadFile(path).size(), 54u + 77 + 1);
  ExpectAudio(path, ramp.bytes);
}

// A chain of every kind of edit on one file: after each, the chunks the
// library does not know are there with their bytes and the audio is intact.
TEST_F(AIFFFormatTest, UnknownChunksSurviveEveryEdit) {
  const auto path = MakeFile(400);
  auto format = std::make_shared<AIFFSoundFileFormat>(SpecOf(path));
  const std::vector<std::function<void(ReadWriteMetaDataAccess&)>> edits = {
      [&](auto& rw) { format->WriteMetaData(rw, T("NAME"), Blob(Text("first"))); },
      [&](auto& rw) { format->WriteMetaData(rw, T("NAME"), Blob(Text("a longer name"))); },
      [&](auto& rw) { format->AddFileLoops(rw, {LoopOf(5, 50)}); },
      [&](auto& rw) {
        SoundFileRegionList list;
        list.Add({1, UString("m"), 30, 0});
        format->WriteRegionList(rw, list.Flatten(), 0);
      },
      [&](auto& rw) { format->WriteFileTempoData(rw, 90.0f, 60, 4, 4, {}, 0, 8.0f); },
      [&](auto& rw) { format->ChangeLengthInFrames(rw, 300); },
      [&](auto& rw) { format->AddFileLoops(rw, {}); },
      [&](auto& rw) { format->WriteMetaData(rw, T("AUTH"), Blob(Pattern(301))); },
  };
  int frames = 400;
  for (std::size_t i = 0; i < edits.size(); ++i) {
    SCOPED_TRACE(i);
    {
      auto rw = format->GetReadWriteMetaDataAccess();
      edits[i](*rw);
    }
    if (i == 5) frames = 300;
    ExpectForeignChunks(path);
    ExpectAudio(path, Bytes(audio_.begin(), audio_.begin() + frames * 4));
    RIFFFileEditor editor(SpecOf(path), kRIFFBigEndian, GetAIFFRIFFFormatHandler());
    editor.ReadChunkLocations(nullptr);
    EXPECT_EQ(
        editor.GetChunkList().back().first.offset + 8 + editor.GetChunkList().back().first.length,
        static_cast<std::int64_t>(ReadFile(path).size()));
  }
  auto ro = format->GetReadOnlyMetaDataAccess();
  EXPECT_EQ(format->NumberOfLoops(*ro), 0);
  EXPECT_EQ(BlobBytes(format->ReadMetaData(*ro, T("AUTH"))), Pattern(301));
}

}  // namespace
}  // namespace tarn::test
