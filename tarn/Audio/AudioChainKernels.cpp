#include <cstring>

#include "tarn/Audio/AudioChainKernelsImpl.h"

namespace tarn::chainimpl {
namespace {

template <int B>
void DeinterleaveN(const unsigned char* in, void* const* channels, int numChannels,
                   std::size_t frames, std::size_t offset) noexcept {
  const std::size_t stride = static_cast<std::size_t>(numChannels) * B;
  for (int c = 0; c < numChannels; ++c) {
    const unsigned char* src = in + static_cast<std::size_t>(c) * B;
    unsigned char* dst = static_cast<unsigned char*>(channels[c]) + offset * B;
    for (std::size_t i = 0; i < frames; ++i) std::memcpy(dst + i * B, src + i * stride, B);
  }
}

template <int B>
void InterleaveN(const void* const* channels, std::size_t offset, unsigned char* out,
                 int numChannels, std::size_t frames) noexcept {
  const std::size_t stride = static_cast<std::size_t>(numChannels) * B;
  for (int c = 0; c < numChannels; ++c) {
    const unsigned char* src = static_cast<const unsigned char*>(channels[c]) + offset * B;
    unsigned char* dst = out + static_cast<std::size_t>(c) * B;
    for (std::size_t i = 0; i < frames; ++i) std::memcpy(dst + i * stride, src + i * B, B);
  }
}

}  // namespace

void Deinterleave(const void* interleaved, void* const* channels, int numChannels,
                  int bytesPerSample, std::size_t frames, std::size_t offset) noexcept {
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
