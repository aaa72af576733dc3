#!/usr/bin/env bash
# abi.sh dump SO OUT
#   Writes the binary interface of SO (built with -g) to OUT as abidw XML.
# abi.sh compare BASELINE SO
#   Fails when SO breaks the interface recorded in BASELINE: a removed symbol,
#   a changed parameter or return type, a changed record that a signature
#   reaches. Added symbols are listed and allowed. Fails, saying why, when
#   abigail-tools are missing or SO carries no debug information.
# abi.sh policy "CC [FLAGS]" INCLUDE_DIR
#   Builds a stub library from INCLUDE_DIR's headers in pairs, the second of
#   each pair with one change, and checks that the comparison of compare
#   rejects every break and lets additions and rebuilds through.
set -euo pipefail
here=$(cd "$(dirname "$0")" && pwd)
dump_flags=(--no-corpus-path --no-comp-dir-path --short-locs --type-id-style hash
            --exported-interfaces-only)
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

dump() {
    abidw "${dump_flags[@]}" --out-file "$2" "$1"
}

# Status 0: compatible (additions printed), 1: a break (printed), 2: abidiff failed.
compare_dumps() {
    local old=$1 new=$2 status=0
    abidiff --suppressions "$here/zvutil.abignore" --no-added-syms "$old" "$new" \
        > "$work/breaks" 2>&1 || status=$?
    if [ "$status" -ne 0 ]; then
        cat "$work/breaks"
        [ $((status & 3)) -eq 0 ] && return 1 || return 2
    fi
    abidiff --suppressions "$here/zvutil.abignore" "$old" "$new" > "$work/all" 2>&1 || status=$?
    if [ "$status" -ne 0 ]; then
        echo "additions (allowed; scripts/abi-update.sh records them):"
        cat "$work/all"
        [ $((status & 3)) -eq 0 ] || return 2
    fi
    return 0
}

# The stub: one function per kind of public record, switched by macros.
write_stub() {
    cat > "$work/stub.c" <<'EOF'
#include <zvutil/directory.h>
#include <zvutil/getopt.h>
#include <zvutil/random.h>
#include <zvutil/sum.h>
#ifndef SEED_T
#define SEED_T uint64_t
#endif
#ifndef RESULT_T
#define RESULT_T zv_status
#endif
struct zv_util_dirscan_state {
    int32_t count;
#ifdef OPAQUE_GROWS
    int64_t more;
#endif
};
ZV_EXPORT RESULT_T stub_seed(zv_util_prng_state *state, SEED_T seed) { state->weyl = seed; return 0; }
#ifndef DROP
ZV_EXPORT zv_status stub_parse(const zv_util_option *table) { return (zv_status)table->takes_value; }
#endif
ZV_EXPORT double stub_total(const zv_util_sum *sum) { return sum->total; }
ZV_EXPORT int32_t stub_count(const zv_util_dirscan_state *scan) { return scan->count; }
#ifdef EXTRA
ZV_EXPORT zv_status stub_extra(void) { return 0; }
#endif
EOF
}

build_stub() {   # OUT INCLUDE_DIR FLAGS...
    local out=$1 include=$2
    shift 2
    $cc -g -O2 -shared -fPIC -I"$include" "$@" "$work/stub.c" -o "$out.so"
    dump "$out.so" "$out.abi"
}

policy() {
    cc=$1 include=$2
    write_stub
    build_stub "$work/base" "$include"
    local fail=0
    # case | expected | header:sed edit of a copy of the headers | flags |
    # a word the report must hold (none: the report must be empty)
    while IFS='|' read -r name expected edit flags word; do
        [ -n "$name" ] || continue
        rm -rf "$work/include" && cp -r "$include" "$work/include"
        if [ -n "$edit" ]; then
            local header=zvutil/${edit%%:*}
            sed -i "${edit#*:}" "$work/include/$header"
            if cmp -s "$include/$header" "$work/include/$header"; then
                echo "FAIL $name: the edit no longer applies to $header"
                fail=1
                continue
            fi
        fi
        # shellcheck disable=SC2086  # flags are words
        build_stub "$work/case" "$work/include" $flags
        local status=0
        compare_dumps "$work/base.abi" "$work/case.abi" > "$work/report" || status=$?
        local got=pass
        [ "$status" -eq 1 ] && got=break
        [ "$status" -eq 2 ] && got=error
        local named=yes
        if [ -n "$word" ]; then
            grep -q -- "$word" "$work/report" || named=no
        else
            [ ! -s "$work/report" ] || named=no
        fi
        if [ "$got" != "$expected" ] || [ $named = no ]; then
            echo "FAIL $name: expected $expected, ${word:+naming '$word', }got $got:"
            sed 's/^/    /' "$work/report"
            fail=1
        else
            echo "ok   $name: $got"
        fi
    done <<'EOF'
rebuilt at -O0|pass||-O0|
added function|pass||-DEXTRA|stub_extra
renamed field|pass|sum.h:s/double window_sum;/double window_total;/||
opaque record grows|pass||-DOPAQUE_GROWS|
removed function|break||-DDROP|stub_parse
parameter narrowed|break||-DSEED_T=uint32_t|parameter 2
return type changed|break||-DRESULT_T=int64_t|return type
field widened|break|random.h:s/uint32_t position;/uint64_t position;/||uint32_t position
field inserted|break|getopt.h:s/void \*destination;/int32_t flags; void *destination;/||zv_util_option
handler type changed|break|getopt.h:s/uint32_t \*consumed);/uint64_t *consumed);/||zv_util_option_handler
EOF
    return $fail
}

case ${1:-} in
dump)
    dump "$2" "$3"
    ;;
compare)
    baseline=$2 so=$3
    for tool in abidw abidiff; do
        command -v "$tool" >/dev/null ||
            { echo "$tool is not installed (scripts/deps.sh installs abigail-tools)"; exit 1; }
    done
    # grep reads the whole listing: with -q it could leave readelf to die of
    # SIGPIPE, which pipefail would report as a missing section.
    sections=$(readelf -S "$so") || exit 1
    if ! grep '\.debug_info' <<<"$sections" >/dev/null; then
        echo "$so has no debug information: the comparison needs a -g build"
        exit 1
    fi
    dump "$so" "$work/new.abi"
    status=0
    compare_dumps "$baseline" "$work/new.abi" || status=$?
    case $status in
    0) echo "compatible with $(basename "$baseline")" ;;
    1) echo "ABI break against $baseline (see README, ABI stability)" ;;
    esac
    exit $status
    ;;
policy)
    policy "$2" "$3"
    ;;
*)
    echo "usage: $0 dump SO OUT | compare BASELINE SO | policy CC INCLUDE_DIR" >&2
    exit 2
    ;;
esac
