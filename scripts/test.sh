#!/usr/bin/env bash
# Runs every test: the i386 and x86_64 presets and the sanitizer preset, each
# including the checks of the shared object (exports, NEEDED entries) and the
# C99 compile of the public headers; the same tests built with clang for both
# targets; the threaded tests under ThreadSanitizer; and each fuzz target for
# ZV_FUZZ_SECONDS (default 10) seconds.
set -uo pipefail
cd "$(dirname "$0")/.."
scripts/deps.sh || exit 1

failed=()
for preset in i386 x86_64 asan clang clang-i386 tsan; do
    echo "=== $preset"
    if cmake --preset "$preset" >/dev/null && cmake --build --preset "$preset" -- -k 0 >/dev/null; then
        ctest --preset "$preset" || failed+=("$preset")
    else
        echo "build of $preset failed"
        cmake --build --preset "$preset" 2>&1 | grep -E -B2 -A6 'error|FAILED' | head -60
        failed+=("$preset")
    fi
done

echo "=== fuzz"
scripts/fuzz.sh "${ZV_FUZZ_SECONDS:-10}" || failed+=(fuzz)

if [ ${#failed[@]} -gt 0 ]; then
    echo "presets that failed: ${failed[*]}"
    exit 1
fi
