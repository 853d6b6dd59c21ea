// Programming only what the image covers, on the simulated chip: a failed
// erase writes no page, a stuck bit fails the verify, and ranges are
// verified and summed where they lie.
#include "tests/support/ReferenceCrc32.h"
#include "tests/system/SystemRig.h"

#include <gtest/gtest.h>

#include <algorithm>

namespace vorant::test {
namespace {

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
};

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
