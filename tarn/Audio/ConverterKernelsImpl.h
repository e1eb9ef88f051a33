// Vector block kernels of the buffer converter (private).
//
// A kernel converts a prefix of a run with vector instructions and returns
// how many samples it converted; the caller converts the rest with the
// per-sample rules of ConverterRulesImpl.h. Every kernel produces results
// bit-identical to those rules. Dithered kernels draw the same dither values
// in the same order as the scalar generator and leave `*ditherState` where
// the scalar generator would be after the converted prefix.
//
// The kernel for a pair is chosen from the processor's features, detected
// once per process: AVX2, SSE4.1 or the SSE2 baseline on x86-64 (AVX2 not on
// Windows builds), NEON on AArch64, plain vector code elsewhere.
#pragma once

#include <cstdint>

namespace tarn::ConverterKernels {

// `stream` marks a run far larger than the caches: the kernel fetches its
// source ahead of use, and its stores bypass the caches where the
// destination is aligned to the vector size and every store is one whole
// vector.
using Kernel = int (*)(const std::uint8_t* source, std::uint8_t* destination, int count,
                       std::uint32_t* ditherState, bool stream) noexcept;

// Destination runs of at least this many bytes are worth streaming.
inline constexpr long long kStreamingBytes = 4 << 20;

// Which kernels converters use: none (per-sample rules only), the
// architecture's baseline vector code (SSE2 for pairs of 4-byte formats,
// NEON, plain vector code), the
// middle tier (SSE4.1 where available, else the baseline), or the best the
// processor supports (AVX2, else as kExtended). The default is kBest; tests
// lower it to check every path. Takes effect for later Convert calls.
enum class KernelLevel { kScalar = 0, kBaseline = 1, kExtended = 2, kBest = 3 };
void SetKernelLevel(KernelLevel level) noexcept;

// The kernel for a pair at the current level, or null for the per-sample
// path. Defined for every pair the converter supports.
template <class Src, class Dst, bool kDither>
[[nodiscard]] Kernel Get() noexcept;

// Name of the instruction set the current level runs with ("avx2", "sse4.1",
// "sse2", "neon", "generic", "scalar"); for benchmarks and diagnostics.
[[nodiscard]] const char* InstructionSet() noexcept;

}  // namespace tarn::ConverterKernels
