// What the tool says is what happened: failed reads are neither "idle" nor
// an answer, a failed erase writes no page, a write that did not stick is a
// failure, and a chip that cannot take a write is refused before it.
#include "host/ConstraintsManager.h"
#include "tests/cli/ToolTestFixture.h"

#include <cstdlib>

namespace vorant::cli::test {
namespace {

// A lost cable ends the polling at once with the cable's reason, not after
// the polling limit with a time-out.
TEST_F(ToolTest, ALostCableStopsPollingAtOnce) {
    write("slow.toml", userPart("SLOW16", "EF4015", {{"PROGRAM_WAITTIME", "100"}, {"SIM_PAGE_PROGRAM_US", "400"}}));
    write("image.bin", randomBytes(1024, 3));
    const Result result = run(Args{"--parts", "slow.toml", "--part", "SLOW16", "--sim-fault", "disconnect=8",
                                   "--no-erase", "program", "image.bin"});
    EXPECT_EQ(result.status, 1);
    EXPECT_TRUE(has(result.err, "the connection to the device was lost")) << result.text();
    EXPECT_TRUE(has(result.err, "unplugged")) << result.text();
    EXPECT_FALSE(has(result.err, "exceeded the allocated time")) << result.text();
}

// With polling off, nothing else would stop the pages: they must not go
// over data the failed erase left.
TEST_F(ToolTest, AFailedEraseWritesNoPage) {
    write("old.bin", randomBytes(4096, 1));
    write("new.bin", randomBytes(4096, 2));
    const Args sim{"--part", "W25Q16JV", "--port", "sim:flash.sim"};
    ok(sim + Args{"program", "old.bin", "-e"});
    const std::string before = read("flash.sim");
    setenv("QRX_VORANT_ENV_DONT_USE_POLLING", "1", 1);
    // Shift 10 is the erase instruction: after the ID read (1, 2), the
    // unlocks of program and erase (3 to 8) and the erase's write enable
    // (9). Wait 3 is the erase's own wait, after the two unlocks' waits.
    for (const char* fault : {"fail-shift=10", "fail-wait=3"}) {
        const Result result = run(sim + Args{"--sim-fault", fault, "program", "new.bin", "-e"});
        EXPECT_EQ(result.status, 1) << fault;
        EXPECT_TRUE(has(result.err, "the erase did not complete; no page was written")) << result.text();
        EXPECT_TRUE(has(result.out, "INFO: Busy polling is off")) << result.text();
        // The erase may have run before its wait failed; a page never did.
        const std::string after = read("flash.sim");
        EXPECT_TRUE(after == before || flashBytes(after) == std::string(kSimBytes, '\xff')) << fault;
    }
    unsetenv("QRX_VORANT_ENV_DONT_USE_POLLING");
}

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
        {{"--part", "W25Q16JV", "--sim-fault", "deep-power-down", "program", "image.bin", "-e"}, "release"},
        {{"--sim-fault", "deep-power-down", "erase"}, "no chip answered the JEDEC ID read"},
        {{"--part", "W25Q16JV", "--sim-fault", "deep-power-down", "idcode"}, "no chip answered the ID read"},
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

// The Quad Enable write is read back: a chip that ignores it fails the run.
TEST_F(ToolTest, QuadEnableThatDidNotStickIsAFailure) {
    const Args locked{"--part", "W25Q32JV", "--sim-fault", "status-locked"};
    const Result set = run(locked + Args{"qe", "set"});
    EXPECT_EQ(set.status, 1) << set.text();
    EXPECT_TRUE(has(set.err, "Quad Enable was to be set but status register 2 reads 0x00 (QE clear)")) << set.text();
    write("image.bin", randomBytes(300, 4));
    const Result x4 = run(locked + Args{"--data-width", "4", "program", "image.bin", "-e"});
    EXPECT_EQ(x4.status, 1) << x4.text();
    EXPECT_TRUE(has(x4.err, "Quad Enable was to be set")) << x4.text();
    // Where the write sticks, it passes both ways.
    ok(Args{"--part", "W25Q32JV", "--port", "sim:qe.sim", "qe", "set"});
    ok(Args{"--part", "W25Q32JV", "--port", "sim:qe.sim", "erase", "-qebit"});
}

// 'signature' on every shipped part: the byte read is the part's, or the
// part says it has none.
TEST_F(ToolTest, SignatureWorksOnEveryShippedPart) {
    ConstraintsManager& database = ConstraintsManager::instance();
    database.clear();
    database.loadDirectory(VORANT_PARTS_DIR);
    int withSignature = 0;
    for (const std::string& part : database.partNames()) {
        auto text = [&](const char* key) {
            return database.hasProperty(part, key) ? std::string(database.getDeviceStringProperty(part.c_str(), key))
                                                   : std::string();
        };
        const bool has = !text("READSIGNATURE_INSTRUCTION").empty() &&
                         (!text("RES_SIGNATURE").empty() || text("USE_RES") == "TRUE");
        const Result result = run(Args{"--part", part, "signature"});
        if (has) {
            ++withSignature;
            EXPECT_EQ(result.status, 0) << part << "\n" << result.text();
            EXPECT_TRUE(vorant::cli::test::has(result.out, "is " + part + "'s")) << result.text();
        } else {
            EXPECT_EQ(result.status, 1) << part << "\n" << result.text();
            EXPECT_TRUE(vorant::cli::test::has(result.err, "has no electronic signature")) << result.text();
        }
    }
    EXPECT_GE(withSignature, 17);
    // A chip answering another signature is a mismatch.
    const Result other = run(Args{"--part", "W25Q16JV", "--chip", "W25Q32JV", "signature"});
    EXPECT_EQ(other.status, 1) << other.text();
    EXPECT_TRUE(has(other.err, "the electronic signature read is 15, but W25Q16JV's is 14")) << other.text();
}

// The simulated Ctrl-C comes after N pages, whatever else asked for a
// cancel before them (the erase's polls do).
TEST_F(ToolTest, CancelAfterNPagesLeavesNPages) {
    const std::string image = randomBytes(8 * 256, 9);
    write("image.bin", image);
    const Result result = run(Args{"--part", "W25Q16JV", "--port", "sim:flash.sim", "--sim-fault", "cancel-after=3",
                                   "program", "image.bin", "-e"});
    EXPECT_EQ(result.status, 1);
    EXPECT_TRUE(has(result.out, "'0': Programming cancelled.")) << result.text();
    const std::string flash = flashBytes(read("flash.sim"));
    EXPECT_TRUE(flash.substr(0, 3 * 256) == image.substr(0, 3 * 256));
    EXPECT_TRUE(flash.substr(3 * 256) == std::string(kSimBytes - 3 * 256, '\xff'));
}

// --quiet keeps the answer of the operations whose output is an answer.
TEST_F(ToolTest, QuietStillAnswers) {
    EXPECT_TRUE(has(ok(Args{"--quiet", "--part", "W25Q16JV", "idcode"}).out, "IDCODE is 'EF4015'"));
    EXPECT_TRUE(has(ok(Args{"--quiet", "--part", "W25Q16JV", "signature"}).out, "IDCODE is '14'"));
    EXPECT_TRUE(has(ok(Args{"--quiet", "--part", "W25Q16JV", "status"}).out, "Status Register Contents"));
    EXPECT_EQ(ok(Args{"--quiet", "--part", "W25Q16JV", "erase"}).out, "");
}

}  // namespace
}  // namespace vorant::cli::test
