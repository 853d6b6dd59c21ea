// Every shipped part, on a simulated chip built from the same entry:
// erase, program, verify and read back a small image.
#include "host/ConstraintsManager.h"
#include "host/PendingOutputs.h"
#include "tests/system/SystemRig.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <iterator>

namespace vorant::test {
namespace {

namespace fs = std::filesystem;

TEST(ShippedParts, EachErasesProgramsVerifiesAndReadsBackOnItsSimulatedChip) {
    loadShippedPartsOnce();
    const auto parts = ConstraintsManager::instance().partNames();
    ASSERT_GE(parts.size(), 200u);
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
        // A readback covers the whole flash (up to 128 MiB here): about ten
        // seconds for all parts together.
        const fs::path out = fs::temp_directory_path() / ("vorant-shipped-readback-" + part + ".bin");
        fs::remove(out);
        ASSERT_TRUE(rig.run([](Type1SPIDevice& d, UT_CMDARGS* a) { return d.readbackToFile(0, a); },
                            {"-f", out.string()}))
            << rig.messages.transcript();
        ASSERT_TRUE(PendingOutputs::commitAll().empty());
        std::ifstream in(out, std::ios::binary);
        const std::vector<unsigned char> file((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
        fs::remove(out);
        ASSERT_EQ(file.size(), memory.size());
        EXPECT_TRUE(std::equal(file.begin(), file.end(), memory.begin())) << "the readback is the flash";
    }
}

}  // namespace
}  // namespace vorant::test
