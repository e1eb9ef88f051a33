// SampleBuffer: one block of 32-bit float samples stamped with the sample
// time of its first sample.
//
// The data is page-aligned (a multiple of 4096 bytes) with at least 4096
// floats of slack behind the allocation's start, so vector code may read
// whole pages. Every constructed block takes the next number of a
// process-wide serial counter. Not locked: its owner serialises access.
#pragma once

#include <cstdint>
#include <memory>

#include "tarn/Time/SampleCount.h"

namespace tarn {

class MultiBuffer;

class SampleBuffer {
 public:
  // Allocates `count` samples (zero-filled); size and capacity are both
  // `count`. Throws std::bad_alloc when memory runs out; a negative count is
  // a parameter error (-50).
  SampleBuffer(std::int32_t count, SampleCount startTime);
  SampleBuffer(const SampleBuffer& other);
  // Copies size, start time and the valid samples; the capacity must hold
  // them (-50 otherwise). The serial number stays this block's own.
  SampleBuffer& operator=(const SampleBuffer& other);
  ~SampleBuffer() = default;

  [[nodiscard]] float* GetData() noexcept { return data_; }
  [[nodiscard]] const float* GetData() const noexcept { return data_; }
  [[nodiscard]] std::int32_t GetSize() const noexcept { return size_; }
  [[nodiscard]] std::int32_t GetCapacity() const noexcept { return capacity_; }
  // Changes the number of valid samples only; 0..capacity (-50 otherwise).
  void SetSize(std::int32_t size);
  [[nodiscard]] SampleCount GetStartTime() const noexcept { return startTime_; }
  [[nodiscard]] SampleCount GetEndTime() const noexcept { return startTime_ + size_; }
  [[nodiscard]] std::uint32_t GetSerialNumber() const noexcept { return serial_; }

  float& operator[](std::int32_t i) noexcept { return data_[i]; }
  const float& operator[](std::int32_t i) const noexcept { return data_[i]; }

  void Clear() noexcept;                   // zeroes the valid samples
  void CheckSentinals() const noexcept {}  // no sentinels in this build

 private:
  friend class MultiBuffer;
  void SetStartTime(SampleCount t) noexcept { startTime_ = t; }

  std::unique_ptr<float[]> raw_;  // capacity + 4096 floats
  float* data_;                   // first 4096-byte boundary strictly above raw_
  std::int32_t size_;
  std::int32_t capacity_;
  SampleCount startTime_;
  std::uint32_t serial_;
};

}  // namespace tarn
