// Shared pieces of the file-system tests: a fresh temporary folder per test
// and the platform's expected system-error values.
#pragma once

#include <gtest/gtest.h>

#include <filesystem>
#include <random>
#include <string>

#include "tarn/FileSystem/FileSpecification.h"
#include "tarn/String/UString.h"

namespace tarntest {

// From UTF-8 text (u8"..." literals included).
inline tarn::UString U(const char* utf8) { return tarn::UString(utf8); }
inline tarn::UString U(const char8_t* utf8) {
  return tarn::UString(reinterpret_cast<const char*>(utf8));
}

inline tarn::UString ToU(const std::filesystem::path& p) {
  const std::u8string s = p.u8string();
  return tarn::UString(reinterpret_cast<const char*>(s.c_str()), s.size());
}
inline std::filesystem::path ToPath(const tarn::UString& s) {
  const std::string utf8 = s.utf8_str();
  return std::filesystem::path(std::u8string(utf8.begin(), utf8.end()));
}

// The kind of system errors and the codes of "already exists" and "not
// found" on this platform (defined per platform).
const char* SystemKind();
int ExistsCode();
int NotFoundCode();
int RenameExistsCode();  // renaming onto an existing name

class TempFolderTest : public ::testing::Test {
 protected:
  void SetUp() override {
    std::random_device rd;
    dir_ =
        std::filesystem::temp_directory_path() /
        ("tarn_fs_" + std::string(::testing::UnitTest::GetInstance()->current_test_info()->name()) +
         "_" + std::to_string(rd()));
    std::filesystem::create_directories(dir_);
    folder_ = tarn::FileSpecification(ToU(dir_));
  }
  void TearDown() override {
    std::error_code ec;
    std::filesystem::remove_all(dir_, ec);
  }

  tarn::FileSpecification In(const tarn::UString& name) const {
    return tarn::FileSpecification(folder_, name);
  }
  void MakeFile(const tarn::UString& name, const std::string& content = "") const {
    std::FILE* f = std::fopen(ToPath(In(name).GetFullPath()).string().c_str(), "wb");
    ASSERT_NE(f, nullptr);
    std::fwrite(content.data(), 1, content.size(), f);
    std::fclose(f);
  }
  void MakeFolder(const tarn::UString& name) const {
    std::filesystem::create_directory(ToPath(In(name).GetFullPath()));
  }
  std::size_t CountEntries() const {
    std::size_t n = 0;
    for ([[maybe_unused]] auto& e : std::filesystem::directory_iterator(dir_)) ++n;
    return n;
  }

  std::filesystem::path dir_;
  tarn::FileSpecification folder_;
};

}  // namespace tarntest
