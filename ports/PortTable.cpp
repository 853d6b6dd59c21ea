#include "ports/PortTable.h"

#include "ports/SimulatedPlayback.h"
#if VORANT_HAVE_CH341A
#include "ports/ch341a/Ch341aPort.h"
#endif
#include "ports/jtag/board/BoardPort.h"
#include "ports/sim/SimPort.h"
#if VORANT_HAVE_OPENOCD
#include "ports/openocd/OpenOcdPort.h"
#endif
#if VORANT_HAVE_FTDI
#include "ports/ftdi/FtdiPort.h"
#endif
#include "ports/svf/SvfPort.h"
#if VORANT_HAVE_SPIDEV
#include "ports/spidev/SpidevPort.h"
#endif

#include <sstream>

namespace vorant::ports {

namespace {

// Wraps a text to `width` columns, every line indented by `indent`.
std::string wrapped(const std::string& text, std::size_t indent, std::size_t width) {
    std::istringstream words(text);
    std::string out, line, word;
    while (words >> word) {
        if (!line.empty() && indent + line.size() + 1 + word.size() > width) {
            out += line + "\n" + std::string(indent, ' ');
            line.clear();
        }
        line += (line.empty() ? "" : " ") + word;
    }
    return out + line;
}

// The players need the SVF and board libraries, which the simulator's own
// library sits below; the table joins them.
PortInfo withPlayer(PortInfo row, decltype(PortInfo::playSvf) player) {
    row.playSvf = player;
    return row;
}

}  // namespace

const std::vector<PortInfo>& portTable() {
    // An explicit list: the port libraries are static, and a row that
    // registered itself would be dropped by the linker when nothing else
    // in its file is used. Optional cables get an #if here.
    static const std::vector<PortInfo> table = {
        withPlayer(sim::simPortInfo(), &playOnSimulator),
        svf::svfPortInfo(),
        withPlayer(jtag::boardPortInfo(), &playOnBoard),
#if VORANT_HAVE_OPENOCD
        openocd::openOcdPortInfo(),
#endif
#if VORANT_HAVE_SPIDEV
        spidev::spidevPortInfo(),
#endif
#if VORANT_HAVE_FTDI
        ftdi::ftdiPortInfo(),
#endif
#if VORANT_HAVE_CH341A
        ch341a::ch341aPortInfo(),
#endif
    };
    return table;
}

const std::vector<std::string>& portsLeftOut() {
    // Cables whose library this build could not link; each optional row
    // above names itself here in its #else.
    static const std::vector<std::string> names = {
#if !VORANT_HAVE_OPENOCD
        "openocd (needs POSIX sockets)",
#endif
#if !VORANT_HAVE_SPIDEV
        "spidev (Linux only)",
#endif
#if !VORANT_HAVE_FTDI
        "ftdi (needs libftdi1)",
#endif
#if !VORANT_HAVE_CH341A
        "ch341a (needs libusb-1.0)",
#endif
    };
    return names;
}

const PortInfo* findPort(const std::string& kind) {
    for (const PortInfo& row : portTable())
        if (row.name == kind) return &row;
    return nullptr;
}

std::string portNames() {
    std::string names;
    for (const PortInfo& row : portTable()) names += (names.empty() ? "" : ", ") + row.name;
    return names;
}

std::string portHelp() {
    constexpr std::size_t kColumn = 15, kWidth = 90;
    std::string text;
    for (const PortInfo& row : portTable()) {
        for (const auto& [form, purpose] : row.synopsis) {
            std::string line = "  " + form;
            line += line.size() < kColumn ? std::string(kColumn - line.size(), ' ') : "\n" + std::string(kColumn, ' ');
            text += line + wrapped(purpose, kColumn, kWidth) + "\n";
        }
        for (const PortKey& key : row.keys) {
            std::string line = "    ," + key.name + "=" + key.valueName;
            line += line.size() < kColumn ? std::string(kColumn - line.size(), ' ') : "\n" + std::string(kColumn, ' ');
            text += line + wrapped(key.purpose, kColumn, kWidth) + "\n";
        }
    }
    for (const std::string& name : portsLeftOut()) text += "  (not in this build: " + name + ")\n";
    return text;
}

}  // namespace vorant::ports
