// Bulk erase as the scan port sees it: the wait and polling of each port
// mode, the time-out path, the Quad Enable clear and the register display.

#include "MemoryTestDoubles.h"

namespace vorant::test::memory {
namespace {

using Erase = MemoryTest;

const Lines kEraseStart = {kCommentErase, "shift 0 " + kBulkErase};
const Lines kOneBusyPoll = concat({statusRead(), {"wait 4000000", "isCancelled 2"}, statusRead()});

struct ModeCase {
    const char* name;
    bool fileMode;
    bool pollingSwitchedOff;
    Lines afterEraseShift;
    friend void PrintTo(const ModeCase& c, std::ostream* os) { *os << c.name; }
};

class EraseModes : public Erase, public ::testing::WithParamInterface<ModeCase> {};

TEST_P(EraseModes, WaitsAndPollsAsThePortModeRequires) {
    const ModeCase& c = GetParam();
    auto device = c.pollingSwitchedOff ? makeDeviceWithoutPolling() : makeDevice();
    port.fileMode = c.fileMode;
    port.scriptStatus(kReadStatus1, 1);

    EXPECT_TRUE(device->erase(3, nullptr));
    // The second outputMode is the register display's (disabled on this part).
    EXPECT_EQ(port.lines(), concat({writeEnable(), {"outputMode"}, kEraseStart, c.afterEraseShift, {"outputMode"},
                                    writeDisable()}));
    EXPECT_EQ(status(), Lines{"'3': Erasing Device.\n"});
    EXPECT_TRUE(errors().empty());

    const ScanEvent eraseShift = shifts()[1];
    EXPECT_EQ(eraseShift.stage, 0);
    EXPECT_EQ(eraseShift.tdiMask, "11111111");
    EXPECT_EQ(eraseShift.tdo, "00000000");
    EXPECT_EQ(eraseShift.tdoMask, "00000000");
}

INSTANTIATE_TEST_SUITE_P(
    PortModes, EraseModes,
    ::testing::Values(ModeCase{"CableWithPolling", false, false,
                               concat({{"wait 40000000"}, kOneBusyPoll, {"isCancelled 2"}})},
                      ModeCase{"CableWithoutPolling", false, true, {"wait 40000000"}},
                      ModeCase{"FileMode", true, false, {"wait 300000000"}},
                      ModeCase{"FileModeWithoutPolling", true, true, {"wait 300000000"}}),
    [](const auto& info) { return std::string(info.param.name); });

// A flash that stays busy past the limit, or a cancel during polling, ends
// the erase with the error, a write disable and nothing else: no Quad
// Enable clear and no display, although both are asked for.
TEST_F(Erase, PollingThatFailsEndsWithTheErrorAndAWriteDisable) {
    struct Case {
        const char* name;
        int cancelFromQuery;
        Lines polling;
    };
    const Lines busyRead = statusRead();
    const Case cases[] = {
        // Limit 8000000 in steps of 4000000: reads at 0, 4 and 8 s, time-out after the third wait.
        {"time-out", 0,
         concat({busyRead, {"wait 4000000", "isCancelled 2"}, busyRead, {"wait 4000000", "isCancelled 2"}, busyRead,
                 {"wait 4000000", "isCancelled 2"}})},
        {"cancel", 1, concat({busyRead, {"wait 4000000", "isCancelled 2"}})},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        port = RecordingScanPort();
        sink.clear();
        auto device = makeDevice({{"BULKERASE_MAXWAITTIME", "8000000"},
                                  {"X4_READ", "TRUE"},
                                  {"READ_STATUS_ENABLED", "TRUE"}});
        port.scriptStatus(kReadStatus1, 1000);
        port.cancelFromQuery = c.cancelFromQuery;

        EXPECT_FALSE(device->erase(1, nullptr));
        EXPECT_EQ(port.scanLines(), concat({writeEnable(), kEraseStart, {"wait 40000000"}, c.polling, writeDisable()}));
        EXPECT_EQ(errors(), Lines{"'1': Erase did not complete.\n"});
        EXPECT_EQ(debug(), Lines{"'1': Device has exceeded the allocated time.\n"});
        EXPECT_EQ(status(), Lines{"'1': Erasing Device.\n"});
    }
}

// In file mode nothing is polled, so a failed erase scan only skips the
// Quad Enable clear and the display, and the result is false.
TEST_F(Erase, FailedScanWithoutPollingSkipsTheClosingStepsSilently) {
    auto device = makeDevice({{"X4_READ", "TRUE"}});
    port.fileMode = true;
    port.failingShifts = {2};
    EXPECT_FALSE(device->erase(0, nullptr));
    EXPECT_EQ(port.scanLines(), concat({writeEnable(), kEraseStart, {"wait 300000000"}, writeDisable()}));
    EXPECT_TRUE(errors().empty());
}

// "-qebit" or X4_READ: after the erase, both registers are read and written
// back with the Quad Enable bit (raw register-2 bit 6) cleared.
TEST_F(Erase, QuadEnableIsClearedAfterASuccessfulEraseWhenAskedOrX4Capable) {
    struct Case {
        const char* name;
        Lines tokens;
        const char* x4Read;
    };
    const Case cases[] = {{"-qebit", {"-qebit"}, "FALSE"}, {"X4_READ", {}, "TRUE"}};
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        port = RecordingScanPort();
        port.fileMode = true;
        // Register 1 reads 0x1C (block protect bits), register 2 reads 0x02 (QE).
        port.responder = [](const std::string& opening, std::size_t) {
            return opening == kReadStatus2 ? wireBits(0x02, 8) : wireBits(0x1C, 8);
        };
        auto device = makeDevice({{"X4_READ", c.x4Read}});
        auto args = switches(c.tokens);

        EXPECT_TRUE(device->erase(0, args.get()));
        EXPECT_EQ(port.scanLines(),
                  concat({writeEnable(), kEraseStart, {"wait 300000000"}, statusRead(kReadStatus1),
                          statusRead(kReadStatus2),
                          {"comment // The previous SDR scan only masks the Quad Enable bit and assumes that the "
                           "other bits in the Status Register-2 are all zeros. If this SDR scan fails, the mask "
                           "and data must be modified to reflect the real states of these bits.\n"},
                          writeEnable(),
                          {kCommentWriteSr, "shiftWrite 1 " + kWriteSr,
                           "shiftWrite 3 " + wireBits(0x1C, 8) + wireBits(0x00, 8), "wait 22500"},
                          writeDisable()}));
    }
}

TEST_F(Erase, AFailedQuadEnableWriteFailsTheErase) {
    auto device = makeDevice({{"X4_READ", "TRUE"}});
    port.fileMode = true;
    port.failingWaits = {2};  // the wait after the 'write SR' scan
    EXPECT_FALSE(device->erase(0, nullptr));
    EXPECT_EQ(port.scanLines().back(), "shiftWrite 0 " + kWriteDisable);
}

// "-e"/"-erase" (program's erase) drop the register display and nothing else.
TEST_F(Erase, EraseSwitchesSuppressOnlyTheRegisterDisplay) {
    const Lines display = {kCommentReadStatus, "shift 1 " + kReadStatus1, "shift 12 00000000",
                           kCommentReadStatus, "shift 1 " + kReadStatus2, "shift 12 00000000"};
    const Lines base = concat({writeEnable(), kEraseStart, {"wait 40000000"}, statusRead(), {"isCancelled 2"}});
    struct Case {
        Lines tokens;
        bool shown;
    };
    for (const Case& c : {Case{{}, true}, Case{{"-e"}, false}, Case{{"-erase"}, false}, Case{{"-v"}, true}}) {
        SCOPED_TRACE(c.tokens.empty() ? "no switch" : c.tokens[0]);
        port = RecordingScanPort();
        sink.clear();
        auto device = makeDevice({{"READ_STATUS_ENABLED", "TRUE"}});
        auto args = switches(c.tokens);
        EXPECT_TRUE(device->erase(0, args.get()));
        EXPECT_EQ(port.scanLines(), concat({base, c.shown ? display : Lines{}, writeDisable()}));
        // The start line; when shown, the contents line and 15 labelled bits (one is NOT_VALID).
        EXPECT_EQ(status().size(), c.shown ? 17u : 1u);
    }
}

// USE_UNLOCKSR: the unlock comes first; its failure does not fail the erase.
TEST_F(Erase, UnlockRunsFirstAndItsFailureIsIgnored) {
    auto device = makeDevice({{"USE_UNLOCKSR", "TRUE"}});
    port.fileMode = true;
    port.failingShifts = {2};  // the unlock's 'write SR' instruction
    EXPECT_TRUE(device->erase(0, nullptr));
    EXPECT_EQ(port.scanLines(),
              concat({writeEnable(),
                      {kCommentWriteSr, "shiftWrite 1 " + kWriteSr, "shiftWrite 2 00000000", "wait 22500"},
                      writeEnable(), kEraseStart, {"wait 300000000"}, writeDisable()}));
}

}  // namespace
}  // namespace vorant::test::memory
