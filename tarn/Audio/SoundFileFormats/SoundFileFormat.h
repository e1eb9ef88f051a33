#pragma once
// SoundFileFormat: the format-independent face of one sound file on disk.
//
// Each concrete class (WAVE, AIFF, and NoMetaDataSoundFileFormat for files
// an outside converter reads) answers the same questions: the file's length
// and audio attributes, its regions, loops, tempo and time stamp, its
// metadata chunks by tag or by name; and it makes readers and writers for
// the audio layer. Format objects are shared: SoundFileFormatCache hands out
// one object per file, and every change of length is reported to it.
//
// The object holds the FileSpecification of its file and no open file of
// its own. Everything else (attributes, cached metadata positions, regions)
// belongs to the concrete class.
//
// Metadata. Every metadata read takes a ReadOnlyMetaDataAccess and every
// write a ReadWriteMetaDataAccess (see MetaDataAccess.h), so that the caller
// proves it holds the metadata open in the right mode:
//
//   std::shared_ptr<SoundFileFormat> format = SoundFileFormatCache::Instance().GetFormat(spec);
//   auto rw = format->GetReadWriteMetaDataAccess();   // opens the metadata
//   format->WriteMetaData(*rw, MakeRIFFType("bext"), blob);
//   format->ChangeLengthInFrames(*rw, newLength);
//   rw.reset();                                       // writes and closes
//
// This base does the counting of the access objects (slots 58 to 64 of the
// interface below). A concrete format supplies three private hooks:
// OpenMetaDataOnDisk (the first handle arrives, or the first writer joins
// readers), WriteMetaDataToDisk (a read-write handle flushes or is released:
// apply the pending changes) and CloseMetaDataOnDisk (the last handle is
// gone). When a session has changed metadata but no audio length, closing
// sets the file's modification date back to its value at opening, unless
// DontSetModDateBackOnMetaDataClose was called during the session.
//
// Threads: the metadata counting is thread-safe, and the hooks run one at a
// time under the object's metadata lock. A hook may call this object's
// metadata queries (MetaDataIsOpen, DontSetModDateBackOnMetaDataClose, ...)
// and change the length, but must not make or release access handles of
// its own format. Other operations follow the concrete format's rules;
// UpdateFileSpec must not race with users of GetFile.
// Failures are TarnErrors; file operations pass on the file system's.

#include <cstdint>
#include <memory>
#include <mutex>
#include <optional>
#include <vector>

#include "tarn/Audio/SoundFileFormats/HostChannelOrder.h"
#include "tarn/Audio/SoundFileFormats/MetaDataAccess.h"
#include "tarn/Audio/SoundFileFormats/SoundFileAttributes.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatLoop.h"
#include "tarn/Audio/SoundFileFormats/SoundFileRegionList.h"
#include "tarn/Basics/RCBlobMT.h"
#include "tarn/FileSystem/FileDate.h"
#include "tarn/FileSystem/FileSpecification.h"
#include "tarn/String/UString.h"
#include "tarn/Time/SampleCount.h"
#include "tarn/Time/Tick.h"
#include "tarn/Time/TimeRegion.h"

namespace tarn {

// The audio layer's reader and writer bases (the reader/writer chain).
class AsyncAudioReader;
class AudioReader;
class InterAudioWriter;

class SoundFileFormat : public std::enable_shared_from_this<SoundFileFormat> {
 public:
  // Error code of the operations this base cannot carry out itself (readers
  // and writers before the audio layer supplies them): kind, system and
  // subsystem "SoundFileFormat".
  static constexpr int kNotAvailableErr = -4;
  // Number of rows of the file-type table (GetSupportedFileTypes).
  static constexpr int kNumSupportedFileTypes = 32;

  explicit SoundFileFormat(const FileSpecification& file);
  SoundFileFormat(const SoundFileFormat&) = delete;
  SoundFileFormat& operator=(const SoundFileFormat&) = delete;

  // ---- virtual operations, in slot order -------------------------------

  // 0
  virtual ~SoundFileFormat();
  // 1: the rate field of GetFileAttributes.
  [[nodiscard]] virtual double GetNaturalRate() = 0;
  // 2: rates for which renderings of the file are cached; none here.
  [[nodiscard]] virtual std::vector<double> GetCachedRates();
  // 3-5: the audio layer's reader over a range of frames at a rate, its
  // floating-point reader, and its writer. For a file whose
  // GetFileAttributes describe plain PCM or float samples, MakeReader gives
  // an AudioInFile over `range` (cut at the file's length; frame 0 is
  // range.start) and throws -50 unless `rate` is GetNaturalRate();
  // MakeWriter gives an AudioOutFile appending after the present audio (chunks
  // after the audio are removed first) and needs this object to be owned by
  // a shared_ptr (-50 otherwise). Other sample layouts throw -50; files
  // that need the outside converter throw kNotAvailableErr.
  // MakeFloatingPointReader is MakeReader deinterleaved into one float
  // buffer per channel (DeinterleavingReader, ConvertingReader) and throws
  // what MakeReader throws.
  [[nodiscard]] virtual std::unique_ptr<AsyncAudioReader> MakeReader(
      const TimeRangeOf<SampleCount>& range, double rate);
  [[nodiscard]] virtual std::unique_ptr<AudioReader> MakeFloatingPointReader(
      const TimeRangeOf<SampleCount>& range, double rate);
  [[nodiscard]] virtual std::shared_ptr<InterAudioWriter> MakeWriter();
  // 6: deletes the file; the cache forgets this object.
  virtual void Delete();
  // 7: moves the file into `folder` under `name`; this object then names
  // the new place (UpdateFileSpec) and the cache follows it.
  virtual void MoveTo(const FileSpecification& folder, const UString& name);
  // 8: renames the file within its folder; as MoveTo.
  virtual void Rename(const UString& name);
  // 9: the file's modification date; false (never a throw) when it cannot
  // be read.
  virtual bool GetFileModDate(FileDate& date);
  // 10: whether the file exists and opens for writing.
  [[nodiscard]] virtual bool IsFileWritable();
  // 11: the table name of GetActualFileType (of GetCanonicalFileType when
  // the actual type is not in the table; empty when neither is).
  virtual void GetFormatName(UString& name);
  // 12
  [[nodiscard]] virtual SampleCount GetLengthInFrames() = 0;
  // 13: GetLengthInFrames multiplied by GetNaturalRate, as the product is
  // defined for this interface.
  [[nodiscard]] virtual double GetLengthInSeconds();
  // 14: sets the frame count in the file's header. Nothing happens (and
  // nobody is told) when n is the current length; otherwise the file may be
  // switched to its extended form first (ShouldSwitchToExtendedFileFormat),
  // the header is adjusted, cached metadata positions are dropped and the
  // cache is told. Throws -50 if `access` belongs to another format.
  virtual void ChangeLengthInFrames(ReadWriteMetaDataAccess& access, SampleCount n);
  // 15: after audio was appended: the length that the file's size gives
  // (GetLengthInFramesBasedOnDataLen of `attributes`), written as in
  // ChangeLengthInFrames but always (and always reported).
  virtual void UpdateLengthAfterAppendingAudio(ReadWriteMetaDataAccess& access,
                                               const SoundFileAttributes& attributes);
  // 16-20: regions.
  [[nodiscard]] virtual bool SupportsRegionList();  // false
  [[nodiscard]] virtual std::unique_ptr<SoundFileRegionList> GetRegionList(
      ReadOnlyMetaDataAccess& access) = 0;
  // `regions` as SoundFileRegionList::Flatten makes it.
  virtual void WriteRegionList(ReadWriteMetaDataAccess& access, RCBlobMT regions,
                               std::uint32_t flags) = 0;
  [[nodiscard]] virtual bool ImportRegionsAsSeparateSoundBites();  // false
  [[nodiscard]] virtual bool AlwaysImportRegionForWholeFile();     // true
  // 21-25: file types.
  [[nodiscard]] virtual std::uint32_t GetCanonicalFileType() = 0;
  [[nodiscard]] virtual std::uint32_t GetActualFileType();  // GetCanonicalFileType
  // True when GetActualFileType is 0 or `type` is GetCanonicalFileType.
  [[nodiscard]] virtual bool IsValidType(std::uint32_t type);
  [[nodiscard]] virtual std::uint32_t GetPerferredFileCreator() = 0;
  [[nodiscard]] virtual bool MatchesExtension(const UString& extension);  // false
  // 26-28: audio attributes.
  [[nodiscard]] virtual SoundFileAttributes GetFileAttributes() = 0;
  [[nodiscard]] virtual HostChannelOrder GetChannelOrder() = 0;
  [[nodiscard]] virtual bool FormatRequiresExternalConversion();  // false
  // 29-35: tempo, pitch and time stamp; none here.
  virtual bool HasFileTempoAndSyncPoint(float& tempo, SampleCount& syncPoint);
  virtual bool HasFileMeterAndPitch(short& rootNote, short& numerator, short& denominator);
  virtual bool GetDisplayTempo(UString& tempo);
  virtual bool SetDisplayTempo(ReadWriteMetaDataAccess& access, UString& tempo);
  virtual bool HasOriginalTimeStamp(SampleCount& timeStamp);
  virtual void WriteOriginalTimeStamp(ReadWriteMetaDataAccess& access, SampleCount timeStamp);
  [[nodiscard]] virtual bool ShouldUseExistingGroup();
  // 36: writes the header of a new file with `attributes` and `frames`
  // frames (with a recording indicator when `recording`); returns the
  // attributes actually written. `hint` carries the caller's wishes beyond
  // the attributes (e.g. the type of the file being replaced).
  virtual SoundFileAttributes CreateFileOnDisk(const SoundFileAttributes& attributes,
                                               SampleCount frames, bool recording,
                                               const SoundFileAttributes& hint) = 0;
  // 37-38
  virtual void SetRecordFlagMetaData(ReadWriteMetaDataAccess& access, int flag) = 0;
  virtual void WriteFileTempoData(ReadWriteMetaDataAccess& access, float tempo, short rootNote,
                                  short numerator, short denominator,
                                  const std::vector<std::int64_t>& beatPositions,
                                  SampleCount syncPoint, float beats) = 0;
  // 39-42: loops.
  [[nodiscard]] virtual bool SupportsLoops();  // false
  [[nodiscard]] virtual short NumberOfLoops(ReadOnlyMetaDataAccess& access) = 0;
  virtual void GetFileLoop(ReadOnlyMetaDataAccess& access, short index,
                           SoundFileFormatLoop& loop) = 0;
  virtual void AddFileLoops(ReadWriteMetaDataAccess& access,
                            const std::vector<SoundFileFormatLoop>& loops) = 0;
  // 43-51: musical time; none here.
  [[nodiscard]] virtual bool SupportsTickOffsets();
  virtual void GetTickOffsets(std::vector<Tick>& offsets);
  virtual void SetTickOffsets(const std::vector<Tick>& offsets);
  [[nodiscard]] virtual bool SupportsLengthInTicks();
  [[nodiscard]] virtual double GetLengthInTicks();  // 0.0
  [[nodiscard]] virtual bool SupportsRegionTempos();
  virtual void GetRegionTempos(ReadOnlyMetaDataAccess& access, std::vector<double>& tempos);
  virtual void ClearFileTempoData();
  [[nodiscard]] virtual bool SetNoTimeScaleOnImport();
  // 52-57: strings, recovery and raw header; none here.
  virtual void SaveStringToFile(ReadWriteMetaDataAccess& access, int which, const UString& text);
  virtual bool GetStringFromFile(ReadOnlyMetaDataAccess& access, int which, UString& text);
  [[nodiscard]] virtual bool AudioDataIsZeroLength();
  virtual void RecoverCrashedRecording();
  [[nodiscard]] virtual bool SupportsRawHeader();
  virtual void GetRawHeader(std::vector<std::uint8_t>& header);
  // 58-60: new access handles (see MetaDataAccess.h). The first live handle
  // opens the metadata (OpenMetaDataOnDisk); that hook's failure is thrown
  // and no handle is made.
  [[nodiscard]] virtual std::shared_ptr<ReadOnlyMetaDataAccess> GetReadOnlyMetaDataAccess();
  [[nodiscard]] virtual std::shared_ptr<ReadWriteMetaDataAccess> GetReadWriteMetaDataAccess();
  [[nodiscard]] virtual std::shared_ptr<HoldOpenMetaData> OpenMetaData();
  // 61: true.
  [[nodiscard]] virtual bool FormatSupportsMetaData();
  // 62: whether any access handle lives.
  [[nodiscard]] virtual bool MetaDataIsOpen();
  // 63: the current session's close leaves the file's modification date
  // as the writes made it.
  virtual void DontSetModDateBackOnMetaDataClose();
  // 64: the file's modification date when the metadata was opened. Throws
  // -50 when the metadata is not open or the date could not be read then.
  virtual void GetFileModDateAtMetaDataOpen(FileDate& date);
  // 65-71: metadata chunks by tag and by name.
  [[nodiscard]] virtual bool HasMetaData(ReadOnlyMetaDataAccess& access, std::uint32_t tag) = 0;
  [[nodiscard]] virtual RCBlobMT ReadMetaData(ReadOnlyMetaDataAccess& access,
                                              std::uint32_t tag) = 0;
  virtual void WriteMetaData(ReadWriteMetaDataAccess& access, std::uint32_t tag, RCBlobMT data) = 0;
  // Drops pending metadata changes not yet written.
  virtual void CleanMetaDataMods() = 0;
  virtual void RemoveTrailingMetaData();  // nothing here
  [[nodiscard]] virtual RCBlobMT ReadNamedMetaData(ReadOnlyMetaDataAccess& access,
                                                   const UString& name, std::uint32_t tag) = 0;
  virtual void WriteNamedMetaData(ReadWriteMetaDataAccess& access, const UString& name,
                                  std::uint32_t tag, RCBlobMT data) = 0;
  // 72: replaces the held FileSpecification.
  virtual void UpdateFileSpec(const FileSpecification& file);
  // 73: the most frames a file of this type and frame size can hold:
  // SoundFileFormatCache::GetMaxFrameCountForType(GetActualFileType(),
  // bytes per frame of GetFileAttributes()).
  [[nodiscard]] virtual SampleCount GetMaxFrameCount();
  // 74-76: the extended (64-bit) form of the format; none here.
  [[nodiscard]] virtual bool ShouldSwitchToExtendedFileFormat(const SampleCount& frames);
  virtual void SwitchToExtendedFileFormat(const SampleCount& frames);
  [[nodiscard]] virtual bool IsExtendedFormat();

 private:
  // 77: writes frame count `frames` into the file's header.
  virtual void AdjustLengthInHeader(const SoundFileAttributes& attributes, SampleCount frames) = 0;

 protected:
  // 78: forgets where metadata chunks were found (after the layout changed).
  virtual void ThrowOutCachedMetaDataPositions();

 private:
  // ---- metadata hooks (see the opening comment) -------------------------
  // The metadata opens (forWriting as the first handle asked), or a first
  // read-write handle joins a session that was open for reading only
  // (forWriting true). A throw refuses the handle.
  virtual void OpenMetaDataOnDisk(bool forWriting);
  // Applies pending metadata changes to the file; returns whether the file
  // changed. Called on Flush and when a read-write handle is released.
  virtual bool WriteMetaDataToDisk();
  // The last handle is gone (after its flush).
  virtual void CloseMetaDataOnDisk() noexcept;

 public:
  // ---- non-virtual members ----------------------------------------------

  [[nodiscard]] const FileSpecification& GetFile() const noexcept { return file_; }

  // The table name of `type` ("WAVE", "AIFF", "MP3 Audio", ...); empty when
  // the type is not in the table.
  static void GetFormatName(std::uint32_t type, UString& name);
  // The 32 type codes of the table, "Sd2f" first and "wma " last.
  static void GetSupportedFileTypes(const std::uint32_t*& types, int& count) noexcept;
  // Open the file's format through the cache (made for `type`), ask it,
  // release it. Throw what making the format throws.
  [[nodiscard]] static SoundFileAttributes GetAttributesFromFileAndType(
      const FileSpecification& file, std::uint32_t type);
  [[nodiscard]] static SampleCount GetFileLengthInFrames(const FileSpecification& file,
                                                         std::uint32_t type);

  // (size of the file's data - attributes.mOffsetToAudio) /
  // attributes.mBytesPerFrame, in signed 64-bit division. A frame size
  // below 1 throws -50 before the file is looked at; a missing file throws
  // the file system's error.
  [[nodiscard]] SampleCount GetLengthInFramesBasedOnDataLen(
      const SoundFileAttributes& attributes) const;

 protected:
  // Steps shared by ChangeLengthInFrames and UpdateLengthAfterAppendingAudio:
  // switch to the extended form if needed, AdjustLengthInHeader,
  // ThrowOutCachedMetaDataPositions, tell the cache.
  void ChangeLengthInternal(const SoundFileAttributes& attributes, SampleCount frames);

  // Throws -50 unless `access` is a handle of this object.
  void CheckAccess(const HoldOpenMetaData& access) const;

 private:
  friend class HoldOpenMetaData;
  friend class ReadWriteMetaDataAccess;

  // Counts a new handle of `mode` (opening the metadata if it is the first)
  // and makes it.
  std::shared_ptr<HoldOpenMetaData> AcquireMetaData(MetaDataMode mode);
  // Flush of a read-write handle (throws).
  void FlushMetaData();
  // Release of a handle of `mode`: flush (failures dropped), uncount, close
  // when it was the last.
  void ReleaseMetaData(MetaDataMode mode) noexcept;

  FileSpecification file_;

  // Guards the fields below and serialises the metadata hooks; recursive so
  // that a hook may use this object's metadata queries.
  std::recursive_mutex metaDataLock_;
  int metaDataHolds_ = 0;            // live handles of any mode
  int metaDataWriters_ = 0;          // live read-write handles; <= metaDataHolds_
  bool metaDataWritten_ = false;     // a flush changed the file this session
  bool lengthChanged_ = false;       // the audio length changed this session
  bool keepModDateOnClose_ = false;  // DontSetModDateBackOnMetaDataClose
  std::optional<FileDate> modDateAtOpen_;
};

}  // namespace tarn
