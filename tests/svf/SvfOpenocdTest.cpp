// A recorded file must play in a standard SVF player. OpenOCD with its dummy
// adapter parses and runs every statement; TDO compares fail there (nothing
// answers) and are ignored, a statement it cannot parse fails the run.
// Skipped where openocd is not installed.

#include "ports/svf/SvfRecorder.h"
#include "tests/svf/SvfTestSupport.h"

#include <gtest/gtest.h>

#include <cstdlib>

namespace vorant::svf {
namespace {

using test::filledVector;
using test::ScratchFolder;
using test::wireVector;

std::string quote(const std::filesystem::path& path) { return "\"" + path.generic_string() + "\""; }

int runCommand(const std::string& command, const std::filesystem::path& log) {
    return std::system((command + " > " + quote(log) + " 2>&1").c_str());
}

bool openocdInstalled(const ScratchFolder& folder) {
    return std::system(nullptr) != 0 && runCommand("openocd --version", folder / "version.log") == 0;
}

int playInOpenocd(const std::filesystem::path& svf, const std::filesystem::path& log) {
    return runCommand("openocd -c \"adapter driver dummy\" -c \"transport select jtag\""
                      " -c \"jtag newtap chip tap -irlen 6\" -c init"
                      " -c \"svf quiet ignore_error " + svf.generic_string() + "\" -c shutdown",
                      log);
}

TEST(SvfOpenocd, PlaysARecordedFile) {
    ScratchFolder folder;
    if (!openocdInstalled(folder)) GTEST_SKIP() << "openocd is not installed";

    SvfRecorderOptions options;
    options.toolName = "vorant-spi test";
    options.partName = "TEST25Q";
    options.preamble = {"SIR 6 TDI (02);"};
    {
        SvfRecorder recorder(folder / "job.svf", options);
        recorder.comment("//Loading device with 'write enable' instruction.\n");
        RLBitVec wren = wireVector({0x06});
        recorder.shiftWrite(0, &wren, 0);
        // Unlock: left open, closed by its wait.
        RLBitVec writeStatus = wireVector({0x01}), zero = wireVector({0x00});
        recorder.shiftWrite(1, &writeStatus, 0);
        recorder.shiftWrite(2, &zero, 0);
        recorder.wait(10, true);
        // A whole page program, then a compared status read and page read.
        std::vector<std::uint8_t> frame = {0x02, 0x00, 0x01, 0x00};
        for (int value = 0; value < 256; ++value) frame.push_back(static_cast<std::uint8_t>(value * 7));
        RLBitVec page = wireVector(frame);
        RLBitVec ones = filledVector(page.length(), true), zeros = filledVector(page.length(), false);
        recorder.shift(0, &page, &ones, &zeros, &zeros);
        recorder.wait(0, true);
        recorder.wait(700, true);
        RLBitVec readStatus = wireVector({0x05}), status = filledVector(8, false), all8 = filledVector(8, true);
        recorder.shift(1, &readStatus, &all8, &status, &status);
        recorder.shift(12, &status, &all8, &status, &all8);
        RLBitVec read = wireVector({0x03, 0x00, 0x01, 0x00}), data = filledVector(2048, true);
        RLBitVec all32 = filledVector(32, true), none32 = filledVector(32, false);
        recorder.shift(1, &read, &all32, &none32, &none32);
        recorder.shift(12, &data, &data, &data, &data);
        recorder.finish();
    }
    EXPECT_EQ(playInOpenocd(folder / "job.svf", folder / "job.log"), 0) << test::readFile(folder / "job.log");

    // The same command must fail on a file it cannot parse, or the check
    // above proves nothing.
    test::writeFile(folder / "broken.svf", test::readFile(folder / "job.svf") + "SDR 8 TDI (6G);\n");
    EXPECT_NE(playInOpenocd(folder / "broken.svf", folder / "broken.log"), 0) << test::readFile(folder / "broken.log");
}

}  // namespace
}  // namespace vorant::svf
