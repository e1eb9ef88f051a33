// The chunk editor on files that other programs wrote. make-foreign-files.sh
// makes WAVE, Wave64, AIFF and AIFC files with sox, ffmpeg and libsndfile's
// tools; each is listed and compared with a walk of its bytes done here, then
// every kind of edit runs on a fresh copy. After each edit the file must be,
// byte for byte, what the edit promises (audio payload untouched, chunks
// junked, cut, moved back or appended, container size rewritten or kept), a
// new editor must list it the same way, and on POSIX sox and libsndfile must
// still decode the very same samples (from Wave64 files, the part up to the
// end of the audio chunk: both read past it).

#include <algorithm>
#include <cctype>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <map>
#include <string>
#include <vector>

#include "SoundFileFormats/ChunkFileTestUtil.h"

#ifdef TARN_TEST_DECODERS
#include <sndfile.h>
#endif

namespace tarn::test {
namespace {

namespace fs = std::filesystem;

struct ForeignFile {
  const char* name;  // as make-foreign-files.sh names it
  Container container;
  const char* layout;  // the chunks that writer puts down, each tag followed by '|'
  RIFFType meta;       // a metadata chunk before the audio that may be edited, or 0
};

constexpr RIFFType T(const char (&code)[5]) { return MakeRIFFType(code); }

const ForeignFile kFiles[] = {
    {"sox-s16.wav", Container::kRIFF, "fmt |data|", 0},
    {"sox-s24.wav", Container::kRIFF, "fmt |fact|data|", T("fact")},
    {"sox-u8-odd.wav", Container::kRIFF, "fmt |data|", 0},
    {"ffmpeg-s16.wav", Container::kRIFF, "fmt |LIST|data|", T("LIST")},
    {"ffmpeg-s24-info.wav", Container::kRIFF, "fmt |LIST|data|", T("LIST")},
    {"ffmpeg-bext.wav", Container::kRIFF, "fmt |bext|LIST|data|", T("bext")},
    {"sndfile-bext.wav", Container::kRIFF, "fmt |bext|data|LIST|", T("bext")},
    {"sox-s16.w64", Container::kWave64, "fmt |data|", 0},
    {"sox-u8-odd.w64", Container::kWave64, "fmt |data|", 0},
    {"ffmpeg-s24.w64", Container::kWave64, "fmt |data|", 0},
    {"sndfile-f32.w64", Container::kWave64, "fmt |fact|data|", T("fact")},
    {"sox-s16.aiff", Container::kFORM, "COMT|COMM|SSND|", T("COMT")},
    {"sox-s8-odd.aiff", Container::kFORM, "COMT|COMM|SSND|", T("COMT")},
    {"ffmpeg-name.aiff", Container::kFORM, "NAME|COMM|SSND|", T("NAME")},
    {"sndfile-s16.aiff", Container::kFORM, "COMM|SSND|", 0},
    {"sox-s16.aifc", Container::kFORM, "FVER|COMM|SSND|", 0},
    {"ffmpeg-sowt.aifc", Container::kFORM, "FVER|COMM|SSND|", 0},
};

// The folder of the files: $TARN_FOREIGN_FILES (CTest's fixture made it on
// the host), else on POSIX a scratch folder the script fills on first use.
const fs::path& ForeignDir() {
  struct Scratch {
    fs::path path;
    ~Scratch() {
      std::error_code ignored;
      if (!path.empty()) fs::remove_all(path, ignored);
    }
  };
  static Scratch scratch;
  static const fs::path dir = []() -> fs::path {
    if (const char* env = std::getenv("TARN_FOREIGN_FILES"); env != nullptr && *env != 0)
      return env;
#ifdef TARN_TEST_DECODERS
    std::string name = (fs::temp_directory_path() / "tarn-foreign-XXXXXX").string();
    if (::mkdtemp(name.data()) == nullptr) return {};
    scratch.path = name;
    const std::string command = "sh '" TARN_FOREIGN_FILES_SCRIPT "' '" + name + "'";
    if (std::system(command.c_str()) == 0) return name;
#endif
    return {};
  }();
  return dir;
}

// ------------------------------------------------------------ byte layouts

std::uint64_t SizeAt(const Bytes& b, std::size_t at, Container c) {
  std::uint64_t v = 0;
  const int n = IsWave64(c) ? 8 : 4;
  for (int i = 0; i < n; ++i)
    v |= std::uint64_t{b[at + i]} << (c == Container::kFORM ? 8 * (n - 1 - i) : 8 * i);
  return v;
}
std::uint64_t ContainerSize(const Bytes& b, Container c) {
  return SizeAt(b, IsWave64(c) ? 16 : 4, c);
}
std::size_t TopSize(Container c) { return IsWave64(c) ? 40 : 12; }

// A chunk's tag from its first bytes. Wave64 identifiers carry the tag in
// their first four bytes, lower case for the container's own "junk", "list".
RIFFType TagOf(const Bytes& image) {
  RIFFType tag =
      RIFFType{image[0]} << 24 | RIFFType{image[1]} << 16 | RIFFType{image[2]} << 8 | image[3];
  if (tag == T("junk")) return T("JUNK");
  return tag == T("list") ? T("LIST") : tag;
}

struct RawChunk {
  Bytes image;         // header, payload and pad bytes (zeros where the file ends early)
  std::uint64_t size;  // payload length as its size field says
};

// The file as the test sees it: container header, chunks, and how many pad
// bytes the last chunk lacks at the end of the file.
struct Layout {
  Container c;
  Bytes top;
  std::vector<RawChunk> chunks;
  std::size_t missingPad = 0;
};

Layout Walk(const Bytes& file, Container c) {
  Layout out{c, Bytes(file.begin(), file.begin() + TopSize(c)), {}};
  const std::size_t header = HeaderSizeOf(c);
  for (std::size_t pos = TopSize(c); pos + header <= file.size();) {
    const std::uint64_t size =
        SizeAt(file, pos + header - (IsWave64(c) ? 8 : 4), c) - (IsWave64(c) ? 24 : 0);
    const std::size_t end = pos + header + Padded(size, c);
    RawChunk chunk{Bytes(file.begin() + pos, file.begin() + std::min(end, file.size())), size};
    chunk.image.resize(end - pos);
    out.missingPad = end > file.size() ? end - file.size() : 0;
    out.chunks.push_back(std::move(chunk));
    pos = end;
  }
  return out;
}

Bytes BytesOf(const RCBlobMT& blob) { return Bytes(blob.GetPtr(), blob.GetPtr() + blob.GetSize()); }

Bytes PayloadOf(const RawChunk& chunk, Container c) {
  const auto begin = chunk.image.begin() + HeaderSizeOf(c);
  return Bytes(begin, begin + chunk.size);
}

// One line per chunk: tag, offset, padded length, and the identifier in Wave64.
std::string Describe(const RIFFFileEditor::ChunkList& list) {
  std::string out;
  for (const auto& [info, action] : list) {
    out += RIFFTypeToString(info.tag) + " @" + std::to_string(info.offset) + " +" +
           std::to_string(info.length);
    if (!info.uuid.IsClear()) {
      out += ' ';
      for (std::uint8_t b : info.uuid.GetBytes()) {
        out += "0123456789abcdef"[b >> 4];
        out += "0123456789abcdef"[b & 15];
      }
    }
    out += '\n';
  }
  return out;
}

// What the file must be after each edit, following the editor's rules: a
// chunk of the new tag and the same padded size is overwritten; one of another
// size (or one marked as junk) becomes "JUNK" before the audio and is cut
// after it; otherwise the chunk is appended and the container size rewritten.
class Model {
 public:
  explicit Model(Layout layout) : l_(std::move(layout)) {}

  [[nodiscard]] Bytes Image() const {
    Bytes out = l_.top;
    for (const auto& chunk : l_.chunks)
      out.insert(out.end(), chunk.image.begin(), chunk.image.end());
    out.resize(out.size() - l_.missingPad);
    return out;
  }

  [[nodiscard]] RIFFFileEditor::ChunkList Listing() const {
    RIFFFileEditor::ChunkList list;
    std::int64_t offset = static_cast<std::int64_t>(TopSize(l_.c));
    for (const auto& chunk : l_.chunks) {
      const std::int64_t length =
          static_cast<std::int64_t>(chunk.image.size()) - HeaderSizeOf(l_.c);
      TarnCOM::UUIDBytes id{};
      if (IsWave64(l_.c)) std::copy_n(chunk.image.begin(), 16, id.bytes);
      const UUIDObj uuid(id);
      list.push_back({{TagOf(chunk.image), uuid, offset, length}, RIFFFileEditor::kKeepSegment});
      offset += static_cast<std::int64_t>(chunk.image.size());
    }
    return list;
  }

  // Returns whether the chunk was appended.
  bool Add(RIFFType tag, const Bytes& payload) {
    const Bytes image = ChunkImage({tag, payload}, l_.c);
    bool written = false;
    bool afterAudio = false;
    std::vector<RawChunk> kept;
    for (auto& chunk : l_.chunks) {
      const RIFFType was = TagOf(chunk.image);
      const bool marked =
          std::erase(junk_, static_cast<std::size_t>(&chunk - l_.chunks.data())) > 0;
      if (was == tag && chunk.image.size() == image.size()) {
        chunk = {image, payload.size()};
        written = true;
      } else if (was == tag || marked) {
        if (afterAudio) continue;
        // Wave64's published "junk" identifier, spelt out here.
        const Bytes junk = IsWave64(l_.c) ? Bytes{'j',  'u',  'n',  'k',  0xF3, 0xAC, 0xD3, 0x11,
                                                  0x8C, 0xD1, 0x00, 0xC0, 0x4F, 0x8E, 0xDB, 0x8A}
                                          : Text("JUNK");
        std::copy(junk.begin(), junk.end(), chunk.image.begin());
      }
      afterAudio = afterAudio || was == AudioTagOf(l_.c);
      kept.push_back(chunk);
    }
    l_.chunks = std::move(kept);
    junk_.clear();
    if (written) return false;
    l_.chunks.push_back({image, payload.size()});
    l_.missingPad = 0;
    const std::uint64_t size = Image().size() - (IsWave64(l_.c) ? 0 : 8);
    Bytes field;
    PutSize(field, size, l_.c);
    std::copy(field.begin(), field.end(), l_.top.begin() + (IsWave64(l_.c) ? 16 : 4));
    return true;
  }

  void MarkJunk(RIFFType tag) {
    for (std::size_t i = 0; i < l_.chunks.size(); ++i)
      if (TagOf(l_.chunks[i].image) == tag) return junk_.push_back(i);
  }

  void StripAfterAudio() {
    for (std::size_t i = 0; i < l_.chunks.size(); ++i)
      if (TagOf(l_.chunks[i].image) == AudioTagOf(l_.c) && i + 1 < l_.chunks.size()) {
        l_.chunks.resize(i + 1);
        l_.missingPad = 0;
        return;
      }
  }

 private:
  Layout l_;
  std::vector<std::size_t> junk_;  // chunks marked by MaybeJunkSegment
};

// ------------------------------------------------------------ decoding

struct Decoded {
  std::vector<int> sndfile;  // libsndfile's sf_readf_int, all frames
  Bytes sox;                 // sox's 32-bit signed raw output
};

#ifdef TARN_TEST_DECODERS
std::vector<int> DecodeWithSndfile(const fs::path& path) {
  SF_INFO info{};
  SNDFILE* file = sf_open(path.c_str(), SFM_READ, &info);
  if (file == nullptr) {
    ADD_FAILURE() << "libsndfile cannot open " << path << ": " << sf_strerror(nullptr);
    return {};
  }
  std::vector<int> samples(static_cast<std::size_t>(info.frames * info.channels));
  EXPECT_EQ(sf_readf_int(file, samples.data(), info.frames), info.frames) << path;
  sf_close(file);
  return samples;
}

Bytes DecodeWithSox(const fs::path& path) {
  FILE* pipe = ::popen(("sox -V1 '" + path.string() + "' -t raw -e signed -b 32 -").c_str(), "r");
  if (pipe == nullptr) return {};
  Bytes out;
  std::uint8_t buffer[4096];
  for (std::size_t n; (n = std::fread(buffer, 1, sizeof buffer, pipe)) > 0;)
    out.insert(out.end(), buffer, buffer + n);
  EXPECT_EQ(::pclose(pipe), 0) << "sox cannot decode " << path;
  return out;
}
#endif

// sox launches cost tens of milliseconds, so the originals are decoded once.
Decoded Decode(const fs::path& path, bool withSox) {
  Decoded out;
#ifdef TARN_TEST_DECODERS
  out.sndfile = DecodeWithSndfile(path);
  if (withSox) out.sox = DecodeWithSox(path);
  EXPECT_FALSE(out.sndfile.empty()) << path;
#else
  (void)path, (void)withSox;
#endif
  return out;
}

const Decoded& OriginalDecoded(const ForeignFile& file) {
  static std::map<std::string, Decoded> cache;
  auto found = cache.find(file.name);
  if (found == cache.end())
    found = cache.emplace(file.name, Decode(ForeignDir() / file.name, true)).first;
  return found->second;
}

// ------------------------------------------------------------ edits

enum class Edit {
  kAppend,
  kOverwriteOwn,
  kOverwriteForeign,
  kResizeBeforeAudio,
  kCutAndMoveBack,
  kStrip,
  kMaybeJunk
};
const char* const kEditNames[] = {
    "Append",         "OverwriteOwn",  "OverwriteForeign", "ResizeBeforeAudio",
    "CutAndMoveBack", "StripTrailing", "MaybeJunk"};

struct Op {
  enum Kind { kAdd, kMarkJunk, kStrip } kind;
  RIFFType tag = 0;
  Bytes payload;
};

// `n` letters, so that text chunks (AIFF "NAME", "ANNO") stay text.
Bytes Letters(std::size_t n, int seed) {
  Bytes out(n);
  for (std::size_t i = 0; i < n; ++i) out[i] = static_cast<std::uint8_t>('a' + (seed + 7 * i) % 26);
  return out;
}

// A broadcast extension chunk with a description, and a LIST/INFO comment.
Bytes Bext(std::string_view description) {
  Bytes out(602);
  std::copy(description.begin(), description.end(), out.begin());
  return out;
}
Bytes Info(std::string_view comment) {
  Bytes out = Text("INFOICMT");
  PutSize(out, comment.size() + 1, Container::kRIFF);
  out.insert(out.end(), comment.begin(), comment.end());
  out.resize(Padded(out.size() + 1, Container::kRIFF));
  return out;
}

std::vector<Op> OpsFor(Edit edit, const ForeignFile& file, const Layout& layout) {
  const bool form = file.container == Container::kFORM;
  const RIFFType a = form ? T("ANNO") : T("qzma"), b = form ? T("AUTH") : T("qzsa"),
                 c = form ? T("(c) ") : T("qzam");
  Bytes meta;
  for (const auto& chunk : layout.chunks)
    if (file.meta != 0 && TagOf(chunk.image) == file.meta) meta = PayloadOf(chunk, file.container);
  switch (edit) {
    case Edit::kAppend:
      if (form)
        return {{Op::kAdd, T("ANNO"), Text("Edited by TarnCore!")},
                {Op::kAdd, T("NAME"), Text("Tone")}};
      return {{Op::kAdd, T("bext"), Bext("Edited by TarnCore")},
              {Op::kAdd, T("LIST"), Info("Edited by TarnCore")}};
    case Edit::kOverwriteOwn:  // 11 and 12 bytes take the same room
      return {{Op::kAdd, a, Letters(11, 1)}, {Op::kAdd, a, Letters(12, 2)}};
    case Edit::kOverwriteForeign:  // the same bytes with lower-case letters raised
      for (auto& byte : meta) byte = static_cast<std::uint8_t>(std::toupper(byte));
      return {{Op::kAdd, file.meta, meta}};
    case Edit::kResizeBeforeAudio:  // trailing zeros keep every reader's view of it
      meta.resize(meta.size() + 8);
      return {{Op::kAdd, file.meta, meta}};
    case Edit::kCutAndMoveBack:
      return {{Op::kAdd, a, Letters(11, 1)},
              {Op::kAdd, b, Letters(5, 2)},
              {Op::kAdd, c, Letters(20, 3)},
              {Op::kAdd, a, Letters(30, 4)}};
    case Edit::kStrip:
      return {{Op::kAdd, a, Letters(11, 1)}, {Op::kAdd, b, Letters(5, 2)}, {Op::kStrip, 0, {}}};
    case Edit::kMaybeJunk: {
      std::vector<Op> ops{
          {Op::kAdd, a, Letters(11, 1)}, {Op::kAdd, b, Letters(5, 2)}, {Op::kMarkJunk, a, {}}};
      if (file.meta != 0) ops.push_back({Op::kMarkJunk, file.meta, {}});
      ops.push_back({Op::kAdd, c, Letters(3, 3)});
      return ops;
    }
  }
  return {};
}

// "" when `actual` is `expected`, else where they part.
template <typename T>
std::string FirstDifference(const std::vector<T>& actual, const std::vector<T>& expected) {
  std::size_t i = 0;
  while (i < actual.size() && i < expected.size() && actual[i] == expected[i]) ++i;
  if (i == expected.size() && i == actual.size()) return {};
  return "sizes " + std::to_string(actual.size()) + " / " + std::to_string(expected.size()) +
         ", first difference at item " + std::to_string(i);
}

// The file as its writer made it, or an empty path after a failure.
fs::path SourceOf(const ForeignFile& file) {
  const fs::path path = ForeignDir() / file.name;
  if (!ForeignDir().empty() && fs::exists(path)) return path;
  ADD_FAILURE()
      << "no " << file.name << ": run the tests through CTest, or make the files with "
      << "tests/SoundFileFormats/make-foreign-files.sh DIR and set TARN_FOREIGN_FILES=DIR";
  return {};
}

class ForeignFileList : public ::testing::TestWithParam<const ForeignFile*> {};

TEST_P(ForeignFileList, MatchesTheWriterLayoutAndPayloads) {
  const ForeignFile& file = *GetParam();
  const fs::path path = SourceOf(file);
  if (path.empty()) return;
  const Container c = file.container;
  const Layout layout = Walk(ReadFile(path), c);
  std::string tags;
  for (const auto& chunk : layout.chunks) tags += RIFFTypeToString(TagOf(chunk.image)) + "|";
  EXPECT_EQ(tags, file.layout);

  RIFFFileEditor editor(SpecOf(path), EndianOf(c), HandlerOf(c));
  editor.ReadChunkLocations(nullptr);
  EXPECT_EQ(editor.IsWave64(), IsWave64(c));
  EXPECT_FALSE(editor.AudioRunsToEndOfFile());
  EXPECT_EQ(Describe(editor.GetChunkList()), Describe(Model(layout).Listing()));
  for (const auto& chunk : layout.chunks) {
    EXPECT_EQ(BytesOf(editor.ReadChunkData(TagOf(chunk.image))), PayloadOf(chunk, c))
        << RIFFTypeToString(TagOf(chunk.image));
  }
}

// A test name from a file name (and an edit).
std::string NameOf(std::string name) {
  for (char& ch : name)
    if (!std::isalnum(static_cast<unsigned char>(ch))) ch = '_';
  return name;
}

INSTANTIATE_TEST_SUITE_P(Foreign, ForeignFileList, ::testing::ValuesIn([] {
                           std::vector<const ForeignFile*> files;
                           for (const auto& file : kFiles) files.push_back(&file);
                           return files;
                         }()),
                         [](const auto& info) { return NameOf(info.param->name); });

struct Case {
  const ForeignFile* file;
  Edit edit;
};

class ForeignFileEdit : public ::testing::TestWithParam<Case> {};

TEST_P(ForeignFileEdit, KeepsTheAudioAndEveryReader) {
  const auto [source, edit] = GetParam();
  const fs::path original = SourceOf(*source);
  if (original.empty()) return;
  const Container c = source->container;
  const RIFFType audioTag = AudioTagOf(c);
  TempDir dir;
  const fs::path path = dir.Path(source->name);
  fs::copy_file(original, path);
  const Layout layout = Walk(ReadFile(path), c);
  Model model(layout);
  Bytes audio;
  for (const auto& chunk : layout.chunks)
    if (TagOf(chunk.image) == audioTag) audio = PayloadOf(chunk, c);
  ASSERT_FALSE(audio.empty());
  const Decoded& decodedBefore = OriginalDecoded(*source);

  RIFFFileEditor editor(SpecOf(path), EndianOf(c), HandlerOf(c));
  editor.ReadChunkLocations(nullptr);
  const std::vector<Op> ops = OpsFor(edit, *source, layout);
  for (std::size_t step = 0; step < ops.size(); ++step) {
    const Op& op = ops[step];
    SCOPED_TRACE("step " + std::to_string(step) + ": " + RIFFTypeToString(op.tag));
    const Bytes before = ReadFile(path);
    bool appended = false;
    if (op.kind == Op::kMarkJunk) {
      editor.MaybeJunkSegment(op.tag);
      model.MarkJunk(op.tag);
      continue;
    }
    if (op.kind == Op::kStrip) {
      editor.RemoveTrailingMetaData(audioTag);
      model.StripAfterAudio();
    } else {
      editor.AddChunkData({op.tag, {}, RCBlobMT(op.payload.data(), op.payload.size())}, audioTag);
      appended = model.Add(op.tag, op.payload);
    }
    const Bytes after = ReadFile(path);
    EXPECT_EQ(FirstDifference(after, model.Image()), "");
    EXPECT_EQ(ContainerSize(after, c),
              appended ? after.size() - (IsWave64(c) ? 0 : 8) : ContainerSize(before, c));
    EXPECT_EQ(Describe(editor.GetChunkList()), Describe(model.Listing()));

    RIFFFileEditor fresh(SpecOf(path), EndianOf(c), HandlerOf(c));
    fresh.ReadChunkLocations(nullptr);
    EXPECT_EQ(Describe(fresh.GetChunkList()), Describe(model.Listing()));
    const auto at =
        static_cast<std::size_t>(fresh.GetOffsetToChunkStart(audioTag) + HeaderSizeOf(c));
    ASSERT_LE(at + audio.size(), after.size());
    EXPECT_TRUE(
        std::equal(audio.begin(), audio.end(), after.begin() + static_cast<std::ptrdiff_t>(at)));
    if (op.kind == Op::kAdd) {
      EXPECT_EQ(BytesOf(fresh.ReadChunkData(op.tag)), op.payload);
    }
    // sox runs once, after the last step: the steps before it are the
    // appends of other cases. Both readers take a Wave64 audio chunk to run
    // to the end of the file (chunks after it decode as frames, floats
    // included), so they read Wave64 files up to the end of the audio.
    const bool last = step + 1 == ops.size();
    fs::path decodable = path;
    if (IsWave64(c)) {
      decodable = dir.Path("audio-" + std::string(source->name));
      WriteFile(decodable, Bytes(after.begin(),
                                 after.begin() + static_cast<std::ptrdiff_t>(at + audio.size())));
    }
    const Decoded decoded = Decode(decodable, last);
    EXPECT_EQ(FirstDifference(decoded.sndfile, decodedBefore.sndfile), "") << "libsndfile";
    if (last) {
      EXPECT_EQ(FirstDifference(decoded.sox, decodedBefore.sox), "") << "sox";
    }
  }
}

std::vector<Case> AllCases() {
  std::vector<Case> cases;
  for (const auto& file : kFiles)
    for (int e = 0; e <= static_cast<int>(Edit::kMaybeJunk); ++e) {
      const auto edit = static_cast<Edit>(e);
      if (file.meta == 0 && (edit == Edit::kOverwriteForeign || edit == Edit::kResizeBeforeAudio))
        continue;
      cases.push_back({&file, edit});
    }
  return cases;
}

INSTANTIATE_TEST_SUITE_P(Foreign, ForeignFileEdit, ::testing::ValuesIn(AllCases()),
                         [](const auto& info) {
                           return NameOf(std::string(info.param.file->name) + "_" +
                                         kEditNames[static_cast<int>(info.param.edit)]);
                         });

#ifndef TARN_TEST_DECODERS
TEST(ForeignFileDecoders, NeedTheHostTools) {
  GTEST_SKIP()
      << "sox and libsndfile run on the build host only: this build checks the bytes alone";
}
#endif

}  // namespace
}  // namespace tarn::test
