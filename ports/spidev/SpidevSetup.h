#pragma once
// Puts an open spidev node in the shape a 25-series flash needs: SPI mode
// 0, 8-bit words, the chosen clock; each setting read back, so a driver
// that quietly keeps another is caught before anything is sent.

#include "ports/spidev/SpidevIo.h"

#include <cstdint>
#include <string>

namespace vorant::ports::spidev {

// Throws PortError (Unavailable) naming the setting the driver refused or
// changed; `where` ("--port spidev:/dev/spidev0.0") starts the message.
void setUpSpidev(SpidevIo& io, std::uint32_t speedHz, const std::string& where, const std::string& path);

}  // namespace vorant::ports::spidev
