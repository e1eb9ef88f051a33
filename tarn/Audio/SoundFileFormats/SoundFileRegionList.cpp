// SoundFileRegionList and its flattened byte form.
#include "tarn/Audio/SoundFileFormats/SoundFileRegionList.h"

#include <algorithm>

#include "tarn/Audio/SoundFileFormats/RIFFType.h"
#include "tarn/Errors/Fail.h"

namespace tarn {
namespace {

constexpr std::uint32_t kTag = MakeRIFFType("RgnL");
constexpr std::uint32_t kVersion = 1;
constexpr std::size_t kListHeaderSize = 12;  // tag, version, count
constexpr std::size_t kEntryFixedSize = 24;  // id, start, length, name length

void PutBE(std::uint8_t*& p, std::uint64_t value, int bytes) noexcept {
  for (int i = bytes - 1; i >= 0; --i) *p++ = static_cast<std::uint8_t>(value >> (8 * i));
}

// Reads big-endian values from a block, failing with -50 at its end.
class Cursor {
 public:
  Cursor(const std::uint8_t* p, std::size_t size) noexcept : p_(p), left_(size) {}
  std::uint64_t Get(int bytes) {
    if (left_ < static_cast<std::size_t>(bytes)) FailOSErr(kParamErr);
    std::uint64_t value = 0;
    for (int i = 0; i < bytes; ++i) value = value << 8 | *p_++;
    left_ -= static_cast<std::size_t>(bytes);
    return value;
  }
  [[nodiscard]] std::size_t Left() const noexcept { return left_; }

 private:
  const std::uint8_t* p_;
  std::size_t left_;
};

}  // namespace

std::size_t SoundFileRegionList::CountMarkers() const noexcept {
  return static_cast<std::size_t>(
      std::count_if(entries_.begin(), entries_.end(), [](const Entry& e) { return e.IsMarker(); }));
}

RCBlobMT SoundFileRegionList::Flatten() const {
  std::size_t size = kListHeaderSize;
  for (const Entry& e : entries_) {
    size += kEntryFixedSize + 2 * e.mName.size();
    if (size > RCBlobMT::kMaxSize) FailOSErr(kParamErr);
  }
  RCBlobMT blob(size);
  std::uint8_t* p = blob.GetPtr();
  PutBE(p, kTag, 4);
  PutBE(p, kVersion, 4);
  PutBE(p, entries_.size(), 4);
  for (const Entry& e : entries_) {
    PutBE(p, e.mID, 4);
    PutBE(p, static_cast<std::uint64_t>(e.mStart.AsLongLong()), 8);
    PutBE(p, static_cast<std::uint64_t>(e.mLength.AsLongLong()), 8);
    PutBE(p, e.mName.size(), 4);
    for (std::size_t i = 0; i < e.mName.size(); ++i) PutBE(p, e.mName[i], 2);
  }
  return blob;
}

SoundFileRegionList SoundFileRegionList::Unflatten(const RCBlobMT& blob) {
  SoundFileRegionList list;
  if (blob.IsEmpty()) return list;
  Cursor in(blob.GetPtr(), static_cast<std::size_t>(blob.GetSize()));
  if (in.Get(4) != kTag || in.Get(4) != kVersion) FailOSErr(kParamErr);
  const std::uint64_t count = in.Get(4);
  // Every entry takes at least its fixed part: a count beyond that is a lie.
  if (count > in.Left() / kEntryFixedSize) FailOSErr(kParamErr);
  list.entries_.reserve(static_cast<std::size_t>(count));
  for (std::uint64_t n = 0; n < count; ++n) {
    Entry e;
    e.mID = static_cast<std::uint32_t>(in.Get(4));
    e.mStart = SampleCount(static_cast<std::int64_t>(in.Get(8)));
    e.mLength = SampleCount(static_cast<std::int64_t>(in.Get(8)));
    if (e.mLength < SampleCount(0)) FailOSErr(kParamErr);
    const std::uint64_t units = in.Get(4);
    if (units > in.Left() / 2) FailOSErr(kParamErr);
    UTF16String name;
    name.reserve(static_cast<std::size_t>(units));
    for (std::uint64_t i = 0; i < units; ++i) {
      name.push_back(static_cast<UString::value_type>(in.Get(2)));
    }
    e.mName = UString(name);
    list.entries_.push_back(std::move(e));
  }
  if (in.Left() != 0) FailOSErr(kParamErr);
  return list;
}

}  // namespace tarn
