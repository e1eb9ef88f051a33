#include "Commands.h"
#include "ToolSupport.h"

namespace tarnfile {

int RunDemo(const Words& words) {
  const CommandLine cl(words, {}, {}, 0, 1);
  throw UsageError("demo is not available yet");
}

}  // namespace tarnfile
