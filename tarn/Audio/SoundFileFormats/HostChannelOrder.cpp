#include "tarn/Audio/SoundFileFormats/HostChannelOrder.h"

#include <utility>

namespace tarn {

SurroundModel HostChannelOrder::GuessSurroundModel(int channels) noexcept {
  if (channels <= 0) return SurroundModel::kNone;
  if (channels > 8) return SurroundModel::kDiscrete;
  return static_cast<SurroundModel>(channels);
}

HostChannelOrder HostChannelOrder::ForChannelCount(int channels) {
  using L = ChannelLabel;
  // The positions of the usual layouts in WAVE's mask order.
  static const std::vector<L> kLayouts[9] = {
      {},
      {L::kCenter},
      {L::kLeft, L::kRight},
      {L::kLeft, L::kRight, L::kCenter},
      {L::kLeft, L::kRight, L::kLeftSurround, L::kRightSurround},
      {L::kLeft, L::kRight, L::kCenter, L::kLeftSurround, L::kRightSurround},
      {L::kLeft, L::kRight, L::kCenter, L::kLFE, L::kLeftSurround, L::kRightSurround},
      {L::kLeft, L::kRight, L::kCenter, L::kLFE, L::kBackCenter, L::kSideLeft, L::kSideRight},
      {L::kLeft, L::kRight, L::kCenter, L::kLFE, L::kLeftSurround, L::kRightSurround, L::kSideLeft,
       L::kSideRight},
  };
  const SurroundModel model = GuessSurroundModel(channels);
  if (channels <= 0) return {};
  if (channels <= 8) return HostChannelOrder(kLayouts[channels], model);
  return HostChannelOrder(std::vector<L>(static_cast<std::size_t>(channels), L::kDiscrete), model);
}

std::uint32_t HostChannelOrder::GetChannelMask() const noexcept {
  std::uint32_t mask = 0;
  for (ChannelLabel label : labels_) {
    if (label != ChannelLabel::kDiscrete) mask |= 1u << static_cast<int>(label);
  }
  return mask;
}

}  // namespace tarn
