#!/usr/bin/env bash
# scripts/check-packages.sh [ARCH...]
# Installs the packages that scripts/package.sh builds in build/deb/ARCH
# (default amd64 and i386, side by side; built first when missing), -dbgsym
# included, into the running Debian 12 system with apt-get. For each ARCH it
# builds a C program with that architecture's pkg-config files (only
# "pkg-config --libs zvutil": it reads the failure trace too) and the
# examples/ project with find_package(zvutil), and runs both (i386 under
# qemu-i386 where the kernel cannot run it); then it renders a manual page
# through a link and purges the packages, also when a step fails, and fails
# if any of their files is left. Needs root; refuses to run if one of the
# packages is installed already.
set -euo pipefail
cd "$(dirname "$0")/.."
root=$PWD
archs=("$@")
[ ${#archs[@]} -gt 0 ] || archs=(amd64 i386)
names=(libzvutil-dev libzvutil1 libzverrortrace1 libzvlog1)
[ "$(id -u)" -eq 0 ] || { echo "run as root: the packages go into /usr" >&2; exit 2; }

scripts/deps.sh --only dpkg-dev man-db pkg-config cmake ninja-build gcc g++-multilib
version=$(dpkg-parsechangelog -SVersion)
debs=() packages=()
for arch in "${archs[@]}"; do
    for name in "${names[@]}" libzvutil1-dbgsym libzverrortrace1-dbgsym libzvlog1-dbgsym; do
        deb=$root/build/deb/$arch/${name}_${version}_$arch.deb
        [ -f "$deb" ] || scripts/package.sh "$arch"
        debs+=("$deb") packages+=("$name:$arch")
    done
done
for package in "${packages[@]}"; do
    status=$(dpkg-query -W -f='${Status}' "$package" 2>/dev/null || true)
    [ "$status" != "install ok installed" ] || { echo "$package is installed already; remove it first" >&2; exit 2; }
done

work=$(mktemp -d)
apt=(env DEBIAN_FRONTEND=noninteractive apt-get -y -o DPkg::Lock::Timeout=600)
installed=no
purge() {
    "${apt[@]}" purge "${packages[@]}" >"$work/purge.log" 2>&1 || { cat "$work/purge.log"; return 1; }
    echo "== apt-get purge: ${#packages[@]} packages removed"
}
cleanup() {
    [ $installed = no ] || purge || true
    rm -rf "$work"
}
trap cleanup EXIT

installed=yes
"${apt[@]}" install "${debs[@]}" >"$work/apt.log" 2>&1 || { cat "$work/apt.log"; exit 1; }
echo "== apt-get install: $(grep -c '^Setting up lib' "$work/apt.log" || true) packages set up (${archs[*]})"

cat >"$work/program.c" <<'EOF'
#include <zvutil/zvutil.h>
#include <zverrortrace.h>

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
    zv_trace_clear();
    zv_status status = zv_util_mkdir(NULL);
    printf("%s %.*s %u %u %u-bit\n", text, (int)length, encoded, (unsigned)status,
           (unsigned)zv_trace_count(), (unsigned)(8 * sizeof(void *)));
    free(encoded);
    zv_util_free(&text);
    return 0;
}
EOF
for arch in "${archs[@]}"; do
    triplet=$(dpkg-architecture -a"$arch" -qDEB_HOST_MULTIARCH 2>/dev/null)
    cc=(gcc) toolchain=() run=() bits=64
    if [ "$arch" = i386 ]; then
        cc=(gcc -m32) toolchain=(--toolchain "$root/cmake/i386-linux-gnu.cmake") bits=32
        runner=$(scripts/i386-runner.sh)
        run=(${runner:+"$runner"})
    fi
    flags=$(PKG_CONFIG_LIBDIR=/usr/lib/$triplet/pkgconfig:/usr/share/pkgconfig pkg-config --cflags --libs zvutil)
    echo "== $arch: ${cc[*]} program.c \$(pkg-config --cflags --libs zvutil) = $flags"
    # shellcheck disable=SC2086  # the flags are words
    "${cc[@]}" -std=c99 -Wall -Wextra -pedantic -Werror "$work/program.c" -o "$work/program-$arch" $flags
    output=$("${run[@]}" "$work/program-$arch")
    expected="zvutil-32 $(printf zvutil-32 | base64) 3 1 $bits-bit"
    echo "   ran${run[*]:+ under ${run[*]}}: $output"
    [ "$output" = "$expected" ] || { echo "expected: $expected"; exit 1; }

    echo "== $arch: find_package(zvutil) for examples/"
    cmake -S examples -B "$work/cmake-$arch" -G Ninja "${toolchain[@]}" >"$work/cmake.log" 2>&1 &&
        cmake --build "$work/cmake-$arch" >>"$work/cmake.log" 2>&1 || { cat "$work/cmake.log"; exit 1; }
    dir=$(sed -n 's/^zvutil_DIR:PATH=//p' "$work/cmake-$arch/CMakeCache.txt")
    [ "$dir" = "/usr/lib/$triplet/cmake/zvutil" ] || { echo "zvutil_DIR is $dir"; exit 1; }
    mkdir -p "$work/run-$arch/build/demo"
    (cd "$work/run-$arch" && "${run[@]}" "$work/cmake-$arch/demo") >"$work/demo.out"
    grep 'zv_util_read_named_file -> 0: .* identical' "$work/demo.out" >/dev/null ||
        { cat "$work/demo.out"; exit 1; }
    echo "   zvutil_DIR=$dir; the demo ran"
done

echo "== man zv_util_split"
man -P cat zv_util_split 2>/dev/null >"$work/page"
grep 'zv_util_split' "$work/page" >/dev/null || { echo "zv_util_split does not render"; exit 1; }
echo "   $(man -w zv_util_split): $(wc -l <"$work/page") lines"

purge
installed=no
left=$(dpkg-query -W -f='${Package}:${Architecture} ${Status}\n' "${packages[@]}" 2>/dev/null |
    grep -v 'not-installed$' || true)
[ -z "$left" ] || { echo "still known to dpkg:"; echo "$left"; exit 1; }
for path in /usr/include/zvutil /usr/include/zverrortrace.h /usr/share/man/man7/zvutil.7.gz \
    /usr/share/doc/libzvutil-dev /usr/lib/*-linux-gnu/libzvutil.so.1 /usr/lib/*-linux-gnu/cmake/zvutil; do
    [ ! -e "$path" ] || { echo "left behind: $path"; exit 1; }
done
echo "== the packages install, build, run and purge cleanly"
