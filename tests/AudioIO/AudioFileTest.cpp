// AudioFile's byte order helpers, BasicAudioOutFile's block-aware disk
// interface and swapping writes, AudioInFile's reads at the edges of its
// stretch and of a file cut while open.

#include <atomic>
#include <future>
#include <tuple>

#include "AudioIOTestUtil.h"

namespace tarn::test {
namespace {

TEST(AudioFile, ByteSwapsReverseEachSampleAndLeaveATrailingPartOfOne) {
  struct Case {
    void (*swap)(void*, std::int64_t) noexcept;
    SampleFormat format;
    int size;
  };
  const Case cases[] = {{AudioFile::ByteSwap16BitBuffer, kSamp16, 2},
                        {AudioFile::ByteSwap24BitBuffer, kSamp24, 3},
                        {AudioFile::ByteSwap32BitBuffer, kSampFloat32, 4},
                        {AudioFile::ByteSwap64BitBuffer, kSampWide64B, 8}};
  TempDir dir;
  WriteFile(dir.Path("f"), {});
  for (const Case& c : cases) {
    SCOPED_TRACE(c.size);
    const Bytes original = Pattern(17);
    Bytes expected = original;
    const std::size_t whole = 17 / c.size * c.size;
    for (std::size_t i = 0; i < whole; i += c.size)
      std::reverse(expected.begin() + std::ptrdiff_t(i),
                   expected.begin() + std::ptrdiff_t(i + c.size));
    Bytes bytes = original;
    c.swap(bytes.data(), 17);
    EXPECT_EQ(bytes, expected);
    // ByteSwapBuffer picks the same one from the sample format.
    AudioFile file(SpecOf(dir.Path("f")), 0, kByteSwap, {c.format, 1, 48000.0}, false);
    bytes = original;
    file.ByteSwapBuffer(bytes.data(), 17);
    EXPECT_EQ(bytes, expected);
  }
  Bytes eight = Pattern(5);
  AudioFile file(SpecOf(dir.Path("f")), 0, kByteSwap, {kSamp8, 1, 48000.0}, false);
  file.ByteSwapBuffer(eight.data(), 5);
  EXPECT_EQ(eight, Pattern(5));
}

TEST(AudioFile, ByteOrderOptions) {
  EXPECT_EQ(AudioFile::LSBOrderToByteSwapOption(true), kNoByteSwap);
  EXPECT_EQ(AudioFile::LSBOrderToByteSwapOption(false), kByteSwap);
  TempDir dir;
  WriteFile(dir.Path("f"), Bytes(100));
  DSPSoundBiteSpec bite{SpecOf(dir.Path("f")),
                        Attributes(0, 1, kSamp16, true),
                        {},
                        {SampleCount(0), SampleCount(50)}};
  bite.mAttributes.mBytesPerSample = 2;
  bite.mAttributes.mBytesPerFrame = 2;
  AudioInFile in(bite, FileLength{50});
  EXPECT_FALSE(in.ShouldSwapBuffer());
  const bool table[][3] = {
      {true, true, false}, {true, false, true}, {false, true, true}, {false, false, false}};
  for (const auto& row : table) {
    in.SetByteSwappingBasedOnDesriedOutputByteOrder(row[0], row[1]);
    EXPECT_EQ(in.ShouldSwapBuffer(), row[2]);
  }
}

class BasicAudioOutFileTest : public testing::Test {
 protected:
  static constexpr std::int32_t kHeader = 100;
  void SetUp() override { WriteFile(path_, Pattern(kHeader)); }
  BasicAudioOutFile Open(SampleFormat format, int channels, ByteSwapOption swap) {
    return BasicAudioOutFile(SpecOf(path_), kHeader, swap,
                             {format, static_cast<std::int16_t>(channels), 48000.0}, 0);
  }
  TempDir dir_;
  std::filesystem::path path_ = dir_.Path("out");
};

TEST_F(BasicAudioOutFileTest, BlockArithmeticOfTheDiskInterface) {
  BasicAudioOutFile out(SpecOf(path_), kHeader, kNoByteSwap, {kSamp8, 1, 48000.0}, 0);
  InterAudioWriter::DiskAPI* disk = out.getDiskAPI();
  ASSERT_EQ(disk, static_cast<InterAudioWriter::DiskAPI*>(&out));
  EXPECT_EQ(disk->GetBlockSize(), 4096);
  struct Case {
    std::int64_t bytePosition;
    int tillBoundary;
  };
  for (const Case c :
       {Case{8192, 4096}, {8193, 4095}, {4096 + 4095, 1}, {kHeader, 4096 - kHeader}}) {
    out.SetWritePosition(c.bytePosition - kHeader);
    EXPECT_EQ(disk->GetBytesTillNextBlockBoundary(), c.tillBoundary) << c.bytePosition;
  }
  // File of 100 bytes: nothing unfilled after the header; room is short.
  out.SetWritePosition(0);
  EXPECT_EQ(disk->GetUnFilledSpace(), 0);
  SampleCount newLength = -1;
  ASSERT_TRUE(disk->ShouldExtendFile(newLength, 10));
  EXPECT_EQ(newLength, SampleCount(4096));  // (100 + 4096 - 100) / 1
  out.SetEOF(newLength);
  EXPECT_EQ(std::filesystem::file_size(path_), 4196u);
  EXPECT_EQ(disk->GetUnFilledSpace(), 4096);
  EXPECT_FALSE(disk->ShouldExtendFile(newLength, 4096));
  out.SetWritePosition(4096 - kHeader);  // at a boundary: never extend
  EXPECT_FALSE(disk->ShouldExtendFile(newLength, 1 << 20));
  out.SetEOF(0);
  EXPECT_EQ(ReadFile(path_), Pattern(kHeader));
  out.Close();
  EXPECT_EQ(ErrorOf([&] { out.SetEOF(1); })->GetIntErrorCode(), kParamErr);
  out.Close();  // again: nothing
}

TEST_F(BasicAudioOutFileTest, SwappedWritesLeaveTheCallersBufferAlone) {
  for (auto [format, size] :
       {std::pair{kSamp16, 2}, {kSamp24, 3}, {kSampFloat32, 4}, {kSampWide64B, 8}}) {
    SCOPED_TRACE(size);
    SetUp();
    for (ByteSwapOption swap : {kNoByteSwap, kByteSwap}) {
      BasicAudioOutFile out = Open(format, 3, swap);
      EXPECT_EQ(out.NeedToSwapBytes(), swap == kByteSwap);
      const Bytes frames = Noise(std::size_t(11) * 3 * size);
      Bytes buffer = frames;
      out.Write(buffer.data(), 5);
      out.Write(buffer.data() + 5 * 3 * size, 6);
      EXPECT_EQ(buffer, frames);
      EXPECT_EQ(out.GetWritePosition(), SampleCount(11));
      EXPECT_EQ(out.GetFramesWritten(), SampleCount(11));
      out.Close();
      Bytes expected = frames;
      if (swap == kByteSwap)
        for (std::size_t i = 0; i < expected.size(); i += size)
          std::reverse(expected.begin() + std::ptrdiff_t(i),
                       expected.begin() + std::ptrdiff_t(i + size));
      const Bytes file = ReadFile(path_);
      ASSERT_EQ(file.size(), kHeader + frames.size());
      EXPECT_TRUE(std::equal(expected.begin(), expected.end(), file.begin() + kHeader));
    }
  }
}

// A file of a 44-byte header and 1000 stereo 16-bit frames, read as the
// stretch [100, 900).
class AudioInFileTest : public testing::Test {
 protected:
  static constexpr int kHeader = 44, kFrameSize = 4;
  void SetUp() override {
    contents_ = Noise(kHeader + 1000 * kFrameSize);
    WriteFile(path_, contents_);
  }
  DSPSoundBiteSpec Bite(std::int64_t start, std::int64_t end, bool lsb = true) {
    SoundFileAttributes a = Attributes(MakeRIFFType("WAVE"), 2, kSamp16, lsb);
    a.mBytesPerSample = 2;
    a.mBytesPerFrame = kFrameSize;
    a.mOffsetToAudio = kHeader;
    return {SpecOf(path_), a, HostChannelOrder::ForChannelCount(2), {start, end}};
  }
  Bytes FramesOfFile(std::int64_t first, std::int64_t count) {
    const auto at = contents_.begin() + kHeader + first * kFrameSize;
    return Bytes(at, at + count * kFrameSize);
  }
  TempDir dir_;
  std::filesystem::path path_ = dir_.Path("in.wav");
  Bytes contents_;
};

TEST_F(AudioInFileTest, StreamReadsStopAtTheStretchEnd) {
  for (bool forced : {false, true}) {
    AudioInFile in(Bite(100, 900), FileLength{1000}, {kCachedCaching, forced});
    EXPECT_EQ(in.GetLengthInFrames(), SampleCount(800));
    EXPECT_EQ(in.GetBytesPerFrame(), kFrameSize);
    EXPECT_EQ(in.GetChannelOrder(), HostChannelOrder::ForChannelCount(2));
    Bytes buffer(1000 * kFrameSize);
    EXPECT_EQ(in.Read(buffer.data(), 300), SampleCount(300));
    EXPECT_EQ(Bytes(buffer.begin(), buffer.begin() + 1200), FramesOfFile(100, 300));
    in.SetReadPosition(750);
    EXPECT_EQ(in.Read(buffer.data(), 100), SampleCount(50));
    EXPECT_EQ(Bytes(buffer.begin(), buffer.begin() + 200), FramesOfFile(850, 50));
    EXPECT_EQ(in.GetReadPosition(), SampleCount(800));
    EXPECT_EQ(in.Read(buffer.data(), 100), SampleCount(0));
    for (auto [asked, got] :
         {std::pair<std::int64_t, std::int64_t>{-5, 0}, {801, 800}, {400, 400}}) {
      in.SetReadPosition(asked);
      EXPECT_EQ(in.GetReadPosition(), SampleCount(got));
    }
  }
}

TEST_F(AudioInFileTest, PreflightCutsRequestsAtTheDataEnd) {
  // The file's length (FileLength 850) ends the stretch before its own end.
  AudioInFile in(Bite(100, 900), FileLength{850});
  struct Case {
    std::int64_t start, frames, position, count;
  };
  const Case cases[] = {
      {0, 10, 0, 40},    {-7, 10, 0, 40}, {740, 20, 2960, 40},   {750, 1, 3000, 0},
      {760, 5, 3000, 0}, {10, -3, 40, 0}, {0, 1 << 30, 0, 3000}, {INT64_MAX / 2, 1, 3000, 0}};
  for (const Case& c : cases) {
    std::int64_t position = -1, count = -1;
    in.PreflightReadRequest(c.start, c.frames, position, count);
    EXPECT_EQ(position, c.position) << c.start << " " << c.frames;
    EXPECT_EQ(count, c.count) << c.start << " " << c.frames;
  }
  Bytes buffer(100 * kFrameSize);
  EXPECT_EQ(in.OutOfOrderRead(buffer.data(), 745, 100), SampleCount(5));
  EXPECT_EQ(Bytes(buffer.begin(), buffer.begin() + 20), FramesOfFile(845, 5));
  EXPECT_EQ(in.GetReadPosition(), SampleCount(0));
}

TEST_F(AudioInFileTest, AFileCutWhileOpenGivesShortReads) {
  AudioInFile in(Bite(0, 1000), FileLength{1000}, {kUnbufferedCaching, false});
  std::filesystem::resize_file(path_, kHeader + 600 * kFrameSize + 3);
  Bytes buffer(1000 * kFrameSize);
  in.SetReadPosition(500);
  EXPECT_EQ(in.Read(buffer.data(), 300), SampleCount(100));
  EXPECT_EQ(Bytes(buffer.begin(), buffer.begin() + 400), FramesOfFile(500, 100));
  EXPECT_EQ(in.GetReadPosition(), SampleCount(1000));  // the data end
  EXPECT_EQ(in.Read(buffer.data(), 10), SampleCount(0));
  // Out of order the end of the file is an error.
  EXPECT_EQ(ErrorOf([&] { (void)in.OutOfOrderRead(buffer.data(), 590, 20); })->GetIntErrorCode(),
            kEOFErr);
  EXPECT_EQ(in.CheckEndPosition(), SampleCount(600));
  EXPECT_EQ(in.OutOfOrderRead(buffer.data(), 590, 20), SampleCount(10));
  EXPECT_EQ(Bytes(buffer.begin(), buffer.begin() + 40), FramesOfFile(590, 10));
}

TEST_F(AudioInFileTest, BadBitesAreRefused) {
  struct Case {
    std::int64_t start, end;
    int bytesPerSample;
  };
  for (const Case c : {Case{-1, 10, 2}, {10, 5, 2}, {0, 10, 3}}) {
    DSPSoundBiteSpec bite = Bite(c.start, c.end);
    bite.mAttributes.mBytesPerSample = static_cast<std::int16_t>(c.bytesPerSample);
    EXPECT_EQ(ErrorOf([&] { AudioInFile in(bite, FileLength{1000}); })->GetIntErrorCode(),
              kParamErr);
  }
  EXPECT_EQ(
      ErrorOf([&] { AudioInFile in(Bite(0, 10), FileLength{1000}, kSamp24); })->GetIntErrorCode(),
      kParamErr);
  AudioInFile asFloat(Bite(0, 10), FileLength{1000}, kSamp16);
  EXPECT_EQ(asFloat.GetFormat().mSampleFormat, kSamp16);
}

class CountingMonitor : public AudioReadPerformanceMonitor {
 public:
  void BytesCompleted(std::int64_t bytes) noexcept override { total += bytes; }
  std::atomic<std::int64_t> total{0};
};

TEST_F(AudioInFileTest, AsyncReadsSwapTellTheMonitorAndComplete) {
  AudioInFile in(Bite(100, 900, false), FileLength{1000}, {kUnbufferedCaching, false});
  ASSERT_TRUE(in.ShouldSwapBuffer());
  auto monitor = std::make_shared<CountingMonitor>();
  in.SetPerformanceMonitor(monitor);
  Bytes buffer(64 * kFrameSize);
  for (auto [start, frames, expected] :
       {std::tuple<std::int64_t, std::int64_t, std::int64_t>{0, 64, 64},
        {790, 64, 10},
        {900, 4, 0}}) {
    std::promise<std::pair<int, SampleCount>> done;
    in.OutOfOrderReadAsync(buffer.data(), start, frames, [&](int status, SampleCount got) {
      done.set_value({status, got});
    });
    const auto [status, got] = done.get_future().get();
    EXPECT_EQ(status, 0);
    ASSERT_EQ(got, SampleCount(expected));
    Bytes swapped = FramesOfFile(100 + start, expected);
    AudioFile::ByteSwap16BitBuffer(swapped.data(), std::int64_t(swapped.size()));
    EXPECT_EQ(Bytes(buffer.begin(), buffer.begin() + std::ptrdiff_t(swapped.size())), swapped);
  }
  EXPECT_EQ(monitor->total, 74 * kFrameSize);
}

}  // namespace
}  // namespace tarn::test
