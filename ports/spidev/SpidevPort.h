#pragma once
// The Linux spidev cable: "spidev:/dev/spidevB.C[,speed=HZ]", a flash on a
// board's SPI bus (a Raspberry Pi's header, say) through the kernel's
// user-space SPI driver. Mode 0, 8-bit words, one SPI_IOC_MESSAGE per
// transaction.

#include "ports/PortTable.h"

#include <filesystem>
#include <vector>

namespace vorant::ports::spidev {

const PortInfo& spidevPortInfo();

// The spidevB.C nodes in `folder` ("/dev" on a running system), by bus and
// chip select.
std::vector<FoundCable> findSpidevNodes(const std::filesystem::path& folder);

}  // namespace vorant::ports::spidev
