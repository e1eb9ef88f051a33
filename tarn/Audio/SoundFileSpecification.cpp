#include "tarn/Audio/SoundFileSpecification.h"

#include <algorithm>
#include <string>

#include "tarn/Basics/TarnCoreLibCallbacks.h"
#include "tarn/Errors/Fail.h"

namespace tarn {

namespace {

// Entries of the host's channel-suffix list.
enum SuffixIndex : short {
  kSuffixLeft = 1,
  kSuffixRight = 2,
  kSuffixCenter = 3,
  kSuffixLFE = 4,
  kSuffixLeftSurround = 5,
  kSuffixRightSurround = 6,
  kSuffixLeftCenter = 7,
  kSuffixRightCenter = 8,
  kSuffixCenterSurround = 9,
  kSuffixLeftSurroundRear = 10,
  kSuffixRightSurroundRear = 11,
  kSuffixTopSurround = 12,
};

// The list entry of a position; 0 for none.
short SuffixFor(ChannelLabel label, bool hasSides) {
  switch (label) {
    case ChannelLabel::kLeft:
      return kSuffixLeft;
    case ChannelLabel::kRight:
      return kSuffixRight;
    case ChannelLabel::kCenter:
      return kSuffixCenter;
    case ChannelLabel::kLFE:
      return kSuffixLFE;
    case ChannelLabel::kLeftSurround:
      return hasSides ? kSuffixLeftSurroundRear : kSuffixLeftSurround;
    case ChannelLabel::kRightSurround:
      return hasSides ? kSuffixRightSurroundRear : kSuffixRightSurround;
    case ChannelLabel::kLeftCenter:
      return kSuffixLeftCenter;
    case ChannelLabel::kRightCenter:
      return kSuffixRightCenter;
    case ChannelLabel::kBackCenter:
      return kSuffixCenterSurround;
    case ChannelLabel::kSideLeft:
      return kSuffixLeftSurround;
    case ChannelLabel::kSideRight:
      return kSuffixRightSurround;
    default:
      return 0;
  }
}

bool IsChannelNumber(const UString& suffix) {
  if (suffix.size() < 2 || suffix[0] != u'.') return false;
  for (std::size_t i = 1; i < suffix.size(); ++i)
    if (suffix[i] < u'0' || suffix[i] > u'9') return false;
  return true;
}

}  // namespace

SoundFileSpecification::SoundFileSpecification(const FileSpecification& file) : files_{file} {}

SoundFileSpecification::SoundFileSpecification(const FileSpecification& folder,
                                               const UString& baseName, const UString& extension,
                                               const HostChannelOrder& order)
    : multiMono_(true) {
  for (int c = 0; c < order.GetNumChannels(); ++c) {
    UString name = baseName;
    name += GetChannelSuffix(order, c);
    if (!extension.empty()) {
      name += '.';
      name += extension;
    }
    files_.emplace_back(folder, name);
  }
}

const FileSpecification& SoundFileSpecification::GetFile(int index) const {
  if (index < 0 || index >= GetNumFiles()) FailOSErr(kParamErr);
  return files_[static_cast<std::size_t>(index)];
}

UString SoundFileSpecification::GetChannelSuffix(const HostChannelOrder& order, int index) {
  const auto& labels = order.GetLabels();
  if (index < 0 || index >= static_cast<int>(labels.size())) FailOSErr(kParamErr);
  if (labels.size() == 1) return UString();
  const bool hasSides = std::any_of(labels.begin(), labels.end(), [](ChannelLabel l) {
    return l == ChannelLabel::kSideLeft || l == ChannelLabel::kSideRight;
  });
  const short entry = SuffixFor(labels[static_cast<std::size_t>(index)], hasSides);
  if (entry == 0) return UString("." + std::to_string(index + 1));
  return GetIndUString(kChannelSuffixesStringList, entry);
}

bool SoundFileSpecification::SplitChannelFileName(const UString& name, UString& baseName,
                                                  UString& suffix, UString& extension) {
  UString stem = name;
  UString ext;
  const auto dot = name.rfind('.');
  if (dot != UString::npos && dot > 0) {
    // "Take.L" alone: the last dot starts the suffix, not an extension.
    const UString tail = name.substr(dot);
    bool tailIsSuffix = IsChannelNumber(tail);
    for (short i = kSuffixLeft; i <= kSuffixTopSurround && !tailIsSuffix; ++i)
      tailIsSuffix = tail == GetIndUString(kChannelSuffixesStringList, i);
    if (!tailIsSuffix) {
      stem = name.substr(0, dot);
      ext = name.substr(dot + 1);
    }
  }
  // The stem's last dot starts its suffix.
  const auto cut = stem.rfind('.');
  if (cut == UString::npos || cut == 0) return false;
  const UString candidate = stem.substr(cut);
  bool known = IsChannelNumber(candidate);
  for (short i = kSuffixLeft; i <= kSuffixTopSurround && !known; ++i)
    known = candidate == GetIndUString(kChannelSuffixesStringList, i);
  if (!known) return false;
  baseName = stem.substr(0, cut);
  suffix = candidate;
  extension = ext;
  return true;
}

}  // namespace tarn
