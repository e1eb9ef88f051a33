#pragma once
// SoundFileRegionList: the markers and regions of a sound file.
//
// An entry is a region (a start frame and a length) or, with length 0, a
// marker at one frame. Entries keep the order in which they were added
// (usually file order); identifiers are the file's own and need not be
// unique or sorted. A format hands a list out from GetRegionList and takes
// one back, flattened to bytes, in WriteRegionList:
//
//   SoundFileRegionList list;
//   list.Add({1, UString("Verse"), 44100, 88200});
//   list.Add({2, UString("Hit"), 10000, 0});             // a marker
//   format.WriteRegionList(access, list.Flatten(), 0);
//   auto back = SoundFileRegionList::Unflatten(blob);   // throws on bad bytes
//
// Plain value: copy and compare freely; one object is not synchronised.

#include <cstddef>
#include <cstdint>
#include <utility>
#include <vector>

#include "tarn/Basics/RCBlobMT.h"
#include "tarn/String/UString.h"
#include "tarn/Time/SampleCount.h"

namespace tarn {

class SoundFileRegionList {
 public:
  struct Entry {
    std::uint32_t mID = 0;
    UString mName;
    SampleCount mStart;
    SampleCount mLength;  // 0 for a marker

    [[nodiscard]] bool IsMarker() const noexcept { return mLength == SampleCount(0); }
    friend bool operator==(const Entry&, const Entry&) = default;
  };
  using const_iterator = std::vector<Entry>::const_iterator;

  SoundFileRegionList() = default;
  SoundFileRegionList(const SoundFileRegionList&) = default;
  SoundFileRegionList(SoundFileRegionList&&) noexcept = default;
  SoundFileRegionList& operator=(const SoundFileRegionList&) = default;
  SoundFileRegionList& operator=(SoundFileRegionList&&) noexcept = default;
  ~SoundFileRegionList() = default;

  void Add(const Entry& entry) { entries_.push_back(entry); }
  void Add(Entry&& entry) { entries_.push_back(std::move(entry)); }
  void Clear() noexcept { entries_.clear(); }

  [[nodiscard]] std::size_t size() const noexcept { return entries_.size(); }
  [[nodiscard]] bool empty() const noexcept { return entries_.empty(); }
  [[nodiscard]] const Entry& operator[](std::size_t i) const noexcept { return entries_[i]; }
  [[nodiscard]] const_iterator begin() const noexcept { return entries_.begin(); }
  [[nodiscard]] const_iterator end() const noexcept { return entries_.end(); }
  [[nodiscard]] std::size_t CountMarkers() const noexcept;
  [[nodiscard]] std::size_t CountRegions() const noexcept { return size() - CountMarkers(); }

  // The list as bytes, big-endian: "RgnL", version (u32, 1), entry count
  // (u32), then per entry: id (u32), start (i64), length (i64), name length
  // in UTF-16 units (u32), the units (u16 each). Throws -50 if the bytes
  // would exceed an RCBlobMT's limit.
  [[nodiscard]] RCBlobMT Flatten() const;
  // The list that Flatten wrote. An empty block gives an empty list; any
  // other block that is not exactly one flattened list (wrong tag or
  // version, counts running past the end, bytes left over, a negative
  // length) throws TarnError -50.
  [[nodiscard]] static SoundFileRegionList Unflatten(const RCBlobMT& blob);

  friend bool operator==(const SoundFileRegionList&, const SoundFileRegionList&) = default;

 private:
  std::vector<Entry> entries_;
};

}  // namespace tarn
