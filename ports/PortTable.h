#pragma once
// The one list of the scan ports the tool can open. A row says everything
// the host needs: the name and synopsis for --help, the keys its address
// takes, what the port can do, and how to open it. A new cable is one row.

#include "ports/Port.h"
#include "ports/PortAddress.h"
#include "ports/svf/SvfPlayer.h"

#include <memory>
#include <string>
#include <vector>

namespace vorant::ports {

struct PortKey {
    std::string name;
    std::string valueName;  // for the synopsis: "HZ", "NAME"
    std::string purpose;
};

// A cable found on this machine, for `vorant-spi ports`.
struct FoundCable {
    std::string address;      // a --port value that opens it
    std::string description;  // what it is: "FT232H, serial FT4ABC12"
};

enum class PathUse { None, Optional, Required };

struct PortInfo {
    std::string name;
    // The forms of its address and what each does, for --help.
    std::vector<std::pair<std::string, std::string>> synopsis;
    PathUse path = PathUse::None;
    std::string pathName;  // "FILE", "HOST[:PORT]"
    std::vector<PortKey> keys;
    PortCaps caps;
    // Opens the port; the address has been checked against this row.
    // Throws PortError; a refused open leaves nothing behind.
    std::unique_ptr<Port> (*open)(const PortAddress& address, const PortContext& context) = nullptr;
    // Plays an SVF file on the port's simulated hardware (the flash file,
    // chip and faults as open() would take them); null for a port with no
    // simulated hardware. Throws PortError for a request it refuses, and
    // what the SVF player throws for a file it cannot play.
    svf::SvfPlayResult (*playSvf)(const PortAddress& address, const PortContext& context,
                                  const std::string& svfFile) = nullptr;
    // Lists the cables of this kind on this machine; null for a port that
    // has none to find. Throws PortError when it cannot look.
    std::vector<FoundCable> (*discover)() = nullptr;

    bool takesKey(const std::string& key) const {
        for (const PortKey& known : keys)
            if (known.name == key) return true;
        return false;
    }
};

const std::vector<PortInfo>& portTable();
// The cables this build leaves out, each with what it would need, so
// --help can say why one is missing.
const std::vector<std::string>& portsLeftOut();
// The row of a kind; null when there is none.
const PortInfo* findPort(const std::string& kind);
// "sim, svf", for messages.
std::string portNames();
// The ports section of --help.
std::string portHelp();

}  // namespace vorant::ports
