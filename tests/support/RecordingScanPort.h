#pragma once
// A scan port for exact-stream tests: it logs every call in order and can be
// scripted (bits to capture, failing shifts and waits, cancel requests, file
// mode).

#include "host/RLBitVec.h"
#include "host/ScanPort.h"

#include <cstddef>
#include <functional>
#include <string>
#include <vector>

namespace vorant::test {

// A vector as text, bit 0 first: "10011111" for opcode 0x9F.
std::string bitsOf(const RLBitVec& vector);

struct ScanEvent {
    enum class Kind { Comment, Shift, ShiftWrite, Wait, Cancel, OutputMode };
    explicit ScanEvent(Kind k) : kind(k) {}
    Kind kind;
    int stage = -1;
    // Bit texts (bit 0 first). tdo is recorded as it was handed in (the
    // expected bits) and tdoAfter as it was left (the captured bits).
    std::string tdi, tdiMask, tdo, tdoMask, tdoAfter;
    int time = 0;
    bool timeFlag = false;
    int level = 0;     // isCancelled's argument
    std::string text;  // comment text
    bool result = true;
};

class RecordingScanPort : public ScanPort {
public:
    // What a stage-12 shift captures. Gets the tdi of the shift that opened
    // the transaction (bit text; "" when no stage-1 shift opened it) and the
    // number of bits to capture; returns the bit text to store (shorter
    // texts are padded with '0', longer ones cut). Without a responder, and
    // on a failing shift, a capture leaves tdo untouched.
    using Responder = std::function<std::string(const std::string& openingTdi, std::size_t bits)>;

    bool outputMode() override;
    void comment(const char* text) override;
    bool shift(int stage, RLBitVec* tdi, RLBitVec* tdiMask, RLBitVec* tdo, RLBitVec* tdoMask) override;
    bool shiftWrite(int stage, RLBitVec* tdi, int reserved) override;
    bool wait(int time, bool microseconds) override;
    bool isCancelled(int level) override;

    // Scripting.
    bool fileMode = false;
    Responder responder;
    // 1-based call numbers (counting shift and shiftWrite together) that
    // fail; failAllShifts fails every one.
    std::vector<int> failingShifts;
    bool failAllShifts = false;
    std::vector<int> failingWaits;  // 1-based wait calls that fail
    // isCancelled answers true from this 1-based query on (0: never).
    int cancelFromQuery = 0;
    // Status reads (stage-12 capture after an opening shift of `statusOpcode`)
    // answer busy (WIP set) for the first busyReads reads, then statusValue.
    // Values are in register order and go out MSB first, so WIP (bit 0) is
    // the last bit captured; a busy read answers statusValue | 0x01. Longer
    // captures repeat the byte, as a flash does. Captures after any other
    // opening shift go to the responder installed before (if any).
    void scriptStatus(const std::string& statusOpcodeBits, int busyReads, unsigned statusValue = 0);

    // The log.
    std::vector<ScanEvent> events;
    // One line per event, for readable expectations:
    //   "comment //Loading device with 'write enable' instruction.\n"
    //   "shiftWrite 0 00000110"
    //   "shift 1 00000101"          (tdi only)
    //   "wait 10"
    //   "isCancelled 2"
    //   "outputMode"                (a query of outputMode())
    std::vector<std::string> lines() const;
    // The same without the outputMode queries: what reaches the wire.
    std::vector<std::string> scanLines() const;
    std::size_t count(ScanEvent::Kind kind) const;
    void clear() { events.clear(); shiftCalls_ = waitCalls_ = cancelQueries_ = 0; openingTdi_.clear(); }

private:
    bool nextShiftFails();
    // Tracks chip-select framing so a capture knows its opening shift.
    void trackTransaction(int stage, const std::string& tdiBits);
    int shiftCalls_ = 0, waitCalls_ = 0, cancelQueries_ = 0;
    std::string openingTdi_;
};

}  // namespace vorant::test
