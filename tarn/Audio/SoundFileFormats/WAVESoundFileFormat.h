#pragma once
// WAVESoundFileFormat: the SoundFileFormat of RIFF "WAVE" and Wave64 files.
//
// Attributes, length, comment, time stamp, tempo and recording indicator
// come from a WAVEReader, made on first need and dropped whenever the
// file's layout changes. Metadata chunks are read through a RIFFFileEditor
// (WAVE handler, little-endian sizes). Writes are compared with what the
// file holds and, when they differ, kept pending until the read-write
// access is flushed or released (WriteMetaDataToDisk), which applies them
// through RIFFFileEditor::AddChunkData: a same-size chunk is rewritten in
// place, other chunks before the audio become "JUNK", chunks after the
// audio move; the audio payload is never touched, and chunks this class
// does not know survive every edit. Reads see pending writes.
//
// What the metadata means here:
//   - loops: "smpl" (its loop end is the last frame played, so a loop's
//     mEnd is the stored end + 1);
//   - markers and regions: "cue " points, named by "labl" and made regions
//     by "ltxt" (purpose "rgn ") inside a "LIST"/"adtl" chunk. The names are
//     written only when the file has no other "LIST" before (the chunk
//     editor addresses the first chunk of a tag; an "INFO" list is kept
//     rather than replaced);
//   - comment (SaveStringToFile / GetStringFromFile which 0), originator
//     (which 1) and the original time stamp: "bext";
//   - tempo, root note and meter: "acid";
//   - the recording indicator: "Rec!".
// In Wave64 files only tags with Wave64 identifiers can be written (every
// chunk above has one); another tag throws -50.
//
// Length and Wave64: AdjustLengthInHeader rewrites the container and "data"
// sizes; a RIFF file whose new length needs 64-bit sizes
// (ShouldSwitchToExtendedFileFormat) is rewritten as Wave64 in place first,
// its audio offset unchanged, when its header has the room
// (WAVEReader::CanSwitchToWave64); otherwise the switch throws
// kind/system/subsystem "WAVESoundFileFormat" code kCannotSwitchErr.
//
// Threads: the metadata counting of the base is thread-safe; everything
// else is for one thread at a time per object. Errors: reader errors
// ("WAVEReader"), editor errors ("RIFFFileEditor"), stream and file-system
// errors propagate.
//
//   auto format = std::make_shared<WAVESoundFileFormat>(spec);
//   auto rw = format->GetReadWriteMetaDataAccess();
//   format->SaveStringToFile(*rw, WAVESoundFileFormat::kCommentString, UString("Take 2"));
//   rw->Flush();   // the "bext" chunk is in the file now

#include <memory>
#include <utility>
#include <vector>

#include "tarn/Audio/SoundFileFormats/RIFFFileEditor.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/WAVEReader.h"

namespace tarn {

class WAVESoundFileFormat : public SoundFileFormat {
 public:
  static constexpr const char* kErrorClass = "WAVESoundFileFormat";
  static constexpr int kCannotSwitchErr = 1;
  // SaveStringToFile / GetStringFromFile: which string.
  static constexpr int kCommentString = 0;     // "bext" description
  static constexpr int kOriginatorString = 1;  // "bext" originator

  explicit WAVESoundFileFormat(const FileSpecification& file);
  ~WAVESoundFileFormat() override;

  // Whether a file of `channels` channels and `frames` frames (of
  // `bytesPerSample` bytes) is too large for RIFF's 32-bit sizes.
  [[nodiscard]] static bool FileWillBeWave64(int channels, const SampleCount& frames,
                                             int bytesPerSample = 4);

  [[nodiscard]] double GetNaturalRate() override;
  [[nodiscard]] SampleCount GetLengthInFrames() override;
  [[nodiscard]] bool SupportsRegionList() override { return true; }
  [[nodiscard]] std::unique_ptr<SoundFileRegionList> GetRegionList(
      ReadOnlyMetaDataAccess& access) override;
  void WriteRegionList(ReadWriteMetaDataAccess& access, RCBlobMT regions,
                       std::uint32_t flags) override;
  [[nodiscard]] std::uint32_t GetCanonicalFileType() override;
  // ".W64" for a Wave64 file, "WAVE" otherwise.
  [[nodiscard]] std::uint32_t GetActualFileType() override;
  [[nodiscard]] std::uint32_t GetPerferredFileCreator() override { return 0; }
  // What 64-bit sizes hold for Wave64 files and RIFF files that can switch to
  // Wave64 in place; what 32-bit sizes hold for any other RIFF file.
  [[nodiscard]] SampleCount GetMaxFrameCount() override;
  [[nodiscard]] SoundFileAttributes GetFileAttributes() override;
  [[nodiscard]] HostChannelOrder GetChannelOrder() override;
  bool HasFileTempoAndSyncPoint(float& tempo, SampleCount& syncPoint) override;
  bool HasFileMeterAndPitch(short& rootNote, short& numerator, short& denominator) override;
  bool HasOriginalTimeStamp(SampleCount& timeStamp) override;
  void WriteOriginalTimeStamp(ReadWriteMetaDataAccess& access, SampleCount timeStamp) override;
  // A new file at GetFile() through WAVEWriter: Wave64 when `attributes`
  // or `hint` ask for type ".W64" or the length needs it; a "Rec!" chunk
  // when `recording`. Returns the attributes of the file as written.
  SoundFileAttributes CreateFileOnDisk(const SoundFileAttributes& attributes, SampleCount frames,
                                       bool recording, const SoundFileAttributes& hint) override;
  void SetRecordFlagMetaData(ReadWriteMetaDataAccess& access, int flag) override;
  // Writes "acid": tempo, root note, meter and the number of beats.
  void WriteFileTempoData(ReadWriteMetaDataAccess& access, float tempo, short rootNote,
                          short numerator, short denominator,
                          const std::vector<std::int64_t>& beatPositions, SampleCount syncPoint,
                          float beats) override;
  [[nodiscard]] bool SupportsLoops() override { return true; }
  [[nodiscard]] short NumberOfLoops(ReadOnlyMetaDataAccess& access) override;
  // Throws -50 for an index outside 0 .. NumberOfLoops - 1.
  void GetFileLoop(ReadOnlyMetaDataAccess& access, short index, SoundFileFormatLoop& loop) override;
  // Replaces the file's loops (the rest of "smpl" is kept).
  void AddFileLoops(ReadWriteMetaDataAccess& access,
                    const std::vector<SoundFileFormatLoop>& loops) override;
  void SaveStringToFile(ReadWriteMetaDataAccess& access, int which, const UString& text) override;
  bool GetStringFromFile(ReadOnlyMetaDataAccess& access, int which, UString& text) override;
  [[nodiscard]] bool AudioDataIsZeroLength() override;
  // A recording whose "data" size was never written (0, or more than the
  // file holds) gets the size the file's length gives, written in place.
  void RecoverCrashedRecording() override;
  [[nodiscard]] bool SupportsRawHeader() override { return true; }
  void GetRawHeader(std::vector<std::uint8_t>& header) override;
  [[nodiscard]] bool HasMetaData(ReadOnlyMetaDataAccess& access, std::uint32_t tag) override;
  [[nodiscard]] RCBlobMT ReadMetaData(ReadOnlyMetaDataAccess& access, std::uint32_t tag) override;
  void WriteMetaData(ReadWriteMetaDataAccess& access, std::uint32_t tag, RCBlobMT data) override;
  void CleanMetaDataMods() override;
  // Cuts every chunk after "data" and fixes the container size.
  void RemoveTrailingMetaData() override;
  // Named metadata lives in the chunk of `tag`; the name is not stored.
  [[nodiscard]] RCBlobMT ReadNamedMetaData(ReadOnlyMetaDataAccess& access, const UString& name,
                                           std::uint32_t tag) override;
  void WriteNamedMetaData(ReadWriteMetaDataAccess& access, const UString& name, std::uint32_t tag,
                          RCBlobMT data) override;
  void UpdateFileSpec(const FileSpecification& file) override;
  [[nodiscard]] bool ShouldSwitchToExtendedFileFormat(const SampleCount& frames) override;
  void SwitchToExtendedFileFormat(const SampleCount& frames) override;
  [[nodiscard]] bool IsExtendedFormat() override;

 protected:
  void ThrowOutCachedMetaDataPositions() override;

 private:
  void AdjustLengthInHeader(const SoundFileAttributes& attributes, SampleCount frames) override;
  bool WriteMetaDataToDisk() override;
  void CloseMetaDataOnDisk() noexcept override;

  WAVEReader& Reader();
  // The chunk editor of the file, made and listed on first need.
  RIFFFileEditor& DemandFileEditor();
  // The file's (or the pending) payload of `tag`; empty when none.
  RCBlobMT CurrentChunk(std::uint32_t tag);
  void SetPending(std::uint32_t tag, const RCBlobMT& data);
  BWFBroadcastWaveExtension CurrentBroadcastExtension();
  void WriteBroadcastExtension(const BWFBroadcastWaveExtension& bext);

  std::unique_ptr<WAVEReader> reader_;
  std::unique_ptr<RIFFFileEditor> editor_;
  // Changes not yet in the file, in the order they were made (one per tag).
  std::vector<std::pair<std::uint32_t, RCBlobMT>> pending_;
};

}  // namespace tarn
