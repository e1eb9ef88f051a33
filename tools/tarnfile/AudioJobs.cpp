#include "AudioJobs.h"

#include <algorithm>
#include <filesystem>

#include "Progress.h"
#include "tarn/Audio/AsyncAudioReader.h"
#include "tarn/Audio/AudioOutFile.h"
#include "tarn/Audio/BufConverter.h"
#include "tarn/Audio/ConvertingWriter.h"
#include "tarn/Audio/PlatformFileDriver.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"

namespace tarnfile {

namespace {

using tarn::MakeRIFFType;
using tarn::SampleFormat;

constexpr std::int64_t kBlockFrames = 16384;

bool IsWAVEFamily(Container c) { return c == Container::kRIFF || c == Container::kWave64; }

// A new, empty file at `path` for the target's attributes; the old file of
// that name goes first.
std::shared_ptr<tarn::SoundFileFormat> CreateSoundFile(const std::string& path,
                                                       const AudioTarget& target) {
  CheckStorable(target.container, target.format, target.channels);
  const tarn::FileSpecification spec = SpecForPath(path);
  auto& cache = tarn::SoundFileFormatCache::Instance();
  if (cache.FindFormat(spec)) tarn::FailFSErr(tarn::kAccessDeniedErr, spec);  // in use here
  std::error_code ignored;
  std::filesystem::remove(std::filesystem::u8path(spec.GetFullPath().utf8_str()), ignored);
  tarn::SoundFileAttributes a;
  switch (target.container) {
    case Container::kRIFF:
      a.mFileType = MakeRIFFType("WAVE");
      break;
    case Container::kWave64:
      a.mFileType = MakeRIFFType(".W64");
      break;
    case Container::kAIFF:
      a.mFileType = MakeRIFFType("AIFF");
      break;
    case Container::kAIFC:
    case Container::kUnknown:
      a.mFileType = MakeRIFFType("AIFC");
      break;
  }
  a.mNumChannels = static_cast<std::int16_t>(target.channels);
  a.mSampleRate = target.rate;
  a.mSampleFormat = target.format;
  a.mBytesPerSample = static_cast<std::int16_t>(tarn::GetBytesPerSample(target.format));
  a.mBytesPerFrame = a.mBytesPerSample * target.channels;
  a.mSamplesAreLSBFirst = IsWAVEFamily(target.container);
  auto format = cache.GetFormat(
      spec, IsWAVEFamily(target.container) ? MakeRIFFType("WAVE") : MakeRIFFType("AIFF"));
  (void)format->CreateFileOnDisk(a, 0, false, a);
  return format;
}

std::shared_ptr<tarn::AudioOutFile> OpenForAppending(std::shared_ptr<tarn::SoundFileFormat> format,
                                                     bool unbuffered) {
  tarn::PlatformFileOptions options;
  options.mCachingMode = unbuffered ? tarn::kUnbufferedCaching : tarn::kCachedCaching;
  return std::make_shared<tarn::AudioOutFile>(std::move(format), options);
}

// Turns `count` samples of `format` into floats. The library's converter
// covers every format but the 8-byte float, which is narrowed here.
class FloatStage {
 public:
  explicit FloatStage(SampleFormat format) : format_(format) {
    if (format != tarn::kSampFloat32 && format != tarn::kSampWide64B)
      converter_ =
          tarn::BufConverter::Create({format, 1, 0}, {tarn::kSampFloat32, 1, 0}, tarn::kNoDither);
  }
  void Convert(const void* from, float* to, std::int64_t count) const {
    if (converter_)
      converter_->Convert(from, to, static_cast<int>(count));
    else if (format_ == tarn::kSampWide64B)
      std::transform(static_cast<const double*>(from), static_cast<const double*>(from) + count, to,
                     [](double d) { return static_cast<float>(d); });
    else
      std::copy_n(static_cast<const float*>(from), count, to);
  }

 private:
  SampleFormat format_;
  std::unique_ptr<tarn::BufConverter> converter_;
};

}  // namespace

Container ParseContainerType(const std::string& name) {
  if (name == "wav") return Container::kRIFF;
  if (name == "w64") return Container::kWave64;
  if (name == "aiff") return Container::kAIFF;
  if (name == "aifc") return Container::kAIFC;
  throw UsageError("unknown file type '" + name + "' (wav, w64, aiff, aifc)");
}

std::optional<Container> ContainerForExtension(const std::string& path) {
  std::string ext = std::filesystem::u8path(path).extension().string();
  std::transform(ext.begin(), ext.end(), ext.begin(),
                 [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
  if (ext == ".wav" || ext == ".wave" || ext == ".bwf") return Container::kRIFF;
  if (ext == ".w64") return Container::kWave64;
  if (ext == ".aif" || ext == ".aiff") return Container::kAIFF;
  if (ext == ".aifc") return Container::kAIFC;
  return std::nullopt;
}

std::vector<SampleFormat> StorableFormats(Container container, int channels) {
  std::vector<SampleFormat> formats;
  if (IsWAVEFamily(container)) {
    formats = {tarn::kSamp8Offset, tarn::kSamp16, tarn::kSamp24};
    // 32-bit integers need the extensible "fmt " layout, written from 3 channels up.
    if (channels >= 3) formats.push_back(tarn::kSampUnpacked24);
    formats.insert(formats.end(), {tarn::kSampFloat32, tarn::kSampWide64B});
  } else {
    formats = {tarn::kSamp8, tarn::kSamp16, tarn::kSamp24, tarn::kSampUnpacked24};
    if (container == Container::kAIFC)
      formats.insert(formats.end(), {tarn::kSampFloat32, tarn::kSampWide64B});
  }
  return formats;
}

void CheckStorable(Container container, SampleFormat format, int channels) {
  const auto formats = StorableFormats(container, channels);
  if (std::find(formats.begin(), formats.end(), format) != formats.end()) return;
  std::string list;
  for (SampleFormat f : formats)
    list += std::string(list.empty() ? "" : ", ") + SampleFormatName(f);
  throw UsageError(std::string(FormatName(container)) + " files with " + std::to_string(channels) +
                   " channel(s) hold " + list + ", not " + SampleFormatName(format));
}

std::int64_t ConvertFile(const std::string& in, const std::string& out, AudioTarget target) {
  std::int64_t frames = 0;
  SampleFormat inFormat;
  std::unique_ptr<tarn::AsyncAudioReader> reader;
  {
    FileScope scope(in);
    const SoundFile source = OpenSoundFile(in);
    frames = source.frames;
    inFormat = source.attributes.mSampleFormat;
    target.channels = source.attributes.mNumChannels;
    target.rate = source.attributes.mSampleRate;
    reader = source.format->MakeReader({0, frames}, source.attributes.mSampleRate);
  }
  FileScope scope(out);
  // The converting writer takes the source's samples as they are, unless one
  // side is the 8-byte float: then they pass through floats.
  const bool direct = inFormat == target.format ||
                      (inFormat != tarn::kSampWide64B && target.format != tarn::kSampWide64B);
  const SampleFormat client = direct                                ? inFormat
                              : target.format == tarn::kSampWide64B ? tarn::kSampWide64B
                                                                    : tarn::kSampFloat32;
  tarn::ConvertingWriter writer(OpenForAppending(CreateSoundFile(out, target), target.unbuffered),
                                client, target.dither);
  const FloatStage toFloat(inFormat);
  const auto samples = static_cast<std::size_t>(kBlockFrames * target.channels);
  std::vector<std::uint8_t> block(static_cast<std::size_t>(kBlockFrames) *
                                  static_cast<std::size_t>(reader->GetBytesPerFrame()));
  std::vector<float> floats(direct ? 0 : samples);
  std::vector<double> doubles(client == tarn::kSampWide64B && !direct ? samples : 0);
  Progress progress("converting", frames);
  std::int64_t done = 0;
  while (done < frames) {
    const std::int64_t got = reader->Read(block.data(), kBlockFrames).AsLongLong();
    if (got <= 0) break;
    if (direct) {
      writer.Write(block.data(), got);
    } else {
      toFloat.Convert(block.data(), floats.data(), got * target.channels);
      if (doubles.empty()) {
        writer.Write(floats.data(), got);
      } else {
        std::copy_n(floats.begin(), got * target.channels, doubles.begin());
        writer.Write(doubles.data(), got);
      }
    }
    done += got;
    progress.Update(done);
  }
  writer.Close();
  return done;
}

ToneShape ParseToneShape(const std::string& name) {
  if (name == "sine") return ToneShape::kSine;
  if (name == "square") return ToneShape::kSquare;
  if (name == "saw") return ToneShape::kSaw;
  if (name == "triangle") return ToneShape::kTriangle;
  throw UsageError("unknown shape '" + name + "' (sine, square, saw, triangle)");
}

tarn::FunctionGenerator MakeToneGenerator(const Tone& tone, double rate) {
  tarn::WaveCycle* shape = nullptr;
  switch (tone.shape) {
    case ToneShape::kSine:
      shape = new tarn::SineWave;
      break;
    case ToneShape::kSquare:
      shape = new tarn::SquareWave;
      break;
    case ToneShape::kSaw:
      shape = new tarn::SawToothWave;
      break;
    case ToneShape::kTriangle:
      shape = new tarn::TriangleWave;
      break;
  }
  return tarn::FunctionGenerator(shape, rate / tone.frequency, tone.amplitude);
}

void WriteTone(const std::string& out, const AudioTarget& target, const Tone& tone,
               std::int64_t frames) {
  FileScope scope(out);
  const tarn::FunctionGenerator generator = MakeToneGenerator(tone, target.rate);
  // 8-byte files get the generator's doubles; every other format is made
  // from floats by the converting writer.
  const bool wide = target.format == tarn::kSampWide64B;
  tarn::ConvertingWriter writer(OpenForAppending(CreateSoundFile(out, target), target.unbuffered),
                                wide ? tarn::kSampWide64B : tarn::kSampFloat32, target.dither);
  const auto channels = static_cast<std::size_t>(target.channels);
  std::vector<double> doubles(static_cast<std::size_t>(kBlockFrames) * channels);
  std::vector<float> floats(wide ? 0 : doubles.size());
  Progress progress("writing tone", frames);
  for (std::int64_t done = 0; done < frames;) {
    const std::int64_t count = std::min(kBlockFrames, frames - done);
    for (std::int64_t i = 0; i < count; ++i)
      std::fill_n(doubles.begin() + i * target.channels, channels,
                  generator.GetValue(static_cast<double>(done + i)));
    if (wide) {
      writer.Write(doubles.data(), count);
    } else {
      std::copy_n(doubles.begin(), count * target.channels, floats.begin());
      writer.Write(floats.data(), count);
    }
    done += count;
    progress.Update(done);
  }
  writer.Close();
}

std::vector<float> ReadFramesAsFloat(const SoundFile& file) {
  const auto reader = file.format->MakeReader({0, file.frames}, file.attributes.mSampleRate);
  const FloatStage toFloat(reader->GetFormat().mSampleFormat);
  const int channels = file.attributes.mNumChannels;
  std::vector<float> frames(static_cast<std::size_t>(file.frames * channels));
  std::vector<std::uint8_t> block(static_cast<std::size_t>(kBlockFrames) *
                                  static_cast<std::size_t>(reader->GetBytesPerFrame()));
  std::int64_t done = 0;
  while (done < file.frames) {
    const std::int64_t got = reader->Read(block.data(), kBlockFrames).AsLongLong();
    if (got <= 0) break;
    toFloat.Convert(block.data(), frames.data() + done * channels, got * channels);
    done += got;
  }
  frames.resize(static_cast<std::size_t>(done * channels));
  return frames;
}

}  // namespace tarnfile
