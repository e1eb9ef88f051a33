#pragma once
// SoundFileSpecification: names the file or files that hold one sound: a
// single file with every channel, or a multi-mono set with one file per
// channel, named base name + channel suffix + extension ("Take.L.wav",
// "Take.R.wav", "Take.C.wav", ...).
//
// Suffixes follow the channel's position in the sound's HostChannelOrder
// and come from the host's texts (string list 12597, see
// TarnCoreLibCallbacks.h; built-in English ".L", ".R", ".C", ".LFE", ".Ls",
// ".Rs", ".Lc", ".Rc", ".Cs", ".Lsr", ".Rsr" without a host): left, right,
// centre, LFE, left and right of centre, back centre; side channels are
// ".Ls"/".Rs", and back left/right are ".Ls"/".Rs" too unless the layout
// also has side channels, when they are ".Lsr"/".Rsr". A channel without a
// position gets its number (".1", ".2", ...). A set of one channel has no
// suffix.
//
//   SoundFileSpecification take(folder, "Take", "wav", HostChannelOrder::ForChannelCount(2));
//   take.GetFile(1);   // <folder>/Take.R.wav
//
// A plain value: copy and compare freely, from any thread (suffixes are
// fetched from the host's texts when a set is made). Nothing touches the
// disk. Failures: -50 for a channel index out of range.

#include <vector>

#include "tarn/Audio/SoundFileFormats/HostChannelOrder.h"
#include "tarn/FileSystem/FileSpecification.h"
#include "tarn/String/UString.h"

namespace tarn {

class SoundFileSpecification {
 public:
  SoundFileSpecification() = default;
  // One file holding every channel.
  explicit SoundFileSpecification(const FileSpecification& file);
  // A multi-mono set in `folder`: one file per channel of `order`, named
  // `baseName` + suffix + "." + `extension` (no dot when `extension` is
  // empty).
  SoundFileSpecification(const FileSpecification& folder, const UString& baseName,
                         const UString& extension, const HostChannelOrder& order);

  [[nodiscard]] bool IsMultiMono() const noexcept { return multiMono_; }
  [[nodiscard]] int GetNumFiles() const noexcept { return static_cast<int>(files_.size()); }
  // The file of channel `index` of a multi-mono set (index 0 for a single
  // file); throws -50 outside 0 .. GetNumFiles() - 1.
  [[nodiscard]] const FileSpecification& GetFile(int index) const;
  [[nodiscard]] const std::vector<FileSpecification>& GetFiles() const noexcept { return files_; }

  // The suffix of channel `index` of a multi-mono set laid out as `order`
  // (empty for a one-channel set); throws -50 for an index out of range.
  [[nodiscard]] static UString GetChannelSuffix(const HostChannelOrder& order, int index);
  // Splits a channel file's name ("Take.Ls.wav") into base name ("Take"),
  // suffix (".Ls": from the last dot before the extension) and extension
  // ("wav", without its dot; empty when the name has none). Returns false, leaving the outputs
  // alone, when the part before the extension ends in no known suffix (the host's or a channel
  // number) or nothing would remain of the base name.
  static bool SplitChannelFileName(const UString& name, UString& baseName, UString& suffix,
                                   UString& extension);

  friend bool operator==(const SoundFileSpecification&, const SoundFileSpecification&) = default;

 private:
  std::vector<FileSpecification> files_;
  bool multiMono_ = false;
};

}  // namespace tarn
