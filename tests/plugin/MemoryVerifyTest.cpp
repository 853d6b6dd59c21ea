// Verify and checksum as the scan port and the user see them: the page
// reads over the data's range, the stop at the first difference, the sums
// handed to the checksum accumulator, cancels and refusals.

#include "MemoryTestDoubles.h"

#include <cstdio>

namespace vorant::test::memory {
namespace {

using Verify = MemoryTest;

// An independent CRC-32 (reflected 0xEDB88320, zlib's), bit by bit.
std::uint32_t crc32Of(const Bytes& bytes) {
    std::uint32_t crc = 0xFFFFFFFFu;
    for (std::uint8_t byte : bytes) {
        crc ^= byte;
        for (int k = 0; k < 8; ++k) crc = (crc & 1u) ? (crc >> 1) ^ 0xEDB88320u : crc >> 1;
    }
    return ~crc;
}
std::string crcLine(const char* what, std::uint32_t crc) {
    char text[96];
    std::snprintf(text, sizeof text, "'0': Checksum (CRC-32) of the %s0x%08X\n", what, static_cast<unsigned>(crc));
    return text;
}

Lines pageRead(std::uint32_t address, const Bytes& expected) {
    return {kCommentVerifyRead, "shift 1 " + readFrame(address), "shift 12 " + wireBytes(expected), "isCancelled 2"};
}

const std::string kReading = "'0': Reading device contents...\n";
const std::string kCompleted = "'0': Verification completed.\n";
const std::string kChecksumRange =
    "All Checksum calculations are performed on the address range spanned by the configuration file.\n";

// 2.5 pages: three reads at 0, 8 and 16; the short last page is read and
// compared only as far as the data go.
TEST_F(Verify, ReadsEveryChunkOfTheDataFromAddressZero) {
    auto device = makeDevice();
    const Bytes data = patternBytes(20);
    Bytes flash = data;
    flash.resize(32, 0x00);  // past the data the flash differs, and is never compared
    port.responder = flashResponder(flash);
    MemoryImage image(data, 0x400);
    device->setConfigData(&image);

    EXPECT_TRUE(device->verify(0, nullptr));
    EXPECT_EQ(port.scanLines(), concat({pageRead(0, slice(data, 0, 8)), pageRead(8, slice(data, 8, 8)),
                                        pageRead(16, slice(data, 16, 4))}));
    EXPECT_EQ(status(), (Lines{kReading, "done.\n", kCompleted}));

    const std::vector<ScanEvent> reads = shifts();
    EXPECT_EQ(reads[0].tdiMask, std::string(32, '1'));
    EXPECT_EQ(reads[0].tdo, std::string(32, '0'));
    EXPECT_EQ(reads[0].tdoMask, std::string(32, '0'));
    EXPECT_EQ(reads[5].tdiMask, std::string(64, '1'));  // the read-data masks keep PAGE_SIZE bits
    EXPECT_EQ(reads[5].tdoMask, std::string(64, '1'));
    EXPECT_EQ(reads[5].tdoAfter, wireBytes(slice(data, 16, 4)));
}

TEST_F(Verify, StopsAtTheFirstDifferingPageWithTheReadersAddress) {
    auto device = makeDevice({{"READ_STATUS_ENABLED", "TRUE"}});
    const Bytes data = patternBytes(24);
    Bytes flash = data;
    flash[12] ^= 0x01;
    port.responder = flashResponder(flash);
    MemoryImage image(data, 0x100);
    device->setConfigData(&image);

    EXPECT_FALSE(device->verify(0, nullptr));
    EXPECT_EQ(status(), (Lines{kReading, "Failed at address, 264\n", "'0': Verification Terminated\n"}));
    Lines reads = concat({pageRead(0, slice(data, 0, 8)), pageRead(8, slice(data, 8, 8))});
    reads.pop_back();  // no cancel query after the failing page, and no display
    EXPECT_EQ(port.scanLines(), reads);
}

// Outcomes that still reach the end of the loop.
TEST_F(Verify, EndOfLoopOutcomes) {
    struct Case {
        const char* name;
        std::size_t dataBytes;
        std::vector<int> failingShifts;
        int cancelFromQuery;
        bool result;
        Lines messages;
        std::size_t pagesRead;
    };
    const Case cases[] = {
        {"a failed shift", 16, {1}, 0, false, {kReading, "done.\n", kCompleted}, 2},
        {"a cancel with data left", 24, {}, 1, false, {kReading, "done.\n", "'0': Verification cancelled.\n"}, 1},
        {"a cancel after the last page", 8, {}, 1, true, {kReading, "done.\n", kCompleted}, 1},
        {"empty data", 0, {}, 0, true, {kReading, "done.\n", kCompleted}, 0},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        port = RecordingScanPort();
        port.failingShifts = c.failingShifts;
        port.cancelFromQuery = c.cancelFromQuery;
        sink.clear();
        auto device = makeDevice();
        MemoryImage image(patternBytes(c.dataBytes));
        device->setConfigData(&image);

        EXPECT_EQ(device->verify(0, nullptr), c.result);
        EXPECT_EQ(status(), c.messages);
        EXPECT_EQ(port.count(ScanEvent::Kind::Shift), 2 * c.pagesRead);
    }
}

// A verify started by program ("-v"/"-verify") leaves the display to it.
TEST_F(Verify, StandAloneVerifyShowsTheStatusRegisters) {
    for (const auto& [tokens, shown] : {std::pair{Lines{}, true}, std::pair{Lines{"-v"}, false},
                                        std::pair{Lines{"-verify"}, false}}) {
        SCOPED_TRACE(tokens.empty() ? "stand-alone" : tokens[0]);
        port = RecordingScanPort();
        sink.clear();
        auto device = makeDevice({{"READ_STATUS_ENABLED", "TRUE"}});
        MemoryImage image({});
        device->setConfigData(&image);
        auto args = switches(tokens);
        EXPECT_TRUE(device->verify(0, args.get()));
        EXPECT_EQ(scanCount(), shown ? 6u : 0u);  // two register reads
    }
}

TEST_F(Verify, OperationNameSelectsTheMode) {
    struct Case {
        const char* operation;
        bool checksum;
    };
    for (const Case& c : {Case{nullptr, false}, Case{"VERIFY", false}, Case{"anything", false},
                          Case{"CHECKSUM", true}, Case{"checksum", true}}) {
        SCOPED_TRACE(c.operation ? c.operation : "null");
        sink.clear();
        auto device = makeDevice();
        MemoryImage image({});
        device->setConfigData(&image);
        EXPECT_TRUE(device->verify(0, nullptr, c.operation));
        EXPECT_EQ(status()[2], c.checksum ? kChecksumRange : kCompleted);
    }
}

// Both sums are CRC-32 of the bytes in flash order: the file's chunks and
// the pages read. The loop never stops at a difference.
TEST_F(Verify, ChecksumReportsBothSumsOverTheDataRange) {
    struct Case {
        const char* name;
        std::size_t dataBytes;
        int flippedByte;  // -1: the flash matches
    };
    for (const Case& c : {Case{"matching flash", 20, -1}, Case{"differing flash", 20, 3}, Case{"empty data", 0, -1}}) {
        SCOPED_TRACE(c.name);
        port = RecordingScanPort();
        sink.clear();
        auto device = makeDevice();
        const Bytes data = patternBytes(c.dataBytes);
        Bytes flash = data;
        flash.resize(32, 0xFF);
        if (c.flippedByte >= 0) flash[static_cast<std::size_t>(c.flippedByte)] ^= 0x80;
        port.responder = flashResponder(flash);
        MemoryImage image(data);
        device->setConfigData(&image);

        const bool match = c.flippedByte < 0;
        EXPECT_EQ(device->checksum(0, nullptr), match);
        Lines expected = {kReading, "done.\n", kChecksumRange, crcLine("configuration data: ", crc32Of(data)),
                          crcLine("device contents:    ", crc32Of(slice(flash, 0, data.size())))};
        if (match) expected.push_back("'0': Checksums match.\n");
        EXPECT_EQ(status(), expected);
        EXPECT_EQ(errors(), match ? Lines{} : Lines{"'0': Checksums differ.\n"});
        EXPECT_EQ(port.count(ScanEvent::Kind::Shift), 2 * ((data.size() + 7) / 8));
    }
}

// A cancelled checksum covers part of the range: no sums, and false.
TEST_F(Verify, CancelledChecksumReportsNoSums) {
    auto device = makeDevice();
    port.cancelFromQuery = 1;
    MemoryImage image(patternBytes(24));
    device->setConfigData(&image);
    EXPECT_FALSE(device->checksum(0, nullptr));
    EXPECT_EQ(status(), (Lines{kReading, "done.\n", "'0': Checksum cancelled.\n"}));
    EXPECT_TRUE(errors().empty());
}

TEST_F(Verify, RefusesWithoutDataOrWithAPageUnderOneByte) {
    struct Case {
        const char* name;
        bool checksum;
        bool noData;
        MessageKind kind;
        std::string message;
    };
    const Case cases[] = {
        {"verify without data", false, true, MessageKind::Info,
         "'0': Verification terminated, please assign a configuration Bitstream before attempting this "
         "operation.\n"},
        {"checksum without data", true, true, MessageKind::Info,
         "'0': Checksum terminated, please assign a configuration Bitstream before attempting this operation.\n"},
        {"verify with PAGE_SIZE 0", false, false, MessageKind::Error,
         "'0': Verification terminated, PAGE_SIZE (0 bits) is smaller than one byte.\n"},
        {"checksum with PAGE_SIZE 0", true, false, MessageKind::Error,
         "'0': Checksum terminated, PAGE_SIZE (0 bits) is smaller than one byte.\n"},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        port = RecordingScanPort();
        sink.clear();
        auto device = makeDevice({{"PAGE_SIZE", c.noData ? "64" : "0"}, {"READ_STATUS_ENABLED", "TRUE"}});
        MemoryImage image(patternBytes(8));
        if (!c.noData) device->setConfigData(&image);
        EXPECT_FALSE(c.checksum ? device->checksum(0, nullptr) : device->verify(0, nullptr));
        EXPECT_TRUE(port.events.empty());
        EXPECT_EQ(sink.texts(c.kind), Lines{c.message});
        EXPECT_EQ(sink.messages().size(), 1u);
    }
}

}  // namespace
}  // namespace vorant::test::memory
