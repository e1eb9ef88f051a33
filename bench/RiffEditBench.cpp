// Metadata edits in place against rewriting the file. On WAVE files whose
// audio is 10 MiB and 1 GiB (RIFF, 16-bit stereo 48 kHz) and 8 GiB (Wave64:
// a RIFF size field stops at 4 GiB), the chunk editor
//   ReplaceBext  swaps the 858-byte "bext" before the audio for a 1000-byte
//                one (the old one becomes "JUNK" in place, the new one is
//                appended after the audio),
//   AddChunk     appends a LIST/INFO comment chunk after the audio,
//   StripTrail   cuts the "levl" and LIST chunks after the audio
//                (RemoveTrailingMetaData),
// next to the same change made without it: libsndfile opening the file in
// SFM_RDWR and closing it, which rewrites the header (SFC_SET_BROADCAST_INFO,
// sf_set_string(SF_STR_COMMENT); having no call that removes chunks, a bare
// open and close for the strip), and a plain copy into a new file with the
// new metadata, the audio going through a 1 MiB buffer.
//
// The audio is a hole made with ftruncate, so the sources cost no disk; the
// copies do write their audio out and are deleted after each iteration.
// Every iteration starts from the same file: the header, the first and last
// 4 KiB of audio (marker bytes that show whether the audio moved) and the
// trailer are rewritten and the file cut back, outside the timed part. One
// untimed edit per benchmark first checks what it did to the file; what
// libsndfile did is printed after the table, and an operation libsndfile
// cannot do on a format shows as "n/a".
//
// The timed part is one whole edit as a program makes it: open, list or
// parse, write, close. Times are wall-clock milliseconds per edit and the
// table's ratios are ours / peer in wall time; the reporter's ratio lines
// below it compare processor time, which leaves out waiting for the disk.
//
// Usage: bench_RiffEditBench [Google Benchmark flags]. Files go into a
// folder under $TARN_BENCH_DIR (or the system's temporary folder), removed
// at the end.
#include <benchmark/benchmark.h>
#include <fcntl.h>
#include <sndfile.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include "RatioReporter.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <chrono>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "tarn/Audio/SoundFileFormats/RIFFFileEditor.h"
#include "tarn/Audio/SoundFileFormats/RIFFFormatHandlers.h"
#include "tarn/Audio/SoundFileFormats/RIFFType.h"
#include "tarn/Audio/SoundFileFormats/WAVEWriter.h"
#include "tarn/Basics/RCBlobMT.h"
#include "tarn/Errors/TarnError.h"
#include "tarn/FileSystem/FileSpecification.h"
#include "tarn/String/UString.h"

namespace {

using tarn::MakeRIFFType;
using tarn::RIFFFileEditor;
using tarn::RIFFType;

constexpr std::int64_t kMiB = std::int64_t{1} << 20;
constexpr std::int64_t kGiB = std::int64_t{1} << 30;
constexpr std::size_t kCopyBuffer = 1 << 20;
constexpr std::size_t kMarkerBytes = 4096;
constexpr int kOldCodingHistory = 256;  // bext of 602 + 256 = 858 bytes
constexpr int kNewCodingHistory = 398;  // bext of 602 + 398 = 1000 bytes
constexpr RIFFType kDataTag = MakeRIFFType("data");
constexpr RIFFType kBextTag = MakeRIFFType("bext");
constexpr RIFFType kListTag = MakeRIFFType("LIST");
constexpr RIFFType kLevlTag = MakeRIFFType("levl");
constexpr const char* kComment = "Take 3, room mics re-balanced after the edit session";

// ---- fatal errors of the harness itself --------------------------------

struct Scratch {
  std::filesystem::path dir;
  ~Scratch() {
    std::error_code ignored;
    if (!dir.empty()) std::filesystem::remove_all(dir, ignored);
  }
};
Scratch gScratch;

[[noreturn]] void Die(const std::string& what) {
  std::fprintf(stderr, "RiffEditBench: %s: %s\n", what.c_str(), std::strerror(errno));
  std::exit(1);  // runs gScratch's destructor
}

void WriteAt(int fd, const void* bytes, std::size_t size, std::int64_t at) {
  if (pwrite(fd, bytes, size, at) != static_cast<ssize_t>(size)) Die("pwrite");
}

void WriteAll(int fd, const void* bytes, std::size_t size) {
  const auto* p = static_cast<const std::uint8_t*>(bytes);
  while (size > 0) {
    const ssize_t n = write(fd, p, size);
    if (n <= 0) Die("write");
    p += n;
    size -= static_cast<std::size_t>(n);
  }
}

// ---- building RIFF and Wave64 files ------------------------------------

using Bytes = std::vector<std::uint8_t>;

void PutLE(Bytes& out, std::uint64_t value, int size) {
  for (int i = 0; i < size; ++i) out.push_back(static_cast<std::uint8_t>(value >> (8 * i)));
}

// Four characters, first character first.
void PutTag(Bytes& out, RIFFType tag) {
  for (int shift = 24; shift >= 0; shift -= 8)
    out.push_back(static_cast<std::uint8_t>(tag >> shift));
}

void PutTagOrID(Bytes& out, RIFFType tag, bool wave64) {
  if (wave64) {
    const auto id = tarn::GetWaveRIFFFormatHandler().UUIDForTag(tag, true).GetBytes();
    out.insert(out.end(), id.begin(), id.end());
  } else {
    PutTag(out, tag);
  }
}

// A chunk header for `length` payload bytes.
void PutChunkHeader(Bytes& out, RIFFType tag, std::int64_t length, bool wave64) {
  PutTagOrID(out, tag, wave64);
  if (wave64)
    PutLE(out, static_cast<std::uint64_t>(length) + 24, 8);
  else
    PutLE(out, static_cast<std::uint64_t>(length), 4);
}

void PutChunk(Bytes& out, RIFFType tag, const Bytes& payload, bool wave64) {
  PutChunkHeader(out, tag, static_cast<std::int64_t>(payload.size()), wave64);
  out.insert(out.end(), payload.begin(), payload.end());
  const auto size = static_cast<std::int64_t>(payload.size());
  out.resize(out.size() +
             static_cast<std::size_t>(tarn::WAVEWriter::PadDataLength(size, wave64) - size));
}

// The container header for a file of `fileLength` bytes.
void PutContainer(Bytes& out, std::int64_t fileLength, bool wave64) {
  PutTagOrID(out, MakeRIFFType("RIFF"), wave64);
  PutLE(out, static_cast<std::uint64_t>(wave64 ? fileLength : fileLength - 8), wave64 ? 8 : 4);
  PutTagOrID(out, MakeRIFFType("WAVE"), wave64);
}

Bytes FmtPayload() {
  Bytes fmt;
  PutLE(fmt, 1, 2);          // PCM
  PutLE(fmt, 2, 2);          // stereo
  PutLE(fmt, 48000, 4);      // frames per second
  PutLE(fmt, 48000 * 4, 4);  // bytes per second
  PutLE(fmt, 4, 2);          // bytes per frame
  PutLE(fmt, 16, 2);         // bits per sample
  return fmt;
}

void CopyText(char* to, std::size_t room, const char* text) {
  std::memcpy(to, text, std::min(room, std::strlen(text)));
}

// Coding-history text of exactly `size` bytes.
std::string CodingHistory(int size) {
  static const std::string line = "A=PCM,F=48000,W=16,M=stereo,T=Field recorder\r\n";
  std::string text;
  while (static_cast<int>(text.size()) < size) text += line;
  text.resize(static_cast<std::size_t>(size));
  return text;
}

// A broadcast-extension payload: 602 fixed bytes and the coding history.
Bytes BextPayload(int codingHistory, const char* description) {
  Bytes b(602 + static_cast<std::size_t>(codingHistory), 0);
  auto* text = reinterpret_cast<char*>(b.data());
  CopyText(text, 256, description);
  CopyText(text + 256, 32, "TarnCore bench");
  CopyText(text + 288, 32, "RIFFEDIT0001");
  CopyText(text + 320, 10, "2024-05-01");
  CopyText(text + 330, 8, "12:00:00");
  b[338] = 0x80;  // time reference 48000 * 2.73 s, low word
  b[339] = 0x00;
  b[340] = 0x02;
  b[346] = 1;  // version
  const std::string history = CodingHistory(codingHistory);
  std::memcpy(b.data() + 602, history.data(), history.size());
  return b;
}

Bytes InfoListPayload(const char* comment) {
  Bytes list;
  PutTag(list, MakeRIFFType("INFO"));
  const std::size_t length = std::strlen(comment) + 1;
  PutTag(list, MakeRIFFType("ICMT"));
  PutLE(list, length, 4);
  list.insert(list.end(), comment, comment + length);
  if (length & 1) list.push_back(0);
  return list;
}

// A peak envelope, as some recorders leave after the audio.
Bytes LevlPayload() {
  Bytes levl(128 + 2000, 0);
  levl[0] = 1;  // version
  for (std::size_t i = 128; i < levl.size(); ++i) levl[i] = static_cast<std::uint8_t>(i * 7);
  return levl;
}

// Bytes that are not zero, so a moved or overwritten audio start shows.
const Bytes& Marker() {
  static const Bytes marker = [] {
    Bytes m(kMarkerBytes);
    for (std::size_t i = 0; i < m.size(); ++i) m[i] = static_cast<std::uint8_t>((i * 31 + 7) | 1);
    return m;
  }();
  return marker;
}

// One test file and everything needed to put it back into a known state.
struct WaveFile {
  const char* label = "";
  bool wave64 = false;
  std::int64_t audioBytes = 0;
  std::filesystem::path path;
  tarn::FileSpecification spec;
  int fd = -1;  // kept open for resets
  std::int64_t audioOffset = 0;
  std::int64_t audioEnd = 0;  // end of the audio chunk (already padded)
  Bytes trailer;              // "levl" and LIST after the audio

  // Everything before the audio, with the 858-byte bext (or `bext`), for a
  // file with or without the trailer (or with `tail`).
  [[nodiscard]] Bytes Head(const Bytes& bext, std::int64_t tailBytes) const {
    Bytes chunks;
    PutChunk(chunks, MakeRIFFType("fmt "), FmtPayload(), wave64);
    PutChunk(chunks, kBextTag, bext, wave64);
    PutChunkHeader(chunks, kDataTag, audioBytes, wave64);
    Bytes head;
    const std::int64_t containerBytes = wave64 ? 40 : 12;
    PutContainer(head,
                 containerBytes + static_cast<std::int64_t>(chunks.size()) + audioBytes + tailBytes,
                 wave64);
    head.insert(head.end(), chunks.begin(), chunks.end());
    return head;
  }

  [[nodiscard]] Bytes OriginalHead(bool withTrailer) const {
    return Head(BextPayload(kOldCodingHistory, "Original take"),
                withTrailer ? static_cast<std::int64_t>(trailer.size()) : 0);
  }

  void Create(const std::filesystem::path& dir) {
    path = dir / (std::string("take_") + label + (wave64 ? ".w64" : ".wav"));
    spec = tarn::FileSpecification(tarn::UString(path.string().c_str()));
    fd = open(path.c_str(), O_RDWR | O_CREAT | O_TRUNC, 0644);
    if (fd < 0) Die("create " + path.string());
    PutChunk(trailer, kLevlTag, LevlPayload(), wave64);
    PutChunk(trailer, kListTag, InfoListPayload("Recorded on location"), wave64);
    audioOffset = static_cast<std::int64_t>(OriginalHead(false).size());
    audioEnd = audioOffset + audioBytes;
    Reset(false);
  }

  // The known state: header, audio markers, trailer or none.
  void Reset(bool withTrailer) const {
    const Bytes head = OriginalHead(withTrailer);
    WriteAt(fd, head.data(), head.size(), 0);
    WriteAt(fd, Marker().data(), Marker().size(), audioOffset);
    // Cutting first drops whatever an edit appended; the ftruncate that
    // extends the file makes the audio a hole.
    if (ftruncate(fd, audioEnd - static_cast<std::int64_t>(kMarkerBytes)) != 0) Die("ftruncate");
    WriteAt(fd, Marker().data(), Marker().size(),
            audioEnd - static_cast<std::int64_t>(kMarkerBytes));
    if (withTrailer) WriteAt(fd, trailer.data(), trailer.size(), audioEnd);
  }

  void Close() {
    if (fd >= 0) close(fd);
    fd = -1;
    std::error_code ignored;
    std::filesystem::remove(path, ignored);
  }
};

std::array<WaveFile, 3> gFiles{{
    {"10MB", false, 10 * kMiB, {}, {}, -1, 0, 0, {}},
    {"1GB", false, 1 * kGiB, {}, {}, -1, 0, 0, {}},
    {"8GB", true, 8 * kGiB, {}, {}, -1, 0, 0, {}},
}};

// ---- looking at a file after an edit ------------------------------------

struct Inspection {
  std::string chunks;  // "fmt  @12+16, bext @36+858, ..."
  bool audioInPlace = false;
  std::int64_t audioShift = 0;    // where the audio chunk's payload now starts, less where it did
  std::int64_t audioOverrun = 0;  // bytes the audio chunk's size field claims past the file's end
  bool startMarker = false;
  bool endMarker = false;
  std::int64_t bextBytes = 0;
  bool bextFirst = false;  // the live bext lies before the audio
  int chunksAfterAudio = 0;
  bool commentAfterAudio = false;
  std::int64_t fileBytes = 0;
};

bool MarkerAt(const WaveFile& f, std::int64_t at) {
  Bytes got(kMarkerBytes);
  if (pread(f.fd, got.data(), got.size(), at) != static_cast<ssize_t>(got.size())) return false;
  return got == Marker();
}

Inspection Inspect(const WaveFile& f) {
  Inspection seen;
  seen.startMarker = MarkerAt(f, f.audioOffset);
  seen.endMarker = MarkerAt(f, f.audioEnd - static_cast<std::int64_t>(kMarkerBytes));
  seen.fileBytes = static_cast<std::int64_t>(std::filesystem::file_size(f.path));
  RIFFFileEditor lister(f.spec, tarn::kRIFFLittleEndian, tarn::GetWaveRIFFFormatHandler());
  try {
    lister.ReadChunkLocations(nullptr);
  } catch (const tarn::TarnError&) {
    seen.chunks = "(not a chunk file any more)";
    return seen;
  }
  const int header = f.wave64 ? 24 : 8;
  bool afterAudio = false;
  bool bextSeen = false;
  for (const auto& [info, action] : lister.GetChunkList()) {
    if (!seen.chunks.empty()) seen.chunks += ", ";
    seen.chunks += tarn::RIFFTypeToString(info.tag) + " @" + std::to_string(info.offset) + "+" +
                   std::to_string(info.length);
    if (info.tag == kDataTag) {
      seen.audioInPlace = info.offset + header == f.audioOffset && info.length == f.audioBytes;
      seen.audioShift = info.offset + header - f.audioOffset;
      seen.audioOverrun =
          std::max<std::int64_t>(0, info.offset + header + info.length - seen.fileBytes);
      afterAudio = true;
    } else if (afterAudio) {
      ++seen.chunksAfterAudio;
    }
    if (info.tag == kBextTag && !bextSeen) seen.bextFirst = !afterAudio;
    bextSeen = bextSeen || info.tag == kBextTag;
    if (info.tag == kListTag && afterAudio) seen.commentAfterAudio = true;
  }
  seen.bextBytes = lister.ReadChunkData(kBextTag).GetSize();
  return seen;
}

std::string AudioText(const Inspection& seen) {
  if (seen.audioInPlace && seen.startMarker && seen.endMarker) return "audio untouched";
  std::string text = seen.audioShift == 0
                         ? std::string("audio chunk in place")
                         : "audio chunk header moved by " + std::to_string(seen.audioShift) +
                               " bytes, the audio bytes were not";
  if (seen.audioOverrun > 0)
    text += ", its size passes the file's end by " + std::to_string(seen.audioOverrun) + " bytes";
  if (!seen.startMarker) text += ", first audio bytes overwritten";
  if (!seen.endMarker) text += ", last audio bytes overwritten";
  return text;
}

// ---- the three ways of making an edit -----------------------------------

enum class Edit { kReplaceBext, kAddChunk, kStripTrail };
enum class Way { kTarn, kSndfile, kCopy };

const char* const kEditNames[] = {"ReplaceBext", "AddChunk", "StripTrail"};
const char* const kWayNames[] = {"Tarn", "libsndfile", "Copy"};

bool StartsWithTrailer(Edit edit) { return edit == Edit::kStripTrail; }

void EditWithTarn(const WaveFile& f, Edit edit, const tarn::RCBlobMT& newBext,
                  const tarn::RCBlobMT& comment) {
  RIFFFileEditor editor(f.spec, tarn::kRIFFLittleEndian, tarn::GetWaveRIFFFormatHandler());
  editor.ReadChunkLocations(nullptr);
  switch (edit) {
    case Edit::kReplaceBext:
      editor.AddChunkData({kBextTag, {}, newBext}, kDataTag);
      break;
    case Edit::kAddChunk:
      editor.AddChunkData({kListTag, {}, comment}, kDataTag);
      break;
    case Edit::kStripTrail:
      editor.RemoveTrailingMetaData(kDataTag);
      break;
  }
}

// What libsndfile said; empty when it accepted the edit.
std::string EditWithSndfile(const WaveFile& f, Edit edit) {
  SF_INFO info{};
  SNDFILE* file = sf_open(f.path.c_str(), SFM_RDWR, &info);
  if (file == nullptr) return std::string("sf_open: ") + sf_strerror(nullptr);
  std::string refused;
  if (edit == Edit::kReplaceBext) {
    SF_BROADCAST_INFO_VAR(kNewCodingHistory) bext;
    std::memset(&bext, 0, sizeof bext);
    CopyText(bext.description, sizeof bext.description, "Edited take");
    CopyText(bext.originator, sizeof bext.originator, "TarnCore bench");
    CopyText(bext.originator_reference, sizeof bext.originator_reference, "RIFFEDIT0001");
    CopyText(bext.origination_date, sizeof bext.origination_date, "2024-05-01");
    CopyText(bext.origination_time, sizeof bext.origination_time, "12:00:00");
    bext.time_reference_low = 0x20080;
    bext.version = 1;
    const std::string history = CodingHistory(kNewCodingHistory);
    std::memcpy(bext.coding_history, history.data(), history.size());
    bext.coding_history_size = kNewCodingHistory;
    if (sf_command(file, SFC_SET_BROADCAST_INFO, &bext, sizeof bext) != SF_TRUE)
      refused = "SFC_SET_BROADCAST_INFO refused";
  } else if (edit == Edit::kAddChunk) {
    if (const int error = sf_set_string(file, SF_STR_COMMENT, kComment); error != 0)
      refused = std::string("sf_set_string: ") + sf_error_number(error);
  }
  if (refused.empty() && sf_error(file) != SF_ERR_NO_ERROR)
    refused = std::string("after the edit: ") + sf_strerror(file);
  if (sf_close(file) != 0 && refused.empty()) refused = "sf_close failed";
  return refused;
}

// A new file with the edit's metadata, the audio copied through a buffer.
void EditByCopy(const WaveFile& f, const std::filesystem::path& to, const Bytes& head,
                const Bytes& tail) {
  static const auto buffer = std::make_unique<std::uint8_t[]>(kCopyBuffer);
  const int in = open(f.path.c_str(), O_RDONLY);
  const int out = open(to.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
  if (in < 0 || out < 0) Die("open for the copy");
  WriteAll(out, head.data(), head.size());
  if (lseek(in, f.audioOffset, SEEK_SET) != f.audioOffset) Die("lseek");
  for (std::int64_t left = f.audioBytes; left > 0;) {
    const auto want = static_cast<std::size_t>(std::min<std::int64_t>(left, kCopyBuffer));
    const ssize_t got = read(in, buffer.get(), want);
    if (got <= 0) Die("read");
    WriteAll(out, buffer.get(), static_cast<std::size_t>(got));
    left -= got;
  }
  WriteAll(out, tail.data(), tail.size());
  close(in);
  if (close(out) != 0) Die("close the copy");
}

// ---- the benchmarks ------------------------------------------------------

struct Outcome {
  std::string text;
  bool applied = false;
};
std::map<std::string, Outcome> gOutcomes;  // "ReplaceBext_10MB_libsndfile" -> what happened

double SecondsSince(std::chrono::steady_clock::time_point start) {
  return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
}

// Whether `seen` shows the edit done, whatever else happened to the file;
// `exactBext` asks for the 1000-byte bext, otherwise any change of size will
// do (libsndfile writes the coding history its own way).
bool EditDone(Edit edit, const WaveFile& f, const Inspection& seen, bool exactBext) {
  switch (edit) {
    case Edit::kReplaceBext:
      return exactBext ? seen.bextBytes == 602 + kNewCodingHistory
                       : seen.bextBytes != 602 + kOldCodingHistory;
    case Edit::kAddChunk:
      return seen.commentAfterAudio;
    case Edit::kStripTrail:
      // The trailing bytes gone, not merely counted as audio.
      return seen.chunksAfterAudio == 0 && seen.fileBytes == f.audioEnd;
  }
  return false;
}

void Run(benchmark::State& state, const std::string& name, Edit edit, int fileIndex, Way way) {
  const WaveFile& f = gFiles[static_cast<std::size_t>(fileIndex)];
  const bool withTrailer = StartsWithTrailer(edit);
  const Bytes newBextBytes = BextPayload(kNewCodingHistory, "Edited take");
  const tarn::RCBlobMT newBext(newBextBytes.data(), newBextBytes.size());
  const Bytes commentBytes = InfoListPayload(kComment);
  const tarn::RCBlobMT comment(commentBytes.data(), commentBytes.size());

  // The copy's header and trailer: the new metadata laid out afresh.
  Bytes copyHead;
  Bytes copyTail;
  if (edit == Edit::kReplaceBext) {
    copyHead = f.Head(newBextBytes, 0);
  } else if (edit == Edit::kAddChunk) {
    PutChunk(copyTail, kListTag, commentBytes, f.wave64);
    copyHead = f.Head(BextPayload(kOldCodingHistory, "Original take"),
                      static_cast<std::int64_t>(copyTail.size()));
  } else {
    copyHead = f.OriginalHead(false);
  }
  const std::filesystem::path copyPath = gScratch.dir / "copy.wav";
  std::error_code ignored;

  auto once = [&] {
    switch (way) {
      case Way::kTarn:
        EditWithTarn(f, edit, newBext, comment);
        return std::string();
      case Way::kSndfile:
        return EditWithSndfile(f, edit);
      case Way::kCopy:
        EditByCopy(f, copyPath, copyHead, copyTail);
        return std::string();
    }
    return std::string();
  };

  // One untimed in-place edit to check what it does (a copy leaves its
  // source alone, and one more copy of 8 GB would cost half a minute).
  try {
    if (way != Way::kCopy) {
      f.Reset(withTrailer);
      const std::string refused = once();
      const Inspection seen = Inspect(f);
      Outcome outcome;
      outcome.applied = refused.empty() && EditDone(edit, f, seen, way == Way::kTarn);
      outcome.text = refused.empty() ? "" : refused + "; after sf_close: ";
      outcome.text +=
          AudioText(seen) + "; " +
          (seen.bextBytes == 0 ? std::string("no bext")
                               : "bext " + std::to_string(seen.bextBytes) + " bytes " +
                                     (seen.bextFirst ? "before" : "after") + " the audio") +
          "; " + std::to_string(seen.chunksAfterAudio) + " chunk(s) after the audio; file " +
          std::to_string(seen.fileBytes) + " bytes\n      chunks: " + seen.chunks;
      gOutcomes[name] = outcome;
      if (way == Way::kTarn && (!outcome.applied || AudioText(seen) != "audio untouched")) {
        state.SkipWithError(("the edit left a wrong file: " + outcome.text).c_str());
        return;
      }
      if (way == Way::kSndfile && !outcome.applied) {
        state.SkipWithError(("n/a: " + (refused.empty() ? "no change made" : refused)).c_str());
        return;
      }
    }

    for (auto _ : state) {
      state.PauseTiming();
      std::filesystem::remove(copyPath, ignored);
      f.Reset(withTrailer);
      state.ResumeTiming();
      const auto start = std::chrono::steady_clock::now();
      (void)once();
      state.SetIterationTime(SecondsSince(start));
    }
  } catch (const tarn::TarnError& e) {
    state.SkipWithError(("TarnError " + std::to_string(e.GetIntErrorCode())).c_str());
  }
  std::filesystem::remove(copyPath, ignored);
  f.Reset(false);
}

// Keeps the wall times for the table; runs that failed or were skipped are
// shown but kept out of the ratios.
class EditReporter : public tarn_bench::RatioReporter {
 public:
  void ReportRuns(const std::vector<Run>& runs) override {
    std::vector<Run> good;
    std::vector<Run> failed;
    for (Run r : runs) {
      // Plain "<Edit>_<size>_<way>" names, without the timing options.
      r.run_name.min_time.clear();
      r.run_name.iterations.clear();
      r.run_name.time_type.clear();
      (r.error_occurred ? failed : good).push_back(r);
    }
    for (const Run& r : good)
      if (r.run_type == Run::RT_Iteration && r.iterations > 0)
        wall_[r.benchmark_name()] = r.GetAdjustedRealTime();
    if (!good.empty()) RatioReporter::ReportRuns(good);
    if (!failed.empty()) ConsoleReporter::ReportRuns(failed);
  }

  void PrintTable() const {
    std::printf("\nWall time per edit (ms); ratios ours / peer\n");
    std::printf("%-12s %-5s %10s %13s %10s %18s %12s\n", "edit", "audio", "Tarn", "libsndfile",
                "copy", "Tarn/libsndfile", "Tarn/copy");
    for (const char* edit : kEditNames) {
      for (const WaveFile& f : gFiles) {
        const std::string stem = std::string(edit) + "_" + f.label + "_";
        const double ours = Find(stem + "Tarn");
        const double sndfile = Find(stem + "libsndfile");
        const double copy = Find(stem + "Copy");
        if (ours < 0 && sndfile < 0 && copy < 0) continue;  // not run
        std::printf("%-12s %-5s %10s %13s %10s %18s %12s\n", edit, f.label, Ms(ours).c_str(),
                    Ms(sndfile).c_str(), Ms(copy).c_str(), Ratio(ours, sndfile).c_str(),
                    Ratio(ours, copy).c_str());
      }
    }
  }

 private:
  [[nodiscard]] double Find(const std::string& name) const {
    const auto at = wall_.find(name);
    return at == wall_.end() ? -1 : at->second;
  }
  static std::string Ms(double ms) {
    if (ms < 0) return "n/a";
    char text[32];
    std::snprintf(text, sizeof text, ms < 10 ? "%.3f" : "%.0f", ms);
    return text;
  }
  static std::string Ratio(double ours, double theirs) {
    if (ours < 0 || theirs <= 0) return "n/a";
    char text[32];
    std::snprintf(text, sizeof text, "%.2g", ours / theirs);
    return text;
  }

  std::map<std::string, double> wall_;
};

std::filesystem::path BenchFolder() {
  const char* env = std::getenv("TARN_BENCH_DIR");
  const std::filesystem::path base = env != nullptr && *env != '\0'
                                         ? std::filesystem::path(env)
                                         : std::filesystem::temp_directory_path();
  return base / ("tarn_riffedit_bench_" + std::to_string(getpid()));
}

}  // namespace

int main(int argc, char** argv) {
  benchmark::Initialize(&argc, argv);
  gScratch.dir = BenchFolder();
  std::filesystem::create_directories(gScratch.dir);
  for (WaveFile& f : gFiles) f.Create(gScratch.dir);

  // The largest copy writes its audio out for real.
  struct statvfs fs {};
  const bool roomFor8GB =
      statvfs(gScratch.dir.c_str(), &fs) == 0 &&
      static_cast<std::int64_t>(fs.f_bavail) * static_cast<std::int64_t>(fs.f_frsize) >
          gFiles[2].audioBytes + 4 * kGiB;
  if (!roomFor8GB) std::printf("Less than 12 GiB free in %s: no 8 GB copy\n", gScratch.dir.c_str());

  for (int e = 0; e < 3; ++e) {
    for (int i = 0; i < 3; ++i) {
      for (int w = 0; w < 3; ++w) {
        const auto way = static_cast<Way>(w);
        if (way == Way::kCopy && i == 2 && !roomFor8GB) continue;
        const std::string name = std::string(kEditNames[e]) + "_" +
                                 gFiles[static_cast<std::size_t>(i)].label + "_" + kWayNames[w];
        auto* b =
            benchmark::RegisterBenchmark(name.c_str(), Run, name, static_cast<Edit>(e), i, way);
        b->UseManualTime()->Unit(benchmark::kMillisecond);
        if (way != Way::kCopy)
          b->MinTime(0.2);
        else if (i == 0)
          b->MinTime(0.3);
        else
          b->Iterations(i == 1 ? 3 : 1);
      }
    }
  }

  EditReporter reporter;
  benchmark::RunSpecifiedBenchmarks(&reporter);
  reporter.PrintRatios();
  reporter.PrintTable();

  std::printf("\nWhat each in-place edit left in the file (first edit from the known state):\n");
  for (const auto& [name, outcome] : gOutcomes)
    std::printf("  %s: %s%s\n", name.c_str(), outcome.applied ? "" : "[n/a] ",
                outcome.text.c_str());

  for (WaveFile& f : gFiles) f.Close();
  benchmark::Shutdown();
  return 0;
}
