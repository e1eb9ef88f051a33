// Files that other programs wrote (sox, ffmpeg and libsndfile's tools, made
// on the build host by make-foreign-files.sh and make-aiff-files.sh).
// AIFFReader must find what each AIFF/AIFC file holds (the audio offset
// from a walk of the chunk headers done here; on POSIX the samples there
// are the ones libsndfile decodes), and sox's rate bytes must be ours. The
// chunk editor lists each WAVE, Wave64, AIFF and AIFC file as a walk of its
// bytes does, then every kind of edit runs on a fresh copy: after each, the
// file must be, byte for byte, what the chunk model says, a new editor must
// list it the same way, and on POSIX sox and libsndfile must still decode
// the very same samples (from Wave64 files, the part up to the end of the
// audio chunk: both read past it).

#include <algorithm>
#include <cctype>
#include <filesystem>
#include <map>
#include <string>
#include <vector>

#include "SoundFileFormats/ChunkFileTestUtil.h"
#include "tarn/Audio/SoundFileFormats/AIFFReader.h"

#ifdef TARN_TEST_DECODERS
#include <sndfile.h>
#endif

namespace tarn::test {
namespace {

namespace fs = std::filesystem;

#ifndef TARN_FOREIGN_FILES_SCRIPT
#define TARN_FOREIGN_FILES_SCRIPT ""
#define TARN_AIFF_FILES_SCRIPT ""
#endif

fs::path ForeignFile(const std::string& name) {
  static const fs::path dir = FixtureDir("TARN_FOREIGN_FILES", TARN_FOREIGN_FILES_SCRIPT);
  return FixtureFile(dir, name, "tests/SoundFileFormats/make-foreign-files.sh",
                     "TARN_FOREIGN_FILES");
}
fs::path AIFFFile(const std::string& name) {
  static const fs::path dir = FixtureDir("TARN_AIFF_FILES", TARN_AIFF_FILES_SCRIPT);
  return FixtureFile(dir, name, "tests/SoundFileFormats/make-aiff-files.sh", "TARN_AIFF_FILES");
}

// A test name from a file name.
std::string TestName(std::string name) {
  for (char& ch : name)
    if (!std::isalnum(static_cast<unsigned char>(ch))) ch = '_';
  return name;
}

// ------------------------------------------------------------ AIFF reader

const struct ForeignAIFF {
  const char* name;
  bool parses;
  int channels = 0;
  double rate = 0;
  std::int64_t frames = 0;
  SampleFormat format = kSamp16;
  int bytes = 0;
  bool lsbFirst = false;
} kForeignAIFF[] = {
    {"sox-s8-odd.aiff", true, 1, 8000, 81, kSamp8, 1},
    {"sox-s16-stereo.aiff", true, 2, 8000, 80, kSamp16, 2},
    {"sox-s24.aiff", true, 1, 8000, 80, kSamp24, 3},
    {"sox-s32-6ch.aiff", true, 6, 8000, 80, kSampUnpacked24, 4},
    {"sox-s16.aifc", true, 1, 8000, 80, kSamp16, 2},
    {"sox-f32.aifc", true, 2, 8000, 80, kSampFloat32, 4},
    {"sox-f64.aifc", true, 1, 8000, 80, kSampWide64B, 8},
    {"ffmpeg-s8.aiff", true, 1, 8000, 80, kSamp8, 1},
    {"ffmpeg-s16-stereo.aiff", true, 2, 8000, 80, kSamp16, 2},
    {"ffmpeg-s24.aiff", true, 1, 8000, 80, kSamp24, 3},
    {"ffmpeg-s32.aiff", true, 1, 8000, 80, kSampUnpacked24, 4},
    {"ffmpeg-f32.aifc", true, 1, 8000, 80, kSampFloat32, 4},
    {"ffmpeg-f64.aifc", true, 1, 8000, 80, kSampWide64B, 8},
    {"ffmpeg-sowt.aifc", true, 1, 8000, 80, kSamp16, 2, true},
    {"ffmpeg-u8.aifc", false},  // compression "raw "
    {"sndfile-s8.aiff", true, 2, 44100, 441, kSamp8, 1},
    {"sndfile-s16.aiff", true, 2, 44100, 441, kSamp16, 2},
    {"sndfile-s24.aiff", true, 2, 44100, 441, kSamp24, 3},
    {"sndfile-s32.aiff", true, 2, 44100, 441, kSampUnpacked24, 4},
    {"sndfile-f32.aiff", true, 2, 44100, 441, kSampFloat32, 4},  // "FL32"
    {"sndfile-f64.aiff", true, 2, 44100, 441, kSampWide64B, 8},  // "FL64"
    {"sndfile-sowt.aiff", true, 2, 44100, 441, kSamp16, 2, true},
    {"sndfile-le24.aiff", false},  // compression "42n1"
};

class ForeignAIFFReader : public ::testing::TestWithParam<const ForeignAIFF*> {};

TEST_P(ForeignAIFFReader, AgreesWithTheWriter) {
  const ForeignAIFF& f = *GetParam();
  const fs::path path = AIFFFile(f.name);
  if (path.empty()) return;
  AIFFReader reader(SpecOf(path));
  ASSERT_EQ(reader.CanParse(), f.parses);
  if (!f.parses) return;
  EXPECT_EQ(reader.GetNumberOfChannels(), f.channels);
  EXPECT_EQ(reader.GetSampleRate(), f.rate);
  EXPECT_EQ(reader.GetNumberOfFrames(), f.frames);
  EXPECT_EQ(reader.GetSampleFormat(), f.format);
  EXPECT_EQ(reader.GetSampleSize(), f.bytes);
  EXPECT_EQ(reader.GetSampleFrameSize(), f.bytes * f.channels);
  EXPECT_EQ(reader.GetSamplesAreLSBFirst(), f.lsbFirst);
  const Bytes file = ReadFile(path);
  const std::size_t ssnd = FindFormChunk(file, T("SSND"));
  ASSERT_NE(ssnd, 0u);
  EXPECT_EQ(reader.GetOffsetToSoundChunk(), static_cast<std::int64_t>(ssnd));
  EXPECT_EQ(reader.GetHeaderSize(), static_cast<std::int64_t>(ssnd + 16 + Get32(file, ssnd + 8)));
  const auto count = static_cast<std::size_t>(f.frames * f.channels);
  const auto at = static_cast<std::size_t>(reader.GetHeaderSize());
  ASSERT_LE(at + count * f.bytes, file.size());
#ifdef TARN_TEST_DECODERS
  // The samples at the offset as full-scale 32-bit integers or as doubles,
  // against libsndfile's.
  const bool floating = f.format == kSampFloat32 || f.format == kSampWide64B;
  std::vector<int> ints, theirInts(count);
  std::vector<double> reals, theirReals(count);
  for (std::size_t k = 0; k < count; ++k) {
    std::uint64_t word = 0;
    for (int i = 0; i < f.bytes; ++i)
      word |= std::uint64_t{file[at + k * f.bytes + i]}
              << (f.lsbFirst ? 8 * i : 8 * (f.bytes - 1 - i));
    float single;
    double wide;
    std::memcpy(&single, &word, 4);
    std::memcpy(&wide, &word, 8);
    if (!floating)
      ints.push_back(
          static_cast<std::int32_t>(static_cast<std::uint32_t>(word << (32 - 8 * f.bytes))));
    else
      reals.push_back(f.bytes == 4 ? single : wide);
  }
  SF_INFO info{};
  SNDFILE* sf = sf_open(path.c_str(), SFM_READ, &info);
  ASSERT_NE(sf, nullptr) << sf_strerror(nullptr);
  EXPECT_EQ(info.frames, f.frames);
  EXPECT_EQ(info.channels, f.channels);
  if (floating) {
    EXPECT_EQ(sf_readf_double(sf, theirReals.data(), f.frames), f.frames);
    EXPECT_EQ(reals, theirReals);
  } else {
    EXPECT_EQ(sf_readf_int(sf, theirInts.data(), f.frames), f.frames);
    EXPECT_EQ(ints, theirInts);
  }
  sf_close(sf);
#endif
}

INSTANTIATE_TEST_SUITE_P(Programs, ForeignAIFFReader, ::testing::ValuesIn([] {
                           std::vector<const ForeignAIFF*> files;
                           for (const auto& f : kForeignAIFF) files.push_back(&f);
                           return files;
                         }()),
                         [](const auto& info) { return TestName(info.param->name); });

// sox writes the rate field with full precision; its bytes for the usual
// rates, pulled-down rates and a half-hertz rate are ours exactly.
TEST(ForeignAIFFRates, SoxWritesTheSameRateBytes) {
  for (const char* rate :
       {"8000", "11025", "16000", "22050", "32000", "44100", "48000", "88200", "96000", "176400",
        "192000", "44055.944055944055", "47952.047952047952", "22050.5"}) {
    SCOPED_TRACE(rate);
    const fs::path path = AIFFFile(std::string("rate-") + rate + ".aiff");
    if (path.empty()) return;
    const Bytes comm = FormPayload(ReadFile(path), T("COMM"));
    ASSERT_GE(comm.size(), 18u);
    Bytes ours(10);
    double_to_ieee_80(std::strtod(rate, nullptr), ours.data());
    EXPECT_EQ(Slice(comm, 8, 18), ours);
    EXPECT_EQ(AIFFReader(SpecOf(path)).GetSampleRate(), std::strtod(rate, nullptr));
  }
}

// ------------------------------------------------------------ chunk editor

const struct Foreign {
  const char* name;  // as make-foreign-files.sh names it
  Container container;
  const char* layout;  // the chunks that writer puts down, each tag followed by '|'
  RIFFType meta;       // a metadata chunk before the audio that may be edited, or 0
} kFiles[] = {
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

class ForeignFileList : public ::testing::TestWithParam<const Foreign*> {};

TEST_P(ForeignFileList, MatchesTheWriterLayoutAndPayloads) {
  const Foreign& file = *GetParam();
  const fs::path path = ForeignFile(file.name);
  if (path.empty()) return;
  const Container c = file.container;
  const ChunkModel model(ReadFile(path), c);
  std::string tags;
  for (const auto& chunk : model.layout().chunks)
    tags += RIFFTypeToString(TagOf(chunk.image)) + "|";
  EXPECT_EQ(tags, file.layout);
  RIFFFileEditor editor(SpecOf(path), EndianOf(c), HandlerOf(c));
  editor.ReadChunkLocations(nullptr);
  EXPECT_EQ(editor.IsWave64(), IsWave64(c));
  EXPECT_FALSE(editor.AudioRunsToEndOfFile());
  EXPECT_EQ(Describe(editor.GetChunkList()), Describe(model.Listing()));
  for (const auto& chunk : model.layout().chunks)
    EXPECT_EQ(BytesOf(editor.ReadChunkData(TagOf(chunk.image))), PayloadOf(chunk, c))
        << RIFFTypeToString(TagOf(chunk.image));
}

INSTANTIATE_TEST_SUITE_P(Foreign, ForeignFileList, ::testing::ValuesIn([] {
                           std::vector<const Foreign*> files;
                           for (const auto& file : kFiles) files.push_back(&file);
                           return files;
                         }()),
                         [](const auto& info) { return TestName(info.param->name); });

// What libsndfile (all frames, as ints) and sox (32-bit signed raw) decode.
struct Decoded {
  std::vector<int> sndfile;
  std::string sox;
};
Decoded Decode([[maybe_unused]] const fs::path& path, [[maybe_unused]] bool withSox) {
  Decoded out;
#ifdef TARN_TEST_DECODERS
  SF_INFO info{};
  SNDFILE* file = sf_open(path.c_str(), SFM_READ, &info);
  if (file == nullptr) {
    ADD_FAILURE() << "libsndfile cannot open " << path << ": " << sf_strerror(nullptr);
    return out;
  }
  out.sndfile.resize(static_cast<std::size_t>(info.frames * info.channels));
  EXPECT_EQ(sf_readf_int(file, out.sndfile.data(), info.frames), info.frames) << path;
  sf_close(file);
  // sox launches cost tens of milliseconds: asked only where it matters.
  if (withSox) out.sox = RunTool("sox -V1 '" + path.string() + "' -t raw -e signed -b 32 -");
#endif
  return out;
}

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

std::vector<Op> OpsFor(Edit edit, const Foreign& file, const Layout& layout) {
  const bool form = file.container == Container::kFORM;
  const RIFFType a = form ? T("ANNO") : T("qzma"), b = form ? T("AUTH") : T("qzsa"),
                 c = form ? T("(c) ") : T("qzam");
  Bytes meta;
  for (const auto& chunk : layout.chunks)
    if (file.meta != 0 && TagOf(chunk.image) == file.meta) meta = PayloadOf(chunk, file.container);
  switch (edit) {
    case Edit::kAppend: {
      if (form)
        return {{Op::kAdd, T("ANNO"), Text("Edited by TarnCore!")},
                {Op::kAdd, T("NAME"), Text("Tone")}};
      // A broadcast extension with a description, and a LIST/INFO comment.
      Bytes bext = Text("Edited by TarnCore");
      bext.resize(602);
      return {{Op::kAdd, T("bext"), bext},
              {Op::kAdd, T("LIST"),
               Cat({Text("INFOICMT"), LE(19, 4), Text("Edited by TarnCore"), Bytes(2)})}};
    }
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

struct Case {
  const Foreign* file;
  Edit edit;
};
class ForeignFileEdit : public ::testing::TestWithParam<Case> {};

TEST_P(ForeignFileEdit, KeepsTheAudioAndEveryReader) {
  const auto [source, edit] = GetParam();
  const fs::path original = ForeignFile(source->name);
  if (original.empty()) return;
  const Container c = source->container;
  const RIFFType audioTag = AudioTagOf(c);
  TempDir dir;
  const fs::path path = dir.Path(source->name);
  fs::copy_file(original, path);
  ChunkModel model(ReadFile(path), c);
  const Bytes audio = model.Audio();
  ASSERT_FALSE(audio.empty());
  // The originals are decoded once.
  static std::map<std::string, Decoded> decodedOriginals;
  if (!decodedOriginals.contains(source->name))
    decodedOriginals[source->name] = Decode(original, true);
  const Decoded& decodedBefore = decodedOriginals[source->name];

  RIFFFileEditor editor(SpecOf(path), EndianOf(c), HandlerOf(c));
  editor.ReadChunkLocations(nullptr);
  const std::vector<Op> ops = OpsFor(edit, *source, model.layout());
  for (std::size_t step = 0; step < ops.size(); ++step) {
    const Op& op = ops[step];
    SCOPED_TRACE("step " + std::to_string(step) + ": " + RIFFTypeToString(op.tag));
    const Bytes before = ReadFile(path);
    bool resized = false;
    if (op.kind == Op::kMarkJunk) {
      editor.MaybeJunkSegment(op.tag);
      model.MarkJunk(op.tag);
      continue;
    }
    if (op.kind == Op::kStrip) {
      editor.RemoveTrailingMetaData(audioTag);
      model.StripAfterAudio();
    } else {
      editor.AddChunkData({op.tag, {}, Blob(op.payload)}, audioTag);
      resized = model.Add(op.tag, op.payload);
    }
    const Bytes after = ReadFile(path);
    ASSERT_TRUE(after == model.Image()) << "the file is not what the edit promises";
    EXPECT_EQ(ContainerSize(after, c),
              resized ? after.size() - (IsWave64(c) ? 0 : 8) : ContainerSize(before, c));
    EXPECT_EQ(Describe(editor.GetChunkList()), Describe(model.Listing()));
    RIFFFileEditor fresh(SpecOf(path), EndianOf(c), HandlerOf(c));
    fresh.ReadChunkLocations(nullptr);
    EXPECT_EQ(Describe(fresh.GetChunkList()), Describe(model.Listing()));
    const auto at =
        static_cast<std::size_t>(fresh.GetOffsetToChunkStart(audioTag) + HeaderSizeOf(c));
    ASSERT_LE(at + audio.size(), after.size());
    EXPECT_EQ(Slice(after, at, at + audio.size()), audio);
    if (op.kind == Op::kAdd) {
      EXPECT_EQ(BytesOf(fresh.ReadChunkData(op.tag)), op.payload);
    }
    // sox runs once, after the last step: the steps before it are the
    // appends of other cases.
    const bool last = step + 1 == ops.size();
    fs::path decodable = path;
    if (IsWave64(c)) {
      decodable = dir.Path("audio-" + std::string(source->name));
      WriteFile(decodable, Slice(after, 0, at + audio.size()));
    }
    const Decoded decoded = Decode(decodable, last);
    EXPECT_TRUE(decoded.sndfile == decodedBefore.sndfile) << "libsndfile decodes other samples";
    if (last) {
      EXPECT_TRUE(decoded.sox == decodedBefore.sox) << "sox decodes other samples";
    }
  }
}

INSTANTIATE_TEST_SUITE_P(Foreign, ForeignFileEdit, ::testing::ValuesIn([] {
                           std::vector<Case> cases;
                           for (const auto& file : kFiles)
                             for (int e = 0; e <= static_cast<int>(Edit::kMaybeJunk); ++e)
                               if (file.meta != 0 ||
                                   (e != static_cast<int>(Edit::kOverwriteForeign) &&
                                    e != static_cast<int>(Edit::kResizeBeforeAudio)))
                                 cases.push_back({&file, static_cast<Edit>(e)});
                           return cases;
                         }()),
                         [](const auto& info) {
                           return TestName(std::string(info.param.file->name) + "_" +
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
