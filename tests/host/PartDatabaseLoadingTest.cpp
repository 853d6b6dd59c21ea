// Loading part files: families, overrides, and one clear error for every
// value that could make a device misbehave.
#include "host/ConstraintsManager.h"
#include "host/VorantException.h"
#include "tests/support/TestParts.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <sstream>

namespace {

using vorant::test::Properties;

// A part file holding one family with every key of the canonical part, and a
// part that extends it with the given overrides (TOML lines).
std::string partFile(const Properties& family, const std::string& partLines) {
    std::ostringstream toml;
    toml << "[family.TEST]\n";
    for (const auto& [key, value] : family) toml << key << " = \"" << value << "\"\n";
    toml << "\n[part.TESTPART]\nextends = \"TEST\"\n" << partLines;
    return toml.str();
}

class PartLoading : public ::testing::Test {
protected:
    void SetUp() override { ConstraintsManager::instance().clear(); }
    void TearDown() override { ConstraintsManager::instance().clear(); }
    ConstraintsManager& db = ConstraintsManager::instance();
};

// A part reads as its family with its overrides, TOML numbers and booleans
// as the texts the device reads, under its name in any letter case; IDs
// may be shared; a lookup of what is not there names what was asked.
TEST_F(PartLoading, APartReadsAsItsFamilyWithItsOverrides) {
    db.loadText(partFile(vorant::test::w25q128Properties(), "DEVICE_SIZE = 67108864\nX4_READ = false\nPAGE_SIZE = 2048\n") +
                    "\n[part.SECOND]\nextends = \"TEST\"\n",
                "winbond.toml");
    EXPECT_EQ(db.getDeviceLongProperty("tEsTpArT", "DEVICE_SIZE"), 67108864);
    EXPECT_STREQ(db.getDeviceStringProperty("TESTPART", "READ_INSTRUCTION"), "00000011");
    EXPECT_STREQ(db.getDeviceStringProperty("TESTPART", "X4_READ"), "FALSE");
    EXPECT_STREQ(db.getDeviceStringProperty("TESTPART", "PAGE_SIZE"), "2048");
    EXPECT_EQ(db.sourceOf("TESTPART"), "winbond.toml");
    EXPECT_FALSE(db.hasPart("TEST")) << "a family is not a part";
    EXPECT_TRUE(db.hasPart("testpart"));
    EXPECT_EQ(db.canonicalName("TestPart"), "TESTPART");
    EXPECT_EQ(db.canonicalName("NOPART"), "");
    EXPECT_EQ(db.partsWithId("ef4018"), (std::vector<std::string>{"SECOND", "TESTPART"}));
    for (const auto& [part, key] : {std::pair{"NOPART", "PAGE_SIZE"}, {"TESTPART", "STATUS_LOCATION_99"}}) {
        try {
            db.getDeviceStringProperty(part, key);
            ADD_FAILURE() << part << " " << key;
        } catch (const VorantException& e) {
            EXPECT_NE(std::string(e.what()).find(part == std::string("NOPART") ? part : key), std::string::npos);
        }
    }
}

struct BadPart {
    const char* what;
    const char* lines;       // TOML lines added to the part
    const char* key;         // the key the error must name
};

class InvalidParts : public PartLoading, public ::testing::WithParamInterface<BadPart> {};

TEST_P(InvalidParts, AreRejectedNamingFilePartAndKey) {
    const BadPart& bad = GetParam();
    try {
        db.loadText(partFile(vorant::test::w25q128Properties(), bad.lines), "vendor.toml");
        FAIL() << bad.what << " was accepted";
    } catch (const VorantException& e) {
        const std::string text = e.what();
        EXPECT_NE(text.find("vendor.toml"), std::string::npos) << text;
        EXPECT_NE(text.find(bad.key), std::string::npos) << text;
    }
    EXPECT_FALSE(db.hasPart("TESTPART")) << "nothing of a failed file is added";
}

const BadPart kBadParts[] = {
    {"zero page size", "PAGE_SIZE = 0\n", "PAGE_SIZE"},
    {"negative device size", "DEVICE_SIZE = -8\n", "DEVICE_SIZE"},
    {"page size not whole bytes", "PAGE_SIZE = 2044\nTOTAL_SHIFT_SIZE = 2076\n", "PAGE_SIZE"},
    {"zero polling step", "PROGRAM_WAITTIME_INC = 0\n", "PROGRAM_WAITTIME_INC"},
    {"zero progress divisor", "PROGRESS_ERASE_WAITTIME_INC = 0\n", "PROGRESS_ERASE_WAITTIME_INC"},
    {"address over 32 bits", "ADDRESS_SIZE = 40\nREAD_SIZE = 48\nDATA_START_INDEX = 48\nTOTAL_SHIFT_SIZE = 2096\n",
     "ADDRESS_SIZE"},
    {"instruction not binary", "READ_INSTRUCTION = \"0000 011\"\n", "READ_INSTRUCTION"},
    {"read instruction overlaps address", "READ_INSTRUCTION = \"0000001100\"\n", "PAGE_ADDRESS_START_INDEX"},
    {"data past the frame", "TOTAL_SHIFT_SIZE = 2072\n", "TOTAL_SHIFT_SIZE"},
    {"address past the read frame", "READ_SIZE = 24\n", "READ_SIZE"},
    {"status read under 8 bits", "READSTATUS_INSTRUCTION = \"0101\"\n", "READSTATUS_INSTRUCTION"},
    {"program poll overflows", "PROGRAM_MAXWAITTIME = 2147483600\n", "PROGRAM_MAXWAITTIME"},
    {"number past 32 bits", "DEVICE_SIZE = 4294967296\n", "DEVICE_SIZE"},
    {"number as text", "PAGE_SIZE = \"2k\"\n", "PAGE_SIZE"},
    {"short ID", "IDCODE = \"EF40\"\n", "IDCODE"},
    {"RES part with a JEDEC ID", "USE_RES = \"TRUE\"\n", "IDCODE"},
    {"flag typo", "USE_UNLOCKSR = \"TURE\"\n", "USE_UNLOCKSR"},
    {"x4 without two status bytes", "STATUS_REGISTER_LENGTH = 8\n", "STATUS_REGISTER_LENGTH"},
    {"negative wait", "WRSR_MAXWAITTIME = -1\n", "WRSR_MAXWAITTIME"},
    {"bad QE location", "QE_LOCATION = \"SR3.1\"\n", "QE_LOCATION"},
    {"x4 with a one-byte status write", "WRSR_BITS = 8\n", "WRSR_BITS"},
    {"x4 with Quad Enable in register 1", "QE_LOCATION = \"SR1.6\"\n", "QE_LOCATION"},
    {"malformed TOML", "PAGE_SIZE = = 3\n", "vendor.toml"},
    {"misspelt key", "PAGE_SIZ = 2048\n", "PAGE_SIZ: unknown key; did you mean 'PAGE_SIZE'?"},
    {"misspelt key in another case", "Sim_Page_Program_Us = 700\n", "did you mean 'SIM_PAGE_PROGRAM_US'?"},
    {"status label past 32 bits", "STATUS_LOCATION_32 = \"QE\"\n", "STATUS_LOCATION_32: unknown key"},
    {"program limit below the first wait", "PROGRAM_WAITTIME = 800\nPROGRAM_MAXWAITTIME = 700\n",
     "PROGRAM_MAXWAITTIME: 700 is below PROGRAM_WAITTIME (800)"},
    {"erase limit below the first wait", "BULKERASE_MAXWAITTIME = 1\n", "BULKERASE_MAXWAITTIME: 1 is below"},
    {"block size not a power of two", "BLOCKERASE32_SIZE = 30000\n", "BLOCKERASE32_SIZE"},
    {"block size past the chip", "BLOCKERASE64_SIZE = 33554432\n", "BLOCKERASE64_SIZE"},
    {"SFDP area not hexadecimal", "SFDP = \"5346445G05010000\"\n", "SFDP"},
};
INSTANTIATE_TEST_SUITE_P(Validation, InvalidParts, ::testing::ValuesIn(kBadParts));

// Text the TOML reader trips over or that is not ASCII, a missing key, a
// misspelt or unknown table or family: each is one clear error naming the
// file (and the first byte past ASCII with its place), never an abort, and
// nothing of the file is added. The first three once stopped toml++ 3.3.0
// on an assertion or an unreachable branch.
TEST_F(PartLoading, BrokenFilesAreRefusedNamingFileAndPlace) {
    auto lacking = vorant::test::w25q128Properties();
    lacking.erase("WRSR_MAXWAITTIME");
    const std::pair<std::string, const char*> cases[] = {
        {"[}", "vendor.toml: malformed TOML"},
        {"a = [}", "vendor.toml: malformed TOML"},
        {"\xCF\xAD", "vendor.toml:1:1: byte 0xCF at offset 0 is not ASCII"},
        {"[part.TESTPART]\n# caf\xC3\xA9\nPAGE_SIZE = 2048\n", "vendor.toml:2:6: byte 0xC3 at offset 21 is not ASCII"},
        {"[part.TESTPART]\nDEVICE_SIZE = \x80\n", "vendor.toml:2:15: byte 0x80 at offset 30"},
        {"[part.TESTPART]\nPAGE_SIZE = [[[[\n", "vendor.toml:2:"},
        {partFile(lacking, ""), "part TESTPART: WRSR_MAXWAITTIME"},
        {"[family.F]\nBULKERASE_INSTRUCTON = \"11000111\"\n",
         "vendor.toml: family F: BULKERASE_INSTRUCTON: unknown key; did you mean 'BULKERASE_INSTRUCTION'?"},
        {"[part.P]\nextends = \"NOFAMILY\"\n", "NOFAMILY"},
        {"[family.A]\nextends = \"B\"\n[family.B]\nextends = \"A\"\n", "extends itself"},
        {"[parts.P]\n", "unknown table 'parts'"},
    };
    for (const auto& [text, expected] : cases) {
        try {
            db.loadText(text, "vendor.toml");
            ADD_FAILURE() << "accepted: " << text;
        } catch (const VorantException& e) {
            EXPECT_NE(std::string(e.what()).find(expected), std::string::npos) << e.what();
        }
        EXPECT_TRUE(db.partNames().empty()) << text;
    }
    EXPECT_THROW(db.loadFile("/nonexistent/parts.toml"), VorantException);
    EXPECT_THROW(db.loadDirectory("/nonexistent-folder"), VorantException);
}

TEST_F(PartLoading, APartFromAnotherFileThatReplacesOneIsReported) {
    const std::string text = partFile(vorant::test::w25q128Properties(), "");
    EXPECT_TRUE(db.loadText(text, "shipped.toml").empty());
    EXPECT_TRUE(db.loadText(text, "shipped.toml").empty()) << "reloading the same file replaces nothing of another";
    const auto replaced = db.loadText("[part.testpart]\nextends = \"TEST\"\nDEVICE_SIZE = 67108864\n", "user.toml");
    ASSERT_EQ(replaced.size(), 1u);
    EXPECT_EQ(replaced[0].part, "testpart");
    EXPECT_EQ(replaced[0].previousSource, "shipped.toml");
    EXPECT_EQ(replaced[0].newSource, "user.toml");
    EXPECT_EQ(db.partNames(), std::vector<std::string>{"testpart"}) << "one part, under the newer spelling";
    EXPECT_EQ(db.getDeviceLongProperty("TESTPART", "DEVICE_SIZE"), 67108864);
}

TEST_F(PartLoading, AFolderLoadsEveryPartFileAndAFolderWithoutOneIsAnError) {
    const auto folder = std::filesystem::path(::testing::TempDir()) / "part-folder-test";
    std::filesystem::remove_all(folder);
    std::filesystem::create_directories(folder);
    EXPECT_THROW(db.loadDirectory(folder.string()), VorantException);
    std::ofstream(folder / "notes.txt") << "not a part file\n";
    try {
        db.loadDirectory(folder.string());
        FAIL();
    } catch (const VorantException& e) {
        EXPECT_NE(std::string(e.what()).find("no part files (*.toml)"), std::string::npos) << e.what();
    }
    std::ofstream(folder / "a.toml") << partFile(vorant::test::w25q128Properties(), "");
    std::ofstream(folder / "b.toml") << "[part.OTHER]\nextends = \"TEST\"\n";  // uses a.toml's family
    db.loadDirectory(folder.string());
    EXPECT_EQ(db.partNames(), (std::vector<std::string>{"OTHER", "TESTPART"}));
    std::filesystem::remove_all(folder);
}

}  // namespace
