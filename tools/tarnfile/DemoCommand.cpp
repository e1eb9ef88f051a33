// demo: the library at work on real files, step by step, with a table of
// what was done and how long each step took.
#include <chrono>
#include <cmath>
#include <cstdio>
#include <filesystem>
#include <functional>
#include <random>
#include <string>
#include <vector>

#include "AudioJobs.h"
#include "Commands.h"
#include "ToolSupport.h"
#include "tarn/Audio/AudioReader.h"
#include "tarn/Audio/SoundFileFormats/BWFBroadcastWaveExtension.h"
#include "tarn/Audio/SoundFileFormats/ConverterSoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/RIFFFileEditor.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormat.h"
#include "tarn/Audio/SoundFileWriter.h"
#include "tarn/Basics/TarnCoreVersion.h"
#include "tarn/Errors/Fail.h"
#include "tarn/Streams/CFileStream.h"

namespace tarnfile {

namespace {

namespace fs = std::filesystem;
using tarn::MakeRIFFType;

constexpr double kRate = 48000.0;
constexpr std::int64_t kFrames = 48000;  // one second
const Tone kTone{ToneShape::kSine, 440.0, 0.5};

struct Row {
  std::string step;
  bool ok = false;
  double ms = 0;
  std::string what;
};

struct DemoFile {
  std::string path;
  AudioTarget target;
};

class Demo {
 public:
  explicit Demo(fs::path dir) : dir_(std::move(dir)) {}

  int Run() {
    std::printf("TarnCore %s: demo in %s\n", tarn::GetTarnCoreVersion(), dir_.string().c_str());
    Step("write", [this] { return WriteEveryFormat(); });
    Step("read back", [this] { return ReadBack(); });
    Step("convert", [this] { return Convert(); });
    Step("edit bext", [this] { return EditBext(); });
    Step("recover", [this] { return Recover(); });
    Step("to Wave64", [this] { return SwitchToWave64(); });
    Step("converter", [this] { return ReadThroughConverter(); });
    PrintTable();
    return failures_ == 0 ? 0 : 1;
  }

 private:
  std::string Path(const std::string& name) const { return (dir_ / name).string(); }

  // Runs one step, timing it; a failure is reported and the demo goes on.
  void Step(const char* name, const std::function<std::string()>& step) {
    std::printf("\n== %s\n", name);
    std::fflush(stdout);
    Row row{name, false, 0, {}};
    const auto start = std::chrono::steady_clock::now();
    try {
      row.what = step();
      row.ok = true;
    } catch (const UsageError& e) {
      row.what = e.what();
    } catch (...) {
      row.what = CurrentFile() + ": " + tarn::GetCurrentError().Describe();
    }
    row.ms =
        std::chrono::duration<double, std::milli>(std::chrono::steady_clock::now() - start).count();
    if (!row.ok) {
      ++failures_;
      std::printf("   FAILED: %s\n", row.what.c_str());
    }
    rows_.push_back(row);
  }

  // The tone in every container and every sample format it holds (stereo;
  // 32-bit integer WAVE files take three channels).
  std::string WriteEveryFormat() {
    for (Container c : {Container::kRIFF, Container::kWave64, Container::kAIFF, Container::kAIFC}) {
      const char* ext = c == Container::kRIFF     ? "wav"
                        : c == Container::kWave64 ? "w64"
                        : c == Container::kAIFF   ? "aiff"
                                                  : "aifc";
      for (int channels : {2, 3}) {
        for (tarn::SampleFormat format : StorableFormats(c, channels)) {
          // Three channels only where two cannot hold the format.
          const auto stereo = StorableFormats(c, 2);
          if (channels == 3 && std::find(stereo.begin(), stereo.end(), format) != stereo.end())
            continue;
          DemoFile file;
          file.target = {c, format, channels, kRate, tarn::kNoDither, false};
          file.path = Path(std::string("tone-") + SampleFormatName(format) + "." + ext);
          WriteTone(file.path, file.target, kTone, kFrames);
          std::printf("   %-22s %s %-7s %d ch\n", fs::path(file.path).filename().string().c_str(),
                      FormatName(c), SampleFormatName(format), channels);
          files_.push_back(file);
        }
      }
    }
    return std::to_string(files_.size()) + " files: 440 Hz sine, 1 s at 48 kHz";
  }

  // A file of a type only the outside converter reads would need an encoder
  // this library does not have; the 16-bit AIFC tone, which the converter
  // decodes as well, shows the same path: opened by the converter's format
  // object, read through the same float chain, sample for sample equal to
  // what the AIFF reader gives.
  std::string ReadThroughConverter() {
    const std::string path = Path("tone-s16.aifc");
    FileScope scope(path);
    const SoundFile direct = OpenSoundFile(path);
    auto format =
        std::make_shared<tarn::ConverterSoundFileFormat>(direct.spec, MakeRIFFType("AIFC"));
    const tarn::SampleCount frames = format->GetLengthInFrames();
    auto reader =
        format->MakeFloatingPointReader({tarn::SampleCount(0), frames}, format->GetNaturalRate());
    std::vector<std::vector<float>> decoded(static_cast<std::size_t>(reader->GetNumChannels()),
                                            std::vector<float>(static_cast<std::size_t>(kFrames)));
    std::vector<void*> pointers;
    for (auto& channel : decoded) pointers.push_back(channel.data());
    const std::int64_t got = reader->Read(pointers.data(), kFrames).AsLongLong();
    const auto expected = ReadFramesAsFloat(direct);
    if (got != kFrames || decoded != expected)
      throw UsageError(path + ": the outside converter decodes other samples than the AIFF reader");
    std::printf("   %s through the outside converter: %lld frames, equal to the AIFF reader's\n",
                fs::path(path).filename().string().c_str(), static_cast<long long>(got));
    return "AIFC decoded by the outside converter, sample-exact";
  }

  // Each file read back: its header facts and every sample against the
  // generator, within two steps of the sample format (the tone passes
  // through 32-bit floats on its way in).
  std::string ReadBack() {
    const tarn::FunctionGenerator generator = MakeToneGenerator(kTone, kRate);
    double worst = 0;
    for (const DemoFile& f : files_) {
      FileScope scope(f.path);
      const SoundFile file = OpenSoundFile(f.path);
      const auto& a = file.attributes;
      if (file.container != f.target.container || a.mNumChannels != f.target.channels ||
          a.mSampleRate != kRate || a.mSampleFormat != f.target.format || file.frames != kFrames)
        throw UsageError(f.path + ": header facts differ from what was written");
      const auto frames = ReadFramesAsFloat(file);
      const int bits = 8 * tarn::GetBytesPerSample(f.target.format);
      const bool isFloat =
          f.target.format == tarn::kSampFloat32 || f.target.format == tarn::kSampWide64B;
      const double step =
          isFloat ? 1e-7
                  : std::ldexp(1.0, -(f.target.format == tarn::kSampUnpacked24 ? 23 : bits - 1));
      double error = 0;
      for (std::int64_t i = 0; i < kFrames; ++i) {
        const double want = generator.GetValue(static_cast<double>(i));
        for (const auto& channel : frames)
          error = std::max(error, std::fabs(channel[static_cast<std::size_t>(i)] - want));
      }
      std::printf("   %-22s %6lld frames, largest error %.3g (%.2f steps)\n",
                  fs::path(f.path).filename().string().c_str(), static_cast<long long>(file.frames),
                  error, error / step);
      if (error > step * 2) throw UsageError(f.path + ": samples differ from the tone");
      worst = std::max(worst, error / step);
    }
    char text[96];
    std::snprintf(text, sizeof text, "%zu files match the tone (worst %.2f steps)", files_.size(),
                  worst);
    return text;
  }

  // 24-bit to 16-bit with and without dither, and 24-bit AIFF to 32-bit
  // float Wave64 (exact).
  std::string Convert() {
    const std::string source = Path("tone-s24.wav");
    AudioTarget plain{Container::kRIFF, tarn::kSamp16, 2, kRate, tarn::kNoDither, false};
    AudioTarget dithered = plain;
    dithered.dither = tarn::kTriangularDither;
    ConvertFile(source, Path("convert-s16.wav"), plain);
    ConvertFile(source, Path("convert-s16-tpdf.wav"), dithered);
    const auto a = ReadFramesAsFloat(OpenSoundFile(Path("convert-s16.wav")));
    const auto b = ReadFramesAsFloat(OpenSoundFile(Path("convert-s16-tpdf.wav")));
    std::size_t differ = 0;
    std::size_t samples = 0;
    double most = 0;
    for (std::size_t ch = 0; ch < a.size() && ch < b.size(); ++ch) {
      for (std::size_t i = 0; i < a[ch].size() && i < b[ch].size(); ++i) {
        differ += a[ch][i] != b[ch][i];
        most = std::max(most, std::fabs(a[ch][i] - b[ch][i]) * 32768.0);
      }
      samples += a[ch].size();
    }
    std::printf("   s24 -> s16: dither changed %zu of %zu samples, by at most %.0f steps\n", differ,
                samples, most);
    if (a.size() != b.size() || differ == 0 || most > 2)
      throw UsageError("dithered and plain conversions do not differ as they should");

    AudioTarget wide{Container::kWave64, tarn::kSampFloat32, 2, kRate, tarn::kNoDither, true};
    ConvertFile(Path("tone-s24.aiff"), Path("convert-f32.w64"), wide);
    const auto original = ReadFramesAsFloat(OpenSoundFile(Path("tone-s24.aiff")));
    const auto converted = ReadFramesAsFloat(OpenSoundFile(Path("convert-f32.w64")));
    if (original != converted) throw UsageError("24-bit to float conversion is not exact");
    std::printf("   s24 AIFF -> f32 Wave64 (unbuffered): %zu channels, all samples equal\n",
                converted.size());
    return "s16 with and without dither (" + std::to_string(differ) +
           " samples differ), s24 AIFF -> f32 Wave64 exact";
  }

  // Broadcast-extension fields edited in place; chunks and audio MD5 before
  // and after.
  std::string EditBext() {
    const std::string path = Path("tone-s24.wav");
    FileScope scope(path);
    std::printf("   before:\n");
    RunChunks({path});
    const std::string before = AudioPayloadMD5(OpenSoundFile(path));
    std::printf("   audio MD5 %s\n", before.c_str());
    {
      SoundFile file = OpenSoundFile(path);
      auto access = file.format->GetReadWriteMetaDataAccess();
      const tarn::RCBlobMT old = file.format->ReadMetaData(*access, MakeRIFFType("bext"));
      auto bext = tarn::BWFBroadcastWaveExtension::Parse(old.GetPtr(),
                                                         static_cast<std::size_t>(old.GetSize()));
      bext.mDescription = "tarnfile demo: 440 Hz sine";
      bext.mOriginatorReference = "DEMO-0001";
      bext.mTimeReferenceLow = 48000 * 3600;  // one hour into the day
      const auto bytes = bext.Flatten();
      file.format->WriteMetaData(*access, MakeRIFFType("bext"),
                                 tarn::RCBlobMT(bytes.data(), bytes.size()));
      const std::string note = "<note>made by the tarnfile demo</note>";
      file.format->WriteMetaData(*access, MakeRIFFType("iXML"),
                                 tarn::RCBlobMT(note.data(), note.size()));
      access->Flush();
    }
    std::printf("   after replacing \"bext\" (same size, in place) and adding \"iXML\":\n");
    RunChunks({path});
    const std::string after = AudioPayloadMD5(OpenSoundFile(path));
    std::printf("   audio MD5 %s\n", after.c_str());
    RunBext({path});
    if (before != after) throw UsageError("the audio changed");
    return "bext and iXML written in place, audio MD5 unchanged";
  }

  // Recordings whose sizes were never written (a WAVE "data" size of 0; an
  // AIFF "SSND" that holds only its offset fields and no frame count in
  // "COMM"), repaired from the files' lengths.
  std::string Recover() {
    std::string what;
    for (const char* name : {"tone-s16.wav", "tone-s16.aiff"}) {
      const std::string path = Path(std::string("unclosed-") + name);
      fs::copy_file(Path(name), path, fs::copy_options::overwrite_existing);
      FileScope scope(path);
      const std::string md5 = AudioPayloadMD5(OpenSoundFile(path));
      {
        const SoundFile file = OpenSoundFile(path);
        const auto editor = MakeChunkEditor(file);
        tarn::CFileStream stream(SpecForPath(path));
        stream.Open(tarn::kTCLReadWriteMode);
        if (file.IsWAVE()) {
          stream.MoveTo(editor->GetOffsetToChunkStart(MakeRIFFType("data")) + 4);
          stream.PutRawDataToStream("\0\0\0\0", 4);
        } else {
          stream.MoveTo(editor->GetOffsetToChunkStart(MakeRIFFType("SSND")) + 4);
          stream.PutRawDataToStream("\0\0\0\x08", 4);
          stream.MoveTo(editor->GetOffsetToChunkStart(MakeRIFFType("COMM")) + 10);
          stream.PutRawDataToStream("\0\0\0\0", 4);
        }
        stream.Close();
      }
      std::printf("   %s: the header says %lld frames after the crash\n", name,
                  static_cast<long long>(OpenSoundFile(path).frames));
      RunRecover({path});
      const SoundFile back = OpenSoundFile(path);
      if (back.frames != kFrames || AudioPayloadMD5(back) != md5)
        throw UsageError("recovery did not find every frame");
      what += std::string(what.empty() ? "" : ", ") + FormatName(back.container) + " 0 -> " +
              std::to_string(back.frames) + " frames";
    }
    return what + ", audio MD5 as before";
  }

  // A RIFF recording grown (sparsely) past 4 GiB of audio: the format
  // rewrites it as Wave64 in place, audio offset unchanged.
  std::string SwitchToWave64() {
    const std::string path = Path("recording.wav");
    FileScope scope(path);
    const tarn::FileSpecification spec = SpecForPath(path);
    tarn::SoundFileWriter::Settings settings;  // a 16-bit stereo WAVE recording
    settings.fileFormat = tarn::kSamp16;
    settings.sampleRate = kRate;
    tarn::SoundFileAttributes a;
    {
      tarn::SoundFileWriter writer(spec, settings);
      const tarn::FunctionGenerator generator = MakeToneGenerator(kTone, kRate);
      std::vector<float> frames(static_cast<std::size_t>(kFrames) * 2);
      for (std::size_t i = 0; i < frames.size(); ++i)
        frames[i] = static_cast<float>(generator.GetValue(static_cast<double>(i / 2)));
      writer.WriteInterleaved(frames.data(), kFrames);
      writer.Close();
      a = writer.GetAttributes();
    }
    std::printf("   a recording, one second long:\n");
    RunChunks({path});
    const SoundFile small = OpenSoundFile(path);
    const auto firstSecond = ReadFramesAsFloat(small);
    // Recording goes on: the file grows past what 32-bit sizes hold. The
    // new space is a hole in the file (sparse where the file system can).
    const std::int64_t grownFrames = (std::int64_t{1} << 32) / a.mBytesPerFrame + kFrames;
    fs::resize_file(fs::u8path(path),
                    static_cast<std::uintmax_t>(a.mOffsetToAudio + grownFrames * a.mBytesPerFrame));
    {
      SoundFile grown = OpenSoundFile(path);
      auto access = grown.format->GetReadWriteMetaDataAccess();
      grown.format->UpdateLengthAfterAppendingAudio(*access, grown.attributes);
      access->Flush();
    }
    std::printf("   after growing to %.2f GiB of audio:\n",
                static_cast<double>(grownFrames * a.mBytesPerFrame) / (1 << 30));
    RunChunks({path});
    SoundFile big = OpenSoundFile(path);
    std::printf("   %s, %lld frames, audio at byte %d (was %d)\n", FormatName(big.container),
                static_cast<long long>(big.frames), big.attributes.mOffsetToAudio,
                small.attributes.mOffsetToAudio);
    if (big.container != Container::kWave64 || big.frames != grownFrames ||
        big.attributes.mOffsetToAudio != small.attributes.mOffsetToAudio)
      throw UsageError("the recording was not switched to Wave64 in place");
    if (ReadFramesAsFloat(big, kFrames) != firstSecond)
      throw UsageError("the recorded audio changed");
    big.format.reset();
    fs::remove(fs::u8path(path));
    return "RIFF -> Wave64 in place at " + std::to_string(grownFrames) +
           " frames, first second intact (file removed)";
  }

  void PrintTable() const {
    std::printf("\n%-10s %-6s %9s  %s\n", "step", "result", "ms", "what");
    for (const Row& row : rows_)
      std::printf("%-10s %-6s %9.1f  %s\n", row.step.c_str(), row.ok ? "ok" : "FAILED", row.ms,
                  row.what.c_str());
    std::printf("\nFiles are in %s\n", dir_.string().c_str());
  }

  fs::path dir_;
  std::vector<DemoFile> files_;
  std::vector<Row> rows_;
  int failures_ = 0;
};

}  // namespace

int RunDemo(const Words& words) {
  const CommandLine cl(words, {}, {}, 0, 1);
  fs::path dir;
  if (!cl.Positional().empty()) {
    dir = fs::u8path(cl.Positional()[0]);
  } else {
    std::random_device random;
    dir = fs::temp_directory_path() / ("tarnfile-demo-" + std::to_string(random()));
  }
  {
    FileScope scope(dir.string());
    std::error_code error;
    fs::create_directories(dir, error);
    if (error || !fs::is_directory(dir)) tarn::FailFSErr(-43, SpecForPath(dir.string()));
  }
  return Demo(fs::absolute(dir)).Run();
}

}  // namespace tarnfile
