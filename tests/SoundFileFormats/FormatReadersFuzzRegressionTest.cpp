// Files the format-reader fuzz target found, rebuilt byte for byte, and the
// rule each one broke at its boundary.

#include <gtest/gtest.h>

#include <cstdint>
#include <memory>
#include <string>

#include "SoundFileFormats/ChunkFileTestUtil.h"
#include "tarn/Audio/SoundFileFormats/SoundFileAttributes.h"
#include "tarn/Audio/SoundFileFormats/WAVEReader.h"
#include "tarn/Audio/SoundFileFormats/WAVESoundFileFormat.h"

namespace tarn::test {
namespace {

constexpr RIFFType kFmt = MakeRIFFType("fmt ");
constexpr RIFFType kData = MakeRIFFType("data");

// A 16-byte PCM "fmt " payload whose channel field is `channels` as stored.
Bytes PcmFormat(std::uint16_t channels, std::uint32_t rate, std::uint16_t blockAlign) {
  return Cat({LE(1, 2), LE(channels, 2), LE(rate, 4), LE(rate * blockAlign, 4), LE(blockAlign, 2),
              LE(16, 2)});
}

class FormatReadersFuzzRegression : public ::testing::Test {
 protected:
  FileSpecification Put(const Bytes& bytes) {
    const auto path = dir_.Path("f" + std::to_string(count_++) + ".wav");
    WriteFile(path, bytes);
    return SpecOf(path);
  }

 private:
  TempDir dir_;
  int count_ = 0;
};

// The fuzzer's file: 0xBB02 = 47874 channels. The reader took the count,
// and the format object's attributes, which hold channels in 16 signed
// bits, reported -17662 channels next to a 95748-byte frame.
TEST_F(FormatReadersFuzzRegression, ChannelCountBeyondSixteenSignedBitsIsUnsupported) {
  const Bytes acid = Cat({LE(1, 4), LE(60, 4), Bytes(16, 0)});
  const Bytes info = Cat({Text("INFOINAM"), LE(5, 4), Text("Loop"), Bytes(2, 0)});
  const Bytes format =
      Cat({LE(1, 2), LE(0xBB02, 2), LE(0x80, 4), LE(192000, 4), LE(4, 2), LE(16, 2)});
  Bytes found = FileImage(
      {{kFmt, format},
       {MakeRIFFType("acid"), acid},
       {kData, Cat({LE(0x00640000, 4), LE(0x012C00C8, 4), LE(0x01F40190, 4), LE(0x02BC0258, 4)})},
       {MakeRIFFType("LIST"), info}},
      Container::kRIFF);
  ASSERT_EQ(found.size(), 118u);
  found[4] = 0xDA;  // the container size as found: 100 bytes past the end
  const FileSpecification spec = Put(found);
  WAVEReader reader(spec);
  EXPECT_FALSE(reader.CanParse());
  const auto error = ErrorOf([&] { (void)reader.GetNumberOfChannels(); });
  ASSERT_TRUE(error);
  EXPECT_STREQ(error->GetKind().c_str(), WAVEReader::kErrorClass);
  EXPECT_EQ(error->GetIntErrorCode(), WAVEReader::kUnsupportedFormat);

  auto object = std::make_shared<WAVESoundFileFormat>(spec);
  const auto formatError = ErrorOf([&] { (void)object->GetFileAttributes(); });
  ASSERT_TRUE(formatError);
  EXPECT_STREQ(formatError->GetKind().c_str(), WAVEReader::kErrorClass);
}

// The boundary in both containers: 32767 channels read, and the format's
// attributes agree with the reader; 32768 and above do not read.
TEST_F(FormatReadersFuzzRegression, ChannelCountBoundary) {
  for (const Container c : {Container::kRIFF, Container::kWave64}) {
    for (const std::uint32_t channels : {1u, 0x7FFEu, 0x7FFFu, 0x8000u, 0xBB02u, 0xFFFFu}) {
      SCOPED_TRACE(std::string(NameOf(c)) + " " + std::to_string(channels));
      const auto block = static_cast<std::uint16_t>(channels * 2);
      const Bytes bytes =
          FileImage({{kFmt, PcmFormat(static_cast<std::uint16_t>(channels), 8000, block)},
                     {kData, Pattern(static_cast<std::size_t>(channels) * 2 * 2)}},
                    c);
      const FileSpecification spec = Put(bytes);
      WAVEReader reader(spec);
      const bool readable = channels <= static_cast<std::uint32_t>(WAVEReader::kMaxChannels);
      ASSERT_EQ(reader.CanParse(), readable);
      auto format = std::make_shared<WAVESoundFileFormat>(spec);
      if (!readable) {
        const auto error = ErrorOf([&] { (void)format->GetFileAttributes(); });
        ASSERT_TRUE(error);
        EXPECT_EQ(error->GetIntErrorCode(), WAVEReader::kUnsupportedFormat);
        continue;
      }
      EXPECT_EQ(reader.GetNumberOfChannels(), static_cast<int>(channels));
      EXPECT_EQ(reader.GetNumberOfFrames(), 2);
      const SoundFileAttributes a = format->GetFileAttributes();
      EXPECT_EQ(a.mNumChannels, static_cast<int>(channels));
      EXPECT_EQ(a.mBytesPerSample, 2);
      EXPECT_EQ(a.mBytesPerFrame, a.mNumChannels * a.mBytesPerSample);
      EXPECT_EQ(format->GetLengthInFrames(), SampleCount(2));
    }
  }
}

}  // namespace
}  // namespace tarn::test
