#pragma once
// PipedStream: one end of an in-process pipe between two threads.
//
// The first end, made with the default constructor, creates the pipe and
// writes into it (kTCLWriteMode); the second end, made from the first,
// shares the pipe and reads from it (kTCLReadMode). The two ends may be used
// on two threads at once; each end by one thread at a time. Writes never
// block. A read blocks until all its bytes have arrived; once the other end
// has been destroyed, a read that cannot be completed fails with -39 after
// taking what was there (Close on an end has the same effect as destroying
// it). GetThruN returns what it has at that point instead.
//
// Positions count the bytes this end has moved. MoveTo accepts the current
// position, and on the reading end a later one (the bytes in between are
// read and dropped); any other position fails with FailStream(6). The reading
// end's Size() is unbounded while the writing end lives, and afterwards its
// position plus the bytes still waiting. Truncate has no effect.
//
//   PipedStream out;
//   PipedStream in(out);
//   std::thread t([&] { out.PutLong(42); });
//   int v = in.GetLong();   // waits for the writer
//   t.join();

#include <cstdint>
#include <memory>

#include "tarn/Streams/CStream.h"

namespace tarn {

class PipedStream : public CStream {
 public:
  PipedStream();
  explicit PipedStream(PipedStream& otherEnd);
  PipedStream(const PipedStream&) = delete;
  PipedStream& operator=(const PipedStream&) = delete;
  ~PipedStream() override;

  // Leaves the pipe: the other end then sees the end of the data once it
  // has read what is waiting. A closed end cannot be reopened.
  void Close() override;

  [[nodiscard]] std::int64_t Position() override { return transferred_; }
  [[nodiscard]] std::int64_t Size() override;
  void MoveTo(std::int64_t position) override;
  void Truncate(std::int64_t) override {}
  void GetRawDataFromStream(void* buffer, int count) override;
  void PutRawDataToStream(const void* data, int count) override;
  void PutThru(const void* data, char terminator) override;
  int GetThruN(void* buffer, char terminator, int max) override;

  struct Pipe;

 private:
  // Takes up to `count` bytes, waiting while the other end lives; returns
  // the count taken.
  int Take(char* buffer, int count, char terminator, bool stopAtTerminator);

  std::shared_ptr<Pipe> pipe_;
  bool isReadingEnd_;
  bool attached_ = true;
  std::int64_t transferred_ = 0;
};

}  // namespace tarn
