#include "ports/jtag/board/BoardSink.h"

#include "ports/jtag/board/BoardScans.h"

namespace vorant::ports::jtag {

BoardSink::BoardSink(BoardModel& board) : board_(board) { resetToIdle(board_); }

// The other TAPs of the chain get BYPASS (all ones) in IR and one bit in
// DR; the TAPs nearest TDO are shifted first.
bool BoardSink::irScan(unsigned bits, std::uint64_t value) {
    const JtagChain& chain = board_.settings().chain;
    BitBuffer ir, ones;
    ones.assign(chain.irBitsAfter(), true);
    ir.append(ones.data(), ones.size());
    for (unsigned k = 0; k < bits; ++k) {
        ir.appendZeros(1);
        ir.setBit(ir.size() - 1, k < 64 && ((value >> k) & 1u));
    }
    ones.assign(chain.irBitsBefore(), true);
    ir.append(ones.data(), ones.size());
    scanIr(board_, ir, scratch_);
    const std::size_t at = chain.irBitsAfter();
    if (bits < 2 || !scratch_.bit(at) || scratch_.bit(at + 1)) {
        error_ = "the TAP's IR did not capture ...01 (is the IR length " + std::to_string(bits) + " right?)";
        return false;
    }
    return true;
}

bool BoardSink::drScan(const BitBuffer& tdi, BitBuffer* tdo) {
    const JtagChain& chain = board_.settings().chain;
    if (chain.tapCount() == 1) {
        scanDr(board_, tdi, tdo != nullptr ? *tdo : scratch_);
        return true;
    }
    BitBuffer padded;
    padded.appendZeros(chain.tapsAfter());
    padded.append(tdi.data(), tdi.size());
    padded.appendZeros(chain.tapsBefore());
    scanDr(board_, padded, scratch_);
    if (tdo != nullptr) {
        tdo->clear();
        tdo->appendRange(scratch_.data(), chain.tapsAfter(), tdi.size());
    }
    return true;
}

bool BoardSink::idle(std::uint64_t microseconds) {
    const std::uint64_t hz = board_.settings().tckHz;
    runIdle(board_, (microseconds * hz + 999'999) / 1'000'000);
    return true;
}

}  // namespace vorant::ports::jtag
