#pragma once
// CFileStream: a buffered stream over a C run-time file.
//
// The file is named by a FileSpecification and opened on Open with "rb"
// (kTCLReadMode), "wb" (kTCLWriteMode, which empties the file) or "r+b"
// (kTCLReadWriteMode); a file that cannot be opened fails with -5000. A file
// opened elsewhere can be adopted with Open(FILE*, mode); the stream then
// owns it. Positions and sizes are 64-bit. Reading past the end fails with
// -39; write errors fail with -36. Close (and the destructor) write back
// buffered bytes and close the file; errors during destruction are dropped,
// so callers that must know call Close first.
//
// Pointers are meaningless once a process has ended: in a file PutPointer
// stores 8 zero bytes and GetPointer skips 8 bytes and returns null.

#include <cstdint>
#include <cstdio>

#include "tarn/FileSystem/FileSpecification.h"
#include "tarn/Streams/CBufferedStream.h"

namespace tarn {

class CFileStream : public CBufferedStream {
 public:
  static constexpr int kDefaultBufferSize = 65536;

  explicit CFileStream(const FileSpecification& spec, int bufferSize = kDefaultBufferSize);
  // A stream without a file of its own, for Open(FILE*, mode).
  explicit CFileStream(int bufferSize = kDefaultBufferSize);
  CFileStream(const CFileStream&) = delete;
  CFileStream& operator=(const CFileStream&) = delete;
  ~CFileStream() override;

  // Opens the named file, or moves to 0 when it is already open.
  void Open(TCLStreamMode mode) override;
  // Adopts `file`, which the stream closes on Close.
  void Open(std::FILE* file, TCLStreamMode mode);
  void Close() override;

  [[nodiscard]] const FileSpecification& GetSpecification() const noexcept { return spec_; }

  void PutPointer(void* p) override;
  [[nodiscard]] void* GetPointer() override;

  void Fill() override;
  void Drain() override;
  void Bracket(std::int64_t position) override;
  [[nodiscard]] std::int64_t GetPhysicalSize() override;
  void SetPhysicalSize(std::int64_t size) override;

 private:
  void AttachFile(std::FILE* file, TCLStreamMode mode);
  void SeekFile(std::int64_t position);

  FileSpecification spec_;
  bool isOpen_ = false;
  std::FILE* file_ = nullptr;
  // The file's length as this stream has made it; the stream is the file's
  // only writer while it is open.
  std::int64_t physicalSize_ = 0;
  // Where the run-time file's position is (-1: unknown) and whether its last
  // transfer was a write, which a read may not follow without a seek.
  std::int64_t filePosition_ = -1;
  bool lastWasWrite_ = false;
};

}  // namespace tarn
