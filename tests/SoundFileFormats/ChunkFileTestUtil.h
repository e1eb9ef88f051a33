#pragma once
// Shared helpers of the sound-file tests: byte images of chunked files built
// chunk by chunk, temporary files, and the error a call throws.

#include <gtest/gtest.h>

#include <cstdint>
#include <filesystem>
#include <fstream>
#include <functional>
#include <initializer_list>
#include <iterator>
#include <optional>
#include <random>
#include <string>
#include <vector>

#include "tarn/Audio/SoundFileFormats/RIFFFileEditor.h"
#include "tarn/Audio/SoundFileFormats/RIFFFormatHandlers.h"
#include "tarn/Errors/TarnError.h"
#include "tarn/FileSystem/FileSpecification.h"

namespace tarn::test {

using Bytes = std::vector<std::uint8_t>;

// `n` bytes of `v`, least significant first.
inline Bytes LE(std::uint64_t v, int n) {
  Bytes out;
  for (int i = 0; i < n; ++i) out.push_back(static_cast<std::uint8_t>(v >> (8 * i)));
  return out;
}
// The parts one after the other.
inline Bytes Cat(std::initializer_list<Bytes> parts) {
  Bytes out;
  for (const auto& p : parts) out.insert(out.end(), p.begin(), p.end());
  return out;
}

enum class Container { kRIFF, kFORM, kWave64 };

inline bool IsWave64(Container c) { return c == Container::kWave64; }
inline RIFFFileEndian EndianOf(Container c) {
  return c == Container::kFORM ? kRIFFBigEndian : kRIFFLittleEndian;
}
inline RIFFFileEditor::FormatHandler& HandlerOf(Container c) {
  if (c == Container::kFORM) return GetAIFFRIFFFormatHandler();
  return GetWaveRIFFFormatHandler();
}
inline RIFFType AudioTagOf(Container c) {
  return c == Container::kFORM ? MakeRIFFType("SSND") : MakeRIFFType("data");
}
inline int HeaderSizeOf(Container c) { return IsWave64(c) ? 24 : 8; }
inline const char* NameOf(Container c) {
  return c == Container::kRIFF ? "RIFF" : c == Container::kFORM ? "FORM" : "Wave64";
}

// One chunk of a built file. `size` overrides the size field (the payload
// length otherwise; in Wave64 the field adds the 24-byte header to either);
// `pad` false leaves out the pad bytes.
struct ChunkSpec {
  RIFFType tag;
  Bytes payload;
  std::optional<std::uint64_t> size = std::nullopt;
  bool pad = true;
};

inline Bytes Text(std::string_view text) { return Bytes(text.begin(), text.end()); }

// `count` bytes counting up from `seed`, so moved or mixed-up bytes show.
inline Bytes Pattern(std::size_t count, std::uint8_t seed = 1) {
  Bytes bytes(count);
  for (std::size_t i = 0; i < count; ++i) bytes[i] = static_cast<std::uint8_t>(seed + i * 7);
  return bytes;
}

inline void PutTag(Bytes& out, RIFFType tag, Container c) {
  if (IsWave64(c)) {
    const UUIDObj id = GetWaveRIFFFormatHandler().UUIDForTag(tag, true);
    out.insert(out.end(), id.GetBytes().begin(), id.GetBytes().end());
    return;
  }
  for (int shift = 24; shift >= 0; shift -= 8)
    out.push_back(static_cast<std::uint8_t>(tag >> shift));
}

inline void PutSize(Bytes& out, std::uint64_t size, Container c) {
  const int bytes = IsWave64(c) ? 8 : 4;
  for (int i = 0; i < bytes; ++i) {
    const int shift = c == Container::kFORM ? 8 * (bytes - 1 - i) : 8 * i;
    out.push_back(static_cast<std::uint8_t>(size >> shift));
  }
}

inline std::size_t Padded(std::size_t n, Container c) {
  return IsWave64(c) ? (n + 7) / 8 * 8 : n + (n & 1);
}

// The image of one chunk, header and padded payload.
inline Bytes ChunkImage(const ChunkSpec& chunk, Container c) {
  Bytes out;
  PutTag(out, chunk.tag, c);
  const std::uint64_t header = IsWave64(c) ? 24 : 0;
  PutSize(out, chunk.size.value_or(chunk.payload.size()) + header, c);
  out.insert(out.end(), chunk.payload.begin(), chunk.payload.end());
  if (chunk.pad) out.resize(out.size() + Padded(chunk.payload.size(), c) - chunk.payload.size());
  return out;
}

// A whole file: the container header with a correct size, then the chunks.
inline Bytes FileImage(const std::vector<ChunkSpec>& chunks, Container c) {
  Bytes body;
  for (const auto& chunk : chunks) {
    const Bytes image = ChunkImage(chunk, c);
    body.insert(body.end(), image.begin(), image.end());
  }
  Bytes out;
  const RIFFType container = c == Container::kFORM ? MakeRIFFType("FORM") : MakeRIFFType("RIFF");
  const RIFFType form = c == Container::kFORM ? MakeRIFFType("AIFF") : MakeRIFFType("WAVE");
  PutTag(out, container, c);
  const std::size_t formSize = IsWave64(c) ? 16 : 4;
  PutSize(out, IsWave64(c) ? 24 + formSize + body.size() : formSize + body.size(), c);
  PutTag(out, form, c);
  out.insert(out.end(), body.begin(), body.end());
  return out;
}

// A scratch folder removed with the fixture.
class TempDir {
 public:
  TempDir() {
    const auto* info = ::testing::UnitTest::GetInstance()->current_test_info();
    // One token per process: several copies of the suite (other worktrees,
    // other presets) may run at once on the same machine.
    static const std::string token = std::to_string(std::random_device{}());
    std::string name = "tarn-sff-" + token + "-";
    if (info != nullptr) name += std::string(info->test_suite_name()) + "-" + info->name();
    for (char& ch : name)
      if (ch == '/') ch = '_';
    path_ = std::filesystem::temp_directory_path() / name;
    std::filesystem::remove_all(path_);
    std::filesystem::create_directories(path_);
  }
  TempDir(const TempDir&) = delete;
  TempDir& operator=(const TempDir&) = delete;
  ~TempDir() {
    std::error_code ignored;
    std::filesystem::remove_all(path_, ignored);
  }
  [[nodiscard]] std::filesystem::path Path(const std::string& name) const { return path_ / name; }

 private:
  std::filesystem::path path_;
};

inline void WriteFile(const std::filesystem::path& path, const Bytes& bytes) {
  std::ofstream out(path, std::ios::binary | std::ios::trunc);
  out.write(reinterpret_cast<const char*>(bytes.data()),
            static_cast<std::streamsize>(bytes.size()));
  ASSERT_TRUE(out.good()) << path;
}

inline Bytes ReadFile(const std::filesystem::path& path) {
  std::ifstream in(path, std::ios::binary);
  return Bytes(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

inline FileSpecification SpecOf(const std::filesystem::path& path) {
  return FileSpecification(UString(reinterpret_cast<const char*>(path.u8string().c_str())));
}

// The error `action` throws (nullopt if it returns).
inline std::optional<TarnError> ErrorOf(const std::function<void()>& action) {
  try {
    action();
  } catch (const TarnError& e) {
    return e;
  }
  return std::nullopt;
}

}  // namespace tarn::test
