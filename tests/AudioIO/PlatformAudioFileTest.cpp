// PlatformAudioFile against a model of the file: every small unaligned
// transfer around block edges, through a memory file that refuses
// unaligned transfers, through the cache with the aligned path forced, and
// through a real unbuffered (O_DIRECT) file.

#include <algorithm>
#include <atomic>
#include <future>
#include <thread>

#include "AudioIOTestUtil.h"

namespace tarn::test {
namespace {

constexpr std::uint64_t kB = PlatformAudioFile::kBlockSize;
constexpr std::size_t kFileSize = 3 * kB + 123;
const std::uint64_t kOffsets[] = {
    0,          1,      5,      kB - 1,        kB,        kB + 1,
    2 * kB - 3, 2 * kB, 3 * kB, kFileSize - 1, kFileSize, kFileSize + 1,
    4 * kB + 7};
const std::uint64_t kCounts[] = {0, 1, 10, kB - 1, kB, kB + 1, 2 * kB + 5};

// The ways a file can be opened that must all behave the same.
enum class Way { kMemoryAligned, kCachedForced, kUnbuffered, kCached };
const Way kWays[] = {Way::kMemoryAligned, Way::kCachedForced, Way::kUnbuffered, Way::kCached};
const char* NameOf(Way w) {
  const char* names[] = {"memory, aligned", "cache, aligned path forced", "unbuffered", "cache"};
  return names[static_cast<int>(w)];
}

struct Opened {
  std::unique_ptr<PlatformAudioFile> file;
  std::shared_ptr<MemoryDriver> memory;  // for kMemoryAligned
  Bytes Contents(const std::filesystem::path& path) const {
    return memory ? memory->bytes_ : ReadFile(path);
  }
};

Opened Open(Way way, const std::filesystem::path& path, const Bytes& contents) {
  Opened o;
  if (way == Way::kMemoryAligned) {
    o.memory = std::make_shared<MemoryDriver>(contents, true);
    o.file = std::make_unique<PlatformAudioFile>(o.memory);
    return o;
  }
  WriteFile(path, contents);
  PlatformFileOptions options;
  options.mCachingMode = way == Way::kUnbuffered ? kUnbufferedCaching : kCachedCaching;
  options.mForceAlignment = way == Way::kCachedForced;
  o.file = std::make_unique<PlatformAudioFile>(SpecOf(path), true, options);
  EXPECT_EQ(o.file->NeedsAlignment(), way != Way::kCached);
  return o;
}

// A buffer whose data start is 1 byte past a block boundary, or on it.
struct Buffer {
  explicit Buffer(std::size_t n, bool aligned) : raw(n + 2 * kB) {
    const auto at = reinterpret_cast<std::uintptr_t>(raw.data());
    data = raw.data() + (kB - at % kB) + (aligned ? 0 : 1);
  }
  Bytes raw;
  std::uint8_t* data;
};

TEST(PlatformAudioFile, EveryReadAroundBlockEdgesMatchesTheModel) {
  TempDir dir;
  const Bytes model = Noise(kFileSize);
  for (Way way : kWays) {
    SCOPED_TRACE(NameOf(way));
    Opened o = Open(way, dir.Path("f"), model);
    for (std::uint64_t at : kOffsets) {
      for (std::uint64_t count : kCounts) {
        SCOPED_TRACE(testing::Message() << "read " << count << " at " << at);
        Buffer buffer(count, false);
        std::fill_n(buffer.data, count, std::uint8_t{0xEE});
        const FileResult r = o.file->SyncRead(buffer.data, count, at);
        const std::uint64_t valid =
            at >= kFileSize ? 0 : std::min<std::uint64_t>(count, kFileSize - at);
        EXPECT_EQ(r.bytes, static_cast<std::int64_t>(valid));
        EXPECT_EQ(r.status, valid == count ? kFileOK : kFileEOFErr);
        EXPECT_EQ(o.file->GetPosition(), at + valid);
        ASSERT_TRUE(
            std::equal(buffer.data, buffer.data + valid,
                       model.begin() + std::ptrdiff_t(std::min<std::uint64_t>(at, kFileSize))));
      }
    }
    if (o.memory) {
      EXPECT_EQ(o.memory->misaligned_, 0);
    }
  }
}

TEST(PlatformAudioFile, EveryWriteAroundBlockEdgesMatchesTheModel) {
  TempDir dir;
  for (Way way : kWays) {
    SCOPED_TRACE(NameOf(way));
    Bytes model = Noise(kFileSize);
    Opened o = Open(way, dir.Path("f"), model);
    std::uint32_t seed = 100;
    for (std::uint64_t at : kOffsets) {
      for (std::uint64_t count : kCounts) {
        SCOPED_TRACE(testing::Message() << "write " << count << " at " << at);
        const Bytes data = Noise(count, ++seed);
        Buffer buffer(count, seed % 2 == 0);
        std::copy(data.begin(), data.end(), buffer.data);
        // The current position is the default.
        o.file->SetPosition(at);
        ASSERT_EQ(o.file->SyncWrite(buffer.data, count), kFileOK);
        EXPECT_EQ(o.file->GetPosition(), at + count);
        if (count != 0) {
          if (model.size() < at + count) model.resize(at + count, 0);
          std::copy(data.begin(), data.end(), model.begin() + std::ptrdiff_t(at));
        }
        ASSERT_EQ(o.Contents(dir.Path("f")), model);
        EXPECT_TRUE(std::equal(data.begin(), data.end(), buffer.data)) << "caller's buffer changed";
      }
    }
    if (o.memory) {
      EXPECT_EQ(o.memory->misaligned_, 0);
    }
  }
}

TEST(PlatformAudioFile, AlignedTransfersGoStraightToTheDriverAndMoveByTheCount) {
  auto memory = std::make_shared<MemoryDriver>(Noise(4 * kB), true);
  PlatformAudioFile file(memory);
  Buffer buffer(2 * kB, true);
  EXPECT_EQ(file.SyncRead(buffer.data, 2 * kB, kB), (FileResult{kFileOK, 2 * kB}));
  EXPECT_EQ(memory->lastBuffer_, buffer.data);
  EXPECT_EQ(file.GetPosition(), 3 * kB);
  EXPECT_EQ(file.SyncWrite(buffer.data, kB), kFileOK);
  EXPECT_EQ(memory->lastBuffer_, buffer.data);
  EXPECT_EQ(file.GetPosition(), 4 * kB);
  EXPECT_EQ(memory->transfers_, 2);
  // An unaligned buffer goes through the bounce buffer instead.
  Buffer odd(10, false);
  EXPECT_EQ(file.SyncRead(odd.data, 10, 5), (FileResult{kFileOK, 10}));
  EXPECT_NE(memory->lastBuffer_, odd.data);
  EXPECT_EQ(file.GetPosition(), 15u);
  EXPECT_TRUE(std::equal(odd.data, odd.data + 10, memory->bytes_.begin() + 5));
}

TEST(PlatformAudioFile, SetPositionLeavesTheSystemFilePointerAlone) {
  auto memory = std::make_shared<MemoryDriver>(Noise(kB), false);
  PlatformAudioFile file(memory);
  memory->pointer_ = 77;
  for (std::uint64_t at : {std::uint64_t{0}, std::uint64_t{12345}, ~std::uint64_t{0} >> 1}) {
    file.SetPosition(at);
    EXPECT_EQ(file.GetPosition(), at);
    EXPECT_EQ(memory->pointer_, 77u);
  }
}

TEST(PlatformAudioFile, AFailedWriteLeavesThePositionAndReportsTheStatus) {
  auto memory = std::make_shared<MemoryDriver>(Noise(kB), true);
  PlatformAudioFile file(memory);
  file.SetPosition(100);
  memory->failWrites_ = true;
  const Bytes data = Noise(10);
  EXPECT_EQ(file.SyncWrite(data.data(), 10), kFileIOErr);
  EXPECT_EQ(file.GetPosition(), 100u);
  // Ranges beyond 64-bit signed offsets are refused before any I/O.
  Bytes buffer(10);
  for (std::uint64_t at : {~std::uint64_t{0} - 5, std::uint64_t{1} << 63}) {
    EXPECT_EQ(file.SyncRead(buffer.data(), 10, at).status, kFileParamErr);
    EXPECT_EQ(file.SyncWrite(buffer.data(), 10, at), kFileParamErr);
  }
  EXPECT_EQ(file.SyncRead(buffer.data(), ~std::uint64_t{0}, 0).status, kFileParamErr);
}

TEST(PlatformAudioFile, AFileThatFailedToOpenAnswersParamErrEverywhere) {
  TempDir dir;
  PlatformAudioFile file(SpecOf(dir.Path("missing")), true);
  std::uint8_t byte = 0;
  EXPECT_EQ(file.SyncRead(&byte, 1).status, kFileParamErr);
  EXPECT_EQ(file.SyncWrite(&byte, 1, 5), kFileParamErr);
  EXPECT_EQ(file.GetSize().status, kFileParamErr);
  EXPECT_EQ(file.SetSize(10), kFileParamErr);
  EXPECT_EQ(file.Flush(), kFileParamErr);
  EXPECT_EQ(file.GetBlockSize(), (FileResult{kFileOK, 4096}));
  std::promise<std::int32_t> status;
  file.AsyncRead(&byte, 0, 1, [&](std::int32_t s, std::int32_t) { status.set_value(s); });
  EXPECT_EQ(status.get_future().get(), kFileParamErr);
}

TEST(PlatformAudioFile, SizeOperationsAndUnbufferedOpenOnRealFileSystems) {
  // /tmp (the temporary folder) is a disk file system here; /dev/shm is
  // tmpfs, where older kernels refuse O_DIRECT and the driver falls back to
  // the cache but keeps the aligned path.
  TempDir dir;
  std::vector<std::filesystem::path> places = {dir.Path("f")};
  if (std::filesystem::is_directory("/dev/shm"))
    places.push_back("/dev/shm/tarn-audioio-" +
                     std::to_string(::testing::UnitTest::GetInstance()->random_seed()) + "-" +
                     std::to_string(reinterpret_cast<std::uintptr_t>(&dir)));
  for (const auto& path : places) {
    SCOPED_TRACE(path.string());
    const Bytes model = Noise(kB + 3);
    WriteFile(path, model);
    {
      PlatformFileDriver driver(SpecOf(path), true, {kUnbufferedCaching, false});
      ASSERT_TRUE(driver.IsOpen());
      EXPECT_TRUE(driver.NeedsAlignment());
#ifdef __linux__
      if (path == dir.Path("f")) {
        EXPECT_TRUE(driver.IsUnbuffered()) << "O_DIRECT refused on disk";
      }
#endif
    }
    PlatformAudioFile file(SpecOf(path), true, {kUnbufferedCaching, false});
    EXPECT_EQ(file.GetSize(), (FileResult{kFileOK, static_cast<std::int64_t>(kB + 3)}));
    Buffer buffer(3, false);
    EXPECT_EQ(file.SyncRead(buffer.data, 3, kB), (FileResult{kFileOK, 3}));
    EXPECT_TRUE(std::equal(buffer.data, buffer.data + 3, model.begin() + kB));
    EXPECT_EQ(file.SetSize(10), kFileOK);
    EXPECT_EQ(file.GetSize().bytes, 10);
    EXPECT_EQ(file.Flush(), kFileOK);
    EXPECT_EQ(ReadFile(path), Bytes(model.begin(), model.begin() + 10));
    std::filesystem::remove(path);
  }
}

TEST(PlatformAudioFile, AsyncReadsCompleteOnTheReaderThreadWithTheRightBytes) {
  TempDir dir;
  const Bytes model = Noise(kFileSize);
  Opened o = Open(Way::kUnbuffered, dir.Path("f"), model);
  struct Read {
    std::uint64_t at, count;
    std::int32_t status, bytes;
  };
  const Read reads[] = {{0, kB, 0, kB},
                        {5, 10, 0, 10},
                        {kB - 1, 2, 0, 2},
                        {kFileSize - 5, 5, 0, 5},
                        {kFileSize - 5, 9, -39, 5},
                        {kFileSize + 9, 4, -39, 0}};
  const auto caller = std::this_thread::get_id();
  for (const Read& r : reads) {
    SCOPED_TRACE(testing::Message() << r.count << " at " << r.at);
    Buffer buffer(r.count, false);
    std::promise<std::pair<std::int32_t, std::int32_t>> done;
    std::atomic<bool> otherThread{false};
    o.file->AsyncRead(buffer.data, r.at, r.count, [&](std::int32_t status, std::int32_t bytes) {
      otherThread = std::this_thread::get_id() != caller;
      done.set_value({status, bytes});
    });
    const auto [status, bytes] = done.get_future().get();
    EXPECT_TRUE(otherThread);
    EXPECT_EQ(status, r.status);
    ASSERT_EQ(bytes, r.bytes);
    EXPECT_TRUE(std::equal(buffer.data, buffer.data + bytes, model.begin() + std::ptrdiff_t(r.at)));
  }
}

TEST(PlatformAudioFile, AQueuedReadKeepsTheFileOpenAfterItsOwnerIsGone) {
  TempDir dir;
  const Bytes model = Noise(kB);
  WriteFile(dir.Path("f"), model);
  Buffer buffer(100, false);
  std::promise<std::int32_t> done;
  {
    PlatformAudioFile file(SpecOf(dir.Path("f")), false);
    file.AsyncRead(buffer.data, 7, 100,
                   [&](std::int32_t, std::int32_t bytes) { done.set_value(bytes); });
  }
  EXPECT_EQ(done.get_future().get(), 100);
  EXPECT_TRUE(std::equal(buffer.data, buffer.data + 100, model.begin() + 7));
}

}  // namespace
}  // namespace tarn::test
