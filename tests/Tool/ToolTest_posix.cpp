// tarnfile as its users run it: exit statuses and messages, help, JSON keys,
// what it reports against what sox says of the same files (made here by sox
// and ffmpeg), metadata edits that leave the audio MD5 alone, recovery of an
// unclosed recording, conversion and tones read back by those programs, and
// the demo.

#include <gtest/gtest.h>
#include <sys/wait.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <random>
#include <string>
#include <vector>

namespace {

namespace fs = std::filesystem;

#ifdef TARNFILE_PATH
constexpr const char* kTool = TARNFILE_PATH;
#else
constexpr const char* kTool = nullptr;
#endif

struct Result {
  int status = -1;
  std::string out;
  std::string err;
};

std::string Slurp(const fs::path& path) {
  std::ifstream in(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}

class ToolTest : public ::testing::Test {
 protected:
  void SetUp() override {
    if (!kTool) GTEST_SKIP() << "tarnfile is not built in this configuration";
    std::random_device random;
    dir_ = fs::temp_directory_path() / ("tarnfile-test-" + std::to_string(random()));
    fs::create_directories(dir_);
  }
  void TearDown() override {
    std::error_code ignored;
    if (!dir_.empty()) fs::remove_all(dir_, ignored);
  }

  fs::path P(const std::string& name) const { return dir_ / name; }

  // Runs a shell command line in the scratch folder.
  Result Shell(const std::string& command) const {
    const std::string line = "cd '" + dir_.string() + "' && " + command + " >'" +
                             P("stdout").string() + "' 2>'" + P("stderr").string() + "'";
    Result r;
    const int raw = std::system(line.c_str());
    r.status = WIFEXITED(raw) ? WEXITSTATUS(raw) : -1;
    r.out = Slurp(P("stdout"));
    r.err = Slurp(P("stderr"));
    return r;
  }
  Result Tool(const std::string& args) const { return Shell(std::string(kTool) + " " + args); }

  // A program the test needs; fails naming its Debian package when missing.
  static void Need(const char* program, const char* package) {
    const std::string probe = std::string("command -v ") + program + " >/dev/null 2>&1";
    ASSERT_EQ(std::system(probe.c_str()), 0)
        << program << " is missing: install the Debian package " << package;
  }

  // Makes a file with a shell command; the command must succeed.
  void Make(const std::string& command) const {
    const Result r = Shell(command);
    ASSERT_EQ(r.status, 0) << command << "\n" << r.err;
  }

  // The trimmed standard output of a command that must succeed.
  std::string Output(const std::string& command) const {
    const Result r = Shell(command);
    EXPECT_EQ(r.status, 0) << command << "\n" << r.err;
    std::string s = r.out;
    while (!s.empty() && (s.back() == '\n' || s.back() == ' ')) s.pop_back();
    return s;
  }

  fs::path dir_;
};

// The raw text of a top-level value in one line of the tool's JSON (numbers
// and strings without their quotes); empty when the key is absent.
std::string JsonValue(const std::string& json, const std::string& key) {
  const std::string quoted = "\"" + key + "\":";
  const std::size_t at = json.find(quoted);
  if (at == std::string::npos) return {};
  std::size_t begin = at + quoted.size();
  if (json[begin] == '"') {
    const std::size_t end = json.find('"', begin + 1);
    return json.substr(begin + 1, end - begin - 1);
  }
  const std::size_t end = json.find_first_of(",}", begin);
  return json.substr(begin, end - begin);
}

TEST_F(ToolTest, ExitStatusHelpAndMessages) {
  Need("sox", "sox");
  Make("sox -n -r 8000 -c 1 -b 16 t.wav synth 0.1 sine 440 && sox t.wav t.aiff");
  Make("echo 'not a sound file' > text.wav");
  struct Case {
    const char* args;
    int status;
    const char* inStdout;
    const char* inStderr;
  } cases[] = {
      {"", 2, "", "usage: tarnfile COMMAND"},
      {"--help", 0, "usage: tarnfile COMMAND", ""},
      {"frobnicate", 2, "", "unknown command 'frobnicate'"},
      {"meta", 2, "", "usage: tarnfile meta get"},
      {"meta --help", 0, "usage: tarnfile meta get", ""},
      {"info", 2, "", "missing argument"},
      {"info --frames t.wav", 2, "", "unknown option --frames"},
      {"chunks t.wav t.aiff", 2, "", "too many arguments"},
      {"info missing.wav", 1, "", "missing.wav: OS, File I/O, , -43"},
      {"md5 t.wav missing.aiff", 1, "t.wav", "missing.aiff"},
      {"info text.wav", 1, "", "text.wav: WAVEReader"},
      {"bext t.aiff", 1, "", "t.aiff"},
      {"meta get t.wav zzzz", 1, "", "RIFFFileEditor, RIFFFileEditor, RIFFFileEditor, 1"},
      {"meta junk t.wav zzzz", 1, "", "t.wav"},
      {"meta set t.wav data t.aiff", 2, "", "part of the file's structure"},
      {"meta get t.wav toolong", 2, "", "one to four characters"},
      {"bext t.wav --set colour=red", 2, "", "unknown bext field 'colour'"},
      {"bext t.wav --set version=70000", 2, "", "version must lie in 0..65535"},
      {"bext t.wav --set description", 2, "", "FIELD=VALUE"},
      {"tone out.wav --format s12", 2, "", "unknown sample format 's12'"},
      {"tone out.wav --seconds x", 2, "", "must be a number"},
      {"convert t.wav", 2, "", "missing argument"},
      {"convert t.wav o.wav --dither loud", 2, "", "--dither"},
      {"convert t.wav ./t.wav --format s24", 2, "", "the same file"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.args);
    const Result r = Tool(c.args);
    EXPECT_EQ(r.status, c.status) << r.err;
    EXPECT_NE(r.out.find(c.inStdout), std::string::npos) << r.out;
    EXPECT_NE(r.err.find(c.inStderr), std::string::npos) << r.err;
  }
  for (const char* command : {"info", "chunks", "convert", "meta get", "meta set", "meta junk",
                              "meta strip", "bext", "md5", "recover", "tone", "demo"}) {
    SCOPED_TRACE(command);
    const Result r = Tool(std::string(command) + " --help");
    EXPECT_EQ(r.status, 0);
    EXPECT_EQ(r.out.rfind(std::string("usage: tarnfile ") + command, 0), 0u) << r.out;
    EXPECT_TRUE(r.err.empty()) << r.err;
  }
}

// Files as sox and ffmpeg write them, with what info must say of them.
struct PeerFile {
  const char* name;
  const char* make;
  const char* format;
  const char* sampleFormat;
  const char* byteOrder;
  const char* rawForMD5;  // sox options giving the payload bytes; empty: skip
};

const PeerFile kPeerFiles[] = {
    {"u8.wav", "sox -n -r 8000 -c 1 -b 8 -e unsigned u8.wav synth 0.25 sine 300", "WAVE", "u8",
     "little", "-b 8 -e unsigned"},
    {"s16.wav", "sox -n -r 44100 -c 2 -b 16 s16.wav synth 0.5 sine 440", "WAVE", "s16", "little",
     "-b 16 -e signed -L"},
    {"s24.wav", "sox -n -r 48000 -c 1 -b 24 s24.wav synth 0.3 sine 1000", "WAVE", "s24", "little",
     "-b 24 -e signed -L"},
    {"f32.wav", "ffmpeg -v error -f lavfi -i sine=d=0.2:sample_rate=22050 -c:a pcm_f32le f32.wav",
     "WAVE", "f32", "little", ""},
    {"s16.w64", "sox -n -r 32000 -c 2 -b 16 -t w64 s16.w64 synth 0.2 sine 500", "Wave64", "s16",
     "little", "-b 16 -e signed -L"},
    {"f64.wav", "sox -n -r 96000 -c 2 -e floating-point -b 64 f64.wav synth 0.1 sine 800", "WAVE",
     "f64", "little", ""},
    {"s24.w64", "sox -n -r 44100 -c 1 -b 24 -t w64 s24.w64 synth 0.2 sine 500", "Wave64", "s24",
     "little", "-b 24 -e signed -L"},
    {"s16.aiff", "sox -n -r 44100 -c 2 -b 16 s16.aiff synth 0.4 sine 220", "AIFF", "s16", "big",
     "-b 16 -e signed -B"},
    {"s24.aiff", "ffmpeg -v error -f lavfi -i sine=d=0.2 -c:a pcm_s24be s24.aiff", "AIFF", "s24",
     "big", ""},
    {"sowt.aifc", "ffmpeg -v error -f lavfi -i sine=d=0.2 -c:a pcm_s16le -f aiff sowt.aifc", "AIFC",
     "s16", "little", ""},
    {"f32.aifc", "sox -n -r 16000 -c 1 -e floating-point -b 32 f32.aifc synth 0.2 sine 700", "AIFC",
     "f32", "big", ""},
};

// (One peer's word per fact: what the reader finds in these files is
// checked against libsndfile and ffprobe by the sound-file format tests.)
TEST_F(ToolTest, InfoAgreesWithSox) {
  Need("sox", "sox");
  Need("ffmpeg", "ffmpeg");
  for (const PeerFile& f : kPeerFiles) {
    SCOPED_TRACE(f.name);
    Make(f.make);
    const Result r = Tool(std::string("info --json ") + f.name);
    ASSERT_EQ(r.status, 0) << r.err;
    const std::string& json = r.out;
    for (const char* key :
         {"file", "format", "container", "channels", "rate", "sample_format", "bytes_per_sample",
          "frames", "duration", "audio_offset", "byte_order", "bext", "loops", "markers"})
      EXPECT_NE(json.find(std::string("\"") + key + "\":"), std::string::npos) << key;
    EXPECT_EQ(JsonValue(json, "format"), f.format);
    EXPECT_EQ(JsonValue(json, "sample_format"), f.sampleFormat);
    EXPECT_EQ(JsonValue(json, "byte_order"), f.byteOrder);
    EXPECT_EQ(JsonValue(json, "channels"), Output(std::string("soxi -c ") + f.name));
    EXPECT_EQ(JsonValue(json, "rate"), Output(std::string("soxi -r ") + f.name));
    EXPECT_EQ(JsonValue(json, "frames"), Output(std::string("soxi -s ") + f.name));
    // The audio MD5 is that of the samples as sox decodes them to raw bytes.
    if (*f.rawForMD5) {
      const Result ours = Tool(std::string("md5 ") + f.name);
      ASSERT_EQ(ours.status, 0) << ours.err;
      EXPECT_EQ(ours.out.substr(0, 32), Output(std::string("sox ") + f.name + " -t raw " +
                                               f.rawForMD5 + " - | md5sum | cut -c1-32"));
    }
  }
}

TEST_F(ToolTest, MetadataEditsLeaveTheAudioMD5Alone) {
  Need("sox", "sox");
  Need("ffmpeg", "ffmpeg");
  Make("sox -n -r 44100 -c 2 -b 16 a.wav synth 0.5 sine 440");
  Make("sox -n -r 44100 -c 2 -b 24 -t w64 a.w64 synth 0.5 sine 440");
  Make("sox -n -r 44100 -c 1 -b 16 a.aiff synth 0.5 sine 440");
  Make("printf 'payload of an odd size' > data.bin && printf 'x' > one.bin");
  struct Step {
    const char* args;  // FILE is replaced by the file
    bool wave;         // WAVE family only
  } steps[] = {
      {"meta set FILE iXML data.bin", false},
      {"meta set FILE iXML one.bin", false},
      {"bext FILE --set description=Take_7 --set originator=tests --set time_reference=4800000000",
       true},
      {"bext FILE --set coding_history=A=PCM", true},
      {"meta set FILE cart data.bin", false},
      {"meta junk FILE iXML", false},
  };
  // The audio as ffmpeg decodes it (sox and libsndfile read a Wave64 file's
  // audio up to the end of the file, chunks after the audio included).
  const auto decoded = [this](const std::string& file) {
    return Output("ffmpeg -v error -i " + file + " -f s32le - | md5sum");
  };
  for (const char* file : {"a.wav", "a.w64", "a.aiff"}) {
    SCOPED_TRACE(file);
    const bool wave = std::string(file) != "a.aiff";
    const std::string md5 = Output(std::string(kTool) + " md5 " + file).substr(0, 32);
    const std::string frames = Output(std::string("soxi -s ") + file);
    const std::string audio = decoded(file);
    for (const Step& step : steps) {
      if (step.wave && !wave) continue;
      std::string args = step.args;
      args.replace(args.find("FILE"), 4, file);
      SCOPED_TRACE(args);
      const Result r = Tool(args);
      ASSERT_EQ(r.status, 0) << r.err;
      EXPECT_EQ(Output(std::string(kTool) + " md5 " + file).substr(0, 32), md5);
      EXPECT_EQ(decoded(file), audio);
      if (args.find("meta set") != std::string::npos) {
        // What was set is what comes back, byte for byte.
        const std::string tag = args.find("cart") != std::string::npos ? "cart" : "iXML";
        const std::string source = args.substr(args.rfind(' ') + 1);
        EXPECT_EQ(Tool(std::string("meta get ") + file + " " + tag).out, Slurp(P(source)));
      }
    }
    const std::string chunks = Tool(std::string("chunks --json ") + file).out;
    EXPECT_EQ(chunks.find("\"tag\":\"iXML\""), std::string::npos) << chunks;
    EXPECT_NE(chunks.find("\"tag\":\"cart\""), std::string::npos) << chunks;
    if (wave) {
      const std::string bext = Tool(std::string("bext --json ") + file).out;
      EXPECT_EQ(JsonValue(bext, "description"), "Take_7");
      EXPECT_EQ(JsonValue(bext, "originator"), "tests");
      EXPECT_EQ(JsonValue(bext, "time_reference"), "4800000000");
      EXPECT_EQ(JsonValue(bext, "coding_history"), "A=PCM");
      EXPECT_NE(Tool(std::string("info --json ") + file).out.find("\"bext\":{\"description\""),
                std::string::npos);
    }
    // Cutting every chunk after the audio leaves the audio too.
    ASSERT_EQ(Tool(std::string("meta strip ") + file).status, 0);
    EXPECT_EQ(Output(std::string(kTool) + " md5 " + file).substr(0, 32), md5);
    EXPECT_EQ(Output(std::string("soxi -s ") + file), frames);
    const std::string stripped = Tool(std::string("chunks --json ") + file).out;
    const std::string audioTag = wave ? "\"tag\":\"data\"" : "\"tag\":\"SSND\"";
    EXPECT_EQ(stripped.rfind("\"tag\":"), stripped.find(audioTag)) << stripped;
  }
}

TEST_F(ToolTest, ChunkListingMatchesTheFile) {
  Need("sox", "sox");
  Make("sox -n -r 8000 -c 1 -b 16 c.wav synth 0.01 sine 440");  // 80 frames: 160 bytes
  const Result r = Tool("chunks --json c.wav");
  ASSERT_EQ(r.status, 0) << r.err;
  // sox writes "fmt " (16 bytes here) and "data"; offsets are those of the
  // chunk headers.
  EXPECT_EQ(
      r.out,
      "{\"file\":\"c.wav\",\"container\":\"RIFF\",\"chunks\":[{\"tag\":\"fmt \",\"offset\":12,"
      "\"length\":16},{\"tag\":\"data\",\"offset\":36,\"length\":160}]}\n");
}

// The offset of a chunk's header in `chunks --json` output.
long ChunkOffset(const std::string& json, const std::string& tag) {
  const std::string key = "{\"tag\":\"" + tag + "\",\"offset\":";
  const std::size_t at = json.find(key);
  return at == std::string::npos ? -1 : std::stol(json.substr(at + key.size()));
}

TEST_F(ToolTest, RecoverRepairsUnclosedRecordings) {
  Need("sox", "sox");
  Make("sox -n -r 8000 -c 2 -b 16 r.wav synth 0.5 sine 440 && cp r.wav whole.wav");
  Make("sox -n -r 8000 -c 2 -b 16 r.aiff synth 0.5 sine 440 && cp r.aiff whole.aiff");
  const long data = ChunkOffset(Tool("chunks --json r.wav").out, "data");
  const long ssnd = ChunkOffset(Tool("chunks --json r.aiff").out, "SSND");
  const long comm = ChunkOffset(Tool("chunks --json r.aiff").out, "COMM");
  ASSERT_GT(data, 0);
  ASSERT_GT(ssnd, 0);
  ASSERT_GT(comm, 0);
  const auto poke = [&](const char* file, long at, const char* bytes) {
    Make(std::string("printf '") + bytes + "' | dd of=" + file +
         " bs=1 seek=" + std::to_string(at) + " conv=notrunc status=none");
  };
  // Recordings that were never closed: the WAVE "data" size still 0; the
  // AIFF "SSND" holding only its offset fields, "COMM" without frames.
  poke("r.wav", data + 4, "\\000\\000\\000\\000");
  poke("r.aiff", ssnd + 4, "\\000\\000\\000\\010");
  poke("r.aiff", comm + 10, "\\000\\000\\000\\000");
  for (const char* file : {"r.wav", "r.aiff"}) {
    SCOPED_TRACE(file);
    EXPECT_EQ(JsonValue(Tool(std::string("info --json ") + file).out, "frames"), "0");
    const Result r = Tool(std::string("recover ") + file);
    ASSERT_EQ(r.status, 0) << r.err;
    EXPECT_NE(r.out.find("repaired, 4000 frames"), std::string::npos) << r.out;
    EXPECT_EQ(Output(std::string("soxi -s ") + file), "4000");
    EXPECT_NE(Tool(std::string("recover ") + file).out.find("header whole"), std::string::npos);
  }
  // The repaired headers are byte for byte those sox wrote.
  EXPECT_EQ(Slurp(P("r.wav")), Slurp(P("whole.wav")));
  EXPECT_EQ(Slurp(P("r.aiff")), Slurp(P("whole.aiff")));
}

// Tones and conversions as sox and libsndfile read them.
TEST_F(ToolTest, TonesAndConversionsReadElsewhere) {
  Need("sox", "sox");
  Need("sndfile-info", "sndfile-programs");
  const std::string tone = " --rate 44100 --seconds 0.25";
  struct Case {
    std::string args;
    const char* file;
    const char* format;
    const char* sampleFormat;
    const char* soxBits;
    const char* channels;
  } cases[] = {
      {"tone t1.wav --format u8 --channels 1" + tone, "t1.wav", "WAVE", "u8", "8", "1"},
      {"tone t2.w64 --type w64 --format s24" + tone, "t2.w64", "Wave64", "s24", "24", "2"},
      {"tone t3.aif --format s8 --shape square" + tone, "t3.aif", "AIFF", "s8", "8", "2"},
      {"tone t4.aifc --format f64 --shape saw --channels 3" + tone, "t4.aifc", "AIFC", "f64", "64",
       "3"},
      {"tone t5.wav --format s24in32 --channels 4 --shape triangle" + tone, "t5.wav", "WAVE",
       "s24in32", "32", "4"},
      {"convert t2.w64 c1.aiff --format s16 --dither tpdf", "c1.aiff", "AIFF", "s16", "16", "2"},
      {"convert t1.wav c2.w64 --format f32", "c2.w64", "Wave64", "f32", "32", "1"},
      {"convert t4.aifc c3.wav --unbuffered", "c3.wav", "WAVE", "f64", "64", "3"},
      {"convert t3.aif c4.aiff --type aifc --format s24in32", "c4.aiff", "AIFC", "s24in32", "32",
       "2"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.args);
    const Result r = Tool(c.args);
    ASSERT_EQ(r.status, 0) << r.err;
    EXPECT_TRUE(r.err.empty()) << "no progress off a terminal: " << r.err;
    const std::string json = Tool(std::string("info --json ") + c.file).out;
    EXPECT_EQ(JsonValue(json, "format"), c.format);
    EXPECT_EQ(JsonValue(json, "sample_format"), c.sampleFormat);
    EXPECT_EQ(JsonValue(json, "frames"), "11025");
    EXPECT_EQ(JsonValue(json, "channels"), c.channels);
    const std::string soxFile = c.file;
    EXPECT_EQ(Output("soxi -s " + soxFile), "11025");
    EXPECT_EQ(Output("soxi -b " + soxFile), c.soxBits);
    EXPECT_EQ(Output("soxi -c " + soxFile), c.channels);
    EXPECT_EQ(Output("soxi -r " + soxFile), "44100");
    // Every tone peaks at half of full scale (-6 dB).
    EXPECT_NE(Output(std::string("sndfile-info ") + c.file + " | grep 'Signal Max'").find("(-6.0"),
              std::string::npos);
  }
  // An option convert does not take: a usage error, nothing written.
  EXPECT_EQ(Tool("convert t1.wav x.wav --channels 2").status, 2);
  EXPECT_FALSE(fs::exists(P("x.wav")));
}

TEST_F(ToolTest, ConvertedFormatsOpenThroughTheOutsideConverter) {
  Need("ffmpeg", "ffmpeg");
  Make(
      "ffmpeg -loglevel error -f lavfi -i sine=frequency=440:duration=1:sample_rate=48000 "
      "-ac 2 -c:a alac song.m4a && ffmpeg -loglevel error -i song.m4a song.mp3 && "
      "ffmpeg -loglevel error -i song.m4a -f s16le song.raw && head -c 3000 /dev/urandom > "
      "junk.mp3");
  const std::string m4a = Tool("info --json song.m4a").out;
  EXPECT_EQ(JsonValue(m4a, "container"), "converter");
  EXPECT_EQ(JsonValue(m4a, "frames"), "48000");
  EXPECT_EQ(JsonValue(m4a, "channels"), "2");
  EXPECT_EQ(JsonValue(Tool("info --json song.mp3").out, "format"), "MP3 Audio");
  // Lossless audio converts to the very samples ffmpeg decodes.
  ASSERT_EQ(Tool("convert song.m4a song.wav --format s16").status, 0);
  EXPECT_EQ(Output("sox song.wav -t s16 - | cmp - song.raw && echo same"), "same");
  ASSERT_EQ(Tool("convert song.mp3 fromMp3").status, 0);  // no extension: WAVE
  EXPECT_EQ(JsonValue(Tool("info --json fromMp3").out, "format"), "WAVE");
  // Chunk tools need a chunk container; noise is refused naming the file.
  EXPECT_EQ(Tool("chunks song.m4a").status, 1);
  const Result junk = Tool("info junk.mp3");
  EXPECT_EQ(junk.status, 1);
  EXPECT_NE(junk.err.find("junk.mp3"), std::string::npos);
}

TEST_F(ToolTest, DemoRunsToTheEnd) {
  const Result r = Tool("demo demo-files");
  ASSERT_EQ(r.status, 0) << r.out << r.err;
  EXPECT_NE(r.out.find("step"), std::string::npos) << r.out;
  EXPECT_TRUE(fs::is_directory(P("demo-files")));
}

}  // namespace
