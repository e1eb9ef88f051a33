#pragma once
// What every tarnfile command shares: its command line, the usage error,
// the file that is being worked on (named in error messages), opening a
// sound file through the format cache, and the names of sample formats and
// four-character tags as the tool spells them.
//
// Errors: a bad command line throws UsageError (exit status 2); everything
// else is a TarnError (exit status 1), reported with the file that
// CurrentFile names at the time of the throw.

#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "tarn/Audio/SampleFormat.h"
#include "tarn/Audio/SoundFileFormats/RIFFType.h"
#include "tarn/Audio/SoundFileFormats/SoundFileAttributes.h"
#include "tarn/FileSystem/FileSpecification.h"

namespace tarn {
class RIFFFileEditor;
class SoundFileFormat;
}  // namespace tarn

namespace tarnfile {

// A command line the command cannot run with; the text says why.
class UsageError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// The words after the command's name, split into positional arguments and
// options. `flags` take no value; `valued` take the next word (or the text
// after "="); a valued option may be repeated. "--help" is always known.
// Throws UsageError for an unknown option, a missing value, or a count of
// positional arguments outside [minPositional, maxPositional].
class CommandLine {
 public:
  CommandLine(const std::vector<std::string>& words, std::vector<std::string_view> flags,
              std::vector<std::string_view> valued, std::size_t minPositional,
              std::size_t maxPositional);

  [[nodiscard]] bool HelpAsked() const noexcept { return help_; }
  [[nodiscard]] const std::vector<std::string>& Positional() const noexcept { return positional_; }
  [[nodiscard]] bool Has(std::string_view name) const;
  // The last value given for `name`, if any.
  [[nodiscard]] std::optional<std::string> Value(std::string_view name) const;
  [[nodiscard]] std::vector<std::string> Values(std::string_view name) const;

 private:
  bool help_ = false;
  std::vector<std::string> positional_;
  std::map<std::string, std::vector<std::string>, std::less<>> options_;
};

// Names the file the current step works on, for the error message of a
// failure, for as long as the scope lives (scopes nest).
class FileScope {
 public:
  explicit FileScope(std::string path);
  FileScope(const FileScope&) = delete;
  FileScope& operator=(const FileScope&) = delete;
  ~FileScope();

 private:
  std::string previous_;
  int exceptions_;
};
[[nodiscard]] const std::string& CurrentFile() noexcept;

// The FileSpecification of a path given on the command line, made absolute.
[[nodiscard]] tarn::FileSpecification SpecForPath(const std::string& path);

// The container of a sound file as its first bytes show it.
// kConverter: a file only the outside converter reads (MP3, M4A, CAF...).
enum class Container { kRIFF, kWave64, kAIFF, kAIFC, kConverter, kUnknown };
[[nodiscard]] Container SniffContainer(const tarn::FileSpecification& spec);
[[nodiscard]] const char* FormatName(Container c) noexcept;     // "WAVE", "Wave64", "AIFF", "AIFC"
[[nodiscard]] const char* ContainerName(Container c) noexcept;  // "RIFF", "Wave64", "FORM",
                                                                // "converter"

// An existing WAVE, Wave64, AIFF or AIFC file, opened through the format
// cache and parsed; with `converterToo`, also a file the outside converter
// reads. A missing file throws the file system's -43; any other file throws
// the error of the reader its extension names (or the cache's
// unsupported-format error).
struct SoundFile {
  tarn::FileSpecification spec;
  Container container = Container::kUnknown;
  std::shared_ptr<tarn::SoundFileFormat> format;
  tarn::SoundFileAttributes attributes;
  std::int64_t frames = 0;
  // The file-type table's name of the format ("WAVE", "MP3 Audio", ...).
  std::string formatName;

  [[nodiscard]] bool IsWAVE() const noexcept {
    return container == Container::kRIFF || container == Container::kWave64;
  }
  // The tag of the audio chunk: "data" or "SSND".
  [[nodiscard]] tarn::RIFFType AudioTag() const noexcept;
};
[[nodiscard]] SoundFile OpenSoundFile(const std::string& path, bool converterToo = false);
// A chunk editor of the file with its container's handler, listed.
[[nodiscard]] std::unique_ptr<tarn::RIFFFileEditor> MakeChunkEditor(const SoundFile& file);
// MD5 of the audio payload (the frames only, from the audio offset), as 32
// lowercase hex digits; metadata edits never change it.
[[nodiscard]] std::string AudioPayloadMD5(const SoundFile& file);

// The tool's names of the sample formats: "u8", "s8", "s16", "s24",
// "s24in32", "f32", "f64" ("s32" is read as "s24in32": 32-bit integer
// samples on disk). Unknown names throw UsageError.
[[nodiscard]] const char* SampleFormatName(tarn::SampleFormat format) noexcept;
[[nodiscard]] tarn::SampleFormat ParseSampleFormat(const std::string& name);

// A tag given on the command line: one to four printable characters,
// padded with blanks ("fmt" is "fmt "). Throws UsageError otherwise.
[[nodiscard]] tarn::RIFFType ParseTag(const std::string& text);
// The tag's four characters with non-printable bytes as "\xNN".
[[nodiscard]] std::string TagText(tarn::RIFFType tag);

// Parses a whole decimal number or throws UsageError naming `what`.
[[nodiscard]] std::int64_t ParseInteger(const std::string& text, const char* what);
[[nodiscard]] double ParseNumber(const std::string& text, const char* what);

// Whole file contents, and writing bytes to a file (creating or replacing
// it). Failures throw the file system's errors naming the file.
[[nodiscard]] std::vector<std::uint8_t> ReadWholeFile(const std::string& path);
void WriteWholeFile(const std::string& path, const std::uint8_t* data, std::size_t size);

// Whether standard error is a terminal (progress is shown only there).
[[nodiscard]] bool StandardErrorIsTerminal() noexcept;
// Puts standard output in binary mode where text mode would change bytes.
void SetStandardOutputBinary() noexcept;

}  // namespace tarnfile
