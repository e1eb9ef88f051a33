// Sets the description of a WAVE file's broadcast extension in place: the
// read-write metadata access opens the file's metadata, the write is applied
// by Flush, and the audio itself is never rewritten.
#include <cstdio>

#include "tarn/Audio/SoundFileFormats/BWFBroadcastWaveExtension.h"
#include "tarn/Audio/SoundFileFormats/RIFFType.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormat.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormatCache.h"
#include "tarn/Errors/TarnError.h"

int main(int argc, char** argv) {
  if (argc != 3) {
    std::fprintf(stderr, "usage: tarn_edit_bext /absolute/path/file.wav DESCRIPTION\n");
    return 2;
  }
  try {
    const tarn::FileSpecification spec{tarn::UString(argv[1])};
    auto format = tarn::SoundFileFormatCache::Instance().GetFormat(spec);
    const tarn::RIFFType bextTag = tarn::MakeRIFFType("bext");

    auto access = format->GetReadWriteMetaDataAccess();
    const tarn::RCBlobMT old = format->ReadMetaData(*access, bextTag);
    auto bext = old.IsEmpty()
                    ? tarn::BWFBroadcastWaveExtension::ForNewRecording(format->GetFileAttributes())
                    : tarn::BWFBroadcastWaveExtension::Parse(
                          old.GetPtr(), static_cast<std::size_t>(old.GetSize()));
    bext.mDescription = argv[2];
    const std::vector<std::uint8_t> bytes = bext.Flatten();
    format->WriteMetaData(*access, bextTag, tarn::RCBlobMT(bytes.data(), bytes.size()));
    access->Flush();  // in the file now; a failure throws here
    std::printf("description: %s\n", bext.mDescription.c_str());
  } catch (const tarn::TarnError& e) {
    std::fprintf(stderr, "%s\n", e.Describe().c_str());
    return 1;
  }
  return 0;
}
