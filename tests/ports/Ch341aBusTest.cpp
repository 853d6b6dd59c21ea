// The CH341A cable against its double: the packets of a write enable and a
// status read byte for byte (written from the stream protocol: CS0# on D0
// through UIO packets, data in A8 packets, every byte mirrored), long
// transfers cut into packets, and answers that come wrong, late or not at
// all failing instead of becoming data.

#include "host/RLBitVec.h"
#include "host/ScanPort.h"
#include "ports/ch341a/Ch341aBus.h"
#include "ports/ch341a/Ch341aPort.h"
#include "ports/sim/FlashModel.h"
#include "tests/doubles/FakeCh341a.h"
#include "tests/support/TestParts.h"

#include <gtest/gtest.h>

#include <functional>

namespace vorant::ports::ch341a::test {
namespace {

using vorant::test::FakeCh341a;

// A packet followed by another in one transfer is padded to 32 bytes.
std::string padded(const std::string& packet) {
    std::string text = packet;
    for (std::size_t bytes = (packet.size() + 1) / 3; bytes < 32; ++bytes) text += " 00";
    return text;
}

const std::string kSetup = padded("AA 61 00") + " AB B7 7F 20";  // one data line; CS0# high, D0..D5 driven

class Ch341aBusTest : public ::testing::Test {
protected:
    Ch341aBusTest() : flash(sim::FlashConfig::fromPartDatabase(part())), fake(flash) {}
    static std::string part() {
        static const std::string name = vorant::test::addTestPart("TEST_CH341A", vorant::test::w25q128Properties());
        return name;
    }
    // A status read (05h, one byte back) straight on the bus.
    bool readStatus(std::uint8_t& status) {
        const std::uint8_t opcode = 0x05, filler = 0x00;
        const spi::SpiSegment segments[] = {{&opcode, 1, nullptr}, {&filler, 1, &status}};
        return bus->transact(segments);
    }
    void openBus() {
        bus = std::make_unique<Ch341aBus>(fake.connect());
        ASSERT_TRUE(bus->start()) << bus->error();
    }

    sim::FlashModel flash;
    FakeCh341a fake;
    std::unique_ptr<Ch341aBus> bus;
};

TEST_F(Ch341aBusTest, WriteEnableAndStatusReadAreTheseBytes) {
    std::unique_ptr<Port> cable = openCh341aCable(fake.connect(), "ch341a:1:5");
    ScanPort& scan = cable->scan();
    RLBitVec wren(8, false), read(8, false), filler(8, false), status(8, true);
    for (int bit : {5, 6}) wren.setBit(bit, true);  // 06h, MSB first
    for (int bit : {5, 7}) read.setBit(bit, true);  // 05h
    ASSERT_TRUE(scan.shiftWrite(ScanStage::kWhole, &wren, 0));
    ASSERT_TRUE(scan.shiftWrite(ScanStage::kOpen, &read, 0));
    ASSERT_TRUE(scan.shift(ScanStage::kCaptureClose, &filler, nullptr, &status, nullptr));
    ASSERT_TRUE(scan.wait(0, true));
    EXPECT_EQ(fake.transfers, std::vector<std::string>({
                                  kSetup,
                                  padded("AB B6 20") + " A8 60",        // CS0# low; 06h mirrored
                                  padded("AB B7 B6 20") + " A8 A0 00",  // CS0# high, low; 05h mirrored, filler
                                  "AB B7 20",                           // CS0# high before the wait
                              }));
    EXPECT_EQ(fake.log, std::vector<std::string>({"stream 61", "uio cs=1 dir=3F", "uio cs=0", "spi 06", "in 1",
                                                  "uio cs=1 cs=0", "spi 05 00", "in 2", "uio cs=1"}));
    // WEL, as the flash answered it: 02h, captured MSB first.
    std::string bits;
    for (std::size_t i = 0; i < 8; ++i) bits += status.getBit(i) ? '1' : '0';
    EXPECT_EQ(bits, "00000010");
    cable.reset();
    EXPECT_EQ(fake.transfers.back(), "AB B7 40 20") << "the pins are let go at the end";
}

// 03h, a 3-byte address and 256 bytes read: 260 bytes clocked, so nine SPI
// packets (8 x 31 + 12), each answered, the page kept from the last 256.
TEST_F(Ch341aBusTest, ALongTransactionIsCutIntoPacketsAndItsAnswersJoined) {
    for (std::size_t i = 0; i < 256; ++i) flash.memory()[0x100 + i] = static_cast<std::uint8_t>(i * 7 + 3);
    openBus();
    const std::uint8_t command[] = {0x03, 0x00, 0x01, 0x00};
    std::vector<std::uint8_t> zeros(256, 0), page(256, 0);
    const spi::SpiSegment segments[] = {{command, 4, nullptr}, {zeros.data(), 256, page.data()}};
    ASSERT_TRUE(bus->transact(segments)) << bus->error();
    EXPECT_EQ(page, std::vector<std::uint8_t>(flash.memory().begin() + 0x100, flash.memory().begin() + 0x200));
    ASSERT_EQ(fake.transfers.size(), 1u + 9u);
    EXPECT_EQ(fake.transfers[1].substr(0, 3 * 37 - 1), padded("AB B6 20") + " A8 C0 00 80 00");  // 03 00 01 00
    EXPECT_EQ(fake.transfers.back().size(), 13u * 3 - 1) << "A8 and the last 12 bytes";
    EXPECT_EQ(fake.inTransfers, 1u + 9u);  // the drain at start, then one per packet
}

// Whatever goes wrong with an answer, the caller's bytes stay as they were
// and the bus says what happened; a device still there works on.
TEST_F(Ch341aBusTest, AWrongLateOrMissingAnswerIsAFailureNeverData) {
    struct Row {
        const char* name;
        std::function<void(FakeCh341a&)> fault;
        std::string error;
        bool lost;
    };
    // Packets 1 and 2 are the setup; the status read is packets 3 (CS) and 4 (A8).
    const Row rows[] = {
        {"short",
         [](FakeCh341a& f) {
             f.answerFaultAtSpiPacket = 1;
             f.answerSizeChange = -1;
         },
         "the CH341A answered an SPI packet of 2 bytes with 1 bytes", false},
        {"long",
         [](FakeCh341a& f) {
             f.answerFaultAtSpiPacket = 1;
             f.answerSizeChange = 1;
         },
         "the CH341A answered an SPI packet of 2 bytes with 3 bytes", false},
        {"none",
         [](FakeCh341a& f) {
             f.answerFaultAtSpiPacket = 1;
             f.answerWithheld = true;
         },
         "the CH341A did not answer an SPI packet of 2 bytes within 1000 ms", false},
        {"transfer", [](FakeCh341a& f) { f.failAtPacket = 4; },
         "sending to the CH341A failed: LIBUSB_ERROR_IO: Input/Output Error", false},
        {"unplugged", [](FakeCh341a& f) { f.vanishAtPacket = 3; },
         "the CH341A is gone (unplugged?): LIBUSB_ERROR_NO_DEVICE", true},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        FakeCh341a device(flash);
        bus = std::make_unique<Ch341aBus>(device.connect());
        ASSERT_TRUE(bus->start());
        row.fault(device);
        std::uint8_t status = 0xA5;
        EXPECT_FALSE(readStatus(status));
        EXPECT_EQ(status, 0xA5);
        EXPECT_EQ(bus->error().rfind(row.error, 0), 0u) << bus->error();
        EXPECT_EQ(bus->lost(), row.lost);
        if (row.lost) {
            EXPECT_FALSE(bus->flush());
            continue;
        }
        ASSERT_TRUE(readStatus(status)) << bus->error();
        EXPECT_EQ(status, 0x00);
        ASSERT_TRUE(bus->flush());
        EXPECT_FALSE(device.chipSelected());
        bus.reset();
    }
}

// The double refuses what the device would not run, so a port that sends
// it cannot pass.
TEST_F(Ch341aBusTest, TheDoubleRefusesMalformedPackets) {
    const std::pair<std::vector<std::uint8_t>, std::string> rows[] = {
        {{0xA8, 0x60}, "SPI data while chip select is high"},
        {{0x55, 0x00}, "unknown command 55"},
        {{0xAB, 0xB6}, "UIO stream without its end (20)"},
        {{0xAB, 0xBE, 0x7F, 0x20}, "SCK high as chip select falls"},
        {{0xAB, 0xB6, 0x41, 0x20, 0xA8, 0x60}, "SPI data with SCK or MOSI not driven"},
    };
    for (const auto& [bytes, refusal] : rows) {
        FakeCh341a device(flash);
        std::vector<std::uint8_t> transfer = bytes;
        if (transfer[0] == 0xAB && transfer.size() > 4) transfer.insert(transfer.begin() + 4, 28, 0x00);
        EXPECT_EQ(device.connect()->bulkOut(transfer.data(), transfer.size(), std::chrono::milliseconds(10)),
                  BulkResult::Failed);
        EXPECT_EQ(device.refusal.rfind(refusal, 0), 0u) << device.refusal;
    }
    // A command longer than a packet spills into the next, whose first byte
    // is no command.
    FakeCh341a device(flash);
    std::vector<std::uint8_t> transfer = {0xAB, 0xB6, 0x7F, 0x20};
    transfer.resize(32, 0x00);
    transfer.push_back(0xA8);
    transfer.resize(32 + 40, 0x00);
    EXPECT_EQ(device.connect()->bulkOut(transfer.data(), transfer.size(), std::chrono::milliseconds(10)),
              BulkResult::Failed);
    EXPECT_EQ(device.refusal, "unknown command 00");
}

}  // namespace
}  // namespace vorant::ports::ch341a::test
