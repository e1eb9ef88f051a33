#include "tarn/Audio/BufConverter.h"

#include <cstdint>
#include <type_traits>

#include "tarn/Audio/ConverterKernelsImpl.h"
#include "tarn/Audio/ConverterRulesImpl.h"
#include "tarn/Errors/Fail.h"

namespace tarn {
namespace {

using namespace ConverterRules;

// State of the undithered narrowing converters: none; selects the
// truncating and rounding rules.
struct NoDitherState {};

// Runs the vector kernel over a prefix of the run, then the per-sample rule
// over the rest in groups of four and singly.
template <class SrcBuf, class DstBuf, bool kDither, class State>
inline void ConvertRun(State& state, const void* source, void* destination, int count) noexcept {
  if (count <= 0) return;
  const auto* s = static_cast<const std::uint8_t*>(source);
  auto* d = static_cast<std::uint8_t*>(destination);
  constexpr std::ptrdiff_t kIn = SrcBuf::kBytes, kOut = DstBuf::kBytes;
  auto one = [&](std::ptrdiff_t k) {
    if constexpr (std::is_same_v<State, NoDitherState>) {
      ConvertNoDither<SrcBuf, DstBuf>(s + k * kIn, d + k * kOut);
    } else {
      ConvertOne<SrcBuf, DstBuf>(state, s + k * kIn, d + k * kOut);
    }
  };
  int i = 0;
  if (const ConverterKernels::Kernel kernel = ConverterKernels::Get<SrcBuf, DstBuf, kDither>()) {
    // Long runs stream their stores; a few samples converted singly first
    // bring the destination to a 64-byte boundary when its stride allows.
    const bool stream = static_cast<long long>(count) * kOut >= ConverterKernels::kStreamingBytes;
    if (stream) {
      while (i < 64 && reinterpret_cast<std::uintptr_t>(d + i * kOut) % 64 != 0) ++i;
      if (i == 64) i = 0;
      for (int k = 0; k < i; ++k) one(k);
    }
    std::uint32_t ditherState = 0;
    if constexpr (kDither) ditherState = state.GetState();
    i += kernel(s + i * kIn, d + i * kOut, count - i, &ditherState, stream);
    if constexpr (kDither) state = TriangularPDFDither16(ditherState);
  }
  for (; count - i >= 4; i += 4) {
    one(i);
    one(i + 1);
    one(i + 2);
    one(i + 3);
  }
  for (; i < count; ++i) one(i);
}

// Stateless widening (UnusedState), integer to float (DoubleUnion) and
// dithered narrowing (TriangularPDFDither16) converters.
template <class State, class SrcT, class SrcBuf, class DstT, class DstBuf>
class BufConverterImpl final : public BufConverter {
 public:
  explicit BufConverterImpl(const State& state) : mState(state) {}
  BufConverterImpl(const BufConverterImpl&) = default;
  BufConverterImpl& operator=(const BufConverterImpl&) = default;
  ~BufConverterImpl() override = default;

  void Convert(const void* source, void* destination, int count) noexcept override {
    constexpr bool kDither = std::is_same_v<State, TriangularPDFDither16>;
    ConvertRun<SrcBuf, DstBuf, kDither>(mState, source, destination, count);
  }
  [[nodiscard]] std::unique_ptr<BufConverter> Clone() const override {
    return std::make_unique<BufConverterImpl>(*this);
  }

 private:
  State mState;
};

// Narrowing without dither: truncation by shift, or rounding for floats.
template <class SrcT, class SrcBuf, class DstT, class DstBuf>
class BufConverterImplNoDither final : public BufConverter {
 public:
  BufConverterImplNoDither() = default;
  BufConverterImplNoDither(const BufConverterImplNoDither&) = default;
  BufConverterImplNoDither& operator=(const BufConverterImplNoDither&) = default;
  ~BufConverterImplNoDither() override = default;

  void Convert(const void* source, void* destination, int count) noexcept override {
    NoDitherState none;
    ConvertRun<SrcBuf, DstBuf, false>(none, source, destination, count);
  }
  [[nodiscard]] std::unique_ptr<BufConverter> Clone() const override {
    return std::make_unique<BufConverterImplNoDither>(*this);
  }
};

template <class S, class D>
using Widening = BufConverterImpl<UnusedState, typename S::Sample, S, typename D::Sample, D>;
template <class S, class D>
using ToFloat = BufConverterImpl<DoubleUnion, typename S::Sample, S, typename D::Sample, D>;
template <class S, class D>
using Dithered =
    BufConverterImpl<TriangularPDFDither16, typename S::Sample, S, typename D::Sample, D>;
template <class S, class D>
using Undithered = BufConverterImplNoDither<typename S::Sample, S, typename D::Sample, D>;

// The family's magic high word for integer-to-float converters.
template <class S>
DoubleUnion MagicFor() {
  return DoubleUnion{S::kKind == Kind::k16 ? DoubleUnion::kMagic16 : DoubleUnion::kMagic24};
}

std::unique_ptr<BufConverter> Make(int from, int to, DitherType dither) {
#define TARN_MAKE_W(S, D) return std::make_unique<Widening<S, D>>(UnusedState{});
#define TARN_MAKE_D(S, D) return std::make_unique<ToFloat<S, D>>(MagicFor<S>());
#define TARN_MAKE_N(S, D) return std::make_unique<Undithered<S, D>>();
#define TARN_MAKE_NT(S, D)                                              \
  if (dither == kNoDither) return std::make_unique<Undithered<S, D>>(); \
  if (dither == kTriangularDither) {                                    \
    return std::make_unique<Dithered<S, D>>(TriangularPDFDither16());   \
  }                                                                     \
  return nullptr;
#define TARN_MAKE(S, D, family)                 \
  if (from == S::kFormat && to == D::kFormat) { \
    TARN_MAKE_##family(S, D)                    \
  }
  TARN_CONVERTER_PAIRS(TARN_MAKE)
#undef TARN_MAKE
  return nullptr;
}

}  // namespace

std::unique_ptr<BufConverter> BufConverter::Create(const AudioFormat& from, const AudioFormat& to,
                                                   DitherType dither) {
  std::unique_ptr<BufConverter> converter = Make(from.mSampleFormat, to.mSampleFormat, dither);
  if (!converter) FailMemFullError();
  return converter;
}

}  // namespace tarn
