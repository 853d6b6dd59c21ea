// Every shipped part, on a simulated chip built from the same entry:
// erase, program and verify a small image.
#include "formats/SfdpTable.h"
#include "host/ConstraintsManager.h"
#include "ports/sim/FlashModel.h"
#include "tests/system/SystemRig.h"

#include <gtest/gtest.h>

#include <algorithm>

namespace vorant::test {
namespace {

TEST(ShippedParts, EachErasesProgramsAndVerifiesOnItsSimulatedChip) {
    loadShippedPartsOnce();
    ConstraintsManager& db = ConstraintsManager::instance();
    const auto parts = db.partNames();
    ASSERT_GE(parts.size(), 200u);
    std::uint32_t seed = 1;
    for (const auto& part : parts) {
        SCOPED_TRACE(part);
        SystemRig rig(part);
        const auto pageBytes = static_cast<std::size_t>(
            db.getDeviceLongProperty(part.c_str(), "PAGE_SIZE") / 8);
        auto bytes = randomImage(2 * pageBytes + pageBytes / 2 + 3, seed++);
        rig.useImage(bytes);
        // Dirty the chip first so the erase has something to do.
        std::fill_n(rig.port->model().memory().begin() + static_cast<long>(4 * pageBytes), 16, 0x00);
        ASSERT_TRUE(rig.run([](Type1SPIDevice& d, UT_CMDARGS* a) { return d.program(0, a); }, {"-e", "-v"}))
            << rig.messages.transcript();
        const auto& memory = rig.port->model().memory();
        EXPECT_TRUE(std::equal(bytes.begin(), bytes.end(), memory.begin()));
        EXPECT_TRUE(std::all_of(memory.begin() + static_cast<long>(bytes.size()),
                                memory.begin() + static_cast<long>(8 * pageBytes),
                                [](unsigned char b) { return b == 0xFF; }));
    }
}

// The SFDP area each simulated chip serves (a real chip's dump, or one
// written by the simulator from the part) decodes with the tool's decoder
// into the facts of the part entry: two independent readings of the same
// chip that must agree.
TEST(ShippedParts, ServeAnSfdpAreaThatAgreesWithTheirEntry) {
    loadShippedPartsOnce();
    ConstraintsManager& db = ConstraintsManager::instance();
    int served = 0;
    for (const auto& part : db.partNames()) {
        SCOPED_TRACE(part);
        sim::FlashModel chip(sim::FlashConfig::fromPartDatabase(part));
        chip.select();
        for (std::uint8_t byte : {0x5A, 0x00, 0x00, 0x00, 0xFF}) chip.clockByte(byte);
        std::vector<std::uint8_t> area(1024);
        for (auto& byte : area) byte = chip.clockByte(0xFF);
        chip.deselect();
        const bool none = db.hasProperty(part, "SFDP") && std::string(db.getDeviceStringProperty(part.c_str(), "SFDP")) == "none";
        if (none) {
            EXPECT_TRUE(std::all_of(area.begin(), area.end(), [](std::uint8_t b) { return b == 0xFF; }));
            continue;
        }
        formats::SfdpTable table;
        ASSERT_NO_THROW(table = formats::decodeSfdp(area));
        ++served;
        auto number = [&](const char* key) { return static_cast<std::uint64_t>(db.getDeviceLongProperty(part.c_str(), key)); };
        EXPECT_EQ(table.densityBytes, number("DEVICE_SIZE") / 8);
        const auto* erase = table.eraseOfSize(static_cast<std::uint32_t>(number("SECTOR_SIZE")));
        ASSERT_NE(erase, nullptr) << "no erase type of SECTOR_SIZE";
        const auto opcode = static_cast<std::uint8_t>(std::stoi(db.getDeviceStringProperty(part.c_str(), "SECTORERASE_INSTRUCTION"), nullptr, 2));
        // Some real tables of 4-byte parts list no 4-byte erase (IS25WP256
        // has no 4-byte instruction table): the usual 4-byte pair counts.
        const bool usualPair = number("ADDRESS_SIZE") == 32 &&
                               ((erase->opcode == 0x20 && opcode == 0x21) || (erase->opcode == 0xD8 && opcode == 0xDC));
        EXPECT_TRUE(erase->opcode == opcode || erase->opcode4 == opcode || usualPair);
        if (table.pageBytes) {
            EXPECT_EQ(*table.pageBytes, number("PAGE_SIZE") / 8);
        }
        if (table.quadEnableRequirement && db.hasProperty(part, "QE_LOCATION")) {
            const std::string qe = db.getDeviceStringProperty(part.c_str(), "QE_LOCATION");
            const int r = *table.quadEnableRequirement;
            EXPECT_TRUE(qe == "SR2.1" ? (r == 1 || r == 4 || r == 5 || r == 6) : qe == "SR1.6" ? r == 2 : r == 0)
                << qe << " against requirement " << r;
        }
    }
    EXPECT_GE(served, 150);
}

}  // namespace
}  // namespace vorant::test
