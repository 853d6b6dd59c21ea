// A simulated chip built from a part entry of the part database.

#include "ports/sim/FlashModel.h"
#include "tests/sim/SimTestSupport.h"
#include "tests/support/TestParts.h"

#include "host/VorantException.h"

#include <gtest/gtest.h>

namespace vorant::sim::test {
namespace {

using vorant::test::addTestPart;
using vorant::test::Properties;

TEST(FlashConfigFromParts, W25Q128LikePart) {
    const FlashConfig c = FlashConfig::fromPartDatabase(addTestPart("SIM_W25Q", vorant::test::w25q128Properties()));
    EXPECT_EQ(c.partName, "SIM_W25Q");
    EXPECT_EQ(c.sizeBytes, 16u * 1024 * 1024);
    EXPECT_EQ(c.pageBytes, 256u);
    EXPECT_EQ(c.addressBytes, 3);
    EXPECT_EQ((Bytes{c.jedecId[0], c.jedecId[1], c.jedecId[2]}), (Bytes{0xEF, 0x40, 0x18}));
    EXPECT_TRUE(c.hasSignature);
    EXPECT_EQ(c.signature, 0x17);
    EXPECT_EQ(c.opWriteEnable, 0x06);
    EXPECT_EQ(c.opWriteDisable, 0x04);
    EXPECT_EQ(c.opReadId, 0x9F);
    EXPECT_EQ(c.opReadStatus1, 0x05);
    EXPECT_EQ(c.opReadStatus2, 0x35);
    EXPECT_EQ(c.opWriteStatus, 0x01);
    EXPECT_EQ(c.opRead, 0x03);
    EXPECT_EQ(c.opFastRead, 0x0B);
    EXPECT_EQ(c.opPageProgram, 0x02);
    EXPECT_EQ(c.opSectorErase, 0x20);
    EXPECT_EQ(c.opBulkErase, 0xC7);
    EXPECT_EQ(c.opDeepPowerDown, 0xB9);
    EXPECT_EQ(c.opReleaseSignature, 0xAB);
    EXPECT_EQ(c.sectorBytes, 4096u);
    EXPECT_EQ(c.qe, QeLocation::Sr2Bit1);
    EXPECT_TRUE(c.writeStatusTakesTwoBytes);
    EXPECT_EQ(c.pageProgramUs, 700u);
    EXPECT_EQ(c.bulkEraseUs, 40000000u);
    EXPECT_EQ(c.writeStatusUs, 15000u);
    EXPECT_EQ(c.releaseUs, 3u);
    // BUSY WEL BP0 BP1 BP2 TB SEC SRP / SRL QE - LB1 LB2 LB3 CMP SUS
    EXPECT_EQ(c.blockProtectMask, 0x1C);
    EXPECT_EQ(c.status1WritableMask, 0xFC);
    EXPECT_EQ(c.status2WritableMask, 0x7B);
}

TEST(FlashConfigFromParts, M25P16LikePartIdentifiedBySignature) {
    const FlashConfig c = FlashConfig::fromPartDatabase(addTestPart("SIM_M25P", vorant::test::m25p16Properties()));
    EXPECT_EQ(c.sizeBytes, 2u * 1024 * 1024);
    EXPECT_EQ((Bytes{c.jedecId[0], c.jedecId[1], c.jedecId[2]}), (Bytes{0x20, 0x20, 0x15}));
    EXPECT_TRUE(c.hasSignature);
    EXPECT_EQ(c.signature, 0x14);
    EXPECT_EQ(c.opReadStatus2, -1) << "no register 2: its 05h reads register 1";
    EXPECT_EQ(c.opSectorErase, 0xD8);
    EXPECT_EQ(c.sectorBytes, 65536u);
    EXPECT_EQ(c.qe, QeLocation::None);
    EXPECT_FALSE(c.writeStatusTakesTwoBytes);
    EXPECT_EQ(c.pageProgramUs, 640u);
    EXPECT_EQ(c.releaseUs, 30u);
    // WIP WEL BP0 BP1 BP2 - - SRWD
    EXPECT_EQ(c.status1WritableMask, 0x9C);
}

TEST(FlashConfigFromParts, DefaultsForAbsentSimulatorKeys) {
    struct Case {
        const char* name;
        void (*change)(Properties&);
        void (*check)(const FlashConfig&);
    };
    const Case cases[] = {
        {"JEDEC ID from IDCODE",
         [](Properties& p) { p.erase("JEDEC_ID"); },
         [](const FlashConfig& c) { EXPECT_EQ(c.jedecId[2], 0x18); }},
        {"no signature without RES_SIGNATURE",
         [](Properties& p) { p.erase("RES_SIGNATURE"); },
         [](const FlashConfig& c) { EXPECT_FALSE(c.hasSignature); }},
        {"signature from IDCODE of a RES part",
         [](Properties& p) { p.erase("RES_SIGNATURE"); p.erase("JEDEC_ID"); p["USE_RES"] = "TRUE"; p["IDCODE"] = "14"; },
         [](const FlashConfig& c) {
             EXPECT_TRUE(c.hasSignature);
             EXPECT_EQ(c.signature, 0x14);
             EXPECT_EQ(c.jedecId[0], 0xFF);
         }},
        {"QE and status write from X4_READ",
         [](Properties& p) { p.erase("QE_LOCATION"); p.erase("WRSR_BITS"); },
         [](const FlashConfig& c) {
             EXPECT_EQ(c.qe, QeLocation::Sr2Bit1);
             EXPECT_TRUE(c.writeStatusTakesTwoBytes);
         }},
        {"QE in register 1 bit 6",
         [](Properties& p) { p["QE_LOCATION"] = "SR1.6"; p["WRSR_BITS"] = "8"; },
         [](const FlashConfig& c) {
             EXPECT_EQ(c.qe, QeLocation::Sr1Bit6);
             EXPECT_EQ(c.opReadStatus2, -1);
             EXPECT_EQ(c.status1WritableMask & 0x40, 0x40);
             EXPECT_EQ(c.blockProtectMask & 0x40, 0);
         }},
        {"busy times keep their defaults",
         [](Properties& p) { p.erase("SIM_PAGE_PROGRAM_US"); p.erase("SIM_RELEASE_US"); },
         [](const FlashConfig& c) {
             EXPECT_EQ(c.pageProgramUs, FlashConfig{}.pageProgramUs);
             EXPECT_EQ(c.releaseUs, FlashConfig{}.releaseUs);
         }},
        {"a 32-bit address part",
         [](Properties& p) { p["ADDRESS_SIZE"] = "32"; p["READ_INSTRUCTION"] = "00010011"; },
         [](const FlashConfig& c) {
             EXPECT_EQ(c.addressBytes, 4);
             EXPECT_EQ(c.opRead, 0x13);
         }},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        Properties p = vorant::test::w25q128Properties();
        c.change(p);
        c.check(FlashConfig::fromPartDatabase(addTestPart("SIM_DEFAULTS", p)));
    }
}

TEST(FlashConfigFromParts, RefusesWhatItCannotModel) {
    struct Case {
        const char* key;
        const char* value;
    };
    const Case cases[] = {
        {"READ_INSTRUCTION", "0000001"},          // shorter than an opcode
        {"READ_INSTRUCTION", "0000001x"},
        {"JEDEC_ID", "EF40"},
        {"JEDEC_ID", "EF40GG"},
        {"RES_SIGNATURE", "1"},
        {"QE_LOCATION", "SR3.0"},
        {"WRSR_BITS", "24"},
        {"ADDRESS_SIZE", "16"},
        {"SIM_PAGE_PROGRAM_US", "-1"},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(std::string(c.key) + "=" + c.value);
        Properties p = vorant::test::w25q128Properties();
        p[c.key] = c.value;
        try {
            FlashConfig::fromPartDatabase(addTestPart("SIM_BAD", p));
            ADD_FAILURE() << "accepted";
        } catch (const VorantException& error) {
            EXPECT_NE(std::string(error.what()).find(c.key), std::string::npos) << error.what();
        }
    }
    EXPECT_THROW(FlashConfig::fromPartDatabase("NO_SUCH_PART"), VorantException);
}

// The whole part entry drives a working chip.
TEST(FlashConfigFromParts, ModelOfADatabasePartAnswersItsIds) {
    FlashModel chip(FlashConfig::fromPartDatabase(addTestPart("SIM_M25P_ID", vorant::test::m25p16Properties())));
    EXPECT_EQ(spi(chip, {0x9F}, 3), (Bytes{0x20, 0x20, 0x15}));
    EXPECT_EQ(spi(chip, {0xAB, 0, 0, 0}, 1), Bytes{0x14});
    writeEnable(chip);
    spi(chip, {0x01, 0xFC});
    chip.advance(us(chip.config().writeStatusUs));
    EXPECT_EQ(spi(chip, {0x05}, 1)[0], 0x9C) << "bits 5 and 6 do not exist on this part";
}

}  // namespace
}  // namespace vorant::sim::test
