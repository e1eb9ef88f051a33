#pragma once
// The commands of tarnfile, one function per command, grouped by source
// file. Each takes the words after its name, returns the exit status (0)
// and throws UsageError or TarnError for the caller to report.

#include <string>
#include <vector>

namespace tarnfile {

using Words = std::vector<std::string>;

// One command: its name (one or two words), the usage line, one line of
// what it does, its options explained, and the function that runs it.
struct Command {
  const char* name;
  const char* usage;
  const char* summary;
  const char* details;
  int (*run)(const Words& words);
};

// InfoCommands.cpp
int RunInfo(const Words& words);
int RunChunks(const Words& words);

// MetaCommands.cpp
int RunMetaGet(const Words& words);
int RunMetaSet(const Words& words);
int RunMetaJunk(const Words& words);
int RunMetaStrip(const Words& words);
int RunBext(const Words& words);
int RunMD5(const Words& words);
int RunRecover(const Words& words);

// AudioCommands.cpp
int RunConvert(const Words& words);
int RunTone(const Words& words);

// DemoCommand.cpp
int RunDemo(const Words& words);

}  // namespace tarnfile
