#include "AudioJobs.h"

#include <algorithm>
#include <filesystem>

#include "Progress.h"
#include "tarn/Audio/BufConverter.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormat.h"
#include "tarn/Audio/SoundFileReader.h"
#include "tarn/Audio/SoundFileWriter.h"

namespace tarnfile {

namespace {

using tarn::MakeRIFFType;
using tarn::SampleFormat;

constexpr std::int64_t kBlockFrames = 16384;

bool IsWAVEFamily(Container c) { return c == Container::kRIFF || c == Container::kWave64; }

// A new file at `path` (replacing one of that name) for the target,
// taking samples of `client`.
std::unique_ptr<tarn::SoundFileWriter> CreateWriter(const std::string& path,
                                                    const AudioTarget& target,
                                                    SampleFormat client) {
  CheckStorable(target.container, target.format, target.channels);
  tarn::SoundFileWriter::Settings settings;
  switch (target.container) {
    case Container::kRIFF:
    case Container::kConverter:
      settings.fileType = MakeRIFFType("WAVE");
      break;
    case Container::kWave64:
      settings.fileType = MakeRIFFType(".W64");
      break;
    case Container::kAIFF:
      settings.fileType = MakeRIFFType("AIFF");
      break;
    case Container::kAIFC:
    case Container::kUnknown:
      settings.fileType = MakeRIFFType("AIFC");
      break;
  }
  settings.numChannels = static_cast<std::int16_t>(target.channels);
  settings.sampleRate = target.rate;
  settings.fileFormat = target.format;
  settings.clientFormat = client;
  settings.dither = target.dither;
  settings.recording = false;
  settings.unbuffered = target.unbuffered;
  return std::make_unique<tarn::SoundFileWriter>(SpecForPath(path), settings);
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

// One block of samples per channel and the pointers the facade takes.
class ChannelBlocks {
 public:
  ChannelBlocks(int channels, std::size_t bytesPerChannel)
      : storage_(static_cast<std::size_t>(channels)) {
    for (auto& s : storage_) {
      s.resize((bytesPerChannel + sizeof(double) - 1) / sizeof(double));
      pointers_.push_back(s.data());
    }
  }
  [[nodiscard]] void* const* Pointers() const noexcept { return pointers_.data(); }
  [[nodiscard]] void* operator[](std::size_t channel) const noexcept { return pointers_[channel]; }

 private:
  std::vector<std::vector<double>> storage_;  // doubles: aligned for any sample type
  std::vector<void*> pointers_;
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
  std::unique_ptr<tarn::SoundFileReader> reader;
  {
    FileScope scope(in);
    reader = std::make_unique<tarn::SoundFileReader>(OpenSoundFile(in, true).format);
  }
  const std::int64_t frames = reader->GetLengthInFrames().AsLongLong();
  const SampleFormat inFormat = reader->GetAttributes().mSampleFormat;
  target.channels = reader->GetNumChannels();
  target.rate = reader->GetSampleRate();
  // The writer takes the source's samples as they are, unless one side is
  // the 8-byte float: then they pass through floats here.
  const bool direct = inFormat == target.format ||
                      (inFormat != tarn::kSampWide64B && target.format != tarn::kSampWide64B);
  const SampleFormat client = direct                                ? inFormat
                              : target.format == tarn::kSampWide64B ? tarn::kSampWide64B
                                                                    : tarn::kSampFloat32;
  FileScope scope(out);
  const auto writer = CreateWriter(out, target, client);
  const auto block = static_cast<std::size_t>(kBlockFrames);
  const ChannelBlocks source(target.channels, block * 8);
  const ChannelBlocks floats(direct ? 0 : target.channels, block * sizeof(float));
  const ChannelBlocks wide(client == tarn::kSampWide64B && !direct ? target.channels : 0,
                           block * sizeof(double));
  const FloatStage toFloat(inFormat);
  Progress progress("converting", frames);
  std::int64_t done = 0;
  while (done < frames) {
    const std::int64_t got =
        reader->Read(done, std::min(kBlockFrames, frames - done), source.Pointers(), inFormat)
            .AsLongLong();
    if (got <= 0) break;
    if (direct) {
      writer->Write(source.Pointers(), got);
    } else {
      for (int ch = 0; ch < target.channels; ++ch) {
        auto* f = static_cast<float*>(floats[static_cast<std::size_t>(ch)]);
        toFloat.Convert(source[static_cast<std::size_t>(ch)], f, got);
        if (client == tarn::kSampWide64B)
          std::copy_n(f, got, static_cast<double*>(wide[static_cast<std::size_t>(ch)]));
      }
      writer->Write(client == tarn::kSampWide64B ? wide.Pointers() : floats.Pointers(), got);
    }
    done += got;
    progress.Update(done);
  }
  writer->Close();
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
  // from floats by the writer's converter.
  const bool wide = target.format == tarn::kSampWide64B;
  const auto writer = CreateWriter(out, target, wide ? tarn::kSampWide64B : tarn::kSampFloat32);
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
      writer->WriteInterleaved(doubles.data(), count);
    } else {
      std::copy_n(doubles.begin(), count * target.channels, floats.begin());
      writer->WriteInterleaved(floats.data(), count);
    }
    done += count;
    progress.Update(done);
  }
  writer->Close();
}

std::vector<std::vector<float>> ReadFramesAsFloat(const SoundFile& file, std::int64_t frames) {
  tarn::SoundFileReader reader(file.format);
  const std::int64_t length = reader.GetLengthInFrames().AsLongLong();
  frames = frames < 0 ? length : std::min(frames, length);
  const SampleFormat format = reader.GetAttributes().mSampleFormat;
  const auto channels = static_cast<std::size_t>(reader.GetNumChannels());
  const FloatStage toFloat(format);
  const ChannelBlocks block(reader.GetNumChannels(), static_cast<std::size_t>(kBlockFrames) * 8);
  std::vector<std::vector<float>> out(channels,
                                      std::vector<float>(static_cast<std::size_t>(frames)));
  std::int64_t done = 0;
  while (done < frames) {
    const std::int64_t got =
        reader.Read(done, std::min(kBlockFrames, frames - done), block.Pointers(), format)
            .AsLongLong();
    if (got <= 0) break;
    for (std::size_t ch = 0; ch < channels; ++ch)
      toFloat.Convert(block[ch], out[ch].data() + done, got);
    done += got;
  }
  for (auto& channel : out) channel.resize(static_cast<std::size_t>(done));
  return out;
}

}  // namespace tarnfile
