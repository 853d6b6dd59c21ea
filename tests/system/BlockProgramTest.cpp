// Programming only what the image covers, on the simulated chip: data
// around the image survive, a block that already holds the data is left
// alone, the largest erases are used, and a failed erase writes no page.
#include "tests/support/ReferenceCrc32.h"
#include "tests/system/SystemRig.h"

#include <gtest/gtest.h>

#include <algorithm>

namespace vorant::test {
namespace {

constexpr std::uint32_t K = 1024;

using Bytes = std::vector<unsigned char>;

// The shipped W25Q16JV, which names its 4 KiB, 32 KiB and 64 KiB erases.
struct BlockRig : SystemRig {
    explicit BlockRig(sim::FaultPlan faults = {}) : SystemRig("W25Q16JV", std::move(faults)) {}
    // Puts bytes straight into the chip, as an earlier job would have.
    void fill(std::uint32_t address, const Bytes& bytes) {
        std::copy(bytes.begin(), bytes.end(), port->model().memory().begin() + address);
    }
    void useRanges(std::vector<formats::ImageRange> ranges) {
        image = std::make_unique<formats::FlashImage>(std::move(ranges));
        device->setConfigData(image.get());
    }
    bool programBlocks(const std::vector<std::string>& switches = {"-v"}) {
        return run([](Type1SPIDevice& d, UT_CMDARGS* args) { return d.programBlocks(0, args); }, switches);
    }
    const Bytes& flash() { return port->model().memory(); }
    std::uint64_t erases(std::uint32_t bytes) { return port->model().erasesOf(bytes); }
};

TEST(BlockProgram, DataAroundTheImageSurviveAndOnlyTouchedBlocksAreErased) {
    BlockRig rig;
    const Bytes old = randomImage(0x30000, 1), boot = randomImage(0x1000, 2);
    rig.fill(0, old);
    rig.fill(0, boot);
    const Bytes app = randomImage(3000, 3), patch = randomImage(0x100, 4);
    // The app at 0x10000, and 256 bytes inside the block at 0x21000.
    rig.useRanges({{0x10000, app}, {0x21100, patch}});
    ASSERT_TRUE(rig.programBlocks()) << rig.messages.transcript();

    Bytes expected = old;
    std::copy(boot.begin(), boot.end(), expected.begin());
    std::copy(app.begin(), app.end(), expected.begin() + 0x10000);
    // The block at 0x10000 keeps what it held past the app.
    std::copy(old.begin() + 0x10000 + 3000, old.begin() + 0x11000, expected.begin() + 0x10000 + 3000);
    std::copy(patch.begin(), patch.end(), expected.begin() + 0x21100);
    EXPECT_TRUE(std::equal(expected.begin(), expected.end(), rig.flash().begin()));
    EXPECT_EQ(rig.erases(4 * K), 2u);
    EXPECT_EQ(rig.erases(64 * K) + rig.erases(32 * K) + rig.erases(2 * 1024 * K), 0u);
    EXPECT_NE(rig.messages.transcript().find("2 blocks erased, "), std::string::npos);
    EXPECT_NE(rig.messages.transcript().find("Verification completed."), std::string::npos);
}

TEST(BlockProgram, TheLargestErasesThatFitAndNoneForBlocksThatHoldTheData) {
    BlockRig rig;
    Bytes image = randomImage(1024 * K, 5);
    rig.useRanges({{0, image}});
    ASSERT_TRUE(rig.programBlocks()) << rig.messages.transcript();
    // Written and read back once each: a block the image fills is read
    // before its erase only up to its first differing page.
    EXPECT_LT(rig.port->stats().bitsShifted, image.size() * 8 * 9 / 4);
    EXPECT_EQ(rig.erases(64 * K), 16u);
    EXPECT_EQ(rig.erases(4 * K) + rig.erases(32 * K), 0u);
    EXPECT_TRUE(std::equal(image.begin(), image.end(), rig.flash().begin()));

    // The same image again: nothing to erase or write. One 64 KiB block
    // changed: that block alone.
    ASSERT_TRUE(rig.programBlocks());
    EXPECT_EQ(rig.erases(64 * K), 16u);
    std::fill(image.begin() + 0x50000 + 10, image.begin() + 0x50000 + 20, 0x00);
    rig.useRanges({{0, image}});
    ASSERT_TRUE(rig.programBlocks());
    EXPECT_EQ(rig.erases(64 * K), 17u);
    EXPECT_TRUE(std::equal(image.begin(), image.end(), rig.flash().begin()));
}

TEST(BlockProgram, AFailedEraseWritesNoPageAndAStuckBitFailsTheVerify) {
    {
        sim::FaultPlan stuck;
        stuck.stuckBusy = true;
        BlockRig rig(stuck);
        const Bytes old = randomImage(0x2000, 7);
        rig.fill(0, old);
        rig.useRanges({{0x100, randomImage(0x100, 8)}});
        EXPECT_FALSE(rig.programBlocks());
        EXPECT_NE(rig.messages.transcript().find("the erase of the block at address 0x0 did not complete; no page"),
                  std::string::npos)
            << rig.messages.transcript();
    }
    {
        sim::FaultPlan stuck;
        stuck.stuckBits = {{0x2345, 0xFF, 0x00}};
        BlockRig rig(stuck);
        rig.useRanges({{0x2000, randomImage(0x1000, 9)}});
        EXPECT_FALSE(rig.programBlocks());
        EXPECT_NE(rig.messages.transcript().find("Failed at address, 9029"), std::string::npos)
            << rig.messages.transcript();
    }
}

// Verify and checksum with "-ranges" read only where the data lie; the
// checksum is then the CRC of the data bytes in address order, which
// anyone can recompute from the image alone.
TEST(BlockProgram, RangesAreVerifiedAndSummedWhereTheyLie) {
    BlockRig rig;
    const Bytes low = randomImage(300, 11), high = randomImage(500, 12);
    rig.useRanges({{0x100, low}, {0x180000, high}});
    ASSERT_TRUE(rig.programBlocks({}));
    const auto readsBefore = rig.port->stats().transactions;
    ASSERT_TRUE(rig.run([](Type1SPIDevice& d, UT_CMDARGS* a) { return d.verify(0, a); }, {"-ranges"}))
        << rig.messages.transcript();
    // 300 bytes from 0x100 and 500 from 0x180000: 2 + 2 page pieces, a
    // transaction each, and the status display's two reads.
    EXPECT_EQ(rig.port->stats().transactions - readsBefore, 4u + 2u);

    rig.messages.clear();
    ASSERT_TRUE(rig.run([](Type1SPIDevice& d, UT_CMDARGS* a) { return d.checksum(0, a); }, {"-ranges"}));
    Bytes both = low;
    both.insert(both.end(), high.begin(), high.end());
    const std::string expected = referenceCrc32Text(both.data(), both.size());
    EXPECT_NE(rig.messages.transcript().find("of the device contents:    " + expected), std::string::npos)
        << rig.messages.transcript();

    // A byte changed inside the second range fails the verify there.
    rig.port->model().memory()[0x180000 + 7] ^= 0x01;
    EXPECT_FALSE(rig.run([](Type1SPIDevice& d, UT_CMDARGS* a) { return d.verify(0, a); }, {"-ranges"}));
    EXPECT_NE(rig.messages.transcript().find("Failed at address, 1572864"), std::string::npos)
        << rig.messages.transcript();
}

}  // namespace
}  // namespace vorant::test
