#include "tarn/FileSystem/FileTypes.h"

#include <array>
#include <mutex>
#include <shared_mutex>
#include <utility>

namespace tarn {

namespace {

struct TableRow {
  FileTypeClass type;
  const char* ext1;
  const char* ext2;  // "" when the row has one extension; it still matches ""
};

// Searched in order; the first match wins (so "wav" is "WAVE", "WAVE" is "wav").
constexpr std::array<TableRow, 64> kTable{{
    {"MooV", "mov", ""},
    {"VfW ", "avi", ""},
    {"mpg4", "mp4", "mpg4"},
    {"MPEG", "mpg", "mpeg"},
    {"M4V ", "m4v", ""},
    {"dvc!", "dv", "dif"},
    {"wmv ", "wmv", ""},
    {"AIFF", "aif", "aiff"},
    {"SFIL", "sd", "dig"},
    {"Sd2f", "sd2", ""},
    {"WAVE", "wav", "wave"},
    {".WAV", "wav", "wave"},
    {".wav", "wav", "wave"},
    {".W64", "w64", ""},
    {"WAVE", "bwf", ""},
    {"PNRA", "wav", "wave"},
    {"MPG3", "mp3", "mpg3"},
    {"Mp3 ", "mp3", "mpg3"},
    {"SwaT", "mp3", "mpg3"},
    {"PLAY", "mp3", "mpg3"},
    {"MP3 ", "mp3", "mpg3"},
    {"mp3 ", "mp3", "mpg3"},
    {"3GPM", "mp3", "mpg3"},
    {"M4A ", "m4a", ""},
    {"caff", "caf", ""},
    {"CAFF", "caf", ""},
    {"AIFC", "aifc", ""},
    {"3gp ", "3gp", ""},
    {"3gp2", "3g2", ""},
    {"REX ", "rx", "rex"},
    {"RCSO", "rcy", ""},
    {"REX2", "rx2", "rex2"},
    {"RTMP", "rtm", "rtmp"},
    {"wma ", "wma", ""},
    {"MPEG", "mpeg", ""},
    {"OMFI", "omf", ""},
    {"AAFf", "aaf", ""},
    {"scGR", "grv", ""},
    {".exs", "exs", ""},
    {"sysX", "syx", "sysx"},
    {0x00477276, "grv", "groove"},
    {"TEXT", "txt", ""},
    {"Midi", "mid", "midi"},
    {"Midi", "smf", ""},
    {"html", "html", "htm"},
    {"XML ", "xml", ""},
    {"APPL", "exe", ""},
    // The host applications' own files.
    {"TrnD", "tarn", "trn"},          // project document
    {"TrnB", "tarnbak", "trnbak"},    // project backup
    {"TrnT", "tarntemplate", "trt"},  // project template
    {"TrnS", "tsession", ""},         // session
    {"TrnC", "tclip", "clip"},        // clip
    {"TrnA", "tclips", ""},           // clip archive
    {"TrnK", "tkeys", "keys"},        // key bindings
    {"TrnG", "tgroove", ""},          // groove template
    {"TrnQ", "tquant", ""},           // quantise template
    {"TrnL", "tloop", ""},            // loop
    {"TrnI", "tinst", ""},            // instrument
    {"TrnP", "tpreset", ""},          // plug-in preset
    {"TrnM", "tmix", ""},             // mix preset
    {"TrnR", "trgn", ""},             // region list
    {"TrnX", "tmarker", ""},          // markers
    {"TrnW", "twksp", ""},            // workspace
    {"TrnY", "tstyle", ""},           // style sheet
}};

// The table's extensions as UStrings, built once.
struct UTableRow {
  FileTypeClass type;
  UString ext1;
  UString ext2;
};

const std::array<UTableRow, 64>& UTable() {
  static const std::array<UTableRow, 64> table = [] {
    std::array<UTableRow, 64> t;
    for (std::size_t i = 0; i < kTable.size(); ++i)
      t[i] = {kTable[i].type, UString(kTable[i].ext1), UString(kTable[i].ext2)};
    return t;
  }();
  return table;
}

struct Registered {
  FileTypeClass type;
  std::vector<UString> extensions;
};

std::shared_mutex& RegisteredLock() {
  static std::shared_mutex lock;
  return lock;
}

std::vector<Registered>& RegisteredTypes() {
  static std::vector<Registered> types;
  return types;
}

bool SameExtension(const UString& a, const UString& b) {
  return a.equal(b, UString::kIgnoreCase);  // ignore case
}

}  // namespace

bool ExtensionToFileType(const UString& extension, FileTypeClass& type) {
  type = 0;
  {
    std::shared_lock<std::shared_mutex> guard(RegisteredLock());
    for (const Registered& entry : RegisteredTypes())
      for (const UString& e : entry.extensions)
        if (SameExtension(extension, e)) {
          type = entry.type;
          return true;
        }
  }
  for (const UTableRow& row : UTable())
    if (SameExtension(extension, row.ext1) || SameExtension(extension, row.ext2)) {
      type = row.type;
      return true;
    }
  return false;
}

bool FileTypeToExtensionList(FileTypeClass type, std::vector<UString>& extensions) {
  extensions.clear();
  {
    std::shared_lock<std::shared_mutex> guard(RegisteredLock());
    for (const Registered& entry : RegisteredTypes())
      if (entry.type == type) {
        extensions = entry.extensions;
        return !extensions.empty();
      }
  }
  for (const UTableRow& row : UTable())
    if (row.type == type) {
      extensions.push_back(row.ext1);
      if (!row.ext2.empty()) extensions.push_back(row.ext2);
      return true;
    }
  return false;
}

bool FileTypeToExtension(FileTypeClass type, UString& extension) {
  std::vector<UString> list;
  if (!FileTypeToExtensionList(type, list)) {
    extension.clear();
    return false;
  }
  extension = list.front();
  return true;
}

void RegisterFileType(FileTypeClass type, const std::vector<UString>& extensions) {
  std::unique_lock<std::shared_mutex> guard(RegisteredLock());
  RegisteredTypes().push_back({type, extensions});
}

FileTypeClass FileTypeFromName(const UString& name) {
  const std::size_t dot = name.rfind('.');
  if (dot == UString::npos) return kNoExtensionFileType;
  FileTypeClass type;
  ExtensionToFileType(name.substr(dot + 1), type);
  return type;
}

}  // namespace tarn
