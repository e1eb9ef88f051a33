// WAVEReader and AIFFReader on crafted files: each reading rule at its
// boundary ("fmt " and "COMM" encodings, the "SSND" offset, clamped frame
// counts, pad bytes, "bext", "acid", "strc", "basc", "CHAN"), files the
// fuzzer found, and damaged files (refused, truncated at every length, every
// byte changed) that must give a clear error or a sane answer, never a crash.

#include <gtest/gtest.h>

#include <bit>
#include <memory>
#include <string>
#include <vector>

#include "SoundFileFormats/ChunkFileTestUtil.h"
#include "tarn/Audio/SoundFileFormats/AIFFReader.h"
#include "tarn/Audio/SoundFileFormats/WAVEReader.h"
#include "tarn/Audio/SoundFileFormats/WAVESoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/WAVEWriter.h"

namespace tarn::test {
namespace {

constexpr RIFFType kFmt = T("fmt "), kData = T("data"), kAIFF = T("AIFF"), kAIFC = T("AIFC");

Bytes Fmt(std::uint16_t tag, int channels, std::uint32_t rate, int bits) {
  const auto block = static_cast<std::uint64_t>(channels * (bits / 8));
  return Cat({LE(tag, 2), LE(static_cast<std::uint64_t>(channels), 2), LE(rate, 4),
              LE(rate * block, 4), LE(block, 2), LE(static_cast<std::uint64_t>(bits), 2)});
}
Bytes Extensible(int channels, int bits, std::uint16_t subformat, std::size_t size = 40) {
  Bytes b = Cat({Fmt(0xFFFE, channels, 48000, bits), LE(22, 2),
                 LE(static_cast<std::uint64_t>(bits), 2), LE(0x3F, 4), LE(subformat, 2),
                 Bytes{0, 0, 0, 0, 0x10, 0, 0x80, 0, 0, 0xAA, 0, 0x38, 0x9B, 0x71}});
  b.resize(size);
  return b;
}

// Readers on files written to a scratch folder, each under a new name.
class Readers : public ::testing::Test {
 protected:
  FileSpecification Put(const Bytes& bytes) {
    const auto path = dir_.Path("f" + std::to_string(count_++));
    WriteFile(path, bytes);
    return SpecOf(path);
  }
  WAVEReader& Wave(const Bytes& bytes) {
    wave_ = std::make_unique<WAVEReader>(Put(bytes));
    return *wave_;
  }
  WAVEReader& Wave(const std::vector<ChunkSpec>& chunks, Container c = Container::kRIFF) {
    return Wave(FileImage(chunks, c));
  }
  AIFFReader& Aiff(const Bytes& bytes) {
    aiff_ = std::make_unique<AIFFReader>(Put(bytes));
    return *aiff_;
  }
  AIFFReader& Aiff(RIFFType form, const std::vector<ChunkSpec>& chunks) {
    return Aiff(FormImage(form, chunks));
  }
  TempDir dir_;
  int count_ = 0;
  std::unique_ptr<WAVEReader> wave_;
  std::unique_ptr<AIFFReader> aiff_;
};

// A refused file: CanParse says so every time, and every query throws the
// reader's error with `code`.
template <typename Reader>
void ExpectRefused(Reader& r, const char* kind, int code) {
  EXPECT_FALSE(r.CanParse());
  EXPECT_FALSE(r.CanParse());
  const auto error = ErrorOf([&] { (void)r.GetHeaderSize(); });
  ASSERT_TRUE(error);
  EXPECT_STREQ(error->GetKind().c_str(), kind);
  EXPECT_STREQ(error->GetSystem().c_str(), kind);
  EXPECT_STREQ(error->GetSubsystem().c_str(), kind);
  EXPECT_EQ(error->GetIntErrorCode(), code);
  EXPECT_TRUE(ErrorOf([&] { (void)r.GetNumberOfFrames(); }));
}

TEST_F(Readers, RefuseOtherContainersAndDamagedFiles) {
  const Bytes fmt = Fmt(1, 1, 8000, 16), comm = Comm(1, 1, 16, 8000);
  const Bytes aiff = FormImage(kAIFF, {{T("COMM"), comm}, {T("SSND"), Ssnd(0, Pattern(2))}});
  Bytes riffAiff = aiff;
  std::copy_n("RIFF", 4, riffAiff.begin());
  using W = WAVEReader;
  const struct {
    const char* name;
    bool wave;
    Bytes bytes;
    int code;
  } cases[] = {
      {"empty", true, {}, W::kNotAWaveFile},
      {"11 bytes", true, Text("RIFF\4\0\0\0WAV"), W::kNotAWaveFile},
      {"FORM", true, FileImage({{kFmt, fmt}, {kData, Bytes(2)}}, Container::kFORM),
       W::kNotAWaveFile},
      {"RIFF but AVI ", true, Cat({Text("RIFF"), LE(4, 4), Text("AVI ")}), W::kNotAWaveFile},
      {"no fmt", true, FileImage({{kData, Bytes(2)}}, Container::kRIFF), W::kNoFormatChunk},
      {"no data", true, FileImage({{kFmt, fmt}}, Container::kRIFF), W::kNoDataChunk},
      {"fmt size past the end", true, FileImage({{kFmt, fmt, 0x7FFFFFF0}}, Container::kRIFF),
       W::kNoFormatChunk},
      {"Wave64 size under 24", true,
       FileImage({{kFmt, fmt, std::uint64_t{0} - 24}, {kData, Bytes(2)}}, Container::kWave64),
       W::kNoFormatChunk},
      {"bad tag", true,
       FileImage({{kFmt, Fmt(0x55, 1, 8000, 16)}, {kData, Bytes(2)}}, Container::kRIFF),
       W::kUnsupportedFormat},
      {"empty", false, {}, 0},
      {"eleven bytes", false, Slice(aiff, 0, 11), 0},
      {"RIFF", false, riffAiff, 0},
      {"form type WAVE", false, FormImage(T("WAVE"), {{T("COMM"), comm}, {T("SSND"), Ssnd(0, {})}}),
       0},
      {"form type aiff", false, FormImage(T("aiff"), {{T("COMM"), comm}, {T("SSND"), Ssnd(0, {})}}),
       0},
      {"no COMM", false, FormImage(kAIFF, {{T("SSND"), Ssnd(0, Pattern(2))}}), 0},
      {"no SSND", false, FormImage(kAIFF, {{T("COMM"), comm}}), 0},
      {"COMM of 17 bytes", false,
       FormImage(kAIFF, {{T("COMM"), Slice(comm, 0, 17)}, {T("SSND"), Ssnd(0, {})}}), 0},
      {"AIFC COMM without compression", false,
       FormImage(kAIFC, {{T("COMM"), comm}, {T("SSND"), Ssnd(0, {})}}), 0},
      {"SSND without its fields", false,
       FormImage(kAIFF, {{T("COMM"), comm}, {T("SSND"), Bytes(4)}}), 0},
      {"a huge chunk before COMM", false,
       FormImage(
           kAIFF,
           {{T("ANNO"), Pattern(4), 0xFFFFFFF0}, {T("COMM"), comm}, {T("SSND"), Ssnd(0, {})}}),
       0},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    if (c.wave)
      ExpectRefused(Wave(c.bytes), "WAVEReader", c.code);
    else
      ExpectRefused(Aiff(c.bytes), "AIFFReader", c.code);
  }
  WAVEReader missingWave(SpecOf(dir_.Path("missing.wav")));
  AIFFReader missingAiff(SpecOf(dir_.Path("missing.aif")));
  EXPECT_FALSE(missingWave.CanParse());
  EXPECT_FALSE(missingAiff.CanParse());
  EXPECT_TRUE(ErrorOf([&] { (void)missingWave.GetHeaderSize(); }));
  EXPECT_TRUE(ErrorOf([&] { (void)missingAiff.GetSampleRate(); }));
}

// Every prefix of a file either parses to the same facts or fails cleanly;
// every single byte changed to 0x00 or 0xFF gives an answer or an error.
TEST_F(Readers, TruncatedAndCorruptedFilesNeverCrash) {
  BWFBroadcastWaveExtension bext;
  bext.mDescription = "cut";
  const Bytes wave =
      FileImage({{kFmt, Extensible(6, 32, 3)},
                 {T("bext"), bext.Flatten()},
                 {T("acid"), Cat({LE(1, 4), LE(60, 2), LE(0, 6), LE(4, 4), Bytes(8)})},
                 {kData, Pattern(96)},
                 {T("LIST"), Text("INFOxxxx")}},
                Container::kRIFF);
  Bytes basc(18);
  basc[17] = 1;
  const Bytes aiff =
      FormImage(kAIFC, {{T("FVER"), Pattern(4)},
                        {T("COMM"), Comm(6, 4, 24, 96000, T("NONE"))},
                        {T("basc"), basc},
                        {T("CHAN"), Cat({BE(0, 4), BE(0, 4), BE(1, 4), BE(1, 4), Bytes(16)})},
                        {T("SSND"), Ssnd(0, Pattern(72))}});
  // The WAVE audio starts after the "data" header; the AIFF one 16 bytes
  // into "SSND".
  const std::size_t waveAudio = wave.size() - 16 - 96;
  const std::size_t aiffAudio = FindFormChunk(aiff, T("SSND")) + 16;
  for (std::size_t n = 0; n <= wave.size(); ++n) {
    WAVEReader& r = Wave(Slice(wave, 0, n));
    ASSERT_EQ(r.CanParse(), n >= waveAudio) << n;
    if (r.CanParse()) {
      EXPECT_EQ(r.GetNumberOfFrames(),
                static_cast<std::int64_t>(std::min(n - waveAudio, std::size_t{96}) / 24))
          << n;
      EXPECT_EQ(r.GetHeaderSize(), static_cast<std::int64_t>(waveAudio));
    }
  }
  for (std::size_t n = 0; n <= aiff.size(); ++n) {
    AIFFReader& r = Aiff(Slice(aiff, 0, n));
    ASSERT_EQ(r.CanParse(), n >= aiffAudio) << n;
    if (r.CanParse()) {
      EXPECT_EQ(r.GetNumberOfFrames(), 4);
      EXPECT_EQ(r.GetHeaderSize(), static_cast<std::int64_t>(aiffAudio));
    }
  }
  for (const bool isWave : {true, false}) {
    const Bytes& image = isWave ? wave : aiff;
    for (std::size_t i = 0; i < image.size(); ++i) {
      for (std::uint8_t value : {std::uint8_t{0}, std::uint8_t{0xFF}}) {
        Bytes bad = image;
        bad[i] = value;
        if (isWave) {
          WAVEReader& r = Wave(bad);
          if (!r.CanParse()) continue;
          EXPECT_LE(static_cast<std::size_t>(r.GetRawHeader().size()), bad.size());
          EXPECT_LE(r.GetNumberOfFrames() * r.GetSampleFrameSize(),
                    static_cast<std::int64_t>(bad.size()));
          (void)r.GetChannelMask(), (void)r.GetAcidInfo(), (void)r.GetComment();
        } else {
          AIFFReader& r = Aiff(bad);
          if (!r.CanParse()) continue;
          std::vector<std::uint8_t> header;
          r.GetRawHeader(header);
          EXPECT_LE(header.size(), bad.size());
          (void)r.GetChannelOrder(), (void)r.GetQuarterNoteTempoBPM();
        }
      }
    }
  }
}

// ------------------------------------------------------------------ WAVE

TEST_F(Readers, WavePlainPCMInBothContainers) {
  for (const Container c : {Container::kRIFF, Container::kWave64}) {
    SCOPED_TRACE(NameOf(c));
    const Bytes file = FileImage({{kFmt, Fmt(1, 2, 44100, 16)}, {kData, Pattern(400)}}, c);
    auto& r = Wave(file);
    ASSERT_TRUE(r.CanParse());
    EXPECT_EQ(r.IsWave64(), IsWave64(c));
    EXPECT_EQ(r.GetNumberOfChannels(), 2);
    EXPECT_EQ(r.GetSampleRate(), 44100.0);
    EXPECT_EQ(r.GetSampleSize(), 2);
    EXPECT_EQ(r.GetSampleFrameSize(), 4);
    EXPECT_EQ(r.GetSampleFormat(), kSamp16);
    EXPECT_EQ(r.GetNumberOfFrames(), 100);
    EXPECT_EQ(r.GetSurroundModel(), SurroundModel::kStereo);
    const std::int64_t dataHeader = IsWave64(c) ? 40 + 24 + 16 : 12 + 8 + 16;
    EXPECT_EQ(r.GetOffsetToAudioHeader(), dataHeader);
    EXPECT_EQ(r.GetHeaderSize(), dataHeader + HeaderSizeOf(c));
    EXPECT_FALSE(r.HasComment());
    EXPECT_FALSE(r.HasTimeStamp());
    EXPECT_FALSE(r.HasRecIndicator());
    EXPECT_FALSE(r.GetAcidInfo().mPresent);
    EXPECT_FALSE(r.CanSwitchToWave64());  // too little room
    EXPECT_EQ(r.GetRawHeader(), Slice(file, 0, static_cast<std::size_t>(r.GetHeaderSize())));
  }
}

TEST_F(Readers, WaveFormatChunkRules) {
  const struct {
    const char* name;
    Bytes fmt;
    int channels, sampleSize;  // 0 channels: refused
    double rate;
    SampleFormat format;
    bool isFloat;
  } cases[] = {
      {"8-bit", Fmt(1, 1, 8000, 8), 1, 1, 8000, kSamp8Offset, false},
      {"24-bit", Fmt(1, 2, 48000, 24), 2, 3, 48000, kSamp24, false},
      {"32-bit int", Fmt(1, 1, 48000, 32), 1, 4, 48000, kSampUnpacked24, false},
      {"float", Fmt(3, 2, 48000, 32), 2, 4, 48000, kSampFloat32, true},
      {"double", Fmt(3, 1, 48000, 64), 1, 8, 48000, kSampWide64B, true},
      {"12 bits truncate", Fmt(1, 1, 8000, 12), 1, 1, 8000, kSamp8Offset, false},
      {"negative rate keeps low 16 bits", Fmt(1, 1, 0xFFFFAC44u, 16), 1, 2, 44100, kSamp16, false},
      {"largest positive rate", Fmt(1, 1, 0x7FFFFFFFu, 16), 1, 2, 2147483647.0, kSamp16, false},
      {"extensible float", Extensible(6, 32, 3), 6, 4, 48000, kSampFloat32, true},
      {"extensible int 32", Extensible(6, 32, 1), 6, 4, 48000, kSampUnpacked24, false},
      {"extensible 38 bytes read", Extensible(4, 32, 3, 38), 4, 4, 48000, kSampFloat32, true},
      {"extensible 37 bytes not read", Extensible(4, 32, 3, 37), 4, 4, 48000, kSampUnpacked24,
       false},
      {"extensible 16 bytes", Extensible(4, 16, 3, 16), 4, 2, 48000, kSamp16, false},
      {"ADPCM tag", Fmt(2, 1, 8000, 16), 0, 0, 0, kSamp16, false},
      {"mu-law tag", Fmt(7, 1, 8000, 8), 0, 0, 0, kSamp16, false},
      {"no channels", Fmt(1, 0, 8000, 16), 0, 0, 0, kSamp16, false},
      {"under 8 bits", Fmt(1, 1, 8000, 7), 0, 0, 0, kSamp16, false},
      {"15-byte fmt", Bytes(15, 1), 0, 0, 0, kSamp16, false},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    auto& r = Wave({{kFmt, c.fmt}, {kData, Pattern(48)}});
    if (c.channels == 0) {
      ExpectRefused(
          r, "WAVEReader",
          c.fmt.size() < 16 ? WAVEReader::kNoFormatChunk : WAVEReader::kUnsupportedFormat);
      continue;
    }
    ASSERT_TRUE(r.CanParse());
    EXPECT_EQ(r.GetNumberOfChannels(), c.channels);
    EXPECT_EQ(r.GetSampleSize(), c.sampleSize);
    EXPECT_EQ(r.GetSampleRate(), c.rate);
    EXPECT_EQ(r.GetSampleFormat(), c.format);
    EXPECT_EQ(r.IsFloatingPoint(), c.isFloat);
    EXPECT_EQ(r.GetNumberOfFrames(), 48 / (c.channels * c.sampleSize));
    EXPECT_EQ(r.GetSurroundModel(), HostChannelOrder::GuessSurroundModel(c.channels));
  }
}

// The fuzzer's file: 0xBB02 = 47874 channels, which the attributes (16
// signed bits) once reported as -17662 next to a 95748-byte frame; and the
// boundary in both containers: 32767 channels read, 32768 and above do not.
TEST_F(Readers, WaveChannelCountBeyondSixteenSignedBitsIsUnsupported) {
  Bytes found = FileImage(
      {{kFmt, Cat({LE(1, 2), LE(0xBB02, 2), LE(0x80, 4), LE(192000, 4), LE(4, 2), LE(16, 2)})},
       {T("acid"), Cat({LE(1, 4), LE(60, 4), Bytes(16, 0)})},
       {kData, Cat({LE(0x00640000, 4), LE(0x012C00C8, 4), LE(0x01F40190, 4), LE(0x02BC0258, 4)})},
       {T("LIST"), Cat({Text("INFOINAM"), LE(5, 4), Text("Loop"), Bytes(2, 0)})}},
      Container::kRIFF);
  ASSERT_EQ(found.size(), 118u);
  found[4] = 0xDA;  // the container size as found: 100 bytes past the end
  ExpectRefused(Wave(found), WAVEReader::kErrorClass, WAVEReader::kUnsupportedFormat);
  ExpectError([&] { (void)WAVESoundFileFormat(Put(found)).GetFileAttributes(); },
              WAVEReader::kErrorClass, WAVEReader::kUnsupportedFormat);

  for (const Container c : {Container::kRIFF, Container::kWave64}) {
    for (const std::uint32_t channels : {1u, 0x7FFEu, 0x7FFFu, 0x8000u, 0xBB02u, 0xFFFFu}) {
      SCOPED_TRACE(std::string(NameOf(c)) + " " + std::to_string(channels));
      const auto block = static_cast<std::uint16_t>(channels * 2);
      const FileSpecification spec =
          Put(FileImage({{kFmt, Cat({LE(1, 2), LE(channels, 2), LE(8000, 4), LE(8000u * block, 4),
                                     LE(block, 2), LE(16, 2)})},
                         {kData, Pattern(channels * 4)}},
                        c));
      WAVEReader reader(spec);
      WAVESoundFileFormat format(spec);
      if (channels > static_cast<std::uint32_t>(WAVEReader::kMaxChannels)) {
        EXPECT_FALSE(reader.CanParse());
        EXPECT_EQ(CodeOf([&] { (void)format.GetFileAttributes(); }),
                  WAVEReader::kUnsupportedFormat);
        continue;
      }
      ASSERT_TRUE(reader.CanParse());
      EXPECT_EQ(reader.GetNumberOfChannels(), static_cast<int>(channels));
      EXPECT_EQ(reader.GetNumberOfFrames(), 2);
      const SoundFileAttributes a = format.GetFileAttributes();
      EXPECT_EQ(a.mNumChannels, static_cast<int>(channels));
      EXPECT_EQ(a.mBytesPerSample, 2);
      EXPECT_EQ(a.mBytesPerFrame, a.mNumChannels * a.mBytesPerSample);
      EXPECT_EQ(format.GetLengthInFrames(), SampleCount(2));
    }
  }
}

TEST_F(Readers, WaveFrameCountIsClampedToTheFile) {
  const struct {
    std::uint64_t declared;
    std::size_t present;
    int frameSize;
    std::int64_t frames;
  } cases[] = {
      {400, 400, 4, 100},  {401, 401, 4, 100},  {398, 400, 4, 99},
      {1000, 400, 4, 100}, {1000, 402, 4, 100}, {0xFFFFFFFF, 403, 4, 100},
      {0, 400, 4, 0},      {7, 7, 1, 7},        {5, 0, 2, 0},
  };
  for (const Container k : {Container::kRIFF, Container::kWave64}) {
    for (const auto& c : cases) {
      SCOPED_TRACE(testing::Message()
                   << NameOf(k) << " declared " << c.declared << " present " << c.present);
      auto& r = Wave({{kFmt, Fmt(1, std::max(c.frameSize / 2, 1), 8000, c.frameSize == 1 ? 8 : 16)},
                      {kData, Pattern(c.present), c.declared, false}},
                     k);
      ASSERT_TRUE(r.CanParse());
      EXPECT_EQ(r.GetSampleFrameSize(), c.frameSize);
      EXPECT_EQ(r.GetNumberOfFrames(), c.frames);
      EXPECT_EQ(r.GetDataLength(), static_cast<std::int64_t>(c.declared));
    }
  }
}

TEST_F(Readers, WaveWalkEndsAtZeroFillAndGivesUpOnThousandsOfChunks) {
  for (const Container c : {Container::kRIFF, Container::kWave64}) {
    SCOPED_TRACE(NameOf(c));
    Bytes file = FileImage({{kFmt, Fmt(1, 1, 8000, 16)}, {kData, {}}}, c);
    file.resize(file.size() + (1 << 20));  // a crashed recording of silence
    auto& r = Wave(file);
    ASSERT_TRUE(r.CanParse());
    EXPECT_EQ(r.GetChunks().size(), 2u);
    EXPECT_EQ(r.GetNumberOfFrames(), 0);
  }
  std::vector<ChunkSpec> many{{kFmt, Fmt(1, 1, 8000, 16)}};
  for (int i = 0; i < 5000; ++i) many.push_back({T("tiny"), {}});
  many.push_back({kData, Bytes(2)});
  ExpectRefused(Wave(many), "WAVEReader", WAVEReader::kNoDataChunk);
}

TEST_F(Readers, WaveMetadataAfterTheAudioIsFoundAndOddAudioIsNotOverCounted) {
  BWFBroadcastWaveExtension bext;
  bext.mDescription = "after";
  auto& r = Wave({{kFmt, Fmt(1, 1, 8000, 8)},
                  {kData, Pattern(7)},
                  {T("LIST"), Text("INFOxxxx")},
                  {T("bext"), bext.Flatten()}});
  ASSERT_TRUE(r.CanParse());
  EXPECT_EQ(r.GetNumberOfFrames(), 7);
  EXPECT_TRUE(r.HasComment());
  EXPECT_EQ(r.GetComment(), UString("after"));
  ASSERT_EQ(r.GetChunks().size(), 4u);
  EXPECT_EQ(r.GetChunks()[3].offset, 12 + 24 + 16 + 16);
}

TEST_F(Readers, WaveBroadcastTimeStampUsesTheSignedMultiplier) {
  const struct {
    std::uint32_t low, high;
    std::int64_t stamp;
  } cases[] = {
      {0, 0, 0},
      {5, 0, 5},
      {0x7FFFFFFF, 0, 0x7FFFFFFF},
      {0, 1, 0x7FFFFFFF},
      {5, 2, 2 * std::int64_t{0x7FFFFFFF} + 5},
      {0xFFFFFFFF, 0, -1},                         // low reads as signed
      {0, 0xFFFFFFFF, -std::int64_t{0x7FFFFFFF}},  // so does high
      {0x80000000, 1, 0x7FFFFFFF - std::int64_t{0x80000000}},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(testing::Message() << c.low << " " << c.high);
    BWFBroadcastWaveExtension bext;
    bext.mTimeReferenceLow = c.low;
    bext.mTimeReferenceHigh = c.high;
    auto& r = Wave({{kFmt, Fmt(1, 1, 8000, 16)}, {T("bext"), bext.Flatten()}, {kData, Bytes(2)}});
    ASSERT_TRUE(r.CanParse());
    EXPECT_TRUE(r.HasTimeStamp());
    EXPECT_FALSE(r.HasComment());
    EXPECT_EQ(r.GetOriginalTimeStamp(), c.stamp);
    if (c.stamp >= 0) {
      std::uint32_t low = 0, high = 0;
      WAVEReader::ReferenceFromTimeStamp(c.stamp, low, high);
      EXPECT_EQ(WAVEReader::TimeStampFromReference(static_cast<std::int32_t>(low),
                                                   static_cast<std::int32_t>(high)),
                c.stamp);
    }
  }
  // A "bext" too short for the time reference has no time stamp.
  for (const std::size_t size : {345u, 346u}) {
    BWFBroadcastWaveExtension bext;
    bext.mDescription = "short";
    bext.mTimeReferenceLow = 9;
    auto& r = Wave({{kFmt, Fmt(1, 1, 8000, 16)},
                    {T("bext"), Slice(bext.Flatten(), 0, size)},
                    {kData, Bytes(2)}});
    ASSERT_TRUE(r.CanParse());
    EXPECT_TRUE(r.HasComment());
    EXPECT_EQ(r.HasTimeStamp(), size == 346);
    EXPECT_EQ(r.GetOriginalTimeStamp(), size == 346 ? 9 : 0);
  }
}

TEST_F(Readers, WaveAcidTempoFromBeatsAndFramesAndStrcSlicesBoundedByTheChunk) {
  const struct {
    std::uint32_t beats;
    std::size_t frames;  // 8000 Hz, 16-bit mono
    bool long28;
  } cases[] = {
      {1, 20, false},  // exactly 20 frames per beat: no tempo
      {1, 21, false},  // just above
      {2, 41, false},  // 20.5 frames per beat
      {2, 40, false}, {4, 16000, false}, {4, 16000, true}, {0, 16000, false},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(testing::Message()
                 << c.beats << " beats, " << c.frames << " frames, 28 " << c.long28);
    Bytes acid = Cat({LE(0x1, 4), LE(60, 2), LE(0x8000, 2), LE(0, 4)});
    if (c.long28) acid = Cat({acid, LE(0xDEAD, 4)});
    acid =
        Cat({acid, LE(c.beats, 4), LE(4, 2), LE(3, 2), LE(std::bit_cast<std::uint32_t>(99.5f), 4)});
    auto& r = Wave({{kFmt, Fmt(1, 1, 8000, 16)}, {T("acid"), acid}, {kData, Bytes(c.frames * 2)}});
    ASSERT_TRUE(r.CanParse());
    const auto& info = r.GetAcidInfo();
    ASSERT_TRUE(info.mPresent);
    EXPECT_EQ(info.mNumberOfBeats, c.beats);
    EXPECT_EQ(info.mRootNote, 60);
    EXPECT_EQ(info.mMeterDenominator, 4);
    EXPECT_EQ(info.mMeterNumerator, 3);
    EXPECT_EQ(info.mStoredTempo, 99.5f);
    const float perBeat =
        c.beats == 0 ? 0.0f : static_cast<float>(c.frames) / static_cast<float>(c.beats);
    EXPECT_EQ(info.mTempo, perBeat > 20.0f ? 8000.0f / perBeat * 60.0f : 0.0f);
  }
  const struct {
    std::uint32_t declared;
    int entries;
    std::vector<std::int64_t> slices;
  } strcs[] = {{2, 2, {1000, 2000}}, {1, 2, {1000}}, {0xFFFFFFFF, 2, {1000, 2000}}, {5, 0, {}}};
  for (const auto& c : strcs) {
    Bytes strc = Cat({LE(0, 4), LE(c.declared, 4), Bytes(20)});
    for (int i = 0; i < c.entries; ++i)
      strc = Cat({strc, Bytes(24), LE(static_cast<std::uint64_t>(1000 * (i + 1)), 8), LE(0, 4)});
    auto& r = Wave({{kFmt, Fmt(1, 1, 8000, 16)}, {T("strc"), strc}, {kData, Bytes(2)}});
    ASSERT_TRUE(r.CanParse());
    EXPECT_TRUE(r.GetAcidInfo().mHasSlices);
    EXPECT_EQ(r.GetAcidInfo().mSlicePositions, c.slices);
  }
}

TEST_F(Readers, WaveRecordingIndicatorAndWave64SwitchRoom) {
  for (const int channels : {1, 2, 3, 8}) {
    for (const bool rec : {false, true}) {
      SCOPED_TRACE(testing::Message() << channels << " rec " << rec);
      const auto path = dir_.Path("w" + std::to_string(channels) + (rec ? "r" : ""));
      {
        WAVEWriter writer(SpecOf(path), 48000.0, 2, static_cast<std::int16_t>(channels), 0,
                          static_cast<std::int16_t>(2 * channels), kSamp16, rec, false);
        writer.WriteHeader(0xCAFE, 10);
        const Bytes audio(static_cast<std::size_t>(20 * channels), 0);
        writer.GetStream().PutRawDataToStream(audio.data(), static_cast<int>(audio.size()));
      }
      WAVEReader r(SpecOf(path));
      ASSERT_TRUE(r.CanParse());
      EXPECT_EQ(r.GetNumberOfFrames(), 10);
      EXPECT_EQ(r.GetHeaderSize(), WAVEWriter::GetHeaderSizeNeededForWave64Switch(rec, channels));
      EXPECT_EQ(r.HasRecIndicator(), rec);
      if (rec) {
        EXPECT_EQ(r.GetOffsetToRecIndicator(), (channels <= 2 ? 16 + 8 : 40 + 8) + 12 + 866);
        EXPECT_EQ(r.GetRecIndicatorValue(), 0xCAFEu);
      }
      EXPECT_TRUE(r.CanSwitchToWave64());
      EXPECT_EQ(r.GetChannelMask(),
                channels > 2 ? HostChannelOrder::ForChannelCount(channels).GetChannelMask() : 0u);
    }
  }
  // Too little room by 8 bytes, a chunk without a Wave64 identifier before
  // the audio, audio not 8-aligned, or a Wave64 file: no switch. A "LIST"
  // costs 16 bytes more in Wave64; the rest of the room must be nothing or
  // a Wave64 "JUNK" (24 bytes at least).
  const struct {
    int junk;
    RIFFType extra;
    bool can;
    Container c = Container::kRIFF;
  } rooms[] = {{74, 0, true},           {66, 0, false},         {58, T("LIST"), false},
               {90, T("LIST"), true},   {98, T("LIST"), false}, {114, T("LIST"), true},
               {115, T("LIST"), false}, {58, T("cue "), false}, {74, 0, false, Container::kWave64}};
  for (const auto& room : rooms) {
    std::vector<ChunkSpec> chunks{{kFmt, Fmt(1, 2, 48000, 16)}, {T("bext"), Bytes(858)}};
    if (room.extra != 0) chunks.push_back({room.extra, Bytes(8)});
    chunks.push_back({T("JUNK"), Bytes(static_cast<std::size_t>(room.junk))});
    chunks.push_back({kData, Bytes(40)});
    EXPECT_EQ(Wave(chunks, room.c).CanSwitchToWave64(), room.can) << room.junk;
  }
}

// ------------------------------------------------------------------ AIFF

const struct Encoding {
  RIFFType form;
  RIFFType compression;  // 0: none written (AIFF)
  std::int16_t bits;
  bool parses;
  SampleFormat format = kSamp16;
  std::int16_t bytes = 0;
  bool lsbFirst = false;
} kEncodings[] = {
    {kAIFF, 0, 8, true, kSamp8, 1},
    {kAIFF, 0, 12, true, kSamp8, 1},  // 12 / 8 = 1 byte
    {kAIFF, 0, 16, true, kSamp16, 2},
    {kAIFF, 0, 20, true, kSamp16, 2},
    {kAIFF, 0, 24, true, kSamp24, 3},
    {kAIFF, 0, 32, true, kSampUnpacked24, 4},
    {kAIFF, 0, 64, true, kSampWide64A, 8},
    {kAIFF, 0, 7, false},
    {kAIFF, 0, 40, false},
    {kAIFF, 0, 48, false},
    {kAIFF, 0, -16, false},
    {kAIFC, T("NONE"), 8, true, kSamp8, 1},
    {kAIFC, T("NONE"), 16, true, kSamp16, 2},
    {kAIFC, T("NONE"), 24, true, kSamp24, 3},
    {kAIFC, T("NONE"), 32, true, kSampUnpacked24, 4},
    {kAIFC, T("NONE"), 64, true, kSampWide64A, 8},
    {kAIFC, T("NONE"), 40, false},
    {kAIFC, T("sowt"), 16, true, kSamp16, 2, true},
    {kAIFC, T("sowt"), 24, true, kSamp16, 3, true},  // still 16-bit, deliberately
    {kAIFC, T("sowt"), 32, true, kSamp16, 4, true},
    {kAIFC, T("sowt"), 8, true, kSamp16, 1, true},
    {kAIFC, T("twos"), 16, true, kSamp16, 2},
    {kAIFC, T("twos"), 24, true, kSamp16, 3},
    {kAIFC, T("in24"), 24, true, kSamp24, 3},
    {kAIFC, T("in32"), 32, true, kSampUnpacked24, 4},
    {kAIFC, T("fl32"), 32, true, kSampFloat32, 4},
    {kAIFC, T("FL32"), 32, true, kSampFloat32, 4},  // libsndfile's spelling
    {kAIFC, T("FL64"), 64, true, kSampWide64B, 8},
    {kAIFC, T("Fl32"), 32, false},
    {kAIFC, T("42n1"), 24, false},  // libsndfile's little-endian 24-bit
    {kAIFC, T("fl64"), 64, true, kSampWide64B, 8},
    {kAIFC, T("ulaw"), 8, false},
    {kAIFC, T("ima4"), 16, false},
    {kAIFC, T("SOWT"), 16, false},
};

TEST_F(Readers, AiffCommonChunkEncodings) {
  for (const Encoding& e : kEncodings) {
    SCOPED_TRACE(RIFFTypeToString(e.form) + " " + RIFFTypeToString(e.compression) + " " +
                 std::to_string(e.bits));
    const std::int16_t channels = 3;
    const Bytes audio = Pattern(static_cast<std::size_t>(channels * 5 * std::max<int>(e.bytes, 1)));
    auto& r = Aiff(e.form, {{T("COMM"), Comm(channels, 5, e.bits, 44100, e.compression)},
                            {T("SSND"), Ssnd(0, audio)}});
    if (!e.parses) {
      ExpectRefused(r, "AIFFReader", 0);
      continue;
    }
    ASSERT_TRUE(r.CanParse());
    EXPECT_EQ(r.GetSampleFormat(), e.format);
    EXPECT_EQ(r.GetSampleSize(), e.bytes);
    EXPECT_EQ(r.GetSampleSizeInBits(), e.bits);
    EXPECT_EQ(r.GetSampleFrameSize(), channels * e.bytes);
    EXPECT_EQ(r.GetSamplesAreLSBFirst(), e.lsbFirst);
    EXPECT_EQ(r.GetNumberOfChannels(), channels);
    EXPECT_EQ(r.GetNumberOfFrames(), 5);
    EXPECT_EQ(r.GetSampleRate(), 44100.0);
    EXPECT_EQ(r.GetFormType(), e.form);
    EXPECT_EQ(r.GetCompressionType(), e.compression == 0 ? T("NONE") : e.compression);
    const std::int64_t ssnd = e.form == kAIFF ? 12 + 8 + 18 : 12 + 8 + 24;
    EXPECT_EQ(r.GetOffsetToSoundChunk(), ssnd);
    EXPECT_EQ(r.GetHeaderSize(), ssnd + 16);
    EXPECT_EQ(r.GetSurroundModel(), SurroundModel::kLCR);
    const SoundFileAttributes a = r.GetAttributes();
    EXPECT_EQ(a.mFileType, e.form);
    EXPECT_EQ(a.mSampleFormat, e.format);
    EXPECT_EQ(a.mBytesPerFrame, channels * e.bytes);
    EXPECT_EQ(a.mOffsetToAudio, ssnd + 16);
    EXPECT_EQ(a.mSamplesAreLSBFirst, e.lsbFirst);
  }
  for (int bits = -2; bits <= 72; ++bits) {
    const int bytes = bits / 8;
    EXPECT_EQ(Aiff(kAIFF, {{T("COMM"), Comm(1, 0, static_cast<std::int16_t>(bits), 8000)},
                           {T("SSND"), Ssnd(0, {})}})
                  .CanParse(),
              bytes == 1 || bytes == 2 || bytes == 3 || bytes == 4 || bytes == 8)
        << bits;
  }
}

// The offset is used exactly when (chunk size - 8 - offset) / frame size
// still covers the "COMM" frame count.
TEST_F(Readers, AiffSoundOffsetIsUsedOnlyWhenTheFramesFit) {
  const struct {
    const char* what;
    std::int16_t channels, bits;
    std::uint32_t frames;
    std::uint32_t offset;  // field value
    std::uint32_t filler;  // bytes between the fields and the audio
    std::size_t audio;     // audio bytes in the chunk
    bool used;
  } cases[] = {
      {"exact fit", 2, 16, 10, 6, 6, 40, true},
      {"one sample short", 2, 16, 10, 6, 6, 38, false},
      // An odd size is rounded up to even first, so its pad byte counts.
      {"one byte short, pad byte counted", 2, 16, 10, 6, 6, 39, true},
      {"one frame short", 2, 16, 10, 6, 6, 36, false},
      {"room to spare", 2, 16, 10, 6, 6, 45, true},
      {"zero offset", 2, 16, 10, 0, 0, 40, true},
      {"offset past the chunk", 1, 8, 0, 20, 10, 0, false},
      {"offset at the chunk end, no frames", 1, 8, 0, 10, 10, 0, true},
      {"negative offset", 1, 8, 1, 0x80000000, 0, 4, false},
      {"no channels", 0, 16, 0, 4, 4, 0, false},
      {"no bytes per sample", 1, 4, 0, 4, 4, 0, false},  // 4 bits: 0 bytes, AIFC "sowt"
      {"24-bit frames", 3, 24, 3, 5, 5, 27, true},
      {"24-bit frames, two bytes short", 3, 24, 3, 5, 5, 25, false},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.what);
    auto& r =
        Aiff(c.bits == 4 ? kAIFC : kAIFF,
             {{T("COMM"), Comm(c.channels, c.frames, c.bits, 8000, c.bits == 4 ? T("sowt") : 0)},
              {T("SSND"), Ssnd(c.offset, Pattern(c.audio), c.filler)}});
    ASSERT_TRUE(r.CanParse());
    const std::int64_t start = r.GetOffsetToSoundChunk() + 16;
    EXPECT_EQ(r.GetHeaderSize(), c.used ? start + c.offset : start);
  }
  // A sound chunk without a size, or one past the end, holds no frames.
  for (std::uint32_t size : {0u, 0x7FFFFFFFu, 0xFFFFFFFFu}) {
    auto& r =
        Aiff(kAIFF, {{T("COMM"), Comm(2, 0, 16, 48000)}, {T("SSND"), Ssnd(0, Pattern(400)), size}});
    ASSERT_TRUE(r.CanParse()) << size;
    EXPECT_EQ(r.GetHeaderSize(), 12 + 26 + 16);
    EXPECT_EQ(r.GetNumberOfFrames(), 0);
  }
}

TEST_F(Readers, AiffChunksInAnyOrderOddOnesWithTheirPadByteAndTheRawHeader) {
  auto& r = Aiff(kAIFF, {{T("ANNO"), Text("hello")},
                         {T("SSND"), Ssnd(4, Pattern(8), 4)},
                         {T("ID3 "), Pattern(7)},
                         {T("COMM"), Comm(2, 2, 16, 22050)},
                         {T("MARK"), Pattern(3)}});
  ASSERT_TRUE(r.CanParse());
  EXPECT_EQ(r.GetOffsetToSoundChunk(), 26);  // ANNO: 8 + 5 + pad 1 = 14 bytes from 12
  EXPECT_EQ(r.GetHeaderSize(), 26 + 16 + 4);
  EXPECT_EQ(r.GetSampleRate(), 22050.0);

  const Bytes rest =
      FormImage(kAIFF, {{T("COMM"), Comm(1, 3, 8, 8000)}, {T("SSND"), Ssnd(0, Pattern(3))}});
  for (std::size_t odd : {1u, 3u, 5u, 255u}) {
    SCOPED_TRACE(odd);
    // The pad byte holds 'C' so that a walk that forgets it lands on "COMM"
    // shifted by one and finds no "COMM"; without the pad byte the chunks
    // after it are out of step.
    const Bytes unpadded = Cat({FormImage(kAIFF, {{T("APPL"), Pattern(odd), std::nullopt, false}}),
                                Slice(rest, 12, rest.size())});
    Bytes padded = unpadded;
    padded.insert(padded.begin() + static_cast<std::ptrdiff_t>(20 + odd), 'C');
    auto& good = Aiff(padded);
    ASSERT_TRUE(good.CanParse());
    EXPECT_EQ(good.GetOffsetToCommonChunk(), static_cast<std::int64_t>(12 + 8 + odd + 1));
    EXPECT_EQ(good.GetNumberOfFrames(), 3);
    EXPECT_FALSE(Aiff(unpadded).CanParse());
  }

  const Bytes image = FormImage(kAIFC, {{T("FVER"), Pattern(4)},
                                        {T("COMM"), Comm(2, 3, 16, 44100, T("sowt"))},
                                        {T("SSND"), Ssnd(2, Pattern(12), 2)}});
  auto& raw = Aiff(image);
  std::vector<std::uint8_t> header;
  raw.GetRawHeader(header);
  EXPECT_EQ(raw.GetHeaderSize(), 12 + 12 + 8 + 24 + 16 + 2);
  EXPECT_EQ(header, Slice(image, 0, static_cast<std::size_t>(raw.GetHeaderSize())));
}

TEST_F(Readers, AiffLoopBasics) {
  const struct {
    std::int16_t root, loopType;
    std::uint32_t beats, frames;
    double rate;
    short expectedRoot;
    double tempo;
  } cases[] = {
      {60, 1, 4, 88200, 44100, 60, 120.0},
      {126, 1, 8, 96000, 48000, 126, 240.0},
      {127, 1, 3, 44100, 44100, 60, 180.0},
      {300, 0, 4, 88200, 44100, 60, 0.0},  // one-shot: no tempo
      {-3, 2, 4, 88200, 44100, -3, 0.0},
      {48, 1, 0, 88200, 44100, 48, 0.0},  // no beats
      {48, 1, 4, 0, 44100, 48, 0.0},      // no frames
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.root);
    // version, beats, root, scale, numerator, denominator, loop type, and
    // the rest of the usual chunk.
    const Bytes basc =
        Cat({BE(1, 4), BE(c.beats, 4), BE(static_cast<std::uint16_t>(c.root), 2), BE(1, 2),
             BE(6, 2), BE(8, 2), BE(static_cast<std::uint16_t>(c.loopType), 2), Bytes(84 - 18)});
    auto& r = Aiff(
        kAIFF,
        {{T("COMM"), Comm(1, c.frames, 16, c.rate)}, {T("basc"), basc}, {T("SSND"), Ssnd(0, {})}});
    short root = 0, num = 0, den = 0;
    ASSERT_TRUE(r.GetMeterAndPitch(root, num, den));
    EXPECT_EQ(root, c.expectedRoot);
    EXPECT_EQ(num, 6);
    EXPECT_EQ(den, 8);
    EXPECT_DOUBLE_EQ(r.GetQuarterNoteTempoBPM(), c.tempo);
  }
  // No "basc", or one too short for its fields: nothing.
  for (const std::size_t size : {0u, 17u}) {
    std::vector<ChunkSpec> chunks{{T("COMM"), Comm(1, 10, 16, 8000)}, {T("SSND"), Ssnd(0, {})}};
    if (size != 0) chunks.push_back({T("basc"), Pattern(size)});
    auto& r = Aiff(kAIFF, chunks);
    short root = 1, num = 1, den = 1;
    EXPECT_FALSE(r.GetMeterAndPitch(root, num, den));
    EXPECT_EQ(root, 1);
    EXPECT_EQ(r.GetQuarterNoteTempoBPM(), 0.0);
  }
}

Bytes Chan(std::uint32_t tag, std::uint32_t bitmap, const std::vector<std::uint32_t>& labels,
           std::uint32_t count) {
  Bytes out = Cat({BE(tag, 4), BE(bitmap, 4), BE(count, 4)});
  for (std::uint32_t label : labels) out = Cat({out, BE(label, 4), Bytes(16)});
  return out;
}

TEST_F(Readers, AiffChannelLayouts) {
  using L = ChannelLabel;
  const struct {
    const char* what;
    std::int16_t channels;
    Bytes chan;
    std::vector<L> expected;  // empty: the default order
  } cases[] = {
      {"descriptions",
       6,
       Chan(0, 0, {3, 1, 2, 4, 5, 6}, 6),
       {L::kCenter, L::kLeft, L::kRight, L::kLFE, L::kLeftSurround, L::kRightSurround}},
      {"bitmap",
       4,
       Chan(1u << 16, 0x1 | 0x2 | 0x10 | 0x20, {}, 0),
       {L::kLeft, L::kRight, L::kLeftSurround, L::kRightSurround}},
      {"5.1 A",
       6,
       Chan(121u << 16 | 6, 0, {}, 0),
       {L::kLeft, L::kRight, L::kCenter, L::kLFE, L::kLeftSurround, L::kRightSurround}},
      {"5.1 C",
       6,
       Chan(123u << 16 | 6, 0, {}, 0),
       {L::kLeft, L::kCenter, L::kRight, L::kLeftSurround, L::kRightSurround, L::kLFE}},
      {"stereo", 2, Chan(101u << 16 | 2, 0, {}, 0), {L::kLeft, L::kRight}},
      {"discrete in order",
       3,
       Chan(147u << 16 | 3, 0, {}, 0),
       {L::kDiscrete, L::kDiscrete, L::kDiscrete}},
      {"unknown labels", 2, Chan(0, 0, {400, 0xFFFFFFFF}, 2), {L::kDiscrete, L::kDiscrete}},
      {"count differs from COMM", 6, Chan(101u << 16 | 2, 0, {}, 0), {}},
      {"lying description count", 2, Chan(0, 0, {1, 2}, 1000000), {}},
      {"too short", 2, Bytes(8), {}},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.what);
    auto& r = Aiff(kAIFF, {{T("COMM"), Comm(c.channels, 0, 16, 8000)},
                           {T("CHAN"), c.chan},
                           {T("SSND"), Ssnd(0, {})}});
    const HostChannelOrder order = r.GetChannelOrder();
    EXPECT_EQ(order.GetLabels(), c.expected.empty()
                                     ? HostChannelOrder::ForChannelCount(c.channels).GetLabels()
                                     : c.expected);
    EXPECT_EQ(order.GetSurroundModel(), HostChannelOrder::GuessSurroundModel(c.channels));
    EXPECT_EQ(r.GetSurroundModel(), order.GetSurroundModel());
  }
}

}  // namespace
}  // namespace tarn::test
