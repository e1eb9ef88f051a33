#pragma once
// CBufferedStream: a CStream that moves bytes through a memory buffer over a
// physical store (a file, a handle).
//
// The buffer holds the bytes [start, start + length) of the stream; reads and
// writes copy within it and call Fill or Drain at its edges. Subclasses supply
// the store: Fill (load the bytes after the buffer), Drain (write a dirty
// buffer back and move past it), Bracket (re-centre the buffer on a position),
// GetPhysicalSize and SetPhysicalSize. Reading past the end of the data fails
// with -39; MoveTo outside [0, Size()] fails with FailStream(6); a buffer that
// cannot be allocated fails with -108; reading or writing a stream that was
// never opened fails with -38. Dirty bytes reach the store on Drain,
// on a move outside the buffer, on Truncate and on Close.
//
// Invariant: 0 <= position <= length <= size of the buffer.

#include <cstdint>

#include "tarn/Streams/CStream.h"

namespace tarn {

class CBufferedStream : public CStream {
 public:
  explicit CBufferedStream(int bufferSize) noexcept : bufferSize_(bufferSize) {}
  CBufferedStream(const CBufferedStream&) = delete;
  CBufferedStream& operator=(const CBufferedStream&) = delete;
  ~CBufferedStream() override;

  // Allocates the buffer if there is none and empties it.
  void Open(TCLStreamMode mode) override;

  [[nodiscard]] std::int64_t Position() override { return bufferStart_ + bufferPosition_; }
  // The larger of the store's size and the end of the buffered data.
  [[nodiscard]] std::int64_t Size() override;
  void MoveTo(std::int64_t position) override;
  // Writes back dirty bytes, then sets the store's size; a position beyond
  // the new size moves to it.
  void Truncate(std::int64_t size) override;
  void GetRawDataFromStream(void* buffer, int count) override;
  void PutRawDataToStream(const void* data, int count) override;
  void PutThru(const void* data, char terminator) override;
  // Stops at the end of the data without failing.
  int GetThruN(void* buffer, char terminator, int max) override;

  // Resizes the buffer (or allocates it); a size of 0 or less fails with -50.
  // Changed bytes it holds are first written out and the buffer re-centred
  // on the current position, so position and contents stay as they were.
  virtual void SetBufferSize(int size);
  // Loads the bytes that follow the buffer; the base version fails with -39
  // when nothing could be loaded.
  virtual void Fill();
  virtual void Drain() = 0;
  virtual void Bracket(std::int64_t position) = 0;
  [[nodiscard]] virtual std::int64_t GetPhysicalSize() = 0;
  virtual void SetPhysicalSize(std::int64_t size) = 0;

 protected:
  // Writes dirty bytes back and keeps the position (Drain, then Bracket).
  void Flush();
  // Frees the buffer; the stream must be reopened before further use.
  void ReleaseBuffer() noexcept;

  std::int64_t bufferStart_ = 0;
  int bufferPosition_ = 0;
  int bufferSize_;
  int bufferLength_ = 0;
  char** buffer_ = nullptr;
  bool dirty_ = false;
  bool ownsBuffer_ = true;
};

}  // namespace tarn
