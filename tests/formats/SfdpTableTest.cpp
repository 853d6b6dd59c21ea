// The SFDP decoder on tables read from real chips (checked against what
// their sources state), on the worked W25Q128JV table, and on malformed and
// lying tables, which must be errors and never crashes.
#include "formats/SfdpTable.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <fstream>
#include <functional>
#include <map>
#include <sstream>
#include <string>
#include <vector>

namespace vorant::formats {
namespace {

using Bytes = std::vector<std::uint8_t>;
const std::string kDumps = std::string(VORANT_TEST_DATA_DIR) + "/sfdp/";

Bytes hexFile(const std::string& path) {
    std::ifstream in(path);
    Bytes bytes;
    std::string digits, word;
    while (in >> word) digits += word;
    for (std::size_t i = 0; i + 1 < digits.size(); i += 2)
        bytes.push_back(static_cast<std::uint8_t>(std::stoi(digits.substr(i, 2), nullptr, 16)));
    return bytes;
}

struct IndexRow {
    std::string part, statedSize, statedErase;
};

std::vector<IndexRow> indexRows() {
    std::ifstream in(kDumps + "INDEX.tsv");
    std::vector<IndexRow> rows;
    std::string line;
    std::getline(in, line);  // header
    while (std::getline(in, line)) {
        std::vector<std::string> cells;
        std::istringstream fields(line);
        for (std::string cell; std::getline(fields, cell, '\t');) cells.push_back(cell);
        if (cells.size() >= 6) rows.push_back({cells[0], cells[3], cells[5]});
    }
    return rows;
}

// The index marks this source's size as conflicting with the part name
// (512 Mbit); the chip's own table agrees with the name.
const std::map<std::string, std::uint64_t> kSizeFromName{{"MX77L51250F", 64u << 20}};

TEST(SfdpDumps, DecodeToTheDensityAndEraseTypesTheirSourcesState) {
    const auto rows = indexRows();
    ASSERT_GE(rows.size(), 15u);
    int sizesChecked = 0, erasesChecked = 0;
    for (const IndexRow& row : rows) {
        SCOPED_TRACE(row.part);
        const Bytes bytes = hexFile(kDumps + row.part + ".sfdp.hex");
        ASSERT_FALSE(bytes.empty());
        SfdpTable table;
        ASSERT_NO_THROW(table = decodeSfdp(bytes));
        EXPECT_FALSE(describeSfdp(table).empty());
        if (const auto name = kSizeFromName.find(row.part); name != kSizeFromName.end()) {
            EXPECT_EQ(table.densityBytes, name->second);
        } else if (row.statedSize != "-") {
            EXPECT_EQ(table.densityBytes, std::stoull(row.statedSize));
            ++sizesChecked;
        }
        if (row.statedErase == "-") continue;
        // "4K:0x21,64K:0xdc": each stated size is an erase type, whose 3- or
        // 4-byte opcode is the stated one.
        std::istringstream erases(row.statedErase);
        for (std::string item; std::getline(erases, item, ',');) {
            const auto colon = item.find(':');
            const std::uint32_t size = std::stoul(item.substr(0, colon - 1)) * 1024;
            const auto opcode = static_cast<std::uint8_t>(std::stoul(item.substr(colon + 1), nullptr, 16));
            const SfdpEraseType* erase = table.eraseOfSize(size);
            ASSERT_NE(erase, nullptr) << item;
            EXPECT_TRUE(erase->opcode == opcode || erase->opcode4 == opcode) << item;
            ++erasesChecked;
        }
    }
    EXPECT_GE(sizesChecked, 8);
    EXPECT_GE(erasesChecked, 15);
}

TEST(SfdpDumps, TheWorkedW25Q128JVTableDecodesFieldByField) {
    const SfdpTable t = decodeSfdp(hexFile(kDumps + "W25Q128JV.sfdp.hex"));
    EXPECT_EQ(t.majorRevision, 1);
    EXPECT_EQ(t.minorRevision, 5);
    ASSERT_EQ(t.headers.size(), 1u);
    EXPECT_EQ(t.basic.pointer, 0x80u);
    EXPECT_EQ(t.basic.lengthDwords, 16u);
    EXPECT_EQ(t.densityBytes, 16u << 20);
    EXPECT_EQ(t.addressing, SfdpAddressing::ThreeByteOnly);
    EXPECT_EQ(t.erase4kOpcode, 0x20);
    ASSERT_EQ(t.eraseTypes.size(), 3u);
    const std::pair<std::uint32_t, std::uint8_t> types[] = {{4096, 0x20}, {32768, 0x52}, {65536, 0xD8}};
    const std::uint32_t typicalMs[] = {64, 128, 160};  // DWORD 10 00A60236, maximum factor 14
    for (int i = 0; i < 3; ++i) {
        EXPECT_EQ(t.eraseTypes[i].sizeBytes, types[i].first);
        EXPECT_EQ(t.eraseTypes[i].opcode, types[i].second);
        EXPECT_EQ(t.eraseTypes[i].typicalMs, typicalMs[i]);
        EXPECT_EQ(t.eraseTypes[i].maximumMs, typicalMs[i] * 14);
    }
    EXPECT_EQ(t.pageBytes, 256u);  // DWORD 11 C914EA82
    EXPECT_EQ(t.pageProgramTypicalUs, 704u);
    EXPECT_EQ(t.pageProgramMaximumUs, 704u * 6);
    EXPECT_EQ(t.chipEraseTypicalMs, 40000u);
    EXPECT_EQ(t.quadEnableRequirement, 4);  // DWORD 15 FF4DF719
    EXPECT_EQ(t.deepPowerDownOpcode, 0xB9);
    EXPECT_EQ(t.releaseOpcode, 0xAB);
    EXPECT_FALSE(t.hasFourByteTable);
}

// A small valid table: header, one basic table of 9 DWORDs at 0x10.
Bytes minimalTable() {
    Bytes b = {'S', 'F', 'D', 'P', 0x00, 0x01, 0x00, 0xFF, 0x00, 0x00, 0x01, 0x09, 0x10, 0x00, 0x00, 0xFF};
    const std::uint32_t dwords[9] = {0xFFF920E5, 0x00FFFFFF, 0, 0, 0, 0, 0, 0x520F200C, 0x0000D810};
    for (std::uint32_t dw : dwords)
        for (int i = 0; i < 4; ++i) b.push_back(static_cast<std::uint8_t>(dw >> (8 * i)));
    return b;
}

TEST(SfdpTables, AFirstRevisionTableHasNoPageSizeTimesOrQuadEnableField) {
    const SfdpTable t = decodeSfdp(minimalTable());
    EXPECT_EQ(t.densityBytes, 2u << 20);
    EXPECT_EQ(t.eraseTypes.size(), 3u);
    EXPECT_FALSE(t.pageBytes);
    EXPECT_FALSE(t.quadEnableRequirement);
    EXPECT_FALSE(t.eraseTypes[0].typicalMs);
}

struct Malformed {
    const char* name;
    std::function<void(Bytes&)> damage;
    const char* error;
};

auto setBytes(std::size_t at, Bytes values) {
    return [=](Bytes& b) { std::copy(values.begin(), values.end(), b.begin() + static_cast<long>(at)); };
}
auto cutTo(std::size_t size) { return [=](Bytes& b) { b.resize(size); }; }

class MalformedSfdp : public ::testing::TestWithParam<Malformed> {};

TEST_P(MalformedSfdp, IsAnErrorNamingTheFieldNeverACrash) {
    Bytes bytes = minimalTable();
    GetParam().damage(bytes);
    try {
        decodeSfdp(bytes);
        FAIL() << GetParam().name << " was accepted";
    } catch (const SfdpError& error) {
        EXPECT_NE(std::string(error.what()).find(GetParam().error), std::string::npos) << error.what();
    }
}

// Offsets: SFDP header 0..7, parameter header 8..15 (length at 11, pointer
// at 12), basic table from 16: DWORD 2 at 20, DWORDs 8 and 9 at 44 and 48.
INSTANTIATE_TEST_SUITE_P(Sfdp, MalformedSfdp, ::testing::Values(
    Malformed{"BadSignature", setBytes(3, {'Q'}), "no SFDP signature"},
    Malformed{"Empty", cutTo(0), "too few for an SFDP header"},
    Malformed{"MajorRevisionTwo", setBytes(5, {2}), "major revision 2"},
    Malformed{"HeaderCountOverruns", setBytes(6, {0x40}), "65 parameter headers overrun"},
    Malformed{"PointerPastTheEnd", setBytes(12, {0xF0}), "runs past the"},
    Malformed{"TableCutShort", cutTo(40), "runs past the 40 bytes"},
    Malformed{"LengthZero", setBytes(11, {0}), "length of 0 DWORDs"},
    Malformed{"ShorterThanTheFirstRevision", setBytes(11, {4}), "fewer than the 9"},
    Malformed{"FirstHeaderNotTheBasicTable", setBytes(8, {0x84}), "not the basic flash parameter table"},
    Malformed{"DensityZero", setBytes(20, {0, 0, 0, 0}), "density is 0"},
    Malformed{"DensityPowerBelowAByte", setBytes(20, {2, 0, 0, 0x80}), "not a whole number of bytes"},
    Malformed{"EraseLargerThanTheChip", setBytes(44, {0x30}), "erase type 1 of 2^48 bytes is larger than the chip"},
    Malformed{"NoEraseType", setBytes(44, {0, 0x20, 0, 0x52, 0, 0xD8, 0, 0}), "lists no erase type"}),
    [](const auto& info) { return std::string(info.param.name); });

}  // namespace
}  // namespace vorant::formats
