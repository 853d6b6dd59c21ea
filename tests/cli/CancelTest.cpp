// Cancelling: Ctrl-C reaches the operation through the port's cancel query,
// the run ends at the next page or poll, and the tool says so.
#include "ToolTestFixture.h"
#include "UserPartFiles.h"

#include <csignal>

namespace vorant::cli::test {
namespace {

constexpr const char* kCancelledLine = "vorant-spi: cancelled by the user";

class CtrlC : public ToolTest, public ::testing::WithParamInterface<std::vector<std::string>> {};

TEST_P(CtrlC, DuringBusyPollingCancelsTheRun) {
    writeText(file("slow.toml"), endlessErasePart("TEST_ENDLESS_ERASE"));
    writeFile(file("image.bin"), randomBytes(1000, 30));
    std::vector<std::string> arguments{"--parts", "slow.toml", "--part", "TEST_ENDLESS_ERASE", "--port", "sim:flash.bin"};
    arguments.insert(arguments.end(), GetParam().begin(), GetParam().end());
    RunningTool tool(arguments, scratch.path());
    // The erase polls for half an hour of simulated time; in real time
    // only the signal ends it.
    ASSERT_TRUE(tool.waitForOutput("'0': Erasing Device.", std::chrono::seconds(30)))
        << tool.finish(std::chrono::seconds(5)).transcript();
    tool.sendSignal(SIGINT);
    const ToolResult result = tool.finish(std::chrono::seconds(30));

    EXPECT_EQ(result.signal, 0) << result.transcript();
    EXPECT_EQ(result.exitStatus, 1) << result.transcript();
    ASSERT_FALSE(result.errorLines().empty()) << result.transcript();
    EXPECT_EQ(result.errorLines().back(), kCancelledLine) << result.transcript();
    EXPECT_TRUE(contains(result.err, "vorant-spi: " + GetParam().front() + " cancelled")) << result.transcript();
}

INSTANTIATE_TEST_SUITE_P(Operations, CtrlC,
                         ::testing::Values(std::vector<std::string>{"erase"},
                                           std::vector<std::string>{"program", "image.bin", "-e", "-v"}));

TEST_F(ToolTest, CancelBetweenPagesStopsTheProgram) {
    const Bytes image = randomBytes(64 * 256, 31);
    writeFile(file("image.bin"), image);
    // The port reports a cancel at its sixth query.
    const ToolResult result = run({"--part", kSmallPart, "--port", "sim:flash.bin", "--sim-fault", "cancel-after=5",
                                   "program", "image.bin", "-v"});
    EXPECT_EQ(result.exitStatus, 1) << result.transcript();
    ASSERT_FALSE(result.errorLines().empty());
    EXPECT_EQ(result.errorLines().back(), kCancelledLine) << result.transcript();
    EXPECT_FALSE(contains(result.out, "Verification completed")) << result.transcript();

    // Some pages went in, not all of them.
    const Bytes flash = flashArray("flash.bin");
    ASSERT_EQ(flash.size(), kSmallPartBytes);
    EXPECT_EQ(firstDifference(flash, Bytes(image.begin(), image.begin() + 256)), -1);
    EXPECT_TRUE(allErased(flash, image.size() - 256, image.size()));
}

TEST_F(ToolTest, CancelledReadbackSaysSo) {
    const ToolResult result = run({"--part", kSmallPart, "--sim-fault", "cancel-after=3", "readback", "-f", "out.bin"});
    EXPECT_EQ(result.exitStatus, 1) << result.transcript();
    ASSERT_FALSE(result.errorLines().empty());
    EXPECT_EQ(result.errorLines().back(), kCancelledLine) << result.transcript();
    EXPECT_TRUE(contains(result.out, "out.bin holds only the pages read before the cancel")) << result.transcript();
}

TEST_F(ToolTest, CancelledBlankCheckGivesNoVerdict) {
    // The device ends a cancelled check on its "blank" path; the tool must
    // not pass that on as a verdict.
    const ToolResult result = run({"--part", kSmallPart, "--sim-fault", "cancel-after=2", "blankcheck"});
    EXPECT_EQ(result.exitStatus, 1) << result.transcript();
    EXPECT_EQ(result.errorLines().back(), kCancelledLine) << result.transcript();
}

}  // namespace
}  // namespace vorant::cli::test
