#!/usr/bin/env bash
# Installs, on Debian 12, what building and testing the library need:
# compilers for both targets (GCC, and clang with its sanitizer and libFuzzer
# runtimes), CMake, Ninja, make, pkg-config, GoogleTest for both targets,
# qemu-user for kernels that cannot run i386 programs, mandoc for the
# manual-page check and abigail-tools for the ABI check.
# Pass extra package names to install them as well. Does nothing when all
# are present.
set -euo pipefail

packages=(ca-certificates gcc g++ g++-multilib clang libclang-rt-14-dev make cmake ninja-build
          pkg-config binutils file libgtest-dev libgtest-dev:i386 qemu-user mandoc abigail-tools
          "$@")

sudo=
if [ "$(id -u)" -ne 0 ]; then sudo=sudo; fi

if ! dpkg --print-foreign-architectures | grep -qx i386; then
    $sudo dpkg --add-architecture i386
    updated=no
fi

missing=()
for package in "${packages[@]}"; do
    dpkg-query -W -f='${Status}' "$package" 2>/dev/null | grep -q 'ok installed' || missing+=("$package")
done

if [ ${#missing[@]} -gt 0 ] || [ "${updated:-}" = no ]; then
    echo "Installing: ${missing[*]}"
    $sudo apt-get update -qq
    [ ${#missing[@]} -eq 0 ] || DEBIAN_FRONTEND=noninteractive \
        $sudo apt-get install -y -qq --no-install-recommends "${missing[@]}"
fi
