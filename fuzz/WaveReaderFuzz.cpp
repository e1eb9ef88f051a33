// Fuzz target of WAVEReader and WAVESoundFileFormat: arbitrary bytes are
// parsed as a WAVE or Wave64 file, every question is asked, and when the
// file parses its metadata is read through the format object and one
// metadata edit is made on a copy.
//
// Checked on every input (a violation aborts, which libFuzzer reports):
//   - nothing but TarnError escapes (no crash, no other exception, no
//     allocation beyond what the sanitizers allow);
//   - the audio offset and the audio (frames times frame size) lie inside
//     the file; the "data" header lies before the audio;
//   - the raw header is exactly the bytes before the audio;
//   - the chunks the walk met lie inside the file, in increasing order;
//   - after a "bext" edit on a copy, the audio bytes are unchanged and the
//     copy still parses with the same frame count and offset.

#include <unistd.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <vector>

#include "FuzzSupport.h"
#include "tarn/Audio/SoundFileFormats/WAVEReader.h"
#include "tarn/Audio/SoundFileFormats/WAVESoundFileFormat.h"
#include "tarn/Errors/TarnError.h"

namespace tarn {
namespace {

using fuzz::Bytes;
constexpr std::size_t kMaxInput = 64 * 1024;

struct Scratch {
  fuzz::ScratchFile original{"tarn-wave-fuzz", "-in.wav"};
  fuzz::ScratchFile copy{"tarn-wave-fuzz", "-edit.wav"};
};

using fuzz::ReadBytes;
using fuzz::Violation;
using fuzz::WriteBytes;

FileSpecification SpecOf(const std::filesystem::path& path) {
  return FileSpecification(UString(path.c_str()));
}

template <class F>
void Guard(F&& f) {
  try {
    f();
  } catch (const TarnError&) {  // NOLINT(bugprone-empty-catch): the expected failure
  } catch (...) {
    Violation("an exception other than TarnError escaped");
  }
}

void Check(const Scratch& scratch, const Bytes& original) {
  WAVEReader reader(SpecOf(scratch.original));
  if (!reader.CanParse()) {
    bool threw = false;
    try {
      (void)reader.GetNumberOfFrames();
    } catch (const TarnError&) {
      threw = true;
    }
    TARN_FUZZ_CHECK(threw);
    return;
  }
  const auto length = static_cast<std::int64_t>(original.size());
  const std::int64_t audio = reader.GetHeaderSize();
  const std::int64_t frames = reader.GetNumberOfFrames();
  TARN_FUZZ_CHECK(reader.GetOffsetToAudioHeader() < audio);
  TARN_FUZZ_CHECK(audio <= length);
  TARN_FUZZ_CHECK(frames >= 0 && reader.GetSampleFrameSize() > 0);
  TARN_FUZZ_CHECK(audio + frames * reader.GetSampleFrameSize() <= length);
  const Bytes raw = reader.GetRawHeader();
  TARN_FUZZ_CHECK(raw == Bytes(original.begin(), original.begin() + audio));
  std::int64_t last = -1;
  for (const auto& chunk : reader.GetChunks()) {
    TARN_FUZZ_CHECK(chunk.offset > last && chunk.offset < length);
    last = chunk.offset;
  }
  (void)reader.GetComment();
  (void)reader.GetOriginalTimeStamp();
  (void)reader.GetAcidInfo();
  (void)reader.CanSwitchToWave64();
  (void)reader.GetSampleFormat();

  // The format object over the same bytes: metadata reads, then one edit
  // on a copy.
  Guard([&] {
    auto format = std::make_shared<WAVESoundFileFormat>(SpecOf(scratch.original));
    auto ro = format->GetReadOnlyMetaDataAccess();
    (void)format->GetRegionList(*ro);
    const short loops = format->NumberOfLoops(*ro);
    for (short i = 0; i < loops && i < 8; ++i) {
      SoundFileFormatLoop loop;
      format->GetFileLoop(*ro, i, loop);
    }
    UString text;
    (void)format->GetStringFromFile(*ro, WAVESoundFileFormat::kCommentString, text);
  });
  WriteBytes(scratch.copy, original.data(), original.size());
  Guard([&] {
    auto format = std::make_shared<WAVESoundFileFormat>(SpecOf(scratch.copy));
    {
      auto rw = format->GetReadWriteMetaDataAccess();
      format->SaveStringToFile(*rw, WAVESoundFileFormat::kCommentString, UString("fuzz"));
      rw->Flush();
    }
    WAVEReader after(SpecOf(scratch.copy));
    TARN_FUZZ_CHECK(after.CanParse());
    const Bytes edited = ReadBytes(scratch.copy);
    const std::int64_t audioBytes = frames * reader.GetSampleFrameSize();
    TARN_FUZZ_CHECK(static_cast<std::int64_t>(edited.size()) >= audio + audioBytes);
    TARN_FUZZ_CHECK(Bytes(edited.begin() + audio, edited.begin() + audio + audioBytes) ==
                    Bytes(original.begin() + audio, original.begin() + audio + audioBytes));
    TARN_FUZZ_CHECK(after.GetHeaderSize() == audio);
  });
}

}  // namespace
}  // namespace tarn

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace tarn;
  if (size > kMaxInput) return -1;
  static Scratch scratch;
  WriteBytes(scratch.original, data, size);
  Check(scratch, Bytes(data, data + size));
  return 0;
}
