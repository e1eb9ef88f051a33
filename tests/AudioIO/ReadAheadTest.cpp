// AudioInFile's read-ahead on files read without the system cache: forward
// runs of any request size, jumps after a prefetch, a file cut under a
// prefetched block, reads inside completions and destruction mid-prefetch.

#include <future>

#include "AudioIOTestUtil.h"

namespace tarn::test {
namespace {

// 20000 stereo 24-bit frames after a 44-byte header: frames straddle every
// 4096-byte block boundary.
class ReadAheadTest : public testing::Test {
 protected:
  static constexpr std::int64_t kFrames = 20000;
  static constexpr std::int64_t kFrameBytes = 6;
  void SetUp() override { WriteFile(path_, contents_); }
  DSPSoundBiteSpec Bite(bool lsb = true) {
    SoundFileAttributes a = Attributes(MakeRIFFType("WAVE"), 2, kSamp24, lsb);
    a.mOffsetToAudio = 44;
    return {SpecOf(path_), a, HostChannelOrder::ForChannelCount(2), {0, kFrames}};
  }
  AudioInFile Unbuffered(bool lsb = true) {
    return AudioInFile(Bite(lsb), FileLength{kFrames}, {kUnbufferedCaching, false});
  }
  Bytes FramesOfFile(std::int64_t first, std::int64_t count) {
    first = std::clamp<std::int64_t>(first, 0, kFrames);
    count = std::clamp<std::int64_t>(count, 0, kFrames - first);
    return Bytes(contents_.begin() + 44 + first * kFrameBytes,
                 contents_.begin() + 44 + (first + count) * kFrameBytes);
  }
  TempDir dir_;
  std::filesystem::path path_ = dir_.Path("in.wav");
  Bytes contents_ = Noise(44 + kFrames * kFrameBytes);
};

TEST_F(ReadAheadTest, ForwardRunsGiveTheFileBytesForAnyRequestSize) {
  // Request sizes in frames, taken in turn: equal runs, growing and
  // shrinking requests, sizes around one block.
  const std::vector<std::vector<std::int64_t>> runs = {
      {683}, {682, 683, 684}, {4096}, {5000, 1, 7}, {1, 7000}, {19999}, {kFrames + 5}};
  for (bool lsb : {true, false}) {
    for (bool stream : {true, false}) {
      for (const auto& sizes : runs) {
        SCOPED_TRACE(testing::Message()
                     << "lsb " << lsb << " stream " << stream << " first " << sizes.front());
        AudioInFile in = Unbuffered(lsb);
        Bytes got, buffer;
        std::int64_t at = 0;
        for (std::size_t i = 0; at < kFrames; ++i) {
          const std::int64_t want = sizes[i % sizes.size()];
          buffer.assign(static_cast<std::size_t>(want * kFrameBytes), 0);
          const std::int64_t n = stream ? in.Read(buffer.data(), want).AsLongLong()
                                        : in.OutOfOrderRead(buffer.data(), at, want).AsLongLong();
          ASSERT_EQ(n, std::min(want, kFrames - at)) << at;
          got.insert(got.end(), buffer.begin(), buffer.begin() + n * kFrameBytes);
          at += n;
        }
        EXPECT_EQ(stream ? in.Read(buffer.data(), 1) : in.OutOfOrderRead(buffer.data(), at, 1),
                  SampleCount(0));
        EXPECT_TRUE(got == (lsb ? FramesOfFile(0, kFrames) : Swapped(FramesOfFile(0, kFrames), 3)));
      }
    }
  }
}

TEST_F(ReadAheadTest, JumpsAfterAPrefetchReadTheFile) {
  // Two forward reads of 1000 frames queue a prefetch of 2000 .. 2999;
  // then one read at `start`.
  const std::int64_t cases[][2] = {{0, 1000},    {2000, 1000}, {2000, 500}, {2000, 3000},
                                   {2001, 1000}, {1999, 1000}, {5000, 10},  {19990, 100}};
  for (const auto& [start, frames] : cases) {
    AudioInFile in = Unbuffered();
    Bytes buffer(static_cast<std::size_t>(3000 * kFrameBytes));
    ASSERT_EQ(in.OutOfOrderRead(buffer.data(), 0, 1000), SampleCount(1000));
    ASSERT_EQ(in.OutOfOrderRead(buffer.data(), 1000, 1000), SampleCount(1000));
    const std::int64_t n = in.OutOfOrderRead(buffer.data(), start, frames).AsLongLong();
    const Bytes want = FramesOfFile(start, frames);
    ASSERT_EQ(n * kFrameBytes, std::int64_t(want.size())) << start;
    EXPECT_TRUE(std::equal(want.begin(), want.end(), buffer.begin())) << start << " " << frames;
    // And a stream read from where the jump left off.
    in.SetReadPosition(start + n);
    const std::int64_t more = in.Read(buffer.data(), 700).AsLongLong();
    const Bytes next = FramesOfFile(start + n, 700);
    ASSERT_EQ(more * kFrameBytes, std::int64_t(next.size()));
    EXPECT_TRUE(std::equal(next.begin(), next.end(), buffer.begin())) << start;
  }
}

TEST_F(ReadAheadTest, AFileCutUnderAPrefetchedBlockGivesShortReads) {
  for (std::int64_t cut : {1500, 2000, 2600, 3000}) {
    SetUp();
    AudioInFile in = Unbuffered();
    Bytes buffer(static_cast<std::size_t>(1000 * kFrameBytes));
    ASSERT_EQ(in.Read(buffer.data(), 1000), SampleCount(1000));
    ASSERT_EQ(in.Read(buffer.data(), 1000), SampleCount(1000));  // prefetches 2000 .. 2999
    std::filesystem::resize_file(path_, 44 + cut * kFrameBytes + 1);
    const std::int64_t expected = std::clamp<std::int64_t>(cut - 2000, 0, 1000);
    EXPECT_EQ(in.Read(buffer.data(), 1000), SampleCount(expected)) << cut;
    const Bytes want = FramesOfFile(2000, expected);
    EXPECT_TRUE(std::equal(want.begin(), want.end(), buffer.begin())) << cut;
  }
}

TEST_F(ReadAheadTest, ReadsInsideACompletionAndDestructionMidPrefetch) {
  for (int round = 0; round < 20; ++round) {
    auto in = std::make_unique<AudioInFile>(Bite(), FileLength{kFrames},
                                            PlatformFileOptions{kUnbufferedCaching, false});
    Bytes buffer(static_cast<std::size_t>(4000 * kFrameBytes));
    ASSERT_EQ(in->OutOfOrderRead(buffer.data(), 0, 2000), SampleCount(2000));
    ASSERT_EQ(in->OutOfOrderRead(buffer.data(), 2000, 2000), SampleCount(2000));
    if (round % 2 == 0) {
      in.reset();  // with the prefetch of 4000 .. 5999 most likely still queued
      continue;
    }
    // Forward reads on the reader thread neither wait for nor queue prefetches.
    std::promise<Bytes> done;
    in->OutOfOrderReadAsync(buffer.data(), 4000, 10, [&](int, SampleCount) {
      Bytes inner(static_cast<std::size_t>(3000 * kFrameBytes));
      (void)in->OutOfOrderRead(inner.data(), 4010, 1000);
      (void)in->OutOfOrderRead(inner.data() + 1000 * kFrameBytes, 5010, 2000);
      done.set_value(inner);
    });
    EXPECT_TRUE(done.get_future().get() == FramesOfFile(4010, 3000));
    EXPECT_TRUE(std::equal(buffer.begin(), buffer.begin() + 60, FramesOfFile(4000, 10).begin()));
    in.reset();
  }
}

}  // namespace
}  // namespace tarn::test
