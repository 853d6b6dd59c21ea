#pragma once
// The address keys every JTAG port takes for its bridge, and their
// parsing: bridge=NAME, ir=VALUE, irlen=N, delay=N, chain=LIST.

#include "ports/PortAddress.h"
#include "ports/PortTable.h"
#include "ports/jtag/Bridge.h"

#include <vector>

namespace vorant::ports::jtag {

std::vector<PortKey> bridgeKeys();

// The bridge settings an address names, `defaultBridge` when it names none.
// Throws PortError (BadRequest) naming the key and what it takes.
BridgeSettings bridgeSettings(const PortAddress& address, const std::string& defaultBridge);

// A whole number from `text` (decimal or 0x hex) no larger than `limit`;
// throws PortError (BadRequest) naming the key.
std::uint64_t keyNumber(const PortAddress& address, const std::string& key, std::uint64_t limit);

}  // namespace vorant::ports::jtag
