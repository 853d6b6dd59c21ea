// The FTDI cable's USB writes, byte for byte, as the MPSSE command
// reference spells them for an SPI mode-0 master: the engine check and
// set-up at open, then a write enable (06h) and a status read (05h and one
// byte).

#include "host/RLBitVec.h"
#include "host/ScanPort.h"
#include "ports/PortTable.h"
#include "ports/sim/FlashModel.h"
#include "tests/doubles/FakeMpsse.h"
#include "tests/support/TestParts.h"

#include <gtest/gtest.h>

namespace vorant::cables::test {
namespace {

using vorant::test::FakeFtdiUsb;
using vorant::test::FakeMpsse;
using Bytes = std::vector<std::uint8_t>;

// Vector bits from text, first bit on the wire first.
RLBitVec bits(const std::string& text) {
    RLBitVec v(text.size(), false);
    for (std::size_t i = 0; i < text.size(); ++i) v.setBit(i, text[i] == '1');
    return v;
}

class MpsseSequence : public ::testing::Test {
protected:
    static void SetUpTestSuite() {
        partName = vorant::test::addTestPart("TEST_MPSSE", vorant::test::w25q128Properties());
    }
    void open(const std::string& address, unsigned wiredChipSelect = 3) {
        port.reset();
        usb.reset();
        mpsse = std::make_unique<FakeMpsse>(flash, wiredChipSelect);
        usb = std::make_unique<FakeFtdiUsb>(mpsse.get());
        usb->devices = {FakeFtdiUsb::ft232h()};
        ports::PortContext context;
        context.partName = partName;
        port = ports::findPort("ftdi")->open(ports::parsePortAddress(address), context);
    }
    void TearDown() override {
        port.reset();
        if (mpsse) {
            EXPECT_EQ(mpsse->misuse, std::vector<std::string>{});
        }
    }
    ScanPort& scan() { return port->scan(); }

    static inline std::string partName;
    sim::FlashModel flash{sim::FlashConfig::fromPartDatabase(partName)};
    std::unique_ptr<FakeMpsse> mpsse;
    std::unique_ptr<FakeFtdiUsb> usb;
    std::unique_ptr<ports::Port> port;
};

TEST_F(MpsseSequence, WriteEnableAndStatusReadAreTheReferenceBytes) {
    struct Row {
        const char* address;
        unsigned chipSelect;
        Bytes setUp, writeEnable, statusRead;
    };
    const Row rows[] = {
        // 6 MHz by default: divisor 4. Chip select ADBUS3: idle 80 08 0B.
        {"ftdi",
         3,
         {0x8A, 0x86, 0x04, 0x00, 0x8D, 0x97, 0x85, 0x80, 0x08, 0x0B},
         {0x80, 0x00, 0x0B, 0x11, 0x00, 0x00, 0x06, 0x80, 0x08, 0x0B},
         {0x80, 0x00, 0x0B, 0x11, 0x00, 0x00, 0x05, 0x31, 0x00, 0x00, 0x00, 0x80, 0x08, 0x0B, 0xAA, 0x87}},
        // 30 MHz: divisor 0. Chip select ADBUS5: idle 80 20 23.
        {"ftdi:0403:6014,speed=30000000,cs=ADBUS5",
         5,
         {0x8A, 0x86, 0x00, 0x00, 0x8D, 0x97, 0x85, 0x80, 0x20, 0x23},
         {0x80, 0x00, 0x23, 0x11, 0x00, 0x00, 0x06, 0x80, 0x20, 0x23},
         {0x80, 0x00, 0x23, 0x11, 0x00, 0x00, 0x05, 0x31, 0x00, 0x00, 0x00, 0x80, 0x20, 0x23, 0xAA, 0x87}},
    };
    for (const Row& row : rows) {
        open(row.address, row.chipSelect);
        RLBitVec writeEnable = bits("00000110"), readStatus = bits("00000101");
        ASSERT_TRUE(scan().shiftWrite(ScanStage::kWhole, &writeEnable, 0));
        ASSERT_TRUE(scan().wait(0, true));
        ASSERT_TRUE(scan().shiftWrite(ScanStage::kOpen, &readStatus, 0));
        RLBitVec tdi(8, false), tdo(8, true), mask(8, false);
        ASSERT_TRUE(scan().shift(ScanStage::kCaptureClose, &tdi, nullptr, &tdo, &mask));
        const std::vector<Bytes> expected = {{0xAA, 0x87}, row.setUp, row.writeEnable, row.statusRead};
        EXPECT_EQ(mpsse->writes, expected) << row.address;
        // WEL (bit 1) set, captured first bit first: 00000010.
        EXPECT_EQ(tdo.getBit(6), true) << row.address;
        EXPECT_EQ(mpsse->log.front() + " " + mpsse->log[1] + " " + mpsse->log[2], "bitmode 00 bitmode 02 purge");
    }
}

// speed= is rounded down to a step of 30 MHz / (divisor + 1).
TEST_F(MpsseSequence, SpeedRoundsDownToAStepOfTheDivider) {
    const std::pair<const char*, double> rows[] = {
        {"ftdi", 6e6},          {"ftdi,speed=30M", 30e6},  {"ftdi,speed=20000000", 15e6},
        {"ftdi,speed=7M", 6e6}, {"ftdi,speed=1000k", 1e6}, {"ftdi,speed=458", 30e6 / 65503},
    };
    for (const auto& [address, hz] : rows) {
        open(address);
        EXPECT_DOUBLE_EQ(mpsse->sckHz(), hz) << address;
    }
}

}  // namespace
}  // namespace vorant::cables::test
