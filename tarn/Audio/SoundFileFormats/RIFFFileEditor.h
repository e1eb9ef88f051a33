#pragma once
// RIFFFileEditor: lists the chunks of a chunked sound file and edits its
// metadata chunks in place, without ever touching the audio payload.
//
// Three containers are understood: classic RIFF ("RIFF"/"WAVE", 32-bit
// little-endian sizes), FORM ("FORM"/"AIFF" or "AIFC", 32-bit big-endian
// sizes) and Wave64 (16-byte chunk identifiers, 64-bit little-endian sizes
// that count the 24-byte chunk header, payloads padded to 8 bytes). Which
// container and form identifiers are accepted, and how Wave64 identifiers map
// to four-character tags, is the FormatHandler's business
// (GetWaveRIFFFormatHandler, GetAIFFRIFFFormatHandler); the editor never
// interprets chunk contents.
//
// Calling order: construct, ReadChunkLocations once, then any queries and
// edits. Editing operations (AddChunkData, RemoveTrailingMetaData) list the
// file first if nobody has.
//
//   RIFFFileEditor editor(spec, kRIFFLittleEndian, GetWaveRIFFFormatHandler());
//   editor.ReadChunkLocations(nullptr);
//   RCBlobMT old = editor.ReadChunkData(MakeRIFFType("bext"));
//   editor.AddChunkData({MakeRIFFType("bext"), {}, newBext}, MakeRIFFType("data"));
//
// How an edit changes the file (AddChunkData, audio tag "data" or "SSND"):
//   - a chunk of the new tag with the same padded size is overwritten in place;
//   - one of another size before the audio becomes "JUNK" of the same size in
//     place, one after the audio is cut out and the chunks after it move back;
//   - the new chunk is appended after the last chunk, the container size is
//     rewritten and the file is cut to its new end;
//   - when the audio chunk was listed as running past the end of the file (a
//     recording whose sizes were never written), that call only rewrites the
//     audio chunk's identifier and size field and adds nothing;
//   - an empty "SSND" audio chunk (size 0) that a chunk is appended after
//     first gets the eight zero bytes of its offset and block size: of size
//     0 with chunks after it, it would list as running to the end.
// Only metadata regions are written: the bytes of the audio payload are never
// read for an edit nor written. An edit that fails half-way (full disk, I/O
// error) leaves the audio payload intact and the chunks up to and including
// the audio chunk listable; the chunks after the audio may be partly moved,
// so the editor forgets its listing and the next edit lists the file again.
//
// Only the container's first audio chunk ("data" in RIFF and Wave64,
// "SSND" in FORM) is the audio; any later one, and the other container's
// audio tag, is metadata like any other chunk.
//
// The editor opens its file only for the length of an operation and restores
// the stream's earlier access afterwards (a closed stream is closed again),
// so no handle is held between calls and write errors surface before an
// edit returns.
//
// Errors: a file that is not an accepted container, or whose form type is
// refused, throws kind/system/subsystem "RIFFFileEditor" code 0 from the
// listing (an empty or truncated container header included);
// GetOffsetToChunkStart for an absent tag throws "RIFFFileEditor" code 1;
// AddChunkData on a file whose last listed chunk is cut short (its size
// passes the end of the file, though by less than the file's whole length,
// so the listing keeps it) throws "RIFFFileEditor" code 2 and writes nothing; a
// chunk to write that has no identifier in Wave64 mode, the null tag, or an
// empty "SSND" chunk in a FORM file throws -50 before the file is touched; stream errors (-36 I/O,
// -39 end of file, -5000 cannot open) propagate. A damaged or truncated chunk header, or a
// non-audio chunk whose size is larger than the whole file, ends the listing silently: the chunks
// before it stay listed. An audio chunk that large, or an "SSND" chunk of size 0 with bytes after
// its header, is listed as running to the end of the file (AudioRunsToEndOfFile).
//
// Threads: ReadChunkData, AddChunkData, JunkChunk, CountPostAudioChunks,
// GetNthPostAudioChunks, RemoveTrailingMetaData and Reset take the editor's
// lock for their whole duration. The listing, HasChunk,
// GetOffsetToChunkStart, MaybeJunkSegment and UpdateUUIDsFromTags take none:
// the owner calls them from the thread that owns the editor.

#include <cstdint>
#include <memory>
#include <utility>
#include <vector>

#include "tarn/Audio/SoundFileFormats/RIFFType.h"
#include "tarn/Basics/RCBlobMT.h"
#include "tarn/Basics/UUIDObj.h"
#include "tarn/FileSystem/FileSpecification.h"
#include "tarn/Streams/CFileStream.h"
#include "tarn/Threads/TarnMutex.h"

namespace tarn {

// The byte order of the size fields; tags and identifiers are never swapped.
enum RIFFFileEndian : int {
  kRIFFBigEndian = 0,     // FORM (AIFF, AIFC)
  kRIFFLittleEndian = 1,  // RIFF and Wave64
};

class RIFFFileEditor {
 public:
  static constexpr RIFFType kJunkTag = MakeRIFFType("JUNK");
  static constexpr RIFFType kNullTag = 0;
  static constexpr int kStreamBufferSize = 4096;

  // Codes of the "RIFFFileEditor" errors.
  static constexpr int kNotAChunkFile = 0;
  static constexpr int kChunkNotFound = 1;
  static constexpr int kChunkPastEndOfFile = 2;

  // One chunk of the file, in file order.
  struct ChunkInfo {
    RIFFType tag = kNullTag;  // in Wave64 mode, the tag of `uuid`
    UUIDObj uuid;             // the 16-byte identifier; clear in classic mode
    std::int64_t offset = 0;  // first byte of the chunk header
    std::int64_t length = 0;  // payload length rounded up to the padding unit
    friend bool operator==(const ChunkInfo&, const ChunkInfo&) = default;
  };

  // What the next AddChunkData does with a listed chunk.
  enum SegmentAction : std::int32_t {
    kJunkSegment = 0,       // rename to "JUNK" in place, size and payload kept
    kOverwriteSegment = 1,  // write the new chunk over it (same padded size)
    kRemoveSegment = 2,     // cut it out; later chunks move back over it
    kKeepSegment = 3,       // keep it (moved back if something before it was cut)
    kFixAudioHeader = 4,    // rewrite this audio chunk's identifier and size field
  };

  using ChunkList = std::vector<std::pair<ChunkInfo, SegmentAction>>;

  // A chunk to write. `uuid` is its Wave64 identifier; when clear the
  // handler's identifier for `tag` is used. An empty block writes a chunk of
  // length 0.
  struct ChunkData {
    RIFFType tag = kNullTag;
    UUIDObj uuid;
    RCBlobMT data;
  };

  // Container knowledge for one family of files. Implementations are
  // long-lived, immutable after construction and shared by all editors.
  class FormatHandler {
   public:
    FormatHandler() = default;
    FormatHandler(const FormatHandler&) = delete;
    FormatHandler& operator=(const FormatHandler&) = delete;
    virtual ~FormatHandler() = default;

    // Is this the file's first four bytes' accepted container identifier?
    [[nodiscard]] virtual bool IsContainerID(std::uint32_t id) const = 0;
    // Are these the file's first 16 bytes as the Wave64 container identifier?
    [[nodiscard]] virtual bool IsWave64Container(const UUIDObj& id) const = 0;
    // Is the form type after the container size accepted?
    [[nodiscard]] virtual bool IsFormType(std::uint32_t tag) const = 0;
    [[nodiscard]] virtual bool SupportsWave64() const = 0;
    // The tag of a Wave64 chunk identifier.
    [[nodiscard]] virtual RIFFType TagForUUID(const UUIDObj& id) const = 0;
    // The Wave64 identifier of a tag; clear when the tag has none.
    [[nodiscard]] virtual UUIDObj UUIDForTag(RIFFType tag, bool forWriting) const = 0;
  };

  // Asked after each chunk is listed whether the listing should stop there
  // (the chunk itself stays listed).
  class StopParsingTester {
   public:
    StopParsingTester() = default;
    StopParsingTester(const StopParsingTester&) = delete;
    StopParsingTester& operator=(const StopParsingTester&) = delete;
    virtual ~StopParsingTester() = default;
    [[nodiscard]] virtual bool ShouldStop(RIFFType tag) = 0;
  };

  // Stops at the first chunk with its tag.
  class TestForChunk final : public StopParsingTester {
   public:
    explicit TestForChunk(RIFFType tag) noexcept : tag_(tag) {}
    [[nodiscard]] bool ShouldStop(RIFFType tag) override { return tag == tag_; }

   private:
    RIFFType tag_;
  };

  // An editor of the file `spec`, read through a CFileStream with a
  // 4096-byte buffer. Nothing is read until ReadChunkLocations.
  RIFFFileEditor(const FileSpecification& spec, RIFFFileEndian endian, FormatHandler& handler);
  // The same over a stream the caller made (another buffer size, or a stream
  // that fails on purpose); the editor owns it. The stream may be closed or
  // open in any mode.
  RIFFFileEditor(std::unique_ptr<CFileStream> stream, RIFFFileEndian endian,
                 FormatHandler& handler);
  RIFFFileEditor(const RIFFFileEditor&) = delete;
  RIFFFileEditor& operator=(const RIFFFileEditor&) = delete;
  ~RIFFFileEditor();

  // Empties the list and moves the editor to another file (a new stream).
  void Reset(const FileSpecification& spec);

  // Lists the chunks, seeking from header to header, in place of any
  // earlier listing; `tester` may be null. Throws "RIFFFileEditor" 0 for a
  // file that is not an accepted container.
  void ReadChunkLocations(StopParsingTester* tester);

  [[nodiscard]] bool HasChunk(RIFFType tag) const;
  // The offset of the first chunk with the tag; "RIFFFileEditor" 1 if none.
  [[nodiscard]] std::int64_t GetOffsetToChunkStart(RIFFType tag) const;

  // The payload of the first chunk with the tag (without its pad bytes), or
  // an empty block when there is none. The second form also gives the
  // chunk's identifier as read from the file, or UUIDForTag(tag) when the
  // chunk is absent or empty. A payload is never read beyond the end of the
  // file, whatever its size field says.
  [[nodiscard]] RCBlobMT ReadChunkData(RIFFType tag);
  [[nodiscard]] RCBlobMT ReadChunkData(RIFFType tag, UUIDObj& uuid);

  // Writes `chunk` into the file (see the head of this file); audioTag is
  // the audio chunk's tag ("data", "SSND").
  void AddChunkData(const ChunkData& chunk, RIFFType audioTag);
  // Marks the first chunk with the tag to become junk at the next
  // AddChunkData (in place before the audio, cut out after it). The null
  // tag (zero fill) marks nothing.
  void MaybeJunkSegment(RIFFType tag);
  // Retires the first chunk with the tag now, writing nothing new: before
  // the audio it is renamed "JUNK" in place (size and payload kept); after
  // the audio it is cut out, the chunks behind it move back, the container
  // size is rewritten and the file is cut to its new end. Chunks marked by
  // MaybeJunkSegment go the same way. Throws "RIFFFileEditor" 1 when there
  // is no such chunk, and what AddChunkData throws for a damaged file.
  void JunkChunk(RIFFType tag, RIFFType audioTag);
  // Cuts the file after the audio chunk (and its pad byte) and drops the
  // listed chunks there; nothing happens without an audio chunk or with
  // nothing after it. The container's size field is left as it is.
  void RemoveTrailingMetaData(RIFFType audioTag);

  // Lists the file afresh up to its first audio chunk: true when that chunk
  // exists and its padded length is at most `limit`.
  [[nodiscard]] bool AudioDataIsZeroLength(RIFFType audioTag, std::int64_t limit);
  // How many chunks follow the first audio chunk (0 without one).
  [[nodiscard]] int CountPostAudioChunks(RIFFType audioTag);
  // The tag (and identifier) of the n-th chunk after the first audio chunk,
  // n from 0; the null tag when there is no audio chunk or no such chunk.
  [[nodiscard]] RIFFType GetNthPostAudioChunks(int n, RIFFType audioTag, UUIDObj& uuid);

  // The metadata tag <-> resource number table: the tag's number (or the
  // argument when the tag is not in the table), and back.
  [[nodiscard]] static std::uint32_t FindIDForTag(RIFFType tag) noexcept;
  [[nodiscard]] static RIFFType FindTagForID(std::uint32_t id) noexcept;

  // Gives every listed chunk its tag's identifier; a chunk whose tag has
  // none becomes junk at the next AddChunkData. Does nothing with a handler
  // that has no identifiers (FORM files).
  void UpdateUUIDsFromTags();

  // The listing as it stands, and the file facts found while listing.
  [[nodiscard]] const ChunkList& GetChunkList() const noexcept { return chunks_; }
  [[nodiscard]] bool IsWave64() const noexcept { return wave64_; }
  [[nodiscard]] bool AudioRunsToEndOfFile() const noexcept { return audioRunsToEnd_; }

 private:
  struct ChunkHeader {
    RIFFType tag = kNullTag;
    UUIDObj uuid;
    std::int64_t length = 0;  // unpadded payload length as the size field says
    std::int64_t padded = 0;
  };
  class Access;

  RIFFType ReadRIFFChunk();
  ChunkHeader ReadChunkHeader();
  RIFFType ReadRIFFType(UUIDObj& uuid);
  std::uint64_t ReadLength();
  void WriteRIFFType(RIFFType tag, const UUIDObj& uuid);
  void WriteLength(std::int64_t length);
  std::int64_t WriteSegment(const ChunkData& chunk, const UUIDObj& uuid);
  // The actions of an edit that writes `chunk` (none: only junk marked
  // chunks), and carrying them out.
  void DetermineSegmentActions(const ChunkData* chunk, RIFFType audioTag);
  void ApplySegmentActions(const ChunkData* chunk, const UUIDObj& uuid, RIFFType audioTag);
  void WriteSegmentActions(const ChunkData* chunk, const UUIDObj& uuid);
  // Before an append at `end`: an empty "SSND" audio chunk listed last gets
  // its zero offset and block size. Returns where the append goes.
  std::int64_t CompleteEmptySoundChunk(std::int64_t end);
  void ForgetListing() noexcept;
  void JunkThisSegment(ChunkInfo& info);
  void OverwriteThisSegment(ChunkInfo& info, const ChunkData& chunk, const UUIDObj& uuid);
  void MoveThisSegmentBack(ChunkInfo& info, std::int64_t shift);
  void RemoveOverwrittenChunks();
  [[nodiscard]] UUIDObj MaybeTranslateRiffType(RIFFType tag) const;
  void ConfirmUUIDMap() const;
  RCBlobMT ReadChunkDataInternal(RIFFType tag, UUIDObj& uuid);
  void ReadChunkLocationsExt(ChunkList& list, StopParsingTester* tester);
  void EnsureListed();
  [[nodiscard]] int GetIDSize() const noexcept { return wave64_ ? 16 : 4; }
  [[nodiscard]] int GetRiffHeaderSize() const noexcept { return wave64_ ? 24 : 8; }
  [[nodiscard]] ChunkList::const_iterator FindChunk(RIFFType tag) const;

  TarnMutexLite lock_;
  ChunkList chunks_;
  std::unique_ptr<CFileStream> stream_;
  RIFFFileEndian endian_;
  FormatHandler& handler_;
  bool wave64_ = false;
  bool audioRunsToEnd_ = false;
  bool listed_ = false;
};

}  // namespace tarn
