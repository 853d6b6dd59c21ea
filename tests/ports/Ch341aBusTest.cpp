// The CH341A cable against its double: the packets of a write enable and a
// status read byte for byte, and answers that come wrong, late or not at
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

}  // namespace
}  // namespace vorant::ports::ch341a::test
