#!/usr/bin/env bash
# Records the binary interface of libzvutil as it is now built, for i386 and
# x86_64, in abi/zvutil-<target>.abi, after printing what changes against the
# stored one. Run it only for a deliberate change of the interface; commit the
# .abi files with the change that caused it.
set -euo pipefail
cd "$(dirname "$0")/.."
scripts/deps.sh

for preset in i386 x86_64; do
    echo "=== $preset"
    cmake --preset "$preset" >/dev/null
    cmake --build --preset "$preset" --target zvutil >/dev/null
    baseline=abi/zvutil-$preset.abi
    so=build/$preset/libzvutil.so.1
    if [ -f "$baseline" ]; then
        abi/abi.sh compare "$baseline" "$so" || true
    fi
    abi/abi.sh dump "$so" "$baseline"
    echo "wrote $baseline"
done
git status --short abi/
