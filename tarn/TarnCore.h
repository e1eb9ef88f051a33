// Umbrella header: includes every public header of the library.
#pragma once

#include "tarn/Basics/TarnCoreVersion.h"
