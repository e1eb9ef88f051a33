#pragma once
// PtrStream: an unbuffered stream over a memory area that the caller owns.
//
// The area has a capacity (bytes that may be written) and a current size
// (bytes that hold data). PtrStream never fails: a read that would pass the
// current size, a write that would pass the capacity and a move outside
// [0, size] are ignored and leave the position where it was (values read by
// CStream's typed operations then come back as 0). Callers check AtEnd or
// sizes first. The area must outlive the stream.

#include <cstdint>

#include "tarn/Streams/CStream.h"

namespace tarn {

class PtrStream : public CStream {
 public:
  // A writable area of `capacity` bytes whose first `size` bytes hold data.
  PtrStream(void* base, std::int64_t capacity, std::int64_t size = 0) noexcept;
  // A read-only area of `size` bytes of data.
  PtrStream(const void* base, std::int64_t size) noexcept;
  PtrStream(const PtrStream&) = delete;
  PtrStream& operator=(const PtrStream&) = delete;
  ~PtrStream() override = default;

  // Records the mode and moves to 0.
  void Open(TCLStreamMode mode) override;

  [[nodiscard]] std::int64_t Position() override { return position_; }
  [[nodiscard]] std::int64_t Size() override { return size_; }
  void MoveTo(std::int64_t position) override;
  // Shrinks the data to `size` bytes; a larger size is ignored.
  void Truncate(std::int64_t size) override;
  void GetRawDataFromStream(void* buffer, int count) override;
  void PutRawDataToStream(const void* data, int count) override;
  void PutThru(const void* data, char terminator) override;
  int GetThruN(void* buffer, char terminator, int max) override;

 private:
  char* base_;
  std::int64_t capacity_;
  std::int64_t position_ = 0;
  std::int64_t size_;
};

}  // namespace tarn
