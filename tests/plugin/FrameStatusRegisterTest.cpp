// The status registers: the raw read, the display, the unlock and the
// Quad Enable write, as scans and as messages.

#include "FrameFixture.h"

#include <cstdio>
#include <sstream>

namespace vorant::test::frame {
namespace {

// Opens the protected register read to the tests.
class StatusReadingDevice : public Type1SPIDevice {
public:
    using Type1SPIDevice::Type1SPIDevice;
    using Type1SPIDevice::readStatusRegister;
};

const std::string kQuadEnableFileComment =
    "comment // The previous SDR scan only masks the Quad Enable bit and assumes that the other bits in the "
    "Status Register-2 are all zeros. If this SDR scan fails, the mask and data must be modified to reflect "
    "the real states of these bits.\n";

// One bit line of the display: the label left-aligned in 50 columns, the
// bit right-aligned in 10.
std::string bitLine(const std::string& label, int bit) {
    return label + std::string(50 - label.size(), ' ') + ":" + std::string(9, ' ') + std::to_string(bit) + "\n";
}

class FrameStatusRegisters : public FrameTest {
protected:
    // The flash's two status registers, in register order.
    void flashStatus(unsigned register1, unsigned register2) {
        port.responder = nullptr;
        port.scriptStatus(kReadStatus1, 0, register1);
        port.scriptStatus(kReadStatus2, 0, register2);
    }
    std::vector<std::string> registerRead(const std::string& instruction) const {
        return {"outputMode", kCommentReadStatus, "shift 1 " + instruction, "shift 12 00000000"};
    }
};

TEST_F(FrameStatusRegisters, RawReadReturnsTheCapturedByteUnreversed) {
    const struct {
        unsigned flashValue;
        unsigned char raw;
    } cases[] = {{0x01, 0x80}, {0x02, 0x40}, {0x80, 0x01}, {0x9C, 0x39}, {0x00, 0x00}};
    addTestPart("FRAME_W25Q", w25q128Properties());
    StatusReadingDevice device("FRAME_W25Q");
    for (const auto& c : cases) {
        SCOPED_TRACE(c.flashValue);
        RecordingScanPort fresh;
        fresh.scriptStatus(kReadStatus1, 0, c.flashValue);
        device.setScanPort(&fresh);
        sink.clear();
        unsigned char raw = 0xAA;
        EXPECT_TRUE(device.readStatusRegister(kReadStatus1.c_str(), &raw));
        EXPECT_EQ(raw, c.raw);
        EXPECT_EQ(fresh.lines(), registerRead(kReadStatus1));
        const ScanEvent& capture = fresh.events.back();
        EXPECT_EQ(capture.tdiMask, "11111111");
        EXPECT_EQ(capture.tdo, "00000000");
        EXPECT_EQ(capture.tdoMask, "11111111");
        char trace[80];
        std::snprintf(trace, sizeof trace, "Status Register Read Instruction = 00000101, Contents =  0x%02X.\n",
                      c.raw);
        EXPECT_EQ(debugTexts(), std::vector<std::string>{trace});
        EXPECT_TRUE(statusTexts().empty());
    }
}

TEST_F(FrameStatusRegisters, DisplayReadsBothRegistersAndShowsTheirContents) {
    auto device = makeDevice();
    flashStatus(0x9C, 0x42);
    EXPECT_TRUE(device->displayStatusRegisterBits(4));
    std::vector<std::string> expectedScans = {"outputMode"};
    for (const auto& line : registerRead(kReadStatus1)) expectedScans.push_back(line);
    for (const auto& line : registerRead(kReadStatus2)) expectedScans.push_back(line);
    EXPECT_EQ(port.lines(), expectedScans);
    ASSERT_FALSE(statusTexts().empty());
    EXPECT_EQ(statusTexts().front(), "FRAME_W25Q Status Register Contents = 0x429C.\n");

    // The host's device-status request is the same display.
    const std::vector<std::string> displayTexts = statusTexts();
    port.clear();
    sink.clear();
    EXPECT_TRUE(device->readDeviceStatus(4, nullptr));
    EXPECT_EQ(port.lines(), expectedScans);
    EXPECT_EQ(statusTexts(), displayTexts);
}

TEST_F(FrameStatusRegisters, BitLinesWalkTheContentsFromBit15ForEachLabel) {
    const struct {
        const char* what;
        Properties changes;
        std::vector<std::string> removed;
        unsigned register1, register2;
        const char* contents;
        const char* lines;  // "LABEL=bit ...", in display order
    } cases[] = {
        {"16 bits, bit 10 NOT_VALID", {}, {}, 0x9C, 0x42, "0x429C",
         "SUS=0 CMP=1 LB3=0 LB2=0 LB1=0 QE=1 SRL=0 SRP=1 SEC=0 TB=0 BP2=1 BP1=1 BP0=1 WEL=0 BUSY=0"},
        {"8 bits show register 2", {{"STATUS_REGISTER_LENGTH", "8"}}, {}, 0xFF, 0x82, "0x82FF",
         "SRP=1 SEC=0 TB=0 BP2=0 BP1=0 BP0=0 WEL=1 BUSY=0"},
        {"no length", {{"STATUS_REGISTER_LENGTH", "0"}}, {}, 0xFF, 0xFF, "0xFFFF", ""},
        {"negative length", {{"STATUS_REGISTER_LENGTH", "-3"}}, {}, 0xFF, 0xFF, "0xFFFF", ""},
        {"lines past the sixteenth show 0",
         {{"STATUS_REGISTER_LENGTH", "18"}, {"STATUS_LOCATION_16", "EXTRA16"}, {"STATUS_LOCATION_17", "EXTRA17"}},
         {}, 0xFF, 0xFF, "0xFFFF",
         "EXTRA17=1 EXTRA16=1 SUS=1 CMP=1 LB3=1 LB2=1 LB1=1 QE=1 SRL=1 SRP=1 SEC=1 TB=1 BP2=1 BP1=1 BP0=1 "
         "WEL=0 BUSY=0"},
        {"missing label skipped, hidden label in any case", {{"STATUS_LOCATION_11", "not_Valid"}},
         {"STATUS_LOCATION_5"}, 0x10, 0x00, "0x0010",
         "SUS=0 CMP=0 LB3=0 LB2=0 QE=0 SRL=0 SRP=0 SEC=0 BP2=1 BP1=0 BP0=0 WEL=0 BUSY=0"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.what);
        Properties properties = w25q128Properties();
        for (const auto& [key, value] : c.changes) properties[key] = value;
        for (const std::string& key : c.removed) properties.erase(key);
        auto device = makeDevice(properties);
        port.clear();
        sink.clear();
        flashStatus(c.register1, c.register2);
        EXPECT_TRUE(device->displayStatusRegisterBits(0));

        std::vector<std::string> expected = {std::string("FRAME_W25Q Status Register Contents = ") +
                                             c.contents + ".\n"};
        std::istringstream entries(c.lines);
        for (std::string entry; entries >> entry;) {
            const std::size_t equals = entry.find('=');
            expected.push_back(bitLine(entry.substr(0, equals), std::stoi(entry.substr(equals + 1))));
        }
        EXPECT_EQ(statusTexts(), expected);
    }
}

TEST_F(FrameStatusRegisters, DisplayIsSilentInFileModeOrWhenDisabled) {
    {
        auto device = makeDevice();
        port.fileMode = true;
        EXPECT_TRUE(device->displayStatusRegisterBits(0));
        EXPECT_EQ(port.lines(), std::vector<std::string>{"outputMode"});
    }
    port.clear();
    port.fileMode = false;
    {
        Properties properties = w25q128Properties();
        properties["READ_STATUS_ENABLED"] = "FALSE";
        auto device = makeDevice(properties);
        EXPECT_TRUE(device->displayStatusRegisterBits(0));
        EXPECT_EQ(port.lines(), std::vector<std::string>{"outputMode"});
    }
    EXPECT_TRUE(sink.messages().empty());
}

TEST_F(FrameStatusRegisters, AFailedRegisterReadEndsTheDisplay) {
    const struct {
        int failingShift;
        const char* message;
        std::size_t shifts;
    } cases[] = {
        {1, "'4': Error reading Status Register - 1.\n", 2},  // both shifts of a read always go out
        {2, "'4': Error reading Status Register - 1.\n", 2},
        {3, "'4': Error reading Status Register - 2.\n", 4},
        {4, "'4': Error reading Status Register - 2.\n", 4},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.failingShift);
        auto device = makeDevice();
        RecordingScanPort fresh;
        fresh.failingShifts = {c.failingShift};
        device->setScanPort(&fresh);
        sink.clear();
        EXPECT_FALSE(device->displayStatusRegisterBits(4));
        EXPECT_EQ(statusTexts(), std::vector<std::string>{c.message});
        EXPECT_EQ(fresh.count(ScanEvent::Kind::Shift), c.shifts);
    }
}

TEST_F(FrameStatusRegisters, UnlockWritesInstructionLengthZeroBitsLeftOpenThenWaits) {
    const struct {
        const char* instructionLength;
        std::string data;
    } cases[] = {{"8", "00000000"}, {"12", "000000000000"}, {"0", ""}, {"-4", ""}};
    for (const auto& c : cases) {
        SCOPED_TRACE(c.instructionLength);
        Properties properties = w25q128Properties();
        properties["INSTRUCTION_LENGTH"] = c.instructionLength;
        auto device = makeDevice(properties);
        port.clear();
        EXPECT_TRUE(device->unlockStatusRegister(0, nullptr));
        EXPECT_EQ(port.lines(), (std::vector<std::string>{kCommentWriteEnable, "shiftWrite 0 " + kWriteEnable,
                                                          kCommentWriteSr, "shiftWrite 1 " + kWriteStatus,
                                                          "shiftWrite 2 " + c.data, "wait 22500"}));
        EXPECT_TRUE(port.events.back().timeFlag);
    }
}

TEST_F(FrameStatusRegisters, UnlockRunsEveryStepWhateverFails) {
    const struct {
        std::vector<int> shifts, waits;
    } cases[] = {{{1}, {}}, {{2}, {}}, {{3}, {}}, {{}, {1}}};
    for (const auto& c : cases) {
        auto device = makeDevice();
        RecordingScanPort fresh;
        fresh.failingShifts = c.shifts;
        fresh.failingWaits = c.waits;
        device->setScanPort(&fresh);
        EXPECT_FALSE(device->unlockStatusRegister(0, nullptr));
        EXPECT_EQ(fresh.lines().size(), 6u);
    }
}

TEST_F(FrameStatusRegisters, QuadEnableWriteRewritesBothRegistersWithBitOneOfRegisterTwo) {
    const struct {
        bool set;
        unsigned register1, register2, written2;
        const char* registerLength;
        std::string padding;  // a longer register shifts zeros after both bytes
    } cases[] = {
        {true, 0x00, 0x00, 0x02, "16", ""},   // raw 0x00 -> 0x40
        {false, 0x00, 0xFF, 0xFD, "16", ""},  // raw 0xFF -> 0xBF
        {true, 0x9C, 0x02, 0x02, "16", ""},
        {false, 0x9C, 0x40, 0x40, "16", ""},
        {true, 0x80, 0x00, 0x02, "24", "00000000"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(std::to_string(c.register1) + "/" + std::to_string(c.register2));
        Properties properties = w25q128Properties();
        properties["STATUS_REGISTER_LENGTH"] = c.registerLength;
        auto device = makeDevice(properties);
        port.clear();
        flashStatus(c.register1, c.register2);
        EXPECT_TRUE(device->writeQuadEnableBit(0, nullptr, c.set));

        std::vector<std::string> expected = registerRead(kReadStatus1);
        expected.push_back("outputMode");
        for (const auto& line : registerRead(kReadStatus2)) expected.push_back(line);
        for (const std::string& line :
             {std::string("outputMode"), kCommentWriteEnable, "shiftWrite 0 " + kWriteEnable, kCommentWriteSr,
              "shiftWrite 1 " + kWriteStatus, "shiftWrite 3 " + wireByte(c.register1) + wireByte(c.written2) + c.padding,
              std::string("wait 22500")})
            expected.push_back(line);
        EXPECT_EQ(port.lines(), expected);
        EXPECT_EQ(device->cachedStatusByte(), 0xFF);
    }
}

TEST_F(FrameStatusRegisters, QuadEnableInFileModeMasksOnlyTheQuadEnableBitOfRegisterTwo) {
    auto device = makeDevice();
    port.fileMode = true;
    for (int run = 0; run < 2; ++run) {  // the cached byte is back to "no value" for the next run
        SCOPED_TRACE(run);
        port.clear();
        EXPECT_TRUE(device->writeQuadEnableBit(0, nullptr, true));
        std::vector<std::string> expected = registerRead(kReadStatus1);
        expected.push_back("outputMode");
        for (const auto& line : registerRead(kReadStatus2)) expected.push_back(line);
        for (const std::string& line :
             {std::string("outputMode"), kQuadEnableFileComment, kCommentWriteEnable,
              "shiftWrite 0 " + kWriteEnable, kCommentWriteSr, "shiftWrite 1 " + kWriteStatus,
              "shiftWrite 3 " + wireByte(0x00) + wireByte(0x02), std::string("wait 22500")})
            expected.push_back(line);
        EXPECT_EQ(port.lines(), expected);

        const std::vector<ScanEvent> scans = shifts();
        EXPECT_EQ(scans[1].tdoMask, "11111111");  // register 1: every bit compared
        EXPECT_EQ(scans[3].tdo, "00000000");
        EXPECT_EQ(scans[3].tdoMask, "11111101");  // register 2: all but Quad Enable (raw 0xBF)
        EXPECT_EQ(device->cachedStatusByte(), 0xFF);
    }
}

TEST_F(FrameStatusRegisters, QuadEnableWritesNothingUnlessBothRegistersWereRead) {
    const struct {
        const char* what;
        int failingShift;
        std::size_t events;
    } cases[] = {
        {"register 1 opening", 1, 4},
        {"register 1 capture", 2, 4},
        {"register 2 opening", 3, 10},
        {"register 2 capture", 4, 10},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.what);
        auto device = makeDevice();
        RecordingScanPort fresh;
        fresh.failingShifts = {c.failingShift};
        device->setScanPort(&fresh);
        EXPECT_FALSE(device->writeQuadEnableBit(0, nullptr, true));
        EXPECT_EQ(fresh.events.size(), c.events);
        EXPECT_EQ(fresh.count(ScanEvent::Kind::ShiftWrite), 0u);
        EXPECT_EQ(fresh.count(ScanEvent::Kind::Wait), 0u);
        EXPECT_EQ(device->cachedStatusByte(), 0xFF);
    }
}

TEST_F(FrameStatusRegisters, QuadEnableRefusesARegisterTooShortForBothBytes) {
    for (const char* length : {"15", "8", "0", "-1"}) {
        SCOPED_TRACE(length);
        Properties properties = w25q128Properties();
        properties["STATUS_REGISTER_LENGTH"] = length;
        auto device = makeDevice(properties);
        port.clear();
        sink.clear();
        for (bool fileMode : {false, true}) {
            port.fileMode = fileMode;
            EXPECT_FALSE(device->writeQuadEnableBit(0, nullptr, true));
        }
        EXPECT_TRUE(port.events.empty());
        EXPECT_EQ(debugTexts().size(), 2u);
        EXPECT_TRUE(statusTexts().empty());
        EXPECT_TRUE(infoTexts().empty());
        EXPECT_TRUE(sink.texts(MessageKind::Error).empty());
        port.fileMode = false;
    }
}

}  // namespace
}  // namespace vorant::test::frame
