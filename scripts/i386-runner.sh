#!/usr/bin/env bash
# Prints the launcher for i386 programs: nothing where the kernel runs them
# itself, else the path of qemu-i386. Fails when neither works.
#   scripts/i386-runner.sh [PROGRAM [ARG...]]
# PROGRAM is an i386 program that exits 0 when run with ARGs; without one, a
# probe is built with ${CC:-gcc} -m32.
set -euo pipefail
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
if [ $# -eq 0 ]; then
    echo 'int main(void) { return 0; }' | "${CC:-gcc}" -m32 -x c - -o "$work/probe"
    set -- "$work/probe"
fi
"$@" >/dev/null 2>&1 && exit 0
command -v qemu-i386 && exit 0
echo "this kernel runs no i386 programs and qemu-i386 is not installed" >&2
exit 1
