#!/usr/bin/env bash
# Installs, on Debian 12, what building and testing the library need:
# compilers for both targets (GCC, and clang with its sanitizer and libFuzzer
# runtimes), CMake, Ninja, make, pkg-config, GoogleTest for both targets,
# qemu-user for kernels that cannot run i386 programs, mandoc for the
# manual-page check and abigail-tools for the ABI check.
#   scripts/deps.sh [PACKAGE...]       those and the PACKAGEs
#   scripts/deps.sh --only PACKAGE...  only the PACKAGEs
#   scripts/deps.sh --build-dep DIR    the Build-Depends of the Debian source DIR
# Does nothing when all are present. apt's output goes to a log: each step
# prints one line, and the whole log when it fails.
set -euo pipefail

packages=(ca-certificates gcc g++ g++-multilib clang libclang-rt-14-dev make cmake ninja-build
          pkg-config binutils file libgtest-dev libgtest-dev:i386 qemu-user mandoc abigail-tools)
build_dep=
case ${1:-} in
--only) shift; packages=("$@") ;;
--build-dep) build_dep=$2; packages=(dpkg-dev) ;;
*) packages+=("$@") ;;
esac

sudo=
if [ "$(id -u)" -ne 0 ]; then sudo=sudo; fi
log=$(mktemp)
trap 'rm -f "$log"' EXIT

# step DESCRIPTION COMMAND...: runs COMMAND with its output in the log.
step() {
    local what=$1 start=$SECONDS
    shift
    if ! "$@" >"$log" 2>&1; then
        echo "== $what: failed"
        cat "$log"
        exit 1
    fi
    local added
    added=$(grep -c '^Setting up ' "$log" || true)
    [ "$added" -gt 0 ] && added=", $added packages set up" || added=
    echo "== $what: done in $((SECONDS - start)) s$added"
}
apt=($sudo env DEBIAN_FRONTEND=noninteractive apt-get -y -o DPkg::Lock::Timeout=600)

foreign=$(dpkg --print-foreign-architectures)
if ! grep -qx i386 <<<"$foreign"; then
    step "dpkg --add-architecture i386" $sudo dpkg --add-architecture i386
    updated=no
fi

missing=()
for package in "${packages[@]}"; do
    status=$(dpkg-query -W -f='${Status}' "$package" 2>/dev/null || true)
    # A name without an architecture may list several (libgtest-dev).
    [[ $status == *"ok installed"* ]] || missing+=("$package")
done
if [ -n "$build_dep" ] && ! (cd "$build_dep" && dpkg-checkbuilddeps) >/dev/null 2>&1; then
    build_dep_missing=yes
fi

if [ ${#missing[@]} -gt 0 ] || [ "${updated:-}" = no ] || [ -n "${build_dep_missing:-}" ]; then
    step "apt-get update" "${apt[@]}" update
    [ ${#missing[@]} -eq 0 ] ||
        step "apt-get install ${missing[*]}" "${apt[@]}" install --no-install-recommends "${missing[@]}"
    [ -z "${build_dep_missing:-}" ] ||
        step "apt-get build-dep $build_dep" "${apt[@]}" build-dep --no-install-recommends "$build_dep"
fi
