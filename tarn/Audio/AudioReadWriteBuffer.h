// AudioReadWriteBuffer: a block of non-interleaved float audio, one array
// per channel (at most 12), that readers and writers pass around. It either
// owns its arrays (allocated zeroed, freed with the block) or borrows them
// from the caller or a host render-cache buffer.
//
// AudioReadWriteBufferCache: a time-ordered run of shared blocks, so that a
// channel's samples can be read back by time and old blocks released.
//
//   AudioReadWriteBufferCache cache;
//   cache.addData(0, std::make_shared<AudioReadWriteBuffer>(2, 100));
//   cache.addData(100, std::make_shared<AudioReadWriteBuffer>(2, 100));
//   int got = cache.readChannelData(dest, 0, 50, 150);  // 150: crosses blocks
//   cache.flushUpTo(100);                               // releases the first
//
// Neither class is locked; the owning reader or writer serialises access.
#pragma once

#include <array>
#include <cstdint>
#include <deque>
#include <memory>

#include "tarn/Time/SampleCount.h"

namespace tarn {

// The host's render-cache buffer, as far as the library reads it.
struct PavRenderCacheBuffer {
  std::int32_t length = 0;  // frames per channel
  std::uint32_t flags = 0;  // bit 0: the data is silence
  std::int32_t channelCount = 0;
  bool hasData = false;  // the channel pointers below are valid
  float* channels[12] = {};
};

class AudioReadWriteBuffer {
 public:
  static constexpr int kMaxChannels = 12;
  static constexpr std::uint32_t kSilentFlag = 1;

  // Owning: one zeroed array of `length` floats per channel; silent.
  // Channel counts outside 0..12 and negative lengths are parameter errors
  // (-50); allocation failure throws std::bad_alloc.
  AudioReadWriteBuffer(int channels, std::int32_t length);
  // Borrowing the first `channels` of the given arrays.
  AudioReadWriteBuffer(int channels, std::int32_t length, bool isSilent, float* const* arrays);
  // Borrows the host's arrays when it carries data (silent per its flag bit
  // 0), otherwise owns zeroed arrays and is silent.
  explicit AudioReadWriteBuffer(const PavRenderCacheBuffer& host);
  AudioReadWriteBuffer(const AudioReadWriteBuffer&) = delete;
  AudioReadWriteBuffer& operator=(const AudioReadWriteBuffer&) = delete;
  ~AudioReadWriteBuffer();

  [[nodiscard]] std::int32_t GetDataLen() const noexcept { return length_; }
  [[nodiscard]] int GetNumChans() const noexcept { return channelCount_; }
  [[nodiscard]] bool IsSilent() const noexcept { return isSilent_; }
  void SetIsSilent(bool silent) noexcept { isSilent_ = silent; }
  [[nodiscard]] bool OwnsData() const noexcept { return ownsData_; }
  // The channel's array; null for channels at or above the channel count.
  [[nodiscard]] float* operator[](int channel) const noexcept { return channels_[channel]; }

 private:
  void AllocateOwned();

  std::int32_t length_;
  bool isSilent_;
  bool ownsData_;
  std::int8_t channelCount_;
  std::array<float*, kMaxChannels> channels_{};
};

class AudioReadWriteBufferCache {
 public:
  AudioReadWriteBufferCache() = default;
  AudioReadWriteBufferCache(const AudioReadWriteBufferCache&) = default;
  AudioReadWriteBufferCache& operator=(const AudioReadWriteBufferCache&) = default;
  ~AudioReadWriteBufferCache() = default;

  // Inserts in start order (after blocks with the same start). Callers add
  // contiguous blocks; gaps are not filled and overlaps are not skipped.
  void addData(SampleCount start, std::shared_ptr<AudioReadWriteBuffer> block);
  // The first block's start, or 2^48 - 1 when empty.
  [[nodiscard]] SampleCount getStart() const noexcept;
  // The last block's end, or -(2^48 - 1) when empty.
  [[nodiscard]] SampleCount getEnd() const noexcept;
  // Releases blocks from the front while t is at or past their end.
  void flushUpTo(SampleCount t);
  // Copies up to `count` samples of `channel` from `start` on; returns how
  // many were copied. A time before the first block reads from its
  // beginning. A channel outside 0..11, or one a block does not carry, is a
  // parameter error (-50).
  int readChannelData(float* destination, int channel, SampleCount start, int count) const;
  [[nodiscard]] std::size_t size() const noexcept { return entries_.size(); }

 private:
  struct Entry {
    SampleCount start;
    std::shared_ptr<AudioReadWriteBuffer> block;
  };
  std::deque<Entry> entries_;  // ascending start
};

}  // namespace tarn
