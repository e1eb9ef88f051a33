// SoundFileFormat's own behaviours: the defaults a format inherits, the
// length algorithms, the metadata handles and their hooks, and the file
// operations.
#include <gtest/gtest.h>

#include <filesystem>
#include <limits>
#include <memory>
#include <string>
#include <vector>

#include "ChunkFileTestUtil.h"
#include "FakeSoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/NoMetaDataSoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"
#include "tarn/FileSystem/File.h"

namespace tarn::test {
namespace {

using Log = std::vector<std::string>;

// Counts the cache's change notifications for one format while it lives.
class ChangeCounter {
 public:
  ChangeCounter() {
    id_ = SoundFileFormatCache::Instance().AddChangeListener(
        [this](SoundFileFormat& f) { changed.push_back(&f); });
  }
  ~ChangeCounter() { SoundFileFormatCache::Instance().RemoveChangeListener(id_); }
  std::vector<SoundFileFormat*> changed;

 private:
  SoundFileFormatCache::ListenerID id_;
};

TEST(SoundFileFormatBase, AFormatKeepingAllDefaultsHasNoOptionalFeatures) {
  DefaultsSoundFileFormat f(FileSpecification(UString("/nowhere/x.wav")));

  float tempo = -1.0F;
  SampleCount sync(-7);
  EXPECT_FALSE(f.HasFileTempoAndSyncPoint(tempo, sync));
  EXPECT_EQ(tempo, -1.0F);
  EXPECT_EQ(sync, SampleCount(-7));
  short root = 5, num = 6, den = 7;
  EXPECT_FALSE(f.HasFileMeterAndPitch(root, num, den));
  EXPECT_EQ(root + num + den, 18);
  UString text("keep");
  EXPECT_FALSE(f.GetDisplayTempo(text));
  SampleCount stamp(-3);
  EXPECT_FALSE(f.HasOriginalTimeStamp(stamp));
  EXPECT_EQ(stamp, SampleCount(-3));

  EXPECT_FALSE(f.SupportsLoops());
  EXPECT_FALSE(f.SupportsRegionList());
  EXPECT_FALSE(f.ImportRegionsAsSeparateSoundBites());
  EXPECT_TRUE(f.AlwaysImportRegionForWholeFile());
  EXPECT_TRUE(f.FormatSupportsMetaData());
  EXPECT_FALSE(f.MetaDataIsOpen());
  EXPECT_FALSE(f.SupportsLengthInTicks());
  EXPECT_EQ(f.GetLengthInTicks(), 0.0);
  EXPECT_FALSE(f.SupportsTickOffsets());
  std::vector<Tick> ticks{Tick(3)};
  f.GetTickOffsets(ticks);
  EXPECT_EQ(ticks.size(), 1u);
  f.SetTickOffsets(ticks);
  EXPECT_FALSE(f.SupportsRegionTempos());
  EXPECT_FALSE(f.SetNoTimeScaleOnImport());
  EXPECT_FALSE(f.AudioDataIsZeroLength());
  EXPECT_FALSE(f.SupportsRawHeader());
  std::vector<std::uint8_t> raw{1, 2};
  f.GetRawHeader(raw);
  EXPECT_EQ(raw.size(), 2u);
  EXPECT_FALSE(f.MatchesExtension(UString("wav")));
  EXPECT_FALSE(f.FormatRequiresExternalConversion());
  EXPECT_FALSE(f.ShouldUseExistingGroup());
  EXPECT_FALSE(f.ShouldSwitchToExtendedFileFormat(SampleCount(1) * 5000000000LL));
  EXPECT_FALSE(f.IsExtendedFormat());
  EXPECT_TRUE(f.GetCachedRates().empty());
  EXPECT_EQ(f.GetActualFileType(), MakeRIFFType("WAVE"));

  // Operations that need the metadata open do nothing by default.
  auto rw = f.GetReadWriteMetaDataAccess();
  EXPECT_TRUE(f.MetaDataIsOpen());
  EXPECT_FALSE(f.SetDisplayTempo(*rw, text));
  f.WriteOriginalTimeStamp(*rw, SampleCount(10));
  f.SaveStringToFile(*rw, 1, UString("x"));
  EXPECT_FALSE(f.GetStringFromFile(*rw, 1, text));
  EXPECT_EQ(text, UString("keep"));
  std::vector<double> tempos{1.0};
  f.GetRegionTempos(*rw, tempos);
  EXPECT_EQ(tempos, std::vector<double>{1.0});
  f.ClearFileTempoData();
  f.RecoverCrashedRecording();
  f.RemoveTrailingMetaData();
  rw.reset();
  EXPECT_FALSE(f.MetaDataIsOpen());
}

TEST(SoundFileFormatBase, IsValidTypeComparesWithTheCanonicalTypeUnlessTheActualTypeIsZero) {
  const std::uint32_t wave = MakeRIFFType("WAVE"), w64 = MakeRIFFType(".W64"),
                      aiff = MakeRIFFType("AIFF");
  struct Row {
    std::uint32_t canonical, actual, asked;
    bool valid;
  };
  const Row rows[] = {
      {wave, wave, wave, true}, {wave, wave, w64, false}, {wave, w64, wave, true},
      {wave, w64, w64, false},  {wave, 0, aiff, true},    {wave, 0, 0, true},
      {aiff, aiff, 0, false},   {aiff, wave, aiff, true},
  };
  FakeSoundFileFormat f(FileSpecification(UString("/nowhere/x.wav")));
  for (const Row& r : rows) {
    f.canonicalType = r.canonical;
    f.actualType = r.actual;
    EXPECT_EQ(f.IsValidType(r.asked), r.valid)
        << RIFFTypeToString(r.canonical) << " " << RIFFTypeToString(r.actual) << " "
        << RIFFTypeToString(r.asked);
  }
}

TEST(SoundFileFormatBase, LengthInSecondsIsFramesTimesRate) {
  FakeSoundFileFormat f(FileSpecification(UString("/nowhere/x.wav")));
  f.length = 10;
  f.attributes.mSampleRate = 2.5;
  EXPECT_EQ(f.GetLengthInSeconds(), 25.0);
  f.length = 0;
  EXPECT_EQ(f.GetLengthInSeconds(), 0.0);
}

TEST(SoundFileFormatBase, ChangingToTheCurrentLengthChangesNothingAndTellsNobody) {
  ChangeCounter counter;
  FakeSoundFileFormat f(FileSpecification(UString("/nowhere/x.wav")));
  f.switchToExtended = true;
  auto rw = f.GetReadWriteMetaDataAccess();
  f.log.clear();
  f.ChangeLengthInFrames(*rw, f.length);
  EXPECT_EQ(f.log, Log{});
  EXPECT_TRUE(counter.changed.empty());
}

TEST(SoundFileFormatBase, ChangingTheLengthSwitchesAdjustsForgetsAndTellsTheCacheInThatOrder) {
  for (bool extended : {false, true}) {
    ChangeCounter counter;
    FakeSoundFileFormat f(FileSpecification(UString("/nowhere/x.wav")));
    f.switchToExtended = extended;
    auto rw = f.GetReadWriteMetaDataAccess();
    f.log.clear();
    f.ChangeLengthInFrames(*rw, SampleCount(5000000000LL));
    Log expected{"should-switch 5000000000"};
    if (extended) expected.push_back("switch 5000000000");
    expected.insert(expected.end(), {"adjust 5000000000 bpf 4", "throw-out"});
    EXPECT_EQ(f.log, expected);
    ASSERT_EQ(counter.changed.size(), 1u);
    EXPECT_EQ(counter.changed[0], &f);
    EXPECT_EQ(f.GetLengthInFrames(), SampleCount(5000000000LL));
  }
}

TEST(SoundFileFormatBase, LengthChangesRefuseAnAccessOfAnotherFormat) {
  FakeSoundFileFormat a(FileSpecification(UString("/nowhere/a.wav")));
  FakeSoundFileFormat b(FileSpecification(UString("/nowhere/b.wav")));
  auto rwB = b.GetReadWriteMetaDataAccess();
  a.log.clear();
  auto e = ErrorOf([&] { a.ChangeLengthInFrames(*rwB, 7); });
  ASSERT_TRUE(e);
  EXPECT_EQ(e->GetIntErrorCode(), kParamErr);
  e = ErrorOf([&] { a.UpdateLengthAfterAppendingAudio(*rwB, a.attributes); });
  ASSERT_TRUE(e);
  EXPECT_EQ(e->GetIntErrorCode(), kParamErr);
  EXPECT_EQ(a.log, Log{});
}

TEST(SoundFileFormatBase, LengthFromDataSizeIsSigned64BitDivision) {
  TempDir dir;
  const auto path = dir.Path("take.wav");
  struct Row {
    std::size_t fileSize;
    std::int32_t offset, bytesPerFrame;
    std::int64_t frames;
  };
  const Row rows[] = {
      {1044, 44, 4, 250}, {1047, 44, 4, 250}, {1048, 44, 4, 251}, {44, 44, 4, 0},
      {10, 20, 4, -2},    {0, 0, 1, 0},       {7, 0, 1, 7},       {1016 + 6 * 3, 1016, 6, 3},
  };
  for (const Row& r : rows) {
    WriteFile(path, Bytes(r.fileSize, 0));
    FakeSoundFileFormat f(SpecOf(path));
    SoundFileAttributes a = f.attributes;
    a.mOffsetToAudio = r.offset;
    a.mBytesPerFrame = r.bytesPerFrame;
    EXPECT_EQ(f.GetLengthInFramesBasedOnDataLen(a), SampleCount(r.frames)) << r.fileSize;
  }
}

TEST(SoundFileFormatBase, FrameSizeBelowOneFailsWithParamErrBeforeTheFileIsLookedAt) {
  // The file does not exist: a look at it would fail with "file not found".
  FakeSoundFileFormat f(FileSpecification(UString("/nowhere/missing.wav")));
  auto rw = f.GetReadWriteMetaDataAccess();
  for (std::int32_t bpf : {0, -1, -4, std::numeric_limits<std::int32_t>::min()}) {
    SoundFileAttributes a = f.attributes;
    a.mBytesPerFrame = bpf;
    f.log.clear();
    auto e = ErrorOf([&] { f.UpdateLengthAfterAppendingAudio(*rw, a); });
    ASSERT_TRUE(e) << bpf;
    EXPECT_EQ(e->GetIntErrorCode(), kParamErr) << bpf;
    EXPECT_EQ(std::string(e->GetKind().c_str()), "OS");
    EXPECT_EQ(f.log, Log{});
  }
  // With a valid frame size the missing file is what fails.
  auto e = ErrorOf([&] { f.UpdateLengthAfterAppendingAudio(*rw, f.attributes); });
  ASSERT_TRUE(e);
  EXPECT_NE(e->GetIntErrorCode(), kParamErr);
}

TEST(SoundFileFormatBase, UpdatingAfterAppendingWritesTheLengthTheFileSizeGivesEvenIfUnchanged) {
  TempDir dir;
  const auto path = dir.Path("take.wav");
  WriteFile(path, Bytes(44 + 4 * 1000 + 3, 0));
  ChangeCounter counter;
  FakeSoundFileFormat f(SpecOf(path));
  f.length = 1000;
  auto rw = f.GetReadWriteMetaDataAccess();
  f.log.clear();
  f.UpdateLengthAfterAppendingAudio(*rw, f.attributes);
  EXPECT_EQ(f.log, (Log{"should-switch 1000", "adjust 1000 bpf 4", "throw-out"}));
  EXPECT_EQ(counter.changed.size(), 1u);
}

TEST(SoundFileFormatBase, MaxFrameCountAsksTheCacheWithTheActualTypeAndFrameSize) {
  FakeSoundFileFormat f(FileSpecification(UString("/nowhere/x.wav")));
  f.canonicalType = MakeRIFFType("WAVE");
  f.actualType = MakeRIFFType(".wav");
  f.attributes.mBytesPerFrame = 6;
  EXPECT_EQ(f.GetMaxFrameCount(),
            SoundFileFormatCache::GetMaxFrameCountForType(MakeRIFFType(".wav"), 6));
  EXPECT_EQ(f.GetMaxFrameCount(), SampleCount((0xFFFFFFFFLL - 65536) / 6));
  f.actualType = MakeRIFFType(".W64");
  EXPECT_EQ(f.GetMaxFrameCount(), SampleCount((std::int64_t{1} << 62) / 6));
}

TEST(SoundFileFormatBase, WritersNeedAFormatOwnedByASharedPtr) {
  FakeSoundFileFormat f(FileSpecification(UString("/nowhere/x.wav")));
  auto e = ErrorOf([&] { (void)f.MakeWriter(); });
  ASSERT_TRUE(e);
  EXPECT_EQ(e->GetIntErrorCode(), kParamErr);
  EXPECT_EQ(std::string(e->GetKind().c_str()), "SoundFileFormat");
}

// --- metadata handles --------------------------------------------------------

TEST(SoundFileFormatMetaData, FirstHandleOpensLastClosesAndEveryReadWriteReleaseFlushes) {
  FakeSoundFileFormat f(FileSpecification(UString("/nowhere/x.wav")));
  auto hold = f.OpenMetaData();
  EXPECT_TRUE(f.MetaDataIsOpen());
  EXPECT_EQ(hold->GetMode(), MetaDataMode::kHoldOpen);
  auto ro = f.GetReadOnlyMetaDataAccess();
  EXPECT_EQ(&ro->GetFormat(), &f);
  auto rw1 = f.GetReadWriteMetaDataAccess();  // first writer joins readers
  auto rw2 = f.GetReadWriteMetaDataAccess();
  EXPECT_EQ(f.log, (Log{"open r", "open rw"}));
  rw1.reset();
  ro.reset();
  rw2->Flush();
  rw2.reset();
  EXPECT_EQ(f.log, (Log{"open r", "open rw", "write", "write", "write"}));
  EXPECT_TRUE(f.MetaDataIsOpen());
  hold.reset();
  EXPECT_FALSE(f.MetaDataIsOpen());
  EXPECT_EQ(f.log.back(), "close");

  // A new session starts over.
  f.log.clear();
  auto rw = f.GetReadWriteMetaDataAccess();
  rw.reset();
  EXPECT_EQ(f.log, (Log{"open rw", "write", "close"}));
}

TEST(SoundFileFormatMetaData, FlushReportsFailuresAndReleaseSwallowsThem) {
  FakeSoundFileFormat f(FileSpecification(UString("/nowhere/x.wav")));
  f.onWrite = []() -> bool { Failure(kIOErr); };
  auto rw = f.GetReadWriteMetaDataAccess();
  auto e = ErrorOf([&] { rw->Flush(); });
  ASSERT_TRUE(e);
  EXPECT_EQ(e->GetIntErrorCode(), kIOErr);
  EXPECT_NO_THROW(rw.reset());
  EXPECT_FALSE(f.MetaDataIsOpen());
  EXPECT_EQ(f.log.back(), "close");
}

TEST(SoundFileFormatMetaData, HooksMayAskTheMetaDataQueriesOfTheirFormat) {
  FakeSoundFileFormat f(FileSpecification(UString("/nowhere/x.wav")));
  bool openDuringWrite = false;
  f.onWrite = [&] {
    openDuringWrite = f.MetaDataIsOpen();
    f.DontSetModDateBackOnMetaDataClose();
    return false;
  };
  auto rw = f.GetReadWriteMetaDataAccess();
  rw->Flush();
  EXPECT_TRUE(openDuringWrite);
  rw.reset();
  EXPECT_FALSE(f.MetaDataIsOpen());
}

TEST(SoundFileFormatMetaData, AFailedOpenMakesNoHandle) {
  FakeSoundFileFormat f(FileSpecification(UString("/nowhere/x.wav")));
  f.failOpen = true;
  auto e = ErrorOf([&] { (void)f.GetReadOnlyMetaDataAccess(); });
  ASSERT_TRUE(e);
  EXPECT_EQ(e->GetIntErrorCode(), kIOErr);
  EXPECT_FALSE(f.MetaDataIsOpen());
  f.failOpen = false;
  auto ro = f.GetReadOnlyMetaDataAccess();
  EXPECT_EQ(f.log, Log{"open r"});
}

TEST(SoundFileFormatMetaData, HandlesKeepASharedFormatAlive) {
  auto f = std::make_shared<FakeSoundFileFormat>(FileSpecification(UString("/nowhere/x.wav")));
  std::weak_ptr<FakeSoundFileFormat> weak = f;
  auto ro = f->GetReadOnlyMetaDataAccess();
  f.reset();
  EXPECT_FALSE(weak.expired());
  ro.reset();
  EXPECT_TRUE(weak.expired());
}

class MetaDataModDate : public ::testing::Test {
 protected:
  void SetUp() override {
    path_ = dir_.Path("take.wav");
    WriteFile(path_, Bytes(1044, 0));
    FileDate::Set(SpecOf(path_), kOld);
    format_ = std::make_shared<FakeSoundFileFormat>(SpecOf(path_));
    // The hook touches the file as a metadata write would.
    format_->onWrite = [this] {
      FileDate::Set(SpecOf(path_), FileDate(kOld.GetSeconds() + 1000, 0));
      return true;
    };
  }
  static constexpr FileDate kOld{1500000000, 0};
  TempDir dir_;
  std::filesystem::path path_;
  std::shared_ptr<FakeSoundFileFormat> format_;
};

TEST_F(MetaDataModDate, MetadataWritesLeaveTheDateAsItWasAtOpening) {
  auto rw = format_->GetReadWriteMetaDataAccess();
  FileDate atOpen;
  format_->GetFileModDateAtMetaDataOpen(atOpen);
  EXPECT_EQ(atOpen, kOld);
  rw.reset();
  EXPECT_EQ(FileDate::Get(SpecOf(path_)), kOld);
}

TEST_F(MetaDataModDate, DontSetModDateBackKeepsTheNewDateForThatSessionOnly) {
  auto rw = format_->GetReadWriteMetaDataAccess();
  format_->DontSetModDateBackOnMetaDataClose();
  rw.reset();
  EXPECT_EQ(FileDate::Get(SpecOf(path_)).GetSeconds(), kOld.GetSeconds() + 1000);

  FileDate::Set(SpecOf(path_), kOld);
  rw = format_->GetReadWriteMetaDataAccess();
  rw.reset();
  EXPECT_EQ(FileDate::Get(SpecOf(path_)), kOld);
}

TEST_F(MetaDataModDate, ALengthChangeKeepsTheNewDate) {
  auto rw = format_->GetReadWriteMetaDataAccess();
  format_->ChangeLengthInFrames(*rw, 10);
  rw.reset();
  EXPECT_EQ(FileDate::Get(SpecOf(path_)).GetSeconds(), kOld.GetSeconds() + 1000);
}

TEST_F(MetaDataModDate, TheDateAtOpeningIsAskedOnlyWhileOpen) {
  FileDate date;
  auto e = ErrorOf([&] { format_->GetFileModDateAtMetaDataOpen(date); });
  ASSERT_TRUE(e);
  EXPECT_EQ(e->GetIntErrorCode(), kParamErr);
  auto hold = format_->OpenMetaData();
  format_->GetFileModDateAtMetaDataOpen(date);
  EXPECT_EQ(date, kOld);
}

// --- file operations ---------------------------------------------------------

TEST(SoundFileFormatFiles, DateAndWritabilityComeFromTheFile) {
  TempDir dir;
  const auto path = dir.Path("take.wav");
  FakeSoundFileFormat missing(SpecOf(path));
  FileDate date(7, 7);
  EXPECT_FALSE(missing.GetFileModDate(date));
  EXPECT_EQ(date, FileDate(7, 7));
  EXPECT_FALSE(missing.IsFileWritable());

  WriteFile(path, Bytes(10, 1));
  FileDate::Set(SpecOf(path), FileDate(1600000000, 0));
  FakeSoundFileFormat f(SpecOf(path));
  EXPECT_TRUE(f.GetFileModDate(date));
  EXPECT_EQ(date, FileDate(1600000000, 0));
  EXPECT_TRUE(f.IsFileWritable());
}

TEST(SoundFileFormatFiles, RenameMoveAndDeleteTakeTheCacheEntryAlong) {
  TempDir dir;
  const auto path = dir.Path("take.tst");
  WriteFile(path, Bytes(10, 1));
  std::filesystem::create_directories(dir.Path("sub"));
  auto& cache = SoundFileFormatCache::Instance();
  auto previous = cache.SetConverterFormatFactory([](const FileSpecification& spec, std::uint32_t) {
    return std::make_shared<FakeSoundFileFormat>(spec);
  });
  ChangeCounter counter;
  auto f = cache.GetFormat(SpecOf(path), MakeRIFFType("TsT1"));

  f->Rename(UString("renamed.tst"));
  EXPECT_EQ(f->GetFile(), SpecOf(dir.Path("renamed.tst")));
  EXPECT_TRUE(std::filesystem::exists(dir.Path("renamed.tst")));
  EXPECT_FALSE(std::filesystem::exists(path));
  EXPECT_EQ(cache.FindFormat(SpecOf(dir.Path("renamed.tst"))), f);
  EXPECT_EQ(cache.FindFormat(SpecOf(path)), nullptr);

  f->MoveTo(SpecOf(dir.Path("sub")), UString("moved.tst"));
  const auto moved = dir.Path("sub") / "moved.tst";
  EXPECT_EQ(f->GetFile(), SpecOf(moved));
  EXPECT_TRUE(std::filesystem::exists(moved));
  EXPECT_EQ(cache.FindFormat(SpecOf(moved)), f);
  EXPECT_EQ(counter.changed.size(), 2u);

  // A name that is taken fails with the file system's error and changes nothing.
  WriteFile(dir.Path("sub") / "taken.tst", Bytes(1, 0));
  EXPECT_THROW(f->Rename(UString("taken.tst")), TarnError);
  EXPECT_EQ(f->GetFile(), SpecOf(moved));

  f->Delete();
  EXPECT_FALSE(std::filesystem::exists(moved));
  EXPECT_EQ(cache.FindFormat(SpecOf(moved)), nullptr);
  EXPECT_THROW(f->Delete(), TarnError);
  cache.SetConverterFormatFactory(previous);
}

// --- NoMetaDataSoundFileFormat -------------------------------------------------

class ConverterOnlyFormat : public NoMetaDataSoundFileFormat {
 public:
  using NoMetaDataSoundFileFormat::NoMetaDataSoundFileFormat;
  SampleCount GetLengthInFrames() override { return 100; }
  std::uint32_t GetCanonicalFileType() override { return MakeRIFFType("mp3 "); }
  std::uint32_t GetPerferredFileCreator() override { return 0; }
  SoundFileAttributes GetFileAttributes() override {
    SoundFileAttributes a;
    a.mNumChannels = 6;
    a.mSampleRate = 32000.0;
    return a;
  }
  SoundFileAttributes CreateFileOnDisk(const SoundFileAttributes& a, SampleCount, bool,
                                       const SoundFileAttributes&) override {
    return a;
  }
};

TEST(NoMetaDataSoundFileFormat, AnswersEveryMetadataQuestionWithNone) {
  ConverterOnlyFormat f(FileSpecification(UString("/nowhere/x.mp3")));
  EXPECT_EQ(f.GetNaturalRate(), 32000.0);
  EXPECT_EQ(f.GetChannelOrder(), HostChannelOrder::ForChannelCount(6));
  EXPECT_FALSE(f.FormatSupportsMetaData());
  EXPECT_FALSE(f.SupportsLoops());
  EXPECT_FALSE(f.SupportsRegionList());
  auto rw = f.GetReadWriteMetaDataAccess();
  EXPECT_FALSE(f.MetaDataIsOpen());
  EXPECT_EQ(f.NumberOfLoops(*rw), 0);
  SoundFileFormatLoop loop;
  loop.mStart = 5;
  f.GetFileLoop(*rw, 0, loop);
  EXPECT_EQ(loop.mStart, SampleCount(5));
  f.AddFileLoops(*rw, {loop});
  EXPECT_TRUE(f.GetRegionList(*rw)->empty());
  EXPECT_FALSE(f.HasMetaData(*rw, MakeRIFFType("bext")));
  EXPECT_TRUE(f.ReadMetaData(*rw, MakeRIFFType("bext")).IsEmpty());
  EXPECT_TRUE(f.ReadNamedMetaData(*rw, UString("n"), MakeRIFFType("bext")).IsEmpty());
  f.WriteMetaData(*rw, MakeRIFFType("bext"), RCBlobMT(4));
  EXPECT_FALSE(f.HasMetaData(*rw, MakeRIFFType("bext")));
  f.SetRecordFlagMetaData(*rw, 1);
  f.WriteFileTempoData(*rw, 120.0F, 60, 4, 4, {}, 0, 4.0F);
  f.CleanMetaDataMods();
  f.DontSetModDateBackOnMetaDataClose();
  // The length change runs (and reaches AdjustLengthInHeader, which does nothing).
  f.ChangeLengthInFrames(*rw, 50);
  EXPECT_EQ(f.GetLengthInFrames(), SampleCount(100));
  EXPECT_EQ(f.GetLengthInSeconds(), 100 * 32000.0);
}

}  // namespace
}  // namespace tarn::test
