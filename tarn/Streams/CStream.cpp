#include "tarn/Streams/CStream.h"

#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

#include "tarn/Basics/Endian.h"
#include "tarn/Errors/TarnError.h"
#include "tarn/String/UString.h"

namespace tarn {
namespace {

constexpr char kCarriageReturn = 13;
constexpr int kMaxDoubleText = 99;

template <class T>
void PutBigEndian(CStream& s, T value) {
  const T swapped = Endian::Swapped(value);
  s.PutRawDataToStream(&swapped, sizeof(T));
}

// Zero-initialised, so that a stream that refuses a read yields 0.
template <class T>
T GetBigEndian(CStream& s) {
  T raw{};
  s.GetRawDataFromStream(&raw, sizeof(T));
  return Endian::Swapped(raw);
}

// Arrays go out in slices of swapped copies: each element big-endian, the
// caller's data untouched.
template <class T>
void PutSwappedArray(CStream& s, const T* a, int count) {
  constexpr int kSlice = 256;
  T slice[kSlice];
  for (int done = 0; done < count;) {
    const int n = count - done < kSlice ? count - done : kSlice;
    for (int i = 0; i < n; ++i) slice[i] = Endian::Swapped(a[done + i]);
    s.PutRawDataToStream(slice, n * static_cast<int>(sizeof(T)));
    done += n;
  }
}

template <class T>
void GetSwappedArray(CStream& s, T* a, int count) {
  if (count <= 0) return;
  std::memset(static_cast<void*>(a), 0, sizeof(T) * static_cast<std::size_t>(count));
  s.GetRawDataFromStream(a, count * static_cast<int>(sizeof(T)));
  for (int i = 0; i < count; ++i) a[i] = Endian::Swapped(a[i]);
}

}  // namespace

void CStream::Open(TCLStreamMode mode) { mode_ = mode; }
void CStream::Close() { mode_ = kTCLClosedMode; }
TCLStreamMode CStream::GetMode() const noexcept { return mode_; }
bool CStream::AtEnd() { return Position() == Size(); }

void CStream::RequireRemaining(std::int64_t count) {
  if (count > Size() - Position()) Failure(-39);
}

// ---- writing ----

void CStream::PutStr(const char* s) { PutThru(s, 0); }

void CStream::PutStr255(const unsigned char* pascalString) {
  PutRawDataToStream(pascalString, pascalString[0] + 1);
}

void CStream::PutStr255AsLine(const unsigned char* pascalString) {
  PutStr255(pascalString);
  PutChar(kCarriageReturn);
}

void CStream::PutChar(char c) { PutRawDataToStream(&c, 1); }

void CStream::PutBoolean(bool b) {
  const unsigned char byte = b ? 1 : 0;
  PutRawDataToStream(&byte, 1);
}

void CStream::PutShort(short n) { PutBigEndian(*this, n); }
void CStream::PutLong(int n) { PutBigEndian(*this, n); }
void CStream::PutLongLong(std::int64_t n) { PutBigEndian(*this, n); }

void CStream::PutPoint(const tarnPoint& p) {
  PutShort(p.v);
  PutShort(p.h);
}

void CStream::PutRect(const tarnRect& r) {
  PutShort(r.top);
  PutShort(r.left);
  PutShort(r.bottom);
  PutShort(r.right);
}

void CStream::_PutDouble(double d) {
  char text[64];
  std::snprintf(text, sizeof text, "%.16g", d);
  PutStr(text);
}

void CStream::PutIEEEDouble(double d) { PutBigEndian(*this, d); }

void CStream::PutUString(const UString& s) {
  const std::string utf8 = s.utf8_str();
  PutLong(static_cast<int>(utf8.size()));
  PutRawDataToStream(utf8.data(), static_cast<int>(utf8.size()));
}

void CStream::PutPointer(void* p) { PutRawDataToStream(&p, sizeof p); }

void CStream::PutHandle(char** handle) {
  if (!handle) {
    PutLong(0);
    return;
  }
  const int size = static_cast<int>(GetHandleSize(handle));
  PutLong(size);
  PutHandleOfSize(handle, size);
}

void CStream::PutHandleOfSize(char** handle, int size) {
  if (size <= 0) return;
  if (!handle || static_cast<std::size_t>(size) > GetHandleSize(handle)) Failure(-50);
  PutRawDataToStream(*handle, size);
}

void CStream::PutCharArray(const char* a, int count) {
  if (count > 0) PutRawDataToStream(a, count);
}

void CStream::PutUCharArray(const unsigned char* a, int count) {
  if (count > 0) PutRawDataToStream(a, count);
}

void CStream::PutLongArray(const int* a, int count) { PutSwappedArray(*this, a, count); }
void CStream::PutShortArray(const short* a, int count) { PutSwappedArray(*this, a, count); }
void CStream::PutFloatArray(const float* a, int count) { PutSwappedArray(*this, a, count); }

// ---- reading ----

void CStream::GetStr(char* buffer, int max) { GetThruN(buffer, 0, max); }

void CStream::GetStr255(unsigned char* buffer) {
  const auto length = static_cast<unsigned char>(GetChar());
  buffer[0] = 0;
  std::memset(buffer + 1, 0, length);
  GetRawDataFromStream(buffer + 1, length);
  buffer[0] = length;
}

void CStream::GetLimitedStr255(unsigned char* buffer, short max) {
  if (max <= 0) return;
  const auto stored = static_cast<unsigned char>(GetChar());
  const int count = stored < max - 1 ? stored : max - 1;
  buffer[0] = 0;
  std::memset(buffer + 1, 0, static_cast<std::size_t>(count));
  GetRawDataFromStream(buffer + 1, count);
  buffer[0] = static_cast<unsigned char>(count);
}

void CStream::GetLineAsStr255(unsigned char* buffer) {
  const int count = GetThruN(buffer + 1, kCarriageReturn, 255);
  const bool endsInCR = count > 0 && buffer[count] == kCarriageReturn;
  if (count == 255 && !endsInCR) FailStream(kLineTooLong);
  buffer[0] = static_cast<unsigned char>(endsInCR ? count - 1 : count);
}

char CStream::GetChar() { return GetBigEndian<char>(*this); }
bool CStream::GetBoolean() { return GetBigEndian<unsigned char>(*this) != 0; }
short CStream::GetShort() { return GetBigEndian<short>(*this); }
int CStream::GetLong() { return GetBigEndian<int>(*this); }
std::int64_t CStream::GetLongLong() { return GetBigEndian<std::int64_t>(*this); }

void CStream::GetPoint(tarnPoint& p) {
  p.v = GetShort();
  p.h = GetShort();
}

tarnPoint CStream::GetPoint() {
  tarnPoint p;
  GetPoint(p);
  return p;
}

void CStream::GetRect(tarnRect& r) {
  r.top = GetShort();
  r.left = GetShort();
  r.bottom = GetShort();
  r.right = GetShort();
}

tarnRect CStream::GetRect() {
  tarnRect r;
  GetRect(r);
  return r;
}

double CStream::_GetDouble() {
  char text[kMaxDoubleText + 1] = {};
  const int count = GetThruN(text, 0, kMaxDoubleText);
  if (count <= 0) FailStream(kNoNumberText);
  text[count] = 0;
  double value = 0;
  if (std::sscanf(text, "%lf", &value) != 1) FailStream(kNoNumberText);
  return value;
}

double CStream::GetIEEEDouble() { return GetBigEndian<double>(*this); }

void CStream::GetUString(UString& s) {
  const int stored = GetLong();
  const int count = stored < 0 ? 0 : (stored > kMaxUStringBytes ? kMaxUStringBytes : stored);
  const std::int64_t start = Position();
  std::string utf8(static_cast<std::size_t>(count), '\0');
  GetRawDataFromStream(utf8.data(), count);
  if (stored > count) MoveTo(start + stored);
  s = UString(utf8.data(), utf8.size(), UString::kUTF8Encoding);
}

void* CStream::GetPointer() {
  void* p = nullptr;
  GetRawDataFromStream(&p, sizeof p);
  return p;
}

auto_handle<char> CStream::GetHandle() { return GetHandleOfSize(GetLong()); }

auto_handle<char> CStream::GetHandleOfSize(int size) {
  if (size < 0) Failure(-50);
  RequireRemaining(size);
  auto_handle<char> h(NewHandle(static_cast<std::size_t>(size)));
  if (size > 0) GetRawDataFromStream(*h.get(), size);
  return h;
}

void CStream::GetCharArray(char* a, int count) {
  if (count <= 0) return;
  std::memset(a, 0, static_cast<std::size_t>(count));
  GetRawDataFromStream(a, count);
}

void CStream::GetUCharArray(unsigned char* a, int count) {
  if (count <= 0) return;
  std::memset(a, 0, static_cast<std::size_t>(count));
  GetRawDataFromStream(a, count);
}

void CStream::GetLongArray(int* a, int count) { GetSwappedArray(*this, a, count); }
void CStream::GetShortArray(short* a, int count) { GetSwappedArray(*this, a, count); }
void CStream::GetFloatArray(float* a, int count) { GetSwappedArray(*this, a, count); }

}  // namespace tarn
