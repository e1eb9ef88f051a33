// Writes one second of a 440 Hz sine as a 24-bit stereo WAVE file: the
// format object creates the header, AudioOutFile appends the audio and keeps
// the header's length right, ConvertingWriter turns floats into 24 bits.
#include <cstdio>
#include <memory>
#include <vector>

#include "tarn/Audio/AudioOutFile.h"
#include "tarn/Audio/ConvertingWriter.h"
#include "tarn/Audio/FunctionGenerator.h"
#include "tarn/Audio/SoundFileFormats/RIFFType.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"
#include "tarn/Errors/TarnError.h"

int main(int argc, char** argv) {
  if (argc != 2) {
    std::fprintf(stderr, "usage: tarn_write_tone /absolute/path/tone.wav\n");
    return 2;
  }
  try {
    const tarn::FileSpecification spec{tarn::UString(argv[1])};
    auto format = tarn::SoundFileFormatCache::Instance().GetFormat(spec);  // WAVE, by extension

    tarn::SoundFileAttributes attributes;
    attributes.mFileType = tarn::MakeRIFFType("WAVE");
    attributes.mNumChannels = 2;
    attributes.mSampleRate = 48000.0;
    attributes.mSampleFormat = tarn::kSamp24;
    attributes.mBytesPerSample = 3;
    attributes.mBytesPerFrame = 6;
    (void)format->CreateFileOnDisk(attributes, 0, false, attributes);

    tarn::FunctionGenerator sine(new tarn::SineWave, 48000.0 / 440.0, 0.5);
    std::vector<float> frames(2 * 48000);
    for (std::size_t i = 0; i < frames.size(); ++i)
      frames[i] = static_cast<float>(sine.GetValue(static_cast<double>(i / 2)));

    tarn::ConvertingWriter writer(std::make_shared<tarn::AudioOutFile>(format), tarn::kSampFloat32);
    writer.Write(frames.data(), 48000);
    writer.Close();  // the header now says 48000 frames
    std::printf("wrote %s\n", argv[1]);
  } catch (const tarn::TarnError& e) {
    std::fprintf(stderr, "%s\n", e.Describe().c_str());
    return 1;
  }
  return 0;
}
