// The host facade on files this library writes: every type and channel
// count round trip, reads of any range in any format, asynchronous reads,
// mono summing, recordings that can grow into Wave64, and the repair of
// recordings whose writer died.

#include <gtest/gtest.h>

#include <fstream>
#include <future>

#include "AudioChain/ChainTestUtil.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormat.h"
#include "tarn/Audio/SoundFileReader.h"
#include "tarn/Audio/SoundFileWriter.h"

namespace tarn::test {
namespace {

namespace fs = std::filesystem;

struct TypeCase {
  RIFFType type;
  const char* extension;
  bool bigEndian;
};
const TypeCase kTypes[] = {{MakeRIFFType("WAVE"), "wav", false},
                           {MakeRIFFType(".W64"), "w64", false},
                           {MakeRIFFType("AIFF"), "aiff", true},
                           {MakeRIFFType("AIFC"), "aifc", true}};

// Frame i, channel c of the test signal: a ramp of exact 16-bit values.
std::int16_t Sample16(std::int64_t i, int c) {
  return static_cast<std::int16_t>((i * 97 + c * 4099) % 65536 - 32768);
}

std::vector<std::int16_t> Interleaved16(std::int64_t frames, int channels, std::int64_t from = 0) {
  std::vector<std::int16_t> out;
  for (std::int64_t i = from; i < from + frames; ++i)
    for (int c = 0; c < channels; ++c) out.push_back(Sample16(i, c));
  return out;
}

fs::path Write16(const fs::path& dir, const TypeCase& t, int channels, std::int64_t frames) {
  const fs::path path = dir / (std::string("take.") + t.extension);
  SoundFileWriter::Settings settings;
  settings.fileType = t.type;
  settings.numChannels = static_cast<std::int16_t>(channels);
  settings.fileFormat = kSamp16;
  settings.clientFormat = kSamp16;
  SoundFileWriter out(SpecOf(path), settings);
  const auto frames16 = Interleaved16(frames, channels);
  out.WriteInterleaved(frames16.data(), frames);
  out.Close();
  return path;
}

TEST(Facade, ReadsAnyRangeInAnyFormat) {
  TempDir dir;
  constexpr std::int64_t kFrames = 5000;
  for (const auto& t : kTypes)
    for (int channels : {1, 2, 5, 8}) {
      SCOPED_TRACE(testing::Message() << t.extension << ", " << channels << " ch");
      SoundFileReader file(SpecOf(Write16(dir.path, t, channels, kFrames)));
      ASSERT_EQ(file.GetLengthInFrames(), kFrames);
      ASSERT_EQ(file.GetNumChannels(), channels);
      EXPECT_EQ(file.GetAttributes().mSampleFormat, kSamp16);
      for (auto [start, frames, expected] :
           {std::tuple<std::int64_t, std::int64_t, std::int64_t>{0, kFrames, kFrames},
            {2500, 100, 100},
            {kFrames - 1, 5, 1},
            {kFrames, 5, 0},
            {kFrames + 7, 5, 0},
            {10, 0, 0}}) {
        std::vector<std::vector<float>> floats;
        ASSERT_EQ(file.Read(start, frames, floats), expected) << "start " << start;
        std::vector<std::vector<std::int16_t>> ints(static_cast<std::size_t>(channels),
                                                    std::vector<std::int16_t>(6000));
        std::vector<void*> ptrs;
        for (auto& c : ints) ptrs.push_back(c.data());
        ASSERT_EQ(file.Read(start, frames, ptrs.data(), kSamp16), expected);
        for (int c = 0; c < channels; ++c)
          for (std::int64_t i = 0; i < expected; ++i) {
            ASSERT_EQ(ints[static_cast<std::size_t>(c)][static_cast<std::size_t>(i)],
                      Sample16(start + i, c));
            ASSERT_EQ(floats[static_cast<std::size_t>(c)][static_cast<std::size_t>(i)],
                      Sample16(start + i, c) / 32768.0f);
          }
      }
      EXPECT_EQ(ErrorOf([&] {
                  std::vector<std::vector<float>> f;
                  (void)file.Read(-1, 5, f);
                }),
                -50);
    }
}

TEST(Facade, AsyncReadsAndMonoSum) {
  TempDir dir;
  SoundFileReader file(SpecOf(Write16(dir.path, kTypes[2], 3, 20000)));
  for (SampleFormat f : {kSampFloat32, kSamp24}) {
    const int bytes = GetBytesPerSample(f);
    std::vector<Bytes> async(3, Bytes(8000 * static_cast<std::size_t>(bytes)));
    std::vector<Bytes> sync = async;
    std::vector<void*> a, s;
    for (int c = 0; c < 3; ++c) {
      a.push_back(async[static_cast<std::size_t>(c)].data());
      s.push_back(sync[static_cast<std::size_t>(c)].data());
    }
    std::promise<std::pair<int, SampleCount>> done;
    file.ReadAsync(12345, 8000, a.data(), f, [&](int status, SampleCount n) {
      done.set_value({status, n});
    });
    EXPECT_EQ(done.get_future().get(), std::make_pair(0, SampleCount(7655)));
    EXPECT_EQ(file.Read(12345, 8000, s.data(), f), 7655);
    EXPECT_EQ(async, sync);
  }
  auto mono = file.MakeReader({100, 200}, kSampFloat32, true);
  ASSERT_EQ(mono->GetNumChannels(), 1);
  ASSERT_EQ(mono->GetLengthInFrames(), 100);
  std::vector<float> sum(100);
  void* p[] = {sum.data()};
  ASSERT_EQ(mono->Read(p, 1000), 100);
  for (int i = 0; i < 100; ++i)
    ASSERT_EQ(sum[static_cast<std::size_t>(i)], Sample16(100 + i, 0) / 32768.0f +
                                                    Sample16(100 + i, 1) / 32768.0f +
                                                    Sample16(100 + i, 2) / 32768.0f);
}

TEST(Facade, FormatsMakeFloatingPointReaders) {
  TempDir dir;
  for (const auto& t : kTypes) {
    SCOPED_TRACE(t.extension);
    SoundFileReader file(SpecOf(Write16(dir.path, t, 2, 3000)));
    auto reader = file.GetFileFormat()->MakeFloatingPointReader({1000, 2500}, file.GetSampleRate());
    ASSERT_EQ(reader->GetFormat().mSampleFormat, kSampFloat32);
    ASSERT_EQ(reader->GetLengthInFrames(), 1500);
    std::vector<float> l(2000), r(2000);
    void* p[] = {l.data(), r.data()};
    ASSERT_EQ(reader->OutOfOrderRead(p, 1499, 10), 1);
    EXPECT_EQ(l[0], Sample16(2499, 0) / 32768.0f);
    EXPECT_EQ(r[0], Sample16(2499, 1) / 32768.0f);
    ASSERT_EQ(reader->Read(p, 2000), 1500);
    for (int i = 0; i < 1500; ++i)
      ASSERT_EQ(r[static_cast<std::size_t>(i)], Sample16(1000 + i, 1) / 32768.0f);
  }
}

TEST(Facade, FlushLeavesACompleteFileAndRecordingsCanOutgrowRIFF) {
  TempDir dir;
  for (const auto& t : kTypes) {
    SCOPED_TRACE(t.extension);
    const fs::path path = dir.path / (std::string("rec.") + t.extension);
    SoundFileWriter::Settings settings;
    settings.fileType = t.type;
    settings.numChannels = 2;
    settings.fileFormat = kSamp24;
    SoundFileWriter out(SpecOf(path), settings);
    std::vector<float> frames(2 * 300, 0.5f);
    for (int k = 1; k <= 3; ++k) {
      out.WriteInterleaved(frames.data(), 300);
      out.Flush();
      SoundFileReader check(SpecOf(path));
      EXPECT_EQ(check.GetLengthInFrames(), 300 * k);
      EXPECT_EQ(out.GetFramesWritten(), 300 * k);
    }
    // A WAVE recording may grow to Wave64's limit: its format switches it
    // in place when RIFF's sizes run out.
    if (t.type == MakeRIFFType("WAVE")) {
      EXPECT_GT(out.GetFileFormat()->GetMaxFrameCount(), SampleCount(std::int64_t{1} << 40));
    }
    out.Close();
  }
}

// Appends raw bytes to a file, as a writer does before it updates the
// header.
void Append(const fs::path& path, const std::vector<std::int16_t>& samples, bool bigEndian,
            int extraBytes) {
  std::ofstream out(path, std::ios::binary | std::ios::app);
  for (std::int16_t s : samples) {
    const auto u = static_cast<std::uint16_t>(s);
    const char b[2] = {static_cast<char>(bigEndian ? u >> 8 : u & 0xFF),
                       static_cast<char>(bigEndian ? u & 0xFF : u >> 8)};
    out.write(b, 2);
  }
  for (int k = 0; k < extraBytes; ++k) out.put('\x55');  // a frame cut short
}

TEST(Facade, RecoversCrashedRecordings) {
  TempDir dir;
  for (const auto& t : kTypes)
    for (std::int64_t headerFrames : {0, 1000})
      for (int partial : {0, 2}) {
        SCOPED_TRACE(testing::Message() << t.extension << ", header " << headerFrames << " frames, "
                                        << partial << " stray bytes");
        const fs::path path = Write16(dir.path, t, 2, headerFrames);
        // Intact files are left as they are.
        const auto before = fs::file_size(path);
        SoundFileWriter::RecoverCrashedRecording(SpecOf(path));
        ASSERT_EQ(fs::file_size(path), before);
        ASSERT_EQ(SoundFileReader(SpecOf(path)).GetLengthInFrames(), headerFrames);

        // Audio the writer got to disk before it died, after the header's
        // last update: every whole frame of it is recovered.
        Append(path, Interleaved16(777, 2, headerFrames), t.bigEndian, partial);
        SoundFileWriter::RecoverCrashedRecording(SpecOf(path));
        const std::int64_t expected = headerFrames + 777;
        SoundFileReader file(SpecOf(path));
        ASSERT_EQ(file.GetLengthInFrames(), expected);
        std::vector<std::int16_t> l(1800), r(1800);
        void* p[] = {l.data(), r.data()};
        ASSERT_EQ(file.Read(0, 1800, p, kSamp16), expected);
        for (std::int64_t i = 0; i < expected; ++i) {
          ASSERT_EQ(l[static_cast<std::size_t>(i)], Sample16(i, 0)) << i;
          ASSERT_EQ(r[static_cast<std::size_t>(i)], Sample16(i, 1)) << i;
        }
      }
}

}  // namespace
}  // namespace tarn::test
