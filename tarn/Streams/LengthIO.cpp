#include "tarn/Streams/LengthIO.h"

#include <exception>

#include "tarn/Errors/TarnError.h"

namespace tarn {

LengthWriter::LengthWriter(CStream& stream, bool includeOwnLength)
    : stream_(stream),
      lengthPosition_(stream.Position()),
      includeOwnLength_(includeOwnLength),
      uncaught_(std::uncaught_exceptions()) {
  stream_.PutLong(0);
}

LengthWriter::~LengthWriter() noexcept(false) {
  if (!patched_ && std::uncaught_exceptions() == uncaught_) PatchLength();
}

void LengthWriter::PatchLength() {
  std::int64_t length = stream_.Position() - lengthPosition_;
  if (!includeOwnLength_) length -= 4;
  PatchWithNum(static_cast<int>(length));
}

void LengthWriter::PatchWithNum(int length) {
  const std::int64_t end = stream_.Position();
  stream_.MoveTo(lengthPosition_);
  stream_.PutLong(length);
  stream_.MoveTo(end);
  patched_ = true;
}

LengthReader::LengthReader(CStream& stream, bool lengthIncludesItself)
    : stream_(stream), length_(stream.GetLong()) {
  const std::int64_t start = stream_.Position();
  end_ = start + length_ - (lengthIncludesItself ? 4 : 0);
  if (end_ < start) FailStream(CStream::kPositionOutOfRange);
}

LengthReader::~LengthReader() {
  if (skipped_) return;
  try {
    SkipRemainingData();
  } catch (...) {
    // A short stream is reported by whatever reads next.
  }
}

bool LengthReader::AnyDataRemainsToBeRead() { return stream_.Position() < end_; }

void LengthReader::SkipRemainingData() {
  stream_.MoveTo(end_);
  skipped_ = true;
}

}  // namespace tarn
