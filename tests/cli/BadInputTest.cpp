// Bad input: one clear error line, a status that says what went wrong, and
// nothing changes: no file is created or changed, the simulated flash
// included (a refused run sends it nothing).
#include "ToolTestFixture.h"

namespace vorant::cli::test {
namespace {

struct BadCase { const char* name; Args args; int status; std::string message; };

class BadInput : public ToolTest, public ::testing::WithParamInterface<BadCase> {
protected:
    std::map<std::string, std::string> snapshot() const {
        std::map<std::string, std::string> all;
        for (const auto& entry : fs::recursive_directory_iterator(dir))
            if (entry.is_regular_file()) all[entry.path().string()] = slurp(entry.path());
        return all;
    }
};

TEST_P(BadInput, IsRefusedWithOneLineAndChangesNothing) {
    if (std::string(GetParam().name) == "UnreadableImage" && geteuid() == 0) GTEST_SKIP() << "root reads every file";
    write("image.bin", randomBytes(5001, 41));
    ok(kSim + Args{"program", "image.bin", "-e"});  // a simulated flash that holds something
    write("empty.bin", "");
    write("big.bin", randomBytes(kSimBytes + 1, 42));
    write("locked.bin", "x");
    fs::permissions(dir / "locked.bin", fs::perms::none);
    write("bad.hex", ":020000040000FA\n:10000000000102030405060708090A0B0C0D0E0F78\n:10001000GG\n:00000001FF\n");
    write("old.svf", "// an older recording\n");
    write("lacking.toml", userPart("TEST_LACKING", "EF40B1", {{"PROGRAM_WAITTIME_INC", ""}}));
    write("invalid.toml", userPart("TEST_ODD_PAGE", "EF40B2", {{"PAGE_SIZE", "2047"}, {"TOTAL_SHIFT_SIZE", "2079"}}));
    write("misspelt.toml", userPart("TEST_MISSPELT", "EF40B3", {{"PROGRAM_WAITIME", "400"}}));
    write("backwards.toml", userPart("TEST_BACKWARDS", "EF40B4", {{"PROGRAM_MAXWAITTIME", "300"}}));
    fs::create_directories(dir / "noparts");
    write("noparts/readme.txt", "part files go here\n");
    const auto before = snapshot();

    const Result result = run(GetParam().args);
    EXPECT_EQ(result.status, GetParam().status) << result.text();
    ASSERT_EQ(result.errLines().size(), 1u) << result.text();
    EXPECT_EQ(result.errLines()[0].rfind("vorant-spi: ", 0), 0u) << result.text();
    EXPECT_TRUE(has(result.err, GetParam().message)) << result.text();
    EXPECT_EQ(result.out, "");
    EXPECT_TRUE(snapshot() == before) << "a file was created or changed";
}

const std::string kNoQe = " has no Quad Enable bit vorant-spi can write";

INSTANTIATE_TEST_SUITE_P(Cases, BadInput, ::testing::Values(
    BadCase{"MissingImage", kSim + Args{"program", "nothere.bin", "-e"}, 2, "nothere.bin"},
    BadCase{"EmptyImage", kSim + Args{"program", "empty.bin", "-e"}, 2, "empty.bin"},
    BadCase{"UnreadableImage", kSim + Args{"program", "locked.bin", "-e"}, 2, "locked.bin"},
    BadCase{"MalformedHexLine", kSim + Args{"program", "bad.hex", "-e"}, 2, "bad.hex:3"},
    BadCase{"ImageLargerThanThePart", kSim + Args{"program", "big.bin", "-e"}, 2, "W25Q16JV holds 2 MiB"},
    BadCase{"ImageLargerThanTheIdentifiedPart", {"--chip", "W25Q16JV", "--port", "sim:new.bin", "program", "big.bin"},
            2, "W25Q16JV holds 2 MiB"},
    BadCase{"UnknownPart", {"--part", "NO_SUCH_PART", "--port", "sim:flash.bin", "erase"}, 2,
            "unknown part 'NO_SUCH_PART'"},
    BadCase{"PartFileLacksAKey", {"--parts", "lacking.toml", "--part", "TEST_LACKING", "erase"}, 2,
            "lacking.toml: part TEST_LACKING: PROGRAM_WAITTIME_INC: missing"},
    BadCase{"PartFileWithAnInvalidValue", {"--parts", "invalid.toml", "--part", "TEST_ODD_PAGE", "erase"}, 2,
            "invalid.toml: part TEST_ODD_PAGE: PAGE_SIZE"},
    BadCase{"PartFileWithAMisspeltKey", {"--parts", "misspelt.toml", "--part", "TEST_MISSPELT", "erase"}, 2,
            "misspelt.toml: part TEST_MISSPELT: PROGRAM_WAITIME: unknown key; did you mean 'PROGRAM_WAITTIME'?"},
    BadCase{"PartFileWithALimitBelowItsFirstWait",
            {"--parts", "backwards.toml", "--part", "TEST_BACKWARDS", "erase"}, 2,
            "backwards.toml: part TEST_BACKWARDS: PROGRAM_MAXWAITTIME: 300 is below PROGRAM_WAITTIME (400)"},
    BadCase{"PartFolderWithoutPartFiles", {"--parts", "noparts", "--part", "W25Q16JV", "erase"}, 2,
            "no part files (*.toml) in the folder"},
    BadCase{"PartsSizeThatIsNoSize", {"parts", "--size", "16 parsecs"}, 2, "--size 16 parsecs is not a size"},
    BadCase{"PartsIdWithoutValue", {"parts", "--id"}, 2, "'--id' needs a JEDEC ID such as EF4018"},
    BadCase{"RecordingIntoAMissingFolder", {"--part", "W25Q16JV", "--port", "svf:no/job.svf", "erase"}, 2,
            "no/job.svf"},
    BadCase{"RecordingNeedsAPartName", {"--port", "svf:job.svf", "program", "image.bin"}, 2, "--part NAME"},
    BadCase{"RecordingOverItsOwnImage", {"--part", "W25Q16JV", "--port", "svf:image.bin", "program", "image.bin"}, 2,
            "would replace the image image.bin"},
    BadCase{"RecordingOfABadImageKeepsTheOldFile",
            {"--part", "W25Q16JV", "--port", "svf:old.svf", "program", "big.bin"}, 2, "big.bin"},
    BadCase{"ReadbackWithoutFile", kSim + Args{"readback"}, 2, "-f FILE"},
    BadCase{"ReadbackFileIsASwitch", kSim + Args{"readback", "-f", "-v"}, 2, "'-f' needs a file name"},
    BadCase{"ReadbackFileGivenTwice", kSim + Args{"readback", "-f", "a.bin", "-f", "b.bin"}, 2, "'-f' is given twice"},
    BadCase{"LongReadbackSwitchGivenTwice", kSim + Args{"readback", "-file", "a.bin", "-file", "b.bin"}, 2,
            "'-file' is given twice"},
    // Numbers are quoted as typed, also those no integer type holds.
    BadCase{"ClockPastEveryInteger", kSim + Args{"--clock", "99999999999999999999", "erase"}, 2,
            "--clock 99999999999999999999 is out of range; give 1 to 1000000000 Hz"},
    BadCase{"ClockWithAUnit", kSim + Args{"--clock", "50MHz", "erase"}, 2, "--clock 50MHz is not a whole number"},
    BadCase{"IndexPastEveryInteger", kSim + Args{"--index", "-99999999999999999999", "erase"}, 2,
            "--index -99999999999999999999 is out of range; give 0 to 9999"},
    BadCase{"DataWidthPastEveryInteger", kSim + Args{"--data-width", "18446744073709551617", "erase"}, 2,
            "--data-width 18446744073709551617 is out of range; give 1 or 4"},
    BadCase{"DataWidthOfTwo", kSim + Args{"--data-width", "2", "erase"}, 2, "--data-width 2 is not supported"},
    // The device writes the -f file when -file is given too: the tool must check that one.
    BadCase{"ReadbackOntoTheFlashFile", kSim + Args{"readback", "-file", "out.bin", "-f", "./flash.bin"}, 2,
            "own file"},
    BadCase{"FlashFileOfAnotherChip", {"--part", "W25Q32JV", "--port", "sim:flash.bin", "erase"}, 2, "flash.bin"},
    BadCase{"SharedIdCreatesNoFlashFile", {"--chip", "N25Q128A", "--port", "sim:new.bin", "erase"}, 2, "N25Q128A"},
    BadCase{"UnknownOperation", kSim + Args{"frobnicate"}, 2, "unknown operation 'frobnicate'"},
    // Quad Enable writes only where it is register 2 bit 1 written by 01h with two bytes.
    BadCase{"QeSet", kSim + Args{"qe", "set"}, 2, "W25Q16JV" + kNoQe},
    BadCase{"QeClear", kSim + Args{"qe", "clear"}, 2, "W25Q16JV" + kNoQe},
    BadCase{"ProgramQebit", kSim + Args{"program", "image.bin", "-e", "-qebit"}, 2, "W25Q16JV" + kNoQe},
    BadCase{"EraseQebitOnAnIdentifiedChip", {"--chip", "MX25L25645G", "--port", "sim:new.bin", "erase", "-qebit"}, 2,
            "MX25L25645G" + kNoQe},
    BadCase{"QeRecording", {"--part", "W25Q16JV", "--port", "svf:job.svf", "qe", "set"}, 2, "W25Q16JV" + kNoQe}),
    [](const auto& info) { return std::string(info.param.name); });

}  // namespace
}  // namespace vorant::cli::test
