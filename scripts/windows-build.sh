#!/usr/bin/env bash
# Cross-builds the Windows (64-bit) DLLs and vorant-spi.exe with MinGW-w64 and
# checks that the plug-in exports its factory under the plain C name.
set -euo pipefail
cd "$(dirname "$0")/.."
scripts/install-deps.sh
cmake --preset mingw >/dev/null
cmake --build --preset mingw -j 2
dll=build/mingw/bin/libVorantType1SPIDevice.dll
x86_64-w64-mingw32-objdump -p "$dll" | grep -E '^\s+\[\s*[0-9]+\] create_type1_spi_device$' \
  || { echo "FAIL: $dll does not export create_type1_spi_device" >&2; exit 1; }
echo "Windows build OK: $dll exports create_type1_spi_device"
# Where wine is installed, run the Windows tool once for real: its version,
# then an erase + program + verify of the example image on the simulator.
if command -v wine >/dev/null 2>&1; then
  export WINEDEBUG=-all
  exe=build/mingw/bin/vorant-spi.exe
  timeout 300 wine "$exe" --version
  if timeout 300 wine "$exe" --quiet --chip W25Q16JV program examples/blinky.bin -e -v; then
    echo "Windows smoke test OK: vorant-spi.exe programmed and verified examples/blinky.bin under wine"
  else
    echo "FAIL: vorant-spi.exe did not program examples/blinky.bin under wine" >&2
    exit 1
  fi
fi
