#!/usr/bin/env bash
# Builds the library (default preset), installs it, builds the example
# program against the installed package and runs it.
set -euo pipefail
cd "$(dirname "$0")/.."
export CCACHE_BASEDIR="$PWD"
cmake --preset default >/dev/null
cmake --build --preset default -j "$(nproc)" --target TarnCore
rm -rf build/default/install build/default/example-cmake
cmake --install build/default --prefix build/default/install >/dev/null
cmake -S examples -B build/default/example-cmake -G Ninja -DCMAKE_PREFIX_PATH="$PWD/build/default/install" >/dev/null
cmake --build build/default/example-cmake >/dev/null
build/default/example-cmake/tarn_example
