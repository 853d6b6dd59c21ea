// The progress line fits the terminal it is drawn on: at most columns - 1
// characters, the bar shrinking first, then the label going, and the
// percentage always there.
#include "cli/ProgressDisplay.h"

#include <gtest/gtest.h>

namespace vorant::cli {
namespace {

struct LineCase { int columns; long long done, total; const char* line; };
class ProgressLine : public ::testing::TestWithParam<LineCase> {};

TEST_P(ProgressLine, FitsTheWidth) {
    const LineCase& c = GetParam();
    const std::string line = ProgressDisplay::render("program", c.done, c.total, 1, c.columns);
    EXPECT_EQ(line, c.line) << c.columns << " columns";
    if (c.columns > 4) {
        EXPECT_LE(line.size(), static_cast<std::size_t>(c.columns - 1)) << c.columns << " columns";
    }
}

INSTANTIATE_TEST_SUITE_P(Widths, ProgressLine, ::testing::Values(
    LineCase{80, 1, 2, "[####################....................]  50% program"},
    LineCase{80, 2, 2, "[########################################] 100% program"},
    LineCase{80, 5, 2, "[########################################] 100% program"},  // never past the end
    LineCase{26, 3, 4, "[#######...]  75% program"},  // the shortest bar that keeps the label
    LineCase{25, 3, 4, "[############.....]  75%"},   // one column less: the label goes first
    LineCase{18, 1, 2, "[#####.....]  50%"},
    LineCase{17, 1, 2, " 50% program"},
    LineCase{12, 1, 2, "50%"},
    LineCase{3, 1, 1, "100%"},  // wider than the terminal, but never nothing
    // Without a total: a spinner, cut to the width.
    LineCase{80, 7, 0, "/ program: 7 steps"},
    LineCase{10, 7, 0, "/ program"}));

}  // namespace
}  // namespace vorant::cli
