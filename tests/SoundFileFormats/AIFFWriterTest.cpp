// AIFFWriter: exact byte images of new AIFF and AIFC files, the size fields
// after the audio grows, the pad byte after odd audio, what it refuses, and
// every encoding and channel count read back by AIFFReader and listed by the
// chunk editor.

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <string>
#include <tuple>

#include "SoundFileFormats/AIFFTestUtil.h"
#include "tarn/Audio/SoundFileFormats/AIFFReader.h"
#include "tarn/Audio/SoundFileFormats/AIFFWriter.h"

namespace tarn::test {
namespace {

constexpr RIFFType T(const char (&code)[5]) { return MakeRIFFType(code); }

Bytes FromHex(std::string hex) {
  std::erase(hex, ' ');
  Bytes out;
  for (std::size_t i = 0; i + 1 < hex.size(); i += 2)
    out.push_back(static_cast<std::uint8_t>(std::stoi(hex.substr(i, 2), nullptr, 16)));
  return out;
}

struct Image {
  const char* what;
  RIFFType form;
  RIFFType compression;
  std::int16_t channels;
  std::int16_t bits;
  double rate;
  std::int64_t frames;
  const char* header;  // hex, everything before the audio
};

const Image kImages[] = {
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

TEST(AIFFWriter, ByteImagesOfNewFiles) {
  TempDir dir;
  for (const Image& image : kImages) {
    SCOPED_TRACE(image.what);
    const auto path = dir.Path(std::string(image.what) + ".aif");
    const Bytes header = FromHex(image.header);
    const bool floating = image.compression == T("fl32") || image.compression == T("fl64");
    const Ramp ramp = MakeRamp(image.channels, static_cast<int>(image.frames), image.bits,
                               image.compression == T("sowt"), floating);
    {
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
    }
    Bytes expected = header;
    expected.insert(expected.end(), ramp.bytes.begin(), ramp.bytes.end());
    if (ramp.bytes.size() % 2 == 1) expected.push_back(0);
    EXPECT_EQ(ReadFile(path), expected);
  }
}

TEST(AIFFWriter, UpdateDataLengthRewritesTheSizesInPlace) {
  TempDir dir;
  for (const auto& [form, compression, bits, pathName] :
       {std::tuple{T("AIFF"), T("NONE"), std::int16_t{24}, "a.aif"},
        std::tuple{T("AIFC"), T("sowt"), std::int16_t{16}, "b.aifc"},
        std::tuple{T("AIFC"), T("NONE"), std::int16_t{8}, "c.aifc"}}) {
    SCOPED_TRACE(pathName);
    const auto path = dir.Path(pathName);
    AIFFWriter writer(SpecOf(path), 44100, 1, bits, form, compression, 0);
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
    for (int frames : {5, 9, 2}) {
      const Ramp ramp = MakeRamp(1, frames, bits, compression == T("sowt"), false);
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
      EXPECT_EQ(Get32(after, 4), end - 8);
      const std::size_t comm = form == T("AIFC") ? 24 : 12;
      EXPECT_EQ(Get32(after, comm + 10), static_cast<std::uint32_t>(frames));
      const std::size_t ssnd = FindSoundChunk(after);
      EXPECT_EQ(ssnd, static_cast<std::size_t>(writer.GetHeaderSize() - 16));
      EXPECT_EQ(Get32(after, ssnd + 4), 8 + data);
      // Nothing else in the header moved.
      for (std::size_t i = 0; i < before.size(); ++i) {
        if ((i >= 4 && i < 8) || (i >= comm + 10 && i < comm + 14) ||
            (i >= ssnd + 4 && i < ssnd + 8))
          continue;
        ASSERT_EQ(after[i], before[i]) << i;
      }
      EXPECT_TRUE(
          std::equal(ramp.bytes.begin(), ramp.bytes.end(), after.begin() + writer.GetHeaderSize()));
      if (data % 2 == 1) {
        EXPECT_EQ(after[writer.GetHeaderSize() + data], 0);
      }
    }
  }
}

TEST(AIFFWriter, RefusesWhatAIFFCannotHold) {
  struct Case {
    const char* what;
    RIFFType form;
    RIFFType compression;
    std::int16_t channels;
    std::int16_t bits;
    double rate;
    std::int64_t frames;
  };
  const Case cases[] = {
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
  for (const Case& c : cases) {
    SCOPED_TRACE(c.what);
    const auto path = dir.Path("refused.aif");
    const auto error = ErrorOf([&] {
      AIFFWriter(SpecOf(path), c.rate, c.channels, c.bits, c.form, c.compression, c.frames);
    });
    ASSERT_TRUE(error.has_value());
    EXPECT_EQ(error->GetIntErrorCode(), -50);
    EXPECT_FALSE(std::filesystem::exists(path));
  }
  // The largest audio the size fields hold is accepted.
  const std::int64_t most = (0xFFFFFFFFLL - 1 - 54) / 4;
  EXPECT_FALSE(ErrorOf([&] {
                 AIFFWriter(SpecOf(dir.Path("big.aif")), 44100, 2, 16, T("AIFF"), T("NONE"), most);
               }).has_value());
  AIFFWriter small(SpecOf(dir.Path("small.aif")), 44100, 2, 16, T("AIFF"), T("NONE"), 0);
  EXPECT_EQ(ErrorOf([&] { small.UpdateDataLength(most + 1); })->GetIntErrorCode(), -50);
}

TEST(AIFFWriter, ChooseEncodingFollowsTheAttributes) {
  struct Case {
    std::uint32_t fileType;
    SampleFormat format;
    bool lsbFirst;
    RIFFType form;  // 0: refused
    RIFFType compression;
    std::int16_t bits;
  };
  const Case cases[] = {
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
  for (const Case& c : cases) {
    SCOPED_TRACE(static_cast<int>(c.format));
    SoundFileAttributes a;
    a.mFileType = c.fileType;
    a.mSampleFormat = c.format;
    a.mSamplesAreLSBFirst = c.lsbFirst;
    RIFFType form = 0, compression = 0;
    std::int16_t bits = 0;
    const auto error = ErrorOf([&] { AIFFWriter::ChooseEncoding(a, form, compression, bits); });
    if (c.form == 0) {
      ASSERT_TRUE(error.has_value());
      EXPECT_EQ(error->GetIntErrorCode(), -50);
      continue;
    }
    ASSERT_FALSE(error.has_value());
    EXPECT_EQ(form, c.form);
    EXPECT_EQ(compression, c.compression);
    EXPECT_EQ(bits, c.bits);
  }
}

struct Encoding {
  RIFFType form;
  RIFFType compression;
  std::int16_t bits;
};
const Encoding kEncodings[] = {
    {T("AIFF"), T("NONE"), 8},  {T("AIFF"), T("NONE"), 16}, {T("AIFF"), T("NONE"), 24},
    {T("AIFF"), T("NONE"), 32}, {T("AIFC"), T("NONE"), 16}, {T("AIFC"), T("NONE"), 24},
    {T("AIFC"), T("sowt"), 16}, {T("AIFC"), T("fl32"), 32}, {T("AIFC"), T("fl64"), 64},
};

// Every encoding with 1 to 8 channels reads back with the attributes it was
// written with, and the chunk editor lists exactly the header's chunks.
TEST(AIFFWriter, EveryEncodingAndChannelCountReadsBack) {
  TempDir dir;
  for (const Encoding& e : kEncodings) {
    for (std::int16_t channels = 1; channels <= 8; ++channels) {
      SCOPED_TRACE(RIFFTypeToString(e.compression) + " " + std::to_string(e.bits) + " bits, " +
                   std::to_string(channels) + " channels");
      const auto path = dir.Path("rt.aif");
      std::filesystem::remove(path);
      const int frames = 7;
      const bool floating = e.compression == T("fl32") || e.compression == T("fl64");
      const Ramp ramp = MakeRamp(channels, frames, e.bits, e.compression == T("sowt"), floating);
      {
        AIFFWriter writer(SpecOf(path), 32000, channels, e.bits, e.form, e.compression, 0);
        writer.WriteHeader();
        writer.GetStream().PutRawDataToStream(ramp.bytes.data(),
                                              static_cast<int>(ramp.bytes.size()));
        writer.UpdateDataLength(frames);
        writer.MaybePadChunk();
        writer.Close();
      }
      AIFFReader reader(SpecOf(path));
      ASSERT_TRUE(reader.CanParse());
      EXPECT_EQ(reader.GetAttributes(),
                AIFFWriter::AttributesOf(32000, channels, e.bits, e.form, e.compression));
      EXPECT_EQ(reader.GetNumberOfFrames(), frames);
      const Bytes file = ReadFile(path);
      const auto at = static_cast<std::size_t>(reader.GetHeaderSize());
      ASSERT_EQ(file.size(), at + ramp.bytes.size() + ramp.bytes.size() % 2);
      EXPECT_TRUE(std::equal(ramp.bytes.begin(), ramp.bytes.end(), file.begin() + at));

      RIFFFileEditor editor(SpecOf(path), kRIFFBigEndian, GetAIFFRIFFFormatHandler());
      editor.ReadChunkLocations(nullptr);
      std::string tags;
      for (const auto& [info, action] : editor.GetChunkList())
        tags += RIFFTypeToString(info.tag) + "|";
      EXPECT_EQ(tags, e.form == T("AIFC") ? "FVER|COMM|SSND|" : "COMM|SSND|");
    }
  }
}

}  // namespace
}  // namespace tarn::test
