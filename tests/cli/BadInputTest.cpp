// Bad input: every case gets one clear error line and an exit status that
// says what went wrong, and nothing changes: no scan reaches the simulated
// flash (its file keeps its bytes), no file is created or overwritten.
#include "ToolTestFixture.h"
#include "UserPartFiles.h"

#include <filesystem>
#include <map>
#include <unistd.h>

namespace vorant::cli::test {
namespace {

struct BadCase {
    const char* name;
    std::vector<std::string> arguments;
    int exitStatus;
    const char* messagePart;  // in the one error line
};

class BadInput : public ToolTest, public ::testing::WithParamInterface<BadCase> {
protected:
    void SetUp() override {
        writeFile(file("image.bin"), randomBytes(5001, 41));
        writeFile(file("empty.bin"), {});
        writeFile(file("big.bin"), randomBytes(kSmallPartBytes + 1, 42));
        writeText(file("bad.hex"), ":020000040000FA\n:10000000000102030405060708090A0B0C0D0E0F78\n:10001000GG\n"
                                   ":00000001FF\n");
        writeText(file("bad.svf"), "SDR 8 TDI (ZZ);\n");
        std::filesystem::create_directory(file("folder"));
        writeText(file("old.svf"), "// an older recording\n");
        writeText(file("old.bin"), "an older readback");
        // A user part that lacks a key every part needs.
        std::string lacking = smallWinbondPart("TEST_LACKING", 2048, "EF40B1");
        lacking.erase(lacking.find("PROGRAM_WAITTIME_INC = 40\n"), std::string("PROGRAM_WAITTIME_INC = 40\n").size());
        writeText(file("lacking.toml"), lacking);
        // A page size that is no whole number of bytes.
        writeText(file("invalid.toml"), smallWinbondPart("TEST_BAD_PAGE", 2047, "EF40B2"));

        // A simulated flash that already holds something.
        runOk({"--part", kSmallPart, "--port", "sim:flash.bin", "program", "image.bin", "-e"});
        before_ = snapshot();
    }

    std::map<std::string, Bytes> snapshot() const {
        std::map<std::string, Bytes> files;
        for (const auto& entry : std::filesystem::recursive_directory_iterator(scratch.path()))
            files[entry.path().string()] = entry.is_regular_file() ? readFile(entry.path().string()) : Bytes{};
        return files;
    }

    std::map<std::string, Bytes> before_;
};

TEST_P(BadInput, IsRefusedWithOneLineAndChangesNothing) {
    const BadCase& c = GetParam();
    const ToolResult result = run(c.arguments);
    EXPECT_EQ(result.exitStatus, c.exitStatus) << result.transcript();
    ASSERT_EQ(result.errorLines().size(), 1u) << result.transcript();
    const std::string line = result.errorLines().front();
    EXPECT_EQ(line.rfind("vorant-spi: ", 0), 0u) << line;
    EXPECT_TRUE(contains(line, c.messagePart)) << line;
    EXPECT_EQ(result.out, "") << result.transcript();

    const std::map<std::string, Bytes> after = snapshot();
    EXPECT_EQ(after.size(), before_.size()) << "files were created or removed";
    for (const auto& [path, bytes] : before_) {
        const auto found = after.find(path);
        ASSERT_NE(found, after.end()) << path << " disappeared";
        EXPECT_TRUE(found->second == bytes) << path << " changed";
    }
}

const std::vector<std::string> kSim{"--part", kSmallPart, "--port", "sim:flash.bin"};

std::vector<std::string> sim(std::vector<std::string> rest) {
    std::vector<std::string> arguments = kSim;
    arguments.insert(arguments.end(), rest.begin(), rest.end());
    return arguments;
}

INSTANTIATE_TEST_SUITE_P(
    Cases, BadInput,
    ::testing::Values(
        BadCase{"MissingImage", sim({"program", "nothere.bin", "-e"}), 2, "nothere.bin"},
        BadCase{"EmptyImage", sim({"program", "empty.bin", "-e"}), 2, "empty"},
        BadCase{"FolderAsImage", sim({"program", "folder", "-e"}), 2, "folder"},
        BadCase{"MalformedHexLine", sim({"program", "bad.hex", "-e"}), 2, "bad.hex:3"},
        BadCase{"ImageLargerThanThePart", sim({"program", "big.bin", "-e"}), 2, "W25Q16JV holds 2 MiB"},
        BadCase{"ImageLargerThanTheIdentifiedPart",
                {"--chip", kSmallPart, "--port", "sim:flash.bin", "program", "big.bin", "-e"}, 2, "holds 2 MiB"},
        BadCase{"UnknownPart", {"--part", "NO_SUCH_PART", "--port", "sim:flash.bin", "program", "image.bin", "-e"}, 2,
                "unknown part 'NO_SUCH_PART'"},
        BadCase{"UnknownChip", {"--chip", "NO_SUCH_CHIP", "--port", "sim:flash.bin", "erase"}, 2,
                "unknown chip 'NO_SUCH_CHIP'"},
        BadCase{"PartFileLacksAKey",
                {"--parts", "lacking.toml", "--part", "TEST_LACKING", "--port", "sim:flash.bin", "program", "image.bin",
                 "-e"},
                2, "PROGRAM_WAITTIME_INC: missing"},
        BadCase{"PartFileWithAnInvalidValue",
                {"--parts", "invalid.toml", "--part", "TEST_BAD_PAGE", "--port", "sim:flash.bin", "erase"}, 2,
                "PAGE_SIZE"},
        BadCase{"MissingPartFile", sim({"--parts", "nothere.toml", "erase"}), 2, "nothere.toml"},
        BadCase{"RecordingIntoAMissingFolder",
                {"--part", kSmallPart, "--port", "svf:nofolder/job.svf", "program", "image.bin", "-e"}, 2, "nofolder"},
        BadCase{"RecordingWithABadImageKeepsTheOldFile",
                {"--part", kSmallPart, "--port", "svf:old.svf", "program", "nothere.bin", "-e"}, 2, "nothere.bin"},
        BadCase{"RecordingNeedsAPartName", {"--port", "svf:job.svf", "program", "image.bin"}, 2, "--part NAME"},
        BadCase{"RecordingCannotReadBack", {"--part", kSmallPart, "--port", "svf:job.svf", "readback", "-f", "out.bin"},
                2, "'readback'"},
        BadCase{"ReadbackWithoutFile", sim({"readback"}), 2, "-f FILE"},
        BadCase{"ReadbackIntoAMissingFolder", sim({"readback", "-f", "nofolder/out.bin"}), 2, "nofolder"},
        BadCase{"ReadbackIntoAFolder", sim({"readback", "-f", "folder"}), 2, "folder"},
        BadCase{"ReadbackOntoTheSimulatedFlashFile", sim({"readback", "-f", "./flash.bin"}), 2, "own file"},
        BadCase{"RecordingOverItsOwnImage", {"--part", kSmallPart, "--port", "svf:image.bin", "program", "image.bin"},
                2, "would replace the image"},
        BadCase{"UnknownOperation", sim({"frobnicate"}), 2, "unknown operation 'frobnicate'"},
        BadCase{"UnknownSwitch", sim({"program", "image.bin", "-erase-all"}), 2, "-erase-all"},
        BadCase{"UnknownOption", sim({"--erase", "program", "image.bin"}), 2, "--erase"},
        BadCase{"AmbiguousChipCreatesNoFlashFile",
                {"--chip", "N25Q128A", "--port", "sim:new-flash.bin", "program", "image.bin", "-e"}, 2,
                "MT25QL128ABA, N25Q128A"},
        BadCase{"SilentChip",
                {"--chip", kSmallPart, "--sim-fault", "deep-power-down", "--port", "sim:flash.bin", "program",
                 "image.bin", "-e"},
                2, "no chip answered"},
        BadCase{"FlashFileOfAnotherChip", {"--part", "W25Q32JV", "--port", "sim:flash.bin", "erase"}, 2, "flash.bin"},
        BadCase{"MalformedRecording", sim({"play", "bad.svf"}), 2, "bad.svf"},
        BadCase{"MissingRecording", sim({"play", "nothere.svf"}), 2, "nothere.svf"},
        BadCase{"PlayNeedsTheSimulator", {"--part", kSmallPart, "--port", "svf:old.svf", "play", "bad.svf"}, 2,
                "--port sim"}),
    [](const auto& info) { return std::string(info.param.name); });

TEST_F(ToolTest, UnreadableImageIsRefused) {
    if (geteuid() == 0) GTEST_SKIP() << "root reads every file";
    writeFile(file("image.bin"), randomBytes(100, 43));
    std::filesystem::permissions(file("image.bin"), std::filesystem::perms::none);
    const ToolResult result = run({"--part", kSmallPart, "--port", "sim:flash.bin", "program", "image.bin"});
    EXPECT_EQ(result.exitStatus, 2) << result.transcript();
    EXPECT_EQ(result.errorLines().size(), 1u) << result.transcript();
    EXPECT_FALSE(fileExists(file("flash.bin")));
}

}  // namespace
}  // namespace vorant::cli::test
