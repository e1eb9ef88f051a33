// MultiBuffer: a pool of 32768-sample float blocks that together hold one
// continuous, growing span [start, end) of a single channel.
//
// A block's index moves free -> being filled -> filled -> popped -> free.
// Filled block k covers [start + 32768k, start + 32768(k + 1)). A producer
// fills blocks ahead while a consumer reads spans, which may cross one block
// boundary (joined in a scratch block). Not locked: the reader or writer that
// owns the pool serialises access.
//
//   MultiBuffer pool(4);
//   pool.SetTime(0);
//   SampleBuffer* b;
//   while (pool.AllocateBuffer(b)) { Fill(*b); pool.BufferIsFilled(); }
//   const float* p = pool.MakeBufferPointer(from, to, from);  // may cross a block
//   pool.PopAndFreeBuffer();
#pragma once

#include <cstdint>
#include <deque>
#include <memory>
#include <vector>

#include "tarn/Audio/SampleBuffer.h"
#include "tarn/Time/SampleCount.h"

namespace tarn {

// A class that can check its own invariants (a debugging aid).
template <class Derived>
class Invariable {
 public:
  Invariable() = default;
  Invariable(const Invariable&) = default;
  Invariable& operator=(const Invariable&) = default;
  virtual ~Invariable() = default;
  [[nodiscard]] virtual bool Invariant() const = 0;
};

class MultiBuffer : public Invariable<MultiBuffer> {
 public:
  static constexpr std::int32_t kBlockLength = 32768;

  // The scratch block and `blocks` free blocks. Throws std::bad_alloc when
  // the scratch block or the table cannot be allocated.
  explicit MultiBuffer(int blocks);
  MultiBuffer(const MultiBuffer& other);
  MultiBuffer& operator=(const MultiBuffer& other);
  ~MultiBuffer() override;

  // Appends n free blocks; false when any block could not be allocated (its
  // table entry stays null and is never handed out).
  bool ExpandCapacity(int n);

  // Block life cycle; each returns false, changing nothing, when its source
  // queue is empty.
  bool AllocateBuffer(SampleBuffer*& block);  // oldest free -> being filled
  bool BufferIsFilled();                      // oldest being filled -> filled; end += its size
  bool AllocateUninitializedBuffer();         // both of the above
  bool PopBuffer(SampleBuffer*& block);       // oldest filled -> popped; start += its size
  bool FreeBuffer();                          // oldest popped -> free
  bool PopAndFreeBuffer();

  // The start time a PopBuffer would leave.
  [[nodiscard]] SampleCount StartTimeAfterPop() const noexcept;
  // The k-th filled block, or block (t - start) / 32768 (the grid slot of t,
  // even past a truncated end); null when there is no such filled block.
  [[nodiscard]] SampleBuffer* GetInUseBuffer(int k) const noexcept;
  [[nodiscard]] SampleBuffer* GetInUseBuffer(SampleCount t) const noexcept;

  // When [from, to) lies in one filled block: the address of sample `at` in
  // it; otherwise null.
  [[nodiscard]] float* GetBufferPointer(SampleCount from, SampleCount to, SampleCount at) noexcept;
  [[nodiscard]] const float* GetBufferPointer(SampleCount from, SampleCount to,
                                              SampleCount at) const noexcept;
  // Joins [from, to) from its two filled blocks in the scratch block and
  // returns the scratch address of sample `at`. A span of more than 32768
  // samples, one crossing more than one boundary, one outside the filled
  // span, or `at` outside [from, to] is refused with a parameter error (-50).
  float* MakeBufferPointer(SampleCount from, SampleCount to, SampleCount at);
  const float* MakeBufferPointer(SampleCount from, SampleCount to, SampleCount at) const;

  // Ends the span at `end` and sets the at-end flag: keeps the filled blocks
  // that hold [start, end), trims the last one, frees the rest.
  void Truncate(SampleCount end);
  void SetTime(SampleCount t) noexcept;  // start = end = t
  [[nodiscard]] SampleCount GetStartTime() const noexcept { return start_; }
  [[nodiscard]] SampleCount GetEndTime() const noexcept { return end_; }
  [[nodiscard]] bool AtEnd() const noexcept { return atEnd_; }

  // The sample at time t; t outside [start, end) is a parameter error (-50).
  float& operator[](SampleCount t);
  const float& operator[](SampleCount t) const;

  // Every index is in exactly one queue; the filled blocks cover [start, end).
  [[nodiscard]] bool Invariant() const override;

 private:
  [[nodiscard]] std::int64_t BlockOf(SampleCount t) const noexcept;
  const float* Join(SampleCount from, SampleCount to, SampleCount at) const;
  void Release(std::int32_t index) noexcept;  // back to the free queue, full size

  // Invariant: |free| + |filling| + |filled| + |popped| == number of non-null
  // table entries, and sum of filled sizes == end - start.
  std::vector<std::unique_ptr<SampleBuffer>> table_;
  std::unique_ptr<SampleBuffer> scratch_;
  std::deque<std::int32_t> free_;
  std::deque<std::int32_t> filling_;
  std::deque<std::int32_t> filled_;
  std::deque<std::int32_t> popped_;
  SampleCount start_;
  SampleCount end_;
  bool atEnd_ = false;
};

}  // namespace tarn
