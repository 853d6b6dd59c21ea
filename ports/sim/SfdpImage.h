#pragma once
// The SFDP area a simulated chip serves to 5Ah when its part entry carries
// no dump of a real chip: written from the chip's own configuration with
// this file's own encoders, apart from the decoder in formats/, so one
// misreading of the standard cannot pass on both sides.

#include "ports/sim/FlashModel.h"

#include <cstdint>
#include <vector>

namespace vorant::sim {

// A JESD216B-style area: the header, a 16-DWORD basic flash parameter
// table and, for a 4-byte part, the 4-byte address instruction table.
std::vector<std::uint8_t> sfdpImageFor(const FlashConfig& config);

}  // namespace vorant::sim
