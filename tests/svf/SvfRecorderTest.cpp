// The recorder: its exact output (golden files), one SDR per transaction,
// the frames and waits of each bridge, its file handling, a standard player
// accepting what it writes, and the proof of file mode: a recorded job
// played on a fresh simulated flash leaves the image there.

#include "ports/jtag/Bridge.h"
#include "ports/svf/SvfError.h"
#include "ports/svf/SvfPlayer.h"
#include "ports/svf/SvfRecorder.h"
#include "tests/support/ScratchFolder.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <random>
#include <sstream>
#include <tuple>

namespace vorant::svf {
namespace {

namespace fs = std::filesystem;
using Bytes = std::vector<std::uint8_t>;

using Scratch = vorant::test::ScratchFolder;

std::string readFile(const fs::path& file) {
    std::ostringstream text;
    text << std::ifstream(file, std::ios::binary).rdbuf();
    return text.str();
}

void writeFile(const fs::path& file, const std::string& text) { std::ofstream(file, std::ios::binary) << text; }

std::string hex(const Bytes& bytes) {
    std::string out;
    for (std::uint8_t b : bytes) out += {"0123456789ABCDEF"[b >> 4], "0123456789ABCDEF"[b & 15]};
    return out;
}

// Plays a script of scan-port calls; returns one '1' or '0' per call that
// answers. Steps are separated by '|': "#text" a comment, "-" a null
// comment, "W700" a wait of 700 us, "S:tdi" a shiftWrite at stage S,
// "S:tdi/tdo/mask" a shift. Vectors are wire bytes in hex (first byte
// first, each MSB first); an empty tdi is a null one.
std::string drive(ScanPort& port, const std::string& script) {
    std::string results;
    std::istringstream steps(script);
    for (std::string step; std::getline(steps, step, '|');) {
        if (step[0] == '#') port.comment(step.c_str() + 1);
        else if (step == "-") port.comment(nullptr);
        else if (step[0] == 'W') results += port.wait(std::stoi(step.substr(1)), true) ? '1' : '0';
        else {
            std::vector<RLBitVec> v;  // tdi, tdo, mask
            std::istringstream fields(step.substr(step.find(':') + 1));
            for (std::string field; std::getline(fields, field, '/');) {
                v.emplace_back(field.size() * 4, false);
                for (std::size_t i = 0; i < field.size() * 4; ++i)
                    if ((std::stoi(field.substr(i / 4, 1), nullptr, 16) >> (3 - i % 4)) & 1)
                        v.back().data()[i / 8] |= static_cast<std::uint8_t>(1 << (i % 8));
            }
            results += (v.size() == 3 ? port.shift(std::stoi(step), &v[0], nullptr, &v[1], &v[2])
                                      : port.shiftWrite(std::stoi(step), v.empty() ? nullptr : &v[0], 0)) ? '1' : '0';
        }
    }
    return results;
}

constexpr const char* kSetup =
    "// One SDR per SPI transaction: chip select is asserted for the length of each SDR.\n"
    "TRST OFF;\nENDIR IDLE;\nENDDR IDLE;\nSTATE RESET;\nSTATE IDLE;\nHDR 0;\nHIR 0;\nTDR 0;\nTIR 0;\n";

// The finished file of a recorder driven by `script`, then the driver's answers.
std::pair<std::string, std::string> record(const std::string& script, const SvfRecorderOptions& options = {}) {
    Scratch folder;
    SvfRecorder recorder(folder / "out.svf", options);
    const std::string answers = drive(recorder, script);
    recorder.finish();
    return {readFile(folder / "out.svf"), answers};
}

std::string pageProgram() {
    Bytes page;
    for (int value = 0; value < 256; ++value) page.push_back(static_cast<std::uint8_t>(value));
    return "#//Loading device with 'write enable' instruction.\n|0:06|"
           "#//Loading device with 'page program' instruction.\n|0:02000100" + hex(page) + "|W0|W700";
}

TEST(SvfRecorder, WritesTheGoldenFiles) {
    const std::pair<const char*, std::string> cases[] = {
        {"write_enable.svf", "#//Loading device with 'write enable' instruction.\n|0:06"},
        // Only the busy bit, the last bit received, is compared.
        {"status_read.svf", "#//Loading device with 'read status' instruction.\n|1:05/00/00|12:00/00/01"},
        // A comment that comes while the transaction is open follows its SDR.
        {"unlock.svf", "#//Loading device with 'write status' instruction.\n|1:01|2:0000|"
                       "#//Status registers written.\n|W15000"},
        {"page_program.svf", pageProgram()},
        {"comments.svf", "#//plain\n|#no slashes|#two\nlines\n|#|-|#!bang\r\n|#\n|1:9F|#//while open\n|"
                         "12:000000/EF4018/FFFFFF"},
    };
    for (const auto& [file, script] : cases) {
        SvfRecorderOptions options;
        options.toolName = "vorant-spi test", options.partName = "TEST25Q";
        if (file == std::string("comments.svf")) options.preamble = {"SIR 6 TDI (02);"};
        EXPECT_EQ(record(script, options).first, readFile(fs::path(VORANT_TEST_DATA_DIR) / "svf" / file)) << file;
    }
}

// The stage codes join shifts into one SDR (bits in shift order); TDO and
// MASK appear only when a shift compares something, and cover the whole SDR.
TEST(SvfRecorder, WritesOneSdrPerTransaction) {
    const std::tuple<const char*, const char*, const char*> cases[] = {
        {"1:AA|2:0B|3:C0", "111", "SDR 24 TDI (03D055);\n"},
        {"1:AA|2:0B|0:C0", "111", "SDR 16 TDI (D055);\nSDR 8 TDI (03);\n"},  // an opening stage closes
        {"1:AA|1:0B|3:C0", "111", "SDR 8 TDI (55);\nSDR 16 TDI (03D0);\n"},
        {"1:AA|W0|0:0B", "111", "SDR 8 TDI (55);\nSDR 8 TDI (D0);\n"},  // a zero wait closes, writes nothing
        {"1:AA|2:0B", "11", "SDR 16 TDI (D055);\n"},                     // finish closes
        {"0:05/05/00", "1", "SDR 8 TDI (A0);\n"},                            // an all-zero mask compares nothing
        {"0:0000/FF/FFFFFF", "1", "SDR 16 TDI (0000) TDO (00FF) MASK (FFFF);\n"},  // companions of other lengths
        {"2:AA|3:AA|12:AA/AA/AA|7:AA|0:|W-5", "000000", ""},                // nothing it cannot frame
    };
    for (const auto& [script, results, body] : cases)
        EXPECT_EQ(record(script), std::make_pair(kSetup + std::string(body), std::string(results))) << script;
}

// The file is an atomic output (its cases are the host's): an unfinished run
// leaves the earlier file, and an unusable preamble is refused at once,
// creating nothing.
TEST(SvfRecorder, ReplacesItsFileOnlyAtFinish) {
    Scratch folder;
    writeFile(folder / "out.svf", "earlier\n");
    { SvfRecorder recorder(folder / "out.svf"); drive(recorder, "0:AA"); }
    EXPECT_EQ(readFile(folder / "out.svf"), "earlier\n");
    SvfRecorderOptions badPreamble;
    badPreamble.preamble = {"SIR 6 TDI (02);", "SIR 6 TDI (0Z);"};  // would make every file unplayable
    std::string message = "accepted";
    try {
        SvfRecorder recorder(folder / "new.svf", badPreamble);
    } catch (const SvfError& error) {
        message = error.what();
    }
    EXPECT_NE(message.find((folder / "new.svf").string()), std::string::npos) << message;
    EXPECT_EQ(folder.entries(), 1u);
}

// Recordings for a bridge: the chain and the bridge's instruction after the
// set-up, each transaction as the bridge's DR scan with TDO and MASK moved
// to where MISO comes back, and waits stated in TCK cycles and seconds,
// split below 2^31 cycles.
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

// The statements of a recorded status read (compare the busy bit) and
// `waitUs` of waiting: the scans and waits, and of the headers and
// trailers only those that shift bits (the set-up clears all four).
std::string recordStatusRead(const SvfRecorderOptions& options, int waitUs = 0) {
    const auto [file, answers] = record("1:05|12:00/00/01" + (waitUs > 0 ? "|W" + std::to_string(waitUs) : ""), options);
    EXPECT_EQ(answers, waitUs > 0 ? "111" : "11");
    std::istringstream in(file);
    std::string text;
    for (std::string line; std::getline(in, line);) {
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

// A job recorded as the plug-in would make it (unlock, sector erase, page
// programs each followed by a status check, a compare of every page) plays
// on a fresh flash and leaves the image there. Its file is longer than the
// player's read buffer. A file that does not parse to its end plays nothing.
TEST(SvfPlayer, PlaysARecordedJobOnAFreshFlash) {
    Bytes image(50 * 256 + 100);
    std::mt19937 random(11);
    for (auto& byte : image) byte = static_cast<std::uint8_t>(random());
    const std::string idle = "|1:05/00/00|12:00/00/03";  // busy and write enable both clear
    // 1.5627E-02 s reads back a hair under 15627 us: the player must round.
    std::string job = "#//Unlock.\n|0:06|1:01|2:00|W15627|0:06|0:20000000|W0|W1000" + idle, verify;
    for (std::size_t at = 0; at < image.size(); at += 256) {
        const std::string address = hex({0, std::uint8_t(at >> 8), 0});
        const std::string page = hex(Bytes(image.begin() + at, image.begin() + std::min(at + 256, image.size())));
        job += "|0:06|0:02" + address + page + "|W0|W1000" + idle;
        verify += "|1:03" + address + "|12:" + page + "/" + page + "/" + std::string(page.size(), 'F');
    }
    Scratch folder;
    SvfRecorderOptions options;
    options.preamble = {"SIR 6 TDI (02);"};  // a bridge's, ignored by the player
    SvfRecorder recorder(folder / "job.svf", options);
    EXPECT_EQ(drive(recorder, job + verify).find('0'), std::string::npos);
    recorder.finish();
    EXPECT_GT(fs::file_size(folder / "job.svf"), 64u * 1024);

    sim::FlashConfig config;
    config.sizeBytes = 64 * 1024;
    sim::FlashModel flash(config);
    std::fill_n(flash.memory().begin(), 4096, std::uint8_t{0x00});  // only the recorded erase clears it
    const SvfPlayResult result = SvfPlayer(flash).playFile(folder / "job.svf");
    for (const SvfMismatch& mismatch : result.mismatches) ADD_FAILURE() << mismatch.describe();
    EXPECT_EQ(result.sdrCount, recorder.totals().sdrCount);
    EXPECT_EQ(result.sdrBits, recorder.totals().sdrBits);
    EXPECT_EQ(result.comparedSdrs, 1 + 2 * 51u);
    EXPECT_EQ(result.waitNanoseconds, recorder.totals().runTestMicroseconds * 1000);
    image.resize(config.sizeBytes, 0xFF);
    EXPECT_TRUE(flash.memory() == image);

    writeFile(folder / "bad.svf", readFile(folder / "job.svf") + "SDR 8 TDI (6G);\n");
    sim::FlashModel fresh(config);
    EXPECT_THROW(SvfPlayer(fresh).playFile(folder / "bad.svf"), SvfParseError);
    EXPECT_EQ(fresh.now(), 0u);
}

}  // namespace
}  // namespace vorant::svf
