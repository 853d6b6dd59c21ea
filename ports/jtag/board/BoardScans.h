#pragma once
// Whole JTAG operations on a simulated board, walked TCK by TCK through its
// TAP as an adapter would: reset, IR and DR scans that start and end in
// Run-Test/Idle, and idle clocks.

#include "ports/jtag/board/BoardModel.h"
#include "ports/wire/BitBuffer.h"

#include <cstdint>

namespace vorant::ports::jtag {

// Five clocks with TMS high, then Run-Test/Idle.
void resetToIdle(BoardModel& board);
// Shifts `bits` through IR or DR (bit 0 first) and returns TDO of each
// shift in `tdo`, from Run-Test/Idle back to it.
void scanIr(BoardModel& board, const BitBuffer& bits, BitBuffer& tdo);
void scanDr(BoardModel& board, const BitBuffer& bits, BitBuffer& tdo);
// Clocks in Run-Test/Idle.
void runIdle(BoardModel& board, std::uint64_t cycles);

}  // namespace vorant::ports::jtag
