#pragma once
// CStream: the abstract, seekable byte stream and the library's one binary
// encoding of values.
//
// Concrete streams (CFileStream, CHandleStream, PtrStream, PipedStream)
// supply the primitives: Position, Size, MoveTo, Truncate,
// GetRawDataFromStream, PutRawDataToStream, PutThru and GetThruN. On top of
// them CStream writes and reads typed values in a fixed format:
//   - numbers big-endian (short 2, long 4, long long 8, IEEE double 8 bytes);
//   - Pascal strings (a length byte and that many bytes), NUL-terminated
//     strings, and UString as a 4-byte count followed by UTF-8 bytes;
//   - handles as a 4-byte count and the block's bytes;
//   - short, long and float arrays element by element, each big-endian.
// Every failure is a thrown TarnError: the stream's own end-of-data or I/O
// errors (-39 at the end of a file), and FailStream codes 2 (no number text),
// 3 (line longer than 255 bytes) and 6 (position out of range). A failed read
// leaves the position wherever the primitive left it. Values read from data
// that a stream refuses to deliver (PtrStream) come back as zeros.
//
// A stream is used by one thread at a time (PipedStream's two ends excepted).
//
//   CHandleStream out(kTCLWriteMode);
//   out.PutLong(1);               // 00 00 00 01
//   out.PutUString(name);         // count, then UTF-8
//   out.MoveTo(0);
//   int one = out.GetLong();

#include <cstdint>

#include "tarn/Basics/Handle.h"

namespace tarn {

class UString;

// How a stream is opened. Values beyond these are read as kTCLReadMode where
// a stream must pick one.
enum TCLStreamMode : int {
  kTCLClosedMode = 0,
  kTCLReadMode = 1,
  kTCLWriteMode = 2,
  kTCLReadWriteMode = 3,
};

// Two and four 16-bit fields, written in declaration order.
struct tarnPoint {
  short v = 0;
  short h = 0;
  friend bool operator==(const tarnPoint&, const tarnPoint&) = default;
};

struct tarnRect {
  short top = 0;
  short left = 0;
  short bottom = 0;
  short right = 0;
  friend bool operator==(const tarnRect&, const tarnRect&) = default;
};

class CStream {
 public:
  // FailStream codes raised by the typed operations.
  static constexpr short kNoNumberText = 2;  // _GetDouble found no text
  static constexpr short kLineTooLong = 3;   // GetLineAsStr255 without CR
  static constexpr short kPositionOutOfRange = 6;

  // UString texts longer than this are cut on reading (the rest is skipped).
  static constexpr int kMaxUStringBytes = 65535;

  CStream() noexcept = default;
  CStream(const CStream&) = delete;
  CStream& operator=(const CStream&) = delete;
  virtual ~CStream() = default;

  // The base Open only records the mode and Close resets it to closed;
  // concrete streams acquire and release their stores here.
  virtual void Open(TCLStreamMode mode);
  virtual void Close();
  [[nodiscard]] virtual TCLStreamMode GetMode() const noexcept;
  // Position() == Size().
  [[nodiscard]] virtual bool AtEnd();

  [[nodiscard]] virtual std::int64_t Position() = 0;
  [[nodiscard]] virtual std::int64_t Size() = 0;
  virtual void MoveTo(std::int64_t position) = 0;
  virtual void Truncate(std::int64_t size) = 0;
  virtual void GetRawDataFromStream(void* buffer, int count) = 0;
  virtual void PutRawDataToStream(const void* data, int count) = 0;
  // Writes `data` up to and including the first `terminator`.
  virtual void PutThru(const void* data, char terminator) = 0;

  virtual void PutStr(const char* s);
  virtual void PutStr255(const unsigned char* pascalString);
  virtual void PutStr255AsLine(const unsigned char* pascalString);
  virtual void PutChar(char c);
  virtual void PutBoolean(bool b);
  virtual void PutShort(short n);
  virtual void PutLong(int n);
  virtual void PutLongLong(std::int64_t n);
  virtual void PutPoint(const tarnPoint& p);
  virtual void PutRect(const tarnRect& r);
  // The value as text ("%.16g"), NUL-terminated.
  virtual void _PutDouble(double d);
  virtual void PutIEEEDouble(double d);
  virtual void PutUString(const UString& s);
  // The pointer's 8 bytes in host order: meaningful only within one process.
  virtual void PutPointer(void* p);
  // A 4-byte count and the block's bytes; a null handle writes a 0 count.
  virtual void PutHandle(char** handle);
  // The first `size` bytes of the block, without a count.
  virtual void PutHandleOfSize(char** handle, int size);
  virtual void PutCharArray(const char* a, int count);
  virtual void PutUCharArray(const unsigned char* a, int count);
  virtual void PutLongArray(const int* a, int count);
  virtual void PutShortArray(const short* a, int count);
  virtual void PutFloatArray(const float* a, int count);

  // Reads up to and including `terminator`, or `max` bytes, or to the end of
  // the data, whichever comes first; returns the count read.
  virtual int GetThruN(void* buffer, char terminator, int max) = 0;
  // GetThruN(buffer, 0, max).
  virtual void GetStr(char* buffer, int max);
  // `buffer` holds 256 bytes: a length byte and up to 255 characters.
  virtual void GetStr255(unsigned char* buffer);
  // Stores at most max - 1 characters; the unread rest of a longer stored
  // string is left in the stream. Does nothing when max <= 0.
  virtual void GetLimitedStr255(unsigned char* buffer, short max);
  // A line ending in CR (13), stored without the CR as a Pascal string in a
  // 256-byte buffer; more than 254 characters before the CR fails with 3.
  virtual void GetLineAsStr255(unsigned char* buffer);
  [[nodiscard]] virtual char GetChar();
  [[nodiscard]] virtual bool GetBoolean();
  [[nodiscard]] virtual short GetShort();
  [[nodiscard]] virtual int GetLong();
  [[nodiscard]] virtual std::int64_t GetLongLong();
  virtual void GetPoint(tarnPoint& p);
  [[nodiscard]] tarnPoint GetPoint();
  virtual void GetRect(tarnRect& r);
  [[nodiscard]] tarnRect GetRect();
  // Fails with 2 when no number text is found.
  [[nodiscard]] virtual double _GetDouble();
  [[nodiscard]] virtual double GetIEEEDouble();
  // Texts over 65,535 bytes are cut there; the stream still moves past the
  // whole stored text. A negative stored count reads as an empty string.
  virtual void GetUString(UString& s);
  [[nodiscard]] virtual void* GetPointer();
  // The 4-byte count, then GetHandleOfSize(count).
  [[nodiscard]] virtual auto_handle<char> GetHandle();
  // A count larger than the data left fails with -39 before allocating; a
  // negative count fails with -50.
  [[nodiscard]] virtual auto_handle<char> GetHandleOfSize(int size);
  virtual void GetCharArray(char* a, int count);
  virtual void GetUCharArray(unsigned char* a, int count);
  virtual void GetLongArray(int* a, int count);
  virtual void GetShortArray(short* a, int count);
  virtual void GetFloatArray(float* a, int count);

 protected:
  // Fails with -39 unless `count` more bytes lie between Position() and Size().
  void RequireRemaining(std::int64_t count);

 private:
  TCLStreamMode mode_ = kTCLClosedMode;
};

}  // namespace tarn
