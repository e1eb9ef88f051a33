// Helpers of the reader/writer chain tests: in-memory stand-ins for the
// file layer's interleaved reader and writer, and sample tables.
#pragma once

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <future>
#include <memory>
#include <vector>

#include "Audio/AudioTestUtil.h"
#include "TestSupport.h"
#include "tarn/Audio/AsyncAudioReader.h"
#include "tarn/Audio/InterAudioWriter.h"
#include "tarn/Errors/Fail.h"
#include "tarn/Errors/TarnError.h"
#include "tarn/FileSystem/FileSpecification.h"
#include "tarn/String/UString.h"

namespace tarn::test {

inline AudioFormat Format(SampleFormat f, int channels, double rate = 48000.0) {
  AudioFormat a;
  a.mSampleFormat = f;
  a.mNumChannels = static_cast<std::int16_t>(channels);
  a.mSampleRate = rate;
  return a;
}

// Interleaved frames held in memory. `delivered` frames (all by default)
// are really there: reads past them come up short with status -39, as a
// file cut short does. Asynchronous reads complete on a thread of their own.
class MemoryReader final : public AsyncAudioReader {
 public:
  MemoryReader(AudioFormat format, Bytes frames, std::int64_t delivered = -1)
      : format_(format), bytes_(std::move(frames)) {
    length_ = static_cast<std::int64_t>(bytes_.size()) / GetBytesPerFrame();
    delivered_ = delivered < 0 ? length_ : delivered;
  }
  ~MemoryReader() override {
    if (pending_.valid()) pending_.wait();
  }

  AudioFormat GetFormat() const override { return format_; }
  HostChannelOrder GetChannelOrder() const override {
    return HostChannelOrder::ForChannelCount(format_.mNumChannels);
  }
  SampleCount GetLengthInFrames() const override { return length_; }
  SampleCount Read(void* buffer, SampleCount frames) override {
    const SampleCount got = OutOfOrderRead(buffer, position_, frames);
    position_ += got;
    return got;
  }
  SampleCount GetReadPosition() const override { return position_; }
  void SetReadPosition(SampleCount frame) override {
    position_ = std::clamp<std::int64_t>(frame.AsLongLong(), 0, length_);
  }
  SampleCount OutOfOrderRead(void* buffer, SampleCount start, SampleCount frames) override {
    ++reads;
    const std::int64_t s = std::max<std::int64_t>(start.AsLongLong(), 0);
    const std::int64_t n =
        std::clamp<std::int64_t>(std::min(frames.AsLongLong(), delivered_ - s), 0, LLONG_MAX);
    std::memcpy(buffer, bytes_.data() + s * GetBytesPerFrame(),
                static_cast<std::size_t>(n * GetBytesPerFrame()));
    return n;
  }
  void OutOfOrderReadAsync(void* buffer, SampleCount start, SampleCount frames,
                           Completion completion) override {
    if (pending_.valid()) pending_.wait();
    pending_ = std::async(std::launch::async, [=, this] {
      const SampleCount got = OutOfOrderRead(buffer, start, frames);
      completion(got < std::min(frames, SampleCount(length_) - start) ? -39 : 0, got);
    });
  }

  int reads = 0;

 private:
  AudioFormat format_;
  Bytes bytes_;
  std::int64_t length_ = 0;
  std::int64_t delivered_ = 0;
  SampleCount position_ = 0;
  std::future<void> pending_;
};

// Collects interleaved frames; with a block size it also offers a DiskAPI
// whose write position starts `headerBytes` into the file, and records the
// byte count of every Write.
class MemoryWriter final : public InterAudioWriter, public InterAudioWriter::DiskAPI {
 public:
  explicit MemoryWriter(AudioFormat format, int blockSize = 0, std::int64_t headerBytes = 0)
      : format_(format), blockSize_(blockSize), position_(headerBytes) {}

  AudioFormat GetFormat() const override { return format_; }
  void Write(const void* buffer, SampleCount frames) override {
    if (closed) tarn::FailOSErr(-50);
    const auto bytes = static_cast<std::size_t>(frames.AsLongLong() * GetBytesPerFrame());
    const auto* p = static_cast<const std::uint8_t*>(buffer);
    data.insert(data.end(), p, p + bytes);
    writes.push_back(static_cast<std::int64_t>(bytes));
    position_ += static_cast<std::int64_t>(bytes);
  }
  void Flush() override { ++flushes; }
  void Close() override { closed = true; }
  InterAudioWriter::DiskAPI* getDiskAPI() override { return blockSize_ > 0 ? this : nullptr; }

  int GetBlockSize() override { return blockSize_; }
  int GetBytesTillNextBlockBoundary() override {
    return blockSize_ - static_cast<int>(position_ % blockSize_);
  }
  std::int64_t GetUnFilledSpace() override { return 0; }
  bool ShouldExtendFile(SampleCount&, std::int64_t) override { return false; }
  void RawWrite(const void*, std::int64_t) override {}

  int GetBytesPerFrame() const {
    return GetBytesPerSample(format_.mSampleFormat) * format_.mNumChannels;
  }
  [[nodiscard]] std::int64_t Position() const { return position_; }

  Bytes data;
  std::vector<std::int64_t> writes;
  int flushes = 0;
  bool closed = false;

 private:
  AudioFormat format_;
  int blockSize_;
  std::int64_t position_;
};

// One stored sample and the float it stands for, per format; boundary
// values first (full scale, most negative, silence, one step).
struct SampleCase {
  Bytes bytes;
  float value;
};

inline std::vector<SampleCase> SampleTable(SampleFormat f) {
  auto le32 = [](std::uint32_t u) {
    return Bytes{static_cast<std::uint8_t>(u), static_cast<std::uint8_t>(u >> 8),
                 static_cast<std::uint8_t>(u >> 16), static_cast<std::uint8_t>(u >> 24)};
  };
  auto fl = [&](float v) {
    std::uint32_t u;
    std::memcpy(&u, &v, 4);
    return SampleCase{le32(u), v};
  };
  switch (f) {
    case kSamp8Offset:
      return {{{0x00}, -1.0f},
              {{0xFF}, 127.0f / 128},
              {{0x80}, 0.0f},
              {{0x81}, 1.0f / 128},
              {{0x7F}, -1.0f / 128}};
    case kSamp8:
      return {{{0x80}, -1.0f},
              {{0x7F}, 127.0f / 128},
              {{0x00}, 0.0f},
              {{0x01}, 1.0f / 128},
              {{0xFF}, -1.0f / 128}};
    case kSamp16:
      return {{{0x00, 0x80}, -1.0f},
              {{0xFF, 0x7F}, 32767.0f / 32768},
              {{0x00, 0x00}, 0.0f},
              {{0x01, 0x00}, 1.0f / 32768},
              {{0xFF, 0xFF}, -1.0f / 32768}};
    case kSamp24:
      return {{{0x00, 0x00, 0x80}, -1.0f},
              {{0xFF, 0xFF, 0x7F}, 8388607.0f / 8388608},
              {{0x00, 0x00, 0x00}, 0.0f},
              {{0x01, 0x00, 0x00}, 1.0f / 8388608},
              {{0xFF, 0xFF, 0xFF}, -1.0f / 8388608}};
    case kSampUnpacked24:
      return {{le32(0x80000000u), -1.0f},
              {le32(0x7FFFFF00u), 8388607.0f / 8388608},
              {le32(0), 0.0f},
              {le32(0x100u), 1.0f / 8388608},
              {le32(0xFFFFFF00u), -1.0f / 8388608}};
    case kSampFloat32:
      return {fl(-1.0f), fl(1.0f), fl(0.0f), fl(1.5f), fl(-0.25f)};
    default:
      return {{Bytes(8, 0x11), 0.0f}, {Bytes(8, 0xEE), 0.0f}};  // moved, never converted
  }
}

// What the sample converter makes of interleaved `frames` in format `from`,
// by the audio tests' independent model of it (no dither); the same format
// is copied.
inline Bytes Converted(SampleFormat from, SampleFormat to, const Bytes& frames) {
  return from == to ? frames : convref::ConvertRun(from, to, nullptr, frames);
}
// The file formats the chain converts to and from.
constexpr SampleFormat kConvertible[] = {kSamp8Offset, kSamp8,          kSamp16,
                                         kSamp24,      kSampUnpacked24, kSampFloat32};

// Interleaved frames whose sample (frame i, channel c) is table entry
// (i * 3 + c) % size, so neighbouring channels and frames differ.
inline std::size_t CaseIndex(std::int64_t frame, int channel, std::size_t size) {
  return static_cast<std::size_t>(frame * 3 + channel) % size;
}

inline Bytes MakeFrames(SampleFormat f, int channels, std::int64_t frames) {
  const auto table = SampleTable(f);
  Bytes out;
  for (std::int64_t i = 0; i < frames; ++i)
    for (int c = 0; c < channels; ++c) {
      const auto& b = table[CaseIndex(i, c, table.size())].bytes;
      out.insert(out.end(), b.begin(), b.end());
    }
  return out;
}

}  // namespace tarn::test
