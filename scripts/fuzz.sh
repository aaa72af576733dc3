#!/usr/bin/env bash
# Builds the libFuzzer targets of fuzz/ (preset fuzz: clang with ASan and
# UBSan) and runs each for SECONDS (default 5) from its seed corpus in
# fuzz/corpus/NAME. Inputs that reach new code are kept in
# build/fuzz/corpus/NAME for later runs; a failing input is saved as
# build/fuzz/crashes/NAME-*, and the run's log as build/fuzz/NAME.log.
#   scripts/fuzz.sh [SECONDS]
set -euo pipefail
cd "$(dirname "$0")/.."
seconds=${1:-5}
scripts/deps.sh

cmake --preset fuzz >/dev/null
cmake --build --preset fuzz 2>&1 | scripts/progress.sh build/fuzz.build.log ||
    { tail -40 build/fuzz.build.log; exit 1; }
mkdir -p build/fuzz/crashes
failed=()
for source in fuzz/*.cpp; do
    name=$(basename "$source" .cpp)
    mkdir -p "build/fuzz/corpus/$name"
    # The targets fail calls on purpose: -close_fd_mask=2 drops their log lines
    # (libFuzzer and the sanitizers keep their own output).
    if build/fuzz/fuzz/"fuzz_$name" -max_total_time="$seconds" -timeout=10 -close_fd_mask=2 \
        -print_final_stats=1 -artifact_prefix="build/fuzz/crashes/$name-" \
        "build/fuzz/corpus/$name" "fuzz/corpus/$name" >"build/fuzz/$name.log" 2>&1; then
        runs=$(sed -n 's/^stat::number_of_executed_units: *//p' "build/fuzz/$name.log")
        echo "fuzz_$name: $runs inputs in ${seconds}s, nothing found"
    else
        echo "fuzz_$name FAILED:"
        grep -v '^#' "build/fuzz/$name.log" | tail -30
        failed+=("$name")
    fi
done

# The targets reach each vector path only where the processor has it.
for flag in sse2 ssse3 avx2 avx512vbmi; do
    grep -q -w -m1 "$flag" /proc/cpuinfo || echo "not fuzzed: the $flag paths (the processor lacks it)"
done

if [ ${#failed[@]} -gt 0 ]; then
    echo "fuzz targets that failed: ${failed[*]}"
    exit 1
fi
