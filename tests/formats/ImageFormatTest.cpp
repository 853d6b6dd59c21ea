// Images as address ranges: the format picked by --format, extension or
// content; S-records read and written; a
// binary placed at an offset; memory that follows the data; pages served
// from 0 over the holes.
#include "tests/formats/FormatsTestFiles.h"

#include "formats/SRecordImage.h"
#include "host/PendingOutputs.h"

#include <gtest/gtest.h>

#include <optional>
#include <sstream>

namespace vorant::formats::testing {

TEST(ImageFormat, GivenFormatThenExtensionThenContentDecide) {
    ScratchDirectory dir;
    const std::string hex = ":0100020042BB\n:00000001FF\n", srec = "S1050002424373\nS9030000FC\n";
    const struct {
        const char* name;
        std::string content;
        std::optional<ImageFormat> given;
        std::optional<ImageFormat> expected;  // nothing: refused, asking for --format
    } cases[] = {
        {"a.HEX", hex, {}, ImageFormat::IntelHex},  // extensions in any letter case
        {"c.bin", hex, {}, ImageFormat::Binary},
        {"a.S37", srec, {}, ImageFormat::SRecord},
        {"a.img", hex, {}, ImageFormat::Binary},  // a known binary extension is final
        {"firmware", hex, {}, ImageFormat::IntelHex},
        {"firmware.txt", "\n\n" + srec, {}, ImageFormat::SRecord},
        {"firmware.dat", "\x7F" "ELF", {}, std::nullopt},
        {"firmware.dat", "\x7F" "ELF", ImageFormat::Binary, ImageFormat::Binary},
        {"b.hex", srec, ImageFormat::SRecord, ImageFormat::SRecord},  // --format always wins
    };
    for (const auto& c : cases) {
        writeFile(dir.file(c.name), c.content);
        ImageOptions options;
        options.format = c.given;
        if (c.expected) {
            EXPECT_EQ(imageFormatOf(dir.file(c.name), options), *c.expected) << c.name;
        } else {
            const std::string message = formatErrorOf([&] { imageFormatOf(dir.file(c.name), options); });
            EXPECT_NE(message.find("--format bin|ihex|srec"), std::string::npos) << message;
        }
    }
    // A format that does not match the content is the content's error, not data.
    writeFile(dir.file("c.bin"), std::string("\x01\x02"));
    ImageOptions asHex;
    asHex.format = ImageFormat::IntelHex;
    EXPECT_NE(formatErrorOf([&] { loadFlashImage(dir.file("c.bin"), asHex); }).find("starts with ':'"), std::string::npos);
}

TEST(SRecords, DataRecordsOfEveryWidthBecomeRangesAndBadRecordsNameTheirLine) {
    // 0x123456 in an S2 after S1 data at 0x0010, joined S3 data at 0x01000000.
    const std::string good =
        "S00600004844521B\n"
        "S1050010AABB85\n"
        "S20612345601025A\r\n"
        "S3080100000011223390\n"
        "S3060100000344B1\n"
        "S5030004F8\n"
        "S70500000000FA";
    std::istringstream in(good);
    const FlashImage image = parseSRecords(in, "t.srec");
    ASSERT_EQ(image.ranges().size(), 3u);
    EXPECT_EQ(image.ranges()[0].address, 0x10u);
    EXPECT_EQ(image.ranges()[1].address, 0x123456u);
    EXPECT_EQ(image.ranges()[2].address, 0x01000000u);
    EXPECT_EQ(image.ranges()[2].bytes, (Bytes{0x11, 0x22, 0x33, 0x44}));
    EXPECT_EQ(image.dataBytes(), 8u);

    const struct { const char* text; const char* reason; } bad[] = {
        {"S1050010AABB86\n", "t.srec:1: checksum mismatch"},
        {"S1060010AABB85\n", "t.srec:1: the count says 6 bytes follow, the line holds 5"},
        {"S0030000FC\nX1050010AABB85\n", "t.srec:2: a record starts with 'S' and a type digit"},
        {"S1050010AABG85\n", "t.srec:1: a character that is not a hex digit"},
        {"S105001AABB85\n", "t.srec:1: an odd number of hex digits"},
        {"S4030000FC\n", "t.srec:1: S4 is a reserved record type"},
        {"S1050010AABB85\nS5030002FA\n", "t.srec:2: the count record says 2 data records, 1 came before it"},
        {"S1050010AABB85\nS1040011CC1E\n", "t.srec:2: data at 0x11 overlap data of an earlier record"},
        {"S1050010AABB85\nS9030000FC\nS1040020CC0F\n", "t.srec:3: record after the end record"},
        {"S00600004844521B\nS9030000FC\n", "no data record"},
        {"S3091000000001020304DC\n", "t.srec:1: data at 0x10000000 reach past 0x10000000"},
        {"S102FFFE\n", "leaves no room for the address"},
    };
    for (const auto& c : bad) {
        std::istringstream text(c.text);
        const std::string message = formatErrorOf([&] { parseSRecords(text, "t.srec"); });
        EXPECT_NE(message.find(c.reason), std::string::npos) << c.text << " -> " << message;
    }
}

// A few bytes at the top of the largest flash cost a few bytes; pages from
// 0 come out 0xFF over the holes and the data where they are.
TEST(SparseImage, MemoryFollowsTheDataAndPagesFillTheHoles) {
    std::istringstream far("S3090FFFFF00DEADBEEFB1\n");
    const FlashImage top = parseSRecords(far, "far.srec");
    EXPECT_EQ(top.dataBytes(), 4u);
    EXPECT_EQ(top.byteSize(), 0x0FFFFF04u);
    EXPECT_EQ(top.ranges().front().bytes.capacity(), 4u);

    FlashImage image(std::vector<ImageRange>{{0x30, Bytes(8, 0x11)}, {0x05, Bytes(3, 0x22)}, {0x08, Bytes(2, 0x33)}});
    ASSERT_EQ(image.ranges().size(), 2u) << "touching ranges are joined";
    const Bytes dense = image.denseBytes();
    EXPECT_EQ(dense.size(), 0x38u);
    EXPECT_TRUE(dense[0x05] == 0x22 && dense[0x09] == 0x33 && dense[0x0A] == 0xFF);
    EXPECT_THROW(FlashImage(std::vector<ImageRange>{{0, Bytes(4)}, {3, Bytes(1)}}), FormatError);
}

TEST(SRecords, OurWriterWritesOneTypeWithCountAndEnd) {
    ScratchDirectory dir;
    Bytes flash(40);
    for (std::size_t i = 0; i < flash.size(); ++i) flash[i] = static_cast<unsigned char>(i);
    for (const auto& [name, dataType] : {std::pair{"a.s19", '1'}, {"a.s28", '2'}, {"a.srec", '3'}}) {
        auto writer = openConfigDataWriter(dir.file(name));
        ASSERT_TRUE(writer->beginWrite() && writePages(*writer, flash, 0, 16) && writer->endWrite());
        ASSERT_TRUE(PendingOutputs::commitAll().empty());
        const std::string text = readFile<std::string>(dir.file(name));
        std::istringstream lines(text);
        std::string line;
        std::string types;
        while (std::getline(lines, line)) types += line.substr(0, 2) + " ";
        EXPECT_EQ(types, std::string("S0 S") + dataType + " S" + dataType + " S5 S" + char('0' + 10 - (dataType - '0')) + " ")
            << text;
        EXPECT_EQ(loadFlashImage(dir.file(name)).denseBytes(), flash) << name;
    }
    // Data past the reach of S1 records are refused, naming the way out.
    auto narrow = openConfigDataWriter(dir.file("big.s19"));
    ASSERT_TRUE(narrow->beginWrite());
    EXPECT_FALSE(writePages(*narrow, Bytes(16), 0xFFF8, 16));
}

}  // namespace vorant::formats::testing
