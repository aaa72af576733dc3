#!/usr/bin/env bash
# check_shared_object.sh exports SO LIST HEADER_DIR
#   SO exports only names in LIST, and every name of LIST that a header in
#   HEADER_DIR declares. Every export carries the version node ZVUTIL_1.0.
# check_shared_object.sh needed SO
#   SO has SONAME libzvutil.so.1, needs only the sibling libraries, librt and
#   libc, and references nothing of the C++ runtime.
set -euo pipefail
mode=$1 so=$2
fail=0

case $mode in
exports)
    list=$3 headers=$4
    symbols=$(nm -D --defined-only "$so" | awk '$2 ~ /^[B-Za-z]$/ {print $3}')
    exported=$(echo "$symbols" | sed 's/@.*//' | sort -u)
    unversioned=$(echo "$symbols" | grep -v '@@ZVUTIL_1\.0$' || true)
    if [ -n "$unversioned" ]; then echo "not in ZVUTIL_1.0:"; echo "$unversioned"; fail=1; fi
    extra=$(comm -23 <(echo "$exported") <(sort -u "$list"))
    if [ -n "$extra" ]; then echo "exported but not public:"; echo "$extra"; fail=1; fi
    declared=$(grep -ohwE "$(paste -sd'|' "$list")" "$headers"/*.h | sort -u)
    missing=$(comm -23 <(echo "$declared") <(echo "$exported"))
    if [ -n "$missing" ]; then echo "declared but not exported:"; echo "$missing"; fail=1; fi
    echo "$(echo "$exported" | wc -l) names exported, $(echo "$declared" | wc -l) declared"
    ;;
needed)
    soname=$(readelf -d "$so" | sed -n 's/.*(SONAME).*\[\(.*\)\]/\1/p')
    [ "$soname" = libzvutil.so.1 ] || { echo "SONAME is '$soname'"; fail=1; }
    needed=$(readelf -d "$so" | sed -n 's/.*(NEEDED).*\[\(.*\)\]/\1/p')
    echo "NEEDED: $(echo $needed)"
    for lib in $needed; do
        case $lib in
        libzverrortrace.so.1 | libzvlog.so.1 | librt.so.1 | libc.so.6) ;;
        *) echo "unexpected NEEDED entry $lib"; fail=1 ;;
        esac
    done
    # glibc itself provides __cxa_finalize and __cxa_atexit: only other providers count.
    runtime=$(nm -D --undefined-only "$so" | awk '{print $2}' | grep -v '@GLIBC_' |
        grep -E '^(_Zn|_Zd|__cxa_|__gxx_personality)|@(GLIBCXX|CXXABI|GCC)_' || true)
    if [ -n "$runtime" ]; then echo "C++ runtime references:"; echo "$runtime"; fail=1; fi
    ;;
*)
    echo "usage: $0 exports|needed ..." >&2; exit 2 ;;
esac
exit $fail
