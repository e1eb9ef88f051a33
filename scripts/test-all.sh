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
if [ ${#presets[@]} -eq 0 ]; then
  presets=(default clang asan tsan mingw)
  # The fuzz step (scripts/run-fuzz.sh) needs clang's libFuzzer runtime.
  if echo 'extern "C" int LLVMFuzzerTestOneInput(const char*, unsigned long) { return 0; }' |
    clang++ -x c++ -fsanitize=fuzzer -o /dev/null - 2>/dev/null; then
    presets+=(fuzz)
  else
    echo "fuzz: skipped, clang's libFuzzer runtime is missing (Debian: libclang-rt-14-dev)"
  fi
fi

failed=()
run_preset() {
  local p=$1
  echo "=== preset $p"
  if [ "$p" = fuzz ]; then
    scripts/run-fuzz.sh || return 1
    return 0
  fi
  # Each step is checked by hand: run_preset is called inside `if`, where
  # errexit does not apply.
  cmake --preset "$p" >/dev/null || return 1
  cmake --build --preset "$p" -j "$jobs" || return 1
  if [ "$p" = mingw ]; then
    . scripts/wine-env.sh
    tarn_wine_start || return 1
    trap tarn_wine_stop EXIT
  fi
  ctest --preset "$p" -j "$jobs" || return 1
  if [ "$p" = default ]; then
    scripts/check-umbrella.sh || return 1
    scripts/check-install.sh build/default || return 1
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
