#include "ports/jtag/Bridge.h"

#include "ports/jtag/bridges/DirectBridge.h"
#include "ports/jtag/bridges/JtagSpiBridge.h"
#include "ports/jtag/bridges/ShiftDrBridge.h"

#include <stdexcept>

namespace vorant::ports::jtag {

void Bridge::decode(const std::uint8_t* drTdo, std::size_t spiBits, BitBuffer& miso) const {
    miso.clear();
    miso.appendRange(drTdo, misoOffset(), spiBits);
}

const char* bridgeNames() { return "jtagspi, shiftdr, direct"; }

std::unique_ptr<Bridge> makeBridge(const BridgeSettings& settings) {
    if (settings.name == "jtagspi") return std::make_unique<JtagSpiBridge>(settings);
    if (settings.name == "shiftdr") return std::make_unique<ShiftDrBridge>(settings);
    if (settings.name == "direct") return std::make_unique<DirectBridge>();
    throw std::invalid_argument("unknown bridge '" + settings.name + "'; the bridges are " + bridgeNames());
}

}  // namespace vorant::ports::jtag
