#pragma once
// MonoSplittingWriter: a one-channel AudioWriter that writes its channel to
// every channel of another AudioWriter (the same samples, no copy: the one
// buffer is handed on once per destination channel).
//
// Threads and failures: as AudioWriter; the constructor throws -50 for a
// null destination.

#include <memory>
#include <vector>

#include "tarn/Audio/AudioWriter.h"

namespace tarn {

class MonoSplittingWriter final : public AudioWriter {
 public:
  explicit MonoSplittingWriter(std::shared_ptr<AudioWriter> destination);
  ~MonoSplittingWriter() override;

  [[nodiscard]] AudioFormat GetFormat() const override { return format_; }
  void Write(const void* const* channels, SampleCount frames) override;
  void Flush() override { destination_->Flush(); }
  void Close() override { destination_->Close(); }

 private:
  std::shared_ptr<AudioWriter> destination_;
  AudioFormat format_;
  std::vector<const void*> copies_;
};

}  // namespace tarn
