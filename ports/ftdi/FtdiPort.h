#pragma once
// FTDI's high-speed chips as SPI masters through their MPSSE engine:
// "ftdi[:VID:PID][,interface=A|B,serial=S,speed=HZ,cs=PIN]". Without
// VID:PID it takes the one FT232H, FT2232H or FT4232H on USB.

#include "ports/PortTable.h"

namespace vorant::ports::ftdi {

const PortInfo& ftdiPortInfo();

}  // namespace vorant::ports::ftdi
