#include "tarn/Audio/BufConverter.h"

#include <gtest/gtest.h>

#include "AudioTestUtil.h"

namespace {

using namespace convref;
using tarn::ConverterKernels::KernelLevel;
using tarn::ConverterKernels::SetKernelLevel;

// Calls f(level, from, to, dither) for every converter the table has, with the
// kernels set to each level in turn.
template <typename F>
void ForEachConverterAndLevel(F f) {
  struct Restore {
    ~Restore() { SetKernelLevel(KernelLevel::kBest); }
  } restore;
  for (auto level :
       {KernelLevel::kScalar, KernelLevel::kBaseline, KernelLevel::kExtended, KernelLevel::kBest}) {
    SetKernelLevel(level);
    SCOPED_TRACE(tarn::ConverterKernels::InstructionSet());
    for (int from = 0; from <= 5; ++from)
      for (int to = 0; to <= 5; ++to)
        for (int dither = 0; from != to && dither <= int(Ditherable(from, to)); ++dither)
          f(level, from, to, dither);
  }
}

// Every combination of formats -1..8 and dither -1..2: a converter exactly
// where the table has one, converting as the model says; -108 elsewhere.
TEST(BufConverter, CreateTable) {
  std::mt19937_64 rng(7);
  for (int from = -1; from <= 8; ++from)
    for (int to = -1; to <= 8; ++to)
      for (int dither = -1; dither <= 2; ++dither) {
        SCOPED_TRACE(testing::Message() << from << "->" << to << " dither " << dither);
        const bool valid = from >= 0 && from <= 5 && to >= 0 && to <= 5 && from != to;
        const bool dithered = valid && Ditherable(from, to);
        if (!valid || (dithered && (dither < 0 || dither > 1))) {
          EXPECT_EQ(ErrorOf([&] { (void)New(from, to, dither); }), -108);
          continue;
        }
        Made m = Create(from, to, dither);
        Check(*m.conv, from, to, m.Gen(dithered && dither), RandomSamples(rng, from, 67));
      }
}

// Every 8- and 16-bit source value; boundary, whole-space bit-pattern and
// random floats; extreme and random 24-bit words: every pair, every level.
TEST(BufConverter, EveryPairAtEveryKernelLevel) {
  std::mt19937_64 rng(2024);
  Bytes sources[6];
  for (int v = 0; v < 65536; ++v) {
    if (v < 256) sources[0].push_back(std::uint8_t(v));
    sources[2].push_back(std::uint8_t(v));
    sources[2].push_back(std::uint8_t(v >> 8));
  }
  sources[1] = sources[0];
  for (std::uint32_t hi : {0x0u, 0x7FFFFF00u, 0x80000000u, 0xFFFFFF00u, 0x8000u, 0xFF800000u})
    for (std::uint32_t w : {hi, hi + 0xFF, hi + 0x100})
      for (int k = 0; k < 4; ++k) {
        sources[4].push_back(std::uint8_t(w >> (8 * k)));
        if (k > 0) sources[3].push_back(std::uint8_t(w >> (8 * k)));
      }
  sources[5] = BoundaryFloats();
  for (std::uint64_t bits = 0; bits < (std::uint64_t{1} << 32); bits += 4093)
    PushFloat(sources[5], std::bit_cast<float>(std::uint32_t(bits)));
  for (int from = 3; from <= 5; ++from)
    for (std::uint8_t x : RandomSamples(rng, from, 1 << 18)) sources[from].push_back(x);
  ForEachConverterAndLevel([&](KernelLevel, int from, int to, int dither) {
    Made m = Create(from, to, dither);
    Check(*m.conv, from, to, m.Gen(dither), sources[from]);
  });
}

// Runs of 0 to 40 samples at every alignment of source and destination, and
// runs long enough for streaming stores; a dithered converter keeps its
// sequence across calls. Counts below zero write nothing.
TEST(BufConverter, RunLengthsAlignmentsAndGuards) {
  std::mt19937_64 rng(99);
  const auto longRun = std::size_t(tarn::ConverterKernels::kStreamingBytes / 2 + 37);
  Bytes longs[6];
  for (int from = 0; from <= 5; ++from) longs[from] = RandomSamples(rng, from, longRun);
  ForEachConverterAndLevel([&](KernelLevel level, int from, int to, int dither) {
    Made m = Create(from, to, dither);
    for (int count = 0; count <= 40; ++count)
      for (int srcOff = 0; srcOff < 4; ++srcOff)
        for (int dstOff = 0; dstOff < 4; ++dstOff)
          Check(*m.conv, from, to, m.Gen(dither), RandomSamples(rng, from, count), srcOff, dstOff);
    for (int dstOff : {0, 2, 12})
      if (level >= KernelLevel::kExtended && (to == 2 || to >= 4))
        Check(*m.conv, from, to, m.Gen(dither), longs[from], 0, dstOff);
    Bytes src(64, 0x40), dst(64, 0x33);
    for (int count : {-1, -17, INT_MIN}) m.conv->Convert(src.data(), dst.data(), count);
    EXPECT_EQ(dst, Bytes(64, 0x33));
  });
}

// Samples as the format stores them (offset 8-bit as 0..255, 24-bit as a
// 24-bit integer), so these rows check the model as well as the converter.
Bytes Encode(int f, std::initializer_list<double> values) {
  Bytes b;
  for (double v : values)
    for (int k = 0; k < Width(f); ++k)
      b.push_back(std::uint8_t(
          (f == 5 ? std::bit_cast<std::uint32_t>(float(v)) : std::int64_t(v)) >> (8 * k)));
  return b;
}

TEST(BufConverter, CharacteristicValues) {
  constexpr double nan = NAN, inf = INFINITY;
  const struct {
    int from, to, dither;
    std::initializer_list<double> in, out;
  } rows[] = {
      {2, 5, 0, {-32768, 32767}, {-1.0, 0.999969482421875}},
      {5,
       2,
       0,
       {1, -1, 0.5, -1e-5, 1.5, -1.5, nan, -nan, inf, -inf},
       {32767, -32768, 16384, 0, 32767, -32768, 0, 0, 32767, -32768}},
      {5, 1, 0, {1.5, -1.5, nan}, {127, -128, 0}},
      {5, 0, 0, {1.5, -1.5, nan}, {255, 0, 128}},
      {1, 2, 0, {-128, 127, -1, 1}, {-32767, 32511, -255, 255}},
      {1, 0, 0, {0, -128}, {128, 0}},
      {0, 1, 0, {128, 0}, {0, -128}},
      {0, 2, 0, {128, 255}, {0, 32511}},
      {0, 3, 0, {128, 0}, {0, -8388608}},
      {0, 4, 0, {128, 1}, {0, -2130706432}},
      {0, 5, 0, {128, 0}, {0, -1}},
      {5, 4, 0, {1, -1, -0x1p-23, nan}, {0x7FFFFF00, -2147483648.0, -512, 0}},
      {5, 3, 1, {1, -1, -0x1p-23, inf}, {0x7FFFFF, -8388608, -2, 0x7FFFFF}},
      {4, 2, 0, {0x7FFFFFFF, -1, 0x10000}, {32767, -1, 1}},
      {3, 1, 0, {0x7FFFFF, -1, 0x10000}, {127, -1, 1}},
  };
  for (const auto& row : rows) {
    SCOPED_TRACE(std::to_string(row.from) + "->" + std::to_string(row.to));
    const Bytes in = Encode(row.from, row.in), want = Encode(row.to, row.out);
    EXPECT_EQ(ConvertRun(row.from, row.to, nullptr, in), want) << "model";
    Bytes got(want.size());
    New(row.from, row.to, row.dither)->Convert(in.data(), got.data(), int(row.in.size()));
    EXPECT_EQ(got, want);
  }
}

// A clone continues the original's dither sequence; both then run
// independently. Undithered clones convert like their originals.
TEST(BufConverter, CloneContinuesTheDitherSequence) {
  std::mt19937_64 rng(5);
  ForEachConverterAndLevel([&](KernelLevel, int from, int to, int dither) {
    Made m = Create(from, to, dither);
    Check(*m.conv, from, to, m.Gen(dither), RandomSamples(rng, from, 1001));
    Made clone{m.conv->Clone(), m.gen};
    const Bytes next = RandomSamples(rng, from, 333);
    Check(*clone.conv, from, to, clone.Gen(dither), next);
    Check(*m.conv, from, to, m.Gen(dither), next);
  });
}

// The dither generator; converters seed it through SeedForEventTime (see Create).
TEST(TriangularPDFDither16, MatchesTheModelAndCopiesContinue) {
  for (std::uint32_t seed : {0u, 1u, 0x7FFFFFFFu, 0x80000000u, 0xFFFFFFFFu, 123456789u}) {
    tarn::TriangularPDFDither16 dither(seed);
    Generator model{seed};
    for (int k = 0; k < 200000; ++k) {
      ASSERT_EQ(dither.Next(), model.Next()) << "seed " << seed << " value " << k;
      ASSERT_EQ(dither.GetState(), model.state);
    }
    tarn::TriangularPDFDither16 copy = dither;
    for (int k = 0; k < 100; ++k) ASSERT_EQ(copy.Next(), model.Next());
  }
  const std::pair<double, std::uint32_t> rows[] = {
      {1.0, 60}, {1.0 / 120.0, 1}, {0.0083, 0}, {4294967296.0 / 60.0 + 1.0, 60}};
  for (auto [t, seed] : rows)
    EXPECT_EQ(tarn::TriangularPDFDither16::SeedForEventTime(t), seed) << t;
}

}  // namespace
