// WAVESoundFileFormat: new files, metadata round trips through the chunk
// editor (unknown chunks kept, audio untouched), the in-place switch to
// Wave64 and the repair of a crashed recording.

#include <gtest/gtest.h>

#include <filesystem>

#include "SoundFileFormats/ChunkFileTestUtil.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"
#include "tarn/Audio/SoundFileFormats/WAVEReader.h"
#include "tarn/Audio/SoundFileFormats/WAVESoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/WAVEWriter.h"

namespace tarn::test {
namespace {

namespace fs = std::filesystem;

const RIFFType kFmt = MakeRIFFType("fmt ");
const RIFFType kData = MakeRIFFType("data");

Bytes Fmt16(int channels) {
  Bytes b = LE(1, 2);
  for (const auto& part : {LE(static_cast<std::uint64_t>(channels), 2), LE(8000, 4),
                           LE(8000u * 2 * static_cast<std::uint64_t>(channels), 4),
                           LE(2 * static_cast<std::uint64_t>(channels), 2), LE(16, 2)})
    b.insert(b.end(), part.begin(), part.end());
  return b;
}

SoundFileAttributes Attributes(int channels, SampleFormat format, double rate = 48000.0) {
  SoundFileAttributes a;
  a.mNumChannels = static_cast<std::int16_t>(channels);
  a.mSampleRate = rate;
  a.mSampleFormat = format;
  a.mBytesPerSample = static_cast<std::int16_t>(GetBytesPerSample(format));
  a.mBytesPerFrame = a.mBytesPerSample * channels;
  return a;
}

// Appends `bytes` to the file at `path`.
void Append(const fs::path& path, const Bytes& bytes) {
  std::ofstream out(path, std::ios::binary | std::ios::app);
  out.write(reinterpret_cast<const char*>(bytes.data()),
            static_cast<std::streamsize>(bytes.size()));
}

TEST(WAVEFormat, CreateAppendAndReadBack) {
  struct Case {
    int channels;
    SampleFormat format;
    std::uint32_t hintType;
    bool recording;
    bool wave64;
    std::int64_t audio;
  };
  const Case cases[] = {
      {1, kSamp16, 0, false, false, 992},
      {2, kSamp24, 0, true, false, 1024},
      {6, kSampFloat32, 0, false, false, 1016},
      {2, kSamp16, MakeRIFFType(".W64"), false, true, 992},
      {8, kSamp24, MakeRIFFType(".W64"), true, true, 1048},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(testing::Message() << c.channels << " ch, w64 " << c.wave64);
    TempDir dir;
    const auto path = dir.Path("new.wav");
    auto format = std::make_shared<WAVESoundFileFormat>(SpecOf(path));
    SoundFileAttributes hint;
    hint.mFileType = c.hintType;
    const auto written =
        format->CreateFileOnDisk(Attributes(c.channels, c.format), 0, c.recording, hint);
    EXPECT_EQ(written.mOffsetToAudio, c.audio);
    EXPECT_EQ(written.mFileType, c.wave64 ? MakeRIFFType(".W64") : MakeRIFFType("WAVE"));
    EXPECT_EQ(format->GetLengthInFrames(), 0);
    EXPECT_TRUE(format->AudioDataIsZeroLength());

    const int frameSize = written.mBytesPerFrame;
    Append(path, Pattern(static_cast<std::size_t>(100 * frameSize)));
    {
      auto rw = format->GetReadWriteMetaDataAccess();
      format->UpdateLengthAfterAppendingAudio(*rw, written);
    }
    EXPECT_EQ(format->GetLengthInFrames(), 100);
    const auto attributes = format->GetFileAttributes();
    EXPECT_EQ(attributes.mNumChannels, c.channels);
    EXPECT_EQ(attributes.mSampleRate, 48000.0);
    EXPECT_EQ(attributes.mSampleFormat, c.format);
    EXPECT_EQ(attributes.mOffsetToAudio, c.audio);
    EXPECT_EQ(attributes.mFileType, written.mFileType);
    EXPECT_EQ(format->IsExtendedFormat(), c.wave64);
    EXPECT_EQ(format->GetNaturalRate(), 48000.0);
    EXPECT_EQ(format->GetChannelOrder(), HostChannelOrder::ForChannelCount(c.channels));
    SampleCount stamp;
    EXPECT_TRUE(format->HasOriginalTimeStamp(stamp));
    EXPECT_EQ(stamp, 0);
    const Bytes file = ReadFile(path);
    EXPECT_EQ(Bytes(file.begin() + c.audio, file.end()),
              Pattern(static_cast<std::size_t>(100 * frameSize)));
    std::vector<std::uint8_t> raw;
    format->GetRawHeader(raw);
    EXPECT_EQ(raw, Bytes(file.begin(), file.begin() + c.audio));
  }
}

// A file with chunks the format does not know before and after the audio.
Bytes ForeignLayout(Container c) {
  return FileImage({{kFmt, Fmt16(2)},
                    {MakeRIFFType("qzma"), Text("before")},
                    {kData, Pattern(400)},
                    {MakeRIFFType("qzsa"), Text("after!!")}},
                   c);
}

TEST(WAVEFormat, MetadataRoundTripsKeepUnknownChunksAndAudio) {
  for (const Container c : {Container::kRIFF, Container::kWave64}) {
    SCOPED_TRACE(NameOf(c));
    TempDir dir;
    const auto path = dir.Path("meta.wav");
    WriteFile(path, ForeignLayout(c));
    auto format = std::make_shared<WAVESoundFileFormat>(SpecOf(path));
    const std::int64_t audio = format->GetFileAttributes().mOffsetToAudio;
    {
      auto rw = format->GetReadWriteMetaDataAccess();
      format->SaveStringToFile(*rw, WAVESoundFileFormat::kCommentString, UString("Take 7"));
      format->SaveStringToFile(*rw, WAVESoundFileFormat::kOriginatorString, UString("Tarn test"));
      format->WriteOriginalTimeStamp(*rw, 3 * std::int64_t{0x7FFFFFFF} + 11);
      format->WriteFileTempoData(*rw, 120.0f, 60, 3, 4, {}, 0, 4.0f);
      format->SetRecordFlagMetaData(*rw, 1);
      UString text;
      EXPECT_TRUE(format->GetStringFromFile(*rw, WAVESoundFileFormat::kCommentString, text));
      EXPECT_EQ(text, UString("Take 7"));  // pending changes are read back
      rw->Flush();
    }
    EXPECT_EQ(format->GetFileAttributes().mOffsetToAudio, audio);
    const Bytes file = ReadFile(path);
    EXPECT_EQ(Bytes(file.begin() + audio, file.begin() + audio + 400), Pattern(400));

    WAVEReader reader(SpecOf(path));
    ASSERT_TRUE(reader.CanParse());
    EXPECT_EQ(reader.GetComment(), UString("Take 7"));
    EXPECT_EQ(reader.GetBroadcastExtension().mOriginator, "Tarn test");
    EXPECT_EQ(reader.GetOriginalTimeStamp(), 3 * std::int64_t{0x7FFFFFFF} + 11);
    EXPECT_TRUE(reader.HasRecIndicator());
    EXPECT_EQ(reader.GetRecIndicatorValue(), 1u);
    EXPECT_EQ(reader.GetNumberOfFrames(), 100);
    std::string tags;
    for (const auto& chunk : reader.GetChunks()) tags += RIFFTypeToString(chunk.tag) + "|";
    EXPECT_NE(tags.find("qzma|"), std::string::npos) << tags;
    EXPECT_NE(tags.find("qzsa|"), std::string::npos) << tags;

    auto ro = format->GetReadOnlyMetaDataAccess();
    EXPECT_EQ(format->ReadMetaData(*ro, MakeRIFFType("qzma")).SameBytes(RCBlobMT("before", 6)),
              true);
    EXPECT_TRUE(format->ReadMetaData(*ro, MakeRIFFType("qzsa")).SameBytes(RCBlobMT("after!!", 7)));
    SampleCount stamp;
    EXPECT_TRUE(format->HasOriginalTimeStamp(stamp));
    EXPECT_EQ(stamp, 3 * std::int64_t{0x7FFFFFFF} + 11);
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

TEST(WAVEFormat, WritingWhatTheFileHoldsChangesNothing) {
  TempDir dir;
  const auto path = dir.Path("same.wav");
  WriteFile(path, ForeignLayout(Container::kRIFF));
  const Bytes before = ReadFile(path);
  auto format = std::make_shared<WAVESoundFileFormat>(SpecOf(path));
  {
    auto rw = format->GetReadWriteMetaDataAccess();
    format->WriteMetaData(*rw, MakeRIFFType("qzma"), RCBlobMT("before", 6));
    format->WriteMetaData(*rw, MakeRIFFType("qzsa"), RCBlobMT("other!!", 7));
    format->WriteMetaData(*rw, MakeRIFFType("qzsa"), RCBlobMT("after!!", 7));  // back again
    rw->Flush();
  }
  EXPECT_EQ(ReadFile(path), before);
}

void CheckLoopsAndRegionsRoundTrip(const std::filesystem::path& path);

TEST(WAVEFormat, LoopsAndRegionsInBothForms) {
  for (const Container c : {Container::kRIFF, Container::kWave64}) {
    SCOPED_TRACE(c == Container::kRIFF ? "RIFF" : "Wave64");
    TempDir dir;
    const auto path = dir.Path("loops.wav");
    WriteFile(path, FileImage({{kFmt, Fmt16(1)}, {kData, Pattern(2000)}}, c));
    CheckLoopsAndRegionsRoundTrip(path);
  }
}

void CheckLoopsAndRegionsRoundTrip(const std::filesystem::path& path) {
  auto format = std::make_shared<WAVESoundFileFormat>(SpecOf(path));
  std::vector<SoundFileFormatLoop> loops(2);
  loops[0].mStart = 10;
  loops[0].mEnd = 200;
  loops[0].mID = 1;
  loops[1].mStart = 300;
  loops[1].mEnd = 301;
  loops[1].mType = SoundFileFormatLoop::Type::kAlternating;
  loops[1].mPlayCount = 3;
  loops[1].mFraction = 0x80000000;
  loops[1].mID = 2;
  SoundFileRegionList regions;
  regions.Add({1, UString("Verse"), 100, 400});
  regions.Add({2, UString("Hit"), 50, 0});
  regions.Add({3, UString(), 700, 10});
  {
    auto rw = format->GetReadWriteMetaDataAccess();
    format->AddFileLoops(*rw, loops);
    format->WriteRegionList(*rw, regions.Flatten(), 0);
  }
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
  const RCBlobMT smpl = format->ReadMetaData(*ro, MakeRIFFType("smpl"));
  ASSERT_EQ(smpl.GetSize(), 36 + 2 * 24);
  EXPECT_EQ(Bytes(smpl.GetPtr() + 36 + 8, smpl.GetPtr() + 36 + 16),
            Bytes({10, 0, 0, 0, 199, 0, 0, 0}));
}

Bytes InfoList() {
  Bytes b = Text("INFOINAM");
  for (const auto& part : {LE(4, 4), Text("Song")}) b.insert(b.end(), part.begin(), part.end());
  return b;
}

TEST(WAVEFormat, RegionNamesDoNotReplaceAnInfoList) {
  TempDir dir;
  const auto path = dir.Path("info.wav");
  WriteFile(path,
            FileImage({{kFmt, Fmt16(1)}, {MakeRIFFType("LIST"), InfoList()}, {kData, Pattern(200)}},
                      Container::kRIFF));
  auto format = std::make_shared<WAVESoundFileFormat>(SpecOf(path));
  SoundFileRegionList regions;
  regions.Add({5, UString("Named"), 10, 0});
  {
    auto rw = format->GetReadWriteMetaDataAccess();
    format->WriteRegionList(*rw, regions.Flatten(), 0);
  }
  auto ro = format->GetReadOnlyMetaDataAccess();
  const auto list = format->GetRegionList(*ro);
  ASSERT_EQ(list->size(), 1u);
  EXPECT_EQ((*list)[0].mStart, 10);
  const Bytes info = InfoList();
  EXPECT_TRUE(format->ReadMetaData(*ro, MakeRIFFType("LIST"))
                  .SameBytes(RCBlobMT(info.data(), info.size())));
}

TEST(WAVEFormat, TrailingMetadataIsRemovedAndTheSizesFollow) {
  TempDir dir;
  const auto path = dir.Path("trail.wav");
  WriteFile(path, ForeignLayout(Container::kRIFF));
  auto format = std::make_shared<WAVESoundFileFormat>(SpecOf(path));
  const std::int64_t end = format->GetFileAttributes().mOffsetToAudio + 400;
  format->RemoveTrailingMetaData();
  const Bytes file = ReadFile(path);
  ASSERT_EQ(static_cast<std::int64_t>(file.size()), end);
  EXPECT_EQ(Bytes(file.begin() + 4, file.begin() + 8), LE(static_cast<std::uint64_t>(end - 8), 4));
  EXPECT_EQ(format->GetLengthInFrames(), 100);
}

TEST(WAVEFormat, CrashedRecordingIsSizedFromTheFile) {
  for (const bool wave64 : {false, true}) {
    for (const std::uint64_t declared : {std::uint64_t{0}, std::uint64_t{0xFFFFFFFF}}) {
      SCOPED_TRACE(testing::Message() << wave64 << " " << declared);
      TempDir dir;
      const auto path = dir.Path("crash.wav");
      {
        WAVEWriter writer(SpecOf(path), 48000.0, 2, 2, 0, 4, kSamp16, true, wave64);
        writer.WriteHeader(1, 0);
      }
      Append(path, Pattern(4 * 250 + 3));  // a partial frame at the end
      if (declared != 0) {                 // a size field that claims more than the file has
        std::fstream f(path, std::ios::binary | std::ios::in | std::ios::out);
        f.seekp(wave64 ? 1000 + 16 : 1016 + 4);
        const Bytes size = LE(declared, wave64 ? 8 : 4);
        f.write(reinterpret_cast<const char*>(size.data()),
                static_cast<std::streamsize>(size.size()));
      }
      auto format = std::make_shared<WAVESoundFileFormat>(SpecOf(path));
      // A size past the end reads clamped to the file already.
      EXPECT_EQ(format->GetLengthInFrames(), declared == 0 ? 0 : 250);
      format->RecoverCrashedRecording();
      EXPECT_EQ(format->GetLengthInFrames(), 250);
      WAVEReader reader(SpecOf(path));
      EXPECT_EQ(reader.GetDataLength(), 1000);
      EXPECT_EQ(reader.IsWave64(), wave64);
      // A second repair finds nothing to do.
      const Bytes once = ReadFile(path);
      format->RecoverCrashedRecording();
      EXPECT_EQ(ReadFile(path), once);
    }
  }
}

TEST(WAVEFormat, RecordingThatRunsPastItsSizeIsFixedByTheFirstMetadataWrite) {
  TempDir dir;
  const auto path = dir.Path("runs.wav");
  WriteFile(path,
            FileImage({{kFmt, Fmt16(1)}, {kData, Pattern(100), 0x7FFFFFF0}}, Container::kRIFF));
  auto format = std::make_shared<WAVESoundFileFormat>(SpecOf(path));
  {
    auto rw = format->GetReadWriteMetaDataAccess();
    format->SaveStringToFile(*rw, WAVESoundFileFormat::kCommentString, UString("late"));
  }
  WAVEReader reader(SpecOf(path));
  ASSERT_TRUE(reader.CanParse());
  EXPECT_EQ(reader.GetDataLength(), 100);
  EXPECT_EQ(reader.GetComment(), UString("late"));
}

TEST(WAVEFormat, SwitchToWave64InPlaceKeepsTheAudioWhereItIs) {
  for (const int channels : {1, 2, 3, 8}) {
    for (const bool rec : {false, true}) {
      SCOPED_TRACE(testing::Message() << channels << " rec " << rec);
      TempDir dir;
      const auto path = dir.Path("switch.wav");
      {
        WAVEWriter writer(SpecOf(path), 44100.0, 3, static_cast<std::int16_t>(channels), 0,
                          static_cast<std::int16_t>(3 * channels), kSamp24, rec, false);
        writer.WriteHeader(7, 50);
        const Bytes audio = Pattern(static_cast<std::size_t>(150 * channels));
        writer.GetStream().PutRawDataToStream(audio.data(), static_cast<int>(audio.size()));
      }
      const Bytes before = ReadFile(path);
      auto format = std::make_shared<WAVESoundFileFormat>(SpecOf(path));
      const auto attributes = format->GetFileAttributes();
      // A RIFF recording with room to switch may grow as far as Wave64 does.
      EXPECT_EQ(format->GetMaxFrameCount(),
                SoundFileFormatCache::GetMaxFrameCountForType(MakeRIFFType(".W64"), 3 * channels));
      format->SwitchToExtendedFileFormat(50);
      EXPECT_TRUE(format->IsExtendedFormat());
      const auto after = format->GetFileAttributes();
      EXPECT_EQ(after.mOffsetToAudio, attributes.mOffsetToAudio);
      EXPECT_EQ(after.mFileType, MakeRIFFType(".W64"));
      EXPECT_EQ(format->GetLengthInFrames(), 50);
      const Bytes file = ReadFile(path);
      ASSERT_EQ(file.size(), before.size());
      EXPECT_TRUE(std::equal(file.begin() + attributes.mOffsetToAudio, file.end(),
                             before.begin() + attributes.mOffsetToAudio));
      WAVEReader reader(SpecOf(path));
      EXPECT_EQ(reader.HasRecIndicator(), rec);
      EXPECT_EQ(reader.GetRecIndicatorValue(), rec ? 7u : 0u);
      EXPECT_EQ(reader.GetBroadcastExtension().mOriginator, "TarnCore");
      // The header is the one a new Wave64 recording of the same kind gets,
      // except for the bext date and time.
      const auto w64 = dir.Path("fresh.w64");
      {
        WAVEWriter writer(SpecOf(w64), 44100.0, 3, static_cast<std::int16_t>(channels), 0,
                          static_cast<std::int16_t>(3 * channels), kSamp24, rec, true);
        writer.SetBroadcastExtension(reader.GetBroadcastExtension());
        writer.WriteHeader(7, 50);
        const Bytes audio = Pattern(static_cast<std::size_t>(150 * channels));
        writer.GetStream().PutRawDataToStream(audio.data(), static_cast<int>(audio.size()));
      }
      EXPECT_EQ(ReadFile(w64), file);
    }
  }
}

TEST(WAVEFormat, NoSwitchWithoutRoom) {
  TempDir dir;
  const auto path = dir.Path("tight.wav");
  WriteFile(path, FileImage({{kFmt, Fmt16(2)}, {kData, Pattern(400)}}, Container::kRIFF));
  auto format = std::make_shared<WAVESoundFileFormat>(SpecOf(path));
  const auto error = ErrorOf([&] { format->SwitchToExtendedFileFormat(100); });
  ASSERT_TRUE(error);
  EXPECT_STREQ(error->GetKind().c_str(), "WAVESoundFileFormat");
  EXPECT_EQ(error->GetIntErrorCode(), WAVESoundFileFormat::kCannotSwitchErr);
  EXPECT_FALSE(format->IsExtendedFormat());
  // Without room to switch, the file stops where 32-bit sizes do.
  EXPECT_EQ(format->GetMaxFrameCount(),
            SoundFileFormatCache::GetMaxFrameCountForType(MakeRIFFType(".wav"), 4));
  EXPECT_LT(format->GetMaxFrameCount(), SampleCount(std::int64_t{1} << 30));
}

TEST(WAVEFormat, Wave64ThresholdIsTheRIFFSizeLimit) {
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
