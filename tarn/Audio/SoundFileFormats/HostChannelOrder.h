#pragma once
// HostChannelOrder: the order and labels of the channels of a file, and the
// surround model guessed from the channel count.
//
// A file stores its channels interleaved in some order; the host labels each
// position. `ForChannelCount` gives the default order for a count (the
// order WAVE's channel mask implies: L R C LFE Ls Rs for 5.1, and so on);
// formats that carry an explicit layout (AIFF "CHAN", WAVE extensible masks)
// build theirs from it. Plain value, any thread.

#include <cstdint>
#include <utility>
#include <vector>

namespace tarn {

// The surround model guessed from a channel count.
enum class SurroundModel : std::int32_t {
  kNone = 0,  // no channels
  kMono = 1,
  kStereo = 2,
  kLCR = 3,
  kQuad = 4,
  kFiveZero = 5,
  kFiveOne = 6,
  kSixOne = 7,
  kSevenOne = 8,
  kDiscrete = 9,  // more than 8 channels: numbered, no positions
};

// One channel position; the values are the bit numbers of WAVE's
// speaker-position mask, so a mask converts with 1u << label.
enum class ChannelLabel : std::int32_t {
  kLeft = 0,
  kRight = 1,
  kCenter = 2,
  kLFE = 3,
  kLeftSurround = 4,   // back left
  kRightSurround = 5,  // back right
  kLeftCenter = 6,
  kRightCenter = 7,
  kBackCenter = 8,
  kSideLeft = 9,
  kSideRight = 10,
  kDiscrete = 31,  // no position
};

class HostChannelOrder {
 public:
  HostChannelOrder() = default;
  explicit HostChannelOrder(std::vector<ChannelLabel> labels, SurroundModel model)
      : labels_(std::move(labels)), model_(model) {}

  // The default order and model for `channels` (0 and negative give none).
  [[nodiscard]] static HostChannelOrder ForChannelCount(int channels);
  // The model guessed from a channel count.
  [[nodiscard]] static SurroundModel GuessSurroundModel(int channels) noexcept;

  [[nodiscard]] int GetNumChannels() const noexcept { return static_cast<int>(labels_.size()); }
  [[nodiscard]] SurroundModel GetSurroundModel() const noexcept { return model_; }
  [[nodiscard]] const std::vector<ChannelLabel>& GetLabels() const noexcept { return labels_; }
  // WAVE's speaker-position mask of the labelled channels (discrete ones
  // add nothing).
  [[nodiscard]] std::uint32_t GetChannelMask() const noexcept;

  friend bool operator==(const HostChannelOrder&, const HostChannelOrder&) = default;

 private:
  std::vector<ChannelLabel> labels_;
  SurroundModel model_ = SurroundModel::kNone;
};

}  // namespace tarn
