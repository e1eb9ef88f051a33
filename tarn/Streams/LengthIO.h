#pragma once
// LengthWriter and LengthReader: a 32-bit big-endian length in front of a
// block of data, so that a reader can skip what it does not understand.
//
// LengthWriter writes a placeholder 0 where it is made and, on PatchLength,
// the count of bytes written since (plus 4 when the length includes its own
// field). A writer that was never patched patches itself on destruction,
// unless an exception is propagating. LengthReader reads the length and knows
// where the data ends; on destruction it moves there unless SkipRemainingData
// already did, and drops any error in doing so. Both need a seekable stream.
//
//   { LengthWriter len(s, false); s.PutLong(1); s.PutShort(2); }   // 00 00 00 06 ...
//   { LengthReader len(s, false); int a = s.GetLong(); }           // skips the short

#include <cstdint>

#include "tarn/Streams/CStream.h"

namespace tarn {

class LengthWriter {
 public:
  LengthWriter(CStream& stream, bool includeOwnLength);
  LengthWriter(const LengthWriter&) = delete;
  LengthWriter& operator=(const LengthWriter&) = delete;
  ~LengthWriter() noexcept(false);

  // Writes the length of what was written since construction and returns
  // to the current position.
  void PatchLength();
  // Writes `length` instead.
  void PatchWithNum(int length);

 private:
  CStream& stream_;
  std::int64_t lengthPosition_;
  bool patched_ = false;
  bool includeOwnLength_;
  int uncaught_;
};

class LengthReader {
 public:
  // A length that would put the end before its own field fails with
  // FailStream(6).
  LengthReader(CStream& stream, bool lengthIncludesItself);
  LengthReader(const LengthReader&) = delete;
  LengthReader& operator=(const LengthReader&) = delete;
  ~LengthReader();

  [[nodiscard]] bool AnyDataRemainsToBeRead();
  // Moves to the end of the data (FailStream(6) if the stream is shorter).
  void SkipRemainingData();
  [[nodiscard]] int GetLength() const noexcept { return length_; }

 private:
  CStream& stream_;
  int length_;
  std::int64_t end_ = 0;
  bool skipped_ = false;
};

}  // namespace tarn
