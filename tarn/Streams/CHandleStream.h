#pragma once
// CHandleStream: a buffered stream whose store is a relocatable memory block.
//
// The handle itself is the buffer: the stream's data are the first Size()
// bytes of the block. Writing past the block's end grows it by the block
// size. A stream made from the caller's handle does not own it (and does not
// free it); a stream made from a mode alone creates its own handle on Open
// (4,096 bytes, growing by 4,096) and frees it on destruction. A non-zero
// mode opens the stream at once. Reading past the end fails with -39; growth
// that cannot be allocated fails with -108.
//
//   CHandleStream s(kTCLReadWriteMode);
//   s.PutLong(7);
//   auto_handle<char> bytes = s.DetachHandle();   // 4 bytes: 00 00 00 07

#include <cstdint>

#include "tarn/Streams/CBufferedStream.h"

namespace tarn {

class CHandleStream : public CBufferedStream {
 public:
  static constexpr int kDefaultBlockSize = 4096;

  CHandleStream(char** handle, TCLStreamMode mode, int blockSize = kDefaultBlockSize);
  explicit CHandleStream(TCLStreamMode mode = kTCLClosedMode);
  CHandleStream(const CHandleStream&) = delete;
  CHandleStream& operator=(const CHandleStream&) = delete;
  ~CHandleStream() override = default;

  // Opens at position 0 and keeps the block's content.
  void Open(TCLStreamMode mode) override;
  void Truncate(std::int64_t size) override;

  // The handle, trimmed to the stream's data; the stream keeps (or does not
  // keep) ownership as before.
  [[nodiscard]] char** GetStreamHandle();
  // The handle trimmed to the data, now owned by the caller; the stream is
  // left closed without a handle. Fails with -50 when the stream does not
  // own its handle.
  [[nodiscard]] auto_handle<char> DetachHandle();
  // Frees an owned handle (forgets one it does not own) and closes.
  void DisposeAll() noexcept;
  void SetBlockSize(int blockSize);

  // Reserves room for `size` bytes in the block (never below the data).
  void SetBufferSize(int size) override;
  void Drain() override;
  void Bracket(std::int64_t position) override;
  [[nodiscard]] std::int64_t GetPhysicalSize() override { return bufferLength_; }
  void SetPhysicalSize(std::int64_t size) override;

 private:
  void ResizeBlock(std::int64_t size);

  int blockSize_;
};

}  // namespace tarn
