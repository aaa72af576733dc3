#!/usr/bin/env bash
# check_pkgconfig.sh SOURCE_DIR
#   The .pc files find their prefix from where they lie, and name an absolute
#   libdir as it stands, with the include directory still under the prefix.
set -euo pipefail
src=$1 work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
pc_head() {   # NAME CMAKE_ARGS...: the first three lines of zvutil.pc on one line
    cmake -G Ninja -S "$src" -B "$work/$1" -DZV_BUILD_TESTS=OFF \
        -DCMAKE_INSTALL_PREFIX=/usr/local "${@:2}" >/dev/null
    head -3 "$work/$1/zvutil.pc" | tr '\n' ' '
}
expect() {
    [ "$1" = "$2" ] && return
    printf 'got:      %s\nexpected: %s\n' "$1" "$2"
    exit 1
}
# shellcheck disable=SC2016  # the .pc variables stay unexpanded
expect "$(pc_head relative)" 'prefix=${pcfiledir}/../../ libdir=${prefix}/lib includedir=${prefix}/include '
# shellcheck disable=SC2016
expect "$(pc_head absolute -DCMAKE_INSTALL_LIBDIR=/opt/zv/lib)" \
    'prefix=/usr/local libdir=/opt/zv/lib includedir=${prefix}/include '
