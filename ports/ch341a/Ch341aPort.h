#pragma once
// The CH341A USB programmer as an SPI cable: "ch341a[:BUS:ADDR]". Without
// an address it opens the only CH341A plugged in. The SPI clock is the
// chip's own (about 1.4 MHz) and cannot be set, so the address takes no
// keys.

#include "ports/Port.h"
#include "ports/PortTable.h"
#include "ports/ch341a/Ch341Io.h"

#include <memory>
#include <string>

namespace vorant::ports::ch341a {

const PortInfo& ch341aPortInfo();

// The cable over an opened device, set up for SPI; `name` starts its
// failure reasons ("ch341a:1:5"). Throws PortError (Unavailable) when the
// device does not take the setup.
std::unique_ptr<Port> openCh341aCable(std::unique_ptr<Ch341Io> io, const std::string& name);

}  // namespace vorant::ports::ch341a
