// Edits that die half-way: every kind of edit is stopped after each of its
// writes in turn, and part-way through it, by a file stream whose writes run
// out like a disk that fills up. Whatever the point, the audio payload is
// byte-for-byte intact and a fresh editor still lists the file up to and
// including its audio chunk.

#include <gtest/gtest.h>

#include <algorithm>
#include <set>

#include "ChunkFileTestUtil.h"

namespace tarn::test {
namespace {

// Writes stop after `budget` bytes: the write that crosses it puts its
// first bytes and fails with -36, as does every write and truncation after.
// A truncation costs one unit of the budget.
class FailingFileStream : public CFileStream {
 public:
  FailingFileStream(const FileSpecification& spec, std::int64_t budget,
                    std::vector<std::int64_t>* writes = nullptr)
      : CFileStream(spec, RIFFFileEditor::kStreamBufferSize), budget_(budget), writes_(writes) {}

  void Drain() override {
    if (dirty_ && bufferLength_ > 0) {
      if (writes_ != nullptr) writes_->push_back(bufferLength_);
      if (budget_ < bufferLength_) {
        bufferLength_ = static_cast<int>(budget_);
        budget_ = 0;
        CFileStream::Drain();
        Failure(kIOErr);
      }
      budget_ -= bufferLength_;
    }
    CFileStream::Drain();
  }

  void SetPhysicalSize(std::int64_t size) override {
    if (writes_ != nullptr) writes_->push_back(1);
    if (budget_ < 1) Failure(kIOErr);
    --budget_;
    CFileStream::SetPhysicalSize(size);
  }

 private:
  std::int64_t budget_;
  std::vector<std::int64_t>* writes_;
};

const RIFFType kBext = MakeRIFFType("bext");
const RIFFType kList = MakeRIFFType("LIST");
const RIFFType kQzma = MakeRIFFType("qzma");
const RIFFType kAcid = MakeRIFFType("acid");

struct Edit {
  const char* name;
  bool audioRunsToEnd;  // the file's audio chunk has its size never written
  void (*apply)(RIFFFileEditor& editor, RIFFType audioTag);
};

RCBlobMT Blob(std::size_t size, std::uint8_t seed) {
  const Bytes bytes = Pattern(size, seed);
  return RCBlobMT(bytes.data(), bytes.size());
}

const Edit kEdits[] = {
    {"overwrite in place", false,
     [](RIFFFileEditor& e, RIFFType audio) {
       e.AddChunkData({kBext, {}, Blob(20, 77)}, audio);
     }},
    {"junk before the audio and append", false,
     [](RIFFFileEditor& e, RIFFType audio) {
       e.AddChunkData({kBext, {}, Blob(31, 77)}, audio);
     }},
    {"cut after the audio and move back", false,
     [](RIFFFileEditor& e, RIFFType audio) {
       e.AddChunkData({kList, {}, Blob(50, 77)}, audio);
     }},
    {"append a new chunk", false,
     [](RIFFFileEditor& e, RIFFType audio) {
       e.AddChunkData({kQzma, {}, Blob(12, 77)}, audio);
     }},
    {"junk after the audio and overwrite", false,
     [](RIFFFileEditor& e, RIFFType audio) {
       e.MaybeJunkSegment(kList);
       e.AddChunkData({kBext, {}, Blob(20, 77)}, audio);
     }},
    {"strip trailing chunks", false,
     [](RIFFFileEditor& e, RIFFType audio) { e.RemoveTrailingMetaData(audio); }},
    {"fix the audio header", true,
     [](RIFFFileEditor& e, RIFFType audio) {
       e.AddChunkData({kQzma, {}, Blob(12, 77)}, audio);
     }},
};

Bytes OriginalFile(Container c, bool audioRunsToEnd) {
  if (audioRunsToEnd)
    return FileImage({{MakeRIFFType("fmt "), Pattern(16)},
                      {kBext, Pattern(20)},
                      {AudioTagOf(c), Pattern(999, 5), 0xFFFFFFFF, false}},
                     c);
  return FileImage({{MakeRIFFType("fmt "), Pattern(16)},
                    {kBext, Pattern(20)},
                    {AudioTagOf(c), Pattern(1001, 5)},
                    {kList, Pattern(6)},
                    {kQzma, Pattern(300)},
                    {kAcid, Pattern(9000, 9)}},
                   c);
}

struct AudioPlace {
  std::int64_t offset;
  std::size_t begin;
  std::size_t end;
};

AudioPlace FindAudio(const std::filesystem::path& path, Container c) {
  RIFFFileEditor editor(SpecOf(path), EndianOf(c), HandlerOf(c));
  editor.ReadChunkLocations(nullptr);
  for (const auto& [info, action] : editor.GetChunkList()) {
    if (info.tag == AudioTagOf(c)) {
      const auto begin = static_cast<std::size_t>(info.offset + HeaderSizeOf(c));
      return {info.offset, begin, begin + static_cast<std::size_t>(info.length)};
    }
  }
  return {-1, 0, 0};
}

// Runs `edit` on a fresh copy with a write budget; returns whether it failed.
bool RunWithBudget(const std::filesystem::path& path, const Bytes& original, Container c,
                   const Edit& edit, std::int64_t budget, std::vector<std::int64_t>* writes) {
  WriteFile(path, original);
  RIFFFileEditor editor(std::make_unique<FailingFileStream>(SpecOf(path), budget, writes),
                        EndianOf(c), HandlerOf(c));
  editor.ReadChunkLocations(nullptr);
  const auto error = ErrorOf([&] { edit.apply(editor, AudioTagOf(c)); });
  if (error) {
    EXPECT_EQ(error->GetIntErrorCode(), kIOErr);
  }
  return error.has_value();
}

TEST(RIFFEditorFaults, EveryEditStoppedAtEveryWriteKeepsTheAudio) {
  TempDir dir;
  const auto path = dir.Path("f");
  for (Container c : {Container::kRIFF, Container::kFORM, Container::kWave64}) {
    for (const Edit& edit : kEdits) {
      SCOPED_TRACE(std::string(NameOf(c)) + ": " + edit.name);
      const Bytes original = OriginalFile(c, edit.audioRunsToEnd);
      WriteFile(path, original);
      const AudioPlace audio = FindAudio(path, c);
      ASSERT_GE(audio.offset, 0);

      // The edit done whole, recording its writes.
      std::vector<std::int64_t> writes;
      ASSERT_FALSE(RunWithBudget(path, original, c, edit, INT64_MAX / 2, &writes));
      const Bytes finished = ReadFile(path);
      ASSERT_NE(finished, original);

      // Stop it at the start of each write, one byte in, half-way, and one
      // byte before its end.
      std::set<std::int64_t> budgets;
      std::int64_t total = 0;
      for (std::int64_t w : writes) {
        for (std::int64_t in : {std::int64_t{0}, std::int64_t{1}, w / 2, w - 1})
          if (in >= 0 && in < w) budgets.insert(total + in);
        total += w;
      }
      for (std::int64_t budget : budgets) {
        SCOPED_TRACE("budget " + std::to_string(budget) + " of " + std::to_string(total));
        ASSERT_TRUE(RunWithBudget(path, original, c, edit, budget, nullptr));
        const Bytes after = ReadFile(path);
        ASSERT_GE(after.size(), std::min(audio.end, original.size()));
        ASSERT_TRUE(std::equal(
            original.begin() + static_cast<std::ptrdiff_t>(audio.begin),
            original.begin() + static_cast<std::ptrdiff_t>(std::min(audio.end, original.size())),
            after.begin() + static_cast<std::ptrdiff_t>(audio.begin)));
        EXPECT_EQ(FindAudio(path, c).offset, audio.offset);
      }
      // With just enough budget the edit completes as before.
      ASSERT_FALSE(RunWithBudget(path, original, c, edit, total, nullptr));
      EXPECT_EQ(ReadFile(path), finished);
    }
  }
}

}  // namespace
}  // namespace tarn::test
