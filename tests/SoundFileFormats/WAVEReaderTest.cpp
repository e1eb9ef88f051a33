// WAVEReader on crafted RIFF and Wave64 files: each reading rule at its
// boundary, lying sizes, and the facts of files the writer made.

#include <gtest/gtest.h>

#include <bit>

#include "SoundFileFormats/ChunkFileTestUtil.h"
#include "tarn/Audio/SoundFileFormats/WAVEReader.h"
#include "tarn/Audio/SoundFileFormats/WAVEWriter.h"

namespace tarn::test {
namespace {

Bytes Fmt(std::uint16_t tag, int channels, std::uint32_t rate, int bits) {
  const int block = channels * (bits / 8);
  return Cat({LE(tag, 2), LE(static_cast<std::uint64_t>(channels), 2), LE(rate, 4),
              LE(rate * static_cast<std::uint32_t>(block), 4),
              LE(static_cast<std::uint64_t>(block), 2), LE(static_cast<std::uint64_t>(bits), 2)});
}
Bytes Extensible(int channels, int bits, std::uint16_t subformat, std::size_t size = 40) {
  Bytes b = Cat(
      {Fmt(0xFFFE, channels, 48000, bits), LE(22, 2), LE(static_cast<std::uint64_t>(bits), 2),
       LE(0x3F, 4), LE(subformat, 2),
       Bytes{0x00, 0x00, 0x00, 0x00, 0x10, 0x00, 0x80, 0x00, 0x00, 0xAA, 0x00, 0x38, 0x9B, 0x71}});
  b.resize(size);
  return b;
}

class WAVEReaderFiles : public ::testing::Test {
 protected:
  // A reader on a file holding `chunks` in `container`.
  WAVEReader& Open(const std::vector<ChunkSpec>& chunks, Container c = Container::kRIFF) {
    return OpenBytes(FileImage(chunks, c));
  }
  WAVEReader& OpenBytes(const Bytes& bytes) {
    const auto path = dir_.Path("f" + std::to_string(count_++) + ".wav");
    WriteFile(path, bytes);
    reader_ = std::make_unique<WAVEReader>(SpecOf(path));
    return *reader_;
  }
  TempDir dir_;
  int count_ = 0;
  std::unique_ptr<WAVEReader> reader_;
};

const RIFFType kFmt = MakeRIFFType("fmt ");
const RIFFType kData = MakeRIFFType("data");

TEST_F(WAVEReaderFiles, PlainPCMInBothContainers) {
  for (const Container c : {Container::kRIFF, Container::kWave64}) {
    SCOPED_TRACE(NameOf(c));
    auto& r = Open({{kFmt, Fmt(1, 2, 44100, 16)}, {kData, Pattern(400)}}, c);
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
    const Bytes file = FileImage({{kFmt, Fmt(1, 2, 44100, 16)}, {kData, Pattern(400)}}, c);
    EXPECT_EQ(r.GetRawHeader(), Bytes(file.begin(), file.begin() + r.GetHeaderSize()));
  }
}

struct FormatCase {
  const char* name;
  Bytes fmt;
  bool parses;
  int channels, sampleSize;
  double rate;
  SampleFormat format;
  bool isFloat;
};

TEST_F(WAVEReaderFiles, FormatChunkRules) {
  const FormatCase cases[] = {
      {"8-bit", Fmt(1, 1, 8000, 8), true, 1, 1, 8000, kSamp8Offset, false},
      {"24-bit", Fmt(1, 2, 48000, 24), true, 2, 3, 48000, kSamp24, false},
      {"32-bit int", Fmt(1, 1, 48000, 32), true, 1, 4, 48000, kSampUnpacked24, false},
      {"float", Fmt(3, 2, 48000, 32), true, 2, 4, 48000, kSampFloat32, true},
      {"double", Fmt(3, 1, 48000, 64), true, 1, 8, 48000, kSampWide64B, true},
      {"12 bits truncate", Fmt(1, 1, 8000, 12), true, 1, 1, 8000, kSamp8Offset, false},
      {"negative rate keeps low 16 bits", Fmt(1, 1, 0xFFFFAC44u, 16), true, 1, 2, 44100, kSamp16,
       false},
      {"largest positive rate", Fmt(1, 1, 0x7FFFFFFFu, 16), true, 1, 2, 2147483647.0, kSamp16,
       false},
      {"extensible float", Extensible(6, 32, 3), true, 6, 4, 48000, kSampFloat32, true},
      {"extensible int 32", Extensible(6, 32, 1), true, 6, 4, 48000, kSampUnpacked24, false},
      {"extensible 38 bytes read", Extensible(4, 32, 3, 38), true, 4, 4, 48000, kSampFloat32, true},
      {"extensible 37 bytes not read", Extensible(4, 32, 3, 37), true, 4, 4, 48000, kSampUnpacked24,
       false},
      {"extensible 16 bytes", Extensible(4, 16, 3, 16), true, 4, 2, 48000, kSamp16, false},
      {"ADPCM tag", Fmt(2, 1, 8000, 16), false, 0, 0, 0, kSamp16, false},
      {"mu-law tag", Fmt(7, 1, 8000, 8), false, 0, 0, 0, kSamp16, false},
      {"no channels", Fmt(1, 0, 8000, 16), false, 0, 0, 0, kSamp16, false},
      {"under 8 bits", Fmt(1, 1, 8000, 7), false, 0, 0, 0, kSamp16, false},
      {"15-byte fmt", Bytes(15, 1), false, 0, 0, 0, kSamp16, false},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    auto& r = Open({{kFmt, c.fmt}, {kData, Pattern(48)}});
    ASSERT_EQ(r.CanParse(), c.parses);
    if (!c.parses) {
      const auto error = ErrorOf([&] { (void)r.GetNumberOfFrames(); });
      ASSERT_TRUE(error);
      EXPECT_STREQ(error->GetKind().c_str(), "WAVEReader");
      EXPECT_STREQ(error->GetSystem().c_str(), "WAVEReader");
      EXPECT_STREQ(error->GetSubsystem().c_str(), "WAVEReader");
      continue;
    }
    EXPECT_EQ(r.GetNumberOfChannels(), c.channels);
    EXPECT_EQ(r.GetSampleSize(), c.sampleSize);
    EXPECT_EQ(r.GetSampleRate(), c.rate);
    EXPECT_EQ(r.GetSampleFormat(), c.format);
    EXPECT_EQ(r.IsFloatingPoint(), c.isFloat);
    EXPECT_EQ(r.GetNumberOfFrames(), 48 / (c.channels * c.sampleSize));
    EXPECT_EQ(r.GetSurroundModel(), HostChannelOrder::GuessSurroundModel(c.channels));
  }
}

TEST_F(WAVEReaderFiles, ErrorsNameTheReaderAndTheFault) {
  struct Case {
    const char* name;
    Bytes bytes;
    int code;
  };
  const Case cases[] = {
      {"empty", {}, WAVEReader::kNotAWaveFile},
      {"11 bytes", Bytes(Text("RIFF\4\0\0\0WAV")), WAVEReader::kNotAWaveFile},
      {"FORM", FileImage({{kFmt, Fmt(1, 1, 8000, 16)}, {kData, Bytes(2)}}, Container::kFORM),
       WAVEReader::kNotAWaveFile},
      {"RIFF but AVI ", Cat({Text("RIFF"), LE(4, 4), Text("AVI ")}), WAVEReader::kNotAWaveFile},
      {"no fmt", FileImage({{kData, Bytes(2)}}, Container::kRIFF), WAVEReader::kNoFormatChunk},
      {"no data", FileImage({{kFmt, Fmt(1, 1, 8000, 16)}}, Container::kRIFF),
       WAVEReader::kNoDataChunk},
      {"fmt size past the end",
       FileImage({{kFmt, Fmt(1, 1, 8000, 16), 0x7FFFFFF0}}, Container::kRIFF),
       WAVEReader::kNoFormatChunk},
      {"Wave64 size under 24",
       FileImage({{kFmt, Fmt(1, 1, 8000, 16), std::uint64_t{0} - 24}, {kData, Bytes(2)}},
                 Container::kWave64),
       WAVEReader::kNoFormatChunk},
      {"bad tag", FileImage({{kFmt, Fmt(0x55, 1, 8000, 16)}, {kData, Bytes(2)}}, Container::kRIFF),
       WAVEReader::kUnsupportedFormat},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    auto& r = OpenBytes(c.bytes);
    EXPECT_FALSE(r.CanParse());
    EXPECT_FALSE(r.CanParse());  // the answer is kept
    const auto error = ErrorOf([&] { (void)r.IsWave64(); });
    ASSERT_TRUE(error);
    EXPECT_STREQ(error->GetKind().c_str(), "WAVEReader");
    EXPECT_EQ(error->GetIntErrorCode(), c.code);
  }
  WAVEReader missing(SpecOf(dir_.Path("missing.wav")));
  EXPECT_FALSE(missing.CanParse());
  EXPECT_TRUE(ErrorOf([&] { (void)missing.GetHeaderSize(); }));
}

TEST_F(WAVEReaderFiles, FrameCountIsClampedToTheFile) {
  struct Case {
    std::uint64_t declared;
    std::size_t present;
    int frameSize;
    std::int64_t frames;
  };
  const Case cases[] = {
      {400, 400, 4, 100},  {401, 401, 4, 100},  {398, 400, 4, 99},
      {1000, 400, 4, 100}, {1000, 402, 4, 100}, {0xFFFFFFFF, 403, 4, 100},
      {0, 400, 4, 0},      {7, 7, 1, 7},        {5, 0, 2, 0},
  };
  for (const Container k : {Container::kRIFF, Container::kWave64}) {
    for (const auto& c : cases) {
      SCOPED_TRACE(testing::Message()
                   << NameOf(k) << " declared " << c.declared << " present " << c.present);
      auto& r = Open({{kFmt, Fmt(1, c.frameSize / 2 > 0 ? c.frameSize / 2 : 1, 8000,
                                 c.frameSize == 1 ? 8 : 16)},
                      {kData, Pattern(c.present), c.declared, false}},
                     k);
      ASSERT_TRUE(r.CanParse());
      EXPECT_EQ(r.GetSampleFrameSize(), c.frameSize);
      EXPECT_EQ(r.GetNumberOfFrames(), c.frames);
      EXPECT_EQ(r.GetDataLength(), static_cast<std::int64_t>(c.declared));
    }
  }
}

TEST_F(WAVEReaderFiles, ZeroBytesAfterAnEmptyDataChunkEndTheWalk) {
  for (const Container c : {Container::kRIFF, Container::kWave64}) {
    SCOPED_TRACE(NameOf(c));
    Bytes file = FileImage({{kFmt, Fmt(1, 1, 8000, 16)}, {kData, {}}}, c);
    file.resize(file.size() + (1 << 20));  // a crashed recording of silence
    auto& r = OpenBytes(file);
    ASSERT_TRUE(r.CanParse());
    EXPECT_EQ(r.GetChunks().size(), 2u);
    EXPECT_EQ(r.GetNumberOfFrames(), 0);
  }
  // Thousands of tiny chunks: the walk gives up quietly.
  std::vector<ChunkSpec> many{{kFmt, Fmt(1, 1, 8000, 16)}};
  for (int i = 0; i < 5000; ++i) many.push_back({MakeRIFFType("tiny"), {}});
  many.push_back({kData, Bytes(2)});
  auto& r = Open(many);
  EXPECT_FALSE(r.CanParse());
  EXPECT_EQ(ErrorOf([&] { (void)r.GetHeaderSize(); })->GetIntErrorCode(), WAVEReader::kNoDataChunk);
}

TEST_F(WAVEReaderFiles, MetadataAfterTheAudioIsFoundAndOddAudioIsNotOverCounted) {
  BWFBroadcastWaveExtension bext;
  bext.mDescription = "after";
  auto& r = Open({{kFmt, Fmt(1, 1, 8000, 8)},
                  {kData, Pattern(7)},
                  {MakeRIFFType("LIST"), Text("INFOxxxx")},
                  {MakeRIFFType("bext"), bext.Flatten()}});
  ASSERT_TRUE(r.CanParse());
  EXPECT_EQ(r.GetNumberOfFrames(), 7);
  EXPECT_TRUE(r.HasComment());
  EXPECT_EQ(r.GetComment(), UString("after"));
  ASSERT_EQ(r.GetChunks().size(), 4u);
  EXPECT_EQ(r.GetChunks()[3].offset, 12 + 24 + 16 + 16);
}

TEST_F(WAVEReaderFiles, BroadcastTimeStampUsesTheSignedMultiplier) {
  struct Case {
    std::uint32_t low, high;
    std::int64_t stamp;
  };
  const Case cases[] = {
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
    auto& r = Open(
        {{kFmt, Fmt(1, 1, 8000, 16)}, {MakeRIFFType("bext"), bext.Flatten()}, {kData, Bytes(2)}});
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
    Bytes image = bext.Flatten();
    image.resize(size);
    auto& r = Open({{kFmt, Fmt(1, 1, 8000, 16)}, {MakeRIFFType("bext"), image}, {kData, Bytes(2)}});
    ASSERT_TRUE(r.CanParse());
    EXPECT_TRUE(r.HasComment());
    EXPECT_EQ(r.HasTimeStamp(), size == 346);
    EXPECT_EQ(r.GetOriginalTimeStamp(), size == 346 ? 9 : 0);
  }
}

Bytes Acid(std::uint32_t beats, float tempo, bool long28) {
  Bytes b = Cat({LE(0x1, 4), LE(60, 2), LE(0x8000, 2), LE(0, 4)});
  if (long28) b = Cat({b, LE(0xDEAD, 4)});
  return Cat({b, LE(beats, 4), LE(4, 2), LE(3, 2), LE(std::bit_cast<std::uint32_t>(tempo), 4)});
}

TEST_F(WAVEReaderFiles, AcidTempoFromBeatsAndFrames) {
  struct Case {
    std::uint32_t beats;
    std::size_t frames;
    bool long28;
    float tempo;
  };
  // 8000 Hz, 16-bit mono.
  const Case cases[] = {
      {1, 20, false, 0.0f},                                        // exactly 20 frames per beat
      {1, 21, false, static_cast<float>(8000.0) / 21.0f * 60.0f},  // just above
      {2, 41, false, 8000.0f / 20.5f * 60.0f},                     // 20.5 frames per beat
      {2, 40, false, 0.0f},
      {4, 16000, false, 120.0f},
      {4, 16000, true, 120.0f},
      {0, 16000, false, 0.0f},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(testing::Message()
                 << c.beats << " beats, " << c.frames << " frames, 28 " << c.long28);
    auto& r = Open({{kFmt, Fmt(1, 1, 8000, 16)},
                    {MakeRIFFType("acid"), Acid(c.beats, 99.5f, c.long28)},
                    {kData, Bytes(c.frames * 2)}});
    ASSERT_TRUE(r.CanParse());
    const auto& acid = r.GetAcidInfo();
    ASSERT_TRUE(acid.mPresent);
    EXPECT_EQ(acid.mNumberOfBeats, c.beats);
    EXPECT_EQ(acid.mRootNote, 60);
    EXPECT_EQ(acid.mMeterDenominator, 4);
    EXPECT_EQ(acid.mMeterNumerator, 3);
    EXPECT_EQ(acid.mStoredTempo, 99.5f);
    const float framesPerBeat =
        c.beats == 0 ? 0.0f : static_cast<float>(c.frames) / static_cast<float>(c.beats);
    EXPECT_EQ(acid.mTempo, framesPerBeat > 20.0f ? 8000.0f / framesPerBeat * 60.0f : 0.0f);
    EXPECT_EQ(acid.mTempo > 0.0f, c.tempo > 0.0f);
  }
}

TEST_F(WAVEReaderFiles, StrcSlicesAreBoundedByTheChunk) {
  const auto strc = [](std::uint32_t declared, int entries) {
    Bytes b = Cat({LE(0, 4), LE(declared, 4), Bytes(20)});
    for (int i = 0; i < entries; ++i)
      b = Cat({b, Bytes(24), LE(static_cast<std::uint64_t>(1000 * (i + 1)), 8), LE(0, 4)});
    return b;
  };
  struct Case {
    std::uint32_t declared;
    int entries;
    std::vector<std::int64_t> slices;
  };
  const Case cases[] = {
      {2, 2, {1000, 2000}}, {1, 2, {1000}}, {0xFFFFFFFF, 2, {1000, 2000}}, {5, 0, {}}};
  for (const auto& c : cases) {
    auto& r = Open({{kFmt, Fmt(1, 1, 8000, 16)},
                    {MakeRIFFType("strc"), strc(c.declared, c.entries)},
                    {kData, Bytes(2)}});
    ASSERT_TRUE(r.CanParse());
    EXPECT_TRUE(r.GetAcidInfo().mHasSlices);
    EXPECT_EQ(r.GetAcidInfo().mSlicePositions, c.slices);
  }
}

TEST_F(WAVEReaderFiles, RecordingIndicatorAndWave64SwitchRoom) {
  for (const int channels : {1, 2, 3, 8}) {
    for (const bool rec : {false, true}) {
      SCOPED_TRACE(testing::Message() << channels << " rec " << rec);
      const auto path = dir_.Path("w" + std::to_string(channels) + (rec ? "r" : "") + ".wav");
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
  // Too little room by 8 bytes, or a chunk without a Wave64 identifier
  // before the audio, or a Wave64 file: no switch.
  const auto junked = [](int junk, RIFFType extra) {
    std::vector<ChunkSpec> chunks{{kFmt, Fmt(1, 2, 48000, 16)}, {MakeRIFFType("bext"), Bytes(858)}};
    if (extra != 0) chunks.push_back({extra, Bytes(8)});
    chunks.push_back({MakeRIFFType("JUNK"), Bytes(static_cast<std::size_t>(junk))});
    chunks.push_back({kData, Bytes(40)});
    return chunks;
  };
  EXPECT_TRUE(Open(junked(74, 0)).CanSwitchToWave64());
  EXPECT_FALSE(Open(junked(66, 0)).CanSwitchToWave64());
  // A "LIST" costs 16 bytes more in Wave64; the rest of the room must be
  // nothing or a Wave64 "JUNK" (24 bytes at least).
  EXPECT_FALSE(Open(junked(58, MakeRIFFType("LIST"))).CanSwitchToWave64());
  EXPECT_TRUE(Open(junked(90, MakeRIFFType("LIST"))).CanSwitchToWave64());
  EXPECT_FALSE(Open(junked(98, MakeRIFFType("LIST"))).CanSwitchToWave64());
  EXPECT_TRUE(Open(junked(114, MakeRIFFType("LIST"))).CanSwitchToWave64());
  EXPECT_FALSE(Open(junked(115, MakeRIFFType("LIST"))).CanSwitchToWave64());  // audio not 8-aligned
  EXPECT_FALSE(Open(junked(58, MakeRIFFType("cue "))).CanSwitchToWave64());
  EXPECT_FALSE(Open(junked(74, 0), Container::kWave64).CanSwitchToWave64());
}

}  // namespace
}  // namespace tarn::test
