// Decoding through the outside converter: a 10-minute 48 kHz stereo file in
// each lossless form (ALAC in M4A, FLAC in CAF, PCM in MOV), made with
// ffmpeg at start-up, read whole through this library's reader chain into
// deinterleaved float, next to ffmpeg's own tool decoding the same file to
// raw float (-f f32le to /dev/null). Times are processor time (ours: this
// process; ffmpeg's: the child's user + system time), best of a few runs;
// the ratio is ours / ffmpeg's (below 1 is faster). A form that ffmpeg
// itself cannot decode is reported and skipped.
//   bench_ConverterDecodeBench [SECONDS]   (default 600)
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include "tarn/Audio/AudioReader.h"
#include "tarn/Audio/SoundFileFormats/ConverterSoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/RIFFType.h"
#include "tarn/Errors/TarnError.h"

namespace {

namespace fs = std::filesystem;
constexpr int kRuns = 3;

double ProcessSeconds() {
  timespec t{};
  clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &t);
  return static_cast<double>(t.tv_sec) + static_cast<double>(t.tv_nsec) * 1e-9;
}

double ChildrenSeconds() {
  rusage usage{};
  getrusage(RUSAGE_CHILDREN, &usage);
  const auto seconds = [](const timeval& t) {
    return static_cast<double>(t.tv_sec) + static_cast<double>(t.tv_usec) * 1e-6;
  };
  return seconds(usage.ru_utime) + seconds(usage.ru_stime);
}

int Run(const std::string& command) { return std::system(command.c_str()); }

// Our read: open, count, and read every frame as per-channel float.
std::int64_t DecodeWithTarn(const fs::path& file, std::uint32_t type) {
  tarn::ConverterSoundFileFormat format(tarn::FileSpecification(tarn::UString(file.string())),
                                        type);
  const tarn::SampleCount length = format.GetLengthInFrames();
  std::unique_ptr<tarn::AudioReader> reader =
      format.MakeFloatingPointReader({0, length}, format.GetNaturalRate());
  constexpr int kBlock = 32768;
  const int channels = reader->GetFormat().mNumChannels;
  std::vector<std::vector<float>> planes(channels, std::vector<float>(kBlock));
  std::vector<void*> pointers;
  for (auto& plane : planes) pointers.push_back(plane.data());
  std::int64_t frames = 0;
  for (;;) {
    const tarn::SampleCount got = reader->Read(pointers.data(), kBlock);
    if (got == tarn::SampleCount(0)) break;
    frames += got.AsLongLong();
  }
  return frames;
}

}  // namespace

int main(int argc, char** argv) {
  const int seconds = argc > 1 ? std::max(1, std::atoi(argv[1])) : 600;
  const fs::path dir =
      fs::temp_directory_path() / ("tarn-decode-bench-" + std::to_string(getpid()));
  fs::create_directories(dir);
  const std::string ff = "ffmpeg -nostdin -hide_banner -loglevel error -y ";
  const std::string source = (dir / "source.wav").string();
  std::printf("making a %d s 48 kHz stereo tone in %s ...\n", seconds, dir.c_str());
  const std::string noise = "anoisesrc=d=" + std::to_string(seconds) + ":r=48000:a=0.25";
  if (Run(ff + "-filter_complex \"" + noise + ":seed=1[a];" + noise +
          ":c=pink:seed=2[b];[a][b]amerge=inputs=2\" -c:a pcm_s16le '" + source + "'") != 0) {
    std::fprintf(stderr, "ffmpeg could not make the source file\n");
    return 1;
  }
  struct Form {
    const char* label;
    const char* file;
    const char* args;
    char type[5];
  };
  const Form forms[] = {
      {"ALAC in M4A", "alac.m4a", "-c:a alac", "M4A "},
      {"FLAC in CAF", "flac.caf", "-c:a flac", "caff"},
      {"FLAC in MP4", "flac.m4a", "-c:a flac -strict -2 -f mp4", "M4A "},
      {"PCM in MOV", "pcm.mov", "-c:a pcm_s16le", "MooV"},
  };
  std::printf("%-12s %10s %12s %12s %8s\n", "form", "frames", "ours (s)", "ffmpeg (s)", "ratio");
  for (const Form& form : forms) {
    const fs::path file = dir / form.file;
    if (Run(ff + "-i '" + source + "' " + form.args + " '" + file.string() + "'") != 0) {
      std::printf("%-12s ffmpeg cannot write it\n", form.label);
      continue;
    }
    const std::string peer = ff + "-i '" + file.string() + "' -f f32le -c:a pcm_f32le /dev/null";
    if (Run(peer) != 0) {
      std::printf("%-12s skipped: ffmpeg's own tool cannot decode it\n", form.label);
      continue;
    }
    double ours = 1e30, theirs = 1e30;
    std::int64_t frames = 0;
    try {
      for (int run = 0; run < kRuns; ++run) {
        const double t0 = ProcessSeconds();
        frames = DecodeWithTarn(file, tarn::MakeRIFFType(form.type));
        ours = std::min(ours, ProcessSeconds() - t0);
        const double c0 = ChildrenSeconds();
        Run(peer);
        theirs = std::min(theirs, ChildrenSeconds() - c0);
      }
    } catch (const tarn::TarnError&) {
      std::printf("%-12s our reader failed\n", form.label);
      continue;
    }
    std::printf("%-12s %10lld %12.3f %12.3f %8.2f\n", form.label, static_cast<long long>(frames),
                ours, theirs, ours / theirs);
  }
  std::error_code ignored;
  fs::remove_all(dir, ignored);
  return 0;
}
