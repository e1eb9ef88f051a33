// Prints a sound file's header facts through its format object and lists
// its chunks with the chunk editor.
#include <cstdio>

#include "tarn/Audio/SoundFileFormats/RIFFFileEditor.h"
#include "tarn/Audio/SoundFileFormats/RIFFFormatHandlers.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"
#include "tarn/Errors/TarnError.h"

int main(int argc, char** argv) {
  if (argc != 2) {
    std::fprintf(stderr, "usage: tarn_sound_file_info /absolute/path/file.wav\n");
    return 2;
  }
  try {
    const tarn::FileSpecification spec{tarn::UString(argv[1])};
    auto format = tarn::SoundFileFormatCache::Instance().GetFormat(spec);
    const tarn::SoundFileAttributes a = format->GetFileAttributes();
    std::printf("%d channels, %g Hz, %d bytes per sample, %lld frames, audio at byte %d\n",
                a.mNumChannels, a.mSampleRate, a.mBytesPerSample,
                static_cast<long long>(format->GetLengthInFrames().AsLongLong()), a.mOffsetToAudio);

    tarn::RIFFFileEditor editor(spec, tarn::kRIFFLittleEndian, tarn::GetWaveRIFFFormatHandler());
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
