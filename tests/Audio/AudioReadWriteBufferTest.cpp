#include "tarn/Audio/AudioReadWriteBuffer.h"

#include <gtest/gtest.h>

#include "AudioTestUtil.h"

namespace tarn {
namespace {

TEST(AudioReadWriteBuffer, OwnedBorrowedAndHostBlocks) {
  AudioReadWriteBuffer block(12, 64);
  EXPECT_TRUE(block.IsSilent() && block.OwnsData());
  for (int c = 0; c < 12; ++c) EXPECT_EQ(std::count(block[c], block[c] + 64, 0.0f), 64);
  EXPECT_EQ(AudioReadWriteBuffer(3, 8)[3], nullptr);
  for (const auto& shape : {std::pair{13, 10}, {-1, 10}, {2, -1}})
    EXPECT_EQ(ErrorOf([&] { AudioReadWriteBuffer(shape.first, shape.second); }), -50)
        << shape.first;

  std::vector<float> left(32, 1.0f), right(32, 2.0f);
  float* arrays[] = {left.data(), right.data()};
  AudioReadWriteBuffer borrowed(2, 32, false, arrays);
  EXPECT_TRUE(!borrowed.OwnsData() && borrowed[1] == right.data());
  PavRenderCacheBuffer host{32, 1, 2, true, {left.data(), right.data()}};
  AudioReadWriteBuffer fromHost(host);
  EXPECT_TRUE(fromHost[0] == left.data() && fromHost.IsSilent() && !fromHost.OwnsData());
  host.flags = 2;  // only bit 0 means silence
  EXPECT_FALSE(AudioReadWriteBuffer(host).IsSilent());
  host.hasData = false;
  AudioReadWriteBuffer own(host);
  EXPECT_TRUE(own.OwnsData() && own.IsSilent());
  EXPECT_TRUE(own[0] != left.data() && own[1][31] == 0.0f);
}

// Blocks [0, 100) and [100, 200), channel c sample t holding c * 10000 + t.
TEST(AudioReadWriteBufferCache, ReadsAcrossBlocksAndFlushes) {
  AudioReadWriteBufferCache cache;
  EXPECT_TRUE(cache.getStart() == 281474976710655LL && cache.getEnd() == -281474976710655LL);
  std::vector<float> out(400, -1.0f);
  EXPECT_EQ(cache.readChannelData(out.data(), 0, 0, 4), 0);
  std::shared_ptr<AudioReadWriteBuffer> blocks[2];
  for (int b : {1, 0}) {  // inserted in order
    blocks[b] = std::make_shared<AudioReadWriteBuffer>(2, 100);
    for (int c = 0; c < 2; ++c)
      for (int i = 0; i < 100; ++i) (*blocks[b])[c][i] = float(c * 10000 + b * 100 + i);
    cache.addData(b * 100, blocks[b]);
  }
  EXPECT_TRUE(cache.getStart() == 0 && cache.getEnd() == 200);
  for (int start = -20; start <= 210; start += 7)
    for (int count : {0, 1, 99, 100, 101, 250})
      for (int channel : {0, 1}) {
        std::fill(out.begin(), out.end(), -1.0f);
        const int from = std::max(start, 0);  // before the first block reads from its start
        const int expected = std::max(0, std::min(count, 200 - from));
        ASSERT_EQ(cache.readChannelData(out.data(), channel, start, count), expected)
            << start << " " << count;
        for (int i = 0; i < expected; ++i) ASSERT_EQ(out[i], float(channel * 10000 + from + i));
        ASSERT_EQ(out[expected], -1.0f);
      }
  for (int channel : {-1, 2, 12})
    EXPECT_EQ(ErrorOf([&] { (void)cache.readChannelData(out.data(), channel, 0, 10); }), -50);
  // Flushing releases only finished blocks, and the cache's share of them.
  for (auto [upTo, size, start] : {std::tuple{99, 2u, 0}, {100, 1u, 100}, {1000, 0u, -1}}) {
    cache.flushUpTo(upTo);
    EXPECT_EQ(blocks[0].use_count(), upTo < 100 ? 2 : 1);
    EXPECT_TRUE(cache.size() == size && (start < 0 || cache.getStart() == start)) << upTo;
  }
}

}  // namespace
}  // namespace tarn
