// Playing a recording on the simulator: the verdict line counts scans and
// mismatches as a person would say them, and the exit status follows it.
#include "ToolTestFixture.h"

namespace vorant::cli::test {
namespace {

// Reads the JEDEC ID and expects EF 40 18 (the default simulated chip).
const std::string kIdRead = "SDR 32 TDI (000000F9) TDO (1802F700) MASK (FFFFFF00);\n";

TEST_F(ToolTest, PlayCountsScansAndMismatches) {
    const struct { const char* chip; int reads; int status; const char* verdict; } cases[] = {
        {"W25Q128JV", 2, 0, ": 2 scans, 2 compared, no mismatches."},
        {"W25Q16JV", 2, 1, ": 2 scans, 2 compared, 2 mismatches."},  // it answers EF 40 15
    };
    for (const auto& c : cases) {
        std::string svf;
        for (int i = 0; i < c.reads; ++i) svf += kIdRead;
        write("id.svf", svf);
        const Result result = run({"--chip", c.chip, "--all-mismatches", "play", "id.svf"});
        EXPECT_EQ(result.status, c.status) << result.text();
        EXPECT_TRUE(has(result.out, "Played id.svf on a simulated " + std::string(c.chip) + c.verdict)) << result.text();
        // Each mismatch on a line of its own, then the run's summary.
        EXPECT_EQ(result.errLines().size(), (c.status == 0 ? 0u : static_cast<std::size_t>(c.reads)) + 1) << result.text();
    }
    // By default the first mismatch ends the play, and says so.
    const Result first = run({"--chip", "W25Q16JV", "play", "id.svf"});
    EXPECT_EQ(first.status, 1);
    EXPECT_TRUE(has(first.out, ": 1 scan, 1 compared, 1 mismatch.")) << first.text();
    EXPECT_TRUE(has(first.err, "stopped at the first mismatch; nothing after line")) << first.text();
}

}  // namespace
}  // namespace vorant::cli::test
