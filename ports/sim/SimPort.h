#pragma once
// The flash simulator as a port of the port table: "sim" for a fresh chip
// every run, "sim:FILE" for one whose memory and status registers live in
// FILE between runs.

#include "ports/Port.h"
#include "ports/PortTable.h"
#include "ports/sim/SimScanPort.h"

#include <memory>
#include <string>

namespace vorant::sim {

// The chip a port plays: context.chipName's configuration and the
// context's faults. Throws PortError (BadRequest) naming what is wrong.
struct SimulatedChip {
    FlashConfig config;
    FaultPlan faults;
};
SimulatedChip simulatedChip(const ports::PortContext& context);

class SimPort final : public ports::Port {
public:
    // Plays context.chipName with the context's faults and clock. Throws
    // PortError (BadRequest) when the chip cannot be simulated, a fault is
    // malformed or the backing file cannot be used; the file is then left
    // as it was.
    SimPort(const std::string& backingFile, const ports::PortContext& context);

    ScanPort& scan() override { return *simulator_; }
    std::optional<std::uint64_t> busNanoseconds() const override;
    void abandon() override;

    SimScanPort& simulator() { return *simulator_; }

private:
    std::unique_ptr<SimScanPort> simulator_;
    std::string createdBackingFile_;
};

// The row of the port table.
const ports::PortInfo& simPortInfo();

}  // namespace vorant::sim
