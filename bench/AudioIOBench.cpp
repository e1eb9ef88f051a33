// Sample I/O through the reader and writer chain against libsndfile, on one
// 24-bit stereo 48 kHz WAVE file of 1 GiB of audio (TARN_AUDIOIO_MB sets
// another size):
//   Read       the whole file into one float buffer per channel, 64 Ki
//              frames at a time: ours through AudioInFile (cached or
//              unbuffered), DeinterleavingReader and ConvertingReader;
//              libsndfile's sf_readf_float, then the deinterleaving a host
//              would do.
//   ReadCold   the same with the file's pages dropped from the cache
//              (posix_fadvise DONTNEED) before each run: unbuffered against
//              cached reads of ours; and below it the bare disk's two
//              ways (read(2) in 1 MiB requests, cached and O_DIRECT), the
//              floor the platform sets under that ratio.
//   Write      the same frames from per-channel float into a new 24-bit
//              file: ours through SoundFileWriter (cached and unbuffered),
//              libsndfile interleaving first and then sf_writef_float; our
//              Close forces the data to the disk (fdatasync), so libsndfile
//              is also timed with an fdatasync after sf_close (WriteDurable).
//   AsyncRead  the completion latency of one 4 KiB read from the page cache:
//              PlatformAudioFile::AsyncRead on its reader thread against
//              pread on a condition-variable worker thread.
// Times are wall-clock medians of several runs; the ratio lines are ours /
// peer in time (below 1: ours is faster), in the form bench/run gathers.
//
// Usage: bench_AudioIOBench. Files go into $TARN_BENCH_DIR (or the system's
// temporary folder, which must not be tmpfs for the unbuffered reads) and
// are removed at the end.
#include <fcntl.h>
#include <sndfile.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <functional>
#include <memory>
#include <mutex>
#include <new>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "tarn/Audio/AudioInFile.h"
#include "tarn/Audio/ConvertingReader.h"
#include "tarn/Audio/DeinterleavingReader.h"
#include "tarn/Audio/PlatformAudioFile.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"
#include "tarn/Audio/SoundFileWriter.h"
#include "tarn/Errors/TarnError.h"
#include "tarn/FileSystem/FileSpecification.h"
#include "tarn/String/UString.h"

namespace {

using namespace tarn;
using Clock = std::chrono::steady_clock;

constexpr int kChannels = 2;
constexpr int kBlock = 65536;

FileSpecification Spec(const std::string& path) { return FileSpecification(UString(path.c_str())); }

double Seconds(Clock::duration d) { return std::chrono::duration<double>(d).count(); }

double Median(std::vector<double> v) {
  std::sort(v.begin(), v.end());
  return v[v.size() / 2];
}

template <typename F>
double TimeMedian(int runs, const std::function<void()>& before, F&& body) {
  std::vector<double> times;
  for (int i = 0; i < runs; ++i) {
    before();
    const auto t0 = Clock::now();
    body();
    times.push_back(Seconds(Clock::now() - t0));
  }
  return Median(times);
}

void DropCache(const std::string& path) {
  const int fd = ::open(path.c_str(), O_RDONLY);
  if (fd < 0) return;
  ::fdatasync(fd);
  ::posix_fadvise(fd, 0, 0, POSIX_FADV_DONTNEED);
  ::close(fd);
}

void WarmCache(const std::string& path) {
  const int fd = ::open(path.c_str(), O_RDONLY);
  if (fd < 0) return;
  std::vector<char> buffer(1 << 20);
  while (::read(fd, buffer.data(), buffer.size()) > 0) {
  }
  ::close(fd);
}

// Reads the whole file in 1 MiB requests with nothing else to do: through
// the system cache, or (direct) without it into an aligned buffer. On a cold
// cache this is what the disk itself gives each way, the floor under the
// chain's cold reads.
void ReadRaw(const std::string& path, bool direct) {
  const int fd = ::open(path.c_str(), O_RDONLY | (direct ? O_DIRECT : 0));
  if (fd < 0) throw std::runtime_error("cannot open " + path);
  constexpr std::size_t kRequest = 1 << 20;
  void* buffer = nullptr;
  if (::posix_memalign(&buffer, 4096, kRequest) != 0) throw std::bad_alloc();
  while (::read(fd, buffer, kRequest) > 0) {
  }
  std::free(buffer);
  ::close(fd);
}

// A ramp that fills every bit of the 24-bit samples over the file.
void FillBlock(std::vector<std::vector<float>>& channels, std::int64_t first) {
  for (int c = 0; c < kChannels; ++c)
    for (int i = 0; i < kBlock; ++i)
      channels[c][i] =
          static_cast<float>(((first + i) * (c + 3)) % 16777216 - 8388608) / 8388608.0f;
}

void WriteOurs(const std::string& path, std::int64_t frames, bool unbuffered) {
  SoundFileWriter::Settings settings;
  settings.unbuffered = unbuffered;
  settings.numChannels = kChannels;
  settings.fileFormat = kSamp24;
  SoundFileWriter out(Spec(path), settings);
  std::vector<std::vector<float>> channels(kChannels, std::vector<float>(kBlock));
  const void* pointers[kChannels] = {channels[0].data(), channels[1].data()};
  for (std::int64_t at = 0; at < frames; at += kBlock) {
    FillBlock(channels, at);
    out.Write(pointers, std::min<std::int64_t>(kBlock, frames - at));
  }
  out.Close();
}

// `durable`: the file's data is forced to the disk after sf_close, as our
// writer's Close does (a recording must survive a crash once closed).
void WriteSndfile(const std::string& path, std::int64_t frames, bool durable) {
  SF_INFO info{};
  info.samplerate = 48000;
  info.channels = kChannels;
  info.format = SF_FORMAT_WAV | SF_FORMAT_PCM_24;
  SNDFILE* file = sf_open(path.c_str(), SFM_WRITE, &info);
  if (!file) throw std::runtime_error(sf_strerror(nullptr));
  std::vector<std::vector<float>> channels(kChannels, std::vector<float>(kBlock));
  std::vector<float> interleaved(static_cast<std::size_t>(kBlock) * kChannels);
  for (std::int64_t at = 0; at < frames; at += kBlock) {
    FillBlock(channels, at);
    const auto n = std::min<std::int64_t>(kBlock, frames - at);
    for (std::int64_t i = 0; i < n; ++i)
      for (int c = 0; c < kChannels; ++c) interleaved[i * kChannels + c] = channels[c][i];
    sf_writef_float(file, interleaved.data(), n);
  }
  sf_close(file);
  if (durable) {
    const int fd = ::open(path.c_str(), O_WRONLY);
    if (fd >= 0) {
      ::fdatasync(fd);
      ::close(fd);
    }
  }
}

double ReadOurs(const std::string& path, int cachingMode) {
  const std::shared_ptr<SoundFileFormat> format =
      SoundFileFormatCache::Instance().GetFormat(Spec(path));
  const SampleCount length = format->GetLengthInFrames();
  const DSPSoundBiteSpec bite{format->GetFile(),
                              format->GetFileAttributes(),
                              format->GetChannelOrder(),
                              {SampleCount(0), length}};
  PlatformFileOptions options;
  options.mCachingMode = cachingMode;
  auto reader =
      ConvertingReader::Wrap(std::make_unique<DeinterleavingReader>(
                                 std::make_unique<AudioInFile>(bite, FileLength{length}, options)),
                             kSampFloat32);
  std::vector<std::vector<float>> channels(kChannels, std::vector<float>(kBlock));
  void* pointers[kChannels] = {channels[0].data(), channels[1].data()};
  double sum = 0;
  while (const std::int64_t got = reader->Read(pointers, kBlock).AsLongLong())
    sum += channels[0][got - 1] + channels[1][0];
  return sum;
}

double ReadSndfile(const std::string& path) {
  SF_INFO info{};
  SNDFILE* file = sf_open(path.c_str(), SFM_READ, &info);
  if (!file) throw std::runtime_error(sf_strerror(nullptr));
  std::vector<float> interleaved(static_cast<std::size_t>(kBlock) * kChannels);
  std::vector<std::vector<float>> channels(kChannels, std::vector<float>(kBlock));
  double sum = 0;
  while (const sf_count_t got = sf_readf_float(file, interleaved.data(), kBlock)) {
    for (sf_count_t i = 0; i < got; ++i)
      for (int c = 0; c < kChannels; ++c) channels[c][i] = interleaved[i * kChannels + c];
    sum += channels[0][got - 1] + channels[1][0];
  }
  sf_close(file);
  return sum;
}

// pread on a worker woken by a condition variable: the plain way to move a
// read off the caller's thread.
class PreadWorker {
 public:
  explicit PreadWorker(int fd) : fd_(fd), thread_([this] { Run(); }) {}
  ~PreadWorker() {
    {
      std::lock_guard lock(mutex_);
      stop_ = true;
    }
    wake_.notify_one();
    thread_.join();
  }
  void Post(void* buffer, std::size_t count, off_t position, std::function<void(ssize_t)> done) {
    {
      std::lock_guard lock(mutex_);
      job_ = Job{buffer, count, position, std::move(done)};
      pending_ = true;
    }
    wake_.notify_one();
  }

 private:
  struct Job {
    void* buffer;
    std::size_t count;
    off_t position;
    std::function<void(ssize_t)> done;
  };
  void Run() {
    std::unique_lock lock(mutex_);
    for (;;) {
      wake_.wait(lock, [this] { return pending_ || stop_; });
      if (stop_) return;
      Job job = std::move(job_);
      pending_ = false;
      lock.unlock();
      job.done(::pread(fd_, job.buffer, job.count, job.position));
      lock.lock();
    }
  }
  int fd_;
  std::mutex mutex_;
  std::condition_variable wake_;
  bool pending_ = false;
  bool stop_ = false;
  Job job_{};
  std::thread thread_;
};

// Median completion latency of `rounds` 4 KiB reads at spread positions.
template <typename Post>
double AsyncLatency(int rounds, std::int64_t fileBytes, Post&& post) {
  std::vector<double> times;
  std::atomic<bool> done{false};
  for (int i = 0; i < rounds; ++i) {
    const std::int64_t position = (static_cast<std::int64_t>(i) * 7919 * 4096) % (fileBytes - 4096);
    done.store(false, std::memory_order_relaxed);
    const auto t0 = Clock::now();
    Clock::time_point t1;
    post(position & ~std::int64_t{4095}, [&] {
      t1 = Clock::now();
      done.store(true, std::memory_order_release);
    });
    while (!done.load(std::memory_order_acquire)) std::this_thread::yield();
    times.push_back(Seconds(t1 - t0) * 1e6);
  }
  return Median(times);
}

void Report(const char* what, const char* peer, double ours, double theirs, const char* unit) {
  std::printf("%-10s ours %10.3f %s   %-18s %10.3f %s\n", what, ours, unit, peer, theirs, unit);
  std::printf("%s ours / %s = %.2f\n", what, peer, ours / theirs);
}

}  // namespace

int main() {
  const char* dirEnv = std::getenv("TARN_BENCH_DIR");
  const std::filesystem::path dir =
      std::filesystem::path(dirEnv ? dirEnv : std::filesystem::temp_directory_path().string()) /
      ("tarn-audioio-" + std::to_string(::getpid()));
  std::filesystem::create_directories(dir);
  const char* mbEnv = std::getenv("TARN_AUDIOIO_MB");
  const std::int64_t megabytes = mbEnv ? std::max(1L, std::atol(mbEnv)) : 1024;
  const std::int64_t frames = megabytes * 1024 * 1024 / (3 * kChannels);
  const std::string ours = (dir / "ours.wav").string();
  const std::string theirs = (dir / "theirs.wav").string();
  const auto nothing = [] {};
  int status = 0;
  try {
    std::printf("AudioIOBench: %lld MiB of 24-bit stereo audio in %s\n",
                static_cast<long long>(megabytes), dir.c_str());
    const double writeOurs = TimeMedian(3, nothing, [&] { WriteOurs(ours, frames, false); });
    const double writeUnbuffered = TimeMedian(3, nothing, [&] { WriteOurs(ours, frames, true); });
    const double writeTheirs = TimeMedian(3, nothing, [&] { WriteSndfile(theirs, frames, false); });
    const double writeTheirsDurable =
        TimeMedian(3, nothing, [&] { WriteSndfile(theirs, frames, true); });

    WarmCache(ours);
    double checkOurs = 0, checkTheirs = 0;
    const double readOurs =
        TimeMedian(3, nothing, [&] { checkOurs = ReadOurs(ours, kCachedCaching); });
    const double readTheirs = TimeMedian(3, nothing, [&] { checkTheirs = ReadSndfile(ours); });
    if (checkOurs != checkTheirs) {
      std::printf("read check differs: ours %.9g, libsndfile %.9g\n", checkOurs, checkTheirs);
      status = 1;
    }
    const double readUnbufferedWarm =
        TimeMedian(3, nothing, [&] { ReadOurs(ours, kUnbufferedCaching); });
    const auto drop = [&] { DropCache(ours); };
    const double coldCached = TimeMedian(3, drop, [&] { ReadOurs(ours, kCachedCaching); });
    const double coldUnbuffered = TimeMedian(3, drop, [&] { ReadOurs(ours, kUnbufferedCaching); });
    const double rawCached = TimeMedian(3, drop, [&] { ReadRaw(ours, false); });
    const double rawDirect = TimeMedian(3, drop, [&] { ReadRaw(ours, true); });

    const double mib = static_cast<double>(megabytes);
    std::printf("\n%-28s %10s %10s\n", "case", "seconds", "MiB/s");
    const auto row = [&](const char* name, double s) {
      std::printf("%-28s %10.3f %10.1f\n", name, s, mib / s);
    };
    row("write ours (float->s24)", writeOurs);
    row("write ours unbuffered", writeUnbuffered);
    row("write libsndfile", writeTheirs);
    row("write libsndfile + fdatasync", writeTheirsDurable);
    row("read ours cached", readOurs);
    row("read ours unbuffered (warm)", readUnbufferedWarm);
    row("read libsndfile", readTheirs);
    row("cold read ours cached", coldCached);
    row("cold read ours unbuffered", coldUnbuffered);
    row("cold read(2) cached", rawCached);
    row("cold read(2) O_DIRECT", rawDirect);
    std::printf("\n");
    Report("Write", "libsndfile", writeOurs, writeTheirs, "s");
    Report("WriteUnbuffered", "libsndfile", writeUnbuffered, writeTheirs, "s");
    // Ours closes durably (fdatasync): the same guarantee asked of the peer.
    Report("WriteDurable", "libsndfile_fdatasync", writeOurs, writeTheirsDurable, "s");
    Report("Read", "libsndfile", readOurs, readTheirs, "s");
    Report("ReadUnbuffered", "libsndfile", readUnbufferedWarm, readTheirs, "s");
    Report("ReadCold", "cached_cold", coldUnbuffered, coldCached, "s");
    // The same comparison for the bare disk: what the platform allows the
    // line above.
    Report("ReadColdDisk", "cached_cold_disk", rawDirect, rawCached, "s");

    // Completion latency of a 4 KiB read from the page cache.
    WarmCache(ours);
    const std::int64_t bytes = static_cast<std::int64_t>(std::filesystem::file_size(ours));
    std::vector<char> storage(4096);
    char* const buffer = storage.data();
    PlatformFileOptions cached;
    cached.mCachingMode = kCachedCaching;
    PlatformAudioFile file(Spec(ours), false, cached);
    const double asyncOurs = AsyncLatency(20000, bytes, [&](std::int64_t at, auto done) {
      file.AsyncRead(buffer, static_cast<std::uint64_t>(at), 4096,
                     [done](std::int32_t, std::int32_t) { done(); });
    });
    const int fd = ::open(ours.c_str(), O_RDONLY);
    double asyncTheirs = 0;
    {
      PreadWorker worker(fd);
      asyncTheirs = AsyncLatency(20000, bytes, [&](std::int64_t at, auto done) {
        worker.Post(buffer, 4096, static_cast<off_t>(at), [done](ssize_t) { done(); });
      });
    }
    ::close(fd);
    Report("AsyncRead4K", "pread_cv_worker", asyncOurs, asyncTheirs, "us");
  } catch (const TarnError& error) {
    std::printf("failed: TarnError %d\n", static_cast<int>(error.GetIntErrorCode()));
    status = 1;
  } catch (const std::exception& error) {
    std::printf("failed: %s\n", error.what());
    status = 1;
  }
  std::error_code ignored;
  std::filesystem::remove_all(dir, ignored);
  return status;
}
