// WAVESoundFileFormat and AIFFSoundFileFormat: new files, appended audio,
// metadata kept pending and written through the chunk editor (unknown
// chunks kept, audio untouched, the same bytes not written again), loops,
// markers and regions, tempo, length changes, the in-place switch to Wave64
// and the repair of a crashed recording.

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "SoundFileFormats/ChunkFileTestUtil.h"
#include "tarn/Audio/SoundFileFormats/AIFFReader.h"
#include "tarn/Audio/SoundFileFormats/AIFFSoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"
#include "tarn/Audio/SoundFileFormats/WAVEReader.h"
#include "tarn/Audio/SoundFileFormats/WAVESoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/WAVEWriter.h"

#ifdef TARN_TEST_DECODERS
#include <sndfile.h>
#endif

namespace tarn::test {
namespace {

namespace fs = std::filesystem;

Bytes Fmt16(int channels) {
  const auto ch = static_cast<std::uint64_t>(channels);
  return Cat({LE(1, 2), LE(ch, 2), LE(8000, 4), LE(16000 * ch, 4), LE(2 * ch, 2), LE(16, 2)});
}
SoundFileFormatLoop LoopOf(std::int64_t start, std::int64_t end) {
  SoundFileFormatLoop loop;
  loop.mStart = start;
  loop.mEnd = end;
  return loop;
}
std::shared_ptr<SoundFileFormat> Open(const fs::path& path, bool aiff) {
  if (aiff) return std::make_shared<AIFFSoundFileFormat>(SpecOf(path));
  return std::make_shared<WAVESoundFileFormat>(SpecOf(path));
}
// Runs `edit` with a read-write handle, released (and so written) after.
void Edit(SoundFileFormat& format, const std::function<void(ReadWriteMetaDataAccess&)>& edit) {
  auto rw = format.GetReadWriteMetaDataAccess();
  edit(*rw);
}

// Files with chunks no format code here knows before and after the audio
// (one of them odd-sized): `frames` frames of 16-bit stereo.
class Files : public ::testing::Test {
 protected:
  fs::path MakeAIFF(int frames, const std::string& name = "file.aif") {
    audio_ = MakeRamp(2, frames, 16, false, false).bytes;
    const auto path = dir_.Path(name);
    WriteFile(path, FormImage(T("AIFF"),
                              {{T("ANNO"), Text("made by hand")},
                               {T("COMM"), Comm(2, static_cast<std::uint32_t>(frames), 16, 44100)},
                               {T("APPL"), Pattern(7)},
                               {T("SSND"), Ssnd(0, audio_)},
                               {T("ID3 "), Pattern(9, 3)}}));
    return path;
  }
  fs::path MakeWAVE(int frames, Container c = Container::kRIFF) {
    audio_ = Pattern(static_cast<std::size_t>(frames) * 4);
    const auto path = dir_.Path("file.wav");
    WriteFile(path, FileImage({{T("fmt "), Fmt16(2)},
                               {T("qzma"), Text("before")},
                               {T("data"), audio_},
                               {T("qzsa"), Text("after!!")}},
                              c));
    return path;
  }
  // The AIFF audio as made, at the reader's offset, and the container size.
  void ExpectAIFFAudio(const fs::path& path, std::size_t frames) {
    const Bytes file = ReadFile(path);
    AIFFReader reader(SpecOf(path));
    ASSERT_TRUE(reader.CanParse());
    const auto at = static_cast<std::size_t>(reader.GetHeaderSize());
    ASSERT_LE(at + frames * 4, file.size());
    EXPECT_EQ(Slice(file, at, at + frames * 4), Slice(audio_, 0, frames * 4));
    EXPECT_EQ(Get32(file, 4), file.size() - 8);
  }
  // The unknown chunks of MakeAIFF, still there with their bytes.
  static void ExpectForeignAIFFChunks(const fs::path& path) {
    const Bytes file = ReadFile(path);
    EXPECT_EQ(FormPayload(file, T("ANNO")), Text("made by hand"));
    EXPECT_EQ(FormPayload(file, T("APPL")), Pattern(7));
    EXPECT_EQ(FormPayload(file, T("ID3 ")), Pattern(9, 3));
  }
  TempDir dir_;
  Bytes audio_;
};

// ------------------------------------------------------------ both formats

TEST_F(Files, NewFilesHaveTheAttributesAskedAndGrowByAppendedAudio) {
  const struct {
    bool aiff;
    std::uint32_t type;  // the asked type, or the hint's for WAVE
    std::int16_t channels;
    double rate;
    SampleFormat format;
    bool lsbFirst, recording;
    std::int32_t offset;
    std::uint32_t written;  // the file type written
  } cases[] = {
      {true, T("AIFF"), 2, 44100, kSamp16, false, false, 54, T("AIFF")},
      {true, T("AIFF"), 1, 96000, kSamp24, false, false, 54, T("AIFF")},
      {true, T("AIFF"), 6, 48000, kSampUnpacked24, false, false, 54, T("AIFF")},
      {true, T("AIFC"), 2, 48000, kSamp16, false, false, 86, T("AIFC")},
      {true, T("AIFF"), 2, 44100, kSamp16, true, false, 84, T("AIFC")},
      {true, T("AIFF"), 8, 192000, kSampFloat32, false, false, 92, T("AIFC")},
      {true, T("AIFF"), 1, 22050, kSampWide64B, false, false, 92, T("AIFC")},
      {true, T("AIFF"), 1, 8000, kSamp8, false, true, 54, T("AIFF")},
      {false, 0, 1, 48000, kSamp16, true, false, 992, T("WAVE")},
      {false, 0, 2, 48000, kSamp24, true, true, 1024, T("WAVE")},
      {false, 0, 6, 48000, kSampFloat32, true, false, 1016, T("WAVE")},
      {false, T(".W64"), 2, 48000, kSamp16, true, false, 992, T(".W64")},
      {false, T(".W64"), 8, 48000, kSamp24, true, true, 1048, T(".W64")},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(testing::Message() << c.aiff << " " << c.channels << " channels, format "
                                    << c.format << " offset " << c.offset);
    const auto path = dir_.Path("new");
    fs::remove(path);
    auto format = Open(path, c.aiff);
    SoundFileAttributes asked, hint;
    asked.mFileType = c.aiff ? c.type : 0;
    hint.mFileType = c.aiff ? 0 : c.type;
    asked.mNumChannels = c.channels;
    asked.mSampleRate = c.rate;
    asked.mSampleFormat = c.format;
    asked.mSamplesAreLSBFirst = c.lsbFirst;
    asked.mBytesPerSample = static_cast<std::int16_t>(GetBytesPerSample(c.format));
    asked.mBytesPerFrame = asked.mBytesPerSample * c.channels;
    const SampleCount hinted = c.aiff && !c.recording ? 1000 : 0;
    const SoundFileAttributes written = format->CreateFileOnDisk(asked, hinted, c.recording, hint);
    EXPECT_EQ(written.mOffsetToAudio, c.offset);
    EXPECT_EQ(written.mFileType, c.written);
    EXPECT_EQ(written.mSampleFormat, c.format);
    EXPECT_EQ(written.mSamplesAreLSBFirst, c.lsbFirst);
    EXPECT_EQ(format->GetFileAttributes(), written);
    EXPECT_EQ(format->GetLengthInFrames(), hinted);
    if (hinted == 0) {
      EXPECT_TRUE(format->AudioDataIsZeroLength());
    }
    EXPECT_EQ(format->IsExtendedFormat(), c.written == T(".W64"));
    EXPECT_EQ(format->GetNaturalRate(), c.rate);
    EXPECT_EQ(format->GetChannelOrder(), HostChannelOrder::ForChannelCount(c.channels));
    EXPECT_EQ(fs::file_size(path), static_cast<std::uintmax_t>(c.offset));

    const int frames = 77;  // odd: 8-bit mono audio needs its pad byte
    const Bytes audio = Pattern(static_cast<std::size_t>(frames * written.mBytesPerFrame));
    AppendFile(path, audio);
    Edit(*format, [&](auto& rw) { format->UpdateLengthAfterAppendingAudio(rw, written); });
    EXPECT_EQ(format->GetLengthInFrames(), frames);
    EXPECT_FALSE(format->AudioDataIsZeroLength());
    EXPECT_EQ(format->GetFileAttributes(), written);
    const Bytes file = ReadFile(path);
    EXPECT_EQ(Slice(file, static_cast<std::size_t>(c.offset), c.offset + audio.size()), audio);
    std::vector<std::uint8_t> raw;
    format->GetRawHeader(raw);
    EXPECT_EQ(raw, Slice(file, 0, static_cast<std::size_t>(c.offset)));
    if (c.aiff) {
      EXPECT_EQ(file.size(), c.offset + audio.size() + audio.size() % 2);
    } else {
      SampleCount stamp;
      EXPECT_TRUE(format->HasOriginalTimeStamp(stamp));
      EXPECT_EQ(stamp, 0);
    }
  }
  // No little-endian 24-bit AIFF.
  SoundFileAttributes bad;
  bad.mNumChannels = 2;
  bad.mSampleRate = 44100;
  bad.mSampleFormat = kSamp24;
  bad.mSamplesAreLSBFirst = true;
  EXPECT_EQ(
      CodeOf([&] { (void)Open(dir_.Path("bad.aif"), true)->CreateFileOnDisk(bad, 0, false, {}); }),
      -50);
}

// Writing the bytes a chunk already holds leaves the file untouched, its
// date included; dropped changes never reach the file.
TEST_F(Files, WritingWhatTheFileHoldsChangesNothing) {
  for (const bool aiff : {false, true}) {
    SCOPED_TRACE(aiff);
    const auto path = aiff ? MakeAIFF(20) : MakeWAVE(100);
    const Bytes before = ReadFile(path);
    const auto time = fs::last_write_time(path);
    auto format = Open(path, aiff);
    const RIFFType tag = aiff ? T("ANNO") : T("qzsa");
    const Bytes held = aiff ? Text("made by hand") : Text("after!!");
    Edit(*format, [&](auto& rw) {
      format->WriteMetaData(rw, tag, Blob(Text("other")));
      format->WriteMetaData(rw, tag, Blob(held));  // back again
    });
    EXPECT_EQ(ReadFile(path), before);
    EXPECT_EQ(fs::last_write_time(path), time);
    Edit(*format, [&](auto& rw) {
      format->WriteMetaData(rw, T("AUTH"), Blob(Text("Somebody")));
      format->CleanMetaDataMods();
      EXPECT_FALSE(format->HasMetaData(rw, T("AUTH")));
    });
    EXPECT_EQ(ReadFile(path), before);
  }
}

TEST_F(Files, TrailingMetadataIsRemovedAndTheSizesFollow) {
  for (const bool aiff : {false, true}) {
    SCOPED_TRACE(aiff);
    const auto path = aiff ? MakeAIFF(77) : MakeWAVE(100);
    auto format = Open(path, aiff);
    const std::size_t end = format->GetFileAttributes().mOffsetToAudio + audio_.size();
    format->RemoveTrailingMetaData();
    const Bytes file = ReadFile(path);
    ASSERT_EQ(file.size(), end);
    EXPECT_EQ(Slice(file, 4, 8), aiff ? BE(end - 8, 4) : LE(end - 8, 4));
    EXPECT_EQ(format->GetLengthInFrames(), static_cast<std::int64_t>(audio_.size() / 4));
  }
}

// ------------------------------------------------------------ AIFF

TEST_F(Files, AiffCacheMakesItAndItsWritesArePendingUntilTheHandleGoes) {
  const auto path = MakeAIFF(20, "cached.aif");
  auto format = SoundFileFormatCache::Instance().GetFormat(SpecOf(path));
  ASSERT_NE(dynamic_cast<AIFFSoundFileFormat*>(format.get()), nullptr);
  EXPECT_EQ(format->GetLengthInFrames(), SampleCount(20));
  EXPECT_TRUE(format->MatchesExtension(UString("AIF")));
  EXPECT_TRUE(format->MatchesExtension(UString(".aifc")));
  EXPECT_FALSE(format->MatchesExtension(UString("wav")));
  const Bytes before = ReadFile(path);
  Edit(*format, [&](auto& rw) {
    format->WriteMetaData(rw, T("NAME"), Blob(Text("A tone")));
    EXPECT_EQ(ReadFile(path), before);
    EXPECT_TRUE(format->HasMetaData(rw, T("NAME")));
    EXPECT_EQ(BytesOf(format->ReadMetaData(rw, T("NAME"))), Text("A tone"));
    EXPECT_FALSE(format->HasMetaData(rw, T("AUTH")));
  });
  const Bytes after = ReadFile(path);
  EXPECT_EQ(FormPayload(after, T("NAME")), Text("A tone"));
  EXPECT_EQ(WalkForm(after).size(), WalkForm(before).size() + 1);
  ExpectForeignAIFFChunks(path);
  ExpectAIFFAudio(path, 20);
}

TEST_F(Files, AiffLoopsRoundTripAndOtherProgramsSeeThem) {
  const auto path = MakeAIFF(1000);
  auto format = std::make_shared<AIFFSoundFileFormat>(SpecOf(path));
  SoundFileFormatLoop sustain = LoopOf(100, 600), release = LoopOf(700, 900);
  sustain.mName = UString("Sustain");
  release.mType = SoundFileFormatLoop::Type::kAlternating;
  Edit(*format, [&](auto& rw) {
    EXPECT_EQ(format->NumberOfLoops(rw), 0);
    format->AddFileLoops(rw, {sustain, release});
    EXPECT_EQ(format->NumberOfLoops(rw), 2);
    EXPECT_EQ(CodeOf([&] { format->AddFileLoops(rw, {sustain, sustain, sustain}); }), -50);
    SoundFileFormatLoop backward = sustain;
    backward.mType = SoundFileFormatLoop::Type::kBackward;
    EXPECT_EQ(CodeOf([&] { format->AddFileLoops(rw, {backward}); }), -50);
  });
  ExpectForeignAIFFChunks(path);
  ExpectAIFFAudio(path, 1000);
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
  EXPECT_EQ(CodeOf([&] { fresh->GetFileLoop(*ro, 2, loop); }), -50);
  EXPECT_TRUE(fresh->GetRegionList(*ro)->empty());  // loop markers are not markers of the list
#ifdef TARN_TEST_DECODERS
  SF_INFO info{};
  SNDFILE* sf = sf_open(path.c_str(), SFM_READ, &info);
  ASSERT_NE(sf, nullptr);
  SF_INSTRUMENT inst{};
  ASSERT_EQ(sf_command(sf, SFC_GET_INSTRUMENT, &inst, sizeof inst), SF_TRUE);
  sf_close(sf);
  // libsndfile finds both loops through their markers; it reports every
  // AIFF loop as forward, whatever its play mode.
  ASSERT_EQ(inst.loop_count, 2);
  EXPECT_EQ(inst.loops[0].mode, SF_LOOP_FORWARD);
  EXPECT_EQ(inst.loops[0].start, 100u);
  EXPECT_EQ(inst.loops[0].end, 600u);
  EXPECT_EQ(inst.loops[1].start, 700u);
  EXPECT_EQ(inst.loops[1].end, 900u);
#endif
}

TEST_F(Files, AiffRegionListRoundTripsAndItsPointsAreMarkers) {
  const auto path = MakeAIFF(5000);
  auto format = std::make_shared<AIFFSoundFileFormat>(SpecOf(path));
  SoundFileRegionList list;
  list.Add({7, UString("Hit"), 1000, 0});
  list.Add({3, UString("Verse"), 2000, 1500});
  list.Add({0, UString("Late"), 4000, 0});
  Edit(*format, [&](auto& rw) {
    format->AddFileLoops(rw, {LoopOf(10, 20)});
    format->WriteRegionList(rw, list.Flatten(), 0);
  });
  ExpectForeignAIFFChunks(path);
  ExpectAIFFAudio(path, 5000);
  {
    auto fresh = std::make_shared<AIFFSoundFileFormat>(SpecOf(path));
    auto ro = fresh->GetReadOnlyMetaDataAccess();
    EXPECT_EQ(*fresh->GetRegionList(*ro), list);
    EXPECT_EQ(fresh->NumberOfLoops(*ro), 1);  // the loop's markers stayed
  }
  // "MARK" holds the loop's two points and every marker and region edge,
  // each with an id of its own.
  std::vector<std::uint32_t> positions;
  std::vector<std::int16_t> ids;
  for (const auto& m :
       AIFFSoundFileFormat::ParseMarkers(Blob(FormPayload(ReadFile(path), T("MARK"))))) {
    positions.push_back(m.position);
    ids.push_back(m.id);
  }
  std::sort(positions.begin(), positions.end());
  std::sort(ids.begin(), ids.end());
  EXPECT_EQ(positions, (std::vector<std::uint32_t>{10, 20, 1000, 2000, 3500, 4000}));
  EXPECT_EQ(std::adjacent_find(ids.begin(), ids.end()), ids.end()) << "marker ids repeat";
  // Without the library's own chunk the markers alone are the list.
  {
    RIFFFileEditor editor(SpecOf(path), kRIFFBigEndian, GetAIFFRIFFFormatHandler());
    editor.ReadChunkLocations(nullptr);
    editor.MaybeJunkSegment(T("regn"));
    editor.AddChunkData({T("NAME"), {}, Blob(Text("x"))}, T("SSND"));
  }
  auto plain = std::make_shared<AIFFSoundFileFormat>(SpecOf(path));
  auto ro = plain->GetReadOnlyMetaDataAccess();
  EXPECT_EQ(plain->GetRegionList(*ro)->size(), 4u);
}

TEST_F(Files, AiffTempoMeterRecordFlagAndNamedMetaData) {
  const auto path = MakeAIFF(88200);  // two seconds
  auto format = std::make_shared<AIFFSoundFileFormat>(SpecOf(path));
  float tempo = 0;
  SampleCount sync;
  short root = 0, num = 0, den = 0;
  EXPECT_FALSE(format->HasFileTempoAndSyncPoint(tempo, sync));
  EXPECT_FALSE(format->HasFileMeterAndPitch(root, num, den));
  Edit(*format, [&](auto& rw) {
    format->WriteFileTempoData(rw, 120.0f, 62, 3, 4, {}, 0, 0.0f);
    format->SetRecordFlagMetaData(rw, 0x01020304);
    format->WriteNamedMetaData(rw, UString("Take"), T("APPL"), Blob(Text("payload")));
  });
  ExpectAIFFAudio(path, 88200);
  EXPECT_TRUE(format->HasFileTempoAndSyncPoint(tempo, sync));
  EXPECT_FLOAT_EQ(tempo, 120.0f);  // 4 beats over two seconds
  EXPECT_EQ(sync, SampleCount(0));
  ASSERT_TRUE(format->HasFileMeterAndPitch(root, num, den));
  EXPECT_EQ(root, 62);
  EXPECT_EQ(num, 3);
  EXPECT_EQ(den, 4);
  auto ro = format->GetReadOnlyMetaDataAccess();
  EXPECT_EQ(BytesOf(format->ReadMetaData(*ro, T("Rec!"))), (Bytes{1, 2, 3, 4}));
  EXPECT_EQ(BytesOf(format->ReadNamedMetaData(*ro, UString("Take"), T("APPL"))), Text("payload"));
  EXPECT_TRUE(format->ReadNamedMetaData(*ro, UString("Other"), T("APPL")).IsEmpty());
  // The "APPL" chunk before the audio was junked in place, not lost
  // silently: the new one follows the audio.
  EXPECT_EQ(FormPayload(ReadFile(path), T("JUNK")), Pattern(7));
}

TEST_F(Files, AiffShorterAudioKeepsTheChunksAfterIt) {
  const auto path = MakeAIFF(100);
  auto format = std::make_shared<AIFFSoundFileFormat>(SpecOf(path));
  Edit(*format, [&](auto& rw) { format->WriteMetaData(rw, T("NAME"), Blob(Text("odd"))); });
  for (int frames : {61, 60, 0}) {
    SCOPED_TRACE(frames);
    Edit(*format, [&](auto& rw) { format->ChangeLengthInFrames(rw, frames); });
    EXPECT_EQ(format->GetLengthInFrames(), SampleCount(frames));
    ExpectAIFFAudio(path, static_cast<std::size_t>(frames));
    ExpectForeignAIFFChunks(path);
    const Bytes file = ReadFile(path);
    EXPECT_EQ(FormPayload(file, T("NAME")), Text("odd"));
    EXPECT_EQ(Get32(file, FindFormChunk(file, T("SSND")) + 4),
              8u + static_cast<std::uint32_t>(frames) * 4);
#ifdef TARN_TEST_DECODERS
    SF_INFO info{};
    SNDFILE* sf = sf_open(path.c_str(), SFM_READ, &info);
    ASSERT_NE(sf, nullptr);
    EXPECT_EQ(info.frames, frames);
    sf_close(sf);
#endif
  }
}

// A chain of every kind of edit on one file: after each, the chunks the
// library does not know are there with their bytes, the audio is intact and
// the last chunk ends the file.
TEST_F(Files, AiffUnknownChunksSurviveEveryEdit) {
  const auto path = MakeAIFF(400);
  auto format = std::make_shared<AIFFSoundFileFormat>(SpecOf(path));
  SoundFileRegionList list;
  list.Add({1, UString("m"), 30, 0});
  const std::vector<std::function<void(ReadWriteMetaDataAccess&)>> edits = {
      [&](auto& rw) { format->WriteMetaData(rw, T("NAME"), Blob(Text("first"))); },
      [&](auto& rw) { format->WriteMetaData(rw, T("NAME"), Blob(Text("a longer name"))); },
      [&](auto& rw) { format->AddFileLoops(rw, {LoopOf(5, 50)}); },
      [&](auto& rw) { format->WriteRegionList(rw, list.Flatten(), 0); },
      [&](auto& rw) { format->WriteFileTempoData(rw, 90.0f, 60, 4, 4, {}, 0, 8.0f); },
      [&](auto& rw) { format->ChangeLengthInFrames(rw, 300); },
      [&](auto& rw) { format->AddFileLoops(rw, {}); },
      [&](auto& rw) { format->WriteMetaData(rw, T("AUTH"), Blob(Pattern(301))); },
  };
  for (std::size_t i = 0; i < edits.size(); ++i) {
    SCOPED_TRACE(i);
    Edit(*format, edits[i]);
    ExpectForeignAIFFChunks(path);
    ExpectAIFFAudio(path, i >= 5 ? 300 : 400);
    const auto chunks = WalkForm(ReadFile(path));
    EXPECT_EQ(
        chunks.back().offset + 8 + chunks.back().payload.size() + chunks.back().payload.size() % 2,
        ReadFile(path).size());
  }
  auto ro = format->GetReadOnlyMetaDataAccess();
  EXPECT_EQ(format->NumberOfLoops(*ro), 0);
  EXPECT_EQ(BytesOf(format->ReadMetaData(*ro, T("AUTH"))), Pattern(301));
}

// ------------------------------------------------------------ WAVE

TEST_F(Files, WaveMetadataRoundTripsKeepUnknownChunksAndAudio) {
  for (const Container c : {Container::kRIFF, Container::kWave64}) {
    SCOPED_TRACE(NameOf(c));
    const auto path = MakeWAVE(100, c);
    auto format = std::make_shared<WAVESoundFileFormat>(SpecOf(path));
    const std::int64_t audio = format->GetFileAttributes().mOffsetToAudio;
    const std::int64_t stamp = 3 * std::int64_t{0x7FFFFFFF} + 11;
    {
      auto rw = format->GetReadWriteMetaDataAccess();
      format->SaveStringToFile(*rw, WAVESoundFileFormat::kCommentString, UString("Take 7"));
      format->SaveStringToFile(*rw, WAVESoundFileFormat::kOriginatorString, UString("Tarn test"));
      format->WriteOriginalTimeStamp(*rw, stamp);
      format->WriteFileTempoData(*rw, 120.0f, 60, 3, 4, {}, 0, 4.0f);
      format->SetRecordFlagMetaData(*rw, 1);
      UString text;
      EXPECT_TRUE(format->GetStringFromFile(*rw, WAVESoundFileFormat::kCommentString, text));
      EXPECT_EQ(text, UString("Take 7"));  // pending changes are read back
      rw->Flush();
    }
    EXPECT_EQ(format->GetFileAttributes().mOffsetToAudio, audio);
    EXPECT_EQ(Slice(ReadFile(path), audio, audio + 400), audio_);
    WAVEReader reader(SpecOf(path));
    ASSERT_TRUE(reader.CanParse());
    EXPECT_EQ(reader.GetComment(), UString("Take 7"));
    EXPECT_EQ(reader.GetBroadcastExtension().mOriginator, "Tarn test");
    EXPECT_EQ(reader.GetOriginalTimeStamp(), stamp);
    EXPECT_TRUE(reader.HasRecIndicator());
    EXPECT_EQ(reader.GetRecIndicatorValue(), 1u);
    EXPECT_EQ(reader.GetNumberOfFrames(), 100);
    auto ro = format->GetReadOnlyMetaDataAccess();
    EXPECT_EQ(BytesOf(format->ReadMetaData(*ro, T("qzma"))), Text("before"));
    EXPECT_EQ(BytesOf(format->ReadMetaData(*ro, T("qzsa"))), Text("after!!"));
    SampleCount read;
    EXPECT_TRUE(format->HasOriginalTimeStamp(read));
    EXPECT_EQ(read, stamp);
    short root = 0, numerator = 0, denominator = 0;
    ASSERT_TRUE(format->HasFileMeterAndPitch(root, numerator, denominator));
    EXPECT_EQ(root, 60);
    EXPECT_EQ(numerator, 3);
    EXPECT_EQ(denominator, 4);
    float tempo = 0;
    SampleCount sync;
    ASSERT_TRUE(format->HasFileTempoAndSyncPoint(tempo, sync));
    EXPECT_EQ(tempo, 8000.0f / 25.0f * 60.0f);  // 100 frames over 4 beats
  }
}

TEST_F(Files, WaveLoopsAndRegionsInBothFormsAndAnInfoListKept) {
  for (const Container c : {Container::kRIFF, Container::kWave64}) {
    SCOPED_TRACE(NameOf(c));
    const auto path = dir_.Path("loops.wav");
    WriteFile(path, FileImage({{T("fmt "), Fmt16(1)}, {T("data"), Pattern(2000)}}, c));
    auto format = std::make_shared<WAVESoundFileFormat>(SpecOf(path));
    std::vector<SoundFileFormatLoop> loops{LoopOf(10, 200), LoopOf(300, 301)};
    loops[0].mID = 1;
    loops[1].mType = SoundFileFormatLoop::Type::kAlternating;
    loops[1].mPlayCount = 3;
    loops[1].mFraction = 0x80000000;
    loops[1].mID = 2;
    SoundFileRegionList regions;
    regions.Add({1, UString("Verse"), 100, 400});
    regions.Add({2, UString("Hit"), 50, 0});
    regions.Add({3, UString(), 700, 10});
    Edit(*format, [&](auto& rw) {
      format->AddFileLoops(rw, loops);
      format->WriteRegionList(rw, regions.Flatten(), 0);
    });
    auto ro = format->GetReadOnlyMetaDataAccess();
    ASSERT_EQ(format->NumberOfLoops(*ro), 2);
    for (short i = 0; i < 2; ++i) {
      SoundFileFormatLoop loop;
      format->GetFileLoop(*ro, i, loop);
      EXPECT_EQ(loop, loops[static_cast<std::size_t>(i)]);
    }
    SoundFileFormatLoop none;
    EXPECT_TRUE(ErrorOf([&] { format->GetFileLoop(*ro, 2, none); }));
    EXPECT_EQ(*format->GetRegionList(*ro), regions);
    const Bytes smpl = BytesOf(format->ReadMetaData(*ro, T("smpl")));
    ASSERT_EQ(smpl.size(), 36u + 2 * 24);
    EXPECT_EQ(Slice(smpl, 36 + 8, 36 + 16), Cat({LE(10, 4), LE(199, 4)}));
  }
  // Region names do not replace an INFO list the file holds.
  const Bytes info = Cat({Text("INFOINAM"), LE(4, 4), Text("Song")});
  const auto path = dir_.Path("info.wav");
  WriteFile(path, FileImage({{T("fmt "), Fmt16(1)}, {T("LIST"), info}, {T("data"), Pattern(200)}},
                            Container::kRIFF));
  auto format = std::make_shared<WAVESoundFileFormat>(SpecOf(path));
  SoundFileRegionList regions;
  regions.Add({5, UString("Named"), 10, 0});
  Edit(*format, [&](auto& rw) { format->WriteRegionList(rw, regions.Flatten(), 0); });
  auto ro = format->GetReadOnlyMetaDataAccess();
  const auto list = format->GetRegionList(*ro);
  ASSERT_EQ(list->size(), 1u);
  EXPECT_EQ((*list)[0].mStart, 10);
  EXPECT_EQ(BytesOf(format->ReadMetaData(*ro, T("LIST"))), info);
}

TEST_F(Files, WaveCrashedRecordingIsSizedFromTheFile) {
  for (const bool wave64 : {false, true}) {
    for (const std::uint64_t declared : {std::uint64_t{0}, std::uint64_t{0xFFFFFFFF}}) {
      SCOPED_TRACE(testing::Message() << wave64 << " " << declared);
      const auto path = dir_.Path("crash.wav");
      fs::remove(path);  // the writer writes over a file without shortening it
      {
        WAVEWriter writer(SpecOf(path), 48000.0, 2, 2, 0, 4, kSamp16, true, wave64);
        writer.WriteHeader(1, 0);
      }
      AppendFile(path, Pattern(4 * 250 + 3));  // a partial frame at the end
      if (declared != 0) {                     // a size field that claims more than the file has
        Bytes file = ReadFile(path);
        const Bytes size = LE(declared, wave64 ? 8 : 4);
        std::copy(size.begin(), size.end(), file.begin() + (wave64 ? 1000 + 16 : 1016 + 4));
        WriteFile(path, file);
      }
      auto format = std::make_shared<WAVESoundFileFormat>(SpecOf(path));
      EXPECT_EQ(format->GetLengthInFrames(), declared == 0 ? 0 : 250);  // clamped to the file
      format->RecoverCrashedRecording();
      EXPECT_EQ(format->GetLengthInFrames(), 250);
      WAVEReader reader(SpecOf(path));
      EXPECT_EQ(reader.GetDataLength(), 1000);
      EXPECT_EQ(reader.IsWave64(), wave64);
      const Bytes once = ReadFile(path);
      format->RecoverCrashedRecording();  // nothing left to do
      EXPECT_EQ(ReadFile(path), once);
    }
  }
  // A recording that runs past its size is fixed by the first metadata write.
  const auto path = dir_.Path("runs.wav");
  WriteFile(path, FileImage({{T("fmt "), Fmt16(1)}, {T("data"), Pattern(100), 0x7FFFFFF0}},
                            Container::kRIFF));
  auto format = std::make_shared<WAVESoundFileFormat>(SpecOf(path));
  Edit(*format, [&](auto& rw) {
    format->SaveStringToFile(rw, WAVESoundFileFormat::kCommentString, UString("late"));
  });
  WAVEReader reader(SpecOf(path));
  ASSERT_TRUE(reader.CanParse());
  EXPECT_EQ(reader.GetDataLength(), 100);
  EXPECT_EQ(reader.GetComment(), UString("late"));
}

TEST_F(Files, WaveSwitchToWave64InPlaceKeepsTheAudioWhereItIs) {
  const auto record = [](const fs::path& path, int channels, bool rec, bool wave64,
                         const BWFBroadcastWaveExtension* bext) {
    WAVEWriter writer(SpecOf(path), 44100.0, 3, static_cast<std::int16_t>(channels), 0,
                      static_cast<std::int16_t>(3 * channels), kSamp24, rec, wave64);
    if (bext != nullptr) writer.SetBroadcastExtension(*bext);
    writer.WriteHeader(7, 50);
    const Bytes audio = Pattern(static_cast<std::size_t>(150 * channels));
    writer.GetStream().PutRawDataToStream(audio.data(), static_cast<int>(audio.size()));
  };
  for (const int channels : {1, 2, 3, 8}) {
    for (const bool rec : {false, true}) {
      SCOPED_TRACE(testing::Message() << channels << " rec " << rec);
      const auto path = dir_.Path("switch.wav");
      fs::remove(path);
      fs::remove(dir_.Path("fresh.w64"));
      record(path, channels, rec, false, nullptr);
      const Bytes before = ReadFile(path);
      auto format = std::make_shared<WAVESoundFileFormat>(SpecOf(path));
      const auto offset = static_cast<std::size_t>(format->GetFileAttributes().mOffsetToAudio);
      // A RIFF recording with room to switch may grow as far as Wave64 does.
      EXPECT_EQ(format->GetMaxFrameCount(),
                SoundFileFormatCache::GetMaxFrameCountForType(T(".W64"), 3 * channels));
      format->SwitchToExtendedFileFormat(50);
      EXPECT_TRUE(format->IsExtendedFormat());
      EXPECT_EQ(format->GetFileAttributes().mOffsetToAudio, static_cast<std::int32_t>(offset));
      EXPECT_EQ(format->GetFileAttributes().mFileType, T(".W64"));
      EXPECT_EQ(format->GetLengthInFrames(), 50);
      const Bytes file = ReadFile(path);
      ASSERT_EQ(file.size(), before.size());
      EXPECT_EQ(Slice(file, offset, file.size()), Slice(before, offset, before.size()));
      WAVEReader reader(SpecOf(path));
      EXPECT_EQ(reader.HasRecIndicator(), rec);
      EXPECT_EQ(reader.GetRecIndicatorValue(), rec ? 7u : 0u);
      EXPECT_EQ(reader.GetBroadcastExtension().mOriginator, "TarnCore");
      // The header is the one a new Wave64 recording of the same kind gets
      // (with the same broadcast extension, date and time included).
      record(dir_.Path("fresh.w64"), channels, rec, true, &reader.GetBroadcastExtension());
      EXPECT_EQ(ReadFile(dir_.Path("fresh.w64")), file);
    }
  }
  // Without room to switch, the file stops where 32-bit sizes do.
  auto tight = std::make_shared<WAVESoundFileFormat>(SpecOf(MakeWAVE(100)));
  ExpectError([&] { tight->SwitchToExtendedFileFormat(100); }, "WAVESoundFileFormat",
              WAVESoundFileFormat::kCannotSwitchErr);
  EXPECT_FALSE(tight->IsExtendedFormat());
  EXPECT_EQ(tight->GetMaxFrameCount(), SoundFileFormatCache::GetMaxFrameCountForType(T(".wav"), 4));
  // 2 channels of 4 bytes: 8 bytes per frame; the largest standard header
  // (with a recording indicator) is 1024 bytes.
  const std::int64_t limit = (0xFFFFFFFFll + 8 - 1024) / 8;
  EXPECT_FALSE(WAVESoundFileFormat::FileWillBeWave64(2, limit));
  EXPECT_TRUE(WAVESoundFileFormat::FileWillBeWave64(2, limit + 1));
  EXPECT_FALSE(WAVESoundFileFormat::FileWillBeWave64(1, 1000));
  EXPECT_TRUE(WAVESoundFileFormat::FileWillBeWave64(2, limit + 1, 4));
  EXPECT_FALSE(WAVESoundFileFormat::FileWillBeWave64(2, limit + 1, 2));
}

}  // namespace
}  // namespace tarn::test
