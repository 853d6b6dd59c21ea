#pragma once
// What a run sees of its scan port, whatever the cable: the ScanPort the
// device drives, and the port's part in starting and ending the run.

#include "host/ScanPort.h"

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace vorant::ports {

// What a kind of port can do; the host decides by these, never by a name.
struct PortCaps {
    // Captures come from a chip: the port can identify a part, answer
    // reads, and its blank check has a verdict. (ScanPort::outputMode() is
    // the opposite.)
    bool readsBack = false;
    // The scans become a file that appears when the run succeeds.
    bool records = false;
    // The chip is a model built from a part entry (--chip picks it).
    bool simulatesChip = false;
    // The bus runs at a clock the host may set (--clock).
    bool hasBusClock = false;
    // Injected faults apply (--sim-fault).
    bool takesSimFaults = false;
};

// What the host hands to a port it opens, beside the port's address.
struct PortContext {
    std::string toolName;
    // The part the run is for; empty while it is still to be identified.
    std::string partName;
    // The part a simulated chip plays.
    std::string chipName;
    std::optional<std::uint32_t> clockHz;
    std::vector<std::string> simFaults;
    // play: go on past the first mismatch and report every one.
    bool allMismatches = false;
};

class Port {
public:
    virtual ~Port();
    virtual ScanPort& scan() = 0;
    // Simulated bus time so far; nothing for a port that runs in wall time.
    virtual std::optional<std::uint64_t> busNanoseconds() const { return std::nullopt; }
    // Completes the run's output: a recording appears under its name.
    // Throws PortError when it could not be completed.
    virtual void commit() {}
    // Gives the run up: the port closes, and files it created for this run
    // or would have published go again, so a refused run leaves no trace.
    virtual void abandon() {}
    // True when the output goes to its target as the run goes (a FIFO, a
    // device, standard output), so a failed run cannot take it back.
    virtual bool writesInPlace() const { return false; }
};

}  // namespace vorant::ports
