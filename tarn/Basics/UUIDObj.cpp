#include "tarn/Basics/UUIDObj.h"

#include <cstring>

#include "tarn/Errors/Fail.h"
#include "tarn/Streams/CStream.h"

namespace tarn {

namespace {

// Offsets of the 32 hex digits in "xxxxxxxx-xxxx-xxxx-xxxx-xxxxxxxxxxxx".
constexpr std::size_t kTextLength = 36;
constexpr bool IsHyphenAt(std::size_t i) { return i == 8 || i == 13 || i == 18 || i == 23; }

int HexValue(unsigned short c) {
  if (c >= '0' && c <= '9') return c - '0';
  if (c >= 'a' && c <= 'f') return c - 'a' + 10;
  if (c >= 'A' && c <= 'F') return c - 'A' + 10;
  return -1;
}

}  // namespace

UUIDObj::UUIDObj(const TarnCOM::UUIDBytes& bytes) noexcept {
  std::memcpy(fBytes.data(), bytes.bytes, 16);
}

UUIDObj::UUIDObj(const UString& text) {
  if (text.empty()) return;
  std::size_t start = 0;
  std::size_t length = text.length();
  if (length == kTextLength + 2 && text[0] == '{' && text[length - 1] == '}') {
    start = 1;
    length -= 2;
  }
  if (length != kTextLength) FailOSErr(kParamErr);
  std::size_t out = 0;
  for (std::size_t i = 0; i < kTextLength; ++i) {
    const unsigned short c = text[start + i];
    if (IsHyphenAt(i)) {
      if (c != '-') FailOSErr(kParamErr);
      continue;
    }
    const int v = HexValue(c);
    if (v < 0) FailOSErr(kParamErr);
    fBytes[out / 2] = std::uint8_t(out % 2 == 0 ? v << 4 : fBytes[out / 2] | v);
    ++out;
  }
}

UString UUIDObj::GetString() const {
  static const char kHex[] = "0123456789abcdef";
  char text[kTextLength + 1];
  std::size_t in = 0;
  for (std::size_t i = 0; i < kTextLength; ++i) {
    if (IsHyphenAt(i)) {
      text[i] = '-';
      continue;
    }
    const std::uint8_t b = fBytes[in / 2];
    text[i] = kHex[in % 2 == 0 ? b >> 4 : b & 15];
    ++in;
  }
  text[kTextLength] = 0;
  return UString(text);
}

TarnCOM::UUIDBytes UUIDObj::GetUUIDBytes() const noexcept {
  TarnCOM::UUIDBytes bytes;
  std::memcpy(bytes.bytes, fBytes.data(), 16);
  return bytes;
}

void UUIDObj::PutTo(CStream& stream) const {
  stream.PutChar(char(kStreamVersion));
  stream.PutRawDataToStream(fBytes.data(), 16);
}

void UUIDObj::GetFrom(CStream& stream) {
  const char version = stream.GetChar();
  std::array<std::uint8_t, 16> bytes;
  stream.GetRawDataFromStream(bytes.data(), 16);
  if (version == 1) {
    char skipped[2];
    stream.GetRawDataFromStream(skipped, 2);
  }
  fBytes = bytes;
}

}  // namespace tarn
