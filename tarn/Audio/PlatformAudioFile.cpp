#include "tarn/Audio/PlatformAudioFile.h"

#include <algorithm>
#include <cstring>
#include <limits>
#include <utility>

#include "tarn/Basics/Singleton.h"
#include "tarn/Threads/TarnJobThread.h"

namespace tarn {

namespace {

constexpr std::uint64_t kBlock = PlatformAudioFile::kBlockSize;
constexpr std::uint64_t kBlockMask = kBlock - 1;

bool IsAligned(std::uint64_t value) noexcept { return (value & kBlockMask) == 0; }

// Whether [position, position + count) rounded out to whole blocks is a
// range of signed 64-bit file offsets.
bool FitsInOffsets(std::uint64_t position, std::uint64_t count) noexcept {
  constexpr std::uint64_t kMax = std::uint64_t(std::numeric_limits<std::int64_t>::max()) - kBlock;
  return position <= kMax && count <= kMax - position;
}

// The process-wide job thread of asynchronous reads, started on first use.
class ReaderThread {
 public:
  TarnJobThread& Get() noexcept { return thread_; }

 private:
  friend class tarn::Singleton<ReaderThread>;
  ReaderThread()
      : thread_(UString("PlatformAudioFile Reader Thread"),
                TarnJobThread::kRunRemainingJobsAtExit) {
    thread_.Start();
  }
  TarnJobThread thread_;
};

}  // namespace

class PlatformAudioFile::Impl {
 public:
  explicit Impl(std::shared_ptr<IFileDriver> driver) : driver_(std::move(driver)) {}

  FileResult Read(void* buffer, std::uint64_t count, std::optional<std::uint64_t> at);
  FileStatus Write(const void* buffer, std::uint64_t count, std::optional<std::uint64_t> at);

  std::shared_ptr<IFileDriver> driver_;
  BlockAlignedBuffer bounce_;
  std::uint64_t position_ = 0;

 private:
  [[nodiscard]] bool Direct(const void* buffer, std::uint64_t count,
                            std::uint64_t position) const noexcept {
    return !driver_->NeedsAlignment() || (IsAligned(reinterpret_cast<std::uintptr_t>(buffer)) &&
                                          IsAligned(count) && IsAligned(position));
  }
  // Reads [alignedStart, alignedEnd) into the bounce buffer and returns the
  // driver's result.
  FileResult FillBounce(std::uint64_t alignedStart, std::uint64_t alignedEnd);
};

std::byte* BlockAlignedBuffer::Reserve(std::uint64_t bytes) {
  if (bytes <= capacity_) return data_;
  if (bytes > std::numeric_limits<std::size_t>::max() - kBlock) throw std::bad_alloc();
  raw_.reset();
  data_ = nullptr;
  capacity_ = 0;
  raw_.reset(new std::byte[static_cast<std::size_t>(bytes + kBlock)]);
  const auto raw = reinterpret_cast<std::uintptr_t>(raw_.get());
  data_ = raw_.get() + (kBlock - (raw & kBlockMask));
  capacity_ = bytes;
  return data_;
}

FileResult PlatformAudioFile::Impl::FillBounce(std::uint64_t alignedStart,
                                               std::uint64_t alignedEnd) {
  std::byte* const bounce = bounce_.Reserve(alignedEnd - alignedStart);
  if (const FileStatus status = driver_->SetFilePointer(alignedStart); status != kFileOK)
    return {status, 0};
  return driver_->Read(bounce, alignedEnd - alignedStart);
}

FileResult PlatformAudioFile::Impl::Read(void* buffer, std::uint64_t count,
                                         std::optional<std::uint64_t> at) {
  if (!driver_) return {kFileParamErr, 0};
  const std::uint64_t position = at.value_or(position_);
  if (!FitsInOffsets(position, count)) return {kFileParamErr, 0};
  if (Direct(buffer, count, position)) {
    if (const FileStatus status = driver_->SetFilePointer(position); status != kFileOK)
      return {status, 0};
    const FileResult result = driver_->Read(buffer, count);
    position_ = position + static_cast<std::uint64_t>(result.bytes);
    return result;
  }
  const std::uint64_t end = position + count;
  const std::uint64_t alignedStart = position & ~kBlockMask;
  const std::uint64_t alignedEnd = (end + kBlockMask) & ~kBlockMask;
  FileResult result = FillBounce(alignedStart, alignedEnd);
  // What arrived is [alignedStart, readEnd); the caller gets its overlap with
  // [position, end). Only valid bytes are copied.
  const std::uint64_t readEnd = alignedStart + static_cast<std::uint64_t>(result.bytes);
  const std::uint64_t validEnd = std::min(end, readEnd);
  const std::uint64_t valid = validEnd > position ? validEnd - position : 0;
  if (valid != 0)
    std::memcpy(buffer, bounce_.Data() + (position - alignedStart),
                static_cast<std::size_t>(valid));
  position_ = position + valid;
  // The end of the file inside the last block is no error of this read.
  if (result.status == kFileEOFErr && valid == count) result.status = kFileOK;
  result.bytes = static_cast<std::int64_t>(valid);
  return result;
}

FileStatus PlatformAudioFile::Impl::Write(const void* buffer, std::uint64_t count,
                                          std::optional<std::uint64_t> at) {
  if (!driver_) return kFileParamErr;
  const std::uint64_t position = at.value_or(position_);
  if (!FitsInOffsets(position, count)) return kFileParamErr;
  const std::uint64_t newEnd = position + count;
  if (count == 0) {  // nothing to move: above all, no block to pad the file with
    position_ = position;
    return kFileOK;
  }
  if (Direct(buffer, count, position)) {
    if (const FileStatus status = driver_->SetFilePointer(position); status != kFileOK)
      return status;
    const FileStatus status = driver_->Write(buffer, count);
    if (status == kFileOK) position_ = newEnd;
    return status;
  }
  const std::uint64_t alignedStart = position & ~kBlockMask;
  const std::uint64_t alignedEnd = (newEnd + kBlockMask) & ~kBlockMask;
  // When the pre-read met the end of the file: where the file ended.
  std::optional<std::uint64_t> oldEnd;
  std::byte* const bounce = bounce_.Reserve(alignedEnd - alignedStart);
  if (alignedStart != position || alignedEnd != newEnd) {
    // Read-modify-write of the partial blocks at either edge.
    const FileResult pre = FillBounce(alignedStart, alignedEnd);
    if (pre.status == kFileEOFErr) {
      oldEnd = alignedStart + static_cast<std::uint64_t>(pre.bytes);
      // Filler past the end of the file reads as zeros, as a hole would.
      std::memset(bounce + pre.bytes, 0,
                  static_cast<std::size_t>(alignedEnd - alignedStart -
                                           static_cast<std::uint64_t>(pre.bytes)));
    } else if (pre.status != kFileOK) {
      return pre.status;
    }
  }
  std::memcpy(bounce + (position - alignedStart), buffer, static_cast<std::size_t>(count));
  if (const FileStatus status = driver_->SetFilePointer(alignedStart); status != kFileOK)
    return status;
  if (const FileStatus status = driver_->Write(bounce, alignedEnd - alignedStart);
      status != kFileOK)
    return status;
  // The filler of the last block must not lengthen the file (nor may a
  // write that ends inside the file's last block shorten it).
  if (oldEnd) {
    if (const FileStatus status = driver_->SetFileSize(std::max(newEnd, *oldEnd));
        status != kFileOK)
      return status;
  }
  position_ = newEnd;
  return kFileOK;
}

namespace {

// One queued asynchronous read; the job owns it.
struct ASyncReadParams {
  void* mBuffer = nullptr;
  std::uint64_t mPosition = 0;
  std::uint64_t mCount = 0;
  PlatformAudioFile::Completion mCompletion;
  std::shared_ptr<PlatformAudioFile::Impl> mFile;
};

}  // namespace

PlatformAudioFile::PlatformAudioFile(const FileSpecification& file, bool writable,
                                     PlatformFileOptions options)
    : impl_(std::make_shared<Impl>(std::make_shared<PlatformFileDriver>(file, writable, options))) {
}

PlatformAudioFile::PlatformAudioFile(std::shared_ptr<IFileDriver> driver)
    : impl_(std::make_shared<Impl>(std::move(driver))) {}

PlatformAudioFile::~PlatformAudioFile() = default;

FileResult PlatformAudioFile::SyncRead(void* buffer, std::uint64_t count,
                                       std::optional<std::uint64_t> position) {
  return impl_->Read(buffer, count, position);
}

FileStatus PlatformAudioFile::SyncWrite(const void* buffer, std::uint64_t count,
                                        std::optional<std::uint64_t> position) {
  return impl_->Write(buffer, count, position);
}

void PlatformAudioFile::AsyncRead(void* buffer, std::uint64_t position, std::uint64_t count,
                                  Completion completion) {
  auto params = std::make_shared<ASyncReadParams>();
  params->mBuffer = buffer;
  params->mPosition = position;
  params->mCount = count;
  params->mCompletion = std::move(completion);
  params->mFile = impl_;
  (void)Singleton<ReaderThread>::Instance().Get().Post([params] {
    FileResult result{kFileParamErr, 0};
    if (params->mCount <= std::uint64_t(std::numeric_limits<std::int32_t>::max()))
      result = params->mFile->Read(params->mBuffer, params->mCount, params->mPosition);
    params->mCompletion(result.status, static_cast<std::int32_t>(result.bytes));
  });
}

bool PlatformAudioFile::IsReaderThread() {
  return Singleton<ReaderThread>::Instance().Get().IsCurrent();
}

std::uint64_t PlatformAudioFile::GetPosition() const noexcept { return impl_->position_; }

void PlatformAudioFile::SetPosition(std::uint64_t position) noexcept {
  impl_->position_ = position;
}

FileResult PlatformAudioFile::GetSize() {
  if (!impl_->driver_) return {kFileParamErr, 0};
  return impl_->driver_->GetFileSize();
}

FileStatus PlatformAudioFile::SetSize(std::uint64_t bytes) {
  if (!impl_->driver_) return kFileParamErr;
  return impl_->driver_->SetFileSize(bytes);
}

FileStatus PlatformAudioFile::Flush() {
  if (!impl_->driver_) return kFileParamErr;
  return impl_->driver_->Flush();
}

bool PlatformAudioFile::NeedsAlignment() const noexcept {
  return impl_->driver_ && impl_->driver_->NeedsAlignment();
}

}  // namespace tarn
