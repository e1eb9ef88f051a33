#include "ToolSupport.h"

#include <algorithm>
#include <charconv>
#include <cstdio>
#include <exception>
#include <filesystem>
#include <limits>

#include <nettle/md5.h>

#include "tarn/Audio/SoundFileFormats/RIFFFileEditor.h"
#include "tarn/Audio/SoundFileFormats/RIFFFormatHandlers.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"
#include "tarn/Audio/SoundFileFormats/SoundFileProbes.h"
#include "tarn/Errors/Fail.h"
#include "tarn/FileSystem/File.h"
#include "tarn/Streams/CFileStream.h"

namespace tarnfile {

using tarn::FileSpecification;
using tarn::MakeRIFFType;
using tarn::UString;

// ---------------------------------------------------------------- command line

CommandLine::CommandLine(const std::vector<std::string>& words, std::vector<std::string_view> flags,
                         std::vector<std::string_view> valued, std::size_t minPositional,
                         std::size_t maxPositional) {
  const auto known = [](const std::vector<std::string_view>& list, std::string_view name) {
    return std::find(list.begin(), list.end(), name) != list.end();
  };
  bool optionsEnded = false;
  for (std::size_t i = 0; i < words.size(); ++i) {
    const std::string& word = words[i];
    if (optionsEnded || word.size() < 2 || word.compare(0, 2, "--") != 0) {
      if (!optionsEnded && word == "-h") {
        help_ = true;
        continue;
      }
      positional_.push_back(word);
      continue;
    }
    if (word == "--") {
      optionsEnded = true;
      continue;
    }
    const std::size_t equals = word.find('=');
    const std::string name = word.substr(2, equals == std::string::npos ? equals : equals - 2);
    if (name == "help") {
      help_ = true;
    } else if (known(flags, name)) {
      if (equals != std::string::npos) throw UsageError("--" + name + " takes no value");
      options_[name];
    } else if (known(valued, name)) {
      if (equals != std::string::npos) {
        options_[name].push_back(word.substr(equals + 1));
      } else if (i + 1 < words.size()) {
        options_[name].push_back(words[++i]);
      } else {
        throw UsageError("--" + name + " needs a value");
      }
    } else {
      throw UsageError("unknown option --" + name);
    }
  }
  if (help_) return;
  if (positional_.size() < minPositional) throw UsageError("missing argument");
  if (positional_.size() > maxPositional) throw UsageError("too many arguments");
}

bool CommandLine::Has(std::string_view name) const { return options_.find(name) != options_.end(); }

std::optional<std::string> CommandLine::Value(std::string_view name) const {
  const auto it = options_.find(name);
  if (it == options_.end() || it->second.empty()) return std::nullopt;
  return it->second.back();
}

std::vector<std::string> CommandLine::Values(std::string_view name) const {
  const auto it = options_.find(name);
  return it == options_.end() ? std::vector<std::string>{} : it->second;
}

// ---------------------------------------------------------------- current file

namespace {
std::string& CurrentFileSlot() {
  static std::string current;
  return current;
}
}  // namespace

FileScope::FileScope(std::string path)
    : previous_(std::move(CurrentFileSlot())), exceptions_(std::uncaught_exceptions()) {
  CurrentFileSlot() = std::move(path);
}

FileScope::~FileScope() {
  // While a failure unwinds, the file it concerns stays named for its report.
  if (std::uncaught_exceptions() == exceptions_) CurrentFileSlot() = std::move(previous_);
}

const std::string& CurrentFile() noexcept { return CurrentFileSlot(); }

FileSpecification SpecForPath(const std::string& path) {
  std::error_code error;
  std::filesystem::path absolute = std::filesystem::absolute(std::filesystem::u8path(path), error);
  if (error) absolute = std::filesystem::u8path(path);
  const auto text = absolute.lexically_normal().u8string();
  return FileSpecification(UString(reinterpret_cast<const char*>(text.c_str()), text.size()));
}

// ---------------------------------------------------------------- sound files

Container SniffContainer(const FileSpecification& spec) {
  // The Wave64 container identifier: "riff" and twelve fixed bytes.
  static constexpr std::uint8_t kWave64Tail[12] = {0x2E, 0x91, 0xCF, 0x11, 0xA5, 0xD6,
                                                   0x28, 0xDB, 0x04, 0xC1, 0x00, 0x00};
  std::uint8_t head[12] = {};
  tarn::CFileStream stream(spec, 64);
  stream.Open(tarn::kTCLReadMode);
  if (stream.Size() < 12) return Container::kUnknown;
  stream.GetRawDataFromStream(head, 12);
  stream.Close();
  const tarn::RIFFType id = tarn::RIFFTypeFromChars(reinterpret_cast<const char*>(head));
  const tarn::RIFFType form = tarn::RIFFTypeFromChars(reinterpret_cast<const char*>(head + 8));
  if (id == MakeRIFFType("RIFF") && form == MakeRIFFType("WAVE")) return Container::kRIFF;
  if (id == MakeRIFFType("riff") && std::equal(head + 4, head + 12, kWave64Tail))
    return Container::kWave64;
  if (id == MakeRIFFType("FORM") && form == MakeRIFFType("AIFF")) return Container::kAIFF;
  if (id == MakeRIFFType("FORM") && form == MakeRIFFType("AIFC")) return Container::kAIFC;
  return Container::kUnknown;
}

const char* FormatName(Container c) noexcept {
  switch (c) {
    case Container::kRIFF:
      return "WAVE";
    case Container::kWave64:
      return "Wave64";
    case Container::kAIFF:
      return "AIFF";
    case Container::kAIFC:
      return "AIFC";
    case Container::kConverter:
      return "converted";
    case Container::kUnknown:
      break;
  }
  return "unknown";
}

const char* ContainerName(Container c) noexcept {
  switch (c) {
    case Container::kRIFF:
      return "RIFF";
    case Container::kWave64:
      return "Wave64";
    case Container::kAIFF:
    case Container::kAIFC:
      return "FORM";
    case Container::kConverter:
      return "converter";
    case Container::kUnknown:
      break;
  }
  return "unknown";
}

tarn::RIFFType SoundFile::AudioTag() const noexcept {
  return IsWAVE() ? MakeRIFFType("data") : MakeRIFFType("SSND");
}

SoundFile OpenSoundFile(const std::string& path, bool converterToo) {
  SoundFile file;
  file.spec = FileSpecification(SpecForPath(path).GetFullPath(), tarn::kMissingFileSpecFails);
  if (!file.spec.IsFile()) tarn::FailFSErr(-43, file.spec);
  file.container = SniffContainer(file.spec);
  std::uint32_t type = 0;
  if (file.container == Container::kRIFF || file.container == Container::kWave64)
    type = MakeRIFFType("WAVE");
  else if (file.container != Container::kUnknown)
    type = MakeRIFFType("AIFF");  // AIFC files too: one format class reads both forms
  else
    type = tarn::File(file.spec).GetType();
  try {
    file.format = tarn::SoundFileFormatCache::Instance().GetFormat(file.spec, type);
    file.attributes = file.format->GetFileAttributes();
    file.frames = file.format->GetLengthInFrames().AsLongLong();
    if (file.container == Container::kUnknown && converterToo &&
        file.format->FormatRequiresExternalConversion())
      file.container = Container::kConverter;
    if (file.container == Container::kUnknown)
      tarn::FailFormatError("tarnfile", tarn::kParamErr, file.spec);
    // The container's own name where there is one; the file-type table's
    // for a converted file.
    file.formatName = FormatName(file.container);
    if (file.container == Container::kConverter) {
      tarn::UString name;
      file.format->GetFormatName(name);
      if (!name.empty()) file.formatName = name.utf8_str();
    }
  } catch (...) {
    if (file.container == Container::kUnknown)
      std::fprintf(stderr, "tarnfile: %s: not a WAVE, Wave64, AIFF or AIFC file%s\n", path.c_str(),
                   converterToo ? ", nor one the outside converter reads" : "");
    throw;
  }
  return file;
}

std::unique_ptr<tarn::RIFFFileEditor> MakeChunkEditor(const SoundFile& file) {
  std::unique_ptr<tarn::RIFFFileEditor> editor;
  if (file.IsWAVE())
    editor = std::make_unique<tarn::RIFFFileEditor>(file.spec, tarn::kRIFFLittleEndian,
                                                    tarn::GetWaveRIFFFormatHandler());
  else
    editor = std::make_unique<tarn::RIFFFileEditor>(file.spec, tarn::kRIFFBigEndian,
                                                    tarn::GetAIFFRIFFFormatHandler());
  editor->ReadChunkLocations(nullptr);
  return editor;
}

std::string AudioPayloadMD5(const SoundFile& file) {
  constexpr int kBlock = 1 << 20;
  tarn::CFileStream stream(file.spec, kBlock);
  stream.Open(tarn::kTCLReadMode);
  std::int64_t left = file.frames * file.attributes.mBytesPerFrame;
  stream.MoveTo(file.attributes.mOffsetToAudio);
  std::vector<std::uint8_t> block(kBlock);
  md5_ctx context;
  md5_init(&context);
  while (left > 0) {
    const int count = static_cast<int>(std::min<std::int64_t>(left, kBlock));
    stream.GetRawDataFromStream(block.data(), count);
    md5_update(&context, static_cast<std::size_t>(count), block.data());
    left -= count;
  }
  stream.Close();
  std::uint8_t digest[MD5_DIGEST_SIZE];
  md5_digest(&context, MD5_DIGEST_SIZE, digest);
  static constexpr char kHex[] = "0123456789abcdef";
  std::string text;
  for (std::uint8_t b : digest) {
    text += kHex[b >> 4];
    text += kHex[b & 15];
  }
  return text;
}

// ---------------------------------------------------------------- names

namespace {
struct FormatNameEntry {
  const char* name;
  tarn::SampleFormat format;
};
constexpr FormatNameEntry kFormatNames[] = {
    {"u8", tarn::kSamp8Offset},
    {"s8", tarn::kSamp8},
    {"s16", tarn::kSamp16},
    {"s24", tarn::kSamp24},
    {"s24in32", tarn::kSampUnpacked24},
    {"s32", tarn::kSampUnpacked24},
    {"f32", tarn::kSampFloat32},
    {"f64", tarn::kSampWide64B},
};
}  // namespace

const char* SampleFormatName(tarn::SampleFormat format) noexcept {
  for (const auto& entry : kFormatNames)
    if (entry.format == format) return entry.name;
  return format == tarn::kSampWide64A ? "wide64a" : "unknown";
}

tarn::SampleFormat ParseSampleFormat(const std::string& name) {
  for (const auto& entry : kFormatNames)
    if (name == entry.name) return entry.format;
  throw UsageError("unknown sample format '" + name +
                   "' (u8, s8, s16, s24, s24in32, s32, f32, f64)");
}

tarn::RIFFType ParseTag(const std::string& text) {
  if (text.empty() || text.size() > 4) throw UsageError("a tag has one to four characters");
  char chars[4] = {' ', ' ', ' ', ' '};
  for (std::size_t i = 0; i < text.size(); ++i) {
    if (text[i] < 0x20 || text[i] > 0x7E) throw UsageError("a tag is printable ASCII");
    chars[i] = text[i];
  }
  return tarn::RIFFTypeFromChars(chars);
}

std::string TagText(tarn::RIFFType tag) { return tarn::RIFFTypeToString(tag); }

std::int64_t ParseInteger(const std::string& text, const char* what) {
  std::int64_t value = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
  if (error != std::errc() || end != text.data() + text.size() || text.empty())
    throw UsageError(std::string(what) + " must be a whole number: '" + text + "'");
  return value;
}

double ParseNumber(const std::string& text, const char* what) {
  double value = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
  if (error != std::errc() || end != text.data() + text.size() || text.empty() ||
      !(value == value) || value > std::numeric_limits<double>::max() ||
      value < -std::numeric_limits<double>::max())
    throw UsageError(std::string(what) + " must be a number: '" + text + "'");
  return value;
}

std::vector<std::uint8_t> ReadWholeFile(const std::string& path) {
  FileScope scope(path);
  const FileSpecification spec(SpecForPath(path).GetFullPath(), tarn::kMissingFileSpecFails);
  tarn::CFileStream stream(spec);
  stream.Open(tarn::kTCLReadMode);
  const std::int64_t size = stream.Size();
  if (size > std::numeric_limits<std::int32_t>::max()) tarn::FailFSErr(tarn::kParamErr, spec);
  std::vector<std::uint8_t> bytes(static_cast<std::size_t>(size));
  if (size > 0) stream.GetRawDataFromStream(bytes.data(), static_cast<int>(size));
  stream.Close();
  return bytes;
}

void WriteWholeFile(const std::string& path, const std::uint8_t* data, std::size_t size) {
  FileScope scope(path);
  tarn::CFileStream stream(SpecForPath(path));
  stream.Open(tarn::kTCLWriteMode);
  constexpr std::size_t kStep = 1 << 20;
  for (std::size_t done = 0; done < size; done += kStep)
    stream.PutRawDataToStream(data + done, static_cast<int>(std::min(kStep, size - done)));
  stream.Close();
}

}  // namespace tarnfile
