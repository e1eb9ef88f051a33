#pragma once
// Private: the block kernels of the reader and writer chain. Each resolves
// the sample size once per call and then runs a loop with fixed-size copies
// (no per-sample calls or branches on the format).

#include <cstddef>

namespace tarn::chainimpl {

// Frames per block of the chain's scratch buffers.
inline constexpr std::size_t kBlockFrames = 4096;

// Splits `frames` interleaved frames of `channels` samples of
// `bytesPerSample` bytes into one buffer per channel, written from sample
// `offset` on.
void Deinterleave(const void* interleaved, void* const* channels, int numChannels,
                  int bytesPerSample, std::size_t frames, std::size_t offset) noexcept;

// The reverse: samples `offset` .. offset + frames - 1 of each channel
// buffer into `frames` interleaved frames.
void Interleave(const void* const* channels, std::size_t offset, void* interleaved, int numChannels,
                int bytesPerSample, std::size_t frames) noexcept;

// out[i] = in[0][offset + i] + in[1][offset + i] + ... in channel order, in
// single precision.
void SumChannels(const void* const* channels, int numChannels, std::size_t offset, float* out,
                 std::size_t frames) noexcept;

}  // namespace tarn::chainimpl
