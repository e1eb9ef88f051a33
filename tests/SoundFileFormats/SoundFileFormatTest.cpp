// SoundFileFormat's own behaviours (the defaults a format inherits, the
// length algorithms, the metadata handles and their hooks, the file
// operations), NoMetaDataSoundFileFormat, and SoundFileFormatCache (one
// object per file while held, classes and size limits by type,
// notifications, concurrent lookups).
#include <gtest/gtest.h>

#include <atomic>
#include <filesystem>
#include <limits>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "ChunkFileTestUtil.h"
#include "FakeSoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/NoMetaDataSoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"
#include "tarn/FileSystem/File.h"

namespace tarn::test {
namespace {

using Log = std::vector<std::string>;
constexpr std::uint32_t kTestType = MakeRIFFType("TsT1");

FileSpecification Nowhere(const std::string& name = "x.wav") {
  return FileSpecification(UString("/nowhere/" + name));
}

// The cache's change notifications while it lives.
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
  StubSoundFileFormat f(Nowhere());
  float tempo = -1.0F;
  SampleCount sync(-7);
  short root = 5, num = 6, den = 7;
  UString text("keep");
  for (bool no :
       {f.HasFileTempoAndSyncPoint(tempo, sync), f.HasFileMeterAndPitch(root, num, den),
        f.GetDisplayTempo(text), f.HasOriginalTimeStamp(sync), f.SupportsLoops(),
        f.SupportsRegionList(), f.ImportRegionsAsSeparateSoundBites(), f.MetaDataIsOpen(),
        f.SupportsLengthInTicks(), f.SupportsTickOffsets(), f.SupportsRegionTempos(),
        f.SetNoTimeScaleOnImport(), f.AudioDataIsZeroLength(), f.SupportsRawHeader(),
        f.MatchesExtension(UString("wav")), f.FormatRequiresExternalConversion(),
        f.ShouldUseExistingGroup(),
        f.ShouldSwitchToExtendedFileFormat(SampleCount(1) * 5000000000LL), f.IsExtendedFormat()})
    EXPECT_FALSE(no);
  EXPECT_EQ(tempo, -1.0F);  // outputs are left alone
  EXPECT_EQ(sync, SampleCount(-7));
  EXPECT_EQ(root + num + den, 18);
  EXPECT_TRUE(f.AlwaysImportRegionForWholeFile());
  EXPECT_TRUE(f.FormatSupportsMetaData());
  EXPECT_EQ(f.GetLengthInTicks(), 0.0);
  std::vector<Tick> ticks{Tick(3)};
  f.GetTickOffsets(ticks);
  f.SetTickOffsets(ticks);
  std::vector<std::uint8_t> raw{1, 2};
  f.GetRawHeader(raw);
  EXPECT_EQ(ticks.size() + raw.size(), 3u);
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
  const std::uint32_t wave = T("WAVE"), w64 = T(".W64"), aiff = T("AIFF");
  const struct {
    std::uint32_t canonical, actual, asked;
    bool valid;
  } rows[] = {{wave, wave, wave, true}, {wave, wave, w64, false}, {wave, w64, wave, true},
              {wave, w64, w64, false},  {wave, 0, aiff, true},    {wave, 0, 0, true},
              {aiff, aiff, 0, false},   {aiff, wave, aiff, true}};
  FakeSoundFileFormat f(Nowhere());
  for (const auto& r : rows) {
    f.canonicalType = r.canonical;
    f.actualType = r.actual;
    EXPECT_EQ(f.IsValidType(r.asked), r.valid)
        << RIFFTypeToString(r.canonical) << " " << RIFFTypeToString(r.actual) << " "
        << RIFFTypeToString(r.asked);
  }
}

// A change to the current length does nothing and tells nobody; another
// switches (if asked), adjusts, forgets and tells the cache, in that order.
TEST(SoundFileFormatBase, LengthChangesSwitchAdjustForgetAndNotifyInThatOrder) {
  for (bool extended : {false, true}) {
    ChangeCounter counter;
    FakeSoundFileFormat f(Nowhere());
    f.switchToExtended = extended;
    auto rw = f.GetReadWriteMetaDataAccess();
    f.log.clear();
    f.ChangeLengthInFrames(*rw, f.length);
    EXPECT_EQ(f.log, Log{});
    EXPECT_TRUE(counter.changed.empty());
    f.ChangeLengthInFrames(*rw, SampleCount(5000000000LL));
    Log expected{"should-switch 5000000000"};
    if (extended) expected.push_back("switch 5000000000");
    expected.insert(expected.end(), {"adjust 5000000000 bpf 4", "throw-out"});
    EXPECT_EQ(f.log, expected);
    EXPECT_EQ(counter.changed, std::vector<SoundFileFormat*>{&f});
    EXPECT_EQ(f.GetLengthInFrames(), SampleCount(5000000000LL));
  }
}

TEST(SoundFileFormatBase, LengthChangesRefuseAnAccessOfAnotherFormat) {
  FakeSoundFileFormat a(Nowhere("a.wav")), b(Nowhere("b.wav"));
  auto rwB = b.GetReadWriteMetaDataAccess();
  a.log.clear();
  EXPECT_EQ(CodeOf([&] { a.ChangeLengthInFrames(*rwB, 7); }), kParamErr);
  EXPECT_EQ(CodeOf([&] { a.UpdateLengthAfterAppendingAudio(*rwB, a.attributes); }), kParamErr);
  EXPECT_EQ(a.log, Log{});
}

TEST(SoundFileFormatBase, LengthFromDataSizeIsSigned64BitDivision) {
  TempDir dir;
  const auto path = dir.Path("take.wav");
  const struct {
    std::size_t fileSize;
    std::int32_t offset, bytesPerFrame;
    std::int64_t frames;
  } rows[] = {{1044, 44, 4, 250}, {1047, 44, 4, 250},        {1048, 44, 4, 251},
              {44, 44, 4, 0},     {10, 20, 4, -2},           {0, 0, 1, 0},
              {7, 0, 1, 7},       {1016 + 6 * 3, 1016, 6, 3}};
  for (const auto& r : rows) {
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
  FakeSoundFileFormat f(Nowhere("missing.wav"));
  auto rw = f.GetReadWriteMetaDataAccess();
  for (std::int32_t bpf : {0, -1, -4, std::numeric_limits<std::int32_t>::min()}) {
    SoundFileAttributes a = f.attributes;
    a.mBytesPerFrame = bpf;
    f.log.clear();
    ExpectError([&] { f.UpdateLengthAfterAppendingAudio(*rw, a); }, "OS", kParamErr);
    EXPECT_EQ(f.log, Log{});
  }
  const int code = CodeOf([&] { f.UpdateLengthAfterAppendingAudio(*rw, f.attributes); });
  EXPECT_NE(code, kParamErr);
  EXPECT_NE(code, 1);
}

TEST(SoundFileFormatBase, UpdatingAfterAppendingWritesTheLengthTheFileSizeGivesEvenIfUnchanged) {
  TempDir dir;
  WriteFile(dir.Path("take.wav"), Bytes(44 + 4 * 1000 + 3, 0));
  ChangeCounter counter;
  FakeSoundFileFormat f(SpecOf(dir.Path("take.wav")));
  auto rw = f.GetReadWriteMetaDataAccess();
  f.log.clear();
  f.UpdateLengthAfterAppendingAudio(*rw, f.attributes);
  EXPECT_EQ(f.log, (Log{"should-switch 1000", "adjust 1000 bpf 4", "throw-out"}));
  EXPECT_EQ(counter.changed.size(), 1u);
}

TEST(SoundFileFormatBase, WritersNeedAFormatOwnedByASharedPtr) {
  FakeSoundFileFormat f(Nowhere());
  ExpectError([&] { (void)f.MakeWriter(); }, "SoundFileFormat", kParamErr);
}

// --- metadata handles --------------------------------------------------------

TEST(SoundFileFormatMetaData, FirstHandleOpensLastClosesAndEveryReadWriteReleaseFlushes) {
  FakeSoundFileFormat f(Nowhere());
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
  f.log.clear();  // a new session starts over
  f.GetReadWriteMetaDataAccess().reset();
  EXPECT_EQ(f.log, (Log{"open rw", "write", "close"}));
}

TEST(SoundFileFormatMetaData, FlushReportsFailuresReleaseSwallowsThemFailedOpenMakesNoHandle) {
  FakeSoundFileFormat f(Nowhere());
  f.onWrite = []() -> bool { Failure(kIOErr); };
  auto rw = f.GetReadWriteMetaDataAccess();
  EXPECT_EQ(CodeOf([&] { rw->Flush(); }), kIOErr);
  EXPECT_NO_THROW(rw.reset());
  EXPECT_FALSE(f.MetaDataIsOpen());
  EXPECT_EQ(f.log.back(), "close");

  FakeSoundFileFormat g(Nowhere());
  g.failOpen = true;
  EXPECT_EQ(CodeOf([&] { (void)g.GetReadOnlyMetaDataAccess(); }), kIOErr);
  EXPECT_FALSE(g.MetaDataIsOpen());
  g.failOpen = false;
  auto ro = g.GetReadOnlyMetaDataAccess();
  EXPECT_EQ(g.log, Log{"open r"});
}

TEST(SoundFileFormatMetaData, HooksMayAskTheMetaDataQueriesOfTheirFormat) {
  FakeSoundFileFormat f(Nowhere());
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

TEST(SoundFileFormatMetaData, HandlesKeepASharedFormatAlive) {
  auto f = std::make_shared<FakeSoundFileFormat>(Nowhere());
  std::weak_ptr<FakeSoundFileFormat> weak = f;
  auto ro = f->GetReadOnlyMetaDataAccess();
  f.reset();
  EXPECT_FALSE(weak.expired());
  ro.reset();
  EXPECT_TRUE(weak.expired());
}

// Metadata writes leave the file's date as it was at opening, unless the
// session asked otherwise or the length changed.
TEST(SoundFileFormatMetaData, ModificationDate) {
  TempDir dir;
  const auto spec = SpecOf(dir.Path("take.wav"));
  WriteFile(dir.Path("take.wav"), Bytes(1044, 0));
  constexpr FileDate kOld{1500000000, 0};
  const FileDate kNew(kOld.GetSeconds() + 1000, 0);
  FileDate::Set(spec, kOld);
  auto f = std::make_shared<FakeSoundFileFormat>(spec);
  f->onWrite = [&] {  // the hook touches the file as a metadata write would
    FileDate::Set(spec, kNew);
    return true;
  };
  FileDate date;
  EXPECT_EQ(CodeOf([&] { f->GetFileModDateAtMetaDataOpen(date); }), kParamErr);
  auto rw = f->GetReadWriteMetaDataAccess();
  f->GetFileModDateAtMetaDataOpen(date);
  EXPECT_EQ(date, kOld);
  rw.reset();
  EXPECT_EQ(FileDate::Get(spec), kOld);

  rw = f->GetReadWriteMetaDataAccess();
  f->DontSetModDateBackOnMetaDataClose();
  rw.reset();
  EXPECT_EQ(FileDate::Get(spec), kNew);
  FileDate::Set(spec, kOld);  // for that session only
  f->GetReadWriteMetaDataAccess().reset();
  EXPECT_EQ(FileDate::Get(spec), kOld);

  rw = f->GetReadWriteMetaDataAccess();
  f->ChangeLengthInFrames(*rw, 10);
  rw.reset();
  EXPECT_EQ(FileDate::Get(spec), kNew);
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

// Installs a converter factory that makes FakeSoundFileFormats and counts them.
class FormatCache : public ::testing::Test {
 protected:
  void SetUp() override {
    previous_ =
        cache_.SetConverterFormatFactory([this](const FileSpecification& spec, std::uint32_t type) {
          ++made_;
          auto f = std::make_shared<FakeSoundFileFormat>(spec);
          f->canonicalType = f->actualType = type;
          return f;
        });
  }
  void TearDown() override { cache_.SetConverterFormatFactory(previous_); }
  SoundFileFormatCache& cache_ = SoundFileFormatCache::Instance();
  SoundFileFormatCache::ConverterFormatFactory previous_;
  std::atomic<int> made_{0};
};

TEST_F(FormatCache, RenameMoveAndDeleteTakeTheEntryAlong) {
  TempDir dir;
  const auto path = dir.Path("take.tst");
  WriteFile(path, Bytes(10, 1));
  std::filesystem::create_directories(dir.Path("sub"));
  ChangeCounter counter;
  auto f = cache_.GetFormat(SpecOf(path), kTestType);
  f->Rename(UString("renamed.tst"));
  EXPECT_EQ(f->GetFile(), SpecOf(dir.Path("renamed.tst")));
  EXPECT_TRUE(std::filesystem::exists(dir.Path("renamed.tst")));
  EXPECT_FALSE(std::filesystem::exists(path));
  EXPECT_EQ(cache_.FindFormat(SpecOf(dir.Path("renamed.tst"))), f);
  EXPECT_EQ(cache_.FindFormat(SpecOf(path)), nullptr);
  f->MoveTo(SpecOf(dir.Path("sub")), UString("moved.tst"));
  const auto moved = dir.Path("sub") / "moved.tst";
  EXPECT_EQ(f->GetFile(), SpecOf(moved));
  EXPECT_TRUE(std::filesystem::exists(moved));
  EXPECT_EQ(cache_.FindFormat(SpecOf(moved)), f);
  EXPECT_EQ(counter.changed.size(), 2u);
  // A name that is taken fails with the file system's error and changes nothing.
  WriteFile(dir.Path("sub") / "taken.tst", Bytes(1, 0));
  EXPECT_THROW(f->Rename(UString("taken.tst")), TarnError);
  EXPECT_EQ(f->GetFile(), SpecOf(moved));
  f->Delete();
  EXPECT_FALSE(std::filesystem::exists(moved));
  EXPECT_EQ(cache_.FindFormat(SpecOf(moved)), nullptr);
  EXPECT_THROW(f->Delete(), TarnError);
}

TEST_F(FormatCache, OneObjectPerFileWhileHeld) {
  auto a1 = cache_.GetFormat(Nowhere("a.tst"), kTestType);
  auto a2 = cache_.GetFormat(Nowhere("a.tst"), kTestType);
  auto a3 = cache_.GetFormat(Nowhere("a.tst"), T("TsT2"));  // held: type not asked
  auto b = cache_.GetFormat(Nowhere("b.tst"), kTestType);
  EXPECT_EQ(a1, a2);
  EXPECT_EQ(a1, a3);
  EXPECT_NE(a1, b);
  EXPECT_EQ(cache_.FindFormat(Nowhere("a.tst")), a1);
  EXPECT_EQ(cache_.FindFormat(Nowhere("c.tst")), nullptr);
  EXPECT_EQ(made_, 2);
  // An object nobody holds is dropped; a metadata handle is a holder too.
  std::weak_ptr<SoundFileFormat> weak = a1;
  const std::size_t live = cache_.GetLiveCount();
  a1.reset(), a2.reset(), a3.reset();
  EXPECT_TRUE(weak.expired());
  EXPECT_EQ(cache_.GetLiveCount(), live - 1);
  EXPECT_EQ(cache_.FindFormat(Nowhere("a.tst")), nullptr);
  auto again = cache_.GetFormat(Nowhere("a.tst"), kTestType);
  EXPECT_EQ(made_, 3);
  auto hold = again->OpenMetaData();
  weak = again;
  again.reset();
  EXPECT_EQ(cache_.FindFormat(Nowhere("a.tst")), weak.lock());
  hold.reset();
  EXPECT_EQ(cache_.FindFormat(Nowhere("a.tst")), nullptr);
}

TEST_F(FormatCache, ConcurrentLookupsAgreeOnOneObjectPerFile) {
  constexpr int kThreads = 8, kFiles = 5, kRounds = 300;
  std::vector<std::vector<std::shared_ptr<SoundFileFormat>>> held(
      kThreads, std::vector<std::shared_ptr<SoundFileFormat>>(kFiles));
  std::atomic<int> mismatches{0};
  std::atomic<bool> go{false};
  std::vector<std::thread> threads;
  for (int t = 0; t < kThreads; ++t) {
    threads.emplace_back([&, t] {
      while (!go) std::this_thread::yield();
      for (int r = 0; r < kRounds; ++r) {
        const int file = (t + r) % kFiles;
        auto f = cache_.GetFormat(Nowhere("same" + std::to_string(file) + ".tst"), kTestType);
        if (held[t][file] && held[t][file] != f) ++mismatches;
        held[t][file] = f;
        // Churn: objects of other files come and go meanwhile.
        auto churn =
            cache_.GetFormat(Nowhere("churn" + std::to_string(t * kRounds + r)), kTestType);
        if (churn == f) ++mismatches;
      }
    });
  }
  go = true;
  for (auto& th : threads) th.join();
  EXPECT_EQ(mismatches, 0);
  for (int file = 0; file < kFiles; ++file)
    for (int t = 1; t < kThreads; ++t) EXPECT_EQ(held[t][file], held[0][file]) << file;
  // Losers of a race may have made objects that were dropped.
  EXPECT_GE(made_, kThreads * kRounds + kFiles);
  held.clear();
  cache_.Purge();
  for (int file = 0; file < kFiles; ++file)
    EXPECT_EQ(cache_.FindFormat(Nowhere("same" + std::to_string(file) + ".tst")), nullptr);
}

TEST_F(FormatCache, ListenersHearOfLengthChangesUntilRemoved) {
  auto f =
      std::dynamic_pointer_cast<FakeSoundFileFormat>(cache_.GetFormat(Nowhere("a.tst"), kTestType));
  std::vector<SoundFileFormat*> heard;
  const auto id = cache_.AddChangeListener([&](SoundFileFormat& c) { heard.push_back(&c); });
  auto rw = f->GetReadWriteMetaDataAccess();
  for (int frames : {5, 5, 6}) f->ChangeLengthInFrames(*rw, frames);
  cache_.RemoveChangeListener(id);
  f->ChangeLengthInFrames(*rw, 7);
  EXPECT_EQ(heard, (std::vector<SoundFileFormat*>{f.get(), f.get()}));
}

TEST_F(FormatCache, ClassesFollowTheFileType) {
  using F = SoundFileFamily;
  const std::pair<const char*, F> rows[] = {
      {"WAVE", F::kWAVE},          {"TEXT", F::kWAVE},          {"PNRA", F::kWAVE},
      {".W64", F::kWAVE},          {".WAV", F::kWAVE},          {".wav", F::kWAVE},
      {"AIFF", F::kAIFF},          {"ACdI", F::kAIFF},          {"Sd2f", F::kSoundDesigner},
      {"SFIL", F::kSoundDesigner}, {"AIFC", F::kConverter},     {"mp3 ", F::kConverter},
      {"wave", F::kConverter},     {"\0\0\0\0", F::kConverter},
  };
  for (const auto& [type, family] : rows)
    EXPECT_EQ(SoundFileFormatCache::FamilyForType(RIFFTypeFromChars(type)), family) << type;
  for (const char* type : {"Sd2f", "SFIL"})
    ExpectError([&] { (void)cache_.MakeFormatForFile(Nowhere(), RIFFTypeFromChars(type)); },
                "SoundFileFormatCache", SoundFileFormatCache::kUnsupportedFormatErr);
  EXPECT_EQ(made_, 0);
  auto aifc = cache_.MakeFormatForFile(Nowhere("x.aifc"), T("AIFC"));
  EXPECT_EQ(aifc->GetCanonicalFileType(), T("AIFC"));
  EXPECT_NE(aifc, cache_.MakeFormatForFile(Nowhere("x.aifc"), T("AIFC")));  // not cached
}

TEST_F(FormatCache, ConverterTypesWithoutAFactoryAnswerAreUnsupported) {
  cache_.SetConverterFormatFactory(nullptr);
  const auto get = [&] { (void)cache_.GetFormat(Nowhere("x.mp3"), T("mp3 ")); };
  EXPECT_EQ(CodeOf(get), SoundFileFormatCache::kUnsupportedFormatErr);
  cache_.SetConverterFormatFactory(
      [](const FileSpecification&, std::uint32_t) { return std::shared_ptr<SoundFileFormat>(); });
  EXPECT_EQ(CodeOf(get), SoundFileFormatCache::kUnsupportedFormatErr);
  EXPECT_EQ(cache_.FindFormat(Nowhere("x.mp3")), nullptr);
}

TEST_F(FormatCache, StaticQueriesOpenAskAndRelease) {
  EXPECT_EQ(SoundFileFormat::GetAttributesFromFileAndType(Nowhere("q"), kTestType).mSampleRate,
            48000.0);
  EXPECT_EQ(SoundFileFormat::GetFileLengthInFrames(Nowhere("q"), kTestType), SampleCount(1000));
  EXPECT_EQ(made_, 2);  // released in between
  EXPECT_EQ(cache_.FindFormat(Nowhere("q")), nullptr);
}

TEST(FormatCacheLimits, MaxFrameCountByTypeAndFrameSize) {
  const std::int64_t k32 = 0xFFFFFFFFLL - SoundFileFormatCache::kHeaderReserve;
  const std::int64_t k62 = std::int64_t{1} << 62;
  const std::pair<const char*, std::int64_t> rows[] = {
      {".WAV", k32}, {".wav", k32},          {"PNRA", k32},          {"TEXT", k32},
      {"AIFF", k32}, {"AIFC", k32},          {"ACdI", k32},          {"WAVE", k62},
      {".W64", k62}, {"Sd2f", 0xFFFFFFFFLL}, {"SFIL", 0xFFFFFFFFLL}, {"mp3 ", k62},
  };
  for (const auto& [type, bytes] : rows)
    for (int bpf : {1, 2, 3, 4, 6, 8, 24, 32, 1 << 20})
      EXPECT_EQ(SoundFileFormatCache::GetMaxFrameCountForType(RIFFTypeFromChars(type), bpf),
                SampleCount(bytes / bpf))
          << type << " " << bpf;
  // A 16-bit stereo RIFF file: 4 GiB less the header room, in 4-byte frames.
  EXPECT_EQ(SoundFileFormatCache::GetMaxFrameCountForType(T(".wav"), 4), SampleCount(1073725439));
  // A format asks with its actual type and frame size.
  FakeSoundFileFormat f(Nowhere());
  f.actualType = T(".W64");
  f.attributes.mBytesPerFrame = 6;
  EXPECT_EQ(f.GetMaxFrameCount(), SampleCount(k62 / 6));
  for (int bpf : {0, -1, -1000})
    EXPECT_EQ(CodeOf([&] { (void)SoundFileFormatCache::GetMaxFrameCountForType(T("WAVE"), bpf); }),
              kParamErr);
}

// --- NoMetaDataSoundFileFormat -------------------------------------------------

class ConverterOnlyFormat : public NoMetaDataSoundFileFormat {
 public:
  using NoMetaDataSoundFileFormat::NoMetaDataSoundFileFormat;
  SampleCount GetLengthInFrames() override { return 100; }
  std::uint32_t GetCanonicalFileType() override { return T("mp3 "); }
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
  ConverterOnlyFormat f(Nowhere("x.mp3"));
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
  f.WriteMetaData(*rw, T("bext"), RCBlobMT(4));
  EXPECT_FALSE(f.HasMetaData(*rw, T("bext")));
  EXPECT_TRUE(f.ReadMetaData(*rw, T("bext")).IsEmpty());
  EXPECT_TRUE(f.ReadNamedMetaData(*rw, UString("n"), T("bext")).IsEmpty());
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
