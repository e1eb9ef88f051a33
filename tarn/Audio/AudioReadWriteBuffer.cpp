#include "tarn/Audio/AudioReadWriteBuffer.h"

#include <algorithm>

#include "tarn/Errors/Fail.h"
#include "tarn/Time/SampleCount.h"

namespace tarn {
namespace {

void CheckShape(int channels, std::int32_t length) {
  if (channels < 0 || channels > AudioReadWriteBuffer::kMaxChannels || length < 0)
    FailOSErr(kParamErr);
}

}  // namespace

AudioReadWriteBuffer::AudioReadWriteBuffer(int channels, std::int32_t length)
    : length_(length), isSilent_(true), ownsData_(true), channelCount_(0) {
  CheckShape(channels, length);
  channelCount_ = static_cast<std::int8_t>(channels);
  AllocateOwned();
}

AudioReadWriteBuffer::AudioReadWriteBuffer(int channels, std::int32_t length, bool isSilent,
                                           float* const* arrays)
    : length_(length), isSilent_(isSilent), ownsData_(false), channelCount_(0) {
  CheckShape(channels, length);
  channelCount_ = static_cast<std::int8_t>(channels);
  std::copy_n(arrays, channels, channels_.begin());
}

AudioReadWriteBuffer::AudioReadWriteBuffer(const PavRenderCacheBuffer& host)
    : length_(host.length), isSilent_(true), ownsData_(false), channelCount_(0) {
  CheckShape(host.channelCount, host.length);
  channelCount_ = static_cast<std::int8_t>(host.channelCount);
  if (host.hasData) {
    std::copy_n(host.channels, host.channelCount, channels_.begin());
    isSilent_ = (host.flags & kSilentFlag) != 0;
  } else {
    ownsData_ = true;
    AllocateOwned();
  }
}

void AudioReadWriteBuffer::AllocateOwned() {
  try {
    for (int c = 0; c < channelCount_; ++c) channels_[c] = new float[length_]();
  } catch (...) {
    for (float* p : channels_) delete[] p;
    throw;
  }
}

AudioReadWriteBuffer::~AudioReadWriteBuffer() {
  if (ownsData_)
    for (float* p : channels_) delete[] p;
}

void AudioReadWriteBufferCache::addData(SampleCount start,
                                        std::shared_ptr<AudioReadWriteBuffer> block) {
  if (!block) FailOSErr(kParamErr);
  auto at = std::upper_bound(entries_.begin(), entries_.end(), start,
                             [](SampleCount t, const Entry& e) { return t < e.start; });
  entries_.insert(at, Entry{start, std::move(block)});
}

SampleCount AudioReadWriteBufferCache::getStart() const noexcept {
  return entries_.empty() ? kLargestSampleCount : entries_.front().start;
}

SampleCount AudioReadWriteBufferCache::getEnd() const noexcept {
  if (entries_.empty()) return kSmallestSampleCount;
  return entries_.back().start + entries_.back().block->GetDataLen();
}

void AudioReadWriteBufferCache::flushUpTo(SampleCount t) {
  while (!entries_.empty() && t >= entries_.front().start + entries_.front().block->GetDataLen())
    entries_.pop_front();
}

int AudioReadWriteBufferCache::readChannelData(float* destination, int channel, SampleCount start,
                                               int count) const {
  if (entries_.empty() || count <= 0) return 0;
  if (channel < 0 || channel >= AudioReadWriteBuffer::kMaxChannels) FailOSErr(kParamErr);
  auto it = std::lower_bound(entries_.begin(), entries_.end(), start,
                             [](const Entry& e, SampleCount t) { return e.start < t; });
  if ((it == entries_.end() || it->start > start) && it != entries_.begin()) --it;
  std::int64_t offset = std::clamp<std::int64_t>((start - it->start).AsLongLong(), 0, 2147483647);
  int copied = 0;
  for (; it != entries_.end() && copied < count; ++it, offset = 0) {
    const AudioReadWriteBuffer& block = *it->block;
    const std::int64_t available = block.GetDataLen() - offset;
    if (available <= 0) continue;
    const float* source = channel < block.GetNumChans() ? block[channel] : nullptr;
    if (source == nullptr) FailOSErr(kParamErr);
    const int n = static_cast<int>(std::min<std::int64_t>(count - copied, available));
    std::copy_n(source + offset, n, destination + copied);
    copied += n;
  }
  return copied;
}

}  // namespace tarn
