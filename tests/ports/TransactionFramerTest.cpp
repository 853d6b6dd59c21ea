// The stage-code rules, on a sink that logs the three edges of a
// transaction. Each row is a script of shifts ("1" a stage-1 shift, "12" a
// capture, "w" a wait, "n0" a stage-0 shift without tdi) and the edges the
// sink must see; "!" marks a refused shift in the log.

#include "host/RLBitVec.h"
#include "host/ScanPort.h"
#include "ports/wire/TransactionFramer.h"

#include <gtest/gtest.h>

#include <sstream>
#include <stdexcept>
#include <string>

namespace vorant::ports::test {
namespace {

class LoggingSink : public TransactionSink {
public:
    std::string log;
    bool throwOnShift = false;
    void select() override { log += "S"; }
    void shiftBits(const RLBitVec& tdi, RLBitVec*, const RLBitVec*, bool capture) override {
        if (throwOnShift) throw std::runtime_error("cable gone");
        log += capture ? "c" : "s";
        log += std::to_string(tdi.length());
    }
    void deselect() override { log += "D"; }
};

struct FramingCase {
    const char* script;
    const char* edges;
};

std::string play(const std::string& script, LoggingSink& sink, TransactionFramer& framer) {
    std::istringstream steps(script);
    for (std::string step; steps >> step;) {
        if (step == "w") {
            framer.closeOpenTransaction();
            sink.log += "|";
            continue;
        }
        const bool noTdi = step[0] == 'n';
        const int stage = std::stoi(noTdi ? step.substr(1) : step);
        RLBitVec tdi(8, false), tdo(8, false);
        if (framer.shift(stage, noTdi ? nullptr : &tdi, &tdo, nullptr) != FramingFault::None) sink.log += "!";
    }
    return sink.log;
}

TEST(TransactionFramer, FramesEveryStageSequenceByTheRules) {
    const FramingCase cases[] = {
        {"0", "Ss8D"},
        {"1 2 3", "Ss8s8s8D"},
        {"1 12", "Ss8c8D"},
        {"1 2 w", "Ss8s8D|"},          // the unlock: the wait deselects
        {"1 1", "Ss8DSs8"},            // an opening stage closes the one left open
        {"1 0", "Ss8DSs8D"},
        {"w 1 w w", "|Ss8D||"},        // a wait with nothing open does nothing
        {"0 3", "Ss8D!"},
        {"1 7 3", "Ss8!s8D"},          // a refused shift leaves the transaction open
        {"1 n2 3", "Ss8!s8D"},
    };
    for (const FramingCase& row : cases) {
        LoggingSink sink;
        TransactionFramer framer(sink);
        EXPECT_EQ(play(row.script, sink, framer), row.edges) << row.script;
    }
}

// A sink that throws (a lost cable) must not be left counted open, or the
// next wait would deselect a transaction the cable never saw.
TEST(TransactionFramer, ASinkThatThrowsLeavesNothingOpen) {
    LoggingSink sink;
    TransactionFramer framer(sink);
    sink.throwOnShift = true;
    RLBitVec tdi(8, false);
    EXPECT_THROW(framer.shift(ScanStage::kOpen, &tdi, nullptr, nullptr), std::runtime_error);
    EXPECT_FALSE(framer.transactionOpen());
    framer.closeOpenTransaction();
    EXPECT_EQ(sink.log, "S");
}

}  // namespace
}  // namespace vorant::ports::test
