#include "tarn/Audio/SampleBuffer.h"

#include <algorithm>
#include <atomic>
#include <cstring>

#include "tarn/Errors/Fail.h"

namespace tarn {
namespace {

constexpr std::uintptr_t kPage = 4096;
constexpr std::int32_t kSlackFloats = 4096;

std::atomic<std::uint32_t> gSerialCounter{0};

float* PageAbove(float* raw) noexcept {
  auto address = reinterpret_cast<std::uintptr_t>(raw);
  return reinterpret_cast<float*>((address / kPage + 1) * kPage);
}

}  // namespace

SampleBuffer::SampleBuffer(std::int32_t count, SampleCount startTime)
    : data_(nullptr), size_(count), capacity_(count), startTime_(startTime) {
  if (count < 0) FailOSErr(kParamErr);
  raw_.reset(new float[static_cast<std::size_t>(count) + kSlackFloats]());
  data_ = PageAbove(raw_.get());
  serial_ = ++gSerialCounter;
}

SampleBuffer::SampleBuffer(const SampleBuffer& other)
    : SampleBuffer(other.capacity_, other.startTime_) {
  size_ = other.size_;
  std::copy_n(other.data_, other.size_, data_);
}

SampleBuffer& SampleBuffer::operator=(const SampleBuffer& other) {
  if (this == &other) return *this;
  if (other.size_ > capacity_) FailOSErr(kParamErr);
  std::copy_n(other.data_, other.size_, data_);
  size_ = other.size_;
  startTime_ = other.startTime_;
  return *this;
}

void SampleBuffer::SetSize(std::int32_t size) {
  if (size < 0 || size > capacity_) FailOSErr(kParamErr);
  size_ = size;
}

void SampleBuffer::Clear() noexcept { std::memset(data_, 0, sizeof(float) * size_); }

}  // namespace tarn
