#pragma once
#include "cli/CommandLine.h"
#include "cli/PhaseTimer.h"
#include "host/ScanPort.h"
#include "ports/sim/SimScanPort.h"
#include "ports/svf/SvfRecorder.h"

#include <cstdint>
#include <memory>
#include <optional>
#include <string>

namespace vorant::cli {

// The scan port of one run: the flash simulator or the SVF recorder.
class PortSession {
public:
    // The simulator playing `chipName`, with the options' backing file,
    // clock and faults. Throws UsageError when the chip cannot be simulated
    // or the backing file cannot be used (the file is then left as it was).
    static std::unique_ptr<PortSession> openSimulator(const ToolOptions& options, const std::string& chipName);
    // The SVF recorder writing the options' port file for `partName`.
    // Throws UsageError when the file cannot be written; nothing is created.
    static std::unique_ptr<PortSession> openRecorder(const ToolOptions& options, const std::string& partName);

    ScanPort& port();
    sim::SimScanPort* simulator() { return simulator_.get(); }
    svf::SvfRecorder* recorder() { return recorder_.get(); }

    // Simulated bus time so far; nothing for a recording.
    std::optional<std::uint64_t> simulatedNanoseconds() const;
    // The clock a run's phases are timed by, as its rate is: the simulated
    // bus time, or the wall clock for a recording.
    PhaseTimer::Clock phaseClock() const;

    // Completes a recording: the file appears under its name. Throws
    // svf::SvfError when it could not be written; for the simulator there
    // is nothing to do.
    void commit();
    // Gives the run up before any operation ran: closes the port and
    // removes a backing file this session created, so a refused run leaves
    // no trace. A recording is dropped without a file.
    void abandon();

private:
    PortSession() = default;

    std::unique_ptr<sim::SimScanPort> simulator_;
    std::unique_ptr<svf::SvfRecorder> recorder_;
    std::string createdBackingFile_;
};

}  // namespace vorant::cli
