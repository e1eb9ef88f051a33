#pragma once
// The metadata access objects: shared handles that keep a sound file's
// metadata open for as long as any of them lives.
//
//   HoldOpenMetaData         keeps the metadata open (no reading or writing)
//   ReadOnlyMetaDataAccess   ... and proves the holder may read it
//   ReadWriteMetaDataAccess  ... and may change it; a read-write access
//                            also serves wherever a read-only one is asked
//
// They are made only by a format object (SoundFileFormat's
// GetReadOnlyMetaDataAccess, GetReadWriteMetaDataAccess, OpenMetaData) and
// handed out as std::shared_ptr. The format counts the live handles: the
// first one opens the metadata, the last one closes it. Releasing a
// read-write access writes the format's pending changes to the file;
// Flush() does so at once and is the way to see a failure (a release cannot
// throw, so a failure during the release is dropped).
//
//   auto rw = format->GetReadWriteMetaDataAccess();
//   format->WriteMetaData(*rw, MakeRIFFType("bext"), blob);
//   rw->Flush();   // the chunk is now in the file; throws on failure
//   rw.reset();    // last handle: the metadata closes
//
// A handle keeps its format object alive when the format is owned by a
// shared_ptr (as the format cache's are); handles of a format that is not
// must be released before it is destroyed. Handles may be made, copied (as
// shared_ptrs) and released on any thread.

#include <memory>

namespace tarn {

class SoundFileFormat;

enum class MetaDataMode : int {
  kHoldOpen = 0,
  kReadOnly = 1,
  kReadWrite = 2,
};

class HoldOpenMetaData {
 public:
  HoldOpenMetaData(const HoldOpenMetaData&) = delete;
  HoldOpenMetaData& operator=(const HoldOpenMetaData&) = delete;
  // Gives the hold back to the format (closing the metadata when it was the
  // last); a read-write access writes the pending changes first.
  virtual ~HoldOpenMetaData();

  [[nodiscard]] SoundFileFormat& GetFormat() const noexcept { return *format_; }
  [[nodiscard]] MetaDataMode GetMode() const noexcept { return mode_; }

 protected:
  // Called by the format after it has counted the hold.
  HoldOpenMetaData(SoundFileFormat& format, std::shared_ptr<SoundFileFormat> keepAlive,
                   MetaDataMode mode) noexcept;

 private:
  friend class SoundFileFormat;
  SoundFileFormat* format_;
  std::shared_ptr<SoundFileFormat> keepAlive_;  // null when the format is not shared
  MetaDataMode mode_;
};

class ReadOnlyMetaDataAccess : public HoldOpenMetaData {
 public:
  ~ReadOnlyMetaDataAccess() override = default;

 protected:
  using HoldOpenMetaData::HoldOpenMetaData;
  friend class SoundFileFormat;
};

class ReadWriteMetaDataAccess : public ReadOnlyMetaDataAccess {
 public:
  ~ReadWriteMetaDataAccess() override = default;

  // Writes the format's pending metadata changes to the file now (the
  // format's WriteMetaDataToDisk). Blocks for the file I/O; throws what the
  // format throws.
  void Flush();

 protected:
  using ReadOnlyMetaDataAccess::ReadOnlyMetaDataAccess;
  friend class SoundFileFormat;
};

}  // namespace tarn
