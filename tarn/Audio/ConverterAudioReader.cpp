// ConverterAudioReader: AsyncAudioReader over the outside converter.
#include "tarn/Audio/ConverterAudioReader.h"

#include <algorithm>
#include <utility>

#include "tarn/Basics/Singleton.h"
#include "tarn/Errors/Fail.h"
#include "tarn/Errors/TarnError.h"
#include "tarn/Threads/TarnJobThread.h"

namespace tarn {

namespace {

// The job thread of asynchronous converter reads, started on first use.
// Decoding is slow next to the plain files' positioned reads, so these jobs
// keep off the plain files' reader thread.
class ConverterReaderThread {
 public:
  TarnJobThread& Get() noexcept { return thread_; }

 private:
  friend class tarn::Singleton<ConverterReaderThread>;
  ConverterReaderThread()
      : thread_(UString("Converter Reader Thread"), TarnJobThread::kRunRemainingJobsAtExit) {
    thread_.Start();
  }
  TarnJobThread thread_;
};

}  // namespace

ConverterAudioReader::ConverterAudioReader(const FileSpecification& file,
                                           const TimeRangeOf<SampleCount>& range,
                                           SampleCount fileLength)
    : decoder_(file) {
  if (range.start < SampleCount(0) || range.end < range.start) FailOSErr(kParamErr);
  format_.mSampleFormat = decoder_.GetSampleFormat();
  format_.mNumChannels = static_cast<std::int16_t>(decoder_.GetNumChannels());
  format_.mSampleRate = decoder_.GetSampleRate();
  channelOrder_ = HostChannelOrder::ForChannelCount(format_.mNumChannels);
  first_ = std::min(range.start, fileLength);
  length_ = std::min(range.end, fileLength) - first_;
  if (length_ < SampleCount(0)) length_ = 0;
}

ConverterAudioReader::~ConverterAudioReader() = default;

SampleCount ConverterAudioReader::ReadAt(void* buffer, SampleCount start, SampleCount frames) {
  if (start < SampleCount(0) || frames <= SampleCount(0) || start >= length_) return 0;
  const SampleCount wanted = std::min(frames, length_ - start);
  std::lock_guard<std::mutex> guard(lock_);
  const SampleCount at = first_ + start;
  if (decoder_.GetPosition() != at) decoder_.Seek(at);
  return decoder_.Decode(buffer, wanted);
}

SampleCount ConverterAudioReader::Read(void* buffer, SampleCount frames) {
  const SampleCount got = ReadAt(buffer, readPosition_, frames);
  readPosition_ += got;
  if (got < std::min(std::max(frames, SampleCount(0)), length_ - (readPosition_ - got)))
    readPosition_ = length_;  // the file ended early
  return got;
}

void ConverterAudioReader::SetReadPosition(SampleCount frame) {
  readPosition_ = std::clamp(frame, SampleCount(0), length_);
}

namespace {

// Frames a read of `frames` at `start` should deliver from a stretch of
// `length` frames.
SampleCount FramesWanted(SampleCount start, SampleCount frames, SampleCount length) {
  if (start < SampleCount(0)) return 0;
  return std::clamp(length - start, SampleCount(0), std::max(frames, SampleCount(0)));
}

}  // namespace

SampleCount ConverterAudioReader::OutOfOrderRead(void* buffer, SampleCount start,
                                                 SampleCount frames) {
  const SampleCount got = ReadAt(buffer, start, frames);
  if (got < FramesWanted(start, frames, length_)) FailOSErr(kEOFErr);
  return got;
}

void ConverterAudioReader::OutOfOrderReadAsync(void* buffer, SampleCount start, SampleCount frames,
                                               Completion completion) {
  (void)Singleton<ConverterReaderThread>::Instance().Get().Post(
      [this, buffer, start, frames, completion = std::move(completion)] {
        int status = 0;
        SampleCount got = 0;
        try {
          got = ReadAt(buffer, start, frames);
          if (got < FramesWanted(start, frames, length_)) status = kEOFErr;
        } catch (const TarnError&) {
          status = kIOErr;
        }
        if (completion) completion(status, got);
      });
}

}  // namespace tarn
