#!/usr/bin/env bash
# Regenerates the sample images. The bytes come from a fixed linear
# congruential generator, so every run gives the same files.
#   blinky.bin  5000 bytes (an odd size: the last page is a short one)
#   blinky.mcs  the same bytes as Intel HEX, placed at 0x010000
set -euo pipefail
cd "$(dirname "$0")"

python3 - <<'PY'
state = 0x1234ABCD
data = bytearray()
for _ in range(5000):
    state = (state * 1103515245 + 12345) & 0x7FFFFFFF
    data.append((state >> 16) & 0xFF)
open("blinky.bin", "wb").write(data)
PY

srec_cat blinky.bin -binary -offset 0x010000 -o blinky.mcs -intel -line-length=43 -crlf
echo "wrote blinky.bin and blinky.mcs"
