// What the tool says is what happened: a chip that cannot take a write is
// refused before it, and --quiet keeps the answers.
#include "tests/cli/ToolTestFixture.h"

namespace vorant::cli::test {
namespace {

// A chip that answers nothing is a failed run (status 1), named as such,
// and nothing is written to it; so is a chip whose protection would make
// erase and program change nothing.
TEST_F(ToolTest, AChipThatCannotTakeAWriteIsRefusedFirst) {
    write("image.bin", randomBytes(4096, 5));
    write("noun.toml", userPart("NOUNLOCK", "EF4015", {{"USE_UNLOCKSR", "\"FALSE\""}}));
    const Args noUnlock{"--parts", "noun.toml", "--part", "NOUNLOCK", "--port", "sim:flash.sim"};
    const struct {
        Args args;
        const char* line;
    } runs[] = {
        {{"--part", "W25Q16JV", "--sim-fault", "deep-power-down", "erase"}, "'vorant-spi --part W25Q16JV release'"},
        {{"--sim-fault", "deep-power-down", "erase"}, "no chip answered the JEDEC ID read"},
        {noUnlock + Args{"--sim-fault", "protected", "erase"},
         "the chip is write-protected: BP2, BP1, BP0 set in status register 1 (0x1C)"},
        {noUnlock + Args{"--sim-fault", "protected", "program", "image.bin", "-e"}, "'vorant-spi --part NOUNLOCK unlock'"},
        // A part named for another chip: its size and opcodes could ruin it.
        {{"--part", "W25Q16JV", "--chip", "W25Q32JV", "--port", "sim:other.sim", "erase"},
         "the chip answers the JEDEC ID EF4016 (W25Q32FV, W25Q32JV), not W25Q16JV's EF4015; nothing was written"},
    };
    for (const auto& [args, line] : runs) {
        const Result result = run(args);
        EXPECT_EQ(result.status, 1) << result.text();
        EXPECT_TRUE(has(result.err, line)) << result.text();
        EXPECT_FALSE(has(result.out, "Erasing Device")) << result.text();
    }
    // --force writes all the same.
    ok(Args{"--part", "W25Q16JV", "--chip", "W25Q32JV", "--force", "erase"});
    // After the unlock the same chip takes the job.
    ok(noUnlock + Args{"--sim-fault", "protected", "unlock"});
    ok(noUnlock + Args{"program", "image.bin", "-e", "-v"});
}

// --quiet keeps the answer of the operations whose output is an answer.
TEST_F(ToolTest, QuietStillAnswers) {
    EXPECT_TRUE(has(ok(Args{"--quiet", "--part", "W25Q16JV", "idcode"}).out, "IDCODE is 'EF4015'"));
    EXPECT_TRUE(has(ok(Args{"--quiet", "--part", "W25Q16JV", "signature"}).out, "IDCODE is '14'"));
    EXPECT_TRUE(has(ok(Args{"--quiet", "--part", "W25Q16JV", "status"}).out, "Status Register Contents"));
    EXPECT_EQ(ok(Args{"--quiet", "--part", "W25Q16JV", "erase"}).out, "");
}

// Only the command line reads Quad Enable back: a status write the chip
// ignored (WP# low) is a failure, never "succeeded".
TEST_F(ToolTest, QuadEnableThatDidNotStickIsAFailure) {
    const Result set = run(Args{"--part", "W25Q32JV", "--sim-fault", "status-locked", "qe", "set"});
    EXPECT_EQ(set.status, 1) << set.text();
    EXPECT_TRUE(has(set.err, "Quad Enable was to be set but status register 2 reads 0x00 (QE clear)")) << set.text();
}

}  // namespace
}  // namespace vorant::cli::test
