#include "tarn/Basics/RCBlobMT.h"

#include <cstring>
#include <new>

#include "tarn/Errors/Fail.h"

namespace tarn {

RCBlobMT::RCBlobMT(std::size_t size) {
  if (size > kMaxSize) Failure(kParamErr);
  if (size == 0) return;
  try {
    bytes_ = std::make_shared<std::uint8_t[]>(size);
  } catch (const std::bad_alloc&) {
    FailMemFullError();
  }
  sizeWord_ = static_cast<std::uint32_t>(size);
}

RCBlobMT::RCBlobMT(const void* data, std::size_t size) : RCBlobMT(size) {
  if (size != 0) std::memcpy(bytes_.get(), data, size);
}

bool RCBlobMT::SameBytes(const RCBlobMT& other) const noexcept {
  if (GetSize() != other.GetSize()) return false;
  return bytes_ == other.bytes_ || std::memcmp(GetPtr(), other.GetPtr(), GetSize()) == 0;
}

}  // namespace tarn
