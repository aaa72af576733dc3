#!/bin/sh
# Checks the manual pages:
#  - mandoc reports no warning on any page;
#  - every exported name (src/exports.txt) and every function of the two
#    sibling libraries has a page or a link in the staged man tree;
#  - each section-3 page declares every name of its NAME section in its
#    SYNOPSIS exactly as the headers do, and includes the header;
#  - every cross-reference to a page of these libraries leads somewhere.
# Usage: check.sh PAGE_DIR MAN_TREE SOURCE_ROOT
set -u
pages=$1 tree=$2 root=$3
export LC_ALL=C

if ! command -v mandoc >/dev/null 2>&1; then
    echo "mandoc is not installed (scripts/deps.sh installs it)"
    exit 1
fi

tmp=$(mktemp -d) || exit 1
trap 'rm -rf "$tmp"' EXIT
failures=0
fail() {
    printf '%s\n' "$*"
    failures=$((failures + 1))
}

# Prints "name<TAB>declaration" for every function declared in the C text on
# standard input, the declaration with annotations dropped and blanks
# normalised. With strip=1 the input is a header: comments and preprocessor
# lines are removed first.
declarations() {
    awk -v strip="$1" '
    function norm(s) {
        gsub(/ZV_EXPORT/, "", s)
        gsub(/ZV_PRINTF_LIKE\([^)]*\)/, "", s)
        sub(/__attribute__.*/, "", s)
        gsub(/[ \t\n]+/, " ", s)
        gsub(/ *\* */, "*", s); gsub(/ *\( */, "(", s); gsub(/ *\) */, ")", s)
        gsub(/ *, */, ",", s); gsub(/ *\[ */, "[", s); gsub(/ *\] */, "]", s)
        sub(/^ /, "", s); sub(/ $/, "", s)
        return s
    }
    strip && continued { continued = /\\$/; next }
    strip && /^[ \t]*#/ { continued = /\\$/; next }
    { sub(strip ? "//.*" : "^$", ""); text = text " " $0 }
    END {
        while (strip && (start = index(text, "/*")) > 0) {
            rest = substr(text, start + 2)
            text = substr(text, 1, start - 1) " " substr(rest, index(rest, "*/") + 2)
        }
        gsub(/#include <[^>]*>/, " ", text)
        n = split(text, statements, /[;{}]/)
        for (i = 1; i <= n; i++) {
            s = norm(statements[i])
            if (s !~ /^typedef/ && match(s, /[A-Za-z_][A-Za-z0-9_]*\(/))
                print substr(s, RSTART, RLENGTH - 1) "\t" s
        }
    }'
}

# The SYNOPSIS section of a page as text, overstrike removed.
synopsis() {
    mandoc -T ascii -O width=250 "$1" | sed 's/.\x08//g' |
        awk '/^SYNOPSIS/ { on = 1; next } on && /^[^ \t]/ { exit } on'
}

# Names of a page's NAME section.
names_of() {
    awk '/^\.Nd / { exit } /^\.Nm / { print $2 }' "$1"
}

# 1. Lint.
for page in "$pages"/*.[1-9]; do
    if ! out=$(mandoc -T lint -W warning "$page" 2>&1) || [ -n "$out" ]; then
        fail "$out"
    fi
done

# 2. Every required name leads to a page in the tree.
for header in "$root"/include/zvutil/*.h "$root"/siblings/*/*.h; do
    case $header in
    "$root"/include/*) include=${header#"$root"/include/} ;;
    *) include=${header##*/} ;;
    esac
    declarations 1 <"$header" | sed "s|^|$include	|"
done >"$tmp/headers"
{
    cat "$root/src/exports.txt"
    grep -v "^zvutil/" "$tmp/headers" | cut -f2
} | sort -u >"$tmp/required"
while read -r name; do
    if [ ! -f "$tree/man3/$name.3" ]; then
        fail "$name: no page or link in $tree/man3"
    fi
done <"$tmp/required"

# 3. Synopses match the headers.
for page in "$pages"/*.3; do
    synopsis "$page" >"$tmp/synopsis"
    declarations 0 <"$tmp/synopsis" >"$tmp/declared"
    for name in $(names_of "$page"); do
        from_header=$(awk -F '\t' -v n="$name" '$2 == n' "$tmp/headers")
        if [ -z "$from_header" ]; then
            fail "${page##*/}: $name is declared in no public header"
            continue
        fi
        include=$(printf '%s\n' "$from_header" | head -n 1 | cut -f1)
        expected=$(printf '%s\n' "$from_header" | head -n 1 | cut -f3)
        actual=$(awk -F '\t' -v n="$name" '$1 == n { print $2; exit }' "$tmp/declared")
        if [ "$actual" != "$expected" ]; then
            fail "${page##*/}: $name declared as \"$actual\", header has \"$expected\""
        fi
        if ! grep -q "#include <$include>" "$tmp/synopsis"; then
            fail "${page##*/}: SYNOPSIS does not include <$include> for $name"
        fi
    done
done

# 4. References to pages of these libraries resolve.
grep -H '^\.Xr [a-z_0-9]* [1-9]' "$pages"/*.[1-9] | while IFS=: read -r page line; do
    set -- $line
    case $2 in
    zv* | round_* | ensure_egid)
        [ -f "$tree/man$3/$2.$3" ] || echo "${page##*/}: reference to $2($3) leads nowhere" ;;
    esac
done >"$tmp/references"
if [ -s "$tmp/references" ]; then
    fail "$(cat "$tmp/references")"
fi

required=$(wc -l <"$tmp/required")
if [ "$failures" -ne 0 ]; then
    echo "$failures manual page check(s) failed"
    exit 1
fi
echo "manual pages: $(ls "$pages"/*.[1-9] | wc -l) pages lint clean, $required names covered"
