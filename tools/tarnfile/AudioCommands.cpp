// convert and tone: audio through the reader/writer chain.
#include "Commands.h"
#include "ToolSupport.h"

namespace tarnfile {

int RunConvert(const Words& words) {
  const CommandLine cl(words, {"unbuffered"}, {"type", "format", "dither"}, 2, 2);
  throw UsageError("convert is not available yet");
}

int RunTone(const Words& words) {
  const CommandLine cl(
      words, {}, {"type", "format", "rate", "channels", "seconds", "shape", "freq", "amplitude"}, 1,
      1);
  throw UsageError("tone is not available yet");
}

}  // namespace tarnfile
