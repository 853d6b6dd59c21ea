// Whole jobs on simulated chips: what a user would do with a board, checked
// against the chip's memory rather than against the scans.
#include "host/ConstraintsManager.h"
#include "host/PendingOutputs.h"
#include "tests/system/SystemRig.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <filesystem>
#include <fstream>
#include <iterator>

namespace vorant::test {
namespace {

namespace fs = std::filesystem;

std::string firstPartWithAddressSize(int bits) {
    loadShippedPartsOnce();
    for (const auto& part : ConstraintsManager::instance().partNames())
        if (ConstraintsManager::instance().getDeviceLongProperty(part.c_str(), "ADDRESS_SIZE") == bits) return part;
    return {};
}

std::size_t pageBytesOf(const std::string& part) {
    return static_cast<std::size_t>(ConstraintsManager::instance().getDeviceLongProperty(part.c_str(), "PAGE_SIZE") / 8);
}

bool contains(const std::vector<std::string>& texts, const std::string& text) {
    return std::find(texts.begin(), texts.end(), text) != texts.end();
}

const auto program = [](Type1SPIDevice& d, UT_CMDARGS* a) { return d.program(0, a); };
const auto erase = [](Type1SPIDevice& d, UT_CMDARGS* a) { return d.erase(0, a); };
const auto verify = [](Type1SPIDevice& d, UT_CMDARGS* a) { return d.verify(0, a); };
const auto checksum = [](Type1SPIDevice& d, UT_CMDARGS* a) { return d.checksum(0, a); };
const auto blankCheck = [](Type1SPIDevice& d, UT_CMDARGS* a) { return d.blankCheck(0, a); };
const auto readback = [](Type1SPIDevice& d, UT_CMDARGS* a) { return d.readbackToFile(0, a); };

class WholeJob : public ::testing::TestWithParam<std::string> {};

TEST_P(WholeJob, EraseBlankProgramVerifyChecksumReadbackAndBlankAgain) {
    const std::string part = GetParam() == "32-bit" ? firstPartWithAddressSize(32) : GetParam();
    ASSERT_FALSE(part.empty()) << "no shipped part with a 32-bit address";
    SystemRig rig(part);
    const std::size_t pageBytes = pageBytesOf(part);
    const auto bytes = randomImage(3 * pageBytes + 77, 7);
    rig.useImage(bytes);
    std::fill_n(rig.port->model().memory().begin(), 64, 0x12);

    ASSERT_TRUE(rig.run(erase)) << rig.messages.transcript();
    EXPECT_TRUE(rig.run(blankCheck));
    EXPECT_STREQ(rig.device->getAttribute(DeviceNS::ATTR_BLANK), "TRUE");

    ASSERT_TRUE(rig.run(program, {"-e", "-v"})) << rig.messages.transcript();
    EXPECT_TRUE(rig.run(verify));

    rig.messages.clear();
    EXPECT_TRUE(rig.run(checksum)) << rig.messages.transcript();
    char expected[16];
    std::snprintf(expected, sizeof expected, "0x%08X", referenceCrc32(bytes));
    EXPECT_NE(rig.messages.transcript().find(expected), std::string::npos)
        << "the checksum of the device must be the CRC-32 of the image: " << rig.messages.transcript();

    const fs::path out = fs::temp_directory_path() / ("vorant-system-readback-" + part + ".bin");
    fs::remove(out);
    ASSERT_TRUE(rig.run(readback, {"-f", out.string()})) << rig.messages.transcript();
    // The writer leaves the file for the host to publish, as a host does
    // once the readback succeeded.
    ASSERT_TRUE(PendingOutputs::commitAll().empty());
    std::ifstream in(out, std::ios::binary);
    const std::vector<unsigned char> file((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
    EXPECT_EQ(file.size(), rig.port->model().memory().size()) << "a readback is flash-sized";
    EXPECT_TRUE(std::equal(bytes.begin(), bytes.end(), file.begin()));
    EXPECT_TRUE(std::all_of(file.begin() + static_cast<long>(bytes.size()), file.end(),
                            [](unsigned char b) { return b == 0xFF; }));
    fs::remove(out);

    rig.messages.clear();
    EXPECT_TRUE(rig.run(blankCheck));
    EXPECT_STREQ(rig.device->getAttribute(DeviceNS::ATTR_BLANK), "FALSE");
    EXPECT_TRUE(contains(rig.messages.texts(MessageKind::Status), "Failed at address, 0\n"));
}

INSTANTIATE_TEST_SUITE_P(Parts, WholeJob, ::testing::Values("W25Q128JV", "M25P16", "32-bit"),
                         [](const auto& info) { return info.param == "32-bit" ? std::string("Address32") : info.param; });

TEST(SimulatedFlash, QuadWidthDataLeaveQuadEnableSetInTheChip) {
    SystemRig rig("W25Q128JV");
    rig.useImage(randomImage(600, 3));
    rig.device->setAttribute(DeviceNS::ATTR_DATA_WIDTH, "4", true);
    const std::uint8_t status1Before = rig.port->model().status1();
    ASSERT_TRUE(rig.run(program, {"-e"})) << rig.messages.transcript();
    EXPECT_TRUE(rig.port->model().status2() & 0x02) << "QE is status register 2 bit 1";
    EXPECT_EQ(rig.port->model().status1(), status1Before);
    EXPECT_TRUE(contains(rig.messages.texts(MessageKind::Status), "'0':Programming in x4 mode.\n"));
    // An erase of a part that reads x4 clears it again.
    ASSERT_TRUE(rig.run(erase));
    EXPECT_FALSE(rig.port->model().status2() & 0x02);
}

TEST(SimulatedFlash, AStuckBitFailsVerifyAtItsPage) {
    const std::size_t pageBytes = 256;
    sim::FaultPlan faults;
    faults.stuckBits.push_back({static_cast<std::uint32_t>(2 * pageBytes + 5), 0x01, 0x00});
    SystemRig rig("W25Q128JV", faults);
    auto bytes = randomImage(4 * pageBytes, 11);
    bytes[2 * pageBytes + 5] |= 0x01;
    rig.useImage(bytes);
    EXPECT_FALSE(rig.run(program, {"-e", "-v"}));
    const auto status = rig.messages.texts(MessageKind::Status);
    EXPECT_TRUE(contains(status, "Failed at address, 512\n")) << rig.messages.transcript();
    EXPECT_TRUE(contains(status, "'0': Verification Terminated\n"));
}

TEST(SimulatedFlash, AStuckBusyChipEndsProgramAndEraseWithTheirTimeOuts) {
    sim::FaultPlan faults;
    faults.stuckBusy = true;
    {
        SystemRig rig("W25Q16JV", faults);
        CountingPort counting(*rig.port, 0x02, 0x04);
        rig.device->setScanPort(&counting);
        rig.useImage(randomImage(1000, 5));
        EXPECT_FALSE(rig.run(program));
        EXPECT_EQ(rig.messages.texts(MessageKind::Error),
                  std::vector<std::string>{"'0': Device has exceeded the allocated time.\n"});
        EXPECT_EQ(counting.pagesProgrammed, 1);
        EXPECT_EQ(counting.lastWriteOpcode, 0x04) << "the write disable is still sent";
    }
    {
        SystemRig rig("W25Q16JV", faults);
        CountingPort counting(*rig.port, 0x02, 0x04);
        rig.device->setScanPort(&counting);
        EXPECT_FALSE(rig.run(erase));
        EXPECT_EQ(rig.messages.texts(MessageKind::Error), std::vector<std::string>{"'0': Erase did not complete.\n"});
        EXPECT_EQ(counting.lastWriteOpcode, 0x04);
    }
}

TEST(SimulatedFlash, CancellingAfterNPagesLeavesExactlyNPagesAndSaysSo) {
    SystemRig rig("W25Q16JV");
    CountingPort counting(*rig.port, 0x02, 0x04);
    counting.cancelAfterPages = 3;
    rig.device->setScanPort(&counting);
    const auto bytes = randomImage(10 * 256, 9);
    rig.useImage(bytes);
    EXPECT_FALSE(rig.run(program, {"-v"})) << "a cancelled run is not a success";
    const auto& memory = rig.port->model().memory();
    EXPECT_TRUE(std::equal(bytes.begin(), bytes.begin() + 3 * 256, memory.begin()));
    EXPECT_TRUE(std::all_of(memory.begin() + 3 * 256, memory.begin() + 10 * 256, [](unsigned char b) { return b == 0xFF; }));
    EXPECT_NE(rig.messages.transcript().find("cancel"), std::string::npos) << rig.messages.transcript();
    EXPECT_EQ(counting.lastWriteOpcode, 0x04);
}

TEST(SimulatedFlash, AProtectedChipIsUnlockedBeforeItIsErased) {
    sim::FaultPlan faults;
    faults.protectAtPowerOn = true;
    SystemRig rig("W25Q16JV", faults);
    std::fill_n(rig.port->model().memory().begin(), 16, 0x00);
    ASSERT_TRUE(rig.run(erase)) << rig.messages.transcript();
    EXPECT_EQ(rig.port->model().memory()[0], 0xFF);
    EXPECT_EQ(rig.port->model().status1() & 0x1C, 0) << "the block-protect bits are clear";
}

TEST(SimulatedFlash, IdentificationPassesForTheRightPartAndFailsForAnother) {
    SystemRig rig("W25Q128JV");
    EXPECT_TRUE(rig.device->validateInstance(0));
    EXPECT_STREQ(rig.device->getAttribute(DeviceNS::ATTR_IDCODE), "EF4018");
    SystemRig signature("M25P16");
    EXPECT_TRUE(signature.device->validateInstance(0)) << signature.messages.transcript();
    EXPECT_STREQ(signature.device->getAttribute(DeviceNS::ATTR_IDCODE), "14");
    // A device for another part reads this chip's ID and refuses it.
    Type1SPIDevice* other = create_type1_spi_device("W25Q64JV");
    other->setScanPort(rig.port.get());
    EXPECT_FALSE(other->checkIdcode(0));
    EXPECT_STREQ(other->getAttribute(DeviceNS::ATTR_IDCODE), "EF4018");
    delete static_cast<DeviceOperation*>(other);
}

TEST(SimulatedFlash, QuadEnableSetAndClearSurviveInTheChipAndKeepRegisterOne) {
    SystemRig rig("W25Q128JV");
    rig.port->model().setStatus(0x00, 0x00);
    ASSERT_TRUE(rig.device->writeQuadEnableBit(0, nullptr, true));
    EXPECT_EQ(rig.port->model().status2() & 0x02, 0x02);
    EXPECT_EQ(rig.port->model().status1(), 0x00);
    ASSERT_TRUE(rig.device->writeQuadEnableBit(0, nullptr, false));
    EXPECT_EQ(rig.port->model().status2() & 0x02, 0x00);
}

TEST(SimulatedFlash, TheStatusDisplayShowsTheChipsRegistersBitByBit) {
    SystemRig rig("W25Q128JV");
    rig.port->model().setStatus(0x1C, 0x02);  // BP0-BP2 set, QE set
    ASSERT_TRUE(rig.device->readDeviceStatus(0, nullptr));
    const auto status = rig.messages.texts(MessageKind::Status);
    EXPECT_TRUE(contains(status, "W25Q128JV Status Register Contents = 0x021C.\n")) << rig.messages.transcript();
    char line[80];
    for (const auto& [label, value] : {std::pair{"QE", 1}, {"BP2", 1}, {"BP0", 1}, {"TB", 0}, {"BUSY", 0}}) {
        std::snprintf(line, sizeof line, "%-50s:%10d\n", label, value);
        EXPECT_TRUE(contains(status, line)) << line;
    }
    EXPECT_EQ(status.size(), 1u + 15u) << "the contents line and one line per labelled bit (one is NOT_VALID)";
}

}  // namespace
}  // namespace vorant::test
