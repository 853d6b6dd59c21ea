// A job recorded as SVF, played on a fresh simulated chip, must leave the
// chip holding the image, with every compared scan matching.
#include "ports/svf/SvfPlayer.h"
#include "ports/svf/SvfRecorder.h"
#include "tests/system/SystemRig.h"

#include <gtest/gtest.h>

#include <filesystem>

namespace vorant::test {
namespace {

namespace fs = std::filesystem;

class SvfRoundTrip : public ::testing::TestWithParam<std::string> {};

TEST_P(SvfRoundTrip, RecordedProgramPlaysBackOntoAFreshChip) {
    const std::string part = GetParam();
    loadShippedPartsOnce();
    const fs::path file = fs::temp_directory_path() / ("vorant-roundtrip-" + part + ".svf");
    fs::remove(file);
    const auto bytes = randomImage(5 * 256 + 33, 21);
    {
        SystemRig rig(part);
        svf::SvfRecorder recorder(file);
        rig.device->setScanPort(&recorder);
        rig.useImage(bytes);
        ASSERT_TRUE(rig.run([](Type1SPIDevice& d, UT_CMDARGS* a) { return d.program(0, a); }, {"-e", "-v"}))
            << rig.messages.transcript();
        recorder.finish();
    }
    sim::FlashModel fresh(sim::FlashConfig::fromPartDatabase(part));
    std::fill_n(fresh.memory().begin(), 4096, 0x00);  // the recorded erase must clear this
    svf::SvfPlayer player(fresh);
    const auto result = player.playFile(file);
    for (const auto& m : result.mismatches) ADD_FAILURE() << m.describe();
    EXPECT_GT(result.comparedSdrs, 5u) << "the verify pages are compared";
    EXPECT_TRUE(std::equal(bytes.begin(), bytes.end(), fresh.memory().begin()));
    EXPECT_EQ(fresh.memory()[bytes.size()], 0xFF);
    fs::remove(file);
}

INSTANTIATE_TEST_SUITE_P(Parts, SvfRoundTrip, ::testing::Values("W25Q128JV", "M25P16", "MX25L12835F"));

}  // namespace
}  // namespace vorant::test
