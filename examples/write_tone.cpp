// Writes one second of a 440 Hz sine as a 24-bit stereo WAVE file through
// SoundFileWriter, which creates the file, converts the floats to 24 bits
// and keeps the header's length right.
#include <cstdio>
#include <vector>

#include "tarn/Audio/FunctionGenerator.h"
#include "tarn/Audio/SoundFileWriter.h"
#include "tarn/Errors/TarnError.h"

int main(int argc, char** argv) {
  if (argc != 2) {
    std::fprintf(stderr, "usage: tarn_write_tone /absolute/path/tone.wav\n");
    return 2;
  }
  try {
    tarn::SoundFileWriter::Settings settings;  // WAVE, 2 channels, 48 kHz, 24-bit, floats in
    settings.recording = false;
    tarn::SoundFileWriter out(tarn::FileSpecification(tarn::UString(argv[1])), settings);

    tarn::FunctionGenerator sine(new tarn::SineWave, 48000.0 / 440.0, 0.5);
    std::vector<float> frames(2 * 48000);
    for (std::size_t i = 0; i < frames.size(); ++i)
      frames[i] = static_cast<float>(sine.GetValue(static_cast<double>(i / 2)));
    out.WriteInterleaved(frames.data(), 48000);
    out.Close();  // the header now says 48000 frames
    std::printf("wrote %s\n", argv[1]);
  } catch (const tarn::TarnError& e) {
    std::fprintf(stderr, "%s\n", e.Describe().c_str());
    return 1;
  }
  return 0;
}
