#pragma once
#include "host/ScanPort.h"

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace vorant::cli {

// Reads the chip's SFDP area over a port (5Ah, 3-byte address 0, one dummy
// byte): the header first, then as far as its parameter tables reach (at
// most 4 KiB). Nothing when a shift failed.
std::optional<std::vector<std::uint8_t>> readSfdpArea(ScanPort& port);

// `vorant-spi sfdp`: reads the area and prints it decoded, one fact a line.
// false, with one error line, when the chip has no (valid) SFDP area.
bool showSfdp(ScanPort& port);

}  // namespace vorant::cli
