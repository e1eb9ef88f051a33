// Prints a sound file's header facts and peak level, read through
// SoundFileReader, and lists its chunks with the chunk editor.
#include <cmath>
#include <cstdint>
#include <cstdio>
#include <vector>

#include "tarn/Audio/SoundFileFormats/RIFFFileEditor.h"
#include "tarn/Audio/SoundFileFormats/RIFFFormatHandlers.h"
#include "tarn/Audio/SoundFileReader.h"
#include "tarn/Errors/TarnError.h"

int main(int argc, char** argv) {
  if (argc != 2) {
    std::fprintf(stderr, "usage: tarn_sound_file_info /absolute/path/file\n");
    return 2;
  }
  try {
    const tarn::FileSpecification spec{tarn::UString(argv[1])};
    tarn::SoundFileReader file(spec);
    std::vector<std::vector<float>> channels;  // one vector of floats per channel
    file.Read(0, file.GetLengthInFrames(), channels);
    float peak = 0;
    for (const auto& channel : channels)
      for (float sample : channel) peak = std::max(peak, std::fabs(sample));
    std::printf("%d channels, %g Hz, %lld frames, audio at byte %d, peak %.3f\n",
                file.GetNumChannels(), file.GetSampleRate(),
                static_cast<long long>(file.GetLengthInFrames().AsLongLong()),
                file.GetAttributes().mOffsetToAudio, peak);

    // AIFF and AIFC files are big-endian chunk files with their own tags.
    const std::uint32_t type = file.GetAttributes().mFileType;
    const bool aiff = type == tarn::MakeRIFFType("AIFF") || type == tarn::MakeRIFFType("AIFC");
    tarn::RIFFFileEditor editor(
        spec, aiff ? tarn::kRIFFBigEndian : tarn::kRIFFLittleEndian,
        aiff ? static_cast<tarn::RIFFFileEditor::FormatHandler&>(tarn::GetAIFFRIFFFormatHandler())
             : tarn::GetWaveRIFFFormatHandler());
    editor.ReadChunkLocations(nullptr);
    for (const auto& [chunk, action] : editor.GetChunkList())
      std::printf("  '%s' at %lld, %lld bytes\n", tarn::RIFFTypeToString(chunk.tag).c_str(),
                  static_cast<long long>(chunk.offset), static_cast<long long>(chunk.length));
  } catch (const tarn::TarnError& e) {
    std::fprintf(stderr, "%s\n", e.Describe().c_str());
    return 1;
  }
  return 0;
}
