// The simulated board's TAP as an adapter meets it: the walk of TMS through
// the states, the IR capture pattern, IDCODE after reset and BYPASS. The
// bridge behind its instruction is the conformance suite's board instances.

#include "ports/jtag/board/BoardModel.h"
#include "ports/jtag/board/BoardScans.h"

#include <gtest/gtest.h>

namespace vorant::ports::jtag::test {
namespace {

sim::FlashConfig tinyChip() {
    sim::FlashConfig config;
    config.partName = "TINY";
    config.sizeBytes = 4096;
    config.jedecId[0] = 0xEF, config.jedecId[1] = 0x40, config.jedecId[2] = 0x18;
    return config;
}

BitBuffer bits(std::uint64_t value, unsigned count) {
    BitBuffer out;
    out.assign(count, false);
    for (unsigned k = 0; k < count; ++k) out.setBit(k, (value >> k) & 1u);
    return out;
}

std::uint64_t value(const BitBuffer& buffer) {
    std::uint64_t out = 0;
    for (std::size_t k = 0; k < buffer.size() && k < 64; ++k) out |= static_cast<std::uint64_t>(buffer.bit(k)) << k;
    return out;
}

TEST(BoardModel, WalksTheTapStatesByTms) {
    const std::pair<const char*, TapState> cases[] = {
        {"11111", TapState::TestLogicReset}, {"111110", TapState::RunTestIdle},
        {"1111101", TapState::SelectDrScan}, {"11111010", TapState::CaptureDr},
        {"111110100", TapState::ShiftDr},    {"1111101001", TapState::Exit1Dr},
        {"11111010010", TapState::PauseDr},  {"111110100101", TapState::Exit2Dr},
        {"1111101001010", TapState::ShiftDr}, {"11111010011", TapState::UpdateDr},
        {"111110110", TapState::CaptureIr},  {"1111101100", TapState::ShiftIr},
        {"11111011011", TapState::UpdateIr}, {"1111101111", TapState::TestLogicReset},
    };
    for (const auto& [tms, state] : cases) {
        sim::FlashModel flash(tinyChip());
        BoardModel board(flash, BoardSettings{});
        for (const char* c = tms; *c; ++c) board.cycle(*c == '1', false);
        EXPECT_EQ(board.state(), state) << tms << " ends in " << tapStateName(board.state());
    }
}

TEST(BoardModel, AnswersIdcodeBypassAndTheIrCapture) {
    sim::FlashModel flash(tinyChip());
    BoardSettings settings;
    settings.idcode = 0x0362D093;
    BoardModel board(flash, settings);
    resetToIdle(board);
    BitBuffer tdo;
    scanDr(board, bits(0, 32), tdo);
    EXPECT_EQ(value(tdo), 0x0362D093u) << "IDCODE is selected after reset";

    scanIr(board, bits(0x3F, 6), tdo);  // BYPASS
    EXPECT_EQ(value(tdo) & 3u, 1u) << "the IR captures ...01";
    scanDr(board, bits(0b1011, 5), tdo);
    EXPECT_EQ(value(tdo), 0b10110u) << "BYPASS delays TDI by one bit";

    scanIr(board, bits(0x02, 6), tdo);  // the bridge

    resetToIdle(board);
    EXPECT_EQ(board.instruction(), 0x09u) << "reset selects IDCODE again";
}

TEST(BoardModel, CountsTimeInTckCycles) {
    sim::FlashModel flash(tinyChip());
    BoardSettings settings;
    settings.tckHz = 1'000'000;
    BoardModel board(flash, settings);
    resetToIdle(board);
    const std::uint64_t before = flash.now();
    runIdle(board, 1000);
    EXPECT_EQ(flash.now() - before, 1'000'000u) << "1000 cycles at 1 MHz are 1 ms";
}

}  // namespace
}  // namespace vorant::ports::jtag::test
