// Helpers of the outside converter's tests: the folder of files that
// make-converter-files.sh makes, and ffmpeg's own decodes of them.
#pragma once

#include <gtest/gtest.h>

#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <optional>
#include <string>
#include <vector>

#include "tarn/FileSystem/FileSpecification.h"
#include "tarn/String/UString.h"

#ifdef TARN_CONVERTER_FILES_SCRIPT
#include <stdlib.h>  // mkdtemp
#endif

namespace tarn::test {

namespace fs = std::filesystem;

// $TARN_CONVERTER_FILES (CTest's fixture made it on the host), else on
// POSIX a scratch folder that the script fills on first use.
inline const fs::path& ConverterDir() {
  struct Scratch {
    fs::path path;
    ~Scratch() {
      std::error_code ignored;
      if (!path.empty()) fs::remove_all(path, ignored);
    }
  };
  static Scratch scratch;
  static const fs::path dir = []() -> fs::path {
    if (const char* env = std::getenv("TARN_CONVERTER_FILES"); env != nullptr && *env != 0)
      return env;
#ifdef TARN_CONVERTER_FILES_SCRIPT
    std::string name = (fs::temp_directory_path() / "tarn-converter-XXXXXX").string();
    if (::mkdtemp(name.data()) == nullptr) return {};
    scratch.path = name;
    const std::string command = "sh '" TARN_CONVERTER_FILES_SCRIPT "' '" + name + "'";
    if (std::system(command.c_str()) == 0) return name;
#endif
    return {};
  }();
  return dir;
}

inline FileSpecification ConverterFile(const std::string& name) {
  if (ConverterDir().empty()) {
    ADD_FAILURE() << "no test files: run the tests through CTest, or make them with "
                  << "tests/Converter/make-converter-files.sh DIR and set TARN_CONVERTER_FILES=DIR";
    return {};
  }
  return FileSpecification(UString((ConverterDir() / name).string()));
}

// ffmpeg's decode of `name` (interleaved float), or nothing when ffmpeg
// could not decode it.
inline std::optional<std::vector<float>> FFmpegDecode(const std::string& name) {
  std::ifstream in(ConverterDir() / (name + ".f32"), std::ios::binary);
  if (!in) return std::nullopt;
  std::vector<char> bytes((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
  std::vector<float> samples(bytes.size() / sizeof(float));
  std::memcpy(samples.data(), bytes.data(), samples.size() * sizeof(float));
  return samples;
}

// Index of the first sample whose bits differ, or -1.
inline std::int64_t FirstDifference(const std::vector<float>& a, const std::vector<float>& b) {
  const std::size_t n = std::min(a.size(), b.size());
  for (std::size_t i = 0; i < n; ++i)
    if (std::memcmp(&a[i], &b[i], sizeof(float)) != 0) return static_cast<std::int64_t>(i);
  return a.size() == b.size() ? -1 : static_cast<std::int64_t>(n);
}

}  // namespace tarn::test
