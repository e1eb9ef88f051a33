#include <unistd.h>

#include "ToolSupport.h"

namespace tarnfile {

bool StandardErrorIsTerminal() noexcept { return isatty(STDERR_FILENO) == 1; }

void SetStandardOutputBinary() noexcept {}  // bytes pass unchanged here

}  // namespace tarnfile
