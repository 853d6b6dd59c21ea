// The device plug-in playing on the simulated flash: its command layer and
// memory operations must make the chip do what they mean.

#include "ports/sim/SimScanPort.h"
#include "s/Type1SPIDevice.h"
#include "tests/sim/SimTestSupport.h"
#include "tests/support/TestParts.h"

#include "host/ConfigData.h"
#include "host/MessageSinks.h"
#include "host/UT_CMDARGS.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <memory>

namespace vorant::sim::test {
namespace {

constexpr std::uint8_t kWip = 0x01, kWel = 0x02;

// A W25Q128-like part shrunk to 64 KiB so whole-array runs stay small.
std::string smallDatabasePart() {
    vorant::test::Properties p = vorant::test::w25q128Properties();
    p["DEVICE_SIZE"] = std::to_string(64 * 1024 * 8);
    return vorant::test::addTestPart("SIM_PLUGIN_SMALL", p);
}

// Configuration data from memory, one chunk of up to maxBits bits at a time.
class MemoryReader : public ConfigDataReader {
public:
    explicit MemoryReader(Bytes data) : data_(std::move(data)) {}
    unsigned dataSize() override { return static_cast<unsigned>(data_.size() * 8); }
    void rewind() override { position_ = 0; }
    int next(const char** data, int* address, int maxBits) override {
        if (position_ >= data_.size()) return 0;
        const std::size_t bytes = std::min<std::size_t>(static_cast<std::size_t>(maxBits) / 8, data_.size() - position_);
        chunk_.assign(static_cast<std::size_t>(maxBits + 7) / 8, 0xFF);
        std::copy_n(data_.begin() + static_cast<std::ptrdiff_t>(position_), bytes, chunk_.begin());
        *data = reinterpret_cast<const char*>(chunk_.data());
        *address = static_cast<int>(position_);
        position_ += bytes;
        return static_cast<int>(bytes * 8);
    }

private:
    Bytes data_;
    Bytes chunk_;
    std::size_t position_ = 0;
};

class PluginOnSimulator : public ::testing::Test {
protected:
    void start(const std::string& part, const FaultPlan& faults = FaultPlan{}) {
        port_ = std::make_unique<SimScanPort>(FlashConfig::fromPartDatabase(part), faults);
        device_.reset(create_type1_spi_device(part.c_str()));
        ASSERT_NE(device_, nullptr);
        device_->setScanPort(port_.get());
    }
    // Starts a page program on the chip directly, as a device would.
    void startPageProgram() {
        RLBitVec writeEnable = wireVector({0x06});
        ASSERT_TRUE(port_->shiftWrite(ScanStage::kWhole, &writeEnable, 0));
        RLBitVec program = wireVector({0x02, 0x00, 0x00, 0x00, 0x00});
        ASSERT_TRUE(port_->shiftWrite(ScanStage::kWhole, &program, 0));
        ASSERT_TRUE(port_->model().busy());
    }

    CapturingSink messages_;
    ScopedSink sinkScope_{&messages_};
    std::unique_ptr<SimScanPort> port_;
    std::unique_ptr<Type1SPIDevice> device_;
};

TEST_F(PluginOnSimulator, WriteEnableAndDisableMoveTheLatch) {
    start(smallDatabasePart());
    EXPECT_TRUE(device_->spienable(0, nullptr));
    EXPECT_TRUE(port_->model().writeEnabled());
    EXPECT_TRUE(device_->spidisable(0, nullptr));
    EXPECT_FALSE(port_->model().writeEnabled());
}

// checkStatus polls until the busy time has passed: a 700 us page program
// polled every `step` us needs ceil(700 / step) waits.
TEST_F(PluginOnSimulator, CheckStatusPollsForTheBusyTime) {
    struct Case {
        const char* name;
        bool stuckBusy;
        int maxWait, step;
        bool result;
        std::uint64_t waits;
    };
    const Case cases[] = {
        {"program time 700 us, step 70", false, 4500, 70, true, 10},
        {"step 300", false, 4500, 300, true, 3},
        {"time-out before the program ends", false, 500, 100, false, 6},
        {"stuck busy: floor(4500 / 70) + 1 reads", true, 4500, 70, false, 65},
    };
    const std::string part = smallDatabasePart();
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        FaultPlan faults;
        faults.stuckBusy = c.stuckBusy;
        start(part, faults);
        startPageProgram();
        EXPECT_EQ(device_->checkStatus(0, c.maxWait, c.step), c.result);
        EXPECT_EQ(port_->stats().waitCalls, c.waits);
        EXPECT_EQ(port_->model().busy(), !c.result);
    }
}

TEST_F(PluginOnSimulator, CheckStatusStopsOnCancel) {
    FaultPlan faults;
    faults.stuckBusy = true;
    faults.cancelAfterQueries = 2;
    start(smallDatabasePart(), faults);
    startPageProgram();
    EXPECT_FALSE(device_->checkStatus(0, 1'000'000, 70));
    EXPECT_EQ(port_->stats().waitCalls, 3u);
}

TEST_F(PluginOnSimulator, ReleaseFromStandByWakesTheChip) {
    FaultPlan faults;
    faults.startInDeepPowerDown = true;
    start(smallDatabasePart(), faults);
    ASSERT_TRUE(port_->model().inDeepPowerDown());
    EXPECT_TRUE(device_->releaseFromStandBy(0, nullptr));
    EXPECT_FALSE(port_->model().inDeepPowerDown());
    EXPECT_TRUE(device_->readIdcode(0, false));
    EXPECT_STREQ(device_->getAttribute(DeviceNS::ATTR_IDCODE), "EF4018");
}

TEST_F(PluginOnSimulator, ElectronicSignatureOfAResPart) {
    start(vorant::test::addTestPart("SIM_PLUGIN_M25P", vorant::test::m25p16Properties()));
    EXPECT_TRUE(device_->readElectronicSignature(0, false));
    EXPECT_STREQ(device_->getAttribute(DeviceNS::ATTR_IDCODE), "14");
}

TEST_F(PluginOnSimulator, UnlockClearsTheProtectionBeforeTheNextCommand) {
    FaultPlan faults;
    faults.protectAtPowerOn = true;
    start(smallDatabasePart(), faults);
    port_->model().setStatus(0x1C, 0x02);
    EXPECT_TRUE(device_->unlockStatusRegister(0, nullptr));
    EXPECT_FALSE(port_->model().busy()) << "the write started before the wait";
    EXPECT_EQ(port_->model().status1(), 0x00);
    EXPECT_EQ(port_->model().status2(), 0x02) << "a one-byte write keeps QE";
}

TEST_F(PluginOnSimulator, QuadEnableWriteSetsAndClearsRegister2Bit1) {
    start(smallDatabasePart());
    port_->model().setStatus(0x00, 0x00);
    EXPECT_TRUE(device_->writeQuadEnableBit(0, nullptr, true));
    EXPECT_EQ(port_->model().status2(), 0x02);
    EXPECT_EQ(port_->model().status1() & (kWip | kWel), 0);
    EXPECT_TRUE(device_->writeQuadEnableBit(0, nullptr, false));
    EXPECT_EQ(port_->model().status2(), 0x00);
}

// Erase, program and verify an image of three and a half pages, then read
// the chip as the witness.
TEST_F(PluginOnSimulator, ProgramWithEraseAndVerify) {
    struct Case {
        const char* name;
        std::vector<StuckBits> stuck;
        bool result;
    };
    const Case cases[] = {
        {"a sound chip", {}, true},
        {"a stuck bit fails verify", {{0x105, 0x10, 0x10}}, false},
    };
    Bytes image(256 * 3 + 128);
    for (std::size_t i = 0; i < image.size(); ++i) image[i] = static_cast<std::uint8_t>(i * 37 + 5);
    image[0x105] = 0x00;
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        FaultPlan faults;
        faults.stuckBits = c.stuck;
        start(smallDatabasePart(), faults);
        std::fill(port_->model().memory().begin(), port_->model().memory().end(), std::uint8_t{0x00});
        MemoryReader reader(image);
        device_->setConfigData(&reader);
        UT_CMDARGS args({"-e", "-v"});
        EXPECT_EQ(device_->program(0, &args), c.result);
        const Bytes& flash = port_->model().memory();
        EXPECT_TRUE(std::equal(image.begin(), image.end(), flash.begin()));
        EXPECT_TRUE(std::all_of(flash.begin() + static_cast<std::ptrdiff_t>(image.size()), flash.end(),
                                [](std::uint8_t b) { return b == 0xFF; }));
        EXPECT_FALSE(port_->model().writeEnabled());
        EXPECT_FALSE(port_->model().busy());
        device_->setConfigData(nullptr);
    }
}

}  // namespace
}  // namespace vorant::sim::test
