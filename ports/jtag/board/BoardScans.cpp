#include "ports/jtag/board/BoardScans.h"

namespace vorant::ports::jtag {

namespace {

// From Capture through Shift (when there are bits), Exit1 and Update to
// Run-Test/Idle.
void shiftFromCapture(BoardModel& board, const BitBuffer& bits, BitBuffer& tdo) {
    tdo.assign(bits.size(), false);
    if (bits.empty()) {
        board.cycle(true, false);  // Capture -> Exit1
        board.cycle(true, false);
        board.cycle(false, false);
        return;
    }
    board.cycle(false, false);  // Capture -> Shift
    for (std::size_t i = 0; i < bits.size(); ++i) {
        const bool last = i + 1 == bits.size();
        tdo.setBit(i, board.cycle(last, bits.bit(i)));
    }
    board.cycle(true, false);   // Exit1 -> Update
    board.cycle(false, false);  // Update -> Run-Test/Idle
}

}  // namespace

void resetToIdle(BoardModel& board) {
    for (int k = 0; k < 5; ++k) board.cycle(true, false);
    board.cycle(false, false);
}

void scanIr(BoardModel& board, const BitBuffer& bits, BitBuffer& tdo) {
    board.cycle(true, false);   // Select-DR
    board.cycle(true, false);   // Select-IR
    board.cycle(false, false);  // Capture-IR
    shiftFromCapture(board, bits, tdo);
}

void scanDr(BoardModel& board, const BitBuffer& bits, BitBuffer& tdo) {
    board.cycle(true, false);   // Select-DR
    board.cycle(false, false);  // Capture-DR
    shiftFromCapture(board, bits, tdo);
}

void runIdle(BoardModel& board, std::uint64_t cycles) {
    if (cycles == 0) return;
    board.cycle(false, false);  // into Run-Test/Idle if not there yet
    board.idleCycles(cycles - 1);
}

}  // namespace vorant::ports::jtag
