// Shared pieces of the file-system tests: a fresh temporary folder per test
// and the platform's expected system-error values.
#pragma once

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <random>
#include <string>

#include "tarn/Errors/TarnError.h"
#include "tarn/FileSystem/FileSpecification.h"
#include "tarn/String/UString.h"

namespace tarntest {

// From UTF-8 text (u8"..." literals included).
inline tarn::UString U(const char* utf8) { return tarn::UString(utf8); }
inline tarn::UString U(const char8_t* utf8) { return U(reinterpret_cast<const char*>(utf8)); }

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

// Checks that `f` throws a TarnError of `kind` with `code` and `attachment`.
template <class F>
void ExpectError(F&& f, const char* kind, int code, const tarn::UString& attachment) {
  try {
    f();
    ADD_FAILURE() << "no throw";
  } catch (const tarn::TarnError& e) {
    EXPECT_EQ(e.GetKind(), kind);
    EXPECT_EQ(e.GetIntErrorCode(), code);
    EXPECT_EQ(e.GetAttachment().value_or(tarn::UString()), attachment);
  }
}

class TempFolderTest : public ::testing::Test {
 protected:
  void SetUp() override {
    dir_ = std::filesystem::temp_directory_path() /
           ("tarn_fs_" + std::to_string(std::random_device{}()));
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
  void MakeFile(const tarn::UString& name) const { std::ofstream{ToPath(In(name).GetFullPath())}; }
  void MakeFolder(const tarn::UString& name) const {
    std::filesystem::create_directory(ToPath(In(name).GetFullPath()));
  }

  std::filesystem::path dir_;
  tarn::FileSpecification folder_;
};

}  // namespace tarntest
