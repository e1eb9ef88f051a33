#include "BextFields.h"

#include <cctype>
#include <cstdint>
#include <cstdio>
#include <limits>

#include "ToolSupport.h"

namespace tarnfile {

namespace {

using Bext = tarn::BWFBroadcastWaveExtension;

enum class Kind { kText, kUnsigned, kSigned, kUMID };

struct Field {
  const char* name;
  Kind kind;
  std::size_t size;              // bytes of a text field
  std::string Bext::*text;       // kText
  std::int16_t Bext::*loudness;  // kSigned
  std::int64_t min, max;         // kUnsigned, kSigned
};

// Fields in file order; the time reference and the version are handled apart.
const Field kFields[] = {
    {"description", Kind::kText, Bext::kDescriptionSize, &Bext::mDescription, nullptr, 0, 0},
    {"originator", Kind::kText, Bext::kOriginatorSize, &Bext::mOriginator, nullptr, 0, 0},
    {"originator_reference", Kind::kText, Bext::kOriginatorReferenceSize,
     &Bext::mOriginatorReference, nullptr, 0, 0},
    {"origination_date", Kind::kText, Bext::kOriginationDateSize, &Bext::mOriginationDate, nullptr,
     0, 0},
    {"origination_time", Kind::kText, Bext::kOriginationTimeSize, &Bext::mOriginationTime, nullptr,
     0, 0},
    {"time_reference", Kind::kUnsigned, 0, nullptr, nullptr, 0, 0},
    {"version", Kind::kUnsigned, 0, nullptr, nullptr, 0, 0xFFFF},
    {"umid", Kind::kUMID, 0, nullptr, nullptr, 0, 0},
    {"loudness_value", Kind::kSigned, 0, nullptr, &Bext::mLoudnessValue, -32768, 32767},
    {"loudness_range", Kind::kSigned, 0, nullptr, &Bext::mLoudnessRange, -32768, 32767},
    {"max_true_peak_level", Kind::kSigned, 0, nullptr, &Bext::mMaxTruePeakLevel, -32768, 32767},
    {"max_momentary_loudness", Kind::kSigned, 0, nullptr, &Bext::mMaxMomentaryLoudness, -32768,
     32767},
    {"max_short_term_loudness", Kind::kSigned, 0, nullptr, &Bext::mMaxShortTermLoudness, -32768,
     32767},
    {"coding_history", Kind::kText, 0, &Bext::mCodingHistory, nullptr, 0, 0},
};

bool IsTimeReference(const Field& f) { return std::string_view(f.name) == "time_reference"; }

std::string UMIDHex(const Bext& bext) {
  std::string hex;
  for (std::uint8_t b : bext.mUMID) {
    char two[3];
    std::snprintf(two, sizeof two, "%02x", b);
    hex += two;
  }
  return hex;
}

std::int64_t NumberOf(const Field& f, const Bext& bext) {
  if (IsTimeReference(f)) return static_cast<std::int64_t>(bext.GetTimeReference());
  if (f.kind == Kind::kUnsigned) return bext.mVersion;
  return bext.*f.loudness;
}

// Texts show with their line breaks spelled out, so each field stays one line.
std::string OneLine(const std::string& text) {
  std::string line;
  for (char c : text) {
    if (c == '\r')
      line += "\\r";
    else if (c == '\n')
      line += "\\n";
    else
      line += c;
  }
  return line;
}

}  // namespace

void PrintBextFields(const Bext& bext, const char* indent) {
  for (const Field& f : kFields) {
    std::printf("%s%-24s ", indent, f.name);
    if (f.kind == Kind::kText)
      std::printf("%s\n", OneLine(bext.*f.text).c_str());
    else if (f.kind == Kind::kUMID)
      std::printf("%s\n", UMIDHex(bext).c_str());
    else
      std::printf("%lld\n", static_cast<long long>(NumberOf(f, bext)));
  }
}

void WriteBextJson(JsonWriter& json, const Bext& bext) {
  json.BeginObject();
  for (const Field& f : kFields) {
    json.Key(f.name);
    if (f.kind == Kind::kText)
      json.String(bext.*f.text);
    else if (f.kind == Kind::kUMID)
      json.String(UMIDHex(bext));
    else
      json.Int(NumberOf(f, bext));
  }
  json.EndObject();
}

void SetBextField(Bext& bext, const std::string& name, const std::string& value) {
  for (const Field& f : kFields) {
    if (name != f.name) continue;
    switch (f.kind) {
      case Kind::kText:
        if (f.size != 0 && value.size() > f.size)
          throw UsageError(name + " holds at most " + std::to_string(f.size) + " bytes");
        bext.*f.text = value;
        return;
      case Kind::kUMID: {
        if (value.size() > 2 * Bext::kUMIDSize || value.size() % 2 != 0)
          throw UsageError("umid takes an even number of hex digits, at most 128");
        bext.mUMID.fill(0);
        for (std::size_t i = 0; i < value.size(); i += 2) {
          unsigned byte = 0;
          if (std::sscanf(value.c_str() + i, "%2x", &byte) != 1 ||
              !std::isxdigit(static_cast<unsigned char>(value[i])) ||
              !std::isxdigit(static_cast<unsigned char>(value[i + 1])))
            throw UsageError("umid takes hex digits: '" + value + "'");
          bext.mUMID[i / 2] = static_cast<std::uint8_t>(byte);
        }
        return;
      }
      case Kind::kUnsigned:
      case Kind::kSigned: {
        const std::int64_t n = ParseInteger(value, f.name);
        if (IsTimeReference(f)) {
          if (n < 0) throw UsageError("time_reference cannot be negative");
          bext.mTimeReferenceLow = static_cast<std::uint32_t>(n);
          bext.mTimeReferenceHigh = static_cast<std::uint32_t>(static_cast<std::uint64_t>(n) >> 32);
          return;
        }
        if (n < f.min || n > f.max)
          throw UsageError(name + " must lie in " + std::to_string(f.min) + ".." +
                           std::to_string(f.max));
        if (f.kind == Kind::kUnsigned)
          bext.mVersion = static_cast<std::uint16_t>(n);
        else
          bext.*f.loudness = static_cast<std::int16_t>(n);
        return;
      }
    }
  }
  throw UsageError("unknown bext field '" + name + "'");
}

}  // namespace tarnfile
