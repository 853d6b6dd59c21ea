// What the tool shows: the progress line, the closing summary, and why an
// identification did not pick a part.
#include "cli/PartIdentification.h"
#include "cli/ProgressDisplay.h"
#include "cli/RunSummary.h"

#include <gtest/gtest.h>

namespace vorant::cli {
namespace {

struct BarCase {
    long long done, total;
    const char* expected;
};

class ProgressLine : public ::testing::TestWithParam<BarCase> {};

TEST_P(ProgressLine, ShowsTheShareDone) {
    EXPECT_EQ(ProgressDisplay::render("program", GetParam().done, GetParam().total, 0), GetParam().expected);
}

INSTANTIATE_TEST_SUITE_P(
    States, ProgressLine,
    ::testing::Values(BarCase{0, 200, "[........................................]   0% program"},
                      BarCase{1, 200, "[........................................]   0% program"},
                      BarCase{101, 200, "[####################....................]  50% program"},
                      BarCase{200, 200, "[########################################] 100% program"},
                      // Never past the end, never before the start.
                      BarCase{999, 200, "[########################################] 100% program"},
                      BarCase{-5, 200, "[........................................]   0% program"}));

TEST(ProgressLine, WithoutATotalSpins) {
    EXPECT_EQ(ProgressDisplay::render("checksum", 12, 0, 0), "| checksum: 12 steps");
    EXPECT_EQ(ProgressDisplay::render("checksum", 13, 0, 1), "/ checksum: 13 steps");
}

TEST(RunSummaryLine, RateIsOverTheSimulatedTimeWhenThereIsOne) {
    RunFigures figures;
    figures.operation = "program";
    figures.wallSeconds = 0.25;
    figures.simulatedNanoseconds = 2'000'000'000;
    figures.bytes = 4096;
    EXPECT_EQ(runSummaryLine(figures),
              "vorant-spi: program succeeded: 250.0 ms elapsed, 2.000 s simulated, 4096 bytes at 2.00 KiB/s (simulated)");
}

TEST(RunSummaryLine, NamesTheVerdictInsteadOfTheOutcome) {
    RunFigures figures;
    figures.operation = "blankcheck";
    figures.wallSeconds = 12.5;
    figures.verdict = "found the flash not blank";
    figures.recordedFile = "job.svf";
    EXPECT_EQ(runSummaryLine(figures),
              "vorant-spi: blankcheck found the flash not blank: 12.5 s elapsed, recorded to job.svf");
}

struct IdCase {
    const char* id;
    std::vector<std::string> matches;
    const char* messagePart;  // "" when the ID identifies a part
};

class IdentificationVerdict : public ::testing::TestWithParam<IdCase> {};

TEST_P(IdentificationVerdict, ListsWhatMatchedAndAsksForThePart) {
    const std::string problem = identificationProblem(GetParam().id, GetParam().matches);
    if (*GetParam().messagePart == '\0') {
        EXPECT_EQ(problem, "");
        return;
    }
    EXPECT_NE(problem.find(GetParam().messagePart), std::string::npos) << problem;
    EXPECT_NE(problem.find("--part NAME"), std::string::npos) << problem;
}

INSTANTIATE_TEST_SUITE_P(
    Ids, IdentificationVerdict,
    ::testing::Values(IdCase{"EF4015", {"W25Q16JV"}, ""},
                      IdCase{"20BA18", {"MT25QL128ABA", "N25Q128A"}, "several parts (MT25QL128ABA, N25Q128A)"},
                      IdCase{"ABCDEF", {}, "no part in the database has the JEDEC ID ABCDEF"},
                      // Nothing answers: MISO idles high, or is held low.
                      IdCase{"FFFFFF", {}, "no chip answered"}, IdCase{"ffffff", {}, "no chip answered"},
                      IdCase{"000000", {}, "no chip answered"}));

}  // namespace
}  // namespace vorant::cli
