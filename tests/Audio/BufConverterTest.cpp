#include "tarn/Audio/BufConverter.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <climits>

#include "ConverterTestUtil.h"
#include "tarn/Errors/TarnError.h"

namespace {

using namespace convtest;
using tarn::BufConverter;
using tarn::ConverterKernels::SetKernelLevel;

std::vector<std::uint8_t> RandomBytes(std::mt19937_64& rng, std::size_t n) {
  std::vector<std::uint8_t> b(n);
  for (auto& x : b) x = static_cast<std::uint8_t>(rng());
  return b;
}

// Every combination of formats -1..8 and dither -1..2: a converter exactly
// where the table has one, converting as the table's family says;
// out-of-memory (-108) everywhere else.
TEST(BufConverterCreate, TableOverAllFormatsAndDitherValues) {
  std::mt19937_64 rng(7);
  for (int from = -1; from <= 8; ++from) {
    for (int to = -1; to <= 8; ++to) {
      for (int dither = -1; dither <= 2; ++dither) {
        const Family family = Expected(from, to);
        const bool exists = family == Family::kPlain ||
                            (family == Family::kDitherable && (dither == 0 || dither == 1));
        SCOPED_TRACE("from " + std::to_string(from) + " to " + std::to_string(to) + " dither " +
                     std::to_string(dither));
        if (!exists) {
          try {
            (void)BufConverter::Create(Fmt(from), Fmt(to), static_cast<tarn::DitherType>(dither));
            ADD_FAILURE() << "expected no converter";
          } catch (const tarn::TarnError& e) {
            EXPECT_EQ(e.GetIntErrorCode(), -108);
          }
          continue;
        }
        Made made = CreateKnownSeed(from, to, dither);
        ASSERT_TRUE(made.converter);
        convref::Generator gen{made.seed};
        const bool dithered = family == Family::kDitherable && dither == 1;
        const auto src = RandomBytes(rng, 67 * static_cast<std::size_t>(convref::BytesOf(from)));
        ExpectConversion(*made.converter, from, to, dither, dithered ? &gen : nullptr, src,
                         "table");
      }
    }
  }
}

// 8- and 16-bit sources: every possible source value, through every kernel
// level, to every destination, with and without dither.
TEST(BufConverterExhaustive, EverySmallSourceValue) {
  LevelRestorer restore;
  for (KernelLevel level : kLevels) {
    SetKernelLevel(level);
    for (int from = 0; from <= 2; ++from) {
      std::vector<std::uint8_t> src;
      const int values = from == 2 ? 65536 : 256;
      for (int v = 0; v < values; ++v) {
        src.push_back(static_cast<std::uint8_t>(v));
        if (from == 2) src.push_back(static_cast<std::uint8_t>(v >> 8));
      }
      for (int to = 0; to <= 5; ++to) {
        const Family family = Expected(from, to);
        if (family == Family::kNone) continue;
        for (int dither = 0; dither <= (family == Family::kDitherable ? 1 : 0); ++dither) {
          Made made = CreateKnownSeed(from, to, dither);
          convref::Generator gen{made.seed};
          ExpectConversion(*made.converter, from, to, dither, dither ? &gen : nullptr, src,
                           LevelName(level));
        }
      }
    }
  }
}

// Float and 24-bit sources: every boundary value and a few million random
// ones, through every kernel level.
TEST(BufConverterRandom, FloatAnd24BitSources) {
  LevelRestorer restore;
  std::mt19937_64 rng(2024);
  const std::vector<float> boundaries = BoundaryFloats();
  for (KernelLevel level : kLevels) {
    SetKernelLevel(level);
    const std::size_t randomCount = level == KernelLevel::kBest ? (1u << 20) : (1u << 17);
    for (int from = 3; from <= 5; ++from) {
      std::vector<std::uint8_t> src;
      if (from == 5) {
        std::vector<float> f = boundaries;
        for (std::size_t k = 0; k < randomCount; ++k) f.push_back(RandomFloat(rng));
        src = FloatBytes(f);
      } else {
        // Full-scale words and their neighbours first, then random bytes.
        for (std::uint32_t w : {0x00000000u, 0x000000FFu, 0x00000100u, 0xFFFFFFFFu, 0xFFFFFF00u,
                                0x7FFFFFFFu, 0x7FFFFF00u, 0x80000000u, 0x800000FFu, 0x80000100u,
                                0x00008000u, 0xFFFF8000u, 0x00800000u, 0xFF800000u}) {
          for (int k = 0; k < convref::BytesOf(from); ++k) {
            src.push_back(static_cast<std::uint8_t>(w >> (8 * (k + (from == 3 ? 1 : 0)))));
          }
        }
        const auto more = RandomBytes(rng, randomCount * convref::BytesOf(from));
        src.insert(src.end(), more.begin(), more.end());
      }
      for (int to = 0; to <= 5; ++to) {
        const Family family = Expected(from, to);
        if (family == Family::kNone) continue;
        for (int dither = 0; dither <= (family == Family::kDitherable ? 1 : 0); ++dither) {
          Made made = CreateKnownSeed(from, to, dither);
          convref::Generator gen{made.seed};
          ExpectConversion(*made.converter, from, to, dither, dither ? &gen : nullptr, src,
                           LevelName(level));
        }
      }
    }
  }
}

// Float bit patterns across the whole 32-bit space at a prime stride: every
// exponent, both signs, NaN payloads and denormals, each through every kernel
// level to every integer destination.
TEST(BufConverterRandom, FloatBitPatternsAcrossTheWholeSpace) {
  LevelRestorer restore;
  std::vector<std::uint8_t> src;
  for (std::uint64_t bits = 0; bits < (std::uint64_t{1} << 32); bits += 1021) {
    for (int k = 0; k < 4; ++k) src.push_back(static_cast<std::uint8_t>(bits >> (8 * k)));
  }
  const int count = static_cast<int>(src.size() / 4);
  for (int to = 0; to <= 4; ++to) {
    const std::vector<std::uint8_t> want = convref::ConvertRun(5, to, nullptr, src, count);
    auto conv = BufConverter::Create(Fmt(5), Fmt(to), tarn::kNoDither);
    for (KernelLevel level : kLevels) {
      SetKernelLevel(level);
      std::vector<std::uint8_t> got(want.size());
      conv->Convert(src.data(), got.data(), count);
      EXPECT_TRUE(got == want) << "to " << to << " at " << LevelName(level);
    }
  }
}

// Runs of 0 to 40 samples at every byte alignment of source and destination,
// with guard bytes around the destination; a dithered converter keeps its
// sequence across the calls.
TEST(BufConverterBlocks, SizesAlignmentsAndGuards) {
  LevelRestorer restore;
  std::mt19937_64 rng(99);
  constexpr std::uint8_t kGuard = 0x5A;
  for (KernelLevel level : kLevels) {
    SetKernelLevel(level);
    for (int from = 0; from <= 5; ++from) {
      for (int to = 0; to <= 5; ++to) {
        const Family family = Expected(from, to);
        if (family == Family::kNone) continue;
        for (int dither = 0; dither <= (family == Family::kDitherable ? 1 : 0); ++dither) {
          Made made = CreateKnownSeed(from, to, dither);
          convref::Generator gen{made.seed};
          const int in = convref::BytesOf(from), out = convref::BytesOf(to);
          for (int count = 0; count <= 40; ++count) {
            for (int srcOff = 0; srcOff < 4; ++srcOff) {
              for (int dstOff = 0; dstOff < 4; ++dstOff) {
                std::vector<std::uint8_t> src;
                if (from == 5) {
                  std::vector<float> f;
                  for (int k = 0; k < count; ++k) f.push_back(RandomFloat(rng));
                  src = FloatBytes(f);
                } else {
                  src = RandomBytes(rng, static_cast<std::size_t>(count) * in);
                }
                std::vector<std::uint8_t> srcBuf(srcOff + src.size() + 8, 0xEE);
                std::copy(src.begin(), src.end(), srcBuf.begin() + srcOff);
                std::vector<std::uint8_t> dstBuf(
                    dstOff + static_cast<std::size_t>(count) * out + 16, kGuard);
                made.converter->Convert(srcBuf.data() + srcOff, dstBuf.data() + dstOff, count);
                const auto want =
                    convref::ConvertRun(from, to, dither ? &gen : nullptr, src, count);
                const bool same = std::equal(want.begin(), want.end(), dstBuf.begin() + dstOff);
                bool guards = true;
                for (int k = 0; k < dstOff; ++k) guards &= dstBuf[k] == kGuard;
                for (std::size_t k = dstOff + want.size(); k < dstBuf.size(); ++k) {
                  guards &= dstBuf[k] == kGuard;
                }
                if (!same || !guards) {
                  FAIL() << LevelName(level) << " from " << from << " to " << to << " dither "
                         << dither << " count " << count << " offsets " << srcOff << "/" << dstOff
                         << (same ? ": guard bytes changed" : ": wrong samples");
                }
              }
            }
          }
        }
      }
    }
  }
}

// Runs long enough for stores that bypass the caches, at destination offsets
// that reach a vector boundary after a few samples (or never), with guards.
TEST(BufConverterBlocks, LongRunsAtSeveralAlignments) {
  LevelRestorer restore;
  std::mt19937_64 rng(11);
  for (int from = 0; from <= 5; ++from) {
    for (int to : {2, 4, 5}) {
      const Family family = Expected(from, to);
      if (family == Family::kNone) continue;
      const int in = convref::BytesOf(from), out = convref::BytesOf(to);
      const int count = static_cast<int>(tarn::ConverterKernels::kStreamingBytes / out) + 37;
      std::vector<std::uint8_t> src;
      if (from == 5) {
        std::vector<float> f(static_cast<std::size_t>(count));
        for (float& x : f) x = RandomFloat(rng);
        src = FloatBytes(f);
      } else {
        src = RandomBytes(rng, static_cast<std::size_t>(count) * in);
      }
      for (int dither = 0; dither <= (family == Family::kDitherable ? 1 : 0); ++dither) {
        for (int dstOff : {0, 2, 12}) {
          for (KernelLevel level : {KernelLevel::kExtended, KernelLevel::kBest}) {
            SetKernelLevel(level);
            Made made = CreateKnownSeed(from, to, dither);
            convref::Generator gen{made.seed};
            const auto want = convref::ConvertRun(from, to, dither ? &gen : nullptr, src, count);
            std::vector<std::uint8_t> dst(want.size() + 128, 0x5A);
            // Start from a 64-byte boundary plus the offset.
            const std::size_t base = (64 - reinterpret_cast<std::uintptr_t>(dst.data()) % 64) % 64;
            ASSERT_GE(dst.size(), base + dstOff + want.size());
            made.converter->Convert(src.data(), dst.data() + base + dstOff, count);
            EXPECT_TRUE(std::equal(want.begin(), want.end(), dst.begin() + base + dstOff))
                << from << "->" << to << " dither " << dither << " offset " << dstOff << " "
                << LevelName(level);
            EXPECT_TRUE(std::all_of(dst.begin(), dst.begin() + base + dstOff,
                                    [](std::uint8_t b) { return b == 0x5A; }));
            EXPECT_TRUE(std::all_of(dst.begin() + base + dstOff + want.size(), dst.end(),
                                    [](std::uint8_t b) { return b == 0x5A; }));
          }
        }
      }
    }
  }
}

TEST(BufConverterBlocks, CountZeroOrLessWritesNothing) {
  LevelRestorer restore;
  std::vector<std::uint8_t> src(64, 0x40);
  for (KernelLevel level : kLevels) {
    SetKernelLevel(level);
    for (int from = 0; from <= 5; ++from) {
      for (int to = 0; to <= 5; ++to) {
        if (Expected(from, to) == Family::kNone) continue;
        auto conv = BufConverter::Create(Fmt(from), Fmt(to), tarn::kTriangularDither);
        for (int count : {0, -1, -4, -17, INT_MIN}) {
          std::vector<std::uint8_t> dst(64, 0x33);
          conv->Convert(src.data(), dst.data(), count);
          EXPECT_EQ(dst, std::vector<std::uint8_t>(64, 0x33)) << from << "->" << to << " " << count;
        }
      }
    }
  }
}

// The values singled out as characteristic of this converter.
TEST(BufConverterEdges, CharacteristicValues) {
  auto conv = [](int from, int to, int dither = 0) {
    return BufConverter::Create(Fmt(from), Fmt(to), static_cast<tarn::DitherType>(dither));
  };
  {
    const std::int16_t in[] = {-32768, 32767};
    float out[2];
    conv(2, 5)->Convert(in, out, 2);
    EXPECT_EQ(out[0], -1.0f);
    EXPECT_EQ(out[1], 0.999969482421875f);
  }
  {
    const float in[] = {1.0f, -1.0f, 0.5f, -0.00001f, 1.5f, -1.5f};
    std::int16_t out[6];
    conv(5, 2)->Convert(in, out, 6);
    EXPECT_EQ(out[0], 32767);
    EXPECT_EQ(out[1], -32768);
    EXPECT_EQ(out[2], 16384);
    EXPECT_EQ(out[3], 0);
    EXPECT_EQ(out[4], 32767);
    EXPECT_EQ(out[5], -32768);
    std::int8_t s8[6];
    conv(5, 1)->Convert(in, s8, 6);
    EXPECT_EQ(s8[4], 127);
    EXPECT_EQ(s8[5], -128);
    std::uint8_t u8[6];
    conv(5, 0)->Convert(in, u8, 6);
    EXPECT_EQ(u8[4], 255);
    EXPECT_EQ(u8[5], 0);
  }
  {
    const std::int8_t in[] = {-128, 127, -1, 1};
    std::int16_t out[4];
    conv(1, 2)->Convert(in, out, 4);
    EXPECT_EQ(out[0], -32767);
    EXPECT_EQ(out[1], 32511);
    EXPECT_EQ(out[2], -255);
    EXPECT_EQ(out[3], 255);
  }
  // Offset silence is zero everywhere, and signed zero becomes 0x80.
  for (int to = 1; to <= 5; ++to) {
    const std::uint8_t silence[4] = {0x80, 0x80, 0x80, 0x80};
    std::uint8_t out[16];
    std::memset(out, 0x77, sizeof out);
    conv(0, to)->Convert(silence, out, 4);
    for (int k = 0; k < 4 * convref::BytesOf(to); ++k) EXPECT_EQ(out[k], 0) << to;
  }
  {
    const std::int8_t zero[1] = {0};
    std::uint8_t out = 0;
    conv(1, 0)->Convert(zero, &out, 1);
    EXPECT_EQ(out, 0x80);
  }
  {
    const float in[] = {1.0f, -1.0f, -std::ldexp(1.0f, -23)};
    std::int32_t words[3];
    conv(5, 4)->Convert(in, words, 3);
    EXPECT_EQ(static_cast<std::uint32_t>(words[0]), 0x7FFFFF00u);
    EXPECT_EQ(static_cast<std::uint32_t>(words[1]), 0x80000000u);
    EXPECT_EQ(static_cast<std::uint32_t>(words[2]), 0xFFFFFE00u);
    std::uint8_t packed[9];
    conv(5, 3, 1)->Convert(in, packed, 3);  // dither is ignored for 24-bit destinations
    const std::uint8_t want[9] = {0xFF, 0xFF, 0x7F, 0x00, 0x00, 0x80, 0xFE, 0xFF, 0xFF};
    EXPECT_EQ(0, std::memcmp(packed, want, 9));
  }
  {
    // Non-finite input: NaN is silence, infinities clip to full scale.
    const float in[] = {
        std::numeric_limits<float>::quiet_NaN(), -std::numeric_limits<float>::quiet_NaN(),
        std::numeric_limits<float>::infinity(), -std::numeric_limits<float>::infinity()};
    std::int16_t out[4];
    conv(5, 2)->Convert(in, out, 4);
    EXPECT_EQ(out[0], 0);
    EXPECT_EQ(out[1], 0);
    EXPECT_EQ(out[2], 32767);
    EXPECT_EQ(out[3], -32768);
  }
  {
    // Dithered 16 to 8 of silence stays within one step below zero.
    std::vector<std::int16_t> zeros(10000, 0);
    std::vector<std::int8_t> out(zeros.size());
    conv(2, 1, 1)->Convert(zeros.data(), out.data(), static_cast<int>(zeros.size()));
    bool sawMinusOne = false;
    for (std::int8_t v : out) {
      EXPECT_TRUE(v == 0 || v == -1);
      sawMinusOne |= v == -1;
    }
    EXPECT_TRUE(sawMinusOne);
    conv(2, 1, 0)->Convert(zeros.data(), out.data(), static_cast<int>(zeros.size()));
    for (std::int8_t v : out) EXPECT_EQ(v, 0);
  }
}

// A clone continues the original's dither sequence from the point of
// cloning; both then run independently.
TEST(BufConverterClone, ContinuesTheDitherSequence) {
  LevelRestorer restore;
  std::mt19937_64 rng(5);
  for (KernelLevel level : kLevels) {
    SetKernelLevel(level);
    for (auto [from, to] : {std::pair{5, 2}, std::pair{2, 0}, std::pair{3, 1}, std::pair{4, 2}}) {
      Made made = CreateKnownSeed(from, to, 1);
      convref::Generator gen{made.seed};
      const auto first = RandomBytes(rng, 1001 * static_cast<std::size_t>(convref::BytesOf(from)));
      ExpectConversion(*made.converter, from, to, 1, &gen, first, "before clone");
      const std::unique_ptr<BufConverter> clone = made.converter->Clone();
      convref::Generator genCopy = gen;
      const auto next = RandomBytes(rng, 333 * static_cast<std::size_t>(convref::BytesOf(from)));
      ExpectConversion(*clone, from, to, 1, &genCopy, next, "clone");
      ExpectConversion(*made.converter, from, to, 1, &gen, next, "original after clone");
    }
  }
  // Undithered clones convert like their originals.
  auto plain = BufConverter::Create(Fmt(2), Fmt(5), tarn::kNoDither);
  auto copy = plain->Clone();
  const auto src = RandomBytes(rng, 200);
  ExpectConversion(*copy, 2, 5, 0, nullptr, src, "plain clone");
}

}  // namespace

namespace {

// Names the kernels this machine runs, so test logs show which vector path
// the comparisons above covered at the best level.
TEST(ConverterKernels, InstructionSetPerLevel) {
  LevelRestorer restore;
  for (KernelLevel level : kLevels) {
    tarn::ConverterKernels::SetKernelLevel(level);
    const std::string name = tarn::ConverterKernels::InstructionSet();
    std::printf("[ kernels  ] %s: %s\n", LevelName(level), name.c_str());
    EXPECT_EQ(level == KernelLevel::kScalar, name == "scalar");
  }
}

}  // namespace
