#pragma once
// AIFFSoundFileFormat: a FORM "AIFF" or "AIFC" file as a SoundFileFormat.
//
// Audio attributes, length, channel order, tempo and meter come from an
// AIFFReader over the file (parsed on first need, dropped whenever the
// file's layout changes). Metadata chunks are edited in place through a
// RIFFFileEditor with the AIFF handler and big-endian size fields, so the
// audio is never rewritten and chunks this class does not know ("ANNO",
// "ID3 ", "APPL", anything) survive every edit.
//
// Metadata writes are kept pending: WriteMetaData compares the new block
// with the chunk the file holds and records nothing when the bytes are the
// same; reads see pending blocks first. Pending blocks reach the file when a
// read-write access handle flushes or is released (WriteMetaDataToDisk);
// CleanMetaDataMods drops them.
//
// What the metadata means here:
//   - loops: the sustain and release loops of "INST", whose ends are "MARK"
//     markers (play modes 1 forward, 2 forward-backward); AddFileLoops
//     writes at most two loops (more fail with -50) as "INST" and "MARK";
//   - regions and markers: GetRegionList reads the library's own "regn"
//     chunk when there is one, else the "MARK" markers that no loop uses;
//     WriteRegionList writes "regn" and also every marker and region start
//     and end into "MARK" (loop markers kept) so other programs see them;
//   - tempo and meter: "basc" (WriteFileTempoData writes one; the reader
//     gives HasFileTempoAndSyncPoint and HasFileMeterAndPitch);
//   - the recording flag: a "Rec!" chunk holding the flag, big-endian;
//   - named metadata: the chunk `tag` whose payload starts with the name
//     (a 16-bit big-endian byte count and the name's UTF-8 bytes).
// Marker names are Pascal strings in Mac Roman.
//
// Length changes (AdjustLengthInHeader) rewrite the "COMM" frame count, the
// "SSND" size and the "FORM" size in place. Chunks after the audio move to
// follow the new end when the audio shrinks; when it grows, whatever lay
// after the old audio end is taken to have been written over by the new
// audio. New files (CreateFileOnDisk) are written by AIFFWriter: the form
// and compression follow the attributes (AIFFWriter::ChooseEncoding); the
// recording flag adds nothing to the header.
//
// Errors: the reader's "AIFFReader" errors for a file that is not AIFF,
// -50 for what AIFF cannot hold, and stream errors, all as TarnErrors.
// Threads: any thread; the format's own state is under one lock, and the
// metadata hooks run under the base's lock.

#include <cstdint>
#include <memory>
#include <mutex>
#include <utility>
#include <vector>

#include "tarn/Audio/SoundFileFormats/AIFFReader.h"
#include "tarn/Audio/SoundFileFormats/RIFFFileEditor.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormat.h"

namespace tarn {

class AIFFSoundFileFormat final : public SoundFileFormat {
 public:
  static constexpr RIFFType kINST = MakeRIFFType("INST");
  static constexpr RIFFType kMARK = MakeRIFFType("MARK");
  static constexpr RIFFType kRegn = MakeRIFFType("regn");
  static constexpr RIFFType kRecFlag = MakeRIFFType("Rec!");
  // Bytes of an "INST" payload and of a "basc" payload as written.
  static constexpr int kInstSize = 20;
  static constexpr int kBascWrittenSize = 84;

  // One "MARK" marker.
  struct Marker {
    std::int16_t id = 0;
    std::uint32_t position = 0;  // frames from the start of the audio
    UString name;
    friend bool operator==(const Marker&, const Marker&) = default;
  };
  // The "MARK" payload and back. Parsing stops at the first marker cut
  // short by the end of the payload.
  [[nodiscard]] static std::vector<Marker> ParseMarkers(const RCBlobMT& chunk);
  [[nodiscard]] static RCBlobMT FlattenMarkers(const std::vector<Marker>& markers);

  explicit AIFFSoundFileFormat(const FileSpecification& file);
  ~AIFFSoundFileFormat() override;

  double GetNaturalRate() override;
  SampleCount GetLengthInFrames() override;
  bool SupportsRegionList() override { return true; }
  std::unique_ptr<SoundFileRegionList> GetRegionList(ReadOnlyMetaDataAccess& access) override;
  void WriteRegionList(ReadWriteMetaDataAccess& access, RCBlobMT regions,
                       std::uint32_t flags) override;
  std::uint32_t GetCanonicalFileType() override { return AIFFReader::kAIFF; }
  std::uint32_t GetPerferredFileCreator() override { return 0; }
  // "aif", "aiff" and "aifc" in any case, with or without the dot.
  bool MatchesExtension(const UString& extension) override;
  SoundFileAttributes GetFileAttributes() override;
  HostChannelOrder GetChannelOrder() override;
  // The "basc" tempo of a loop (sync point 0); false without one.
  bool HasFileTempoAndSyncPoint(float& tempo, SampleCount& syncPoint) override;
  bool HasFileMeterAndPitch(short& rootNote, short& numerator, short& denominator) override;
  SoundFileAttributes CreateFileOnDisk(const SoundFileAttributes& attributes, SampleCount frames,
                                       bool recording, const SoundFileAttributes& hint) override;
  void SetRecordFlagMetaData(ReadWriteMetaDataAccess& access, int flag) override;
  // Writes "basc": `beats` beats (rounded; when not positive, the beats the
  // tempo gives over the file's length), the root note, the meter, loop
  // type 1 when tempo is positive and 0 (one-shot) otherwise.
  void WriteFileTempoData(ReadWriteMetaDataAccess& access, float tempo, short rootNote,
                          short numerator, short denominator,
                          const std::vector<std::int64_t>& beatPositions, SampleCount syncPoint,
                          float beats) override;
  bool SupportsLoops() override { return true; }
  short NumberOfLoops(ReadOnlyMetaDataAccess& access) override;
  // Throws -50 for an index outside 0 .. NumberOfLoops - 1.
  void GetFileLoop(ReadOnlyMetaDataAccess& access, short index, SoundFileFormatLoop& loop) override;
  void AddFileLoops(ReadWriteMetaDataAccess& access,
                    const std::vector<SoundFileFormatLoop>& loops) override;
  bool AudioDataIsZeroLength() override;
  // Repairs the file of a writer that died: when the bytes after the
  // "SSND" chunk's declared end are not a chain of well-formed chunks that
  // ends with the file (so they are audio written after the last header
  // update), or the header claims more frames than the file holds, the
  // frame count and chunk sizes are set from the file's size (whole frames;
  // a partial last frame is cut off). A file whose header is right is left
  // alone; one that is not AIFF is left alone; a length AIFF cannot hold
  // fails with -50.
  void RecoverCrashedRecording() override;
  bool SupportsRawHeader() override { return true; }
  void GetRawHeader(std::vector<std::uint8_t>& header) override;
  bool HasMetaData(ReadOnlyMetaDataAccess& access, std::uint32_t tag) override;
  RCBlobMT ReadMetaData(ReadOnlyMetaDataAccess& access, std::uint32_t tag) override;
  void WriteMetaData(ReadWriteMetaDataAccess& access, std::uint32_t tag, RCBlobMT data) override;
  void CleanMetaDataMods() override;
  // Cuts every chunk after "SSND" (pending changes are written first).
  void RemoveTrailingMetaData() override;
  RCBlobMT ReadNamedMetaData(ReadOnlyMetaDataAccess& access, const UString& name,
                             std::uint32_t tag) override;
  void WriteNamedMetaData(ReadWriteMetaDataAccess& access, const UString& name, std::uint32_t tag,
                          RCBlobMT data) override;

 protected:
  void ThrowOutCachedMetaDataPositions() override;

 private:
  struct Loops;

  void AdjustLengthInHeader(const SoundFileAttributes& attributes, SampleCount frames) override;
  void OpenMetaDataOnDisk(bool forWriting) override;
  bool WriteMetaDataToDisk() override;
  void CloseMetaDataOnDisk() noexcept override;

  // Callers hold lock_.
  AIFFReader& Reader();
  RIFFFileEditor& DemandFileEditor();
  RCBlobMT FileChunk(RIFFType tag);
  RCBlobMT CurrentChunk(RIFFType tag);
  void SetPending(RIFFType tag, RCBlobMT data);
  void WritePending();
  void Forget() noexcept;
  Loops ReadLoops();

  std::mutex lock_;
  std::unique_ptr<AIFFReader> reader_;
  std::unique_ptr<RIFFFileEditor> editor_;
  std::vector<std::pair<RIFFType, RCBlobMT>> pending_;  // in order of writing
};

}  // namespace tarn
