// The run summary's closing line: each phase that moves data gets its own
// time and rate, so the erase never dilutes the program rate.
#include "cli/RunSummary.h"

#include <gtest/gtest.h>

namespace vorant::cli {
namespace {

struct SummaryCase { const char* name; RunFigures figures; const char* line; };
class Summary : public ::testing::TestWithParam<SummaryCase> {};

TEST_P(Summary, SaysEachPhaseApart) { EXPECT_EQ(runSummaryLine(GetParam().figures), GetParam().line); }

RunFigures figures(const char* operation, std::optional<std::uint64_t> simulatedNs, std::vector<PhaseFigures> phases,
                   std::uint64_t bytes = 0, std::string recorded = "") {
    RunFigures f;
    f.operation = operation;
    f.wallSeconds = 0.021;
    f.simulatedNanoseconds = simulatedNs;
    f.phases = std::move(phases);
    f.bytes = bytes;
    f.recordedFile = std::move(recorded);
    return f;
}

constexpr std::uint64_t kMiB = 1024 * 1024;

INSTANTIATE_TEST_SUITE_P(Lines, Summary, ::testing::Values(
    SummaryCase{"EraseProgramVerify",
                figures("program", 12'000'000'000, {{"erase", 6.5, 0}, {"program", 4, 4 * kMiB}, {"verify", 0.5, 4 * kMiB}},
                        8 * kMiB),
                "vorant-spi: program succeeded: 21.0 ms elapsed, 12.0 s simulated (erase 6.500 s, program 4.000 s at "
                "1.00 MiB/s, verify 500.0 ms at 8.00 MiB/s)"},
    SummaryCase{"RecordingOnTheWallClock",
                figures("erase", std::nullopt, {{"erase", 0.002, 0}}, 0, "job.svf"),
                "vorant-spi: erase succeeded: 21.0 ms elapsed (erase 2.0 ms), recorded to job.svf"},
    SummaryCase{"DataInNoTimeHaveNoRate",
                figures("program", std::nullopt, {{"program", 0, 256}}, 256),
                "vorant-spi: program succeeded: 21.0 ms elapsed (program 0 us)"},
    // A played file has no phases: one rate over the run.
    SummaryCase{"WithoutPhases", figures("play", 2'000'000'000, {}, 2048),
                "vorant-spi: play succeeded: 21.0 ms elapsed, 2.000 s simulated, 2048 bytes at 1.00 KiB/s (simulated)"}),
    [](const auto& info) { return std::string(info.param.name); });

}  // namespace
}  // namespace vorant::cli
