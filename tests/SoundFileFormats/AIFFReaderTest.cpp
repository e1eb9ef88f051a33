// AIFFReader on crafted files: every "COMM" encoding rule, the "SSND"
// offset check at its boundary, odd chunks and their pad bytes, "basc" and
// "CHAN", and damaged files (truncated at every length, lying sizes, every
// byte flipped) that must give a clear error or a sane answer, never a crash.

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "SoundFileFormats/AIFFTestUtil.h"
#include "tarn/Audio/SoundFileFormats/AIFFReader.h"

namespace tarn::test {
namespace {

constexpr RIFFType T(const char (&code)[5]) { return MakeRIFFType(code); }
constexpr RIFFType kAIFF = T("AIFF"), kAIFC = T("AIFC");

class AIFFReaderTest : public ::testing::Test {
 protected:
  FileSpecification Put(const Bytes& image, const std::string& name = "file.aif") {
    WriteFile(dir_.Path(name), image);
    return SpecOf(dir_.Path(name));
  }
  TempDir dir_;
};

void ExpectAIFFReaderError(AIFFReader& reader) {
  EXPECT_FALSE(reader.CanParse());
  const auto error = ErrorOf([&] { (void)reader.GetHeaderSize(); });
  ASSERT_TRUE(error.has_value());
  EXPECT_STREQ(error->GetKind().c_str(), "AIFFReader");
  EXPECT_STREQ(error->GetSystem().c_str(), "AIFFReader");
  EXPECT_STREQ(error->GetSubsystem().c_str(), "AIFFReader");
  EXPECT_EQ(error->GetIntErrorCode(), 0);
  // The same answer every time.
  EXPECT_TRUE(ErrorOf([&] { (void)reader.GetNumberOfFrames(); }).has_value());
}

struct Encoding {
  RIFFType form;
  RIFFType compression;  // 0: none written (AIFF)
  std::int16_t bits;
  bool parses;
  SampleFormat format = kSamp16;
  std::int16_t bytes = 0;
  bool lsbFirst = false;
};

const Encoding kEncodings[] = {
    {kAIFF, 0, 8, true, kSamp8, 1, false},
    {kAIFF, 0, 12, true, kSamp8, 1, false},  // 12 / 8 = 1 byte
    {kAIFF, 0, 16, true, kSamp16, 2, false},
    {kAIFF, 0, 20, true, kSamp16, 2, false},
    {kAIFF, 0, 24, true, kSamp24, 3, false},
    {kAIFF, 0, 32, true, kSampUnpacked24, 4, false},
    {kAIFF, 0, 64, true, kSampWide64A, 8, false},
    {kAIFF, 0, 7, false},
    {kAIFF, 0, 40, false},
    {kAIFF, 0, 48, false},
    {kAIFF, 0, -16, false},
    {kAIFC, T("NONE"), 8, true, kSamp8, 1, false},
    {kAIFC, T("NONE"), 16, true, kSamp16, 2, false},
    {kAIFC, T("NONE"), 24, true, kSamp24, 3, false},
    {kAIFC, T("NONE"), 32, true, kSampUnpacked24, 4, false},
    {kAIFC, T("NONE"), 64, true, kSampWide64A, 8, false},
    {kAIFC, T("NONE"), 40, false},
    {kAIFC, T("sowt"), 16, true, kSamp16, 2, true},
    {kAIFC, T("sowt"), 24, true, kSamp16, 3, true},  // still 16-bit, deliberately
    {kAIFC, T("sowt"), 32, true, kSamp16, 4, true},
    {kAIFC, T("sowt"), 8, true, kSamp16, 1, true},
    {kAIFC, T("twos"), 16, true, kSamp16, 2, false},
    {kAIFC, T("twos"), 24, true, kSamp16, 3, false},
    {kAIFC, T("in24"), 24, true, kSamp24, 3, false},
    {kAIFC, T("in32"), 32, true, kSampUnpacked24, 4, false},
    {kAIFC, T("fl32"), 32, true, kSampFloat32, 4, false},
    {kAIFC, T("FL32"), 32, true, kSampFloat32, 4, false},  // libsndfile's spelling
    {kAIFC, T("FL64"), 64, true, kSampWide64B, 8, false},
    {kAIFC, T("Fl32"), 32, false},
    {kAIFC, T("42n1"), 24, false},  // libsndfile's little-endian 24-bit
    {kAIFC, T("fl64"), 64, true, kSampWide64B, 8, false},
    {kAIFC, T("ulaw"), 8, false},
    {kAIFC, T("ima4"), 16, false},
    {kAIFC, T("SOWT"), 16, false},
};

TEST_F(AIFFReaderTest, CommonChunkEncodings) {
  for (const Encoding& e : kEncodings) {
    SCOPED_TRACE(RIFFTypeToString(e.form) + " " + RIFFTypeToString(e.compression) + " " +
                 std::to_string(e.bits));
    const std::int16_t channels = 3;
    const std::uint32_t frames = 5;
    const Bytes audio =
        Pattern(static_cast<std::size_t>(channels * frames * std::max(e.bytes, std::int16_t{1})));
    AIFFReader reader(
        Put(FormImage(e.form, {{T("COMM"), Comm(channels, frames, e.bits, 44100, e.compression)},
                               {T("SSND"), Ssnd(0, audio)}})));
    if (!e.parses) {
      ExpectAIFFReaderError(reader);
      continue;
    }
    ASSERT_TRUE(reader.CanParse());
    EXPECT_EQ(reader.GetSampleFormat(), e.format);
    EXPECT_EQ(reader.GetSampleSize(), e.bytes);
    EXPECT_EQ(reader.GetSampleSizeInBits(), e.bits);
    EXPECT_EQ(reader.GetSampleFrameSize(), channels * e.bytes);
    EXPECT_EQ(reader.GetSamplesAreLSBFirst(), e.lsbFirst);
    EXPECT_EQ(reader.GetNumberOfChannels(), channels);
    EXPECT_EQ(reader.GetNumberOfFrames(), frames);
    EXPECT_EQ(reader.GetSampleRate(), 44100.0);
    EXPECT_EQ(reader.GetFormType(), e.form);
    EXPECT_EQ(reader.GetCompressionType(), e.compression == 0 ? T("NONE") : e.compression);
    const std::int64_t ssnd = e.form == kAIFF ? 12 + 8 + 18 : 12 + 8 + 24;
    EXPECT_EQ(reader.GetOffsetToSoundChunk(), ssnd);
    EXPECT_EQ(reader.GetHeaderSize(), ssnd + 16);
    EXPECT_EQ(reader.GetSurroundModel(), SurroundModel::kLCR);
    const SoundFileAttributes a = reader.GetAttributes();
    EXPECT_EQ(a.mFileType, e.form);
    EXPECT_EQ(a.mSampleFormat, e.format);
    EXPECT_EQ(a.mBytesPerFrame, channels * e.bytes);
    EXPECT_EQ(a.mOffsetToAudio, ssnd + 16);
    EXPECT_EQ(a.mSamplesAreLSBFirst, e.lsbFirst);
  }
}

TEST_F(AIFFReaderTest, EveryBitCountOfPlainAIFF) {
  for (int bits = -2; bits <= 72; ++bits) {
    SCOPED_TRACE(bits);
    AIFFReader reader(
        Put(FormImage(kAIFF, {{T("COMM"), Comm(1, 0, static_cast<std::int16_t>(bits), 8000)},
                              {T("SSND"), Ssnd(0, {})}})));
    const int bytes = bits / 8;
    const bool known = bytes == 1 || bytes == 2 || bytes == 3 || bytes == 4 || bytes == 8;
    ASSERT_EQ(reader.CanParse(), known);
  }
}

// The offset is used exactly when (chunk size - 8 - offset) / frame size
// still covers the "COMM" frame count.
TEST_F(AIFFReaderTest, SoundOffsetIsUsedOnlyWhenTheFramesFit) {
  struct Case {
    const char* what;
    std::int16_t channels;
    std::int16_t bits;
    std::uint32_t frames;
    std::uint32_t offset;  // field value
    std::uint32_t filler;  // bytes between the fields and the audio
    std::size_t audio;     // audio bytes in the chunk
    bool used;
  };
  const Case cases[] = {
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
  for (const Case& c : cases) {
    SCOPED_TRACE(c.what);
    const RIFFType form = c.bits == 4 ? kAIFC : kAIFF;
    const RIFFType compression = c.bits == 4 ? T("sowt") : 0;
    AIFFReader reader(
        Put(FormImage(form, {{T("COMM"), Comm(c.channels, c.frames, c.bits, 8000, compression)},
                             {T("SSND"), Ssnd(c.offset, Pattern(c.audio), c.filler)}})));
    ASSERT_TRUE(reader.CanParse());
    const std::int64_t start = reader.GetOffsetToSoundChunk() + 16;
    EXPECT_EQ(reader.GetHeaderSize(), c.used ? start + c.offset : start);
  }
}

TEST_F(AIFFReaderTest, SoundBeforeCommonAndUnknownChunksAnywhere) {
  const Bytes audio = Pattern(8);
  AIFFReader reader(Put(FormImage(kAIFF, {{T("ANNO"), Text("hello")},
                                          {T("SSND"), Ssnd(4, audio, 4)},
                                          {T("ID3 "), Pattern(7)},
                                          {T("COMM"), Comm(2, 2, 16, 22050)},
                                          {T("MARK"), Pattern(3)}})));
  ASSERT_TRUE(reader.CanParse());
  // ANNO: 8 + 5 + pad 1 = 14 bytes from 12.
  EXPECT_EQ(reader.GetOffsetToSoundChunk(), 26);
  EXPECT_EQ(reader.GetHeaderSize(), 26 + 16 + 4);
  EXPECT_EQ(reader.GetSampleRate(), 22050.0);
}

TEST_F(AIFFReaderTest, OddChunksAreSkippedWithTheirPadByte) {
  for (std::size_t odd : {1u, 3u, 5u, 255u}) {
    SCOPED_TRACE(odd);
    // The pad byte holds 'C' so that a walk that forgets it lands on "COMM"
    // shifted by one and finds no "COMM".
    Bytes junk = Pattern(odd);
    Bytes image = FormImage(kAIFF, {{T("APPL"), junk, std::nullopt, false}});
    image.push_back('C');
    const Bytes rest =
        FormImage(kAIFF, {{T("COMM"), Comm(1, 3, 8, 8000)}, {T("SSND"), Ssnd(0, Pattern(3))}});
    image.insert(image.end(), rest.begin() + 12, rest.end());
    AIFFReader reader(Put(image));
    ASSERT_TRUE(reader.CanParse());
    EXPECT_EQ(reader.GetOffsetToCommonChunk(), static_cast<std::int64_t>(12 + 8 + odd + 1));
    EXPECT_EQ(reader.GetNumberOfFrames(), 3);

    // Without the pad byte the chunks after it are out of step.
    Bytes unpadded = FormImage(kAIFF, {{T("APPL"), junk, std::nullopt, false}});
    unpadded.insert(unpadded.end(), rest.begin() + 12, rest.end());
    AIFFReader broken(Put(unpadded, "unpadded.aif"));
    EXPECT_FALSE(broken.CanParse());
  }
}

TEST_F(AIFFReaderTest, RefusesOtherContainersAndDamagedFiles) {
  const Bytes comm = Comm(1, 1, 16, 8000);
  const Bytes good = FormImage(kAIFF, {{T("COMM"), comm}, {T("SSND"), Ssnd(0, Pattern(2))}});
  struct Case {
    const char* what;
    Bytes image;
  };
  Bytes riff = good;
  riff[0] = 'R', riff[1] = 'I', riff[2] = 'F', riff[3] = 'F';
  Bytes wave = FormImage(T("WAVE"), {{T("COMM"), comm}, {T("SSND"), Ssnd(0, Pattern(2))}});
  Bytes shortComm = Comm(1, 1, 16, 8000);
  shortComm.resize(17);
  const Case cases[] = {
      {"empty", {}},
      {"eleven bytes", Bytes(good.begin(), good.begin() + 11)},
      {"RIFF", riff},
      {"form type WAVE", wave},
      {"form type aiff", FormImage(T("aiff"), {{T("COMM"), comm}, {T("SSND"), Ssnd(0, {})}})},
      {"no COMM", FormImage(kAIFF, {{T("SSND"), Ssnd(0, Pattern(2))}})},
      {"no SSND", FormImage(kAIFF, {{T("COMM"), comm}})},
      {"COMM of 17 bytes", FormImage(kAIFF, {{T("COMM"), shortComm}, {T("SSND"), Ssnd(0, {})}})},
      {"AIFC COMM without compression",
       FormImage(kAIFC, {{T("COMM"), comm}, {T("SSND"), Ssnd(0, {})}})},
      {"SSND without its fields", FormImage(kAIFF, {{T("COMM"), comm}, {T("SSND"), Bytes(4)}})},
      {"a huge chunk before COMM", FormImage(kAIFF, {{T("ANNO"), Pattern(4), 0xFFFFFFF0},
                                                     {T("COMM"), comm},
                                                     {T("SSND"), Ssnd(0, {})}})},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.what);
    AIFFReader reader(Put(c.image));
    ExpectAIFFReaderError(reader);
  }
  AIFFReader missing(SpecOf(dir_.Path("nothing-here.aif")));
  EXPECT_FALSE(missing.CanParse());
  EXPECT_TRUE(ErrorOf([&] { (void)missing.GetSampleRate(); }).has_value());
}

TEST_F(AIFFReaderTest, SoundChunkWithoutSizeOrPastTheEnd) {
  for (std::uint32_t size : {0u, 0x7FFFFFFFu, 0xFFFFFFFFu}) {
    SCOPED_TRACE(size);
    AIFFReader reader(Put(FormImage(
        kAIFF, {{T("COMM"), Comm(2, 0, 16, 48000)}, {T("SSND"), Ssnd(0, Pattern(400)), size}})));
    ASSERT_TRUE(reader.CanParse());
    EXPECT_EQ(reader.GetHeaderSize(), 12 + 26 + 16);
    EXPECT_EQ(reader.GetNumberOfFrames(), 0);
  }
}

TEST_F(AIFFReaderTest, LoopBasics) {
  struct Case {
    std::int16_t root;
    std::int16_t loopType;
    std::uint32_t beats;
    std::uint32_t frames;
    double rate;
    short expectedRoot;
    double tempo;
  };
  const Case cases[] = {
      {60, 1, 4, 88200, 44100, 60, 120.0},
      {126, 1, 8, 96000, 48000, 126, 240.0},
      {127, 1, 3, 44100, 44100, 60, 180.0},
      {300, 0, 4, 88200, 44100, 60, 0.0},  // one-shot: no tempo
      {-3, 2, 4, 88200, 44100, -3, 0.0},
      {48, 1, 0, 88200, 44100, 48, 0.0},  // no beats
      {48, 1, 4, 0, 44100, 48, 0.0},      // no frames
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.root);
    Bytes basc;
    Put32(basc, 1);        // version
    Put32(basc, c.beats);  // beats
    Put16(basc, static_cast<std::uint16_t>(c.root));
    Put16(basc, 1);  // scale
    Put16(basc, 6);  // numerator
    Put16(basc, 8);  // denominator
    Put16(basc, static_cast<std::uint16_t>(c.loopType));
    basc.resize(84);  // the rest of the usual chunk
    AIFFReader reader(Put(FormImage(kAIFF, {{T("COMM"), Comm(1, c.frames, 16, c.rate)},
                                            {T("basc"), basc},
                                            {T("SSND"), Ssnd(0, {})}})));
    short root = 0, num = 0, den = 0;
    ASSERT_TRUE(reader.GetMeterAndPitch(root, num, den));
    EXPECT_EQ(root, c.expectedRoot);
    EXPECT_EQ(num, 6);
    EXPECT_EQ(den, 8);
    EXPECT_DOUBLE_EQ(reader.GetQuarterNoteTempoBPM(), c.tempo);
  }
  AIFFReader plain(
      Put(FormImage(kAIFF, {{T("COMM"), Comm(1, 10, 16, 8000)}, {T("SSND"), Ssnd(0, {})}}),
          "plain.aif"));
  short root = 1, num = 1, den = 1;
  EXPECT_FALSE(plain.GetMeterAndPitch(root, num, den));
  EXPECT_EQ(root, 1);
  EXPECT_EQ(plain.GetQuarterNoteTempoBPM(), 0.0);
  // A "basc" chunk too short for its fields is ignored.
  AIFFReader cut(Put(FormImage(kAIFF, {{T("COMM"), Comm(1, 10, 16, 8000)},
                                       {T("basc"), Pattern(17)},
                                       {T("SSND"), Ssnd(0, {})}}),
                     "cut.aif"));
  EXPECT_FALSE(cut.GetMeterAndPitch(root, num, den));
}

Bytes Chan(std::uint32_t tag, std::uint32_t bitmap, const std::vector<std::uint32_t>& labels,
           std::uint32_t count) {
  Bytes out;
  Put32(out, tag);
  Put32(out, bitmap);
  Put32(out, count);
  for (std::uint32_t label : labels) {
    Put32(out, label);
    out.resize(out.size() + 16);  // flags and coordinates
  }
  return out;
}

TEST_F(AIFFReaderTest, ChannelLayouts) {
  using L = ChannelLabel;
  const std::vector<L> wave51 = {L::kLeft, L::kRight,        L::kCenter,
                                 L::kLFE,  L::kLeftSurround, L::kRightSurround};
  struct Case {
    const char* what;
    std::int16_t channels;
    Bytes chan;
    std::vector<L> expected;  // empty: the default order
  };
  const Case cases[] = {
      {"descriptions",
       6,
       Chan(0, 0, {3, 1, 2, 4, 5, 6}, 6),
       {L::kCenter, L::kLeft, L::kRight, L::kLFE, L::kLeftSurround, L::kRightSurround}},
      {"bitmap",
       4,
       Chan(1u << 16, 0x1 | 0x2 | 0x10 | 0x20, {}, 0),
       {L::kLeft, L::kRight, L::kLeftSurround, L::kRightSurround}},
      {"5.1 A", 6, Chan(121u << 16 | 6, 0, {}, 0), wave51},
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
  for (const Case& c : cases) {
    SCOPED_TRACE(c.what);
    AIFFReader reader(Put(FormImage(kAIFF, {{T("COMM"), Comm(c.channels, 0, 16, 8000)},
                                            {T("CHAN"), c.chan},
                                            {T("SSND"), Ssnd(0, {})}})));
    const HostChannelOrder order = reader.GetChannelOrder();
    const HostChannelOrder fallback = HostChannelOrder::ForChannelCount(c.channels);
    EXPECT_EQ(order.GetLabels(), c.expected.empty() ? fallback.GetLabels() : c.expected);
    EXPECT_EQ(order.GetSurroundModel(), HostChannelOrder::GuessSurroundModel(c.channels));
    EXPECT_EQ(reader.GetSurroundModel(), order.GetSurroundModel());
  }
}

TEST_F(AIFFReaderTest, RawHeaderIsEverythingBeforeTheAudio) {
  const Bytes image = FormImage(kAIFC, {{T("FVER"), Pattern(4)},
                                        {T("COMM"), Comm(2, 3, 16, 44100, T("sowt"))},
                                        {T("SSND"), Ssnd(2, Pattern(12), 2)}});
  AIFFReader reader(Put(image));
  std::vector<std::uint8_t> header;
  reader.GetRawHeader(header);
  ASSERT_EQ(static_cast<std::int64_t>(header.size()), reader.GetHeaderSize());
  EXPECT_EQ(header,
            Bytes(image.begin(), image.begin() + static_cast<std::ptrdiff_t>(header.size())));
  EXPECT_EQ(reader.GetHeaderSize(), 12 + 12 + 8 + 24 + 16 + 2);
}

// Every prefix of a file either parses to the same facts or fails cleanly;
// every single byte changed to 0xFF or 0x00 gives an answer or an error.
TEST_F(AIFFReaderTest, TruncatedAndCorruptedFilesNeverCrash) {
  Bytes basc(18);
  basc[17] = 1;
  const Bytes image = FormImage(kAIFC, {{T("FVER"), Pattern(4)},
                                        {T("COMM"), Comm(6, 4, 24, 96000, T("NONE"))},
                                        {T("basc"), basc},
                                        {T("CHAN"), Chan(0, 0, {1, 2, 3, 4, 5, 6}, 6)},
                                        {T("SSND"), Ssnd(0, Pattern(72))}});
  const std::int64_t ssnd = static_cast<std::int64_t>(FindSoundChunk(image));
  const FileSpecification spec = Put(image);
  for (std::size_t n = 0; n <= image.size(); ++n) {
    WriteFile(dir_.Path("file.aif"),
              Bytes(image.begin(), image.begin() + static_cast<std::ptrdiff_t>(n)));
    AIFFReader reader(spec);
    ASSERT_EQ(reader.CanParse(), static_cast<std::int64_t>(n) >= ssnd + 16) << n;
    if (reader.CanParse()) {
      EXPECT_EQ(reader.GetNumberOfFrames(), 4);
      EXPECT_EQ(reader.GetHeaderSize(), ssnd + 16);
    }
  }
  for (std::size_t i = 0; i < image.size(); ++i) {
    for (std::uint8_t value : {std::uint8_t{0}, std::uint8_t{0xFF}}) {
      Bytes bad = image;
      bad[i] = value;
      WriteFile(dir_.Path("file.aif"), bad);
      AIFFReader reader(spec);
      if (!reader.CanParse()) continue;
      std::vector<std::uint8_t> header;
      reader.GetRawHeader(header);
      EXPECT_LE(header.size(), bad.size());
      (void)reader.GetChannelOrder();
      (void)reader.GetQuarterNoteTempoBPM();
    }
  }
}

}  // namespace
}  // namespace tarn::test
