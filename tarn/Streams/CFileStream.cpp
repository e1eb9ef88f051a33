#include "tarn/Streams/CFileStream.h"

#include "tarn/Errors/TarnError.h"
#include "tarn/FileSystem/File.h"
#include "tarn/Streams/CFileStreamImpl.h"

namespace tarn {
namespace {

constexpr int kIOError = -36;
constexpr int kCannotOpen = -5000;

const char* RunTimeMode(TCLStreamMode mode) noexcept {
  switch (mode) {
    case kTCLWriteMode:
      return "wb";
    case kTCLReadWriteMode:
      return "r+b";
    default:
      return "rb";
  }
}

}  // namespace

CFileStream::CFileStream(const FileSpecification& spec, int bufferSize)
    : CBufferedStream(bufferSize), spec_(spec) {}

CFileStream::CFileStream(int bufferSize) : CBufferedStream(bufferSize) {}

CFileStream::~CFileStream() {
  try {
    Close();
  } catch (...) {
    // Close first to learn of a failed final write.
  }
}

void CFileStream::Open(TCLStreamMode mode) {
  if (isOpen_) {
    Flush();
    CStream::Open(mode);
    Bracket(0);
    return;
  }
  std::FILE* file = nullptr;
  try {
    file = File(spec_).Open(RunTimeMode(mode));
  } catch (const TarnError&) {
    file = nullptr;
  }
  if (!file) Failure(kCannotOpen);
  std::setvbuf(file, nullptr, _IOFBF, static_cast<std::size_t>(bufferSize_));
  AttachFile(file, mode);
}

void CFileStream::Open(std::FILE* file, TCLStreamMode mode) {
  FailNIL(file);
  if (isOpen_) Close();
  AttachFile(file, mode);
}

void CFileStream::AttachFile(std::FILE* file, TCLStreamMode mode) {
  try {
    CBufferedStream::Open(mode);
  } catch (...) {
    std::fclose(file);
    throw;
  }
  file_ = file;
  isOpen_ = true;
  filePosition_ = -1;
  lastWasWrite_ = false;
  physicalSize_ = file_stream_impl::Length(file);
  if (physicalSize_ < 0) {
    physicalSize_ = 0;
    Close();
    Failure(kIOError);
  }
}

void CFileStream::Close() {
  if (!isOpen_) return;
  bool failed = false;
  try {
    Flush();
  } catch (const TarnError&) {
    failed = true;
  }
  failed = std::fclose(file_) != 0 || failed;
  file_ = nullptr;
  isOpen_ = false;
  bufferStart_ = 0;
  bufferPosition_ = bufferLength_ = 0;
  dirty_ = false;
  CStream::Close();
  if (failed) Failure(kIOError);
}

void CFileStream::SeekFile(std::int64_t position) {
  if (!file_stream_impl::Seek(file_, position)) Failure(kIOError);
  filePosition_ = position;
}

void CFileStream::Fill() {
  if (dirty_) Drain();
  bufferStart_ += bufferLength_;
  bufferLength_ = 0;
  bufferPosition_ = 0;
  std::int64_t want = physicalSize_ - bufferStart_;
  if (want > bufferSize_) want = bufferSize_;
  if (want > 0) {
    if (filePosition_ != bufferStart_ || lastWasWrite_) SeekFile(bufferStart_);
    lastWasWrite_ = false;
    const std::size_t got = std::fread(*buffer_, 1, static_cast<std::size_t>(want), file_);
    filePosition_ = bufferStart_ + static_cast<std::int64_t>(got);
    if (got < static_cast<std::size_t>(want) && std::ferror(file_)) {
      std::clearerr(file_);
      Failure(kIOError);
    }
    bufferLength_ = static_cast<int>(got);
  }
  CBufferedStream::Fill();
}

void CFileStream::Drain() {
  if (dirty_) {
    if (filePosition_ != bufferStart_ || !lastWasWrite_) SeekFile(bufferStart_);
    lastWasWrite_ = true;
    const auto length = static_cast<std::size_t>(bufferLength_);
    const std::size_t put = std::fwrite(*buffer_, 1, length, file_);
    filePosition_ = bufferStart_ + static_cast<std::int64_t>(put);
    if (put != length) {
      std::clearerr(file_);
      Failure(kIOError);
    }
    if (filePosition_ > physicalSize_) physicalSize_ = filePosition_;
    dirty_ = false;
  }
  bufferStart_ += bufferLength_;
  bufferLength_ = 0;
  bufferPosition_ = 0;
}

void CFileStream::Bracket(std::int64_t position) {
  if (dirty_) Drain();
  bufferStart_ = position;
  bufferLength_ = 0;
  bufferPosition_ = 0;
}

std::int64_t CFileStream::GetPhysicalSize() { return physicalSize_; }

void CFileStream::SetPhysicalSize(std::int64_t size) {
  if (!isOpen_ || !file_stream_impl::SetLength(file_, size)) Failure(kIOError);
  physicalSize_ = size;
  filePosition_ = -1;
}

void CFileStream::PutPointer(void*) { PutLongLong(0); }

void* CFileStream::GetPointer() {
  (void)GetLongLong();
  return nullptr;
}

}  // namespace tarn
