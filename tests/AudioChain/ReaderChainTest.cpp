// The reader chain over an in-memory interleaved reader: deinterleaving in
// every format and channel count, conversion at the boundary values, mono
// summing, frame ranges cut to the stretch, and asynchronous reads.

#include <gtest/gtest.h>

#include <cmath>
#include <future>

#include "AudioChain/ChainTestUtil.h"
#include "tarn/Audio/ConvertingReader.h"
#include "tarn/Audio/DeinterleavingReader.h"
#include "tarn/Audio/MonoSummingReader.h"

namespace tarn::test {
namespace {

constexpr SampleFormat kAllFormats[] = {kSamp8Offset,    kSamp8,       kSamp16,      kSamp24,
                                        kSampUnpacked24, kSampFloat32, kSampWide64A, kSampWide64B};

std::unique_ptr<AudioReader> Deinterleaved(SampleFormat f, int channels, std::int64_t frames,
                                           std::int64_t delivered = -1) {
  return std::make_unique<DeinterleavingReader>(std::make_unique<MemoryReader>(
      Format(f, channels), MakeFrames(f, channels, frames), delivered));
}

// Per-channel buffers of `frames` samples of `bytes` bytes, filled with 0xA5
// so that untouched samples show.
struct Channels {
  Channels(int n, std::int64_t frames, int bytes)
      : data(static_cast<std::size_t>(n), Bytes(static_cast<std::size_t>(frames * bytes), 0xA5)) {
    for (auto& d : data) ptrs.push_back(d.data());
  }
  std::vector<Bytes> data;
  std::vector<void*> ptrs;
  float Float(int c, std::int64_t i) const {
    float v;
    std::memcpy(&v, data[static_cast<std::size_t>(c)].data() + i * 4, 4);
    return v;
  }
};

TEST(ReaderChain, DeinterleavesEveryFormatAndChannelCount) {
  constexpr std::int64_t kFrames = 5000;  // more than one block
  for (SampleFormat f : kAllFormats)
    for (int channels = 1; channels <= 8; ++channels) {
      SCOPED_TRACE(testing::Message() << "format " << f << ", " << channels << " ch");
      auto reader = Deinterleaved(f, channels, kFrames);
      ASSERT_EQ(reader->GetFormat(), Format(f, channels));
      ASSERT_EQ(reader->GetChannelOrder().GetNumChannels(), channels);
      const int bytes = GetBytesPerSample(f);
      Channels out(channels, kFrames, bytes);
      ASSERT_EQ(reader->Read(out.ptrs.data(), kFrames), kFrames);
      const auto table = SampleTable(f);
      for (int c = 0; c < channels; ++c)
        for (std::int64_t i = 0; i < kFrames; ++i)
          ASSERT_EQ(0, std::memcmp(out.data[static_cast<std::size_t>(c)].data() + i * bytes,
                                   table[CaseIndex(i, c, table.size())].bytes.data(),
                                   static_cast<std::size_t>(bytes)))
              << "channel " << c << " frame " << i;
    }
}

TEST(ReaderChain, ConvertsEveryFormatToFloatExactly) {
  constexpr std::int64_t kFrames = 4099;
  for (SampleFormat f : kConvertible)
    for (int channels = 1; channels <= 8; ++channels) {
      SCOPED_TRACE(testing::Message() << "format " << f << ", " << channels << " ch");
      auto reader = ConvertingReader::Wrap(Deinterleaved(f, channels, kFrames), kSampFloat32);
      ASSERT_EQ(reader->GetFormat().mSampleFormat, kSampFloat32);
      Channels out(channels, kFrames, 4);
      ASSERT_EQ(reader->OutOfOrderRead(out.ptrs.data(), 0, kFrames), kFrames);
      const auto table = SampleTable(f);
      for (int c = 0; c < channels; ++c)
        for (std::int64_t i = 0; i < kFrames; ++i)
          ASSERT_EQ(out.Float(c, i), table[CaseIndex(i, c, table.size())].value)
              << "channel " << c << " frame " << i;
    }
}

TEST(ReaderChain, ConvertsFloatToIntegersWithClipping) {
  for (SampleFormat to : kConvertible)
    for (int channels : {1, 2, 5}) {
      SCOPED_TRACE(testing::Message() << "to " << to << ", " << channels << " ch");
      auto reader = ConvertingReader::Wrap(Deinterleaved(kSampFloat32, channels, 20), to);
      const int bytes = GetBytesPerSample(to);
      Channels out(channels, 20, bytes);
      ASSERT_EQ(reader->Read(out.ptrs.data(), 20), 20);
      const Bytes want = Converted(kSampFloat32, to, MakeFrames(kSampFloat32, channels, 20));
      for (int ch = 0; ch < channels; ++ch)
        for (std::int64_t i = 0; i < 20; ++i)
          ASSERT_EQ(0, std::memcmp(out.data[static_cast<std::size_t>(ch)].data() + i * bytes,
                                   want.data() + (i * channels + ch) * bytes,
                                   static_cast<std::size_t>(bytes)))
              << "channel " << ch << " frame " << i;
    }
}

TEST(ReaderChain, DitherOnlyWhenAsked) {
  // A silent float file read as 16-bit: plain conversion gives silence,
  // dithered conversion spreads over -1..1 and is not all silence.
  Bytes silence(4 * 2 * 8192, 0);
  for (DitherType dither : {kNoDither, kTriangularDither}) {
    auto reader = std::make_unique<ConvertingReader>(
        std::make_unique<DeinterleavingReader>(
            std::make_unique<MemoryReader>(Format(kSampFloat32, 2), silence)),
        kSamp16, dither);
    std::vector<std::int16_t> l(8192), r(8192);
    void* ptrs[] = {l.data(), r.data()};
    ASSERT_EQ(reader->Read(ptrs, 8192), 8192);
    int nonzero = 0;
    for (auto* ch : {&l, &r})
      for (std::int16_t v : *ch) {
        ASSERT_GE(v, -1);
        ASSERT_LE(v, 1);
        nonzero += v != 0;
      }
    if (dither == kNoDither) {
      EXPECT_EQ(nonzero, 0);
    } else {
      EXPECT_GT(nonzero, 1000);
      EXPECT_NE(l, r) << "each channel draws its own dither";
    }
  }
  // Dither is never applied on the way to 24 bits.
  auto wide = std::make_unique<ConvertingReader>(
      std::make_unique<DeinterleavingReader>(
          std::make_unique<MemoryReader>(Format(kSampFloat32, 1), Bytes(4 * 1000, 0))),
      kSamp24, kTriangularDither);
  Bytes out(3000, 0xA5);
  void* p[] = {out.data()};
  ASSERT_EQ(wide->Read(p, 1000), 1000);
  EXPECT_EQ(out, Bytes(3000, 0));
}

TEST(ReaderChain, MonoSumIsExact) {
  // Channel values per frame and the expected single-precision sum in
  // channel order.
  struct Case {
    std::vector<float> samples;
    float sum;
  };
  const Case cases[] = {
      {{0.5f}, 0.5f},
      {{1.0f, 1.0f}, 2.0f},
      {{-1.0f, 1.0f}, 0.0f},
      {{0.5f, 0.25f, 0.125f}, 0.875f},
      {{1e8f, 1.0f, -1e8f}, 0.0f},  // 1e8 + 1 rounds back to 1e8 in single precision
      {{-1.0f, -1.0f, -1.0f, -1.0f, -1.0f, -1.0f, -1.0f, -1.0f}, -8.0f},
  };
  for (const auto& c : cases) {
    const int channels = static_cast<int>(c.samples.size());
    SCOPED_TRACE(testing::Message() << channels << " ch");
    constexpr std::int64_t kFrames = 4100;
    Bytes frames;
    for (std::int64_t i = 0; i < kFrames; ++i)
      for (float v : c.samples) {
        const auto* p = reinterpret_cast<const std::uint8_t*>(&v);
        frames.insert(frames.end(), p, p + 4);
      }
    MonoSummingReader mono(std::make_unique<DeinterleavingReader>(
        std::make_unique<MemoryReader>(Format(kSampFloat32, channels), frames)));
    ASSERT_EQ(mono.GetFormat(), Format(kSampFloat32, 1));
    std::vector<float> out(kFrames, 7.0f);
    void* p[] = {out.data()};
    ASSERT_EQ(mono.Read(p, kFrames), kFrames);
    for (float v : out) ASSERT_EQ(v, c.sum);
  }
  EXPECT_EQ(ErrorOf([] { MonoSummingReader m(Deinterleaved(kSamp16, 2, 4)); }), -50);
}

// Reads [start, start + frames) synchronously and asynchronously through
// each chain and checks the count, the samples and that nothing else was
// written.
TEST(ReaderChain, AnyFrameRangeSyncAndAsync) {
  constexpr std::int64_t kLength = 9000;
  struct Range {
    std::int64_t start, frames, expected;
  };
  const Range ranges[] = {
      {0, kLength, kLength},
      {0, 0, 0},
      {0, 1, 1},
      {4095, 2, 2},
      {3000, 4500, 4500},
      {kLength - 1, 1, 1},
      {kLength - 1, 10, 1},
      {kLength, 5, 0},
      {kLength + 100, 5, 0},
      {100, kLength, kLength - 100},
  };
  enum Chain { kDeinterleave, kConvert, kMono };
  for (Chain chain : {kDeinterleave, kConvert, kMono})
    for (bool async : {false, true})
      for (const auto& r : ranges) {
        SCOPED_TRACE(testing::Message() << "chain " << chain << (async ? " async" : " sync")
                                        << " start " << r.start << " frames " << r.frames);
        const int channels = 3;
        std::unique_ptr<AudioReader> reader =
            chain == kDeinterleave
                ? Deinterleaved(kSamp16, channels, kLength)
                : ConvertingReader::Wrap(Deinterleaved(kSamp24, channels, kLength), kSampFloat32);
        if (chain == kMono) reader = std::make_unique<MonoSummingReader>(std::move(reader));
        const int outChannels = reader->GetNumChannels();
        const int bytes = GetBytesPerSample(reader->GetFormat().mSampleFormat);
        Channels out(outChannels, r.frames + 1, bytes);
        SampleCount got = -1;
        if (async) {
          std::promise<std::pair<int, SampleCount>> done;
          reader->OutOfOrderReadAsync(out.ptrs.data(), r.start, r.frames,
                                      [&](int status, SampleCount n) {
                                        done.set_value({status, n});
                                      });
          const auto [status, n] = done.get_future().get();
          EXPECT_EQ(status, 0);
          got = n;
        } else {
          got = reader->OutOfOrderRead(out.ptrs.data(), r.start, r.frames);
        }
        ASSERT_EQ(got, r.expected);
        EXPECT_EQ(reader->GetReadPosition(), 0);
        const auto t16 = SampleTable(kSamp16), t24 = SampleTable(kSamp24);
        for (int c = 0; c < outChannels; ++c) {
          const Bytes& d = out.data[static_cast<std::size_t>(c)];
          for (std::int64_t i = 0; i < r.expected; ++i) {
            const std::int64_t frame = r.start + i;
            if (chain == kDeinterleave) {
              ASSERT_EQ(0,
                        std::memcmp(d.data() + i * 2, t16[CaseIndex(frame, c, 5)].bytes.data(), 2));
            } else if (chain == kConvert) {
              ASSERT_EQ(out.Float(c, i), t24[CaseIndex(frame, c, 5)].value);
            } else {
              float sum = t24[CaseIndex(frame, 0, 5)].value;
              for (int k = 1; k < channels; ++k) sum += t24[CaseIndex(frame, k, 5)].value;
              ASSERT_EQ(out.Float(c, i), sum);
            }
          }
          for (std::int64_t k = r.expected * bytes; k < static_cast<std::int64_t>(d.size()); ++k)
            ASSERT_EQ(d[static_cast<std::size_t>(k)], 0xA5) << "written past the frames read";
        }
      }
}

TEST(ReaderChain, StreamPositionNegativeRequestsAndShortFiles) {
  auto reader = ConvertingReader::Wrap(Deinterleaved(kSamp16, 2, 10000), kSampFloat32);
  Channels out(2, 10000, 4);
  EXPECT_EQ(reader->Read(out.ptrs.data(), 6000), 6000);
  EXPECT_EQ(reader->GetReadPosition(), 6000);
  EXPECT_EQ(reader->Read(out.ptrs.data(), 6000), 4000);
  EXPECT_EQ(reader->GetReadPosition(), 10000);
  EXPECT_EQ(reader->Read(out.ptrs.data(), 6000), 0);
  reader->SetReadPosition(-5);
  EXPECT_EQ(reader->GetReadPosition(), 0);
  reader->SetReadPosition(20000);
  EXPECT_EQ(reader->GetReadPosition(), 10000);
  EXPECT_EQ(ErrorOf([&] { (void)reader->OutOfOrderRead(out.ptrs.data(), -1, 5); }), -50);
  EXPECT_EQ(ErrorOf([&] { (void)reader->OutOfOrderRead(out.ptrs.data(), 0, -5); }), -50);
  EXPECT_EQ(ErrorOf([] { DeinterleavingReader r(nullptr); }), -50);
  EXPECT_EQ(ErrorOf([] { ConvertingReader r(Deinterleaved(kSamp16, 1, 1), kSamp16); }), -108);

  // A file that ends before its stretch does: the reads come up short.
  for (bool async : {false, true}) {
    auto cut = ConvertingReader::Wrap(Deinterleaved(kSamp16, 2, 10000, 5000), kSampFloat32);
    if (async) {
      std::promise<std::pair<int, SampleCount>> done;
      cut->OutOfOrderReadAsync(out.ptrs.data(), 4000, 3000, [&](int status, SampleCount n) {
        done.set_value({status, n});
      });
      EXPECT_EQ(done.get_future().get(), std::make_pair(-39, SampleCount(1000)));
    } else {
      EXPECT_EQ(cut->OutOfOrderRead(out.ptrs.data(), 4000, 3000), 1000);
    }
  }
}

TEST(ReaderChain, EmptyAsyncReadCompletesAtOnce) {
  auto reader = Deinterleaved(kSamp16, 2, 100);
  Channels out(2, 1, 2);
  int calls = 0;
  reader->OutOfOrderReadAsync(out.ptrs.data(), 100, 10, [&](int status, SampleCount n) {
    EXPECT_EQ(status, 0);
    EXPECT_EQ(n, 0);
    ++calls;
  });
  EXPECT_EQ(calls, 1);
}

}  // namespace
}  // namespace tarn::test
