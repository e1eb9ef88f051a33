// tarnfile: looks into and edits WAVE, Wave64, AIFF and AIFC files with
// TarnCore. Exit status: 0 success, 1 a failure (reported on standard error
// with the file it concerns), 2 a usage error.
#include <cstdio>
#include <cstring>
#include <string>

#include "Commands.h"
#include "ToolSupport.h"
#include "tarn/Basics/TarnCoreVersion.h"
#include "tarn/Errors/Fail.h"

namespace tarnfile {
namespace {

constexpr const char* kFormats = "u8|s8|s16|s24|s24in32|s32|f32|f64";

const Command kCommands[] = {
    {"info", "info FILE... [--json]",
     "format, channels, rate, sample format, frames, duration, audio offset, bext, loops, markers",
     "  --json   one JSON object per file, one per line\n", RunInfo},
    {"chunks", "chunks FILE [--json]", "every chunk of the file: tag, offset, length",
     "  --json   one JSON object\n", RunChunks},
    {"convert",
     "convert IN OUT [--type wav|w64|aiff|aifc] [--format FMT] [--dither none|tpdf] "
     "[--unbuffered]",
     "copy the audio of IN into a new file OUT, converting the sample format",
     "  --type        container of OUT (default: from OUT's extension, else IN's)\n"
     "  --format      sample format of OUT (default: IN's)\n"
     "  --dither      dither when narrowing to 8 or 16 bits (default none)\n"
     "  --unbuffered  write OUT bypassing the system's file cache\n",
     RunConvert},
    {"meta get", "meta get FILE TAG [OUT]", "a chunk's payload to OUT or standard output", "",
     RunMetaGet},
    {"meta set", "meta set FILE TAG DATAFILE", "add or replace a chunk in place", "", RunMetaSet},
    {"meta junk", "meta junk FILE TAG",
     "retire a chunk: renamed JUNK before the audio, cut out after it", "", RunMetaJunk},
    {"meta strip", "meta strip FILE", "cut every chunk after the audio", "", RunMetaStrip},
    {"bext", "bext FILE [--set FIELD=VALUE]... [--json]",
     "read or edit the broadcast-extension fields of a WAVE or Wave64 file in place",
     "  --set FIELD=VALUE  description, originator, originator_reference, origination_date,\n"
     "                     origination_time, time_reference, version, umid (128 hex digits),\n"
     "                     loudness_value, loudness_range, max_true_peak_level,\n"
     "                     max_momentary_loudness, max_short_term_loudness, coding_history\n"
     "  --json             the fields as one JSON object\n",
     RunBext},
    {"md5", "md5 FILE...", "MD5 of the audio payload alone (unchanged by metadata edits)", "",
     RunMD5},
    {"recover", "recover FILE", "repair the header of a recording that was never closed", "",
     RunRecover},
    {"tone",
     "tone OUT [--type wav|w64|aiff|aifc] [--format FMT] [--rate R] [--channels N] "
     "[--seconds S] [--shape sine|square|saw|triangle] [--freq F] [--amplitude A]",
     "write a test tone",
     "  defaults: --format s16 --rate 48000 --channels 2 --seconds 2 --shape sine\n"
     "            --freq 440 --amplitude 0.5 (of full scale)\n"
     "  --dither none|tpdf  dither when writing 8 or 16 bits (default none)\n"
     "  --unbuffered        write bypassing the system's file cache\n",
     RunTone},
    {"demo", "demo [DIR]",
     "make, write, read, convert and edit files in every container and sample format",
     "  DIR  where the files go (default: a new temporary folder)\n", RunDemo},
};

void PrintOverview(std::FILE* out) {
  std::fprintf(out, "usage: tarnfile COMMAND [ARGS] (tarnfile COMMAND --help for more)\n\n");
  for (const Command& c : kCommands) std::fprintf(out, "  %-11s %s\n", c.name, c.summary);
  std::fprintf(out, "\nSample formats (FMT): %s. TarnCore %s.\n", kFormats,
               tarn::GetTarnCoreVersion());
}

void PrintCommandHelp(const Command& c) {
  std::printf("usage: tarnfile %s\n\n%s\n", c.usage, c.summary);
  if (*c.details) std::printf("\n%s", c.details);
}

int RunCommand(const Command& c, const Words& words) {
  try {
    return c.run(words);
  } catch (const UsageError& e) {
    std::fprintf(stderr, "tarnfile %s: %s\nusage: tarnfile %s\n", c.name, e.what(), c.usage);
    return 2;
  } catch (...) {
    const tarn::TarnError error = tarn::GetCurrentError();
    const std::string& file = CurrentFile();
    std::fprintf(stderr, "tarnfile %s: %s%s%s\n", c.name, file.c_str(), file.empty() ? "" : ": ",
                 error.Describe().c_str());
    return 1;
  }
}

}  // namespace
}  // namespace tarnfile

int main(int argc, char** argv) {
  using namespace tarnfile;
  Words words(argv + 1, argv + argc);
  if (words.empty()) {
    PrintOverview(stderr);
    return 2;
  }
  if (words[0] == "--help" || words[0] == "-h" || words[0] == "help") {
    PrintOverview(stdout);
    return 0;
  }
  for (const Command& c : kCommands) {
    // Two-word commands ("meta get") take two words.
    const char* blank = std::strchr(c.name, ' ');
    std::size_t taken = 1;
    if (blank) {
      if (words.size() < 2 || words[0] != std::string(c.name, blank) || words[1] != blank + 1)
        continue;
      taken = 2;
    } else if (words[0] != c.name) {
      continue;
    }
    const Words rest(words.begin() + static_cast<std::ptrdiff_t>(taken), words.end());
    for (const std::string& w : rest) {
      if (w == "--") break;
      if (w == "--help" || w == "-h") {
        PrintCommandHelp(c);
        return 0;
      }
    }
    return RunCommand(c, rest);
  }
  if (words[0] == "meta") {
    const bool help = words.size() >= 2 && (words[1] == "--help" || words[1] == "-h");
    std::FILE* out = help ? stdout : stderr;
    if (!help) std::fprintf(out, "tarnfile meta: expected get, set, junk or strip\n");
    for (const Command& c : kCommands)
      if (std::strncmp(c.name, "meta ", 5) == 0) std::fprintf(out, "usage: tarnfile %s\n", c.usage);
    return help ? 0 : 2;
  }
  std::fprintf(stderr, "tarnfile: unknown command '%s'\n\n", words[0].c_str());
  PrintOverview(stderr);
  return 2;
}
