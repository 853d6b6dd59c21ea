#include "ports/openocd/OpenOcdPort.h"

#include "ports/PortError.h"
#include "ports/jtag/BridgeKeys.h"

#include <sstream>
#include <vector>

namespace vorant::ports::openocd {

namespace {

constexpr const char* kDefaultHost = "localhost";
constexpr std::uint16_t kDefaultTclPort = 6666;
constexpr std::chrono::milliseconds kConnectTimeout{5000};

[[noreturn]] void unavailable(const std::string& message) {
    throw PortError(PortError::Kind::Unavailable, message);
}

std::vector<std::string> words(const std::string& text) {
    std::istringstream in(text);
    std::vector<std::string> out;
    for (std::string word; in >> word;) out.push_back(word);
    return out;
}

// The TAP to scan: the one named, or the only one OpenOCD has.
std::string chooseTap(OpenOcdSink& sink, const PortAddress& address, const std::string& where) {
    std::string names;
    if (!sink.run("jtag names", names)) unavailable(where + ": asking OpenOCD for its TAPs failed: " + sink.error());
    const std::vector<std::string> taps = words(names);
    std::string list;
    for (const std::string& tap : taps) list += (list.empty() ? "" : ", ") + tap;
    const std::string wanted = address.key("tap");
    if (wanted.empty()) {
        if (taps.size() == 1) return taps.front();
        unavailable(where + ": " + (taps.empty() ? std::string("OpenOCD has no TAP") : "OpenOCD has several TAPs (" + list + ")") +
                    "; name the bridge's with --tap NAME");
    }
    for (const std::string& tap : taps)
        if (tap == wanted) return tap;
    unavailable(where + ": OpenOCD has no TAP '" + wanted + "' (it has " + (list.empty() ? "none" : list) +
                "); give one of them with --tap");
}

// The IR length OpenOCD declares for `tap` (its scan_chain table); 0 when
// the table says nothing readable about it.
unsigned declaredIrLength(OpenOcdSink& sink, const std::string& tap) {
    std::string table;
    if (!sink.run("scan_chain", table)) return 0;
    std::istringstream lines(table);
    for (std::string line; std::getline(lines, line);) {
        const std::vector<std::string> columns = words(line);
        // " 0 fpga.tap  Y  0x0362d093 0x0362d093  6 0x01 0x03"
        if (columns.size() >= 6 && columns[1] == tap && columns[5].find_first_not_of("0123456789") == std::string::npos)
            return static_cast<unsigned>(std::stoul(columns[5]));
    }
    return 0;
}

std::unique_ptr<Port> open(const PortAddress& address, const PortContext&) {
    std::string host = kDefaultHost;
    std::uint16_t port = kDefaultTclPort;
    if (!address.path.empty()) {
        const std::size_t colon = address.path.rfind(':');
        host = address.path.substr(0, colon);
        if (colon != std::string::npos) {
            const std::string number = address.path.substr(colon + 1);
            if (number.empty() || number.size() > 5 || number.find_first_not_of("0123456789") != std::string::npos ||
                std::stoul(number) == 0 || std::stoul(number) > 65535)
                throw PortError(PortError::Kind::BadRequest,
                                "--port " + address.text + ": '" + number + "' is not a TCP port; give 1 to 65535");
            port = static_cast<std::uint16_t>(std::stoul(number));
        }
        if (host.empty()) host = kDefaultHost;
    }
    const std::string where = "OpenOCD at " + host + ":" + std::to_string(port);
    // Keys first: a bad bridge costs no connection.
    jtag::bridgeSettings(address, "jtagspi");
    std::string error;
    std::unique_ptr<TclRpcIo> io = connectTclRpc(host, port, kConnectTimeout, error);
    if (!io)
        unavailable("--port " + address.text + ": cannot connect to " + where + ": " + error +
                    "; start OpenOCD with its Tcl server (tcl_port " + std::to_string(port) + ") or give its address");
    return std::make_unique<OpenOcdPort>(std::move(io), address, where);
}

}  // namespace

OpenOcdPort::OpenOcdPort(std::unique_ptr<TclRpcIo> io, const PortAddress& address, const std::string& where)
    : io_(std::move(io)) {
    const jtag::BridgeSettings bridge = jtag::bridgeSettings(address, "jtagspi");
    sink_ = std::make_unique<OpenOcdSink>(*io_, "");
    const std::string tap = chooseTap(*sink_, address, where);
    sink_ = std::make_unique<OpenOcdSink>(*io_, tap);
    // OpenOCD shifts as many IR bits as the TAP was declared with: a
    // bridge instruction of another length would land wrong.
    const unsigned declared = declaredIrLength(*sink_, tap);
    if (declared != 0 && declared != bridge.irLength)
        unavailable(where + ": OpenOCD declares " + tap + " with a " + std::to_string(declared) +
                    "-bit IR, but the bridge's instruction has " + std::to_string(bridge.irLength) +
                    " bits; give the TAP's real length to 'jtag newtap ... -irlen' and to --irlen");
    port_ = std::make_unique<jtag::JtagPort>(where + ", TAP " + tap, jtag::makeBridge(bridge), bridge, *sink_);
}

// Whatever is still queued goes out; a run that failed has said so.
OpenOcdPort::~OpenOcdPort() {
    if (sink_ && !io_->closed()) sink_->flush();
}

void OpenOcdPort::commit() {
    if (!sink_->flush()) unavailable(sink_->error());
}

const PortInfo& openOcdPortInfo() {
    static const PortInfo row = [] {
        PortInfo info;
        info.name = "openocd";
        info.synopsis = {
            {"openocd[:HOST[:PORT]]",
             "a board through a running OpenOCD's Tcl server (default localhost:6666); the bridge's TAP is tap= "
             "(default: OpenOCD's only TAP), its bridge bridge= (default jtagspi)"},
        };
        info.path = PathUse::Optional;
        info.pathName = "HOST[:PORT]";
        info.keys = {{"tap", "NAME", "the OpenOCD TAP of the bridge, as in 'jtag newtap CHIP tap' (CHIP.tap)"}};
        for (PortKey& key : jtag::bridgeKeys()) info.keys.push_back(std::move(key));
        info.caps = {.readsBack = true, .records = false, .simulatesChip = false, .hasBusClock = false,
                     .takesSimFaults = false};
        info.open = &open;
        return info;
    }();
    return row;
}

}  // namespace vorant::ports::openocd
