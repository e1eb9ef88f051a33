#!/usr/bin/env bash
# Builds the fuzz preset and runs every libFuzzer target (build/fuzz/fuzz/
# fuzz_<Name>) for the given seconds each, one after the other, starting
# from a scratch copy of its seed corpus fuzz/corpus/<Name>/ (new inputs
# never go into the committed folder). Fails on the first crash, leak,
# timeout or out-of-memory; the input that caused it is kept in
# build/fuzz/fuzz-runs/<Name>/.
# Usage: scripts/run-fuzz.sh [seconds-per-target]   (default 60)
set -euo pipefail
cd "$(dirname "$0")/.."
export CCACHE_BASEDIR="$PWD"
seconds=${1:-60}

cmake --preset fuzz >/dev/null
cmake --build --preset fuzz -j "$(nproc)"

# A small quarantine keeps each run's memory fresh in cache: the default
# 256 MB costs more than half of the executions.
export ASAN_OPTIONS=${ASAN_OPTIONS:-quarantine_size_mb=16:detect_leaks=1}
export UBSAN_OPTIONS=${UBSAN_OPTIONS:-print_stacktrace=1:halt_on_error=1}

runs=build/fuzz/fuzz-runs
status=0
found=0
for src in fuzz/*.cpp; do
  name=$(basename "$src" .cpp)
  exe=build/fuzz/fuzz/fuzz_$name
  found=$((found + 1))
  work=$runs/$name
  rm -rf "$work"
  mkdir -p "$work/corpus" "$work/artifacts"
  if [ -d "fuzz/corpus/$name" ]; then cp -R "fuzz/corpus/$name/." "$work/corpus/"; fi
  echo "=== fuzz_$name for ${seconds}s"
  # One process, one job: CI machines have two cores.
  if "$exe" -max_total_time="$seconds" -max_len=4096 -timeout=10 -rss_limit_mb=2048 \
      -malloc_limit_mb=512 -print_final_stats=1 -artifact_prefix="$work/artifacts/" \
      "$work/corpus" >"$work/log.txt" 2>&1; then
    grep -E '^#[0-9]+[[:space:]]+DONE|stat::number_of_executed_units|stat::average_exec_per_sec' \
      "$work/log.txt" || true
    echo "fuzz_$name: no crash ($(find "$work/corpus" -type f | wc -l) inputs in corpus)"
  else
    status=1
    tail -n 60 "$work/log.txt"
    echo "fuzz_$name: FAILED; input kept in $work/artifacts/:"
    ls -l "$work/artifacts/"
  fi
done
[ "$found" -gt 0 ] || { echo "no fuzz targets in fuzz/"; exit 1; }
exit $status
