#include "tarn/Basics/TarnCoreVersion.h"

namespace tarn {

const char* GetTarnCoreVersion() noexcept { return "0.1.0"; }

}  // namespace tarn
