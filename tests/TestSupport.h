#pragma once
// Helpers every test folder may use: scratch folders and files, the error a
// call throws, and (POSIX) the host's programs and their output.

#include <gtest/gtest.h>

#include <stdlib.h>  // mkdtemp
#include <atomic>
#include <climits>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <map>
#include <random>
#include <sstream>
#include <string>
#include <vector>

#include "tarn/Errors/TarnError.h"
#include "tarn/FileSystem/FileSpecification.h"

// The OS-style error code that f throws, 0 when it returns, INT_MIN for others.
template <typename F>
int ErrorOf(F&& f) try {
  return f(), 0;
} catch (const tarn::TarnError& e) {
  return e.IsMacOSError() ? e.GetIntErrorCode() : INT_MIN;
}

namespace tarn::test {

using Bytes = std::vector<std::uint8_t>;

// A scratch folder removed with everything in it, named after the test.
class TempDir {
 public:
  TempDir() {
    const auto* info = ::testing::UnitTest::GetInstance()->current_test_info();
    // One token per process: several copies of a suite (other worktrees,
    // other presets) may run at once on the same machine.
    static const std::string token = std::to_string(std::random_device{}());
    static std::atomic<int> serial{0};
    std::string name = "tarn-test-" + token + "-" + std::to_string(serial++) + "-";
    if (info != nullptr) name += std::string(info->test_suite_name()) + "-" + info->name();
    for (char& ch : name)
      if (ch == '/') ch = '_';
    path = std::filesystem::temp_directory_path() / name;
    std::filesystem::remove_all(path);
    std::filesystem::create_directories(path);
  }
  TempDir(const TempDir&) = delete;
  TempDir& operator=(const TempDir&) = delete;
  ~TempDir() {
    std::error_code ignored;
    std::filesystem::remove_all(path, ignored);
  }
  [[nodiscard]] std::filesystem::path Path(const std::string& name) const { return path / name; }

  std::filesystem::path path;
};

inline void WriteFile(const std::filesystem::path& path, const Bytes& bytes) {
  std::ofstream out(path, std::ios::binary | std::ios::trunc);
  out.write(reinterpret_cast<const char*>(bytes.data()),
            static_cast<std::streamsize>(bytes.size()));
  ASSERT_TRUE(out.good()) << path;
}
inline void AppendFile(const std::filesystem::path& path, const Bytes& bytes) {
  std::ofstream out(path, std::ios::binary | std::ios::app);
  out.write(reinterpret_cast<const char*>(bytes.data()),
            static_cast<std::streamsize>(bytes.size()));
}
inline Bytes ReadFile(const std::filesystem::path& path) {
  std::ifstream in(path, std::ios::binary);
  return Bytes(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}
inline FileSpecification SpecOf(const std::filesystem::path& path) {
  return FileSpecification(UString(reinterpret_cast<const char*>(path.u8string().c_str())));
}

// The folder of files other programs made: $`env` (CTest's fixture made it
// on the host), else, where `script` runs (POSIX), a scratch folder it fills
// on first use and that goes with the process.
inline std::filesystem::path FixtureDir(const char* env, [[maybe_unused]] const char* script) {
  if (const char* dir = std::getenv(env); dir != nullptr && *dir != 0) return dir;
#ifndef _WIN32
  if (script == nullptr || *script == 0) return {};
  struct Scratch {
    std::vector<std::filesystem::path> paths;
    ~Scratch() {
      std::error_code ignored;
      for (const auto& p : paths) std::filesystem::remove_all(p, ignored);
    }
  };
  static Scratch scratch;
  std::string name = (std::filesystem::temp_directory_path() / "tarn-fixture-XXXXXX").string();
  if (::mkdtemp(name.data()) == nullptr) return {};
  scratch.paths.push_back(name);
  if (std::system(("sh '" + std::string(script) + "' '" + name + "'").c_str()) == 0) return name;
#endif
  return {};
}
// A failure that says how to make the files of `script` (a path in the
// repository) when `dir` is empty; whether there are files.
inline bool HaveFixture(const std::filesystem::path& dir, const char* script, const char* env) {
  if (!dir.empty()) return true;
  ADD_FAILURE() << "no test files: run the tests through CTest, or make them with " << script
                << " DIR and set " << env << "=DIR";
  return false;
}
// `name` in `dir`, or an empty path and a failure that says how to make it.
inline std::filesystem::path FixtureFile(const std::filesystem::path& dir, const std::string& name,
                                         const char* script, const char* env) {
  if (!dir.empty() && std::filesystem::exists(dir / name)) return dir / name;
  if (HaveFixture(dir, script, env)) ADD_FAILURE() << "no " << name << " in " << dir;
  return {};
}

#ifndef _WIN32
// The standard output of `command`; fails the test when it exits non-zero.
inline std::string RunTool(const std::string& command) {
  std::string out;
  FILE* pipe = ::popen((command + " 2>/dev/null").c_str(), "r");
  if (pipe == nullptr) {
    ADD_FAILURE() << "cannot run " << command;
    return out;
  }
  char buffer[65536];
  for (std::size_t n; (n = std::fread(buffer, 1, sizeof buffer, pipe)) > 0;) out.append(buffer, n);
  EXPECT_EQ(::pclose(pipe), 0) << command;
  return out;
}
// "key=value" lines (ffprobe) or "Key   : value" lines (sox --i), trimmed.
inline std::map<std::string, std::string> Fields(const std::string& text, char separator) {
  std::map<std::string, std::string> out;
  std::istringstream lines(text);
  const auto trim = [](std::string s) {
    s.erase(0, s.find_first_not_of(' '));
    s.erase(s.find_last_not_of(" \r'") + 1);
    return s;
  };
  for (std::string line; std::getline(lines, line);)
    if (const auto at = line.find(separator); at != std::string::npos)
      out[trim(line.substr(0, at))] = trim(line.substr(at + 1));
  return out;
}
// Fails the test unless `tool` is on PATH.
inline void NeedTool(const char* tool, const char* package) {
  ASSERT_EQ(std::system((std::string("command -v ") + tool + " >/dev/null 2>&1").c_str()), 0)
      << tool << " is missing: install the Debian package " << package;
}
#endif

}  // namespace tarn::test
