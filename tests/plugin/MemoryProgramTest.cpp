// Page programming as the scan port sees it: one page in each port mode,
// the page-program frame, erase and verify around the page loop, the x1/x4
// decision, the time-out path, and every refusal before the first scan.

#include "MemoryTestDoubles.h"

namespace vorant::test::memory {
namespace {

using Program = MemoryTest;

// The page-program frame of the tiny part: instruction, 24-bit address,
// 64 data bits, no gaps.
std::string programFrame(std::uint32_t address, const Bytes& page) {
    return kPageProgram + wireBits(address, 24) + wireBytes(page);
}
Lines pageProgram(std::uint32_t address, const Bytes& page) {
    return concat({writeEnable(), {kCommentPageProgram, "shift 0 " + programFrame(address, page), "wait 0"}});
}
std::size_t countLines(const Lines& lines, const std::string& prefix) {
    return static_cast<std::size_t>(
        std::count_if(lines.begin(), lines.end(), [&](const std::string& l) { return l.rfind(prefix, 0) == 0; }));
}

struct ModeCase {
    const char* name;
    bool fileMode;
    bool pollingSwitchedOff;
    Lines afterPageWait0;
    friend void PrintTo(const ModeCase& c, std::ostream* os) { *os << c.name; }
};

class ProgramModes : public Program, public ::testing::WithParamInterface<ModeCase> {};

TEST_P(ProgramModes, OnePageWaitsAndPollsAsThePortModeRequires) {
    const ModeCase& c = GetParam();
    auto device = c.pollingSwitchedOff ? makeDeviceWithoutPolling() : makeDevice();
    port.fileMode = c.fileMode;
    port.scriptStatus(kReadStatus1, 1);
    const Bytes data = patternBytes(8);
    MemoryImage image(data);
    device->setConfigData(&image);

    EXPECT_TRUE(device->program(0, nullptr));
    EXPECT_EQ(port.lines().front(), "outputMode");  // asked before anything else
    EXPECT_EQ(port.scanLines(), concat({pageProgram(0, data), c.afterPageWait0, {"isCancelled 2"}, writeDisable()}));
    EXPECT_EQ(status(), (Lines{"'0': Programming Flash.\n", "'0':Programming in x1 mode.\n"}));
    EXPECT_EQ(image.rewinds, 1);
}

INSTANTIATE_TEST_SUITE_P(
    PortModes, ProgramModes,
    ::testing::Values(ModeCase{"CableWithPolling", false, false,
                               concat({{"wait 700"}, statusRead(), {"wait 70", "isCancelled 2"}, statusRead()})},
                      ModeCase{"CableWithoutPolling", false, true, {"wait 700"}},
                      ModeCase{"FileMode", true, false, {"wait 4500"}}),
    [](const auto& info) { return std::string(info.param.name); });

// Instruction at bit 0, the address MSB first at PAGE_ADDRESS_START_INDEX,
// data bytes MSB first at DATA_START_INDEX, every gap bit 0; a short last
// chunk still fills PAGE_SIZE bits from the reader's padded buffer; the
// reader's own chunk addresses play no part.
TEST_F(Program, FramesPlaceEveryFieldAndKeepTheGapsZero) {
    auto device = makeDevice({{"PAGE_ADDRESS_START_INDEX", "10"},
                              {"DATA_START_INDEX", "40"},
                              {"TOTAL_SHIFT_SIZE", "112"}});
    port.fileMode = true;
    const Bytes data = patternBytes(20);  // 2.5 pages
    MemoryImage image(data, 0x1000);
    device->setConfigData(&image);

    ASSERT_TRUE(device->program(0, nullptr));
    std::vector<ScanEvent> frames;
    for (const ScanEvent& e : shifts())
        if (e.stage == 0 && e.kind == ScanEvent::Kind::Shift) frames.push_back(e);
    ASSERT_EQ(frames.size(), 3u);
    const std::string ones(112, '1'), zeros(112, '0');
    for (std::size_t page = 0; page < 3; ++page) {
        SCOPED_TRACE(page);
        Bytes bytes = slice(data, 8 * page, page < 2 ? 8 : 4);
        bytes.resize(8, 0xFF);  // the reader's padding behind the short last chunk
        const std::uint32_t address = static_cast<std::uint32_t>(8 * page);
        EXPECT_EQ(frames[page].tdi,
                  kPageProgram + "00" + wireBits(address, 24) + "000000" + wireBytes(bytes) + "00000000");
        EXPECT_EQ(frames[page].tdiMask, ones);
        EXPECT_EQ(frames[page].tdo, zeros);
        EXPECT_EQ(frames[page].tdoMask, zeros);
    }
}

// "-e" and "-v" (or their long forms): the erase runs before the pages
// without its register display, the verify after them without its own.
TEST_F(Program, EraseBeforeAndVerifyAfterThePages) {
    for (const Lines& tokens : {Lines{"-e", "-v"}, Lines{"-erase", "-verify"}}) {
        SCOPED_TRACE(tokens[0]);
        port = RecordingScanPort();
        port.fileMode = true;
        sink.clear();
        auto device = makeDevice();
        const Bytes data = patternBytes(8);
        MemoryImage image(data);
        device->setConfigData(&image);
        auto args = switches(tokens);

        EXPECT_TRUE(device->program(2, args.get()));
        EXPECT_EQ(port.scanLines(),
                  concat({writeEnable(), {kCommentErase, "shift 0 " + kBulkErase, "wait 300000000"}, writeDisable(),
                          pageProgram(0, data), {"wait 4500", "isCancelled 2"},
                          {kCommentVerifyRead, "shift 1 " + readFrame(0), "shift 12 " + wireBytes(data),
                           "isCancelled 2"},
                          writeDisable()}));
        EXPECT_EQ(status(), (Lines{"'2': Erasing Device.\n", "'2': Programming Flash.\n",
                                   "'2': Reading device contents...\n", "done.\n", "'2': Verification completed.\n",
                                   "'2':Programming in x1 mode.\n"}));
        EXPECT_EQ(image.rewinds, 2);
    }
}

TEST_F(Program, EmptyDataWritesNoPageButStillVerifiesAndDisables) {
    auto device = makeDevice();
    MemoryImage image({});
    device->setConfigData(&image);
    auto args = switches({"-v"});
    EXPECT_TRUE(device->program(0, args.get()));
    EXPECT_EQ(port.scanLines(), writeDisable());
    EXPECT_EQ(status(), (Lines{"'0': Programming Flash.\n", "'0': Reading device contents...\n", "done.\n",
                               "'0': Verification completed.\n", "'0':Programming in x1 mode.\n"}));
}

// The data width comes from attribute 80, else from the CIF reader; x4
// also needs X4_READ. x4 sets the Quad Enable bit after the pages.
TEST_F(Program, DataWidthDecidesBetweenX1AndX4) {
    struct Case {
        const char* name;
        const char* dataWidthAttribute;
        int cifWidth;  // 0: no CIF reader
        const char* x4Read;
        bool x4;
    };
    const Case cases[] = {
        {"attribute 4 with X4_READ", "4", 0, "TRUE", true},
        {"attribute 4 without X4_READ", "4", 0, "FALSE", false},
        {"CIF width 4 with X4_READ", nullptr, 4, "TRUE", true},
        {"CIF width 4 without X4_READ", nullptr, 4, "FALSE", false},
        {"CIF width 1", nullptr, 1, "TRUE", false},
        {"attribute 1 outranks CIF width 4", "1", 4, "TRUE", false},
        {"no width at all", nullptr, 0, "TRUE", false},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        port = RecordingScanPort();
        port.fileMode = true;
        sink.clear();
        auto device = makeDevice({{"X4_READ", c.x4Read}});
        MemoryImage image(patternBytes(8));
        FixedWidthCif cif(c.cifWidth);
        device->setConfigData(&image);
        if (c.dataWidthAttribute) device->setAttribute(DeviceNS::ATTR_DATA_WIDTH, c.dataWidthAttribute, true);
        if (c.cifWidth) device->setCifReader(&cif);

        EXPECT_TRUE(device->program(0, nullptr));
        EXPECT_EQ(device->x4Programming(), c.x4);
        EXPECT_EQ(status().back(), c.x4 ? "'0':Programming in x4 mode.\n" : "'0':Programming in x1 mode.\n");
        const Lines scans = port.scanLines();
        EXPECT_EQ(countLines(scans, "shiftWrite 3 "), c.x4 ? 1u : 0u);
        EXPECT_EQ(tail(scans, 2), writeDisable());
    }
}

TEST_F(Program, AFailedQuadEnableWriteFailsTheRun) {
    auto device = makeDevice({{"X4_READ", "TRUE"}});
    port.fileMode = true;
    port.failingWaits = {3};  // wait 0, wait 4500, then the wait after 'write SR'
    MemoryImage image(patternBytes(8));
    device->setConfigData(&image);
    device->setAttribute(DeviceNS::ATTR_DATA_WIDTH, "4", true);
    EXPECT_FALSE(device->program(0, nullptr));
    EXPECT_EQ(tail(port.scanLines(), 2), writeDisable());
}

// Refusals come before any scan: no unlock, no erase, no rewind.
TEST_F(Program, RefusesBeforeAnyScan) {
    struct Case {
        const char* name;
        Properties changes;
        std::size_t dataBytes;
        bool noData;
        unsigned reportedBits;  // 0: the real size
        MessageKind kind;
        std::string message;
    };
    const Case cases[] = {
        {"no configuration data", {}, 0, true, 0, MessageKind::Info,
         "'0':Programming terminated, Please assign a configuration Bitstream before attempting this "
         "operation\n"},
        {"data one byte larger than the flash", {}, 33, false, 0, MessageKind::Error,
         "'0': The configuration data (264 bits) are larger than the device (256 bits).\n"},
        {"data size at the top of its range", {}, 8, false, 0xFFFFFFFFu, MessageKind::Error,
         "'0': The configuration data (4294967295 bits) are larger than the device (256 bits).\n"},
        {"PAGE_SIZE below one byte", {{"PAGE_SIZE", "4"}}, 8, false, 0, MessageKind::Error,
         "'0': Programming terminated, PAGE_SIZE (4 bits) is smaller than one byte.\n"},
        {"PAGE_SIZE 0", {{"PAGE_SIZE", "0"}}, 8, false, 0, MessageKind::Error,
         "'0': Programming terminated, PAGE_SIZE (0 bits) is smaller than one byte.\n"},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        port = RecordingScanPort();
        sink.clear();
        Properties changes = c.changes;
        changes["USE_UNLOCKSR"] = "TRUE";
        auto device = makeDevice(changes);
        MemoryImage image(patternBytes(c.dataBytes));
        if (c.reportedBits) image.reportBits(c.reportedBits);
        if (!c.noData) device->setConfigData(&image);
        auto args = switches({"-e", "-v"});

        EXPECT_FALSE(device->program(0, args.get()));
        EXPECT_EQ(port.lines(), Lines{"outputMode"});
        EXPECT_EQ(sink.texts(c.kind), Lines{c.message});
        EXPECT_EQ(sink.messages().size(), 1u);
        EXPECT_EQ(image.rewinds, 0);
    }
}

TEST_F(Program, DataFillingTheWholeFlashIsAccepted) {
    auto device = makeDevice();
    port.fileMode = true;
    MemoryImage image(patternBytes(32));
    device->setConfigData(&image);
    EXPECT_TRUE(device->program(0, nullptr));
    EXPECT_EQ(countLines(port.scanLines(), "shift 0 "), 4u);
}

// A page whose polling runs out of PROGRAM_MAXWAITTIME ends the run: the
// error, a write disable, no further page and no x1/x4 step.
TEST_F(Program, PollingTimeOutStopsTheRun) {
    auto device = makeDevice({{"PROGRAM_MAXWAITTIME", "140"}});
    port.scriptStatus(kReadStatus1, 1000);
    const Bytes data = patternBytes(16);
    MemoryImage image(data);
    device->setConfigData(&image);

    EXPECT_FALSE(device->program(0, nullptr));
    const Lines busyPoll = concat({statusRead(), {"wait 70", "isCancelled 2"}});
    EXPECT_EQ(port.scanLines(), concat({pageProgram(0, slice(data, 0, 8)), {"wait 700"}, busyPoll, busyPoll, busyPoll,
                                        writeDisable()}));
    EXPECT_EQ(errors(), Lines{"'0': Device has exceeded the allocated time.\n"});
    EXPECT_EQ(status(), Lines{"'0': Programming Flash.\n"});
}

// A failed erase fails the first page's check even though the flash is idle.
TEST_F(Program, FailedEraseStopsTheRunAfterTheFirstPage) {
    auto device = makeDevice();
    port.failingShifts = {2};  // the erase instruction
    MemoryImage image(patternBytes(16));
    device->setConfigData(&image);
    auto args = switches({"-e"});

    EXPECT_FALSE(device->program(0, args.get()));
    EXPECT_EQ(errors(), (Lines{"'0': Erase did not complete.\n", "'0': Device has exceeded the allocated time.\n"}));
    EXPECT_EQ(countLines(port.scanLines(), "shift 0 " + kPageProgram), 1u);
    EXPECT_EQ(tail(port.scanLines(), 2), writeDisable());
}

// A cancel between pages: no further page, no verify, no x1/x4 step (so no
// Quad Enable write), but the write disable; the run fails.
TEST_F(Program, CancelBetweenPagesSkipsVerifyAndModeButDisables) {
    auto device = makeDevice({{"X4_READ", "TRUE"}});
    port.fileMode = true;
    port.cancelFromQuery = 1;
    const Bytes data = patternBytes(24);
    MemoryImage image(data);
    device->setConfigData(&image);
    device->setAttribute(DeviceNS::ATTR_DATA_WIDTH, "4", true);
    auto args = switches({"-v"});

    EXPECT_FALSE(device->program(0, args.get()));
    EXPECT_EQ(port.scanLines(),
              concat({pageProgram(0, slice(data, 0, 8)), {"wait 4500", "isCancelled 2"}, writeDisable()}));
    EXPECT_EQ(status(), (Lines{"'0': Programming Flash.\n", "'0': Programming cancelled.\n"}));
    EXPECT_FALSE(device->x4Programming());
}

}  // namespace
}  // namespace vorant::test::memory
