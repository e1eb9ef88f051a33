// AudioOutFile through the formats, checked by libsndfile: the header is
// right after every flush (WAVE, AIFF, AIFC), a full disk fails loudly and
// keeps every flushed frame, a RIFF recording past 4 GiB turns into Wave64
// in place; the formats' readers give back what was written.

#include <pthread.h>
#include <sndfile.h>
#include <sys/resource.h>

#include <csignal>
#include <future>

#include "AudioIOTestUtil.h"

namespace tarn::test {
namespace {

// libsndfile's view of a file: frames, channels, container, and the raw
// bytes of frames [first, first + count) as stored.
struct Decoded {
  std::int64_t frames = -1;
  int channels = 0, container = 0;
  Bytes raw;
};

Decoded Decode(const std::filesystem::path& path, std::int64_t first = 0, std::int64_t count = -1) {
  SF_INFO info{};
  SNDFILE* file = sf_open(path.c_str(), SFM_READ, &info);
  EXPECT_NE(file, nullptr) << "libsndfile cannot open " << path << ": " << sf_strerror(nullptr);
  if (file == nullptr) return {};
  Decoded d{info.frames, info.channels, info.format & SF_FORMAT_TYPEMASK, {}};
  if (count < 0) count = info.frames - first;
  const int subtype = info.format & SF_FORMAT_SUBMASK;  // 16-bit, 24-bit or 32-bit here
  d.raw.resize(std::size_t(count * info.channels *
                           (subtype == SF_FORMAT_PCM_16   ? 2
                            : subtype == SF_FORMAT_PCM_24 ? 3
                                                          : 4)));
  if (sf_seek(file, first, SEEK_SET) != first) d.raw.clear();
  d.raw.resize(std::size_t(sf_read_raw(file, d.raw.data(), sf_count_t(d.raw.size()))));
  sf_close(file);
  return d;
}

TEST(AudioOutFile, TheHeaderIsRightAfterEveryFlushAndTheReaderGivesTheFramesBack) {
  const std::tuple<const char*, int, SampleFormat, bool> kinds[] = {
      {"a.wav", 2, kSamp16, true},      {"b.wav", 1, kSamp24, true},
      {"c.wav", 3, kSampFloat32, true}, {"d.aif", 2, kSamp16, false},
      {"e.aif", 1, kSamp24, false},     {"sowt.aif", 2, kSamp16, true},
      {"f.aif", 2, kSampFloat32, false}};
  for (const auto& [name, channels, sampleFormat, lsbFirst] : kinds) {
    for (bool forced : {false, true}) {
      SCOPED_TRACE(testing::Message() << name << (forced ? ", aligned path forced" : ""));
      TempDir dir;
      const auto path = dir.Path(name);
      const bool aiff = path.extension() == ".aif";
      auto format = FormatOf(
          path, Attributes(MakeRIFFType(aiff ? "AIFF" : "WAVE"), channels, sampleFormat, lsbFirst));
      const int sampleSize = GetBytesPerSample(sampleFormat), frameSize = sampleSize * channels;
      AudioOutFile out(format, {kCachedCaching, forced});
      EXPECT_EQ(out.NeedToSwapBytes(), !lsbFirst);
      Bytes written;
      for (std::int64_t frames : {37, 1000, 3, 4097}) {
        const Bytes chunk = Noise(std::size_t(frames * frameSize), std::uint32_t(frames));
        out.Write(chunk.data(), frames);
        EXPECT_EQ(chunk, Noise(chunk.size(), std::uint32_t(frames))) << "swapped in place";
        written.insert(written.end(), chunk.begin(), chunk.end());
        out.Flush();
        const Decoded d = Decode(path);
        EXPECT_EQ(d.frames, std::int64_t(written.size()) / frameSize);
        EXPECT_EQ(d.channels, channels);
        // More than two channels make a WAVE_FORMAT_EXTENSIBLE file.
        EXPECT_EQ(d.container, aiff           ? SF_FORMAT_AIFF
                               : channels > 2 ? SF_FORMAT_WAVEX
                                              : SF_FORMAT_WAV);
        ASSERT_EQ(d.raw, lsbFirst ? written : Swapped(written, sampleSize));
        EXPECT_EQ(FormatOf(path)->GetLengthInFrames(), SampleCount(d.frames));
      }
      out.Close();
      auto reader = FormatOf(path)->MakeReader({SampleCount(0), SampleCount(1 << 20)}, 48000.0);
      Bytes back(written.size() + 100);
      EXPECT_EQ(reader->Read(back.data(), 1 << 20),
                SampleCount(std::int64_t(written.size()) / frameSize));
      back.resize(written.size());
      EXPECT_EQ(back, written);
    }
  }
}

TEST(AudioOutFile, WritersAppendAfterThePresentAudioReadersTakeTheFileRateOnly) {
  TempDir dir;
  const auto path = dir.Path("a.wav");
  const Bytes first = Noise(200), second = Noise(60, 9);
  FormatOf(path, Attributes(MakeRIFFType("WAVE"), 1, kSamp16, true))
      ->MakeWriter()
      ->Write(first.data(), 100);
  auto again = FormatOf(path);
  {
    // A chunk after the audio: the writer removes it before appending.
    auto rw = again->GetReadWriteMetaDataAccess();
    const Bytes note = Text("after the audio");
    again->WriteMetaData(*rw, MakeRIFFType("note"), RCBlobMT(note.data(), note.size()));
  }
  ASSERT_GT(std::filesystem::file_size(path),
            std::uintmax_t(again->GetFileAttributes().mOffsetToAudio + 200));
  again->MakeWriter()->Write(second.data(), 30);  // destruction closes and fixes the header
  Bytes both = first;
  both.insert(both.end(), second.begin(), second.end());
  EXPECT_EQ(Decode(path).raw, both);
  auto fresh = FormatOf(path);
  EXPECT_EQ(ErrorOf([&] {
              (void)fresh->MakeReader({SampleCount(0), SampleCount(10)}, 44100.0);
            })->GetIntErrorCode(),
            kParamErr);
  auto reader = fresh->MakeReader({SampleCount(120), SampleCount(500)}, 48000.0);
  EXPECT_EQ(reader->GetLengthInFrames(), SampleCount(10));
  Bytes tail(20);
  std::promise<std::string> thread;
  reader->OutOfOrderReadAsync(tail.data(), 0, 10, [&](int, SampleCount) {
    char name[16] = {};
    pthread_getname_np(pthread_self(), name, sizeof name);
    thread.set_value(name);
  });
  EXPECT_EQ(thread.get_future().get(),
            std::string("PlatformAudioFile Reader Thread").substr(0, 15));
  EXPECT_EQ(tail, Bytes(second.begin() + 40, second.end()));
}

// Lowers the process's file-size limit for its lifetime: writes past it fail
// as on a full disk (EFBIG).
class FileSizeLimit {
 public:
  explicit FileSizeLimit(rlim_t bytes) : handler_(std::signal(SIGXFSZ, SIG_IGN)) {
    getrlimit(RLIMIT_FSIZE, &previous_);
    rlimit lowered = previous_;
    lowered.rlim_cur = bytes;
    EXPECT_EQ(setrlimit(RLIMIT_FSIZE, &lowered), 0);
  }
  ~FileSizeLimit() {
    setrlimit(RLIMIT_FSIZE, &previous_);
    std::signal(SIGXFSZ, handler_);
  }

 private:
  void (*handler_)(int);
  rlimit previous_{};
};

TEST(AudioOutFile, AFullDiskFailsLoudlyAndEveryFlushedFrameStaysReadable) {
  for (int caching : {kUnbufferedCaching, kCachedCaching}) {
    SCOPED_TRACE(caching);
    TempDir dir;
    const auto path = dir.Path("full.wav");
    auto format = FormatOf(path, Attributes(MakeRIFFType("WAVE"), 2, kSamp16, true));
    Bytes flushed;
    std::optional<TarnError> error;
    {
      AudioOutFile out(format, {caching, false});
      FileSizeLimit limit(rlim_t(format->GetFileAttributes().mOffsetToAudio + 50'000));
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
    const std::int64_t frames = std::int64_t(flushed.size()) / 4;
    EXPECT_EQ(frames, 4 * 3001);
    auto reader = FormatOf(path)->MakeReader({SampleCount(0), SampleCount(frames)}, 48000.0);
    Bytes back(flushed.size());
    EXPECT_EQ(reader->Read(back.data(), frames), SampleCount(frames));
    EXPECT_EQ(back, flushed);
  }
}

TEST(AudioOutFile, ARIFFRecordingPast4GiBBecomesWave64InPlace) {
  TempDir dir;
  const auto path = dir.Path("long.wav");
  auto format = FormatOf(path, Attributes(MakeRIFFType("WAVE"), 2, kSamp16, true));
  const std::int64_t offset = format->GetFileAttributes().mOffsetToAudio;
  // Just past what RIFF's 32-bit sizes hold; all but the tail is a hole.
  const std::int64_t frames = (std::int64_t{1} << 30) + 4096;
  const Bytes tail = Noise(1000 * 4, 5);
  {
    auto writer = std::dynamic_pointer_cast<AudioOutFile>(format->MakeWriter());
    ASSERT_TRUE(writer);
    writer->SetEOF(frames - 1000);
    writer->SetWritePosition(frames - 1000);
    writer->Write(tail.data(), 1000);
    writer->Flush();
    EXPECT_EQ(std::filesystem::file_size(path), std::uintmax_t(offset + frames * 4));
  }
  auto reopened = FormatOf(path);
  EXPECT_TRUE(reopened->IsExtendedFormat());
  EXPECT_EQ(reopened->GetLengthInFrames(), SampleCount(frames));
  EXPECT_EQ(reopened->GetFileAttributes().mOffsetToAudio, offset);
  const Decoded d = Decode(path, frames - 1001, 1001);
  EXPECT_EQ(d.container, SF_FORMAT_W64);
  EXPECT_EQ(d.frames, frames);
  Bytes expected(4, 0);
  expected.insert(expected.end(), tail.begin(), tail.end());
  EXPECT_EQ(d.raw, expected);
  std::filesystem::remove(path);
}

}  // namespace
}  // namespace tarn::test
