// Readback to file: the page reads over the whole flash, what the writer
// receives (captured bytes at byte offsets), and which outcomes count as a
// success.

#include "MemoryTestDoubles.h"

namespace vorant::test::memory {
namespace {

class Readback : public MemoryTest {
protected:
    std::shared_ptr<WriterLog> writer = registerRecordingWriter();
};

// A captured page as the writer gets it: each flash byte bit-reversed.
Bytes captured(const Bytes& flashBytes) {
    Bytes out;
    for (std::uint8_t byte : flashBytes) out.push_back(SPIDevice::swapBits(byte));
    return out;
}

const std::string kStart = "'0': Performing readback on device...\n";
const std::string kSuccess = "'0': Reaback completed successfully.\n";

TEST_F(Readback, ReadsEveryPageAndHandsItToTheWriterAtItsOffset) {
    auto device = makeDevice();
    const Bytes flash = patternBytes(32, 0x01);
    port.responder = flashResponder(flash);
    auto args = switches({"-f", "image.memtest"});

    EXPECT_TRUE(device->readbackToFile(0, args.get()));
    // Each data shift sends out the page before it: zeros for the first.
    Lines expected = concat({writeEnable(), {"comment //Performing readback.\n"}});
    for (std::uint32_t page = 0; page < 4; ++page) {
        const std::string sent = page == 0 ? std::string(64, '0') : wireBytes(slice(flash, 8 * (page - 1), 8));
        expected = concat({expected, {kCommentRead, "shift 1 " + readFrame(8 * page), "shift 12 " + sent,
                                      "isCancelled 2"}});
    }
    EXPECT_EQ(port.scanLines(), expected);
    EXPECT_EQ(status(), (Lines{kStart, kSuccess}));

    EXPECT_EQ(writer->fileName, "image.memtest");
    EXPECT_EQ(writer->calls, (Lines{"begin", "write 0 64", "write 8 64", "write 16 64", "write 24 64", "end",
                                    "destroyed"}));
    for (std::size_t page = 0; page < 4; ++page) {
        EXPECT_EQ(writer->pages[page].data, captured(slice(flash, 8 * page, 8)));
        EXPECT_EQ(writer->pages[page].reserved, 0);
    }
    const std::vector<ScanEvent> reads = shifts();
    EXPECT_EQ(reads[1].tdiMask, std::string(32, '1'));
    EXPECT_EQ(reads[1].tdoMask, std::string(32, '0'));
    EXPECT_EQ(reads[2].tdo, reads[2].tdi);  // the capture vector is both
    EXPECT_EQ(reads[2].tdiMask, std::string(64, '1'));
    EXPECT_EQ(reads[2].tdoMask, std::string(64, '1'));
}

// 100 bits of 64-bit pages: two whole pages at 0 and 8; none for size 0.
TEST_F(Readback, PageCountFollowsTheDeviceSize) {
    for (const auto& [deviceSize, calls] :
         {std::pair{"100", Lines{"begin", "write 0 64", "write 8 64", "end", "destroyed"}},
          std::pair{"0", Lines{"begin", "end", "destroyed"}}}) {
        SCOPED_TRACE(deviceSize);
        *writer = WriterLog();
        sink.clear();
        auto device = makeDevice({{"DEVICE_SIZE", deviceSize}});
        auto args = switches({"-f", "size.memtest"});
        EXPECT_TRUE(device->readbackToFile(0, args.get()));
        EXPECT_EQ(writer->calls, calls);
        EXPECT_EQ(status(), (Lines{kStart, kSuccess}));
    }
}

TEST_F(Readback, FileNameComesFromFElseFile) {
    for (const auto& [tokens, name] :
         {std::pair{Lines{"-file", "long.memtest", "-f", "short.memtest"}, "short.memtest"},
          std::pair{Lines{"-file", "long.memtest"}, "long.memtest"},
          std::pair{Lines{"-f", "-file", "fallback.memtest"}, "fallback.memtest"}}) {
        SCOPED_TRACE(name);
        auto device = makeDevice({{"DEVICE_SIZE", "0"}});
        auto args = switches(tokens);
        EXPECT_TRUE(device->readbackToFile(0, args.get()));
        EXPECT_EQ(writer->fileName, name);
    }
}

// Refusals send no scan and create no writer.
TEST_F(Readback, RefusesBeforeAnyScan) {
    struct Case {
        const char* name;
        Lines tokens;
        bool nullArgs;
        const char* pageSize;
        Lines statusMessages;
        Lines errorMessages;
    };
    const Lines noName = {"'0': No file name specified...\n", "'0': Readback terminated\n"};
    const Case cases[] = {
        {"no switches", {}, true, "64", noName, {}},
        {"no file switch", {"-v"}, false, "64", noName, {}},
        {"file switch without a name", {"-f"}, false, "64", noName, {}},
        {"file cannot be written", {"-f", "locked.nowrite"}, false, "64", {},
         {"'0': Readback terminated, the file 'locked.nowrite' cannot be written.\n"}},
        {"PAGE_SIZE 0", {"-f", "zero.memtest"}, false, "0", {},
         {"'0': Readback terminated, PAGE_SIZE (0 bits) is smaller than one byte.\n"}},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        port = RecordingScanPort();
        sink.clear();
        *writer = WriterLog();
        auto device = makeDevice({{"PAGE_SIZE", c.pageSize}});
        auto args = switches(c.tokens);
        EXPECT_FALSE(device->readbackToFile(0, c.nullArgs ? nullptr : args.get()));
        EXPECT_TRUE(port.events.empty());
        EXPECT_TRUE(writer->calls.empty());
        EXPECT_EQ(status(), c.statusMessages);
        EXPECT_EQ(errors(), c.errorMessages);
    }
}

// Only a complete run with every scan and write succeeding is a success;
// the pages read are in the file whatever happened.
TEST_F(Readback, OnlyACompleteCleanRunIsASuccess) {
    struct Case {
        const char* name;
        std::vector<int> failingShifts;
        int cancelFromQuery;
        bool failWrite;
        bool result;
        Lines statusMessages;
        Lines errorMessages;
        std::size_t pagesWritten;
    };
    const std::string readFailed = "'0': Readback failed, a scan to the device did not succeed.\n";
    const Case cases[] = {
        {"failed read", {3}, 0, false, false, {kStart}, {readFailed}, 4},
        {"failed write enable", {1}, 0, false, false, {kStart}, {readFailed}, 4},
        {"cancel after the first page", {}, 1, false, false, {kStart, "'0': Readback cancelled.\n"}, {}, 1},
        {"cancel after the last page", {}, 4, false, true, {kStart, kSuccess}, {}, 4},
        {"failed file write", {}, 0, true, false, {kStart},
         {"'0': Readback failed, the file 'out.memtest' could not be written.\n"}, 4},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        port = RecordingScanPort();
        port.failingShifts = c.failingShifts;
        port.cancelFromQuery = c.cancelFromQuery;
        sink.clear();
        *writer = WriterLog();
        writer->failWrite = c.failWrite;
        auto device = makeDevice();
        auto args = switches({"-f", "out.memtest"});

        EXPECT_EQ(device->readbackToFile(0, args.get()), c.result);
        EXPECT_EQ(status(), c.statusMessages);
        EXPECT_EQ(errors(), c.errorMessages);
        EXPECT_EQ(writer->pages.size(), c.pagesWritten);
        EXPECT_EQ(tail(writer->calls, 2), (Lines{"end", "destroyed"}));
    }
}

}  // namespace
}  // namespace vorant::test::memory
