// The player against the flash simulator, and the proof of file mode:
// record a job, play the file on a fresh simulated flash, compare the flash
// with the image.

#include "ports/sim/FlashModel.h"
#include "ports/svf/SvfError.h"
#include "ports/svf/SvfPlayer.h"
#include "ports/svf/SvfRecorder.h"
#include "tests/svf/SvfTestSupport.h"

#include <gtest/gtest.h>

#include <random>

namespace vorant::svf {
namespace {

using test::filledVector;
using test::ScratchFolder;
using test::wireVector;

sim::FlashConfig testFlash() {
    sim::FlashConfig config;
    config.partName = "TEST25Q";
    config.sizeBytes = 64 * 1024;
    config.pageBytes = 256;
    config.jedecId[0] = 0xEF;
    config.jedecId[1] = 0x40;
    config.jedecId[2] = 0x18;
    return config;
}

std::vector<std::uint8_t> withAddress(std::uint8_t opcode, std::uint32_t address) {
    return {opcode, static_cast<std::uint8_t>(address >> 16), static_cast<std::uint8_t>(address >> 8),
            static_cast<std::uint8_t>(address)};
}

// Drives a scan port as a programming job would: unlock, sector erase,
// page programs with busy checks, then a read-back compare of every page.
class ProgrammingJob {
public:
    explicit ProgrammingJob(ScanPort& port) : port_(port) {}

    void run(const std::vector<std::uint8_t>& image) {
        port_.comment("//Unlock the status register.\n");
        writeEnable();
        RLBitVec writeStatus = wireVector({0x01}), value = wireVector({0x00});
        EXPECT_TRUE(port_.shiftWrite(1, &writeStatus, 0));
        EXPECT_TRUE(port_.shiftWrite(2, &value, 0));
        EXPECT_TRUE(port_.wait(15000, true));  // closes the open status write

        port_.comment("//Erase sector 0.\n");
        writeEnable();
        shiftWhole(wireVector(withAddress(0x20, 0)));
        EXPECT_TRUE(port_.wait(0, true));
        EXPECT_TRUE(port_.wait(1000, true));
        expectIdle();

        for (std::size_t offset = 0; offset < image.size(); offset += 256) {
            const std::size_t length = std::min<std::size_t>(256, image.size() - offset);
            std::vector<std::uint8_t> frame = withAddress(0x02, static_cast<std::uint32_t>(offset));
            for (std::size_t i = 0; i < length; ++i) frame.push_back(image[offset + i]);
            writeEnable();
            shiftWhole(wireVector(frame));
            EXPECT_TRUE(port_.wait(0, true));
            EXPECT_TRUE(port_.wait(1000, true));
            expectIdle();
        }

        for (std::size_t offset = 0; offset < image.size(); offset += 256) {
            const std::size_t length = std::min<std::size_t>(256, image.size() - offset);
            RLBitVec read = wireVector(withAddress(0x03, static_cast<std::uint32_t>(offset)));
            RLBitVec ones = filledVector(32, true), zeros = filledVector(32, false);
            EXPECT_TRUE(port_.shift(1, &read, &ones, &zeros, &zeros));
            RLBitVec expected = wireVector(std::vector<std::uint8_t>(
                image.begin() + static_cast<long>(offset), image.begin() + static_cast<long>(offset + length)));
            RLBitVec dataOnes = filledVector(length * 8, true);
            EXPECT_TRUE(port_.shift(12, &expected, &dataOnes, &expected, &dataOnes));
        }
        RLBitVec writeDisable = wireVector({0x04});
        EXPECT_TRUE(port_.shiftWrite(0, &writeDisable, 0));
    }

private:
    void writeEnable() {
        RLBitVec wren = wireVector({0x06});
        EXPECT_TRUE(port_.shiftWrite(0, &wren, 0));
    }
    void shiftWhole(RLBitVec frame) {
        RLBitVec ones = filledVector(frame.length(), true), zeros = filledVector(frame.length(), false);
        EXPECT_TRUE(port_.shift(0, &frame, &ones, &zeros, &zeros));
    }
    // Status register 1: busy and write-enable latch must both be clear.
    void expectIdle() {
        RLBitVec opcode = wireVector({0x05});
        RLBitVec ones = filledVector(8, true), zeros = filledVector(8, false);
        EXPECT_TRUE(port_.shift(1, &opcode, &ones, &zeros, &zeros));
        RLBitVec capture = filledVector(8, false);
        RLBitVec busyAndLatch = wireVector({0x03});
        EXPECT_TRUE(port_.shift(12, &capture, &ones, &capture, &busyAndLatch));
    }

    ScanPort& port_;
};

TEST(SvfPlayer, RecordedJobProgramsAFreshFlash) {
    std::vector<std::uint8_t> image(3 * 256 + 100);
    std::mt19937 random(11);
    for (auto& byte : image) byte = static_cast<std::uint8_t>(random());

    ScratchFolder folder;
    SvfRecorderOptions options;
    options.toolName = "vorant-spi test";
    options.preamble = {"SIR 6 TDI (02);"};  // a bridge's, ignored by the player
    SvfRecorder recorder(folder / "job.svf", options);
    ProgrammingJob(recorder).run(image);
    recorder.finish();

    sim::FlashModel flash(testFlash());
    // Old contents in the sector: only the recorded erase can clear them.
    std::fill_n(flash.memory().begin(), 4096, std::uint8_t{0x00});
    SvfPlayer player(flash);
    const SvfPlayResult result = player.playFile(folder / "job.svf");

    for (const SvfMismatch& mismatch : result.mismatches) ADD_FAILURE() << mismatch.describe();
    EXPECT_TRUE(result.passed());
    EXPECT_EQ(result.sdrCount, recorder.totals().sdrCount);
    EXPECT_EQ(result.sdrBits, recorder.totals().sdrBits);
    EXPECT_EQ(result.runTestCount, recorder.totals().runTestCount);
    EXPECT_EQ(result.waitNanoseconds, recorder.totals().runTestMicroseconds * 1000);
    // 5 status polls and 4 page compares.
    EXPECT_EQ(result.comparedSdrs, 9u);

    std::vector<std::uint8_t> expected(flash.config().sizeBytes, 0xFF);
    std::copy(image.begin(), image.end(), expected.begin());
    EXPECT_TRUE(flash.memory() == expected);
}

TEST(SvfPlayer, ReportsEveryMismatchWithItsLine) {
    sim::FlashModel flash(testFlash());
    SvfPlayer player(flash);
    // Read ID (9Fh) answering EF 40 18. Line 3 expects EF 40 19; line 5
    // expects a wrong manufacturer byte under a mask that hides it, then a
    // 20-bit read checks the clocking of bits past the last whole byte.
    const SvfPlayResult result = player.playText(
        "// read the ID\n"
        "SDR 32 TDI (000000F9) TDO (1802F700) MASK (FFFFFF00);\n"
        "SDR 32 TDI (000000F9) TDO (9802F700);\n"
        "SDR 32 TDI (000000F9) TDO (1802F600) MASK (FFFFFF00);\n"
        "SDR 32 TDI (000000F9) TDO (1802F600) MASK (FFFF0000);\n"
        "SDR 20 TDI (000F9) TDO (2F700) MASK (FFF00);\n"
        "SDR 20 TDI (000F9) TDO (0F700) MASK (FFF00);\n");
    EXPECT_EQ(result.sdrCount, 6u);
    EXPECT_EQ(result.comparedSdrs, 6u);
    ASSERT_EQ(result.mismatches.size(), 3u);
    EXPECT_EQ(result.mismatches[0].line, 3u);
    EXPECT_EQ(result.mismatches[0].bitCount, 1u);
    EXPECT_EQ(result.mismatches[0].firstBit, 31u);
    EXPECT_EQ(result.mismatches[0].describe(),
              "line 3: 1 bit differs from TDO under MASK, first at bit 31 (scan byte 3: expected 0x19, read 0x18)");
    EXPECT_EQ(result.mismatches[1].line, 4u);
    EXPECT_EQ(result.mismatches[1].firstBit, 8u);
    EXPECT_EQ(result.mismatches[1].expectedByte, 0x6F);
    EXPECT_EQ(result.mismatches[1].capturedByte, 0xEF);
    EXPECT_EQ(result.mismatches[2].line, 7u);
    EXPECT_EQ(result.mismatches[2].firstBit, 17u);
}

TEST(SvfPlayer, ClocksAndRunTestsPassSimulatedTime) {
    struct Case {
        const char* text;
        std::uint32_t spiClockHz;
        std::uint64_t busNanoseconds;
        std::uint64_t waitNanoseconds;
    };
    const Case cases[] = {
        {"SDR 8 TDI (00);", 50'000'000, 160, 0},
        {"SDR 8 TDI (00);", 1'000'000, 8000, 0},
        {"SDR 12 TDI (000);", 50'000'000, 240, 0},
        {"RUNTEST 1.5E-03 SEC;", 50'000'000, 0, 1'500'000},
        {"RUNTEST 1000 TCK;", 50'000'000, 0, 20'000},
        {"FREQUENCY 1E6 HZ; RUNTEST 1000 TCK;", 50'000'000, 0, 1'000'000},
        {"FREQUENCY 1E6 HZ; RUNTEST 10 TCK 1E-3 SEC;", 50'000'000, 0, 1'000'000},
        {"SIR 6 TDI (02); HDR 0; STATE RESET IDLE; TRST OFF; SDR 0;", 50'000'000, 0, 0},
    };
    for (const Case& c : cases) {
        sim::FlashModel flash(testFlash());
        SvfPlayerOptions options;
        options.spiClockHz = c.spiClockHz;
        SvfPlayer player(flash, options);
        const SvfPlayResult result = player.playText(c.text);
        EXPECT_EQ(result.busNanoseconds, c.busNanoseconds) << c.text;
        EXPECT_EQ(result.waitNanoseconds, c.waitNanoseconds) << c.text;
        EXPECT_EQ(flash.now(), c.busNanoseconds + c.waitNanoseconds) << c.text;
    }
}

TEST(SvfPlayer, ARunTestLetsAProgramFinishBeforeTheNextCommand) {
    // WREN, program 00h at address 0, then a status read expecting not busy.
    const std::string program = "SDR 8 TDI (60);\nSDR 40 TDI (0000000040);\n";
    const std::string statusIdle = "SDR 16 TDI (00A0) TDO (0000) MASK (8000);\n";
    for (const bool waits : {false, true}) {
        sim::FlashModel flash(testFlash());
        SvfPlayer player(flash);
        const SvfPlayResult result = player.playText(program + (waits ? "RUNTEST 1.0E-03 SEC;\n" : "") + statusIdle);
        EXPECT_EQ(result.passed(), waits) << (waits ? "waited" : "did not wait");
    }
}

TEST(SvfPlayer, AMalformedFileChangesNothing) {
    ScratchFolder folder;
    test::writeFile(folder / "bad.svf",
                    "SDR 8 TDI (60);\n"
                    "SDR 32 TDI (00000004);\n"  // sector erase at 0
                    "RUNTEST 1E-3 SEC;\n"
                    "SDR 8 TDI (6G);\n");
    sim::FlashModel flash(testFlash());
    flash.memory()[0] = 0x12;
    SvfPlayer player(flash);
    try {
        player.playFile(folder / "bad.svf");
        ADD_FAILURE() << "a malformed file was played";
    } catch (const SvfParseError& error) {
        EXPECT_EQ(error.line(), 4u);
        EXPECT_NE(std::string(error.what()).find("bad.svf"), std::string::npos) << error.what();
    }
    EXPECT_EQ(flash.memory()[0], 0x12);
    EXPECT_EQ(flash.now(), 0u);

    try {
        player.playFile(folder / "missing.svf");
        ADD_FAILURE() << "a missing file was played";
    } catch (const SvfError& error) {
        EXPECT_NE(std::string(error.what()).find("missing.svf"), std::string::npos) << error.what();
    }
}

}  // namespace
}  // namespace vorant::svf
