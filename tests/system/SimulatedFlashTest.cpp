// Jobs on simulated chips checked against the chip's registers and memory
// rather than against the scans: where the plug-in's order of commands
// meets the chip's timing.
#include "tests/system/SystemRig.h"

#include <gtest/gtest.h>

namespace vorant::test {
namespace {

const auto program = [](Type1SPIDevice& d, UT_CMDARGS* a) { return d.program(0, a); };
const auto erase = [](Type1SPIDevice& d, UT_CMDARGS* a) { return d.erase(0, a); };

// x4 data set Quad Enable (status register 2 bit 1) in the chip and leave
// register 1 as it was; an erase of a part that reads x4 clears it again.
TEST(SimulatedFlash, QuadWidthDataSetQuadEnableInTheChipAndEraseClearsIt) {
    SystemRig rig("W25Q128JV");
    rig.useImage(randomImage(600, 3));
    rig.device->setAttribute(DeviceNS::ATTR_DATA_WIDTH, "4", true);
    const std::uint8_t status1Before = rig.port->model().status1();
    ASSERT_TRUE(rig.run(program, {"-e"})) << rig.messages.transcript();
    EXPECT_TRUE(rig.port->model().status2() & 0x02);
    EXPECT_EQ(rig.port->model().status1(), status1Before);
    ASSERT_TRUE(rig.run(erase));
    EXPECT_FALSE(rig.port->model().status2() & 0x02);
}

// The unlock's status write must be over before the erase is sent, or the
// busy chip ignores the erase.
TEST(SimulatedFlash, AProtectedChipIsUnlockedBeforeItIsErased) {
    sim::FaultPlan faults;
    faults.protectAtPowerOn = true;
    SystemRig rig("W25Q16JV", faults);
    std::fill_n(rig.port->model().memory().begin(), 16, 0x00);
    ASSERT_TRUE(rig.run(erase)) << rig.messages.transcript();
    EXPECT_EQ(rig.port->model().memory()[0], 0xFF);
    EXPECT_EQ(rig.port->model().status1() & 0x1C, 0) << "the block-protect bits are clear";
}

}  // namespace
}  // namespace vorant::test
