#!/usr/bin/env bash
# Installs what a fresh Debian 12 machine lacks to build and test vorant-spi.
# Runs apt-get as root, or through sudo.
set -euo pipefail

packages=(
  cmake ninja-build g++ pkg-config
  libgtest-dev libgmock-dev libbenchmark-dev
  libtomlplusplus-dev libcli11-dev
  g++-mingw-w64-x86-64 binutils-mingw-w64-x86-64
  srecord openocd flashrom
  libftdi1-dev libusb-1.0-0-dev
  clang-14 libclang-rt-14-dev
)
if [[ "${VORANT_WITH_WINE:-0}" == 1 ]]; then packages+=(wine wine64); fi

missing=()
for p in "${packages[@]}"; do
  dpkg-query -W -f='${Status}' "$p" 2>/dev/null | grep -q "install ok installed" || missing+=("$p")
done
if ((${#missing[@]} == 0)); then exit 0; fi

if [[ $(id -u) -eq 0 ]]; then sudo=(); else sudo=(sudo); fi
echo "Installing: ${missing[*]}"
"${sudo[@]}" apt-get update -qq
DEBIAN_FRONTEND=noninteractive "${sudo[@]}" apt-get install -y -qq --no-install-recommends "${missing[@]}" >/dev/null
