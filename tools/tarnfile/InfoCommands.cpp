// info and chunks: what a sound file holds, read through its format object
// and the chunk editor.
#include <cstdio>
#include <memory>
#include <string>

#include "BextFields.h"
#include "Commands.h"
#include "JsonWriter.h"
#include "ToolSupport.h"
#include "tarn/Audio/SoundFileFormats/RIFFFileEditor.h"
#include "tarn/Audio/SoundFileFormats/RIFFFormatHandlers.h"
#include "tarn/Audio/SoundFileFormats/SoundFileFormat.h"

namespace tarnfile {

namespace {

using tarn::MakeRIFFType;

struct Facts {
  std::optional<tarn::BWFBroadcastWaveExtension> bext;
  std::vector<tarn::SoundFileFormatLoop> loops;
  std::unique_ptr<tarn::SoundFileRegionList> markers;
};

Facts ReadFacts(SoundFile& file) {
  Facts facts;
  tarn::SoundFileFormat& format = *file.format;
  const auto access = format.GetReadOnlyMetaDataAccess();
  if (file.IsWAVE() && format.HasMetaData(*access, MakeRIFFType("bext"))) {
    const tarn::RCBlobMT blob = format.ReadMetaData(*access, MakeRIFFType("bext"));
    facts.bext = tarn::BWFBroadcastWaveExtension::Parse(blob.GetPtr(),
                                                        static_cast<std::size_t>(blob.GetSize()));
  }
  const short loops = format.NumberOfLoops(*access);
  for (short i = 0; i < loops; ++i) {
    tarn::SoundFileFormatLoop loop;
    format.GetFileLoop(*access, i, loop);
    facts.loops.push_back(loop);
  }
  facts.markers = format.GetRegionList(*access);
  if (!facts.markers) facts.markers = std::make_unique<tarn::SoundFileRegionList>();
  return facts;
}

const char* LoopTypeName(tarn::SoundFileFormatLoop::Type type) {
  switch (type) {
    case tarn::SoundFileFormatLoop::Type::kForward:
      return "forward";
    case tarn::SoundFileFormatLoop::Type::kAlternating:
      return "alternating";
    case tarn::SoundFileFormatLoop::Type::kBackward:
      return "backward";
  }
  return "unknown";
}

double Duration(const SoundFile& file) {
  return file.attributes.mSampleRate > 0
             ? static_cast<double>(file.frames) / file.attributes.mSampleRate
             : 0.0;
}

void WriteInfoJson(const std::string& path, SoundFile& file, const Facts& facts) {
  const tarn::SoundFileAttributes& a = file.attributes;
  std::string line;
  JsonWriter json(line);
  json.BeginObject();
  json.Key("file").String(path);
  json.Key("format").String(file.formatName);
  json.Key("container").String(ContainerName(file.container));
  json.Key("channels").Int(a.mNumChannels);
  json.Key("rate").Number(a.mSampleRate);
  json.Key("sample_format").String(SampleFormatName(a.mSampleFormat));
  json.Key("bytes_per_sample").Int(a.mBytesPerSample);
  json.Key("frames").Int(file.frames);
  json.Key("duration").Number(Duration(file));
  json.Key("audio_offset").Int(a.mOffsetToAudio);
  json.Key("byte_order").String(a.mSamplesAreLSBFirst ? "little" : "big");
  json.Key("bext");
  if (facts.bext)
    WriteBextJson(json, *facts.bext);
  else
    json.Null();
  json.Key("loops").BeginArray();
  for (const auto& loop : facts.loops) {
    json.BeginObject();
    json.Key("start").Int(loop.mStart.AsLongLong());
    json.Key("end").Int(loop.mEnd.AsLongLong());
    json.Key("type").String(LoopTypeName(loop.mType));
    json.Key("play_count").Int(loop.mPlayCount);
    json.Key("name").String(loop.mName.utf8_str());
    json.EndObject();
  }
  json.EndArray();
  json.Key("markers").BeginArray();
  for (const auto& entry : *facts.markers) {
    json.BeginObject();
    json.Key("id").Int(entry.mID);
    json.Key("name").String(entry.mName.utf8_str());
    json.Key("start").Int(entry.mStart.AsLongLong());
    json.Key("length").Int(entry.mLength.AsLongLong());
    json.EndObject();
  }
  json.EndArray();
  json.EndObject();
  std::printf("%s\n", line.c_str());
}

void PrintInfo(const std::string& path, SoundFile& file, const Facts& facts) {
  const tarn::SoundFileAttributes& a = file.attributes;
  std::printf("%s\n", path.c_str());
  std::printf("  format          %s (%s container, %s-endian samples)\n", file.formatName.c_str(),
              ContainerName(file.container), a.mSamplesAreLSBFirst ? "little" : "big");
  std::printf("  channels        %d\n", a.mNumChannels);
  std::printf("  rate            %g Hz\n", a.mSampleRate);
  std::printf("  sample format   %s (%d bytes per sample)\n", SampleFormatName(a.mSampleFormat),
              a.mBytesPerSample);
  std::printf("  frames          %lld\n", static_cast<long long>(file.frames));
  std::printf("  duration        %.6f s\n", Duration(file));
  std::printf("  audio offset    %d\n", a.mOffsetToAudio);
  if (facts.bext) {
    std::printf("  bext\n");
    PrintBextFields(*facts.bext, "    ");
  }
  std::printf("  loops           %zu\n", facts.loops.size());
  for (const auto& loop : facts.loops)
    std::printf("    %lld..%lld %s x%u %s\n", static_cast<long long>(loop.mStart.AsLongLong()),
                static_cast<long long>(loop.mEnd.AsLongLong()), LoopTypeName(loop.mType),
                loop.mPlayCount, loop.mName.utf8_str().c_str());
  std::printf("  markers         %zu\n", facts.markers->size());
  for (const auto& entry : *facts.markers)
    std::printf("    #%u at %lld length %lld %s\n", entry.mID,
                static_cast<long long>(entry.mStart.AsLongLong()),
                static_cast<long long>(entry.mLength.AsLongLong()), entry.mName.utf8_str().c_str());
}

}  // namespace

int RunInfo(const Words& words) {
  const CommandLine cl(words, {"json"}, {}, 1, SIZE_MAX);
  const bool json = cl.Has("json");
  for (const std::string& path : cl.Positional()) {
    FileScope scope(path);
    SoundFile file = OpenSoundFile(path, true);
    const Facts facts = ReadFacts(file);
    if (json)
      WriteInfoJson(path, file, facts);
    else
      PrintInfo(path, file, facts);
  }
  return 0;
}

int RunChunks(const Words& words) {
  const CommandLine cl(words, {"json"}, {}, 1, 1);
  const std::string& path = cl.Positional()[0];
  FileScope scope(path);
  const SoundFile file = OpenSoundFile(path);
  const auto editor = MakeChunkEditor(file);
  const auto& chunks = editor->GetChunkList();
  if (cl.Has("json")) {
    std::string line;
    JsonWriter json(line);
    json.BeginObject();
    json.Key("file").String(path);
    json.Key("container").String(ContainerName(file.container));
    json.Key("chunks").BeginArray();
    for (const auto& [info, action] : chunks) {
      json.BeginObject();
      json.Key("tag").String(TagText(info.tag));
      json.Key("offset").Int(info.offset);
      json.Key("length").Int(info.length);
      json.EndObject();
    }
    json.EndArray();
    json.EndObject();
    std::printf("%s\n", line.c_str());
    return 0;
  }
  std::printf("%s (%s)\n  %-8s %14s %14s\n", path.c_str(), ContainerName(file.container), "tag",
              "offset", "length");
  for (const auto& [info, action] : chunks)
    std::printf("  %-8s %14lld %14lld\n", ("'" + TagText(info.tag) + "'").c_str(),
                static_cast<long long>(info.offset), static_cast<long long>(info.length));
  return 0;
}

}  // namespace tarnfile
