#include "cli/PortSession.h"

#include "cli/FlashFileAdvice.h"
#include "cli/SimFaultOption.h"
#include "cli/UsageError.h"
#include "host/VorantException.h"
#include "ports/svf/SvfError.h"

#include <chrono>
#include <filesystem>
#include <system_error>

namespace vorant::cli {

std::unique_ptr<PortSession> PortSession::openSimulator(const ToolOptions& options, const std::string& chipName) {
    sim::FlashConfig config;
    try {
        config = sim::FlashConfig::fromPartDatabase(chipName);
    } catch (const VorantException& error) {
        throw UsageError(std::string(error.what()) + "; choose another chip with --chip NAME");
    }

    const std::string& file = options.port.file;
    std::error_code error;
    const bool fileExisted = !file.empty() && std::filesystem::exists(file, error);

    std::unique_ptr<PortSession> session(new PortSession);
    try {
        session->simulator_ =
            std::make_unique<sim::SimScanPort>(config, simFaultPlan(options.simFaults), file);
    } catch (const VorantException& problem) {
        throw UsageError(std::string(problem.what()) + "; " + flashFileAdvice(problem));
    }
    if (!file.empty() && !fileExisted) session->createdBackingFile_ = file;
    if (options.clockHz) session->simulator_->setClockHz(*options.clockHz);
    return session;
}

std::unique_ptr<PortSession> PortSession::openRecorder(const ToolOptions& options, const std::string& partName) {
    svf::SvfRecorderOptions recorderOptions;
    recorderOptions.toolName = "vorant-spi";
    recorderOptions.partName = partName;
    std::unique_ptr<PortSession> session(new PortSession);
    try {
        session->recorder_ = std::make_unique<svf::SvfRecorder>(options.port.file, recorderOptions);
    } catch (const svf::SvfError& error) {
        throw UsageError(std::string(error.what()) + "; record into a folder that exists and can be written");
    }
    return session;
}

ScanPort& PortSession::port() {
    if (simulator_) return *simulator_;
    return *recorder_;
}

std::optional<std::uint64_t> PortSession::simulatedNanoseconds() const {
    if (!simulator_) return std::nullopt;
    return simulator_->stats().simulatedNs;
}

PhaseTimer::Clock PortSession::phaseClock() const {
    if (simulator_) {
        const sim::SimScanPort* simulator = simulator_.get();
        return [simulator] { return static_cast<double>(simulator->stats().simulatedNs) / 1e9; };
    }
    return [] { return std::chrono::duration<double>(std::chrono::steady_clock::now().time_since_epoch()).count(); };
}

void PortSession::commit() {
    if (recorder_ && !recorder_->finished()) recorder_->finish();
}

void PortSession::abandon() {
    // The port goes first: it holds the backing file open.
    simulator_.reset();
    recorder_.reset();
    if (!createdBackingFile_.empty()) {
        std::error_code ignored;
        std::filesystem::remove(createdBackingFile_, ignored);
        createdBackingFile_.clear();
    }
}

}  // namespace vorant::cli
