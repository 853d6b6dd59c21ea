#pragma once
// A scan port for exact-stream tests: it logs every call in order and can be
// scripted (bits to capture, failing shifts and waits, cancel requests, file
// mode).

#include "host/RLBitVec.h"
#include "host/ScanPort.h"

#include <functional>
#include <string>
#include <vector>

namespace vorant::test {

// A vector as text, bit 0 first: "10011111" for opcode 0x9F.
std::string bitsOf(const RLBitVec& vector);

struct ScanEvent {
    // The call as one line of text:
    //   "comment //Loading device with 'write enable' instruction.\n"
    //   "shiftWrite 0 00000110"   "shift 1 00000101" (stage, then tdi)
    //   "wait 10" (microseconds; "wait 10 (not us)" otherwise)
    //   "isCancelled 2"           "outputMode" (a query of outputMode())
    std::string line{};
    // A shift's other vectors as bit texts, tdo as handed in: the bits expected.
    std::string tdiMask{}, tdo{}, tdoMask{};
};

class RecordingScanPort : public ScanPort {
public:
    // What a stage-12 shift captures. Gets the tdi of the shift that opened
    // the transaction (bit text; "" when no stage-1 shift opened it) and the
    // number of bits to capture; returns the bit text to store (shorter
    // texts are padded with '0', longer ones cut). An empty text, a failing
    // shift or no responder leave tdo untouched, as a recording port does.
    using Responder = std::function<std::string(const std::string& openingTdi, std::size_t bits)>;

    bool outputMode() override;
    void comment(const char* text) override;
    bool shift(int stage, RLBitVec* tdi, RLBitVec* tdiMask, RLBitVec* tdo, RLBitVec* tdoMask) override;
    bool shiftWrite(int stage, RLBitVec* tdi, int reserved) override;
    bool wait(int time, bool microseconds) override;
    bool isCancelled(int level) override;
    // Not logged: they put nothing on the wire.
    const char* failureReason() override { return failed_ ? "scripted failure" : nullptr; }
    bool connectionLost() override { return lost_; }

    // Scripting.
    bool fileMode = false;
    Responder responder;
    // 1-based numbers of the shift calls (shift and shiftWrite counted
    // together) and of the wait calls that fail.
    std::vector<int> failingShifts, failingWaits;
    // isCancelled answers true from this 1-based query on (0: never).
    int cancelFromQuery = 0;
    // The first failing shift or wait takes the cable with it:
    // connectionLost() answers true from then on.
    bool failureLosesCable = false;

    // The log.
    std::vector<ScanEvent> events;
    // One line per event; without the outputMode queries, what reaches the wire.
    std::vector<std::string> lines(bool withOutputModeQueries = true) const;

private:
    // Logs a call; true unless its number is listed as failing.
    bool record(const std::string& line, const std::vector<int>& failing, int& calls);
    int shiftCalls_ = 0, waitCalls_ = 0, cancelQueries_ = 0;
    bool failed_ = false, lost_ = false;
    std::string openingTdi_;  // the tdi of the shift that opened the current transaction
};

}  // namespace vorant::test
