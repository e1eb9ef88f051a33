#pragma once

// CircularBuffer: a lock-free ring of fixed-size records for exactly one
// producer thread and one consumer thread, usable from real-time callbacks
// (no locks, no allocation after construction, no system calls).
//
// Both sides work through transactions: records written in a WriteTransaction
// become visible to the consumer only at Commit (all at once); records read in
// a ReadTransaction are released to the producer only at Commit. Abort rewinds
// the transaction to its last commit and leaves the buffer unchanged.
//
//   // producer thread
//   CircularBuffer::WriteTransaction w(buffer);
//   if (buffer.WriteRecord(w, noteOn) && buffer.WriteRecord(w, noteOff)) buffer.Commit(w);
//   else buffer.Abort(w);                    // both records or neither
//
//   // consumer thread
//   CircularBuffer::ReadTransaction r(buffer);
//   for (Event e; buffer.ReadRecord(r, e);) Play(e);
//   buffer.Commit(r);                        // frees the slots for the producer
//
// Threads: Write, Commit/Abort of a WriteTransaction and IsFull belong to the
// producer; Read, Snoop, Commit/Abort of a ReadTransaction, SetEmpty and
// CopyAndResize to the consumer. IsEmpty may be asked by either side.
// A buffer of capacity n holds at most n records (one slot stays empty).

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <memory>
#include <new>
#include <type_traits>

#include "tarn/Errors/TarnAssert.h"

namespace tarn {

class alignas(64) CircularBuffer {
 public:
  // A cursor of the consumer: the working position and the position saved at
  // the last commit. Begins at the buffer's committed read pointer.
  class ReadTransaction {
   public:
    explicit ReadTransaction(const CircularBuffer& buffer) noexcept
        : fWorking(buffer.fRead.load(std::memory_order_relaxed)), fSaved(fWorking) {}
    ReadTransaction(const ReadTransaction&) = default;
    ReadTransaction& operator=(const ReadTransaction&) = default;
    ~ReadTransaction() = default;

   private:
    friend class CircularBuffer;
    char* fWorking;
    char* fSaved;
  };

  // A cursor of the producer. Begins at the buffer's committed write pointer.
  class WriteTransaction {
   public:
    explicit WriteTransaction(const CircularBuffer& buffer) noexcept
        : fWorking(buffer.fWrite.load(std::memory_order_relaxed)), fSaved(fWorking) {}
    WriteTransaction(const WriteTransaction&) = default;
    WriteTransaction& operator=(const WriteTransaction&) = default;
    ~WriteTransaction() = default;

   private:
    friend class CircularBuffer;
    char* fWorking;
    char* fSaved;
  };

  // Throws TarnError -50 when recordSize < 1 or capacity + 1, taken as a
  // 16-bit signed number, is below 2; -108 when the storage cannot be had.
  CircularBuffer(int32_t recordSize, int16_t capacity);
  // A copy shares the original's storage and does not own it: only the
  // original's destructor frees it, so the original must outlive its copies.
  CircularBuffer(const CircularBuffer& other) noexcept;
  CircularBuffer& operator=(const CircularBuffer&) = delete;
  virtual ~CircularBuffer();

  // Producer: false when full; else copies one record from source into the
  // transaction's working slot and advances it.
  bool Write(WriteTransaction& t, const void* source) noexcept {
    char* const at = t.fWorking;
    char* const next = BumpPtr(at);
    if (!HasRoomBefore(next)) return false;
    CopyRecord(at, source);
    t.fWorking = next;
    return true;
  }
  // Consumer: false when empty; else copies one record into destination.
  bool Read(ReadTransaction& t, void* destination) noexcept {
    char* const at = t.fWorking;
    if (!HasRecordAt(at)) return false;
    char* const next = BumpPtr(at);
    CopyRecord(destination, at);
    t.fWorking = next;
    return true;
  }
  // Typed forms of Write and Read for a trivially copyable T whose size is
  // the record size: the copy is a typed load or store of known size. Slots
  // are aligned for any T whose size is the record size.
  template <class T>
  bool WriteRecord(WriteTransaction& t, const T& record) noexcept {
    static_assert(std::is_trivially_copyable_v<T>);
    if (sizeof(T) != static_cast<std::size_t>(fRecordSize)) [[unlikely]]
      RecordSizeMismatch();
    char* const at = t.fWorking;
    char* const next = BumpPtr(at);
    if (!HasRoomBefore(next)) return false;
    ::new (static_cast<void*>(at)) T(record);  // a typed store: no char aliasing
    t.fWorking = next;
    return true;
  }
  template <class T>
  bool ReadRecord(ReadTransaction& t, T& record) noexcept {
    static_assert(std::is_trivially_copyable_v<T>);
    if (sizeof(T) != static_cast<std::size_t>(fRecordSize)) [[unlikely]]
      RecordSizeMismatch();
    char* const at = t.fWorking;
    if (!HasRecordAt(at)) return false;
    char* const next = BumpPtr(at);
    record = *std::launder(reinterpret_cast<const T*>(at));
    t.fWorking = next;
    return true;
  }

  // Consumer: the next record in place (no copy), or null when empty. The
  // record stays valid until the read side commits past it.
  [[nodiscard]] const void* Snoop(ReadTransaction& t) noexcept {
    char* const at = t.fWorking;
    if (!HasRecordAt(at)) return nullptr;
    t.fWorking = BumpPtr(at);
    return at;
  }

  // Publishes the transaction's records (write) or frees their slots (read).
  void Commit(WriteTransaction& t) noexcept {
    char* const at = t.fWorking;
    t.fSaved = at;
    fWrite.store(at, std::memory_order_release);
  }
  void Commit(ReadTransaction& t) noexcept {
    char* const at = t.fWorking;
    t.fSaved = at;
    fRead.store(at, std::memory_order_release);
  }
  // Rewinds the transaction to its last commit.
  void Abort(WriteTransaction& t) noexcept { t.fWorking = t.fSaved; }
  void Abort(ReadTransaction& t) noexcept { t.fWorking = t.fSaved; }

  [[nodiscard]] bool IsEmpty() const noexcept;
  [[nodiscard]] bool IsFull() const noexcept;
  // Consumer: discards everything committed and unread.
  void SetEmpty() noexcept;

  [[nodiscard]] int32_t GetRecordSize() const noexcept { return fRecordSize; }
  [[nodiscard]] int32_t GetCapacity() const noexcept;

  // Consumer: a new heap buffer of the same record size and newCapacity,
  // holding this buffer's unread records, oldest first. When the new buffer
  // fills up, the record that was taken out for it is dropped and the rest
  // stay unread here (that one record is lost). Returns null when the scratch
  // record cannot be allocated; throws as the constructor does.
  [[nodiscard]] std::unique_ptr<CircularBuffer> CopyAndResize(int16_t newCapacity);

 protected:
  [[nodiscard]] bool CanRead(const ReadTransaction& t) noexcept { return HasRecordAt(t.fWorking); }
  [[nodiscard]] bool CanWrite(const WriteTransaction& t) noexcept {
    return HasRoomBefore(BumpPtr(t.fWorking));
  }
  void ReadImplementation(ReadTransaction& t, void* destination) noexcept {
    CopyRecord(destination, t.fWorking);
    t.fWorking = BumpPtr(t.fWorking);
  }
  void WriteImplementation(WriteTransaction& t, const void* source) noexcept {
    CopyRecord(t.fWorking, source);
    t.fWorking = BumpPtr(t.fWorking);
  }
  // The wrap is a select, not a branch: with a branch, a producer and a
  // consumer on two cores settle into a lock-step where every record moves
  // cache lines between them (8-byte records ran eight times slower).
  [[nodiscard]] char* BumpPtr(char* p) const noexcept {
    const std::ptrdiff_t span = fEnd - fStart;
    const std::ptrdiff_t next = (p - fStart) + fRecordSize;
    return fStart + (next >= span ? next - span : next);
  }

 private:
  static constexpr std::size_t kLine = 64;

  // The empty and full tests look at the cached sight of the other side's
  // pointer first and reload it only when that says empty or full. Callers
  // read everything they need before copying: the copy goes through char
  // storage, which the compiler must assume may alias the pointers.
  [[nodiscard]] bool HasRecordAt(const char* at) noexcept {
    if (at != fWriteSeenByConsumer) return true;
    fWriteSeenByConsumer = fWrite.load(std::memory_order_acquire);
    return at != fWriteSeenByConsumer;
  }
  [[nodiscard]] bool HasRoomBefore(const char* next) noexcept {
    if (next != fReadSeenByProducer) return true;
    fReadSeenByProducer = fRead.load(std::memory_order_acquire);
    return next != fReadSeenByProducer;
  }
  void CopyRecord(void* to, const void* from) const noexcept {
    std::memcpy(to, from, static_cast<std::size_t>(fRecordSize));
  }

  // Reports a typed access whose type does not have the record size to the
  // assertion handler and ends the process (it would run past the slot).
  [[noreturn]] static void RecordSizeMismatch() noexcept;

  // Checks the invariants below; called off the per-record paths (at
  // construction, SetEmpty and CopyAndResize).
  void AssertInvariants() const noexcept;

  // Invariants (n = (fEnd - fStart) / fRecordSize slots, capacity = n - 1):
  //   fStart <= fRead, fWrite < fEnd and both are multiples of fRecordSize
  //   from fStart; readable = (fWrite - fRead) mod (n * fRecordSize)
  //   / fRecordSize, and 0 <= readable <= n - 1: fRead == fWrite is empty,
  //   BumpPtr(fWrite) == fRead is full.
  char* fStart;
  char* fEnd;
  int32_t fRecordSize;
  bool fOwnsStorage;

  // Producer's line: the committed write pointer (stored only by the
  // producer) and the producer's last sight of fRead. The cached value never
  // runs ahead of fRead, so a full test against it is conservative.
  alignas(kLine) std::atomic<char*> fWrite;
  char* fReadSeenByProducer;

  // Consumer's line: the committed read pointer (stored only by the
  // consumer) and its last sight of fWrite (never ahead of fWrite).
  alignas(kLine) std::atomic<char*> fRead;
  char* fWriteSeenByConsumer;
};

}  // namespace tarn
