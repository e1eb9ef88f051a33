// AudioOutFile through the formats, checked by libsndfile: the header is
// right after every flush (WAVE, AIFF, AIFC), a full disk fails loudly and
// keeps every flushed frame, a RIFF recording that passes 4 GiB turns into
// Wave64 in place; and the formats' readers give back what was written.

#include <sndfile.h>
#include <sys/resource.h>

#include <pthread.h>

#include <csignal>
#include <future>

#include "AudioIOTestUtil.h"

namespace tarn::test {
namespace {

// What libsndfile makes of a file: its frame count, channels, container and
// the raw (undecoded) bytes of frames [first, first + count).
struct Decoded {
  std::int64_t frames = -1;
  int channels = 0;
  int container = 0;
  Bytes raw;
};

Decoded Decode(const std::filesystem::path& path, std::int64_t first = 0, std::int64_t count = -1) {
  SF_INFO info{};
  SNDFILE* file = sf_open(path.c_str(), SFM_READ, &info);
  EXPECT_NE(file, nullptr) << "libsndfile cannot open " << path << ": " << sf_strerror(nullptr);
  if (file == nullptr) return {};
  Decoded d{info.frames, info.channels, info.format & SF_FORMAT_TYPEMASK, {}};
  if (count < 0) count = info.frames - first;
  if (sf_seek(file, first, SEEK_SET) == first) {
    const int bytesPerSample = [&] {
      switch (info.format & SF_FORMAT_SUBMASK) {
        case SF_FORMAT_PCM_S8:
        case SF_FORMAT_PCM_U8:
          return 1;
        case SF_FORMAT_PCM_16:
          return 2;
        case SF_FORMAT_PCM_24:
          return 3;
        case SF_FORMAT_DOUBLE:
          return 8;
        default:
          return 4;
      }
    }();
    d.raw.resize(static_cast<std::size_t>(count * info.channels * bytesPerSample));
    d.raw.resize(
        static_cast<std::size_t>(sf_read_raw(file, d.raw.data(), sf_count_t(d.raw.size()))));
  }
  sf_close(file);
  return d;
}

Bytes Swapped(Bytes bytes, int sampleSize) {
  for (std::size_t i = 0; i + sampleSize <= bytes.size(); i += sampleSize)
    std::reverse(bytes.begin() + std::ptrdiff_t(i), bytes.begin() + std::ptrdiff_t(i + sampleSize));
  return bytes;
}

struct Kind {
  const char* name;
  std::uint32_t type;
  int channels;
  SampleFormat format;
  bool lsbFirst;
  int container;  // libsndfile's
};
const Kind kKinds[] = {
    {"WAVE 16-bit stereo", MakeRIFFType("WAVE"), 2, kSamp16, true, SF_FORMAT_WAV},
    {"WAVE 24-bit mono", MakeRIFFType("WAVE"), 1, kSamp24, true, SF_FORMAT_WAV},
    {"WAVE float 3 ch", MakeRIFFType("WAVE"), 3, kSampFloat32, true, SF_FORMAT_WAV},
    {"AIFF 16-bit stereo", MakeRIFFType("AIFF"), 2, kSamp16, false, SF_FORMAT_AIFF},
    {"AIFF 24-bit mono", MakeRIFFType("AIFF"), 1, kSamp24, false, SF_FORMAT_AIFF},
    {"AIFC sowt stereo", MakeRIFFType("AIFF"), 2, kSamp16, true, SF_FORMAT_AIFF},
    {"AIFF float stereo", MakeRIFFType("AIFF"), 2, kSampFloat32, false, SF_FORMAT_AIFF},
};

std::shared_ptr<SoundFileFormat> Reopen(const std::filesystem::path& path, std::uint32_t type) {
  if (type == MakeRIFFType("AIFF")) return std::make_shared<AIFFSoundFileFormat>(SpecOf(path));
  return std::make_shared<WAVESoundFileFormat>(SpecOf(path));
}

TEST(AudioOutFile, TheHeaderIsRightAfterEveryFlushAndTheReaderGivesTheFramesBack) {
  for (const Kind& k : kKinds) {
    for (bool forced : {false, true}) {
      SCOPED_TRACE(testing::Message() << k.name << (forced ? ", aligned path forced" : ""));
      TempDir dir;
      const auto path = dir.Path(k.type == MakeRIFFType("AIFF") ? "rec.aif" : "rec.wav");
      auto format = NewRecording(path, Attributes(k.type, k.channels, k.format, k.lsbFirst));
      const int sampleSize = GetBytesPerSample(k.format), frameSize = sampleSize * k.channels;
      auto out =
          std::make_shared<AudioOutFile>(format, PlatformFileOptions{kCachedCaching, forced});
      EXPECT_EQ(out->NeedToSwapBytes(), !k.lsbFirst);
      EXPECT_EQ(out->GetFileFormat(), format);
      EXPECT_FALSE(out->HasFixedFileLength());
      Bytes written;
      std::uint32_t seed = 1;
      for (std::int64_t frames : {37, 1000, 3, 4097}) {
        const Bytes chunk = Noise(static_cast<std::size_t>(frames * frameSize), ++seed);
        out->Write(chunk.data(), frames);
        written.insert(written.end(), chunk.begin(), chunk.end());
        out->Flush();
        const std::int64_t total = std::int64_t(written.size()) / frameSize;
        const Decoded d = Decode(path);
        EXPECT_EQ(d.frames, total);
        EXPECT_EQ(d.channels, k.channels);
        // More than two channels make a WAVE_FORMAT_EXTENSIBLE file.
        EXPECT_EQ(d.container == SF_FORMAT_WAVEX ? SF_FORMAT_WAV : d.container, k.container);
        ASSERT_EQ(d.raw, k.lsbFirst ? written : Swapped(written, sampleSize));
        EXPECT_EQ(Reopen(path, k.type)->GetLengthInFrames(), SampleCount(total));
      }
      out->Close();
      auto reader =
          Reopen(path, k.type)->MakeReader({SampleCount(0), SampleCount(1 << 20)}, 48000.0);
      EXPECT_EQ(reader->GetFormat().mSampleFormat, k.format);
      Bytes back(written.size() + 100);
      EXPECT_EQ(reader->Read(back.data(), 1 << 20),
                SampleCount(std::int64_t(written.size()) / frameSize));
      back.resize(written.size());
      EXPECT_EQ(back, written);
    }
  }
}

TEST(AudioOutFile, WritersAppendAfterThePresentAudioAndReadersRefuseOtherRates) {
  TempDir dir;
  const auto path = dir.Path("a.wav");
  auto format = NewRecording(path, Attributes(MakeRIFFType("WAVE"), 1, kSamp16, true));
  const Bytes first = Noise(200), second = Noise(60, 9);
  {
    auto out = format->MakeWriter();
    out->Write(first.data(), 100);
    out->Close();
  }
  auto again = Reopen(path, MakeRIFFType("WAVE"));
  {
    // A chunk after the audio: the writer removes it before appending.
    auto rw = again->GetReadWriteMetaDataAccess();
    const Bytes note = Text("after the audio");
    again->WriteMetaData(*rw, MakeRIFFType("note"), RCBlobMT(note.data(), note.size()));
  }
  ASSERT_GT(std::filesystem::file_size(path),
            static_cast<std::uintmax_t>(again->GetFileAttributes().mOffsetToAudio + 200));
  {
    auto out = again->MakeWriter();
    out->Write(second.data(), 30);
  }  // destruction closes and fixes the header
  const Decoded d = Decode(path);
  EXPECT_EQ(d.frames, 130);
  Bytes both = first;
  both.insert(both.end(), second.begin(), second.end());
  EXPECT_EQ(d.raw, both);
  auto fresh = Reopen(path, MakeRIFFType("WAVE"));
  auto e = ErrorOf([&] { (void)fresh->MakeReader({SampleCount(0), SampleCount(10)}, 44100.0); });
  ASSERT_TRUE(e);
  EXPECT_EQ(e->GetIntErrorCode(), kParamErr);
  auto reader = fresh->MakeReader({SampleCount(120), SampleCount(500)}, 48000.0);
  EXPECT_EQ(reader->GetLengthInFrames(), SampleCount(10));
  Bytes tail(20);
  EXPECT_EQ(reader->OutOfOrderRead(tail.data(), 0, 10), SampleCount(10));
  EXPECT_EQ(tail, Bytes(second.begin() + 40, second.end()));
}

TEST(AudioInFile, AsynchronousReadsCompleteOnTheNamedReaderThread) {
  TempDir dir;
  const auto path = dir.Path("n.wav");
  auto format = NewRecording(path, Attributes(MakeRIFFType("WAVE"), 1, kSamp16, true));
  {
    const Bytes frames = Noise(64);
    auto out = format->MakeWriter();
    out->Write(frames.data(), 32);
  }
  auto reader =
      Reopen(path, MakeRIFFType("WAVE"))->MakeReader({SampleCount(0), SampleCount(32)}, 48000.0);
  Bytes buffer(64);
  std::promise<std::string> name;
  reader->OutOfOrderReadAsync(buffer.data(), 0, 32, [&](int, SampleCount) {
    char text[32] = {};
    pthread_getname_np(pthread_self(), text, sizeof text);
    name.set_value(text);
  });
  EXPECT_EQ(name.get_future().get(), std::string("PlatformAudioFile Reader Thread").substr(0, 15));
}

// Lowers the process's file-size limit for its lifetime: writes past it
// fail as on a full disk (EFBIG).
class FileSizeLimit {
 public:
  explicit FileSizeLimit(rlim_t bytes) {
    previousHandler_ = std::signal(SIGXFSZ, SIG_IGN);
    getrlimit(RLIMIT_FSIZE, &previous_);
    rlimit lowered = previous_;
    lowered.rlim_cur = bytes;
    EXPECT_EQ(setrlimit(RLIMIT_FSIZE, &lowered), 0);
  }
  FileSizeLimit(const FileSizeLimit&) = delete;
  FileSizeLimit& operator=(const FileSizeLimit&) = delete;
  ~FileSizeLimit() {
    setrlimit(RLIMIT_FSIZE, &previous_);
    std::signal(SIGXFSZ, previousHandler_);
  }

 private:
  rlimit previous_{};
  void (*previousHandler_)(int) = nullptr;
};

TEST(AudioOutFile, AFullDiskFailsLoudlyAndEveryFlushedFrameStaysReadable) {
  for (int caching : {kUnbufferedCaching, kCachedCaching}) {
    SCOPED_TRACE(caching);
    TempDir dir;
    const auto path = dir.Path("full.wav");
    auto format = NewRecording(path, Attributes(MakeRIFFType("WAVE"), 2, kSamp16, true));
    const std::int64_t offset = format->GetFileAttributes().mOffsetToAudio;
    Bytes flushed;
    std::optional<TarnError> error;
    {
      AudioOutFile out(format, {caching, false});
      FileSizeLimit limit(static_cast<rlim_t>(offset + 50'000));
      for (std::uint32_t seed = 1; seed < 100 && !error; ++seed) {
        const Bytes chunk = Noise(3001 * 4, seed);
        error = ErrorOf([&] {
          out.Write(chunk.data(), 3001);
          out.Flush();
        });
        if (!error) flushed.insert(flushed.end(), chunk.begin(), chunk.end());
      }
      ASSERT_TRUE(error) << "a write past the limit went unreported";
      EXPECT_EQ(error->GetIntErrorCode(), kIOErr);
      out.SetShouldTruncateOnDelete(false);
      (void)ErrorOf([&] { out.Close(); });
    }
    EXPECT_EQ(flushed.size(), 4u * 3001 * 4);
    auto reopened = Reopen(path, MakeRIFFType("WAVE"));
    ASSERT_GE(reopened->GetLengthInFrames(), SampleCount(std::int64_t(flushed.size()) / 4));
    auto reader = reopened->MakeReader(
        {SampleCount(0), SampleCount(std::int64_t(flushed.size()) / 4)}, 48000.0);
    Bytes back(flushed.size());
    EXPECT_EQ(reader->Read(back.data(), std::int64_t(flushed.size()) / 4),
              SampleCount(std::int64_t(flushed.size()) / 4));
    EXPECT_EQ(back, flushed);
  }
}

TEST(AudioOutFile, ARIFFRecordingPast4GiBBecomesWave64InPlace) {
  TempDir dir;
  const auto path = dir.Path("long.wav");
  auto format = NewRecording(path, Attributes(MakeRIFFType("WAVE"), 2, kSamp16, true));
  const std::int64_t offset = format->GetFileAttributes().mOffsetToAudio;
  // Just over what RIFF's 32-bit sizes hold; all but the last frames are a
  // hole of zeros.
  const std::int64_t frames = (std::int64_t{1} << 30) + 4096;
  const Bytes tail = Noise(1000 * 4, 5);
  {
    auto writer = std::dynamic_pointer_cast<AudioOutFile>(format->MakeWriter());
    ASSERT_TRUE(writer);
    writer->SetEOF(frames - 1000);
    writer->SetWritePosition(frames - 1000);
    writer->Write(tail.data(), 1000);
    writer->Flush();
    EXPECT_EQ(std::filesystem::file_size(path), static_cast<std::uintmax_t>(offset + frames * 4));
    writer->Close();
  }
  auto reopened = Reopen(path, MakeRIFFType("WAVE"));
  EXPECT_TRUE(reopened->IsExtendedFormat());
  EXPECT_EQ(reopened->GetLengthInFrames(), SampleCount(frames));
  EXPECT_EQ(reopened->GetFileAttributes().mOffsetToAudio, offset);
  const Decoded d = Decode(path, frames - 1001, 1001);
  EXPECT_EQ(d.container, SF_FORMAT_W64);
  EXPECT_EQ(d.frames, frames);
  ASSERT_EQ(d.raw.size(), tail.size() + 4);
  EXPECT_EQ(Bytes(d.raw.begin(), d.raw.begin() + 4), Bytes(4, 0));
  EXPECT_EQ(Bytes(d.raw.begin() + 4, d.raw.end()), tail);
  std::filesystem::remove(path);
}

}  // namespace
}  // namespace tarn::test
