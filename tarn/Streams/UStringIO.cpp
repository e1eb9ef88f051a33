#include "tarn/Streams/UStringIO.h"

#include <cstring>
#include <string>
#include <vector>

#include "tarn/String/UString.h"

namespace tarn {
namespace {

constexpr auto kEncoding = UString::kSystemEncoding;
constexpr char kReplacement = '?';
constexpr int kMaxStrBytes = 1000;

UString Decode(const void* bytes, std::size_t count) {
  return UString(static_cast<const char*>(bytes), count, kEncoding);
}

}  // namespace

void PutUStringAsCharArray(CStream& stream, const UString& s) {
  const std::string bytes = s.string(kEncoding, kReplacement);
  stream.PutCharArray(bytes.data(), static_cast<int>(bytes.size()));
}

void PutUStringAsStr(CStream& stream, const UString& s) {
  const std::string bytes = s.string(kEncoding, kReplacement, true);
  stream.PutStr(bytes.c_str());
}

void PutUStringAsStr255(CStream& stream, const UString& s) {
  unsigned char pascal[256] = {};
  s.pstring(pascal, sizeof pascal, kEncoding, kReplacement);
  stream.PutStr255(pascal);
}

void PutUStringAsFixedSizeUCharArray(CStream& stream, int size, const UString& s) {
  if (size <= 0) return;
  std::vector<unsigned char> field(static_cast<std::size_t>(size), 0);
  s.pstring(field.data(), size - 1, kEncoding, kReplacement);
  stream.PutUCharArray(field.data(), size);
}

void GetCharArrayAsUString(CStream& stream, int count, UString& s) {
  if (count <= 0) {
    s.clear();
    return;
  }
  std::vector<char> bytes(static_cast<std::size_t>(count), 0);
  stream.GetCharArray(bytes.data(), count);
  s = Decode(bytes.data(), bytes.size());
}

void GetUCharArrayAsUString(CStream& stream, int count, UString& s) {
  if (count <= 0) {
    s.clear();
    return;
  }
  std::vector<unsigned char> bytes(static_cast<std::size_t>(count), 0);
  stream.GetUCharArray(bytes.data(), count);
  s = Decode(bytes.data(), bytes.size());
}

void GetFixedSizeUCharArrayAsUString(CStream& stream, int size, UString& s) {
  s.clear();
  if (size <= 0) return;
  std::vector<unsigned char> field(static_cast<std::size_t>(size), 0);
  stream.GetUCharArray(field.data(), size);
  const std::size_t length = field[0] < size - 1 ? field[0] : static_cast<std::size_t>(size - 1);
  s = Decode(field.data() + 1, length);
}

void GetStr255AsUString(CStream& stream, UString& s) {
  unsigned char pascal[256] = {};
  stream.GetStr255(pascal);
  s = Decode(pascal + 1, pascal[0]);
}

void GetLimitedStr255AsUString(CStream& stream, UString& s, short max) {
  unsigned char pascal[256] = {};
  stream.GetLimitedStr255(pascal, max > 256 ? short{256} : max);
  s = Decode(pascal + 1, pascal[0]);
}

void GetStrAsUString(CStream& stream, UString& s) {
  char text[kMaxStrBytes + 1] = {};
  stream.GetStr(text, kMaxStrBytes);
  s = Decode(text, std::strlen(text));
}

}  // namespace tarn
