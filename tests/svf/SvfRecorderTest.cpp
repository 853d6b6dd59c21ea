// The recorder's exact output (golden files), its transaction joining, and
// its file handling: atomic replacement, refusal of unusable targets.

#include "ports/svf/SvfError.h"
#include "ports/svf/SvfRecorder.h"
#include "tests/svf/SvfTestSupport.h"

#include <gtest/gtest.h>

#include <functional>
#include <thread>

namespace vorant::svf {
namespace {

using test::filledVector;
using test::readFile;
using test::ScratchFolder;
using test::wireVector;

constexpr const char* kSetup =
    "// One SDR per SPI transaction: chip select is asserted for the length of each SDR.\n"
    "TRST OFF;\nENDIR IDLE;\nENDDR IDLE;\nSTATE RESET;\nSTATE IDLE;\nHDR 0;\nHIR 0;\nTDR 0;\nTIR 0;\n";

std::string golden(const std::string& name) {
    return readFile(std::filesystem::path(VORANT_TEST_DATA_DIR) / "svf" / name);
}

SvfRecorderOptions goldenOptions() {
    SvfRecorderOptions options;
    options.toolName = "vorant-spi test";
    options.partName = "TEST25Q";
    return options;
}

// Records through `drive` with default options and returns what follows
// the set-up statements.
std::string recordBody(const std::function<void(SvfRecorder&)>& drive) {
    ScratchFolder folder;
    SvfRecorder recorder(folder / "out.svf");
    drive(recorder);
    recorder.finish();
    const std::string text = readFile(folder / "out.svf");
    EXPECT_EQ(text.substr(0, std::string(kSetup).size()), kSetup);
    return text.substr(std::string(kSetup).size());
}

// The transfers of one plug-in sequence, and the file it must give.
struct GoldenCase {
    const char* file;
    std::vector<std::string> preamble;
    std::function<void(SvfRecorder&)> drive;
};

class RecorderGolden : public ::testing::TestWithParam<GoldenCase> {};

TEST_P(RecorderGolden, WritesTheExactFile) {
    ScratchFolder folder;
    SvfRecorderOptions options = goldenOptions();
    options.preamble = GetParam().preamble;
    {
        SvfRecorder recorder(folder / "out.svf", options);
        GetParam().drive(recorder);
        recorder.finish();
    }
    EXPECT_EQ(readFile(folder / "out.svf"), golden(GetParam().file));
}

void writeEnable(SvfRecorder& recorder) {
    recorder.comment("//Loading device with 'write enable' instruction.\n");
    RLBitVec wren = wireVector({0x06});
    EXPECT_TRUE(recorder.shiftWrite(0, &wren, 0));
}

void statusRead(SvfRecorder& recorder) {
    recorder.comment("//Loading device with 'read status' instruction.\n");
    RLBitVec opcode = wireVector({0x05});
    RLBitVec ones = filledVector(8, true), zeros = filledVector(8, false);
    EXPECT_TRUE(recorder.shift(1, &opcode, &ones, &zeros, &zeros));
    // Only the busy bit (the last bit received) is compared.
    RLBitVec capture = filledVector(8, false);
    RLBitVec busyBit = wireVector({0x01});
    EXPECT_TRUE(recorder.shift(12, &capture, &ones, &capture, &busyBit));
}

void unlock(SvfRecorder& recorder) {
    recorder.comment("//Loading device with 'write status' instruction.\n");
    RLBitVec opcode = wireVector({0x01}), value = wireVector({0x00, 0x00});
    EXPECT_TRUE(recorder.shiftWrite(1, &opcode, 0));
    EXPECT_TRUE(recorder.shiftWrite(2, &value, 0));
    // Arrives while the transaction is open: follows its SDR.
    recorder.comment("//Status registers written.\n");
    EXPECT_TRUE(recorder.wait(15000, true));
}

void pageProgram(SvfRecorder& recorder) {
    writeEnable(recorder);
    recorder.comment("//Loading device with 'page program' instruction.\n");
    std::vector<std::uint8_t> frameBytes = {0x02, 0x00, 0x01, 0x00};
    for (int value = 0; value < 256; ++value) frameBytes.push_back(static_cast<std::uint8_t>(value));
    RLBitVec frame = wireVector(frameBytes);
    RLBitVec ones = filledVector(2080, true), zeros = filledVector(2080, false);
    EXPECT_TRUE(recorder.shift(0, &frame, &ones, &zeros, &zeros));
    EXPECT_TRUE(recorder.wait(0, true));
    EXPECT_TRUE(recorder.wait(700, true));
}

void comments(SvfRecorder& recorder) {
    recorder.comment("//plain\n");
    recorder.comment("no slashes");
    recorder.comment("two\nlines\n");
    recorder.comment("");
    recorder.comment(nullptr);
    recorder.comment("!bang\r\n");
    recorder.comment("\n");
    RLBitVec opcode = wireVector({0x9F});
    EXPECT_TRUE(recorder.shiftWrite(1, &opcode, 0));
    recorder.comment("//while open\n");
    RLBitVec capture = filledVector(24, false);
    RLBitVec expected = wireVector({0xEF, 0x40, 0x18});
    RLBitVec ones = filledVector(24, true);
    EXPECT_TRUE(recorder.shift(12, &capture, &ones, &expected, &ones));
}

INSTANTIATE_TEST_SUITE_P(Sequences, RecorderGolden,
                         ::testing::Values(GoldenCase{"write_enable.svf", {}, writeEnable},
                                           GoldenCase{"status_read.svf", {}, statusRead},
                                           GoldenCase{"unlock.svf", {}, unlock},
                                           GoldenCase{"page_program.svf", {}, pageProgram},
                                           GoldenCase{"comments.svf", {"SIR 6 TDI (02);"}, comments}),
                         [](const auto& info) {
                             std::string name = info.param.file;
                             return name.substr(0, name.find('.'));
                         });

TEST(SvfRecorder, JoinsAndClosesTransactionsByStage) {
    RLBitVec a = wireVector({0xAA}), b = wireVector({0x0B}), c = wireVector({0xC0});
    struct Case {
        const char* name;
        std::function<void(SvfRecorder&)> drive;
        const char* body;
    };
    const Case cases[] = {
        {"1 2 3 is one SDR, bits in shift order",
         [&](SvfRecorder& r) { r.shiftWrite(1, &a, 0); r.shiftWrite(2, &b, 0); r.shiftWrite(3, &c, 0); },
         "SDR 24 TDI (03D055);\n"},
        {"an opening stage closes an open transaction",
         [&](SvfRecorder& r) { r.shiftWrite(1, &a, 0); r.shiftWrite(2, &b, 0); r.shiftWrite(0, &c, 0); },
         "SDR 16 TDI (D055);\nSDR 8 TDI (03);\n"},
        {"stage 1 after an open transaction starts a new one",
         [&](SvfRecorder& r) { r.shiftWrite(1, &a, 0); r.shiftWrite(1, &b, 0); r.shiftWrite(3, &c, 0); },
         "SDR 8 TDI (55);\nSDR 16 TDI (03D0);\n"},
        {"a zero wait closes the transaction and writes nothing",
         [&](SvfRecorder& r) { r.shiftWrite(1, &a, 0); r.wait(0, true); r.shiftWrite(0, &b, 0); },
         "SDR 8 TDI (55);\nSDR 8 TDI (D0);\n"},
        {"finish closes an open transaction",
         [&](SvfRecorder& r) { r.shiftWrite(1, &a, 0); r.shiftWrite(2, &b, 0); },
         "SDR 16 TDI (D055);\n"},
    };
    for (const Case& c : cases) EXPECT_EQ(recordBody(c.drive), c.body) << c.name;
}

TEST(SvfRecorder, ComparesOnlyTheMaskedShiftsOfATransaction) {
    // Opcode unmasked, then a 3-bit capture of which only the middle bit
    // counts: TDO/MASK cover the whole SDR, zeros where nothing is compared.
    const std::string body = recordBody([](SvfRecorder& r) {
        RLBitVec opcode = wireVector({0x05});
        RLBitVec capture(3, false), expected(3, false), mask(3, false);
        expected.setBit(1, true);
        mask.setBit(1, true);
        EXPECT_TRUE(r.shift(1, &opcode, nullptr, nullptr, nullptr));
        EXPECT_TRUE(r.shift(12, &capture, nullptr, &expected, &mask));
        // An all-zero mask compares nothing.
        RLBitVec noMask(8, false);
        EXPECT_TRUE(r.shift(0, &opcode, nullptr, &opcode, &noMask));
    });
    EXPECT_EQ(body, "SDR 11 TDI (0A0) TDO (200) MASK (200);\nSDR 8 TDI (A0);\n");
}

TEST(SvfRecorder, ToleratesCompanionVectorsOfOtherLengths) {
    const std::string body = recordBody([](SvfRecorder& r) {
        RLBitVec tdi(8, false), shortTdo(4, true), longMask(16, true);
        EXPECT_TRUE(r.shift(0, &tdi, nullptr, &shortTdo, &longMask));
    });
    EXPECT_EQ(body, "SDR 8 TDI (00) TDO (0F) MASK (FF);\n");
}

TEST(SvfRecorder, RefusesTransfersItCannotFrameAndRecordsNothing) {
    RLBitVec a = wireVector({0xAA});
    const std::string body = recordBody([&](SvfRecorder& r) {
        EXPECT_FALSE(r.shiftWrite(2, &a, 0)) << "continue without select";
        EXPECT_FALSE(r.shiftWrite(3, &a, 0)) << "close without select";
        EXPECT_FALSE(r.shift(12, &a, nullptr, &a, &a)) << "capture without select";
        EXPECT_FALSE(r.shiftWrite(7, &a, 0)) << "unknown stage";
        EXPECT_FALSE(r.shiftWrite(0, nullptr, 0)) << "no vector";
        EXPECT_FALSE(r.wait(-5, true)) << "negative wait";
    });
    EXPECT_EQ(body, "");
}

TEST(SvfRecorder, CountsWhatItWrote) {
    ScratchFolder folder;
    SvfRecorder recorder(folder / "out.svf");
    EXPECT_TRUE(recorder.outputMode());
    RLBitVec a = wireVector({0xAA, 0x55});
    recorder.comment("//one\n");
    recorder.shiftWrite(0, &a, 0);
    recorder.shiftWrite(1, &a, 0);
    recorder.shiftWrite(3, &a, 0);
    recorder.wait(700, true);
    recorder.wait(0, true);
    recorder.wait(1500, true);
    recorder.finish();
    EXPECT_EQ(recorder.totals().sdrCount, 2u);
    EXPECT_EQ(recorder.totals().sdrBits, 48u);
    EXPECT_EQ(recorder.totals().runTestCount, 2u);
    EXPECT_EQ(recorder.totals().runTestMicroseconds, 2200u);
    EXPECT_EQ(recorder.totals().commentCount, 1u);
}

TEST(SvfRecorder, CancelIsAFlagAnyThreadCanSet) {
    ScratchFolder folder;
    SvfRecorder recorder(folder / "out.svf");
    EXPECT_FALSE(recorder.isCancelled(2));
    std::thread([&] { recorder.requestCancel(); }).join();
    EXPECT_TRUE(recorder.isCancelled(2));
    recorder.clearCancel();
    EXPECT_FALSE(recorder.isCancelled(2));
    recorder.cancelFlag().store(true);
    EXPECT_TRUE(recorder.isCancelled(2));
}

TEST(SvfRecorder, FinishedRecorderAcceptsNothingMore) {
    ScratchFolder folder;
    SvfRecorder recorder(folder / "out.svf");
    recorder.finish();
    const std::string text = readFile(folder / "out.svf");
    RLBitVec a = wireVector({0xAA});
    EXPECT_FALSE(recorder.shiftWrite(0, &a, 0));
    EXPECT_FALSE(recorder.wait(10, true));
    recorder.comment("//late\n");
    EXPECT_THROW(recorder.finish(), SvfError);
    EXPECT_EQ(readFile(folder / "out.svf"), text);
}

TEST(SvfRecorder, HeaderCarriesADateOnlyWhenAsked) {
    ScratchFolder folder;
    SvfRecorderOptions options;
    options.timestamp = true;
    SvfRecorder recorder(folder / "out.svf", options);
    recorder.finish();
    const std::string text = readFile(folder / "out.svf");
    EXPECT_EQ(text.rfind("// Date: ", 0), 0u) << text;
    EXPECT_EQ(text.substr(text.find('\n') + 1), kSetup);
}

TEST(SvfRecorder, NamesInTheHeaderCannotBreakTheCommentLine) {
    ScratchFolder folder;
    SvfRecorderOptions options;
    options.partName = "X\nSDR 8 TDI (FF);";
    SvfRecorder recorder(folder / "out.svf", options);
    recorder.finish();
    EXPECT_EQ(readFile(folder / "out.svf"), std::string("// Part: X SDR 8 TDI (FF);\n") + kSetup);
}

// --- files ------------------------------------------------------------------

TEST(SvfRecorderFile, NothingAppearsUntilFinish) {
    ScratchFolder folder;
    {
        SvfRecorder recorder(folder / "out.svf");
        RLBitVec a = wireVector({0xAA});
        recorder.shiftWrite(0, &a, 0);
        EXPECT_FALSE(std::filesystem::exists(folder / "out.svf"));
        // Only the temporary file exists meanwhile.
        EXPECT_EQ(folder.entries().size(), 1u);
    }
    // Destroyed without finish (a failed or cancelled run): nothing left.
    EXPECT_TRUE(folder.entries().empty());
}

TEST(SvfRecorderFile, AnUnfinishedRunLeavesAnEarlierFileUntouched) {
    ScratchFolder folder;
    test::writeFile(folder / "out.svf", "earlier contents\n");
    {
        SvfRecorder recorder(folder / "out.svf");
        RLBitVec a = wireVector({0xAA});
        recorder.shiftWrite(0, &a, 0);
    }
    EXPECT_EQ(readFile(folder / "out.svf"), "earlier contents\n");
    EXPECT_EQ(folder.entries(), std::vector<std::string>{"out.svf"});

    SvfRecorder recorder(folder / "out.svf");
    recorder.finish();
    EXPECT_EQ(readFile(folder / "out.svf"), kSetup);
    EXPECT_EQ(folder.entries(), std::vector<std::string>{"out.svf"});
}

TEST(SvfRecorderFile, UnusableTargetsFailAtOnceNamingTheFileAndCreateNothing) {
    ScratchFolder folder;
    std::filesystem::create_directory(folder / "adir");
    SvfRecorderOptions badPreamble;
    badPreamble.preamble = {"SIR 6 TDI (02);", "SIR 6 TDI (0Z);"};
    struct Case {
        std::filesystem::path target;
        SvfRecorderOptions options;
        std::string mention;
    };
    const Case cases[] = {
        {folder / "missing" / "out.svf", {}, "does not exist"},
        {folder / "adir", {}, "folder"},
        {folder / "out.svf", badPreamble, "preamble line 2: bad hex digit 'Z'"},
    };
    for (const Case& c : cases) {
        try {
            SvfRecorder recorder(c.target, c.options);
            ADD_FAILURE() << c.target << " was accepted";
        } catch (const SvfError& error) {
            const std::string message = error.what();
            EXPECT_NE(message.find(c.target.string()), std::string::npos) << message;
            EXPECT_NE(message.find(c.mention), std::string::npos) << message;
        }
        EXPECT_EQ(folder.entries(), std::vector<std::string>{"adir"}) << c.target;
        EXPECT_TRUE(std::filesystem::is_empty(folder / "adir"));
    }
}

}  // namespace
}  // namespace vorant::svf
