#include <fcntl.h>
#include <io.h>
#include <stdio.h>

#include "ToolSupport.h"

namespace tarnfile {

bool StandardErrorIsTerminal() noexcept { return _isatty(_fileno(stderr)) != 0; }

void SetStandardOutputBinary() noexcept { _setmode(_fileno(stdout), _O_BINARY); }

}  // namespace tarnfile
