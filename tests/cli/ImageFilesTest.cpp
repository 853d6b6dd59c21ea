// Image files on the command line: S-records and extension-less HEX are
// read as what they are, a binary lands at --offset, --format wins, a
// readback writes S-records; a recording plays back onto its own chip and
// stops before erasing another.
#include "tests/cli/ToolTestFixture.h"

namespace vorant::cli::test {
namespace {

TEST_F(ToolTest, EveryImageFormatProgramsWhereItsAddressesSay) {
    if (!srecCat("-VERSion")) GTEST_SKIP() << "srec_cat is not on PATH";
    const std::string data = randomBytes(3000, 31);
    write("data.bin", data);
    const fs::path in = dir / "data.bin";
    ASSERT_TRUE(srecCat(in.string() + " -binary -offset 0x10000 -o " + (dir / "image.srec").string() + " -motorola"));
    ASSERT_TRUE(srecCat(in.string() + " -binary -offset 0x20000 -o " + (dir / "firmware").string() + " -intel"));
    const struct {
        Args args;
        std::size_t offset;
    } runs[] = {
        {{"program", "image.srec", "-e", "-v"}, 0x10000},
        {{"program", "firmware", "-e", "-v"}, 0x20000},  // HEX told by its content
        {{"--format", "bin", "--offset", "4096", "program", "data.bin", "-e", "-v"}, 4096},
    };
    for (const auto& [args, offset] : runs) {
        ok(kSim + args);
        ok(kSim + Args{"readback", "-f", "out.bin"});
        EXPECT_TRUE(read("out.bin") == flashWith(data, offset)) << args[args.size() - 3];
    }
    // A readback as S-records converts back to the flash.
    ok(kSim + Args{"readback", "-f", "out.s37"});
    ASSERT_TRUE(srecCat((dir / "out.s37").string() + " -motorola -o " + (dir / "back.bin").string() + " -binary"));
    EXPECT_TRUE(read("back.bin") == flashWith(data, 4096));
    ok(kSim + Args{"--format", "srec", "readback", "-f", "-"});
}

// program without -e touches only the blocks the image covers: what lies
// around the image survives, and the run verifies by default.
TEST_F(ToolTest, ProgramKeepsWhatTheImageDoesNotCover) {
    const std::string boot = randomBytes(0x1000, 41), app = randomBytes(3000, 42), tail = randomBytes(100, 43);
    write("boot.bin", boot);
    write("app.bin", app);
    write("tail.bin", tail);
    ok(kSim + Args{"program", "boot.bin", "-e"});
    const Result result = ok(kSim + Args{"--offset", "0x10000", "program", "app.bin"});
    EXPECT_TRUE(has(result.out, "'0': Verification completed.")) << result.text();
    EXPECT_TRUE(has(result.out, "1 block erased")) << result.text();
    // 100 bytes in the middle of the block the app ends in: the app's last
    // bytes before them and the erased bytes after them stay.
    ok(kSim + Args{"--offset", "0x10C00", "program", "tail.bin"});
    ok(kSim + Args{"readback", "-f", "out.bin"});
    std::string expected = std::string(kSimBytes, '\xff').replace(0, boot.size(), boot);
    expected.replace(0x10000, app.size(), app).replace(0x10C00, tail.size(), tail);
    EXPECT_TRUE(read("out.bin") == expected);
    // A recording erases whole blocks only where that was accepted.
    ok(Args{"--part", "W25Q16JV", "--port", "svf:job.svf", "--erase-whole-blocks", "--offset", "0x10C00", "program",
            "tail.bin"});
    EXPECT_TRUE(has(read("job.svf"), "//Loading device with 'block erase' instruction."));
    // The same image again changes nothing: no block is erased.
    EXPECT_TRUE(has(ok(kSim + Args{"--offset", "0x10000", "program", "app.bin"}).out, "0 blocks erased"));
}

// A recording opens with the chip's ID check: played on another chip it
// stops there, before its erase, and the chip keeps its data.
TEST_F(ToolTest, ARecordingForAnotherChipStopsBeforeItsErase) {
    const std::string image = randomBytes(4096, 51);
    write("image.bin", image);
    write("old.bin", randomBytes(4096, 52));
    ok({"--part", "W25Q16JV", "--port", "svf:job.svf", "program", "image.bin", "-e", "-v"});
    EXPECT_TRUE(has(read("job.svf"), "Checking the chip's JEDEC ID (EF4015)"));
    const Args other{"--part", "W25Q32JV", "--port", "sim:other.sim"};
    ok(other + Args{"program", "old.bin", "-e"});
    const std::string before = read("other.sim");
    const Result played = run(other + Args{"play", "job.svf"});
    EXPECT_EQ(played.status, 1) << played.text();
    EXPECT_TRUE(has(played.err, "stopped at the first mismatch")) << played.text();
    EXPECT_TRUE(read("other.sim") == before) << "the chip's data did not survive";
    // On a used chip of the part it was made for it plays through, its
    // verify compared, and leaves the image.
    const Args right{"--part", "W25Q16JV", "--port", "sim:right.sim"};
    ok(right + Args{"program", "old.bin", "-e"});
    EXPECT_TRUE(has(ok(right + Args{"play", "job.svf"}).out, "no mismatches"));
    EXPECT_TRUE(flashBytes(read("right.sim")) == flashWith(image));
}

}  // namespace
}  // namespace vorant::cli::test
