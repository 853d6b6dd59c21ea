// The device plug-in on the simulated flash where its timing matters; the
// end-to-end jobs are the system tests' part.

#include "ports/sim/SimScanPort.h"
#include "s/Type1SPIDevice.h"
#include "tests/sim/SimTestSupport.h"
#include "tests/support/TestParts.h"

#include <gtest/gtest.h>

#include <memory>

// Fault plans name only the faults they set.
#pragma GCC diagnostic ignored "-Wmissing-field-initializers"

namespace vorant::sim::test {
namespace {

struct Rig {
    std::string part = vorant::test::addTestPart("SIM_PLUGIN", vorant::test::w25q128Properties());
    SimScanPort port;
    std::unique_ptr<Type1SPIDevice> device{create_type1_spi_device(part.c_str())};

    explicit Rig(const FaultPlan& faults = {}) : port(FlashConfig::fromPartDatabase(part), faults) {
        device->setScanPort(&port);
    }
};

// A 700 us page program polled every `step` us is over after ceil(700 /
// step) waits; a time-out shorter than that fails with the chip still busy.
TEST(PluginOnSimulator, CheckStatusPollsForTheBusyTime) {
    struct Case {
        int maxWait, step;
        bool result;
        std::uint64_t waits;
    };
    for (const Case& c : {Case{4500, 70, true, 10}, Case{4500, 300, true, 3}, Case{500, 100, false, 6}}) {
        Rig rig;
        RLBitVec writeEnable = wireVector({0x06}), program = wireVector(hexBytes("02 000000 00"));
        rig.port.shiftWrite(ScanStage::kWhole, &writeEnable, 0);
        rig.port.shiftWrite(ScanStage::kWhole, &program, 0);
        EXPECT_EQ(rig.device->checkStatus(0, c.maxWait, c.step), c.result) << c.step;
        EXPECT_EQ(rig.port.stats().waitCalls, c.waits) << c.step;
        EXPECT_EQ(rig.port.model().busy(), !c.result) << c.step;
    }
}

// The unlock leaves its status write open for its wait to close: the chip
// is busy during that wait and done when the unlock returns.
TEST(PluginOnSimulator, UnlockWritesTheStatusBeforeItsWait) {
    Rig rig({.protectAtPowerOn = true});
    rig.port.model().setStatus(0x1C, 0x02);
    EXPECT_TRUE(rig.device->unlockStatusRegister(0, nullptr));
    EXPECT_FALSE(rig.port.model().selected());
    EXPECT_FALSE(rig.port.model().busy());
    EXPECT_EQ(rig.port.model().status1(), 0x00);
    EXPECT_EQ(rig.port.model().status2(), 0x02) << "a one-byte write keeps register 2";
}

}  // namespace
}  // namespace vorant::sim::test
