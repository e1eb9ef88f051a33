// The chunk editor on files built byte by byte in all three containers:
// listing geometry, files that lie, the errors, every edit checked against
// the chunk model over random edit sequences, edits stopped at every write
// by a stream that fails like a full disk, concurrent use, and the tag and
// Wave64 identifier tables.

#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <cstring>
#include <random>
#include <set>
#include <thread>

#include "ChunkFileTestUtil.h"
#include "tarn/Audio/SoundFileFormats/WAVEWriter.h"

namespace tarn::test {
namespace {

constexpr RIFFType kFmt = T("fmt "), kBext = T("bext"), kList = T("LIST"), kQzma = T("qzma"),
                   kJunk = T("JUNK"), kData = T("data"), kSsnd = T("SSND");

std::unique_ptr<RIFFFileEditor> Editor(const std::filesystem::path& path, Container c,
                                       RIFFFileEditor::StopParsingTester* tester = nullptr) {
  auto editor = std::make_unique<RIFFFileEditor>(SpecOf(path), EndianOf(c), HandlerOf(c));
  editor->ReadChunkLocations(tester);
  return editor;
}

// "tag @offset +length" lines of the listing, each chunk kept and with its
// tag's identifier in Wave64.
std::string ListOf(const std::filesystem::path& path, Container c,
                   RIFFFileEditor::StopParsingTester* tester = nullptr) {
  const auto editor = Editor(path, c, tester);
  std::string out;
  for (const auto& [info, action] : editor->GetChunkList()) {
    EXPECT_EQ(action, RIFFFileEditor::kKeepSegment);
    EXPECT_EQ(info.uuid, IsWave64(c) ? HandlerOf(c).UUIDForTag(info.tag, false) : UUIDObj());
    out += RIFFTypeToString(info.tag) + " @" + std::to_string(info.offset) + " +" +
           std::to_string(info.length) + "\n";
  }
  return out;
}

struct Listed {
  RIFFType tag;
  std::int64_t offset, length;
};
std::string Lines(const std::vector<Listed>& list, std::int64_t base = 0) {
  std::string out;
  for (const auto& l : list)
    out += RIFFTypeToString(l.tag) + " @" + std::to_string(base + l.offset) + " +" +
           std::to_string(l.length) + "\n";
  return out;
}

TEST(RIFFEditorListing, GeometryOfEachContainer) {
  TempDir dir;
  const auto path = dir.Path("f");
  for (Container c : kContainers) {
    SCOPED_TRACE(NameOf(c));
    const RIFFType audio = AudioTagOf(c);
    WriteFile(
        path,
        FileImage(
            {{kFmt, Pattern(16)}, {kBext, Pattern(5)}, {audio, Pattern(10)}, {kList, Pattern(3)}},
            c));
    const std::int64_t h = HeaderSizeOf(c);
    const auto pad = [c](std::int64_t n) { return WAVEWriter::PadDataLength(n, IsWave64(c)); };
    auto at = static_cast<std::int64_t>(TopSize(c));
    std::vector<Listed> want;
    for (auto [tag, n] : {std::pair{kFmt, 16}, {kBext, 5}, {audio, 10}, {kList, 3}}) {
      want.push_back({tag, at, pad(n)});
      at += h + pad(n);
    }
    EXPECT_EQ(ListOf(path, c), Lines(want));
    RIFFFileEditor::TestForChunk stopAtAudio(audio);
    want.pop_back();
    EXPECT_EQ(ListOf(path, c, &stopAtAudio), Lines(want));

    const auto editor = Editor(path, c);
    EXPECT_EQ(editor->IsWave64(), IsWave64(c));
    EXPECT_TRUE(editor->HasChunk(kBext));
    EXPECT_FALSE(editor->HasChunk(kQzma));
    EXPECT_EQ(editor->GetOffsetToChunkStart(kList), at - h - pad(3));
    UUIDObj uuid;
    EXPECT_EQ(BytesOf(editor->ReadChunkData(kBext, uuid)), Pattern(5));
    EXPECT_EQ(uuid, IsWave64(c) ? HandlerOf(c).UUIDForTag(kBext, false) : UUIDObj());
    EXPECT_TRUE(editor->ReadChunkData(kQzma, uuid).IsEmpty());
    EXPECT_EQ(editor->CountPostAudioChunks(audio), 1);
    EXPECT_EQ(editor->GetNthPostAudioChunks(0, audio, uuid), kList);
    EXPECT_EQ(editor->GetNthPostAudioChunks(1, audio, uuid), RIFFFileEditor::kNullTag);
    EXPECT_EQ(editor->CountPostAudioChunks(kQzma), 0);
    EXPECT_FALSE(editor->AudioDataIsZeroLength(audio, pad(10) - 1));
    EXPECT_TRUE(editor->AudioDataIsZeroLength(audio, pad(10)));
    EXPECT_FALSE(editor->AudioDataIsZeroLength(kQzma, 1 << 30));
    ExpectError([&] { (void)editor->GetOffsetToChunkStart(kQzma); }, "RIFFFileEditor",
                RIFFFileEditor::kChunkNotFound);
  }
}

// Files that lie about their sizes, and how far the listing trusts them.
TEST(RIFFEditorListing, LyingFilesStopOrStretchAsTheyShould) {
  const struct {
    const char* name;
    Container c;
    std::vector<ChunkSpec> chunks;
    Bytes tail;                // appended raw after the chunks
    std::vector<Listed> want;  // offsets relative to the end of the form type
    bool audioRunsToEnd = false;
  } cases[] = {
      {"SSND of length 0 runs to the end",
       Container::kFORM,
       {{kFmt, Pattern(4)}, {kSsnd, Pattern(9), 0, true}},
       {},
       {{kFmt, 0, 4}, {kSsnd, 12, 10}},
       true},
      {"data of length 0 stays empty",
       Container::kRIFF,
       {{kData, {}}, {kList, Pattern(2)}},
       {},
       {{kData, 0, 0}, {kList, 8, 2}}},
      {"data longer than the file",
       Container::kRIFF,
       {{kFmt, Pattern(2)}, {kData, Pattern(7), 5000, false}},
       {},
       {{kFmt, 0, 2}, {kData, 10, 7}},
       true},
      {"SSND longer than the file",
       Container::kFORM,
       {{kSsnd, Pattern(6), 0xFFFFFFFF}},
       {},
       {{kSsnd, 0, 6}},
       true},
      {"Wave64 data longer than the file",
       Container::kWave64,
       {{kData, Pattern(9), 1ull << 40, false}},
       {},
       {{kData, 0, 9}},
       true},
      {"a second data longer than the file ends the walk",
       Container::kRIFF,
       {{kData, Pattern(2)}, {kData, Pattern(4), 1000}},
       {},
       {{kData, 0, 2}}},
      {"SSND in a RIFF file is metadata",
       Container::kRIFF,
       {{kFmt, Pattern(2)}, {kSsnd, Pattern(4), 1000}},
       {},
       {{kFmt, 0, 2}}},
      {"metadata longer than the file ends the walk",
       Container::kRIFF,
       {{kFmt, Pattern(2)}, {kBext, Pattern(4), 1000}, {kData, Pattern(2)}},
       {},
       {{kFmt, 0, 2}}},
      {"last chunk without its pad byte",
       Container::kRIFF,
       {{kFmt, Pattern(2)}, {kData, Pattern(3), std::nullopt, false}},
       {},
       {{kFmt, 0, 2}, {kData, 10, 4}}},
      {"truncated chunk header",
       Container::kFORM,
       {{kFmt, Pattern(2)}},
       Text("SSN"),
       {{kFmt, 0, 2}}},
      {"zero fill is a null chunk",
       Container::kRIFF,
       {{kData, Pattern(2)}},
       Bytes(20),
       {{kData, 0, 2}, {0, 10, 0}}},
      // A size field of 23 (one less than the header it counts).
      {"Wave64 size below its header",
       Container::kWave64,
       {{kFmt, Pattern(8)}, {kBext, {}, 0 - 1ull}},
       {},
       {{kFmt, 0, 8}}},
  };
  TempDir dir;
  const auto path = dir.Path("f");
  for (const auto& t : cases) {
    SCOPED_TRACE(t.name);
    WriteFile(path, Cat({FileImage(t.chunks, t.c), t.tail}));
    EXPECT_EQ(ListOf(path, t.c), Lines(t.want, static_cast<std::int64_t>(TopSize(t.c))));
    EXPECT_EQ(Editor(path, t.c)->AudioRunsToEndOfFile(), t.audioRunsToEnd);
  }
}

TEST(RIFFEditorListing, WhatIsNotAChunkFileThrows) {
  TempDir dir;
  const auto path = dir.Path("f");
  const Bytes wave = FileImage({{kData, Pattern(2)}}, Container::kRIFF);
  Bytes avi = wave,
        riffLower = FileImage({{kFmt, Pattern(2)}, {kData, Pattern(4)}}, Container::kRIFF);
  std::copy_n("AVI ", 4, avi.begin() + 8);
  // A "riff" without the Wave64 identifier is a classic RIFF file.
  std::copy_n("riff", 4, riffLower.begin());
  WriteFile(path, riffLower);
  EXPECT_EQ(ListOf(path, Container::kRIFF), "fmt  @12 +2\ndata @22 +4\n");
  const struct {
    const char* name;
    Bytes bytes;
    Container c;
  } cases[] = {
      {"empty", {}, Container::kRIFF},
      {"three bytes", Text("RIF"), Container::kRIFF},
      {"container only", Text("RIFF\x10\0\0"), Container::kRIFF},
      {"another format", Cat({Text("OggS"), Bytes(12)}), Container::kRIFF},
      {"refused form type", avi, Container::kRIFF},
      {"FORM given to the WAVE handler", FileImage({{kSsnd, Pattern(2)}}, Container::kFORM),
       Container::kRIFF},
      {"RIFF given to the AIFF handler", wave, Container::kFORM},
  };
  for (const auto& t : cases) {
    SCOPED_TRACE(t.name);
    WriteFile(path, t.bytes);
    RIFFFileEditor editor(SpecOf(path), EndianOf(t.c), HandlerOf(t.c));
    const auto error = ErrorOf([&] { editor.ReadChunkLocations(nullptr); });
    ASSERT_TRUE(error);
    EXPECT_STREQ(error->GetKind().c_str(), "RIFFFileEditor");
    EXPECT_STREQ(error->GetSystem().c_str(), "RIFFFileEditor");
    EXPECT_STREQ(error->GetSubsystem().c_str(), "RIFFFileEditor");
    EXPECT_EQ(error->GetIntErrorCode(), RIFFFileEditor::kNotAChunkFile);
    EXPECT_TRUE(error->GetAttachment().has_value());
    EXPECT_TRUE(editor.GetChunkList().empty());
    EXPECT_EQ(ReadFile(path), t.bytes);
  }
  for (const auto& missing : {dir.Path("missing"), dir.Path("")}) {
    RIFFFileEditor editor(SpecOf(missing), kRIFFLittleEndian, GetWaveRIFFFormatHandler());
    EXPECT_EQ(CodeOf([&] { editor.ReadChunkLocations(nullptr); }), kAccessDeniedErr) << missing;
  }
}

// ------------------------------------------------------------------ editing

TEST(RIFFEditorEdits, RandomEditSequencesMatchTheModel) {
  TempDir dir;
  const auto path = dir.Path("f");
  std::mt19937 rng(20261123);
  const RIFFType pool[] = {kFmt, kBext, kList, kQzma};
  const auto pick = [&](int n) { return static_cast<int>(rng() % static_cast<unsigned>(n)); };
  // After the audio a chunk may also carry the audio tag again, or (where
  // the container can name it) the other container's audio tag: both are
  // metadata there, moved like any other.
  const auto chunksOf = [&](std::vector<ChunkSpec>& chunks, int most, Container c,
                            bool afterAudio) {
    const RIFFType also[] = {AudioTagOf(c), IsWave64(c)             ? kData
                                            : c == Container::kFORM ? kData
                                                                    : kSsnd};
    for (int i = pick(most + 1); i > 0; --i) {
      const int which = pick(afterAudio ? 6 : 4);
      chunks.push_back({which < 4 ? pool[which] : also[which - 4],
                        Pattern(static_cast<std::size_t>(pick(20)), 30)});
    }
  };
  for (Container c : kContainers) {
    for (int round = 0; round < 100; ++round) {
      std::vector<ChunkSpec> chunks;
      chunksOf(chunks, 3, c, false);
      chunks.push_back({AudioTagOf(c), Pattern(1 + static_cast<std::size_t>(pick(40)), 99)});
      chunksOf(chunks, 3, c, true);
      WriteFile(path, FileImage(chunks, c));
      ChunkModel model(ReadFile(path), c);
      const Bytes audio = model.Audio();
      const auto editor = Editor(path, c);
      std::string log;
      for (int step = pick(4) + 1; step > 0; --step) {
        const int kind = pick(7);
        const RIFFType tag = pool[pick(4)];
        log += RIFFTypeToString(tag) + ":" + std::to_string(kind) + " ";
        SCOPED_TRACE(std::string(NameOf(c)) + " round " + std::to_string(round) + " " + log);
        if (kind == 0) {
          model.MarkJunk(tag);
          editor->MaybeJunkSegment(tag);
          continue;
        }
        if (kind == 1) {
          // The container size is left as it was; made right again here
          // for the steps after.
          model.StripAfterAudio();
          editor->RemoveTrailingMetaData(AudioTagOf(c));
          ASSERT_EQ(ReadFile(path), model.Image());
          model.FixContainerSize();
          WriteFile(path, model.Image());
        } else if (kind == 2) {
          if (model.Junk(tag)) {
            editor->JunkChunk(tag, AudioTagOf(c));
          } else {
            const auto error = ErrorOf([&] { editor->JunkChunk(tag, AudioTagOf(c)); });
            ASSERT_TRUE(error);
            EXPECT_EQ(error->GetIntErrorCode(), RIFFFileEditor::kChunkNotFound);
          }
        } else {
          const Bytes payload = Pattern(static_cast<std::size_t>(pick(24)), 200);
          model.Add(tag, payload);
          editor->AddChunkData({tag, {}, Blob(payload)}, AudioTagOf(c));
        }
        ASSERT_EQ(ReadFile(path), model.Image());
        ASSERT_EQ(ChunkModel(ReadFile(path), c).Audio(), audio);
        ASSERT_EQ(Describe(editor->GetChunkList()), Describe(model.Listing()));
      }
    }
  }
}

TEST(RIFFEditorEdits, AudioRunningPastTheEndIsFixedFirstAndAMissingPadByteRestored) {
  TempDir dir;
  const auto path = dir.Path("f");
  for (Container c : kContainers) {
    SCOPED_TRACE(NameOf(c));
    // A recording whose sizes were never written: 7 bytes of audio, no pad.
    const Bytes image =
        FileImage({{kFmt, Pattern(4)}, {AudioTagOf(c), Pattern(7), 0xFFFFFFFF, false}}, c);
    WriteFile(path, image);
    const auto editor = Editor(path, c);
    ASSERT_TRUE(editor->AudioRunsToEndOfFile());
    editor->AddChunkData({kBext, {}, Blob(Pattern(3))}, AudioTagOf(c));
    // Only the audio chunk's size field changed; nothing was added.
    Bytes want = image;
    const Bytes fixed = ChunkImage({AudioTagOf(c), {}, 7}, c);
    std::copy(fixed.begin(), fixed.end(),
              want.end() - 7 - static_cast<std::ptrdiff_t>(fixed.size()));
    EXPECT_EQ(ReadFile(path), want);
    EXPECT_FALSE(editor->HasChunk(kBext));
    // The next edit restores the pad bytes and appends.
    editor->AddChunkData({kBext, {}, Blob(Pattern(3))}, AudioTagOf(c));
    EXPECT_EQ(ReadFile(path),
              FileImage({{kFmt, Pattern(4)}, {AudioTagOf(c), Pattern(7)}, {kBext, Pattern(3)}}, c));
  }
  WriteFile(path, FileImage({{kData, Pattern(5), std::nullopt, false}}, Container::kRIFF));
  Editor(path, Container::kRIFF)->AddChunkData({kList, {}, Blob(Pattern(1))}, kData);
  EXPECT_EQ(ReadFile(path),
            FileImage({{kData, Pattern(5)}, {kList, Pattern(1)}}, Container::kRIFF));
  // An "SSND" header at the very end, its size a lie (fixed to 0 first) or
  // 0: of size 0 with a chunk after it, it would list as running to the end
  // over that chunk, so it becomes an empty chunk before the append.
  const RIFFType sound = AudioTagOf(Container::kFORM);
  for (std::uint64_t size : {138, 0}) {
    WriteFile(path, FileImage({{kFmt, Pattern(4)}, {sound, {}, size}}, Container::kFORM));
    const auto editor = Editor(path, Container::kFORM);
    EXPECT_EQ(editor->AudioRunsToEndOfFile(), size != 0);
    if (size != 0) editor->AddChunkData({kBext, {}, Blob(Pattern(3))}, sound);
    EXPECT_EQ(ReadFile(path), FileImage({{kFmt, Pattern(4)}, {sound, {}}}, Container::kFORM));
    editor->AddChunkData({kBext, {}, Blob(Pattern(3))}, sound);
    EXPECT_EQ(ReadFile(path),
              FileImage({{kFmt, Pattern(4)}, {sound, Bytes(8, 0)}, {kBext, Pattern(3)}},
                        Container::kFORM));
    EXPECT_TRUE(Editor(path, Container::kFORM)->HasChunk(kBext)) << size;
  }
}

// A last chunk cut short stays listed at its claimed size; an edit then
// refuses to start rather than move or append around missing bytes. So
// does a Wave64 chunk without an identifier, unless the caller gives one,
// and an empty "SSND" chunk.
TEST(RIFFEditorEdits, EditsThatCannotBeDoneAreRefusedUntouched) {
  TempDir dir;
  const auto path = dir.Path("f");
  for (RIFFType last : {kList, kData}) {
    Bytes image = FileImage({{kFmt, Pattern(200)}, {kData, Pattern(300)}, {kList, Pattern(40)}},
                            Container::kRIFF);
    image.resize(image.size() - (last == kData ? 88 : 20));
    WriteFile(path, image);
    const auto editor = Editor(path, Container::kRIFF);
    ASSERT_EQ(editor->GetChunkList().back().first.tag, last);
    EXPECT_FALSE(editor->AudioRunsToEndOfFile());
    ExpectError(
        [&] {
          editor->AddChunkData({kBext, {}, Blob(Pattern(4))}, kData);
        },
        "RIFFFileEditor", RIFFFileEditor::kChunkPastEndOfFile);
    EXPECT_EQ(ReadFile(path), image);
  }
  const Bytes image = FileImage({{kData, Pattern(8)}}, Container::kWave64);
  WriteFile(path, image);
  RIFFFileEditor editor(SpecOf(path), kRIFFLittleEndian, GetWaveRIFFFormatHandler());
  EXPECT_EQ(CodeOf([&] { editor.AddChunkData({T("zzzz"), {}, Blob(Pattern(2))}, kData); }), -50);
  EXPECT_EQ(ReadFile(path), image);
  const UUIDObj own(UString("0f1e2d3c-4b5a-6978-8796-a5b4c3d2e1f0"));
  editor.AddChunkData({T("zzzz"), own, Blob(Pattern(2))}, kData);
  EXPECT_EQ(Slice(ReadFile(path), 72, 88), Bytes(own.GetBytes().begin(), own.GetBytes().end()));
  // An empty "SSND" would make every later chunk part of the audio.
  const Bytes form = FileImage({{kFmt, Pattern(2)}}, Container::kFORM);
  WriteFile(path, form);
  EXPECT_EQ(CodeOf([&] {
              Editor(path, Container::kFORM)->AddChunkData({kSsnd, {}, {}}, kSsnd);
            }),
            -50);
  EXPECT_EQ(ReadFile(path), form);
}

TEST(RIFFEditorEdits, UpdateUUIDsFromTagsJunksTagsWithoutIdentifier) {
  TempDir dir;
  const auto path = dir.Path("f");
  WriteFile(path, FileImage({{kFmt, Pattern(2)}, {T("odd!"), Pattern(6)}, {kData, Pattern(2)}},
                            Container::kRIFF));
  const auto editor = Editor(path, Container::kRIFF);
  editor->UpdateUUIDsFromTags();
  const auto& list = editor->GetChunkList();
  EXPECT_EQ(list[0].first.uuid, GetWaveRIFFFormatHandler().UUIDForTag(kFmt, true));
  EXPECT_EQ(list[1].first.tag, kJunk);
  EXPECT_EQ(list[1].second, RIFFFileEditor::kJunkSegment);
  EXPECT_EQ(list[1].first.uuid, GetWaveRIFFFormatHandler().UUIDForTag(kJunk, true));
  editor->AddChunkData({kBext, {}, Blob(Pattern(2))}, kData);
  EXPECT_EQ(
      ReadFile(path),
      FileImage({{kFmt, Pattern(2)}, {kJunk, Pattern(6)}, {kData, Pattern(2)}, {kBext, Pattern(2)}},
                Container::kRIFF));
  // The AIFF handler names no identifiers: nothing is marked, the audio
  // least of all.
  const Bytes form = FileImage({{kFmt, Pattern(2)}, {kSsnd, Pattern(8)}}, Container::kFORM);
  WriteFile(path, form);
  const auto aiff = Editor(path, Container::kFORM);
  aiff->UpdateUUIDsFromTags();
  aiff->AddChunkData({kBext, {}, Blob(Pattern(2))}, kSsnd);
  EXPECT_EQ(
      ReadFile(path),
      FileImage({{kFmt, Pattern(2)}, {kSsnd, Pattern(8)}, {kBext, Pattern(2)}}, Container::kFORM));
}

// Zero fill after the last chunk is listed as a null entry; a chunk
// appended over it replaces the entry, and junking the null tag marks
// nothing, so later cuts move only real chunks.
TEST(RIFFEditorEdits, ChunksAppendedOverZeroFillReplaceIt) {
  TempDir dir;
  const auto path = dir.Path("f");
  WriteFile(path, Cat({FileImage({{kData, Pattern(4)}, {kList, Pattern(6)}}, Container::kRIFF),
                       Bytes(40)}));
  const auto editor = Editor(path, Container::kRIFF);
  ASSERT_EQ(editor->GetChunkList().back().first.tag, RIFFFileEditor::kNullTag);
  editor->AddChunkData({kBext, {}, Blob(Pattern(3))}, kData);
  editor->MaybeJunkSegment(RIFFFileEditor::kNullTag);
  editor->AddChunkData({kList, {}, Blob(Pattern(9))}, kData);
  const Bytes want =
      FileImage({{kData, Pattern(4)}, {kBext, Pattern(3)}, {kList, Pattern(9)}}, Container::kRIFF);
  EXPECT_EQ(ReadFile(path), want);
  EXPECT_EQ(Describe(editor->GetChunkList()),
            Describe(ChunkModel(want, Container::kRIFF).Listing()));
}

// Readers on several threads and a writer share one editor: the lock makes
// every read see one whole version of the chunk, never a mix of two.
TEST(RIFFEditorEdits, ReadsAndEditsOfOneEditorSerialise) {
  TempDir dir;
  const auto path = dir.Path("f");
  WriteFile(path, FileImage({{kBext, Bytes(600, 0)}, {kData, Pattern(64)}}, Container::kRIFF));
  const auto editor = Editor(path, Container::kRIFF);
  std::atomic<bool> stop{false};
  std::atomic<int> reads{0};
  std::vector<std::thread> readers;
  for (int t = 0; t < 3; ++t) {
    readers.emplace_back([&] {
      while (!stop.load()) {
        const Bytes blob = BytesOf(editor->ReadChunkData(kBext));
        ASSERT_EQ(blob.size(), 600u);
        ASSERT_EQ(std::count(blob.begin(), blob.end(), blob[0]), 600);
        ASSERT_EQ(editor->CountPostAudioChunks(kData), 0);
        ++reads;
      }
    });
  }
  for (int round = 1; round <= 200; ++round)
    editor->AddChunkData({kBext, {}, Blob(Bytes(600, static_cast<std::uint8_t>(round)))}, kData);
  while (reads.load() < 50) std::this_thread::yield();
  stop = true;
  for (auto& r : readers) r.join();
  EXPECT_EQ(ReadFile(path),
            FileImage({{kBext, Bytes(600, 200)}, {kData, Pattern(64)}}, Container::kRIFF));
}

// ------------------------------------------------------------------ faults

// Writes stop after `budget` bytes: the write that crosses it puts its
// first bytes and fails with -36, as does every write and truncation after.
// A truncation costs one unit of the budget.
class FailingFileStream : public CFileStream {
 public:
  FailingFileStream(const FileSpecification& spec, std::int64_t budget,
                    std::vector<std::int64_t>* writes)
      : CFileStream(spec, RIFFFileEditor::kStreamBufferSize), budget_(budget), writes_(writes) {}
  // The disk has room again.
  void Refill() { budget_ = INT64_MAX / 2; }

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

RCBlobMT Payload(std::size_t size) { return Blob(Pattern(size, 77)); }

const struct FaultEdit {
  const char* name;
  bool audioRunsToEnd;  // the file's audio chunk has its size never written
  void (*apply)(RIFFFileEditor& editor, RIFFType audioTag);
} kFaultEdits[] = {
    {"overwrite in place", false,
     [](RIFFFileEditor& e, RIFFType audio) {
       e.AddChunkData({kBext, {}, Payload(20)}, audio);
     }},
    {"junk before the audio and append", false,
     [](RIFFFileEditor& e, RIFFType audio) {
       e.AddChunkData({kBext, {}, Payload(31)}, audio);
     }},
    {"cut after the audio and move back", false,
     [](RIFFFileEditor& e, RIFFType audio) {
       e.AddChunkData({kList, {}, Payload(50)}, audio);
     }},
    {"append a new chunk", false,
     [](RIFFFileEditor& e, RIFFType audio) {
       e.AddChunkData({kQzma, {}, Payload(12)}, audio);
     }},
    {"junk after the audio and overwrite", false,
     [](RIFFFileEditor& e, RIFFType audio) {
       e.MaybeJunkSegment(kList);
       e.AddChunkData({kBext, {}, Payload(20)}, audio);
     }},
    {"strip trailing chunks", false,
     [](RIFFFileEditor& e, RIFFType audio) { e.RemoveTrailingMetaData(audio); }},
    {"fix the audio header", true,
     [](RIFFFileEditor& e, RIFFType audio) {
       e.AddChunkData({kQzma, {}, Payload(12)}, audio);
     }},
};

// Every kind of edit is stopped after each of its writes in turn, and
// part-way through it, then retried on the same editor once the disk has
// room again. Whatever the point, the audio payload is byte-for-byte intact
// and a fresh editor still lists the file up to and including its audio
// chunk at the same place, after the failure and after the retry.
TEST(RIFFEditorFaults, EveryEditStoppedAtEveryWriteKeepsTheAudio) {
  TempDir dir;
  const auto path = dir.Path("f");
  for (Container c : kContainers) {
    for (const FaultEdit& edit : kFaultEdits) {
      SCOPED_TRACE(std::string(NameOf(c)) + ": " + edit.name);
      const RIFFType audioTag = AudioTagOf(c);
      const Bytes original = edit.audioRunsToEnd
                                 ? FileImage({{kFmt, Pattern(16)},
                                              {kBext, Pattern(20)},
                                              {audioTag, Pattern(999, 5), 0xFFFFFFFF, false}},
                                             c)
                                 : FileImage({{kFmt, Pattern(16)},
                                              {kBext, Pattern(20)},
                                              {audioTag, Pattern(1001, 5)},
                                              {kList, Pattern(6)},
                                              {kQzma, Pattern(300)},
                                              {T("acid"), Pattern(9000, 9)}},
                                             c);
      const auto audioOffset = static_cast<std::int64_t>(TopSize(c) + 2 * HeaderSizeOf(c) +
                                                         Padded(16, c) + Padded(20, c));
      const auto audioStart = static_cast<std::size_t>(audioOffset + HeaderSizeOf(c));
      const std::size_t audioEnd = audioStart + (edit.audioRunsToEnd ? 999 : 1001);
      const auto expectAudioKept = [&] {
        const Bytes after = ReadFile(path);
        ASSERT_GE(after.size(), audioEnd);
        ASSERT_EQ(Slice(after, audioStart, audioEnd), Slice(original, audioStart, audioEnd));
        EXPECT_EQ(Editor(path, c)->GetOffsetToChunkStart(audioTag), audioOffset);
      };
      // Runs the edit on a fresh copy; returns whether it failed.
      const auto run = [&](std::int64_t budget, std::vector<std::int64_t>* writes,
                           bool retry = false) {
        WriteFile(path, original);
        auto owned = std::make_unique<FailingFileStream>(SpecOf(path), budget, writes);
        FailingFileStream& stream = *owned;
        RIFFFileEditor editor(std::move(owned), EndianOf(c), HandlerOf(c));
        editor.ReadChunkLocations(nullptr);
        const int code = CodeOf([&] { edit.apply(editor, audioTag); });
        if (code != 1) {
          EXPECT_EQ(code, kIOErr);
        }
        if (code != 1 && retry) {
          expectAudioKept();
          stream.Refill();
          // The retry either completes or, where the failure left a chunk
          // cut short at the end, refuses before writing.
          const int again = CodeOf([&] { edit.apply(editor, audioTag); });
          EXPECT_TRUE(again == 1 || again == RIFFFileEditor::kChunkPastEndOfFile) << again;
        }
        return code != 1;
      };
      std::vector<std::int64_t> writes;
      ASSERT_FALSE(run(INT64_MAX / 2, &writes));
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
        ASSERT_TRUE(run(budget, nullptr, true));
        expectAudioKept();
      }
      // With just enough budget the edit completes as before.
      ASSERT_FALSE(run(total, nullptr));
      EXPECT_EQ(ReadFile(path), finished);
    }
  }
}

// ------------------------------------------------------------------ tables

TEST(RIFFEditorTables, TagIDTableIncludingTheDoubleEntry) {
  const std::pair<const char*, std::uint32_t> numbers[] = {
      {"qzma", 1001}, {"qzsa", 1002}, {"qzam", 1004}, {"qzas", 1005}, {"qzac", 1006},
      {"qzwe", 1020}, {"qzw1", 1023}, {"qzbt", 1024}, {"qzcu", 1050}, {"qzmu", 1051},
      {"qzuc", 1052}, {"MLo1", 1022}, {"qzdt", 1025}, {"MLo2", 1026}, {"ANNO", 1021}};
  for (const auto& [tag, id] : numbers) {
    EXPECT_EQ(RIFFFileEditor::FindIDForTag(RIFFTypeFromChars(tag)), id) << tag;
    EXPECT_EQ(RIFFFileEditor::FindTagForID(id), RIFFTypeFromChars(tag)) << tag;
  }
  EXPECT_EQ(RIFFFileEditor::FindIDForTag(T("qzmc")), 1003u);
  EXPECT_EQ(RIFFFileEditor::FindTagForID(1003), T("qzmc"));
  EXPECT_EQ(RIFFFileEditor::FindTagForID(1053), T("qzmc"));
  EXPECT_EQ(RIFFFileEditor::FindIDForTag(T("qzrn")), T("ddRL"));
  EXPECT_EQ(RIFFFileEditor::FindTagForID(T("QZtd")), T("qzte"));
  for (const char* same : {"bext", "levl", "qzod", "Rec!", "SmpI", "ddOV", "Dscr", "AUTH", "(c) ",
                           "ACdI", "basc", "acid", "regn", "data"}) {
    EXPECT_EQ(RIFFFileEditor::FindIDForTag(RIFFTypeFromChars(same)), RIFFTypeFromChars(same))
        << same;
    EXPECT_EQ(RIFFFileEditor::FindTagForID(RIFFTypeFromChars(same)), RIFFTypeFromChars(same))
        << same;
  }
  EXPECT_EQ(RIFFFileEditor::FindTagForID(7), 7u);
}

TEST(RIFFEditorTables, Wave64IdentifiersAsPublishedAndOurOwn) {
  const auto& wave = GetWaveRIFFFormatHandler();
  const std::pair<const char*, const char*> published[] = {
      {"RIFF", "72696666-2e91-cf11-a5d6-28db04c10000"},
      {"LIST", "6c697374-2f91-cf11-a5d6-28db04c10000"},
      {"WAVE", "77617665-f3ac-d311-8cd1-00c04f8edb8a"},
      {"fmt ", "666d7420-f3ac-d311-8cd1-00c04f8edb8a"},
      {"fact", "66616374-f3ac-d311-8cd1-00c04f8edb8a"},
      {"data", "64617461-f3ac-d311-8cd1-00c04f8edb8a"},
      {"levl", "6c65766c-f3ac-d311-8cd1-00c04f8edb8a"},
      {"JUNK", "6a756e6b-f3ac-d311-8cd1-00c04f8edb8a"},
      {"bext", "62657874-f3ac-d311-8cd1-00c04f8edb8a"},
      {"MRKR", "5662f7ab-2d39-d211-86c7-00c04f8edb8a"},
      {"SmLt", "bc945f92-5a52-d211-86dc-00c04f8edb8a"},
  };
  for (const auto& [tag, id] : published) {
    const UUIDObj uuid{UString(id)};
    EXPECT_EQ(wave.UUIDForTag(RIFFTypeFromChars(tag), false), uuid) << tag;
    EXPECT_EQ(wave.UUIDForTag(RIFFTypeFromChars(tag), true), uuid) << tag;
    EXPECT_EQ(wave.TagForUUID(uuid), RIFFTypeFromChars(tag)) << tag;
  }
  // Standard chunks without a published identifier: their characters and
  // the WAVE chunks' common tail, both ways.
  for (const char* tag :
       {"cue ", "smpl", "inst", "strc", "plst", "iXML", "axml", "cart", "PEAK", "DISP", "id3 "}) {
    TarnCOM::UUIDBytes bytes;
    const std::uint8_t tail[12] = {0xF3, 0xAC, 0xD3, 0x11, 0x8C, 0xD1,
                                   0x00, 0xC0, 0x4F, 0x8E, 0xDB, 0x8A};
    std::memcpy(bytes.bytes, tag, 4);
    std::memcpy(bytes.bytes + 4, tail, 12);
    EXPECT_EQ(wave.UUIDForTag(RIFFTypeFromChars(tag), true), UUIDObj(bytes)) << tag;
    EXPECT_EQ(wave.TagForUUID(UUIDObj(bytes)), RIFFTypeFromChars(tag)) << tag;
  }
  EXPECT_TRUE(wave.IsWave64Container(UUIDObj(UString(published[0].second))));
  EXPECT_FALSE(wave.IsWave64Container(UUIDObj(UString(published[1].second))));
  EXPECT_EQ(wave.TagForUUID(UUIDObj(UString("62657874-f3ac-d3aa-d18c-00c04f8edb8a"))), kBext);
  EXPECT_EQ(wave.TagForUUID(UUIDObj(UString("6c65766c-f3ac-d311-d18c-00c04f8edb8a"))), T("levl"));
  EXPECT_EQ(wave.TagForUUID(UUIDObj(UString("62657874-0000-0000-0000-000000000000"))),
            kUnknownChunkTag);
  EXPECT_EQ(wave.UUIDForTag(T("zzzz"), true), UUIDObj());
  EXPECT_EQ(wave.UUIDForTag(0, true), UUIDObj());
  // Every metadata tag has an identifier of its own, distinct from all
  // others, that reads back as the tag.
  std::vector<UUIDObj> seen;
  for (const char* own :
       {"qzma", "qzsa", "qzmc", "qzam", "qzas", "qzac", "qzwe", "qzw1", "qzbt", "qzcu",
        "qzmu", "qzuc", "qzrn", "qzte", "qzod", "Rec!", "MLo1", "qzdt", "MLo2", "SmpI",
        "ddOV", "ANNO", "Dscr", "AUTH", "(c) ", "ACdI", "basc", "acid", "regn", "qzfd",
        "qzf1", "qzf2", "qzf3", "qzf4", "qzf5", "qzf6", "qzf7", "qzf8", "qzf9", "qzfa"}) {
    const UUIDObj id = wave.UUIDForTag(RIFFTypeFromChars(own), true);
    EXPECT_FALSE(id.IsClear()) << own;
    EXPECT_EQ(wave.TagForUUID(id), RIFFTypeFromChars(own)) << own;
    EXPECT_EQ(std::count(seen.begin(), seen.end(), id), 0) << own;
    seen.push_back(id);
  }
  const auto& aiff = GetAIFFRIFFFormatHandler();
  EXPECT_TRUE(aiff.IsContainerID(T("FORM")));
  EXPECT_FALSE(aiff.IsContainerID(T("RIFF")));
  EXPECT_TRUE(aiff.IsFormType(T("AIFC")));
  EXPECT_TRUE(aiff.IsFormType(T("AIFF")));
  EXPECT_FALSE(aiff.IsFormType(T("WAVE")));
  EXPECT_FALSE(aiff.SupportsWave64());
  EXPECT_EQ(aiff.UUIDForTag(kBext, true), UUIDObj());
  EXPECT_EQ(aiff.TagForUUID(UUIDObj(UString(published[8].second))), 0u);
  EXPECT_TRUE(wave.IsContainerID(T("riff")));
  EXPECT_FALSE(wave.IsContainerID(T("FORM")));
}

}  // namespace
}  // namespace tarn::test
