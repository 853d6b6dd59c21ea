// Reading configuration data: Intel HEX errors and layout, page chunking,
// and the input files that are refused.
#include "formats/IntelHexImage.h"
#include "tests/formats/FormatsTestFiles.h"

#include <gtest/gtest.h>

#include <sstream>
#include <stdexcept>
#include <unistd.h>

namespace vorant::formats::testing {

TEST(IntelHexReader, MalformedFileIsRefusedNamingFileAndLine) {
    const struct { const char *content; int line; const char* reason; } cases[] = {
        {":0100000011EE\n;0100010022DC\n:00000001FF\n", 2, "starts with ';'"},
        {":0100000011EE\n:0100010022D\n:00000001FF\n", 2, "odd number of hex digits"},
        {":0100000011EE\n:01000100G2DC\n:00000001FF\n", 2, "bad hex digit 'G' at column 10"},
        {":0200010022DB\n:00000001FF\n", 1, "byte count says 2 data bytes, the line holds 1"},
        {":0100000011EE\n:0100010022DD\n:00000001FF\n", 2, "checksum mismatch: the record says 0xDD, its bytes need 0xDC"},
        {":0100000011EE\n:00000006FA\n:00000001FF\n", 2, "unknown record type 0x06"},
        {":0100000011EE\n:00000001FF\n:0100010022DC\n", 3, "after the end-of-file record"},
        {":0100000011EE\n\n:0100010022DC\n", 3, "without an end-of-file record"},
        // Data at 2, 0 and 4, then 1 joining the first two, then 3..4 reaching into the run at 4.
        {":0100020033CA\n:0100000011EE\n:0100040044B7\n:0100010022DC\n:02000300AABB96\n:00000001FF\n", 5, "data at 0x00000003..0x00000004 overlap"},
        // Segment 0x1000 (02) and upper address 0x0001 (04) both reach 0x10000.
        {":020000021000EC\n:0100000011EE\n:020000040001F9\n:0100000022DD\n:00000001FF\n", 4, "overlap"},
        {":020000042000DA\n:0100000011EE\n:00000001FF\n", 2, "the end of the largest supported image"},
        // Far addresses are refused before any image is laid out: 16 bytes at
        // 0x1FFFFF00 once took a 512 MiB image. No part holds past 256 MiB.
        {":020000041FFFDC\n:10FF0000000102030405060708090A0B0C0D0E0F79\n:00000001FF\n", 2,
         "data at 0x1FFFFF00 reach past 0x10000000, the end of the largest supported image"},
        {":020000040FFFEC\n:02FFFF000102FD\n:00000001FF\n", 2, "data at 0x0FFFFFFF reach past 0x10000000"},
    };
    ScratchDirectory dir;
    const std::string path = dir.file("image.hex");
    for (const auto& c : cases) {
        writeFile(path, std::string(c.content));
        const std::string message = formatErrorOf([&] { openConfigData(path); });
        EXPECT_TRUE(message.rfind(path + ":" + std::to_string(c.line) + ": ", 0) == 0 && message.find(c.reason) != std::string::npos) << message;
    }
}

TEST(IntelHexReader, DataLandAtTheirAddressesAndEverythingElseReadsFF) {
    const struct { const char* content; std::size_t size; std::vector<std::pair<std::size_t, unsigned char>> data; } cases[] = {
        {":0100020042BB\n:01000500AA50\n:00000001FF\n", 6, {{2, 0x42}, {5, 0xAA}}},  // below and between records
        {":0100010011ED\n:0100000022DD\n:00000001FF\n", 2, {{0, 0x22}, {1, 0x11}}},  // descending, adjacent
        {":020000040001F9\n:0100020042BB\n:00000001FF\n", 0x10003, {{0x10002, 0x42}}},
        {":02FFFF00A1B2AD\n:00000001FF\n", 0x10001, {{0xFFFF, 0xA1}, {0x10000, 0xB2}}},  // linear: runs on
        {":020000021000EC\n:02FFFF00A1B2AD\n:00000001FF\n", 0x20000, {{0x1FFFF, 0xA1}, {0x10000, 0xB2}}},  // segment: wraps
        {":0400000300001000E9\n:0100000011EE\n:0400000500001000E7\n:00000001FF\n", 1, {{0, 0x11}}},  // start addresses
        {"\r\n:0100000011ee\r\n\r\n:00000001ff  \r\n\r\n", 1, {{0, 0x11}}},
    };
    for (const auto& c : cases) {
        std::istringstream in(c.content);
        Bytes expected(c.size, 0xFF);
        for (const auto& [address, value] : c.data) expected[address] = value;
        EXPECT_EQ(parseIntelHex(in, "test.hex").denseBytes(), expected) << c.content;
    }
    // Made by an independent converter: 300 bytes at 0xFFC0 with 04 records (CRLF), and with 02 records.
    Bytes expected(0xFFC0, 0xFF);
    for (unsigned k = 0; k < 300; ++k) expected.push_back(static_cast<unsigned char>(k * 7 + 3));
    for (const char* name : {"linear-ffc0.mcs", "segmented-ffc0.hex"})
        EXPECT_EQ(loadFlashImage(VORANT_TEST_DATA_DIR "/formats/" + std::string(name)).denseBytes(), expected) << name;
}

TEST(FlashImage, ChunksArePagesFromZeroWithAShortTailPaddedFF) {
    for (const auto& [size, pageBytes] : {std::pair<std::size_t, std::size_t>{1001, 256}, {1024, 256}, {5, 1}, {0, 256}}) {
        FlashImage image(randomBytes(size, 7));
        EXPECT_EQ(image.dataSize(), size * 8);
        for (int pass = 0; pass < 2; ++pass, image.rewind()) {  // a rewind starts over
            Bytes pages;
            const char* data = nullptr;
            int address = -1;
            for (int bits; pages.size() <= size + pageBytes && (bits = image.next(&data, &address, int(pageBytes * 8))) > 0;) {
                EXPECT_EQ(address, int(pages.size()));
                EXPECT_EQ(bits, int(std::min(pageBytes, size - pages.size()) * 8));
                pages.insert(pages.end(), data, data + pageBytes);
            }
            Bytes expected = image.denseBytes();
            expected.resize((size + pageBytes - 1) / pageBytes * pageBytes, 0xFF);
            EXPECT_EQ(pages, expected) << size << " bytes in pages of " << pageBytes;
        }
    }
    const char* data = nullptr;
    int address = 0;
    for (int bits : {0, -8, 12}) EXPECT_THROW(FlashImage(Bytes(16)).next(&data, &address, bits), std::invalid_argument) << bits;
}

TEST(OpenConfigData, UnusableInputIsRefusedNamingTheFile) {
    ScratchDirectory dir;
    fs::create_directory(dir.path() / "folder.bin");
    writeFile(dir.file("locked.bin"), std::string("x"));
    fs::permissions(dir.file("locked.bin"), fs::perms::none);
    const struct { const char *name, *content, *reason; } cases[] = {
        {"none.bin", nullptr, "no such file"}, {"eof.hex", ":00000001FF\n", "empty image"}, {"folder.bin", nullptr, "is a directory"},
        {"locked.bin", nullptr, geteuid() == 0 ? nullptr : "cannot open for reading"}};  // root reads any file
    for (const auto& c : cases) {
        if (c.content) writeFile(dir.file(c.name), std::string(c.content));
        const std::string message = formatErrorOf([&] { openConfigData(dir.file(c.name)); });
        EXPECT_TRUE(!c.reason || message.find(dir.file(c.name) + ": " + c.reason) != std::string::npos) << c.name << ": " << message;
    }
}

}  // namespace vorant::formats::testing
