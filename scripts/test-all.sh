#!/usr/bin/env bash
# Builds and runs every test suite in every preset: default (g++), clang,
# asan, tsan (threaded suites) and mingw (under Wine); then proves the
# installed package by building the example against it.
# Usage: scripts/test-all.sh [preset ...]
set -euo pipefail
cd "$(dirname "$0")/.."
export CCACHE_BASEDIR="$PWD"
jobs=$(nproc)

presets=("$@")
[ ${#presets[@]} -gt 0 ] || presets=(default clang asan tsan mingw)

failed=()
run_preset() {
  local p=$1
  echo "=== preset $p"
  cmake --preset "$p" >/dev/null
  cmake --build --preset "$p" -j "$jobs"
  if [ "$p" = mingw ]; then
    . scripts/wine-env.sh
    tarn_wine_start
    trap tarn_wine_stop EXIT
  fi
  ctest --preset "$p" -j "$jobs"
  if [ "$p" = default ]; then
    scripts/check-umbrella.sh
    scripts/check-install.sh build/default
  fi
}

total=0
for p in "${presets[@]}"; do
  total=$((total + 1))
  if ! run_preset "$p"; then failed+=("$p"); fi
done

passed=$((total - ${#failed[@]}))
echo
echo "presets: $passed passed, ${#failed[@]} failed${failed:+ (${failed[*]})}"
[ ${#failed[@]} -eq 0 ]
