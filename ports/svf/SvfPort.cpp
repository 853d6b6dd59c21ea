#include "ports/svf/SvfPort.h"

#include "ports/PortError.h"
#include "ports/jtag/BridgeKeys.h"
#include "ports/svf/SvfError.h"

namespace vorant::svf {

namespace {

// The bridge most JTAG boards carry; bridge=direct keeps the first format
// (the ideal bridge, waits in seconds only).
constexpr const char* kDefaultBridge = "jtagspi";
constexpr std::uint32_t kDefaultTckHz = 10'000'000;

}  // namespace

SvfPort::SvfPort(const ports::PortAddress& address, const ports::PortContext& context) {
    SvfRecorderOptions options;
    options.toolName = context.toolName;
    options.partName = context.partName;
    options.bridgeSettings = ports::jtag::bridgeSettings(address, kDefaultBridge);
    if (options.bridgeSettings.name != "direct")
        options.bridge = ports::jtag::makeBridge(options.bridgeSettings);
    if (address.keys.count("tck-hz")) {
        const auto hz = ports::jtag::keyNumber(address, "tck-hz", 1'000'000'000);
        if (hz == 0) throw ports::PortError(ports::PortError::Kind::BadRequest, "--port " + address.text + ": tck-hz=0; give 1 to 1000000000");
        options.tckHz = static_cast<std::uint32_t>(hz);
    } else if (options.bridge) {
        options.tckHz = kDefaultTckHz;
    }
    const std::string& file = address.path;
    try {
        recorder_ = std::make_unique<SvfRecorder>(file, options);
    } catch (const SvfError& error) {
        throw ports::PortError(ports::PortError::Kind::BadRequest,
                               std::string(error.what()) + "; record into a folder that exists and can be written");
    }
}

void SvfPort::commit() {
    if (!recorder_ || recorder_->finished()) return;
    try {
        recorder_->finish();
    } catch (const SvfError& error) {
        throw ports::PortError(ports::PortError::Kind::Unavailable, error.what());
    }
}

const ports::PortInfo& svfPortInfo() {
    static const ports::PortInfo row = [] {
        ports::PortInfo info;
        info.name = "svf";
        info.synopsis = {
            {"svf:FILE", "record the scans as SVF into FILE; the file appears only when the operation succeeds "
                         "(a failed or cancelled run leaves no file and leaves an existing FILE untouched). "
                         "The scans are framed for bridge= (default jtagspi); bridge=direct assumes an ideal bridge"},
        };
        info.path = ports::PathUse::Required;
        info.pathName = "FILE";
        info.keys = ports::jtag::bridgeKeys();
        info.keys.push_back({"tck-hz", "HZ", "the TCK frequency waits are counted in (default 10000000 with a bridge)"});
        info.caps = {.readsBack = false, .records = true, .simulatesChip = false, .hasBusClock = false,
                     .takesSimFaults = false};
        info.open = [](const ports::PortAddress& address, const ports::PortContext& context) -> std::unique_ptr<ports::Port> {
            return std::make_unique<SvfPort>(address, context);
        };
        return info;
    }();
    return row;
}

}  // namespace vorant::svf
