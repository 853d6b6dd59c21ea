// ProgressPort counts steps from what goes over the wire.
#include "cli/ProgressPort.h"
#include "tests/support/RecordingScanPort.h"

#include <gtest/gtest.h>

#include <sstream>

namespace vorant::cli {
namespace {

struct StepCase { const char* name; long long total; const char* script; long long steps; };
class ProgressSteps : public ::testing::TestWithParam<StepCase> {};

// Script words: P a page program; Ixx a one-byte instruction xx (hex);
// Oxx a shift opening a transaction with xx; C a capture closing it; Wn a
// wait of n us; Q a cancel query (answered true).
TEST_P(ProgressSteps, CountWhatTheScriptSends) {
    test::RecordingScanPort inner;
    inner.cancelFromQuery = 1;
    ProgressPlan plan;
    plan.totalSteps = GetParam().total;
    plan.pageProgramOpcode = 0x02, plan.readOpcode = 0x03, plan.bulkEraseOpcode = 0xC7;
    plan.eraseSteps = 10, plan.eraseStepMicroseconds = 100, plan.pageBytes = 256;
    ProgressPort port(inner, plan);
    auto frame = [](unsigned opcode, std::size_t bits) {
        RLBitVec bitsOut(bits, false);
        for (int i = 0; i < 8; ++i) bitsOut.setBit(static_cast<std::size_t>(i), (opcode >> (7 - i)) & 1);
        return bitsOut;
    };
    std::istringstream script(GetParam().script);
    for (std::string word; script >> word;) {
        const unsigned opcode = word[0] == 'I' || word[0] == 'O' ? std::stoul(word.substr(1), nullptr, 16) : 0x02;
        RLBitVec tdi = frame(opcode, word[0] == 'P' ? 2080 : word[0] == 'O' ? 32 : word[0] == 'C' ? 64 : 8);
        RLBitVec ones(tdi.length(), true), tdo(tdi.length(), false), mask(tdi.length(), word[0] == 'C');
        switch (word[0]) {
        case 'P': port.shift(0, &tdi, &ones, &tdo, &mask); break;
        case 'I': port.shiftWrite(0, &tdi, 0); break;
        case 'O': port.shift(1, &tdi, &ones, &tdo, &mask); break;
        case 'C': port.shift(12, &tdi, &ones, &tdo, &mask); break;
        case 'W': port.wait(std::stoi(word.substr(1)), true); break;
        case 'Q': EXPECT_TRUE(port.isCancelled(2)); break;
        default: FAIL() << word;
        }
    }
    EXPECT_EQ(port.stepsDone(), GetParam().steps);
}

INSTANTIATE_TEST_SUITE_P(Scripts, ProgressSteps, ::testing::Values(
    StepCase{"OnePerPageProgramNotPerPollOrCancelQuery", 1000, "I06 P W0 O05 C Q I06 P W0 O05 C Q I06 P Q", 3},
    StepCase{"ABarePageProgramOpcodeIsNoPage", 1000, "I02 I02", 0},
    // A read command's capture is a page; a status read's, or one after a wait closed the command, is not.
    StepCase{"PageReads", 1000, "O03 C O03 C O05 C O03 W0 C", 2},
    StepCase{"EraseByTheTimeWaited", 1000, "IC7 W250 O05 C W50 Q", 3},
    StepCase{"EraseNeverPastItsShare", 1000, "IC7 W100000", 10},
    StepCase{"EraseEndedEarlyCountsWhole", 1000, "IC7 W100 I04", 10},
    StepCase{"WaitsAfterTheEraseAreNoErase", 1000, "IC7 W100 I04 W100000 IC7 W100000 I04 W100000", 20},
    StepCase{"NeverPastTheTotal", 2, "P P P P P", 2},
    StepCase{"WithoutATotalCountsOn", 0, "P P P P P", 5}),
    [](const auto& info) { return std::string(info.param.name); });

}  // namespace
}  // namespace vorant::cli
