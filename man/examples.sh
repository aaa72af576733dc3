#!/usr/bin/env bash
# Builds and runs the C code in the EXAMPLES section of every manual page.
# Usage: examples.sh PAGE_DIR BUILD_DIR "CC [FLAGS]" [RUNNER]
# The libraries of BUILD_DIR are installed into a scratch prefix, and each
# example is linked with the link line its page documents: the page's
# "pkg-config --cflags --libs ..." line, or else zvutil(7)'s
# "pkg-config --cflags --libs zvutil". A literal block with a main() is built
# as it stands; any other block holding C statements is a fragment: its
# leading "static" definitions (up to a line "}") go before main(argc, argv),
# the rest a block in its body (which may declare argv anew). Each program runs in a directory of its own
# (under RUNNER, for i386 where the kernel cannot run it) and must exit 0.
set -euo pipefail
pages=$1 build=$2 cc=$3 runner=${4:-}
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

cmake --install "$build" --prefix "$work/prefix" >/dev/null
pcdir=$(dirname "$(find "$work/prefix" -name zvutil.pc)")
libdir=$(dirname "$pcdir")
export PKG_CONFIG_LIBDIR=$pcdir PKG_CONFIG_PATH=

# Writes each literal block of the EXAMPLES section of page $1 as text to
# $2-1.c.txt, $2-2.c.txt, ...
blocks() {
    sed -e 's/\\e/\\/g' -e 's/\\-/-/g' -e 's/\\&//g' "$1" |
        awk -v out="$2" '/^\.Sh / { on = ($2 == "EXAMPLES") }
             on && /^\.Bd -literal/ { inside = 1; n++; next }
             inside && /^\.Ed/ { inside = 0; next }
             inside { print > (out "-" n ".c.txt") }'
}

# Writes the program for one block (on standard input) to standard output.
program() {
    local block
    block=$(cat)
    if grep -E '(^|[^a-z_])main\(' <<<"$block" >/dev/null; then
        printf '%s\n' "$block"
        return
    fi
    cat <<'EOF'
#include <zvutil/zvutil.h>
#include <zverrortrace.h>
#include <zvlog.h>
#include <stdint.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <syslog.h>
#include <time.h>
#include <unistd.h>
EOF
    awk 'top == 0 && /^(static |#)/ { top = /^static / ? 2 : 1 }
         top { print; if (top == 1 || $0 == "}") top = 0; next }
         { body = body $0 "\n" }
         END { printf "int main(int argc, char **argv)\n{\n(void)argc; (void)argv;\n{\n%s}\nreturn 0;\n}\n", body }' \
        <<<"$block"
}

built=0 failed=0
for page in "$pages"/*.[1-9]; do
    name=${page##*/}
    libs=$(grep -o -m 1 'pkg-config --cflags --libs [a-z ]*[a-z]' "$page" |
        sed 's/.*--libs //') || true
    # shellcheck disable=SC2086  # a list of packages
    flags=$(pkg-config --cflags --libs ${libs:-zvutil})
    blocks "$page" "$work/$name"
    for block in "$work/$name"-*.c.txt; do
        [ -e "$block" ] || continue
        # Shell and CMake lines hold no C statement.
        grep ';' "$block" >/dev/null || continue
        index=${block%.c.txt} index=${index##*-}
        dir=$work/$name-$index
        mkdir -p "$dir"
        program <"$block" >"$dir/example.c"
        # shellcheck disable=SC2086  # CC and the flags are words
        if ! $cc -std=gnu11 -Wall -Wno-unused -Werror=implicit-function-declaration \
            "$dir/example.c" -o "$dir/example" $flags -Wl,-rpath,"$libdir" >"$dir/log" 2>&1; then
            echo "FAIL $name example $index does not build with: ${libs:-zvutil}"
            cat -n "$dir/example.c" "$dir/log"
            failed=$((failed + 1))
            continue
        fi
        built=$((built + 1))
        # shellcheck disable=SC2086  # the runner may be empty
        if ! (cd "$dir" && $runner ./example </dev/null >"$dir/out" 2>&1); then
            echo "FAIL $name example $index exits non-zero:"
            cat "$dir/out"
            failed=$((failed + 1))
            continue
        fi
        echo "ok   $name example $index (pkg-config ${libs:-zvutil}): $(head -n 1 "$dir/out" | cut -c1-60)"
    done
done
echo "$built examples built and run, $failed failed"
[ "$failed" -eq 0 ] && [ "$built" -gt 0 ]
