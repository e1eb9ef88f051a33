// The writer chain over an in-memory interleaved writer: interleaving in
// every format and channel count, conversion from float at the boundary
// values, dither only when asked, whole-block hand-on through the DiskAPI,
// mono splitting, and the closed state.

#include <gtest/gtest.h>

#include "AudioChain/ChainTestUtil.h"
#include "tarn/Audio/ConvertingWriter.h"
#include "tarn/Audio/InterleavingWriter.h"
#include "tarn/Audio/MonoSplittingWriter.h"

namespace tarn::test {
namespace {

// Per-channel buffers holding the channel's samples of MakeFrames.
std::vector<Bytes> ChannelData(SampleFormat f, int channels, std::int64_t frames) {
  const auto table = SampleTable(f);
  std::vector<Bytes> out(static_cast<std::size_t>(channels));
  for (std::int64_t i = 0; i < frames; ++i)
    for (int c = 0; c < channels; ++c) {
      const auto& b = table[CaseIndex(i, c, table.size())].bytes;
      out[static_cast<std::size_t>(c)].insert(out[static_cast<std::size_t>(c)].end(), b.begin(),
                                              b.end());
    }
  return out;
}

std::vector<const void*> Pointers(const std::vector<Bytes>& data) {
  std::vector<const void*> p;
  for (const auto& d : data) p.push_back(d.data());
  return p;
}

TEST(WriterChain, InterleavesEveryFormatAndChannelCount) {
  constexpr std::int64_t kFrames = 5000;
  for (SampleFormat f : {kSamp8Offset, kSamp8, kSamp16, kSamp24, kSampUnpacked24, kSampFloat32,
                         kSampWide64A, kSampWide64B})
    for (int channels = 1; channels <= 8; ++channels) {
      SCOPED_TRACE(testing::Message() << "format " << f << ", " << channels << " ch");
      auto file = std::make_shared<MemoryWriter>(Format(f, channels));
      InterleavingWriter writer(file);
      ASSERT_EQ(writer.GetFormat(), Format(f, channels));
      const auto data = ChannelData(f, channels, kFrames);
      const auto ptrs = Pointers(data);
      writer.Write(ptrs.data(), 1000);
      std::vector<const void*> rest;
      for (int c = 0; c < channels; ++c)
        rest.push_back(data[static_cast<std::size_t>(c)].data() + 1000 * GetBytesPerSample(f));
      writer.Write(rest.data(), kFrames - 1000);
      writer.Write(ptrs.data(), 0);
      ASSERT_EQ(file->data, MakeFrames(f, channels, kFrames));
      writer.Flush();
      writer.Close();
      writer.Close();
      EXPECT_EQ(file->flushes, 1);
      EXPECT_TRUE(file->closed);
      EXPECT_EQ(ErrorOf([&] { writer.Write(ptrs.data(), 1); }), -50);
      EXPECT_EQ(ErrorOf([&] { writer.Flush(); }), -50);
    }
}

TEST(WriterChain, ConvertsFloatToEveryFileFormat) {
  constexpr std::int64_t kFrames = 12000;  // more than the staging buffer holds at 8 ch
  for (SampleFormat to : kConvertible)
    for (int channels = 1; channels <= 8; ++channels) {
      SCOPED_TRACE(testing::Message() << "to " << to << ", " << channels << " ch");
      auto file = std::make_shared<MemoryWriter>(Format(to, channels));
      auto converter = std::make_shared<ConvertingWriter>(file, kSampFloat32);
      ASSERT_EQ(converter->GetFormat(), Format(kSampFloat32, channels));
      InterleavingWriter writer(converter);
      const auto data = ChannelData(kSampFloat32, channels, kFrames);
      writer.Write(Pointers(data).data(), kFrames);
      EXPECT_EQ(converter->GetFramesWritten(), kFrames);
      writer.Flush();
      EXPECT_EQ(file->flushes, 1);
      EXPECT_TRUE(file->data ==
                  Converted(kSampFloat32, to, MakeFrames(kSampFloat32, channels, kFrames)));
    }
}

TEST(WriterChain, ConvertsIntegerClientsToOtherFormats) {
  // 16-bit and 8-bit offset clients writing other formats: widening is
  // exact, narrowing truncates, 8-bit -128 widens to -32767.
  struct Case {
    SampleFormat from, to;
    Bytes in, out;
  };
  const Case cases[] = {
      {kSamp16, kSamp24, {0x00, 0x80, 0xFF, 0x7F}, {0, 0, 0x80, 0, 0xFF, 0x7F}},
      {kSamp16, kSampFloat32, {0x00, 0x80, 0x00, 0x40}, {0, 0, 0x80, 0xBF, 0, 0, 0, 0x3F}},
      {kSamp16, kSamp8Offset, {0x00, 0x80, 0xFF, 0x7F}, {0x00, 0xFF}},
      {kSamp8Offset, kSamp16, {0x00, 0xFF}, {0x01, 0x80, 0xFF, 0x7E}},
      {kSamp24, kSamp16, {0x00, 0x00, 0x80, 0xFF, 0xFF, 0x7F}, {0x00, 0x80, 0xFF, 0x7F}},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(testing::Message() << c.from << " -> " << c.to);
    auto file = std::make_shared<MemoryWriter>(Format(c.to, 1));
    ConvertingWriter writer(file, c.from);
    writer.Write(c.in.data(), static_cast<std::int64_t>(c.in.size()) / GetBytesPerSample(c.from));
    writer.Close();
    EXPECT_EQ(file->data, c.out);
    EXPECT_TRUE(file->closed);
  }
}

TEST(WriterChain, DitherOnlyWhenAsked) {
  const std::vector<float> silence(2 * 20000, 0.0f);
  struct Case {
    SampleFormat to;
    DitherType dither;
    bool expectNoise;
  };
  const Case cases[] = {
      {kSamp16, kNoDither, false},
      {kSamp16, kTriangularDither, true},
      {kSamp8, kTriangularDither, true},
      {kSamp24, kTriangularDither, false},
      {kSampFloat32, kTriangularDither, false},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(testing::Message() << "to " << c.to << " dither " << c.dither);
    auto file = std::make_shared<MemoryWriter>(Format(c.to, 2));
    ConvertingWriter writer(file, kSampFloat32, c.dither);
    writer.Write(silence.data(), 20000);
    writer.Flush();
    Bytes zero(file->data.size(), c.to == kSamp8Offset ? 0x80 : 0);
    if (!c.expectNoise) {
      EXPECT_EQ(file->data, zero);
      continue;
    }
    // Silence dithered to 16 bits stays within one step; at 8 bits the
    // dither has a 16-bit step's size, so it rounds to silence or -1 / +1.
    int nonzero = 0;
    const int bytes = GetBytesPerSample(c.to);
    for (std::size_t i = 0; i < file->data.size(); i += static_cast<std::size_t>(bytes)) {
      const int v = bytes == 2 ? static_cast<std::int16_t>(file->data[i] | file->data[i + 1] << 8)
                               : static_cast<std::int8_t>(file->data[i]);
      ASSERT_GE(v, -1);
      ASSERT_LE(v, 1);
      nonzero += v != 0;
    }
    if (c.to == kSamp16)
      EXPECT_GT(nonzero, 5000);
    else
      EXPECT_EQ(nonzero, 0);
  }
}

TEST(WriterChain, HandsOnWholeDiskBlocks) {
  // When frames can meet a block boundary (the frame size divides the block
  // size and the audio starts on a frame of it), every hand-on but the last
  // ends on a boundary; otherwise within a frame before one.
  struct Case {
    SampleFormat file;
    int channels;
    std::int64_t header;
  };
  const Case cases[] = {{kSamp16, 2, 44},
                        {kSamp24, 2, 1024},
                        {kSampFloat32, 8, 100},
                        {kSamp24, 6, 58},
                        {kSamp16, 1, 0}};
  for (const auto& c : cases) {
    SCOPED_TRACE(testing::Message() << c.file << " x " << c.channels << " header " << c.header);
    auto file = std::make_shared<MemoryWriter>(Format(c.file, c.channels), 4096, c.header);
    ConvertingWriter writer(file, kSampFloat32);
    const std::int64_t frameBytes = GetBytesPerSample(c.file) * c.channels;
    std::vector<float> frames(static_cast<std::size_t>(c.channels) * 1000, 0.25f);
    std::int64_t total = 0;
    for (int k = 0; k < 600; ++k) {  // small writes, as a recorder makes them
      const std::int64_t n = 1 + (k * 37) % 1000;
      writer.Write(frames.data(), n);
      total += n;
    }
    writer.Flush();
    ASSERT_EQ(static_cast<std::int64_t>(file->data.size()), total * frameBytes);
    ASSERT_GT(file->writes.size(), 2u);
    std::int64_t at = c.header;
    for (std::size_t w = 0; w + 1 < file->writes.size(); ++w) {
      at += file->writes[w];
      if (4096 % frameBytes == 0 && c.header % frameBytes == 0)
        EXPECT_EQ(at % 4096, 0) << "write " << w;
      else
        EXPECT_LT(at % 4096 == 0 ? 0 : 4096 - at % 4096, frameBytes) << "write " << w;
      EXPECT_GE(file->writes[w], 64 * 1024) << "write " << w;
    }
  }
}

TEST(WriterChain, MonoSplitsToEveryChannel) {
  for (int channels = 1; channels <= 8; ++channels) {
    auto file = std::make_shared<MemoryWriter>(Format(kSamp16, channels));
    MonoSplittingWriter writer(std::make_shared<InterleavingWriter>(
        std::make_shared<ConvertingWriter>(file, kSampFloat32)));
    ASSERT_EQ(writer.GetFormat(), Format(kSampFloat32, 1));
    const float mono[] = {-1.0f, 0.5f, 1.0f};
    const void* p[] = {mono};
    writer.Write(p, 3);
    writer.Close();
    Bytes expected;
    for (Bytes s : {Bytes{0x00, 0x80}, Bytes{0x00, 0x40}, Bytes{0xFF, 0x7F}})
      for (int c = 0; c < channels; ++c) expected.insert(expected.end(), s.begin(), s.end());
    EXPECT_EQ(file->data, expected) << channels << " ch";
    EXPECT_TRUE(file->closed);
  }
}

TEST(WriterChain, ConvertingWriterStateAndFailures) {
  auto file = std::make_shared<MemoryWriter>(Format(kSamp16, 2));
  {
    ConvertingWriter writer(file, kSampFloat32);
    const float f[] = {0.5f, -0.5f};
    writer.Write(f, 1);
    EXPECT_TRUE(file->data.empty()) << "staged until a flush";
  }  // the destructor hands staged frames on
  EXPECT_EQ(file->data, (Bytes{0x00, 0x40, 0x00, 0xC0}));
  ConvertingWriter writer(file, kSamp24);
  writer.Close();
  EXPECT_EQ(ErrorOf([&] { writer.Write(nullptr, 0); }), -50);
  EXPECT_EQ(ErrorOf([&] { writer.Flush(); }), -50);
  EXPECT_EQ(ErrorOf([&] { ConvertingWriter w(nullptr, kSamp16); }), -50);
  EXPECT_EQ(ErrorOf([&] { ConvertingWriter w(file, kSampWide64B); }), -108);
  EXPECT_EQ(ErrorOf([&] { InterleavingWriter w(nullptr); }), -50);
}

}  // namespace
}  // namespace tarn::test
