// Image files on the command line: S-records and extension-less HEX are
// read as what they are, a binary lands at --offset, --format wins, a
// readback writes S-records, and misuse is refused before any scan.
#include "tests/cli/ToolTestFixture.h"
#include "tests/support/ReferenceCrc32.h"

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
        {{"--offset", "0x30000", "program", "data.bin", "-e", "-v"}, 0x30000},
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

TEST_F(ToolTest, ImageMisuseIsRefusedBeforeAnyScan) {
    write("data.bin", randomBytes(100, 3));
    write("data.hex", ":0100020042BB\n:00000001FF\n");
    write("blob.dat", std::string("\x7F" "ELF\x02\x01", 6));
    const struct {
        Args args;
        const char* line;
    } runs[] = {
        {{"--offset", "0x10", "program", "data.hex"}, "files carry their own addresses"},
        {{"program", "blob.dat"}, "name it with --format bin|ihex|srec"},
        {{"--format", "elf", "program", "data.bin"}, "--format elf is not known"},
        {{"--offset", "0x1FFFFF", "program", "data.bin"}, "reaches address"},
        {{"--format", "ihex", "program", "data.bin"}, "starts with ':'"},
    };
    for (const auto& [args, line] : runs) {
        const Result result = run(kSim + args);
        EXPECT_EQ(result.status, 2) << result.text();
        EXPECT_TRUE(has(result.err, line)) << result.text();
        EXPECT_FALSE(fs::exists(dir / "flash.bin")) << "a refused run made the flash file";
    }
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

// checksum sums what the image holds, in address order, so the image alone
// gives the same CRC; --whole-span sums every byte from address 0.
TEST_F(ToolTest, ChecksumIsTheCrcOfTheImagesBytes) {
    if (!srecCat("-VERSion")) GTEST_SKIP() << "srec_cat is not on PATH";
    const std::string low = randomBytes(300, 61), high = randomBytes(200, 62);
    write("low.bin", low);
    write("high.bin", high);
    ok(kSim + Args{"--offset", "0x100", "program", "low.bin"});
    ok(kSim + Args{"--offset", "0x9000", "program", "high.bin"});
    ASSERT_TRUE(srecCat("'" + dir.string() + "/low.bin' -binary -offset 0x100 '" + dir.string() +
                        "/high.bin' -binary -offset 0x9000 -o '" + dir.string() + "/both.srec' -motorola"));
    const std::string both = low + high;
    const Result ranges = ok(kSim + Args{"checksum", "both.srec"});
    EXPECT_TRUE(has(ranges.out, "of the device contents:    " + vorant::test::referenceCrc32Text(both.data(), both.size())))
        << ranges.text();
    std::string span(0x9000 + high.size(), '\xff');
    span.replace(0x100, low.size(), low).replace(0x9000, high.size(), high);
    const Result whole = ok(kSim + Args{"--whole-span", "checksum", "both.srec"});
    EXPECT_TRUE(has(whole.out, "of the device contents:    " + vorant::test::referenceCrc32Text(span.data(), span.size())))
        << whole.text();
}

// A recording opens with the chip's ID check: played on another chip it
// stops there, before its erase, and the chip keeps its data.
TEST_F(ToolTest, ARecordingForAnotherChipStopsBeforeItsErase) {
    write("image.bin", randomBytes(4096, 51));
    write("old.bin", randomBytes(4096, 52));
    ok({"--part", "W25Q16JV", "--port", "svf:job.svf", "program", "image.bin", "-e"});
    EXPECT_TRUE(has(read("job.svf"), "Checking the chip's JEDEC ID (EF4015)"));
    const Args other{"--part", "W25Q32JV", "--port", "sim:other.sim"};
    ok(other + Args{"program", "old.bin", "-e"});
    const std::string before = read("other.sim");
    const Result played = run(other + Args{"play", "job.svf"});
    EXPECT_EQ(played.status, 1) << played.text();
    EXPECT_TRUE(has(played.err, "stopped at the first mismatch")) << played.text();
    EXPECT_TRUE(read("other.sim") == before) << "the chip's data did not survive";
    // On the chip it was made for it plays through.
    EXPECT_TRUE(has(ok({"--part", "W25Q16JV", "--port", "sim:right.sim", "play", "job.svf"}).out, "no mismatches"));
}

}  // namespace
}  // namespace vorant::cli::test
