// Fuzz target of the WAVE and AIFF header readers and the metadata the
// format objects read: arbitrary bytes are one file, which the probes, the
// readers (WAVEReader, AIFFReader) and the format objects of both families
// (made by the format cache) are asked every question a host asks.
//
// Checked on every input (a violation aborts, which libFuzzer reports):
//   - the probes answer and agree with the readers' CanParse;
//   - only TarnErrors escape, and only of the kinds expected where they
//     are thrown: "WAVEReader" / "AIFFReader" from the readers, and those
//     plus "RIFFFileEditor" from the format objects' metadata reads;
//   - a reader that can parse answers every question, the same way twice;
//   - frame size = channels * bytes per sample (WAVE: both positive; AIFF
//     parses a "COMM" of no channels or of samples under 8 bits);
//   - WAVE: the audio offset + frames * frame size never passes the end of
//     the file, the "data" header lies before the audio, the chunks walked
//     lie inside the file in increasing order; the format object reports
//     the reader's facts;
//   - AIFF: the raw header is the bytes before the audio, cut to the file
//     (the "COMM" frame count is not cut to the file: the reader's rule);
//   - what the metadata reads build (raw headers, chunk blobs, comments,
//     loops, regions, slices) is bounded by the file's length, and no single
//     allocation made while the library runs is larger than the file plus
//     the fixed buffers of the streams (kAllocationAllowance).

#include <sanitizer/allocator_interface.h>
#include <unistd.h>

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <filesystem>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "FuzzSupport.h"
#include "tarn/Audio/SoundFileFormats/AIFFReader.h"
#include "tarn/Audio/SoundFileFormats/MetaDataAccess.h"
#include "tarn/Audio/SoundFileFormats/RIFFType.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"
#include "tarn/Audio/SoundFileFormats/SoundFileProbes.h"
#include "tarn/Audio/SoundFileFormats/SoundFileRegionList.h"
#include "tarn/Audio/SoundFileFormats/WAVEReader.h"
#include "tarn/Errors/TarnError.h"
#include "tarn/FileSystem/FileSpecification.h"

namespace tarn {
namespace {

// Inputs larger than this are skipped: small files reach every path.
constexpr std::size_t kMaxInput = 64 * 1024;
// Loops and regions looked at per file.
constexpr int kMaxLoops = 64;
// The largest allocation allowed beyond the file's length: the streams'
// fixed buffers and the formats' fixed-size records.
constexpr std::size_t kAllocationAllowance = 256 * 1024;

// The largest single allocation since the last reset; counted only while
// `armed` is set, so libFuzzer's own allocations do not count.
volatile bool gArmed = false;
volatile std::size_t gLargest = 0;

void MallocHook(const volatile void*, std::size_t size) {
  if (gArmed && size > gLargest) gLargest = size;
}
void FreeHook(const volatile void*) {}

// Counts the allocations of its scope.
class Watch {
 public:
  Watch() {
    gLargest = 0;
    gArmed = true;
  }
  Watch(const Watch&) = delete;
  Watch& operator=(const Watch&) = delete;
  ~Watch() { gArmed = false; }
};

// One scratch file per process, rewritten by every run. The ".wav" name
// lets the WAVE probe's name rule pass, so the probe reaches the reader.
struct Scratch {
  fuzz::ScratchFile path{"tarn-format-fuzz", ".wav"};
};

Scratch& GetScratch() {
  static Scratch scratch;
  return scratch;
}

using fuzz::Violation;
using fuzz::WriteBytes;

// Runs `body`; a TarnError of one of `kinds` is the answer "cannot", any
// other exception is a violation. Returns whether `body` finished.
template <typename Body>
bool Expect(std::initializer_list<std::string_view> kinds, const char* where, Body&& body) {
  try {
    body();
    return true;
  } catch (const TarnError& e) {
    const std::string kind(e.GetKind().c_str());
    if (std::find(kinds.begin(), kinds.end(), kind) != kinds.end()) return false;
    std::fprintf(stderr, "FormatReadersFuzz: %s threw kind \"%s\" code %d\n", where, kind.c_str(),
                 e.GetIntErrorCode());
    std::abort();
  } catch (const std::exception& e) {
    std::fprintf(stderr, "FormatReadersFuzz: %s threw %s\n", where, e.what());
    std::abort();
  } catch (...) {
    std::fprintf(stderr, "FormatReadersFuzz: %s threw something else\n", where);
    std::abort();
  }
}

void CheckWAVEReader(const FileSpecification& spec, std::int64_t fileLength) {
  WAVEReader reader(spec);
  const bool can = reader.CanParse();
  TARN_FUZZ_CHECK(reader.CanParse() == can);
  TARN_FUZZ_CHECK(ProbeWAVEFile(spec, MakeRIFFType("WAVE")) == can);
  TARN_FUZZ_CHECK(ProbeWAVEFile(spec) == can);
  const bool answered = Expect({WAVEReader::kErrorClass}, "WAVEReader", [&] {
    const std::int64_t header = reader.GetHeaderSize();
    const std::int64_t audioHeader = reader.GetOffsetToAudioHeader();
    const int channels = reader.GetNumberOfChannels();
    const int sampleSize = reader.GetSampleSize();
    const int frameSize = reader.GetSampleFrameSize();
    const std::int64_t frames = reader.GetNumberOfFrames();
    TARN_FUZZ_CHECK(channels > 0 && sampleSize > 0, channels, sampleSize);
    TARN_FUZZ_CHECK(frameSize == channels * sampleSize, frameSize, channels * sampleSize);
    TARN_FUZZ_CHECK(frames >= 0, frames);
    TARN_FUZZ_CHECK(audioHeader >= 0 && audioHeader < header, audioHeader, header);
    TARN_FUZZ_CHECK(header <= fileLength, header, fileLength);
    TARN_FUZZ_CHECK(header + frames * frameSize <= fileLength, header + frames * frameSize,
                    fileLength);
    TARN_FUZZ_CHECK(reader.GetFileLength() == fileLength, reader.GetFileLength(), fileLength);
    TARN_FUZZ_CHECK(reader.GetDataLength() >= 0, reader.GetDataLength());
    (void)reader.IsWave64();
    (void)reader.CanSwitchToWave64();
    (void)reader.GetSampleRate();
    (void)reader.GetSampleFormat();
    (void)reader.IsFloatingPoint();
    (void)reader.GetSurroundModel();
    (void)reader.GetChannelMask();
    (void)reader.GetFormatTag();
    if (reader.HasBroadcastExtension()) (void)reader.GetBroadcastExtension().GetTimeReference();
    if (reader.HasComment())
      TARN_FUZZ_CHECK(static_cast<std::int64_t>(reader.GetComment().size()) <= fileLength);
    if (reader.HasTimeStamp()) (void)reader.GetOriginalTimeStamp();
    if (reader.HasRecIndicator()) {
      const std::int64_t rec = reader.GetOffsetToRecIndicator();
      TARN_FUZZ_CHECK(rec >= 0 && rec < fileLength, rec, fileLength);
      (void)reader.GetRecIndicatorValue();
    }
    const WAVEReader::AcidInfo& acid = reader.GetAcidInfo();
    TARN_FUZZ_CHECK(static_cast<std::int64_t>(acid.mSlicePositions.size()) * 4 <= fileLength,
                    static_cast<std::int64_t>(acid.mSlicePositions.size()), fileLength);
    const std::vector<std::uint8_t> raw = reader.GetRawHeader();
    TARN_FUZZ_CHECK(static_cast<std::int64_t>(raw.size()) == header,
                    static_cast<std::int64_t>(raw.size()), header);
    std::int64_t previous = -1;
    for (const WAVEReader::ChunkLocation& chunk : reader.GetChunks()) {
      TARN_FUZZ_CHECK(chunk.offset > previous && chunk.offset < fileLength, chunk.offset,
                      fileLength);
      TARN_FUZZ_CHECK(chunk.length >= 0, chunk.length);
      previous = chunk.offset;
    }
    // Every later question repeats the first answer.
    TARN_FUZZ_CHECK(reader.GetHeaderSize() == header);
    TARN_FUZZ_CHECK(reader.GetNumberOfFrames() == frames);
  });
  TARN_FUZZ_CHECK(answered == can, answered, can);
}

void CheckAIFFReader(const FileSpecification& spec, std::int64_t fileLength) {
  AIFFReader reader(spec);
  const bool can = reader.CanParse();
  TARN_FUZZ_CHECK(reader.CanParse() == can);
  TARN_FUZZ_CHECK(ProbeAIFFFile(spec) == can);
  TARN_FUZZ_CHECK(ProbeFileOfType(spec, MakeRIFFType("AIFF")) == can);
  const bool answered = Expect({"AIFFReader"}, "AIFFReader", [&] {
    const std::int64_t header = reader.GetHeaderSize();
    const int channels = reader.GetNumberOfChannels();
    const int sampleSize = reader.GetSampleSize();
    const std::int32_t frameSize = reader.GetSampleFrameSize();
    // No channels and samples under 8 bits parse (the "SSND" offset check
    // guards against them): only the product is checked.
    TARN_FUZZ_CHECK(frameSize == channels * sampleSize, frameSize, channels * sampleSize);
    TARN_FUZZ_CHECK(reader.GetNumberOfFrames() >= 0, reader.GetNumberOfFrames());
    TARN_FUZZ_CHECK(header >= 0, header);
    const std::int64_t comm = reader.GetOffsetToCommonChunk();
    const std::int64_t ssnd = reader.GetOffsetToSoundChunk();
    TARN_FUZZ_CHECK(comm >= 12 && comm < fileLength, comm, fileLength);
    TARN_FUZZ_CHECK(ssnd >= 12 && ssnd < fileLength && ssnd + 16 <= header, ssnd, header);
    (void)reader.GetSampleRate();
    (void)reader.GetSampleSizeInBits();
    (void)reader.GetSampleFormat();
    (void)reader.GetSamplesAreLSBFirst();
    (void)reader.GetSurroundModel();
    (void)reader.GetFormType();
    (void)reader.GetCompressionType();
    TARN_FUZZ_CHECK(reader.GetChannelOrder().GetNumChannels() == std::max(channels, 0),
                    reader.GetChannelOrder().GetNumChannels(), channels);
    short root = 0;
    short numerator = 0;
    short denominator = 0;
    if (reader.GetMeterAndPitch(root, numerator, denominator)) TARN_FUZZ_CHECK(root < 127, root);
    (void)reader.GetQuarterNoteTempoBPM();
    std::vector<std::uint8_t> raw;
    reader.GetRawHeader(raw);
    TARN_FUZZ_CHECK(static_cast<std::int64_t>(raw.size()) == std::min(header, fileLength),
                    static_cast<std::int64_t>(raw.size()), header);
    const SoundFileAttributes attributes = reader.GetAttributes();
    TARN_FUZZ_CHECK(attributes.mNumChannels == channels && attributes.mBytesPerFrame == frameSize);
    TARN_FUZZ_CHECK(reader.GetHeaderSize() == header);
  });
  TARN_FUZZ_CHECK(answered == can, answered, can);
}

// The format object of `type`, made by the format cache, asked what a host
// asks: attributes and length, then the metadata through a read-only
// access (bext, acid, strc, smpl, cue and adtl labels for WAVE; INST/MARK
// loops and markers, regn, basc and CHAN for AIFF).
void CheckFormat(const FileSpecification& spec, std::uint32_t type, bool wave, bool readerCan,
                 std::int64_t fileLength) {
  const std::initializer_list<std::string_view> kinds = {WAVEReader::kErrorClass, "AIFFReader",
                                                         "RIFFFileEditor"};
  std::shared_ptr<SoundFileFormat> format;
  if (!Expect(kinds, "GetFormat",
              [&] { format = SoundFileFormatCache::Instance().GetFormat(spec, type); }))
    return;
  TARN_FUZZ_CHECK(format != nullptr);

  const bool answered = Expect(kinds, "format attributes", [&] {
    const SoundFileAttributes a = format->GetFileAttributes();
    const std::int64_t frames = format->GetLengthInFrames().AsLongLong();
    if (wave)
      TARN_FUZZ_CHECK(a.mNumChannels > 0 && a.mBytesPerSample > 0, a.mNumChannels,
                      a.mBytesPerSample);
    TARN_FUZZ_CHECK(a.mBytesPerFrame == a.mNumChannels * a.mBytesPerSample, a.mBytesPerFrame,
                    a.mNumChannels * a.mBytesPerSample);
    TARN_FUZZ_CHECK(frames >= 0, frames);
    if (wave)
      TARN_FUZZ_CHECK(a.mOffsetToAudio + frames * a.mBytesPerFrame <= fileLength,
                      a.mOffsetToAudio + frames * a.mBytesPerFrame, fileLength);
    TARN_FUZZ_CHECK(format->GetChannelOrder().GetNumChannels() == std::max<int>(a.mNumChannels, 0),
                    format->GetChannelOrder().GetNumChannels(), a.mNumChannels);
    (void)format->GetNaturalRate();
    (void)format->GetActualFileType();
    (void)format->IsExtendedFormat();
    (void)format->AudioDataIsZeroLength();
    float tempo = 0;
    SampleCount sync;
    (void)format->HasFileTempoAndSyncPoint(tempo, sync);
    short root = 0;
    short numerator = 0;
    short denominator = 0;
    (void)format->HasFileMeterAndPitch(root, numerator, denominator);
    SampleCount stamp;
    (void)format->HasOriginalTimeStamp(stamp);
    std::vector<std::uint8_t> raw;
    format->GetRawHeader(raw);
    TARN_FUZZ_CHECK(static_cast<std::int64_t>(raw.size()) <= fileLength,
                    static_cast<std::int64_t>(raw.size()), fileLength);
  });
  TARN_FUZZ_CHECK(answered == readerCan, answered, readerCan);

  // The metadata is read whether or not the audio header parses: a host may
  // ask for the markers of a file it cannot play.
  (void)Expect(kinds, "format metadata", [&] {
    const std::shared_ptr<ReadOnlyMetaDataAccess> access = format->GetReadOnlyMetaDataAccess();
    const short loops = format->NumberOfLoops(*access);
    TARN_FUZZ_CHECK(loops >= 0 && loops * 8 <= fileLength, loops, fileLength);
    for (short i = 0; i < std::min<short>(loops, kMaxLoops); ++i) {
      SoundFileFormatLoop loop;
      format->GetFileLoop(*access, i, loop);
      TARN_FUZZ_CHECK(static_cast<std::int64_t>(loop.mName.size()) <= fileLength);
    }
    const std::unique_ptr<SoundFileRegionList> regions = format->GetRegionList(*access);
    TARN_FUZZ_CHECK(regions != nullptr);
    TARN_FUZZ_CHECK(static_cast<std::int64_t>(regions->size()) * 4 <= fileLength,
                    static_cast<std::int64_t>(regions->size()), fileLength);
    for (std::size_t i = 0; i < std::min<std::size_t>(regions->size(), kMaxLoops); ++i)
      TARN_FUZZ_CHECK(static_cast<std::int64_t>((*regions)[i].mName.size()) <= fileLength);
    for (int which = 0; which < 2; ++which) {
      UString text;
      if (format->GetStringFromFile(*access, which, text))
        TARN_FUZZ_CHECK(static_cast<std::int64_t>(text.size()) <= fileLength);
    }
    static constexpr RIFFType kTags[] = {
        MakeRIFFType("bext"), MakeRIFFType("acid"), MakeRIFFType("strc"), MakeRIFFType("smpl"),
        MakeRIFFType("cue "), MakeRIFFType("LIST"), MakeRIFFType("INST"), MakeRIFFType("MARK"),
        MakeRIFFType("regn"), MakeRIFFType("basc"), MakeRIFFType("CHAN"), MakeRIFFType("Rec!"),
    };
    for (const RIFFType tag : kTags) {
      if (!format->HasMetaData(*access, tag)) continue;
      const RCBlobMT blob = format->ReadMetaData(*access, tag);
      TARN_FUZZ_CHECK(static_cast<std::int64_t>(blob.GetSize()) <= fileLength,
                      static_cast<std::int64_t>(blob.GetSize()), fileLength);
    }
  });
}

}  // namespace
}  // namespace tarn

extern "C" int LLVMFuzzerInitialize(int*, char***) {
  __sanitizer_install_malloc_and_free_hooks(tarn::MallocHook, tarn::FreeHook);
  return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace tarn;
  if (size > kMaxInput) return -1;  // -1: not added to the corpus
  Scratch& scratch = GetScratch();
  WriteBytes(scratch.path, data, size);
  const auto fileLength = static_cast<std::int64_t>(size);
  {
    Watch watch;
    const FileSpecification spec(UString(scratch.path.c_str()));
    CheckWAVEReader(spec, fileLength);
    CheckAIFFReader(spec, fileLength);
    CheckFormat(spec, MakeRIFFType("WAVE"), true, WAVEReaderCanParse(spec), fileLength);
    CheckFormat(spec, MakeRIFFType("AIFF"), false, AIFFReaderCanParse(spec), fileLength);
  }
  static const bool trace = std::getenv("FORMAT_FUZZ_TRACE") != nullptr;
  if (trace) std::fprintf(stderr, "largest allocation %zu for %zu bytes\n", gLargest, size);
  TARN_FUZZ_CHECK(gLargest <= size + kAllocationAllowance, static_cast<std::int64_t>(gLargest),
                  fileLength);
  return 0;
}
