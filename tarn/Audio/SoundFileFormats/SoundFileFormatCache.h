#pragma once
// SoundFileFormatCache: the process-wide map from a file to its one shared
// format object.
//
// GetFormat gives every caller asking for the same file (same full path)
// the same SoundFileFormat object for as long as anyone holds it; the cache
// itself holds only weak references, so an object that no caller holds is
// destroyed at once and its entry is dropped at the next lookup (or by
// Purge). Which class a file gets follows from its type (MakeFormatForFile).
//
//   auto& cache = SoundFileFormatCache::Instance();
//   std::shared_ptr<SoundFileFormat> f = cache.GetFormat(spec);  // by the file's type
//   SampleCount n = f->GetLengthInFrames();
//
// Formats report changes (a new length, a new name) through FormatChanged;
// listeners added with AddChangeListener hear of them.
//
// Threads: every operation may be called from any thread. Lookups take a
// short lock; a new format object is made outside it (its constructor may
// read the file), and when two threads make one for the same file at once,
// both get the object that was entered first. Listeners are called on the
// thread that reports the change, outside the lock.

#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>
#include <unordered_map>
#include <utility>
#include <vector>

#include "tarn/Basics/Singleton.h"
#include "tarn/FileSystem/FileSpecification.h"
#include "tarn/String/UString.h"
#include "tarn/Time/SampleCount.h"

namespace tarn {

class SoundFileFormat;

// Which class of format serves a file type (SoundFileFormatCache::FamilyForType).
enum class SoundFileFamily : int {
  kWAVE = 0,           // "WAVE", "TEXT", "PNRA", ".W64", ".WAV", ".wav"
  kAIFF = 1,           // "AIFF", "ACdI"
  kSoundDesigner = 2,  // "Sd2f", "SFIL": not supported by this library
  kConverter = 3,      // any other type: read through the outside converter
};

class SoundFileFormatCache {
 public:
  // Makes the format object of a file read through the outside converter;
  // returns null when it cannot.
  using ConverterFormatFactory =
      std::function<std::shared_ptr<SoundFileFormat>(const FileSpecification&, std::uint32_t)>;
  // Whether the outside converter can open a file. Must not throw.
  using ConverterProbe = std::function<bool(const FileSpecification&)>;
  // Hears that a format object changed.
  using ChangeListener = std::function<void(SoundFileFormat&)>;
  using ListenerID = std::uint64_t;

  // Error code of the types this library does not open (Sound Designer I
  // and II, and converter types when no converter factory answers): kind,
  // system and subsystem "SoundFileFormatCache".
  static constexpr int kUnsupportedFormatErr = -4;

  SoundFileFormatCache(const SoundFileFormatCache&) = delete;
  SoundFileFormatCache& operator=(const SoundFileFormatCache&) = delete;

  // The process-wide cache, created on first use.
  [[nodiscard]] static SoundFileFormatCache& Instance();

  // The shared format object of `file`, made for the file's type
  // (File::GetType) if nobody holds one. Throws what MakeFormatForFile
  // throws.
  [[nodiscard]] std::shared_ptr<SoundFileFormat> GetFormat(const FileSpecification& file);
  // As above, made for `type` if nobody holds one (an existing object is
  // returned whatever its type).
  [[nodiscard]] std::shared_ptr<SoundFileFormat> GetFormat(const FileSpecification& file,
                                                           std::uint32_t type);
  // The object some caller holds for `file`, or null; never makes one.
  [[nodiscard]] std::shared_ptr<SoundFileFormat> FindFormat(const FileSpecification& file);

  // A new format object of the class for `type` (not entered in the
  // cache): WAVE and AIFF families get their formats; Sound Designer types
  // throw kUnsupportedFormatErr; any other type goes to the converter
  // factory, and throws kUnsupportedFormatErr when it gives null.
  [[nodiscard]] std::shared_ptr<SoundFileFormat> MakeFormatForFile(const FileSpecification& file,
                                                                   std::uint32_t type);
  [[nodiscard]] static SoundFileFamily FamilyForType(std::uint32_t type) noexcept;

  // Replaces the converter factory (empty: none, which answers null);
  // returns the previous one. The default makes a ConverterSoundFileFormat.
  ConverterFormatFactory SetConverterFormatFactory(ConverterFormatFactory factory);
  // Replaces the converter probe (empty: none, which answers false);
  // returns the previous one. The default asks OutsideDecoder::CanDecode.
  ConverterProbe SetConverterProbe(ConverterProbe probe);
  // The converter probe: whether the outside converter can open `file`.
  // Never throws (a throwing probe answers false).
  [[nodiscard]] bool ConverterCanOpen(const FileSpecification& file) noexcept;

  // The most frames a file of `type` with `bytesPerFrame` bytes per frame
  // can hold (throws -50 when bytesPerFrame < 1):
  //  - classic RIFF WAVE (".WAV", ".wav", "PNRA", "TEXT") and AIFF ("AIFF",
  //    "AIFC", "ACdI"): the 32-bit size fields must hold the audio and the
  //    header, so (2^32 - 1 - kHeaderReserve) / bytesPerFrame;
  //  - Wave64 (".W64") and "WAVE", the type of this library's own
  //    recordings, which switch to Wave64 in place when they outgrow RIFF:
  //    2^62 / bytesPerFrame;
  //  - Sound Designer ("Sd2f", "SFIL"): 32-bit data fork sizes,
  //    (2^32 - 1) / bytesPerFrame;
  //  - any other (converter-read, never written): 2^62 / bytesPerFrame.
  [[nodiscard]] static SampleCount GetMaxFrameCountForType(std::uint32_t type, int bytesPerFrame);
  // Bytes kept for the header (and trailing chunks) of a 32-bit file.
  static constexpr std::int64_t kHeaderReserve = 64 * 1024;

  // Reported by a format whose length, name or layout changed: the entry
  // follows the object's current file, then the listeners are called.
  void FormatChanged(SoundFileFormat& format);
  // Reported by a format whose file was deleted: its entry goes.
  void FormatDeleted(SoundFileFormat& format);

  [[nodiscard]] ListenerID AddChangeListener(ChangeListener listener);
  void RemoveChangeListener(ListenerID id);

  // Drops the entries of objects nobody holds any more.
  void Purge();
  // Entries whose objects are still held.
  [[nodiscard]] std::size_t GetLiveCount();

 private:
  friend class Singleton<SoundFileFormatCache>;
  SoundFileFormatCache();
  ~SoundFileFormatCache();

  void PurgeLocked();

  std::mutex lock_;                                                      // guards everything below
  std::unordered_map<UString, std::weak_ptr<SoundFileFormat>> formats_;  // key: full path
  ConverterFormatFactory converterFactory_;
  ConverterProbe converterProbe_;
  std::vector<std::pair<ListenerID, ChangeListener>> listeners_;
  ListenerID nextListenerID_ = 1;
};

}  // namespace tarn
