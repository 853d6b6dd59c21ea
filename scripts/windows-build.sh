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
if command -v wine >/dev/null 2>&1 && [[ -x build/mingw/bin/vorant-spi.exe ]]; then
  WINEDEBUG=-all wine build/mingw/bin/vorant-spi.exe --version
fi
