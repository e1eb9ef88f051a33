#pragma once
// What the fuzz targets share: the check that stops a run on a violated
// invariant, and scratch files. Each process writes its inputs to files
// of its own (named after the process id), in /dev/shm where it exists so
// that no run waits for a disk, and removes them when it exits. A failure to
// write or read them ends the run at once: it says nothing about the code
// under test.

#include <unistd.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <system_error>
#include <vector>

namespace tarn::fuzz {

using Bytes = std::vector<std::uint8_t>;

// Ends the run; libFuzzer keeps the input that got here.
[[noreturn]] inline void Violation(const char* what, std::int64_t a = 0, std::int64_t b = 0) {
  std::fprintf(stderr, "fuzz: invariant violated: %s (%lld, %lld)\n", what,
               static_cast<long long>(a), static_cast<long long>(b));
  std::abort();
}

// Checks `cond`; up to two numbers after it are printed when it fails.
#define TARN_FUZZ_CHECK(cond, ...)                                          \
  do {                                                                      \
    if (!(cond)) ::tarn::fuzz::Violation(#cond __VA_OPT__(, ) __VA_ARGS__); \
  } while (false)

[[noreturn]] inline void ScratchFailure(const char* what, const std::filesystem::path& path) {
  std::fprintf(stderr, "fuzz: cannot %s the scratch file %s\n", what, path.c_str());
  std::abort();
}

// The file <stem>-<pid><suffix> in the scratch folder; it stands wherever a
// path is asked for.
class ScratchFile {
 public:
  ScratchFile(const std::string& stem, const std::string& suffix) {
    std::error_code ec;
    std::filesystem::path dir = "/dev/shm";
    if (!std::filesystem::is_directory(dir, ec)) dir = std::filesystem::temp_directory_path();
    path_ = dir / (stem + "-" + std::to_string(::getpid()) + suffix);
  }
  ScratchFile(const ScratchFile&) = delete;
  ScratchFile& operator=(const ScratchFile&) = delete;
  ~ScratchFile() {
    std::error_code ignored;
    std::filesystem::remove(path_, ignored);
  }

  operator const std::filesystem::path&() const noexcept { return path_; }
  [[nodiscard]] const char* c_str() const noexcept { return path_.c_str(); }

 private:
  std::filesystem::path path_;
};

inline void WriteBytes(const std::filesystem::path& path, const std::uint8_t* data,
                       std::size_t size) {
  std::FILE* f = std::fopen(path.c_str(), "wb");
  if (f == nullptr) ScratchFailure("create", path);
  if (size > 0 && std::fwrite(data, 1, size, f) != size) ScratchFailure("write", path);
  if (std::fclose(f) != 0) ScratchFailure("close", path);
}

inline Bytes ReadBytes(const std::filesystem::path& path) {
  std::error_code ec;
  const auto size = std::filesystem::file_size(path, ec);
  if (ec) ScratchFailure("size", path);
  Bytes out(size);
  std::FILE* f = std::fopen(path.c_str(), "rb");
  if (f == nullptr) ScratchFailure("open", path);
  if (!out.empty() && std::fread(out.data(), 1, out.size(), f) != out.size())
    ScratchFailure("read", path);
  std::fclose(f);
  return out;
}

}  // namespace tarn::fuzz
