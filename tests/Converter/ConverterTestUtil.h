// Helpers of the outside converter's tests: the folder of files that
// make-converter-files.sh makes, and ffmpeg's own decodes of them.
#pragma once

#include <gtest/gtest.h>

#include <cstdint>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <optional>
#include <string>
#include <vector>

#include "TestSupport.h"
#include "tarn/FileSystem/FileSpecification.h"
#include "tarn/String/UString.h"

namespace tarn::test {

namespace fs = std::filesystem;

#ifndef TARN_CONVERTER_FILES_SCRIPT
#define TARN_CONVERTER_FILES_SCRIPT ""
#endif
inline const fs::path& ConverterDir() {
  static const fs::path dir = FixtureDir("TARN_CONVERTER_FILES", TARN_CONVERTER_FILES_SCRIPT);
  return dir;
}
inline FileSpecification ConverterFile(const std::string& name) {
  if (!HaveFixture(ConverterDir(), "tests/Converter/make-converter-files.sh",
                   "TARN_CONVERTER_FILES"))
    return {};
  return SpecOf(ConverterDir() / name);
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
