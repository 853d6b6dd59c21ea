// The tool's main jobs on the flash simulator, run as a user runs them.
#include "ToolTestFixture.h"
#include "UserPartFiles.h"

#include <cstdlib>

namespace vorant::cli::test {
namespace {

// --- --part auto -------------------------------------------------------

struct ChipCase {
    const char* chip;
    const char* jedecId;
};

class AutoPart : public ToolTest, public ::testing::WithParamInterface<ChipCase> {};

TEST_P(AutoPart, IdentifiesTheSimulatedChip) {
    const ToolResult result = runOk({"--chip", GetParam().chip, "idcode"});
    EXPECT_TRUE(contains(result.out, std::string("INFO: Identified ") + GetParam().chip + " by its JEDEC ID " +
                                         GetParam().jedecId + "."))
        << result.transcript();
    EXPECT_TRUE(contains(result.out, std::string("'0': IDCODE is '") + GetParam().jedecId + "' (in hex)."))
        << result.transcript();
}

INSTANTIATE_TEST_SUITE_P(ShippedParts, AutoPart,
                         ::testing::Values(ChipCase{"W25Q16JV", "EF4015"}, ChipCase{"W25Q64JV", "EF4017"},
                                           ChipCase{"M25P16", "202015"}, ChipCase{"MX25L3233F", "C22016"},
                                           ChipCase{"S25FL064L", "016017"}, ChipCase{"IS25LP128", "9D6018"},
                                           ChipCase{"N25Q032A", "20BA16"}),
                         [](const auto& info) { return std::string(info.param.chip); });

TEST_F(AutoPart, ASharedIdListsTheCandidatesAndAsksForThePart) {
    const ToolResult result = run({"--chip", "N25Q128A", "idcode"});
    EXPECT_EQ(result.exitStatus, 2) << result.transcript();
    ASSERT_EQ(result.errorLines().size(), 1u) << result.transcript();
    EXPECT_TRUE(contains(result.err, "MT25QL128ABA, N25Q128A")) << result.err;
    EXPECT_TRUE(contains(result.err, "--part NAME")) << result.err;
}

TEST_F(AutoPart, ExplicitPartNamesTheChipToo) {
    const ToolResult result = runOk({"--part", "M25P16", "signature"});
    EXPECT_TRUE(contains(result.out, "'0': IDCODE is '14' (in hex).")) << result.transcript();
}

// --- program, then read back -------------------------------------------

class ProgramAndReadBack : public ToolTest, public ::testing::WithParamInterface<const char*> {};

TEST_P(ProgramAndReadBack, ReadbackIsFlashSizedImageThenErased) {
    const Bytes image = randomBytes(70001, 11);  // odd: the last page is short
    writeFile(file("image.bin"), image);
    const std::string part = GetParam();
    const ToolResult programmed =
        runOk({"--part", part, "--port", "sim:flash.bin", "--clock", kFastClock, "program", "image.bin", "-e", "-v"});
    EXPECT_TRUE(contains(programmed.out, "'0': Verification completed.")) << programmed.transcript();
    EXPECT_TRUE(contains(programmed.err, "vorant-spi: program succeeded")) << programmed.transcript();

    runOk({"--part", part, "--port", "sim:flash.bin", "readback", "-f", "out.bin"});
    const Bytes readback = readFile(file("out.bin"));
    ASSERT_EQ(readback.size(), kSmallPartBytes);
    EXPECT_EQ(firstDifference(readback, image), -1);
    EXPECT_TRUE(allErased(readback, image.size(), readback.size()));
    // The simulated chip's memory says the same.
    EXPECT_EQ(flashArray("flash.bin"), readback);
}

INSTANTIATE_TEST_SUITE_P(SmallParts, ProgramAndReadBack, ::testing::Values("W25Q16JV", "M25P16"));

TEST_F(ToolTest, IntelHexImageLandsAtItsAddress) {
    if (std::system("command -v srec_cat >/dev/null 2>&1") != 0) GTEST_SKIP() << "srec_cat is not installed";
    const Bytes data = randomBytes(3001, 12);
    writeFile(file("data.bin"), data);
    const std::string convert = "cd '" + scratch.path().string() +
                                "' && srec_cat data.bin -binary -offset 0x1000 -o image.mcs -intel >/dev/null 2>&1";
    ASSERT_EQ(std::system(convert.c_str()), 0);

    runOk({"--part", kSmallPart, "--port", "sim:flash.bin", "program", "image.mcs", "-e", "-v"});
    runOk({"--part", kSmallPart, "--port", "sim:flash.bin", "readback", "-f", "out.bin"});
    const Bytes readback = readFile(file("out.bin"));
    ASSERT_EQ(readback.size(), kSmallPartBytes);
    EXPECT_TRUE(allErased(readback, 0, 0x1000));
    EXPECT_EQ(firstDifference(readback, data, 0x1000), -1);
    EXPECT_TRUE(allErased(readback, 0x1000 + data.size(), readback.size()));
}

TEST_F(ToolTest, ChecksumAgreesWithTheProgrammedFlash) {
    writeFile(file("image.bin"), randomBytes(9999, 13));
    runOk({"--part", kSmallPart, "--port", "sim:flash.bin", "program", "image.bin", "-e"});
    const ToolResult result = runOk({"--part", kSmallPart, "--port", "sim:flash.bin", "checksum", "image.bin"});
    EXPECT_TRUE(contains(result.out, "'0': Checksums match.")) << result.transcript();
}

// --- a flash kept in a file ---------------------------------------------

TEST_F(ToolTest, PersistentFlashKeepsItsContentsBetweenRuns) {
    writeFile(file("image.bin"), randomBytes(4099, 14));
    runOk({"--part", kSmallPart, "--port", "sim:flash.bin", "program", "image.bin", "-e"});

    const ToolResult verified = runOk({"--part", kSmallPart, "--port", "sim:flash.bin", "verify", "image.bin"});
    EXPECT_TRUE(contains(verified.out, "'0': Verification completed.")) << verified.transcript();
    EXPECT_EQ(run({"--part", kSmallPart, "--port", "sim:flash.bin", "blankcheck"}).exitStatus, 1);

    // A fresh simulated chip has none of it.
    const ToolResult fresh = run({"--part", kSmallPart, "verify", "image.bin"});
    EXPECT_EQ(fresh.exitStatus, 1) << fresh.transcript();
    EXPECT_TRUE(contains(fresh.out, "Failed at address, 0")) << fresh.transcript();

    runOk({"--part", kSmallPart, "--port", "sim:flash.bin", "erase"});
    const ToolResult blank = runOk({"--part", kSmallPart, "--port", "sim:flash.bin", "blankcheck"});
    EXPECT_TRUE(contains(blank.out, "'0': Part is blank.")) << blank.transcript();
}

// --- record as SVF, then play -------------------------------------------

TEST_F(ToolTest, RecordedProgramPlaysWithoutMismatchesAndProgramsTheImage) {
    const Bytes image = randomBytes(6001, 15);
    writeFile(file("image.bin"), image);
    const ToolResult recorded =
        runOk({"--part", kSmallPart, "--port", "svf:job.svf", "program", "image.bin", "-e", "-v"});
    EXPECT_TRUE(contains(recorded.err, "recorded to job.svf")) << recorded.transcript();
    EXPECT_EQ(scratch.listing(), (std::vector<std::string>{"image.bin", "job.svf"}));

    const ToolResult played = runOk({"--part", kSmallPart, "--port", "sim:played.bin", "play", "job.svf"});
    EXPECT_TRUE(contains(played.out, "no mismatches")) << played.transcript();

    runOk({"--part", kSmallPart, "--port", "sim:played.bin", "readback", "-f", "out.bin"});
    const Bytes readback = readFile(file("out.bin"));
    EXPECT_EQ(firstDifference(readback, image), -1);
    EXPECT_TRUE(allErased(readback, image.size(), readback.size()));
}

TEST_F(ToolTest, PlayReportsEveryMismatchWithItsLine) {
    writeFile(file("image.bin"), randomBytes(600, 16));
    runOk({"--part", kSmallPart, "--port", "svf:verify.svf", "verify", "image.bin"});
    // Played on an erased chip, every page read compares against the image.
    const ToolResult played = run({"--part", kSmallPart, "play", "verify.svf"});
    EXPECT_EQ(played.exitStatus, 1) << played.transcript();
    EXPECT_TRUE(contains(played.err, "ERROR: verify.svf: line ")) << played.transcript();
    EXPECT_TRUE(contains(played.out, "3 mismatches")) << played.transcript();
}

TEST_F(ToolTest, FailedRecordingLeavesNoFileAndKeepsAnOldOne) {
    // A part with one status register byte cannot take the Quad Enable
    // write, so the operation fails.
    writeText(file("sr8.toml"), smallWinbondPart("TEST_SR8", 2048, "EF40A8", "STATUS_REGISTER_LENGTH = 8\n"));
    const std::vector<std::string> base{"--parts", "sr8.toml", "--part", "TEST_SR8"};

    std::vector<std::string> fresh = base;
    fresh.insert(fresh.end(), {"--port", "svf:qe.svf", "qe", "set"});
    const ToolResult failed = run(fresh);
    EXPECT_EQ(failed.exitStatus, 1) << failed.transcript();
    EXPECT_TRUE(contains(failed.out, "Nothing was recorded")) << failed.transcript();
    EXPECT_EQ(scratch.listing(), (std::vector<std::string>{"sr8.toml"}));

    writeText(file("old.svf"), "// an older recording\n");
    std::vector<std::string> over = base;
    over.insert(over.end(), {"--port", "svf:old.svf", "qe", "set"});
    EXPECT_EQ(run(over).exitStatus, 1);
    const Bytes kept = readFile(file("old.svf"));
    EXPECT_EQ(std::string(kept.begin(), kept.end()), "// an older recording\n");
    EXPECT_EQ(scratch.listing(), (std::vector<std::string>{"old.svf", "sr8.toml"}));
}

// --- parts the user adds --------------------------------------------------

TEST_F(ToolTest, UserPartWithAnUnusualPageSizeWorksWithoutRebuilding) {
    writeText(file("my.toml"), smallWinbondPart("MY_FLASH_P128", 1024, "EF40AA"));
    const Bytes image = randomBytes(1001, 17);  // eight 128-byte pages, the last one short
    writeFile(file("image.bin"), image);

    const ToolResult listed = runOk({"--parts", "my.toml", "parts", "my_flash*"});
    EXPECT_TRUE(contains(listed.out, "MY_FLASH_P128")) << listed.transcript();
    EXPECT_TRUE(contains(listed.out, "EF40AA")) << listed.transcript();

    // Identified among the shipped parts by its own ID.
    const ToolResult programmed = runOk({"--parts", "my.toml", "--chip", "MY_FLASH_P128", "--port", "sim:flash.bin",
                                         "program", "image.bin", "-e", "-v"});
    EXPECT_TRUE(contains(programmed.out, "Identified MY_FLASH_P128 by its JEDEC ID EF40AA.")) << programmed.transcript();

    runOk({"--parts", "my.toml", "--part", "MY_FLASH_P128", "--port", "sim:flash.bin", "readback", "-f", "out.bin"});
    const Bytes readback = readFile(file("out.bin"));
    ASSERT_EQ(readback.size(), kSmallPartBytes);
    EXPECT_EQ(firstDifference(readback, image), -1);
    EXPECT_TRUE(allErased(readback, image.size(), readback.size()));
}

// --- options that change what the device does ------------------------------

struct WidthCase {
    const char* part;
    const char* width;
    const char* mode;
};

class DataWidth : public ToolTest, public ::testing::WithParamInterface<WidthCase> {};

TEST_P(DataWidth, DecidesTheModeTheFlashIsLeftIn) {
    writeFile(file("image.bin"), randomBytes(300, 18));
    const ToolResult result =
        runOk({"--part", GetParam().part, "--data-width", GetParam().width, "program", "image.bin", "-e"});
    EXPECT_TRUE(contains(result.out, std::string("'0':Programming in ") + GetParam().mode + " mode."))
        << result.transcript();
}

INSTANTIATE_TEST_SUITE_P(Parts, DataWidth,
                         ::testing::Values(WidthCase{"W25Q32JV", "4", "x4"}, WidthCase{"W25Q32JV", "1", "x1"},
                                           // No x4 reading on this part: x1 whatever is asked.
                                           WidthCase{"W25Q16JV", "4", "x1"}));

TEST_F(ToolTest, QuietShowsNothingWhenAllGoesWell) {
    writeFile(file("image.bin"), randomBytes(300, 19));
    const ToolResult result = runOk({"--quiet", "--part", kSmallPart, "program", "image.bin", "-e", "-v"});
    EXPECT_EQ(result.out, "");
    EXPECT_EQ(result.err, "");
}

TEST_F(ToolTest, QuietStillSaysWhyItFailed) {
    writeFile(file("image.bin"), randomBytes(300, 20));
    const ToolResult result = run({"--quiet", "--part", kSmallPart, "verify", "image.bin"});
    EXPECT_EQ(result.exitStatus, 1);
    EXPECT_EQ(result.out, "");
    EXPECT_EQ(result.errorLines(), (std::vector<std::string>{"vorant-spi: verify failed"}));
}

TEST_F(ToolTest, IndexNumbersTheDeviceMessages) {
    const ToolResult result = runOk({"--index", "3", "--part", kSmallPart, "blankcheck"});
    EXPECT_TRUE(contains(result.out, "'3': Part is blank.")) << result.transcript();
}

TEST_F(ToolTest, ProtectedChipIsUnlockedBeforeProgramming) {
    writeFile(file("image.bin"), randomBytes(700, 21));
    runOk({"--part", kSmallPart, "--sim-fault", "protected", "program", "image.bin", "-e", "-v"});
}

TEST_F(ToolTest, StuckBitFailsTheVerify) {
    writeFile(file("image.bin"), Bytes(600, 0xA5));
    const ToolResult result =
        run({"--part", kSmallPart, "--sim-fault", "stuck-bit=300:0x01:0", "program", "image.bin", "-e", "-v"});
    EXPECT_EQ(result.exitStatus, 1) << result.transcript();
    EXPECT_TRUE(contains(result.out, "Failed at address, 256")) << result.transcript();
    EXPECT_TRUE(contains(result.err, "vorant-spi: program failed")) << result.transcript();
}

TEST_F(ToolTest, ChipThatStaysBusyTimesOut) {
    writeFile(file("image.bin"), randomBytes(600, 22));
    const ToolResult result = run({"--part", kSmallPart, "--sim-fault", "stuck-busy", "program", "image.bin", "-e"});
    EXPECT_EQ(result.exitStatus, 1) << result.transcript();
    EXPECT_TRUE(contains(result.err, "ERROR: '0': Erase did not complete.")) << result.transcript();
}

}  // namespace
}  // namespace vorant::cli::test
