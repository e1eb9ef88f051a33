#pragma once
// The audio work behind convert, tone and the demo: new files in any of the
// four containers, conversion of one file's audio into another, tones from
// the function generators, and reading a file's frames back as floats.
//
// Files are read through SoundFileReader and written through
// SoundFileWriter. Every job is synchronous and throws TarnErrors (file and
// format errors) or UsageError (a container that cannot hold the sample
// format asked for). Long jobs show a Progress bar on a terminal.

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "ToolSupport.h"
#include "tarn/Audio/FunctionGenerator.h"
#include "tarn/Audio/SampleFormat.h"

namespace tarn {
class SoundFileFormat;
}

namespace tarnfile {

// "wav", "w64", "aiff", "aifc"; UsageError otherwise.
[[nodiscard]] Container ParseContainerType(const std::string& name);
// The container a file name's extension asks for, if it names one.
[[nodiscard]] std::optional<Container> ContainerForExtension(const std::string& path);
// Throws UsageError unless files of `container` can hold `format` with
// `channels` channels: WAVE and Wave64 hold u8, s16, s24, f32 and f64 (and
// 32-bit integers from 3 channels up), AIFF s8, s16, s24 and 32-bit
// integers, AIFC those and f32, f64.
void CheckStorable(Container container, tarn::SampleFormat format, int channels);
// The sample formats `container` holds with `channels` channels, in order.
[[nodiscard]] std::vector<tarn::SampleFormat> StorableFormats(Container container, int channels);

struct AudioTarget {
  Container container = Container::kRIFF;
  tarn::SampleFormat format = tarn::kSamp16;
  int channels = 2;
  double rate = 48000.0;
  tarn::DitherType dither = tarn::kNoDither;
  bool unbuffered = false;
};

// Converts all of `in`'s audio into a new file at `out` (replaced if it
// exists) with the target's container, sample format and dither (its
// channels and rate are taken from `in`); returns the frames written.
std::int64_t ConvertFile(const std::string& in, const std::string& out, AudioTarget target);

enum class ToneShape { kSine, kSquare, kSaw, kTriangle };
[[nodiscard]] ToneShape ParseToneShape(const std::string& name);

struct Tone {
  ToneShape shape = ToneShape::kSine;
  double frequency = 440.0;
  double amplitude = 0.5;  // of full scale
};
// The tone as a generator of values at frame numbers of a file at `rate`.
[[nodiscard]] tarn::FunctionGenerator MakeToneGenerator(const Tone& tone, double rate);
// Writes `frames` frames of the tone (the same on every channel) into a new
// file at `out`.
void WriteTone(const std::string& out, const AudioTarget& target, const Tone& tone,
               std::int64_t frames);

// The first `frames` frames of a file (all when negative) as floats (full
// scale +-1), one vector per channel.
[[nodiscard]] std::vector<std::vector<float>> ReadFramesAsFloat(const SoundFile& file,
                                                                std::int64_t frames = -1);

}  // namespace tarnfile
