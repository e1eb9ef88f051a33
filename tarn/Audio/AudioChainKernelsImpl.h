#pragma once
// Private: the block kernels of the reader and writer chain. Each resolves
// the sample size once per call and then runs a loop with fixed-size copies
// (no per-sample calls or branches on the format).

#include <algorithm>
#include <cstddef>
#include <cstdint>

namespace tarn::chainimpl {

// Frames per block of the chain's scratch buffers.
inline constexpr std::size_t kBlockFrames = 4096;

// Readers ask the file layer for about this many bytes at a time: an
// unbuffered file is read straight from the disk, one transfer per request,
// and small transfers would leave it waiting on the disk's latency.
inline constexpr std::size_t kReadAheadBytes = std::size_t{1} << 20;

// Frames per request to the file layer for frames of `frameBytes` bytes: at
// least kBlockFrames, otherwise about kReadAheadBytes of them.
[[nodiscard]] inline std::size_t ReadBlockFrames(std::size_t frameBytes) noexcept {
  return std::max(kBlockFrames, kReadAheadBytes / std::max<std::size_t>(frameBytes, 1));
}

// Moves frames [start, start + frames) through a scratch buffer in blocks of
// at most `block` frames: `read(at, count)` fills the scratch from the source
// and returns the frames it got; `use(done, got)` passes those on, `done`
// being the frames already used. Stops after the first short read; returns
// the frames used.
template <typename Read, typename Use>
std::int64_t ReadInBlocks(std::int64_t start, std::int64_t frames, std::size_t block, Read&& read,
                          Use&& use) {
  std::int64_t done = 0;
  while (done < frames) {
    const std::int64_t want =
        std::min<std::int64_t>(frames - done, static_cast<std::int64_t>(block));
    const std::int64_t got = read(start + done, want);
    if (got <= 0) break;
    use(static_cast<std::size_t>(done), static_cast<std::size_t>(got));
    done += got;
    if (got < want) break;
  }
  return done;
}

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
