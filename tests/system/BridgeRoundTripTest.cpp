// A job recorded for a bridge, played on a simulated board that carries
// that bridge, must leave the board's flash holding the image, every
// compared scan matching. The board's bridge models are written apart from
// the encoders, so a framing mistake on either side fails here. A tampered
// TDO is reported with its line.
#include "ports/jtag/Bridge.h"
#include "ports/jtag/board/BoardModel.h"
#include "ports/jtag/board/BoardSvfPlayer.h"
#include "ports/svf/SvfRecorder.h"
#include "tests/system/SystemRig.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <unistd.h>
#include <fstream>
#include <sstream>

namespace vorant::test {
namespace {

namespace fs = std::filesystem;

struct BridgeCase {
    const char* bridge;
    std::optional<unsigned> delay;
    const char* chain = "[6]";  // from TDI, the bridge's TAP in brackets
};

class BridgeRoundTrip : public ::testing::TestWithParam<BridgeCase> {};

TEST_P(BridgeRoundTrip, RecordedProgramPlaysOnABoardWithThatBridge) {
    const BridgeCase& row = GetParam();
    loadShippedPartsOnce();
    const std::string part = "W25Q128JV";
    // Rows run side by side in separate processes: each its own file.
    const fs::path file = fs::temp_directory_path() /
                          ("vorant-bridge-" + std::string(row.bridge) + "-" + std::to_string(::getpid()) + ".svf");
    fs::remove(file);
    const auto bytes = randomImage(3 * 256 + 17, 5);
    svf::SvfRecorderOptions options;
    options.bridgeSettings.name = row.bridge;
    options.bridgeSettings.misoDelay = row.delay;
    unsigned irLength = 0;
    options.bridgeSettings.chain = ports::jtag::parseJtagChain(row.chain, irLength);
    options.bridge = ports::jtag::makeBridge(options.bridgeSettings);
    options.tckHz = 10'000'000;
    {
        SystemRig rig(part);
        svf::SvfRecorder recorder(file, options);
        rig.device->setScanPort(&recorder);
        rig.useImage(bytes);
        ASSERT_TRUE(rig.run([](Type1SPIDevice& d, UT_CMDARGS* a) { return d.program(0, a); }, {"-e", "-v"}))
            << rig.messages.transcript();
        recorder.finish();
    }
    auto playOnFreshBoard = [&](const std::string& text, sim::FlashModel& flash) {
        ports::jtag::BoardSettings settings;
        settings.bridge = row.bridge;
        settings.misoDelay = row.delay.value_or(1);  // the bridge's own register; the chain adds its TAPs
        settings.chain = options.bridgeSettings.chain;
        ports::jtag::BoardModel board(flash, settings);
        ports::jtag::BoardSvfPlayer player(board);
        return player.playText(text);
    };
    std::ostringstream recorded;
    recorded << std::ifstream(file).rdbuf();
    fs::remove(file);

    sim::FlashModel fresh(sim::FlashConfig::fromPartDatabase(part));
    std::fill_n(fresh.memory().begin(), 4096, 0x00);  // the recorded erase must clear this
    const auto result = playOnFreshBoard(recorded.str(), fresh);
    for (const auto& m : result.mismatches) ADD_FAILURE() << m.describe();
    EXPECT_GT(result.comparedSdrs, 3u) << "the verify pages are compared";
    EXPECT_TRUE(std::equal(bytes.begin(), bytes.end(), fresh.memory().begin()));
    EXPECT_EQ(fresh.memory()[bytes.size()], 0xFF);

    // One flipped expected bit in the last compared scan (a verify page):
    // the mismatch names that SDR's line.
    std::string text = recorded.str();
    const std::size_t tdo = text.rfind(" TDO (");
    const std::size_t digit = text.find_first_of("0123456789ABCDEF", tdo + 6 + 8);
    text[digit] = text[digit] == '0' ? '1' : '0';
    const std::size_t sdr = text.rfind("\nSDR ", tdo) + 1;  // a mismatch names the line its SDR starts on
    const std::size_t line = static_cast<std::size_t>(std::count(text.begin(), text.begin() + static_cast<long>(sdr), '\n')) + 1;
    sim::FlashModel again(sim::FlashConfig::fromPartDatabase(part));
    const auto tampered = playOnFreshBoard(text, again);
    ASSERT_EQ(tampered.mismatches.size(), 1u);
    EXPECT_EQ(tampered.mismatches[0].line, line);
}

INSTANTIATE_TEST_SUITE_P(Bridges, BridgeRoundTrip,
                         ::testing::Values(BridgeCase{"jtagspi", {}}, BridgeCase{"jtagspi", {}, "8,5,[6],4"},
                                           BridgeCase{"shiftdr", {}},
                                           BridgeCase{"shiftdr", 0u}, BridgeCase{"shiftdr", 3u},
                                           BridgeCase{"direct", {}}),
                         [](const auto& info) {
                             return std::string(info.param.bridge) +
                                    (info.param.delay ? "Delay" + std::to_string(*info.param.delay) : "") +
                                    (std::string(info.param.chain) != "[6]" ? "InAChain" : "");
                         });

}  // namespace
}  // namespace vorant::test
