#include "cli/RunSummary.h"

#include <cstdio>

namespace vorant::cli {

namespace {

std::string fixed(double value, int decimals) {
    char text[64];
    std::snprintf(text, sizeof text, "%.*f", decimals, value);
    return text;
}

std::string secondsText(double seconds) {
    if (seconds < 1e-3) return fixed(seconds * 1e6, 0) + " us";
    if (seconds < 1.0) return fixed(seconds * 1e3, 1) + " ms";
    return fixed(seconds, seconds < 10 ? 3 : 1) + " s";
}

const char* outcomeWord(RunOutcome outcome) {
    switch (outcome) {
    case RunOutcome::Succeeded: return "succeeded";
    case RunOutcome::Failed: return "failed";
    case RunOutcome::Cancelled: return "cancelled";
    }
    return "";
}

}  // namespace

std::string rateText(double bytesPerSecond) {
    if (bytesPerSecond >= 1024.0 * 1024.0) return fixed(bytesPerSecond / (1024.0 * 1024.0), 2) + " MiB/s";
    if (bytesPerSecond >= 1024.0) return fixed(bytesPerSecond / 1024.0, 2) + " KiB/s";
    return fixed(bytesPerSecond, 0) + " B/s";
}

std::string runSummaryLine(const RunFigures& figures) {
    const std::string outcome = figures.verdict.empty() ? outcomeWord(figures.outcome) : figures.verdict;
    std::string line = "vorant-spi: " + figures.operation + " " + outcome + ": " +
                       secondsText(figures.wallSeconds) + " elapsed";
    double rateSeconds = figures.wallSeconds;
    const char* rateBasis = "elapsed";
    if (figures.simulatedNanoseconds) {
        const double simulated = static_cast<double>(*figures.simulatedNanoseconds) / 1e9;
        line += ", " + secondsText(simulated) + " simulated";
        rateSeconds = simulated;
        rateBasis = "simulated";
    }
    if (!figures.phases.empty()) {
        std::string breakdown;
        for (const PhaseFigures& phase : figures.phases) {
            breakdown += (breakdown.empty() ? "" : ", ") + phase.name + " " + secondsText(phase.seconds);
            if (phase.bytes > 0 && phase.seconds > 0)
                breakdown += " at " + rateText(static_cast<double>(phase.bytes) / phase.seconds);
        }
        line += " (" + breakdown + ")";
    } else if (figures.bytes > 0) {
        line += ", " + std::to_string(figures.bytes) + " bytes";
        if (rateSeconds > 0)
            line += " at " + rateText(static_cast<double>(figures.bytes) / rateSeconds) + " (" + rateBasis + ")";
    }
    if (!figures.recordedFile.empty()) line += ", recorded to " + figures.recordedFile;
    return line;
}

void printRunSummary(const RunFigures& figures) {
    std::fflush(stdout);
    std::fprintf(stderr, "%s\n", runSummaryLine(figures).c_str());
    std::fflush(stderr);
}

}  // namespace vorant::cli
