// ProgressPort: progress measured from what goes over the wire, cancel
// queries answered and remembered, every call passed on unchanged.
#include "cli/ProgressPort.h"
#include "host/Hex2Bit.h"
#include "tests/support/RecordingScanPort.h"

#include <gtest/gtest.h>

#include <memory>
#include <vector>

namespace vorant::cli {
namespace {

using test::RecordingScanPort;

constexpr unsigned char kPageProgram = 0x02, kRead = 0x03, kBulkErase = 0xC7, kReadStatus = 0x05,
                        kWriteEnable = 0x06, kWriteDisable = 0x04;

// A vector whose first byte on the wire is `opcode`, `bits` long.
RLBitVec frameOf(unsigned char opcode, std::size_t bits) {
    RLBitVec frame(bits, false);
    for (int i = 0; i < 8; ++i) frame.setBit(static_cast<std::size_t>(i), (opcode >> (7 - i)) & 1);
    return frame;
}

struct Recorder : ProgressListener {
    std::vector<std::pair<long long, long long>> calls;
    void progressed(long long done, long long total) override { calls.emplace_back(done, total); }
};

class ProgressPortTest : public ::testing::Test {
protected:
    ProgressPlan plan() const {
        ProgressPlan p;
        p.totalSteps = 1000;
        p.pageProgramOpcode = kPageProgram;
        p.readOpcode = kRead;
        p.bulkEraseOpcode = kBulkErase;
        p.eraseSteps = 10;
        p.eraseStepMicroseconds = 100;
        p.pageBytes = 256;
        return p;
    }

    void pageProgram(ProgressPort& port) {
        RLBitVec frame = frameOf(kPageProgram, 2080), ones(2080, true), zeros(2080, false), zeros2(2080, false);
        port.shift(0, &frame, &ones, &zeros, &zeros2);
    }
    // An opening shift of `opcode` and a capture of `bits`.
    void readPair(ProgressPort& port, unsigned char opcode, std::size_t bits) {
        RLBitVec command = frameOf(opcode, 32), ones(32, true), zeros(32, false), zeros2(32, false);
        port.shift(1, &command, &ones, &zeros, &zeros2);
        RLBitVec capture(bits, true), mask(bits, true);
        port.shift(12, &capture, &mask, &capture, &mask);
    }
    void bareInstruction(ProgressPort& port, unsigned char opcode) {
        RLBitVec instruction = frameOf(opcode, 8);
        port.shiftWrite(0, &instruction, 0);
    }

    RecordingScanPort inner;
};

TEST_F(ProgressPortTest, CountsOnePerPageProgramTransaction) {
    ProgressPort port(inner, plan());
    Recorder listener;
    port.setListener(&listener);
    for (int page = 0; page < 3; ++page) {
        bareInstruction(port, kWriteEnable);
        pageProgram(port);
        port.wait(0, true);
        readPair(port, kReadStatus, 8);  // a busy poll is no page
        port.isCancelled(2);
    }
    EXPECT_EQ(port.stepsDone(), 3);
    EXPECT_EQ(port.pagesProgrammed(), 3u);
    EXPECT_EQ(port.dataBytes(), 3u * 256u);
    EXPECT_EQ(listener.calls, (std::vector<std::pair<long long, long long>>{{1, 1000}, {2, 1000}, {3, 1000}}));
}

TEST_F(ProgressPortTest, ABareInstructionWithThePageProgramOpcodeIsNoPage) {
    ProgressPort port(inner, plan());
    bareInstruction(port, kPageProgram);
    EXPECT_EQ(port.stepsDone(), 0);
}

TEST_F(ProgressPortTest, CountsPageReadsOnlyAfterAReadCommand) {
    ProgressPort port(inner, plan());
    readPair(port, kRead, 2048);
    readPair(port, kRead, 100);        // a short last chunk
    readPair(port, kReadStatus, 2048);  // a status read is no page
    // A capture after the read command's transaction was closed by a wait.
    RLBitVec command = frameOf(kRead, 32), ones(32, true), zeros(32, false), zeros2(32, false);
    port.shift(1, &command, &ones, &zeros, &zeros2);
    port.wait(0, true);
    RLBitVec capture(64, true), mask(64, true);
    port.shift(12, &capture, &mask, &capture, &mask);

    EXPECT_EQ(port.pagesRead(), 2u);
    EXPECT_EQ(port.stepsDone(), 2);
    EXPECT_EQ(port.dataBytes(), 256u + 12u);
}

TEST_F(ProgressPortTest, EraseAdvancesWithTheTimeWaitedAndCompletesWhenItEnds) {
    ProgressPort port(inner, plan());
    bareInstruction(port, kWriteEnable);
    RLBitVec erase = frameOf(kBulkErase, 8), ones(8, true), zeros(8, false), zeros2(8, false);
    port.shift(0, &erase, &ones, &zeros, &zeros2);
    port.wait(250, true);  // 2.5 increments
    EXPECT_EQ(port.stepsDone(), 2);
    readPair(port, kReadStatus, 8);
    port.wait(50, true);
    EXPECT_EQ(port.stepsDone(), 3);
    port.wait(100000, true);  // far past the erase's share
    EXPECT_EQ(port.stepsDone(), 10);
    bareInstruction(port, kWriteDisable);
    EXPECT_EQ(port.stepsDone(), 10);

    // An erase that ended before its share was waited still counts whole.
    port.shift(0, &erase, &ones, &zeros, &zeros2);
    port.wait(100, true);
    bareInstruction(port, kWriteDisable);
    EXPECT_EQ(port.stepsDone(), 20);
    // Waits after the erase are not erase progress.
    port.wait(100000, true);
    EXPECT_EQ(port.stepsDone(), 20);
}

TEST_F(ProgressPortTest, NeverPassesTheTotal) {
    ProgressPlan small = plan();
    small.totalSteps = 2;
    ProgressPort port(inner, small);
    for (int page = 0; page < 5; ++page) pageProgram(port);
    EXPECT_EQ(port.stepsDone(), 2);
    EXPECT_EQ(port.pagesProgrammed(), 5u);
}

TEST_F(ProgressPortTest, WithoutATotalCountsOn) {
    ProgressPlan open = plan();
    open.totalSteps = 0;
    ProgressPort port(inner, open);
    for (int page = 0; page < 5; ++page) pageProgram(port);
    EXPECT_EQ(port.stepsDone(), 5);
}

TEST_F(ProgressPortTest, AnswersTheUsersCancelAndRemembersIt) {
    std::atomic<bool> userCancel{false};
    ProgressPort port(inner, plan(), &userCancel);
    EXPECT_FALSE(port.isCancelled(2));
    EXPECT_FALSE(port.cancelSeen());
    userCancel.store(true);
    EXPECT_TRUE(port.isCancelled(2));
    EXPECT_TRUE(port.cancelSeen());
}

TEST_F(ProgressPortTest, PassesOnTheRealPortsCancel) {
    inner.cancelFromQuery = 2;
    ProgressPort port(inner, plan());
    EXPECT_FALSE(port.isCancelled(2));
    EXPECT_FALSE(port.cancelSeen());
    EXPECT_TRUE(port.isCancelled(2));
    EXPECT_TRUE(port.cancelSeen());
}

TEST_F(ProgressPortTest, PassesEveryCallOnUnchanged) {
    inner.fileMode = true;
    inner.failingShifts = {2};
    inner.failingWaits = {1};
    inner.responder = [](const std::string&, std::size_t bits) { return std::string(bits, '0') + "1"; };
    ProgressPort port(inner, plan());

    EXPECT_TRUE(port.outputMode());
    port.comment("//hello\n");
    RLBitVec command = frameOf(kRead, 32), ones(32, true), zeros(32, false), zeros2(32, false);
    EXPECT_TRUE(port.shift(1, &command, &ones, &zeros, &zeros2));
    RLBitVec capture(16, true), mask(16, true);
    EXPECT_FALSE(port.shift(12, &capture, &mask, &capture, &mask));  // the inner port's failure
    EXPECT_FALSE(port.wait(5, true));
    EXPECT_TRUE(port.wait(7, true));

    const std::vector<std::string> expected{"outputMode", "comment //hello\n", "shift 1 " + test::bitsOf(command),
                                            "shift 12 1111111111111111", "wait 5", "wait 7"};
    EXPECT_EQ(inner.lines(), expected);
}

TEST_F(ProgressPortTest, CapturedBitsReachTheCaller) {
    inner.responder = [](const std::string&, std::size_t bits) { return std::string(bits / 2, '1') + std::string(bits / 2, '0'); };
    ProgressPort port(inner, plan());
    RLBitVec command = frameOf(kRead, 32), ones(32, true), zeros(32, false), zeros2(32, false);
    port.shift(1, &command, &ones, &zeros, &zeros2);
    RLBitVec capture(8, false), mask(8, true);
    port.shift(12, &capture, &mask, &capture, &mask);
    EXPECT_EQ(test::bitsOf(capture), "11110000");
}

}  // namespace
}  // namespace vorant::cli
