// The SPI command layer as the scan port sees it: write enable and disable,
// the status read and its polling loop, the release from deep power-down.

#include "FrameFixture.h"

#include <climits>

namespace vorant::test::frame {
namespace {

using FrameSpiCommands = FrameTest;

const std::string kOnes8 = "11111111";
const std::string kZeros8 = "00000000";

TEST_F(FrameSpiCommands, WriteEnableAndDisableAreOneCommentAndOneWholeShiftEachCall) {
    auto device = makeDevice();
    EXPECT_TRUE(device->spienable(0, nullptr));
    EXPECT_TRUE(device->spienable(0, nullptr));
    EXPECT_TRUE(device->spidisable(0, nullptr));
    EXPECT_EQ(port.lines(), (std::vector<std::string>{
                                kCommentWriteEnable, "shiftWrite 0 " + kWriteEnable,
                                kCommentWriteEnable, "shiftWrite 0 " + kWriteEnable,
                                kCommentWriteDisable, "shiftWrite 0 " + kWriteDisable}));
}

TEST_F(FrameSpiCommands, WriteLatchInstructionsKeepTheirConfiguredLengthAndReportFailure) {
    Properties properties = w25q128Properties();
    properties["ENABLE_INSTRUCTION"] = "000001101";
    properties["DISABLE_INSTRUCTION"] = "0000";
    auto device = makeDevice(properties);
    port.failAllShifts = true;
    port.fileMode = true;  // the comment goes out in every mode
    EXPECT_FALSE(device->spienable(0, nullptr));
    EXPECT_FALSE(device->spidisable(0, nullptr));
    EXPECT_EQ(port.lines(), (std::vector<std::string>{kCommentWriteEnable, "shiftWrite 0 000001101",
                                                      kCommentWriteDisable, "shiftWrite 0 0000"}));
}

TEST_F(FrameSpiCommands, ReleaseSendsTheSignatureInstructionThenWaitsTheReleaseTime) {
    auto device = makeDevice();
    EXPECT_TRUE(device->releaseFromStandBy(0, nullptr));
    EXPECT_EQ(port.lines(),
              (std::vector<std::string>{kCommentReadSig, "shift 0 " + kReadSignature, "wait 5"}));
    const ScanEvent& shift = port.events[1];
    EXPECT_EQ(shift.tdiMask, kOnes8);
    EXPECT_EQ(shift.tdo, kZeros8);
    EXPECT_EQ(shift.tdoMask, kZeros8);
    EXPECT_TRUE(port.events[2].timeFlag);
}

TEST_F(FrameSpiCommands, ReleaseWaitsEvenAfterAFailedShiftAndReportsEitherFailure) {
    auto device = makeDevice();
    port.failingShifts = {1};
    EXPECT_FALSE(device->releaseFromStandBy(0, nullptr));
    EXPECT_EQ(port.lines().back(), "wait 5");

    port.clear();
    port.failingShifts.clear();
    port.failingWaits = {1};
    EXPECT_FALSE(device->releaseFromStandBy(0, nullptr));
}

TEST_F(FrameSpiCommands, StatusReadOpensWithTheInstructionAndCapturesAsManyBits) {
    auto device = makeDevice();
    device->readStatus(0, "wip");
    EXPECT_EQ(port.lines(), (std::vector<std::string>{kCommentReadStatus, "shift 1 " + kReadStatus1,
                                                      "shift 12 " + kZeros8}));
    const ScanEvent& open = port.events[1];
    EXPECT_EQ(open.tdiMask, kOnes8);
    EXPECT_EQ(open.tdo, kZeros8);
    EXPECT_EQ(open.tdoMask, kZeros8);
    const ScanEvent& capture = port.events[2];
    EXPECT_EQ(capture.tdiMask, kOnes8);
    EXPECT_EQ(capture.tdo, kZeros8);
    EXPECT_EQ(capture.tdoMask, kOnes8);
}

TEST_F(FrameSpiCommands, StatusReadTestsTheNamedBitCountedFromTheEndOfTheCapture) {
    using VORANT_TYPE1SPINS::NOT_SET;
    using VORANT_TYPE1SPINS::WEL_SET;
    using VORANT_TYPE1SPINS::WIP_SET;
    const struct {
        unsigned status;
        const char* name;
        VORANT_TYPE1SPINS::RESULT expected;
    } cases[] = {
        {0x01, "wip", WIP_SET}, {0x01, "WIP", WIP_SET}, {0x03, "Wip", WIP_SET},
        {0x02, "wel", WEL_SET}, {0x02, "Wel", WEL_SET}, {0x03, "WEL", WEL_SET},
        {0x02, "wip", NOT_SET}, {0x01, "wel", NOT_SET}, {0xFC, "wip", NOT_SET}, {0xFD, "wel", NOT_SET},
        {0x03, "busy", NOT_SET}, {0x03, "", NOT_SET}, {0x03, "wip ", NOT_SET},
    };
    auto device = makeDevice();
    for (const auto& c : cases) {
        SCOPED_TRACE(std::string(c.name) + " of status " + std::to_string(c.status));
        RecordingScanPort fresh;
        fresh.scriptStatus(kReadStatus1, 0, c.status);
        device->setScanPort(&fresh);
        EXPECT_EQ(device->readStatus(0, c.name), c.expected);
        // Any name scans all the same.
        EXPECT_EQ(fresh.count(ScanEvent::Kind::Shift), 2u);
    }
    device->setScanPort(&port);
}

TEST_F(FrameSpiCommands, WriteInProgressIsTheLastBitCaptured) {
    auto device = makeDevice();
    port.scriptStatus(kReadStatus1, 0, 0x01);
    EXPECT_EQ(device->readStatus(0, "wip"), VORANT_TYPE1SPINS::WIP_SET);
    // Status bit 0 is vector bit 7: storage byte 0x80 of the raw capture.
    EXPECT_EQ(port.events.back().tdoAfter, "00000001");
}

TEST_F(FrameSpiCommands, StatusReadIgnoresShiftResultsAndAnswersFromTheCapture) {
    auto device = makeDevice();
    port.scriptStatus(kReadStatus1, 1, 0x00);
    port.failingShifts = {1};  // the opening shift fails, the capture still answers busy
    EXPECT_EQ(device->readStatus(0, "wip"), VORANT_TYPE1SPINS::WIP_SET);
}

TEST_F(FrameSpiCommands, PollingReadsFirstAndWaitsOnlyWhileBusy) {
    constexpr int kAlwaysBusy = INT_MAX;
    const struct {
        const char* what;
        int maxWait, step, busyReads, cancelFromQuery;
        bool expected;
        std::size_t reads, waits;
    } cases[] = {
        {"idle flash, no time allowed", 0, 5, 0, 0, true, 1, 0},
        {"busy flash, no time allowed", 0, 5, kAlwaysBusy, 0, false, 1, 1},
        {"stays busy past the limit", 10, 5, kAlwaysBusy, 0, false, 3, 3},
        {"clears on the third read", 10, 5, 2, 0, true, 3, 2},
        {"wait sum equal to the limit still reads", 10, 10, 1, 0, true, 2, 1},
        {"negative limit", -1, 5, kAlwaysBusy, 0, false, 0, 0},
        {"cancel ends the loop", 1000, 5, kAlwaysBusy, 2, false, 2, 2},
        {"step 0 ends only on cancel", 0, 0, kAlwaysBusy, 4, false, 4, 4},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.what);
        auto device = makeDevice();
        RecordingScanPort fresh;
        fresh.scriptStatus(kReadStatus1, c.busyReads, 0x00);
        fresh.cancelFromQuery = c.cancelFromQuery;
        device->setScanPort(&fresh);
        EXPECT_EQ(device->checkStatus(0, c.maxWait, c.step), c.expected);
        std::size_t reads = 0;
        for (const ScanEvent& event : fresh.events)
            if (event.kind == ScanEvent::Kind::Shift && event.stage == 12) ++reads;
        EXPECT_EQ(reads, c.reads);
        EXPECT_EQ(fresh.count(ScanEvent::Kind::Wait), c.waits);
        EXPECT_EQ(fresh.count(ScanEvent::Kind::Cancel), c.waits);  // one query after every wait
    }
}

TEST_F(FrameSpiCommands, PollingStreamWaitsTheStepThenAsksForACancel) {
    auto device = makeDevice();
    port.scriptStatus(kReadStatus1, 1, 0x00);
    port.failingWaits = {1};  // a failed wait does not end the polling
    EXPECT_TRUE(device->checkStatus(0, 100, 70));
    const std::vector<std::string> read = {kCommentReadStatus, "shift 1 " + kReadStatus1, "shift 12 " + kZeros8};
    std::vector<std::string> expected = read;
    expected.push_back("wait 70");
    expected.push_back("isCancelled 2");
    expected.insert(expected.end(), read.begin(), read.end());
    EXPECT_EQ(port.lines(), expected);
}

}  // namespace
}  // namespace vorant::test::frame
