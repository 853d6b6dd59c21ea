#pragma once
#include "cli/CommandLine.h"
#include "cli/PhaseTimer.h"
#include "host/ScanPort.h"
#include "ports/Port.h"
#include "ports/PortTable.h"

#include <cstdint>
#include <memory>
#include <optional>
#include <string>

namespace vorant::cli {

// The scan port of one run, opened from its row of the port table.
class PortSession {
public:
    // Opens the options' port for `partName` (empty while --part auto is
    // still to identify it). Throws UsageError for a request the port
    // refuses and ToolFailure when the cable is not there; either way
    // nothing is left behind.
    static std::unique_ptr<PortSession> open(const ToolOptions& options, const std::string& partName);

    ScanPort& port() { return port_->scan(); }
    const ports::PortCaps& caps() const { return row_->caps; }

    // Simulated bus time so far; nothing for a port that runs in wall time.
    std::optional<std::uint64_t> simulatedNanoseconds() const { return port_->busNanoseconds(); }
    // The clock a run's phases are timed by, as its rate is: the simulated
    // bus time, or the wall clock.
    PhaseTimer::Clock phaseClock() const;
    // Whether a failed run's output has already reached its target.
    bool writesInPlace() const { return port_->writesInPlace(); }

    // Completes the run's output (a recording appears). Throws
    // ports::PortError when it could not be completed.
    void commit() { port_->commit(); }
    // Gives the run up: a refused or failed run leaves no trace.
    void abandon() { port_->abandon(); }

private:
    PortSession() = default;

    const ports::PortInfo* row_ = nullptr;
    std::unique_ptr<ports::Port> port_;
};

// The port's options as the user gave them, checked against what the
// port can do. Throws UsageError.
void checkPortOptions(const ToolOptions& options);

}  // namespace vorant::cli
