#pragma once
// Shared helpers of the stream tests: byte images, temporary files, and
// "channels" that give a write end and, afterwards, a read end over the same
// bytes for every kind of stream.

#include <gtest/gtest.h>

#include <atomic>
#include <cstdint>
#include <filesystem>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "tarn/Errors/TarnError.h"
#include "tarn/FileSystem/FileSpecification.h"
#include "tarn/Streams/CFileStream.h"
#include "tarn/Streams/CHandleStream.h"
#include "tarn/Streams/PipedStream.h"
#include "tarn/Streams/PtrStream.h"
#include "tarn/String/UString.h"

namespace tarn::test {

using Bytes = std::vector<unsigned char>;

// The bytes that `write` puts on a fresh stream.
inline Bytes ImageOf(const std::function<void(CStream&)>& write) {
  CHandleStream s(kTCLReadWriteMode);
  write(s);
  auto_handle<char> h = s.DetachHandle();
  return Bytes(h.data(), h.data() + h.size());
}

// The error code that `action` throws, or 0 if it returns.
inline int CodeOf(const std::function<void()>& action) {
  try {
    action();
  } catch (const TarnError& e) {
    return e.GetIntErrorCode();
  }
  return 0;
}

// A path in the temporary folder, removed on destruction.
class TempPath {
 public:
  explicit TempPath(const std::string& stem) {
    static std::atomic<int> counter{0};
    path_ = std::filesystem::temp_directory_path() /
            ("tarn_streams_" + stem + "_" + std::to_string(counter++) + ".bin");
    std::filesystem::remove(path_);
  }
  TempPath(const TempPath&) = delete;
  TempPath& operator=(const TempPath&) = delete;
  ~TempPath() {
    std::error_code ignored;
    std::filesystem::remove(path_, ignored);
  }
  [[nodiscard]] FileSpecification Spec() const {
    const std::u8string utf8 = path_.u8string();
    return FileSpecification(UString(reinterpret_cast<const char*>(utf8.c_str())));
  }
  [[nodiscard]] const std::filesystem::path& Path() const { return path_; }

 private:
  std::filesystem::path path_;
};

// A write end, then (after In()) a read end over what was written.
class Channel {
 public:
  virtual ~Channel() = default;
  virtual CStream& Out() = 0;
  virtual CStream& In() = 0;
};

class HandleChannel : public Channel {
 public:
  CStream& Out() override { return s_; }
  CStream& In() override {
    s_.MoveTo(0);
    return s_;
  }

 private:
  CHandleStream s_{kTCLReadWriteMode};
};

class FileChannel : public Channel {
 public:
  explicit FileChannel(int bufferSize) : bufferSize_(bufferSize), out_(path_.Spec(), bufferSize) {
    out_.Open(kTCLWriteMode);
  }
  CStream& Out() override { return out_; }
  CStream& In() override {
    out_.Close();
    in_ = std::make_unique<CFileStream>(path_.Spec(), bufferSize_);
    in_->Open(kTCLReadMode);
    return *in_;
  }

 private:
  TempPath path_{"channel"};
  int bufferSize_;
  CFileStream out_;
  std::unique_ptr<CFileStream> in_;
};

class PtrChannel : public Channel {
 public:
  PtrChannel()
      : memory_(1 << 20), out_(memory_.data(), static_cast<std::int64_t>(memory_.size())) {}
  CStream& Out() override { return out_; }
  CStream& In() override {
    in_ = std::make_unique<PtrStream>(static_cast<const void*>(memory_.data()), out_.Size());
    return *in_;
  }

 private:
  std::vector<char> memory_;
  PtrStream out_;
  std::unique_ptr<PtrStream> in_;
};

class PipeChannel : public Channel {
 public:
  CStream& Out() override { return out_; }
  CStream& In() override {
    out_.Close();
    return in_;
  }

 private:
  PipedStream out_;
  PipedStream in_{out_};
};

struct ChannelKind {
  std::string name;
  std::function<std::unique_ptr<Channel>()> make;
};

inline std::vector<ChannelKind> AllChannelKinds() {
  return {
      {"Handle", [] { return std::make_unique<HandleChannel>(); }},
      {"File", [] { return std::make_unique<FileChannel>(CFileStream::kDefaultBufferSize); }},
      {"FileTinyBuffer", [] { return std::make_unique<FileChannel>(5); }},
      {"Ptr", [] { return std::make_unique<PtrChannel>(); }},
      {"Pipe", [] { return std::make_unique<PipeChannel>(); }},
  };
}

}  // namespace tarn::test
