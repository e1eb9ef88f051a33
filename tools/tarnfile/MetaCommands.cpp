// Metadata in place: chunks by tag, the broadcast extension, the audio MD5
// that no such edit changes, and the repair of unfinished recordings.
#include <cstdio>
#include <string>

#include "BextFields.h"
#include "Commands.h"
#include "JsonWriter.h"
#include "ToolSupport.h"
#include "tarn/Audio/SoundFileFormats/BWFBroadcastWaveExtension.h"
#include "tarn/Audio/SoundFileFormats/RIFFFileEditor.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormat.h"
#include "tarn/Errors/Fail.h"

namespace tarnfile {

namespace {

using tarn::MakeRIFFType;

const tarn::RIFFType kBext = MakeRIFFType("bext");

// Chunks whose replacement would leave the file unreadable or move the audio.
void RefuseStructuralTag(const SoundFile& file, tarn::RIFFType tag) {
  const tarn::RIFFType header = file.IsWAVE() ? MakeRIFFType("fmt ") : MakeRIFFType("COMM");
  if (tag == file.AudioTag() || tag == header || tag == MakeRIFFType("JUNK"))
    throw UsageError("'" + TagText(tag) + "' is part of the file's structure, not metadata");
}

tarn::BWFBroadcastWaveExtension ReadBext(SoundFile& file, tarn::ReadOnlyMetaDataAccess& access) {
  if (!file.format->HasMetaData(access, kBext))
    return tarn::BWFBroadcastWaveExtension::ForNewRecording(file.attributes);
  const tarn::RCBlobMT blob = file.format->ReadMetaData(access, kBext);
  return tarn::BWFBroadcastWaveExtension::Parse(blob.GetPtr(),
                                                static_cast<std::size_t>(blob.GetSize()));
}

}  // namespace

int RunMetaGet(const Words& words) {
  const CommandLine cl(words, {}, {}, 2, 3);
  const std::string& path = cl.Positional()[0];
  const tarn::RIFFType tag = ParseTag(cl.Positional()[1]);
  tarn::RCBlobMT payload;
  {
    FileScope scope(path);
    const SoundFile file = OpenSoundFile(path);
    const auto editor = MakeChunkEditor(file);
    if (!editor->HasChunk(tag))
      tarn::FailFormatError("RIFFFileEditor", tarn::RIFFFileEditor::kChunkNotFound, file.spec);
    payload = editor->ReadChunkData(tag);
  }
  const auto size = static_cast<std::size_t>(payload.GetSize());
  if (cl.Positional().size() == 3) {
    WriteWholeFile(cl.Positional()[2], payload.GetPtr(), size);
  } else {
    SetStandardOutputBinary();
    if (size > 0 && std::fwrite(payload.GetPtr(), 1, size, stdout) != size) {
      FileScope scope("standard output");
      tarn::FailOSErr(tarn::kIOErr);
    }
  }
  return 0;
}

int RunMetaSet(const Words& words) {
  const CommandLine cl(words, {}, {}, 3, 3);
  const std::string& path = cl.Positional()[0];
  const tarn::RIFFType tag = ParseTag(cl.Positional()[1]);
  const std::vector<std::uint8_t> data = ReadWholeFile(cl.Positional()[2]);
  FileScope scope(path);
  SoundFile file = OpenSoundFile(path);
  RefuseStructuralTag(file, tag);
  auto access = file.format->GetReadWriteMetaDataAccess();
  file.format->WriteMetaData(*access, tag, tarn::RCBlobMT(data.data(), data.size()));
  access->Flush();
  return 0;
}

int RunMetaJunk(const Words& words) {
  const CommandLine cl(words, {}, {}, 2, 2);
  const std::string& path = cl.Positional()[0];
  const tarn::RIFFType tag = ParseTag(cl.Positional()[1]);
  FileScope scope(path);
  SoundFile file = OpenSoundFile(path);
  RefuseStructuralTag(file, tag);
  file.format.reset();  // the editor changes the layout under any format object
  MakeChunkEditor(file)->JunkChunk(tag, file.AudioTag());
  return 0;
}

int RunMetaStrip(const Words& words) {
  const CommandLine cl(words, {}, {}, 1, 1);
  const std::string& path = cl.Positional()[0];
  FileScope scope(path);
  SoundFile file = OpenSoundFile(path);
  auto access = file.format->GetReadWriteMetaDataAccess();
  file.format->RemoveTrailingMetaData();
  access->Flush();
  return 0;
}

int RunBext(const Words& words) {
  const CommandLine cl(words, {"json"}, {"set"}, 1, 1);
  const std::string& path = cl.Positional()[0];
  FileScope scope(path);
  SoundFile file = OpenSoundFile(path);
  if (!file.IsWAVE()) {
    std::fprintf(stderr,
                 "tarnfile bext: %s: only WAVE and Wave64 files hold a broadcast extension\n",
                 path.c_str());
    tarn::FailFormatError("tarnfile", tarn::kParamErr, file.spec);
  }
  tarn::BWFBroadcastWaveExtension bext;
  const std::vector<std::string> sets = cl.Values("set");
  if (sets.empty()) {
    const auto access = file.format->GetReadOnlyMetaDataAccess();
    if (!file.format->HasMetaData(*access, kBext)) {
      if (cl.Has("json"))
        std::printf("null\n");
      else
        std::printf("%s: no broadcast extension\n", path.c_str());
      return 0;
    }
    bext = ReadBext(file, *access);
  } else {
    auto access = file.format->GetReadWriteMetaDataAccess();
    bext = ReadBext(file, *access);
    for (const std::string& set : sets) {
      const std::size_t equals = set.find('=');
      if (equals == std::string::npos) throw UsageError("--set takes FIELD=VALUE: '" + set + "'");
      SetBextField(bext, set.substr(0, equals), set.substr(equals + 1));
    }
    const std::vector<std::uint8_t> bytes = bext.Flatten();
    file.format->WriteMetaData(*access, kBext, tarn::RCBlobMT(bytes.data(), bytes.size()));
    access->Flush();
  }
  if (cl.Has("json")) {
    std::string line;
    JsonWriter json(line);
    WriteBextJson(json, bext);
    std::printf("%s\n", line.c_str());
  } else {
    std::printf("%s\n", path.c_str());
    PrintBextFields(bext, "  ");
  }
  return 0;
}

int RunMD5(const Words& words) {
  const CommandLine cl(words, {}, {}, 1, SIZE_MAX);
  for (const std::string& path : cl.Positional()) {
    FileScope scope(path);
    const SoundFile file = OpenSoundFile(path);
    std::printf("%s  %s\n", AudioPayloadMD5(file).c_str(), path.c_str());
  }
  return 0;
}

int RunRecover(const Words& words) {
  const CommandLine cl(words, {}, {}, 1, 1);
  const std::string& path = cl.Positional()[0];
  FileScope scope(path);
  std::int64_t before = 0;
  {
    SoundFile file = OpenSoundFile(path);
    before = file.frames;
    file.format->RecoverCrashedRecording();
  }
  const SoundFile after = OpenSoundFile(path);
  if (after.frames == before)
    std::printf("%s: header whole, %lld frames\n", path.c_str(), static_cast<long long>(before));
  else
    std::printf("%s: repaired, %lld frames (header said %lld)\n", path.c_str(),
                static_cast<long long>(after.frames), static_cast<long long>(before));
  return 0;
}

}  // namespace tarnfile
