#!/usr/bin/env bash
# Installs a build into a scratch prefix and builds the example against it
# twice: through find_package(TarnCore CONFIG) and through pkg-config.
set -euo pipefail
build=${1:-build/default}
prefix="$PWD/$build/install"
rm -rf "$prefix" "$build/example-cmake"
cmake --install "$build" --prefix "$prefix" >/dev/null
cmake -S examples -B "$build/example-cmake" -G Ninja -DCMAKE_PREFIX_PATH="$prefix" >/dev/null
cmake --build "$build/example-cmake" >/dev/null
"$build/example-cmake/tarn_example" >/dev/null
PKG_CONFIG_PATH="$prefix/lib/pkgconfig" \
  c++ examples/example.cpp -o "$build/example-pkgconfig" \
  $(PKG_CONFIG_PATH="$prefix/lib/pkgconfig" pkg-config --cflags --libs tarncore)
"$build/example-pkgconfig" >/dev/null
echo "install check: find_package and pkg-config builds of the example run"
