// Intel HEX input: malformed files, address records, holes and overlaps.
#include "formats/ConfigDataFiles.h"
#include "formats/FormatError.h"
#include "formats/IntelHexImage.h"
#include "tests/formats/FormatsTestFiles.h"

#include <gtest/gtest.h>

#include <sstream>

namespace vorant::formats {
namespace {
using testing::Bytes;

struct MalformedHex {
    const char* name;
    const char* content;
    int line;
    const char* reason;
};
void PrintTo(const MalformedHex& value, std::ostream* out) { *out << value.name; }

class IntelHexMalformed : public ::testing::TestWithParam<MalformedHex> {};

TEST_P(IntelHexMalformed, ErrorNamesFileLineAndReason) {
    const auto& param = GetParam();
    testing::ScratchDirectory dir;
    const std::string path = dir.file("image.hex");
    testing::writeFile(path, std::string(param.content));
    try {
        openConfigData(path);
        FAIL() << "accepted";
    } catch (const FormatError& error) {
        const std::string message = error.what();
        EXPECT_EQ(message.rfind(path + ":" + std::to_string(param.line) + ": ", 0), 0u) << message;
        EXPECT_NE(message.find(param.reason), std::string::npos) << message;
    }
}

INSTANTIATE_TEST_SUITE_P(
    Lines, IntelHexMalformed,
    ::testing::Values(
        MalformedHex{"BadStartCode", ":0100000011EE\n;0100010022DC\n:00000001FF\n", 2, "starts with ';'"},
        MalformedHex{"LeadingSpace", " :0100000011EE\n:00000001FF\n", 1, "starts with byte 0x20"},
        MalformedHex{"OddDigits", ":0100000011EE\n:0100010022D\n:00000001FF\n", 2, "odd number of hex digits"},
        MalformedHex{"BadHexDigit", ":0100000011EE\n:01000100G2DC\n:00000001FF\n", 2, "bad hex digit 'G' at column 10"},
        MalformedHex{"TooShort", ":00000001\n", 1, "record too short"},
        MalformedHex{"LengthMismatch", ":0200010022DB\n:00000001FF\n", 1, "byte count says 2 data bytes, the line holds 1"},
        MalformedHex{"Checksum", ":0100000011EE\n:0100010022DD\n:00000001FF\n", 2, "checksum mismatch: the record says 0xDD, its bytes need 0xDC"},
        MalformedHex{"UnknownType", ":0100000011EE\n:00000006FA\n:00000001FF\n", 2, "unknown record type 0x06"},
        MalformedHex{"EndOfFileWithData", ":0100000011EE\n:01000001FFFF\n", 2, "end-of-file record carries 0 data bytes"},
        MalformedHex{"LinearAddressLength", ":0100000400FB\n:00000001FF\n", 1, "extended linear address record carries 2"},
        MalformedHex{"SegmentAddressLength", ":0100000200FD\n:00000001FF\n", 1, "extended segment address record carries 2"},
        MalformedHex{"RecordAfterEndOfFile", ":0100000011EE\n:00000001FF\n:0100010022DC\n", 3, "after the end-of-file record"},
        MalformedHex{"MissingEndOfFile", ":0100000011EE\n\n:0100010022DC\n", 3, "without an end-of-file record"},
        MalformedHex{"SameAddressTwice", ":0100000011EE\n:0100000011EE\n:00000001FF\n", 2, "overlap"},
        MalformedHex{"PartialOverlap", ":020000000102FB\n:0100010022DC\n:00000001FF\n", 2, "data at 0x00000001..0x00000001 overlap"},
        // 02 segment 0x1000 and 04 upper 0x0001 both reach address 0x10000.
        MalformedHex{"OverlapAcrossAddressStyles",
                     ":020000021000EC\n:0100000011EE\n:020000040001F9\n:0100000022DD\n:00000001FF\n", 4, "overlap"},
        MalformedHex{"BeyondLargestImage", ":020000042000DA\n:0100000011EE\n:00000001FF\n", 2,
                     "the end of the largest supported image"}),
    [](const auto& info) { return std::string(info.param.name); });

struct WellFormedHex {
    const char* name;
    const char* content;
    std::size_t size;
    std::vector<std::pair<std::size_t, unsigned char>> dataBytes;  // every other byte reads 0xFF
};
void PrintTo(const WellFormedHex& value, std::ostream* out) { *out << value.name; }

class IntelHexImageLayout : public ::testing::TestWithParam<WellFormedHex> {};

TEST_P(IntelHexImageLayout, DataLandAtTheirAddressesAndTheRestReadsFF) {
    const auto& param = GetParam();
    std::istringstream in(param.content);
    FlashImage image = parseIntelHex(in, "test.hex");
    Bytes expected(param.size, 0xFF);
    for (const auto& [address, value] : param.dataBytes) expected[address] = value;
    EXPECT_EQ(image.bytes(), expected);
    EXPECT_EQ(image.dataSize(), param.size * 8);
}

INSTANTIATE_TEST_SUITE_P(
    Records, IntelHexImageLayout,
    ::testing::Values(
        WellFormedHex{"HoleAndSpaceBelowFirstRecord", ":0100020042BB\n:01000500AA50\n:00000001FF\n", 6,
                      {{2, 0x42}, {5, 0xAA}}},
        WellFormedHex{"DescendingRecords", ":0100050011E9\n:0100000022DD\n:00000001FF\n", 6, {{0, 0x22}, {5, 0x11}}},
        WellFormedHex{"ExtendedSegmentAddress", ":020000020001FB\n:0100020042BB\n:00000001FF\n", 0x13, {{0x12, 0x42}}},
        WellFormedHex{"ExtendedLinearAddress", ":020000040001F9\n:0100020042BB\n:00000001FF\n", 0x10003,
                      {{0x10002, 0x42}}},
        WellFormedHex{"LinearDataRunAcross64KiB", ":02FFFF00A1B2AD\n:00000001FF\n", 0x10001,
                      {{0xFFFF, 0xA1}, {0x10000, 0xB2}}},
        WellFormedHex{"SegmentDataWrapInsideSegment", ":020000021000EC\n:02FFFF00A1B2AD\n:00000001FF\n", 0x20000,
                      {{0x1FFFF, 0xA1}, {0x10000, 0xB2}}},
        WellFormedHex{"StartAddressesIgnored", ":0400000300001000E9\n:0100000011EE\n:0400000500001000E7\n:00000001FF\n",
                      1, {{0, 0x11}}},
        WellFormedHex{"CrlfBlankLinesLowerCase", "\r\n:0100000011ee\r\n\r\n:00000001ff  \r\n\r\n", 1, {{0, 0x11}}}),
    [](const auto& info) { return std::string(info.param.name); });

// Files made once by an independent converter: 300 bytes (7k + 3) at
// 0xFFC0, across the 64 KiB bound, with 04 records (CRLF) and with 02 records.
class IntelHexSampleFiles : public ::testing::TestWithParam<const char*> {};

TEST_P(IntelHexSampleFiles, ReadAsTheirSourceImage) {
    Bytes expected(0xFFC0, 0xFF);
    for (unsigned k = 0; k < 300; ++k) expected.push_back(static_cast<unsigned char>(k * 7 + 3));
    const std::string path = std::string(VORANT_TEST_DATA_DIR) + "/formats/" + GetParam();
    EXPECT_EQ(loadFlashImage(path).bytes(), expected);
}

INSTANTIATE_TEST_SUITE_P(Files, IntelHexSampleFiles, ::testing::Values("linear-ffc0.mcs", "segmented-ffc0.hex"));

}  // namespace
}  // namespace vorant::formats
