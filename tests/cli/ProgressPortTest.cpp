// ProgressPort counts steps from what goes over the wire.
#include "cli/ProgressPort.h"
#include "tests/support/RecordingScanPort.h"

#include <gtest/gtest.h>

#include <functional>
#include <sstream>

namespace vorant::cli {
namespace {

struct StepCase { const char* name; long long total; const char* script; long long steps; };
class ProgressSteps : public ::testing::TestWithParam<StepCase> {};

// Script words: P a page program; Ixx a one-byte instruction xx (hex);
// Oxx a shift opening a transaction with xx; C a capture closing it; Wn a
// wait of n us; Q a cancel query (answered true). `afterWord` runs after
// each word.
void play(ProgressPort& port, const std::string& text, const std::function<void()>& afterWord = [] {}) {
    auto frame = [](unsigned opcode, std::size_t bits) {
        RLBitVec bitsOut(bits, false);
        for (int i = 0; i < 8; ++i) bitsOut.setBit(static_cast<std::size_t>(i), (opcode >> (7 - i)) & 1);
        return bitsOut;
    };
    std::istringstream script(text);
    for (std::string word; script >> word; afterWord()) {
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
}

ProgressPlan testPlan(long long totalSteps) {
    ProgressPlan plan;
    plan.totalSteps = totalSteps;
    plan.pageProgramOpcode = 0x02, plan.readOpcode = 0x03, plan.bulkEraseOpcode = 0xC7;
    plan.eraseSteps = 10, plan.eraseStepMicroseconds = 100, plan.pageBytes = 256;
    return plan;
}

TEST_P(ProgressSteps, CountWhatTheScriptSends) {
    test::RecordingScanPort inner;
    inner.cancelFromQuery = 1;
    ProgressPort port(inner, testPlan(GetParam().total));
    play(port, GetParam().script);
    EXPECT_EQ(port.stepsDone(), GetParam().steps);
}

INSTANTIATE_TEST_SUITE_P(Scripts, ProgressSteps, ::testing::Values(
    StepCase{"OnePerPageProgramNotPerPollOrCancelQuery", 1000, "I06 P W0 O05 C Q I06 P W0 O05 C Q I06 P Q", 3},
    // A read command's capture is a page; a status read's, or one after a wait closed the command, is not.
    StepCase{"PageReads", 1000, "O03 C O03 C O05 C O03 W0 C", 2},
    StepCase{"EraseByTheTimeWaited", 1000, "IC7 W250 O05 C W50 Q", 3},
    StepCase{"EraseNeverPastItsShare", 1000, "IC7 W100000", 10},
    StepCase{"WaitsAfterTheEraseAreNoErase", 1000, "IC7 W100 I04 W100000 IC7 W100000 I04 W100000", 20},
    StepCase{"NeverPastTheTotal", 2, "P P P P P", 2}),
    [](const auto& info) { return std::string(info.param.name); });

struct PhaseCase { const char* name; const char* script; const char* phases; };
class Phases : public ::testing::TestWithParam<PhaseCase> {};

// Every script word takes one second of the clock; "name seconds/bytes".
TEST_P(Phases, TakeTheTimeFromTheirFirstTransactionToTheNextPhase) {
    test::RecordingScanPort inner;
    ProgressPort port(inner, testPlan(1000));
    double now = 0;
    port.setPhaseClock([&now] { return now; });
    play(port, GetParam().script, [&now] { now += 1; });
    std::string text;
    for (const PhaseFigures& phase : port.phaseFigures("verify"))
        text += (text.empty() ? "" : ", ") + phase.name + " " + std::to_string(int(phase.seconds)) + "/" +
                std::to_string(phase.bytes);
    EXPECT_EQ(text, GetParam().phases);
}

INSTANTIATE_TEST_SUITE_P(Scripts, Phases, ::testing::Values(
    // The write enable before the erase and the status polls in it are no
    // phase of their own; the program's write enables belong to it.
    PhaseCase{"EraseProgramVerify", "I06 IC7 O05 C I06 P O05 C I06 P O03 C O03 C",
              "erase 4/0, program 5/512, verify 4/16"},
    PhaseCase{"StatusReadsAlone", "O05 C O05 C I04", ""},
    PhaseCase{"ABareEraseOpcodeStillErases", "IC7 W100", "erase 2/0"}),
    [](const auto& info) { return std::string(info.param.name); });

}  // namespace
}  // namespace vorant::cli
