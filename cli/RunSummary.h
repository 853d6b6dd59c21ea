#pragma once
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace vorant::cli {

enum class RunOutcome { Succeeded, Failed, Cancelled };

// One phase of a run that erases or moves data.
struct PhaseFigures {
    std::string name;  // "erase", "program", "verify", "read"
    double seconds = 0;
    std::uint64_t bytes = 0;  // data programmed or read; 0 for an erase
};

// What one run cost.
struct RunFigures {
    std::string operation;
    RunOutcome outcome = RunOutcome::Succeeded;
    double wallSeconds = 0;
    // Bus time on the simulator (clocks plus waits); nothing on a recording.
    std::optional<std::uint64_t> simulatedNanoseconds;
    // Data bytes moved (pages programmed and read).
    std::uint64_t bytes = 0;
    // The phases that erase or move data, timed like the rate: over the
    // simulated time when there is one, else the elapsed time. When there
    // are some, each phase gets its own rate instead of one over the run.
    std::vector<PhaseFigures> phases;
    std::string recordedFile;  // the SVF file written, if any
    // Replaces the outcome word when the operation's answer is a verdict
    // ("found the flash blank").
    std::string verdict;
};

// The closing line, e.g.
//   "vorant-spi: program succeeded: 21.0 ms elapsed, 9.007 s simulated (erase 5.000 s, program 3.200 s at
//    640.00 KiB/s, verify 807.0 ms at 2.48 MiB/s)"
// A rate counts only the phase that moved the data, so an erase (or an
// identification) does not dilute the program rate. Without phases (a
// played file) one rate covers the run:
//   "vorant-spi: play succeeded: 0.21 s elapsed, 3.52 s simulated, 4096 bytes at 1.14 KiB/s (simulated)"
// Rates are taken over the simulated time when there is one (what a real
// board would see), else over the elapsed time.
std::string runSummaryLine(const RunFigures& figures);
// Prints the line on stderr.
void printRunSummary(const RunFigures& figures);

// "812 B/s", "1.14 KiB/s", "3.50 MiB/s".
std::string rateText(double bytesPerSecond);

}  // namespace vorant::cli
