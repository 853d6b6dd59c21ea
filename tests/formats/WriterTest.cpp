// Readback writers: bit order, record layout, refused targets, atomic
// replacement held back until the host publishes it, a readback written
// through the host's factory, and a cross-check of reader and writer
// against srec_cat (skipped where it is not installed). A writer leaves its
// finished file pending (PendingOutputs); these tests publish it as the
// tool does after a successful readback.
#include "tests/formats/FormatsTestFiles.h"

#include "host/PendingOutputs.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <memory>
#include <numeric>
#include <stdexcept>
#include <tuple>

namespace vorant::formats::testing {

TEST(Writers, CapturedBytesAreWrittenBitReversedIn16Or32ByteRecordsWithAn04RecordAtEvery64KiB) {
    const struct { const char* name; int recordBytes, offset; unsigned char first; std::size_t count; std::string text; } cases[] = {
        {"a.hex", 16, 0, 0, 20, ":020000040000FA\n:10000000000102030405060708090A0B0C0D0E0F78\n:0400100010111213A6\n:00000001FF\n"},
        {"b.MCS", 16, 0, 0, 20, ":020000040000FA\r\n:10000000000102030405060708090A0B0C0D0E0F78\r\n:0400100010111213A6\r\n:00000001FF\r\n"},
        {"c.hex", 32, 0, 0, 20, ":020000040000FA\n:14000000000102030405060708090A0B0C0D0E0F101112132E\n:00000001FF\n"},
        {"d.hex", 16, 5, 0, 16, ":020000040000FA\n:0B000500000102030405060708090AB9\n:050010000B0C0D0E0FAA\n:00000001FF\n"},
        {"e.mcs", 16, 0xFFF8, 0xA0, 16, ":020000040000FA\r\n:08FFF800A0A1A2A3A4A5A6A7E5\r\n:020000040001F9\r\n:08000000A8A9AAABACADAEAF9C\r\n:00000001FF\r\n"},
        {"f.bin", 16, 2, 0x41, 3, "\xFF\xFF" "ABC"},  // the gap reads erased
    };
    ScratchDirectory dir;
    for (const auto& c : cases) {
        Bytes flash(c.count);
        std::iota(flash.begin(), flash.end(), c.first);
        auto writer = openConfigDataWriter(dir.file(c.name), c.recordBytes);
        ASSERT_TRUE(writer->beginWrite() && writePages(*writer, flash, c.offset, 8) && writer->endWrite());
        EXPECT_TRUE(PendingOutputs::commitAll().empty());
        EXPECT_EQ(readFile<std::string>(dir.file(c.name)), c.text) << c.name;
    }
    EXPECT_THROW(openConfigDataWriter(dir.file("g.hex"), 24), std::invalid_argument);
}

TEST(Writers, UnwritableTargetIsRefusedNamingItAndNothingIsCreated) {
    registerStandardFormats();
    ScratchDirectory dir;
    fs::create_directory(dir.path() / "taken.mcs");
    for (const auto& [name, reason] : {std::pair{"no/such/dir/flash.mcs", "does not exist"}, {"taken.mcs", "is a directory"}}) {
        const std::string path = dir.file(name), message = formatErrorOf([&] { openConfigDataWriter(path); });
        EXPECT_TRUE(message.rfind(path + ": ", 0) == 0 && message.find(reason) != std::string::npos) << message;
        EXPECT_EQ(std::unique_ptr<ConfigDataWriter>(ConfigDataWriter::CreateWriter(path.c_str(), "part", nullptr)), nullptr);
    }
    EXPECT_TRUE(dir.entries() == 1 && fs::is_empty(dir.path() / "taken.mcs"));
}

TEST(Writers, APublishedReadbackReadsBackAsTheFlash) {
    registerStandardFormats();
    Bytes flash = randomBytes(0x10000 + 0x800, 21);     // crosses 64 KiB
    std::fill(flash.end() - 0x300, flash.end(), 0xFF);  // erased tail
    for (const auto& [name, lineEnd] : {std::pair{"back.mcs", "\r\n:"}, {"back.hex", "\n:"}, {"back.bin", ""}}) {
        ScratchDirectory dir;
        const std::string path = dir.file(name);
        const Bytes earlier = randomBytes(1000, 11);
        writeFile(path, earlier);
        std::unique_ptr<ConfigDataWriter> writer(ConfigDataWriter::CreateWriter(path.c_str(), "part", nullptr));
        ASSERT_TRUE(writer && writer->beginWrite() && writePages(*writer, flash, 0, 256) && writer->endWrite()) << name;
        writer.reset();
        EXPECT_TRUE(readFile(path) == earlier) << name << ": replaced before the host published it";
        EXPECT_TRUE(PendingOutputs::commitAll().empty());
        EXPECT_EQ(loadFlashImage(path).denseBytes(), flash) << name;
        EXPECT_TRUE(!*lineEnd || readFile<std::string>(path).find(lineEnd) == 15) << name << ": line end after the first record";
    }
}

static bool srecCat(const std::string& arguments) { return std::system(("srec_cat " + arguments + " >/dev/null 2>&1").c_str()) == 0; }

// srec_cat's S-records (its default mixes S1, S2 and S3 by address) and HEX
// read as it converts them, our image starting at 0 with 0xFF below the
// data; our files convert back to the flash.
TEST(SrecCat, ItsFilesReadAsItConvertsThemAndOursConvertBackToTheFlash) {
    if (!srecCat("-VERSion")) GTEST_SKIP() << "srec_cat is not on PATH";
    ScratchDirectory dir;
    const std::string in = "'" + dir.file("in.bin") + "'", back = "'" + dir.file("back.bin") + "'";
    const std::tuple<const char*, int, int, const char*> theirs[] = {
        {"a.srec", 0, 5001, "-motorola"}, {"b.s28", 0xFFF0, 0x20003, "-motorola"}, {"c.mot", 0x1FFFF00, 700, "-motorola"},
        {"a.mcs", 0x1000, 5001, "-intel -Output_Block_Size 16"}, {"b.mcs", 0xFFF0, 0x20003, "-intel"},
        {"c.hex", 0x1F000, 70000, "-intel -address-length=3"}};
    for (const auto& [name, offset, size, format] : theirs) {
        const Bytes data = randomBytes(static_cast<std::size_t>(size), static_cast<unsigned>(size));
        writeFile(dir.file("in.bin"), data);
        ASSERT_TRUE(srecCat(in + " -binary -offset " + std::to_string(offset) + " -o '" + dir.file(name) + "' " + format));
        Bytes expected(static_cast<std::size_t>(offset), 0xFF);
        expected.insert(expected.end(), data.begin(), data.end());
        EXPECT_TRUE(loadFlashImage(dir.file(name)).denseBytes() == expected) << name;
    }
    const Bytes flash = randomBytes(0x20000 + 77, 99);
    const std::tuple<const char*, int, int, const char*> ours[] = {
        {"ours.srec", 16, 0, "-motorola"}, {"ours.s37", 16, 0x1F000, "-motorola"},
        {"ours.mcs", 16, 0, "-intel"}, {"ours.hex", 32, 0x1F000, "-intel"}};
    for (const auto& [name, recordBytes, offset, format] : ours) {
        auto writer = openConfigDataWriter(dir.file(name), recordBytes);
        ASSERT_TRUE(writePages(*writer, flash, offset, 256) && writer->endWrite());
        ASSERT_TRUE(PendingOutputs::commitAll().empty());
        ASSERT_TRUE(srecCat("'" + dir.file(name) + "' " + format + " -offset -" + std::to_string(offset) + " -o " + back +
                            " -binary"));
        EXPECT_EQ(readFile(dir.file("back.bin")), flash) << name;
    }
}

}  // namespace vorant::formats::testing
