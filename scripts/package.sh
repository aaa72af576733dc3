#!/usr/bin/env bash
# scripts/package.sh [--twice] [amd64] [i386]
# Builds the Debian packages of each architecture (default both) with
#   dpkg-buildpackage -us -uc -b -a ARCH
# from a copy of the tracked files (staged once, as they are when it starts)
# in build/deb/ARCH/libzvutil-VERSION, so that the .deb, .changes and
# .buildinfo files land in build/deb/ARCH, then runs lintian --pedantic on
# them and on the source package (errors and warnings fail). Only the
# Build-Depends of debian/control are installed to build. i386 is built on
# amd64 with the multilib compilers (see debian/rules).
# --twice builds each architecture again in another directory and fails
# unless every .deb is byte-identical to the first build's.
set -euo pipefail
cd "$(dirname "$0")/.."
root=$PWD
twice=no
if [ "${1:-}" = --twice ]; then twice=yes; shift; fi
archs=("$@")
[ ${#archs[@]} -gt 0 ] || archs=(amd64 i386)
for arch in "${archs[@]}"; do
    case $arch in
    amd64 | i386) ;;
    *) echo "usage: $0 [--twice] [amd64] [i386]" >&2; exit 2 ;;
    esac
done

scripts/deps.sh --only dpkg-dev lintian
scripts/deps.sh --build-dep "$root"
# The i386 line of Build-Depends, which a native build does not install.
if [[ " ${archs[*]} " == *" i386 "* ]]; then
    scripts/deps.sh --only g++-multilib libc6:i386
fi
version=$(dpkg-parsechangelog -SVersion)
staged=$root/build/deb/source
rm -rf "$staged"
mkdir -p "$staged"
git ls-files -z --cached --others --exclude-standard |
    while IFS= read -r -d '' file; do [ ! -e "$file" ] || printf '%s\0' "$file"; done |
    xargs -0 cp -P --parents -t "$staged"
echo "== lintian --pedantic (source)"
rm -rf "$root/build/deb/dsc" && mkdir -p "$root/build/deb/dsc"
cp -a "$staged" "$root/build/deb/dsc/libzvutil-$version"
(cd "$root/build/deb/dsc" && dpkg-source -b "libzvutil-$version" >/dev/null)
lintian --pedantic --fail-on error,warning --display-info "$root/build/deb/dsc"/*.dsc
echo "   no errors or warnings"

# build ARCH DIR: the packages of ARCH in DIR, with the log in DIR/build.log.
build() {
    local arch=$1 out=$2 start=$SECONDS
    local src=$out/libzvutil-$version
    rm -rf "$out"
    mkdir -p "$out"
    cp -a "$staged" "$src"
    (cd "$src" && dpkg-checkbuilddeps -a "$arch")
    echo "== dpkg-buildpackage -us -uc -b -a $arch in ${out#"$root"/}"
    # The progress: each debhelper step and ninja's count of targets.
    set +e
    (cd "$src" && dpkg-buildpackage -us -uc -b -a "$arch" 2>&1) | tee "$out/build.log" |
        grep --line-buffered -E '^[[:space:]]+dh_[a-z_]+|^\[[0-9]+/[0-9]+\]' |
        sed -u -E 's/^[[:space:]]+/   /; s/^(\[[0-9]+\/[0-9]+\]).* -o ([^ ]+) .*/   \1 \2/; s/^(.{100}).*/\1 .../'
    local status=${PIPESTATUS[0]}
    set -e
    if [ "$status" -ne 0 ]; then
        echo "dpkg-buildpackage failed; the end of $out/build.log:"
        tail -40 "$out/build.log"
        exit 1
    fi
    echo "   built in $((SECONDS - start)) s:"
    (cd "$out" && ls -1 ./*.deb | sed 's|^\./|   |')
}

for arch in "${archs[@]}"; do
    out=$root/build/deb/$arch
    build "$arch" "$out"
    echo "== lintian --pedantic ($arch)"
    lintian --pedantic --fail-on error,warning --display-info "$out"/*_"$arch".changes
    echo "   no errors or warnings"
    if [ $twice = yes ]; then
        build "$arch" "$root/build/deb/$arch-again"
        for deb in "$out"/*.deb; do
            cmp "$deb" "$root/build/deb/$arch-again/${deb##*/}" ||
                { echo "${deb##*/} differs between the two builds"; exit 1; }
        done
        echo "== every .deb of the two $arch builds is byte-identical"
    fi
done
