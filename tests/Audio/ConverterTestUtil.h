// Shared helpers of the converter tests: formats, the expected choice of
// converter, creation with a known dither seed, and comparison against the
// reference model.
#pragma once

#include <gtest/gtest.h>

#include <cmath>
#include <cstdint>
#include <memory>
#include <random>
#include <string>
#include <vector>

#include "ConverterReference.h"
#include "tarn/Audio/BufConverter.h"
#include "tarn/Audio/ConverterKernelsImpl.h"
#include "tarn/Time/TarnSystemTime.h"

namespace convtest {

using tarn::ConverterKernels::KernelLevel;

inline const KernelLevel kLevels[] = {KernelLevel::kScalar, KernelLevel::kBaseline,
                                      KernelLevel::kExtended, KernelLevel::kBest};

inline const char* LevelName(KernelLevel level) {
  switch (level) {
    case KernelLevel::kScalar:
      return "scalar";
    case KernelLevel::kBaseline:
      return "baseline";
    case KernelLevel::kExtended:
      return "extended";
    default:
      return "best";
  }
}

// Puts the kernels back to their default when a test leaves.
struct LevelRestorer {
  LevelRestorer() = default;
  LevelRestorer(const LevelRestorer&) = delete;
  LevelRestorer& operator=(const LevelRestorer&) = delete;
  ~LevelRestorer() { tarn::ConverterKernels::SetKernelLevel(KernelLevel::kBest); }
};

inline tarn::AudioFormat Fmt(int f) {
  tarn::AudioFormat a;
  a.mSampleFormat = static_cast<tarn::SampleFormat>(f);
  return a;
}

enum class Family { kNone, kPlain, kDitherable };

// The converter table: 8- and 16-bit destinations from wider sources may be
// dithered; everything else between distinct formats 0..5 is plain.
inline Family Expected(int from, int to) {
  if (from < 0 || from > 5 || to < 0 || to > 5 || from == to) return Family::kNone;
  const bool narrowing =
      (from == 2 && to <= 1) || ((from == 3 || from == 4) && to <= 2) || (from == 5 && to <= 2);
  return narrowing ? Family::kDitherable : Family::kPlain;
}

struct Made {
  std::unique_ptr<tarn::BufConverter> converter;
  std::uint32_t seed = 0;  // the dither seed, when the converter dithers
};

inline std::uint32_t SeedNow() {
  const double t = tarn::TarnSystemTime::GetCurrentEventTime();
  return static_cast<std::uint32_t>(static_cast<std::int64_t>(t * 60.0 + 0.5));
}

// Creates a converter and learns its seed by reading the event time before
// and after; retried until both fall in the same sixtieth of a second.
inline Made CreateKnownSeed(int from, int to, int dither) {
  for (;;) {
    const std::uint32_t before = SeedNow();
    Made m;
    m.converter =
        tarn::BufConverter::Create(Fmt(from), Fmt(to), static_cast<tarn::DitherType>(dither));
    if (SeedNow() == before) {
      m.seed = before;
      return m;
    }
  }
}

// Floats that sit on or next to every rounding and clipping boundary.
inline std::vector<float> BoundaryFloats() {
  std::vector<float> v;
  const float inf = std::numeric_limits<float>::infinity();
  const float nan = std::numeric_limits<float>::quiet_NaN();
  const double bases[] = {0.0, 0.5, 1.0, 1.5, 2.0, 1e30, 3.4e38};
  for (double b : bases) {
    v.push_back(static_cast<float>(b));
    v.push_back(-static_cast<float>(b));
  }
  for (float x :
       {inf, -inf, nan, -nan, std::numeric_limits<float>::signaling_NaN(),
        std::numeric_limits<float>::denorm_min(), -std::numeric_limits<float>::denorm_min(),
        std::numeric_limits<float>::min(), -std::numeric_limits<float>::min(),
        std::numeric_limits<float>::max(), -std::numeric_limits<float>::max()}) {
    v.push_back(x);
  }
  // Ties and their neighbours for 8-, 16- and 24-bit steps, near zero and
  // near full scale, plus the exact steps.
  for (int shift : {7, 15, 23, 31}) {
    const double step = std::ldexp(1.0, -shift);
    const double half = shift == 31 ? 128.0 * step : 0.5 * step;
    const double fullSteps = std::ldexp(1.0, shift);
    for (double k :
         {0.0, 1.0, 2.0, 3.0, 100.0, fullSteps - 2, fullSteps - 1, fullSteps, fullSteps + 1}) {
      for (double off : {0.0, half, -half, step - half}) {
        for (int sign : {1, -1}) {
          const auto f = static_cast<float>(sign * (k * step + off));
          v.push_back(f);
          v.push_back(std::nextafter(f, inf));
          v.push_back(std::nextafter(f, -inf));
        }
      }
    }
  }
  return v;
}

// A float from one of several populations: any bit pattern, the audio range,
// near a step of some width, or tiny.
inline float RandomFloat(std::mt19937_64& rng) {
  const std::uint64_t r = rng();
  switch (r & 3) {
    case 0: {
      const auto bits = static_cast<std::uint32_t>(r >> 32);
      float f;
      std::memcpy(&f, &bits, 4);
      return f;
    }
    case 1:
      return static_cast<float>((static_cast<double>(r >> 11) / 9007199254740992.0) * 2.4 - 1.2);
    case 2: {
      const int shifts[] = {7, 15, 23, 31};
      const int shift = shifts[(r >> 2) & 3];
      const double k = static_cast<double>(static_cast<std::int64_t>(r >> 8) %
                                           (std::int64_t{1} << (shift + 1))) -
                       std::ldexp(1.0, shift);
      const double off = ((r >> 4) & 1) ? 0.5 : (shift == 31 ? 128.0 : 0.0);
      float f = static_cast<float>(std::ldexp(k + off, -shift));
      const int nudge = static_cast<int>((r >> 5) & 3) - 1;
      if (nudge > 0) f = std::nextafter(f, 2.0f);
      if (nudge < 0) f = std::nextafter(f, -2.0f);
      return f;
    }
    default:
      return static_cast<float>(std::ldexp(static_cast<double>(static_cast<std::int64_t>(r) >> 40),
                                           -static_cast<int>(60 + (r & 0x3F))));
  }
}

inline std::vector<std::uint8_t> FloatBytes(const std::vector<float>& v) {
  std::vector<std::uint8_t> b(v.size() * 4);
  if (!v.empty()) std::memcpy(b.data(), v.data(), b.size());
  return b;
}

inline std::string Describe(int from, int to, int dither, const char* what, std::size_t index,
                            const std::vector<std::uint8_t>& src) {
  std::string s = "from " + std::to_string(from) + " to " + std::to_string(to) + " dither " +
                  std::to_string(dither) + " (" + what + ") sample " + std::to_string(index) +
                  " source bytes";
  const int n = convref::BytesOf(from);
  for (int k = 0; k < n && index * n + k < src.size(); ++k) {
    s += " " + std::to_string(src[index * n + k]);
  }
  return s;
}

// Converts `src` with `conv` and expects the reference's bytes; reports the
// first mismatching sample only. `gen` is the model generator, or null.
inline void ExpectConversion(tarn::BufConverter& conv, int from, int to, int dither,
                             convref::Generator* gen, const std::vector<std::uint8_t>& src,
                             const char* what) {
  const int count = static_cast<int>(src.size() / convref::BytesOf(from));
  const std::vector<std::uint8_t> want = convref::ConvertRun(from, to, gen, src, count);
  std::vector<std::uint8_t> got(want.size() + 1, 0xA5);
  conv.Convert(src.data(), got.data(), count);
  ASSERT_EQ(got.back(), 0xA5) << "wrote past the end: " << what;
  const int w = convref::BytesOf(to);
  for (int i = 0; i < count; ++i) {
    if (std::memcmp(got.data() + static_cast<std::size_t>(i) * w,
                    want.data() + static_cast<std::size_t>(i) * w, w) != 0) {
      std::string gotS, wantS;
      for (int k = 0; k < w; ++k) {
        gotS += " " + std::to_string(got[static_cast<std::size_t>(i) * w + k]);
        wantS += " " + std::to_string(want[static_cast<std::size_t>(i) * w + k]);
      }
      ADD_FAILURE() << Describe(from, to, dither, what, i, src) << ": got" << gotS << ", want"
                    << wantS;
      return;
    }
  }
}

}  // namespace convtest
