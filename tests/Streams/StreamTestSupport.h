#pragma once
// Shared helpers of the stream tests: byte images, error codes, temporary
// files, and channels giving a write end and then a read end of every kind.

#include <gtest/gtest.h>

#include <cstring>
#include <filesystem>
#include <functional>
#include <limits>
#include <memory>
#include <random>
#include <string>
#include <vector>

#include "tarn/Errors/TarnError.h"
#include "tarn/FileSystem/FileSpecification.h"
#include "tarn/Streams/CFileStream.h"
#include "tarn/Streams/CHandleStream.h"
#include "tarn/Streams/PipedStream.h"
#include "tarn/Streams/PtrStream.h"
#include "tarn/String/UString.h"

namespace tarn::test {

using Bytes = std::vector<unsigned char>;
using Action = std::function<void(CStream&)>;

// The bytes that `write` puts on a fresh stream.
inline Bytes ImageOf(const Action& write) {
  CHandleStream s(kTCLReadWriteMode);
  write(s);
  auto_handle<char> h = s.DetachHandle();
  return Bytes(h.data(), h.data() + h.size());
}

// The error code that `action` throws, or 0 if it returns.
inline int CodeOf(const std::function<void()>& action) {
  try {
    action();
  } catch (const TarnError& e) {
    return e.GetIntErrorCode();
  }
  return 0;
}

// Bytes from hex digits, spaces ignored: "7C97 0F1A".
inline Bytes Hex(std::string digits) {
  std::erase(digits, ' ');
  Bytes out;
  for (std::size_t i = 0; i + 1 < digits.size(); i += 2)
    out.push_back(static_cast<unsigned char>(std::stoi(digits.substr(i, 2), nullptr, 16)));
  return out;
}
inline Bytes Text(std::string_view text) { return Bytes(text.begin(), text.end()); }

struct HandleCopy {
  auto_handle<char> handle;
};
// A read-only handle stream over a copy of `bytes`.
class Reader : private HandleCopy, public CHandleStream {
 public:
  explicit Reader(const Bytes& bytes)
      : HandleCopy{auto_handle<char>(NewHandle(bytes.size()))},
        CHandleStream(handle.get(), kTCLReadMode) {
    if (!bytes.empty()) std::memcpy(handle.data(), bytes.data(), bytes.size());
  }
};

// A path in the temporary folder, removed on destruction.
struct TempPath {
  explicit TempPath(const std::string& stem)
      : path(std::filesystem::temp_directory_path() /
             ("tarn_streams_" + stem + "_" + std::to_string(std::random_device{}()))) {}
  ~TempPath() {
    std::error_code ignored;
    std::filesystem::remove(path, ignored);
  }
  FileSpecification Spec() const { return FileSpecification(UString(path.string())); }
  std::filesystem::path path;
};

inline const char* const kChannelKinds[] = {"Handle", "File", "FileTinyBuffer", "Ptr", "Pipe"};

// A write end of one kind, then (after In()) a read end over what was written.
class Channel {
 public:
  explicit Channel(const std::string& kind) : kind_(kind) {
    if (kind_ == "Handle") out_ = std::make_unique<CHandleStream>(kTCLReadWriteMode);
    if (kind_ == "Ptr") out_ = std::make_unique<PtrStream>(memory_.data(), memory_.size());
    if (kind_ == "Pipe") out_ = std::make_unique<PipedStream>();
    if (kind_ == "Pipe") in_ = std::make_unique<PipedStream>(static_cast<PipedStream&>(*out_));
    if (kind_.starts_with("File")) out_ = std::make_unique<CFileStream>(path_.Spec(), BufferSize());
    if (kind_.starts_with("File")) out_->Open(kTCLWriteMode);
  }
  CStream& Out() { return *out_; }
  CStream& In() {
    if (kind_ == "Handle") out_->MoveTo(0);
    if (kind_ == "Handle") return *out_;
    if (kind_ == "Ptr")
      in_ = std::make_unique<PtrStream>(PtrStream::ReadOnly{}, memory_.data(), out_->Size());
    if (kind_ != "Ptr") out_->Close();
    if (kind_.starts_with("File")) in_ = std::make_unique<CFileStream>(path_.Spec(), BufferSize());
    if (kind_.starts_with("File")) in_->Open(kTCLReadMode);
    return *in_;
  }

 private:
  int BufferSize() const { return kind_ == "File" ? CFileStream::kDefaultBufferSize : 5; }

  std::string kind_;
  TempPath path_{"channel"};
  std::vector<char> memory_ = std::vector<char>(1 << 20);
  std::unique_ptr<CStream> out_, in_;
};

// Writes values or, reading, reads them back and counts those that differ:
// one list of calls gives a byte image, a record, and the record's check.
class Io {
 public:
  Io(CStream& stream, bool reading) : s(stream), reading_(reading) {}
  void Char(char v) { reading_ ? Check(s.GetChar() == v) : s.PutChar(v); }
  void Bool(bool v) { reading_ ? Check(s.GetBoolean() == v) : s.PutBoolean(v); }
  void Short(short v) { reading_ ? Check(s.GetShort() == v) : s.PutShort(v); }
  void Long(int v) { reading_ ? Check(s.GetLong() == v) : s.PutLong(v); }
  void LongLong(std::int64_t v) { reading_ ? Check(s.GetLongLong() == v) : s.PutLongLong(v); }
  void Point(tarnPoint v) { reading_ ? Check(s.GetPoint() == v) : s.PutPoint(v); }
  void Rect(tarnRect v) { reading_ ? Check(s.GetRect() == v) : s.PutRect(v); }
  void NumberText(double v) { reading_ ? Check(s._GetDouble() == v) : s._PutDouble(v); }
  void Double(double v) {  // bit for bit: -0.0 is not 0.0
    const double got = reading_ ? s.GetIEEEDouble() : (s.PutIEEEDouble(v), v);
    Check(std::memcmp(&got, &v, sizeof v) == 0);
  }
  void Text(const UString& v) {
    UString got;
    reading_ ? s.GetUString(got) : s.PutUString(v);
    Check(!reading_ || got == v);
  }
  void Str255(const std::string& v) {
    unsigned char p[256] = {static_cast<unsigned char>(v.size())};
    std::memcpy(p + 1, v.data(), v.size());
    reading_ ? s.GetStr255(p) : s.PutStr255(p);
    Check(!reading_ || std::string(reinterpret_cast<char*>(p + 1), p[0]) == v);
  }
  void Handle(const char* v) {  // nullptr: no handle, read back as an empty one
    auto_handle<char> h(v ? NewHandle(std::strlen(v)) : nullptr);
    if (v) std::memcpy(h.data(), v, h.size());
    if (!reading_) return s.PutHandle(h.get());
    auto_handle<char> got = s.GetHandle();
    Check(got && std::string(got.data(), got.size()) == (v ? v : ""));
  }
  template <class T, class... V>
  void Array(V... values) {
    const std::vector<T> v{static_cast<T>(values)...};
    std::vector<T> got(v.size());
    const int n = static_cast<int>(v.size());
    if constexpr (std::is_same_v<T, char>)
      reading_ ? s.GetCharArray(got.data(), n) : s.PutCharArray(v.data(), n);
    if constexpr (std::is_same_v<T, short>)
      reading_ ? s.GetShortArray(got.data(), n) : s.PutShortArray(v.data(), n);
    if constexpr (std::is_same_v<T, int>)
      reading_ ? s.GetLongArray(got.data(), n) : s.PutLongArray(v.data(), n);
    if constexpr (std::is_same_v<T, float>)
      reading_ ? s.GetFloatArray(got.data(), n) : s.PutFloatArray(v.data(), n);
    Check(!reading_ || std::memcmp(got.data(), v.data(), v.size() * sizeof(T)) == 0);
  }
  int mismatches = 0;

 private:
  void Check(bool same) { mismatches += same ? 0 : 1; }
  CStream& s;
  bool reading_;
};

inline UString WithChar(const char* start, unsigned int c) {
  UString s(start);
  s += c;
  return s;
}

// A record of one of every value, each with its exact bytes.
struct Field {
  const char* name;
  std::function<void(Io&)> io;
  const char* hex;
};
inline const std::vector<Field>& Record() {
  static const std::vector<Field> fields = {
      {"char", [](Io& io) { io.Char('\xF0'); }, "F0"},
      {"true", [](Io& io) { io.Bool(true); }, "01"},
      {"short", [](Io& io) { io.Short(-2); }, "FFFE"},
      {"long", [](Io& io) { io.Long(0x01020304); }, "01020304"},
      {"long min", [](Io& io) { io.Long(std::numeric_limits<int>::min()); }, "80000000"},
      {"longlong", [](Io& io) { io.LongLong(0x0102030405060708); }, "0102030405060708"},
      {"longlong -2", [](Io& io) { io.LongLong(-2); }, "FFFFFFFFFFFFFFFE"},
      {"point",
       [](Io& io) {
         io.Point(tarnPoint{1, -1});
       },
       "0001 FFFF"},
      {"rect",
       [](Io& io) {
         io.Rect(tarnRect{1, 2, -3, 4});
       },
       "0001 0002 FFFD 0004"},
      {"number text", [](Io& io) { io.NumberText(-1234.5); }, "2D313233342E35 00"},
      {"double", [](Io& io) { io.Double(-2.5); }, "C004000000000000"},
      {"double -0", [](Io& io) { io.Double(-0.0); }, "8000000000000000"},
      {"double max", [](Io& io) { io.Double(std::numeric_limits<double>::max()); },
       "7FEFFFFFFFFFFFFF"},
      {"empty text", [](Io& io) { io.Text(UString()); }, "00000000"},
      {"text 2-byte", [](Io& io) { io.Text(WithChar("a", 0xE9)); }, "00000003 61C3A9"},
      {"text pair", [](Io& io) { io.Text(WithChar("", 0x1D11E)); }, "00000004 F09D849E"},
      {"str255", [](Io& io) { io.Str255("abc"); }, "03616263"},
      {"no handle", [](Io& io) { io.Handle(nullptr); }, "00000000"},
      {"handle", [](Io& io) { io.Handle("xyz"); }, "00000003 78797A"},
      {"chars", [](Io& io) { io.Array<char>('a', 0, 'b'); }, "610062"},
      {"shorts", [](Io& io) { io.Array<short>(1, -2); }, "0001 FFFE"},
      {"longs", [](Io& io) { io.Array<int>(0x01020304, -1); }, "01020304 FFFFFFFF"},
      {"floats", [](Io& io) { io.Array<float>(1.0f, -2.0f, 1e-45f); },
       "3F800000 C0000000 00000001"},
  };
  return fields;
}

// Writes `f`, or reads it back and returns how many of its values differ.
inline int Run(CStream& s, const Field& f, bool reading) {
  Io io(s, reading);
  f.io(io);
  return io.mismatches;
}

}  // namespace tarn::test
