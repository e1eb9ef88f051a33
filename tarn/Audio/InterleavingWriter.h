#pragma once
// InterleavingWriter: an AudioWriter (one buffer per channel) over an
// InterAudioWriter (interleaved frames). Samples are not changed: the
// format is the destination's. Frames are interleaved in blocks into one
// reused scratch buffer and handed on block by block; a mono writer hands
// the caller's buffer on as it is.
//
//   auto writer = std::make_unique<InterleavingWriter>(format->MakeWriter());
//
// Threads and failures: as AudioWriter; the constructor throws -50 for a
// null destination.

#include <memory>
#include <vector>

#include "tarn/Audio/AudioWriter.h"
#include "tarn/Audio/InterAudioWriter.h"

namespace tarn {

class InterleavingWriter final : public AudioWriter {
 public:
  explicit InterleavingWriter(std::shared_ptr<InterAudioWriter> destination);
  ~InterleavingWriter() override;

  [[nodiscard]] AudioFormat GetFormat() const override { return format_; }
  void Write(const void* const* channels, SampleCount frames) override;
  void Flush() override;
  void Close() override;

  [[nodiscard]] const std::shared_ptr<InterAudioWriter>& GetDestination() const noexcept {
    return destination_;
  }

 private:
  std::shared_ptr<InterAudioWriter> destination_;
  AudioFormat format_;
  int bytesPerSample_ = 0;
  bool closed_ = false;
  std::vector<unsigned char> scratch_;  // one block of interleaved frames
};

}  // namespace tarn
