#include "tarn/Streams/StreamChunk.h"

#include <exception>

#include "tarn/Errors/TarnError.h"

namespace tarn {
namespace {
constexpr int kNotAChunk = 103;
}

void StreamChunkVers::put(CStream& stream) const {
  stream.PutShort(majorVersion);
  stream.PutShort(minorVersion);
}

void StreamChunkVers::get(CStream& stream) {
  majorVersion = stream.GetShort();
  minorVersion = stream.GetShort();
}

StreamChunkWriter::StreamChunkWriter(CStream& stream, int identifier, StreamChunkVers version)
    : stream_(stream), uncaught_(std::uncaught_exceptions()) {
  stream_.PutLong(kStreamChunkMagic);
  stream_.PutLong(identifier);
  version.put(stream_);
  stream_.PutLong(0);
  dataStart_ = stream_.Position();
}

StreamChunkWriter::~StreamChunkWriter() noexcept(false) {
  if (std::uncaught_exceptions() != uncaught_) return;
  const std::int64_t end = stream_.Position();
  stream_.MoveTo(dataStart_ - 4);
  stream_.PutLong(static_cast<int>(static_cast<std::uint32_t>(end - dataStart_)));
  stream_.MoveTo(end);
}

StreamChunkReader::StreamChunkReader(CStream& stream) : stream_(stream) {
  if (stream_.GetLong() != kStreamChunkMagic) FailOSErr(kNotAChunk);
  id_ = stream_.GetLong();
  vers_.get(stream_);
  length_ = static_cast<std::uint32_t>(stream_.GetLong());
  dataStart_ = stream_.Position();
}

StreamChunkReader::~StreamChunkReader() {
  try {
    stream_.MoveTo(dataStart_ + length_);
  } catch (...) {
    // The chunk claims more data than the stream holds; the next read says so.
  }
}

bool StreamChunkReader::HasMagic(CStream& stream) {
  const std::int64_t start = stream.Position();
  if (stream.Size() - start < 4) return false;
  const int magic = stream.GetLong();
  stream.MoveTo(start);
  return magic == kStreamChunkMagic;
}

bool StreamChunkReader::MoreInChunk() { return stream_.Position() < dataStart_ + length_; }

void StreamChunkReader::GetAge(const StreamChunkVers& v, bool& tooOld,
                               bool& tooNew) const noexcept {
  tooOld = v.majorVersion > vers_.majorVersion;
  tooNew = v < vers_;
}

bool StreamChunkReader::IsTooOld(const StreamChunkVers& v) const noexcept {
  return v.majorVersion > vers_.majorVersion;
}

bool StreamChunkReader::IsTooNew(const StreamChunkVers& v) const noexcept { return v < vers_; }

bool StreamChunkReader::ShouldRead(const StreamChunkVers& v) const noexcept {
  return !IsTooOld(v) && !IsTooNew(v);
}

void StreamChunkReader::FailIfCantRead(const StreamChunkVers& v, int tooOldCode,
                                       int tooNewCode) const {
  if (IsTooOld(v)) FailOSErr(tooOldCode);
  if (IsTooNew(v)) FailOSErr(tooNewCode);
}

}  // namespace tarn
