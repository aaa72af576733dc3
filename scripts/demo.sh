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
cmake --build --preset i386 --target zvutil zverrortrace zvlog >/dev/null
echo "== installing into $prefix"
rm -rf "$prefix"
cmake --install build/i386 --prefix "$prefix" >/dev/null
find "$prefix" -type f -o -type l | sed "s|$prefix/|   |" | sort

libdir=$(cd "$(dirname "$(find "$prefix" -name zvutil.pc)")/.." && pwd)
export PKG_CONFIG_PATH=$libdir/pkgconfig
echo "== pkg-config zvutil zverrortrace: $(pkg-config --cflags --libs zvutil zverrortrace)"
mkdir -p build/demo
gcc -m32 -std=c99 -Wall -Wextra -pedantic -Werror examples/demo.c -o build/demo/demo \
    $(pkg-config --cflags --libs zvutil zverrortrace) -Wl,-rpath,"$libdir"

echo "== find_package(zvutil)"
cmake -S examples -B build/demo/cmake -G Ninja --toolchain "$PWD/cmake/i386-linux-gnu.cmake" \
    -DCMAKE_PREFIX_PATH="$prefix" >/dev/null
cmake --build build/demo/cmake >/dev/null
echo "   built build/demo/cmake/demo"

runner=$(scripts/i386-runner.sh build/demo/demo --probe)
run=(${runner:+"$runner"})
echo "== running the demo (${run[*]:-natively})"
"${run[@]}" build/demo/demo
