// Byte-order helpers, BasicAudioOutFile's disk interface, AudioInFile at
// the edges of its stretch and of a file cut while open.

#include <atomic>
#include <future>

#include "AudioIOTestUtil.h"

namespace tarn::test {
namespace {

TEST(AudioFile, ByteSwapsReverseEachWholeSample) {
  TempDir dir;
  WriteFile(dir.Path("f"), {});
  using Swap = void (*)(void*, std::int64_t) noexcept;
  const std::tuple<Swap, SampleFormat, int> cases[] = {
      {AudioFile::ByteSwap16BitBuffer, kSamp16, 2},
      {AudioFile::ByteSwap24BitBuffer, kSamp24, 3},
      {AudioFile::ByteSwap32BitBuffer, kSampFloat32, 4},
      {AudioFile::ByteSwap64BitBuffer, kSampWide64B, 8},
      {nullptr, kSamp8, 1}};
  for (const auto& [swap, format, size] : cases) {
    Bytes bytes = Pattern(17), picked = bytes;
    if (swap) swap(bytes.data(), 17);
    EXPECT_EQ(bytes, Swapped(Pattern(17), size)) << size;  // a trailing part stays
    AudioFile file(SpecOf(dir.Path("f")), 0, kByteSwap, {format, 1, 48000.0}, false);
    file.ByteSwapBuffer(picked.data(), 17);
    EXPECT_EQ(picked, bytes) << size;
  }
  EXPECT_EQ(AudioFile::LSBOrderToByteSwapOption(true), kNoByteSwap);
  EXPECT_EQ(AudioFile::LSBOrderToByteSwapOption(false), kByteSwap);
}

TEST(BasicAudioOutFile, BlockArithmeticOfTheDiskInterface) {
  TempDir dir;
  const auto path = dir.Path("out");
  WriteFile(path, Pattern(100));
  BasicAudioOutFile out(SpecOf(path), 100, kNoByteSwap, {kSamp8, 1, 48000.0}, 0);
  InterAudioWriter::DiskAPI* disk = out.getDiskAPI();
  EXPECT_EQ(disk->GetBlockSize(), 4096);
  for (auto [at, till] : {std::pair{8192, 4096}, {8193, 4095}, {8191, 1}, {100, 3996}}) {
    out.SetWritePosition(at - 100);
    EXPECT_EQ(disk->GetBytesTillNextBlockBoundary(), till) << at;
  }
  out.SetWritePosition(0);
  EXPECT_EQ(disk->GetUnFilledSpace(), 0);
  SampleCount length = -1;
  ASSERT_TRUE(disk->ShouldExtendFile(length, 10));
  EXPECT_EQ(length, SampleCount(4096));  // (100 + 4096 - 100) / 1
  out.SetEOF(length);
  EXPECT_EQ(disk->GetUnFilledSpace(), 4096);
  EXPECT_FALSE(disk->ShouldExtendFile(length, 4096));
  out.SetWritePosition(3996);  // at a boundary: never
  EXPECT_FALSE(disk->ShouldExtendFile(length, 1 << 20));
  out.SetEOF(0);
  EXPECT_EQ(ReadFile(path), Pattern(100));
  out.Close();
  EXPECT_EQ(ErrorOf([&] { out.SetEOF(1); })->GetIntErrorCode(), kParamErr);
}

// 1000 stereo 16-bit frames after a 44-byte header.
class AudioInFileTest : public testing::Test {
 protected:
  void SetUp() override { WriteFile(path_, contents_); }
  DSPSoundBiteSpec Bite(std::int64_t start, std::int64_t end, bool lsb = true) {
    SoundFileAttributes a = Attributes(MakeRIFFType("WAVE"), 2, kSamp16, lsb);
    a.mOffsetToAudio = 44;
    return {SpecOf(path_), a, HostChannelOrder::ForChannelCount(2), {start, end}};
  }
  Bytes FramesOfFile(std::int64_t first, std::int64_t count) {
    return Bytes(contents_.begin() + 44 + first * 4, contents_.begin() + 44 + (first + count) * 4);
  }
  TempDir dir_;
  std::filesystem::path path_ = dir_.Path("in.wav");
  Bytes contents_ = Noise(44 + 4000);
  Bytes buffer_ = Bytes(4000);
};

TEST_F(AudioInFileTest, StreamReadsStopAtTheStretchEnd) {
  AudioInFile in(Bite(100, 900), FileLength{1000}, {kCachedCaching, true});
  EXPECT_EQ(in.GetLengthInFrames(), SampleCount(800));
  EXPECT_EQ(in.Read(buffer_.data(), 300), SampleCount(300));
  EXPECT_EQ(Bytes(buffer_.begin(), buffer_.begin() + 1200), FramesOfFile(100, 300));
  in.SetReadPosition(750);
  EXPECT_EQ(in.Read(buffer_.data(), 100), SampleCount(50));
  EXPECT_EQ(Bytes(buffer_.begin(), buffer_.begin() + 200), FramesOfFile(850, 50));
  EXPECT_EQ(in.GetReadPosition(), SampleCount(800));
  EXPECT_EQ(in.Read(buffer_.data(), 100), SampleCount(0));
  for (auto [asked, got] : {std::pair<std::int64_t, std::int64_t>{-5, 0}, {801, 800}}) {
    in.SetReadPosition(asked);
    EXPECT_EQ(in.GetReadPosition(), SampleCount(got));
  }
  for (auto range : {std::pair{-1, 10}, {10, 5}})
    EXPECT_EQ(ErrorOf([&] {
                AudioInFile bad(Bite(range.first, range.second), FileLength{1000});
              })->GetIntErrorCode(),
              kParamErr);
  EXPECT_EQ(
      ErrorOf([&] { AudioInFile bad(Bite(0, 9), FileLength{1000}, kSamp24); })->GetIntErrorCode(),
      kParamErr);
}

TEST_F(AudioInFileTest, PreflightCutsRequestsAtTheDataEnd) {
  AudioInFile in(Bite(100, 900), FileLength{850});  // the file's length ends it first
  const std::int64_t cases[][4] = {
      {0, 10, 0, 40},  {-7, 10, 0, 40},       {740, 20, 2960, 40},        {750, 1, 3000, 0},
      {10, -3, 40, 0}, {0, 1 << 30, 0, 3000}, {INT64_MAX / 2, 1, 3000, 0}};
  for (const auto& c : cases) {
    std::int64_t position = -1, count = -1;
    in.PreflightReadRequest(c[0], c[1], position, count);
    EXPECT_EQ(position, c[2]) << c[0] << " " << c[1];
    EXPECT_EQ(count, c[3]) << c[0] << " " << c[1];
  }
  EXPECT_EQ(in.OutOfOrderRead(buffer_.data(), 745, 100), SampleCount(5));
  EXPECT_EQ(Bytes(buffer_.begin(), buffer_.begin() + 20), FramesOfFile(845, 5));
  EXPECT_EQ(in.GetReadPosition(), SampleCount(0));
}

TEST_F(AudioInFileTest, AFileCutWhileOpenGivesShortReads) {
  AudioInFile in(Bite(0, 1000), FileLength{1000}, {kUnbufferedCaching, false});
  std::filesystem::resize_file(path_, 44 + 600 * 4 + 3);
  in.SetReadPosition(500);
  EXPECT_EQ(in.Read(buffer_.data(), 300), SampleCount(100));
  EXPECT_EQ(Bytes(buffer_.begin(), buffer_.begin() + 400), FramesOfFile(500, 100));
  EXPECT_EQ(in.GetReadPosition(), SampleCount(1000));  // the data end
  EXPECT_EQ(in.Read(buffer_.data(), 10), SampleCount(0));
  EXPECT_EQ(ErrorOf([&] { (void)in.OutOfOrderRead(buffer_.data(), 590, 20); })->GetIntErrorCode(),
            kEOFErr);
  EXPECT_EQ(in.CheckEndPosition(), SampleCount(600));
  EXPECT_EQ(in.OutOfOrderRead(buffer_.data(), 590, 20), SampleCount(10));
}

struct CountingMonitor : AudioReadPerformanceMonitor {
  void BytesCompleted(std::int64_t bytes) noexcept override { total += bytes; }
  std::atomic<std::int64_t> total{0};
};

TEST_F(AudioInFileTest, AsyncReadsTellTheMonitorAndSwap) {
  AudioInFile in(Bite(100, 900, false), FileLength{1000}, {kUnbufferedCaching, false});
  EXPECT_TRUE(in.ShouldSwapBuffer());
  for (auto [file, wanted, swap] : {std::tuple{true, true, false},
                                    {true, false, true},
                                    {false, true, true},
                                    {false, false, false}}) {
    in.SetByteSwappingBasedOnDesriedOutputByteOrder(file, wanted);
    EXPECT_EQ(in.ShouldSwapBuffer(), swap);
  }
  in.SetByteSwappingBasedOnDesriedOutputByteOrder(false, true);
  auto monitor = std::make_shared<CountingMonitor>();
  in.SetPerformanceMonitor(monitor);
  for (auto [start, frames, got] : {std::tuple{0, 64, 64}, {790, 64, 10}, {900, 4, 0}}) {
    std::promise<std::pair<int, SampleCount>> done;
    in.OutOfOrderReadAsync(buffer_.data(), start, frames, [&](int status, SampleCount n) {
      done.set_value({status, n});
    });
    EXPECT_EQ(done.get_future().get(), std::make_pair(0, SampleCount(got)));
    EXPECT_EQ(Bytes(buffer_.begin(), buffer_.begin() + got * 4),
              Swapped(FramesOfFile(100 + start, got), 2));
  }
  EXPECT_EQ(monitor->total, 74 * 4);
}

}  // namespace
}  // namespace tarn::test
