#include "cli/Tool.h"

#include "cli/CommandLine.h"
#include "cli/DeviceRun.h"
#include "cli/PartDatabaseSetup.h"
#include "cli/PartListing.h"
#include "cli/ProgressAwareSink.h"
#include "cli/SvfPlayback.h"
#include "cli/ToolFailure.h"
#include "cli/UsageError.h"
#include "host/MessageSinks.h"
#include "host/OutputTarget.h"
#include "ports/PortError.h"
#include "ports/PortTable.h"

#include <csignal>
#include <cstdio>
#include <exception>

namespace vorant::cli {

namespace {

void printToolError(const std::string& message) {
    std::fflush(stdout);
    std::fprintf(stderr, "vorant-spi: %s\n", message.c_str());
    std::fflush(stderr);
}

int listParts(const OperationRequest& request) {
    PartFilter filter;
    if (!request.operands.empty()) filter.pattern = request.operands.front();
    std::string asked = "'" + filter.pattern + "'";
    const auto& tokens = request.switchTokens;
    for (std::size_t i = 0; i + 1 < tokens.size(); i += 2) {
        const std::string& value = tokens[i + 1];
        asked += " " + tokens[i] + " " + value;
        if (tokens[i] == "--vendor") filter.vendor = value;
        if (tokens[i] == "--id") filter.jedecId = value;
        if (tokens[i] == "--size" && !(filter.sizeBytes = parseSizeText(value)))
            throw UsageError("--size " + value + " is not a size; give bytes or a unit, such as 16MiB or 128Mbit");
    }
    const std::vector<PartSummary> parts = matchingParts(filter);
    if (parts.empty()) {
        printToolError("no part matches " + asked + "; 'vorant-spi parts' lists them all");
        return kExitFailure;
    }
    // The listing is the answer, so --quiet does not hide it.
    std::fputs(partTable(parts).c_str(), stdout);
    return kExitSuccess;
}

// Every cable the port table's rows find, one line each. A kind that
// cannot look (no permission to list USB devices) says so and the others
// still report.
int listPorts() {
    std::string lines;
    for (const ports::PortInfo& row : ports::portTable()) {
        if (row.discover == nullptr) continue;
        try {
            for (const ports::FoundCable& cable : row.discover())
                lines += "  " + cable.address + std::string(cable.address.size() < 28 ? 28 - cable.address.size() : 1, ' ') +
                         cable.description + "\n";
        } catch (const ports::PortError& error) {
            printToolError(error.what());
        }
    }
    std::fputs(lines.empty() ? "nothing found\n" : lines.c_str(), stdout);
    return kExitSuccess;
}

int runOperation(const CommandLine& command, ProgressAwareSink& sink) {
    loadPartDatabase(command.options.partFiles);
    switch (command.request.info->operation) {
    case Operation::Parts: return listParts(command.request);
    case Operation::Ports: return listPorts();
    case Operation::Play: return playRecording(command.options, command.request.fileOperand());
    default: return runDeviceOperation(command.options, command.request, sink);
    }
}

// Runs a step of the tool; a usage error becomes its one line and exit
// status 2, a failure or anything unexpected a line and status 1.
template <class Step>
int guarded(Step&& step) {
    try {
        return step();
    } catch (const UsageError& error) {
        printToolError(error.what());
        return kExitUsage;
    } catch (const ToolFailure& failure) {
        printToolError(failure.what());
        return kExitFailure;
    } catch (const std::exception& error) {
        printToolError(std::string("unexpected failure: ") + error.what());
        return kExitFailure;
    }
}

// Whether the run's data go to standard output ("-f -", "--port svf:-",
// or a name for the file standard output already is).
bool dataOnStandardOutput(const CommandLine& command) {
    const OperationInfo* info = command.request.info;
    if (info != nullptr && info->operation == Operation::Readback &&
        isStandardOutputTarget(command.request.fileOperand()))
        return true;
    const ports::PortInfo* port = ports::findPort(command.options.port.kind);
    return port != nullptr && port->caps.records && isStandardOutputTarget(command.options.port.path);
}

// A reader that goes away (`vorant-spi program ... | head -1`) must not end
// the run between erase and program: writes to it then just fail, the job
// goes on, and the exit status tells how it went.
void ignoreBrokenPipes() {
#ifndef _WIN32
    std::signal(SIGPIPE, SIG_IGN);
#endif
}

}  // namespace

int runTool(int argc, char** argv) {
    ignoreBrokenPipes();
    CommandLine command;
    const int parsed = guarded([&] {
        command = parseCommandLine(std::vector<std::string>(argv + (argc > 0 ? 1 : 0), argv + argc));
        return kExitSuccess;
    });
    if (parsed != kExitSuccess) return parsed;
    switch (command.action) {
    case CommandLine::Action::ShowHelp: std::fputs(command.helpText.c_str(), stdout); return kExitSuccess;
    case CommandLine::Action::ShowVersion: std::printf("%s\n", versionText().c_str()); return kExitSuccess;
    case CommandLine::Action::Run: break;
    }

    // Status lines must not mix with data on standard output: they go to
    // stderr for such a run.
    std::FILE* statusStream = dataOnStandardOutput(command) ? stderr : stdout;
    ProgressAwareSink sink(statusStream, stderr, command.options.debug, command.options.quiet);
    vorant::ScopedSink installed(&sink);
    return guarded([&] {
        const int status = runOperation(command, sink);
        std::fflush(stdout);
        return status;
    });
}

}  // namespace vorant::cli
