#pragma once
// RCBlobMT: a reference-counted block of bytes shared between owners on any
// threads.
//
// Copies share one block; the block is freed when the last copy goes. The
// count is atomic, so copies may be made and dropped on different threads at
// once; the bytes themselves are not synchronised: writers and readers of the
// same block agree among themselves (in practice a block is filled once and
// then only read). A block holds at most 2^31 - 1 bytes: its size word keeps
// the size in the low 31 bits, the top bit is reserved and always clear.
// New blocks are zero-filled.
//
//   RCBlobMT blob(payload.data(), payload.size());
//   RCBlobMT shared = blob;            // same bytes, count 2
//   Write(blob.GetPtr(), blob.GetSize());

#include <cstddef>
#include <cstdint>
#include <memory>

namespace tarn {

class RCBlobMT {
 public:
  static constexpr std::uint32_t kSizeMask = 0x7FFFFFFF;
  static constexpr std::size_t kMaxSize = kSizeMask;

  // The empty block: no bytes, GetPtr() is null.
  RCBlobMT() noexcept = default;
  // `size` zero bytes. Over kMaxSize throws TarnError -50; an allocation
  // failure throws -108.
  explicit RCBlobMT(std::size_t size);
  // A copy of `size` bytes at `data` (which may be null only when size is 0);
  // throws as above.
  RCBlobMT(const void* data, std::size_t size);
  RCBlobMT(const RCBlobMT&) noexcept = default;
  RCBlobMT& operator=(const RCBlobMT&) noexcept = default;
  RCBlobMT(RCBlobMT&&) noexcept = default;
  RCBlobMT& operator=(RCBlobMT&&) noexcept = default;
  ~RCBlobMT() = default;

  // The first byte; null for an empty block.
  [[nodiscard]] std::uint8_t* GetPtr() const noexcept { return bytes_.get(); }
  // The size word's low 31 bits.
  [[nodiscard]] std::int32_t GetSize() const noexcept {
    return static_cast<std::int32_t>(sizeWord_ & kSizeMask);
  }
  [[nodiscard]] bool IsEmpty() const noexcept { return GetSize() == 0; }
  // How many copies share the block (0 for the empty block).
  [[nodiscard]] long UseCount() const noexcept { return bytes_.use_count(); }

  // Same size and same bytes (two empty blocks are equal).
  [[nodiscard]] bool SameBytes(const RCBlobMT& other) const noexcept;

 private:
  std::shared_ptr<std::uint8_t[]> bytes_;
  std::uint32_t sizeWord_ = 0;
};

}  // namespace tarn
