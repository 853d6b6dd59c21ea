// Recordings for a bridge: the chain and the bridge's instruction after the
// set-up, each transaction as the bridge's DR scan with TDO and MASK moved
// to where MISO comes back, and waits stated in TCK cycles and seconds,
// split below 2^31 cycles.

#include "ports/jtag/Bridge.h"
#include "ports/svf/SvfRecorder.h"
#include "tests/support/ScratchFolder.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <sstream>

namespace vorant::svf {
namespace {

namespace fs = std::filesystem;


// A vector of wire bytes given in hex, first byte first, each MSB first.
RLBitVec wire(const std::string& hex) {
    RLBitVec v(hex.size() * 4, false);
    for (std::size_t i = 0; i < hex.size() * 4; ++i)
        v.setBit(i, (std::stoi(hex.substr(i / 4, 1), nullptr, 16) >> (3 - i % 4)) & 1);
    return v;
}

SvfRecorderOptions forBridge(const std::string& name, const std::string& chain = "[6]") {
    SvfRecorderOptions options;
    options.bridgeSettings.name = name;
    unsigned irLength = 0;
    options.bridgeSettings.chain = ports::jtag::parseJtagChain(chain, irLength);
    options.bridgeSettings.irLength = irLength;
    options.bridge = ports::jtag::makeBridge(options.bridgeSettings);
    options.tckHz = 10'000'000;
    return options;
}

// The statements after the header comments, from a status read (compare
// the busy bit) and `waitUs` of waiting.
std::string recordStatusRead(const SvfRecorderOptions& options, int waitUs = 0) {
    vorant::test::ScratchFolder folder;
    const fs::path file = folder / "out.svf";
    {
        SvfRecorder recorder(file, options);
        RLBitVec opcode = wire("05"), tdi = wire("00"), tdo = wire("00"), mask = wire("01");
        EXPECT_TRUE(recorder.shiftWrite(ScanStage::kOpen, &opcode, 0));
        EXPECT_TRUE(recorder.shift(ScanStage::kCaptureClose, &tdi, nullptr, &tdo, &mask));
        if (waitUs > 0) {
            EXPECT_TRUE(recorder.wait(waitUs, true));
        }
        recorder.finish();
    }
    std::ifstream in(file);
    std::string text, line;
    // The scans and waits; of the headers and trailers only those that
    // shift bits (the set-up clears all four with a length of 0).
    while (std::getline(in, line)) {
        const std::string command = line.substr(0, line.find(' '));
        if (command == "SIR" || command == "SDR" || command == "RUNTEST" || line.find("TDI") != std::string::npos)
            text += line + "\n";
    }
    return text;
}

TEST(SvfBridgeRecording, FramesATransactionForEachBridge) {
    const std::pair<SvfRecorderOptions, const char*> cases[] = {
        // Marker, length 15 MSB first, 05 00, one late clock; the busy bit,
        // the last of the 16 SPI bits, is compared at DR bit 34 + 15.
        {forBridge("jtagspi"),
         "SIR 6 TDI (02);\nSDR 50 TDI (00141E0000001) TDO (0000000000000) MASK (2000000000000);\n"},
        // The SPI bits and one late clock; MISO bit 15 at DR bit 16.
        {forBridge("shiftdr"), "SIR 6 TDI (02);\nSDR 17 TDI (000A0) TDO (00000) MASK (10000);\n"},
        // Three TAPs: the others in BYPASS around the bridge, MISO three
        // clocks late.
        {forBridge("jtagspi", "8,[6],4"),
         "HIR 4 TDI (F);\nTIR 8 TDI (FF);\nHDR 1 TDI (0);\nTDR 1 TDI (0);\nSIR 6 TDI (02);\n"
         "SDR 52 TDI (00141E0000001) TDO (0000000000000) MASK (8000000000000);\n"},
    };
    for (const auto& [options, expected] : cases)
        EXPECT_EQ(recordStatusRead(options), expected) << options.bridgeSettings.name;
}

// Whole cycles rounded up, no RUNTEST of 2^31 cycles or more, the cycles
// and the seconds adding up to the wait.
TEST(SvfBridgeRecording, StatesWaitsInCyclesBelowTwoToThe31) {
    struct WaitCase {
        std::uint32_t tckHz;
        int waitUs;
        std::uint64_t cycles;
        std::size_t statements;
    };
    const WaitCase cases[] = {
        {10'000'000, 700, 7000, 1},
        {1, 1, 1, 1},  // a part of a cycle is a whole one
        {1'000'000'000, 2'147'483, 2'147'483'000, 1},  // just below the limit
        {1'000'000'000, 2'147'484, 2'147'484'000, 2},
        {1'000'000'000, 40'000'000, 40'000'000'000, 19},
    };
    for (const WaitCase& row : cases) {
        SvfRecorderOptions options = forBridge("jtagspi");
        options.tckHz = row.tckHz;
        std::istringstream text(recordStatusRead(options, row.waitUs));
        std::uint64_t cycles = 0;
        double seconds = 0;
        std::size_t statements = 0;
        for (std::string line; std::getline(text, line);) {
            if (line.rfind("RUNTEST ", 0) != 0) continue;
            std::istringstream words(line.substr(8));
            std::uint64_t count = 0;
            std::string tck, sec;
            double time = 0;
            words >> count >> tck >> time >> sec;
            EXPECT_EQ(tck, "TCK") << line;
            EXPECT_EQ(sec, "SEC;") << line;
            EXPECT_LT(count, 1ull << 31) << line;
            cycles += count;
            seconds += time;
            ++statements;
        }
        EXPECT_EQ(cycles, row.cycles) << row.waitUs;
        EXPECT_EQ(statements, row.statements) << row.waitUs;
        EXPECT_NEAR(seconds, row.waitUs / 1e6, row.waitUs / 1e6 * 1e-3 + 1e-6) << row.waitUs;
    }
}

}  // namespace
}  // namespace vorant::svf
