// Reads any sound file the library opens as floats, block by block through
// SoundFileReader, and writes a converted copy through SoundFileWriter: a
// 16-bit AIFF file with triangular dither, same channels and rate.
#include <algorithm>
#include <cstdio>
#include <vector>

#include "tarn/Audio/SoundFileReader.h"
#include "tarn/Audio/SoundFileWriter.h"
#include "tarn/Errors/TarnError.h"

int main(int argc, char** argv) {
  if (argc != 3) {
    std::fprintf(stderr, "usage: tarn_convert_copy /absolute/path/in.wav /absolute/path/out.aif\n");
    return 2;
  }
  try {
    tarn::SoundFileReader in{tarn::FileSpecification(tarn::UString(argv[1]))};
    tarn::SoundFileWriter::Settings settings;
    settings.fileType = tarn::MakeRIFFType("AIFF");
    settings.numChannels = static_cast<std::int16_t>(in.GetNumChannels());
    settings.sampleRate = in.GetSampleRate();
    settings.fileFormat = tarn::kSamp16;
    settings.dither = tarn::kTriangularDither;
    settings.recording = false;
    tarn::SoundFileWriter out(tarn::FileSpecification(tarn::UString(argv[2])), settings);

    const long long total = in.GetLengthInFrames().AsLongLong();
    constexpr long long kBlock = 65536;
    std::vector<std::vector<float>> channels;  // one vector of floats per channel
    std::vector<const void*> pointers;
    for (long long at = 0; at < total; at += kBlock) {
      const tarn::SampleCount got = in.Read(at, std::min(kBlock, total - at), channels);
      pointers.clear();
      for (const auto& channel : channels) pointers.push_back(channel.data());
      out.Write(pointers.data(), got);
    }
    out.Close();  // the header now holds every frame
    std::printf("copied %lld frames into %s\n", total, argv[2]);
  } catch (const tarn::TarnError& e) {
    std::fprintf(stderr, "%s\n", e.Describe().c_str());
    return 1;
  }
  return 0;
}
