#include "tarn/Audio/MultiBuffer.h"

#include <algorithm>
#include <new>
#include <utility>

#include "tarn/Errors/Fail.h"

namespace tarn {
namespace {

// The start time of every new block and of a pool before SetTime.
const SampleCount kDefaultTime{0};

constexpr std::int64_t kMaxInt32 = 2147483647;

std::int32_t ClampOffset(std::int64_t offset) noexcept {
  return static_cast<std::int32_t>(std::clamp<std::int64_t>(offset, 0, kMaxInt32));
}

template <class T>
bool TakeFront(std::deque<T>& from, std::deque<T>& to) {
  if (from.empty()) return false;
  to.push_back(from.front());
  from.pop_front();
  return true;
}

}  // namespace

MultiBuffer::MultiBuffer(int blocks)
    : scratch_(std::make_unique<SampleBuffer>(kBlockLength, kDefaultTime)),
      start_(kDefaultTime),
      end_(kDefaultTime) {
  ExpandCapacity(blocks);
}

MultiBuffer::MultiBuffer(const MultiBuffer& other)
    : scratch_(std::make_unique<SampleBuffer>(*other.scratch_)),
      free_(other.free_),
      filling_(other.filling_),
      filled_(other.filled_),
      popped_(other.popped_),
      start_(other.start_),
      end_(other.end_),
      atEnd_(other.atEnd_) {
  table_.reserve(other.table_.size());
  for (const auto& block : other.table_)
    table_.push_back(block ? std::make_unique<SampleBuffer>(*block) : nullptr);
}

MultiBuffer& MultiBuffer::operator=(const MultiBuffer& other) {
  if (this != &other) {
    MultiBuffer copy(other);
    std::swap(table_, copy.table_);
    std::swap(scratch_, copy.scratch_);
    std::swap(free_, copy.free_);
    std::swap(filling_, copy.filling_);
    std::swap(filled_, copy.filled_);
    std::swap(popped_, copy.popped_);
    start_ = copy.start_;
    end_ = copy.end_;
    atEnd_ = false;  // assigning a pool starts a new pass over the source
  }
  return *this;
}

MultiBuffer::~MultiBuffer() = default;

bool MultiBuffer::ExpandCapacity(int n) {
  bool allAllocated = true;
  for (int i = 0; i < n; ++i) {
    std::unique_ptr<SampleBuffer> block;
    try {
      block = std::make_unique<SampleBuffer>(kBlockLength, kDefaultTime);
    } catch (const std::bad_alloc&) {
      allAllocated = false;
    }
    const auto index = static_cast<std::int32_t>(table_.size());
    table_.push_back(std::move(block));
    if (table_.back()) free_.push_back(index);
  }
  return allAllocated;
}

bool MultiBuffer::AllocateBuffer(SampleBuffer*& block) {
  if (!TakeFront(free_, filling_)) return false;
  block = table_[filling_.back()].get();
  return true;
}

bool MultiBuffer::BufferIsFilled() {
  if (!TakeFront(filling_, filled_)) return false;
  SampleBuffer& block = *table_[filled_.back()];
  block.SetStartTime(end_);
  end_ += block.GetSize();
  return true;
}

bool MultiBuffer::AllocateUninitializedBuffer() {
  SampleBuffer* block = nullptr;
  return AllocateBuffer(block) && BufferIsFilled();
}

bool MultiBuffer::PopBuffer(SampleBuffer*& block) {
  if (!TakeFront(filled_, popped_)) return false;
  block = table_[popped_.back()].get();
  start_ += block->GetSize();
  return true;
}

bool MultiBuffer::FreeBuffer() {
  if (popped_.empty()) return false;
  Release(popped_.front());
  popped_.pop_front();
  return true;
}

bool MultiBuffer::PopAndFreeBuffer() {
  SampleBuffer* block = nullptr;
  return PopBuffer(block) && FreeBuffer();
}

void MultiBuffer::Release(std::int32_t index) noexcept {
  SampleBuffer& block = *table_[index];
  block.size_ = block.capacity_;
  block.SetStartTime(kDefaultTime);
  free_.push_back(index);
}

SampleCount MultiBuffer::StartTimeAfterPop() const noexcept {
  if (filled_.empty()) return start_;
  return start_ + table_[filled_.front()]->GetSize();
}

SampleBuffer* MultiBuffer::GetInUseBuffer(int k) const noexcept {
  if (k < 0 || static_cast<std::size_t>(k) >= filled_.size()) return nullptr;
  return table_[filled_[k]].get();
}

std::int64_t MultiBuffer::BlockOf(SampleCount t) const noexcept {
  return ((t - start_) / kBlockLength).AsLongLong();
}

SampleBuffer* MultiBuffer::GetInUseBuffer(SampleCount t) const noexcept {
  if (t < start_) return nullptr;
  const std::int64_t k = BlockOf(t);
  return k > kMaxInt32 ? nullptr : GetInUseBuffer(static_cast<int>(k));
}

const float* MultiBuffer::GetBufferPointer(SampleCount from, SampleCount to,
                                           SampleCount at) const noexcept {
  if (from < start_ || to <= from) return nullptr;
  const std::int64_t k = BlockOf(from);
  if (k != BlockOf(to - 1)) return nullptr;
  const SampleBuffer* block = GetInUseBuffer(from);
  if (block == nullptr) return nullptr;
  return block->GetData() + ClampOffset((at - start_).AsLongLong() - k * kBlockLength);
}

float* MultiBuffer::GetBufferPointer(SampleCount from, SampleCount to, SampleCount at) noexcept {
  return const_cast<float*>(std::as_const(*this).GetBufferPointer(from, to, at));
}

const float* MultiBuffer::Join(SampleCount from, SampleCount to, SampleCount at) const {
  // Refuse anything that would read outside the filled blocks or write past
  // the scratch block.
  if (to < from || (to - from) > kBlockLength || from < start_ || to > end_ || at < from || at > to)
    FailOSErr(kParamErr);
  if (to == from) return scratch_->GetData();
  const std::int64_t first = BlockOf(from);
  const std::int64_t last = BlockOf(to - 1);
  if (last - first > 1) FailOSErr(kParamErr);
  float* out = scratch_->GetData();
  const std::int64_t offset = (from - start_).AsLongLong() - first * kBlockLength;
  const std::int64_t inFirst =
      std::min<std::int64_t>((to - from).AsLongLong(), kBlockLength - offset);
  const SampleBuffer* a = GetInUseBuffer(static_cast<int>(first));
  std::copy_n(a->GetData() + offset, inFirst, out);
  if (last != first) {
    const SampleBuffer* b = GetInUseBuffer(static_cast<int>(last));
    std::copy_n(b->GetData(), (to - from).AsLongLong() - inFirst, out + inFirst);
  }
  return out + (at - from).AsLongLong();
}

const float* MultiBuffer::MakeBufferPointer(SampleCount from, SampleCount to,
                                            SampleCount at) const {
  return Join(from, to, at);
}

float* MultiBuffer::MakeBufferPointer(SampleCount from, SampleCount to, SampleCount at) {
  return const_cast<float*>(Join(from, to, at));
}

void MultiBuffer::Truncate(SampleCount end) {
  atEnd_ = true;
  end_ = end;
  const std::int64_t span = std::clamp<std::int64_t>((end - start_).AsLongLong(), 0, kMaxInt32);
  const std::size_t keep = static_cast<std::size_t>((span + kBlockLength - 1) / kBlockLength);
  while (filled_.size() > keep) {
    Release(filled_.back());
    filled_.pop_back();
  }
  if (keep > 0 && keep <= filled_.size())
    table_[filled_[keep - 1]]->size_ =
        static_cast<std::int32_t>(span - static_cast<std::int64_t>(keep - 1) * kBlockLength);
}

void MultiBuffer::SetTime(SampleCount t) noexcept { start_ = end_ = t; }

const float& MultiBuffer::operator[](SampleCount t) const {
  if (t < start_ || t >= end_) FailOSErr(kParamErr);
  const SampleBuffer* block = GetInUseBuffer(t);
  if (block == nullptr) FailOSErr(kParamErr);
  return (*block)[static_cast<std::int32_t>((t - start_).AsLongLong() % kBlockLength)];
}

float& MultiBuffer::operator[](SampleCount t) {
  return const_cast<float&>(std::as_const(*this)[t]);
}

bool MultiBuffer::Invariant() const {
  std::size_t live = 0;
  for (const auto& block : table_) live += block != nullptr;
  if (free_.size() + filling_.size() + filled_.size() + popped_.size() != live) return false;
  std::int64_t held = 0;
  for (std::int32_t index : filled_) held += table_[index]->GetSize();
  return atEnd_ || held == (end_ - start_).AsLongLong();
}

}  // namespace tarn
