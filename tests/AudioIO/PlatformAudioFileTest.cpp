// PlatformAudioFile against a model file: every small transfer around block
// edges through a memory file refusing unaligned transfers, through the
// cache with the aligned path forced, through O_DIRECT and through the cache.

#include <future>
#include <thread>

#include "AudioIOTestUtil.h"

namespace tarn::test {
namespace {

constexpr std::uint64_t kB = PlatformAudioFile::kBlockSize;
constexpr std::uint64_t kSize = 3 * kB + 123;
const std::uint64_t kOffsets[] = {0,      1,          5,         kB - 1, kB,
                                  kB + 1, 2 * kB - 3, 2 * kB,    3 * kB, kSize - 1,
                                  kSize,  kSize + 1,  4 * kB + 7};
const std::uint64_t kCounts[] = {0, 1, 10, kB - 1, kB, kB + 1, 2 * kB + 5};

enum Way { kMemory, kForced, kUnbuffered, kCached };

struct Opened {
  std::shared_ptr<MemoryDriver> memory;
  std::unique_ptr<PlatformAudioFile> file;
  Bytes Contents(const std::filesystem::path& path) const {
    return memory ? memory->bytes_ : ReadFile(path);
  }
};

Opened Open(Way way, const std::filesystem::path& path, const Bytes& contents) {
  Opened o;
  if (way == kMemory) {
    o.memory = std::make_shared<MemoryDriver>(contents, true);
    o.file = std::make_unique<PlatformAudioFile>(o.memory);
  } else {
    WriteFile(path, contents);
    o.file = std::make_unique<PlatformAudioFile>(
        SpecOf(path), true, PlatformFileOptions{way == kUnbuffered ? 2 : 0, way == kForced});
  }
  EXPECT_EQ(o.file->NeedsAlignment(), way != kCached);
  return o;
}

// `n` bytes starting one byte past a block boundary (or on it).
struct Buffer {
  Buffer(std::size_t n, bool aligned) : raw(n + 2 * kB) {
    data = raw.data() + (kB - reinterpret_cast<std::uintptr_t>(raw.data()) % kB) + !aligned;
  }
  Bytes raw;
  std::uint8_t* data;
};

TEST(PlatformAudioFile, EveryTransferAroundBlockEdgesMatchesTheModel) {
  TempDir dir;
  for (Way way : {kMemory, kForced, kUnbuffered, kCached}) {
    SCOPED_TRACE(way);
    Bytes model = Noise(kSize);
    Opened o = Open(way, dir.Path("f"), model);
    for (std::uint64_t at : kOffsets) {
      for (std::uint64_t count : kCounts) {
        SCOPED_TRACE(testing::Message() << count << " bytes at " << at);
        Buffer in(count, false);
        const FileResult r = o.file->SyncRead(in.data, count, at);
        const std::uint64_t valid = std::min(count, model.size() - std::min(at, model.size()));
        EXPECT_EQ(r, (FileResult{valid == count ? kFileOK : kFileEOFErr, std::int64_t(valid)}));
        EXPECT_EQ(o.file->GetPosition(), at + valid);
        ASSERT_TRUE(std::equal(in.data, in.data + valid,
                               model.begin() + std::ptrdiff_t(std::min(at, kSize))));

        const Bytes data = Noise(count, std::uint32_t(at + count));
        Buffer out(count, count % 2 == 0);
        std::copy(data.begin(), data.end(), out.data);
        o.file->SetPosition(at);  // the current position is the default
        ASSERT_EQ(o.file->SyncWrite(out.data, count), kFileOK);
        EXPECT_EQ(o.file->GetPosition(), at + count);
        if (count != 0) {
          model.resize(std::max<std::uint64_t>(model.size(), at + count), 0);
          std::copy(data.begin(), data.end(), model.begin() + std::ptrdiff_t(at));
        }
        ASSERT_EQ(o.Contents(dir.Path("f")), model);
        EXPECT_TRUE(std::equal(data.begin(), data.end(), out.data)) << "caller's buffer changed";
        model.resize(kSize);  // back to the size the next read expects
        ASSERT_EQ(o.file->SetSize(kSize), kFileOK);
      }
    }
    if (o.memory) {
      EXPECT_EQ(o.memory->misaligned_, 0);
    }
  }
}

TEST(PlatformAudioFile, AlignedTransfersGoStraightThroughAndThePositionIsOurOwn) {
  auto memory = std::make_shared<MemoryDriver>(Noise(4 * kB), true);
  PlatformAudioFile file(memory);
  Buffer buffer(2 * kB, true);
  EXPECT_EQ(file.SyncRead(buffer.data, 2 * kB, kB), (FileResult{kFileOK, 2 * kB}));
  EXPECT_EQ(memory->lastBuffer_, buffer.data);
  EXPECT_EQ(file.GetPosition(), 3 * kB);
  EXPECT_EQ(file.SyncWrite(buffer.data, kB), kFileOK);
  EXPECT_EQ(memory->lastBuffer_, buffer.data);
  EXPECT_EQ(file.GetPosition(), 4 * kB);
  for (std::uint64_t at : {std::uint64_t{5}, std::uint64_t{1} << 62}) {
    file.SetPosition(at);
    EXPECT_EQ(file.GetPosition(), at);
    EXPECT_EQ(memory->pointer_, 4 * kB);  // untouched until the next transfer
  }
  Buffer odd(10, false);
  EXPECT_EQ(file.SyncRead(odd.data, 10, 5), (FileResult{kFileOK, 10}));
  EXPECT_EQ(file.GetPosition(), 15u);
  EXPECT_TRUE(std::equal(odd.data, odd.data + 10, memory->bytes_.begin() + 5));
}

TEST(PlatformAudioFile, FailuresAreStatuses) {
  TempDir dir;
  PlatformAudioFile missing(SpecOf(dir.Path("missing")), true);
  Bytes buffer(10);
  EXPECT_EQ(missing.SyncRead(buffer.data(), 1).status, kFileParamErr);
  EXPECT_EQ(missing.SyncWrite(buffer.data(), 1, 5), kFileParamErr);
  EXPECT_EQ(missing.GetSize().status, kFileParamErr);
  EXPECT_EQ(missing.SetSize(10), kFileParamErr);
  EXPECT_EQ(missing.Flush(), kFileParamErr);
  EXPECT_EQ(missing.GetBlockSize(), (FileResult{kFileOK, 4096}));
  auto memory = std::make_shared<MemoryDriver>(Noise(kB), true);
  PlatformAudioFile file(memory);
  file.SetPosition(100);
  memory->failWrites_ = true;
  EXPECT_EQ(file.SyncWrite(buffer.data(), 10), kFileIOErr);
  EXPECT_EQ(file.GetPosition(), 100u);
  // Ranges beyond signed 64-bit offsets are refused before any I/O.
  for (std::uint64_t at : {~std::uint64_t{0} - 5, std::uint64_t{1} << 63}) {
    EXPECT_EQ(file.SyncRead(buffer.data(), 10, at).status, kFileParamErr);
    EXPECT_EQ(file.SyncWrite(buffer.data(), 10, at), kFileParamErr);
  }
}

TEST(PlatformAudioFile, UnbufferedFilesOnDiskAndOnTmpfs) {
  // The temporary folder is on disk here; /dev/shm is tmpfs, where kernels
  // before 6.6 refuse O_DIRECT and the driver falls back to the cache.
  TempDir dir;
  std::vector<std::filesystem::path> places = {dir.Path("f")};
  if (std::filesystem::is_directory("/dev/shm"))
    places.push_back("/dev/shm/" + dir.Path("f").parent_path().filename().string());
  for (const auto& path : places) {
    SCOPED_TRACE(path.string());
    const Bytes model = Noise(kB + 3);
    WriteFile(path, model);
    {
      PlatformFileDriver driver(SpecOf(path), true, {kUnbufferedCaching, false});
      EXPECT_TRUE(driver.IsOpen() && driver.NeedsAlignment());
#ifdef __linux__
      if (path == places.front()) {
        EXPECT_TRUE(driver.IsUnbuffered()) << "O_DIRECT refused on disk";
      }
#endif
    }
    {
      PlatformAudioFile file(SpecOf(path), true, {kUnbufferedCaching, false});
      EXPECT_EQ(file.GetSize(), (FileResult{kFileOK, std::int64_t(kB + 3)}));
      Buffer buffer(3, false);
      EXPECT_EQ(file.SyncRead(buffer.data, 3, kB), (FileResult{kFileOK, 3}));
      EXPECT_TRUE(std::equal(buffer.data, buffer.data + 3, model.begin() + kB));
      EXPECT_EQ(file.SetSize(10), kFileOK);
      EXPECT_EQ(file.Flush(), kFileOK);
    }
    EXPECT_EQ(ReadFile(path), Bytes(model.begin(), model.begin() + 10));
    std::filesystem::remove(path);
  }
}

TEST(PlatformAudioFile, AsyncReadsCompleteOnAnotherThreadWithTheRightBytes) {
  TempDir dir;
  const Bytes model = Noise(kSize);
  struct Read {
    std::uint64_t at, count;
    std::int32_t status, bytes;
  };
  const Read reads[] = {{0, kB, 0, kB},       {5, 10, 0, 10},         {kB - 1, 2, 0, 2},
                        {kSize - 5, 5, 0, 5}, {kSize - 5, 9, -39, 5}, {kSize + 9, 4, -39, 0}};
  for (const Read& r : reads) {
    SCOPED_TRACE(testing::Message() << r.count << " at " << r.at);
    Buffer buffer(r.count, false);
    std::promise<std::tuple<std::int32_t, std::int32_t, std::thread::id>> done;
    {
      // The queued read keeps the file open after its owner is gone.
      Opened o = Open(kUnbuffered, dir.Path("f"), model);
      o.file->AsyncRead(buffer.data, r.at, r.count, [&](std::int32_t status, std::int32_t bytes) {
        done.set_value({status, bytes, std::this_thread::get_id()});
      });
    }
    const auto [status, bytes, thread] = done.get_future().get();
    EXPECT_NE(thread, std::this_thread::get_id());
    EXPECT_EQ(status, r.status);
    ASSERT_EQ(bytes, r.bytes);
    EXPECT_TRUE(std::equal(buffer.data, buffer.data + bytes,
                           model.begin() + std::ptrdiff_t(std::min(r.at, kSize))));
  }
  std::promise<std::int32_t> status;
  PlatformAudioFile(SpecOf(dir.Path("missing")), false)
      .AsyncRead(nullptr, 0, 1, [&](std::int32_t s, std::int32_t) { status.set_value(s); });
  EXPECT_EQ(status.get_future().get(), kFileParamErr);
}

}  // namespace
}  // namespace tarn::test
