// The simulator scan port: stage codes as chip-select framing, shift
// vectors as SPI clocks, waits as virtual time, and the injected faults.

#include "ports/sim/SimScanPort.h"
#include "tests/sim/SimTestSupport.h"

#include <gtest/gtest.h>

namespace vorant::sim::test {
namespace {

constexpr std::uint8_t kWip = 0x01, kWel = 0x02;

// Transfers as a device issues them, built from wire bytes.
struct Driver {
    SimScanPort& port;

    bool whole(const Bytes& bytes) {
        RLBitVec tdi = wireVector(bytes);
        return port.shiftWrite(ScanStage::kWhole, &tdi, 0);
    }
    bool writeEnable() { return whole({0x06}); }

    // Opening shift of `command`, then a stage-12 capture of `bits` bits
    // (tdi all 0, tdo passed separately); returns the capture.
    RLBitVec read(const Bytes& command, std::size_t bits) {
        RLBitVec opening = wireVector(command);
        RLBitVec ones(opening.length(), true), zeros(opening.length(), false);
        port.shift(ScanStage::kOpen, &opening, &ones, &zeros, &zeros);
        RLBitVec tdi(bits, false), mask(bits, true), capture(bits, false);
        port.shift(ScanStage::kCaptureClose, &tdi, &mask, &capture, &mask);
        return capture;
    }
    std::uint8_t status1() { return wireBytes(read({0x05}, 8))[0]; }
    Bytes readArray(std::uint32_t address, std::size_t n) {
        return wireBytes(read({0x03, static_cast<std::uint8_t>(address >> 16), static_cast<std::uint8_t>(address >> 8),
                               static_cast<std::uint8_t>(address)},
                              n * 8));
    }
    bool program(std::uint32_t address, const Bytes& data) {
        Bytes frame{0x02, static_cast<std::uint8_t>(address >> 16), static_cast<std::uint8_t>(address >> 8),
                    static_cast<std::uint8_t>(address)};
        frame.insert(frame.end(), data.begin(), data.end());
        RLBitVec tdi = wireVector(frame);
        RLBitVec ones(tdi.length(), true), zeros(tdi.length(), false);
        return port.shift(ScanStage::kWhole, &tdi, &ones, &zeros, &zeros);
    }
};

// The unlock opens with the write-status instruction (stage 1), sends its
// data (stage 2) and closes nothing; the wait after it must close the
// transaction first, so the chip is busy during the wait, not after it.
TEST(SimScanPort, AnOpenTransactionIsClosedByTheNextWait) {
    struct Case {
        int waitUs;
        std::uint8_t statusAfter;
    };
    const Case cases[] = {{10000, 0x00}, {9999, kWip | kWel}};
    for (const Case& c : cases) {
        SCOPED_TRACE(c.waitUs);
        SimScanPort port(smallPart());
        port.setClockHz(1'000'000'000);
        port.model().setStatus(0x1C, 0x00);
        Driver driver{port};
        ASSERT_TRUE(driver.writeEnable());
        RLBitVec instruction = wireVector({0x01}), data = wireVector({0x00});
        ASSERT_TRUE(port.shiftWrite(ScanStage::kOpen, &instruction, 0));
        ASSERT_TRUE(port.shiftWrite(ScanStage::kContinue, &data, 0));
        EXPECT_EQ(port.model().status1(), 0x1C | kWel) << "nothing happens while selected";
        ASSERT_TRUE(port.wait(c.waitUs, true));
        // The status read itself takes 16 ns at 1 GHz: not enough to finish.
        EXPECT_EQ(driver.status1(), c.statusAfter);
        EXPECT_EQ(port.stats().transactions, 3u);
    }
}

TEST(SimScanPort, AnOpenTransactionIsClosedByTheNextOpeningStage) {
    for (int opening : {ScanStage::kWhole, ScanStage::kOpen}) {
        SCOPED_TRACE(opening);
        SimScanPort port(smallPart());
        RLBitVec writeEnable = wireVector({0x06});
        ASSERT_TRUE(port.shiftWrite(ScanStage::kOpen, &writeEnable, 0));
        RLBitVec readStatus = wireVector({0x05, 0x00});
        RLBitVec ones(16, true), capture(16, false);
        ASSERT_TRUE(port.shift(opening, &readStatus, &ones, &capture, &ones));
        if (opening == ScanStage::kOpen) {
            RLBitVec tdi(8, false), tdo(8, false), mask(8, true);
            ASSERT_TRUE(port.shift(ScanStage::kCaptureClose, &tdi, &mask, &tdo, &mask));
            EXPECT_EQ(wireBytes(tdo)[0], kWel);
        } else {
            EXPECT_TRUE(port.model().writeEnabled());
        }
        EXPECT_EQ(bitText(capture), std::string(16, '0')) << "stage 0 leaves tdo alone";
        EXPECT_FALSE(port.model().selected() && opening == ScanStage::kWhole);
    }
}

TEST(SimScanPort, CaptureFillsExactlyTheBitsOfTdo) {
    const std::string id = "111011110100000000010000";  // EF 40 10, first bit first
    struct Case {
        const char* name;
        std::size_t tdiBits;
        std::size_t tdoBits;
        std::string expected;
    };
    const Case cases[] = {
        {"same length", 24, 24, id},
        {"short tdo, as on a short last page", 24, 20, id.substr(0, 20)},
        {"odd lengths", 13, 13, id.substr(0, 13)},
        {"tdo longer than the shift: the rest stays", 16, 24, id.substr(0, 16) + "11111111"},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        SimScanPort port(smallPart());
        RLBitVec opening = wireVector({0x9F});
        ASSERT_TRUE(port.shiftWrite(ScanStage::kOpen, &opening, 0));
        RLBitVec tdi(c.tdiBits, false), mask(c.tdiBits, true), tdo(c.tdoBits, true);
        ASSERT_TRUE(port.shift(ScanStage::kCaptureClose, &tdi, &mask, &tdo, &mask));
        EXPECT_EQ(bitText(tdo), c.expected);
        EXPECT_EQ(tdo.length(), c.tdoBits);
        // Storage bits past the length stay 0.
        if (c.tdoBits % 8) {
            EXPECT_EQ(tdo.data()[c.tdoBits / 8] >> (c.tdoBits % 8), 0);
        }
        EXPECT_FALSE(port.model().selected());
    }
}

// Readback and verify pass one vector as both tdi and tdo.
TEST(SimScanPort, CaptureIntoTheVectorThatIsShifted) {
    SimScanPort port(smallPart());
    Driver driver{port};
    Bytes page(256);
    for (std::size_t i = 0; i < page.size(); ++i) page[i] = static_cast<std::uint8_t>(i * 13 + 1);
    ASSERT_TRUE(driver.writeEnable());
    ASSERT_TRUE(driver.program(0x200, page));
    ASSERT_TRUE(port.wait(700, true));

    RLBitVec command = wireVector({0x03, 0x00, 0x02, 0x00});
    ASSERT_TRUE(port.shiftWrite(ScanStage::kOpen, &command, 0));
    RLBitVec expected(page.data(), page.size() * 8);  // the file's data, as verify builds it
    RLBitVec capture = expected;
    RLBitVec mask(page.size() * 8, true);
    ASSERT_TRUE(port.shift(ScanStage::kCaptureClose, &capture, &mask, &capture, &mask));
    EXPECT_TRUE(capture.equals(expected));
    EXPECT_EQ(wireBytes(capture), page);
}

TEST(SimScanPort, BitGranularTransfers) {
    SimScanPort port(smallPart());
    // The signature read: instruction, a 24-bit dummy field, 8 bits back.
    RLBitVec instruction = wireVector({0xAB}), dummy(24, true), ones(8, true), signature(8, false);
    ASSERT_TRUE(port.shift(ScanStage::kOpen, &instruction, &ones, &signature, &signature));
    ASSERT_TRUE(port.shift(ScanStage::kContinue, &dummy, &dummy, &dummy, &dummy));
    ASSERT_TRUE(port.shift(ScanStage::kCaptureClose, &ones, &ones, &signature, &ones));
    EXPECT_EQ(wireBytes(signature), Bytes{0x13});

    // An instruction split 3 + 5 bits.
    RLBitVec first = bitVector("100"), second = bitVector("11111");
    ASSERT_TRUE(port.shiftWrite(ScanStage::kOpen, &first, 0));
    ASSERT_TRUE(port.shiftWrite(ScanStage::kContinue, &second, 0));
    RLBitVec tdi(24, false), id(24, false);
    ASSERT_TRUE(port.shift(ScanStage::kCaptureClose, &tdi, &tdi, &id, &tdi));
    EXPECT_EQ(wireBytes(id), (Bytes{0xEF, 0x40, 0x10}));
}

TEST(SimScanPort, RefusesTransfersItCannotFrame) {
    struct Case {
        const char* name;
        int stage;
        bool nullTdi;
    };
    const Case cases[] = {
        {"continue without an open transaction", ScanStage::kContinue, false},
        {"close without an open transaction", ScanStage::kClose, false},
        {"capture without an open transaction", ScanStage::kCaptureClose, false},
        {"unknown stage", 7, false},
        {"no tdi", ScanStage::kWhole, true},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        SimScanPort port(smallPart());
        RLBitVec tdi = wireVector({0x06}), tdo(8, true);
        EXPECT_FALSE(port.shift(c.stage, c.nullTdi ? nullptr : &tdi, &tdo, &tdo, &tdo));
        EXPECT_FALSE(port.lastError().empty());
        EXPECT_FALSE(port.model().writeEnabled());
        EXPECT_EQ(bitText(tdo), "11111111");
        EXPECT_EQ(port.stats().bitsShifted, 0u);
        EXPECT_EQ(port.stats().transactions, 0u);
    }
    SimScanPort port(smallPart());
    EXPECT_FALSE(port.wait(-1, true));
    EXPECT_EQ(port.stats().simulatedNs, 0u);
}

TEST(SimScanPort, CountsBitsTransactionsAndTime) {
    struct Case {
        std::uint32_t hz;
        std::uint64_t nsPerBit;
    };
    for (const Case& c : {Case{50'000'000, 20}, Case{10'000'000, 100}, Case{1'000'000, 1000}}) {
        SCOPED_TRACE(c.hz);
        SimScanPort port(smallPart());
        if (c.hz != 50'000'000) port.setClockHz(c.hz);
        Driver driver{port};
        ASSERT_TRUE(driver.writeEnable());
        ASSERT_TRUE(driver.program(0, Bytes(256, 0x00)));  // 2080 bits, as the page frame
        ASSERT_TRUE(port.wait(0, true));
        ASSERT_TRUE(port.wait(700, true));
        const SimStats stats = port.stats();
        EXPECT_EQ(stats.bitsShifted, 8u + 2080u);
        EXPECT_EQ(stats.transactions, 2u);
        EXPECT_EQ(stats.shiftCalls, 2u);
        EXPECT_EQ(stats.waitCalls, 2u);
        EXPECT_EQ(stats.simulatedNs, 2088 * c.nsPerBit + 700'000);
    }
}

TEST(SimScanPortFaults, AFailingShiftPutsNothingOnTheWire) {
    FaultPlan faults;
    faults.failShiftAt = 2;
    SimScanPort port(smallPart(), faults);
    Driver driver{port};
    EXPECT_TRUE(driver.writeEnable());
    EXPECT_FALSE(driver.program(0, {0x00}));
    EXPECT_TRUE(port.wait(700, true));
    EXPECT_EQ(port.model().memory()[0], 0xFF);
    EXPECT_EQ(driver.status1(), kWel) << "later shifts work again";
    EXPECT_EQ(port.stats().bitsShifted, 8u + 16u);
}

TEST(SimScanPortFaults, FailingEveryShiftLeavesTdoAlone) {
    FaultPlan faults;
    faults.failAllShifts = true;
    SimScanPort port(smallPart(), faults);
    Driver driver{port};
    EXPECT_FALSE(driver.writeEnable());
    RLBitVec opening = wireVector({0x9F}), tdi(24, false), tdo(24, true);
    EXPECT_FALSE(port.shift(ScanStage::kOpen, &opening, &opening, &opening, &opening));
    EXPECT_FALSE(port.shift(ScanStage::kCaptureClose, &tdi, &tdi, &tdo, &tdi));
    EXPECT_EQ(bitText(tdo), std::string(24, '1'));
    EXPECT_EQ(port.stats().bitsShifted, 0u);
}

TEST(SimScanPortFaults, AFailingWaitLetsNoTimePassButClosesTheTransaction) {
    for (bool always : {false, true}) {
        SCOPED_TRACE(always);
        FaultPlan faults;
        if (always) faults.failAllWaits = true;
        else faults.failWaitAt = 1;
        SimScanPort port(smallPart(), faults);
        port.setClockHz(1'000'000'000);
        Driver driver{port};
        driver.writeEnable();
        RLBitVec instruction = wireVector({0x01}), data = wireVector({0x00});
        port.shiftWrite(ScanStage::kOpen, &instruction, 0);
        port.shiftWrite(ScanStage::kContinue, &data, 0);
        const std::uint64_t before = port.stats().simulatedNs;
        EXPECT_FALSE(port.wait(10000, true));
        EXPECT_EQ(port.stats().simulatedNs, before);
        EXPECT_TRUE(port.model().busy()) << "the status write started at the wait";
        EXPECT_EQ(port.wait(10000, true), !always);
    }
}

TEST(SimScanPortFaults, CancelAfterQueries) {
    struct Case {
        int after;
        std::vector<bool> answers;
    };
    const Case cases[] = {
        {-1, {false, false, false, false}},
        {0, {true, true}},
        {3, {false, false, false, true, true}},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.after);
        FaultPlan faults;
        faults.cancelAfterQueries = c.after;
        SimScanPort port(smallPart(), faults);
        std::vector<bool> answers;
        for (std::size_t i = 0; i < c.answers.size(); ++i) answers.push_back(port.isCancelled(2));
        EXPECT_EQ(answers, c.answers);
    }
}

TEST(SimScanPortFaults, CancelFlagFromOutside) {
    SimScanPort port(smallPart());
    EXPECT_FALSE(port.isCancelled(2));
    port.requestCancel();
    EXPECT_TRUE(port.isCancelled(2));
    port.clearCancel();
    EXPECT_FALSE(port.isCancelled(2));
    std::atomic<bool>* flag = &port.cancelFlag();  // what a signal handler keeps
    flag->store(true);
    EXPECT_TRUE(port.isCancelled(2));
}

// Stuck bits take the array read off its fast path.
TEST(SimScanPortFaults, StuckBitsShowInACapture) {
    FaultPlan faults;
    faults.stuckBits = {{0x101, 0x01, 0x00}};
    SimScanPort port(smallPart(), faults);
    Driver driver{port};
    driver.writeEnable();
    driver.program(0x100, {0xAA, 0xFF});
    port.wait(700, true);
    EXPECT_EQ(driver.readArray(0x100, 3), (Bytes{0xAA, 0xFE, 0xFF}));
}

TEST(SimScanPort, WholeTransactionWithCapture) {
    SimScanPort port(smallPart());
    RLBitVec tdi = wireVector({0x9F, 0, 0, 0});
    ASSERT_TRUE(port.transaction(tdi, &tdi));
    EXPECT_EQ(wireBytes(tdi), (Bytes{0xFF, 0xEF, 0x40, 0x10}));
    EXPECT_EQ(port.stats().transactions, 1u);
}

}  // namespace
}  // namespace vorant::sim::test
