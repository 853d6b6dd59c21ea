#include "cli/SvfPlayback.h"

#include "cli/RunSummary.h"
#include "cli/Tool.h"
#include "cli/ToolFailure.h"
#include "cli/ToolMessages.h"
#include "cli/UsageError.h"
#include "host/ConstraintsManager.h"
#include "host/VorantException.h"
#include "ports/PortTable.h"
#include "ports/PortError.h"
#include "ports/sim/FlashFileAdvice.h"
#include "ports/sim/FlashModel.h"
#include "ports/svf/SvfError.h"
#include "ports/svf/SvfFileCheck.h"
#include "ports/svf/SvfParser.h"
#include "ports/svf/SvfPlayer.h"

#include <chrono>
#include <cstdint>
#include <filesystem>
#include <fstream>
#include <system_error>

namespace vorant::cli {
namespace {

// "1 scan", "2 scans": the plural for every count but one.
std::string counted(std::uint64_t count, const char* one, const char* many) {
    return std::to_string(count) + " " + (count == 1 ? one : many);
}

}  // namespace

std::string simulatedChipName(const ToolOptions& options) {
    if (options.chip) return *options.chip;
    if (!options.autoPart()) return options.part;
    return kDefaultSimulatedChip;
}

int playRecording(const ToolOptions& options, const std::string& svfFile) {
    const ports::PortInfo* port = ports::findPort(options.port.kind);
    if (port == nullptr || port->playSvf == nullptr) {
        std::string players;
        for (const ports::PortInfo& row : ports::portTable())
            if (row.playSvf != nullptr) players += (players.empty() ? "--port " : " or --port ") + row.name;
        throw UsageError("'play' plays a file on simulated hardware, which --port " + options.port.kind +
                         " has none of; use " + players);
    }
    std::error_code error;
    if (!std::filesystem::is_regular_file(svfFile, error))
        throw UsageError(svfFile + ": no such SVF file; give the file a recording run wrote");

    const std::string chip = simulatedChipName(options);
    if (!ConstraintsManager::instance().hasPart(chip))
        throw UsageError("unknown part '" + chip + "'; 'vorant-spi parts' lists the known parts");

    // The whole file is checked before the flash exists, so a malformed
    // file, or one that holds nothing to play, leaves no trace.
    svf::SvfContents contents;
    try {
        contents = svf::checkSvfFile(svfFile);
    } catch (const svf::SvfParseError& problem) {
        throw UsageError(svfFile + ": " + problem.what() + "; the file is not valid SVF and nothing was played");
    } catch (const svf::SvfError& problem) {
        throw UsageError(std::string(problem.what()) + "; give a readable SVF file");
    }
    if (contents.scans == 0)
        throw ToolFailure(svfFile + ": no scan to play (the file holds no SDR or SIR that shifts a bit); "
                                    "nothing was played");

    ports::PortContext context;
    context.chipName = chip;
    context.clockHz = options.clockHz;
    context.simFaults = options.simFaults;
    context.allMismatches = options.allMismatches;
    const std::string& backingFile = options.port.path;
    const bool backingFileExisted = !backingFile.empty() && std::filesystem::exists(backingFile, error);
    const auto started = std::chrono::steady_clock::now();
    svf::SvfPlayResult result;
    try {
        result = port->playSvf(options.port, context, svfFile);
    } catch (const ports::PortError& problem) {
        throw UsageError(problem.what());
    } catch (const VorantException& problem) {
        throw UsageError(std::string(problem.what()) + "; " + sim::flashFileAdvice(problem));
    } catch (const svf::SvfError& problem) {
        // Nothing was played: a backing file made for this run goes again.
        if (!backingFile.empty() && !backingFileExisted) std::filesystem::remove(backingFile, error);
        if (dynamic_cast<const svf::SvfParseError*>(&problem) != nullptr)
            throw UsageError(svfFile + ": " + problem.what() + "; the file is not valid SVF and nothing was played");
        throw UsageError(std::string(problem.what()) + "; give a readable SVF file");
    }

    constexpr std::size_t kMismatchesShown = 20;
    const std::size_t mismatches = result.mismatches.size();
    for (std::size_t i = 0; i < mismatches && i < kMismatchesShown; ++i)
        toolError(svfFile + ": " + result.mismatches[i].describe());
    if (mismatches > kMismatchesShown)
        toolError("... and " + counted(mismatches - kMismatchesShown, "more mismatch", "more mismatches"));
    if (result.stoppedEarly)
        toolError(svfFile + ": stopped at the first mismatch; nothing after line " +
                  std::to_string(result.mismatches.front().line) +
                  " was played (--all-mismatches plays on and reports every mismatch)");
    const std::string verdict = result.passed() ? "no mismatches" : counted(mismatches, "mismatch", "mismatches");
    toolInfo("Played " + svfFile + " on a simulated " + chip + ": " + counted(result.sdrCount, "scan", "scans") +
             ", " + std::to_string(result.comparedSdrs) + " compared, " + verdict + ".");

    RunFigures figures;
    figures.operation = "play";
    figures.outcome = result.passed() ? RunOutcome::Succeeded : RunOutcome::Failed;
    figures.wallSeconds = std::chrono::duration<double>(std::chrono::steady_clock::now() - started).count();
    figures.simulatedNanoseconds = result.busNanoseconds + result.waitNanoseconds;
    figures.bytes = result.sdrBits / 8;
    if (!options.quiet) printRunSummary(figures);
    return result.passed() ? kExitSuccess : kExitFailure;
}

}  // namespace vorant::cli
