// The chain's byte-moving kernels, exhaustively over small shapes: every
// sample size, 1 to 5 channels, 0 to 9 frames and three channel offsets.
// Buffers are sized exactly, so a read past the input shows under the
// address sanitizer, and outputs carry guard bytes before and after, so a
// store outside its samples shows in every build.

#include <gtest/gtest.h>

#include <cstdint>
#include <vector>

#include "tarn/Audio/AudioChainKernelsImpl.h"

namespace tarn::test {
namespace {

using Bytes = std::vector<std::uint8_t>;

constexpr std::uint8_t kGuard = 0xA5;
constexpr std::size_t kGuardBytes = 8;

std::uint8_t ByteOf(std::size_t frame, int channel, int byte) {
  return static_cast<std::uint8_t>(frame * 37 + static_cast<std::size_t>(channel) * 11 +
                                   static_cast<std::size_t>(byte) * 3 + 1);
}

TEST(ChainKernels, DeinterleaveAndInterleaveEveryShape) {
  for (int bytes : {1, 2, 3, 4, 8}) {
    for (int channels = 1; channels <= 5; ++channels) {
      for (std::size_t frames = 0; frames <= 9; ++frames) {
        for (std::size_t offset = 0; offset <= 2; ++offset) {
          SCOPED_TRACE(::testing::Message() << bytes << " bytes, " << channels << " channels, "
                                            << frames << " frames from " << offset);
          const auto b = static_cast<std::size_t>(bytes);
          const auto n = static_cast<std::size_t>(channels);
          Bytes interleaved(frames * n * b);
          for (std::size_t i = 0; i < frames; ++i)
            for (int c = 0; c < channels; ++c)
              for (int k = 0; k < bytes; ++k)
                interleaved[(i * n + static_cast<std::size_t>(c)) * b +
                            static_cast<std::size_t>(k)] = ByteOf(i, c, k);

          // Each channel: guard, `offset` samples left alone, the frames, guard.
          const std::size_t span = (offset + frames) * b;
          std::vector<Bytes> split(n, Bytes(span + 2 * kGuardBytes, kGuard));
          std::vector<void*> out;
          for (auto& s : split) out.push_back(s.data() + kGuardBytes);
          chainimpl::Deinterleave(interleaved.data(), out.data(), channels, bytes, frames, offset);
          for (int c = 0; c < channels; ++c) {
            const Bytes& s = split[static_cast<std::size_t>(c)];
            for (std::size_t at = 0; at < s.size(); ++at) {
              const bool sample = at >= kGuardBytes + offset * b && at < kGuardBytes + span;
              const std::size_t rel = at - kGuardBytes - offset * b;
              const std::uint8_t want =
                  sample ? ByteOf(rel / b, c, static_cast<int>(rel % b)) : kGuard;
              ASSERT_EQ(s[at], want) << "channel " << c << " byte " << at;
            }
          }

          Bytes joined(frames * n * b + 2 * kGuardBytes, kGuard);
          std::vector<const void*> in(out.begin(), out.end());
          chainimpl::Interleave(in.data(), offset, joined.data() + kGuardBytes, channels, bytes,
                                frames);
          ASSERT_EQ(Bytes(joined.begin(), joined.begin() + kGuardBytes),
                    Bytes(kGuardBytes, kGuard));
          ASSERT_EQ(Bytes(joined.begin() + kGuardBytes, joined.end() - kGuardBytes), interleaved);
          ASSERT_EQ(Bytes(joined.end() - kGuardBytes, joined.end()), Bytes(kGuardBytes, kGuard));
        }
      }
    }
  }
}

}  // namespace
}  // namespace tarn::test
