#!/usr/bin/env bash
# Builds the library and the tarnfile tool (default preset), installs them,
# builds the example programs against the installed package and runs them,
# then runs the tool's demo in a fresh temporary folder.
set -euo pipefail
cd "$(dirname "$0")/.."
export CCACHE_BASEDIR="$PWD"
cmake --preset default >/dev/null
cmake --build --preset default -j "$(nproc)" --target TarnCore tarnfile
rm -rf build/default/install build/default/example-cmake
cmake --install build/default --prefix build/default/install >/dev/null
cmake -S examples -B build/default/example-cmake -G Ninja -DCMAKE_PREFIX_PATH="$PWD/build/default/install" >/dev/null
cmake --build build/default/example-cmake >/dev/null
build/default/example-cmake/tarn_example

# The sound-file examples on a file of their own.
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT
build/default/example-cmake/tarn_write_tone "$scratch/tone.wav"
build/default/example-cmake/tarn_edit_bext "$scratch/tone.wav" "Example tone"
build/default/example-cmake/tarn_sound_file_info "$scratch/tone.wav"
build/default/example-cmake/tarn_convert_copy "$scratch/tone.wav" "$scratch/tone.aif"
build/default/example-cmake/tarn_sound_file_info "$scratch/tone.aif"

build/default/tools/tarnfile/tarnfile demo
