// The header of new WAVE and Wave64 recordings, byte by byte, and the
// broadcast extension's byte image.

#include <gtest/gtest.h>

#include <cstring>

#include "SoundFileFormats/ChunkFileTestUtil.h"
#include "tarn/Audio/SoundFileFormats/BWFBroadcastWaveExtension.h"
#include "tarn/Audio/SoundFileFormats/WAVEWriter.h"
#include "tarn/Streams/CFileStream.h"

namespace tarn::test {
namespace {

// The worked offsets: "data" header in RIFF and Wave64, junk, audio.
static_assert(WAVEWriter::ComputeStandardOffsetToSoundDataHeader(false, false, true, 2) == 984);
static_assert(WAVEWriter::ComputeStandardOffsetToSoundDataHeader(false, true, true, 2) == 968);
static_assert(WAVEWriter::ComputeWave64ReserveJunkLength(false, 1) == 74);
static_assert(WAVEWriter::ComputeStandardOffsetToSoundDataHeader(false, false, true, 3) == 1008);
static_assert(WAVEWriter::ComputeStandardOffsetToSoundDataHeader(false, true, true, 8) == 992);
static_assert(WAVEWriter::GetHeaderSizeNeededForWave64Switch(false, 2) == 992);
static_assert(WAVEWriter::GetHeaderSizeNeededForWave64Switch(false, 6) == 1016);

struct OffsetCase {
  bool rec;
  int channels;
  std::int64_t riffData, wave64Data, junk, audio;
};

TEST(WAVEWriterLayout, AudioStartsAtTheSameByteInBothForms) {
  const OffsetCase cases[] = {
      {false, 1, 984, 968, 74, 992},   {false, 2, 984, 968, 74, 992},
      {false, 3, 1008, 992, 74, 1016}, {false, 8, 1008, 992, 74, 1016},
      {true, 2, 1016, 1000, 94, 1024}, {true, 6, 1040, 1024, 94, 1048},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(testing::Message() << "rec " << c.rec << " channels " << c.channels);
    EXPECT_EQ(WAVEWriter::ComputeStandardOffsetToSoundDataHeader(c.rec, false, true, c.channels),
              c.riffData);
    EXPECT_EQ(WAVEWriter::ComputeStandardOffsetToSoundDataHeader(c.rec, true, true, c.channels),
              c.wave64Data);
    EXPECT_EQ(WAVEWriter::ComputeWave64ReserveJunkLength(c.rec, c.channels), c.junk);
    EXPECT_EQ(c.riffData + 8, c.audio);
    EXPECT_EQ(c.wave64Data + 24, c.audio);
    EXPECT_EQ(WAVEWriter::GetHeaderSizeNeededForWave64Switch(c.rec, c.channels), c.audio);
  }
}

const Bytes kPCMGuidTail = {0x00, 0x00, 0x00, 0x00, 0x10, 0x00, 0x80,
                            0x00, 0x00, 0xAA, 0x00, 0x38, 0x9B, 0x71};

struct FormatCase {
  int channels, bytesPerSample;
  SampleFormat format;
  double rate;
  Bytes expected;
};

TEST(WAVEWriterLayout, FormatChunkPayloads) {
  const FormatCase cases[] = {
      {2, 2, kSamp16, 44100.0,
       Cat({LE(1, 2), LE(2, 2), LE(44100, 4), LE(176400, 4), LE(4, 2), LE(16, 2)})},
      {1, 3, kSamp24, 48000.0,
       Cat({LE(1, 2), LE(1, 2), LE(48000, 4), LE(144000, 4), LE(3, 2), LE(24, 2)})},
      {2, 4, kSampFloat32, 96000.0,
       Cat({LE(3, 2), LE(2, 2), LE(96000, 4), LE(768000, 4), LE(8, 2), LE(32, 2)})},
      {1, 1, kSamp8Offset, 22050.7,  // the rate truncates
       Cat({LE(1, 2), LE(1, 2), LE(22050, 4), LE(22050, 4), LE(1, 2), LE(8, 2)})},
      {6, 3, kSamp24, 48000.0,
       Cat({LE(0xFFFE, 2), LE(6, 2), LE(48000, 4), LE(864000, 4), LE(18, 2), LE(24, 2), LE(22, 2),
            LE(24, 2), LE(0x3F, 4), LE(1, 2), kPCMGuidTail})},
      {3, 4, kSamp16, 44100.0,  // 32-bit integer needs the extensible form
       Cat({LE(0xFFFE, 2), LE(3, 2), LE(44100, 4), LE(529200, 4), LE(12, 2), LE(32, 2), LE(22, 2),
            LE(32, 2), LE(0x7, 4), LE(1, 2), kPCMGuidTail})},
      {8, 4, kSampFloat32, 48000.0,
       Cat({LE(0xFFFE, 2), LE(8, 2), LE(48000, 4), LE(1536000, 4), LE(32, 2), LE(32, 2), LE(22, 2),
            LE(32, 2), LE(0x63F, 4), LE(3, 2), kPCMGuidTail})},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(testing::Message() << c.channels << " x " << c.bytesPerSample);
    EXPECT_EQ(WAVEWriter::MakeFormatChunkPayload(
                  c.rate, static_cast<std::int16_t>(c.bytesPerSample),
                  static_cast<std::int16_t>(c.channels),
                  static_cast<std::int16_t>(c.bytesPerSample * c.channels), c.format),
              c.expected);
  }
}

BWFBroadcastWaveExtension FixedBext() {
  BWFBroadcastWaveExtension bext;
  bext.mDescription = "Take 1";
  bext.mOriginator = "Tarn";
  bext.mOriginationDate = "2026-11-24";
  bext.mOriginationTime = "01:02:03";
  bext.mVersion = 1;
  return bext;
}

struct HeaderCase {
  bool wave64, rec;
  int channels, bytesPerSample;
  std::int64_t frames;
};

// The whole header, built here chunk by chunk from the published layout.
Bytes ExpectedHeader(const HeaderCase& c) {
  const Container k = c.wave64 ? Container::kWave64 : Container::kRIFF;
  const int frameSize = c.channels * c.bytesPerSample;
  const SampleFormat format =
      c.bytesPerSample == 4 ? kSampFloat32 : NormalSampleFormatForSize(c.bytesPerSample);
  Bytes body = Cat(
      {ChunkImage({MakeRIFFType("fmt "), WAVEWriter::MakeFormatChunkPayload(
                                             48000.0, static_cast<std::int16_t>(c.bytesPerSample),
                                             static_cast<std::int16_t>(c.channels),
                                             static_cast<std::int16_t>(frameSize), format)},
                  k),
       ChunkImage({MakeRIFFType("bext"), FixedBext().Flatten()}, k)});
  if (c.rec) {
    Bytes value = LE(0x12345678, 4);
    if (c.wave64) value = Cat({value, value});
    body = Cat({body, ChunkImage({MakeRIFFType("Rec!"), value, 4 + 0u}, k)});
  }
  if (!c.wave64) {
    const int junk = c.rec ? 94 : 74;
    body =
        Cat({body, ChunkImage({MakeRIFFType("JUNK"), Bytes(static_cast<std::size_t>(junk))}, k)});
  }
  const std::uint64_t dataLength = static_cast<std::uint64_t>(c.frames) * frameSize;
  Bytes dataHeader;
  PutTag(dataHeader, MakeRIFFType("data"), k);
  PutSize(dataHeader, dataLength + (c.wave64 ? 24 : 0), k);
  Bytes out;
  PutTag(out, MakeRIFFType("RIFF"), k);
  const std::uint64_t audio = (c.wave64 ? 16 + 24 : 4 + 8) + body.size() + dataHeader.size();
  PutSize(out, c.wave64 ? audio + dataLength : audio + dataLength - 8, k);
  PutTag(out, MakeRIFFType("WAVE"), k);
  return Cat({out, body, dataHeader});
}

TEST(WAVEWriterFile, HeaderImages) {
  const HeaderCase cases[] = {
      {false, false, 2, 2, 1000}, {true, false, 2, 2, 1000}, {false, false, 1, 3, 7},
      {false, false, 6, 3, 100},  {true, false, 6, 3, 100},  {false, true, 2, 4, 5},
      {true, true, 2, 4, 5},      {true, true, 8, 4, 0},     {false, false, 1, 1, 3},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(testing::Message() << "w64 " << c.wave64 << " rec " << c.rec << " ch "
                                    << c.channels << " bps " << c.bytesPerSample);
    TempDir dir;
    const auto path = dir.Path("new.wav");
    const int frameSize = c.channels * c.bytesPerSample;
    const SampleFormat format =
        c.bytesPerSample == 4 ? kSampFloat32 : NormalSampleFormatForSize(c.bytesPerSample);
    std::int64_t audioOffset = 0;
    {
      WAVEWriter writer(SpecOf(path), 48000.0, static_cast<std::int16_t>(c.bytesPerSample),
                        static_cast<std::int16_t>(c.channels), 0,
                        static_cast<std::int16_t>(frameSize), format, c.rec, c.wave64);
      writer.SetBroadcastExtension(FixedBext());
      writer.WriteHeader(0x12345678, c.frames);
      audioOffset = writer.GetStream().Position();
      EXPECT_EQ(audioOffset, writer.GetOffsetToAudio());
      writer.Close();
    }
    const Bytes expected = ExpectedHeader(c);
    EXPECT_EQ(audioOffset, static_cast<std::int64_t>(expected.size()));
    EXPECT_EQ(ReadFile(path), expected);
  }
}

TEST(WAVEWriterFile, UpdateDataLengthRewritesOnlyTheSizesAndPadsTheAudio) {
  for (const bool wave64 : {false, true}) {
    SCOPED_TRACE(wave64);
    TempDir dir;
    const auto path = dir.Path("grow.wav");
    WAVEWriter writer(SpecOf(path), 44100.0, 1, 1, 0, 1, kSamp8Offset, false, wave64);
    writer.SetBroadcastExtension(FixedBext());
    writer.WriteHeader(0, 0);
    const Bytes audio = Pattern(13);
    writer.GetStream().PutRawDataToStream(audio.data(), static_cast<int>(audio.size()));
    writer.UpdateDataLength(13);
    writer.MaybePadChunk();
    writer.Close();
    const Bytes file = ReadFile(path);
    ASSERT_EQ(file.size(), wave64 ? 992u + 13 : 992u + 14);
    EXPECT_EQ(Bytes(file.begin() + 992, file.begin() + 1005), audio);
    EXPECT_TRUE(std::all_of(file.begin() + 1005, file.end(), [](auto b) { return b == 0; }));
    if (wave64) {
      EXPECT_EQ(Bytes(file.begin() + 16, file.begin() + 24), LE(992 + 13, 8));
      EXPECT_EQ(Bytes(file.begin() + 968 + 16, file.begin() + 992), LE(13 + 24, 8));
    } else {
      EXPECT_EQ(Bytes(file.begin() + 4, file.begin() + 8), LE(992 + 13 - 8, 4));
      EXPECT_EQ(Bytes(file.begin() + 984, file.begin() + 992), Cat({Text("data"), LE(13, 4)}));
    }
    // The file's end padded to the mode's unit (before a chunk goes behind).
    {
      WAVEWriter again(SpecOf(path), 44100.0, 1, 1, 13, 1, kSamp8Offset, false, wave64);
      again.MaybePadTrailingChunk();
      again.Close();
    }
    EXPECT_EQ(ReadFile(path).size(), wave64 ? 992u + 16 : 992u + 14);
  }
}

TEST(WAVEWriterFile, JunkAndRecordingIndicatorChunks) {
  TempDir dir;
  const auto path = dir.Path("chunks.w64");
  WriteFile(path, Bytes(64, 0xEE));
  WAVEWriter writer(SpecOf(path), 8000.0, 2, 1, 0, 2, kSamp16, true, true);
  writer.WriteJunkChunk(0, 5);
  writer.WriteRecordingIndicatorChunk(32, 0xAABBCCDD);
  writer.Close();
  const Bytes file = ReadFile(path);
  Bytes junk;
  PutTag(junk, MakeRIFFType("JUNK"), Container::kWave64);
  EXPECT_EQ(Bytes(file.begin(), file.begin() + 16), junk);
  EXPECT_EQ(Bytes(file.begin() + 16, file.begin() + 32), Cat({LE(29, 8), Bytes(8)}));
  Bytes rec;
  PutTag(rec, MakeRIFFType("Rec!"), Container::kWave64);
  EXPECT_EQ(Bytes(file.begin() + 32, file.begin() + 64),
            Cat({rec, LE(28, 8), LE(0xAABBCCDD, 4), LE(0xAABBCCDD, 4)}));
}

TEST(BWFBroadcastWaveExtension, ByteImageRoundTrip) {
  BWFBroadcastWaveExtension bext = FixedBext();
  bext.mOriginatorReference = std::string(40, 'R');  // cut to 32
  bext.mTimeReferenceLow = 0x89ABCDEF;
  bext.mTimeReferenceHigh = 0x01234567;
  bext.mVersion = 2;
  for (int i = 0; i < 64; ++i) bext.mUMID[i] = static_cast<std::uint8_t>(i + 1);
  bext.mLoudnessValue = -2300;
  bext.mLoudnessRange = 500;
  bext.mMaxTruePeakLevel = -100;
  bext.mMaxMomentaryLoudness = -1800;
  bext.mMaxShortTermLoudness = 0x7FFF;
  bext.mCodingHistory = "A=PCM,F=48000,W=24,M=mono,T=x\r\n";
  const auto image = bext.Flatten();
  ASSERT_EQ(image.size(), 858u);
  EXPECT_EQ(std::memcmp(image.data(), "Take 1\0", 7), 0);
  EXPECT_EQ(std::memcmp(image.data() + 256, "Tarn\0", 5), 0);
  EXPECT_EQ(std::memcmp(image.data() + 320, "2026-11-2401:02:03", 18), 0);
  EXPECT_EQ(Bytes(image.begin() + 338, image.begin() + 348),
            Cat({LE(0x89ABCDEF, 4), LE(0x01234567, 4), LE(2, 2)}));
  EXPECT_EQ(image[348], 1);
  EXPECT_EQ(image[411], 64);
  EXPECT_EQ(Bytes(image.begin() + 412, image.begin() + 422),
            Cat({LE(0xF704, 2), LE(500, 2), LE(0xFF9C, 2), LE(0xF8F8, 2), LE(0x7FFF, 2)}));
  EXPECT_TRUE(std::all_of(image.begin() + 422, image.begin() + 602, [](auto b) { return b == 0; }));
  EXPECT_EQ(std::memcmp(image.data() + 602, bext.mCodingHistory.data(), bext.mCodingHistory.size()),
            0);

  const auto back = BWFBroadcastWaveExtension::Parse(image.data(), image.size());
  BWFBroadcastWaveExtension cut = bext;
  cut.mOriginatorReference.resize(32);
  EXPECT_EQ(back, cut);
  EXPECT_EQ(back.GetTimeReference(), 0x0123456789ABCDEFull);

  // A long coding history makes the image longer than the default.
  bext.mCodingHistory = std::string(300, 'h');
  EXPECT_EQ(bext.Flatten().size(), 902u);
  EXPECT_EQ(BWFBroadcastWaveExtension::Parse(bext.Flatten().data(), 902).mCodingHistory,
            bext.mCodingHistory);
}

TEST(BWFBroadcastWaveExtension, ShortImagesKeepDefaultsForWhatIsMissing) {
  const auto full = [] {
    BWFBroadcastWaveExtension b = FixedBext();
    b.mTimeReferenceLow = 77;
    b.mVersion = 2;
    b.mLoudnessValue = 5;
    b.mMaxShortTermLoudness = 9;
    return b.Flatten();
  }();
  for (std::size_t size = 0; size <= 604; ++size) {
    const auto bext = BWFBroadcastWaveExtension::Parse(full.data(), size);
    EXPECT_EQ(bext.mDescription, size == 0 ? "" : std::string("Take 1").substr(0, size));
    EXPECT_EQ(bext.mTimeReferenceLow, size >= 346 ? 77u : 0u);
    EXPECT_EQ(bext.mVersion, size >= 348 ? 2 : 0);
    EXPECT_EQ(bext.mLoudnessValue, size >= 414 ? 5 : 0);
    EXPECT_EQ(bext.mMaxShortTermLoudness, size >= 422 ? 9 : 0);
    EXPECT_TRUE(bext.mCodingHistory.empty());
  }
  EXPECT_EQ(BWFBroadcastWaveExtension::Parse(nullptr, 100), BWFBroadcastWaveExtension());
}

TEST(BWFBroadcastWaveExtension, NewRecordingDescribesTheFile) {
  SoundFileAttributes attributes;
  attributes.mNumChannels = 2;
  attributes.mSampleRate = 48000.0;
  attributes.mSampleFormat = kSamp24;
  attributes.mBytesPerSample = 3;
  const auto bext = BWFBroadcastWaveExtension::ForNewRecording(attributes);
  EXPECT_EQ(bext.mOriginator, "TarnCore");
  EXPECT_EQ(bext.mVersion, 1);
  EXPECT_EQ(bext.mCodingHistory, "A=PCM,F=48000,W=24,M=stereo,T=TarnCore\r\n");
  ASSERT_EQ(bext.mOriginationDate.size(), 10u);
  EXPECT_EQ(bext.mOriginationDate[4], '-');
  EXPECT_EQ(bext.mOriginationDate[7], '-');
  ASSERT_EQ(bext.mOriginationTime.size(), 8u);
  EXPECT_EQ(bext.mOriginationTime[2], ':');
  EXPECT_EQ(bext.Flatten().size(), 858u);
}

}  // namespace
}  // namespace tarn::test
