// The simulator's faults as users name them: each accepted text sets the
// plan field it says, and each malformed one is refused with the reason and
// the list of known faults.

#include "ports/sim/FaultOption.h"

#include <gtest/gtest.h>

#include <functional>

namespace vorant::sim::test {
namespace {

TEST(FaultOption, EachTextSetsItsField) {
    const std::pair<const char*, std::function<bool(const FaultPlan&)>> cases[] = {
        {"protected", [](const FaultPlan& p) { return p.protectAtPowerOn; }},
        {"deep-power-down", [](const FaultPlan& p) { return p.startInDeepPowerDown; }},
        {"status-locked", [](const FaultPlan& p) { return p.statusWriteLocked; }},
        {"cancel-after=0x10", [](const FaultPlan& p) { return p.cancelAfterPages == 16; }},
        {"fail-shift=3", [](const FaultPlan& p) { return p.failShiftAt == 3 && p.failShiftAtPage == 0; }},
        {"fail-shift=page:2", [](const FaultPlan& p) { return p.failShiftAtPage == 2 && p.failShiftAt == 0; }},
        {"disconnect=7", [](const FaultPlan& p) { return p.disconnectAtShift == 7; }},
        {"stuck-bit=16:1:1", [](const FaultPlan& p) {
             return p.stuckBits.size() == 1 && p.stuckBits[0].address == 16 && p.stuckBits[0].value == 1;
         }},
    };
    for (const auto& [text, holds] : cases) {
        FaultPlan plan;
        addFault(plan, text);
        EXPECT_TRUE(holds(plan)) << text;
    }
    EXPECT_EQ(faultPlan({"stuck-bit=1:1", "stuck-bit=2:1"}).stuckBits.size(), 2u) << "stuck bits add up";
}

TEST(FaultOption, RefusesMalformedFaultsWithTheReason) {
    const std::pair<const char*, const char*> cases[] = {
        {"melt", "unknown fault"},
        {"stuck-busy=1", "takes no value"},
        {"fail-shift=0", "counts from 1"},
        {"fail-wait=page:x", "'x' is not a count"},
        {"disconnect=page:2", "counts shift calls"},
        {"stuck-bit=5", "needs ADDR:MASK"},
        {"stuck-bit=5:0", "'0' is not a byte mask (1..0xFF)"},
        {"stuck-bit=5:1:256", "'256' is not a byte value"},
    };
    for (const auto& [text, reason] : cases) {
        FaultPlan plan;
        try {
            addFault(plan, text);
            ADD_FAILURE() << text << " was accepted";
        } catch (const FaultOptionError& error) {
            const std::string message = error.what();
            EXPECT_EQ(message.rfind(std::string("--sim-fault '") + text + "': " + reason, 0), 0u) << message;
            EXPECT_NE(message.find("(known: " + faultList() + ")"), std::string::npos) << message;
        }
    }
    for (const FaultOption& option : faultOptions()) EXPECT_NE(faultList().find(option.name), std::string::npos);
}

}  // namespace
}  // namespace vorant::sim::test
