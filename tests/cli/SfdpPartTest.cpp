// The part --part sfdp builds from a table: every built entry passes the
// loader's validation, and the Quad Enable safety rules decide the keys that
// could misdrive a chip.
#include "cli/SfdpPart.h"
#include "cli/UsageError.h"
#include "host/ConstraintsManager.h"

#include <gtest/gtest.h>

#include <functional>

namespace vorant::cli {
namespace {

formats::SfdpTable revision16Table(int requirement) {
    formats::SfdpTable t;
    t.majorRevision = 1, t.minorRevision = 6;
    t.densityBytes = 8u << 20;
    t.eraseTypes = {{2, 65536, 0xD8, std::nullopt, 150, 2000}, {1, 4096, 0x20, std::nullopt, 45, 400}};
    t.pageBytes = 256;
    t.pageProgramTypicalUs = 400, t.pageProgramMaximumUs = 3000;
    t.chipEraseTypicalMs = 20000, t.chipEraseMaximumMs = 100000;
    t.quadEnableRequirement = requirement;
    t.deepPowerDownOpcode = 0xB9, t.releaseOpcode = 0xAB;
    return t;
}

std::string loadBuilt(const formats::SfdpTable& table, const char* key) {
    ConstraintsManager& db = ConstraintsManager::instance();
    db.loadText(sfdpPartToml("SFDP_TEST", "C84017", table), "built.toml");
    return db.getDeviceStringProperty("SFDP_TEST", key);
}

TEST(SfdpPart, QuadEnableRequirementDecidesRegister2ReadX4AndUnlock) {
    struct Row { int requirement; const char *readStatus2, *x4, *unlock; };
    const Row rows[] = {
        {0, "00000101", "FALSE", "TRUE"}, {1, "00110101", "TRUE", "FALSE"}, {2, "00000101", "FALSE", "TRUE"},
        {3, "00000101", "FALSE", "TRUE"}, {4, "00110101", "TRUE", "TRUE"},  {5, "00110101", "FALSE", "TRUE"},
        {6, "00000101", "FALSE", "TRUE"}, {7, "00000101", "FALSE", "TRUE"}};
    for (const Row& row : rows) {
        SCOPED_TRACE(row.requirement);
        const auto table = revision16Table(row.requirement);
        EXPECT_EQ(loadBuilt(table, "READSTATUS2_INSTRUCTION"), row.readStatus2);
        EXPECT_EQ(loadBuilt(table, "X4_READ"), row.x4);
        EXPECT_EQ(loadBuilt(table, "USE_UNLOCKSR"), row.unlock);
    }
}

TEST(SfdpPart, TakesTheSmallestEraseAndTheTablesTimesWithMargins) {
    const auto table = revision16Table(4);
    EXPECT_EQ(loadBuilt(table, "SECTORERASE_INSTRUCTION"), "00100000");
    EXPECT_EQ(loadBuilt(table, "SECTOR_SIZE"), "4096");
    EXPECT_EQ(loadBuilt(table, "BULKERASE_INSTRUCTION"), "11000111");
    EXPECT_EQ(loadBuilt(table, "PROGRAM_MAXWAITTIME"), "4500");
    EXPECT_EQ(loadBuilt(table, "BULKERASE_MAXWAITTIME"), "150000000");
    EXPECT_EQ(loadBuilt(table, "DEVICE_SIZE"), "67108864");
}

TEST(SfdpPart, AnOldTableGetsAssumedPagesAndWaitsAndNoUnlock) {
    auto table = revision16Table(0);
    table.minorRevision = 0;
    table.pageBytes.reset(), table.pageProgramTypicalUs.reset(), table.pageProgramMaximumUs.reset();
    table.chipEraseTypicalMs.reset(), table.chipEraseMaximumMs.reset(), table.quadEnableRequirement.reset();
    const std::string toml = sfdpPartToml("SFDP_OLD", "C84017", table);
    EXPECT_NE(toml.find("256-byte pages and conservative waits are assumed"), std::string::npos);
    EXPECT_EQ(loadBuilt(table, "PAGE_SIZE"), "2048");
    EXPECT_EQ(loadBuilt(table, "USE_UNLOCKSR"), "FALSE");
    EXPECT_EQ(loadBuilt(table, "BULKERASE_WAITTIME"), "16000000");  // 2 s per MiB
}

TEST(SfdpPart, OverSixteenMiBNeedsTheFourByteOpcodesAndFourByteOnlyIsRefused) {
    auto big = revision16Table(4);
    big.densityBytes = 32u << 20;
    big.addressing = formats::SfdpAddressing::ThreeOrFourByte;
    EXPECT_THROW(sfdpPartToml("SFDP_BIG", "C84019", big), UsageError);
    big.hasFourByteTable = big.fourByteRead = big.fourBytePageProgram = true;
    big.eraseTypes[1].opcode4 = 0x21;
    EXPECT_EQ(loadBuilt(big, "PAGEPROGRAM_INSTRUCTION"), "00010010");
    EXPECT_EQ(loadBuilt(big, "SECTORERASE_INSTRUCTION"), "00100001");
    EXPECT_EQ(loadBuilt(big, "ADDRESS_SIZE"), "32");
    auto fourOnly = revision16Table(4);
    fourOnly.addressing = formats::SfdpAddressing::FourByteOnly;
    EXPECT_THROW(sfdpPartToml("SFDP_4B", "C84017", fourOnly), UsageError);
}

}  // namespace
}  // namespace vorant::cli
