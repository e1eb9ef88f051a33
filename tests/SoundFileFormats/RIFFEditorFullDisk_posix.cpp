// A real full disk, as the kernel reports it: the process's file-size limit
// makes writes past it fail (EFBIG), through the ordinary file stream.

#include <gtest/gtest.h>
#include <sys/resource.h>

#include <csignal>

#include "ChunkFileTestUtil.h"

namespace tarn::test {
namespace {

// Lowers the process's file-size limit for its lifetime.
class FileSizeLimit {
 public:
  explicit FileSizeLimit(rlim_t bytes) {
    previousHandler_ = std::signal(SIGXFSZ, SIG_IGN);
    getrlimit(RLIMIT_FSIZE, &previous_);
    rlimit lowered = previous_;
    lowered.rlim_cur = bytes;
    EXPECT_EQ(setrlimit(RLIMIT_FSIZE, &lowered), 0);
  }
  FileSizeLimit(const FileSizeLimit&) = delete;
  FileSizeLimit& operator=(const FileSizeLimit&) = delete;
  ~FileSizeLimit() {
    setrlimit(RLIMIT_FSIZE, &previous_);
    std::signal(SIGXFSZ, previousHandler_);
  }

 private:
  rlimit previous_{};
  void (*previousHandler_)(int) = nullptr;
};

TEST(RIFFEditorFaults, FullDiskFailsLoudlyAndKeepsTheAudio) {
  TempDir dir;
  const auto path = dir.Path("f");
  const RIFFType data = MakeRIFFType("data");
  const Bytes original =
      FileImage({{MakeRIFFType("bext"), Pattern(40)}, {data, Pattern(5000, 3)}}, Container::kRIFF);
  for (std::size_t room : {0, 1, 7, 8, 100}) {
    SCOPED_TRACE(room);
    WriteFile(path, original);
    RIFFFileEditor editor(SpecOf(path), kRIFFLittleEndian, GetWaveRIFFFormatHandler());
    editor.ReadChunkLocations(nullptr);
    const Bytes bigger = Pattern(3000);
    std::optional<TarnError> error;
    {
      FileSizeLimit limit(original.size() + room);
      error = ErrorOf([&] {
        editor.AddChunkData({MakeRIFFType("bext"), {}, RCBlobMT(bigger.data(), bigger.size())},
                            data);
      });
    }
    ASSERT_TRUE(error) << "a write past the limit went unreported";
    const Bytes after = ReadFile(path);
    ASSERT_GE(after.size(), original.size());
    EXPECT_TRUE(std::equal(original.begin() + 68, original.end(), after.begin() + 68));
    RIFFFileEditor fresh(SpecOf(path), kRIFFLittleEndian, GetWaveRIFFFormatHandler());
    fresh.ReadChunkLocations(nullptr);
    EXPECT_EQ(fresh.GetOffsetToChunkStart(data), 60);
  }
}

}  // namespace
}  // namespace tarn::test
