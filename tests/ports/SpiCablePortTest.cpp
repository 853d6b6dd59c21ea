// The scan port every SPI cable shares, on a bus that logs each
// transaction as hex segments ("9F >3": 9Fh sent, then three bytes read)
// and answers reads from a script. What a cable's own bus makes of these
// is its own test; this is the framing and the byte order of the bytes.

#include "host/RLBitVec.h"
#include "host/ScanPort.h"
#include "ports/spi/SpiCablePort.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <string>
#include <vector>

namespace vorant::ports::spi::test {
namespace {

class LoggingBus final : public SpiBus {
public:
    std::vector<std::string> log;
    std::vector<std::uint8_t> answer;  // what every read returns, from its first byte

    bool transact(std::span<const SpiSegment> segments) override {
        std::string line = "tx";
        for (const SpiSegment& segment : segments) {
            line += " ";
            if (segment.miso != nullptr) {
                line += ">" + std::to_string(segment.length);
                for (std::size_t i = 0; i < segment.length; ++i) segment.miso[i] = i < answer.size() ? answer[i] : 0xFF;
                continue;
            }
            for (std::size_t i = 0; i < segment.length; ++i) {
                char hex[3];
                std::snprintf(hex, sizeof hex, "%02X", segment.mosi[i]);
                line += hex;
            }
        }
        log.push_back(line);
        return true;
    }
    bool flush() override {
        log.push_back("flush");
        return true;
    }
    bool pause(std::uint64_t us) override {
        log.push_back("pause " + std::to_string(us));
        return true;
    }
    std::string error() const override { return "bulk write failed"; }
    bool lost() const override { return false; }
};

RLBitVec wireBytes(std::vector<unsigned char> bytes) { return RLBitVec(bytes.data(), bytes.size() * 8); }

class SpiCablePortTest : public ::testing::Test {
protected:
    bool send(int stage, std::vector<unsigned char> bytes) {
        RLBitVec tdi = wireBytes(std::move(bytes));
        return port.shiftWrite(stage, &tdi, 0);
    }
    LoggingBus bus;
    SpiCablePort port{"cable", bus};
};

// The unlock's status write is left open; the wait deselects it, puts it
// on the wire, and only then lets its time pass.
TEST_F(SpiCablePortTest, AWaitClosesFlushesThenPauses) {
    ASSERT_TRUE(send(ScanStage::kWhole, {0x06}));
    ASSERT_TRUE(send(ScanStage::kOpen, {0x01}));
    ASSERT_TRUE(send(ScanStage::kContinue, {0x00, 0x02}));
    ASSERT_TRUE(port.wait(15000, true));
    ASSERT_TRUE(port.wait(0, true));
    EXPECT_EQ(bus.log, std::vector<std::string>({"tx 06", "tx 01 0002", "flush", "pause 15000", "flush"}));
    EXPECT_EQ(port.stats().transactions, 2u);
}

// A capture shorter than its shift fills only its own bits.
TEST_F(SpiCablePortTest, AShortCaptureKeepsTheRestOfTdoClear) {
    bus.answer = {0xFF};
    ASSERT_TRUE(send(ScanStage::kOpen, {0x05}));
    RLBitVec tdi(8, false), tdo(3, false);
    ASSERT_TRUE(port.shift(ScanStage::kCaptureClose, &tdi, nullptr, &tdo, nullptr));
    EXPECT_EQ(tdo.data()[0], 0x07);
}

// A bus failure and a lost device are each cable's own table.
TEST_F(SpiCablePortTest, AShiftOfPartBytesIsRefusedAndNothingSent) {
    RLBitVec odd(12, false);
    EXPECT_FALSE(port.shiftWrite(ScanStage::kWhole, &odd, 0));
    EXPECT_STREQ(port.failureReason(), "cable: a shift of 12 bits; an SPI cable moves whole bytes");
    EXPECT_TRUE(bus.log.empty());
}

}  // namespace
}  // namespace vorant::ports::spi::test
