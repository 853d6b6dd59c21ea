// The simulator scan port: stage codes as chip-select framing, vectors as
// SPI clocks, waits as virtual time, and the injected faults.

#include "ports/sim/SimScanPort.h"
#include "tests/sim/SimTestSupport.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <tuple>

// Fault plans name only the faults they set.
#pragma GCC diagnostic ignored "-Wmissing-field-initializers"

namespace vorant::sim::test {
namespace {

bool send(SimScanPort& port, int stage, const std::string& hex) {
    RLBitVec tdi = wireVector(hexBytes(hex));
    return port.shiftWrite(stage, &tdi, 0);
}

// An opening shift of `command`, then a stage-12 capture of `bits` bits
// into a vector of ones (a capture that does not happen reads all ones);
// the value received, first bit most significant.
unsigned read(SimScanPort& port, const std::string& command, std::size_t bits = 8) {
    send(port, ScanStage::kOpen, command);
    RLBitVec tdi(bits, false), tdo(bits, true);
    port.shift(ScanStage::kCaptureClose, &tdi, &tdi, &tdo, &tdi);
    return static_cast<unsigned>(std::stoul(bitText(tdo), nullptr, 2));
}

// The unlock shifts stage 1 then stage 2 and leaves the transaction open:
// the wait after it must deselect first, so the status write (10000 us)
// runs during the wait, not after it. An opening stage also closes it.
TEST(SimScanPort, AnOpenTransactionIsClosedByTheNextWaitOrOpeningStage) {
    for (int waitUs : {10000, 9999}) {
        SimScanPort port(smallPart());
        port.setClockHz(1'000'000'000);
        port.model().setStatus(0x1C, 0x00);
        send(port, ScanStage::kWhole, "06");
        send(port, ScanStage::kOpen, "01");
        send(port, ScanStage::kContinue, "00");
        EXPECT_EQ(port.model().status1(), 0x1C | kWel) << "nothing happens while selected";
        ASSERT_TRUE(port.wait(waitUs, true));
        EXPECT_EQ(read(port, "05"), waitUs == 10000 ? 0x00u : kWip | kWel) << waitUs;
    }
    SimScanPort port(smallPart());
    send(port, ScanStage::kOpen, "06");
    EXPECT_EQ(read(port, "05"), kWel);
    send(port, ScanStage::kOpen, "04");
    send(port, ScanStage::kWhole, "06");
    EXPECT_TRUE(port.model().writeEnabled());
    EXPECT_EQ(port.stats().transactions, 4u);
}

TEST(SimScanPort, RefusesTransfersItCannotFrame) {
    // -1 stands for a stage-0 shift without tdi.
    for (int stage : {ScanStage::kContinue, ScanStage::kClose, ScanStage::kCaptureClose, 7, -1}) {
        SimScanPort port(smallPart());
        RLBitVec tdi = wireVector({0x06}), tdo(8, true);
        EXPECT_FALSE(port.shift(stage < 0 ? ScanStage::kWhole : stage, stage < 0 ? nullptr : &tdi, &tdo, &tdo, &tdo));
        EXPECT_FALSE(port.lastError().empty()) << stage;
        EXPECT_FALSE(port.model().writeEnabled()) << stage;
        EXPECT_EQ(bitText(tdo), "11111111") << stage;
        EXPECT_EQ(port.stats().bitsShifted, 0u) << stage;
    }
    SimScanPort port(smallPart());
    EXPECT_FALSE(port.wait(-1, true));
    EXPECT_EQ(port.stats().simulatedNs, 0u);
}

TEST(SimScanPort, CaptureFillsTheBitsOfTdoAndLeavesTheRest) {
    const std::string id = "111011110100000000010000";  // EF 40 10
    const std::tuple<std::size_t, std::size_t, std::string> cases[] = {  // tdi bits, tdo bits, tdo
        {24, 24, id},
        {24, 18, id.substr(0, 18)},  // a short tdo, as on a short last page
        {13, 13, id.substr(0, 13)},
        {16, 24, id.substr(0, 16) + "11111111"},
    };
    for (const auto& [tdiBits, tdoBits, expected] : cases) {
        SimScanPort port(smallPart());
        RLBitVec first = bitVector("100"), rest = bitVector("11111");  // 9Fh in 3 + 5 bits
        port.shiftWrite(ScanStage::kOpen, &first, 0);
        port.shiftWrite(ScanStage::kContinue, &rest, 0);
        RLBitVec tdi(tdiBits, false), tdo(tdoBits, true);
        ASSERT_TRUE(port.shift(ScanStage::kCaptureClose, &tdi, &tdi, &tdo, &tdi));
        EXPECT_EQ(bitText(tdo), expected);
        EXPECT_EQ(tdo.data()[(tdoBits - 1) / 8] >> ((tdoBits - 1) % 8 + 1), 0) << "storage past the length";
        EXPECT_FALSE(port.model().selected());
        EXPECT_EQ(port.stats().bitsShifted, 8 + tdiBits);
    }
}

// One run under each fault at 10 MHz: write enable, a program of C0h at
// 10h left open for the wait to close, a 700 us wait, a 0 us wait, a status
// read, a read of 10h, three cancel queries. The outcome: whether the two
// shifts and the two waits succeeded, busy after the first wait, the status
// and the byte read, the byte in the array, the cancel answers, the bits and
// transactions on the bus and its time.
TEST(SimScanPort, RunsUnderEachFault) {
    const std::pair<FaultPlan, const char*> cases[] = {
        {{}, "11 11 busy 0 sr 00 rd C0 mem C0 cancel 000 bits 104/4 ns 710400"},
        {{.stuckBusy = true}, "11 11 busy 1 sr 03 rd FF mem C0 cancel 000 bits 104/4 ns 710400"},
        {{.stuckBits = {{0x10, 0x81, 0x01}}}, "11 11 busy 0 sr 00 rd 41 mem C0 cancel 000 bits 104/4 ns 710400"},
        {{.protectAtPowerOn = true}, "11 11 busy 0 sr 1C rd FF mem FF cancel 000 bits 104/4 ns 710400"},
        {{.startInDeepPowerDown = true}, "11 11 busy 0 sr FF rd FF mem FF cancel 000 bits 104/4 ns 710400"},
        {{.failShiftAt = 2}, "10 11 busy 0 sr 02 rd FF mem FF cancel 000 bits 64/3 ns 706400"},
        {{.failAllShifts = true}, "00 11 busy 0 sr FF rd FF mem FF cancel 000 bits 0/0 ns 700000"},
        {{.failWaitAt = 1}, "11 01 busy 1 sr 03 rd FF mem C0 cancel 000 bits 104/4 ns 10400"},
        // The program and the read are the page transactions.
        {{.cancelAfterPages = 2}, "11 11 busy 0 sr 00 rd C0 mem C0 cancel 111 bits 104/4 ns 710400"},
        {{.cancelAfterPages = 3}, "11 11 busy 0 sr 00 rd C0 mem C0 cancel 000 bits 104/4 ns 710400"},
        {{.failShiftAtPage = 1}, "10 11 busy 0 sr 02 rd FF mem FF cancel 000 bits 64/3 ns 706400"},
        {{.failShiftAtPage = 2}, "11 11 busy 0 sr 00 rd FF mem C0 cancel 000 bits 64/3 ns 706400"},
        {{.disconnectAtShift = 2}, "10 00 busy 0 sr FF rd FF mem FF cancel 000 bits 8/1 ns 800"},
    };
    for (const auto& [faults, expected] : cases) {
        SimScanPort port(smallPart(), faults);
        port.setClockHz(10'000'000);
        const bool enabled = send(port, ScanStage::kWhole, "06");
        const bool programmed = send(port, ScanStage::kOpen, "02 000010 C0");
        const bool waited = port.wait(700, true), busy = port.model().busy(), waitedAgain = port.wait(0, true);
        const unsigned status = read(port, "05"), data = read(port, "03 000010");
        std::string cancel;
        for (int i = 0; i < 3; ++i) cancel += port.isCancelled(2) ? '1' : '0';
        char outcome[80];
        std::snprintf(outcome, sizeof outcome, "%d%d %d%d busy %d sr %02X rd %02X mem %02X cancel %s", enabled,
                      programmed, waited, waitedAgain, busy, status, data, port.model().memory()[0x10], cancel.c_str());
        const SimStats bus = port.stats();
        EXPECT_EQ(outcome + (" bits " + std::to_string(bus.bitsShifted) + "/" + std::to_string(bus.transactions) +
                             " ns " + std::to_string(bus.simulatedNs)), expected);
    }
}

}  // namespace
}  // namespace vorant::sim::test
