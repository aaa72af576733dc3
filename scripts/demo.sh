#!/usr/bin/env bash
# The main job: builds the library for i386, installs it into build/prefix,
# builds examples/demo.c against the installed tree through pkg-config (and
# again through CMake's find_package), and runs it.
set -euo pipefail
cd "$(dirname "$0")/.."
scripts/deps.sh

prefix=$PWD/build/prefix
echo "== building libzvutil (i386)"
cmake --preset i386 >/dev/null
cmake --build --preset i386 --target zvutil zverrortrace zvlog 2>&1 |
    scripts/progress.sh build/demo.build.log || { tail -40 build/demo.build.log; exit 1; }
echo "== installing into $prefix"
rm -rf "$prefix"
cmake --install build/i386 --prefix "$prefix" >/dev/null
find "$prefix" \( -type f -o -type l \) -not -path '*/share/man/*' | sed "s|$prefix/|   |" | sort
echo "   share/man/: $(find "$prefix/share/man" -name '*.[37]' | wc -l) manual pages and links"

libdir=$(cd "$(dirname "$(find "$prefix" -name zvutil.pc)")/.." && pwd)
export PKG_CONFIG_PATH=$libdir/pkgconfig
echo "== pkg-config --cflags --libs zvutil: $(pkg-config --cflags --libs zvutil)"
mkdir -p build/demo
gcc -m32 -std=c99 -Wall -Wextra -pedantic -Werror examples/demo.c -o build/demo/demo \
    $(pkg-config --cflags --libs zvutil) -Wl,-rpath,"$libdir"

echo "== find_package(zvutil)"
cmake -S examples -B build/demo/cmake -G Ninja --toolchain "$PWD/cmake/i386-linux-gnu.cmake" \
    -DCMAKE_PREFIX_PATH="$prefix" >/dev/null
cmake --build build/demo/cmake 2>&1 | scripts/progress.sh build/demo/cmake.log ||
    { cat build/demo/cmake.log; exit 1; }
echo "   built build/demo/cmake/demo"

runner=$(scripts/i386-runner.sh)
run=(${runner:+"$runner"})
echo "== running the demo (${run[*]:-natively})"
"${run[@]}" build/demo/demo
echo "== the demo ran (its last call fails on purpose, on a file that does not exist)"
