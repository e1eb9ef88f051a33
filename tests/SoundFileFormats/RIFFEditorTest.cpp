// The chunk editor on files built byte by byte: listing geometry, the files
// that lie, the errors, and every edit checked against a chunk-level model of
// the file over random edit sequences in all three containers.

#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <cstring>
#include <random>
#include <thread>

#include "ChunkFileTestUtil.h"
#include "tarn/Audio/SoundFileFormats/WAVEWriter.h"
#include "tarn/Basics/RCBlobMT.h"

namespace tarn::test {
namespace {

const RIFFType kFmt = MakeRIFFType("fmt ");
const RIFFType kBext = MakeRIFFType("bext");
const RIFFType kList = MakeRIFFType("LIST");
const RIFFType kQzma = MakeRIFFType("qzma");
const RIFFType kJunk = MakeRIFFType("JUNK");
const RIFFType kData = MakeRIFFType("data");
const RIFFType kSsnd = MakeRIFFType("SSND");

constexpr Container kContainers[] = {Container::kRIFF, Container::kFORM, Container::kWave64};

struct Listed {
  RIFFType tag;
  std::int64_t offset;
  std::int64_t length;
};

std::vector<Listed> ListOf(const std::filesystem::path& path, Container c,
                           RIFFFileEditor::StopParsingTester* tester = nullptr) {
  RIFFFileEditor editor(SpecOf(path), EndianOf(c), HandlerOf(c));
  editor.ReadChunkLocations(tester);
  std::vector<Listed> out;
  for (const auto& [info, action] : editor.GetChunkList()) {
    EXPECT_EQ(action, RIFFFileEditor::kKeepSegment);
    EXPECT_EQ(info.uuid, IsWave64(c) ? HandlerOf(c).UUIDForTag(info.tag, false) : UUIDObj());
    out.push_back({info.tag, info.offset, info.length});
  }
  return out;
}

void ExpectListing(const std::vector<Listed>& got, const std::vector<Listed>& want) {
  ASSERT_EQ(got.size(), want.size());
  for (std::size_t i = 0; i < got.size(); ++i) {
    EXPECT_EQ(RIFFTypeToString(got[i].tag), RIFFTypeToString(want[i].tag)) << i;
    EXPECT_EQ(got[i].offset, want[i].offset) << i;
    EXPECT_EQ(got[i].length, want[i].length) << i;
  }
}

RCBlobMT Blob(const Bytes& bytes) { return RCBlobMT(bytes.data(), bytes.size()); }

std::int64_t FormEnd(Container c) { return IsWave64(c) ? 40 : 12; }

TEST(RIFFEditorListing, GeometryOfEachContainer) {
  TempDir dir;
  for (Container c : kContainers) {
    SCOPED_TRACE(NameOf(c));
    const auto path = dir.Path("f");
    WriteFile(path, FileImage({{kFmt, Pattern(16)},
                               {kBext, Pattern(5)},
                               {AudioTagOf(c), Pattern(10)},
                               {kList, Pattern(3)}},
                              c));
    const std::int64_t h = HeaderSizeOf(c);
    const auto pad = [c](std::int64_t n) { return WAVEWriter::PadDataLength(n, IsWave64(c)); };
    std::int64_t at = FormEnd(c);
    std::vector<Listed> want;
    for (auto [tag, n] : {std::pair{kFmt, 16}, {kBext, 5}, {AudioTagOf(c), 10}, {kList, 3}}) {
      want.push_back({tag, at, pad(n)});
      at += h + pad(n);
    }
    ExpectListing(ListOf(path, c), want);

    RIFFFileEditor::TestForChunk stopAtAudio(AudioTagOf(c));
    want.resize(3);
    ExpectListing(ListOf(path, c, &stopAtAudio), want);

    RIFFFileEditor editor(SpecOf(path), EndianOf(c), HandlerOf(c));
    editor.ReadChunkLocations(nullptr);
    EXPECT_EQ(editor.IsWave64(), IsWave64(c));
    EXPECT_TRUE(editor.HasChunk(kBext));
    EXPECT_FALSE(editor.HasChunk(kQzma));
    EXPECT_EQ(editor.GetOffsetToChunkStart(kList), want.back().offset + h + pad(10));
    UUIDObj uuid;
    const RCBlobMT bext = editor.ReadChunkData(kBext, uuid);
    EXPECT_EQ(Bytes(bext.GetPtr(), bext.GetPtr() + bext.GetSize()), Pattern(5));
    EXPECT_EQ(uuid, IsWave64(c) ? HandlerOf(c).UUIDForTag(kBext, false) : UUIDObj());
    EXPECT_TRUE(editor.ReadChunkData(kQzma, uuid).IsEmpty());
    EXPECT_EQ(editor.CountPostAudioChunks(AudioTagOf(c)), 1);
    EXPECT_EQ(editor.GetNthPostAudioChunks(0, AudioTagOf(c), uuid), kList);
    EXPECT_EQ(editor.GetNthPostAudioChunks(1, AudioTagOf(c), uuid), RIFFFileEditor::kNullTag);
    EXPECT_EQ(editor.CountPostAudioChunks(kQzma), 0);
    EXPECT_FALSE(editor.AudioDataIsZeroLength(AudioTagOf(c), pad(10) - 1));
    EXPECT_TRUE(editor.AudioDataIsZeroLength(AudioTagOf(c), pad(10)));
    EXPECT_FALSE(editor.AudioDataIsZeroLength(kQzma, 1 << 30));
    const auto missing = ErrorOf([&] { (void)editor.GetOffsetToChunkStart(kQzma); });
    ASSERT_TRUE(missing);
    EXPECT_STREQ(missing->GetKind().c_str(), "RIFFFileEditor");
    EXPECT_EQ(missing->GetIntErrorCode(), RIFFFileEditor::kChunkNotFound);
  }
}

// Files that lie about their sizes, and how far the listing trusts them.
TEST(RIFFEditorListing, LyingFilesStopOrStretchAsTheyShould) {
  struct Case {
    const char* name;
    Container c;
    std::vector<ChunkSpec> chunks;
    Bytes tail;                // appended raw after the chunks
    std::vector<Listed> want;  // offsets relative to the end of the form type
    bool audioRunsToEnd = false;
  };
  const Case cases[] = {
      {"SSND of length 0 runs to the end",
       Container::kFORM,
       {{kFmt, Pattern(4)}, {kSsnd, Pattern(9), 0, true}},
       {},
       {{kFmt, 0, 4}, {kSsnd, 12, 10}}},
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
      {"Wave64 size below its header",
       Container::kWave64,
       {{kFmt, Pattern(8)}, {kBext, {}, 0}},
       {},
       {{kFmt, 0, 8}}},
  };
  TempDir dir;
  for (const Case& t : cases) {
    SCOPED_TRACE(t.name);
    Bytes image = FileImage(t.chunks, t.c);
    if (std::string(t.name).starts_with("Wave64 size below")) {
      // A size field of 23 (one less than the header it counts).
      image[image.size() - 8] = 23;
    }
    image.insert(image.end(), t.tail.begin(), t.tail.end());
    WriteFile(dir.Path("f"), image);
    std::vector<Listed> want = t.want;
    for (auto& w : want) w.offset += FormEnd(t.c);
    ExpectListing(ListOf(dir.Path("f"), t.c), want);
    RIFFFileEditor editor(SpecOf(dir.Path("f")), EndianOf(t.c), HandlerOf(t.c));
    editor.ReadChunkLocations(nullptr);
    EXPECT_EQ(editor.AudioRunsToEndOfFile(), t.audioRunsToEnd);
  }
}

// A last chunk cut short by less than the file's length stays listed at its
// claimed size; an edit then refuses to start rather than move or append
// around missing bytes.
TEST(RIFFEditorEdits, TruncatedLastChunkIsRefusedUntouched) {
  TempDir dir;
  const auto path = dir.Path("f");
  for (RIFFType last : {kList, kData}) {
    Bytes image = FileImage({{kFmt, Pattern(200)}, {kData, Pattern(300)}, {kList, Pattern(40)}},
                            Container::kRIFF);
    if (last == kData) image.resize(image.size() - 48 - 20);
    image.resize(image.size() - 20);
    WriteFile(path, image);
    RIFFFileEditor editor(SpecOf(path), kRIFFLittleEndian, GetWaveRIFFFormatHandler());
    editor.ReadChunkLocations(nullptr);
    ASSERT_EQ(editor.GetChunkList().back().first.tag, last);
    EXPECT_FALSE(editor.AudioRunsToEndOfFile());
    const auto error = ErrorOf([&] { editor.AddChunkData({kBext, {}, Blob(Pattern(4))}, kData); });
    ASSERT_TRUE(error);
    EXPECT_STREQ(error->GetKind().c_str(), "RIFFFileEditor");
    EXPECT_EQ(error->GetIntErrorCode(), RIFFFileEditor::kChunkPastEndOfFile);
    EXPECT_EQ(ReadFile(path), image);
  }
}

TEST(RIFFEditorListing, RiffWithoutTheWave64IdentifierIsClassic) {
  TempDir dir;
  Bytes image = FileImage({{kFmt, Pattern(2)}, {kData, Pattern(4)}}, Container::kRIFF);
  std::copy_n("riff", 4, image.begin());
  WriteFile(dir.Path("f"), image);
  ExpectListing(ListOf(dir.Path("f"), Container::kRIFF), {{kFmt, 12, 2}, {kData, 22, 4}});
}

TEST(RIFFEditorListing, WhatIsNotAChunkFileThrows) {
  TempDir dir;
  const Bytes wave = FileImage({{kData, Pattern(2)}}, Container::kRIFF);
  const Bytes aiff = FileImage({{kSsnd, Pattern(2)}}, Container::kFORM);
  Bytes avi = wave;
  std::copy_n("AVI ", 4, avi.begin() + 8);
  struct Case {
    const char* name;
    Bytes bytes;
    Container c;
  } cases[] = {
      {"empty", {}, Container::kRIFF},
      {"three bytes", Text("RIF"), Container::kRIFF},
      {"container only", Text("RIFF\x10\0\0"), Container::kRIFF},
      {"another format", Text("OggS\0\0\0\0\0\0\0\0\0\0\0\0"), Container::kRIFF},
      {"refused form type", avi, Container::kRIFF},
      {"FORM given to the WAVE handler", aiff, Container::kRIFF},
      {"RIFF given to the AIFF handler", wave, Container::kFORM},
  };
  for (const Case& t : cases) {
    SCOPED_TRACE(t.name);
    WriteFile(dir.Path("f"), t.bytes);
    RIFFFileEditor editor(SpecOf(dir.Path("f")), EndianOf(t.c), HandlerOf(t.c));
    const auto error = ErrorOf([&] { editor.ReadChunkLocations(nullptr); });
    ASSERT_TRUE(error);
    EXPECT_STREQ(error->GetKind().c_str(), "RIFFFileEditor");
    EXPECT_STREQ(error->GetSystem().c_str(), "RIFFFileEditor");
    EXPECT_STREQ(error->GetSubsystem().c_str(), "RIFFFileEditor");
    EXPECT_EQ(error->GetIntErrorCode(), RIFFFileEditor::kNotAChunkFile);
    EXPECT_TRUE(error->GetAttachment().has_value());
    EXPECT_TRUE(editor.GetChunkList().empty());
    EXPECT_EQ(ReadFile(dir.Path("f")), t.bytes);
  }
  for (const auto& path : {dir.Path("missing"), dir.Path("")}) {
    RIFFFileEditor editor(SpecOf(path), kRIFFLittleEndian, GetWaveRIFFFormatHandler());
    const auto error = ErrorOf([&] { editor.ReadChunkLocations(nullptr); });
    ASSERT_TRUE(error) << path;
    EXPECT_EQ(error->GetIntErrorCode(), kAccessDeniedErr) << path;
  }
}

// ------------------------------------------------------------------ editing

// A chunk-level model of the file the editor should leave: the edit rules
// applied to a list of chunks, serialised with FileImage.
struct ModelChunk {
  RIFFType tag;
  Bytes payload;
  bool junkMark = false;
};

class FileModel {
 public:
  FileModel(std::vector<ModelChunk> chunks, Container c) : chunks_(std::move(chunks)), c_(c) {}

  void Add(RIFFType tag, const Bytes& payload) {
    const auto padded = [this](std::size_t n) { return Padded(n, c_); };
    bool seenAudio = false;
    bool written = false;
    std::vector<ModelChunk> kept;
    for (ModelChunk& chunk : chunks_) {
      bool remove = false;
      if (chunk.tag == AudioTagOf(c_)) {
        seenAudio = true;
      } else if (chunk.tag == tag) {
        if (padded(payload.size()) == padded(chunk.payload.size())) {
          chunk.payload = payload;
          chunk.junkMark = false;
          written = true;
        } else if (seenAudio) {
          remove = true;
        } else {
          chunk.junkMark = true;
        }
      } else if (chunk.junkMark && seenAudio) {
        remove = true;
      }
      if (chunk.junkMark) chunk.tag = kJunk;
      if (!remove) kept.push_back(chunk);
    }
    chunks_ = std::move(kept);
    if (!written) chunks_.push_back({tag, payload});
  }

  void MarkJunk(RIFFType tag) {
    for (ModelChunk& chunk : chunks_) {
      if (chunk.tag == tag) {
        chunk.junkMark = true;
        return;
      }
    }
  }

  // JunkChunk: the first chunk of the tag and every marked chunk retire at
  // once; false when no chunk has the tag.
  bool JunkNow(RIFFType tag) {
    const auto first = std::find_if(chunks_.begin(), chunks_.end(),
                                    [tag](const auto& ch) { return ch.tag == tag; });
    if (first == chunks_.end()) return false;
    first->junkMark = true;
    bool seenAudio = false;
    std::vector<ModelChunk> kept;
    for (ModelChunk& chunk : chunks_) {
      if (chunk.tag == AudioTagOf(c_)) seenAudio = true;
      if (chunk.junkMark && seenAudio) continue;
      if (chunk.junkMark) chunk.tag = kJunk;
      kept.push_back(chunk);
    }
    chunks_ = std::move(kept);
    return true;
  }

  void StripAfterAudio() {
    const auto audio = std::find_if(chunks_.begin(), chunks_.end(),
                                    [this](const auto& ch) { return ch.tag == AudioTagOf(c_); });
    if (audio != chunks_.end()) chunks_.erase(audio + 1, chunks_.end());
  }

  [[nodiscard]] Bytes Image() const {
    std::vector<ChunkSpec> specs;
    for (const auto& chunk : chunks_) specs.push_back({chunk.tag, chunk.payload});
    return FileImage(specs, c_);
  }

 private:
  std::vector<ModelChunk> chunks_;
  Container c_;
};

// The bytes of the audio payload, found by the listing.
Bytes AudioPayload(const std::filesystem::path& path, Container c) {
  for (const Listed& chunk : ListOf(path, c)) {
    if (chunk.tag == AudioTagOf(c)) {
      const Bytes file = ReadFile(path);
      const auto begin = static_cast<std::size_t>(chunk.offset + HeaderSizeOf(c));
      const auto end = std::min(file.size(), static_cast<std::size_t>(begin + chunk.length));
      return Bytes(file.begin() + static_cast<std::ptrdiff_t>(begin),
                   file.begin() + static_cast<std::ptrdiff_t>(end));
    }
  }
  ADD_FAILURE() << "no audio chunk listed";
  return {};
}

TEST(RIFFEditorEdits, RandomEditSequencesMatchTheModel) {
  TempDir dir;
  const auto path = dir.Path("f");
  std::mt19937 rng(20261123);
  const RIFFType pool[] = {kFmt, kBext, kList, kQzma};
  const auto pick = [&](int n) { return static_cast<int>(rng() % static_cast<unsigned>(n)); };
  const auto chunksOf = [&](int most) {
    std::vector<ModelChunk> chunks;
    for (int i = pick(most + 1); i > 0; --i)
      chunks.push_back({pool[pick(4)], Pattern(static_cast<std::size_t>(pick(20)), 30)});
    return chunks;
  };
  for (Container c : kContainers) {
    for (int round = 0; round < 100; ++round) {
      std::vector<ModelChunk> chunks = chunksOf(3);
      chunks.push_back({AudioTagOf(c), Pattern(1 + static_cast<std::size_t>(pick(40)), 99)});
      for (auto& after : chunksOf(3)) chunks.push_back(after);
      FileModel model(chunks, c);
      WriteFile(path, model.Image());
      const Bytes audio = AudioPayload(path, c);
      RIFFFileEditor editor(SpecOf(path), EndianOf(c), HandlerOf(c));
      editor.ReadChunkLocations(nullptr);
      std::string log;
      for (int step = pick(4) + 1; step > 0; --step) {
        const int kind = pick(7);
        const RIFFType tag = pool[pick(4)];
        log += RIFFTypeToString(tag) + ":" + std::to_string(kind) + " ";
        SCOPED_TRACE(std::string(NameOf(c)) + " round " + std::to_string(round) + " " + log);
        const Bytes before = ReadFile(path);
        if (kind == 0) {
          model.MarkJunk(tag);
          editor.MaybeJunkSegment(tag);
        } else if (kind == 1) {
          model.StripAfterAudio();
          editor.RemoveTrailingMetaData(AudioTagOf(c));
          // The container size is left as it was.
          Bytes want = model.Image();
          const int sizeAt = IsWave64(c) ? 16 : 4;
          std::copy_n(before.begin() + sizeAt, IsWave64(c) ? 8 : 4, want.begin() + sizeAt);
          ASSERT_EQ(ReadFile(path), want);
          WriteFile(path, model.Image());
          continue;
        } else if (kind == 6) {
          if (!model.JunkNow(tag)) {
            const auto error = ErrorOf([&] { editor.JunkChunk(tag, AudioTagOf(c)); });
            ASSERT_TRUE(error);
            EXPECT_EQ(error->GetIntErrorCode(), RIFFFileEditor::kChunkNotFound);
          } else {
            editor.JunkChunk(tag, AudioTagOf(c));
          }
        } else {
          const Bytes payload = Pattern(static_cast<std::size_t>(pick(24)), 200);
          model.Add(tag, payload);
          editor.AddChunkData({tag, {}, Blob(payload)}, AudioTagOf(c));
        }
        ASSERT_EQ(ReadFile(path), model.Image());
        ASSERT_EQ(AudioPayload(path, c), audio);
        // The editor's list is the file's.
        std::vector<Listed> listed;
        for (const auto& [info, action] : editor.GetChunkList())
          listed.push_back({info.tag, info.offset, info.length});
        ExpectListing(listed, ListOf(path, c));
      }
    }
  }
}

TEST(RIFFEditorEdits, AudioChunkRunningPastTheEndIsFixedFirst) {
  TempDir dir;
  for (Container c : kContainers) {
    SCOPED_TRACE(NameOf(c));
    const auto path = dir.Path("f");
    // A recording whose sizes were never written: 7 bytes of audio, no pad.
    const Bytes image =
        FileImage({{kFmt, Pattern(4)}, {AudioTagOf(c), Pattern(7), 0xFFFFFFFF, false}}, c);
    WriteFile(path, image);
    RIFFFileEditor editor(SpecOf(path), EndianOf(c), HandlerOf(c));
    editor.ReadChunkLocations(nullptr);
    ASSERT_TRUE(editor.AudioRunsToEndOfFile());
    editor.AddChunkData({kBext, {}, Blob(Pattern(3))}, AudioTagOf(c));
    // Only the audio chunk's size field changed; nothing was added.
    Bytes want = image;
    const Bytes header = ChunkImage({AudioTagOf(c), {}}, c);
    Bytes fixed = ChunkImage({AudioTagOf(c), {}, 7}, c);
    const std::size_t at = image.size() - 7 - header.size();
    std::copy(fixed.begin(), fixed.end(), want.begin() + static_cast<std::ptrdiff_t>(at));
    EXPECT_EQ(ReadFile(path), want);
    EXPECT_FALSE(editor.HasChunk(kBext));
    // The next edit restores the pad bytes and appends.
    editor.AddChunkData({kBext, {}, Blob(Pattern(3))}, AudioTagOf(c));
    const Bytes whole =
        FileImage({{kFmt, Pattern(4)}, {AudioTagOf(c), Pattern(7)}, {kBext, Pattern(3)}}, c);
    EXPECT_EQ(ReadFile(path), whole);
  }
}

TEST(RIFFEditorEdits, MissingFinalPadByteIsRestoredBeforeAppending) {
  TempDir dir;
  const auto path = dir.Path("f");
  WriteFile(path, FileImage({{kData, Pattern(5), std::nullopt, false}}, Container::kRIFF));
  RIFFFileEditor editor(SpecOf(path), kRIFFLittleEndian, GetWaveRIFFFormatHandler());
  editor.ReadChunkLocations(nullptr);
  editor.AddChunkData({kList, {}, Blob(Pattern(1))}, kData);
  EXPECT_EQ(ReadFile(path),
            FileImage({{kData, Pattern(5)}, {kList, Pattern(1)}}, Container::kRIFF));
}

TEST(RIFFEditorEdits, ChunkWithoutWave64IdentifierIsRefusedUntouched) {
  TempDir dir;
  const auto path = dir.Path("f");
  const Bytes image = FileImage({{kData, Pattern(8)}}, Container::kWave64);
  WriteFile(path, image);
  RIFFFileEditor editor(SpecOf(path), kRIFFLittleEndian, GetWaveRIFFFormatHandler());
  const auto error = ErrorOf([&] {
    editor.AddChunkData({MakeRIFFType("zzzz"), {}, Blob(Pattern(2))}, kData);
  });
  ASSERT_TRUE(error);
  EXPECT_EQ(error->GetIntErrorCode(), -50);
  EXPECT_EQ(ReadFile(path), image);
  // With an identifier of the caller's own it is written as given.
  const UUIDObj own(UString("0f1e2d3c-4b5a-6978-8796-a5b4c3d2e1f0"));
  editor.AddChunkData({MakeRIFFType("zzzz"), own, Blob(Pattern(2))}, kData);
  const Bytes file = ReadFile(path);
  EXPECT_TRUE(std::equal(own.GetBytes().begin(), own.GetBytes().end(), file.begin() + 72));
}

TEST(RIFFEditorEdits, UpdateUUIDsFromTagsJunksTagsWithoutIdentifier) {
  TempDir dir;
  const auto path = dir.Path("f");
  WriteFile(path,
            FileImage({{kFmt, Pattern(2)}, {MakeRIFFType("odd!"), Pattern(6)}, {kData, Pattern(2)}},
                      Container::kRIFF));
  RIFFFileEditor editor(SpecOf(path), kRIFFLittleEndian, GetWaveRIFFFormatHandler());
  editor.ReadChunkLocations(nullptr);
  editor.UpdateUUIDsFromTags();
  const auto& list = editor.GetChunkList();
  EXPECT_EQ(list[0].first.uuid, GetWaveRIFFFormatHandler().UUIDForTag(kFmt, true));
  EXPECT_EQ(list[1].first.tag, kJunk);
  EXPECT_EQ(list[1].second, RIFFFileEditor::kJunkSegment);
  EXPECT_EQ(list[1].first.uuid, GetWaveRIFFFormatHandler().UUIDForTag(kJunk, true));
  editor.AddChunkData({kBext, {}, Blob(Pattern(2))}, kData);
  EXPECT_EQ(
      ReadFile(path),
      FileImage({{kFmt, Pattern(2)}, {kJunk, Pattern(6)}, {kData, Pattern(2)}, {kBext, Pattern(2)}},
                Container::kRIFF));
}

// Readers on several threads and a writer share one editor: the lock makes
// every read see one whole version of the chunk, never a mix of two.
TEST(RIFFEditorThreads, ReadsAndEditsOfOneEditorSerialise) {
  TempDir dir;
  const auto path = dir.Path("f");
  WriteFile(path, FileImage({{kBext, Bytes(600, 0)}, {kData, Pattern(64)}}, Container::kRIFF));
  RIFFFileEditor editor(SpecOf(path), kRIFFLittleEndian, GetWaveRIFFFormatHandler());
  editor.ReadChunkLocations(nullptr);
  std::atomic<bool> stop{false};
  std::vector<std::thread> readers;
  std::atomic<int> reads{0};
  for (int t = 0; t < 3; ++t) {
    readers.emplace_back([&] {
      while (!stop.load()) {
        const RCBlobMT blob = editor.ReadChunkData(kBext);
        ASSERT_EQ(blob.GetSize(), 600);
        const std::uint8_t first = blob.GetPtr()[0];
        ASSERT_TRUE(std::all_of(blob.GetPtr(), blob.GetPtr() + 600,
                                [first](std::uint8_t b) { return b == first; }));
        ASSERT_EQ(editor.CountPostAudioChunks(kData), 0);
        ++reads;
      }
    });
  }
  for (int round = 1; round <= 200; ++round)
    editor.AddChunkData({kBext, {}, Blob(Bytes(600, static_cast<std::uint8_t>(round)))}, kData);
  while (reads.load() < 50) std::this_thread::yield();
  stop = true;
  for (auto& r : readers) r.join();
  EXPECT_EQ(ReadFile(path),
            FileImage({{kBext, Bytes(600, 200)}, {kData, Pattern(64)}}, Container::kRIFF));
}

// ------------------------------------------------------------------ tables

TEST(RIFFEditorTables, TagIDTableIncludingTheDoubleEntry) {
  struct Pair {
    const char* tag;
    std::uint32_t id;
  };
  const Pair numbers[] = {{"qzma", 1001}, {"qzsa", 1002}, {"qzam", 1004}, {"qzas", 1005},
                          {"qzac", 1006}, {"qzwe", 1020}, {"qzw1", 1023}, {"qzbt", 1024},
                          {"qzcu", 1050}, {"qzmu", 1051}, {"qzuc", 1052}, {"MLo1", 1022},
                          {"qzdt", 1025}, {"MLo2", 1026}, {"ANNO", 1021}};
  for (const Pair& p : numbers) {
    const RIFFType tag = RIFFTypeFromChars(p.tag);
    EXPECT_EQ(RIFFFileEditor::FindIDForTag(tag), p.id) << p.tag;
    EXPECT_EQ(RIFFFileEditor::FindTagForID(p.id), tag) << p.tag;
  }
  EXPECT_EQ(RIFFFileEditor::FindIDForTag(MakeRIFFType("qzmc")), 1003u);
  EXPECT_EQ(RIFFFileEditor::FindTagForID(1003), MakeRIFFType("qzmc"));
  EXPECT_EQ(RIFFFileEditor::FindTagForID(1053), MakeRIFFType("qzmc"));
  EXPECT_EQ(RIFFFileEditor::FindIDForTag(MakeRIFFType("qzrn")), MakeRIFFType("ddRL"));
  EXPECT_EQ(RIFFFileEditor::FindTagForID(MakeRIFFType("QZtd")), MakeRIFFType("qzte"));
  for (const char* same : {"bext", "levl", "qzod", "Rec!", "SmpI", "ddOV", "Dscr", "AUTH", "(c) ",
                           "ACdI", "basc", "acid", "regn"}) {
    const RIFFType tag = RIFFTypeFromChars(same);
    EXPECT_EQ(RIFFFileEditor::FindIDForTag(tag), tag) << same;
    EXPECT_EQ(RIFFFileEditor::FindTagForID(tag), tag) << same;
  }
  EXPECT_EQ(RIFFFileEditor::FindIDForTag(kData), kData);
  EXPECT_EQ(RIFFFileEditor::FindTagForID(7), 7u);
}

TEST(RIFFEditorTables, Wave64IdentifiersAsPublishedAndOurOwn) {
  const auto& wave = GetWaveRIFFFormatHandler();
  const struct {
    const char* tag;
    const char* id;
  } published[] = {
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
  for (const auto& p : published) {
    const RIFFType tag = RIFFTypeFromChars(p.tag);
    const UUIDObj id{UString(p.id)};
    EXPECT_EQ(wave.UUIDForTag(tag, false), id) << p.tag;
    EXPECT_EQ(wave.UUIDForTag(tag, true), id) << p.tag;
    EXPECT_EQ(wave.TagForUUID(id), tag) << p.tag;
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
  EXPECT_TRUE(wave.IsWave64Container(UUIDObj(UString(published[0].id))));
  EXPECT_FALSE(wave.IsWave64Container(UUIDObj(UString(published[1].id))));
  EXPECT_EQ(wave.TagForUUID(UUIDObj(UString("62657874-f3ac-d3aa-d18c-00c04f8edb8a"))), kBext);
  EXPECT_EQ(wave.TagForUUID(UUIDObj(UString("6c65766c-f3ac-d311-d18c-00c04f8edb8a"))),
            MakeRIFFType("levl"));
  EXPECT_EQ(wave.TagForUUID(UUIDObj(UString("62657874-0000-0000-0000-000000000000"))),
            kUnknownChunkTag);
  EXPECT_EQ(wave.UUIDForTag(MakeRIFFType("zzzz"), true), UUIDObj());
  EXPECT_EQ(wave.UUIDForTag(0, true), UUIDObj());

  // Every metadata tag has an identifier of its own, distinct from all
  // others, that reads back as the tag.
  std::vector<UUIDObj> seen;
  for (const char* own :
       {"qzma", "qzsa", "qzmc", "qzam", "qzas", "qzac", "qzwe", "qzw1", "qzbt", "qzcu",
        "qzmu", "qzuc", "qzrn", "qzte", "qzod", "Rec!", "MLo1", "qzdt", "MLo2", "SmpI",
        "ddOV", "ANNO", "Dscr", "AUTH", "(c) ", "ACdI", "basc", "acid", "regn", "qzfd",
        "qzf1", "qzf2", "qzf3", "qzf4", "qzf5", "qzf6", "qzf7", "qzf8", "qzf9", "qzfa"}) {
    const RIFFType tag = RIFFTypeFromChars(own);
    const UUIDObj id = wave.UUIDForTag(tag, true);
    EXPECT_FALSE(id.IsClear()) << own;
    EXPECT_EQ(wave.TagForUUID(id), tag) << own;
    EXPECT_EQ(std::count(seen.begin(), seen.end(), id), 0) << own;
    seen.push_back(id);
  }

  const auto& aiff = GetAIFFRIFFFormatHandler();
  EXPECT_TRUE(aiff.IsContainerID(MakeRIFFType("FORM")));
  EXPECT_FALSE(aiff.IsContainerID(MakeRIFFType("RIFF")));
  EXPECT_TRUE(aiff.IsFormType(MakeRIFFType("AIFC")));
  EXPECT_TRUE(aiff.IsFormType(MakeRIFFType("AIFF")));
  EXPECT_FALSE(aiff.IsFormType(MakeRIFFType("WAVE")));
  EXPECT_FALSE(aiff.SupportsWave64());
  EXPECT_EQ(aiff.UUIDForTag(kBext, true), UUIDObj());
  EXPECT_EQ(aiff.TagForUUID(UUIDObj(UString(published[8].id))), 0u);
  EXPECT_TRUE(wave.IsContainerID(MakeRIFFType("riff")));
  EXPECT_FALSE(wave.IsContainerID(MakeRIFFType("FORM")));
}

TEST(RIFFEditorTables, PaddingRules) {
  for (std::int64_t n = 0; n < 64; ++n) {
    EXPECT_EQ(WAVEWriter::PadDataLength(n, false), n % 2 ? n + 1 : n);
    EXPECT_EQ(WAVEWriter::PadDataLength(n, true), (n + 7) / 8 * 8);
  }
  EXPECT_EQ(WAVEWriter::PadDataLength(0xFFFFFFFF, false), 0x100000000);
  EXPECT_EQ(WAVEWriter::PadDataLength(0x7FFFFFFFFFFFFFF1, true), 0x7FFFFFFFFFFFFFF8);
  EXPECT_EQ(WAVEWriter::GetRIFFChunkExtraSize(false), 4);
  EXPECT_EQ(WAVEWriter::GetRIFFChunkExtraSize(true), 16);
  EXPECT_EQ(WAVEWriter::GetChunkHeaderSize(true), 24);
}

TEST(RCBlobMTTest, SharesBytesAcrossThreadsAndRefusesHugeBlocks) {
  const RCBlobMT blob(Pattern(1000).data(), 1000);
  EXPECT_EQ(blob.GetSize(), 1000);
  EXPECT_EQ(Bytes(blob.GetPtr(), blob.GetPtr() + 1000), Pattern(1000));
  EXPECT_TRUE(RCBlobMT(blob).SameBytes(blob));
  EXPECT_FALSE(RCBlobMT(Pattern(1000, 2).data(), 1000).SameBytes(blob));
  EXPECT_TRUE(RCBlobMT().SameBytes(RCBlobMT(0)));
  EXPECT_EQ(RCBlobMT().GetPtr(), nullptr);
  const RCBlobMT zeros(64);
  EXPECT_EQ(Bytes(zeros.GetPtr(), zeros.GetPtr() + 64), Bytes(64));
  {
    std::vector<std::thread> threads;
    for (int t = 0; t < 4; ++t) {
      threads.emplace_back([&blob] {
        for (int i = 0; i < 20000; ++i) {
          RCBlobMT copy = blob;
          RCBlobMT moved = std::move(copy);
          ASSERT_EQ(moved.GetPtr()[999], blob.GetPtr()[999]);
        }
      });
    }
    for (auto& t : threads) t.join();
  }
  EXPECT_EQ(blob.UseCount(), 1);
  const auto error = ErrorOf([] { RCBlobMT huge(std::size_t{0x80000000}); });
  ASSERT_TRUE(error);
  EXPECT_EQ(error->GetIntErrorCode(), -50);
}

}  // namespace
}  // namespace tarn::test
