#pragma once
// JsonWriter: builds one line of JSON text, keys in the order they are
// written. Strings are written as UTF-8; a byte that is not part of a valid
// UTF-8 sequence is written as the code point of the same value (as if the
// text were Latin-1), so any bytes give valid JSON. Numbers that are not
// finite are written as null. Misuse (a value without a key inside an
// object) is the caller's bug and is not checked.
//
//   std::string line;
//   JsonWriter json(line);
//   json.BeginObject();
//   json.Key("frames").Int(48000);
//   json.EndObject();   // line == {"frames":48000}

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace tarnfile {

class JsonWriter {
 public:
  explicit JsonWriter(std::string& out) : out_(out) {}
  JsonWriter(const JsonWriter&) = delete;
  JsonWriter& operator=(const JsonWriter&) = delete;

  JsonWriter& BeginObject();
  JsonWriter& EndObject();
  JsonWriter& BeginArray();
  JsonWriter& EndArray();
  JsonWriter& Key(std::string_view key);
  JsonWriter& String(std::string_view text);
  JsonWriter& Int(std::int64_t value);
  JsonWriter& Number(double value);
  JsonWriter& Bool(bool value);
  JsonWriter& Null();

  // `text` as a quoted JSON string.
  static void AppendQuoted(std::string& out, std::string_view text);

 private:
  void BeforeValue();

  std::string& out_;
  std::vector<bool> first_;  // per open container: nothing written in it yet
  bool afterKey_ = false;
};

}  // namespace tarnfile
