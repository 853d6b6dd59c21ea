// Every shipped part, on a simulated chip built from the same entry:
// erase, program and verify a small image.
#include "host/ConstraintsManager.h"
#include "tests/system/SystemRig.h"

#include <gtest/gtest.h>

namespace vorant::test {
namespace {

TEST(ShippedParts, EachErasesProgramsAndVerifiesOnItsSimulatedChip) {
    loadShippedPartsOnce();
    const auto parts = ConstraintsManager::instance().partNames();
    ASSERT_GE(parts.size(), 20u);
    std::uint32_t seed = 1;
    for (const auto& part : parts) {
        SCOPED_TRACE(part);
        SystemRig rig(part);
        const auto pageBytes = static_cast<std::size_t>(
            ConstraintsManager::instance().getDeviceLongProperty(part.c_str(), "PAGE_SIZE") / 8);
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

}  // namespace
}  // namespace vorant::test
