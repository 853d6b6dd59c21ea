#include "ports/jtag/board/BoardSink.h"

#include "ports/jtag/board/BoardScans.h"

namespace vorant::ports::jtag {

BoardSink::BoardSink(BoardModel& board) : board_(board) { resetToIdle(board_); }

bool BoardSink::irScan(unsigned bits, std::uint64_t value) {
    BitBuffer ir;
    ir.assign(bits, false);
    for (unsigned k = 0; k < bits && k < 64; ++k) ir.setBit(k, (value >> k) & 1u);
    scanIr(board_, ir, scratch_);
    if (bits < 2 || !scratch_.bit(0) || scratch_.bit(1)) {
        error_ = "the TAP's IR did not capture ...01 (is the IR length " + std::to_string(bits) + " right?)";
        return false;
    }
    return true;
}

bool BoardSink::drScan(const BitBuffer& tdi, BitBuffer* tdo) {
    scanDr(board_, tdi, tdo != nullptr ? *tdo : scratch_);
    return true;
}

bool BoardSink::idle(std::uint64_t microseconds) {
    const std::uint64_t hz = board_.settings().tckHz;
    runIdle(board_, (microseconds * hz + 999'999) / 1'000'000);
    return true;
}

}  // namespace vorant::ports::jtag
