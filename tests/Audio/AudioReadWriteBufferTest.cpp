#include "tarn/Audio/AudioReadWriteBuffer.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <numeric>
#include <vector>

#include "tarn/Errors/TarnError.h"

namespace tarn {
namespace {

// A two-channel block whose channel c sample i is c * 10000 + start + i.
std::shared_ptr<AudioReadWriteBuffer> Ramp(std::int64_t start, int length) {
  auto block = std::make_shared<AudioReadWriteBuffer>(2, length);
  for (int c = 0; c < 2; ++c)
    for (int i = 0; i < length; ++i) (*block)[c][i] = float(c * 10000 + start + i);
  return block;
}

TEST(AudioReadWriteBuffer, OwningBlocksAreZeroedAndSilent) {
  AudioReadWriteBuffer block(12, 64);
  EXPECT_TRUE(block.IsSilent());
  EXPECT_TRUE(block.OwnsData());
  EXPECT_EQ(block.GetNumChans(), 12);
  for (int c = 0; c < 12; ++c)
    for (int i = 0; i < 64; ++i) ASSERT_EQ(block[c][i], 0.0f);
  block.SetIsSilent(false);
  EXPECT_FALSE(block.IsSilent());
  AudioReadWriteBuffer three(3, 8);
  EXPECT_EQ(three[3], nullptr);
  EXPECT_EQ(three[11], nullptr);
}

TEST(AudioReadWriteBuffer, BadShapesAreRefused) {
  for (auto [channels, length] : {std::pair{13, 10}, {-1, 10}, {2, -1}}) {
    try {
      AudioReadWriteBuffer block(channels, length);
      ADD_FAILURE() << channels << " x " << length;
    } catch (const TarnError& e) {
      EXPECT_TRUE(e.IsMacOSError(-50));
    }
  }
}

TEST(AudioReadWriteBuffer, BorrowsFromCallersAndHosts) {
  std::vector<float> left(32, 1.0f), right(32, 2.0f);
  float* arrays[] = {left.data(), right.data()};
  AudioReadWriteBuffer borrowed(2, 32, false, arrays);
  EXPECT_FALSE(borrowed.OwnsData());
  EXPECT_EQ(borrowed[1], right.data());

  PavRenderCacheBuffer host;
  host.length = 32;
  host.channelCount = 2;
  host.hasData = true;
  host.flags = 1;
  host.channels[0] = left.data();
  host.channels[1] = right.data();
  AudioReadWriteBuffer fromHost(host);
  EXPECT_EQ(fromHost[0], left.data());
  EXPECT_TRUE(fromHost.IsSilent());
  EXPECT_FALSE(fromHost.OwnsData());
  host.flags = 2;  // only bit 0 means silence
  EXPECT_FALSE(AudioReadWriteBuffer(host).IsSilent());

  host.hasData = false;
  AudioReadWriteBuffer own(host);
  EXPECT_TRUE(own.OwnsData());
  EXPECT_TRUE(own.IsSilent());
  EXPECT_NE(own[0], left.data());
  EXPECT_EQ(own[1][31], 0.0f);
  EXPECT_EQ(own.GetDataLen(), 32);
}

TEST(AudioReadWriteBufferCache, EmptyCacheSentinels) {
  AudioReadWriteBufferCache cache;
  EXPECT_EQ(cache.getStart(), SampleCount(281474976710655LL));
  EXPECT_EQ(cache.getEnd(), SampleCount(-281474976710655LL));
  EXPECT_GT(cache.getStart(), cache.getEnd());
  float out[4] = {};
  EXPECT_EQ(cache.readChannelData(out, 0, 0, 4), 0);
}

TEST(AudioReadWriteBufferCache, ReadsAcrossBlocks) {
  AudioReadWriteBufferCache cache;
  cache.addData(100, Ramp(100, 100));
  cache.addData(0, Ramp(0, 100));  // inserted in order
  EXPECT_EQ(cache.getStart(), SampleCount(0));
  EXPECT_EQ(cache.getEnd(), SampleCount(200));
  std::vector<float> out(400, -1.0f);
  ASSERT_EQ(cache.readChannelData(out.data(), 1, 50, 150), 150);
  for (int i = 0; i < 150; ++i) ASSERT_EQ(out[i], float(10000 + 50 + i)) << i;
  EXPECT_EQ(out[150], -1.0f);
  // Every start and count over the cache against the ramp.
  for (int start = -20; start <= 210; start += 7) {
    for (int count : {0, 1, 99, 100, 101, 250}) {
      std::fill(out.begin(), out.end(), -1.0f);
      const int from = std::max(start, 0);  // before the first block reads from its start
      const int expected = std::max(0, std::min(count, 200 - from));
      ASSERT_EQ(cache.readChannelData(out.data(), 0, start, count), expected)
          << start << " " << count;
      for (int i = 0; i < expected; ++i) ASSERT_EQ(out[i], float(from + i));
      ASSERT_EQ(out[expected], -1.0f);
    }
  }
}

TEST(AudioReadWriteBufferCache, FlushReleasesOnlyFinishedBlocks) {
  AudioReadWriteBufferCache cache;
  auto first = Ramp(0, 100);
  cache.addData(0, first);
  cache.addData(100, Ramp(100, 100));
  cache.flushUpTo(99);
  EXPECT_EQ(cache.size(), 2u);
  EXPECT_EQ(first.use_count(), 2);
  cache.flushUpTo(100);
  EXPECT_EQ(cache.size(), 1u);
  EXPECT_EQ(first.use_count(), 1);  // the cache let go of its share
  EXPECT_EQ(cache.getStart(), SampleCount(100));
  cache.flushUpTo(1000);
  EXPECT_EQ(cache.size(), 0u);
}

TEST(AudioReadWriteBufferCache, ChannelsABlockLacksAreRefused) {
  AudioReadWriteBufferCache cache;
  cache.addData(0, Ramp(0, 10));
  float out[10];
  for (int channel : {-1, 2, 12}) {
    try {
      (void)cache.readChannelData(out, channel, 0, 10);
      ADD_FAILURE() << channel;
    } catch (const TarnError& e) {
      EXPECT_TRUE(e.IsMacOSError(-50));
    }
  }
}

}  // namespace
}  // namespace tarn
