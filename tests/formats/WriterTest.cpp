// Readback writers: bit order, record layout, atomic replacement, and a
// readback written and read again.
#include "formats/BinaryWriter.h"
#include "formats/ConfigDataFiles.h"
#include "formats/FormatError.h"
#include "formats/IntelHexWriter.h"
#include "tests/formats/FormatsTestFiles.h"

#include <gtest/gtest.h>

#include <numeric>
#include <unistd.h>

namespace vorant::formats {
namespace {
using testing::Bytes;

// Hands flash bytes to a writer the way a readback does: captured (bit
// order reversed), one page per call.
bool writePages(ConfigDataWriter& writer, const Bytes& flashBytes, int offset, std::size_t pageBytes) {
    const Bytes capture = testing::captured(flashBytes);
    bool ok = true;
    for (std::size_t start = 0; start < capture.size(); start += pageBytes) {
        const std::size_t count = std::min(pageBytes, capture.size() - start);
        ok &= writer.writeData(capture.data() + start, offset + static_cast<int>(start), static_cast<int>(count * 8), 0);
    }
    return ok;
}

Bytes sequence(unsigned char first, std::size_t count) {
    Bytes bytes(count);
    std::iota(bytes.begin(), bytes.end(), first);
    return bytes;
}

TEST(BinaryWriter, CapturedBytesAreBitReversedBackToFlashBytes) {
    testing::ScratchDirectory dir;
    const std::string path = dir.file("out.bin");
    // A captured 0x80 is the flash byte 0x01 (first bit read in bit 0).
    const Bytes capture{0x80, 0x01, 0x0F, 0x48, 0x00, 0xFF, 0xA5};
    BinaryWriter writer(path);
    ASSERT_TRUE(writer.beginWrite());
    ASSERT_TRUE(writer.writeData(capture.data(), 0, static_cast<int>(capture.size() * 8), 0));
    ASSERT_TRUE(writer.endWrite());
    EXPECT_EQ(testing::readFile(path), (Bytes{0x01, 0x80, 0xF0, 0x12, 0x00, 0xFF, 0xA5}));
}

TEST(BinaryWriter, GapsReadErasedAndLowerOffsetsOverwrite) {
    testing::ScratchDirectory dir;
    const std::string path = dir.file("out.bin");
    BinaryWriter writer(path);
    ASSERT_TRUE(writePages(writer, Bytes{1, 2}, 4, 2));
    ASSERT_TRUE(writePages(writer, Bytes{9}, 1, 1));
    ASSERT_TRUE(writePages(writer, Bytes{7}, 7, 1));
    ASSERT_TRUE(writer.endWrite());
    EXPECT_EQ(testing::readFile(path), (Bytes{0xFF, 9, 0xFF, 0xFF, 1, 2, 0xFF, 7}));
}

struct HexLayoutCase {
    const char* name;
    const char* fileName;
    int bytesPerRecord;
    int offset;
    Bytes flashBytes;
    std::string expected;  // with '\n' line ends; .mcs files get CRLF
};
void PrintTo(const HexLayoutCase& value, std::ostream* out) { *out << value.name; }

class IntelHexWriterLayout : public ::testing::TestWithParam<HexLayoutCase> {};

TEST_P(IntelHexWriterLayout, RecordsAsExpected) {
    const auto& param = GetParam();
    testing::ScratchDirectory dir;
    const std::string path = dir.file(param.fileName);
    auto writer = openConfigDataWriter(path, param.bytesPerRecord);
    ASSERT_TRUE(writer->beginWrite());
    ASSERT_TRUE(writePages(*writer, param.flashBytes, param.offset, 8));  // records span several pages
    ASSERT_TRUE(writer->endWrite());

    std::string expected = param.expected;
    if (lowerCaseExtension(path) == ".mcs") {
        for (std::size_t at = 0; (at = expected.find('\n', at)) != std::string::npos; at += 2) expected.insert(at, "\r");
    }
    EXPECT_EQ(testing::readText(path), expected);
}

INSTANTIATE_TEST_SUITE_P(
    Layouts, IntelHexWriterLayout,
    ::testing::Values(
        HexLayoutCase{"SixteenBytesLf", "out.hex", 16, 0, sequence(0, 20),
                      ":020000040000FA\n:10000000000102030405060708090A0B0C0D0E0F78\n:0400100010111213A6\n:00000001FF\n"},
        HexLayoutCase{"SixteenBytesCrlf", "out.MCS", 16, 0, sequence(0, 20),
                      ":020000040000FA\n:10000000000102030405060708090A0B0C0D0E0F78\n:0400100010111213A6\n:00000001FF\n"},
        HexLayoutCase{"ThirtyTwoBytes", "out.hex", 32, 0, sequence(0, 20),
                      ":020000040000FA\n:14000000000102030405060708090A0B0C0D0E0F101112132E\n:00000001FF\n"},
        HexLayoutCase{"UnalignedStartKeepsRecordsAligned", "out.hex", 16, 5, sequence(0, 16),
                      ":020000040000FA\n:0B000500000102030405060708090AB9\n:050010000B0C0D0E0FAA\n:00000001FF\n"},
        HexLayoutCase{"LinearAddressRecordAt64KiB", "out.mcs", 16, 0xFFF8, sequence(0xA0, 16),
                      ":020000040000FA\n:08FFF800A0A1A2A3A4A5A6A7E5\n:020000040001F9\n:08000000A8A9AAABACADAEAF9C\n"
                      ":00000001FF\n"},
        HexLayoutCase{"NoData", "out.hex", 16, 0, Bytes{}, ":00000001FF\n"}),
    [](const auto& info) { return std::string(info.param.name); });

TEST(IntelHexWriter, RecordSizeOtherThan16Or32IsRefusedBeforeAnyFileIsMade) {
    testing::ScratchDirectory dir;
    EXPECT_THROW(IntelHexWriter(dir.file("out.hex"), IntelHexLayout{24, false}), std::invalid_argument);
    EXPECT_THROW(registerStandardFormats(64), std::invalid_argument);
    EXPECT_TRUE(dir.listing().empty());
}

// Data a writer cannot take: the call answers false, and endWrite then
// fails and keeps the earlier file.
struct RefusedData {
    const char* name;
    const char* fileName;
    int firstOffset;
    int secondOffset;
    int secondBits;
};
void PrintTo(const RefusedData& value, std::ostream* out) { *out << value.name; }

class WriterRefusesData : public ::testing::TestWithParam<RefusedData> {};

TEST_P(WriterRefusesData, AndKeepsTheEarlierFile) {
    const auto& param = GetParam();
    testing::ScratchDirectory dir;
    const std::string path = dir.file(param.fileName);
    testing::writeFile(path, std::string("earlier contents"));
    auto writer = openConfigDataWriter(path);
    const Bytes page(16, 0x5A);
    ASSERT_TRUE(writer->writeData(page.data(), param.firstOffset, 128, 0));
    EXPECT_FALSE(writer->writeData(page.data(), param.secondOffset, param.secondBits, 0));
    EXPECT_FALSE(writer->endWrite());
    EXPECT_FALSE(dynamic_cast<AtomicFileWriter&>(*writer).errorMessage().empty());
    EXPECT_EQ(testing::readText(path), "earlier contents");
    EXPECT_EQ(dir.listing(), std::vector<std::string>{param.fileName});
}

INSTANTIATE_TEST_SUITE_P(
    Cases, WriterRefusesData,
    ::testing::Values(RefusedData{"HexBelowDataWritten", "out.hex", 0x100, 0x80, 128},
                      RefusedData{"HexOverlappingDataWritten", "out.mcs", 0x100, 0x108, 128},
                      RefusedData{"HexBitsNotWholeBytes", "out.hex", 0, 16, 12},
                      RefusedData{"BinaryBitsNotWholeBytes", "out.bin", 0, 16, 12},
                      RefusedData{"BinaryNegativeOffset", "out.bin", 0, -16, 128}),
    [](const auto& info) { return std::string(info.param.name); });

class WriterAtomicity : public ::testing::TestWithParam<const char*> {};

TEST_P(WriterAtomicity, AbandonedWriterLeavesTargetByteIdenticalAndNoTemporaryFile) {
    testing::ScratchDirectory dir;
    const std::string path = dir.file(GetParam());
    const Bytes earlier = testing::randomBytes(1000, 11);
    testing::writeFile(path, earlier);
    {
        auto writer = openConfigDataWriter(path);
        ASSERT_TRUE(writer->beginWrite());
        ASSERT_TRUE(writePages(*writer, testing::randomBytes(4096, 12), 0, 256));
    }
    EXPECT_EQ(testing::readFile(path), earlier);
    EXPECT_EQ(dir.listing(), std::vector<std::string>{GetParam()});
}

INSTANTIATE_TEST_SUITE_P(Formats, WriterAtomicity, ::testing::Values("flash.bin", "flash.hex", "flash.mcs", "flash"));

struct UnwritableTarget {
    const char* name;
    const char* target;  // relative to the scratch directory
    const char* reason;
};
void PrintTo(const UnwritableTarget& value, std::ostream* out) { *out << value.name; }

class WriterTargetUnwritable : public ::testing::TestWithParam<UnwritableTarget> {
protected:
    void SetUp() override {
        registerStandardFormats();
        std::filesystem::create_directory(dir.path() / "taken.mcs");
        testing::writeFile(dir.file("locked.bin"), std::string("keep"));
        std::filesystem::permissions(dir.file("locked.bin"), std::filesystem::perms::owner_read);
        before = dir.listing();
    }
    testing::ScratchDirectory dir;
    std::vector<std::string> before;
};

TEST_P(WriterTargetUnwritable, FactoryRefusesAndCreatesNothing) {
    const std::string path = dir.file(GetParam().target);
    try {
        openConfigDataWriter(path);
        FAIL() << "writer created";
    } catch (const FormatError& error) {
        const std::string message = error.what();
        EXPECT_NE(message.find(path), std::string::npos) << message;
        EXPECT_NE(message.find(GetParam().reason), std::string::npos) << message;
    }
    std::unique_ptr<ConfigDataWriter> viaHost(ConfigDataWriter::CreateWriter(path.c_str(), "part", nullptr));
    EXPECT_EQ(viaHost, nullptr);
    EXPECT_EQ(dir.listing(), before);
    EXPECT_EQ(testing::readText(dir.file("locked.bin")), "keep");
}

INSTANTIATE_TEST_SUITE_P(
    Targets, WriterTargetUnwritable,
    ::testing::Values(UnwritableTarget{"MissingDirectory", "no/such/dir/flash.mcs", "does not exist"},
                      UnwritableTarget{"TargetIsADirectory", "taken.mcs", "is a directory"},
                      UnwritableTarget{"ReadOnlyTarget", "locked.bin", "read-only"}),
    [](const auto& info) { return std::string(info.param.name); });

TEST(WriterTarget, DirectoryThatRefusesNewFilesCreatesNothing) {
    if (geteuid() == 0) GTEST_SKIP() << "root writes into any directory";
    testing::ScratchDirectory dir;
    const auto locked = dir.path() / "locked";
    std::filesystem::create_directory(locked);
    std::filesystem::permissions(locked, std::filesystem::perms::owner_read | std::filesystem::perms::owner_exec);
    EXPECT_THROW(openConfigDataWriter((locked / "flash.mcs").string()), FormatError);
    EXPECT_TRUE(std::filesystem::is_empty(locked));
}

// A readback as the device performs it: the host's CreateWriter picks the
// format, whole pages arrive captured, and the file reads back as the flash.
class ReadbackRoundTrip : public ::testing::TestWithParam<const char*> {};

TEST_P(ReadbackRoundTrip, FileReadsBackAsTheFlash) {
    registerStandardFormats();
    testing::ScratchDirectory dir;
    const std::string path = dir.file(GetParam());
    Bytes flash = testing::randomBytes(0x10000 + 0x800, 21);  // crosses a 64 KiB bound
    std::fill(flash.end() - 0x300, flash.end(), 0xFF);       // erased tail
    std::unique_ptr<ConfigDataWriter> writer(ConfigDataWriter::CreateWriter(path.c_str(), "part", nullptr));
    ASSERT_NE(writer, nullptr);
    ASSERT_TRUE(writer->beginWrite());
    ASSERT_TRUE(writePages(*writer, flash, 0, 256));
    ASSERT_TRUE(writer->endWrite());
    writer.reset();

    EXPECT_EQ(loadFlashImage(path).bytes(), flash);
    if (lowerCaseExtension(path) == ".mcs") {
        const std::string text = testing::readText(path);
        std::size_t lineEnds = 0;
        for (std::size_t i = 0; i < text.size(); ++i) {
            if (text[i] == '\n') {
                ++lineEnds;
                EXPECT_TRUE(i > 0 && text[i - 1] == '\r') << "bare LF at " << i;
            }
        }
        EXPECT_GT(lineEnds, 0u);
    }
}

INSTANTIATE_TEST_SUITE_P(Formats, ReadbackRoundTrip, ::testing::Values("back.mcs", "back.hex", "back.bin", "back.img"));

}  // namespace
}  // namespace vorant::formats
