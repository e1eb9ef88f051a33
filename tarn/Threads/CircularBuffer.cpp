#include "tarn/Threads/CircularBuffer.h"

#include <cstdlib>
#include <cstring>
#include <new>

#include "tarn/Errors/Fail.h"
#include "tarn/Errors/TarnAssert.h"

namespace tarn {

namespace {
constexpr std::align_val_t kStorageAlignment{64};
}  // namespace

CircularBuffer::CircularBuffer(int32_t recordSize, int16_t capacity)
    : fStart(nullptr), fEnd(nullptr), fRecordSize(recordSize), fOwnsStorage(true) {
  // One slot always stays empty; the slot count is a 16-bit quantity.
  const auto slots = static_cast<int16_t>(capacity + 1);
  if (recordSize < 1 || slots < 1) FailOSErr(-50);
  const std::size_t bytes = static_cast<std::size_t>(recordSize) * static_cast<std::size_t>(slots);
  // Cache-line aligned, so that a record whose size is a multiple of the line
  // never shares a line with its neighbours (the producer writes one while the
  // consumer reads the other).
  fStart = static_cast<char*>(::operator new[](bytes, kStorageAlignment, std::nothrow));
  if (fStart == nullptr) FailMemFullError();
  std::memset(fStart, 0, bytes);
  fEnd = fStart + bytes;
  fWrite.store(fStart, std::memory_order_relaxed);
  fRead.store(fStart, std::memory_order_relaxed);
  fReadSeenByProducer = fStart;
  fWriteSeenByConsumer = fStart;
  AssertInvariants();
}

CircularBuffer::CircularBuffer(const CircularBuffer& other) noexcept
    : fStart(other.fStart),
      fEnd(other.fEnd),
      fRecordSize(other.fRecordSize),
      fOwnsStorage(false),
      fWrite(other.fWrite.load(std::memory_order_acquire)),
      fReadSeenByProducer(other.fStart),
      fRead(other.fRead.load(std::memory_order_acquire)),
      fWriteSeenByConsumer(other.fStart) {
  fReadSeenByProducer = fRead.load(std::memory_order_relaxed);
  fWriteSeenByConsumer = fWrite.load(std::memory_order_relaxed);
}

CircularBuffer::~CircularBuffer() {
  if (fOwnsStorage) ::operator delete[](fStart, kStorageAlignment);
}

void CircularBuffer::RecordSizeMismatch() noexcept {
  TARN_ASSERT_MSG(false, "CircularBuffer: record type size differs from the record size");
  std::abort();
}

void CircularBuffer::AssertInvariants() const noexcept {
  const char* read = fRead.load(std::memory_order_acquire);
  const char* write = fWrite.load(std::memory_order_acquire);
  TARN_ASSERT(fStart < fEnd && (fEnd - fStart) % fRecordSize == 0);
  TARN_ASSERT(read >= fStart && read < fEnd && (read - fStart) % fRecordSize == 0);
  TARN_ASSERT(write >= fStart && write < fEnd && (write - fStart) % fRecordSize == 0);
}

int32_t CircularBuffer::GetCapacity() const noexcept {
  return static_cast<int32_t>((fEnd - fStart) / fRecordSize) - 1;
}

bool CircularBuffer::IsEmpty() const noexcept {
  return fRead.load(std::memory_order_acquire) == fWrite.load(std::memory_order_acquire);
}

bool CircularBuffer::IsFull() const noexcept {
  return BumpPtr(fWrite.load(std::memory_order_relaxed)) == fRead.load(std::memory_order_acquire);
}

void CircularBuffer::SetEmpty() noexcept {
  fWriteSeenByConsumer = fWrite.load(std::memory_order_acquire);
  fRead.store(fWriteSeenByConsumer, std::memory_order_release);
  AssertInvariants();
}

std::unique_ptr<CircularBuffer> CircularBuffer::CopyAndResize(int16_t newCapacity) {
  auto copy = std::make_unique<CircularBuffer>(fRecordSize, newCapacity);
  std::unique_ptr<char[]> scratch(new (std::nothrow) char[static_cast<std::size_t>(fRecordSize)]);
  if (!scratch) return nullptr;

  ReadTransaction from(*this);
  WriteTransaction to(*copy);
  while (Read(from, scratch.get())) {
    // The record just taken out is dropped when the new buffer is full.
    if (!copy->Write(to, scratch.get())) break;
  }
  copy->Commit(to);
  Commit(from);
  AssertInvariants();
  copy->AssertInvariants();
  return copy;
}

}  // namespace tarn
