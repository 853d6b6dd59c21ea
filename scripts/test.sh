#!/usr/bin/env bash
# Builds vorant-spi with warnings as errors and runs every test.
set -euo pipefail
cd "$(dirname "$0")/.."
scripts/install-deps.sh
cmake --preset ci >/dev/null
cmake --build --preset ci -j 2
# The plug-in's factory is exported under its plain C name.
nm -D --defined-only build/ci/bin/libVorantType1SPIDevice.so | grep -q ' T create_type1_spi_device$' \
  || { echo "FAIL: libVorantType1SPIDevice.so does not export create_type1_spi_device" >&2; exit 1; }
# The speed budget of a 16 MiB job, printed for the record (not asserted).
build/ci/bin/vorant-bench
# Programming only what an image covers, against the physical bound of each job.
build/ci/bin/vorant-block-bench
# The tool from outside: CPU beside flashrom's emulated write, peak memory.
build/ci/bin/vorant-tool-bench
# The spidev cable's ioctls per page and per transaction, through its double (Linux builds).
if [ -x build/ci/bin/vorant-spidev-bench ]; then build/ci/bin/vorant-spidev-bench; fi
# Bytes and USB round trips per page on the FTDI cable (where libftdi1 is there).
if [ -x build/ci/bin/vorant-ftdi-bench ]; then build/ci/bin/vorant-ftdi-bench; fi
# USB transfers and packets per page through the CH341A cable (where libusb is there).
if [[ -x build/ci/bin/vorant-ch341a-bench ]]; then build/ci/bin/vorant-ch341a-bench; fi
ctest --preset ci
