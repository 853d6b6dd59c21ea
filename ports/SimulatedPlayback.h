#pragma once
// Plays SVF on the simulated hardware of a port: the flash alone (the
// ideal bridge), or a simulated JTAG board with the recording's bridge.
// A recording names its bridge in its header; keys given with --port win.

#include "ports/PortTable.h"

namespace vorant::ports {

// "sim": a recording for the ideal bridge plays on the flash; one that
// names another bridge plays on a board with that bridge.
svf::SvfPlayResult playOnSimulator(const PortAddress& address, const PortContext& context, const std::string& svfFile);
// "board": always the board, its bridge from the keys or the recording.
svf::SvfPlayResult playOnBoard(const PortAddress& address, const PortContext& context, const std::string& svfFile);

// The bridge keys a recording's header names; none for the ideal format.
std::map<std::string, std::string> recordedBridgeKeys(const std::string& svfFile);

}  // namespace vorant::ports
