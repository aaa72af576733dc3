#!/usr/bin/env bash
# scripts/check-packages.sh [DIR]
# Installs the i386 packages from DIR (default build/packages; built there by
# scripts/package.sh i386 when missing) into the running Debian 12 system with
# apt-get, builds a C program with gcc -m32 and the i386 pkg-config files and
# the example CMake project with find_package(zvutil), runs both, looks up a
# manual page, and purges the packages again, also when a step fails.
# Needs root, and refuses to run if any of the packages is already installed.
set -euo pipefail
cd "$(dirname "$0")/.."
root=$PWD
dir=$(realpath "${1:-build/packages}")
arch=i386 triplet=i386-linux-gnu
packages=(libzvutil-dev libzvutil1 libzverrortrace1 libzvlog1)
[ "$(id -u)" -eq 0 ] || { echo "run as root: the packages go into /usr" >&2; exit 2; }

scripts/deps.sh dpkg-dev man-db
version=$(dpkg-parsechangelog -l packaging/deb/changelog -SVersion)
debs=()
for package in "${packages[@]}"; do debs+=("$dir/${package}_${version}_$arch.deb"); done
for deb in "${debs[@]}"; do
    [ -f "$deb" ] || { scripts/package.sh "$arch"; break; }
done
for package in "${packages[@]}"; do
    if dpkg-query -W -f='${Status}' "$package:$arch" 2>/dev/null | grep -q installed; then
        echo "$package:$arch is installed already; remove it first" >&2
        exit 2
    fi
done

work=$(mktemp -d)
apt=(env DEBIAN_FRONTEND=noninteractive apt-get -y -q -o DPkg::Lock::Timeout=600)
installed=no
cleanup() {
    if [ $installed = yes ]; then
        echo "== removing the packages"
        "${apt[@]}" purge "${packages[@]/%/:$arch}" >/dev/null
    fi
    rm -rf "$work"
}
trap cleanup EXIT

step() { echo "== $*"; }

step "apt-get install ${debs[*]##*/}"
installed=yes
"${apt[@]}" install "${debs[@]}" > "$work/apt.log" 2>&1 || { cat "$work/apt.log"; exit 1; }
grep -E '^Setting up' "$work/apt.log"
dpkg -L libzvutil-dev:$arch | grep -E "/usr/lib/$triplet/(libzvutil\.so$|pkgconfig|cmake/zvutil/zvutilConfig)"
ls /usr/lib/$triplet/libzvutil.so.1 /usr/lib/$triplet/libzverrortrace.so.1 /usr/lib/$triplet/libzvlog.so.1

runner=$(scripts/i386-runner.sh)
run=(${runner:+"$runner"})

step "gcc -m32 \$(pkg-config --cflags --libs zvutil) with the $arch pkg-config files"
if command -v i686-linux-gnu-pkg-config >/dev/null; then
    pkgconfig=(i686-linux-gnu-pkg-config)
else
    pkgconfig=(env PKG_CONFIG_LIBDIR=/usr/lib/$triplet/pkgconfig:/usr/share/pkgconfig pkg-config)
fi
flags=$("${pkgconfig[@]}" --cflags --libs zvutil)
echo "   pkg-config: $flags"
cat > "$work/program.c" <<'EOF'
#include <zvutil/zvutil.h>

#include <stdio.h>
#include <stdlib.h>
#include <string.h>

int main(void)
{
    char *text = NULL;
    char *encoded = NULL;
    uint32_t length = 0;
    if (zv_util_asprintf(&text, NULL, "%s-%d", "zvutil", 32) != ZV_OK ||
        zv_util_base64_encode(text, (uint32_t)strlen(text), &encoded, &length) != ZV_OK)
        return 1;
    printf("%s %.*s %u %u-bit\n", text, (int)length, encoded, (unsigned)zv_util_mkdir(NULL),
           (unsigned)(8 * sizeof(void *)));
    free(encoded);
    zv_util_free(&text);
    return 0;
}
EOF
# shellcheck disable=SC2086  # the flags are words
gcc -m32 -std=c99 -Wall -Wextra -pedantic -Werror "$work/program.c" -o "$work/program" $flags
output=$("${run[@]}" "$work/program")
expected="zvutil-32 $(printf zvutil-32 | base64) 3 32-bit"
echo "   ran${run[*]:+ under ${run[*]}}: $output"
[ "$output" = "$expected" ] || { echo "expected: $expected"; exit 1; }

step "find_package(zvutil) for $arch: examples/"
cmake -S examples -B "$work/cmake" -G Ninja --toolchain "$root/cmake/i386-linux-gnu.cmake" \
    > "$work/cmake.log" || { cat "$work/cmake.log"; exit 1; }
grep -q "/usr/lib/$triplet/cmake/zvutil" "$work/cmake/CMakeCache.txt"
cmake --build "$work/cmake" >/dev/null
mkdir -p "$work/run/build/demo"
(cd "$work/run" && "${run[@]}" "$work/cmake/demo") > "$work/demo.out"
grep -q 'zv_util_read_named_file -> 0: .* identical' "$work/demo.out" || { cat "$work/demo.out"; exit 1; }
echo "   zvutil_DIR=$(sed -n 's/^zvutil_DIR:PATH=//p' "$work/cmake/CMakeCache.txt"); the demo ran"

step "manual pages"
for link in $(dpkg -L libzvutil-dev:$arch | grep '^/usr/share/man/.*\.gz$'); do
    [ -e "$link" ] || { echo "dangling $link"; exit 1; }
done
page=$(man -w zv_util_join)
echo "   man -w zv_util_join: $page"
man -P cat zv_util_join 2>/dev/null | grep -q 'zv_util_join' || { echo "zv_util_join does not render"; exit 1; }

cleanup
installed=no
for package in "${packages[@]}"; do
    ! dpkg-query -W -f='${Status}' "$package:$arch" 2>/dev/null | grep -q installed ||
        { echo "$package:$arch is still installed"; exit 1; }
done
[ ! -e /usr/lib/$triplet/libzvutil.so.1 ] && [ ! -e /usr/include/zvutil ] ||
    { echo "files are left behind"; exit 1; }
echo "== the packages install, build, run and purge cleanly"
