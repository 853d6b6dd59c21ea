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

// The write enable and page program of a page are one USB write at the
// wait; the status poll after it is one write and one read.
TEST_F(MpsseSequence, APageProgramIsOneUsbWrite) {
    open("ftdi");
    const auto before = mpsse->writeCount();
    RLBitVec writeEnable = bits("00000110");
    RLBitVec program = bits("00000010" + std::string(24, '0') + std::string(256 * 8, '0'));
    ASSERT_TRUE(scan().shiftWrite(ScanStage::kWhole, &writeEnable, 0));
    ASSERT_TRUE(scan().shiftWrite(ScanStage::kWhole, &program, 0));
    EXPECT_EQ(mpsse->writeCount(), before) << "nothing reads: both are held";
    ASSERT_TRUE(scan().wait(700, true));
    EXPECT_EQ(mpsse->writeCount(), before + 1);
    EXPECT_EQ(flash.memory()[0], 0x00);
}

// A read longer than one write's reply goes out in pieces with chip select
// held low, and comes back whole and in order.
TEST_F(MpsseSequence, ALongReadComesBackWholeAcrossWrites) {
    for (std::size_t i = 0; i < 1500; ++i) flash.memory()[i] = static_cast<std::uint8_t>(i * 7 + i / 256);
    open("ftdi");
    RLBitVec read = bits("00000011" + std::string(24, '0'));
    ASSERT_TRUE(scan().shiftWrite(ScanStage::kOpen, &read, 0));
    RLBitVec tdi(1500 * 8, false), tdo(1500 * 8, true), mask(1500 * 8, false);
    ASSERT_TRUE(scan().shift(ScanStage::kCaptureClose, &tdi, nullptr, &tdo, &mask));
    for (std::size_t i = 0; i < 1500; ++i) {
        std::uint8_t byte = 0;
        for (int k = 0; k < 8; ++k) byte = static_cast<std::uint8_t>(byte << 1 | (tdo.getBit(i * 8 + k) ? 1 : 0));
        ASSERT_EQ(byte, flash.memory()[i]) << "byte " << i;
    }
    EXPECT_GT(mpsse->readCount(), 2u);
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

// The double itself, on the reference's examples and on the mistakes a
// port could make: a reply where the reference gives one, a refusal where
// the chip would clock garbage.
TEST_F(MpsseSequence, TheDoubleAnswersLikeTheReferenceAndCatchesAMisdrivenBus) {
    struct Row {
        const char* name;
        Bytes write;
        Bytes reply;          // when the write is accepted
        std::string refusal;  // when it is not
    };
    const Row rows[] = {
        {"ID, MSB first",
         {0x80, 0x00, 0x0B, 0x11, 0x00, 0x00, 0x9F, 0x20, 0x02, 0x00, 0x80, 0x08, 0x0B, 0x87},
         {0xEF, 0x40, 0x18},
         ""},
        {"ID, LSB first",
         {0x80, 0x00, 0x0B, 0x19, 0x00, 0x00, 0xF9, 0x28, 0x02, 0x00, 0x80, 0x08, 0x0B, 0x87},
         {0xF7, 0x02, 0x18},
         ""},
        {"ID, 4 bits then 4",
         {0x80, 0x00, 0x0B, 0x11, 0x00, 0x00, 0x9F, 0x22, 0x03, 0x22, 0x03, 0x80, 0x08, 0x0B, 0x87},
         {0x0E, 0x0F},
         ""},
        {"unknown opcode", {0xAB, 0x87}, {0xFA, 0xAB}, ""},
        {"chip select high", {0x80, 0x08, 0x0B, 0x11, 0x00, 0x00, 0x06}, {}, "with chip select (ADBUS3) high"},
        {"SCK an input", {0x80, 0x00, 0x0A, 0x11, 0x00, 0x00, 0x06}, {}, "SCK (ADBUS0) not an output"},
        {"MOSI an input", {0x80, 0x00, 0x09, 0x11, 0x00, 0x00, 0x06}, {}, "MOSI (ADBUS1) not an output"},
        {"out on the rising edge", {0x80, 0x00, 0x0B, 0x10, 0x00, 0x00, 0x06}, {}, "on the rising edge"},
        {"3-phase clocking", {0x8C, 0x80, 0x00, 0x0B, 0x11, 0x00, 0x00, 0x06}, {}, "3-phase"},
        {"length cut short", {0x80, 0x00, 0x0B, 0x11, 0x00}, {}, "malformed MPSSE command 11: its length"},
        {"data cut short", {0x80, 0x00, 0x0B, 0x11, 0x01, 0x00, 0x06}, {}, "carries 2 data bytes"},
    };
    for (const Row& row : rows) {
        FakeMpsse device(flash);
        ASSERT_TRUE(device.setBitmode(0x00, 0x02));
        ASSERT_TRUE(device.write(Bytes{0x8A, 0x97}));
        const bool accepted = device.write(row.write);
        EXPECT_EQ(accepted, row.refusal.empty()) << row.name << ": " << device.error();
        if (!accepted) {
            EXPECT_NE(device.error().find(row.refusal), std::string::npos) << row.name << ": " << device.error();
            continue;
        }
        Bytes reply(row.reply.size() + 1);
        std::size_t got = 0;
        ASSERT_TRUE(device.read(reply, got, std::chrono::milliseconds(0)));
        reply.resize(got);
        EXPECT_EQ(reply, row.reply) << row.name;
    }
}

}  // namespace
}  // namespace vorant::cables::test
