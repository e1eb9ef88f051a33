// Fuzz target of RIFFFileEditor: arbitrary bytes are listed as a file with
// both format handlers, queried, and then edited in place on a copy.
//
// The whole input is the file. Its last bytes, read backwards, also choose
// the edit sequence, so that any real sound file is a useful seed as it is.
//
// Checked on every input (a violation aborts, which libFuzzer reports):
//   - nothing but TarnError escapes the editor;
//   - the listing walks from header to header: offsets increase, each chunk
//     starts where the one before ends, each header lies inside the file;
//   - the queries agree with the listing, and chunk data read back is the
//     file's own bytes, never more than the file holds;
//   - after every edit (AddChunkData, MaybeJunkSegment, JunkChunk,
//     RemoveTrailingMetaData, UpdateUUIDsFromTags, in a sequence the input
//     chooses, going on after a failed one) the audio payload (the bytes of
//     the first audio chunk that lie inside the original file) is
//     byte-identical, and a fresh editor still lists the audio chunk at its
//     old offset;
//   - a chunk that AddChunkData reports written reads back from a fresh
//     editor with the payload given.

#include <unistd.h>

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <string>
#include <vector>

#include "FuzzSupport.h"
#include "tarn/Audio/SoundFileFormats/RIFFFileEditor.h"
#include "tarn/Audio/SoundFileFormats/RIFFFormatHandlers.h"
#include "tarn/Audio/SoundFileFormats/WAVEWriter.h"
#include "tarn/Errors/TarnError.h"
#include "tarn/FileSystem/FileSpecification.h"

namespace tarn {
namespace {

using fuzz::Bytes;

// Inputs larger than this are skipped: the editor's cost grows with the file
// and small files reach every path.
constexpr std::size_t kMaxInput = 64 * 1024;
// Payloads of added chunks stay small so each run stays fast.
constexpr std::size_t kMaxPayload = 600;
constexpr int kMaxEdits = 4;
// ReadChunkData is tried on at most this many listed chunks.
constexpr std::size_t kMaxReads = 8;

constexpr RIFFType kDataTag = MakeRIFFType("data");
constexpr RIFFType kSoundTag = MakeRIFFType("SSND");

// Two scratch files per process, reused by every run: the input as given
// (listed only) and the copy that is edited.
struct Scratch {
  fuzz::ScratchFile original{"tarn-riff-fuzz", "-in.bin"};
  fuzz::ScratchFile copy{"tarn-riff-fuzz", "-edit.bin"};
};

Scratch& GetScratch() {
  static Scratch scratch;
  return scratch;
}

using fuzz::ReadBytes;
using fuzz::Violation;
using fuzz::WriteBytes;

FileSpecification SpecOf(const std::filesystem::path& path) {
  return FileSpecification(UString(path.c_str()));
}

// Control bytes, taken from the end of the input backwards; zero once spent.
class Control {
 public:
  Control(const std::uint8_t* data, std::size_t size) : data_(data), left_(size) {}
  std::uint8_t Next() { return left_ == 0 ? 0 : data_[--left_]; }

 private:
  const std::uint8_t* data_;
  std::size_t left_;
};

// Tags the edits use: metadata tags with and without a Wave64 identifier,
// the junk tag, both audio tags and the null tag (which AddChunkData refuses).
constexpr RIFFType kEditTags[] = {
    MakeRIFFType("bext"),
    MakeRIFFType("LIST"),
    MakeRIFFType("qzma"),
    MakeRIFFType("levl"),
    MakeRIFFType("fmt "),
    MakeRIFFType("COMT"),
    MakeRIFFType("abcd"),
    MakeRIFFType("JUNK"),
    MakeRIFFType("ID3 "),
    MakeRIFFType("acid"),
    kDataTag,
    kSoundTag,
    RIFFFileEditor::kNullTag,
};

struct Facts {
  bool listed = false;
  RIFFFileEditor::ChunkList chunks;
  bool wave64 = false;
};

// Lists `spec` and checks the listing and every query against the bytes.
Facts ListAndQuery(const FileSpecification& spec, RIFFFileEndian endian,
                   RIFFFileEditor::FormatHandler& handler, RIFFType audioTag, const Bytes& bytes) {
  Facts facts;
  const auto fileLength = static_cast<std::int64_t>(bytes.size());
  RIFFFileEditor editor(spec, endian, handler);
  try {
    editor.ReadChunkLocations(nullptr);
  } catch (const TarnError&) {
    return facts;
  }
  facts.listed = true;
  facts.chunks = editor.GetChunkList();
  facts.wave64 = editor.IsWave64();
  const int header = WAVEWriter::GetChunkHeaderSize(facts.wave64);

  // The walk from header to header.
  std::int64_t expected = (facts.wave64 ? 24 : 8) + WAVEWriter::GetRIFFChunkExtraSize(facts.wave64);
  for (const auto& [info, action] : facts.chunks) {
    TARN_FUZZ_CHECK(action == RIFFFileEditor::kKeepSegment, action);
    TARN_FUZZ_CHECK(info.offset == expected, info.offset, expected);
    TARN_FUZZ_CHECK(info.length >= 0, info.length);
    TARN_FUZZ_CHECK(info.offset + header <= fileLength, info.offset, fileLength);
    TARN_FUZZ_CHECK(facts.wave64 || info.uuid.IsClear());
    expected = info.offset + header + info.length;
  }

  // Lookups agree with the listing.
  for (const auto& entry : facts.chunks) {
    const RIFFType tag = entry.first.tag;
    TARN_FUZZ_CHECK(editor.HasChunk(tag));
    const auto first = std::find_if(facts.chunks.begin(), facts.chunks.end(),
                                    [tag](const auto& e) { return e.first.tag == tag; });
    TARN_FUZZ_CHECK(editor.GetOffsetToChunkStart(tag) == first->first.offset);
  }
  constexpr RIFFType kAbsent = MakeRIFFType("\x01zz\x02");
  if (!editor.HasChunk(kAbsent)) {
    bool threw = false;
    try {
      (void)editor.GetOffsetToChunkStart(kAbsent);
    } catch (const TarnError& e) {
      threw = e.GetIntErrorCode() == RIFFFileEditor::kChunkNotFound;
    }
    TARN_FUZZ_CHECK(threw);
  }

  // Chunk data is the file's bytes after the chunk's header.
  std::size_t reads = 0;
  for (const auto& [info, action] : facts.chunks) {
    if (reads++ == kMaxReads) break;
    const auto first = editor.GetOffsetToChunkStart(info.tag);
    UUIDObj uuid;
    RCBlobMT blob;
    try {
      blob = editor.ReadChunkData(info.tag, uuid);
    } catch (const TarnError&) {
      continue;
    }
    const std::int64_t start = first + header;
    TARN_FUZZ_CHECK(blob.GetSize() <= fileLength - start, blob.GetSize(), fileLength - start);
    if (blob.GetSize() > 0)
      TARN_FUZZ_CHECK(std::memcmp(blob.GetPtr(), bytes.data() + start, blob.GetSize()) == 0);
  }

  // The post-audio queries agree with the listing.
  const auto audio = std::find_if(facts.chunks.begin(), facts.chunks.end(),
                                  [&](const auto& e) { return e.first.tag == audioTag; });
  const int post =
      audio == facts.chunks.end() ? 0 : static_cast<int>(facts.chunks.end() - audio - 1);
  try {
    TARN_FUZZ_CHECK(editor.CountPostAudioChunks(audioTag) == post, post);
    for (int n = 0; n <= std::min(post, 4); ++n) {
      UUIDObj uuid;
      const RIFFType tag = editor.GetNthPostAudioChunks(n, audioTag, uuid);
      if (n == post) {
        TARN_FUZZ_CHECK(tag == RIFFFileEditor::kNullTag, n);
      } else {
        TARN_FUZZ_CHECK(tag == (audio + n + 1)->first.tag, n);
        TARN_FUZZ_CHECK(uuid == (audio + n + 1)->first.uuid, n);
      }
    }
    UUIDObj uuid;
    TARN_FUZZ_CHECK(editor.GetNthPostAudioChunks(-1, audioTag, uuid) == RIFFFileEditor::kNullTag);
    const std::int64_t limit = bytes.empty() ? 0 : bytes[0] * 16;
    const bool zero = editor.AudioDataIsZeroLength(audioTag, limit);
    TARN_FUZZ_CHECK(zero == (audio != facts.chunks.end() && audio->first.length <= limit), zero);
  } catch (const TarnError&) {
  }
  return facts;
}

// The audio payload's place in the original file: [begin, end).
struct AudioRegion {
  bool present = false;
  std::int64_t offset = 0;
  std::int64_t begin = 0;
  std::int64_t end = 0;
};

// After an edit: the payload bytes are unchanged and a fresh editor lists the
// audio chunk where it was.
void CheckAudioKept(const Scratch& scratch, const Bytes& original, const AudioRegion& region,
                    RIFFFileEndian endian, RIFFFileEditor::FormatHandler& handler,
                    RIFFType audioTag) {
  if (!region.present) return;
  const Bytes now = ReadBytes(scratch.copy);
  TARN_FUZZ_CHECK(static_cast<std::int64_t>(now.size()) >= region.end,
                  static_cast<std::int64_t>(now.size()), region.end);
  TARN_FUZZ_CHECK(std::equal(original.begin() + region.begin, original.begin() + region.end,
                             now.begin() + region.begin),
                  region.begin, region.end);
  RIFFFileEditor fresh(SpecOf(scratch.copy), endian, handler);
  try {
    fresh.ReadChunkLocations(nullptr);
  } catch (const TarnError& e) {
    Violation("the edited file no longer lists", e.GetIntErrorCode());
  }
  TARN_FUZZ_CHECK(fresh.HasChunk(audioTag));
  TARN_FUZZ_CHECK(fresh.GetOffsetToChunkStart(audioTag) == region.offset,
                  fresh.GetOffsetToChunkStart(audioTag), region.offset);
}

// A chunk AddChunkData wrote reads back as written.
void CheckWritten(const Scratch& scratch, RIFFFileEndian endian,
                  RIFFFileEditor::FormatHandler& handler, RIFFType tag, const RCBlobMT& payload) {
  RIFFFileEditor fresh(SpecOf(scratch.copy), endian, handler);
  try {
    fresh.ReadChunkLocations(nullptr);
  } catch (const TarnError& e) {
    Violation("the edited file no longer lists", e.GetIntErrorCode());
  }
  TARN_FUZZ_CHECK(fresh.HasChunk(tag), static_cast<std::int64_t>(tag));
  const RCBlobMT back = fresh.ReadChunkData(tag);
  TARN_FUZZ_CHECK(back.SameBytes(payload), back.GetSize(), payload.GetSize());
}

void EditCopy(const std::uint8_t* data, std::size_t size, const Bytes& original) {
  Scratch& scratch = GetScratch();
  WriteBytes(scratch.copy, data, size);
  const bool form = size >= 4 && std::memcmp(data, "FORM", 4) == 0;
  const RIFFFileEndian endian = form ? kRIFFBigEndian : kRIFFLittleEndian;
  RIFFFileEditor::FormatHandler& handler =
      form ? static_cast<RIFFFileEditor::FormatHandler&>(GetAIFFRIFFFormatHandler())
           : GetWaveRIFFFormatHandler();
  const RIFFType audioTag = form ? kSoundTag : kDataTag;

  RIFFFileEditor editor(SpecOf(scratch.copy), endian, handler);
  try {
    editor.ReadChunkLocations(nullptr);
  } catch (const TarnError&) {
    return;  // not a chunk file for this handler: nothing to edit
  }
  const auto fileLength = static_cast<std::int64_t>(size);
  const int header = WAVEWriter::GetChunkHeaderSize(editor.IsWave64());
  AudioRegion region;
  for (const auto& [info, action] : editor.GetChunkList()) {
    if (info.tag != audioTag) continue;
    region.present = true;
    region.offset = info.offset;
    region.begin = info.offset + header;
    region.end = std::min(region.begin + info.length, fileLength);
    break;
  }

  // RIFF_EDITOR_FUZZ_TRACE=1 prints the listing and the edits, for reading a
  // crash input.
  static const bool trace = std::getenv("RIFF_EDITOR_FUZZ_TRACE") != nullptr;
  if (trace) {
    for (const auto& [info, action] : editor.GetChunkList())
      std::fprintf(stderr, "listed %s at %lld length %lld\n", RIFFTypeToString(info.tag).c_str(),
                   static_cast<long long>(info.offset), static_cast<long long>(info.length));
  }
  Control control(data, size);
  const int edits = control.Next() % kMaxEdits + 1;
  for (int i = 0; i < edits; ++i) {
    const std::uint8_t op = control.Next();
    const RIFFType tag = kEditTags[(op >> 2) % std::size(kEditTags)];
    if (trace)
      std::fprintf(stderr, "edit %d: op %d tag %s\n", i, op & 3, RIFFTypeToString(tag).c_str());
    try {
      switch (op & 3) {
        case 0: {
          // Payload length from one control byte (odd lengths included),
          // filled from another.
          const std::size_t length = control.Next() * std::size_t{3} % (kMaxPayload + 1);
          const std::uint8_t seed = control.Next();
          Bytes payload(length);
          for (std::size_t k = 0; k < length; ++k) payload[k] = static_cast<std::uint8_t>(seed + k);
          const RCBlobMT blob(payload.data(), payload.size());
          if (trace) std::fprintf(stderr, "  AddChunkData payload %zu bytes\n", length);
          const bool runsToEnd = editor.AudioRunsToEndOfFile();
          editor.AddChunkData({tag, {}, blob}, audioTag);
          CheckAudioKept(scratch, original, region, endian, handler, audioTag);
          // A file whose audio ran to its end only has its audio header
          // fixed; chunks named like audio or junk are not unique.
          if (!runsToEnd && tag != kDataTag && tag != kSoundTag && tag != RIFFFileEditor::kJunkTag)
            CheckWritten(scratch, endian, handler, tag, blob);
          break;
        }
        case 1: {
          // Junking the audio chunk itself is the caller's choice, not a
          // fault of the editor: the audio tag is never passed. A control
          // byte picks marking the chunk or retiring it now.
          const RIFFType junk = tag == audioTag ? MakeRIFFType("LIST") : tag;
          if ((control.Next() & 1) == 0) {
            editor.MaybeJunkSegment(junk);
          } else {
            if (trace) std::fprintf(stderr, "  JunkChunk\n");
            editor.JunkChunk(junk, audioTag);
            CheckAudioKept(scratch, original, region, endian, handler, audioTag);
          }
          break;
        }
        case 2:
          editor.RemoveTrailingMetaData(audioTag);
          CheckAudioKept(scratch, original, region, endian, handler, audioTag);
          break;
        case 3:
          editor.UpdateUUIDsFromTags();
          break;
      }
    } catch (const TarnError& e) {
      if (trace) std::fprintf(stderr, "  threw %d\n", e.GetIntErrorCode());
      // A refused or failed edit must still leave the audio alone, and the
      // edits after it go on with the same editor.
      CheckAudioKept(scratch, original, region, endian, handler, audioTag);
    }
  }
}

}  // namespace
}  // namespace tarn

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace tarn;
  if (size > kMaxInput) return -1;  // -1: not added to the corpus
  Scratch& scratch = GetScratch();
  WriteBytes(scratch.original, data, size);
  const Bytes original(data, data + size);
  const FileSpecification spec = SpecOf(scratch.original);
  (void)ListAndQuery(spec, kRIFFLittleEndian, GetWaveRIFFFormatHandler(), kDataTag, original);
  (void)ListAndQuery(spec, kRIFFBigEndian, GetAIFFRIFFFormatHandler(), kSoundTag, original);
  EditCopy(data, size, original);
  return 0;
}
