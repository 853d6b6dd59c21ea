#!/usr/bin/env bash
# The first thing to run: installs what is missing, builds vorant-spi, then
# programs the sample image into a simulated flash, reads the flash back and
# compares. The simulated flash lives in /tmp/vorant-demo-flash.bin, so a
# second run finds the contents of the first.
set -euo pipefail
cd "$(dirname "$0")/.."

scripts/install-deps.sh
cmake --preset dev >/dev/null
cmake --build --preset dev -j2 --target vorant-spi

tool=build/dev/bin/vorant-spi
image=examples/blinky.bin
flash=/tmp/vorant-demo-flash.bin
readback=/tmp/vorant-demo-readback.bin

step() { printf '\n==> %s\n' "$*"; }
verdict() { printf '\n*** %s\n' "$*"; }

step "$tool --port sim:$flash program $image -e -v"
if ! "$tool" --port "sim:$flash" program "$image" -e -v; then
    verdict "FAILED: programming the simulated flash did not succeed"
    exit 1
fi

step "$tool --port sim:$flash readback -f $readback"
if ! "$tool" --port "sim:$flash" readback -f "$readback"; then
    verdict "FAILED: the readback did not succeed"
    exit 1
fi

size=$(wc -c <"$image")
step "cmp -n $size $image $readback"
if cmp -n "$size" "$image" "$readback"; then
    verdict "PASSED: the first $size bytes read back equal $image ($(wc -c <"$readback") bytes read in all)"
else
    verdict "FAILED: the readback differs from $image"
    exit 1
fi
