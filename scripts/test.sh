#!/usr/bin/env bash
# Runs every test: the i386 and x86_64 presets and the sanitizer preset, each
# including the checks of the shared object (exports, NEEDED entries) and the
# C99 compile of the public headers; the same tests built with clang for both
# targets; the threaded tests under ThreadSanitizer; and each fuzz target for
# ZV_FUZZ_SECONDS (default 10) seconds. Builds show ninja's progress (the whole
# output is in build/<preset>.log); the run ends with a table of the stages.
# A skipped or unrun ABI or manual-page test fails its stage: this command
# installs their tools.
set -uo pipefail
cd "$(dirname "$0")/.."
scripts/deps.sh || exit 1

stages=() results=() seconds=()
record() {   # STAGE RESULT START
    stages+=("$1") results+=("$2") seconds+=($((SECONDS - $3)))
}

for preset in i386 x86_64 asan clang clang-i386 tsan; do
    echo "=== $preset"
    start=$SECONDS log=build/$preset.log
    mkdir -p build
    if ! cmake --preset "$preset" >"$log" 2>&1; then
        cat "$log"
        record "$preset" "configure failed" "$start"
        continue
    fi
    cmake --build --preset "$preset" -- -k 0 2>&1 | scripts/progress.sh "$log.build"
    if [ "${PIPESTATUS[0]}" -ne 0 ]; then
        echo "build of $preset failed:"
        grep -E -B2 -A6 'error|FAILED' "$log.build" | head -60
        record "$preset" "build failed" "$start"
        continue
    fi
    ctest --preset "$preset" 2>&1 | tee "$log.test"
    status=${PIPESTATUS[0]}
    skipped=$(grep -E '[0-9]+ - (abi|man)_[a-z_]+ \((Skipped|Not Run|Disabled)\)' "$log.test" || true)
    if [ -n "$skipped" ]; then
        echo "these checks must run here (scripts/deps.sh installs their tools):"
        echo "$skipped"
        status=1
    fi
    if [ "$status" -eq 0 ]; then record "$preset" passed "$start"; else record "$preset" FAILED "$start"; fi
done

echo "=== fuzz"
start=$SECONDS
if scripts/fuzz.sh "${ZV_FUZZ_SECONDS:-10}"; then record fuzz passed "$start"; else record fuzz FAILED "$start"; fi

echo
printf '%-12s %-18s %s\n' stage result time
failed=0
for i in "${!stages[@]}"; do
    printf '%-12s %-18s %4d s\n' "${stages[$i]}" "${results[$i]}" "${seconds[$i]}"
    [ "${results[$i]}" = passed ] || failed=1
done
printf '%-12s %-18s %4d s\n' total "$([ $failed -eq 0 ] && echo passed || echo FAILED)" "$SECONDS"
exit $failed
