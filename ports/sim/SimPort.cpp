#include "ports/sim/SimPort.h"

#include "host/VorantException.h"
#include "ports/PortError.h"
#include "ports/sim/FaultOption.h"
#include "ports/sim/FlashFileAdvice.h"

#include <filesystem>
#include <system_error>

namespace vorant::sim {

namespace {

[[noreturn]] void refuse(const std::string& message) {
    throw ports::PortError(ports::PortError::Kind::BadRequest, message);
}

}  // namespace

SimulatedChip simulatedChip(const ports::PortContext& context) {
    SimulatedChip chip;
    try {
        chip.faults = faultPlan(context.simFaults);
        chip.config = FlashConfig::fromPartDatabase(context.chipName);
    } catch (const FaultOptionError& error) {
        refuse(error.what());
    } catch (const VorantException& error) {
        refuse(std::string(error.what()) + "; choose another chip with --chip NAME");
    }
    return chip;
}

SimPort::SimPort(const std::string& backingFile, const ports::PortContext& context) {
    const auto [config, faults] = simulatedChip(context);
    std::error_code error;
    const bool fileExisted = !backingFile.empty() && std::filesystem::exists(backingFile, error);
    try {
        simulator_ = std::make_unique<SimScanPort>(config, faults, backingFile);
    } catch (const VorantException& problem) {
        refuse(std::string(problem.what()) + "; " + flashFileAdvice(problem));
    }
    if (!backingFile.empty() && !fileExisted) createdBackingFile_ = backingFile;
    if (context.clockHz) simulator_->setClockHz(*context.clockHz);
}

std::optional<std::uint64_t> SimPort::busNanoseconds() const {
    if (!simulator_) return std::nullopt;
    return simulator_->stats().simulatedNs;
}

void SimPort::abandon() {
    // The port goes first: it holds the backing file open.
    simulator_.reset();
    if (!createdBackingFile_.empty()) {
        std::error_code ignored;
        std::filesystem::remove(createdBackingFile_, ignored);
        createdBackingFile_.clear();
    }
}

const ports::PortInfo& simPortInfo() {
    static const ports::PortInfo row = [] {
        ports::PortInfo info;
        info.name = "sim";
        info.synopsis = {
            {"sim", "a simulated chip, erased at every start (the default)"},
            {"sim:FILE", "a simulated chip whose memory and status registers live in FILE"},
        };
        info.path = ports::PathUse::Optional;
        info.pathName = "FILE";
        info.caps = {.readsBack = true, .records = false, .simulatesChip = true, .hasBusClock = true,
                     .takesSimFaults = true};
        info.open = [](const ports::PortAddress& address, const ports::PortContext& context) -> std::unique_ptr<ports::Port> {
            return std::make_unique<SimPort>(address.path, context);
        };
        return info;
    }();
    return row;
}

}  // namespace vorant::sim
