#include <cstdio>

#include "tarn/TarnCore.h"

int main() {
  std::printf("TarnCore %s\n", tarn::GetTarnCoreVersion());
  return 0;
}
