// SoundFileFormatCache: one object per file while held, the classes by type,
// the size limits by type, notifications and concurrent lookups.
#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "ChunkFileTestUtil.h"
#include "FakeSoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"

namespace tarn::test {
namespace {

constexpr std::uint32_t kTestType = MakeRIFFType("TsT1");

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

  static FileSpecification Spec(const std::string& name) {
    return FileSpecification(UString("/nowhere/" + name));
  }

  SoundFileFormatCache& cache_ = SoundFileFormatCache::Instance();
  SoundFileFormatCache::ConverterFormatFactory previous_;
  std::atomic<int> made_{0};
};

TEST_F(FormatCache, SameFileSameObjectDifferentFileDifferentObject) {
  auto a1 = cache_.GetFormat(Spec("a.tst"), kTestType);
  auto a2 = cache_.GetFormat(Spec("a.tst"), kTestType);
  auto a3 = cache_.GetFormat(Spec("a.tst"), MakeRIFFType("TsT2"));  // held: type not asked
  auto b = cache_.GetFormat(Spec("b.tst"), kTestType);
  EXPECT_EQ(a1, a2);
  EXPECT_EQ(a1, a3);
  EXPECT_NE(a1, b);
  EXPECT_EQ(made_, 2);
  EXPECT_EQ(cache_.FindFormat(Spec("a.tst")), a1);
  EXPECT_EQ(cache_.FindFormat(Spec("c.tst")), nullptr);
  EXPECT_EQ(made_, 2);
}

TEST_F(FormatCache, AnObjectNobodyHoldsIsDropped) {
  auto a = cache_.GetFormat(Spec("a.tst"), kTestType);
  std::weak_ptr<SoundFileFormat> weak = a;
  const std::size_t live = cache_.GetLiveCount();
  a.reset();
  EXPECT_TRUE(weak.expired());
  EXPECT_EQ(cache_.GetLiveCount(), live - 1);
  EXPECT_EQ(cache_.FindFormat(Spec("a.tst")), nullptr);
  auto again = cache_.GetFormat(Spec("a.tst"), kTestType);
  EXPECT_EQ(made_, 2);
  // A metadata handle is a holder too.
  auto hold = again->OpenMetaData();
  weak = again;
  again.reset();
  EXPECT_EQ(cache_.FindFormat(Spec("a.tst")), weak.lock());
  hold.reset();
  EXPECT_EQ(cache_.FindFormat(Spec("a.tst")), nullptr);
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
        auto f = cache_.GetFormat(Spec("same" + std::to_string(file) + ".tst"), kTestType);
        if (held[t][file] && held[t][file] != f) ++mismatches;
        held[t][file] = f;
        // Churn: objects of other files come and go meanwhile.
        auto churn =
            cache_.GetFormat(Spec("churn" + std::to_string(t * kRounds + r) + ".tst"), kTestType);
        if (churn == f) ++mismatches;
      }
    });
  }
  go = true;
  for (auto& th : threads) th.join();
  EXPECT_EQ(mismatches, 0);
  for (int file = 0; file < kFiles; ++file) {
    for (int t = 1; t < kThreads; ++t) EXPECT_EQ(held[t][file], held[0][file]) << file;
  }
  // Losers of a race may have made objects that were dropped, but every
  // churn file made at least one and the held ones exactly one survivor.
  EXPECT_GE(made_, kThreads * kRounds + kFiles);
  held.clear();
  cache_.Purge();
  for (int file = 0; file < kFiles; ++file) {
    EXPECT_EQ(cache_.FindFormat(Spec("same" + std::to_string(file) + ".tst")), nullptr);
  }
}

TEST_F(FormatCache, ListenersHearOfLengthChangesUntilRemoved) {
  auto f =
      std::dynamic_pointer_cast<FakeSoundFileFormat>(cache_.GetFormat(Spec("a.tst"), kTestType));
  std::vector<SoundFileFormat*> heard;
  const auto id =
      cache_.AddChangeListener([&](SoundFileFormat& changed) { heard.push_back(&changed); });
  auto rw = f->GetReadWriteMetaDataAccess();
  f->ChangeLengthInFrames(*rw, 5);
  f->ChangeLengthInFrames(*rw, 5);  // unchanged: no news
  f->ChangeLengthInFrames(*rw, 6);
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
  for (const auto& [type, family] : rows) {
    EXPECT_EQ(SoundFileFormatCache::FamilyForType(RIFFTypeFromChars(type)), family) << type;
  }
  for (const char* type : {"Sd2f", "SFIL"}) {
    auto e = ErrorOf([&] { (void)cache_.MakeFormatForFile(Spec("x"), RIFFTypeFromChars(type)); });
    ASSERT_TRUE(e) << type;
    EXPECT_EQ(e->GetIntErrorCode(), SoundFileFormatCache::kUnsupportedFormatErr);
    EXPECT_EQ(std::string(e->GetKind().c_str()), "SoundFileFormatCache");
  }
  EXPECT_EQ(made_, 0);
  auto aifc = cache_.MakeFormatForFile(Spec("x.aifc"), MakeRIFFType("AIFC"));
  EXPECT_EQ(aifc->GetCanonicalFileType(), MakeRIFFType("AIFC"));
  EXPECT_NE(aifc, cache_.MakeFormatForFile(Spec("x.aifc"), MakeRIFFType("AIFC")));  // not cached
}

TEST_F(FormatCache, ConverterTypesWithoutAFactoryAnswerAreUnsupported) {
  cache_.SetConverterFormatFactory(nullptr);
  auto e = ErrorOf([&] { (void)cache_.GetFormat(Spec("x.mp3"), MakeRIFFType("mp3 ")); });
  ASSERT_TRUE(e);
  EXPECT_EQ(e->GetIntErrorCode(), SoundFileFormatCache::kUnsupportedFormatErr);
  cache_.SetConverterFormatFactory(
      [](const FileSpecification&, std::uint32_t) { return std::shared_ptr<SoundFileFormat>(); });
  e = ErrorOf([&] { (void)cache_.GetFormat(Spec("x.mp3"), MakeRIFFType("mp3 ")); });
  ASSERT_TRUE(e);
  EXPECT_EQ(e->GetIntErrorCode(), SoundFileFormatCache::kUnsupportedFormatErr);
  EXPECT_EQ(cache_.FindFormat(Spec("x.mp3")), nullptr);
}

TEST_F(FormatCache, StaticQueriesOpenAskAndRelease) {
  auto a = SoundFileFormat::GetAttributesFromFileAndType(Spec("q.tst"), kTestType);
  EXPECT_EQ(a.mSampleRate, 48000.0);
  EXPECT_EQ(SoundFileFormat::GetFileLengthInFrames(Spec("q.tst"), kTestType), SampleCount(1000));
  EXPECT_EQ(made_, 2);  // released in between
  EXPECT_EQ(cache_.FindFormat(Spec("q.tst")), nullptr);
}

TEST(FormatCacheLimits, MaxFrameCountByTypeAndFrameSize) {
  const std::int64_t k32 = 0xFFFFFFFFLL - SoundFileFormatCache::kHeaderReserve;
  const std::int64_t k62 = std::int64_t{1} << 62;
  struct Row {
    const char* type;
    std::int64_t bytes;
  };
  const Row rows[] = {
      {".WAV", k32}, {".wav", k32},          {"PNRA", k32},          {"TEXT", k32},
      {"AIFF", k32}, {"AIFC", k32},          {"ACdI", k32},          {"WAVE", k62},
      {".W64", k62}, {"Sd2f", 0xFFFFFFFFLL}, {"SFIL", 0xFFFFFFFFLL}, {"mp3 ", k62},
  };
  for (const Row& r : rows) {
    for (int bpf : {1, 2, 3, 4, 6, 8, 24, 32, 1 << 20}) {
      EXPECT_EQ(SoundFileFormatCache::GetMaxFrameCountForType(RIFFTypeFromChars(r.type), bpf),
                SampleCount(r.bytes / bpf))
          << r.type << " " << bpf;
    }
  }
  // A 16-bit stereo RIFF file: 4 GiB less the header room, in 4-byte frames.
  EXPECT_EQ(SoundFileFormatCache::GetMaxFrameCountForType(MakeRIFFType(".wav"), 4),
            SampleCount(1073725439));
  for (int bpf : {0, -1, -1000}) {
    auto e = ErrorOf(
        [&] { (void)SoundFileFormatCache::GetMaxFrameCountForType(MakeRIFFType("WAVE"), bpf); });
    ASSERT_TRUE(e) << bpf;
    EXPECT_EQ(e->GetIntErrorCode(), kParamErr);
  }
}

}  // namespace
}  // namespace tarn::test
