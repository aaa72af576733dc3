#!/usr/bin/env bash
# scripts/package.sh [i386|amd64]
# Builds the Debian packages for one architecture (default i386) into
# build/packages/ and runs lintian on them:
#   libzvutil1, libzverrortrace1, libzvlog1  the shared objects
#   libzvutil-dev  headers, .so links, pkg-config files, CMake package, manual pages
# Files go to the multiarch directory /usr/lib/<triplet>. The package metadata
# (control, changelog, copyright) lives in packaging/deb/.
set -euo pipefail
cd "$(dirname "$0")/.."
root=$PWD
arch=${1:-i386}
case $arch in
i386) toolchain=(--toolchain "$root/cmake/i386-linux-gnu.cmake") ;;
amd64) toolchain=() ;;
*) echo "usage: $0 [i386|amd64]" >&2; exit 2 ;;
esac
scripts/deps.sh dpkg-dev lintian "libc6:$arch"

# The dpkg tools below work for the DEB_HOST_* architecture they find in the
# environment; file times in the packages are those of the changelog entry.
eval "$(dpkg-architecture -a"$arch" -s 2>/dev/null)"
SOURCE_DATE_EPOCH=$(dpkg-parsechangelog -l packaging/deb/changelog -STimestamp)
export SOURCE_DATE_EPOCH
version=$(dpkg-parsechangelog -l packaging/deb/changelog -SVersion)
libdir=usr/lib/$DEB_HOST_MULTIARCH

build=$root/build/deb-$arch
out=$root/build/packages
echo "== building for $arch ($libdir)"
cmake -S . -B "$build" -G Ninja "${toolchain[@]}" -DCMAKE_BUILD_TYPE=RelWithDebInfo \
    -DZV_BUILD_TESTS=OFF -DCMAKE_INSTALL_PREFIX=/usr -DCMAKE_INSTALL_LIBDIR="lib/$DEB_HOST_MULTIARCH" \
    -DZV_RELOCATABLE_PKGCONFIG=OFF -DCMAKE_SKIP_INSTALL_RPATH=ON \
    -DCMAKE_SHARED_LINKER_FLAGS="-Wl,-z,relro -Wl,-z,now" >/dev/null
cmake --build "$build" --target zvutil zverrortrace zvlog -- -j2 >/dev/null

# A source-package layout, as the dpkg tools expect: debian/control,
# debian/changelog and one tree per package in debian/<package>.
work=$build/pkg
rm -rf "$work"
mkdir -p "$work/debian" "$out"
cp packaging/deb/control packaging/deb/changelog "$work/debian/"
runtime=(libzvutil1:zvutil libzverrortrace1:zverrortrace libzvlog1:zvlog)
for entry in "${runtime[@]}" libzvutil-dev:development; do
    package=${entry%%:*} component=${entry#*:}
    tree=$work/debian/$package
    DESTDIR=$tree cmake --install "$build" --component "$component" >/dev/null
    mkdir -p "$tree/DEBIAN" "$tree/usr/share/doc/$package"
    install -m 644 packaging/deb/copyright "$tree/usr/share/doc/$package/"
    gzip -9nc packaging/deb/changelog > "$tree/usr/share/doc/$package/changelog.gz"
done

# Manual pages compressed, each link re-pointed at its compressed page.
man=$work/debian/libzvutil-dev/usr/share/man
find "$man" -type f -name '*.[0-9]' -exec gzip -9n {} +
find "$man" -type l -name '*.[0-9]' | while read -r link; do
    ln -s "$(readlink "$link").gz" "$link.gz"
    rm "$link"
done

cd "$work"
for entry in "${runtime[@]}"; do
    package=${entry%%:*} lib=lib${entry#*:}
    tree=debian/$package
    object=$(readlink -f "$tree/$libdir/$lib.so.1")
    strip --remove-section=.comment --remove-section=.note --strip-unneeded "$object"
    chmod 644 "$object"
    echo "$lib 1 $package (>= $version)" > "$tree/DEBIAN/shlibs"
    echo "activate-noawait ldconfig" > "$tree/DEBIAN/triggers"
    dpkg-gensymbols -q -p"$package" -P"$tree" -e"$object" -v"$version" -c0 \
        -O"$tree/DEBIAN/symbols"
    sed -i '1a * Build-Depends-Package: libzvutil-dev' "$tree/DEBIAN/symbols"
done
for entry in "${runtime[@]}" libzvutil-dev:development; do
    package=${entry%%:*}
    tree=debian/$package
    : > "debian/$package.substvars"
    if [ "$package" != libzvutil-dev ]; then
        dpkg-shlibdeps -T"debian/$package.substvars" -l"$PWD/debian/libzverrortrace1/$libdir" \
            -l"$PWD/debian/libzvlog1/$libdir" "$tree/$libdir"/*.so.*.*.*
    fi
    dpkg-gencontrol -p"$package" -P"$tree" -T"debian/$package.substvars"
    (cd "$tree" && find . -path ./DEBIAN -prune -o -type f -printf '%P\0' |
        LC_ALL=C sort -z | xargs -0 -r md5sum > DEBIAN/md5sums)
    find "$tree" -type d -exec chmod 755 {} +
    find "$tree" -type f -exec chmod 644 {} +
    dpkg-deb --root-owner-group -Zxz --build "$tree" "$out" | sed 's/^dpkg-deb: /   /'
done

echo "== lintian"
cd "$out"
debs=(*_"$version"_"$arch".deb)
lintian --fail-on error --display-info "${debs[@]}"
echo "lintian reports no errors"
