#include <cstdint>
#include <cstring>

#include "tarn/Audio/AudioChainKernelsImpl.h"

namespace tarn::chainimpl {
namespace {

// A 3-byte sample moves as one 4-byte load and store. The extra byte stored
// belongs to a sample that is written after it (the same channel's next
// sample, or the next one in the frame), and the extra byte loaded lies
// inside the buffer; the last frame moves its samples exactly.
template <int B, bool kWide>
inline void MoveSample(unsigned char* dst, const unsigned char* src) noexcept {
  if constexpr (kWide) {
    std::uint32_t word = 0;
    std::memcpy(&word, src, 4);
    std::memcpy(dst, &word, 4);
  } else {
    std::memcpy(dst, src, B);
  }
}

template <int B>
constexpr bool kWidens = B == 3;

// Stereo, the common case, walks frame by frame: the interleaved side is
// read or written once, in order.
template <int B, bool kWide>
void DeinterleaveStereo(const unsigned char* in, unsigned char* left, unsigned char* right,
                        std::size_t first, std::size_t end) noexcept {
  for (std::size_t i = first; i < end; ++i) {
    MoveSample<B, kWide>(left + i * B, in + i * 2 * B);
    MoveSample<B, kWide>(right + i * B, in + i * 2 * B + B);
  }
}

template <int B, bool kWide>
void InterleaveStereo(const unsigned char* left, const unsigned char* right, unsigned char* out,
                      std::size_t first, std::size_t end) noexcept {
  for (std::size_t i = first; i < end; ++i) {
    MoveSample<B, kWide>(out + i * 2 * B, left + i * B);
    MoveSample<B, kWide>(out + i * 2 * B + B, right + i * B);
  }
}

// More channels go one channel at a time.
template <int B, bool kWide>
void DeinterleaveChannel(const unsigned char* src, unsigned char* dst, std::size_t stride,
                         std::size_t first, std::size_t end) noexcept {
  for (std::size_t i = first; i < end; ++i) MoveSample<B, kWide>(dst + i * B, src + i * stride);
}

template <int B, bool kWide>
void InterleaveChannel(const unsigned char* src, unsigned char* dst, std::size_t stride,
                       std::size_t first, std::size_t end) noexcept {
  for (std::size_t i = first; i < end; ++i) MoveSample<B, kWide>(dst + i * stride, src + i * B);
}

template <int B>
void DeinterleaveN(const unsigned char* in, void* const* channels, int numChannels,
                   std::size_t frames, std::size_t offset) noexcept {
  const std::size_t wide = kWidens<B> && frames > 0 ? frames - 1 : 0;
  const auto out = [&](int c) { return static_cast<unsigned char*>(channels[c]) + offset * B; };
  if (numChannels == 2) {
    DeinterleaveStereo<B, kWidens<B>>(in, out(0), out(1), 0, wide);
    DeinterleaveStereo<B, false>(in, out(0), out(1), wide, frames);
    return;
  }
  const std::size_t stride = static_cast<std::size_t>(numChannels) * B;
  for (int c = 0; c < numChannels; ++c) {
    const unsigned char* src = in + static_cast<std::size_t>(c) * B;
    DeinterleaveChannel<B, kWidens<B>>(src, out(c), stride, 0, wide);
    DeinterleaveChannel<B, false>(src, out(c), stride, wide, frames);
  }
}

template <int B>
void InterleaveN(const void* const* channels, std::size_t offset, unsigned char* out,
                 int numChannels, std::size_t frames) noexcept {
  const std::size_t wide = kWidens<B> && frames > 0 ? frames - 1 : 0;
  const auto in = [&](int c) {
    return static_cast<const unsigned char*>(channels[c]) + offset * B;
  };
  if (numChannels == 2) {
    InterleaveStereo<B, kWidens<B>>(in(0), in(1), out, 0, wide);
    InterleaveStereo<B, false>(in(0), in(1), out, wide, frames);
    return;
  }
  const std::size_t stride = static_cast<std::size_t>(numChannels) * B;
  // Channel by channel, a wide store reaches into the next channel's sample,
  // which that channel's pass rewrites afterwards; the last channel's would
  // reach into the next frame's first sample, written already, so it moves
  // its samples exactly.
  for (int c = 0; c < numChannels; ++c) {
    unsigned char* dst = out + static_cast<std::size_t>(c) * B;
    const std::size_t mid = c + 1 < numChannels ? wide : 0;
    InterleaveChannel<B, kWidens<B>>(in(c), dst, stride, 0, mid);
    InterleaveChannel<B, false>(in(c), dst, stride, mid, frames);
  }
}

}  // namespace

void Deinterleave(const void* interleaved, void* const* channels, int numChannels,
                  int bytesPerSample, std::size_t frames, std::size_t offset) noexcept {
  if (frames == 0) return;  // the buffers of an empty block may be null
  const auto* in = static_cast<const unsigned char*>(interleaved);
  if (numChannels == 1) {
    std::memcpy(static_cast<unsigned char*>(channels[0]) + offset * bytesPerSample, in,
                frames * static_cast<std::size_t>(bytesPerSample));
    return;
  }
  switch (bytesPerSample) {
    case 1:
      return DeinterleaveN<1>(in, channels, numChannels, frames, offset);
    case 2:
      return DeinterleaveN<2>(in, channels, numChannels, frames, offset);
    case 3:
      return DeinterleaveN<3>(in, channels, numChannels, frames, offset);
    case 4:
      return DeinterleaveN<4>(in, channels, numChannels, frames, offset);
    case 8:
      return DeinterleaveN<8>(in, channels, numChannels, frames, offset);
    default:
      return;
  }
}

void Interleave(const void* const* channels, std::size_t offset, void* interleaved, int numChannels,
                int bytesPerSample, std::size_t frames) noexcept {
  if (frames == 0) return;  // the buffers of an empty block may be null
  auto* out = static_cast<unsigned char*>(interleaved);
  if (numChannels == 1) {
    std::memcpy(out, static_cast<const unsigned char*>(channels[0]) + offset * bytesPerSample,
                frames * static_cast<std::size_t>(bytesPerSample));
    return;
  }
  switch (bytesPerSample) {
    case 1:
      return InterleaveN<1>(channels, offset, out, numChannels, frames);
    case 2:
      return InterleaveN<2>(channels, offset, out, numChannels, frames);
    case 3:
      return InterleaveN<3>(channels, offset, out, numChannels, frames);
    case 4:
      return InterleaveN<4>(channels, offset, out, numChannels, frames);
    case 8:
      return InterleaveN<8>(channels, offset, out, numChannels, frames);
    default:
      return;
  }
}

void SumChannels(const void* const* channels, int numChannels, std::size_t offset, float* out,
                 std::size_t frames) noexcept {
  if (numChannels < 1) {
    std::memset(out, 0, frames * sizeof(float));
    return;
  }
  std::memcpy(out, static_cast<const float*>(channels[0]) + offset, frames * sizeof(float));
  for (int c = 1; c < numChannels; ++c) {
    const float* in = static_cast<const float*>(channels[c]) + offset;
    for (std::size_t i = 0; i < frames; ++i) out[i] += in[i];
  }
}

}  // namespace tarn::chainimpl
