// convert and tone: audio through the reader and writer chain.
#include <cstdio>
#include <filesystem>

#include "AudioJobs.h"
#include "Commands.h"
#include "ToolSupport.h"

namespace tarnfile {

namespace {

// The container of a new file: --type, else the name's extension, else
// `fallback`.
Container TargetContainer(const CommandLine& cl, const std::string& path, Container fallback) {
  if (const auto type = cl.Value("type")) return ParseContainerType(*type);
  return ContainerForExtension(path).value_or(fallback);
}

tarn::DitherType ParseDither(const CommandLine& cl) {
  const std::string dither = cl.Value("dither").value_or("none");
  if (dither == "none") return tarn::kNoDither;
  if (dither == "tpdf") return tarn::kTriangularDither;
  throw UsageError("--dither takes none or tpdf, not '" + dither + "'");
}

}  // namespace

int RunConvert(const Words& words) {
  const CommandLine cl(words, {"unbuffered"}, {"type", "format", "dither"}, 2, 2);
  const std::string& in = cl.Positional()[0];
  const std::string& out = cl.Positional()[1];
  std::error_code error;
  if (std::filesystem::equivalent(std::filesystem::u8path(in), std::filesystem::u8path(out), error))
    throw UsageError("IN and OUT are the same file");
  AudioTarget target;
  target.dither = ParseDither(cl);
  target.unbuffered = cl.Has("unbuffered");
  const auto format = cl.Value("format");
  if (format) target.format = ParseSampleFormat(*format);
  {
    FileScope scope(in);
    const SoundFile source = OpenSoundFile(in, true);
    // A converted source is written as WAVE unless the name or --type says
    // otherwise.
    target.container = TargetContainer(
        cl, out, source.container == Container::kConverter ? Container::kRIFF : source.container);
    if (!format) target.format = source.attributes.mSampleFormat;
    CheckStorable(target.container, target.format, source.attributes.mNumChannels);
  }
  const std::int64_t frames = ConvertFile(in, out, target);
  std::printf("%s: %lld frames, %s %s\n", out.c_str(), static_cast<long long>(frames),
              FormatName(target.container), SampleFormatName(target.format));
  return 0;
}

int RunTone(const Words& words) {
  const CommandLine cl(
      words, {"unbuffered"},
      {"type", "format", "rate", "channels", "seconds", "shape", "freq", "amplitude", "dither"}, 1,
      1);
  const std::string& out = cl.Positional()[0];
  AudioTarget target;
  target.container = TargetContainer(cl, out, Container::kRIFF);
  target.format = ParseSampleFormat(cl.Value("format").value_or("s16"));
  target.rate = ParseNumber(cl.Value("rate").value_or("48000"), "--rate");
  target.channels =
      static_cast<int>(ParseInteger(cl.Value("channels").value_or("2"), "--channels"));
  target.dither = ParseDither(cl);
  target.unbuffered = cl.Has("unbuffered");
  const double seconds = ParseNumber(cl.Value("seconds").value_or("2"), "--seconds");
  Tone tone;
  tone.shape = ParseToneShape(cl.Value("shape").value_or("sine"));
  tone.frequency = ParseNumber(cl.Value("freq").value_or("440"), "--freq");
  tone.amplitude = ParseNumber(cl.Value("amplitude").value_or("0.5"), "--amplitude");
  if (target.rate < 1 || target.rate > 1e7) throw UsageError("--rate must lie in 1..10000000");
  if (target.channels < 1 || target.channels > 256)
    throw UsageError("--channels must lie in 1..256");
  if (seconds < 0 || seconds > 86400) throw UsageError("--seconds must lie in 0..86400");
  if (tone.frequency <= 0) throw UsageError("--freq must be above 0");
  if (tone.amplitude < 0 || tone.amplitude > 1) throw UsageError("--amplitude must lie in 0..1");
  CheckStorable(target.container, target.format, target.channels);
  const auto frames = static_cast<std::int64_t>(seconds * target.rate + 0.5);
  WriteTone(out, target, tone, frames);
  std::printf("%s: %lld frames, %s %s, %d channel(s) at %g Hz\n", out.c_str(),
              static_cast<long long>(frames), FormatName(target.container),
              SampleFormatName(target.format), target.channels, target.rate);
  return 0;
}

}  // namespace tarnfile
