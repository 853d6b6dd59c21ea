#pragma once
#include <cstdint>
#include <optional>
#include <string>

namespace vorant::cli {

enum class RunOutcome { Succeeded, Failed, Cancelled };

// What one run cost.
struct RunFigures {
    std::string operation;
    RunOutcome outcome = RunOutcome::Succeeded;
    double wallSeconds = 0;
    // Bus time on the simulator (clocks plus waits); nothing on a recording.
    std::optional<std::uint64_t> simulatedNanoseconds;
    // Data bytes moved (pages programmed and read).
    std::uint64_t bytes = 0;
    std::string recordedFile;  // the SVF file written, if any
    // Replaces the outcome word when the operation's answer is a verdict
    // ("found the flash blank").
    std::string verdict;
};

// The closing line, e.g.
//   "vorant-spi: program succeeded: 0.21 s elapsed, 3.52 s simulated, 4096 bytes at 1.14 KiB/s (simulated)"
// The rate is taken over the simulated time when there is one (what a real
// board would see), else over the elapsed time.
std::string runSummaryLine(const RunFigures& figures);
// Prints the line on stderr.
void printRunSummary(const RunFigures& figures);

// "812 B/s", "1.14 KiB/s", "3.50 MiB/s".
std::string rateText(double bytesPerSecond);

}  // namespace vorant::cli
