#include "cli/PortSession.h"

#include "cli/ToolFailure.h"
#include "cli/SvfPlayback.h"
#include "cli/UsageError.h"
#include "ports/PortError.h"

#include <chrono>

namespace vorant::cli {

namespace {

const ports::PortInfo& rowOf(const ToolOptions& options) {
    const ports::PortInfo* row = ports::findPort(options.port.kind);
    // The address was checked when the command line was read.
    if (row == nullptr) throw UsageError("unknown port '" + options.port.kind + "'; the ports are " + ports::portNames());
    return *row;
}

}  // namespace

void checkPortOptions(const ToolOptions& options) {
    const ports::PortInfo& row = rowOf(options);
    const std::string port = "--port " + row.name;
    if (options.chip && !row.caps.simulatesChip)
        throw UsageError("--chip names the simulated chip and does not apply to " + port);
    if (options.clockHz && !row.caps.hasBusClock)
        throw UsageError("--clock sets the simulator's clock and does not apply to " + port);
    if (!options.simFaults.empty() && !row.caps.takesSimFaults)
        throw UsageError("--sim-fault applies to the simulator only, not to " + port);
}

std::unique_ptr<PortSession> PortSession::open(const ToolOptions& options, const std::string& partName) {
    std::unique_ptr<PortSession> session(new PortSession);
    session->row_ = &rowOf(options);
    ports::PortContext context;
    context.toolName = "vorant-spi";
    context.partName = partName;
    context.chipName = simulatedChipName(options);
    context.clockHz = options.clockHz;
    context.simFaults = options.simFaults;
    try {
        session->port_ = session->row_->open(options.port, context);
    } catch (const ports::PortError& error) {
        if (error.kind() == ports::PortError::Kind::BadRequest) throw UsageError(error.what());
        throw ToolFailure(error.what());
    }
    return session;
}

PhaseTimer::Clock PortSession::phaseClock() const {
    if (port_->busNanoseconds()) {
        const ports::Port* port = port_.get();
        return [port] { return static_cast<double>(port->busNanoseconds().value_or(0)) / 1e9; };
    }
    return [] { return std::chrono::duration<double>(std::chrono::steady_clock::now().time_since_epoch()).count(); };
}

}  // namespace vorant::cli
