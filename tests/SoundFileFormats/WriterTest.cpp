// WAVEWriter and AIFFWriter: the exact bytes of new WAVE, Wave64, AIFF and
// AIFC headers, the size fields after the audio grows (nothing else
// touched), the pad bytes after odd audio, what they refuse, every encoding
// and channel count read back; and the broadcast extension's byte image.

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <string>

#include "SoundFileFormats/ChunkFileTestUtil.h"
#include "tarn/Audio/SoundFileFormats/AIFFReader.h"
#include "tarn/Audio/SoundFileFormats/AIFFWriter.h"
#include "tarn/Audio/SoundFileFormats/BWFBroadcastWaveExtension.h"
#include "tarn/Audio/SoundFileFormats/WAVEWriter.h"

namespace tarn::test {
namespace {

bool AllZero(const Bytes& b, std::size_t from, std::size_t to) {
  return std::all_of(b.begin() + static_cast<std::ptrdiff_t>(from),
                     b.begin() + static_cast<std::ptrdiff_t>(to), [](auto x) { return x == 0; });
}

// ------------------------------------------------------------------ WAVE

// The usable offsets are compile-time facts.
static_assert(WAVEWriter::GetHeaderSizeNeededForWave64Switch(false, 2) == 992);

TEST(WAVEWriter, AudioStartsAtTheSameByteInBothForms) {
  const struct {
    bool rec;
    int channels;
    std::int64_t riffData, wave64Data, junk, audio;
  } cases[] = {
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
  for (std::int64_t n = 0; n < 64; ++n) {
    EXPECT_EQ(WAVEWriter::PadDataLength(n, false), n % 2 ? n + 1 : n);
    EXPECT_EQ(WAVEWriter::PadDataLength(n, true), (n + 7) / 8 * 8);
  }
  EXPECT_EQ(WAVEWriter::PadDataLength(0xFFFFFFFF, false), 0x100000000);
  EXPECT_EQ(WAVEWriter::PadDataLength(0x7FFFFFFFFFFFFFF1, true), 0x7FFFFFFFFFFFFFF8);
  EXPECT_EQ(WAVEWriter::GetRIFFChunkExtraSize(false), 4);
  EXPECT_EQ(WAVEWriter::GetRIFFChunkExtraSize(true), 16);
  EXPECT_EQ(WAVEWriter::GetChunkHeaderSize(true), 24);
}

TEST(WAVEWriter, FormatChunkPayloads) {
  const Bytes guidTail = {0, 0, 0, 0, 0x10, 0, 0x80, 0, 0, 0xAA, 0, 0x38, 0x9B, 0x71};
  const auto plain = [](int tag, int ch, int rate, int bytesPerSec, int block, int bits) {
    return Cat({LE(tag, 2), LE(ch, 2), LE(rate, 4), LE(bytesPerSec, 4), LE(block, 2), LE(bits, 2)});
  };
  const struct {
    int channels, bytesPerSample;
    SampleFormat format;
    double rate;
    Bytes expected;
  } cases[] = {
      {2, 2, kSamp16, 44100.0, plain(1, 2, 44100, 176400, 4, 16)},
      {1, 3, kSamp24, 48000.0, plain(1, 1, 48000, 144000, 3, 24)},
      {2, 4, kSampFloat32, 96000.0, plain(3, 2, 96000, 768000, 8, 32)},
      {1, 1, kSamp8Offset, 22050.7, plain(1, 1, 22050, 22050, 1, 8)},  // the rate truncates
      {6, 3, kSamp24, 48000.0,
       Cat({plain(0xFFFE, 6, 48000, 864000, 18, 24), LE(22, 2), LE(24, 2), LE(0x3F, 4), LE(1, 2),
            guidTail})},
      {3, 4, kSamp16, 44100.0,  // 32-bit integer needs the extensible form
       Cat({plain(0xFFFE, 3, 44100, 529200, 12, 32), LE(22, 2), LE(32, 2), LE(0x7, 4), LE(1, 2),
            guidTail})},
      {8, 4, kSampFloat32, 48000.0,
       Cat({plain(0xFFFE, 8, 48000, 1536000, 32, 32), LE(22, 2), LE(32, 2), LE(0x63F, 4), LE(3, 2),
            guidTail})},
  };
  for (const auto& c : cases) {
    EXPECT_EQ(WAVEWriter::MakeFormatChunkPayload(
                  c.rate, static_cast<std::int16_t>(c.bytesPerSample),
                  static_cast<std::int16_t>(c.channels),
                  static_cast<std::int16_t>(c.bytesPerSample * c.channels), c.format),
              c.expected)
        << c.channels << " x " << c.bytesPerSample;
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

// Every header, against one built here chunk by chunk from the published
// layout: "fmt ", "bext", "Rec!" if recording, "JUNK" in RIFF, "data".
TEST(WAVEWriter, HeaderImages) {
  const struct {
    bool wave64, rec;
    int channels, bytesPerSample;
    std::int64_t frames;
  } cases[] = {
      {false, false, 2, 2, 1000}, {true, false, 2, 2, 1000}, {false, false, 1, 3, 7},
      {false, false, 6, 3, 100},  {true, false, 6, 3, 100},  {false, true, 2, 4, 5},
      {true, true, 2, 4, 5},      {true, true, 8, 4, 0},     {false, false, 1, 1, 3},
  };
  TempDir dir;
  for (const auto& c : cases) {
    SCOPED_TRACE(testing::Message() << "w64 " << c.wave64 << " rec " << c.rec << " ch "
                                    << c.channels << " bps " << c.bytesPerSample);
    const Container k = c.wave64 ? Container::kWave64 : Container::kRIFF;
    const auto frameSize = static_cast<std::int16_t>(c.channels * c.bytesPerSample);
    const SampleFormat format =
        c.bytesPerSample == 4 ? kSampFloat32 : NormalSampleFormatForSize(c.bytesPerSample);
    const auto bps = static_cast<std::int16_t>(c.bytesPerSample);
    const auto ch = static_cast<std::int16_t>(c.channels);
    Bytes body = Cat({ChunkImage({T("fmt "), WAVEWriter::MakeFormatChunkPayload(48000.0, bps, ch,
                                                                                frameSize, format)},
                                 k),
                      ChunkImage({T("bext"), FixedBext().Flatten()}, k)});
    if (c.rec) {
      const Bytes value =
          c.wave64 ? Cat({LE(0x12345678, 4), LE(0x12345678, 4)}) : LE(0x12345678, 4);
      body = Cat({body, ChunkImage({T("Rec!"), value, 4 + 0u}, k)});
    }
    if (!c.wave64) body = Cat({body, ChunkImage({T("JUNK"), Bytes(c.rec ? 94 : 74)}, k)});
    const std::uint64_t dataLength = static_cast<std::uint64_t>(c.frames) * frameSize;
    Bytes expected, dataHeader;
    PutTag(dataHeader, T("data"), k);
    PutSize(dataHeader, dataLength + (c.wave64 ? 24 : 0), k);
    PutTag(expected, T("RIFF"), k);
    const std::uint64_t audio = (c.wave64 ? 16 + 24 : 4 + 8) + body.size() + dataHeader.size();
    PutSize(expected, c.wave64 ? audio + dataLength : audio + dataLength - 8, k);
    PutTag(expected, T("WAVE"), k);
    expected = Cat({expected, body, dataHeader});

    const auto path = dir.Path("new.wav");
    std::filesystem::remove(path);  // the writer writes over a file without shortening it
    WAVEWriter writer(SpecOf(path), 48000.0, bps, ch, 0, frameSize, format, c.rec, c.wave64);
    writer.SetBroadcastExtension(FixedBext());
    writer.WriteHeader(0x12345678, c.frames);
    EXPECT_EQ(writer.GetStream().Position(), writer.GetOffsetToAudio());
    EXPECT_EQ(writer.GetOffsetToAudio(), static_cast<std::int64_t>(expected.size()));
    writer.Close();
    EXPECT_EQ(ReadFile(path), expected);
  }
}

TEST(WAVEWriter, UpdateDataLengthRewritesOnlyTheSizesAndPadsTheAudio) {
  for (const bool wave64 : {false, true}) {
    SCOPED_TRACE(wave64);
    TempDir dir;
    const auto path = dir.Path("grow.wav");
    WAVEWriter writer(SpecOf(path), 44100.0, 1, 1, 0, 1, kSamp8Offset, false, wave64);
    writer.SetBroadcastExtension(FixedBext());
    writer.WriteHeader(0, 0);
    writer.Close();
    const Bytes before = ReadFile(path);
    writer.GetStream().Open(kTCLReadWriteMode);
    writer.GetStream().MoveTo(992);
    const Bytes audio = Pattern(13);
    writer.GetStream().PutRawDataToStream(audio.data(), static_cast<int>(audio.size()));
    writer.UpdateDataLength(13);
    writer.MaybePadChunk();
    writer.Close();
    const Bytes file = ReadFile(path);
    ASSERT_EQ(file.size(), wave64 ? 992u + 13 : 992u + 14);
    EXPECT_EQ(Slice(file, 992, 1005), audio);
    EXPECT_TRUE(AllZero(file, 1005, file.size()));
    // Only the two size fields changed.
    Bytes expected = before;
    const Bytes riff = wave64 ? LE(992 + 13, 8) : LE(992 + 13 - 8, 4);
    const Bytes data = wave64 ? LE(13 + 24, 8) : LE(13, 4);
    std::copy(riff.begin(), riff.end(), expected.begin() + (wave64 ? 16 : 4));
    std::copy(data.begin(), data.end(), expected.begin() + (wave64 ? 968 + 16 : 984 + 4));
    EXPECT_EQ(Slice(file, 0, 992), expected);
    // The file's end padded to the mode's unit (before a chunk goes behind).
    {
      WAVEWriter again(SpecOf(path), 44100.0, 1, 1, 13, 1, kSamp8Offset, false, wave64);
      again.MaybePadTrailingChunk();
      again.Close();
    }
    EXPECT_EQ(ReadFile(path).size(), wave64 ? 992u + 16 : 992u + 14);
  }
}

TEST(WAVEWriter, JunkAndRecordingIndicatorChunks) {
  TempDir dir;
  const auto path = dir.Path("chunks.w64");
  WriteFile(path, Bytes(64, 0xEE));
  WAVEWriter writer(SpecOf(path), 8000.0, 2, 1, 0, 2, kSamp16, true, true);
  writer.WriteJunkChunk(0, 5);
  writer.WriteRecordingIndicatorChunk(32, 0xAABBCCDD);
  writer.Close();
  Bytes expected;
  PutTag(expected, T("JUNK"), Container::kWave64);
  expected = Cat({expected, LE(29, 8), Bytes(8)});
  PutTag(expected, T("Rec!"), Container::kWave64);
  EXPECT_EQ(ReadFile(path), Cat({expected, LE(28, 8), LE(0xAABBCCDD, 4), LE(0xAABBCCDD, 4)}));
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
  const Bytes image = bext.Flatten();
  ASSERT_EQ(image.size(), 858u);
  EXPECT_EQ(Slice(image, 0, 7), Text(std::string_view("Take 1\0", 7)));
  EXPECT_EQ(Slice(image, 256, 261), Text(std::string_view("Tarn\0", 5)));
  EXPECT_EQ(Slice(image, 288, 320), Bytes(32, 'R'));
  EXPECT_EQ(Slice(image, 320, 348),
            Cat({Text("2026-11-2401:02:03"), LE(0x89ABCDEF, 4), LE(0x01234567, 4), LE(2, 2)}));
  EXPECT_EQ(image[348], 1);
  EXPECT_EQ(image[411], 64);
  EXPECT_EQ(Slice(image, 412, 422),
            Cat({LE(0xF704, 2), LE(500, 2), LE(0xFF9C, 2), LE(0xF8F8, 2), LE(0x7FFF, 2)}));
  EXPECT_TRUE(AllZero(image, 422, 602));
  EXPECT_EQ(Slice(image, 602, 602 + bext.mCodingHistory.size()), Text(bext.mCodingHistory));
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
  BWFBroadcastWaveExtension b = FixedBext();
  b.mTimeReferenceLow = 77;
  b.mVersion = 2;
  b.mLoudnessValue = 5;
  b.mMaxShortTermLoudness = 9;
  const Bytes full = b.Flatten();
  for (std::size_t size = 0; size <= 604; ++size) {
    const auto bext = BWFBroadcastWaveExtension::Parse(full.data(), size);
    EXPECT_EQ(bext.mDescription, std::string("Take 1").substr(0, size));
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

// ------------------------------------------------------------------ AIFF

Bytes FromHex(std::string hex) {
  std::erase(hex, ' ');
  Bytes out;
  for (std::size_t i = 0; i + 1 < hex.size(); i += 2)
    out.push_back(static_cast<std::uint8_t>(std::stoi(hex.substr(i, 2), nullptr, 16)));
  return out;
}
bool IsFloat(RIFFType compression) { return compression == T("fl32") || compression == T("fl64"); }

// Writes `frames` frames of a ramp through a new writer the way a
// recording does; returns the ramp.
Ramp WriteAIFF(const std::filesystem::path& path, double rate, std::int16_t channels,
               std::int16_t bits, RIFFType form, RIFFType compression, int frames) {
  const Ramp ramp =
      MakeRamp(channels, frames, bits, compression == T("sowt"), IsFloat(compression));
  AIFFWriter writer(SpecOf(path), rate, channels, bits, form, compression, 0);
  writer.WriteHeader();
  writer.GetStream().PutRawDataToStream(ramp.bytes.data(), static_cast<int>(ramp.bytes.size()));
  writer.UpdateDataLength(frames);
  writer.MaybePadChunk();
  writer.Close();
  return ramp;
}

TEST(AIFFWriter, ByteImagesOfNewFiles) {
  const struct {
    const char* what;
    RIFFType form, compression;
    std::int16_t channels, bits;
    double rate;
    std::int64_t frames;
    const char* header;  // hex, everything before the audio
  } images[] = {
      {"AIFF 16-bit stereo", T("AIFF"), T("NONE"), 2, 16, 44100, 3,
       "464F524D 0000003A 41494646"
       "434F4D4D 00000012 0002 00000003 0010 400EAC44000000000000"
       "53534E44 00000014 00000000 00000000"},
      {"AIFC sowt mono", T("AIFC"), T("sowt"), 1, 16, 48000, 1,
       "464F524D 0000004E 41494643 46564552 00000004 A2805140"
       "434F4D4D 00000024 0001 00000001 0010 400EBB80000000000000 736F7774"
       "0D 6C6974746C6520656E6469616E"
       "53534E44 0000000A 00000000 00000000"},
      {"AIFC fl32 three channels, no frames", T("AIFC"), T("fl32"), 3, 32, 8000, 0,
       "464F524D 00000054 41494643 46564552 00000004 A2805140"
       "434F4D4D 0000002C 0003 00000000 0020 400BFA00000000000000 666C3332"
       "15 33322D62697420666C6F6174696E6720706F696E74"
       "53534E44 00000008 00000000 00000000"},
      {"AIFC NONE 8-bit, odd audio", T("AIFC"), T("NONE"), 1, 8, 8000, 7,
       "464F524D 00000056 41494643 46564552 00000004 A2805140"
       "434F4D4D 00000026 0001 00000007 0008 400BFA00000000000000 4E4F4E45"
       "0E 6E6F7420636F6D70726573736564 00"
       "53534E44 0000000F 00000000 00000000"},
      {"AIFC fl64 mono 96 kHz", T("AIFC"), T("fl64"), 1, 64, 96000, 2,
       "464F524D 00000064 41494643 46564552 00000004 A2805140"
       "434F4D4D 0000002C 0001 00000002 0040 400FBB80000000000000 666C3634"
       "15 36342D62697420666C6F6174696E6720706F696E74"
       "53534E44 00000018 00000000 00000000"},
  };
  TempDir dir;
  for (const auto& image : images) {
    SCOPED_TRACE(image.what);
    const auto path = dir.Path("new.aif");
    std::filesystem::remove(path);
    const Bytes header = FromHex(image.header);
    const Ramp ramp = MakeRamp(image.channels, static_cast<int>(image.frames), image.bits,
                               image.compression == T("sowt"), IsFloat(image.compression));
    AIFFWriter writer(SpecOf(path), image.rate, image.channels, image.bits, image.form,
                      image.compression, image.frames);
    EXPECT_EQ(writer.GetHeaderSize(), static_cast<std::int32_t>(header.size()));
    EXPECT_EQ(AIFFWriter::ComputeHeaderSize(image.form, image.compression),
              static_cast<std::int32_t>(header.size()));
    writer.WriteHeader();
    EXPECT_EQ(writer.GetStream().Position(), writer.GetHeaderSize());
    writer.GetStream().PutRawDataToStream(ramp.bytes.data(), static_cast<int>(ramp.bytes.size()));
    writer.MaybePadChunk();
    writer.Close();
    EXPECT_EQ(ReadFile(path), Cat({header, ramp.bytes, Bytes(ramp.bytes.size() % 2)}));
  }
}

TEST(AIFFWriter, UpdateDataLengthRewritesTheSizesInPlace) {
  TempDir dir;
  const struct {
    RIFFType form, compression;
    std::int16_t bits;
  } cases[] = {{T("AIFF"), T("NONE"), 24}, {T("AIFC"), T("sowt"), 16}, {T("AIFC"), T("NONE"), 8}};
  for (const auto& c : cases) {
    SCOPED_TRACE(RIFFTypeToString(c.compression) + std::to_string(c.bits));
    const auto path = dir.Path("grow.aif");
    std::filesystem::remove(path);  // the writer writes over a file without shortening it
    AIFFWriter writer(SpecOf(path), 44100, 1, c.bits, c.form, c.compression, 0);
    writer.WriteHeader();
    // The file as it stands, with the writer's buffered bytes written back.
    const auto onDisk = [&] {
      const std::int64_t at = writer.GetStream().Position();
      writer.Close();
      Bytes bytes = ReadFile(path);
      writer.GetStream().Open(kTCLReadWriteMode);
      writer.GetStream().MoveTo(at);
      return bytes;
    };
    const Bytes before = onDisk();
    const std::size_t comm = c.form == T("AIFC") ? 24 : 12;
    const auto ssnd = static_cast<std::size_t>(writer.GetHeaderSize() - 16);
    for (int frames : {5, 9, 2}) {
      const Ramp ramp = MakeRamp(1, frames, c.bits, c.compression == T("sowt"), false);
      writer.GetStream().MoveTo(writer.GetHeaderSize());
      writer.GetStream().PutRawDataToStream(ramp.bytes.data(), static_cast<int>(ramp.bytes.size()));
      writer.UpdateDataLength(frames);
      EXPECT_EQ(writer.GetStream().Position(),
                writer.GetHeaderSize() + static_cast<std::int64_t>(ramp.bytes.size()));
      writer.MaybePadChunk();
      const Bytes after = onDisk();
      const std::size_t data = ramp.bytes.size();
      const std::size_t end = writer.GetHeaderSize() + data + data % 2;
      ASSERT_GE(after.size(), end);
      EXPECT_EQ(FindFormChunk(after, T("SSND")), ssnd);
      // Only the container size, the frame count and the sound size changed.
      Bytes expected = before;
      for (const auto& [at, value] : {std::pair{std::size_t{4}, end - 8},
                                      {comm + 10, static_cast<std::size_t>(frames)},
                                      {ssnd + 4, 8 + data}}) {
        const Bytes field = BE(value, 4);
        std::copy(field.begin(), field.end(), expected.begin() + static_cast<std::ptrdiff_t>(at));
      }
      EXPECT_EQ(Slice(after, 0, before.size()), expected);
      EXPECT_EQ(Slice(after, before.size(), before.size() + data), ramp.bytes);
      if (data % 2 == 1) {
        EXPECT_EQ(after[before.size() + data], 0);
      }
    }
  }
}

TEST(AIFFWriter, RefusesWhatAIFFCannotHold) {
  const struct {
    const char* what;
    RIFFType form, compression;
    std::int16_t channels, bits;
    double rate;
    std::int64_t frames;
  } cases[] = {
      {"no channels", T("AIFF"), T("NONE"), 0, 16, 44100, 0},
      {"negative channels", T("AIFF"), T("NONE"), -2, 16, 44100, 0},
      {"12 bits", T("AIFF"), T("NONE"), 1, 12, 44100, 0},
      {"64-bit integers", T("AIFF"), T("NONE"), 1, 64, 44100, 0},
      {"sowt in AIFF", T("AIFF"), T("sowt"), 1, 16, 44100, 0},
      {"sowt 24-bit", T("AIFC"), T("sowt"), 1, 24, 44100, 0},
      {"fl32 of 64 bits", T("AIFC"), T("fl32"), 1, 64, 44100, 0},
      {"fl64 in AIFF", T("AIFF"), T("fl64"), 1, 64, 44100, 0},
      {"ulaw", T("AIFC"), T("ulaw"), 1, 8, 44100, 0},
      {"form WAVE", T("WAVE"), T("NONE"), 1, 16, 44100, 0},
      {"zero rate", T("AIFF"), T("NONE"), 1, 16, 0, 0},
      {"negative rate", T("AIFF"), T("NONE"), 1, 16, -44100, 0},
      {"negative frames", T("AIFF"), T("NONE"), 1, 16, 44100, -1},
      {"2^32 frames", T("AIFF"), T("NONE"), 1, 8, 44100, 0x100000000},
      {"audio past 4 GB", T("AIFF"), T("NONE"), 2, 16, 44100, 0x40000000},
  };
  TempDir dir;
  const auto path = dir.Path("refused.aif");
  for (const auto& c : cases) {
    EXPECT_EQ(CodeOf([&] {
                AIFFWriter(SpecOf(path), c.rate, c.channels, c.bits, c.form, c.compression,
                           c.frames);
              }),
              -50)
        << c.what;
    EXPECT_FALSE(std::filesystem::exists(path)) << c.what;
  }
  // The largest audio the size fields hold is accepted.
  const std::int64_t most = (0xFFFFFFFFLL - 1 - 54) / 4;
  EXPECT_EQ(CodeOf([&] { AIFFWriter(SpecOf(path), 44100, 2, 16, T("AIFF"), T("NONE"), most); }), 1);
  AIFFWriter small(SpecOf(dir.Path("small.aif")), 44100, 2, 16, T("AIFF"), T("NONE"), 0);
  EXPECT_EQ(CodeOf([&] { small.UpdateDataLength(most + 1); }), -50);
}

TEST(AIFFWriter, ChooseEncodingFollowsTheAttributes) {
  const struct {
    std::uint32_t fileType;
    SampleFormat format;
    bool lsbFirst;
    RIFFType form, compression;  // 0: refused
    std::int16_t bits;
  } cases[] = {
      {T("AIFF"), kSamp16, false, T("AIFF"), T("NONE"), 16},
      {T("AIFF"), kSamp8, true, T("AIFF"), T("NONE"), 8},
      {T("AIFF"), kSamp24, false, T("AIFF"), T("NONE"), 24},
      {T("AIFF"), kSampUnpacked24, false, T("AIFF"), T("NONE"), 32},
      {T("AIFC"), kSamp24, false, T("AIFC"), T("NONE"), 24},
      {T("AIFF"), kSamp16, true, T("AIFC"), T("sowt"), 16},
      {0, kSampFloat32, false, T("AIFC"), T("fl32"), 32},
      {T("AIFF"), kSampWide64B, false, T("AIFC"), T("fl64"), 64},
      {T("AIFF"), kSamp24, true, 0, 0, 0},
      {T("AIFF"), kSamp8Offset, false, 0, 0, 0},
      {T("AIFF"), kSampWide64A, false, 0, 0, 0},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(static_cast<int>(c.format));
    SoundFileAttributes a;
    a.mFileType = c.fileType;
    a.mSampleFormat = c.format;
    a.mSamplesAreLSBFirst = c.lsbFirst;
    RIFFType form = 0, compression = 0;
    std::int16_t bits = 0;
    EXPECT_EQ(CodeOf([&] { AIFFWriter::ChooseEncoding(a, form, compression, bits); }),
              c.form == 0 ? -50 : 1);
    if (c.form == 0) continue;
    EXPECT_EQ(form, c.form);
    EXPECT_EQ(compression, c.compression);
    EXPECT_EQ(bits, c.bits);
  }
}

// Every encoding with 1 to 8 channels reads back with the attributes it was
// written with, and the chunk editor lists exactly the header's chunks.
TEST(AIFFWriter, EveryEncodingAndChannelCountReadsBack) {
  TempDir dir;
  const auto path = dir.Path("rt.aif");
  for (const auto& [form, compression, bits] : {std::tuple{T("AIFF"), T("NONE"), std::int16_t{8}},
                                                {T("AIFF"), T("NONE"), 16},
                                                {T("AIFF"), T("NONE"), 24},
                                                {T("AIFF"), T("NONE"), 32},
                                                {T("AIFC"), T("NONE"), 16},
                                                {T("AIFC"), T("NONE"), 24},
                                                {T("AIFC"), T("sowt"), 16},
                                                {T("AIFC"), T("fl32"), 32},
                                                {T("AIFC"), T("fl64"), 64}}) {
    for (std::int16_t channels = 1; channels <= 8; ++channels) {
      SCOPED_TRACE(RIFFTypeToString(compression) + " " + std::to_string(bits) + " bits, " +
                   std::to_string(channels) + " channels");
      std::filesystem::remove(path);
      const Ramp ramp = WriteAIFF(path, 32000, channels, bits, form, compression, 7);
      AIFFReader reader(SpecOf(path));
      ASSERT_TRUE(reader.CanParse());
      EXPECT_EQ(reader.GetAttributes(),
                AIFFWriter::AttributesOf(32000, channels, bits, form, compression));
      EXPECT_EQ(reader.GetNumberOfFrames(), 7);
      const Bytes file = ReadFile(path);
      const auto at = static_cast<std::size_t>(reader.GetHeaderSize());
      EXPECT_EQ(Slice(file, at, file.size()), Cat({ramp.bytes, Bytes(ramp.bytes.size() % 2)}));
      RIFFFileEditor editor(SpecOf(path), kRIFFBigEndian, GetAIFFRIFFFormatHandler());
      editor.ReadChunkLocations(nullptr);
      std::string tags;
      for (const auto& [info, action] : editor.GetChunkList())
        tags += RIFFTypeToString(info.tag) + "|";
      EXPECT_EQ(tags, form == T("AIFC") ? "FVER|COMM|SSND|" : "COMM|SSND|");
    }
  }
}

}  // namespace
}  // namespace tarn::test
