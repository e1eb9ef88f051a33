// OutsideDecoder: sample-accurate positioning over the platform converter's
// block stream (OutsideDecoderImpl.h).
#include "tarn/Audio/OutsideDecoder.h"

#include <algorithm>
#include <cstring>
#include <exception>
#include <utility>

#include "tarn/Audio/OutsideDecoderImpl.h"
#include "tarn/Errors/Fail.h"
#include "tarn/Errors/TarnError.h"

namespace tarn {

namespace {

// Seeks tried, each reaching further back, before decoding from the start.
constexpr int kSeekAttempts = 4;

}  // namespace

OutsideDecoder::OutsideDecoder(const FileSpecification& file) : file_(file) {
  try {
    source_ = odimpl::OpenDecodeSource(file);
  } catch (const TarnError&) {
    throw;
  } catch (const std::exception& e) {
    Fail(e.what());
  } catch (...) {
    Fail("the file cannot be decoded");
  }
}

OutsideDecoder::OutsideDecoder(const FileSpecification& file,
                               std::unique_ptr<odimpl::DecodeSource> source)
    : file_(file), source_(std::move(source)) {
  if (!source_) FailOSErr(kParamErr);
}

OutsideDecoder::~OutsideDecoder() = default;

bool OutsideDecoder::CanDecode(const FileSpecification& file) noexcept {
  try {
    return odimpl::OpenDecodeSource(file) != nullptr;
  } catch (...) {
    return false;
  }
}

int OutsideDecoder::GetNumChannels() const noexcept { return source_->NumChannels(); }
double OutsideDecoder::GetSampleRate() const noexcept { return source_->SampleRate(); }
SampleFormat OutsideDecoder::GetSampleFormat() const noexcept { return source_->Format(); }

std::optional<SampleCount> OutsideDecoder::GetKnownLength() const noexcept {
  if (auto known = source_->KnownLength()) return SampleCount(*known);
  return std::nullopt;
}

void OutsideDecoder::Fail(const char* what) const {
  try {
    FailFormatError("OutsideDecoder", kDecodeErr, file_);
  } catch (TarnError& error) {
    error.SetOptionalErrorString(what);
    throw;
  }
}

SampleCount OutsideDecoder::CountFrames() {
  position_ = 0;
  needSeek_ = true;
  std::int64_t total = 0;
  try {
    source_->Restart();
    std::int64_t start = 0, frames = 0;
    while (source_->Next(start, frames, data_)) total += frames;
  } catch (const TarnError&) {
    throw;
  } catch (const std::exception& e) {
    Fail(e.what());
  }
  atEnd_ = true;
  blockStart_ = total;
  blockFrames_ = used_ = 0;
  position_ = total;
  needSeek_ = false;
  return total;
}

void OutsideDecoder::Seek(SampleCount frame) {
  if (frame < SampleCount(0)) FailOSErr(kParamErr);
  position_ = frame;
  needSeek_ = true;
}

bool OutsideDecoder::NextBlock() {
  const std::int64_t continuation = blockStart_ + blockFrames_;
  std::int64_t start = 0, frames = 0;
  if (!source_->Next(start, frames, data_)) {
    atEnd_ = true;
    blockStart_ = continuation;
    blockFrames_ = used_ = 0;
    return false;
  }
  // In a running stream the blocks follow each other; the converter's own
  // positions are used only right after a seek (Reposition).
  blockStart_ = continuation;
  blockFrames_ = frames;
  used_ = std::clamp<std::int64_t>(position_.AsLongLong() - blockStart_, 0, blockFrames_);
  return true;
}

void OutsideDecoder::Reposition() {
  needSeek_ = false;
  const std::int64_t target = position_.AsLongLong();
  const std::int64_t streamAt = blockStart_ + blockFrames_;  // where decoding goes on
  if (target >= blockStart_ && target <= streamAt) {
    used_ = target - blockStart_;
    return;
  }
  const std::int64_t preRoll = source_->PreRoll();
  const std::int64_t nearby = std::max<std::int64_t>(
      preRoll, static_cast<std::int64_t>(source_->SampleRate()));  // about a second
  if (target > streamAt && (atEnd_ || target - streamAt <= nearby || !source_->CanSeek())) {
    used_ = blockFrames_;  // decode on, dropping what lies before the target
    return;
  }
  atEnd_ = false;
  bool landed = false;
  if (source_->CanSeek() && target - preRoll > 0) {
    std::int64_t back = preRoll;
    for (int attempt = 0; attempt < kSeekAttempts && !landed; ++attempt) {
      source_->SeekNear(std::max<std::int64_t>(target - back, 0));
      std::int64_t start = 0, frames = 0;
      if (!source_->Next(start, frames, data_) || start == odimpl::kUnknownStart) break;
      if (start <= std::max<std::int64_t>(target - preRoll, 0)) {
        blockStart_ = start;
        blockFrames_ = frames;
        landed = true;
      }
      back = 2 * back + nearby;
    }
  }
  if (!landed) {
    source_->Restart();
    std::int64_t start = 0, frames = 0;
    blockStart_ = 0;
    blockFrames_ = 0;
    if (source_->Next(start, frames, data_)) {
      blockFrames_ = frames;
    } else {
      atEnd_ = true;
    }
  }
  used_ = std::clamp<std::int64_t>(target - blockStart_, 0, blockFrames_);
}

SampleCount OutsideDecoder::Decode(void* buffer, SampleCount frames) {
  const std::int64_t wanted = std::max<std::int64_t>(frames.AsLongLong(), 0);
  const std::size_t frameBytes = static_cast<std::size_t>(GetBytesPerFrame());
  auto* out = static_cast<std::byte*>(buffer);
  std::int64_t done = 0;
  try {
    if (needSeek_) Reposition();
    while (done < wanted) {
      if (used_ >= blockFrames_) {
        if (atEnd_ || !NextBlock()) break;
        continue;
      }
      const std::int64_t n = std::min(blockFrames_ - used_, wanted - done);
      std::memcpy(out + static_cast<std::size_t>(done) * frameBytes,
                  data_ + static_cast<std::size_t>(used_) * frameBytes,
                  static_cast<std::size_t>(n) * frameBytes);
      used_ += n;
      done += n;
      position_ += n;
    }
  } catch (const TarnError&) {
    throw;
  } catch (const std::exception& e) {
    Fail(e.what());
  }
  return done;
}

}  // namespace tarn
